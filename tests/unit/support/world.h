// The world that the daemon's modules meet in the unit tests.
//
// Pauses, commands, the clock, threads and a few files are replaced at link time and end up here.
// Everything that happens is written down in one ordered list of texts: the daemon's log lines
// ("DEBUG text", "INFO text", "ERROR text"), its pauses ("sleep 30"), its commands ("run COMMAND")
// and what a test adds. Nothing here really sleeps.
#pragma once

#include <atomic>
#include <ctime>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <variant>
#include <vector>

#include <pthread.h>

// Thrown out of a pause by a test that has seen enough of an endless loop.
struct StopHere {};

// What pthread_exit becomes on the test's own thread.
struct ThreadExit {
    void* value;
};

// What reading a command's output gives, read by read: a piece of text, or an error number.
using Output = std::vector<std::variant<std::string, int>>;

class World {
public:
    static World& current();

    // Everything as at the start of a test. `folder` is the test's own, with trailing slash; it
    // stands in events as "TMP/".
    void reset(const std::string& folder, const std::string& module);

    void record(const std::string& event);
    // All that happened so far, one event a line.
    [[nodiscard]] std::string events();

    // Called for each pause, after it was written down and the clock was moved on.
    std::function<void(unsigned)> onsleep;

    // Runs a command for system() and returns its wait status. The default knows nothing: 0.
    std::function<int(const std::string&)> onsystem;

    // What a command that popen() starts prints; nothing: it cannot be started.
    std::function<std::optional<Output>(const std::string&)> onpopen;

    bool realpopen = false; // popen() asks the system after all

    std::atomic<std::time_t> now = 0;         // what time() gives
    std::set<std::string> existing;           // for access(); any other path does not exist
    std::map<std::string, std::string> files; // for fopen() of paths below /proc/
    std::function<void()> onrealproc;         // fopen() opens the real ones, then calls this

    std::function<void()> onexit; // called before _exit() ends the process

    bool recordpolls = false;      // write poll() down
    bool readerneverreads = false; // poll() does not wait; else it waits for as long as it takes
    bool recordopens = false;      // write open() down, with what matters of its flags
    std::function<void(const std::string&)> onthread; // called for each thread call
    int lockinitresult = 0;
    bool writelockfails = false; // asking for the write side takes the read side and gives EINVAL
    bool threadsfail = false;    // pthread_create gives EAGAIN and leaves rubbish in the id
    bool threadsarereal =
        true; // else a thread's body runs when it is joined, on the joining thread
    bool recordthreads = false; // write thread and lock calls down

private:
    void readlog();

    std::recursive_mutex guard;
    std::string tmp;
    std::string homemodule;
    std::size_t logread = 0;
    std::vector<std::string> happened;
};

// Runs a command in a real shell and returns its wait status.
int runforreal(const std::string& command);

// A command that ended with this exit status, as system() reports it.
int exited(int status);

// Events, one a line, as World::events gives them.
std::string lines(const std::vector<std::string>& events);
