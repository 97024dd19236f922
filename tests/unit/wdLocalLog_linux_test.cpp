#include "wdLocalLog_linux.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <regex>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string_view>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <pthread.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "daemontest.h"
#include "wdsettings.h"

namespace {

constexpr std::size_t kLimitBytes = 1023999;

// A pipe that is full and that nobody reads, but for this object.
class FullPipe {
public:
    FullPipe()
    {
        if (pipe2(ends.data(), O_NONBLOCK) != 0) {
            throw std::runtime_error("no pipe");
        }
        fill();
    }

    ~FullPipe()
    {
        leave();
        close(ends[1]);
    }
    FullPipe(const FullPipe&) = delete;
    FullPipe& operator=(const FullPipe&) = delete;

    void fill()
    {
        fcntl(ends[1], F_SETFL, O_NONBLOCK);
        filling = 0;
        for (ssize_t put = 0; (put = write(ends[1], kFiller.data(), kFiller.size())) > 0;) {
            filling += static_cast<std::size_t>(put);
        }
        fcntl(ends[1], F_SETFL, 0);
    }

    // Becomes standard output or standard error.
    void become(int fd) const { dup2(ends[1], fd); }

    // From now on there is no reader at all.
    void leave()
    {
        if (ends[0] >= 0) {
            close(ends[0]);
        }
        ends[0] = -1;
    }

    // Takes out the filling, and nothing else.
    void drain() const
    {
        std::string rest(filling, '\0');
        for (ssize_t got = 0;
             !rest.empty() && (got = read(ends[0], rest.data(), rest.size())) > 0;) {
            rest.resize(rest.size() - static_cast<std::size_t>(got));
        }
    }

    // What was written besides it.
    [[nodiscard]] std::string text() const
    {
        std::array<char, 4096> block{};
        const ssize_t got = read(ends[0], block.data(), block.size());
        return got > 0 ? std::string(block.data(), static_cast<std::size_t>(got)) : "";
    }

private:
    static constexpr std::string_view kFiller = "................................";
    std::array<int, 2> ends{};
    std::size_t filling = 0;
};

// How many threads of this process wait for something.
std::size_t sleepingthreads()
{
    std::size_t count = 0;
    for (const auto& task : std::filesystem::directory_iterator("/proc/self/task")) {
        std::ifstream file(task.path() / "stat");
        std::string status;
        std::getline(file, status);
        count += status.find(") S ") != std::string::npos ? 1U : 0U;
    }
    return count;
}

class LocalLog : public DaemonTest {
protected:
    LocalLog() : DaemonTest("m") {}

    std::string log() { return folder.read("log"); }

    // 2026-11-16 03:19:16 UTC, a Monday.
    static constexpr std::time_t kMoment = 1794799156;

    void SetUp() override
    {
        DaemonTest::SetUp();
        setenv("TZ", "UTC", 1);
        tzset();
        looknew();
    }

    // Makes the next line the first of its second, for which the log looks at the surroundings.
    void looknew()
    {
        world.now = kMoment - 1;
        wdLocalLog::logFilePath = "/dev/null";
        wdLocalLog::LogMessage("other", kLevelInfo, "");
        wdLocalLog::logFilePath = folder.path("log");
        world.now = kMoment;
        takestdout();
    }

    static std::string tid() { return std::to_string(pthread_self()); }
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

TEST_F(LocalLog, TimeIsLocal)
{
    setenv("TZ", "XYZ-5", 1);
    tzset();
    wdLocalLog::LogMessage("m", kLevelInfo, "x");
    EXPECT_EQ(log().substr(0, 24), "Mon Nov 16 08:19:16 2026");
}

TEST_F(LocalLog, TimeFollowsTheClockForwardsAndBack)
{
    for (const int step : {0, 0, 1, 0, -3600}) {
        world.now = kMoment + step;
        wdLocalLog::LogMessage("m", kLevelInfo, "x");
    }
    const std::string rest = " INFO m|TID" + tid() + " x\n";
    EXPECT_EQ(log(), "Mon Nov 16 03:19:16 2026" + rest + "Mon Nov 16 03:19:16 2026" + rest +
                         "Mon Nov 16 03:19:17 2026" + rest + "Mon Nov 16 03:19:16 2026" + rest +
                         "Mon Nov 16 02:19:16 2026" + rest);
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

TEST_F(LocalLog, AllButDebugIsWrittenWithoutDebug)
{
    debugenable = false;
    for (const int level : {1, 0, 5, -2}) {
        wdLocalLog::LogMessage("m", level, "level " + std::to_string(level));
    }
    EXPECT_EQ(world.events(), lines({"ERROR level 1", "INFO level 0", " level 5", " level -2"}));
    EXPECT_EQ(takestdout(), log());
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

// Close-on-exec, or a service that is started meanwhile inherits the log; appending also when
// emptied, or the lines of two threads overwrite each other.
TEST_F(LocalLog, FileIsOpenedForAppendingAndCloseOnExec)
{
    world.recordopens = true;
    const std::string opened = "open TMP/log for writing append";
    const std::string mode = " mode " + std::to_string(0666);
    wdLocalLog::LogMessage("m", kLevelInfo, "x");
    EXPECT_EQ(world.events(), lines({opened + " cloexec" + mode, "INFO x"}));
}

TEST_F(LocalLog, EmptiedFileIsOpenedForAppendingAndCloseOnExecToo)
{
    folder.write("log", std::string(kLimitBytes, 'x') + "\n");
    debugenable = false;
    world.recordopens = true;
    wdLocalLog::LogMessage("m", kLevelDebug, "x");
    const std::string happened = world.events();
    EXPECT_TRUE(happened.ends_with(
        lines({"open TMP/log for writing append truncate cloexec mode " + std::to_string(0666)})));
}

std::ptrdiff_t opendescriptors()
{
    const std::filesystem::directory_iterator all("/proc/self/fd");
    return std::distance(begin(all), end(all));
}

TEST_F(LocalLog, NothingStaysOpenBetweenMessages)
{
    const auto before = opendescriptors();
    for (int i = 0; i < 10; ++i) {
        wdLocalLog::LogMessage("m", kLevelInfo, "x");
        folder.write("log", std::string(kLimitBytes + 1, 'x'));
        wdLocalLog::LogMessage("m", kLevelInfo, "x");
    }
    EXPECT_EQ(opendescriptors(), before);
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
    // Standard output is one file here; lines of several threads stay whole there, too.
    std::multiset<std::string> written;
    std::multiset<std::string> shown;
    std::istringstream output(takestdout());
    for (std::string line; std::getline(output, line);) {
        shown.insert(line);
    }
    const std::regex whole(R"(Mon Nov 16 03:19:16 2026 INFO m\|TID\d+ (\d+:\d+\.))");
    std::vector<std::string> messages;
    std::istringstream text(log());
    for (std::string line; std::getline(text, line);) {
        std::smatch match;
        ASSERT_TRUE(std::regex_match(line, match, whole)) << line;
        written.insert(line);
        messages.push_back(match[1]);
    }
    std::sort(messages.begin(), messages.end());
    EXPECT_EQ(std::unique(messages.begin(), messages.end()), messages.end());
    EXPECT_EQ(messages.size(), kThreads * kMessages);
    EXPECT_EQ(shown, written);
}

// Two hundred monitors log past the limit, several times over. The file may lose what an emptying
// takes, the lines before it, and nothing behind: what it holds of each thread is an unbroken run
// up to that thread's last line.
TEST_F(LocalLog, TwoHundredThreadsOverTheLimitLoseWhatAnEmptyingTakesAndNoMore)
{
    constexpr int kThreads = 200;
    constexpr int kMessages = 200;
    const std::string padding(60, '.');
    folder.write("log", std::string(kLimitBytes - 100, 'x') + "\n");
    std::atomic<bool> go = false;
    std::vector<std::thread> threads(kThreads);
    for (int t = 0; t < kThreads; ++t) {
        threads.at(static_cast<std::size_t>(t)) = std::thread([&, t] {
            go.wait(false);
            for (int i = 0; i < kMessages; ++i) {
                wdLocalLog::LogMessage("m", kLevelInfo,
                                       std::to_string(t) + ":" + std::to_string(i) + " " + padding);
            }
        });
    }
    go = true;
    go.notify_all();
    for (auto& thread : threads) {
        thread.join();
    }
    const std::regex whole(R"(Mon Nov 16 03:19:16 2026 INFO m\|TID\d+ (\d+):(\d+) \.{60})");
    std::vector<int> expected(kThreads, -1); // of each thread, the next line's number; -1: any
    std::istringstream text(log());
    int count = 0;
    for (std::string line; std::getline(text, line); ++count) {
        std::smatch match;
        ASSERT_TRUE(std::regex_match(line, match, whole)) << line;
        int& next = expected.at(std::stoul(match[1]));
        const int number = std::stoi(match[2]);
        ASSERT_TRUE(next == -1 || next == number) << line << ", expected was number " << next;
        next = number + 1;
    }
    for (const int next : expected) {
        EXPECT_TRUE(next == -1 || next == kMessages) << "a thread's lines end with " << next - 1;
    }
    EXPECT_GT(count, 0);
    EXPECT_LT(count, kThreads * kMessages); // it was emptied
}

class StandardOutput : public LocalLog {
protected:
    void SetUp() override
    {
        LocalLog::SetUp();
        writestandard(STDOUT_FILENO, "\n"); // it is read, whatever an earlier test has left
    }
};

TEST_F(StandardOutput, UnreadPipeIsWaitedForOnceAndThenLeftOut)
{
    FullPipe output;
    output.become(STDOUT_FILENO);
    world.recordpolls = true;
    world.readerneverreads = true;
    wdLocalLog::LogMessage("m", kLevelInfo, "one");
    wdLocalLog::LogMessage("m", kLevelInfo, "two");
    const std::string events = world.events();
    output.drain();
    std::vector<std::string> expected(10, "wait 500 ms");
    expected.insert(expected.end(), {"INFO one", "INFO two"});
    EXPECT_EQ(events, lines(expected));
    EXPECT_EQ(output.text(), "");
}

TEST_F(StandardOutput, FileThatBecomesAnUnreadPipeIsSeenWithinASecond)
{
    wdLocalLog::LogMessage("m", kLevelInfo, "to a file");
    FullPipe output;
    output.become(STDOUT_FILENO);
    world.recordpolls = true;
    world.readerneverreads = true;
    ++world.now;
    wdLocalLog::LogMessage("m", kLevelInfo, "to a pipe");
    std::vector<std::string> expected(10, "wait 500 ms");
    expected.insert(expected.begin(), "INFO to a file");
    expected.emplace_back("INFO to a pipe");
    EXPECT_EQ(world.events(), lines(expected));
}

TEST_F(StandardOutput, GoesOnWhenThePipeIsReadAgain)
{
    FullPipe output;
    output.become(STDOUT_FILENO);
    world.readerneverreads = true;
    wdLocalLog::LogMessage("m", kLevelInfo, "one");
    output.drain();
    wdLocalLog::LogMessage("m", kLevelInfo, "two");
    const std::string text = output.text();
    output.fill();
    world.recordpolls = true;
    wdLocalLog::LogMessage("m", kLevelInfo, "three"); // patience has come back
    output.drain();
    EXPECT_EQ(text, "Mon Nov 16 03:19:16 2026 INFO m|TID" + tid() + " two\n");
    EXPECT_NE(world.events().find("wait 500 ms\n"), std::string::npos);
}

TEST_F(StandardOutput, SlowReaderGetsEverything)
{
    FullPipe output;
    output.become(STDOUT_FILENO);
    std::thread logging([] { wdLocalLog::LogMessage("m", kLevelInfo, "patient"); });
    const bool waits = await([] { return sleepingthreads() >= 1; });
    output.drain(); // before anything is said of it here
    logging.join();
    EXPECT_TRUE(waits);
    EXPECT_NE(output.text().find("patient\n"), std::string::npos);
}

// What is in a pipe's way comes in pieces that it has room for, or a long line would wait in
// write() itself.
TEST_F(StandardOutput, LongLineDoesNotBlockInAPipeWithLittleRoom)
{
    FullPipe output;
    output.become(STDOUT_FILENO);
    output.drain();
    world.readerneverreads = true;
    const std::string message(200'000, '.'); // more than any pipe takes by default
    wdLocalLog::LogMessage("m", kLevelInfo, message);
    EXPECT_NE(log().find(" " + message + "\n"), std::string::npos);
}

TEST_F(StandardOutput, PipeWithoutReaderDoesNotEndTheProcess)
{
    FullPipe output;
    output.become(STDOUT_FILENO);
    output.leave();
    wdLocalLog::LogMessage("m", kLevelInfo, "heard by nobody");
    EXPECT_NE(log().find("heard by nobody\n"), std::string::npos);
    sigset_t signals;
    sigpending(&signals);
    EXPECT_EQ(sigismember(&signals, SIGPIPE), 0);
    pthread_sigmask(SIG_SETMASK, nullptr, &signals);
    EXPECT_EQ(sigismember(&signals, SIGPIPE), 0);
    struct sigaction action {};
    sigaction(SIGPIPE, nullptr, &action);
    EXPECT_EQ(action.sa_handler, SIG_DFL);
}

// Such a pipe cannot be opened anew.
TEST_F(StandardOutput, NamedPipeWithoutReaderIsReplacedByNull)
{
    const std::string name = folder.path("pipe");
    ASSERT_EQ(mkfifo(name.c_str(), 0600), 0);
    const int reader = open(name.c_str(), O_RDONLY | O_NONBLOCK);
    const int writer = open(name.c_str(), O_WRONLY);
    dup2(writer, STDOUT_FILENO);
    close(writer);
    close(reader);
    wdLocalLog::LogMessage("m", kLevelInfo, "heard by nobody");
    EXPECT_EQ(std::filesystem::read_symlink("/proc/self/fd/1"), "/dev/null");
}

// Services inherit it: init scripts that print would be killed before they have started anything.
TEST_F(StandardOutput, PipeWithoutReaderIsReplacedByNull)
{
    FullPipe output;
    output.become(STDOUT_FILENO);
    output.leave();
    wdLocalLog::LogMessage("m", kLevelInfo, "heard by nobody");
    EXPECT_EQ(std::filesystem::read_symlink("/proc/self/fd/1"), "/dev/null");
    EXPECT_EQ(fcntl(STDOUT_FILENO, F_GETFD), 0);
    const int status = runforreal("echo starting && exit 7");
    EXPECT_EQ(status, exited(7));
}

TEST_F(StandardOutput, StandardErrorOnTheSamePipeIsReplacedWithIt)
{
    FullPipe output;
    const int before = dup(STDERR_FILENO);
    output.become(STDOUT_FILENO);
    output.become(STDERR_FILENO);
    output.leave();
    wdLocalLog::LogMessage("m", kLevelInfo, "heard by nobody");
    const auto errors = std::filesystem::read_symlink("/proc/self/fd/2");
    dup2(before, STDERR_FILENO);
    close(before);
    EXPECT_EQ(errors, "/dev/null");
}

// Of a terminal only the first byte of a line is sure to have room.
TEST_F(StandardOutput, TerminalThatNobodyReadsHoldsNobodyUp)
{
    const int master = posix_openpt(O_RDWR | O_NOCTTY);
    ASSERT_EQ(grantpt(master), 0);
    ASSERT_EQ(unlockpt(master), 0);
    const int terminal = open(ptsname(master), O_RDWR | O_NOCTTY);
    ASSERT_GE(terminal, 0);
    const int before = dup(STDOUT_FILENO);
    dup2(terminal, STDOUT_FILENO);
    world.readerneverreads = true;
    constexpr int kMessages = 2000;
    for (int i = 0; i < kMessages; ++i) {
        wdLocalLog::LogMessage("m", kLevelInfo, "text");
    }
    dup2(before, STDOUT_FILENO);
    for (const int fd : {before, terminal, master}) {
        close(fd);
    }
    const std::string text = log();
    EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), kMessages);
}

TEST_F(StandardOutput, SocketThatNobodyReadsHoldsNobodyUpAndIsReplacedWhenItsReaderGoes)
{
    std::array<int, 2> ends{};
    ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM, 0, ends.data()), 0);
    dup2(ends[1], STDOUT_FILENO);
    close(ends[1]);
    world.readerneverreads = true;
    const std::string message(100'000, '.');
    for (int i = 0; i < 5; ++i) {
        wdLocalLog::LogMessage("m", kLevelInfo, message);
    }
    close(ends[0]);
    wdLocalLog::LogMessage("m", kLevelInfo, "heard by nobody");
    EXPECT_EQ(std::filesystem::read_symlink("/proc/self/fd/1"), "/dev/null");
    EXPECT_NE(log().find("heard by nobody\n"), std::string::npos);
}

using LogThatIsAPipe = LocalLog;

TEST_F(LogThatIsAPipe, HoldsNobodyUpWhenItIsNotRead)
{
    ASSERT_EQ(mkfifo(folder.path("pipe").c_str(), 0600), 0);
    const int reader = open(folder.path("pipe").c_str(), O_RDONLY | O_NONBLOCK);
    wdLocalLog::logFilePath = folder.path("pipe");
    world.readerneverreads = true;
    const std::string message(100'000, '.');
    wdLocalLog::LogMessage("m", kLevelInfo, message);
    wdLocalLog::LogMessage("m", kLevelInfo, message);
    wdLocalLog::logFilePath = folder.path("log");
    close(reader);
    EXPECT_NE(takestdout().find(message + "\n"), std::string::npos);
}

TEST_F(LogThatIsAPipe, IsWaitedForOnceThoughStandardOutputIsAFile)
{
    ASSERT_EQ(mkfifo(folder.path("pipe").c_str(), 0600), 0);
    const int reader = open(folder.path("pipe").c_str(), O_RDONLY | O_NONBLOCK);
    const std::string message(100'000, '.');
    wdLocalLog::logFilePath = folder.path("pipe");
    world.recordpolls = true;
    world.readerneverreads = true;
    wdLocalLog::LogMessage("m", kLevelInfo, message);
    wdLocalLog::LogMessage("m", kLevelInfo, message);
    wdLocalLog::logFilePath = folder.path("log");
    close(reader);
    EXPECT_EQ(world.events(), lines(std::vector<std::string>(10, "wait 500 ms")));
}

class LogOfAFreshProcess : public DaemonTest {
protected:
    LogOfAFreshProcess() : DaemonTest("m") {}
};

TEST_F(LogOfAFreshProcess, IsWaitedForByTheVeryFirstLine)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(
        {
            const std::string pipe = folder.path("pipe");
            mkfifo(pipe.c_str(), 0600);
            const int reader = open(pipe.c_str(), O_RDONLY | O_NONBLOCK);
            const int filler = open(pipe.c_str(), O_WRONLY | O_NONBLOCK);
            while (write(filler, "x", 1) > 0) {
            }
            wdLocalLog::logFilePath = pipe;
            world.recordpolls = true;
            world.readerneverreads = true;
            wdLocalLog::LogMessage("m", kLevelInfo, "x");
            wdLocalLog::logFilePath = folder.path("log");
            close(reader);
            const bool waited =
                world.events() == lines(std::vector<std::string>(10, "wait 500 ms"));
            std::filesystem::remove_all(folder.path());
            _exit(waited ? 7 : 8);
        },
        ::testing::ExitedWithCode(7), "");
}

using LocalLogDeath = LocalLog;

TEST_F(LocalLogDeath, PipeWithoutReaderCannotBeOpened)
{
    ASSERT_EQ(mkfifo(folder.path("pipe").c_str(), 0600), 0);
    wdLocalLog::logFilePath = folder.path("pipe");
    EXPECT_EXIT(wdLocalLog::LogMessage("m", kLevelInfo, "x"), ::testing::ExitedWithCode(200),
                "^Unable to open the log file\n$");
}

TEST_F(LocalLogDeath, FileAtItsSizeLimitDoesNotEndTheProcess)
{
    const rlimit onebyte{1, 1};
    EXPECT_EXIT(
        {
            setrlimit(RLIMIT_FSIZE, &onebyte);
            wdLocalLog::LogMessage("m", kLevelInfo, "x");
            wdLocalLog::LogMessage("m", kLevelInfo, "x");
            _exit(7);
        },
        ::testing::ExitedWithCode(7), "");
}

TEST_F(LocalLogDeath, SizeLimitSetMeanwhileDoesNotEndTheProcess)
{
    const rlimit onebyte{1, 1};
    EXPECT_EXIT(
        {
            wdLocalLog::LogMessage("m", kLevelInfo, "x");
            setrlimit(RLIMIT_FSIZE, &onebyte);
            wdLocalLog::LogMessage("m", kLevelInfo, "x");
            _exit(7);
        },
        ::testing::ExitedWithCode(7), "");
}

TEST_F(LocalLogDeath, StandardErrorAtItsSizeLimitDoesNotEndTheProcess)
{
    const rlimit onebyte{1, 1};
    EXPECT_EXIT(
        {
            const int errors = open(folder.path("errors").c_str(), O_WRONLY | O_CREAT, 0600);
            dup2(errors, STDERR_FILENO);
            setrlimit(RLIMIT_FSIZE, &onebyte);
            writestandard(STDERR_FILENO, "xx");
            _exit(7);
        },
        ::testing::ExitedWithCode(7), "");
}

// They are not told of the daemon's arrangements.
TEST_F(LocalLog, ServicesEndAtTheirSizeLimitAsEver)
{
    wdLocalLog::LogMessage("m", kLevelInfo, "x");
    const int status = runforreal("kill -XFSZ $$");
    EXPECT_TRUE(WIFSIGNALED(status));
    EXPECT_EQ(WTERMSIG(status), SIGXFSZ);
}

// In a process of its own, for what is caught is caught with the first line that one writes.
TEST(SizeLimit, IgnoredByWhoeverStartedTheDaemonStaysIgnored)
{
    ::testing::FLAGS_gtest_death_test_style = "threadsafe";
    EXPECT_EXIT(
        {
            (void)std::signal(SIGXFSZ, SIG_IGN);
            writestandard(STDERR_FILENO, "x");
            struct sigaction action {};
            sigaction(SIGXFSZ, nullptr, &action);
            std::_Exit(action.sa_handler == SIG_IGN ? 7 : 8);
        },
        ::testing::ExitedWithCode(7), "");
}

TEST_F(LocalLogDeath, FullStandardErrorDoesNotKeepTheProcessFromEnding)
{
    FullPipe errors;
    EXPECT_EXIT(
        {
            errors.become(STDERR_FILENO);
            world.readerneverreads = true;
            wdLocalLog::logFilePath = folder.path("missing/log");
            wdLocalLog::LogMessage("m", kLevelInfo, "x");
        },
        ::testing::ExitedWithCode(200), "");
}

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

// exit() would destroy the lists and settings that the other threads use.
TEST_F(LocalLogDeath, NoExitHandlerRuns)
{
    wdLocalLog::logFilePath = folder.path("missing/log");
    EXPECT_EXIT(
        {
            std::atexit([] { (void)!write(STDERR_FILENO, "an exit handler ran\n", 20); });
            wdLocalLog::LogMessage("m", kLevelInfo, "x");
        },
        ::testing::ExitedWithCode(200), "^Unable to open the log file\n$");
}

TEST_F(LocalLogDeath, OnlyTheFirstThreadSpeaks)
{
    EXPECT_EXIT(
        {
            constexpr std::size_t kThreads = 20;
            // The process ends only when all others wait for that, the one that joins them
            // included, or when a second thread has spoken.
            std::atomic<int> ending = 0;
            world.onexit = [&ending] {
                ++ending;
                await([&] { return ending > 1 || sleepingthreads() >= kThreads; });
            };
            wdLocalLog::logFilePath = folder.path("missing/log");
            std::vector<std::thread> threads(kThreads);
            for (auto& thread : threads) {
                thread = std::thread([] { wdLocalLog::LogMessage("m", kLevelInfo, "x"); });
            }
            threads.front().join();
        },
        ::testing::ExitedWithCode(200), "^Unable to open the log file\n$");
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
