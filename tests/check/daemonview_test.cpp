// The daemon at its work, watched: which value comes from where.

#include "daemonview.h"

#include <filesystem>
#include <iterator>
#include <string>

#include <gtest/gtest.h>

#include "xmlparser.h"

using namespace check;

namespace {

class DaemonView : public ::testing::Test {
protected:
    // Where `piece` stands in `text` for the given time.
    static std::size_t in(const std::string& text, const std::string& piece, int time = 1)
    {
        std::size_t place = text.find(piece);
        for (; time > 1; --time) {
            place = text.find(piece, place + 1);
        }
        return place;
    }

    const std::size_t name = fieldindex("name");
    const std::size_t startcmd = fieldindex("startcmd");
};

TEST_F(DaemonView, TellsWhereValuesComeFrom)
{
    const std::string text = "<wdtargets><wdmonitortarget><wdmonitorservice><name> web </name>"
                             "<startcmd></startcmd></wdmonitorservice><wdmondependsev>"
                             "<name>db</name></wdmondependsev></wdmonitortarget></wdtargets>";
    const daemonview view = readasdaemon(text);
    ASSERT_TRUE(view.loaded);
    ASSERT_EQ(view.targets.size(), 1U);
    const targetview& target = view.targets[0];
    EXPECT_EQ(target.begin, in(text, "<wdmonitortarget>"));
    EXPECT_EQ(target.end, in(text, "</wdmonitortarget>"));
    EXPECT_EQ(target.monitored.begin, in(text, "<wdmonitorservice>"));
    EXPECT_EQ(target.monitored.end, in(text, "</wdmonitorservice>"));
    EXPECT_EQ(target.monitored.record->name, "web");
    EXPECT_EQ(target.monitored.origins[name].element, in(text, "<name>"));
    EXPECT_EQ(target.monitored.origins[name].text, in(text, "web"));
    EXPECT_EQ(target.monitored.record->startcmd, ">");
    EXPECT_EQ(target.monitored.origins[startcmd].element, in(text, "<startcmd>"));
    EXPECT_EQ(target.monitored.origins[startcmd].text, in(text, "</name>") + 6);
    ASSERT_EQ(target.dependents.size(), 1U);
    EXPECT_EQ(target.dependents[0].begin, in(text, "<wdmondependsev>"));
    EXPECT_EQ(target.dependents[0].record->name, "db");
    EXPECT_EQ(target.dependents[0].origins[name].text, in(text, "db"));
    EXPECT_EQ(target.dependents[0].origins[startcmd].element, kNoPlace);
}

TEST_F(DaemonView, CarriedValuesKeepTheirOrigin)
{
    const std::string text =
        "<wdtargets><wdmonitortarget><wdmonitorservice><name>web</name><startcmd>go</startcmd>"
        "</wdmonitorservice></wdmonitortarget><wdmonitortarget><wdmonitorservice><name>db</name>"
        "</wdmonitorservice></wdmonitortarget><wdmonitortarget></wdmonitortarget></wdtargets>";
    const daemonview view = readasdaemon(text);
    ASSERT_EQ(view.targets.size(), 3U);
    EXPECT_EQ(view.targets[1].monitored.record->startcmd, "go");
    EXPECT_EQ(view.targets[1].monitored.origins[startcmd].text, in(text, "go"));
    EXPECT_EQ(view.targets[2].monitored.record->name, "db");
    EXPECT_EQ(view.targets[2].monitored.begin, kNoPlace);
}

TEST_F(DaemonView, AFieldOutsideAServiceIsTheNextDependents)
{
    const std::string text =
        "<wdtargets><wdmonitortarget><wdmonitorservice><name>web</name></wdmonitorservice>"
        "<name>lost</name><wdmondependsev></wdmondependsev></wdmonitortarget></wdtargets>";
    const targetview target = readasdaemon(text).targets.at(0);
    EXPECT_EQ(target.monitored.origins[name].text, in(text, "web"));
    EXPECT_EQ(target.dependents.at(0).record->name, "lost");
    EXPECT_EQ(target.dependents.at(0).origins[name].element, in(text, "<name>", 2));
    EXPECT_EQ(target.dependents.at(0).origins[name].text, in(text, "lost"));
}

TEST_F(DaemonView, EachReadingIsThatOfADaemonThatHasJustStarted)
{
    readasdaemon("<wdtargets><wdmonitortarget><wdmonitorservice><name>old</name><b></wdtargets>");
    const daemonview view =
        readasdaemon("<wdtargets><wdmonitortarget></wdmonitortarget></wdtargets>");
    ASSERT_EQ(view.targets.size(), 1U);
    EXPECT_EQ(view.targets[0].monitored.record->name, "");
    EXPECT_TRUE(view.neverclosed.empty());
}

TEST_F(DaemonView, KnowsWhatIsNeverClosed)
{
    const std::string text = "<wdtargets><!-- a --><b>x</b></wdtargets>";
    const daemonview view = readasdaemon(text);
    EXPECT_EQ(view.neverclosed, (std::vector<std::size_t>{in(text, "<!--"), in(text, "<b>")}));
}

TEST_F(DaemonView, TellsWhyALoadFails)
{
    const std::string text = "<wdtargets><wdmonitortarget></wdmonitortarget><name/></wdtargets>";
    const daemonview view = readasdaemon(text);
    EXPECT_FALSE(view.loaded);
    EXPECT_EQ(view.failure, in(text, "<name/>"));
    EXPECT_EQ(view.targets.size(), 1U);
}

TEST_F(DaemonView, LeavesNoFileOpen)
{
    const auto open = [] {
        return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
    };
    const auto before = open();
    readasdaemon("<wdtargets></wdtargets>");
    readasdaemon("<wdtargets><></wdtargets>");
    EXPECT_EQ(open(), before);
}

TEST_F(DaemonView, NothingIsRead)
{
    const daemonview view = readasdaemon("");
    EXPECT_TRUE(view.loaded);
    EXPECT_TRUE(view.targets.empty());
    EXPECT_TRUE(xmlparser::allservices.empty());
}

} // namespace
