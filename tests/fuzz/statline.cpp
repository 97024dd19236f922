// Process figures out of any stat file, clock and process id, against the same arithmetic done in
// 64 bits; and the helpers that read them. A unit is a row of checks of one process, each made of
// three pieces, with a record separator between each two: the clock in seconds, what pidof prints,
// and the stat file, which is missing when it is empty. The clock, the command and the file are
// replaced at link time.

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <ctime>
#include <string_view>

#include "ProcessStatistics_Linux.h"
#include "fuzz.h"
#include "leadingnumber.h"
#include "memoryfile.h"
#include "wdLocalLog_linux.h"
#include "wdsettings.h"

namespace {

using Texts = std::vector<std::string>;

constexpr char kSeparator = '\x1e';
constexpr std::size_t kPieces = 3;     // of a check
constexpr std::size_t kMostChecks = 8; // one more would tell nothing new
constexpr char kEndOfStat = '\xff';
constexpr std::size_t kLeastFields = 24;
constexpr std::size_t kLongestPiece = 127;
constexpr int kCpuThreshold = 1000;
constexpr int kThreadThreshold = 50;
constexpr int kPageThreshold = 1000;

struct Check {
    std::time_t clock = 0;
    std::string printed;
    std::string stat;
};

// What the daemon meets, and what it asked for.
Check meets;
std::string askedfor;
const MemoryFile printedfile;
const MemoryFile statfile;
const MemoryFile logfile;

std::vector<Check> checksof(const std::string& unit)
{
    Texts pieces = cut(unit, kSeparator);
    const std::size_t begun = (pieces.size() + kPieces - 1) / kPieces;
    pieces.resize(std::min(begun, kMostChecks) * kPieces);
    std::vector<Check> checks;
    for (std::size_t i = 0; i < pieces.size(); i += kPieces) {
        checks.push_back({leadingnumber<std::time_t>(pieces[i]), pieces[i + 1], pieces[i + 2]});
    }
    return checks;
}

// A command's output is taken line by line, in pieces, each as far as its first NUL byte.
std::string collected(const std::string& output)
{
    std::string text;
    for (std::size_t start = 0; start < output.size();) {
        const std::size_t newline = std::min(output.find('\n', start), output.size() - 1);
        const std::size_t length = std::min(newline + 1 - start, kLongestPiece);
        text += output.substr(start, length).c_str(); // NOLINT(readability-redundant-string-cstr)
        start += length;
    }
    return text;
}

// A separator at the very end is followed by no piece.
Texts separated(const std::string& text, char separator)
{
    Texts pieces = cut(text, separator);
    if (pieces.back().empty()) {
        pieces.pop_back();
    }
    return pieces;
}

int wrapped(std::int64_t value)
{
    return static_cast<std::int32_t>(value);
}

// The figures of one process, as told by what it logs.
class Account {
public:
    // The messages of the next check.
    Texts check(const Check& check)
    {
        Texts messages;
        const int found = leadingnumber<int>(collected(check.printed));
        if (found != pid) {
            messages.push_back("(p) PID changed (old = " + std::to_string(pid) +
                               ", new = " + std::to_string(found) + ")");
            pid = found;
            lasttime = 0;
        }
        const Texts fields = fieldsof(check);
        if (fields.size() < kLeastFields) {
            messages.emplace_back("(p) Unable to fetch stats of process from system");
        } else if (!take(fields, wrapped(check.clock))) {
            messages.emplace_back("Refresh called twice in zero time interval");
        }
        decide(messages);
        return messages;
    }

    static Texts fieldsof(const Check& check)
    {
        return separated(check.stat.substr(0, check.stat.find(kEndOfStat)), ' ');
    }

    [[nodiscard]] std::string statpath() const { return "/proc/" + std::to_string(pid) + "/stat"; }

    [[nodiscard]] bool reached() const
    {
        return cpu > kCpuThreshold || threads > kThreadThreshold || pages > kPageThreshold;
    }

private:
    // False where no time has passed.
    bool take(const Texts& fields, int now)
    {
        const int ticks = leadingnumber<int>(fields[13]);
        threads = leadingnumber<int>(fields[19]);
        pages = leadingnumber<int>(fields[23]);
        const bool moved = now != lasttime;
        if (lasttime != 0 && moved) {
            const int used = wrapped((std::int64_t{ticks} - lastticks) * 1000);
            cpu = wrapped(std::int64_t{used} / wrapped(std::int64_t{now} - lasttime));
        }
        const bool known = lasttime != 0;
        lasttime = now;
        lastticks = ticks;
        return moved || !known;
    }

    void decide(Texts& messages) const
    {
        const auto tell = [&](const char* figure, int value, int threshold) {
            messages.push_back(std::string("(p) ") + figure + "/Threshold:" +
                               std::to_string(value) + "/" + std::to_string(threshold));
        };
        tell("averageCPUUsage", cpu, kCpuThreshold);
        tell("numberOfThreads", threads, kThreadThreshold);
        tell("memoryUsage", pages, kPageThreshold);
        messages.emplace_back(reached() ? "(p) Threshold is reached"
                                        : "(p) Threshold is not reached");
    }

    int pid = -1;
    int cpu = 0;
    int threads = 0;
    int pages = 0;
    int lasttime = 0;
    int lastticks = 0;
};

// The log's messages, without what stands before them in each line.
Texts messagesof(const std::string& log)
{
    Texts messages = separated(log, '\n');
    for (auto& line : messages) {
        line.erase(0, line.find(' ', line.find("|TID")) + 1);
    }
    return messages;
}

void meet(const Check& check)
{
    meets = check;
    printedfile.write(check.printed);
    statfile.write(check.stat);
    logfile.write("");
}

void tryhelpers(const Check& check, Stopwatch& watch)
{
    std::string output = "before";
    Texts pieces{"before"};
    int started = 1;
    int number = 0;
    {
        const Stopwatch::Lap lap(watch);
        started = Utility::exec("anything", output);
        number = Utility::str2int(check.stat);
        Utility::split2(check.stat, ' ', pieces);
    }
    demand(started == 0 && output == collected(check.printed), "a command's output is collected");
    demand(number == leadingnumber<int>(check.stat), "a number is the one at the start");
    Texts expected = separated(check.stat, ' ');
    expected.insert(expected.begin(), "before");
    demand(pieces == expected, "pieces are appended");
}

void tryfetch(ProcessStatistics& statistics, const Check& check, Stopwatch& watch)
{
    Texts fields{"before"};
    int failure = 0;
    {
        const Stopwatch::Lap lap(watch);
        failure = statistics.FetchStatisticsFromSystem(fields);
    }
    const bool opens = !check.stat.empty();
    demand(failure == (opens ? 0 : 1), "a fetch fails where there is no file");
    demand(fields == (opens ? Account::fieldsof(check) : Texts{"before"}),
           "fields are replaced, unless the fetch fails");
}

void trycheck(ProcessStatistics& statistics, Account& account, const Check& check, Stopwatch& watch)
{
    bool reached = false;
    {
        const Stopwatch::Lap lap(watch);
        reached = statistics.IsThresholdReached();
    }
    demand(messagesof(logfile.read()) == account.check(check), "the log tells the figures");
    demand(askedfor == account.statpath(), "the process found is the one that is read");
    demand(reached == account.reached(), "figures above their thresholds decide");
}

} // namespace

// The replaced functions, under the names that the linker gives them.
extern "C" {

std::FILE* __real_fopen(const char* path, const char* mode);

std::FILE* __wrap_fopen(const char* path, const char* mode)
{
    const std::string_view name(path);
    if (!name.starts_with("/proc/") || !name.ends_with("/stat")) {
        return __real_fopen(path, mode);
    }
    askedfor = name;
    return meets.stat.empty() ? nullptr : __real_fopen(statfile.path().c_str(), mode);
}

std::FILE* __wrap_popen(const char* /*command*/, const char* mode)
{
    return __real_fopen(printedfile.path().c_str(), mode);
}

int __wrap_pclose(std::FILE* stream)
{
    return std::fclose(stream);
}

std::time_t __wrap_time(std::time_t* result)
{
    if (result != nullptr) {
        *result = meets.clock;
    }
    return meets.clock;
}

} // extern "C"

std::size_t tryunit(const std::string& unit, Stopwatch& watch)
{
    debugenable = true;
    wdLocalLog::logFilePath = logfile.path();
    ProcessStatistics statistics("p");
    statistics.SetThresholdAverageCPUUsage(std::to_string(kCpuThreshold));
    statistics.SetThresholdThreadCount(std::to_string(kThreadThreshold));
    statistics.SetThresholdMemoryUsage(std::to_string(kPageThreshold));
    Account account;
    std::size_t bytes = unit.size();
    for (const Check& check : checksof(unit)) {
        meet(check);
        trycheck(statistics, account, check, watch);
        tryfetch(statistics, check, watch);
        tryhelpers(check, watch);
        bytes += logfile.read().size();
    }
    return bytes;
}
