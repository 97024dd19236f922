#include "values.h"

#include <string>
#include <string_view>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "load.h"

namespace {

using check::daemonview;
using check::durations;
using check::findings;
using testing::ElementsAre;
using testing::IsEmpty;

// "RULE FIELD" of each finding, where the field is the element that its place stands in.
std::vector<std::string> foundin(const std::string& text)
{
    const daemonview view = check::readasdaemon(text);
    findings found({"unbounded-command"});
    check::checkvalues(view, found);
    std::vector<std::string> result;
    for (const check::finding& each : found.sorted()) {
        const std::size_t begin = text.rfind('<', each.place) + 1;
        result.push_back(std::string(each.rule) + " " +
                         text.substr(begin, text.find('>', begin) - begin));
    }
    return result;
}

std::string target(const std::string& monitored, const std::string& dependent = "")
{
    return "<wdmonitortarget><wdmonitorservice>" + monitored + "</wdmonitorservice>" + dependent +
           "</wdmonitortarget>";
}

std::string file(const std::string& targets)
{
    return "<wdtargets>" + targets + "</wdtargets>";
}

const std::string kBad = "<name>b/d</name><startcmd>null</startcmd>"
                         "<genpinginterval>0</genpinginterval>"
                         "<maxattemptofwakeup>1</maxattemptofwakeup>"
                         "<functionalpingcmd>NULL</functionalpingcmd>";

TEST(Values, AreFoundWhereTheyStand)
{
    EXPECT_THAT(foundin(file(target(kBad))),
                ElementsAre("service-name name", "null-spelling startcmd",
                            "interval-zero genpinginterval", "attempts-one maxattemptofwakeup"));
}

TEST(Values, AreNotFoundAgainWhereTheyAreCarriedOver)
{
    EXPECT_EQ(foundin(file(target(kBad))), foundin(file(target(kBad) + target(""))));
    EXPECT_EQ(foundin(file(target(kBad))),
              foundin(file(target(kBad) + "<wdmonitortarget></wdmonitortarget>")));
}

TEST(Values, AreNotFoundInEmptyElements)
{
    EXPECT_THAT(foundin(file(target("<name>a</name><genpinginterval></genpinginterval>"
                                    "<startcmd></startcmd><stopcmd> </stopcmd>"
                                    "<functionalpingcmd>NULL</functionalpingcmd>"))),
                IsEmpty());
    EXPECT_THAT(foundin(file(target(""))), IsEmpty());
}

TEST(Values, OfDependentServicesCountOnlyForTheirCommands)
{
    const std::string good = "<name>a</name><functionalpingcmd>NULL</functionalpingcmd>";
    EXPECT_THAT(foundin(file(target(good, "<wdmondependsev>" + kBad + "</wdmondependsev>"))),
                ElementsAre("service-name name", "null-spelling startcmd"));
}

TEST(Values, ThatAreNotLookedAtAreOnlyNotes)
{
    const std::string text =
        file(target("<name>a</name><functionalpingcmd>NULL</functionalpingcmd>"
                    "<funpinginterval>x</funpinginterval><MaxFPSkips>-1</MaxFPSkips>"
                    "<ThresholdMemoryUsage>0</ThresholdMemoryUsage>"
                    "<ThresholdThreadCount>y</ThresholdThreadCount>"));
    const daemonview view = check::readasdaemon(text);
    findings found;
    check::checkvalues(view, found);
    const auto sorted = found.sorted();
    ASSERT_EQ(sorted.size(), 2U);
    EXPECT_EQ(sorted[0].level, check::severity::note);
    EXPECT_EQ(sorted[1].level, check::severity::note);
}

TEST(Values, OfAnEarlierTargetAreComparedWithThoseOfTheSameName)
{
    const std::string none = "<functionalpingcmd>NULL</functionalpingcmd>";
    const std::string usual = "<name>a</name><startcmd>service a start</startcmd>" + none;
    const std::string null = "<name>a</name><startcmd>NULL</startcmd>" + none;
    const std::string other = "<name>a</name><startcmd>x</startcmd>" + none;
    const auto dependent = [](const std::string& fields) {
        return "<wdmondependsev>" + fields + "</wdmondependsev>";
    };
    EXPECT_THAT(foundin(file(target(usual) + target("<name>b</name>" + none, dependent(null)))),
                IsEmpty());
    EXPECT_THAT(foundin(file(target(usual) + target("<name>b</name>" + none, dependent(other)))),
                ElementsAre("conflicting-commands startcmd"));
    EXPECT_THAT(foundin(file(target(usual) + target(other))),
                ElementsAre("duplicate-service name"));
}

// A monitored service with a check and these fields.
std::string checked(const std::string& fields)
{
    return file(target("<name>a</name><functionalpingcmd>ask</functionalpingcmd>"
                       "<MaxFPSkips>3</MaxFPSkips>" +
                       fields));
}

TEST(Values, OfOnePauseMayBeNothingIfThereIsTheOther)
{
    const std::string none = "<genpinginterval>0</genpinginterval>";
    EXPECT_THAT(foundin(checked(none + "<funpinginterval>1</funpinginterval>")), IsEmpty());
    EXPECT_THAT(foundin(checked(none + "<funpinginterval>0</funpinginterval>")),
                ElementsAre("interval-zero genpinginterval"));
}

TEST(Values, OfThresholdsLookLikePerCentUpToAHundred)
{
    const auto processor = [](const std::string& value) {
        return foundin(
            checked("<ThresholdAverageCPUUsage>" + value + "</ThresholdAverageCPUUsage>"));
    };
    EXPECT_THAT(processor("100"), ElementsAre("threshold-unit ThresholdAverageCPUUsage"));
    EXPECT_THAT(processor("101"), IsEmpty());
}

TEST(Values, OfMemoryLookLikeBytesOnlyAsWholeMebibytes)
{
    const auto memory = [](const std::string& value) {
        return foundin(checked("<ThresholdMemoryUsage>" + value + "</ThresholdMemoryUsage>"));
    };
    EXPECT_THAT(memory("100"), ElementsAre("threshold-unit ThresholdMemoryUsage"));
    EXPECT_THAT(memory("101"), IsEmpty());
    EXPECT_THAT(memory("1073741824"), ElementsAre("threshold-unit ThresholdMemoryUsage"));
    EXPECT_THAT(memory("2147483647"), IsEmpty()); // what switches it off
}

TEST(Values, BelowAllMeasureAreNegative)
{
    EXPECT_THAT(foundin(checked("<genpinginterval>-99999999999</genpinginterval>"
                                "<funpinginterval>99999999999</funpinginterval>")),
                ElementsAre("negative-number genpinginterval", "number-range funpinginterval"));
}

TEST(Values, OfADependentTellWhetherItIsStartedAgain)
{
    const auto dependent = [](const std::string& start, const std::string& stop) {
        return foundin(
            file(target("<name>a</name><functionalpingcmd>NULL</functionalpingcmd>",
                        "<wdmondependsev><name>b</name><startcmd>" + start +
                            "</startcmd><stopcmd>" + stop + "</stopcmd></wdmondependsev>")));
    };
    EXPECT_THAT(dependent("true", "stop b"), ElementsAre("dependent-not-started startcmd"));
    EXPECT_THAT(dependent("stop b", "stop b"), ElementsAre("dependent-not-started startcmd"));
    EXPECT_THAT(dependent("restart b", "restart b"), IsEmpty());
    EXPECT_THAT(dependent("true", "true"), IsEmpty()); // nothing stops it either
    EXPECT_THAT(dependent("NULL", "stop b"), IsEmpty());
}

// Nobody runs the check of a dependent.
TEST(Values, OnlyWhatIsRunNeedsATimeLimit)
{
    const auto unbounded = [](const std::string& monitored, const std::string& dependent) {
        const std::string commands =
            "<startcmd>timeout 9 a</startcmd><stopcmd>timeout 9 b</stopcmd>"
            "<functionalpingcmd>";
        const std::string end = "</functionalpingcmd>";
        const std::string text = file(target("<name>a</name>" + commands + monitored + end,
                                             "<wdmondependsev><name>b</name>" + commands +
                                                 dependent + end + "</wdmondependsev>"));
        findings found;
        check::checkvalues(check::readasdaemon(text), found);
        return found.sorted().size();
    };
    EXPECT_EQ(unbounded("timeout 9 ask", "ask"), 0U);
    EXPECT_EQ(unbounded("ask", "ask"), 1U);
}

// Also where the service is a dependent in between.
TEST(Values, OfTwoTargetsOfOneServiceTheSecondIsFound)
{
    const std::string none = "<functionalpingcmd>NULL</functionalpingcmd>";
    const std::string web = target("<name>web</name>" + none);
    const std::string database =
        target("<name>db</name>" + none, "<wdmondependsev><name>web</name></wdmondependsev>");
    EXPECT_THAT(foundin(file(web + database)), IsEmpty());
    EXPECT_THAT(foundin(file(web + database + web)), ElementsAre("duplicate-service name"));
}

TEST(Values, OtherSpellingsOfNoCommandAreFoundInAnyCase)
{
    for (const char* const spelling : {"null", "Null", "NONE", "'NULL'", "N/A", "-"}) {
        EXPECT_THAT(foundin(checked(std::string("<stopcmd>") + spelling + "</stopcmd>")),
                    ElementsAre("null-spelling stopcmd"))
            << spelling;
    }
}

std::size_t starved(const std::string& text, const std::vector<durations>& measured)
{
    const daemonview view = check::readasdaemon(text);
    findings found;
    check::checkload(view, measured, found);
    return found.sorted().size();
}

const std::string kOften = "<name>a</name><genpinginterval>9</genpinginterval>"
                           "<funpinginterval>1</funpinginterval>"
                           "<maxattemptofwakeup>3</maxattemptofwakeup>"
                           "<functionalpingcmd>x</functionalpingcmd>";

TEST(Load, IsTheSumOfTheTargetsShares)
{
    const std::string two = file(target(kOften) + target(kOften));
    const durations half{.status = 4, .functional = 6};
    const durations less{.status = 4, .functional = 5};
    EXPECT_EQ(starved(two, {half, half}), 1U);
    EXPECT_EQ(starved(two, {half, less}), 0U);
    EXPECT_EQ(starved(two, {}), 0U) << "guesses are shorter";
}

TEST(Load, OfATargetWithoutPausesIsWhole)
{
    const std::string text =
        file(target("<name>a</name><genpinginterval>0</genpinginterval>"
                    "<funpinginterval>9</funpinginterval><maxattemptofwakeup>3</maxattemptofwakeup>"
                    "<functionalpingcmd>NULL</functionalpingcmd>"));
    EXPECT_EQ(starved(text, {}), 1U);
    EXPECT_EQ(starved(text, {durations{}}), 1U);
}

TEST(Load, IsNoneOfATargetThatIsNeverAsked)
{
    EXPECT_EQ(starved(file(target("<name>a</name>"
                                  "<genpinginterval>0</genpinginterval>"
                                  "<maxattemptofwakeup>0</maxattemptofwakeup>")),
                      {}),
              0U);
    EXPECT_EQ(starved("", {}), 0U);
}

} // namespace
