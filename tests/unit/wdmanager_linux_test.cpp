// The manager. Its loop is left by an exception out of a pause.

#include "wdmanager_linux.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <filesystem>
#include <sstream>
#include <thread>

#include "daemontest.h"
#include "wdsettings.h"
#include "xmlparser.h"

namespace {

std::string configuration(const std::vector<std::string>& names)
{
    std::string text = "<wdtargets>\n";
    for (const auto& name : names) {
        text += "<wdmonitortarget><wdmonitorservice>";
        text.append("<name>").append(name).append("</name>");
        text.append("<binarypath>/usr/sbin/").append(name).append("</binarypath>");
        text += "<startcmd>NULL</startcmd><stopcmd>NULL</stopcmd>"
                "<functionalpingcmd>NULL</functionalpingcmd><genpinginterval>1</genpinginterval>"
                "<maxattemptofwakeup>2</maxattemptofwakeup>";
        text += "</wdmonitorservice></wdmonitortarget>\n";
    }
    return text + "</wdtargets>\n";
}

class Manager : public DaemonTest {
protected:
    Manager() : DaemonTest("wdmanager") {}

    void SetUp() override
    {
        DaemonTest::SetUp();
        globalrefresh = 3;
        configure({"web", "mail"});
        world.recordthreads = true;
        world.threadsarereal = false; // a thread's body runs when it is joined
    }

    void configure(const std::vector<std::string>& names)
    {
        folder.write("config.xml", configuration(names));
    }

    // Supervises until the pause number `pauses` has been asked for.
    std::string supervise(int pauses)
    {
        const std::function<void(unsigned)> test = world.onsleep;
        world.onsleep = [pauses, test](unsigned seconds) mutable {
            if (--pauses == 0) {
                throw StopHere();
            }
            test(seconds);
        };
        wdmanager manager(folder.path("config.xml"), folder.path("log"));
        try {
            manager.wdstart();
        } catch (const StopHere&) {
            world.record("stopped by the test");
        } catch (const ThreadExit& exit) {
            world.record("exits with " +
                         std::to_string(reinterpret_cast<std::intptr_t>(exit.value)));
        }
        return withoutlisting(world.events());
    }

    static std::string withoutlisting(const std::string& events)
    {
        std::string rest;
        std::istringstream text(events);
        for (std::string line; std::getline(text, line);) {
            if (line.find("[wdxmlparserhandler") == std::string::npos) {
                rest += line + "\n";
            }
        }
        return rest;
    }
};

std::vector<std::string> created(int id)
{
    return {"create thread",
            "DEBUG [wdmonitorthread] Thread id :" + std::to_string(id) + "thread created..."};
}

// The body of a thread that finds monitoring disabled, between the lines of its joining.
std::vector<std::string> joined(int id, const std::string& name)
{
    const std::string thread = " [wdmonitorthread] ";
    return {"DEBUG before join......",
            "join thread",
            "DEBUG" + thread + "This is the entry of threadfunc",
            "INFO" + thread + "Name of the service being monitored: " + name,
            "INFO" + thread + "Binary path of service being monitored: /usr/sbin/" + name,
            "DEBUG" + thread + "This is the exit of threadfunc",
            "DEBUG" + thread + "Thread id :" + std::to_string(id) + "thread is joined...",
            "DEBUG after join......"};
}

const std::string kRefresh = "DEBUG After globalrefresh times refreshconfig,join threadas*";

TEST_F(Manager, ConstructionSetsTheLogLoadsAndEnables)
{
    wdLocalLog::logFilePath.clear();
    const wdmanager manager(folder.path("config.xml"), folder.path("log"));
    EXPECT_EQ(wdLocalLog::logFilePath, folder.path("log"));
    EXPECT_EQ(globalenable, 1);
    EXPECT_EQ(xmlparser::alltargets.size(), 2U);
    EXPECT_NE(folder.read("log").find("%web\n"), std::string::npos);
}

TEST_F(Manager, ConstructionFromTheConfigurationAloneLeavesTheLog)
{
    const std::string before = wdLocalLog::logFilePath;
    const wdmanager manager(folder.path("config.xml").c_str());
    EXPECT_EQ(wdLocalLog::logFilePath, before);
    EXPECT_EQ(globalenable, 1);
    EXPECT_EQ(xmlparser::alltargets.size(), 2U);
}

TEST_F(Manager, TwoGenerationsWithAChangedConfigurationBetween)
{
    world.onsleep = [this, ticks = 0](unsigned) mutable {
        if (++ticks == 2) {
            configure({"db"});
        }
    };
    EXPECT_EQ(supervise(7), lines({"sleep 1", "make lock"}) + lines(created(71)) +
                                lines(created(72)) + lines({"sleep 1", "sleep 1", kRefresh}) +
                                lines(joined(71, "web")) + lines(joined(72, "mail")) +
                                lines({"destroy lock", "sleep 1", "make lock"}) +
                                lines(created(71)) + lines({"sleep 1", "sleep 1", kRefresh}) +
                                lines(joined(71, "db")) +
                                lines({"destroy lock", "sleep 1", "stopped by the test"}));
}

TEST_F(Manager, MonitoringIsEnabledWhenThreadsStartAndDisabledWhenTheyAreJoined)
{
    std::string calls;
    world.onthread = [&](const std::string& call) {
        calls += call + (globalenable != 0 ? " enabled\n" : " disabled\n");
    };
    configure({"web"});
    supervise(7);
    const std::string generation = "create thread enabled\njoin thread disabled\n";
    EXPECT_EQ(calls, generation + generation);
}

TEST_F(Manager, ConfigurationWithoutTargetsStartsNothingAndRefreshesAllTheSame)
{
    configure({});
    EXPECT_EQ(supervise(4), lines({"sleep 1", "make lock", "sleep 1", "sleep 1", kRefresh,
                                   "destroy lock", "sleep 1", "stopped by the test"}));
}

TEST_F(Manager, MissingConfigurationIsAnEmptyGenerationAndIsTriedAgain)
{
    std::filesystem::remove(folder.path("config.xml"));
    world.onsleep = [this, ticks = 0](unsigned) mutable {
        if (++ticks == 2) {
            configure({"db"});
        }
    };
    ::testing::internal::CaptureStderr();
    const std::string happened = supervise(5);
    EXPECT_EQ(::testing::internal::GetCapturedStderr(),
              "error, unable to open the input file: 0\n");
    EXPECT_EQ(happened, lines({"sleep 1", "make lock", "sleep 1", "sleep 1", kRefresh,
                               "destroy lock", "sleep 1", "make lock"}) +
                            lines(created(71)) + lines({"sleep 1", "stopped by the test"}));
}

TEST_F(Manager, LeastRefreshPeriodIsAHundredAndTwentyTicks)
{
    globalrefresh = 120;
    configure({});
    const std::string happened = supervise(121);
    const std::string beforerefresh = happened.substr(0, happened.find(kRefresh));
    EXPECT_EQ(std::count(beforerefresh.begin(), beforerefresh.end(), '\n'), 121); // 1 lock
}

TEST_F(Manager, ThreadThatEndedEarlyIsRevivedByTheRefresh)
{
    configure({"web"});
    world.recordthreads = false;
    world.threadsarereal = true;
    std::atomic<int> pings = 0;
    world.onsystem = [&](const std::string&) {
        folder.write("agent.web", "web: unrecognized service\n");
        ++pings;
        return exited(1);
    };
    // Each generation lives until its one thread has pinged, and with that has ended.
    world.onsleep = [&, ticks = 0](unsigned) mutable {
        ++ticks;
        EXPECT_TRUE(await([&] { return pings >= (ticks + 1) / globalrefresh; }));
    };
    const std::string happened = supervise(7);
    const std::string gone =
        "ERROR [wdmonitorthread] General ping failed for service web, unrecognized service.\n";
    EXPECT_EQ(pings, 2);
    EXPECT_NE(happened.find(gone), happened.rfind(gone));
}

TEST_F(Manager, FailedLoadKeepsTheTargetsAndIsLogged)
{
    wdmanager manager(folder.path("config.xml"), folder.path("log"));
    folder.write("broken.xml", "<wdtargets><stopcmd/></wdtargets>");
    manager.loadservices(folder.path("broken.xml"));
    EXPECT_EQ(withoutlisting(world.events()), lines({"ERROR Loadservices error."}));
    // The two targets of the first load are still the manager's.
    world.onsleep = [ticks = 0](unsigned) mutable {
        if (++ticks == 2) {
            throw StopHere();
        }
    };
    EXPECT_THROW(manager.wdstart(), StopHere);
    EXPECT_EQ(withoutlisting(world.events()),
              lines({"ERROR Loadservices error.", "sleep 1", "make lock"}) + lines(created(71)) +
                  lines(created(72)) + lines({"sleep 1"}));
}

TEST_F(Manager, FailedLoadAtARefreshIsAGenerationWithoutThreads)
{
    world.onsleep = [this, ticks = 0](unsigned) mutable {
        if (++ticks == 2) {
            folder.write("config.xml", "<wdtargets><stopcmd/></wdtargets>");
        }
    };
    EXPECT_EQ(supervise(5), lines({"sleep 1", "make lock"}) + lines(created(71)) +
                                lines(created(72)) + lines({"sleep 1", "sleep 1", kRefresh}) +
                                lines(joined(71, "web")) + lines(joined(72, "mail")) +
                                lines({"destroy lock", "ERROR Loadservices error.", "sleep 1",
                                       "make lock", "sleep 1", "stopped by the test"}));
}

TEST_F(Manager, RefreshconfigForgetsAndLoadsAgain)
{
    wdmanager manager(folder.path("config.xml"), folder.path("log"));
    configure({"db"});
    EXPECT_EQ(manager.refreshconfig(), 1);
    ASSERT_EQ(xmlparser::alltargets.size(), 1U);
    EXPECT_EQ(xmlparser::alltargets[0].monitoredservice.name, "db");
    folder.write("config.xml", "<wdtargets><stopcmd/></wdtargets>");
    EXPECT_EQ(manager.refreshconfig(), 1);
    EXPECT_TRUE(xmlparser::alltargets.empty());
}

TEST_F(Manager, RefreshconfigThatCannotLoadLeavesNothingToWatch)
{
    wdmanager manager(folder.path("config.xml"), folder.path("log"));
    folder.write("config.xml", "<wdtargets><stopcmd/></wdtargets>");
    manager.refreshconfig();
    world.onsleep = [ticks = 0](unsigned) mutable {
        if (++ticks == 2) {
            throw StopHere();
        }
    };
    EXPECT_THROW(manager.wdstart(), StopHere);
    EXPECT_EQ(withoutlisting(world.events()),
              lines({"ERROR Loadservices error.", "sleep 1", "make lock", "sleep 1"}));
}

TEST_F(Manager, LockThatCannotBeMadeEndsTheMainThreadBeforeAnyOther)
{
    world.lockinitresult = EAGAIN;
    EXPECT_EQ(supervise(3), lines({"sleep 1", "make lock", "ERROR Failed to init the pingreclock.",
                                   "exits with 1"}));
}

TEST_F(Manager, ThreadThatCannotBeMadeIsNotWatchedThisGeneration)
{
    world.threadsfail = true;
    EXPECT_EQ(supervise(4),
              lines({"sleep 1", "make lock", "create thread", "create thread", "sleep 1", "sleep 1",
                     kRefresh, "DEBUG before join......", "DEBUG after join......",
                     "DEBUG before join......", "DEBUG after join......", "destroy lock", "sleep 1",
                     "stopped by the test"}));
}

// Real threads, through three generations: what they share is read and written without a race.
TEST_F(Manager, RealThreadsAreStoppedJoinedAndStartedAfresh)
{
    world.recordthreads = false;
    world.threadsarereal = true;
    const std::thread::id mainthread = std::this_thread::get_id();
    std::atomic<int> pings = 0;
    world.onsystem = [&](const std::string&) {
        ++pings;
        return 0;
    };
    int ticks = 0;
    world.onsleep = [&](unsigned) {
        if (std::this_thread::get_id() != mainthread) {
            std::this_thread::yield();
            return;
        }
        // Each generation lives until its threads have pinged.
        if (++ticks % globalrefresh == 2) {
            const int before = pings;
            EXPECT_TRUE(await([&] { return pings >= before + 4; }));
        }
        if (ticks == 3 * globalrefresh + 1) {
            throw StopHere();
        }
    };
    wdmanager manager(folder.path("config.xml"), folder.path("log"));
    EXPECT_THROW(manager.wdstart(), StopHere);
    const std::string happened = world.events();
    std::size_t generations = 0;
    for (std::size_t at = happened.find(kRefresh); at != std::string::npos;
         at = happened.find(kRefresh, at + 1)) {
        ++generations;
    }
    EXPECT_EQ(generations, 3U);
}

} // namespace
