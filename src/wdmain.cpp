#include "wdmain.h"

#include <algorithm>
#include <array>
#include <csignal>
#include <cstdlib>
#include <memory>

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

#include "wdLocalLog_linux.h"
#include "wdmanager_linux.h"

namespace {

constexpr const char* kInstallation = "/etc/opt/varden/tolk/cimom";
constexpr const char* kInstallerPidFile = "/var/run/breminstall.pid";

// The marker of a finished installation, and the command that sets it.
constexpr const char* kMarker = "/etc/opt/varden/tolk/wd.nxinstalled";
constexpr const char* kSetMarker = "touch /etc/opt/varden/tolk/wd.nxinstalled";

constexpr unsigned kInstallerPauseSeconds = 60;
constexpr int kBadCommandLineStatus = 2;
constexpr int kNotFound = -1;

// An option that takes a value, the words that are no value for it, and what is said then.
struct valueoption {
    const char* word;
    std::array<const char*, 3> refused;
    const char* message;
};

// "-n" is reserved: only looked for among the values. The log's message names '-o': wrappers match
// it, blank at the end included.
constexpr valueoption kConfigOption{
    "-i", {"-l", "-n", "-t"}, "'-i' used but no input file path specified "};
constexpr valueoption kLogOption{
    "-l", {"-i", "-n", "-t"}, "'-o' used but no output local log file path specified "};
constexpr valueoption kRefreshOption{
    "-t", {"-l", "-i", "-n"}, "'-t' used but no check time specified "};
constexpr const char* kDebugOption = "-g";

[[noreturn]] void refusecommandline(const char* message)
{
    writestandard(STDERR_FILENO, std::string(message) + "\n");
    exit(kBadCommandLineStatus);
}

// The value of the option's first occurrence, or null when the option is not there.
const std::string* valueof(const valueoption& option, const std::vector<std::string>& arguments)
{
    const int found = findarg(option.word, arguments);
    if (found == kNotFound) {
        return nullptr;
    }
    const auto place = static_cast<std::size_t>(found) + 1;
    if (place == arguments.size()) {
        refusecommandline(option.message);
    }
    const std::string& value = arguments[place];
    if (std::find(option.refused.begin(), option.refused.end(), value) != option.refused.end()) {
        refusecommandline(option.message);
    }
    return &value;
}

// Opens 0, 1 and 2 on /dev/null where whoever started the daemon had closed them. Otherwise the
// log file would get such a number, and be written to as standard output.
void openstandarddescriptors()
{
    int fd = STDIN_FILENO;
    while (fd >= 0 && fd <= STDERR_FILENO) {
        fd = open("/dev/null", O_RDWR); // not close-on-exec: services inherit these three
    }
    if (fd > STDERR_FILENO) {
        close(fd);
    }
}

// Keeps what whoever started the daemon had open beyond these three (a lock, a socket) from the
// services that the daemon starts, which outlive it.
void sealotherdescriptors()
{
    const std::unique_ptr<DIR, int (*)(DIR*)> folder(opendir("/proc/self/fd"), closedir);
    if (!folder) {
        return;
    }
    while (const dirent* entry = readdir(folder.get())) {
        const long fd = std::strtol(entry->d_name, nullptr, 10);
        if (fd > STDERR_FILENO) {
            fcntl(static_cast<int>(fd), F_SETFD, FD_CLOEXEC);
        }
    }
}

// Whoever started the daemon may have left SIGCHLD ignored. The result of every command would then
// be lost, and services that run would be taken for failing.
void restorechildsignal()
{
    (void)std::signal(SIGCHLD, SIG_DFL); // cannot fail: the signal exists
}

} // namespace

int isInstalledNX()
{
    return access(kInstallation, F_OK) == 0 && access(kMarker, F_OK) == 0 ? 1 : 0;
}

int wd_postpone()
{
    int result = access(kInstallerPidFile, F_OK);
    while (result == 0) {
        sleep(kInstallerPauseSeconds);
        result = access(kInstallerPidFile, F_OK);
    }
    return result;
}

// In this order, so that of several mistakes the first option's is reported. An option is found
// wherever it stands, also where another one takes it as its value.
void parseArg(int argc, char** argv)
{
    std::vector<std::string> arguments;
    if (argc > 1) {
        arguments.assign(argv + 1, argv + argc);
    }
    if (const auto* value = valueof(kConfigOption, arguments)) {
        configPath = *value;
    }
    if (const auto* value = valueof(kLogOption, arguments)) {
        wdlocallogpath = *value;
    }
    if (const auto* value = valueof(kRefreshOption, arguments)) {
        globalrefresh = static_cast<int>(std::strtol(value->c_str(), nullptr, 10));
    }
    if (findarg(kDebugOption, arguments) != kNotFound) {
        debugenable = true;
    }
}

int findarg(std::string name, std::vector<std::string> arguments)
{
    const auto found = std::find(arguments.begin(), arguments.end(), name);
    return found == arguments.end() ? kNotFound : static_cast<int>(found - arguments.begin());
}

void checkParsed()
{
    if (configPath.empty()) {
        refusecommandline("input configuration file path not specified");
    }
    if (wdlocallogpath.empty()) {
        refusecommandline("output log file path not specified");
    }
    globalrefresh = refreshperiod(globalrefresh);
}

void set_tmp_file_path()
{
    _tmp_file_path = kPingFolder;
}

// The installer comes before the command line: on a fresh installation even a wrong call waits for
// it and sets the marker. An operator's first try must not be what the installation trips over.
int main(int argc, char** argv)
{
    openstandarddescriptors();
    sealotherdescriptors();
    restorechildsignal();
    if (isInstalledNX() == 0) {
        wd_postpone();
        // If it fails, the next start waits again.
        [[maybe_unused]] const int ignored = std::system(kSetMarker);
    }
    parseArg(argc, argv);
    checkParsed();
    wdmanager manager(configPath, wdlocallogpath);
    set_tmp_file_path();
    manager.wdstart();
    return 0;
}
