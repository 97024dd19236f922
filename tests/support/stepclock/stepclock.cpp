// A clock for a daemon under test, which it gets by LD_PRELOAD: it stands still while any thread of
// the daemon has something to do, and jumps to the end of the next pause when none has. So pauses
// last as long as the daemon asked for, to the second, hours of them pass in no time, and how busy
// the machine is makes no difference.
//
// What a command does takes no time on this clock. STEPCLOCK_LASTING gives some a length of their
// own, in the daemon's seconds: "TEXT=SECONDS;TEXT=SECONDS" for commands that hold the text. Each
// command is written to the file STEPCLOCK_JOURNAL, with the times at which it began and ended.
// STEPCLOCK_LATER puts the clock's beginning off by so many seconds.
//
// Does for a daemon whose threads wait for nothing but pauses, commands and each other's ends. A
// thread that waits for a lock counts as one that has something to do, so no command may last on
// this clock while another thread wants its lock.

#include <algorithm>
#include <condition_variable>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <memory>
#include <mutex>
#include <set>
#include <string>

#include <dlfcn.h>
#include <pthread.h>

namespace {

constexpr std::time_t kBegin = 1700000000; // any time will do

template <typename Function>
Function* next(const char* name)
{
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

std::string environment(const char* name)
{
    const char* const value = std::getenv(name);
    return value == nullptr ? "" : value;
}

std::time_t begintime()
{
    const std::string later = environment("STEPCLOCK_LATER");
    return kBegin + (later.empty() ? 0 : std::stol(later));
}

class stepclock {
public:
    // Lives as long as the process, whose threads may outlive all else.
    static stepclock& instance()
    {
        static auto* const only = new stepclock;
        return *only;
    }

    std::time_t now()
    {
        const std::scoped_lock lock(turn);
        return time;
    }

    void pause(unsigned seconds)
    {
        std::unique_lock lock(turn);
        const auto end = ends.insert(time + seconds);
        const std::time_t wanted = *end;
        --busy;
        step();
        moved.wait(lock, [this, wanted] { return time >= wanted; });
        ends.erase(end);
    }

    // A thread that does nothing until another one has ended, and one more or less of them.
    void leave()
    {
        const std::scoped_lock lock(turn);
        --busy;
        step();
    }
    void enter()
    {
        const std::scoped_lock lock(turn);
        ++busy;
    }

private:
    // A thread whose pause is over counts as busy from here on, and not only when it moves.
    void step()
    {
        if (busy > 0 || ends.upper_bound(time) == ends.end()) {
            return;
        }
        time = *ends.upper_bound(time);
        busy += static_cast<int>(ends.count(time));
        moved.notify_all();
    }

    std::mutex turn;
    std::condition_variable moved;
    std::time_t time = begintime();
    std::multiset<std::time_t> ends; // of the pauses under way
    int busy = 1;                    // the main thread
};

struct beginning {
    void* (*body)(void*);
    void* argument;
};

// However the thread ends: by its return or by pthread_exit.
struct leaving {
    leaving() = default;
    ~leaving() { stepclock::instance().leave(); }
    leaving(const leaving&) = delete;
    leaving& operator=(const leaving&) = delete;
};

void* run(void* argument)
{
    const std::unique_ptr<beginning> begin(static_cast<beginning*>(argument));
    const leaving atend;
    return begin->body(begin->argument);
}

unsigned lastingof(const std::string& command, std::string table)
{
    while (!table.empty()) {
        const std::string entry = table.substr(0, table.find(';'));
        table.erase(0, std::min(table.size(), entry.size() + 1));
        const std::size_t equals = entry.find('=');
        if (equals != std::string::npos &&
            command.find(entry.substr(0, equals)) != std::string::npos) {
            return static_cast<unsigned>(std::stoul(entry.substr(equals + 1)));
        }
    }
    return 0;
}

void note(std::time_t begin, const char* command)
{
    static std::mutex turn;
    const std::scoped_lock lock(turn);
    std::ofstream journal(environment("STEPCLOCK_JOURNAL"), std::ios::app);
    journal << begin << ' ' << stepclock::instance().now() << ' ' << command << '\n';
}

// The daemon's commands live by the real clock.
[[gnu::constructor]] void keepfromcommands()
{
    unsetenv("LD_PRELOAD");
}

} // namespace

// The C library's names for the arguments are reserved to it.
// NOLINTBEGIN(readability-inconsistent-declaration-parameter-name)
extern "C" {

unsigned sleep(unsigned seconds)
{
    if (seconds > 0) {
        stepclock::instance().pause(seconds);
    }
    return 0;
}

std::time_t time(std::time_t* result) noexcept
{
    const std::time_t now = stepclock::instance().now();
    if (result != nullptr) {
        *result = now;
    }
    return now;
}

int system(const char* command)
{
    const std::time_t begin = stepclock::instance().now();
    const int status = next<int(const char*)>("system")(command);
    sleep(lastingof(command, environment("STEPCLOCK_LASTING")));
    note(begin, command);
    return status;
}

int pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*body)(void*),
                   void* argument) noexcept
{
    auto begin = std::make_unique<beginning>(beginning{body, argument});
    stepclock::instance().enter();
    const int result = next<int(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*)>(
        "pthread_create")(thread, attributes, run, begin.get());
    if (result == 0) {
        (void)begin.release(); // the thread's now
    } else {
        stepclock::instance().leave();
    }
    return result;
}

int pthread_join(pthread_t thread, void** result)
{
    stepclock::instance().leave();
    const int failure = next<int(pthread_t, void**)>("pthread_join")(thread, result);
    stepclock::instance().enter();
    return failure;
}
}
// NOLINTEND(readability-inconsistent-declaration-parameter-name)
