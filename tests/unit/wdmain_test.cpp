// Start-up. The program's main goes by the name of tolkwd_main here; its endless supervision is
// left by an exception out of a pause.

#include "wdmain.h"

#include <array>
#include <csignal>
#include <initializer_list>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "daemontest.h"
#include "wdLocalLog_linux.h"
#include "wdmonitorthread_linux.h"

int tolkwd_main(int argc, char** argv);

namespace {

constexpr const char* kInstallation = "/etc/opt/varden/tolk/cimom";
constexpr const char* kMarker = "/etc/opt/varden/tolk/wd.nxinstalled";
constexpr const char* kInstaller = "/var/run/breminstall.pid";

// A command line as main gets it.
class CommandLine {
public:
    CommandLine(std::initializer_list<const char*> words) : texts(words.begin(), words.end())
    {
        texts.insert(texts.begin(), "tolkwd");
        for (auto& text : texts) {
            pointers.push_back(text.data());
        }
        pointers.push_back(nullptr);
    }

    [[nodiscard]] int argc() const { return static_cast<int>(texts.size()); }
    char** argv() { return pointers.data(); }

private:
    std::vector<std::string> texts;
    std::vector<char*> pointers;
};

class Startup : public DaemonTest {
protected:
    Startup() : DaemonTest("wdmanager") {}

    void SetUp() override
    {
        DaemonTest::SetUp();
        debugenable = false;
        world.existing = {kInstallation, kMarker};
    }

    static void parse(std::initializer_list<const char*> words)
    {
        CommandLine line(words);
        parseArg(line.argc(), line.argv());
    }

    static void parseandcheck(std::initializer_list<const char*> words)
    {
        parse(words);
        checkParsed();
    }
};

using CommandLineOptions = Startup;

const bool kDebugAtStart = debugenable;

TEST_F(CommandLineOptions, DebuggingIsOffUnlessItIsAskedFor)
{
    EXPECT_FALSE(kDebugAtStart);
}

TEST_F(CommandLineOptions, PathsAreTakenAndTheRestHasItsDefaults)
{
    parseandcheck({"-i", "a.xml", "-l", "b.log"});
    EXPECT_EQ(configPath, "a.xml");
    EXPECT_EQ(wdlocallogpath, "b.log");
    EXPECT_EQ(globalrefresh, 10800);
    EXPECT_FALSE(debugenable);
}

TEST_F(CommandLineOptions, OrderDoesNotMatter)
{
    parseandcheck({"-g", "-t", "300", "-l", "b.log", "-i", "a.xml"});
    EXPECT_EQ(configPath, "a.xml");
    EXPECT_EQ(wdlocallogpath, "b.log");
    EXPECT_EQ(globalrefresh, 300);
    EXPECT_TRUE(debugenable);
}

TEST_F(CommandLineOptions, RefreshPeriodBelowTwoMinutesIsThreeHours)
{
    const std::array<std::pair<const char*, int>, 12> cases{{
        {"119", 10800},
        {"120", 120},
        {"60s", 10800},
        {"0200", 200},
        {"0x100", 10800},
        {"300", 300},
        {" +400x", 400},
        {"-300", 10800},
        {"soon", 10800},
        {"", 10800},
        {"2147483647", 2147483647},
        {"2147483648", 10800},
    }};
    for (const auto& [text, seconds] : cases) {
        parseandcheck({"-i", "a.xml", "-l", "b.log", "-t", text});
        EXPECT_EQ(globalrefresh, seconds) << text;
    }
}

TEST_F(CommandLineOptions, FirstOccurrenceCounts)
{
    parse({"-i", "a.xml", "-i", "other.xml", "-l", "b.log"});
    EXPECT_EQ(configPath, "a.xml");
}

TEST_F(CommandLineOptions, OptionIsFoundWhereAnotherTakesItAsItsValue)
{
    parse({"-i", "a.xml", "-l", "-g"});
    EXPECT_EQ(wdlocallogpath, "-g");
    EXPECT_TRUE(debugenable);
}

TEST_F(CommandLineOptions, DebugWordIsAConfigurationPathToo)
{
    parse({"-i", "-g"});
    EXPECT_EQ(configPath, "-g");
    EXPECT_TRUE(debugenable);
}

TEST_F(CommandLineOptions, OptionMayBeItsOwnValue)
{
    parse({"-i", "-i"});
    EXPECT_EQ(configPath, "-i");
}

TEST_F(CommandLineOptions, OtherWordsAreIgnored)
{
    parseandcheck({"hello", "-i", "a.xml", "-x", "-l", "b.log", "--help", "-n"});
    EXPECT_EQ(configPath, "a.xml");
    EXPECT_EQ(wdlocallogpath, "b.log");
}

TEST_F(CommandLineOptions, NoArgumentsSetNothing)
{
    parseArg(0, nullptr);
    parse({});
    EXPECT_EQ(configPath, "");
    EXPECT_EQ(wdlocallogpath, "");
}

TEST_F(CommandLineOptions, ProgramsNameIsNoOption)
{
    std::string name = "-g";
    std::string word = "hello";
    std::array<char*, 3> words{name.data(), word.data(), nullptr};
    parseArg(2, words.data());
    EXPECT_FALSE(debugenable);
}

TEST_F(CommandLineOptions, FindargWantsTheWholeWordInItsCase)
{
    EXPECT_EQ(findarg("-i", {"-I", "-ii", "x", "-i", "-i"}), 3);
    EXPECT_EQ(findarg("-i", {"-I", "-ii"}), -1);
    EXPECT_EQ(findarg("-i", {}), -1);
}

class CommandLineRefusals : public Startup {
protected:
    static void expectrefusal(std::initializer_list<const char*> words, const std::string& message)
    {
        EXPECT_EXIT(parseandcheck(words), ::testing::ExitedWithCode(2), "^" + message + "\n$");
    }

    const std::string kConfig = "'-i' used but no input file path specified ";
    const std::string kLog = "'-o' used but no output local log file path specified ";
    const std::string kTime = "'-t' used but no check time specified ";
    const std::string kNoConfig = "input configuration file path not specified";
    const std::string kNoLog = "output log file path not specified";
};

TEST_F(CommandLineRefusals, MissingPathsAreNamed)
{
    expectrefusal({}, kNoConfig);
    expectrefusal({"-l", "b.log"}, kNoConfig);
    expectrefusal({"-i", "", "-l", "b.log"}, kNoConfig);
    expectrefusal({"-i", "a.xml"}, kNoLog);
    expectrefusal({"-i", "a.xml", "-l", ""}, kNoLog);
}

TEST_F(CommandLineRefusals, OtherOptionsAreNoValues)
{
    for (const char* word : {"-l", "-n", "-t"}) {
        expectrefusal({"-i", word, "b.log"}, kConfig);
    }
    for (const char* word : {"-i", "-n", "-t"}) {
        expectrefusal({"-l", word, "a.xml"}, kLog);
    }
    for (const char* word : {"-l", "-i", "-n"}) {
        expectrefusal({"-i", "a.xml", "-l", "b.log", "-t", word}, kTime);
    }
}

TEST_F(CommandLineRefusals, FirstOptionInFixedOrderIsReported)
{
    expectrefusal({"-t", "-n", "-l", "-n", "-i", "-n"}, kConfig);
    expectrefusal({"-t", "-n", "-l", "-n", "-i", "a.xml"}, kLog);
    expectrefusal({"-l", "-n", "-i", "a.xml"}, kLog);
}

TEST_F(CommandLineRefusals, OptionAtTheEndWithoutItsValueIsRefused)
{
    expectrefusal({"-l", "b.log", "-i"}, kConfig);
    expectrefusal({"-i", "a.xml", "-l"}, kLog);
    expectrefusal({"-i", "a.xml", "-l", "b.log", "-t"}, kTime);
}

using Installation = Startup;

TEST_F(Installation, CountsOnlyWithBothFiles)
{
    EXPECT_EQ(isInstalledNX(), 1);
    world.existing = {kInstallation};
    EXPECT_EQ(isInstalledNX(), 0);
    EXPECT_EQ(
        world.events(),
        lines({std::string("look for ") + kInstallation, std::string("look for ") + kMarker,
               std::string("look for ") + kInstallation, std::string("look for ") + kMarker}));
}

TEST_F(Installation, MarkerIsNotLookedForWithoutTheInstallation)
{
    world.existing = {kMarker};
    EXPECT_EQ(isInstalledNX(), 0);
    EXPECT_EQ(world.events(), lines({std::string("look for ") + kInstallation}));
}

TEST_F(Installation, WaitEndsWhenTheInstallersPidFileIsGone)
{
    world.existing = {kInstaller};
    world.onsleep = [this, times = 0](unsigned) mutable {
        if (++times == 2) {
            world.existing.clear();
        }
    };
    EXPECT_NE(wd_postpone(), 0);
    const std::string look = std::string("look for ") + kInstaller;
    EXPECT_EQ(world.events(), lines({look, "sleep 60", look, "sleep 60", look}));
}

TEST_F(Installation, NoWaitWithoutAnInstaller)
{
    EXPECT_NE(wd_postpone(), 0);
    EXPECT_EQ(world.events(), lines({std::string("look for ") + kInstaller}));
}

TEST_F(Installation, PingFolderIsFixed)
{
    set_tmp_file_path();
    EXPECT_EQ(_tmp_file_path, "/opt/varden/tolk/bin/");
}

// What tells a file from all others.
using FileIdentity = std::pair<dev_t, ino_t>;

FileIdentity fileof(int fd)
{
    struct stat status {};
    return fstat(fd, &status) == 0 ? FileIdentity{status.st_dev, status.st_ino} : FileIdentity{};
}

FileIdentity fileof(const char* path)
{
    struct stat status {};
    return stat(path, &status) == 0 ? FileIdentity{status.st_dev, status.st_ino} : FileIdentity{};
}

class Program : public Startup {
protected:
    void SetUp() override
    {
        Startup::SetUp();
        _tmp_file_path.clear();
        folder.write("config.xml", "<wdtargets></wdtargets>");
    }

    // Runs main until its first tick, or the end of the process.
    void runmain(std::initializer_list<const char*> words)
    {
        CommandLine line(words);
        try {
            tolkwd_main(line.argc(), line.argv());
        } catch (const StopHere&) {
            world.record("supervises");
        }
    }

    void runmain()
    {
        world.onsleep = [](unsigned seconds) {
            if (seconds == 1) {
                throw StopHere();
            }
        };
        const std::string config = folder.path("config.xml");
        const std::string log = folder.path("log");
        runmain({"-i", config.c_str(), "-l", log.c_str()});
    }

    const std::string kLookForInstallation = std::string("look for ") + kInstallation;
    const std::string kLookForMarker = std::string("look for ") + kMarker;
    const std::string kLookForInstaller = std::string("look for ") + kInstaller;
    const std::string kTouch = "run touch /etc/opt/varden/tolk/wd.nxinstalled";
};

TEST_F(Program, InstalledDaemonStartsWithoutWaitOrTouch)
{
    world.existing.insert(kInstaller);
    runmain();
    EXPECT_EQ(world.events(),
              lines({kLookForInstallation, kLookForMarker, "sleep 1", "supervises"}));
    EXPECT_EQ(_tmp_file_path, "/opt/varden/tolk/bin/");
    EXPECT_EQ(wdLocalLog::logFilePath, folder.path("log"));
    EXPECT_EQ(globalenable, 1);
}

TEST_F(Program, WithoutTheMarkerItWaitsAndSetsIt)
{
    world.existing = {kInstallation};
    runmain();
    EXPECT_EQ(world.events(), lines({kLookForInstallation, kLookForMarker, kLookForInstaller,
                                     kTouch, "sleep 1", "supervises"}));
}

TEST_F(Program, WithoutTheInstallationEveryStartWaitsAndTouches)
{
    world.existing = {kMarker};
    runmain();
    EXPECT_EQ(world.events(),
              lines({kLookForInstallation, kLookForInstaller, kTouch, "sleep 1", "supervises"}));
}

TEST_F(Program, FailingTouchIsIgnored)
{
    world.existing.clear();
    world.onsystem = [](const std::string&) {
        return exited(1);
    };
    runmain();
    EXPECT_TRUE(world.events().ends_with("supervises\n"));
}

TEST_F(Program, CommandLineIsReadOnlyWhenTheInstallerHasGone)
{
    world.existing = {kInstallation, kInstaller};
    world.onsleep = [this](unsigned) {
        EXPECT_EQ(configPath, "");
        world.existing.erase(kInstaller);
    };
    world.onsystem = [](const std::string&) {
        EXPECT_EQ(configPath, "");
        throw StopHere();
        return 0;
    };
    runmain({"-i", "a.xml", "-l", "b.log"});
    EXPECT_EQ(world.events(), lines({kLookForInstallation, kLookForMarker, kLookForInstaller,
                                     "sleep 60", kLookForInstaller, kTouch, "supervises"}));
}

TEST_F(Program, WrongCommandLineOfAFreshInstallationStillWaitsAndTouches)
{
    world.existing = {kInstallation};
    world.onsystem = [this](const std::string& command) {
        folder.write("command", command); // the process that runs it is another one
        return 0;
    };
    EXPECT_EXIT(runmain({"-i"}), ::testing::ExitedWithCode(2),
                "^'-i' used but no input file path specified \n$");
    EXPECT_EQ("run " + folder.read("command"), kTouch);
}

TEST_F(Program, UnwritableLogEndsItWith200AtTheFirstMessage)
{
    folder.write("config.xml", "<wdtargets><a/></wdtargets>");
    const std::string config = folder.path("config.xml");
    EXPECT_EXIT(runmain({"-i", config.c_str(), "-l", "/no/such/folder/log"}),
                ::testing::ExitedWithCode(200), "^Unable to open the log file\n$");
}

TEST_F(Program, MissingConfigurationIsSaidAndTheDaemonRunsOn)
{
    world.onsleep = [](unsigned) {
        throw StopHere();
    };
    const std::string log = folder.path("log");
    ::testing::internal::CaptureStderr();
    runmain({"-i", "/no/such/file.xml", "-l", log.c_str()});
    EXPECT_EQ(::testing::internal::GetCapturedStderr(),
              "error, unable to open the input file: 0\n");
    EXPECT_TRUE(world.events().ends_with("supervises\n"));
}

TEST_F(Program, ClosedStandardDescriptorsAreOpenedOnNull)
{
    EXPECT_EXIT(
        {
            close(STDIN_FILENO);
            close(STDOUT_FILENO);
            close(STDERR_FILENO);
            runmain();
            const bool usable = write(STDOUT_FILENO, "x", 1) == 1 &&
                                write(STDERR_FILENO, "x", 1) == 1 &&
                                fcntl(STDIN_FILENO, F_GETFD) == 0;
            _exit(usable && fileof(STDIN_FILENO) == fileof("/dev/null") &&
                          fileof(STDOUT_FILENO) == fileof("/dev/null") &&
                          fileof(STDERR_FILENO) == fileof("/dev/null")
                      ? 0
                      : 1);
        },
        ::testing::ExitedWithCode(0), "");
}

TEST_F(Program, OpenStandardDescriptorsAreLeftAloneAndNothingMoreStaysOpen)
{
    const auto files = [] {
        return std::array{fileof(STDIN_FILENO), fileof(STDOUT_FILENO), fileof(STDERR_FILENO)};
    };
    const auto filesbefore = files();
    const int before = open("/dev/null", O_RDONLY);
    close(before);
    runmain();
    const int after = open("/dev/null", O_RDONLY);
    close(after);
    EXPECT_EQ(after, before);
    EXPECT_EQ(files(), filesbefore);
}

// Or every command's result would be lost.
TEST_F(Program, IgnoredChildrenAreWaitedForAgain)
{
    EXPECT_EXIT(
        {
            std::signal(SIGCHLD, SIG_IGN);
            runmain();
            _exit(std::signal(SIGCHLD, SIG_DFL) == SIG_DFL ? 0 : 1);
        },
        ::testing::ExitedWithCode(0), "");
}

TEST_F(Program, InheritedDescriptorsAreKeptFromTheServices)
{
    EXPECT_EXIT(
        {
            const int inherited = open("/dev/null", O_RDONLY); // without close-on-exec
            runmain();
            const bool sealed = (fcntl(inherited, F_GETFD) & FD_CLOEXEC) != 0;
            const bool standard = (fcntl(STDOUT_FILENO, F_GETFD) & FD_CLOEXEC) == 0;
            _exit(sealed && standard ? 0 : 1);
        },
        ::testing::ExitedWithCode(0), "");
}

} // namespace
