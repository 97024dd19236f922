#include "wdLocalLog_linux.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <climits>
#include <csignal>
#include <ctime>
#include <mutex>
#include <optional>

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

// Keeps a write to a file at its size limit from ending the process. Not by ignoring the signal,
// which the services that the daemon starts would inherit; what is caught is as ever for them.
// Where it is ignored already, by whoever started the daemon, it stays so. Always true.
bool catchsizelimit()
{
    struct sigaction before {};
    sigaction(SIGXFSZ, nullptr, &before);
    if (before.sa_handler == SIG_DFL) {
        struct sigaction caught {};
        caught.sa_handler = [](int) {
        };
        caught.sa_flags = SA_RESTART;
        sigaction(SIGXFSZ, &caught, nullptr);
    }
    return true;
}

// Keeps the writes of the calling thread to a pipe without a reader from ending the process. This
// signal tells only of those: caught, it would be lost from whoever sends it on purpose.
class writesignalguard {
public:
    writesignalguard()
    {
        sigemptyset(&signals);
        sigaddset(&signals, SIGPIPE);
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
        kFile,   // has places to seek to: its writes do not wait, and it has no reader
        kPlain,  // its writes do not wait: it was opened so, or it is no kind of stream
        kSocket, // each write has to say that it shall not wait, nor raise a signal
        kAsked,  // it could wait, so it is asked for room before each write
    };
    int fd;
    manner how;
    std::atomic<bool>& stuck; // its reader had stopped reading
};

bool isfile(int fd)
{
    return lseek(fd, 0, SEEK_CUR) >= 0;
}

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
    [[maybe_unused]] static const bool caught = catchsizelimit();
    std::optional<writesignalguard> guard;
    if (to.how == sink::kPlain || to.how == sink::kAsked) {
        guard.emplace();
    }
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
            if (guard) {
                guard->takesignal();
            }
            return error;
        }
    }
    if (to.stuck) { // only then, for all threads share it
        to.stuck = false;
    }
    return 0;
}

// A write that waits for room in a pipe or a terminal cannot be interrupted, and O_NONBLOCK set on
// the descriptor would be set for whoever else has it. So these are opened anew, for one line.
sink streamsink(int fd, std::atomic<bool>& stuck)
{
    struct stat kind {};
    fstat(fd, &kind);
    if (S_ISSOCK(kind.st_mode)) {
        return {fd, sink::kSocket, stuck};
    }
    if (!S_ISFIFO(kind.st_mode) && isatty(fd) != 1) {
        return {fd, sink::kPlain, stuck};
    }
    const std::string path = "/proc/self/fd/" + std::to_string(fd);
    const int own = open(path.c_str(), O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
    if (own < 0) {
        // Another user's, a named pipe that its reader has left, or no descriptor is left.
        return {fd, sink::kAsked, stuck};
    }
    return {own, sink::kPlain, stuck};
}

// How to write to standard output or standard error; its `fd` is to be closed where it is another.
sink standardsink(int fd, std::atomic<bool>& stuck)
{
    return isfile(fd) ? sink{fd, sink::kFile, stuck} : streamsink(fd, stuck);
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

// The log as it is opened for one message.
struct openedlog {
    int fd;
    sink::manner how;
};

// The file is emptied, never rotated, and opened for appending again: without O_APPEND the lines
// of two threads that both empty it would overwrite each other.
openedlog openlogwithinlimit()
{
    const int fd = openlog(0);
    const off_t size = lseek(fd, 0, SEEK_END);
    if (size < 0) {
        return {fd, sink::kPlain}; // a pipe or a terminal
    }
    if (size <= kLogLimitBytes) {
        return {fd, sink::kFile};
    }
    close(fd);
    return {openlog(O_TRUNC), sink::kFile};
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

using asctimetext = std::array<char, kAsctimeBytes>;

asctimetext asctimeof(std::time_t when)
{
    std::tm local{};
    localtime_r(&when, &local);
    asctimetext text{};
    asctime_r(&local, text.data());
    return text;
}

// What a line needs besides its message. Finding it out is dear, and it hardly ever changes but for
// the time: each thread looks once a second. Nobody but a debugger makes a stream of a standard
// output that was a file.
struct circumstances {
    std::time_t second;
    asctimetext date;
    bool outputisfile; // standard output is

    // Valid until this thread's next call.
    static const circumstances& at(std::time_t now)
    {
        thread_local std::optional<circumstances> last;
        if (!last || last->second != now) {
            last = {now, asctimeof(now), isfile(STDOUT_FILENO)};
        }
        return *last;
    }
};

// The date is asctime's 24 characters, without its newline.
std::string composeline(const asctimetext& date, int level, std::string_view module,
                        std::string_view message)
{
    constexpr std::size_t kBesides = 64; // date, level word, thread id and what stands between
    const std::string_view when(date.data(), date.size());
    std::string line;
    line.reserve(kBesides + module.size() + message.size());
    line.append(when.substr(0, when.find_first_of(std::string_view("\n\0", 2))));
    line.append(" ").append(levelword(level)).append(" ").append(module);
    line.append("|TID").append(std::to_string(pthread_self()));
    line.append(" ").append(message).append("\n");
    return line;
}

} // namespace

void writestandard(int fd, std::string_view text)
{
    static std::mutex turn; // keeps the lines of two threads apart
    static std::array<std::atomic<bool>, STDERR_FILENO + 1> stuck{};
    const std::scoped_lock lock(turn);
    const sink to = standardsink(fd, stuck.at(static_cast<std::size_t>(fd)));
    if (deliver(to, text) == EPIPE) {
        replacegonereaders();
    }
    if (to.fd != fd) {
        close(to.fd);
    }
}

wdLocalLog::wdLocalLog(const std::string& path)
{
    logFilePath = path;
}

// Into a file, threads need not take turns: the system does not mix the bytes of two writes. (Only
// a line that a full disk has cut short, and that goes on when there is room, can be parted.)
void wdLocalLog::LogMessage(std::string module, int level, std::string message)
{
    static std::atomic<bool> logstuck = false; // only ever true where the log is a pipe or so
    static std::atomic<bool> neverstuck = false;
    const std::time_t now = time(nullptr);
    const openedlog log = openlogwithinlimit();
    if (level != kLevelDebug || debugenable) {
        const circumstances& here = circumstances::at(now);
        const std::string line = composeline(here.date, level, module, message);
        if (here.outputisfile) {
            deliver({STDOUT_FILENO, sink::kFile, neverstuck}, line);
        } else {
            writestandard(STDOUT_FILENO, line);
        }
        deliver({log.fd, log.how, logstuck}, line);
    }
    close(log.fd);
}
