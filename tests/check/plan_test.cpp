// The plan of a configuration: its figures, and how it is told.

#include "plan.h"

#include <ctime>
#include <sstream>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "wdsettings.h"

namespace {

using namespace check;

constexpr int kRefresh = 900;
constexpr long long kGreatest = 9223372036854775807LL;

std::string element(const std::string& name, const std::string& text)
{
    return "<" + name + ">" + text + "</" + name + ">";
}

// What a service says; the texts that are not given are those of a plain one.
struct fields {
    std::string name = "web";
    std::string program = "/usr/sbin/webd";
    std::string startcmd = "NULL";
    std::string stopcmd = "NULL";
    std::string check = "NULL";
    std::string general = "60";
    std::string functional = "60";
    std::string attempts = "3";
    std::string skips = "0";
    std::string processor = "90000";
    std::string memory = "262144";
    std::string threads = "200";
};

std::string record(const std::string& kind, const fields& given)
{
    return element(
        kind,
        element("name", given.name) + element("binarypath", given.program) +
            element("startcmd", given.startcmd) + element("stopcmd", given.stopcmd) +
            element("functionalpingcmd", given.check) + element("genpinginterval", given.general) +
            element("funpinginterval", given.functional) +
            element("maxattemptofwakeup", given.attempts) + element("MaxFPSkips", given.skips) +
            element("ThresholdAverageCPUUsage", given.processor) +
            element("ThresholdMemoryUsage", given.memory) +
            element("ThresholdThreadCount", given.threads));
}

std::string targetof(const fields& given, const std::vector<fields>& dependents = {})
{
    std::string content = record("wdmonitorservice", given);
    for (const fields& dependent : dependents) {
        content += record("wdmondependsev", dependent);
    }
    return element("wdmonitortarget", content);
}

class Plan : public ::testing::Test {
protected:
    Plan() { _tmp_file_path = kPingFolder; }

    std::vector<targetplan> planned(const std::string& targets)
    {
        view = readasdaemon(element("wdtargets", targets));
        return makeplan(view, kRefresh);
    }
    targetplan plannedone(const fields& given) { return planned(targetof(given)).at(0); }

    std::string told(const std::string& targets, bool colour = false)
    {
        std::ostringstream out;
        writeplan(out, planned(targets), colour);
        return out.str();
    }

    daemonview view;
};

void expectpart(const std::string& text, const std::string& part)
{
    EXPECT_NE(text.find(part), std::string::npos) << "no\n  " << part << "\nin\n" << text;
}

void expectnot(const std::string& text, const std::string& part)
{
    EXPECT_EQ(text.find(part), std::string::npos) << part << "\nin\n" << text;
}

// A row of the table of OPERATING.md: seconds from the outage, at worst, with three recoveries.
struct row {
    const char* general;
    const char* functional;
    bool check;
    long long noticed;
    long long first;
    long long second;
    long long givenup;
};

void expectrow(const outageplan& outage, const row& wanted)
{
    EXPECT_EQ(outage.noticed->seconds, wanted.noticed);
    ASSERT_EQ(outage.recoveries.size(), 3U);
    EXPECT_EQ(outage.recoveries[0].begins.seconds, wanted.first);
    EXPECT_EQ(outage.recoveries[1].begins.seconds, wanted.second);
    EXPECT_EQ(outage.givenup->seconds, wanted.givenup);
}

TEST_F(Plan, AServiceThatDoesNotRunIsToldAsInTheOperatorsTable)
{
    for (const row& wanted :
         {row{"10", "", false, 10, 220, 440, 670}, row{"10", "0", true, 10, 220, 440, 670},
          row{"60", "", false, 60, 270, 540, 870}, row{"60", "60", true, 120, 330, 600, 930},
          row{"60", "300", true, 360, 570, 840, 1170}, row{"300", "", false, 300, 510, 1020, 1830},
          row{"300", "300", true, 600, 810, 1320, 2130}}) {
        SCOPED_TRACE(std::string(wanted.general) + "/" + wanted.functional);
        const targetplan plan = plannedone({.check = wanted.check ? "ask" : "NULL",
                                            .general = wanted.general,
                                            .functional = wanted.functional});
        ASSERT_EQ(plan.outages.size(), wanted.check ? 2U : 1U);
        EXPECT_FALSE(plan.outages[0].functional);
        expectrow(plan.outages[0], wanted);
    }
}

TEST_F(Plan, AFailingCheckIsToldAsInTheOperatorsTable)
{
    for (const row& wanted :
         {row{"10", "0", true, 10, 220, 431, 643}, row{"60", "60", true, 120, 330, 601, 933},
          row{"60", "300", true, 360, 570, 1081, 1893},
          row{"300", "300", true, 600, 810, 1321, 2133}}) {
        SCOPED_TRACE(std::string(wanted.general) + "/" + wanted.functional);
        const targetplan plan = plannedone(
            {.check = "ask", .general = wanted.general, .functional = wanted.functional});
        ASSERT_EQ(plan.outages.size(), 2U);
        EXPECT_TRUE(plan.outages[1].functional);
        expectrow(plan.outages[1], wanted);
    }
}

TEST_F(Plan, WhatCommandsTakeIsCountedAsInTheOperatorsFormulas)
{
    const targetplan plan =
        plannedone({.check = "ask", .general = "7", .functional = "11", .attempts = "2"});
    const outageplan& general = plan.outages.at(0);
    EXPECT_EQ(general.noticed, (plannedtime{18, 1, 0}));
    EXPECT_EQ(general.recoveries[0].begins, (plannedtime{18 + 210, 1, 0}));
    EXPECT_EQ(general.recoveries[0].again, (plannedtime{18 + 210 + 7, 1, 1}));
    EXPECT_EQ(general.recoveries[0].recovered, (plannedtime{18 + 210 + 7 + 18, 2, 1}));
    EXPECT_EQ(general.round, (plannedtime{210 + 7, 0, 1}));
    EXPECT_EQ(general.givenup, (plannedtime{18 + 2 * 217, 1, 2}));

    const outageplan& functional = plan.outages.at(1);
    EXPECT_EQ(functional.noticed, (plannedtime{18, 1, 0}));
    EXPECT_EQ(functional.recoveries[0].begins, (plannedtime{18 + 210, 4, 0}));
    EXPECT_EQ(functional.recoveries[0].again, (plannedtime{18 + 210 + 1 + 11, 4, 1}));
    EXPECT_EQ(functional.recoveries[0].recovered, (plannedtime{18 + 210 + 1 + 11 + 11, 5, 1}));
    EXPECT_EQ(functional.round, (plannedtime{210 + 1 + 11, 4, 1}));
    EXPECT_EQ(functional.givenup, (plannedtime{18 + 2 * 222, 1 + 2 * 4 - 1, 2}));
}

TEST_F(Plan, ThePauseStandsBeforeARetriedPingAndBehindARetriedCheck)
{
    const targetplan plan = plannedone({.check = "ask"});
    const recoveryplan& general = plan.outages.at(0).recoveries.at(0);
    EXPECT_EQ(general.retries,
              (std::array<plannedtime, 3>{{{210, 1, 0}, {270, 1, 0}, {330, 1, 0}}}));
    const recoveryplan& functional = plan.outages.at(1).recoveries.at(0);
    EXPECT_EQ(functional.retries,
              (std::array<plannedtime, 3>{{{150, 1, 0}, {210, 2, 0}, {270, 3, 0}}}));
}

TEST_F(Plan, NobodyAsksAgainAfterTheLastRecovery)
{
    for (const outageplan& outage : plannedone({.check = "ask", .attempts = "2"}).outages) {
        ASSERT_EQ(outage.recoveries.size(), 2U);
        EXPECT_TRUE(outage.recoveries[0].again);
        EXPECT_FALSE(outage.recoveries[1].again);
        EXPECT_FALSE(outage.recoveries[1].recovered);
    }
    for (const outageplan& outage : plannedone({.check = "ask", .attempts = "1"}).outages) {
        ASSERT_EQ(outage.recoveries.size(), 1U);
        EXPECT_FALSE(outage.recoveries[0].again);
        EXPECT_TRUE(outage.givenup);
    }
}

TEST_F(Plan, OfManyRecoveriesTheFirstTheSecondAndTheLastAreTold)
{
    const targetplan plan = plannedone({.general = "10", .attempts = "100"});
    const auto& recoveries = plan.outages.at(0).recoveries;
    ASSERT_EQ(recoveries.size(), 3U);
    EXPECT_EQ(recoveries[2].number, 100);
    EXPECT_EQ(recoveries[2].begins.seconds, 10 + 210 + 99 * 220);
    EXPECT_EQ(plan.outages[0].givenup->seconds, 10 + 100 * 220);
    expectpart(told(targetof({.general = "10", .attempts = "100"})),
               "... a recovery every 220 s ...\n   22000 s  recovery 100 of 100 begins\n");
    expectnot(told(targetof({})), "... a recovery every");
}

TEST_F(Plan, NumbersBeyondAllMeasureDoNotOverflow)
{
    const targetplan plan = plannedone({.check = "ask",
                                        .general = "99999999999999999999",
                                        .functional = "4294967296",
                                        .attempts = "99999999999999999999",
                                        .skips = "99999999999"});
    EXPECT_EQ(plan.attempts, kGreatest);
    EXPECT_EQ(plan.every.seconds, 2 * 4294967295LL);
    EXPECT_EQ(plan.outages.at(0).givenup->seconds, kGreatest);
    EXPECT_EQ(plan.outages.at(1).givenup->recoveries, kGreatest);
    EXPECT_EQ(plan.check->skips, 2147483647);
    EXPECT_EQ(plan.check->unnoticed->seconds, kGreatest);
    EXPECT_EQ(kGreatest * (plannedtime{2, 1, 0}) + (plannedtime{1, 1, 1}),
              (plannedtime{kGreatest, kGreatest, 1}));
}

TEST_F(Plan, ATextThatBeginsWithANumberCountsAsTheDaemonCountsIt)
{
    const targetplan plan =
        plannedone({.check = "ask", .general = "60s", .functional = "x", .attempts = " 2 times"});
    EXPECT_EQ(plan.every, (plannedtime{60, 1, 0}));
    EXPECT_EQ(plan.attempts, 2);
}

TEST_F(Plan, IntervalsOfZeroAndLessAreNoPause)
{
    for (const char* const interval : {"0", "-5", "never"}) {
        const targetplan plan =
            plannedone({.check = "ask", .general = interval, .functional = interval});
        EXPECT_EQ(plan.every, (plannedtime{0, 1, 0}));
        EXPECT_EQ(plan.outages.at(0).givenup->seconds, 3 * 210);
        EXPECT_EQ(plan.outages.at(1).givenup->seconds, 3 * 211);
    }
    expectpart(told(targetof({.general = "0"})), "asked     without a pause between:");
}

TEST_F(Plan, WhoIsNeverAskedHasNoTimeLine)
{
    const targetplan zero = plannedone({.attempts = "0"});
    EXPECT_EQ(zero.state, watching::givenup);
    EXPECT_TRUE(zero.outages.empty());
    EXPECT_EQ(plannedone({.attempts = "three"}).state, watching::givenup);
    EXPECT_EQ(plannedone({.attempts = "-1"}).state, watching::spinning);

    const std::string word = told(targetof({.attempts = "three"}));
    expectpart(word, "never asked, for maxattemptofwakeup is \"three\", which counts as 0.");
    expectpart(word, "ERROR \"Failed to general recover the sevice web after try the max times.\"");
    expectnot(word, "when it does not run");
    const std::string negative = told(targetof({.attempts = "-1"}));
    expectpart(negative, "never asked, for maxattemptofwakeup is \"-1\".");
    expectpart(negative, "keeps a processor busy");
    expectnot(negative, "given up");
}

TEST_F(Plan, CommandsAreTheDaemonsWithTheirRedirections)
{
    const targetplan plan = plannedone({.check = "(ask && echo service: ok)"});
    EXPECT_EQ(plan.statuscommand, "service web status 1>/opt/varden/tolk/bin/agent.web "
                                  "2>/opt/varden/tolk/bin/agent.web");
    EXPECT_EQ(plan.check->command,
              "(ask && echo service: ok) 1>/opt/varden/tolk/bin/agent.functionalping.web "
              "2>/opt/varden/tolk/bin/agent.functionalping.web");
    EXPECT_FALSE(plannedone({}).check);
    expectpart(told(targetof({})), "checked   never: functionalpingcmd is NULL\n");
}

TEST_F(Plan, DependentsAreStoppedAndStartedInTheFilesOrder)
{
    const targetplan plan =
        planned(targetof({.startcmd = "begin web"},
                         {{.name = "one", .stopcmd = "end one"}, {.name = "two", .startcmd = ">"}}))
            .at(0);
    std::vector<std::string> commands;
    for (const recoverystep& step : plan.recovery) {
        commands.push_back(step.command);
        EXPECT_EQ(step.unlessdown, &step == &plan.recovery.front());
    }
    EXPECT_EQ(commands, (std::vector<std::string>{"service web stop", "end one", "service two stop",
                                                  "begin web", "service one start", ">"}));
    EXPECT_EQ(plannedone({}).recovery.size(), 2U);
}

TEST_F(Plan, AnEmptyCommandIsToldAsOneThatRunsNothing)
{
    const std::string text = told(element(
        "wdmonitortarget",
        element("wdmonitorservice", element("name", "web") + element("maxattemptofwakeup", "2"))));
    expectpart(text, "1. nothing is run to stop web\n");
    expectpart(text, "2. nothing is run to start web\n");
}

TEST_F(Plan, WithoutSkipsTheThresholdsDoNotCount)
{
    const targetplan plan = plannedone({.check = "ask", .skips = "none", .threads = "0"});
    EXPECT_EQ(plan.check->busy, busyness::never);
    EXPECT_EQ(plan.check->unnoticed, (plannedtime{120, 1, 0}));
    expectpart(told(targetof({.check = "ask"})), "never left out, however busy");
}

TEST_F(Plan, SkipsTellHowLongAFailureCanStayUnnoticed)
{
    const fields busy{.check = "ask", .skips = "5"};
    const targetplan plan = plannedone(busy);
    EXPECT_EQ(plan.check->busy, busyness::overthreshold);
    EXPECT_EQ(plan.check->unnoticed, (plannedtime{720, 1, 0}));
    EXPECT_EQ(plan.check->processorpercent,
              90000.0 / 10 / static_cast<double>(sysconf(_SC_CLK_TCK)));
    EXPECT_EQ(plan.check->memorybytes, 262144.0 * static_cast<double>(sysconf(_SC_PAGESIZE)));
    EXPECT_EQ(plan.check->threads, 200);
    EXPECT_EQ(plan.outages.at(1).noticed, (plannedtime{120, 1, 0}));
    expectpart(told(targetof(busy)), "at most 5 in a row");
    expectpart(told(targetof(busy)), "unnoticed for up to 720 s");
    expectpart(told(targetof(busy)), "(At 720 s if it is busy all the time");
}

// A process has one thread at least, one page, and used no processor if it sleeps; above the
// threshold is who has more.
TEST_F(Plan, TheLeastThresholdsAreNotAlwaysExceeded)
{
    const auto busy = [this](const fields& given) {
        return plannedone(given).check->busy;
    };
    EXPECT_EQ(busy({.check = "ask", .skips = "1", .processor = "0"}), busyness::overthreshold);
    EXPECT_EQ(busy({.check = "ask", .skips = "1", .memory = "1"}), busyness::overthreshold);
    EXPECT_EQ(busy({.check = "ask", .skips = "1", .threads = "1"}), busyness::overthreshold);
}

TEST_F(Plan, NegativeSkipsLeaveAFailureUnnoticedWithoutEnd)
{
    const fields busy{.check = "ask", .skips = "-1"};
    EXPECT_FALSE(plannedone(busy).check->unnoticed);
    EXPECT_TRUE(plannedone(busy).outages.at(1).noticed);
    expectpart(told(targetof(busy)), "unnoticed without end");
    EXPECT_EQ(planjson(planned(targetof(busy))).at(0).at("check").at("skips"), nullptr);
}

// The check that would prove a recovery is left out, and that counts as a success.
TEST_F(Plan, WhoIsAlwaysBusyIsNeverProvedToBeRecovered)
{
    for (const fields& busy :
         {fields{.check = "ask", .general = "7", .functional = "11", .skips = "2", .threads = "0"},
          fields{.check = "ask", .general = "7", .functional = "11", .skips = "2", .memory = "x"},
          fields{.check = "ask",
          .general = "7",
          .functional = "11",
          .skips = "2",
          .processor = "-1"}}) {
        const targetplan plan = plannedone(busy);
        EXPECT_EQ(plan.check->busy, busyness::always);
        const outageplan& outage = plan.outages.at(1);
        EXPECT_TRUE(outage.unproven);
        EXPECT_EQ(outage.noticed, (plannedtime{54, 1, 0}));
        ASSERT_EQ(outage.recoveries.size(), 1U);
        EXPECT_EQ(outage.recoveries[0].begins, (plannedtime{54 + 210, 4, 0}));
        EXPECT_EQ(outage.recoveries[0].recovered, (plannedtime{54 + 210 + 1 + 2 * 11, 4, 1}));
        EXPECT_EQ(outage.recoveries[0].again, (plannedtime{54 + 210 + 1 + 11 + 2 * 18, 4, 1}));
        EXPECT_EQ(outage.round, (plannedtime{210 + 1 + 11 + 2 * 18, 4, 1}));
        EXPECT_FALSE(outage.givenup);
        expectpart(told(targetof(busy)), "it is never given up");
    }
}

TEST_F(Plan, WhoIsAlwaysBusyIsGivenUpAllTheSameAfterAnOnlyRecovery)
{
    const targetplan plan =
        plannedone({.check = "ask", .attempts = "1", .skips = "2", .threads = "0"});
    EXPECT_FALSE(plan.outages.at(1).unproven);
    EXPECT_EQ(plan.outages.at(1).givenup, (plannedtime{360 + 210 + 1 + 60, 4, 1}));
}

TEST_F(Plan, WhoIsAlwaysBusyAndMayAlwaysBeLeftOutIsNeverChecked)
{
    const fields busy{.check = "ask", .skips = "-1", .threads = "0"};
    const outageplan outage = plannedone(busy).outages.at(1);
    EXPECT_FALSE(outage.noticed);
    EXPECT_TRUE(outage.recoveries.empty());
    EXPECT_FALSE(outage.givenup);
    expectpart(told(targetof(busy)), "never noticed: it is not checked");
}

TEST_F(Plan, ARefreshWaitsForTheLongestRoundOfTheOthers)
{
    const auto plans =
        planned(targetof({.general = "10"}) + targetof({.general = "50"}) +
                targetof({.general = "500", .attempts = "0"}) + targetof({.general = "30"}));
    ASSERT_EQ(plans.size(), 4U);
    EXPECT_EQ(plans[0].refresh, kRefresh);
    EXPECT_EQ(plans[0].othersround, 50);
    EXPECT_EQ(plans[1].othersround, 30);
    EXPECT_EQ(plans[2].othersround, 50);
    EXPECT_FALSE(plannedone({}).othersround);
    expectpart(told(targetof({})), "after the next refresh, at most 900 s later.\n");
}

TEST_F(Plan, WithoutATargetNothingIsWatched)
{
    EXPECT_TRUE(planned("").empty());
    expectpart(told(""), "Nothing is watched");
    EXPECT_EQ(planjson(planned("")).dump(), "[]");
}

TEST_F(Plan, OfAFileThatFailsToLoadNothingIsWatched)
{
    const std::string broken = targetof({}) + "<wdmonitortarget><></wdmonitortarget>";
    EXPECT_TRUE(planned(broken).empty());
    EXPECT_FALSE(view.loaded);
    expectpart(told(broken), "Nothing is watched");
}

TEST_F(Plan, OddBytesDoNotReachTheTerminal)
{
    const std::string direction = std::string("\xe2\x80") + "\xae"; // turns what follows it
    const std::string odd = "w\033[2J\xff" + direction + "b\nc";
    const std::string text = told(
        targetof({.name = odd, .program = odd, .startcmd = odd, .check = odd}, {{.name = odd}}) +
        targetof({.name = odd, .attempts = odd}));
    expectnot(text, "\033");
    expectnot(text, "\xff");
    expectnot(text, direction);
    expectpart(text, R"(service w\x1b[2J\xff\u{202e}b\x0ac status 1>)");
    const auto json = planjson(planned(targetof({.name = odd})));
    EXPECT_TRUE(json.at(0).at("name").contains("hex"));
    EXPECT_NO_THROW((void)json.dump());
}

TEST_F(Plan, ANameWithoutLettersIsToldAsSuch)
{
    const std::string nameless = element("wdmonitortarget", element("wdmonitorservice", ""));
    expectpart(told(nameless), "\n(no name)\n");
}

TEST_F(Plan, ColourIsForTheNamesOnly)
{
    const std::string coloured = told(targetof({}), true);
    expectpart(coloured, "\033[1mweb\033[m (/usr/sbin/webd)\n");
    std::string plain = coloured;
    plain.erase(plain.find("\033[1m"), 4);
    plain.erase(plain.find("\033[m"), 3);
    EXPECT_EQ(plain, told(targetof({})));
}

TEST_F(Plan, TheWholeTextOfAPlainTarget)
{
    const std::string text = told(targetof({.general = "10", .attempts = "2"}));
    const std::string wanted = R"(
web (/usr/sbin/webd)
  asked     every 10 s:
              service web status 1>/opt/varden/tolk/bin/agent.web 2>/opt/varden/tolk/bin/agent.web
  checked   never: functionalpingcmd is NULL
  recovered by these commands, one after the other. As long as they run, no service is
            asked, checked or recovered:
              1. service web stop
                 left out when the last status line said that it does not run
              2. service web start

  when it does not run
       0 s  it stops, just after it was asked
      10 s  noticed at the latest:
            ERROR "General ping failed for service web. Try to general ping more times now ..."
     100 s  asked again, retry 1 of 3
     160 s  asked again, retry 2 of 3
     220 s  asked again, retry 3 of 3
     220 s  recovery 1 of 2 begins
            ERROR "Try the general recover for service web"
     230 s  asked again
            if it runs, 10 s later:
            INFO "General ping failed for service web, but this service has been general recoverred successfully."
            if not: from "noticed" on once more
     440 s  recovery 2 of 2 begins
     450 s  given up, not asked once more, even if it runs now:
            ERROR "Failed to general recover the sevice web after try the max times."
            Until here, the commands of 2 recoveries come on top.
            It is watched again after the next refresh, at most 900 s later.
)";
    EXPECT_EQ(text.substr(text.find("\nweb")), wanted);
}

TEST_F(Plan, TheJsonHasTheDocumentedMembers)
{
    const auto json = planjson(planned(targetof({.check = "ask", .attempts = "2"})));
    ASSERT_EQ(json.size(), 1U);
    const auto& plan = json.at(0);
    EXPECT_EQ(plan.at("state"), "watched");
    EXPECT_EQ(plan.at("status").at("every").dump(), R"({"seconds":120,"checks":1,"recoveries":0})");
    EXPECT_EQ(plan.at("recovery").at(0).at("unless"), "down");
    EXPECT_EQ(plan.at("recovery").at(1).at("unless"), nullptr);
    EXPECT_EQ(plan.at("outages").at(0).at("kind"), "general");
    const auto& functional = plan.at("outages").at(1);
    EXPECT_EQ(functional.at("recoveries").at(0).at("retries").size(), 3U);
    EXPECT_EQ(functional.at("recoveries").at(1).at("again"), nullptr);
    EXPECT_EQ(functional.at("givenup").at("checks"), 8);
    EXPECT_EQ(functional.at("log").at("begins"), "Try the functional recover for service web");
    EXPECT_EQ(plan.at("refresh").dump(), R"({"seconds":900,"others":0})");
}

// Reads, plans and tells so many targets; returns the processor time for the latter two.
std::clock_t effort(int count)
{
    std::string targets;
    for (int i = 0; i < count; ++i) {
        targets += targetof({.name = "web" + std::to_string(i), .check = "ask"});
    }
    const daemonview view = readasdaemon(element("wdtargets", targets));
    const std::clock_t begin = std::clock();
    const auto plans = makeplan(view, kRefresh);
    std::ostringstream out;
    writeplan(out, plans, false);
    const auto json = planjson(plans);
    const std::clock_t end = std::clock();
    EXPECT_EQ(json.size(), static_cast<std::size_t>(count));
    EXPECT_EQ(plans.back().name, "web" + std::to_string(count - 1));
    return end - begin;
}

TEST_F(Plan, TenTimesAsManyTargetsAreAboutTenTimesTheWork)
{
    constexpr int kTargets = 300;
    constexpr std::clock_t kBetweenLinearAndSquare = 40;
    const std::clock_t few = effort(kTargets);
    EXPECT_LT(effort(10 * kTargets), kBetweenLinearAndSquare * few);
}

} // namespace
