// What is wrong with the form of a file, beyond the one example of each rule.

#include "shape.h"

#include <string>
#include <string_view>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "document.h"

namespace {

using check::daemonview;
using check::findings;
using check::severity;
using check::sourcetext;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;

// "SEVERITY RULE PLACE" of each finding: the place as the text that stands there, to its ">".
std::vector<std::string> foundin(const std::string& text)
{
    const sourcetext source(text);
    const daemonview view = check::readasdaemon(text);
    findings found;
    check::checkshape(source, view, found);
    std::vector<std::string> result;
    for (const check::finding& each : found.sorted()) {
        const std::string_view level = each.level == severity::error     ? "error "
                                       : each.level == severity::warning ? "warning "
                                                                         : "note ";
        const std::string_view there = std::string_view(text).substr(each.place);
        result.push_back(std::string(level).append(each.rule).append(" ").append(
            there.substr(0, there.find('>') + 1)));
    }
    return result;
}

// The fields of a service, but for one.
std::string fields(const std::string& name, const std::string& missing = "")
{
    std::string text;
    for (const fieldelement& field : kFieldElements) {
        const std::string key(field.name);
        if (key == missing) {
            continue;
        }
        text.append("<").append(key).append(">");
        text.append(key == "name" ? name : key == "functionalpingcmd" ? "NULL" : "1");
        text.append("</").append(key).append(">");
    }
    return text;
}

std::string monitored(const std::string& name)
{
    return "<wdmonitorservice>" + fields(name) + "</wdmonitorservice>";
}

std::string dependent(const std::string& name)
{
    return "<wdmondependsev>" + fields(name) + "</wdmondependsev>";
}

std::string target(const std::string& services)
{
    return "<wdmonitortarget>" + services + "</wdmonitortarget>";
}

std::string file(const std::string& targets)
{
    return "<wdtargets>" + targets + "</wdtargets>";
}

TEST(Shape, OfASoundFileIsSilent)
{
    EXPECT_THAT(foundin(file(target(monitored("web") + dependent("db")) + target(monitored("a")))),
                IsEmpty());
}

TEST(Shape, NeedsARootAroundItAll)
{
    EXPECT_THAT(foundin(target(monitored("web"))), ElementsAre("error unfinished-file >"));
}

// Only the tag without blanks is the end.
TEST(Shape, NeedsTheRootsClosingTagAsItIs)
{
    EXPECT_THAT(foundin("<wdtargets>" + target(monitored("web")) + "</wdtargets >"),
                ElementsAre("warning unfinished-file </wdtargets >"));
}

TEST(Shape, IsLookedAtAlsoWhereTheLoadFails)
{
    EXPECT_THAT(foundin(file(target(dependent("db")) + "<>")),
                ElementsAre("error missing-service <wdmonitortarget>", "error empty-tag <>"));
}

// To the daemon it is a tag without a name, to everybody else a redirection.
TEST(Shape, TellsOfALoadThatFailsAtWhatIsNoTag)
{
    const std::string command = "<startcmd>a <b/> c</startcmd>";
    const std::string text = file(target("<wdmonitorservice>" + command + "</wdmonitorservice>"));
    ASSERT_FALSE(check::readasdaemon(text).loaded);
    EXPECT_THAT(foundin(text), Contains("error empty-tag <b/>"));
}

TEST(Shape, TellsOnceOfAllThatFollowsTheRoot)
{
    EXPECT_THAT(foundin(file(target(monitored("web"))) + "x" + target(monitored("db")) + "y"),
                ElementsAre("warning trailing-text x<wdmonitortarget>"));
}

TEST(Shape, TellsWhatAMissingFieldMeans)
{
    const auto message = [](const std::string& missing) {
        const std::string text =
            file(target("<wdmonitorservice>" + fields("web", missing) + "</wdmonitorservice>"));
        findings found;
        check::checkshape(sourcetext(text), check::readasdaemon(text), found);
        return found.sorted().at(0).message;
    };
    EXPECT_EQ(message("ThresholdMemoryUsage"),
              "ThresholdMemoryUsage is missing in \"web\": at the "
              "start it is empty (0: always exceeded); write it here");
    EXPECT_EQ(message("maxattemptofwakeup"),
              "maxattemptofwakeup is missing in \"web\": at the start it is empty (0: the service "
              "is given up at once and never asked); write it here");
    EXPECT_EQ(message("stopcmd"), "stopcmd is missing in \"web\": at the start it is empty "
                                  "(nothing stops the service); write it here");
}

// A comment whose "/" ends the monitored service: its tags are read.
TEST(Shape, TellsOfADependentThatNobodyMeant)
{
    const std::string text =
        file(target("<wdmonitorservice>" + fields("web") + "<!-- as of 5/6 > " + dependent("db") +
                    " --></wdmonitorservice>"));
    const daemonview view = check::readasdaemon(text);
    ASSERT_EQ(view.targets.size(), 1U);
    ASSERT_EQ(view.targets[0].dependents.size(), 1U);
    const sourcetext source(text);
    findings found;
    check::checkshape(source, view, found);
    const auto sorted = found.sorted();
    ASSERT_FALSE(sorted.empty());
    EXPECT_THAT(sorted.front().message,
                testing::HasSubstr("target \"web\" (line 1) gets a dependent that nobody meant"));
    EXPECT_EQ(sorted.front().level, severity::error);
}

// The first comment is harmless, the second one ends the target.
TEST(Shape, PutsALostDependentDownToWhatIsBeforeIt)
{
    EXPECT_THAT(foundin("<wdtargets><!-- x --><wdmonitortarget>" + monitored("web") +
                        "<!-- a/b -->" + dependent("db") + "</wdmonitortarget></wdtargets>"),
                ElementsAre("note comment <!-- x -->", "error comment <!-- a/b -->"));
}

// Text between elements is harmless.
TEST(Shape, BlamesForALostTargetWhatStaysOpenInsideIt)
{
    EXPECT_THAT(foundin(file(target(monitored("web") + "text<group>" + dependent("db")))),
                ElementsAre("warning stray-text text<group>", "error unknown-element <group>"));
}

} // namespace
