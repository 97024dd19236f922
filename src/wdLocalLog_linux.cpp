#include "wdLocalLog_linux.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <climits>
#include <csignal>
#include <ctime>
#include <mutex>

#include <fcntl.h>
#include <poll.h>
#include <pthread.h>
#include <unistd.h>

#include "wdsettings.h"

std::string wdLocalLog::logFilePath;

namespace {

constexpr off_t kLogLimitBytes = 1023999;
constexpr std::size_t kAsctimeBytes = 26;
constexpr mode_t kLogFileMode = 0666;
constexpr int kLogUnavailableStatus = 200;
constexpr int kReaderPatienceMilliseconds = 5000;

// Takes what one write() has written off the front of `text`. False on any error but an
// interruption.
bool writesome(int fd, std::string_view& text, std::size_t most)
{
    const ssize_t written = write(fd, text.data(), std::min(most, text.size()));
    if (written <= 0) {
        return written < 0 && errno == EINTR;
    }
    text.remove_prefix(static_cast<std::size_t>(written));
    return true;
}

// Writes the whole text with as few write() calls as the system allows: one, unless it is cut
// short. Gives up silently on an error.
void writetext(int fd, std::string_view text)
{
    while (!text.empty() && writesome(fd, text, text.size())) {
    }
}

// Keeps a pipe without a reader from ending the process, for as long as the calling thread writes.
// Not by ignoring SIGPIPE, which the services that the daemon starts would inherit.
class brokenpipeguard {
public:
    brokenpipeguard()
    {
        sigemptyset(&brokenpipe);
        sigaddset(&brokenpipe, SIGPIPE);
        pthread_sigmask(SIG_BLOCK, &brokenpipe, &before);
    }
    ~brokenpipeguard() { pthread_sigmask(SIG_SETMASK, &before, nullptr); }
    brokenpipeguard(const brokenpipeguard&) = delete;
    brokenpipeguard& operator=(const brokenpipeguard&) = delete;

    // Takes the signal of a write that failed with EPIPE off this thread.
    void takesignal() const
    {
        const timespec now{};
        while (sigtimedwait(&brokenpipe, nullptr, &now) < 0 && errno == EINTR) {
        }
    }

private:
    sigset_t brokenpipe{};
    sigset_t before{};
};

// Whether standard output or standard error, `fd`, can take PIPE_BUF bytes without delay. `stuck`
// is what the last answer for it was: only a stream that has been read so far is waited for.
bool cantake(int fd, bool& stuck)
{
    pollfd stream{fd, POLLOUT, 0};
    int ready = 0;
    do {
        ready = poll(&stream, 1, stuck ? 0 : kReaderPatienceMilliseconds);
    } while (ready < 0 && errno == EINTR);
    stuck = ready == 0;
    return ready > 0;
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
    writestandard(STDERR_FILENO, "Unable to open the log file\n");
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

// Nobody will read this stream again. A service that is started with it would be killed by the
// first word that its start command prints.
void replacebynull(int fd)
{
    const int null = open("/dev/null", O_WRONLY | O_CLOEXEC);
    if (null >= 0) {
        dup2(null, fd); // not close-on-exec: services inherit it
        close(null);
    }
}

} // namespace

// A look at the room that there is and the write behind it belong together, or the writes of other
// threads could fill it in between and this one would wait for ever: hence the turns. Only
// standard output and standard error have them; lines reach the file without.
void writestandard(int fd, std::string_view text)
{
    static std::mutex turn;
    static std::array<bool, STDERR_FILENO + 1> stuck{};
    const std::scoped_lock lock(turn);
    const brokenpipeguard guard;
    while (!text.empty() && cantake(fd, stuck.at(static_cast<std::size_t>(fd)))) {
        if (!writesome(fd, text, PIPE_BUF)) {
            if (errno == EPIPE) {
                guard.takesignal();
                replacebynull(fd);
            }
            return;
        }
    }
}

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
        writestandard(STDOUT_FILENO, line);
        writetext(fd, line);
    }
    close(fd);
}
