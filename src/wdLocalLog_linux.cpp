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
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include "wdsettings.h"

std::string wdLocalLog::logFilePath;

namespace {

constexpr off_t kLogLimitBytes = 1023999;
constexpr std::size_t kAsctimeBytes = 26;
constexpr mode_t kLogFileMode = 0666;
constexpr int kLogUnavailableStatus = 200;

// How long a reader that has stopped reading is waited for, in all and at a time.
constexpr int kReaderPatienceMilliseconds = 5000;
constexpr int kReaderWaitMilliseconds = 500;

// Keeps the failed writes of the calling thread from ending the process: a pipe without a reader
// (SIGPIPE), a file at its size limit (SIGXFSZ). Not by ignoring these signals, which the services
// that the daemon starts would inherit.
class writesignalguard {
public:
    writesignalguard()
    {
        sigemptyset(&signals);
        sigaddset(&signals, SIGPIPE);
        sigaddset(&signals, SIGXFSZ);
        pthread_sigmask(SIG_BLOCK, &signals, &before);
    }
    ~writesignalguard() { pthread_sigmask(SIG_SETMASK, &before, nullptr); }
    writesignalguard(const writesignalguard&) = delete;
    writesignalguard& operator=(const writesignalguard&) = delete;

    // Takes the signal of a write that has just failed off this thread.
    void takesignal() const
    {
        const timespec nowait{};
        while (sigtimedwait(&signals, nullptr, &nowait) < 0 && errno == EINTR) {
        }
    }

private:
    sigset_t signals{};
    sigset_t before{};
};

// What a line is written to: a descriptor, how it is written to without ever waiting, and what came
// of it the last time.
struct sink {
    enum manner {
        kPlain,  // its writes do not wait: a file, or opened so
        kSocket, // each write has to say that it shall not wait
        kAsked,  // it could wait, so it is asked for room before each write
    };
    int fd;
    manner how;
    std::atomic<bool>& stuck; // its reader had stopped reading
};

bool hasroom(int fd, int milliseconds)
{
    pollfd stream{fd, POLLOUT, 0};
    return poll(&stream, 1, milliseconds) != 0;
}

// One write of as much as there is room for. As write(), with EAGAIN where there is none.
ssize_t writesome(const sink& to, std::string_view text)
{
    switch (to.how) {
    case sink::kSocket:
        return send(to.fd, text.data(), text.size(), MSG_DONTWAIT | MSG_NOSIGNAL);
    case sink::kAsked:
        if (!hasroom(to.fd, 0)) {
            errno = EAGAIN;
            return -1;
        }
        return write(to.fd, text.data(), std::min<std::size_t>(PIPE_BUF, text.size()));
    default:
        return write(to.fd, text.data(), text.size());
    }
}

// Writes the whole text, in one write() unless that is cut short, and waits for a reader that has
// stopped reading, but only for one that has not been waited for in vain before. 0, or the error
// number of what kept the text, or the rest of it, from being written.
int deliver(const sink& to, std::string_view text)
{
    const writesignalguard guard;
    int patience = to.stuck ? 0 : kReaderPatienceMilliseconds;
    while (!text.empty()) {
        const ssize_t written = writesome(to, text);
        if (written > 0) {
            text.remove_prefix(static_cast<std::size_t>(written));
        } else if (written == 0) {
            return EIO;
        } else if (errno == EAGAIN && patience > 0) {
            patience -= kReaderWaitMilliseconds;
            (void)hasroom(to.fd, kReaderWaitMilliseconds); // the next write tells
        } else if (errno != EINTR) {
            const int error = errno;
            to.stuck = error == EAGAIN;
            guard.takesignal();
            return error;
        }
    }
    to.stuck = false;
    return 0;
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

// Standard output and standard error are mostly the same pipe, and one of them is hardly ever
// written to: looks at both.
void replacegonereaders()
{
    for (const int fd : {STDOUT_FILENO, STDERR_FILENO}) {
        pollfd stream{fd, 0, 0};
        if (poll(&stream, 1, 0) > 0 && (stream.revents & (POLLERR | POLLHUP)) != 0) {
            replacebynull(fd);
        }
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
    writestandard(STDERR_FILENO, "Unable to open the log file\n");
    _exit(kLogUnavailableStatus);
}

// Opens the log for appending, with `extraflags` added. Close-on-exec, or the services that
// another thread starts meanwhile would inherit the file. Without waiting, and not as the
// controlling terminal, for the path may be a pipe or a terminal, like /dev/stdout.
int openlog(int extraflags)
{
    const int fd =
        open(wdLocalLog::logFilePath.c_str(),
             O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | O_NONBLOCK | O_NOCTTY | extraflags,
             kLogFileMode);
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

// A write that waits for room in a pipe or a terminal cannot be interrupted, and O_NONBLOCK set on
// the descriptor would be set for whoever else has it. So these are opened anew, for one line.
void writestandard(int fd, std::string_view text)
{
    static std::mutex turn; // keeps the lines of two threads apart
    static std::array<std::atomic<bool>, STDERR_FILENO + 1> stuck{};
    const std::scoped_lock lock(turn);
    sink to{fd, sink::kPlain, stuck.at(static_cast<std::size_t>(fd))};
    int own = -1;
    struct stat kind {};
    fstat(fd, &kind);
    if (S_ISSOCK(kind.st_mode)) {
        to.how = sink::kSocket;
    } else if (S_ISFIFO(kind.st_mode) || isatty(fd) == 1) {
        const std::string path = "/proc/self/fd/" + std::to_string(fd);
        own = open(path.c_str(), O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
        to.fd = own >= 0 ? own : fd;
        to.how = own >= 0 ? sink::kPlain : sink::kAsked; // another user's, or no descriptor left
    }
    if (deliver(to, text) == EPIPE) {
        replacegonereaders();
    }
    if (own >= 0) {
        close(own);
    }
}

wdLocalLog::wdLocalLog(const std::string& path)
{
    logFilePath = path;
}

void wdLocalLog::LogMessage(std::string module, int level, std::string message)
{
    static std::atomic<bool> logstuck = false; // only ever true where the log is a pipe or so
    const std::time_t now = time(nullptr);
    const int fd = openlogwithinlimit();
    if (level != kLevelDebug || debugenable) {
        std::string line = timetext(now);
        line.append(" ").append(levelword(level)).append(" ").append(module);
        line.append("|TID").append(std::to_string(pthread_self()));
        line.append(" ").append(message).append("\n");
        writestandard(STDOUT_FILENO, line);
        deliver({fd, sink::kPlain, logstuck}, line);
    }
    close(fd);
}
