#include "wdLocalLog_linux.h"

#include <array>
#include <atomic>
#include <cerrno>
#include <ctime>
#include <string_view>

#include <fcntl.h>
#include <pthread.h>
#include <unistd.h>

#include "wdsettings.h"

std::string wdLocalLog::logFilePath;

namespace {

constexpr off_t kLogLimitBytes = 1023999;
constexpr std::size_t kAsctimeBytes = 26;
constexpr mode_t kLogFileMode = 0666;
constexpr int kLogUnavailableStatus = 200;

// Writes the whole text with as few write() calls as the system allows: one, unless it is cut
// short. Gives up silently on any error but an interruption.
void writetext(int fd, std::string_view text)
{
    while (!text.empty()) {
        const ssize_t written = write(fd, text.data(), text.size());
        if (written < 0 && errno == EINTR) {
            continue;
        }
        if (written <= 0) {
            return;
        }
        text.remove_prefix(static_cast<std::size_t>(written));
    }
}

// Several threads can find the log gone at once, while others still use the process-wide lists.
// The first one speaks and ends the process at once, without running any destructor under the
// others' feet; the rest wait here for that end.
[[noreturn]] void endwithoutlog()
{
    static std::atomic_flag ending;
    if (ending.test_and_set()) {
        for (;;) {
            pause();
        }
    }
    writetext(STDERR_FILENO, "Unable to open the log file\n");
    _exit(kLogUnavailableStatus);
}

// Opens the log for appending, with `extraflags` added. Close-on-exec, or the services that
// another thread starts meanwhile would inherit the file.
int openlog(int extraflags)
{
    const int fd = open(wdLocalLog::logFilePath.c_str(),
                        O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | extraflags, kLogFileMode);
    if (fd < 0) {
        endwithoutlog();
    }
    return fd;
}

// The file is emptied, never rotated, and opened for appending again: without O_APPEND the lines
// of two threads that both empty it would overwrite each other.
int openlogwithinlimit()
{
    const int fd = openlog(0);
    if (lseek(fd, 0, SEEK_END) <= kLogLimitBytes) {
        return fd;
    }
    close(fd);
    return openlog(O_TRUNC);
}

std::string_view levelword(int level)
{
    switch (level) {
    case kLevelError:
        return "ERROR";
    case kLevelInfo:
        return "INFO";
    case kLevelDebug:
        return "DEBUG";
    default:
        return "";
    }
}

// The fixed 24 characters of asctime, without its newline.
std::string timetext(std::time_t when)
{
    std::tm local{};
    localtime_r(&when, &local);
    std::array<char, kAsctimeBytes> text{};
    asctime_r(&local, text.data());
    const std::string_view line(text.data(), text.size());
    return std::string(line.substr(0, line.find_first_of(std::string_view("\n\0", 2))));
}

} // namespace

wdLocalLog::wdLocalLog(const std::string& path)
{
    logFilePath = path;
}

void wdLocalLog::LogMessage(std::string module, int level, std::string message)
{
    const std::time_t now = time(nullptr);
    const int fd = openlogwithinlimit();
    if (level != kLevelDebug || debugenable) {
        std::string line = timetext(now);
        line.append(" ").append(levelword(level)).append(" ").append(module);
        line.append("|TID").append(std::to_string(pthread_self()));
        line.append(" ").append(message).append("\n");
        writetext(STDOUT_FILENO, line);
        writetext(fd, line);
    }
    close(fd);
}
