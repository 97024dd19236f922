#include "interrupt.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <system_error>

#include <sys/wait.h>
#include <unistd.h>

namespace check {

namespace {

constexpr std::array<int, 3> kEndingSignals{SIGINT, SIGTERM, SIGHUP};
constexpr int kSignalStatus = 128;

bool isignored(int signal)
{
    struct sigaction action {};
    return sigaction(signal, nullptr, &action) == 0 && action.sa_handler == SIG_IGN;
}

// Keeps the signals that are waited for from ending this process.
class awaitedsignals {
public:
    awaitedsignals()
    {
        (void)std::signal(SIGCHLD, SIG_DFL); // whoever started this may have left it ignored
        sigemptyset(&awaited);
        sigaddset(&awaited, SIGCHLD);
        for (const int signal : kEndingSignals) {
            if (!isignored(signal)) {
                sigaddset(&awaited, signal);
            }
        }
        sigprocmask(SIG_BLOCK, &awaited, &before);
    }
    ~awaitedsignals() { release(); }
    awaitedsignals(const awaitedsignals&) = delete;
    awaitedsignals& operator=(const awaitedsignals&) = delete;

    void release() const { sigprocmask(SIG_SETMASK, &before, nullptr); }

    [[nodiscard]] int next() const
    {
        int signal = 0;
        sigwait(&awaited, &signal);
        return signal;
    }

private:
    sigset_t awaited{};
    sigset_t before{};
};

int interrupted(int signal)
{
    const bool behindprogress = isatty(STDERR_FILENO) == 1;
    (void)std::fputs(
        behindprogress ? "\ntolkwd-check: interrupted\n" : "tolkwd-check: interrupted\n", stderr);
    return kSignalStatus + signal;
}

// Of a child that has ended; it is waited for until then.
int statusof(pid_t child)
{
    int status = 0;
    while (waitpid(child, &status, 0) < 0 && errno == EINTR) {
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : interrupted(WTERMSIG(status));
}

} // namespace

int runinterruptibly(const std::function<int()>& work)
{
    const awaitedsignals signals;
    const pid_t child = fork();
    if (child < 0) {
        throw std::system_error(errno, std::generic_category(), "a process for the commands");
    }
    if (child == 0) {
        signals.release();
        std::_Exit(work());
    }
    const int signal = signals.next();
    if (signal == SIGCHLD) {
        return statusof(child);
    }
    kill(child, SIGKILL);
    waitpid(child, nullptr, 0);
    return interrupted(signal);
}

} // namespace check
