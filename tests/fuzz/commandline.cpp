// The command line, against a plain account of its options. A unit is the words, with a NUL byte
// between each two, as in /proc/PID/cmdline. exit() and writestandard() are replaced at link time.

#include <algorithm>

#include "fuzz.h"
#include "leadingnumber.h"
#include "wdmain.h"

namespace {

using Words = std::vector<std::string>;

// What a command line leads to: settings, or a message on standard error and an exit status.
struct Outcome {
    std::string config;
    std::string log;
    int refresh = 0;
    bool debug = false;
    std::string message;
    int status = 0;

    bool operator==(const Outcome&) const = default;
};

struct Exit {
    int status;
};

// Whether exit() is called by the daemon. The fuzzer itself ends through it, too.
bool trying = false;

// What the daemon has written to standard error.
std::string said;

struct Option {
    std::string word;
    Words refused;
    const char* message;
};

const Option kConfig{"-i", {"-l", "-n", "-t"}, "'-i' used but no input file path specified \n"};
const Option kLog{
    "-l", {"-i", "-n", "-t"}, "'-o' used but no output local log file path specified \n"};
const Option kRefresh{"-t", {"-l", "-i", "-n"}, "'-t' used but no check time specified \n"};
constexpr const char* kNoConfig = "input configuration file path not specified\n";
constexpr const char* kNoLog = "output log file path not specified\n";

bool among(const Words& words, const std::string& word)
{
    return std::find(words.begin(), words.end(), word) != words.end();
}

struct Refusal {
    const char* message;
};

void refuseunless(bool right, const char* message)
{
    if (!right) {
        throw Refusal{message};
    }
}

// The word behind the option's first occurrence; an empty text where there is no such option.
std::string valueof(const Option& option, const Words& words)
{
    const auto place = std::find(words.begin(), words.end(), option.word);
    if (place == words.end()) {
        return "";
    }
    refuseunless(place + 1 != words.end() && !among(option.refused, place[1]), option.message);
    return place[1];
}

Outcome expected(const Words& words)
{
    try {
        const std::string config = valueof(kConfig, words);
        const std::string log = valueof(kLog, words);
        const int seconds = static_cast<int>(leadingnumber<long>(valueof(kRefresh, words)));
        refuseunless(!config.empty(), kNoConfig);
        refuseunless(!log.empty(), kNoLog);
        return {config, log, seconds < 120 ? 10800 : seconds, among(words, "-g"), "", 0};
    } catch (const Refusal& refusal) {
        return {"", "", 0, false, refusal.message, 2};
    }
}

void resetsettings()
{
    configPath.clear();
    wdlocallogpath.clear();
    globalrefresh = 0;
    debugenable = false;
}

// Returns the exit status, or 0 where the daemon goes on.
int start(Words words, Stopwatch& watch)
{
    words.insert(words.begin(), "tolkwd");
    std::vector<char*> argv;
    for (auto& word : words) {
        argv.push_back(word.data());
    }
    argv.push_back(nullptr);
    trying = true;
    int status = 0;
    try {
        const Stopwatch::Lap lap(watch);
        parseArg(static_cast<int>(words.size()), argv.data());
        checkParsed();
    } catch (const Exit& ended) {
        status = ended.status;
    }
    trying = false;
    return status;
}

Outcome actual(const Words& words, Stopwatch& watch)
{
    resetsettings();
    said.clear();
    const int status = start(words, watch);
    if (status != 0) {
        return {"", "", 0, false, said, status};
    }
    return {configPath, wdlocallogpath, globalrefresh, debugenable, said, 0};
}

} // namespace

extern "C" {

[[noreturn]] void __real_exit(int status);

[[noreturn]] void __wrap_exit(int status)
{
    if (trying) {
        throw Exit{status};
    }
    __real_exit(status);
}

// writestandard(int, std::string_view)
void __wrap__Z13writestandardiSt17basic_string_viewIcSt11char_traitsIcEE(int /*fd*/,
                                                                         std::string_view text)
{
    said += text;
}

} // extern "C"

std::size_t tryunit(const std::string& unit, Stopwatch& watch)
{
    const Words words = unit.empty() ? Words() : cut(unit, '\0');
    demand(actual(words, watch) == expected(words), "settings or refusal are as accounted");
    return unit.size();
}
