#include "probe.h"

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <string_view>
#include <vector>

#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "owners.h"
#include "surroundings.h"
#include "wdLocalLog_linux.h"
#include "wdmonitorthread_linux.h"
#include "wdsettings.h"

namespace {

using namespace check;
namespace fs = std::filesystem;

// Stands for the service command: writes down how it is called and where its output goes, and
// answers as the file of that name says.
constexpr std::string_view kServiceCommand = R"(#!/bin/sh
echo "$*" >>"$STAGE/calls"
output=$(readlink "/proc/$$/fd/1"); echo "$output" >>"$STAGE/outputs"
input=$(readlink "/proc/$$/fd/0")
{ pwd; echo "$LC_MESSAGES $LC_ALL"; echo "$input"; } >"$STAGE/around"
cat /proc/self/status >"$STAGE/process"
[ ! -e "$STAGE/$1.status" ] || . "$STAGE/$1.status"
)";

// One target's file; the keys that are not given have the values of a sound configuration.
struct configured {
    std::string name = "web";
    std::string check = "NULL";
    std::string binarypath = "no-such-program";
    std::string maxskips = "3";
    std::string threads = "200";
};

std::string element(std::string_view name, const std::string& value)
{
    return std::string("<").append(name).append(">").append(value).append("</").append(name).append(
        ">\n");
}

class Probe : public testing::Test {
protected:
    Probe()
    {
        std::string pattern = "/tmp/probe_test.XXXXXX";
        stage = mkdtemp(pattern.data());
        fs::create_directory(stage / "bin");
        fs::create_directory(stage / "tmp");
        write("bin/service", kServiceCommand);
        fs::permissions(stage / "bin/service", fs::perms::owner_all);
        setenv("STAGE", stage.c_str(), 1);
        setenv("TMPDIR", (stage / "tmp").c_str(), 1);
        setenv("PATH", (stage.string() + "/bin:" + path).c_str(), 1);
        _tmp_file_path = stage.string() + "/pings/";
        fs::create_directory(_tmp_file_path);
    }
    ~Probe() override
    {
        setenv("PATH", path.c_str(), 1);
        unsetenv("TMPDIR");
        fs::remove_all(stage);
    }

    void write(const std::string& name, std::string_view text) const
    {
        std::ofstream(stage / name) << text;
    }

    [[nodiscard]] std::string read(const std::string& name) const
    {
        std::ostringstream text;
        text << std::ifstream(stage / name).rdbuf();
        return text.str();
    }

    // What `service NAME status` does: lines of a shell script.
    void answers(const std::string& name, std::string_view script) const
    {
        write(name + ".status", script);
    }

    [[nodiscard]] std::string configuration(const std::vector<configured>& targets) const
    {
        std::string text = "<?xml version='1.0'?>\n<wdtargets>\n";
        const std::string touch = "touch " + stage.string();
        for (const configured& each : targets) {
            text +=
                "<wdmonitortarget>\n<wdmonitorservice>\n" + element("name", each.name) +
                element("binarypath", each.binarypath) + element("startcmd", touch + "/started") +
                element("stopcmd", touch + "/stopped") + element("functionalpingcmd", each.check) +
                element("maxattemptofwakeup", "3") + element("MaxFPSkips", each.maxskips) +
                element("ThresholdAverageCPUUsage", "1000000") +
                element("ThresholdMemoryUsage", "100000000") +
                element("ThresholdThreadCount", each.threads) +
                "</wdmonitorservice>\n</wdmonitortarget>\n";
        }
        return text + "</wdtargets>\n";
    }

    std::vector<targetprobe> probe(const std::vector<configured>& targets)
    {
        view = readasdaemon(configuration(targets));
        const outputfolder folder;
        return probetargets(view, folder.path(), found);
    }

    // The findings, in order, as "rule severity".
    [[nodiscard]] std::vector<std::string> rules() const
    {
        std::vector<std::string> names;
        for (const finding& each : found.sorted()) {
            names.push_back(std::string(each.rule) +
                            (each.level == severity::error ? " error" : " warning"));
        }
        return names;
    }

    static std::string written(const std::vector<targetprobe>& probes)
    {
        std::ostringstream out;
        writeprobe(out, probes, false);
        return out.str();
    }

    fs::path stage;
    findings found;
    daemonview view;

private:
    const wdLocalLog log{"/dev/null"};
    const std::string path = std::getenv("PATH");
};

using strings = std::vector<std::string>;

TEST_F(Probe, FindsNothingWhereAllIsWell)
{
    answers("web", "echo web is running");
    const auto probes = probe({{.check = "echo service: ok"}, {.maxskips = "0"}});
    ASSERT_EQ(probes.size(), 2U);
    EXPECT_EQ(probes[0].status.result, kServiceRunning);
    EXPECT_EQ(probes[0].status.command, "service web status");
    EXPECT_EQ(probes[0].status.firstline, "web is running");
    EXPECT_EQ(probes[0].check.value().result, kAnswerCorrect);
    EXPECT_FALSE(probes[1].check);
    EXPECT_EQ(rules(), strings{"probe-process warning"}); // the first one's
}

TEST_F(Probe, RatesWhatTheStatusCommandAnswers)
{
    answers("stopped", "echo stopped is not running; exit 3");
    answers("unknown", "echo 'unknown: unrecognized service' >&2; exit 1");
    answers("unclear", "echo who knows; exit 4");
    answers("silent", "exit 0");
    const auto probes =
        probe({{.name = "stopped"}, {.name = "unknown"}, {.name = "unclear"}, {.name = "silent"}});
    ASSERT_EQ(probes.size(), 4U);
    EXPECT_EQ(probes[0].status.result, kServiceNotRunning);
    EXPECT_EQ(probes[0].status.state, 3);
    EXPECT_EQ(probes[1].status.result, kServiceUnknown);
    EXPECT_EQ(probes[2].status.result, kServiceUnclear);
    EXPECT_EQ(probes[3].status.result, kServiceRunning);
    EXPECT_EQ(rules(),
              (strings{"probe-status warning", "probe-status error", "probe-status warning"}));
}

TEST_F(Probe, RatesWhatTheCheckAnswers)
{
    answers("web", "echo web is running");
    const auto probes = probe({{.check = "echo I cannot say that it is running", .maxskips = "0"},
                               {.check = "echo CIMException", .maxskips = "0"},
                               {.check = "echo web: command not found", .maxskips = "0"},
                               {.check = "false", .maxskips = "0"}});
    ASSERT_EQ(probes.size(), 4U);
    EXPECT_EQ(probes[0].check.value().result, kAnswerUnclear);
    EXPECT_EQ(probes[1].check.value().result, kAnswerException);
    EXPECT_EQ(probes[2].check.value().result, kCommandNotFound);
    EXPECT_EQ(probes[3].check.value().result, kAnswerUnclear);
    EXPECT_EQ(rules(), (strings{"probe-check warning", "probe-check warning", "probe-check error",
                                "probe-check warning"}));
}

TEST_F(Probe, OnlyTellsOfTheFailingCheckOfAServiceThatDoesNotRun)
{
    answers("web", "echo web is stopped");
    const auto probes = probe({{.check = "echo no connection"}});
    EXPECT_EQ(rules(), strings{"probe-status warning"});
    EXPECT_NE(written(probes).find("fails: no keyword"), std::string::npos) << written(probes);
}

TEST_F(Probe, PlacesItsFindingsAtTheName)
{
    answers("web", "echo web is stopped");
    probe({{}});
    const std::string text = configuration({{}});
    ASSERT_EQ(found.sorted().size(), 1U);
    EXPECT_EQ(found.sorted().front().place, text.find("<name>") + std::string("<name>").size());
}

TEST_F(Probe, NeverStartsOrStopsAService)
{
    answers("web", "echo web is stopped");
    answers("mail", "echo who knows; exit 1");
    probe({{.check = "echo no"}, {.name = "mail", .check = "echo no"}, {.name = "none"}});
    EXPECT_EQ(read("calls"), "web status\nmail status\nnone status\n");
    EXPECT_FALSE(fs::exists(stage / "started"));
    EXPECT_FALSE(fs::exists(stage / "stopped"));
}

TEST_F(Probe, LeavesThePingsFolderAloneAndNoFolderOfItsOwn)
{
    write("pings/agent.web", "the daemon's");
    const std::string pingfolder = _tmp_file_path;
    answers("web", "echo web is running");
    probe({{.check = "echo service: ok"}});
    EXPECT_TRUE(read("outputs").starts_with(stage.string() + "/tmp/tolkwd-check."))
        << read("outputs");
    EXPECT_TRUE(fs::is_empty(stage / "tmp"));
    EXPECT_EQ(read("pings/agent.web"), "the daemon's");
    EXPECT_EQ(std::distance(fs::directory_iterator(stage / "pings"), {}), 1);
    EXPECT_EQ(_tmp_file_path, pingfolder);
}

TEST_F(Probe, DoesNotTakeAFolderThatTheShellWouldTakeApart)
{
    setenv("TMPDIR", (stage.string() + "/a b").c_str(), 1);
    fs::create_directory(stage / "a b");
    answers("web", "echo web is running");
    EXPECT_EQ(probe({{}}).at(0).status.result, kServiceRunning);
    EXPECT_TRUE(read("outputs").starts_with("/tmp/tolkwd-check.")) << read("outputs");
}

TEST_F(Probe, RunsCommandsInTheSurroundingsOfTheDaemonsOnes)
{
    setenv("LC_ALL", "de_DE.UTF-8", 1);
    setenv("LC_MESSAGES", "de_DE.UTF-8", 1);
    const fs::path folder = fs::current_path();
    answers("web", "echo web is running");
    probe({{}});
    EXPECT_EQ(read("around"), "/\nC \n/dev/null\n");
    EXPECT_STREQ(std::getenv("LC_ALL"), "de_DE.UTF-8");
    EXPECT_STREQ(std::getenv("LC_MESSAGES"), "de_DE.UTF-8");
    EXPECT_EQ(fs::current_path(), folder);
    unsetenv("LC_ALL");
    unsetenv("LC_MESSAGES");
}

// A set of signals of a process, as its status file has it, without those of the C library.
unsigned long signalset(const fs::path& status, const std::string& name)
{
    std::ifstream lines(status);
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with(name + ":")) {
            return std::stoul(line.substr(name.size() + 1), nullptr, 16) & 0x7fffffffU;
        }
    }
    ADD_FAILURE() << "no " << name;
    return 0;
}

TEST_F(Probe, LeavesCommandsTheSignalsButForThatOfAPipeWithoutReader)
{
    constexpr unsigned long kPipeSignal = 1UL << (SIGPIPE - 1);
    const unsigned long ignored = signalset("/proc/self/status", "SigIgn");
    const unsigned long blocked = signalset("/proc/self/status", "SigBlk");
    answers("web", "echo web is running");
    probe({{}});
    EXPECT_EQ(signalset(stage / "process", "SigIgn"), ignored | kPipeSignal);
    EXPECT_EQ(signalset(stage / "process", "SigBlk"), blocked);
    EXPECT_EQ(signalset("/proc/self/status", "SigIgn"), ignored);
    EXPECT_EQ(signalset("/proc/self/status", "SigBlk"), blocked);
}

TEST_F(Probe, KeepsStandardOutputFromWhatIsWrittenMeanwhile)
{
    answers("web", "echo web is running");
    testing::internal::CaptureStdout();
    probe({{.check = "echo stray; echo service: ok"}});
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
}

// Of a compound command only the last part writes to the file that is read.
TEST_F(Probe, TellsThatThereIsNoOutput)
{
    answers("web", "echo web is running");
    const auto probes = probe({{.check = "false && echo service: ok", .maxskips = "0"}});
    EXPECT_FALSE(probes.at(0).check.value().readable);
    EXPECT_NE(written(probes).find("no output to read"), std::string::npos) << written(probes);
    EXPECT_EQ(rules(), strings{"probe-check warning"});
}

TEST_F(Probe, ReadsTheFiguresOfTheProcess)
{
    answers("web", "echo web is running");
    const std::string self = fs::read_symlink("/proc/self/exe");
    const auto process =
        probe({{.check = "echo service: ok", .binarypath = self, .threads = "1"}}).at(0).process;
    // Others of this program may run beside this one: any of them will do.
    EXPECT_GT(process.pid, 0);
    EXPECT_TRUE(process.counts);
    EXPECT_GE(process.threads.value.value(), 1);
    EXPECT_GT(process.memory.value.value(), 0);
}

TEST_F(Probe, FindsAServiceBusyOnlyAboveItsThreshold)
{
    fs::copy_file("/bin/sleep", stage / "bin/sleeper");
    const std::string sleeper = stage.string() + "/bin/sleeper";
    answers("web", "echo web is running");
    const pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        execl(sleeper.c_str(), sleeper.c_str(), "60", nullptr);
        _exit(1);
    }
    const auto probes = probe({
        {.check = "echo service: ok", .binarypath = sleeper, .threads = "1"}, // equals it
        {.check = "echo service: ok", .binarypath = sleeper, .threads = "0"},
        {.check = "echo service: ok", .binarypath = sleeper, .maxskips = "0", .threads = "0"},
        {.check = "NULL", .binarypath = sleeper, .threads = "0"},
        {.check = "echo service: ok", .binarypath = sleeper, .maxskips = "-1", .threads = "0"},
    });
    kill(child, SIGKILL);
    waitpid(child, nullptr, 0);
    EXPECT_EQ(probes.at(0).process.pid, child);
    EXPECT_FALSE(probes.at(0).process.busy());
    EXPECT_TRUE(probes.at(1).process.busy());
    EXPECT_EQ(probes.at(0).process.processor.value, 0); // it sleeps
    EXPECT_EQ(rules(), (strings{"probe-busy warning", "probe-busy warning"}));
    EXPECT_FALSE(probes.at(2).process.counts);
    EXPECT_FALSE(probes.at(3).process.counts);
    EXPECT_TRUE(probes.at(4).process.counts);
    EXPECT_TRUE(found.sorted().back().message.ends_with("leave its check out, without end"));
    EXPECT_TRUE(written({probes.at(1)}).ends_with("left out, up to 3 times in a row\n"));
    EXPECT_TRUE(written({probes.at(4)}).ends_with("left out, without end\n"));
}

TEST_F(Probe, KnowsNoProcessorTimeOfAProcessThatItHasReadOnce)
{
    fs::copy_file("/bin/sleep", stage / "bin/sleeper");
    answers("web", R"("$STAGE/bin/sleeper" 60 & echo $! >"$STAGE/pid"; echo web is running)");
    const auto process = probe({{.binarypath = stage.string() + "/bin/sleeper"}}).at(0).process;
    const pid_t sleeper = std::stoi(read("pid"));
    kill(sleeper, SIGKILL);
    EXPECT_EQ(process.pid, sleeper);
    EXPECT_EQ(process.threads.value, 1);
    EXPECT_FALSE(process.processor.value);
}

// Another user's ones need root: tests/check/rules/probe-users and probe_test.py have some.
TEST(Starters, AreTheUsersOfProcessesThatNoneOfThemStarted)
{
    const pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
        pause();
        _exit(0);
    }
    const std::vector<uid_t> self{getuid()};
    EXPECT_EQ(startersof({child}), self);
    EXPECT_EQ(startersof({child, getpid()}), self);
    EXPECT_EQ(startersof({getpid(), child}), self);
    kill(child, SIGKILL);
    waitpid(child, nullptr, 0);
    EXPECT_TRUE(startersof({child}).empty()) << "it has ended";
    EXPECT_TRUE(startersof({}).empty());
}

TEST(Starters, AreToldByName)
{
    EXPECT_EQ(username(0), "root");
    EXPECT_EQ(username(4000000), "user 4000000");
}

TEST_F(Probe, MissesTheProcessOnlyWhereTheDaemonLooksForIt)
{
    answers("web", "echo web is running");
    answers("off", "echo off is stopped");
    probe({{.check = "NULL"}, {.check = "echo service: ok", .maxskips = "0"}, {.name = "off"}});
    EXPECT_EQ(rules(), strings{"probe-status warning"});
    probe({{.check = "echo service: ok"}});
    EXPECT_EQ(rules(), (strings{"probe-process warning", "probe-status warning"}));
}

TEST_F(Probe, RunsNothingOfAFileThatDoesNotLoad)
{
    view = readasdaemon(configuration({{}}) + "<>");
    ASSERT_EQ(view.targets.size(), 1U);
    ASSERT_FALSE(view.loaded);
    EXPECT_TRUE(probetargets(view, outputfolder().path(), found).empty());
    EXPECT_FALSE(probequestion(view));
    EXPECT_FALSE(fs::exists(stage / "calls"));
}

TEST_F(Probe, AsksHowManyCommandsItMayRun)
{
    view = readasdaemon(configuration({{}, {.check = "echo service: ok"}}));
    const std::string question = probequestion(view).value();
    EXPECT_TRUE(
        question.starts_with("The checks:\n  \"echo service: ok\"\nThis runs 3 commands as "))
        << question;
    EXPECT_NE(question.find("(2 status commands, 1 check), and pidof for 2 programs"),
              std::string::npos)
        << question;
    EXPECT_FALSE(fs::exists(stage / "calls"));
}

TEST_F(Probe, MeasuresHowLongCommandsTake)
{
    answers("web", "sleep 0.3; echo web is running");
    const auto taken = durationsof(probe({{.check = "echo service: ok"}, {.name = "other"}}));
    ASSERT_EQ(taken.size(), 2U);
    EXPECT_GE(taken[0].status, 0.3);
    EXPECT_TRUE(taken[0].functional);
    EXPECT_LT(taken[1].status, taken[0].status);
    EXPECT_FALSE(taken[1].functional);
    EXPECT_TRUE(durationsof({}).empty());
}

TEST_F(Probe, WritesInPlainWords)
{
    const commandprobe status{.command = "service web status",
                              .firstline = "web is running.",
                              .readable = true,
                              .state = 0,
                              .seconds = 0.02,
                              .result = kServiceRunning,
                              .reason = R"(contains "running" and not "not")"};
    const commandprobe check{.command = "ask",
                             .firstline = "",
                             .readable = true,
                             .state = -1,
                             .seconds = 1.5,
                             .result = kAnswerUnclear,
                             .reason = "nothing on the first line"};
    const processprobe process{.pid = 4711,
                               .counts = true,
                               .threads = {.value = 12, .threshold = 200},
                               .memory = {.value = 1755, .threshold = 262144},
                               .processor = {.value = {}, .threshold = 90000}};
    ASSERT_EQ(sysconf(_SC_PAGESIZE), 4096);
    ASSERT_EQ(sysconf(_SC_CLK_TCK), 100);
    EXPECT_EQ(written({{.name = "web",
                        .binarypath = "/usr/sbin/web",
                        .maxskips = "3",
                        .status = status,
                        .check = check,
                        .process = process}}),
              R"(web
  status     running: contains "running" and not "not"   (exit status 0, 0.02 s)
             "web is running."
  check      fails: nothing on the first line   (did not end normally, 1.50 s)
             nothing on the first line
  process    4711: threads 12 of 200, memory 1755 pages (6.9 MiB) of 262144 (1024 MiB), processor not known of 90000 (90 %)
             not busy: the check would be made
)");
}

TEST_F(Probe, WritesTheBeginningOfALongAnswer)
{
    const auto told = [](std::size_t bytes) {
        targetprobe probe;
        probe.status.firstline = std::string(bytes, 'x');
        probe.status.readable = true;
        return written({probe});
    };
    EXPECT_NE(told(160).find('"' + std::string(160, 'x') + "\"\n"), std::string::npos) << told(160);
    EXPECT_NE(told(161).find('"' + std::string(160, 'x') + "...\n"), std::string::npos)
        << told(161);
}

TEST_F(Probe, KeepsTheTerminalFromWhatCommandsAnswer)
{
    answers("web", R"(printf '\033[2J\377 is running\n')");
    const auto probes = probe({{.check = R"(printf '\033]0;x\007no\n')"}});
    const std::string text = written(probes);
    EXPECT_EQ(text.find('\033'), std::string::npos);
    EXPECT_NE(text.find(R"("\x1b[2J\xff is running")"), std::string::npos) << text;
    EXPECT_EQ(probejson(probes).at(0).at("status").at("line").at("hex"),
              "1b5b324aff2069732072756e6e696e67");
}

TEST_F(Probe, GivesOtherProgramsAllThatItKnows)
{
    answers("web", "echo web is running");
    const auto json = probejson(probe({{.check = "echo service: ok"}, {.name = "other"}}));
    ASSERT_EQ(json.size(), 2U);
    EXPECT_EQ(json[0]["name"], "web");
    EXPECT_EQ(json[0]["status"]["command"], "service web status");
    EXPECT_EQ(json[0]["status"]["result"], "running");
    EXPECT_EQ(json[0]["status"]["exit-status"], 0);
    EXPECT_EQ(json[0]["check"]["result"], "works");
    EXPECT_EQ(json[0]["check"]["reason"], R"(contains "service:")");
    EXPECT_TRUE(json[0]["process"]["pid"].is_null());
    EXPECT_TRUE(json[0]["process"]["threads"]["value"].is_null());
    EXPECT_EQ(json[0]["process"]["threads"]["threshold"], 200);
    EXPECT_TRUE(json[1]["check"].is_null());
    EXPECT_TRUE(probejson({targetprobe()})[0]["status"]["exit-status"].is_null()); // killed
}

} // namespace
