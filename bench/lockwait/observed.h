// Looks on at what the daemon's own functions ask of its lock and of the clock. The program is
// linked so that these requests come by here (--wrap, in CMakeLists.txt) and go on to the system;
// the lock stays the daemon's own, and behaves as it does there.
#pragma once

#include <chrono>
#include <condition_variable>
#include <mutex>

using Clock = std::chrono::steady_clock;

// A request of the write side: when it was made, and when it was granted.
struct WriteRequest {
    Clock::time_point entered;
    Clock::time_point held;
};

// The calling thread's last one.
WriteRequest lastwriterequest();

// How often the read side was held to the end, and how long in all. Requests that were refused are
// not among them.
struct Reads {
    long count = 0;
    Clock::duration total{};
};

// All threads' since the last call.
Reads takereads();

// Pauses that can be ended from outside. The daemon's sleep() is one of them.
class Pauses {
public:
    static Pauses& current();

    // Returns after `length`, or at once when pauses are ended: then false.
    bool pause(Clock::duration length);

    // Ends all pauses, and those to come until begin().
    void end();
    void begin();

private:
    std::mutex guard;
    std::condition_variable change;
    bool ended = false;
};
