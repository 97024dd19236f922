// One monitor thread per target: watches a service, and brings it back.
//
// The cycle. Each turn makes one general ping (`service NAME status`). While the service runs, the
// functional phase follows (the configured check command), then the general interval, then the next
// turn. A general ping that fails is followed by a pause of 30 s and up to three retries, with a
// pause of 60 s before each. If all fail, the service is recovered: stopped, its dependents
// stopped, all started again in that order. A functional ping that fails is followed by a pause of
// 30 s and up to three retries, with a pause of 60 s behind each, and then by such a recovery.
// After maxattemptofwakeup recoveries without a good ping the thread gives up and ends; the
// manager's next refresh starts a fresh one.
//
// The end. A thread looks at `globalenable` at the top of each cycle only, and a cycle lasts until
// the service runs or is given up: intervals, retries and all the recoveries it may have. It also
// ends, through pthread_exit, when the status command does not know the service or when it gives
// up. Nothing on that road may be noexcept or catch everything: pthread_exit unwinds the stack.
//
// The lock. Pings hold `pingreclock` for reading while their command runs, a recovery holds it for
// writing from its first command to its last: no ping runs anywhere while a recovery is under way.
// A recovery pings too, from within. The lock refuses such a request of its own writer at once, the
// ping gives kGeneralPingRefused, and so a recovery stops and starts everything it has.
#pragma once

#include <cstddef>
#include <string>

#include <pthread.h>

#include "wdmonitortarget.h"

// Whether monitor threads go on. Written by the manager, read by every thread, both through
// std::atomic_ref.
extern int globalenable;

// Made by the manager before the threads of a generation start, destroyed after all are joined.
extern pthread_rwlock_t pingreclock;

// The fixed part of the cycle's course.
inline constexpr int kRetries = 3;
inline constexpr unsigned kFirstRetryPauseSeconds = 30;
inline constexpr unsigned kGeneralRetryPauseSeconds = 60;
inline constexpr unsigned kFunctionalRetryPauseSeconds = 60;
inline constexpr unsigned kFunctionalRecoveryPauseSeconds = 1;

// What an interval or a limit of the configuration is as a number; 0 for text without one. Any
// thread, no lock.
long settingnumber(const std::string& text);

// The pause, in seconds, that an interval of so many makes: none below 0. Any thread, no lock.
unsigned pauseseconds(long interval) noexcept;

// What a general ping tells.
enum generalpingresult : int {
    kGeneralPingRefused = -1, // no read lock, nothing was run
    kServiceRunning = 0,
    kServiceNotRunning = 1,
    kServiceUnknown = 2, // the status command does not know it
    kServiceUnclear = 3, // nothing recognisable, and the command failed
};

// What a functional ping tells.
enum functionalpingresult : int {
    kFunctionalPingRefused = -1, // no read lock, or no command
    kAnswerCorrect = 0,
    kAnswerException = 1,
    kCommandNotFound = 2,
    kAnswerUnclear = 3,
};

// Where the output of the status command, and of the functional check, of `svc` goes. Any thread,
// no lock.
std::string statusfile(const service& svc);
std::string functionalfile(const service& svc);

// What asks for the state of `svc` and what checks it, their output redirected to these files; and
// what stops and starts it in a recovery. Any thread, no lock.
std::string statuscommand(const service& svc);
std::string functionalcommand(const service& svc);
std::string stopcommand(const service& svc);
std::string startcommand(const service& svc);

// So much of the first line of an answer is kept; the rest of the line is ignored.
inline constexpr std::size_t kLongestAnswerBytes = 1048576;

// What came of the command of a ping.
struct pingoutcome {
    std::string command{};   // as the shell got it
    int state = -1;          // its exit status, or -1 where it did not end normally
    bool opened = false;     // whether the file with its output could be opened
    std::string firstline{}; // of this output, at most kLongestAnswerBytes; empty if there is none
};

// Runs the status command, or the functional check, of `svc` and reads what it printed, in the file
// that it leaves in the pings' folder. Waits for as long as it takes. Any thread; takes no lock:
// whoever pings while recoveries may run holds pingreclock for reading meanwhile.
pingoutcome askstatus(const service& svc);
pingoutcome askfunction(const service& svc);

// Rates the first line of a status command's output; `state` is the command's exit status, or -1
// where it did not end normally. Logs the rating at DEBUG. Any thread, no lock.
generalpingresult ratestatus(const std::string& line, int state);

// Rates the first line that a functional check printed. Any thread, no lock.
functionalpingresult rateanswer(const std::string& answer);

// Whether a functional result asks for nothing more, and whether it asks for retries and recovery.
// Anything below -1, such as the phase's own "no ping yet", is neither: the next pass decides. Any
// thread, no lock.
bool isfine(int functionalresult) noexcept;
bool isfailure(int functionalresult) noexcept;

class wdmonitorthread {
public:
    // Keeps a copy of `watched`; the thread never looks at the manager's list again.
    explicit wdmonitorthread(wdmonitortarget watched);

    // Starts the thread on this very object, which must keep its address until join() has
    // returned. Returns 1 whether or not a thread could be made; a failure is not logged.
    // The manager's thread only.
    int create();

    // Waits until the thread has ended; does nothing when there is none. The manager's thread only.
    void join();

    // The thread's body; `arg` is the wdmonitorthread. Returns null when monitoring was disabled
    // or `arg` is null; ends through pthread_exit with null (unknown service) or 2 (gave up).
    static void* threadfunc(void* arg);

    // The five steps of the cycle, for the monitor's own thread. Durations are unbounded: commands
    // have no time limit.

    // Runs the status command of `svc` under the read lock and rates its first line of output.
    // Returns a generalpingresult.
    int generalping(const service& svc);

    // Stops and starts the service and its dependents under the write lock. `lastping` is the
    // general ping's result that led here: kServiceNotRunning leaves out stopping the service.
    // Always 1; whether it helped, the next ping tells.
    int generalrecover(int lastping);

    // Runs the functional check under the read lock and rates its first line of output. Ends a run
    // of skipped checks whatever comes of it. Returns a functionalpingresult.
    int functionalping();

    // A whole recovery, stop included, and a second's pause. Always 1.
    int functionalrecover();

    // Whether the functional ping may run now. False while the process is over its thresholds, but
    // at most MaxFPSkips times in a row (negative: without bound). Counts the skips. Takes no lock.
    bool IsPingable();

private:
    void announce();
    void monitorcycle();
    int retrygeneralping();
    void pausegeneral() const;
    void concludegeneral(int recoveries, int lastping) const;
    void functionalphase();
    int skiporping();
    int retryfunctionalping();
    void pausefunctional() const;
    void concludefunctional(int recoveries, int lastping) const;
    void stopmonitored() const;
    void stopdependents();
    void startmonitored();
    void startdependents();
    [[nodiscard]] long maxrecoveries() const;

    int fpskipcount = 0;    // functional pings skipped in a row
    pthread_t threadid = 0; // 0: no thread
    wdmonitortarget montarget;
};
