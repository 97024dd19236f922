#include "ProcessStatistics_Linux.h"

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <sstream>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "daemontest.h"

namespace {

class UtilityTest : public DaemonTest {
protected:
    UtilityTest() : DaemonTest("ProcessStatistics") {}

    void commandprints(Output output)
    {
        world.onpopen = [output](const std::string&) {
            return output;
        };
    }
};

TEST_F(UtilityTest, ExecOfACommandThatPrintsNothingEmptiesTheOutput)
{
    commandprints({});
    std::string output = "old";
    EXPECT_EQ(Utility::exec("true", output), 0);
    EXPECT_EQ(output, "");
}

TEST_F(UtilityTest, ExecThatCannotStartLeavesTheOutput)
{
    world.onpopen = [](const std::string&) {
        return std::nullopt;
    };
    std::string output = "old";
    EXPECT_EQ(Utility::exec("true", output), 1);
    EXPECT_EQ(output, "old");
}

TEST_F(UtilityTest, ExecCollectsALineLongerThanItsBuffer)
{
    const std::string line = std::string(300, 'x') + "\n";
    commandprints({line});
    std::string output;
    EXPECT_EQ(Utility::exec("long", output), 0);
    EXPECT_EQ(output, line);
}

TEST_F(UtilityTest, ExecKeepsAllLinesAndTheirNewlines)
{
    commandprints({std::string("one\ntw"), std::string("o\n"), std::string("three")});
    std::string output;
    Utility::exec("lines", output);
    EXPECT_EQ(output, "one\ntwo\nthree");
}

TEST_F(UtilityTest, ExecClosesThePipeAndOpensItCloseOnExec)
{
    std::string output;
    Utility::exec("something", output);
    EXPECT_EQ(world.events(), lines({"popen re something", "pclose"}));
}

TEST_F(UtilityTest, ExecKeepsOfEachLineWhatStandsBeforeANulByte)
{
    using namespace std::string_literals;
    commandprints({"a\0b\nc\n"s});
    std::string output;
    Utility::exec("binary", output);
    EXPECT_EQ(output, "ac\n");
}

TEST_F(UtilityTest, ExecTakesLongLinesInPiecesOf127Characters)
{
    using namespace std::string_literals;
    commandprints({"ab\0"s + std::string(124, 'x') + "cd\n"});
    std::string output;
    Utility::exec("binary", output);
    EXPECT_EQ(output, "abcd\n");
}

TEST_F(UtilityTest, FilesAreOpenedCloseOnExec)
{
    folder.write("file", "text");
    const auto file = Utility::OpenToRead(folder.path("file"));
    ASSERT_NE(file, nullptr);
    EXPECT_NE(fcntl(fileno(file.get()), F_GETFD) & FD_CLOEXEC, 0);
    EXPECT_EQ(Utility::OpenToRead(folder.path("missing")), nullptr);
}

TEST_F(UtilityTest, ExecReadsOnAfterAnInterruption)
{
    commandprints({std::string("one\ntw"), EINTR, std::string("o\n"), EINTR});
    std::string output;
    EXPECT_EQ(Utility::exec("interrupted", output), 0);
    EXPECT_EQ(output, "one\ntwo\n");
}

TEST_F(UtilityTest, ExecStopsAtAReadError)
{
    commandprints({std::string("one\ntw"), EIO, std::string("o\n")});
    std::string output;
    EXPECT_EQ(Utility::exec("broken", output), 0);
    EXPECT_EQ(output, "one\ntw");
    EXPECT_EQ(world.events(), lines({"popen re broken", "pclose"}));
}

TEST_F(UtilityTest, PidofReturnsTheTextAsItStands)
{
    commandprints({std::string("12 7\n")});
    EXPECT_EQ(Utility::pidof("web"), "12 7\n");
    EXPECT_EQ(world.events(), lines({"popen re pidof web", "pclose"}));
}

TEST_F(UtilityTest, PidofOfAPathFallsBackToItsLastComponent)
{
    world.onpopen = [](const std::string& command) {
        return command == "pidof `basename /usr/sbin/web`" ? Output{std::string("31\n")} : Output{};
    };
    EXPECT_EQ(Utility::pidof("/usr/sbin/web"), "31\n");
    EXPECT_EQ(world.events(), lines({"popen re pidof /usr/sbin/web", "pclose",
                                     "popen re pidof `basename /usr/sbin/web`", "pclose"}));
}

TEST_F(UtilityTest, PidofOfAProgramThatIsNotRunningIsEmptyAndReadsAsZero)
{
    EXPECT_EQ(Utility::pidof("gone"), "");
    EXPECT_EQ(Utility::str2int(Utility::pidof("gone")), 0);
}

TEST_F(UtilityTest, Str2intReadsTheNumberAtTheStart)
{
    EXPECT_EQ(Utility::str2int("  -17abc"), -17);
    EXPECT_EQ(Utility::str2int("12 7\n"), 12);
    EXPECT_EQ(Utility::str2int("+5"), 5);
    EXPECT_EQ(Utility::str2int("60s"), 60);
    EXPECT_EQ(Utility::str2int("010"), 10);
    EXPECT_EQ(Utility::str2int("0x10"), 0);
}

TEST_F(UtilityTest, Str2intOfNoNumberIsZero)
{
    EXPECT_EQ(Utility::str2int(""), 0);
    EXPECT_EQ(Utility::str2int("abc"), 0);
    EXPECT_EQ(Utility::str2int("-"), 0);
}

TEST_F(UtilityTest, Str2intOfANumberBeyondIntIsTheNearest)
{
    EXPECT_EQ(Utility::str2int("99999999999"), 2147483647);
    EXPECT_EQ(Utility::str2int("-99999999999"), -2147483647 - 1);
}

// With a real shell behind popen.
class UtilityWithShell : public UtilityTest {
protected:
    void SetUp() override
    {
        UtilityTest::SetUp();
        world.realpopen = true;
    }

    static std::string outputof(const std::string& command)
    {
        std::string output = "old";
        EXPECT_EQ(Utility::exec(command, output), 0);
        return output;
    }
};

TEST_F(UtilityWithShell, OnlyStandardOutputIsCollected)
{
    EXPECT_EQ(outputof("echo out; exec 2>/dev/null; echo err >&2; exit 3"), "out\n");
    EXPECT_EQ(outputof("true"), "");
    EXPECT_EQ(outputof("/no/such/program 2>/dev/null"), "");
    EXPECT_EQ(outputof("/no/such/program 2>&1").find("old"), std::string::npos);
}

TEST_F(UtilityWithShell, LongLinesAreCollectedWhole)
{
    EXPECT_EQ(outputof("printf '%0300d\\n' 7"), std::string(299, '0') + "7\n");
}

// A process of the test's own, running a program of this path.
class Probe {
public:
    explicit Probe(const std::string& path) : id(fork())
    {
        if (id == 0) {
            execl(path.c_str(), path.c_str(), "300", nullptr);
            _exit(127);
        }
    }
    ~Probe()
    {
        kill(id, SIGKILL);
        waitpid(id, nullptr, 0);
    }
    Probe(const Probe&) = delete;
    Probe& operator=(const Probe&) = delete;

    [[nodiscard]] std::string text() const { return std::to_string(id) + "\n"; }

private:
    pid_t id;
};

TEST_F(UtilityWithShell, PidofFindsAProgramByItsPathAndElseByItsName)
{
    const std::string name = "tolk" + std::to_string(getpid()); // 15 characters at the most
    std::filesystem::copy_file("/bin/sleep", folder.path(name));
    EXPECT_EQ(Utility::pidof(folder.path(name)), "");
    {
        const Probe probe(folder.path(name));
        // Until it has become that program.
        EXPECT_TRUE(await([&] { return !Utility::pidof(folder.path(name)).empty(); }));
        EXPECT_EQ(Utility::pidof(folder.path(name)), probe.text());
        EXPECT_EQ(Utility::pidof(name), probe.text());
        EXPECT_EQ(Utility::pidof("/no/such/folder/" + name), probe.text());
    }
    EXPECT_EQ(Utility::pidof(name), "");
}

using Pieces = std::vector<std::string>;

TEST_F(UtilityTest, Split2KeepsEmptyPiecesBetweenSeparators)
{
    Pieces pieces;
    EXPECT_EQ(&Utility::split2("a  b", ' ', pieces), &pieces);
    EXPECT_EQ(pieces, (Pieces{"a", "", "b"}));
}

TEST_F(UtilityTest, Split2GivesNothingBehindALastSeparatorAndOneBeforeAFirst)
{
    Pieces pieces;
    Utility::split2("a b ", ' ', pieces);
    EXPECT_EQ(pieces, (Pieces{"a", "b"}));
    EXPECT_EQ(Utility::split(" a", ' '), (Pieces{"", "a"}));
}

TEST_F(UtilityTest, Split2AppendsToWhatIsThere)
{
    Pieces pieces{"old"};
    Utility::split2("", ' ', pieces);
    EXPECT_EQ(pieces, (Pieces{"old"}));
    Utility::split2("new", ' ', pieces);
    EXPECT_EQ(pieces, (Pieces{"old", "new"}));
}

TEST_F(UtilityTest, SplitKeepsATrailingNewline)
{
    EXPECT_EQ(Utility::split("x,y\n", ','), (Pieces{"x", "y\n"}));
}

// A stat file with these figures in its 14th, 20th and 24th field.
std::string stat(const std::string& userticks, const std::string& threads, const std::string& pages,
                 const std::string& program = "(web)")
{
    return "42 " + program + " S 1 42 42 0 -1 4194560 1 2 3 4 " + userticks + " 777 15 16 20 0 " +
           threads + " 21 22 23 " + pages + " 25 26\n";
}

class Statistics : public DaemonTest {
protected:
    Statistics() : DaemonTest("ProcessStatistics") {}

    void SetUp() override
    {
        DaemonTest::SetUp();
        processis(42);
        stats.SetName("web");
        stats.SetThresholdAverageCPUUsage("900");
        stats.SetThresholdThreadCount("50");
        stats.SetThresholdMemoryUsage("900");
    }

    void processis(int pid)
    {
        world.onpopen = [pid](const std::string&) {
            return pid == 0 ? Output{} : Output{std::to_string(pid) + "\n"};
        };
    }

    void statis(const std::string& content) { world.files["/proc/42/stat"] = content; }

    // The log of one check, and its result.
    std::string check()
    {
        const std::size_t before = world.events().size();
        const bool reached = stats.IsThresholdReached();
        const std::string all = world.events().substr(before);
        std::string log;
        std::istringstream text(all);
        for (std::string line; std::getline(text, line);) {
            if (!line.starts_with("popen") && !line.starts_with("pclose")) {
                log += line + "\n";
            }
        }
        EXPECT_EQ(reached, log.find(") Threshold is reached") != std::string::npos);
        return log;
    }

    static std::string figures(int cpu, int threads, int pages, bool reached)
    {
        return lines({
            "DEBUG (web) averageCPUUsage/Threshold:" + std::to_string(cpu) + "/900",
            "DEBUG (web) numberOfThreads/Threshold:" + std::to_string(threads) + "/50",
            "DEBUG (web) memoryUsage/Threshold:" + std::to_string(pages) + "/900",
            reached ? "DEBUG (web) Threshold is reached" : "DEBUG (web) Threshold is not reached",
        });
    }

    // The CPU figure after `ticks` more user ticks in `seconds`.
    std::string cpuafter(long ticks, long seconds)
    {
        statis(stat("0", "1", "1"));
        check();
        statis(stat(std::to_string(ticks), "1", "1"));
        world.now += seconds;
        const std::string log = check();
        const std::string label = "averageCPUUsage/Threshold:";
        const std::size_t start = log.find(label) + label.size();
        return log.substr(start, log.find('/', start) - start);
    }

    const std::string changed = "DEBUG (web) PID changed (old = -1, new = 42)\n";
    ProcessStatistics stats;
};

TEST_F(Statistics, ThresholdsAreReadFromText)
{
    EXPECT_EQ(stats.GetThresholdAverageCPUUsage(), 900);
    EXPECT_EQ(stats.GetThresholdThreadCount(), 50);
    EXPECT_EQ(stats.GetThresholdMemoryUsage(), 900);
    stats.SetThresholdMemoryUsage("many");
    EXPECT_EQ(stats.GetThresholdMemoryUsage(), 0);
    stats.SetThresholdMemoryUsage("");
    EXPECT_EQ(stats.GetThresholdMemoryUsage(), 0);
}

TEST_F(Statistics, FirstCheckTakesABaselineAndIsNotReached)
{
    statis(stat("5000", "3", "800"));
    EXPECT_EQ(check(), changed + figures(0, 3, 800, false));
}

TEST_F(Statistics, FigureAtItsThresholdIsNotReached)
{
    statis(stat("0", "50", "900"));
    EXPECT_EQ(check(), changed + figures(0, 50, 900, false));
}

TEST_F(Statistics, MoreThreadsThanAllowedReachTheThreshold)
{
    statis(stat("0", "51", "1"));
    EXPECT_EQ(check(), changed + figures(0, 51, 1, true));
}

TEST_F(Statistics, MorePagesThanAllowedReachTheThreshold)
{
    statis(stat("0", "1", "901"));
    EXPECT_EQ(check(), changed + figures(0, 1, 901, true));
}

TEST_F(Statistics, CpuFigureIsTicksPerSecondTimesThousand)
{
    EXPECT_EQ(cpuafter(25, 50), "500");
}

TEST_F(Statistics, CpuFigureIsTruncated)
{
    EXPECT_EQ(cpuafter(7, 3), "2333");
}

TEST_F(Statistics, CpuFigureAboveItsThresholdReachesIt)
{
    statis(stat("0", "1", "1"));
    check();
    statis(stat("10", "1", "1"));
    world.now += 10;
    EXPECT_EQ(check(), figures(1000, 1, 1, true));
}

TEST_F(Statistics, CpuFigureIsTakenBetweenTheLastTwoChecksOnly)
{
    cpuafter(100, 10);
    statis(stat("101", "1", "1"));
    world.now += 10;
    EXPECT_EQ(check(), figures(100, 1, 1, false));
}

TEST_F(Statistics, ClockSteppedBackGivesANegativeFigure)
{
    EXPECT_EQ(cpuafter(10, -5), "-2000");
}

TEST_F(Statistics, NegativeFigureIsBelowItsThreshold)
{
    cpuafter(10, -5);
    world.now += 10;
    statis(stat("0", "1", "1"));
    EXPECT_EQ(check(), figures(-1000, 1, 1, false));
}

TEST_F(Statistics, NegativeThresholdIsReachedByZero)
{
    statis(stat("0", "0", "0"));
    EXPECT_FALSE(stats.IsThresholdReached());
    for (const auto setter : {&ProcessStatistics::SetThresholdAverageCPUUsage,
                              &ProcessStatistics::SetThresholdThreadCount,
                              &ProcessStatistics::SetThresholdMemoryUsage}) {
        (stats.*setter)("-1");
        EXPECT_TRUE(stats.IsThresholdReached());
        (stats.*setter)("0");
        EXPECT_FALSE(stats.IsThresholdReached());
    }
}

TEST_F(Statistics, CpuArithmeticWrapsAtThirtyTwoBits)
{
    EXPECT_EQ(cpuafter(2147484, 2), "-1073741648");
    stats = ProcessStatistics("web");
    EXPECT_EQ(cpuafter(2147484, 1), "-2147483296");
}

TEST_F(Statistics, TheOneQuotientBeyondIntWrapsToo)
{
    // 2^28 * 1000 is -2^31 in 32 bits, and so would be its negative.
    EXPECT_EQ(cpuafter(268435456, -1), "-2147483648");
}

TEST_F(Statistics, TimesBeyondIntWrap)
{
    world.now = 4294967296L + 1000;
    EXPECT_EQ(cpuafter(25, 50), "500");
}

TEST_F(Statistics, TwoChecksInOneSecondKeepTheFigure)
{
    cpuafter(5, 10);
    EXPECT_EQ(check(),
              "DEBUG Refresh called twice in zero time interval\n" + figures(500, 1, 1, false));
}

TEST_F(Statistics, SecondCheckInOneSecondMovesTheBaseline)
{
    cpuafter(5, 10);
    statis(stat("105", "1", "1"));
    check();
    statis(stat("106", "1", "1"));
    world.now += 10;
    EXPECT_EQ(check(), figures(100, 1, 1, false));
}

TEST_F(Statistics, UnsetThresholdsAreReachedByAnyLiveProcess)
{
    stats = ProcessStatistics("web");
    statis(stat("0", "1", "0"));
    EXPECT_TRUE(stats.IsThresholdReached());
}

TEST_F(Statistics, RestartedProcessIsFollowedAndKeepsTheOldCpuFigureOnce)
{
    cpuafter(5, 10);
    processis(43);
    world.files["/proc/43/stat"] = stat("2", "7", "8");
    world.now += 10;
    EXPECT_EQ(check(),
              "DEBUG (web) PID changed (old = 42, new = 43)\n" + figures(500, 7, 8, false));
    world.files["/proc/43/stat"] = stat("3", "7", "8");
    world.now += 10;
    EXPECT_EQ(check(), figures(100, 7, 8, false));
}

TEST_F(Statistics, FirstOfSeveralProcessesCounts)
{
    world.onpopen = [](const std::string&) {
        return Output{std::string("42 41 40\n")};
    };
    statis(stat("0", "1", "1"));
    EXPECT_EQ(check(), changed + figures(0, 1, 1, false));
}

TEST_F(Statistics, LongProcessIdsAreReadWhole)
{
    processis(4194304);
    world.files["/proc/4194304/stat"] = stat("0", "1", "1");
    EXPECT_EQ(check(),
              "DEBUG (web) PID changed (old = -1, new = 4194304)\n" + figures(0, 1, 1, false));
}

TEST_F(Statistics, GoneProcessIsReportedEachTimeAndTheLastFiguresDecide)
{
    statis(stat("0", "51", "1"));
    check();
    processis(0);
    const std::string unable = "ERROR (web) Unable to fetch stats of process from system\n";
    EXPECT_EQ(check(),
              "DEBUG (web) PID changed (old = 42, new = 0)\n" + unable + figures(0, 51, 1, true));
    EXPECT_EQ(check(), unable + figures(0, 51, 1, true));
}

TEST_F(Statistics, ProcessThatEndsBetweenOpeningAndReadingIsAFailedFetch)
{
    const pid_t child = fork();
    if (child == 0) {
        for (;;) {
            pause();
        }
    }
    processis(child);
    world.onrealproc = [child] {
        kill(child, SIGKILL);
        waitpid(child, nullptr, 0);
    };
    EXPECT_EQ(check(), "DEBUG (web) PID changed (old = -1, new = " + std::to_string(child) +
                           ")\nERROR (web) Unable to fetch stats of process from system\n" +
                           figures(0, 0, 0, false));
}

TEST_F(Statistics, ProgramNeverSeenDecidesOnZeroes)
{
    processis(0);
    EXPECT_EQ(check(), "DEBUG (web) PID changed (old = -1, new = 0)\n"
                       "ERROR (web) Unable to fetch stats of process from system\n" +
                           figures(0, 0, 0, false));
}

TEST_F(Statistics, BlankInTheProgramNameShiftsTheFieldsByOne)
{
    // Threads are then field 19, which holds 0, and pages field 23, which holds 23.
    statis(stat("0", "3", "800", "(web server)"));
    EXPECT_EQ(check(), changed + figures(0, 0, 23, false));
}

TEST_F(Statistics, FetchFillsTheCallersFields)
{
    statis(stat("5", "6", "7"));
    stats.UpdatePID();
    std::vector<std::string> fields{"old"};
    EXPECT_EQ(stats.FetchStatisticsFromSystem(fields), 0);
    ASSERT_EQ(fields.size(), 26U);
    EXPECT_EQ(fields[13], "5");
    EXPECT_EQ(fields[19], "6");
    EXPECT_EQ(fields[23], "7");
    EXPECT_EQ(fields[25], "26\n");
}

TEST_F(Statistics, FailedFetchLeavesTheCallersFields)
{
    stats.UpdatePID();
    std::vector<std::string> fields{"old"};
    EXPECT_EQ(stats.FetchStatisticsFromSystem(fields), 1);
    EXPECT_EQ(fields, (Pieces{"old"}));
    EXPECT_EQ(stats.Refresh(), 1);
}

TEST_F(Statistics, FetchReplacesTheFieldsHoweverFew)
{
    statis("42 (web)");
    stats.UpdatePID();
    std::vector<std::string> fields{"old", "older", "oldest"};
    EXPECT_EQ(stats.FetchStatisticsFromSystem(fields), 0);
    EXPECT_EQ(fields, (Pieces{"42", "(web)"}));
}

// Ends the file at its 24th field.
std::string cutafterpages(const std::string& content)
{
    return content.substr(0, content.find(" 25 26"));
}

TEST_F(Statistics, FewerThanTwentyFourFieldsAreAFailedFetch)
{
    statis(stat("0", "51", "1"));
    check();
    const std::string whole = cutafterpages(stat("9", "1", "1"));
    statis(whole.substr(0, whole.rfind(' ')));
    world.now += 10;
    EXPECT_EQ(check(), "ERROR (web) Unable to fetch stats of process from system\n" +
                           figures(0, 51, 1, true));
}

TEST_F(Statistics, RefreshByTooFewFieldsChangesNothing)
{
    cpuafter(5, 10);
    const std::string whole = cutafterpages(stat("900", "7", "8"));
    statis(whole.substr(0, whole.rfind(' ')));
    world.now += 10;
    EXPECT_NE(stats.Refresh(), 0);
    EXPECT_EQ(stats.GetAverageCPUUsage(), 500);
    EXPECT_EQ(stats.GetNumberOfThreads(), 1);
    EXPECT_EQ(stats.GetMemoryUsage(), 1);
    statis(stat("7", "1", "1"));
    world.now += 10;
    EXPECT_EQ(stats.Refresh(), 0);
    EXPECT_EQ(stats.GetAverageCPUUsage(), 100); // 2 ticks in 20 seconds: the baseline has stayed
}

TEST_F(Statistics, TwentyFourFieldsAreEnough)
{
    statis(cutafterpages(stat("0", "3", "800")));
    EXPECT_EQ(check(), changed + figures(0, 3, 800, false));
}

TEST_F(Statistics, ByteOf0xFFEndsTheReading)
{
    statis(stat("0", "3", "800", "(w\xFFz)"));
    EXPECT_EQ(check(), changed + "ERROR (web) Unable to fetch stats of process from system\n" +
                           figures(0, 0, 0, false));
}

TEST_F(Statistics, NonNumericFieldsReadAsZero)
{
    statis(stat("x", "y", "z"));
    EXPECT_EQ(check(), changed + figures(0, 0, 0, false));
}

TEST_F(Statistics, FiguresCanBeAskedFor)
{
    statis(stat("7", "3", "800"));
    stats.UpdatePID();
    EXPECT_EQ(stats.Refresh(), 0);
    World::current().now += 2;
    statis(stat("9", "4", "900"));
    EXPECT_EQ(stats.Refresh(), 0);
    EXPECT_EQ(stats.GetAverageCPUUsage(), 1000);
    EXPECT_EQ(stats.GetNumberOfThreads(), 4);
    EXPECT_EQ(stats.GetMemoryUsage(), 900);
}

TEST_F(Statistics, CopyTakesTheFiguresAlong)
{
    statis(stat("0", "51", "1"));
    check();
    processis(0);
    ProcessStatistics copy = stats;
    EXPECT_TRUE(copy.IsThresholdReached());
}

} // namespace
