// The monitor thread. Its body runs on the test's own thread, and what it does is compared as one
// ordered list of messages, pauses and commands.

#include "wdmonitorthread_linux.h"

#include <algorithm>
#include <atomic>
#include <deque>
#include <fstream>
#include <initializer_list>
#include <map>
#include <optional>
#include <thread>

#include <fcntl.h>
#include <unistd.h>

#include "daemontest.h"
#include "wdlogbuffer.h"
#include "wdsettings.h"
#include "xmlparser.h"

namespace {

using Events = std::vector<std::string>;

std::string inorder(std::initializer_list<Events> steps)
{
    Events all;
    for (const auto& step : steps) {
        all.insert(all.end(), step.begin(), step.end());
    }
    return lines(all);
}

Events operator+(Events left, const Events& right)
{
    left.insert(left.end(), right.begin(), right.end());
    return left;
}

Events times(int count, const Events& step)
{
    Events all;
    for (int i = 0; i < count; ++i) {
        all = all + step;
    }
    return all;
}

// What a command prints, and its exit status.
struct Reply {
    std::string output;
    int status = 0;
};

const Reply kRunning{"web is running\n", 0};
const Reply kStopped{"web is stopped\n", 3};
const Reply kUnclear{"no idea\n", 4};
const Reply kUnrecognized{"web: unrecognized service\n", 1};

const Reply kCorrect{"service: web\n", 0};
const Reply kException{"CIMException: broken\n", 0};
const Reply kSilent{"", 0};
const Reply kMissing{"sh: 1: check-web: command not found\n", 127};

constexpr unsigned kGeneralInterval = 7;
constexpr unsigned kFunctionalInterval = 11;

// The lists of the steps that make up a cycle.

const Events kEntry{
    "DEBUG This is the entry of threadfunc",
    "INFO Name of the service being monitored: web",
    "INFO Binary path of service being monitored: /usr/sbin/webd",
};
const Events kExit{"DEBUG This is the exit of threadfunc", "returns 0"};

const std::string kRefusedPing = "DEBUG Entering of general ping function, before get read lock.";

Events ping(const Reply& reply, const std::string& rating)
{
    const std::string line = reply.output.substr(0, reply.output.find('\n'));
    const std::string command = "service web status 1>TMP/agent.web 2>TMP/agent.web";
    return {
        "DEBUG Entering of general ping function, before get read lock.",
        "DEBUG enter of general ping, after get read lock.",
        "run " + command,
        "DEBUG command = " + command + ", result = " + line +
            ", state = " + std::to_string(reply.status),
        rating,
    };
}

const Events kGoodPing = ping(kRunning, "DEBUG General ping successful!");
const Events kBadPing = ping(kStopped, "DEBUG General ping failed!");
const Events kUnclearPing =
    ping(kUnclear, "DEBUG  General Ping failed other cases.................");
const Events kUnknownPing = ping(kUnrecognized, "DEBUG General ping failed no/unrecgnized/unused");

const Events kGeneralSleep{"DEBUG General ping sleep 7", "sleep 7"};
const Events kFunctionalSleep{"DEBUG Functional ping sleep 11", "sleep 11"};
const Events kNoFunctionalPing{
    "DEBUG No functional ping cmd is provided, skip functional ping part"};

const std::string kRetryMessage =
    "DEBUG Retry the general ping before we take action to recover, sleeping for 60 seconds now";

const Events kFirstFailure{
    "ERROR General ping failed for service web. Try to general ping more times now, if failed 3 "
    "times, will generally recover this service.",
    "sleep 30",
};

Events retry(const Events& pinged, int left)
{
    return Events{"sleep 60"} + pinged +
           Events{"DEBUG General ping will be tried " + std::to_string(left) + " more time(s)",
                  kRetryMessage};
}

Events failedretries(const Events& pinged)
{
    return retry(pinged, 2) + retry(pinged, 1) + retry(pinged, 0) + Events{kRetryMessage};
}

const Events kRecoveryBegins{
    "DEBUG Entry of general recover before getting write lock",
    "DEBUG Entry of general recover after getting write lock",
    "ERROR Try the general recover for service web",
};
const Events kStopOfWeb{
    "DEBUG Service stop command:service web stop",
    "run service web stop",
};
const Events kNoDependentsToStop{
    "DEBUG number of dependent services = 0",
    "DEBUG All dependent services stopped",
};
const Events kStartOfWeb{
    "DEBUG Will perform general ping from general recover",
    kRefusedPing,
    "DEBUG service is not up hence will start it web",
    "DEBUG Service command start:service web start",
    "DEBUG Executing start command service web start",
    "run service web start",
};
const Events kNoDependentsToStart{"DEBUG Now start dependent services"};
const Events kRecoveryEnds{"DEBUG Exit of general recover after release write lock"};

// A recovery of web alone: after "not running", and after anything else.
const Events kRecoveryOfStopped =
    kRecoveryBegins + kNoDependentsToStop + kStartOfWeb + kNoDependentsToStart + kRecoveryEnds;
const Events kWholeRecovery = kRecoveryBegins + kStopOfWeb + kNoDependentsToStop + kStartOfWeb +
                              kNoDependentsToStart + kRecoveryEnds;

const Events kGaveUp{
    "ERROR Failed to general recover the sevice web after try the max times.",
    "exits with 2",
};

const std::string kExecuting = "INFO (/usr/sbin/webd) Executing functional ping now ... ";
const Events kCanNotSkip{
    "INFO (/usr/sbin/webd) Can not skip Functional ping now, max skip count reached"};

const std::string kUnable = "ERROR [ProcessStatistics] (/usr/sbin/webd) Unable to fetch stats of "
                            "process from system";

Events check(const std::string& rating)
{
    return {
        "DEBUG Performing functional ping, process id is: " + std::to_string(getpid()) +
            ", fp cmd is: check-web",
        "run check-web 1>TMP/agent.functionalping.web 2>TMP/agent.functionalping.web",
        rating,
    };
}

const Events kGoodCheck =
    check("DEBUG Functionalping result correct functional ping, thread id is " +
          std::to_string(getpid()) + ", ping result is service: web");
const Events kExceptionCheck =
    check("DEBUG  Functionalping result wrong functional ping,thread is is  ,ping result is  "
          "CIMException: broken" +
          std::string(22, '@'));
const Events kSilentCheck =
    check("DEBUG Functional ping failed with return 3: " + std::string(48, '@'));
const Events kMissingCheck =
    check("DEBUG Functional ping failed with return 2, no recover action for this case : "
          "sh: 1: check-web: command not found@@@");

const Events kFirstFunctionalFailure{
    "ERROR Functionalping failed for service web. Try to ping more times now, if failed 3 times, "
    "will functionally recover this service.",
    "sleep 30",
};

Events functionalretry(const Events& checked)
{
    return Events{"DEBUG Retry the functionalping before we take action to recover, sleep 10 "
                  "seconds now"} +
           checked + Events{"sleep 60"};
}

const Events kFunctionalRecovery =
    Events{"ERROR Try the functional recover for service web"} + kWholeRecovery + Events{"sleep 1"};

const Events kFunctionallyGaveUp{
    "ERROR Failed to functional recover the sevice web after try the max times. Will log and send "
    "indication to Kelmora Server",
    "exits with 2",
};

// Holds the lock for writing on this thread, which makes it refuse this thread's pings.
class LockHeld {
public:
    LockHeld() { pthread_rwlock_wrlock(&pingreclock); }
    ~LockHeld() { pthread_rwlock_unlock(&pingreclock); }
    LockHeld(const LockHeld&) = delete;
    LockHeld& operator=(const LockHeld&) = delete;
};

bool lockisfree()
{
    const bool isfree = pthread_rwlock_trywrlock(&pingreclock) == 0;
    if (isfree) {
        pthread_rwlock_unlock(&pingreclock);
    }
    return isfree;
}

class Monitor : public DaemonTest {
protected:
    Monitor() : DaemonTest("wdmonitorthread") {}

    void SetUp() override
    {
        DaemonTest::SetUp();
        ASSERT_EQ(pthread_rwlock_init(&pingreclock, nullptr), 0);
        web.name = "web";
        web.binarypath = "/usr/sbin/webd";
        web.startcmd = "NULL";
        web.stopcmd = "NULL";
        web.functionalpingcmd = "NULL";
        web.genpinginterval = std::to_string(kGeneralInterval);
        web.funpinginterval = std::to_string(kFunctionalInterval);
        web.maxattemptofwakeup = "2";
        web.MaxFPSkips = "0";
        xmlparser::allservices = {web};
        status["web"] = {kRunning};
        checks = {kCorrect};
        startagain();
    }

    // Forgets all that happened.
    void startagain()
    {
        folder.write("log", "");
        world.reset(folder.path(), "wdmonitorthread");
        world.onsystem = [this](const std::string& command) {
            return answer(command);
        };
        stopafter(1, kGeneralInterval);
    }

    void TearDown() override
    {
        pthread_rwlock_destroy(&pingreclock);
        DaemonTest::TearDown();
    }

    // Lets the thread end at the top of the cycle that follows the count-th pause of this length.
    void stopafter(int count, unsigned pause)
    {
        globalenable = 1;
        world.onsleep = [count, pause](unsigned seconds) mutable {
            if (seconds == pause && --count == 0) {
                globalenable = 0;
            }
        };
    }

    // Runs the thread's body and returns all that happened.
    std::string run()
    {
        wdmonitorthread thread(watched);
        return runbody(&thread);
    }

    std::string runbody(wdmonitorthread* thread)
    {
        try {
            world.record(wdmonitorthread::threadfunc(thread) == nullptr ? "returns 0"
                                                                        : "returns something");
        } catch (const ThreadExit& exit) {
            world.record("exits with " +
                         std::to_string(reinterpret_cast<std::intptr_t>(exit.value)));
        }
        return world.events();
    }

    // The next reply to a ping's command; the last one stays.
    static Reply next(std::deque<Reply>& replies)
    {
        Reply reply = replies.front();
        if (replies.size() > 1) {
            replies.pop_front();
        }
        return reply;
    }

    int answer(const std::string& command)
    {
        const std::size_t redirection = command.find(" 1>");
        if (redirection == std::string::npos) {
            return 0;
        }
        const std::size_t start = redirection + 3;
        const std::string file = command.substr(start, command.find(" 2>") - start);
        const std::string prefix = folder.path("agent.");
        const bool functional = file.starts_with(prefix + "functionalping.");
        const Reply reply = functional ? next(checks) : next(status.at(file.substr(prefix.size())));
        std::ofstream(file) << reply.output;
        return exited(reply.status);
    }

    wdmonitortarget watched;
    service& web = watched.monitoredservice;
    std::map<std::string, std::deque<Reply>> status; // by service
    std::deque<Reply> checks;
};

using MonitorThread = Monitor;

const int kEnabledAtStart = globalenable;

TEST_F(MonitorThread, MonitoringIsDisabledUntilTheManagerEnablesIt)
{
    EXPECT_EQ(kEnabledAtStart, 0);
}

TEST_F(MonitorThread, HealthyServiceIsOnePingACycle)
{
    stopafter(2, kGeneralInterval);
    EXPECT_EQ(run(),
              inorder({kEntry, times(2, kGoodPing + kNoFunctionalPing + kGeneralSleep), kExit}));
}

TEST_F(MonitorThread, DisabledMonitoringEndsTheThreadAtOnce)
{
    globalenable = 0;
    EXPECT_EQ(run(), inorder({kEntry, kExit}));
}

TEST_F(MonitorThread, HealthyServiceWritesTwoLinesWithoutDebug)
{
    debugenable = false;
    EXPECT_EQ(run(), lines({
                         "INFO Name of the service being monitored: web",
                         "INFO Binary path of service being monitored: /usr/sbin/webd",
                         "run service web status 1>TMP/agent.web 2>TMP/agent.web",
                         "sleep 7",
                         "returns 0",
                     }));
}

TEST_F(MonitorThread, NullArgumentIsLoggedAndReturns)
{
    EXPECT_EQ(runbody(nullptr), lines({"DEBUG This is the entry of threadfunc",
                                       "ERROR Current pointer found NULL ", "returns 0"}));
}

TEST_F(MonitorThread, RetryThatSucceedsMakesNoRecoveryAndNoFunctionalPing)
{
    web.functionalpingcmd = "check-web";
    status["web"] = {kStopped, kRunning};
    EXPECT_EQ(run(), inorder({kEntry, kBadPing, kFirstFailure, retry(kGoodPing, 2), kGeneralSleep,
                              kExit}));
}

TEST_F(MonitorThread, LastRetryThatSucceedsMakesNoRecovery)
{
    status["web"] = {kStopped, kStopped, kStopped, kRunning};
    EXPECT_EQ(run(), inorder({kEntry, kBadPing, kFirstFailure, retry(kBadPing, 2),
                              retry(kBadPing, 1), retry(kGoodPing, 0), kGeneralSleep, kExit}));
}

TEST_F(MonitorThread, RecoveryThatHelpedIsReportedAfterTheNextPing)
{
    status["web"] = {kStopped, kStopped, kStopped, kStopped, kRunning};
    stopafter(2, kGeneralInterval);
    EXPECT_EQ(run(), inorder({kEntry,
                              kBadPing,
                              kFirstFailure,
                              failedretries(kBadPing),
                              kRecoveryOfStopped,
                              kGeneralSleep,
                              kGoodPing,
                              kNoFunctionalPing,
                              kGeneralSleep,
                              {"INFO General ping failed for service web, but this service has "
                               "been general recoverred successfully."},
                              kExit}));
}

TEST_F(MonitorThread, RetrySuccessAfterARecoveryIsReportedToo)
{
    status["web"] = {kStopped, kStopped, kStopped, kStopped, kStopped, kRunning};
    stopafter(2, kGeneralInterval);
    EXPECT_EQ(run(), inorder({kEntry,
                              kBadPing,
                              kFirstFailure,
                              failedretries(kBadPing),
                              kRecoveryOfStopped,
                              kGeneralSleep,
                              kBadPing,
                              kFirstFailure,
                              retry(kGoodPing, 2),
                              kGeneralSleep,
                              {"INFO General ping failed for service web, but this service has "
                               "been general recoverred successfully."},
                              kExit}));
}

TEST_F(MonitorThread, RecoveriesExhaustedEndTheThreadWithoutAnotherPing)
{
    status["web"] = {kStopped};
    EXPECT_EQ(run(), inorder({kEntry,
                              times(2, kBadPing + kFirstFailure + failedretries(kBadPing) +
                                           kRecoveryOfStopped + kGeneralSleep),
                              kGaveUp}));
}

TEST_F(MonitorThread, OneAllowedRecoveryEndsTheThreadEvenIfItWorked)
{
    web.maxattemptofwakeup = "1";
    status["web"] = {kStopped, kStopped, kStopped, kStopped, kRunning};
    EXPECT_EQ(run(), inorder({kEntry, kBadPing, kFirstFailure, failedretries(kBadPing),
                              kRecoveryOfStopped, kGeneralSleep, kGaveUp}));
}

TEST_F(MonitorThread, UnclearResultStopsTheServiceBeforeItStartsIt)
{
    web.maxattemptofwakeup = "1";
    status["web"] = {kUnclear};
    EXPECT_EQ(run(), inorder({kEntry, kUnclearPing, kFirstFailure, failedretries(kUnclearPing),
                              kWholeRecovery, kGeneralSleep, kGaveUp}));
}

TEST_F(MonitorThread, UnknownServiceEndsTheThread)
{
    status["web"] = {kUnrecognized};
    EXPECT_EQ(run(), inorder({kEntry,
                              kUnknownPing,
                              {"ERROR General ping failed for service web, unrecognized service.",
                               "exits with 0"}}));
}

TEST_F(MonitorThread, UnknownServiceInARetryIsAFailureLikeAnyOther)
{
    web.maxattemptofwakeup = "1";
    status["web"] = {kStopped, kUnrecognized};
    EXPECT_EQ(run(), inorder({kEntry, kBadPing, kFirstFailure, failedretries(kUnknownPing),
                              kWholeRecovery, kGeneralSleep, kGaveUp}));
}

TEST_F(MonitorThread, RefusedPingsAreFailures)
{
    web.maxattemptofwakeup = "1";
    pthread_rwlock_wrlock(&pingreclock); // this thread's own: every ping is refused
    const Events refused{kRefusedPing};
    // The recovery asks for the lock that it has, is refused, goes on and releases it.
    EXPECT_EQ(run(), inorder({kEntry, refused, kFirstFailure, failedretries(refused),
                              kWholeRecovery, kGeneralSleep, kGaveUp}));
}

TEST_F(MonitorThread, NoAllowedRecoveryMeansNoPingAtAll)
{
    for (const char* none : {"0", "many", ""}) {
        web.maxattemptofwakeup = none;
        startagain();
        globalenable = 1;
        EXPECT_EQ(run(), inorder({kEntry, kGaveUp})) << none;
    }
}

TEST_F(MonitorThread, NegativeAllowanceCyclesWithoutPingOrPauseUntilDisabled)
{
    web.maxattemptofwakeup = "-1";
    std::atomic<bool> disabled = false;
    std::thread manager([&] {
        EXPECT_TRUE(await([&] { return world.events().find(kEntry.back()) != std::string::npos; }));
        disabled = true;
        std::atomic_ref(globalenable).store(0);
    });
    const std::string happened = run();
    EXPECT_TRUE(disabled);
    manager.join();
    EXPECT_EQ(happened, inorder({kEntry, kExit}));
}

TEST_F(MonitorThread, NonNumericIntervalIsNoPause)
{
    web.genpinginterval = "abc";
    stopafter(1, 0);
    EXPECT_EQ(run(), inorder({kEntry,
                              kGoodPing,
                              kNoFunctionalPing,
                              {"DEBUG General ping sleep 0", "sleep 0"},
                              kExit}));
}

TEST_F(MonitorThread, IntervalsAreDecimal)
{
    web.genpinginterval = "010s";
    stopafter(1, 10);
    EXPECT_EQ(run(), inorder({kEntry,
                              kGoodPing,
                              kNoFunctionalPing,
                              {"DEBUG General ping sleep 10", "sleep 10"},
                              kExit}));
}

TEST_F(MonitorThread, NegativeIntervalIsNoPause)
{
    web.genpinginterval = "-5";
    stopafter(1, 0);
    EXPECT_EQ(run(), inorder({kEntry,
                              kGoodPing,
                              kNoFunctionalPing,
                              {"DEBUG General ping sleep -5", "sleep 0"},
                              kExit}));
}

TEST_F(MonitorThread, IntervalBeyondSleepIsTheLongestPause)
{
    web.genpinginterval = "99999999999";
    stopafter(1, 4294967295U);
    EXPECT_EQ(run(), inorder({kEntry,
                              kGoodPing,
                              kNoFunctionalPing,
                              {"DEBUG General ping sleep 99999999999", "sleep 4294967295"},
                              kExit}));
}

class FunctionalPhase : public Monitor {
protected:
    void SetUp() override
    {
        Monitor::SetUp();
        web.functionalpingcmd = "check-web";
    }

    const Events kPass = kCanNotSkip + Events{kExecuting};
};

TEST_F(FunctionalPhase, CorrectAnswerIsOnePassThenTheGeneralPause)
{
    EXPECT_EQ(run(), inorder({kEntry, kGoodPing, kPass, kGoodCheck, kFunctionalSleep, kGeneralSleep,
                              kExit}));
}

TEST_F(FunctionalPhase, RetryThatSucceedsMakesNoRecovery)
{
    checks = {kException, kCorrect};
    EXPECT_EQ(run(),
              inorder({kEntry, kGoodPing, kPass, kExceptionCheck, kFirstFunctionalFailure,
                       functionalretry(kGoodCheck), kFunctionalSleep, kGeneralSleep, kExit}));
}

TEST_F(FunctionalPhase, RecoveryThatHelpedIsReported)
{
    checks = {kException, kException, kException, kException, kCorrect};
    EXPECT_EQ(run(), inorder({kEntry,
                              kGoodPing,
                              kPass,
                              kExceptionCheck,
                              kFirstFunctionalFailure,
                              times(3, functionalretry(kExceptionCheck)),
                              kFunctionalRecovery,
                              kFunctionalSleep,
                              kPass,
                              kGoodCheck,
                              kFunctionalSleep,
                              {"INFO Functional ping failed for service web, but this service has "
                               "been successfully functional recovered."},
                              kGeneralSleep,
                              kExit}));
}

TEST_F(FunctionalPhase, RecoveriesExhaustedEndTheThread)
{
    checks = {kSilent};
    EXPECT_EQ(run(), inorder({kEntry, kGoodPing,
                              times(2, kPass + kSilentCheck + kFirstFunctionalFailure +
                                           times(3, functionalretry(kSilentCheck)) +
                                           kFunctionalRecovery + kFunctionalSleep),
                              kFunctionallyGaveUp}));
}

TEST_F(FunctionalPhase, OneAllowedRecoveryEndsTheThreadWithoutAnotherPing)
{
    web.maxattemptofwakeup = "1";
    checks = {kSilent};
    EXPECT_EQ(run(), inorder({kEntry, kGoodPing, kPass, kSilentCheck, kFirstFunctionalFailure,
                              times(3, functionalretry(kSilentCheck)), kFunctionalRecovery,
                              kFunctionalSleep, kFunctionallyGaveUp}));
}

TEST_F(FunctionalPhase, UnrecognisedCommandEndsThePhaseWithoutItsPause)
{
    checks = {kMissing};
    EXPECT_EQ(run(),
              inorder({kEntry,
                       kGoodPing,
                       kPass,
                       kMissingCheck,
                       {"ERROR Functionalping failed for service web, unrecognized command."},
                       kGeneralSleep,
                       kExit}));
}

TEST_F(FunctionalPhase, UnrecognisedCommandInARetryIsAFailureLikeAnyOther)
{
    web.maxattemptofwakeup = "1";
    checks = {kException, kMissing};
    EXPECT_EQ(run(), inorder({kEntry, kGoodPing, kPass, kExceptionCheck, kFirstFunctionalFailure,
                              times(3, functionalretry(kMissingCheck)), kFunctionalRecovery,
                              kFunctionalSleep, kFunctionallyGaveUp}));
}

TEST_F(FunctionalPhase, RefusedPingIsNoFailure)
{
    web.MaxFPSkips = "-1";
    // The lock is taken for writing by this very thread between the skip decision and the ping.
    std::optional<LockHeld> held;
    world.onpopen = [&](const std::string&) {
        if (!held) {
            held.emplace();
        }
        return Output{};
    };
    debugenable = false;
    EXPECT_EQ(run(), lines({
                         kEntry[1],
                         kEntry[2],
                         "run service web status 1>TMP/agent.web 2>TMP/agent.web",
                         "popen re pidof /usr/sbin/webd",
                         "pclose",
                         "popen re pidof `basename /usr/sbin/webd`",
                         "pclose",
                         kUnable,
                         kExecuting,
                         "sleep 11",
                         "sleep 7",
                         "returns 0",
                     }));
}

TEST_F(FunctionalPhase, DisabledMonitoringDoesNotCutThePhaseShort)
{
    checks = {kSilent};
    world.onsleep = [](unsigned) {
        globalenable = 0;
    };
    EXPECT_EQ(run(), inorder({kEntry, kGoodPing,
                              times(2, kPass + kSilentCheck + kFirstFunctionalFailure +
                                           times(3, functionalretry(kSilentCheck)) +
                                           kFunctionalRecovery + kFunctionalSleep),
                              kFunctionallyGaveUp}));
}

TEST_F(FunctionalPhase, IntervalBeyondSleepIsTheLongestPause)
{
    web.funpinginterval = "99999999999";
    EXPECT_EQ(run(), inorder({kEntry,
                              kGoodPing,
                              kPass,
                              kGoodCheck,
                              {"DEBUG Functional ping sleep 99999999999", "sleep 4294967295"},
                              kGeneralSleep,
                              kExit}));
}

TEST_F(FunctionalPhase, EmptyCommandIsACommand)
{
    web.functionalpingcmd = "";
    const std::string happened = run();
    EXPECT_NE(
        happened.find("\nrun  1>TMP/agent.functionalping.web 2>TMP/agent.functionalping.web\n"),
        std::string::npos);
}

// A refused ping (result -1) among the retries ends them, and nothing is recovered.
TEST_F(FunctionalPhase, RefusedRetryEndsTheRetriesWithoutRecovery)
{
    checks = {kException};
    std::optional<LockHeld> held;
    world.onsleep = [&](unsigned seconds) {
        if (seconds == 30) {
            held.emplace();
        } else if (seconds == kFunctionalInterval) {
            held.reset();
            globalenable = 0;
        }
    };
    EXPECT_EQ(run(), inorder({kEntry, kGoodPing, kPass, kExceptionCheck, kFirstFunctionalFailure,
                              functionalretry({}), kFunctionalSleep, kGeneralSleep, kExit}));
}

TEST_F(FunctionalPhase, RefusedPingAfterARecoveryCountsAsRecovered)
{
    checks = {kException};
    std::optional<LockHeld> held;
    world.onsleep = [&, phases = 0](unsigned seconds) mutable {
        if (seconds == kFunctionalInterval) {
            if (++phases == 1) {
                held.emplace();
            } else {
                held.reset();
                globalenable = 0;
            }
        }
    };
    EXPECT_EQ(run(), inorder({kEntry,
                              kGoodPing,
                              kPass,
                              kExceptionCheck,
                              kFirstFunctionalFailure,
                              times(3, functionalretry(kExceptionCheck)),
                              kFunctionalRecovery,
                              kFunctionalSleep,
                              kPass,
                              kFunctionalSleep,
                              {"INFO Functional ping failed for service web, but this service has "
                               "been successfully functional recovered."},
                              kGeneralSleep,
                              kExit}));
}

TEST(FunctionalResults, BelowMinusOneAreNeitherFineNorAFailure)
{
    for (const int result : {-2, -3, -100}) {
        EXPECT_FALSE(isfine(result)) << result;
        EXPECT_FALSE(isfailure(result)) << result;
    }
}

TEST(FunctionalResults, MinusOneAndZeroAreFineAndAllAboveAreFailures)
{
    for (const int result : {-1, 0}) {
        EXPECT_TRUE(isfine(result)) << result;
        EXPECT_FALSE(isfailure(result)) << result;
    }
    for (const int result : {1, 2, 3, 4}) {
        EXPECT_FALSE(isfine(result)) << result;
        EXPECT_TRUE(isfailure(result)) << result;
    }
}

class Skipping : public FunctionalPhase {
protected:
    void SetUp() override
    {
        FunctionalPhase::SetUp();
        web.ThresholdAverageCPUUsage = "900";
        web.ThresholdThreadCount = "50";
        web.ThresholdMemoryUsage = "900";
        web.MaxFPSkips = "3";
        world.onpopen = [](const std::string&) {
            return Output{std::string("42\n")};
        };
        threadsare(51);
    }

    void threadsare(int count)
    {
        world.files["/proc/42/stat"] = "42 (webd) S 1 42 42 0 -1 4194560 1 2 3 4 0 0 15 16 20 0 " +
                                       std::to_string(count) + " 21 22 23 800 25 26\n";
    }

    // The statistics' lines of one threshold check.
    static Events statistics(int threads)
    {
        const std::string log = "DEBUG [ProcessStatistics] (/usr/sbin/webd) ";
        return {
            "popen re pidof /usr/sbin/webd",
            "pclose",
            log + "averageCPUUsage/Threshold:0/900",
            log + "numberOfThreads/Threshold:" + std::to_string(threads) + "/50",
            log + "memoryUsage/Threshold:800/900",
            log + (threads > 50 ? "Threshold is reached" : "Threshold is not reached"),
        };
    }

    static Events firststatistics(int threads)
    {
        Events all = statistics(threads);
        all.insert(all.begin() + 2, "DEBUG [ProcessStatistics] (/usr/sbin/webd) PID changed (old = "
                                    "-1, new = 42)");
        return all;
    }

    static Events skip(const Events& checked, int count)
    {
        return kGoodPing + checked +
               Events{"INFO (/usr/sbin/webd) Skipping functional ping. " + std::to_string(count) +
                      " FPs skipped so far."} +
               kFunctionalSleep + kGeneralSleep;
    }

    static Events pinged(const Events& before)
    {
        return kGoodPing + before + Events{kExecuting} + kGoodCheck + kFunctionalSleep +
               kGeneralSleep;
    }
};

TEST_F(Skipping, BusyProcessIsPingedOnEveryFourthPass)
{
    stopafter(5, kGeneralInterval);
    EXPECT_EQ(run(), inorder({kEntry, skip(firststatistics(51), 1), skip(statistics(51), 2),
                              skip(statistics(51), 3), pinged(kCanNotSkip), skip(statistics(51), 1),
                              kExit}));
}

TEST_F(Skipping, IdlePassPingsAndEndsTheRunOfSkips)
{
    int pass = 0;
    world.onsleep = [&](unsigned seconds) {
        if (seconds == kGeneralInterval) {
            ++pass;
            threadsare(pass == 2 ? 50 : 51);
            if (pass == 6) {
                globalenable = 0;
            }
        }
    };
    EXPECT_EQ(run(), inorder({kEntry, skip(firststatistics(51), 1), skip(statistics(51), 2),
                              pinged(statistics(50)), skip(statistics(51), 1),
                              skip(statistics(51), 2), skip(statistics(51), 3), kExit}));
}

TEST_F(Skipping, LimitOfZeroNeverSkipsNorReadsTheStatistics)
{
    for (const char* none : {"0", "", "some"}) {
        web.MaxFPSkips = none;
        startagain();
        world.onsystem = [this](const std::string& command) {
            return answer(command);
        };
        stopafter(2, kGeneralInterval);
        EXPECT_EQ(run(), inorder({kEntry, times(2, pinged(kCanNotSkip)), kExit})) << none;
    }
}

TEST_F(Skipping, IdleProcessAtTheLimitStillGetsTheLine)
{
    web.MaxFPSkips = "1";
    world.onsleep = [&](unsigned seconds) {
        if (seconds == kGeneralInterval) {
            threadsare(1);
            globalenable = world.events().find("Executing") == std::string::npos ? 1 : 0;
        }
    };
    EXPECT_EQ(run(), inorder({kEntry, skip(firststatistics(51), 1), pinged(kCanNotSkip), kExit}));
}

TEST_F(Skipping, NegativeLimitSkipsWithoutBound)
{
    web.MaxFPSkips = "-1";
    stopafter(20, kGeneralInterval);
    const std::string happened = run();
    EXPECT_NE(happened.find("20 FPs skipped so far."), std::string::npos);
    EXPECT_EQ(happened.find("Executing functional ping"), std::string::npos);
}

TEST_F(Skipping, GoneProcessGoesOnBeingJudgedByItsLastFigures)
{
    stopafter(5, kGeneralInterval);
    world.onsleep = [this, passes = 0](unsigned seconds) mutable {
        if (seconds == kGeneralInterval) {
            world.onpopen = [](const std::string&) {
                return Output{};
            };
            globalenable = ++passes == 5 ? 0 : 1;
        }
    };
    const std::string happened = run();
    EXPECT_NE(happened.find("3 FPs skipped so far."), std::string::npos);
    EXPECT_NE(happened.find("Can not skip"), std::string::npos);
    EXPECT_NE(happened.find(kUnable), std::string::npos);
}

TEST_F(Skipping, AskingAloneNeverEndsARunOfSkips)
{
    // As the thread's start would do.
    web.statistics.SetThresholdThreadCount(web.ThresholdThreadCount);
    web.statistics.SetThresholdMemoryUsage(web.ThresholdMemoryUsage);
    wdmonitorthread thread(watched);
    EXPECT_FALSE(thread.IsPingable());
    EXPECT_FALSE(thread.IsPingable());
    threadsare(1);
    EXPECT_TRUE(thread.IsPingable()); // idle
    threadsare(51);
    EXPECT_FALSE(thread.IsPingable()); // the third skip
    EXPECT_TRUE(thread.IsPingable());  // the limit, and it stays
    EXPECT_TRUE(thread.IsPingable());
}

TEST_F(Skipping, ThreadStartsItsCountAfresh)
{
    wdmonitorthread thread(watched);
    EXPECT_FALSE(thread.IsPingable());
    EXPECT_FALSE(thread.IsPingable());
    EXPECT_NE(runbody(&thread).find(" Skipping functional ping. 1 FPs skipped so far."),
              std::string::npos);
}

TEST_F(Skipping, FunctionalPingEndsARunOfSkipsWhateverItsResult)
{
    struct Case {
        const char* command;
        Reply reply;
        bool refused;
        int result;
    };
    const std::vector<Case> cases{
        {"check-web", kCorrect, false, 0}, {"check-web", kException, false, 1},
        {"check-web", kMissing, false, 2}, {"check-web", kSilent, false, 3},
        {"check-web", kCorrect, true, -1}, {"NULL", kCorrect, false, -1},
    };
    for (const auto& [command, reply, refused, result] : cases) {
        web.functionalpingcmd = command;
        web.MaxFPSkips = "2";
        checks = {reply};
        wdmonitorthread thread(watched);
        EXPECT_FALSE(thread.IsPingable());
        EXPECT_FALSE(thread.IsPingable());
        EXPECT_TRUE(thread.IsPingable());
        {
            std::optional<LockHeld> held;
            if (refused) {
                held.emplace();
            }
            EXPECT_EQ(thread.functionalping(), result);
        }
        EXPECT_FALSE(thread.IsPingable());
        EXPECT_FALSE(thread.IsPingable());
        EXPECT_TRUE(thread.IsPingable());
    }
}

class GeneralPing : public Monitor {
protected:
    int rate(const std::string& output, int exitstatus = 0)
    {
        status["web"] = {{output, exitstatus}};
        return wdmonitorthread(watched).generalping(web);
    }
};

TEST_F(GeneralPing, RunningCountsUnlessTheLineSaysNot)
{
    EXPECT_EQ(rate("web is running"), 0);
    EXPECT_EQ(rate("web is not running"), 1);
    EXPECT_EQ(rate("web is running", 3), 0);
}

TEST_F(GeneralPing, StoppedIsNotRunning)
{
    EXPECT_EQ(rate("web is stopped"), 1);
    EXPECT_EQ(rate("web is stopped", 0), 1);
}

TEST_F(GeneralPing, CapitalsAreWordsOfTheirOwn)
{
    EXPECT_EQ(rate("RUNNING"), 0);
    EXPECT_EQ(rate("NOT RUNNING"), 1);
    EXPECT_EQ(rate("not RUNNING", 1), 0);
    EXPECT_EQ(rate("NOT running", 1), 0);
}

TEST_F(GeneralPing, CapitalisedRunningCountsOnlyByExitStatus)
{
    EXPECT_EQ(rate("Running", 0), 0);
    EXPECT_EQ(rate("Running", 3), 3);
}

TEST_F(GeneralPing, RunningComesBeforeStopped)
{
    EXPECT_EQ(rate("running, was stopped"), 0);
}

TEST_F(GeneralPing, NotAloneSaysNothing)
{
    EXPECT_EQ(rate("web does not say", 0), 0);
    EXPECT_EQ(rate("web does not say", 1), 3);
    EXPECT_EQ(rate("WEB DOES NOT SAY", 1), 3);
}

TEST_F(GeneralPing, StoppedComesBeforeUnknown)
{
    EXPECT_EQ(rate("stopped: unrecognized service"), 1);
    EXPECT_EQ(rate("not running: no such service"), 1);
}

TEST_F(GeneralPing, UnusedIsNotRunning)
{
    EXPECT_EQ(rate("web is unused"), 1);
    EXPECT_EQ(rate("unused: unrecognized service"), 1);
}

TEST_F(GeneralPing, UnknownServicesAreRecognisedByTwoTexts)
{
    EXPECT_EQ(rate("web: unrecognized service", 1), 2);
    EXPECT_EQ(rate("no such service: web", 0), 2);
}

TEST_F(GeneralPing, OnlyTheFirstLineCounts)
{
    EXPECT_EQ(rate("\nrunning\n", 0), 0);
    EXPECT_EQ(rate("\nrunning\n", 1), 3);
    EXPECT_EQ(rate("running\nstopped\n", 1), 0);
}

TEST_F(GeneralPing, LongFirstLineCountsToItsEnd)
{
    EXPECT_EQ(rate(std::string(1000, '.') + " running\nstopped\n", 1), 0);
}

TEST_F(GeneralPing, FirstLineCountsToItsFirstMiB)
{
    const std::string word = "running";
    EXPECT_EQ(rate(std::string(kLongestAnswerBytes - word.size(), '.') + word, 1), 0);
    EXPECT_EQ(rate(std::string(kLongestAnswerBytes - word.size() + 1, '.') + word, 1), 3);
    EXPECT_EQ(rate(std::string(kLongestAnswerBytes, '.') + "\nrunning\n", 1), 3);
}

TEST_F(GeneralPing, ExitStatusDecidesWhereNoWordDoes)
{
    EXPECT_EQ(rate("active", 0), 0);
    EXPECT_EQ(rate("active", 1), 3);
    EXPECT_EQ(world.events().substr(world.events().rfind("DEBUG")),
              "DEBUG  General Ping failed other cases.................\n");
}

TEST_F(GeneralPing, SuccessByExitStatusSaysSo)
{
    rate("active", 0);
    EXPECT_EQ(world.events(),
              lines(ping({"active", 0}, "DEBUG General ping successful! state = 0")));
}

TEST_F(GeneralPing, CommandThatDidNotEndNormallyHasStateMinusOne)
{
    world.onsystem = [this](const std::string& command) {
        answer(command);
        return 9; // killed
    };
    status["web"] = {{"active", 0}};
    EXPECT_EQ(wdmonitorthread(watched).generalping(web), 3);
    EXPECT_NE(world.events().find(", result = active, state = -1\n"), std::string::npos);
    status["web"] = {{"running", 0}};
    EXPECT_EQ(wdmonitorthread(watched).generalping(web), 0);
}

TEST_F(GeneralPing, ShellThatCannotStartHasStateMinusOne)
{
    world.onsystem = [](const std::string&) {
        return -1;
    };
    EXPECT_EQ(wdmonitorthread(watched).generalping(web), 3);
    EXPECT_NE(world.events().find(", state = -1\n"), std::string::npos);
}

TEST_F(GeneralPing, MissingStatusFileLeavesTheDecisionToTheExitStatus)
{
    for (const int exitstatus : {0, 1}) {
        world.onsystem = [exitstatus](const std::string&) {
            return exited(exitstatus);
        };
        EXPECT_EQ(wdmonitorthread(watched).generalping(web), exitstatus == 0 ? 0 : 3);
    }
    const std::string command = "service web status 1>TMP/agent.web 2>TMP/agent.web";
    EXPECT_EQ(world.events(), lines({
                                  "DEBUG Entering of general ping function, before get read lock.",
                                  "DEBUG enter of general ping, after get read lock.",
                                  "run " + command,
                                  "DEBUG Unable to open service status file.",
                                  "DEBUG command = " + command + ", result = , state = 0",
                                  "DEBUG General ping successful! state = 0",
                                  "DEBUG Entering of general ping function, before get read lock.",
                                  "DEBUG enter of general ping, after get read lock.",
                                  "run " + command,
                                  "DEBUG Unable to open service status file.",
                                  "DEBUG command = " + command + ", result = , state = 1",
                                  "DEBUG  General Ping failed other cases.................",
                              }));
}

TEST_F(GeneralPing, RefusedLockRunsNothing)
{
    const LockHeld held;
    EXPECT_EQ(wdmonitorthread(watched).generalping(web), -1);
    EXPECT_EQ(world.events(), lines({kRefusedPing}));
}

TEST_F(GeneralPing, LockIsTakenAfterItsFirstMessageAndReleasedAfterTheLast)
{
    world.recordthreads = true;
    wdmonitorthread(watched).generalping(web);
    Events expected = kGoodPing + Events{"release lock"};
    expected.insert(expected.begin() + 1, "take lock for reading");
    EXPECT_EQ(world.events(), lines(expected));
}

TEST_F(GeneralPing, LockIsHeldForReadingWhileTheCommandRunsAndFreeAfterwards)
{
    world.onsystem = [this](const std::string& command) {
        EXPECT_EQ(pthread_rwlock_trywrlock(&pingreclock), EBUSY);
        EXPECT_EQ(pthread_rwlock_tryrdlock(&pingreclock), 0);
        pthread_rwlock_unlock(&pingreclock);
        return answer(command);
    };
    wdmonitorthread(watched).generalping(web);
    EXPECT_TRUE(lockisfree());
}

class FunctionalPing : public Monitor {
protected:
    void SetUp() override
    {
        Monitor::SetUp();
        web.functionalpingcmd = "check-web";
    }

    int rate(const std::string& output)
    {
        checks = {{output, 0}};
        return wdmonitorthread(watched).functionalping();
    }
};

TEST_F(FunctionalPing, MarksOfSuccessAreRecognised)
{
    EXPECT_EQ(rate("CreationClassName = x"), 0);
    EXPECT_EQ(rate("web is running"), 0);
    EXPECT_EQ(rate("service: up"), 0);
    EXPECT_EQ(rate("InstanceID=4"), 0);
    EXPECT_EQ(rate("initialized"), 0);
}

TEST_F(FunctionalPing, NotSpoilsRunningAndInitialized)
{
    EXPECT_EQ(rate("not running"), 3);
    EXPECT_EQ(rate("running, but cannot answer"), 3);
    EXPECT_EQ(rate("not initialized"), 3);
}

TEST_F(FunctionalPing, NotDoesNotSpoilTheOtherMarks)
{
    EXPECT_EQ(rate("not running service:"), 0);
    EXPECT_EQ(rate("not running InstanceID="), 0);
    EXPECT_EQ(rate("not running CreationClassName"), 0);
}

TEST_F(FunctionalPing, ExceptionIsAFailure)
{
    EXPECT_EQ(rate("CIMException: x"), 1);
    EXPECT_EQ(rate("CIMExcept"), 3);
}

TEST_F(FunctionalPing, SuccessComesBeforeException)
{
    EXPECT_EQ(rate("CIMException in service: web"), 0);
    EXPECT_EQ(rate("CIMException while running"), 0);
    EXPECT_EQ(rate("CIMException, initialized"), 0);
}

TEST_F(FunctionalPing, ExceptionComesBeforeMissingCommand)
{
    EXPECT_EQ(rate("CIMException: command not found"), 1);
}

TEST_F(FunctionalPing, MissingCommandIsRecognisedByTwoTexts)
{
    EXPECT_EQ(rate("bash: check-web: command not found"), 2);
    EXPECT_EQ(rate("sh: /x: No such file or directory"), 2);
    EXPECT_EQ(rate("No such file or directory"), 3); // without its leading blank
    EXPECT_EQ(rate("sh: 1: check-web: not found"), 3);
}

TEST_F(FunctionalPing, AnythingElseIsAFailure)
{
    EXPECT_EQ(rate(""), 3);
    EXPECT_EQ(rate("ok"), 3);
    EXPECT_EQ(rate("Running"), 3);
    EXPECT_EQ(rate("service up"), 3);
    EXPECT_EQ(rate("InstanceID 4"), 3);
}

TEST_F(FunctionalPing, OnlyTheFirstLineCounts)
{
    EXPECT_EQ(rate("\nCreationClassName\n"), 3);
}

TEST_F(FunctionalPing, FirstLineCountsToItsFirstMiB)
{
    const std::string word = "service:";
    EXPECT_EQ(rate(std::string(kLongestAnswerBytes - word.size(), '.') + word), 0);
    EXPECT_EQ(rate(std::string(kLongestAnswerBytes - word.size() + 1, '.') + word), 3);
}

TEST_F(FunctionalPing, ExitStatusIsIgnored)
{
    checks = {{"running", 1}};
    EXPECT_EQ(wdmonitorthread(watched).functionalping(), 0);
}

TEST_F(FunctionalPing, MissingOutputFileIsLoggedAndNoAnswer)
{
    world.onsystem = [](const std::string&) {
        return 0;
    };
    EXPECT_EQ(wdmonitorthread(watched).functionalping(), 3);
    Events expected = kSilentCheck;
    expected.insert(expected.begin() + 2, "DEBUG  unable to open service status file.");
    EXPECT_EQ(world.events(), lines(expected));
}

TEST_F(FunctionalPing, LiteralNullRunsNothing)
{
    web.functionalpingcmd = "NULL";
    EXPECT_EQ(wdmonitorthread(watched).functionalping(), -1);
    EXPECT_EQ(world.events(), lines({"DEBUG Performing functional ping, process id is: " +
                                     std::to_string(getpid()) + ", fp cmd is: NULL"}));
    EXPECT_TRUE(lockisfree());
}

TEST_F(FunctionalPing, RefusedLockIsSilent)
{
    const LockHeld held;
    EXPECT_EQ(wdmonitorthread(watched).functionalping(), -1);
    EXPECT_EQ(world.events(), "");
}

TEST_F(FunctionalPing, LockIsTakenBeforeAndReleasedAfterItsMessages)
{
    world.recordthreads = true;
    wdmonitorthread(watched).functionalping();
    EXPECT_EQ(world.events(), inorder({{"take lock for reading"}, kGoodCheck, {"release lock"}}));
}

TEST_F(FunctionalPing, LockIsHeldForReadingWhileTheCommandRunsAndFreeAfterwards)
{
    world.onsystem = [this](const std::string& command) {
        EXPECT_EQ(pthread_rwlock_trywrlock(&pingreclock), EBUSY);
        return answer(command);
    };
    wdmonitorthread(watched).functionalping();
    EXPECT_TRUE(lockisfree());
}

// A ping waits for the recovery of another thread; it is not refused.
TEST_F(GeneralPing, WaitsWhileAnotherThreadHoldsTheLockForWriting)
{
    std::atomic<bool> pinged = false;
    world.onsystem = [&](const std::string& command) {
        pinged = true;
        return answer(command);
    };
    std::optional<LockHeld> held(std::in_place);
    world.recordthreads = true;
    std::thread pinging([this] { EXPECT_EQ(wdmonitorthread(watched).generalping(web), 0); });
    EXPECT_TRUE(await(
        [this] { return world.events().find("take lock for reading") != std::string::npos; }));
    EXPECT_FALSE(pinged);
    held.reset();
    pinging.join();
    EXPECT_TRUE(pinged);
}

TEST_F(GeneralPing, MissingFolderIsLeftToTheShellsExitStatus)
{
    _tmp_file_path = folder.path("missing/");
    world.onsystem = [](const std::string& command) {
        return runforreal(command + " 2>/dev/null");
    };
    EXPECT_EQ(wdmonitorthread(watched).generalping(web), 3);
    EXPECT_NE(world.events().find("DEBUG Unable to open service status file.\n"),
              std::string::npos);
}

class GeneralRecovery : public Monitor {
protected:
    std::string recover(int lastping)
    {
        EXPECT_EQ(wdmonitorthread(watched).generalrecover(lastping), 1);
        return world.events();
    }

    // A dependent service, known to the configuration, with these commands.
    void adddependent(const std::string& name, const std::string& stop, const std::string& start)
    {
        service dependent;
        dependent.name = name;
        dependent.stopcmd = stop;
        dependent.startcmd = start;
        watched.dependentservices.push_back(dependent);
        xmlparser::allservices.push_back(dependent);
    }

    const std::string kNotFound =
        "ERROR Service not found in the xmlparser::allservices, can not recover.";
};

TEST_F(GeneralRecovery, ServiceKnownToBeDownIsOnlyStarted)
{
    EXPECT_EQ(recover(1), lines(kRecoveryOfStopped));
}

TEST_F(GeneralRecovery, OtherResultsStopTheServiceFirst)
{
    for (const int lastping : {-1, 0, 2, 3}) {
        startagain();
        EXPECT_EQ(recover(lastping), lines(kWholeRecovery)) << lastping;
    }
}

TEST_F(GeneralRecovery, ConfiguredCommandsRunAsWritten)
{
    web.stopcmd = "/usr/local/bin/stop-web";
    web.startcmd = "/usr/local/bin/start-web --now";
    EXPECT_EQ(recover(3), inorder({kRecoveryBegins,
                                   {"DEBUG User provided stop command: /usr/local/bin/stop-web",
                                    "run /usr/local/bin/stop-web"},
                                   kNoDependentsToStop,
                                   {"DEBUG Will perform general ping from general recover",
                                    kRefusedPing, "DEBUG service is not up hence will start it web",
                                    std::string("DEBUG User provided command start:") +
                                        "/usr/local/bin/start-web --now",
                                    "DEBUG Executing start command /usr/local/bin/start-web --now",
                                    "run /usr/local/bin/start-web --now"},
                                   kNoDependentsToStart,
                                   kRecoveryEnds}));
}

TEST_F(GeneralRecovery, ConfiguredStopWithDefaultStart)
{
    web.stopcmd = "/usr/local/bin/stop-web";
    EXPECT_EQ(recover(3), inorder({kRecoveryBegins,
                                   {"DEBUG User provided stop command: /usr/local/bin/stop-web",
                                    "run /usr/local/bin/stop-web"},
                                   kNoDependentsToStop,
                                   kStartOfWeb,
                                   kNoDependentsToStart,
                                   kRecoveryEnds}));
}

TEST_F(GeneralRecovery, OnlyTheWholeWordMeansNoCommand)
{
    web.stopcmd = "";
    web.startcmd = "NULLIFY";
    adddependent("a", "null", "");
    debugenable = false;
    EXPECT_EQ(recover(3), lines({"ERROR Try the general recover for service web", "run ",
                                 "run null", "run NULLIFY", "run "}));
}

TEST_F(GeneralRecovery, SimilarNamesAreOtherServices)
{
    debugenable = false;
    xmlparser::allservices[0].name = "web2";
    EXPECT_EQ(recover(1), lines({"ERROR Try the general recover for service web", kNotFound}));
}

TEST_F(GeneralRecovery, LockIsTakenAndReleasedBetweenItsMessages)
{
    world.recordthreads = true;
    Events expected = kRecoveryOfStopped;
    expected.insert(expected.begin() + 1, "take lock for writing");
    const auto ping = std::find(expected.begin(), expected.end(), kRefusedPing);
    expected.insert(ping + 1, "take lock for reading");
    expected.insert(expected.end() - 1, "release lock");
    EXPECT_EQ(recover(1), lines(expected));
}

TEST_F(GeneralRecovery, OneDependentWithDefaultCommands)
{
    adddependent("a", "NULL", "NULL");
    EXPECT_EQ(recover(1),
              inorder({kRecoveryBegins,
                       {"DEBUG number of dependent services = 1", "DEBUG Trying to stop service a",
                        "DEBUG Service stop command dep:service a stop", kRefusedPing,
                        "DEBUG Executing stop command service a stop", "run service a stop",
                        "DEBUG All dependent services stopped"},
                       kStartOfWeb,
                       {"DEBUG Now start dependent services",
                        "DEBUG Service command start dep:service a start", kRefusedPing,
                        "run service a start"},
                       kRecoveryEnds}));
}

TEST_F(GeneralRecovery, TwoDependentsStopAndStartInTheSameOrder)
{
    adddependent("a", "stop-a", "start-a");
    adddependent("b", "NULL", "start-b");
    EXPECT_EQ(
        recover(0),
        inorder({kRecoveryBegins,
                 kStopOfWeb,
                 {"DEBUG number of dependent services = 2", "DEBUG Trying to stop service a",
                  "DEBUG User provided stop command dep: stop-aa", kRefusedPing,
                  "DEBUG Executing stop command stop-a", "run stop-a",
                  "DEBUG Trying to stop service b", "DEBUG Service stop command dep:service b stop",
                  kRefusedPing, "DEBUG Executing stop command service b stop", "run service b stop",
                  "DEBUG All dependent services stopped"},
                 kStartOfWeb,
                 {"DEBUG Now start dependent services",
                  "DEBUG User provided command start dep:start-a", kRefusedPing, "run start-a",
                  "DEBUG User provided command start dep:start-b", kRefusedPing, "run start-b"},
                 kRecoveryEnds}));
}

// Each start happens while fifty threads have the log or another file open.
TEST_F(GeneralRecovery, StartCommandInheritsTheThreeStandardDescriptorsOnly)
{
    constexpr int kStarts = 1000;
    constexpr int kThreads = 50;
    // The ":" keeps the shell from becoming ls, whose own descriptors do not matter.
    web.startcmd = "exec >>" + folder.path("descriptors") + "; ls /proc/$$/fd; :";
    world.onsystem = runforreal;
    debugenable = false; // a dropped line opens the log, too
    for (int fd = STDERR_FILENO + 1; fd < kStarts; ++fd) {
        fcntl(fd, F_SETFD, FD_CLOEXEC); // what the test's own framework has open
    }
    std::atomic<int> starts = 0;
    std::vector<std::thread> threads(kThreads);
    for (auto& thread : threads) {
        thread = std::thread([this, &starts] {
            for (int seen = 0; seen < kStarts; seen = starts) {
                starts.wait(seen);
                wdlog("m", kLevelDebug, "busy");
                const auto file = Utility::OpenToRead(folder.path("log"));
            }
        });
    }
    for (int i = 0; i < kStarts; ++i) {
        ++starts;
        starts.notify_all();
        wdmonitorthread(watched).generalrecover(1);
    }
    for (auto& thread : threads) {
        thread.join();
    }
    std::string expected;
    for (int i = 0; i < kStarts; ++i) {
        expected += "0\n1\n2\n";
    }
    EXPECT_EQ(folder.read("descriptors"), expected);
}

TEST_F(GeneralRecovery, UnconfiguredDependentIsLeftAloneAndTheRestProceeds)
{
    adddependent("a", "NULL", "NULL");
    adddependent("b", "NULL", "NULL");
    xmlparser::allservices.erase(xmlparser::allservices.begin() + 1);
    EXPECT_EQ(
        recover(1),
        inorder({kRecoveryBegins,
                 {"DEBUG number of dependent services = 2", "DEBUG Trying to stop service a",
                  "DEBUG Service stop command dep:service a stop", kRefusedPing, kNotFound,
                  "DEBUG Trying to stop service b", "DEBUG Service stop command dep:service b stop",
                  kRefusedPing, "DEBUG Executing stop command service b stop", "run service b stop",
                  "DEBUG All dependent services stopped"},
                 kStartOfWeb,
                 {"DEBUG Now start dependent services",
                  "DEBUG Service command start dep:service a start", kRefusedPing, kNotFound,
                  "DEBUG Service command start dep:service b start", kRefusedPing,
                  "run service b start"},
                 kRecoveryEnds}));
}

TEST_F(GeneralRecovery, UnconfiguredServiceIsNeitherStoppedNorStarted)
{
    xmlparser::allservices.clear();
    EXPECT_EQ(recover(0), inorder({kRecoveryBegins,
                                   {"DEBUG Service stop command:service web stop", kNotFound},
                                   kNoDependentsToStop,
                                   {"DEBUG Will perform general ping from general recover",
                                    kRefusedPing, "DEBUG service is not up hence will start it web",
                                    "DEBUG Service command start:service web start", kNotFound},
                                   kNoDependentsToStart,
                                   kRecoveryEnds}));
}

TEST_F(GeneralRecovery, OnlyItsAnnouncementIsWrittenWithoutDebug)
{
    debugenable = false;
    adddependent("a", "NULL", "NULL");
    EXPECT_EQ(recover(3),
              lines({"ERROR Try the general recover for service web", "run service web stop",
                     "run service a stop", "run service web start", "run service a start"}));
}

TEST_F(GeneralRecovery, LockIsHeldForWritingFromFirstToLastCommandAndFreeAfterwards)
{
    adddependent("a", "NULL", "NULL");
    int commands = 0;
    world.onsystem = [&](const std::string&) {
        ++commands;
        std::thread other([] { EXPECT_EQ(pthread_rwlock_tryrdlock(&pingreclock), EBUSY); });
        other.join();
        return 0;
    };
    recover(3);
    EXPECT_EQ(commands, 4);
    EXPECT_TRUE(lockisfree());
}

// Where the write side is refused, the pings within the recovery are not, and their results count.
class RecoveryWithoutLock : public GeneralRecovery {
protected:
    void SetUp() override
    {
        GeneralRecovery::SetUp();
        world.writelockfails = true;
        world.recordthreads = true;
        adddependent("a", "NULL", "NULL");
        debugenable = false;
    }

    static std::string statusof(const std::string& name)
    {
        return "take lock for reading\nrun service " + name + " status 1>TMP/agent." + name +
               " 2>TMP/agent." + name;
    }
};

TEST_F(RecoveryWithoutLock, WhatIsDownIsNotStoppedAndWhatRunsIsNotStarted)
{
    status["a"] = {kStopped, kRunning};
    status["web"] = {kRunning};
    EXPECT_EQ(recover(3),
              lines({"take lock for writing", "ERROR Try the general recover for service web",
                     "run service web stop", statusof("a"), statusof("web"), statusof("a"),
                     "release lock"}));
}

TEST_F(RecoveryWithoutLock, WhatRunsIsStoppedAndWhatIsDownIsStarted)
{
    status["a"] = {kRunning, kStopped};
    status["web"] = {kStopped};
    EXPECT_EQ(
        recover(3),
        lines({"take lock for writing", "ERROR Try the general recover for service web",
               "run service web stop", statusof("a"), "run service a stop", statusof("web"),
               "run service web start", statusof("a"), "run service a start", "release lock"}));
}

TEST_F(GeneralRecovery, FunctionalRecoveryIsAWholeRecoveryAndASecond)
{
    world.onsystem = [](const std::string&) {
        return exited(1);
    }; // nothing helps
    EXPECT_EQ(wdmonitorthread(watched).functionalrecover(), 1);
    EXPECT_EQ(world.events(), lines(kFunctionalRecovery));
}

class Threads : public Monitor {
protected:
    void SetUp() override
    {
        Monitor::SetUp();
        world.recordthreads = true;
        world.threadsarereal = false;
        globalenable = 0;
    }
};

TEST_F(Threads, CreateAndJoinLogTheThreadsId)
{
    wdmonitorthread thread(watched);
    EXPECT_EQ(thread.create(), 1);
    thread.join();
    EXPECT_EQ(world.events(),
              inorder({{"create thread", "DEBUG Thread id :71thread created...", "join thread"},
                       kEntry,
                       {"DEBUG This is the exit of threadfunc",
                        "DEBUG Thread id :71thread is joined..."}}));
}

TEST_F(Threads, ThreadThatCannotBeMadeIsSilentAndReturnsOne)
{
    world.threadsfail = true;
    wdmonitorthread thread(watched);
    EXPECT_EQ(thread.create(), 1);
    thread.join();
    EXPECT_EQ(world.events(), lines({"create thread"}));
}

TEST_F(Threads, JoinIsMadeOnce)
{
    wdmonitorthread thread(watched);
    thread.join();
    thread.create();
    thread.join();
    thread.join();
    const std::string happened = world.events();
    EXPECT_EQ(happened.find("join thread"), happened.rfind("join thread"));
}

TEST_F(Threads, FailedJoinOnlyLeavesOutItsLine)
{
    wdmonitorthread thread(watched);
    thread.create();
    wdmonitorthread copy = thread;
    thread.join();
    const std::string before = world.events();
    copy.join(); // that thread is gone
    EXPECT_EQ(world.events(), before + "join thread\n");
    copy.join();
    EXPECT_EQ(world.events(), before + "join thread\n");
}

TEST_F(Threads, WorksOnACopyOfItsTarget)
{
    wdmonitorthread thread(watched);
    web.name = "changed";
    EXPECT_EQ(runbody(&thread), inorder({kEntry, kExit}));
}

// Two threads recover and two ping, all at once: while one recovers, nothing else is pinged or
// recovered.
TEST_F(Monitor, RecoveriesExcludePingsAndEachOther)
{
    constexpr int kTurns = 20;
    std::atomic<int> recovering = 0;
    std::atomic<int> pinging = 0;
    std::atomic<int> pings = 0;
    std::atomic<bool> overlap = false;
    world.onsystem = [&](const std::string& command) {
        const bool isping = command.find(" status ") != std::string::npos;
        pings += isping ? 1 : 0;
        std::atomic<int>& mine = isping ? pinging : recovering;
        ++mine;
        for (int i = 0; i < 20; ++i) {
            if (recovering > (isping ? 0 : 1) || (!isping && pinging > 0)) {
                overlap = true;
            }
            std::this_thread::yield();
        }
        --mine;
        return 0;
    };
    std::vector<std::thread> threads;
    for (int i = 0; i < 2; ++i) {
        threads.emplace_back([&] {
            wdmonitorthread thread(watched);
            for (int n = 0; n < kTurns; ++n) {
                thread.generalrecover(3);
            }
        });
        threads.emplace_back([&] {
            wdmonitorthread thread(watched);
            for (int n = 0; n < kTurns; ++n) {
                thread.generalping(web);
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(pings, 2 * kTurns);
    EXPECT_FALSE(overlap);
}

} // namespace
