#include "interrupt.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <semaphore>
#include <thread>

#include <pthread.h>
#include <unistd.h>

namespace check {

namespace {

constexpr std::array<int, 3> kEndingSignals{SIGINT, SIGTERM, SIGHUP};
constexpr int kWorkSpeaks = SIGUSR1; // it has a question, or is done
constexpr timespec kPatience{.tv_sec = 1, .tv_nsec = 0};
constexpr int kSignalStatus = 128;

pthread_t waiting; // NOLINT(cppcoreguidelines-avoid-non-const-global-variables): a handler's

// For the moments at which the waiting thread does not wait.
void handon(int signal)
{
    pthread_kill(waiting, signal);
}

// The signals that this thread waits for. They are blocked in it and handled by `handon` elsewhere,
// so that none of them ends the process in between. What commands get is as it was before.
class awaitedsignals {
public:
    awaitedsignals()
    {
        waiting = pthread_self();
        sigemptyset(&awaited);
        sigaddset(&awaited, kWorkSpeaks);
        for (std::size_t i = 0; i < kEndingSignals.size(); ++i) {
            sigaction(kEndingSignals.at(i), nullptr, &actions.at(i));
            if (actions.at(i).sa_handler != SIG_IGN) {
                sigaddset(&awaited, kEndingSignals.at(i));
            }
        }
        pthread_sigmask(SIG_BLOCK, &awaited, &mask);
        for (const int signal : kEndingSignals) {
            if (sigismember(&awaited, signal) == 1) {
                struct sigaction handled {};
                handled.sa_handler = handon;
                handled.sa_flags = SA_RESTART;
                sigaction(signal, &handled, nullptr);
            }
        }
    }
    // The mask last: what is pending then does what it did before.
    ~awaitedsignals()
    {
        for (std::size_t i = 0; i < kEndingSignals.size(); ++i) {
            sigaction(kEndingSignals.at(i), &actions.at(i), nullptr);
        }
        pthread_sigmask(SIG_SETMASK, &mask, nullptr);
    }
    awaitedsignals(const awaitedsignals&) = delete;
    awaitedsignals& operator=(const awaitedsignals&) = delete;

    // The next of them.
    [[nodiscard]] int next() const
    {
        int signal = 0;
        sigwait(&awaited, &signal);
        return signal;
    }

    // One that is there already, other than the work's; 0 where there is none.
    [[nodiscard]] int pending() const
    {
        sigset_t others = awaited;
        sigdelset(&others, kWorkSpeaks);
        const timespec nowait{};
        return std::max(sigtimedwait(&others, nullptr, &nowait), 0);
    }

    // For another thread, whose commands inherit its mask.
    void unblock() const { pthread_sigmask(SIG_SETMASK, &mask, nullptr); }

private:
    sigset_t awaited{};
    sigset_t mask{};
    std::array<struct sigaction, kEndingSignals.size()> actions{};
};

// What the two threads say to each other.
class conversation {
public:
    // The worker's side.

    // Whether there was no interrupt. A command that the interrupt has ended can be over before the
    // other thread has seen the signal: so that is asked, which looks before it answers.
    bool maygoon()
    {
        if (!stopped) {
            asked = true;
            pthread_kill(waiting, kWorkSpeaks);
            answers.acquire();
        }
        return !stopped;
    }
    void finish()
    {
        finished = true;
        pthread_kill(waiting, kWorkSpeaks);
    }

    // The waiting side.

    // Lets the worker go on, if it has asked.
    void answer()
    {
        if (asked.exchange(false)) {
            answers.release();
        }
    }
    // Tells it to stop, and waits until it has, or patience is at its end.
    void stop()
    {
        stopped = true;
        answer();
        sigset_t speaks{};
        sigemptyset(&speaks);
        sigaddset(&speaks, kWorkSpeaks);
        while (!finished && sigtimedwait(&speaks, nullptr, &kPatience) == kWorkSpeaks) {
            answer();
        }
    }
    [[nodiscard]] bool over() const { return finished; }

private:
    std::atomic<bool> stopped = false;
    std::atomic<bool> asked = false;
    std::atomic<bool> finished = false;
    std::counting_semaphore<> answers{0};
};

[[noreturn]] void endby(int signal)
{
    const bool behindprogress = isatty(STDERR_FILENO) == 1;
    (void)std::fputs(
        behindprogress ? "\ntolkwd-check: interrupted\n" : "tolkwd-check: interrupted\n", stderr);
    std::_Exit(kSignalStatus + signal);
}

} // namespace

void workuntilinterrupted(const std::function<void(const std::function<bool()>&)>& work,
                          const std::function<void()>& tidy)
{
    const awaitedsignals signals;
    conversation talk;
    std::exception_ptr failure;
    std::thread worker([&] {
        signals.unblock();
        try {
            work([&talk] { return talk.maygoon(); });
        } catch (...) {
            failure = std::current_exception();
        }
        talk.finish();
    });
    while (!talk.over()) {
        int signal = signals.next();
        if (signal == kWorkSpeaks) {
            signal = signals.pending();
        }
        if (signal != 0) {
            talk.stop();
            tidy();
            endby(signal);
        }
        talk.answer();
    }
    worker.join();
    tidy();
    if (failure) {
        std::rethrow_exception(failure);
    }
}

} // namespace check
