#include "wdmonitorthread_linux.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <climits>
#include <cstdlib>
#include <string_view>
#include <utility>

#include <sys/wait.h>
#include <unistd.h>

#include "ProcessStatistics_Linux.h"
#include "wdinputfile.h"
#include "wdlogbuffer.h"
#include "wdsettings.h"
#include "xmlparser.h"

int globalenable = 0;
pthread_rwlock_t pingreclock;

namespace {

constexpr const char* kModule = "wdmonitorthread";

// A first line is mostly much shorter.
constexpr std::size_t kReadBlockBytes = 256;

// Beyond the ratings: no functional ping has been made yet in this phase.
constexpr int kNoFunctionalPingYet = -2;

void* const kGaveUp = reinterpret_cast<void*>(2); // NOLINT(performance-no-int-to-ptr): exit value

// Holds the lock for reading, if the lock grants it.
class readguard {
public:
    explicit readguard(pthread_rwlock_t& guarded)
        : lock(guarded), granted(pthread_rwlock_rdlock(&guarded) == 0)
    {
    }
    ~readguard()
    {
        if (granted) {
            pthread_rwlock_unlock(&lock);
        }
    }
    readguard(const readguard&) = delete;
    readguard& operator=(const readguard&) = delete;

    [[nodiscard]] bool held() const noexcept { return granted; }

private:
    pthread_rwlock_t& lock;
    const bool granted;
};

// Holds the lock for writing. The lock refuses only a thread that holds it already; a recovery goes
// on then, and the release is that thread's own. So the refusal is not looked at.
class writeguard {
public:
    explicit writeguard(pthread_rwlock_t& guarded) : lock(guarded) { pthread_rwlock_wrlock(&lock); }
    ~writeguard() { pthread_rwlock_unlock(&lock); }
    writeguard(const writeguard&) = delete;
    writeguard& operator=(const writeguard&) = delete;

private:
    pthread_rwlock_t& lock;
};

bool monitoringenabled()
{
    return std::atomic_ref(globalenable).load() != 0;
}

bool contains(const std::string& line, const char* word)
{
    return line.find(word) != std::string::npos;
}

// The exit status of `command`, or -1 where it did not end normally.
int runforstate(const std::string& command)
{
    const int status = std::system(command.c_str());
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

// Its exit status is not looked at: what it printed or the next ping shows whether it worked.
void runforeffect(const std::string& command)
{
    [[maybe_unused]] const int ignored = std::system(command.c_str());
}

// Both outputs go to one file, each from its beginning.
std::string redirected(std::string command, const std::string& file)
{
    return std::move(command) + " 1>" + file + " 2>" + file;
}

std::string statuscommand(const service& svc, const std::string& file)
{
    return redirected("service " + svc.name + " status", file);
}

// Runs the command and takes what its output, in the file `path`, holds up to the first newline,
// or kLongestAnswerBytes of it: a check that prints without end must not take all memory.
pingoutcome ask(std::string command, const std::string& path)
{
    pingoutcome outcome{.command = std::move(command)};
    outcome.state = runforstate(outcome.command);
    wdinputfile file(path);
    outcome.opened = file.isopen();
    std::array<char, kReadBlockBytes> block; // read() fills what is taken from it
    for (auto piece = file.read(block); !piece.empty(); piece = file.read(block)) {
        const std::size_t newline = piece.find('\n');
        const std::size_t room = kLongestAnswerBytes - outcome.firstline.size();
        outcome.firstline.append(piece.substr(0, std::min(newline, room)));
        if (newline != std::string_view::npos || piece.size() >= room) {
            break;
        }
    }
    return outcome;
}

// Only services of the configuration in force are stopped and started.
bool isconfigured(const service& svc)
{
    const auto& services = xmlparser::allservices;
    const bool found = std::any_of(services.begin(), services.end(),
                                   [&](const service& known) { return known.name == svc.name; });
    if (!found) {
        wdlog(kModule, kLevelError,
              "Service not found in the xmlparser::allservices, can not recover.");
    }
    return found;
}

void announceretry()
{
    wdlog(kModule, kLevelDebug,
          "Retry the general ping before we take action to recover, sleeping for 60 seconds now");
}

void lograting(functionalpingresult result, const std::string& answer)
{
    switch (result) {
    case kAnswerCorrect:
        // It says thread id, and prints the process id: log filters know it so.
        wdlog(kModule, kLevelDebug, "Functionalping result correct functional ping, thread id is ",
              getpid(), ", ping result is ", answer);
        break;
    case kAnswerException:
        wdlog(kModule, kLevelDebug,
              " Functionalping result wrong functional ping,thread is is  ,ping result is  ",
              answer, "@@@@@@@@@@@@@@@@@@@@@@");
        break;
    case kCommandNotFound:
        wdlog(kModule, kLevelDebug,
              "Functional ping failed with return 2, no recover action for this case : ", answer,
              "@@@");
        break;
    default:
        wdlog(kModule, kLevelDebug, "Functional ping failed with return 3: ", answer,
              "@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@@");
        break;
    }
}

} // namespace

long settingnumber(const std::string& text)
{
    return std::strtol(text.c_str(), nullptr, 10);
}

// sleep() counts unsigned: without the bounds a negative interval would be a pause of a century.
unsigned pauseseconds(long interval) noexcept
{
    return static_cast<unsigned>(std::clamp<long long>(interval, 0, UINT_MAX));
}

std::string statusfile(const service& svc)
{
    return _tmp_file_path + "agent." + svc.name;
}

std::string functionalfile(const service& svc)
{
    return _tmp_file_path + "agent.functionalping." + svc.name;
}

std::string statuscommand(const service& svc)
{
    return statuscommand(svc, statusfile(svc));
}

std::string functionalcommand(const service& svc)
{
    return redirected(svc.functionalpingcmd, functionalfile(svc));
}

std::string stopcommand(const service& svc)
{
    return svc.stopcmd == kNoCommand ? "service " + svc.name + " stop" : svc.stopcmd;
}

std::string startcommand(const service& svc)
{
    return svc.startcmd == kNoCommand ? "service " + svc.name + " start" : svc.startcmd;
}

pingoutcome askstatus(const service& svc)
{
    const std::string file = statusfile(svc);
    return ask(statuscommand(svc, file), file);
}

pingoutcome askfunction(const service& svc)
{
    const std::string file = functionalfile(svc);
    return ask(redirected(svc.functionalpingcmd, file), file);
}

// Upper and lower case are words of their own; a mixed-case word matches nothing. The order counts:
// "unused" is a service that does not run, though the message of the unknown ones names it too.
generalpingresult ratestatus(const std::string& line, int state)
{
    const auto has = [&line](const char* word) {
        return contains(line, word);
    };
    if ((has("running") && !has("not")) || (has("RUNNING") && !has("NOT"))) {
        wdlog(kModule, kLevelDebug, "General ping successful!");
        return kServiceRunning;
    }
    if (has("stopped") || (has("not") && has("running")) || (has("NOT") && has("RUNNING")) ||
        has("unused")) {
        wdlog(kModule, kLevelDebug, "General ping failed!");
        return kServiceNotRunning;
    }
    if (has("no such service") || has("unrecognized")) {
        wdlog(kModule, kLevelDebug, "General ping failed no/unrecgnized/unused");
        return kServiceUnknown;
    }
    if (state == 0) {
        wdlog(kModule, kLevelDebug, "General ping successful! state = ", state);
        return kServiceRunning;
    }
    wdlog(kModule, kLevelDebug, " General Ping failed other cases.................");
    return kServiceUnclear;
}

// Success comes first: a line with a mark of success and an exception counts as success. "not"
// counts inside other words too ("cannot").
functionalpingresult rateanswer(const std::string& answer)
{
    const auto has = [&answer](const char* word) {
        return contains(answer, word);
    };
    if (has("CreationClassName") || (has("running") && !has("not")) || has("service:") ||
        has("InstanceID=") || (has("initialized") && !has("not"))) {
        return kAnswerCorrect;
    }
    if (has("CIMException")) {
        return kAnswerException;
    }
    if (has("command not found") || has(" No such file or directory")) {
        return kCommandNotFound;
    }
    return kAnswerUnclear;
}

bool isfine(int functionalresult) noexcept
{
    return functionalresult == kAnswerCorrect || functionalresult == kFunctionalPingRefused;
}

bool isfailure(int functionalresult) noexcept
{
    return functionalresult > kAnswerCorrect;
}

wdmonitorthread::wdmonitorthread(wdmonitortarget watched) : montarget(std::move(watched)) {}

int wdmonitorthread::create()
{
    threadid = 0;
    if (pthread_create(&threadid, nullptr, threadfunc, this) == 0) {
        wdlog(kModule, kLevelDebug, "Thread id :", threadid, "thread created...");
    } else {
        threadid = 0; // a failed pthread_create may leave anything there
    }
    // 1 in either case: the manager does not tell them apart, and the next refresh tries again.
    return 1;
}

void wdmonitorthread::join()
{
    if (threadid != 0 && pthread_join(threadid, nullptr) == 0) {
        wdlog(kModule, kLevelDebug, "Thread id :", threadid, "thread is joined...");
    }
    threadid = 0;
}

void* wdmonitorthread::threadfunc(void* arg)
{
    wdlog(kModule, kLevelDebug, "This is the entry of threadfunc");
    if (arg == nullptr) {
        wdlog(kModule, kLevelError, "Current pointer found NULL ");
        return nullptr;
    }
    auto& self = *static_cast<wdmonitorthread*>(arg);
    self.announce();
    while (monitoringenabled()) {
        self.monitorcycle();
    }
    wdlog(kModule, kLevelDebug, "This is the exit of threadfunc");
    return nullptr;
}

int wdmonitorthread::generalping(const service& svc)
{
    wdlog(kModule, kLevelDebug, "Entering of general ping function, before get read lock.");
    const readguard reading(pingreclock);
    if (!reading.held()) {
        return kGeneralPingRefused;
    }
    wdlog(kModule, kLevelDebug, "enter of general ping, after get read lock.");
    const pingoutcome outcome = askstatus(svc);
    if (!outcome.opened) {
        wdlog(kModule, kLevelDebug, "Unable to open service status file.");
    }
    wdlog(kModule, kLevelDebug, "command = ", outcome.command, ", result = ", outcome.firstline,
          ", state = ", outcome.state);
    return ratestatus(outcome.firstline, outcome.state);
}

int wdmonitorthread::generalrecover(int lastping)
{
    wdlog(kModule, kLevelDebug, "Entry of general recover before getting write lock");
    {
        const writeguard writing(pingreclock);
        wdlog(kModule, kLevelDebug, "Entry of general recover after getting write lock");
        wdlog(kModule, kLevelError, "Try the general recover for service ",
              montarget.monitoredservice.name);
        if (lastping != kServiceNotRunning) {
            stopmonitored();
        }
        stopdependents();
        startmonitored();
        startdependents();
    }
    wdlog(kModule, kLevelDebug, "Exit of general recover after release write lock");
    return 1;
}

int wdmonitorthread::functionalping()
{
    fpskipcount = 0; // before all else: any attempt, even a refused one, ends a run of skips
    const readguard reading(pingreclock);
    if (!reading.held()) {
        return kFunctionalPingRefused;
    }
    const service& svc = montarget.monitoredservice;
    wdlog(kModule, kLevelDebug, "Performing functional ping, process id is: ", getpid(),
          ", fp cmd is: ", svc.functionalpingcmd);
    if (svc.functionalpingcmd == kNoCommand) {
        return kFunctionalPingRefused;
    }
    const pingoutcome outcome = askfunction(svc);
    if (!outcome.opened) {
        wdlog(kModule, kLevelDebug, " unable to open service status file.");
    }
    // Only the answer counts, not the exit status.
    const functionalpingresult result = rateanswer(outcome.firstline);
    lograting(result, outcome.firstline);
    return result;
}

int wdmonitorthread::functionalrecover()
{
    wdlog(kModule, kLevelError, "Try the functional recover for service ",
          montarget.monitoredservice.name);
    generalrecover(kServiceRunning); // it answers its status command: stop it first
    sleep(kFunctionalRecoveryPauseSeconds);
    return 1;
}

bool wdmonitorthread::IsPingable()
{
    service& svc = montarget.monitoredservice;
    // Equal, not reached or passed: a negative limit is never met and bounds nothing.
    if (fpskipcount == Utility::str2int(svc.MaxFPSkips)) {
        wdlog(kModule, kLevelInfo, "(", svc.binarypath,
              ") Can not skip Functional ping now, max skip count reached");
        return true;
    }
    if (svc.statistics.IsThresholdReached()) {
        ++fpskipcount;
        return false;
    }
    return true;
}

void wdmonitorthread::announce()
{
    service& svc = montarget.monitoredservice;
    wdlog(kModule, kLevelInfo, "Name of the service being monitored: ", svc.name);
    wdlog(kModule, kLevelInfo, "Binary path of service being monitored: ", svc.binarypath);
    svc.statistics.SetName(svc.binarypath);
    svc.statistics.SetThresholdAverageCPUUsage(svc.ThresholdAverageCPUUsage);
    svc.statistics.SetThresholdMemoryUsage(svc.ThresholdMemoryUsage);
    svc.statistics.SetThresholdThreadCount(svc.ThresholdThreadCount);
    fpskipcount = 0;
}

// Turns until a ping succeeds or the recoveries are used up. A healthy service is one turn. After
// the last recovery the thread gives up without another ping, even if that recovery worked.
void wdmonitorthread::monitorcycle()
{
    const service& svc = montarget.monitoredservice;
    int lastping = kGeneralPingRefused;
    int recoveries = 0;
    while (recoveries < maxrecoveries() && lastping != kServiceRunning) {
        lastping = generalping(svc);
        if (lastping == kServiceUnknown) {
            wdlog(kModule, kLevelError, "General ping failed for service ", svc.name,
                  ", unrecognized service.");
            pthread_exit(nullptr);
        }
        if (lastping == kServiceRunning) {
            functionalphase();
        } else {
            lastping = retrygeneralping();
            if (lastping != kServiceRunning) {
                announceretry(); // once more, though neither a pause nor a retry follows
                generalrecover(lastping);
                ++recoveries;
            }
        }
        pausegeneral();
    }
    concludegeneral(recoveries, lastping);
}

// Returns the last retry's result. The retry message follows each ping, the last and a successful
// one included: operators count these lines.
int wdmonitorthread::retrygeneralping()
{
    const service& svc = montarget.monitoredservice;
    wdlog(kModule, kLevelError, "General ping failed for service ", svc.name,
          ". Try to general ping more times now, if failed 3 times, will generally recover this "
          "service.");
    sleep(kFirstRetryPauseSeconds);
    int result = kGeneralPingRefused;
    int retriesleft = kRetries;
    do {
        sleep(kGeneralRetryPauseSeconds);
        result = generalping(svc);
        --retriesleft;
        wdlog(kModule, kLevelDebug, "General ping will be tried ", retriesleft, " more time(s)");
        announceretry();
    } while (result != kServiceRunning && retriesleft > 0);
    return result;
}

void wdmonitorthread::pausegeneral() const
{
    const long interval = settingnumber(montarget.monitoredservice.genpinginterval);
    wdlog(kModule, kLevelDebug, "General ping sleep ", interval);
    sleep(pauseseconds(interval));
}

// Reports the end of an outage, or gives up and ends the thread.
void wdmonitorthread::concludegeneral(int recoveries, int lastping) const
{
    const service& svc = montarget.monitoredservice;
    if (recoveries > 0 && lastping == kServiceRunning) {
        wdlog(kModule, kLevelInfo, "General ping failed for service ", svc.name,
              ", but this service has been general recoverred successfully.");
    }
    if (recoveries == maxrecoveries() && lastping != kServiceRunning) {
        wdlog(kModule, kLevelError, "Failed to general recover the sevice ", svc.name,
              " after try the max times.");
        pthread_exit(kGaveUp);
    }
}

// Passes until a functional ping is fine or skipped, its command is not found, or the recoveries
// are used up. Results below -1 count neither as success nor as failure: the passes go on.
void wdmonitorthread::functionalphase()
{
    const service& svc = montarget.monitoredservice;
    if (svc.functionalpingcmd == kNoCommand) {
        wdlog(kModule, kLevelDebug,
              "No functional ping cmd is provided, skip functional ping part");
        return;
    }
    int lastping = kNoFunctionalPingYet;
    int recoveries = 0;
    while (recoveries < maxrecoveries() && !isfine(lastping)) {
        lastping = skiporping();
        if (lastping == kCommandNotFound) {
            wdlog(kModule, kLevelError, "Functionalping failed for service ", svc.name,
                  ", unrecognized command.");
            break;
        }
        if (isfailure(lastping)) {
            lastping = retryfunctionalping();
            if (isfailure(lastping)) {
                functionalrecover();
                ++recoveries;
            }
        }
        pausefunctional();
    }
    concludefunctional(recoveries, lastping);
}

// The functional ping's result; a skipped one counts as a correct answer.
int wdmonitorthread::skiporping()
{
    const service& svc = montarget.monitoredservice;
    if (!IsPingable()) {
        wdlog(kModule, kLevelInfo, "(", svc.binarypath, ") Skipping functional ping. ", fpskipcount,
              " FPs skipped so far.");
        return kAnswerCorrect;
    }
    wdlog(kModule, kLevelInfo, "(", svc.binarypath, ") Executing functional ping now ... ");
    return functionalping();
}

// Returns the last retry's result. The message announces 10 seconds and the pause is 60; and here
// the pause follows the ping. Both are known, and monitoring of the log is tuned to both.
int wdmonitorthread::retryfunctionalping()
{
    wdlog(kModule, kLevelError, "Functionalping failed for service ",
          montarget.monitoredservice.name,
          ". Try to ping more times now, if failed 3 times, will functionally recover this "
          "service.");
    sleep(kFirstRetryPauseSeconds);
    int result = kFunctionalPingRefused;
    int retriesleft = kRetries;
    do {
        wdlog(kModule, kLevelDebug,
              "Retry the functionalping before we take action to recover, sleep 10 seconds now");
        result = functionalping();
        --retriesleft;
        sleep(kFunctionalRetryPauseSeconds);
    } while (isfailure(result) && retriesleft > 0);
    return result;
}

void wdmonitorthread::pausefunctional() const
{
    const long interval = settingnumber(montarget.monitoredservice.funpinginterval);
    wdlog(kModule, kLevelDebug, "Functional ping sleep ", interval);
    sleep(pauseseconds(interval));
}

// Reports the end of a failure, or gives up and ends the thread.
void wdmonitorthread::concludefunctional(int recoveries, int lastping) const
{
    const service& svc = montarget.monitoredservice;
    if (recoveries > 0 && isfine(lastping)) {
        wdlog(kModule, kLevelInfo, "Functional ping failed for service ", svc.name,
              ", but this service has been successfully functional recovered.");
    }
    if (recoveries == maxrecoveries() && !isfine(lastping)) {
        // The wording is older than the daemon's silence: no indication is sent anywhere.
        wdlog(kModule, kLevelError, "Failed to functional recover the sevice ", svc.name,
              " after try the max times. Will log and send indication to Kelmora Server");
        pthread_exit(kGaveUp);
    }
}

void wdmonitorthread::stopmonitored() const
{
    const service& svc = montarget.monitoredservice;
    const std::string command = stopcommand(svc);
    if (svc.stopcmd != kNoCommand) {
        wdlog(kModule, kLevelDebug, "User provided stop command: ", command);
    } else {
        wdlog(kModule, kLevelDebug, "Service stop command:", command);
    }
    if (isconfigured(svc)) {
        runforeffect(command);
    }
}

void wdmonitorthread::stopdependents()
{
    wdlog(kModule, kLevelDebug,
          "number of dependent services = ", montarget.dependentservices.size());
    for (const service& dependent : montarget.dependentservices) {
        wdlog(kModule, kLevelDebug, "Trying to stop service ", dependent.name);
        const std::string command = stopcommand(dependent);
        if (dependent.stopcmd != kNoCommand) {
            // Command and name stand back to back; so they do in every log there is.
            wdlog(kModule, kLevelDebug, "User provided stop command dep: ", command,
                  dependent.name);
        } else {
            wdlog(kModule, kLevelDebug, "Service stop command dep:", command);
        }
        if (generalping(dependent) != kServiceNotRunning && isconfigured(dependent)) {
            wdlog(kModule, kLevelDebug, "Executing stop command ", command);
            runforeffect(command);
        }
    }
    wdlog(kModule, kLevelDebug, "All dependent services stopped");
}

void wdmonitorthread::startmonitored()
{
    const service& svc = montarget.monitoredservice;
    wdlog(kModule, kLevelDebug, "Will perform general ping from general recover");
    if (generalping(svc) == kServiceRunning) {
        return;
    }
    wdlog(kModule, kLevelDebug, "service is not up hence will start it ", svc.name);
    const std::string command = startcommand(svc);
    if (svc.startcmd != kNoCommand) {
        wdlog(kModule, kLevelDebug, "User provided command start:", command);
    } else {
        wdlog(kModule, kLevelDebug, "Service command start:", command);
    }
    if (isconfigured(svc)) {
        wdlog(kModule, kLevelDebug, "Executing start command ", command);
        runforeffect(command);
    }
}

// In the same order as they were stopped, not reversed: the file's order is the start order.
void wdmonitorthread::startdependents()
{
    wdlog(kModule, kLevelDebug, "Now start dependent services");
    for (const service& dependent : montarget.dependentservices) {
        const std::string command = startcommand(dependent);
        if (dependent.startcmd != kNoCommand) {
            wdlog(kModule, kLevelDebug, "User provided command start dep:", command);
        } else {
            wdlog(kModule, kLevelDebug, "Service command start dep:", command);
        }
        if (generalping(dependent) != kServiceRunning && isconfigured(dependent)) {
            runforeffect(command);
        }
    }
}

long wdmonitorthread::maxrecoveries() const
{
    return settingnumber(montarget.monitoredservice.maxattemptofwakeup);
}
