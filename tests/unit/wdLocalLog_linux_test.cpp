#include "wdLocalLog_linux.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <regex>
#include <sstream>
#include <thread>
#include <vector>

#include <pthread.h>

#include "daemontest.h"
#include "wdsettings.h"

namespace {

constexpr std::size_t kLimitBytes = 1023999;

class LocalLog : public DaemonTest {
protected:
    LocalLog() : DaemonTest("m") {}

    std::string log()
    {
        return folder.read("log");
    }

    // 2026-11-16 03:19:16 UTC, a Monday.
    static constexpr std::time_t kMoment = 1794799156;

    void SetUp() override
    {
        DaemonTest::SetUp();
        setenv("TZ", "UTC", 1); // NOLINT(concurrency-mt-unsafe): one thread here
        tzset();
        world.now = kMoment;
    }

    static std::string tid()
    {
        return std::to_string(pthread_self());
    }
};

TEST_F(LocalLog, LineHasTimeLevelModuleThreadAndMessage)
{
    wdLocalLog::LogMessage("wdmanager", kLevelDebug, "before join......");
    EXPECT_EQ(log(),
              "Mon Nov 16 03:19:16 2026 DEBUG wdmanager|TID" + tid() + " before join......\n");
}

TEST_F(LocalLog, StandardOutputGetsTheSameLine)
{
    wdLocalLog::LogMessage("m", kLevelInfo, "text");
    EXPECT_EQ(takestdout(), log());
}

TEST_F(LocalLog, LevelsHaveTheirWords)
{
    wdLocalLog::LogMessage("m", 1, "a");
    wdLocalLog::LogMessage("m", 0, "b");
    wdLocalLog::LogMessage("m", -1, "c");
    const std::string start = "Mon Nov 16 03:19:16 2026 ";
    const std::string end = " m|TID" + tid() + " ";
    EXPECT_EQ(log(), start + "ERROR" + end + "a\n" + start + "INFO" + end + "b\n" + start +
                         "DEBUG" + end + "c\n");
}

TEST_F(LocalLog, OtherLevelLeavesTwoBlanks)
{
    wdLocalLog::LogMessage("m", 5, "odd");
    EXPECT_EQ(log(), "Mon Nov 16 03:19:16 2026  m|TID" + tid() + " odd\n");
}

TEST_F(LocalLog, DayOfMonthIsPaddedAsAsctimeDoes)
{
    world.now = kMoment - 15 * 86400L;
    wdLocalLog::LogMessage("m", kLevelInfo, "x");
    EXPECT_EQ(log().substr(0, 24), "Sun Nov  1 03:19:16 2026");
}

TEST_F(LocalLog, ModuleIsWrittenAsPassed)
{
    wdLocalLog::LogMessage("module ", kLevelInfo, "x");
    EXPECT_NE(log().find("INFO module |TID"), std::string::npos);
}

TEST_F(LocalLog, DebugIsDroppedUnlessEnabled)
{
    debugenable = false;
    wdLocalLog::LogMessage("m", kLevelDebug, "x");
    EXPECT_EQ(log(), "");
    EXPECT_EQ(takestdout(), "");
}

TEST_F(LocalLog, DroppedDebugStillCreatesTheFile)
{
    debugenable = false;
    wdLocalLog::LogMessage("m", kLevelDebug, "x");
    EXPECT_TRUE(std::filesystem::exists(wdLocalLog::logFilePath));
}

TEST_F(LocalLog, NewlinesInAMessageStay)
{
    wdLocalLog::LogMessage("m", kLevelInfo, "one\ntwo");
    EXPECT_NE(log().find(" one\ntwo\n"), std::string::npos);
}

TEST_F(LocalLog, EmptyMessageIsALine)
{
    wdLocalLog::LogMessage("m", kLevelInfo, "");
    EXPECT_EQ(log(), "Mon Nov 16 03:19:16 2026 INFO m|TID" + tid() + " \n");
}

TEST_F(LocalLog, FileAtItsLimitIsAppendedTo)
{
    folder.write("log", std::string(kLimitBytes, 'x'));
    wdLocalLog::LogMessage("m", kLevelInfo, "new");
    EXPECT_GT(log().size(), kLimitBytes);
    EXPECT_EQ(log().substr(0, kLimitBytes), std::string(kLimitBytes, 'x'));
}

TEST_F(LocalLog, FileOverItsLimitIsEmptiedFirst)
{
    folder.write("log", std::string(kLimitBytes + 1, 'x'));
    wdLocalLog::LogMessage("m", kLevelInfo, "new");
    EXPECT_EQ(log(), "Mon Nov 16 03:19:16 2026 INFO m|TID" + tid() + " new\n");
}

TEST_F(LocalLog, DroppedDebugStillEmptiesAFileOverItsLimit)
{
    debugenable = false;
    folder.write("log", std::string(kLimitBytes + 1, 'x'));
    wdLocalLog::LogMessage("m", kLevelDebug, "x");
    EXPECT_EQ(log(), "");
}

TEST_F(LocalLog, ConstructingAnotherLogRedirectsTheNextMessage)
{
    const wdLocalLog other(folder.path("other"));
    wdLocalLog::LogMessage("m", kLevelInfo, "there");
    EXPECT_NE(folder.read("other").find("there"), std::string::npos);
    EXPECT_FALSE(std::filesystem::exists(folder.path("log")));
}

TEST_F(LocalLog, RemovedFileIsMadeAgain)
{
    wdLocalLog::LogMessage("m", kLevelInfo, "one");
    std::filesystem::remove(folder.path("log"));
    wdLocalLog::LogMessage("m", kLevelInfo, "two");
    EXPECT_EQ(log().find("one"), std::string::npos);
    EXPECT_NE(log().find("two"), std::string::npos);
}

TEST_F(LocalLog, NoThreadsLineIsTornOrLost)
{
    constexpr int kThreads = 8;
    constexpr int kMessages = 100;
    std::vector<std::thread> threads;
    threads.reserve(kThreads);
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([t] {
            for (int i = 0; i < kMessages; ++i) {
                wdLocalLog::LogMessage("m", kLevelInfo,
                                       std::to_string(t) + ":" + std::to_string(i) + ".");
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    const std::regex whole(R"(Mon Nov 16 03:19:16 2026 INFO m\|TID\d+ (\d+:\d+\.))");
    std::vector<std::string> messages;
    std::istringstream text(log());
    for (std::string line; std::getline(text, line);) {
        std::smatch match;
        ASSERT_TRUE(std::regex_match(line, match, whole)) << line;
        messages.push_back(match[1]);
    }
    std::sort(messages.begin(), messages.end());
    EXPECT_EQ(std::unique(messages.begin(), messages.end()), messages.end());
    EXPECT_EQ(messages.size(), kThreads * kMessages);
}

using LocalLogDeath = LocalLog;

TEST_F(LocalLogDeath, UnwritablePathEndsTheProcessWith200)
{
    wdLocalLog::logFilePath = folder.path("missing/log");
    EXPECT_EXIT(wdLocalLog::LogMessage("m", kLevelInfo, "x"), ::testing::ExitedWithCode(200),
                "^Unable to open the log file\n$");
}

TEST_F(LocalLogDeath, EmptyPathEndsTheProcessWith200)
{
    wdLocalLog::logFilePath.clear();
    EXPECT_EXIT(wdLocalLog::LogMessage("m", kLevelInfo, "x"), ::testing::ExitedWithCode(200),
                "^Unable to open the log file\n$");
}

TEST_F(LocalLogDeath, DroppedDebugNeedsTheFileTooAndEndsTheProcess)
{
    debugenable = false;
    wdLocalLog::logFilePath = folder.path("missing/log");
    EXPECT_EXIT(wdLocalLog::LogMessage("m", kLevelDebug, "x"), ::testing::ExitedWithCode(200),
                "^Unable to open the log file\n$");
}

TEST_F(LocalLogDeath, ManyThreadsSpeakOnceAndEndWith200)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(
        {
            wdLocalLog::logFilePath = folder.path("missing/log");
            std::vector<std::thread> threads(20);
            for (auto& thread : threads) {
                thread = std::thread([] { wdLocalLog::LogMessage("m", kLevelInfo, "x"); });
            }
            for (auto& thread : threads) {
                thread.join();
            }
        },
        ::testing::ExitedWithCode(200), "^Unable to open the log file\n$");
}

} // namespace
