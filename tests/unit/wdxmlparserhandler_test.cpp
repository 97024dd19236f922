// The handler, fed by hand and, for what a file makes of it, by the real reader.

#include "wdxmlparserhandler.h"

#include <array>
#include <fstream>
#include <iterator>
#include <stdexcept>

#include "daemontest.h"
#include "wdsettings.h"
#include "xmlparser.h"

namespace {

constexpr std::array<const char*, 16> kFields{
    "name",
    "binarypath",
    "startcmd",
    "stopcmd",
    "functionalpingcmd",
    "genpinginterval",
    "funpinginterval",
    "maxattemptofwakeup",
    "messageformat",
    "hackmessagehandler",
    "sendmessagehandler",
    "MaxFPSkips",
    "ThresholdAverageCPUUsage",
    "ThresholdMemoryUsage",
    "ThresholdThreadCount",
    "ThresholdHandleCount",
};

std::string element(const std::string& name, const std::string& text)
{
    return "<" + name + ">" + text + "</" + name + ">\n";
}

// A service element in which every field holds its own name and `mark`, but for the name.
std::string fullservice(const std::string& kind, const std::string& name, const std::string& mark)
{
    std::string fields = element("name", name);
    for (std::size_t i = 1; i < kFields.size(); ++i) {
        fields += element(kFields.at(i), kFields.at(i) + mark);
    }
    return element(kind, fields);
}

std::string document(const std::string& content)
{
    return "<?xml version='1.0'?>\n" + element("wdtargets", "\n" + content);
}

std::string targetof(const std::string& content)
{
    return element("wdmonitortarget", "\n" + content);
}

std::string monitored(const std::string& fields)
{
    return element("wdmonitorservice", "\n" + fields);
}

std::string dependent(const std::string& fields)
{
    return element("wdmondependsev", "\n" + fields);
}

std::vector<std::string> names(const std::vector<service>& services)
{
    std::vector<std::string> all;
    all.reserve(services.size());
    for (const auto& svc : services) {
        all.push_back(svc.name);
    }
    return all;
}

std::vector<std::string> targetnames()
{
    std::vector<std::string> all;
    all.reserve(xmlparser::alltargets.size());
    for (const auto& one : xmlparser::alltargets) {
        all.push_back(one.monitoredservice.name);
    }
    return all;
}

using Names = std::vector<std::string>;

class Handler : public DaemonTest {
protected:
    Handler() : DaemonTest("wdxmlparserhandler") {}

    void load(const std::string& text)
    {
        folder.write("config.xml", text);
        EXPECT_EQ(xmlparser::parse(folder.path("config.xml")), 0);
    }

    // One field element, as the reader delivers it.
    static void field(const std::string& name, const std::string& text)
    {
        startElement(name);
        characters(text);
        endElement(name);
    }
};

void expectfull(const service& svc, const std::string& name, const std::string& mark)
{
    EXPECT_EQ(svc.name, name);
    EXPECT_EQ(svc.binarypath, "binarypath" + mark);
    EXPECT_EQ(svc.startcmd, "startcmd" + mark);
    EXPECT_EQ(svc.stopcmd, "stopcmd" + mark);
    EXPECT_EQ(svc.functionalpingcmd, "functionalpingcmd" + mark);
    EXPECT_EQ(svc.genpinginterval, "genpinginterval" + mark);
    EXPECT_EQ(svc.funpinginterval, "funpinginterval" + mark);
    EXPECT_EQ(svc.maxattemptofwakeup, "maxattemptofwakeup" + mark);
    EXPECT_EQ(svc.messageformat, "messageformat" + mark);
    EXPECT_EQ(svc.hackmessagehandler, "hackmessagehandler" + mark);
    EXPECT_EQ(svc.sendmessagehandler, "sendmessagehandler" + mark);
    EXPECT_EQ(svc.MaxFPSkips, "MaxFPSkips" + mark);
    EXPECT_EQ(svc.ThresholdAverageCPUUsage, "ThresholdAverageCPUUsage" + mark);
    EXPECT_EQ(svc.ThresholdMemoryUsage, "ThresholdMemoryUsage" + mark);
    EXPECT_EQ(svc.ThresholdThreadCount, "ThresholdThreadCount" + mark);
    EXPECT_EQ(svc.ThresholdHandleCount, "ThresholdHandleCount" + mark);
}

TEST_F(Handler, DocumentWithADependentFillsEveryFieldOfBoth)
{
    load(document(targetof(fullservice("wdmonitorservice", "webagent", "-m") +
                           fullservice("wdmondependsev", "datastore", "-d"))));
    ASSERT_EQ(xmlparser::alltargets.size(), 1U);
    const auto& loaded = xmlparser::alltargets.front();
    expectfull(loaded.monitoredservice, "webagent", "-m");
    ASSERT_EQ(loaded.dependentservices.size(), 1U);
    expectfull(loaded.dependentservices.front(), "datastore", "-d");
    EXPECT_EQ(names(xmlparser::allservices), (Names{"webagent", "datastore"}));
    expectfull(xmlparser::allservices[0], "webagent", "-m");
    expectfull(xmlparser::allservices[1], "datastore", "-d");
}

TEST_F(Handler, FieldsMayComeInAnyOrder)
{
    for (const auto* name : {"ThresholdHandleCount", "name", "name", "stopcmd", "startcmd"}) {
        field(name, name);
    }
    EXPECT_EQ(monservicedep.ThresholdHandleCount, "ThresholdHandleCount");
    EXPECT_EQ(monservicedep.name, "name");
    EXPECT_EQ(monservicedep.stopcmd, "stopcmd");
    EXPECT_EQ(monservicedep.startcmd, "startcmd");
    EXPECT_TRUE(xercecstack.empty());
}

TEST_F(Handler, ServicesAreListedOnceInOrderOfAppearance)
{
    std::string targets;
    Names expected;
    for (int i = 0; i < 500; ++i) {
        const std::string name = "service" + std::to_string(i);
        const std::string known = "service" + std::to_string(i / 2);
        targets += targetof(fullservice("wdmonitorservice", name, "") +
                            fullservice("wdmondependsev", known, ""));
        expected.push_back(name);
    }
    load(document(targets));
    EXPECT_EQ(names(xmlparser::allservices), expected);
}

TEST_F(Handler, SampleConfigurationSaysEverythingOfBothItsServices)
{
    const std::string sample = SAMPLE_CONFIGURATION;
    ASSERT_EQ(xmlparser::parse(sample), 0);
    ASSERT_EQ(xmlparser::alltargets.size(), 1U);
    EXPECT_EQ(names(xmlparser::allservices), (Names{"redis-server", "nginx"}));
    EXPECT_EQ(names(xmlparser::alltargets[0].dependentservices), (Names{"nginx"}));
    EXPECT_TRUE(xercecstack.empty());
    std::ifstream file(sample);
    const std::string text{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
    for (const std::string name : kFields) {
        const std::string open = "<" + name + ">";
        const std::size_t first = text.find(open);
        ASSERT_NE(first, std::string::npos) << name;
        EXPECT_NE(text.find(open, first + 1), std::string::npos) << name;
        EXPECT_EQ(text.find(open + "</"), std::string::npos) << name;
    }
}

TEST_F(Handler, WellFormedDocumentLeavesNoElementOpen)
{
    load(document(targetof(fullservice("wdmonitorservice", "web", ""))));
    EXPECT_TRUE(xercecstack.empty());
}

TEST_F(Handler, SharedDependentIsOneServiceButEachTargetsOwn)
{
    load(document(targetof(monitored(element("name", "a")) +
                           dependent(element("name", "shared") + element("stopcmd", "first"))) +
                  targetof(monitored(element("name", "b")) +
                           dependent(element("name", "shared") + element("stopcmd", "second")))));
    EXPECT_EQ(names(xmlparser::allservices), (Names{"a", "shared", "b"}));
    EXPECT_EQ(xmlparser::allservices[1].stopcmd, "first");
    EXPECT_EQ(xmlparser::alltargets[0].dependentservices[0].stopcmd, "first");
    EXPECT_EQ(xmlparser::alltargets[1].dependentservices[0].stopcmd, "second");
}

TEST_F(Handler, ServicesKeepTheOrderOfFirstAppearance)
{
    load(document(targetof(dependent(element("name", "d1")) + dependent(element("name", "d2")) +
                           monitored(element("name", "m"))) +
                  targetof(monitored(element("name", "d2")))));
    EXPECT_EQ(names(xmlparser::allservices), (Names{"m", "d1", "d2"}));
    EXPECT_EQ(names(xmlparser::alltargets[0].dependentservices), (Names{"d1", "d2"}));
    EXPECT_TRUE(xmlparser::alltargets[1].dependentservices.empty());
}

TEST_F(Handler, SecondDependentInheritsWhatItDoesNotSay)
{
    load(document(targetof(fullservice("wdmonitorservice", "m", "-m") +
                           fullservice("wdmondependsev", "d1", "-d") +
                           dependent(element("name", "d2")))));
    expectfull(xmlparser::alltargets[0].dependentservices[1], "d2", "-d");
}

TEST_F(Handler, DependentOfALaterTargetInheritsToo)
{
    load(document(targetof(fullservice("wdmonitorservice", "m1", "-m") +
                           fullservice("wdmondependsev", "d1", "-d")) +
                  targetof(monitored(element("name", "m2")) + dependent(element("name", "d2")))));
    expectfull(xmlparser::alltargets[1].dependentservices[0], "d2", "-d");
}

TEST_F(Handler, SecondMonitoredServiceInheritsWhatItDoesNotSay)
{
    load(document(
        targetof(monitored(element("name", "a") + element("functionalpingcmd", "check-a"))) +
        targetof(monitored(element("name", "b")))));
    EXPECT_EQ(xmlparser::alltargets[1].monitoredservice.name, "b");
    EXPECT_EQ(xmlparser::alltargets[1].monitoredservice.functionalpingcmd, "check-a");
}

TEST_F(Handler, ValuesCarryOverToTheNextLoad)
{
    load(document(targetof(fullservice("wdmonitorservice", "old", "-old"))));
    load(document(targetof(monitored(element("name", "new")))));
    expectfull(xmlparser::alltargets[0].monitoredservice, "new", "-old");
}

TEST_F(Handler, TargetWithoutAServiceGetsThePreviousOne)
{
    load(document(targetof(monitored(element("name", "a"))) + targetof("")));
    EXPECT_EQ(targetnames(), (Names{"a", "a"}));
}

TEST_F(Handler, EmptyElementBehindAnEndTagStoresABracket)
{
    load(document(targetof(monitored(element("name", "a") + element("MaxFPSkips", "5") +
                                     "<messageformat></messageformat>"))));
    EXPECT_EQ(xmlparser::alltargets[0].monitoredservice.messageformat, ">");
}

TEST_F(Handler, EmptyElementBeforeTheFirstEndTagStoresTheEmptyText)
{
    load(document(targetof(monitored("<name></name>" + element("startcmd", "x")))));
    EXPECT_EQ(xmlparser::alltargets[0].monitoredservice.name, "");
}

TEST_F(Handler, EmptyElementBeforeTheFirstEndTagOfALaterLoadStoresTheLastTokenBefore)
{
    load(document(targetof(monitored(element("name", "a")))));
    load(document(targetof(monitored("<name></name>"))));
    EXPECT_EQ(xmlparser::alltargets[0].monitoredservice.name, ">");
}

TEST_F(Handler, FieldDirectlyInATargetIsTheDependents)
{
    load(document(targetof(monitored(element("name", "m") + element("startcmd", "start-m")) +
                           element("startcmd", "stray") + dependent(element("name", "d")))));
    EXPECT_EQ(xmlparser::alltargets[0].monitoredservice.startcmd, "start-m");
    EXPECT_EQ(xmlparser::alltargets[0].dependentservices[0].startcmd, "stray");
}

TEST_F(Handler, UnknownElementLosesItsTargetAndOnlyThat)
{
    load(document(targetof(monitored(element("name", "before"))) +
                  targetof(monitored(element("name", "lost") + element("comment", "x") +
                                     element("startcmd", "later"))) +
                  targetof(monitored(element("name", "after")) + dependent(element("name", "d")))));
    EXPECT_EQ(targetnames(), (Names{"before", "after"}));
    // What followed it went to the dependent's record.
    EXPECT_EQ(xmlparser::alltargets[1].dependentservices[0].startcmd, "later");
    EXPECT_EQ(xmlparser::alltargets[1].monitoredservice.startcmd, "");
}

TEST_F(Handler, UnknownElementStaysOpenForTheRestOfTheRun)
{
    load(document(targetof(monitored(element("comment", "x")))));
    EXPECT_EQ(xercecstack.size(), 4U);
    EXPECT_EQ(xercecstack.top(), "comment");
    load(document(targetof(monitored(element("name", "later")))));
    EXPECT_EQ(targetnames(), (Names{"later"}));
    EXPECT_EQ(xercecstack.size(), 4U);
}

TEST_F(Handler, CommentBetweenTargetsIsHarmless)
{
    load(document(targetof(monitored(element("name", "a"))) + "<!-- note -->\n" +
                  targetof(monitored(element("name", "b")))));
    EXPECT_EQ(targetnames(), (Names{"a", "b"}));
}

TEST_F(Handler, CommentInsideATargetLosesIt)
{
    load(document(targetof("<!-- note -->\n" + monitored(element("name", "a"))) +
                  targetof(monitored(element("name", "b")))));
    EXPECT_EQ(targetnames(), (Names{"b"}));
}

TEST_F(Handler, MisspeltClosingTagStillCloses)
{
    load(document(targetof(monitored("<name>a</nmae><startcmd>x</startcmd>"))));
    EXPECT_EQ(xmlparser::alltargets[0].monitoredservice.name, "a");
    EXPECT_EQ(xmlparser::alltargets[0].monitoredservice.startcmd, "x");
}

TEST_F(Handler, FieldNamesAreMatchedWithTheirCase)
{
    load(document(targetof(monitored(element("Name", "a")))));
    EXPECT_TRUE(xmlparser::alltargets.empty());
}

TEST_F(Handler, NoTargetMeansEmptyListsAndNoListing)
{
    load(document(""));
    EXPECT_TRUE(xmlparser::alltargets.empty());
    EXPECT_TRUE(xmlparser::allservices.empty());
    EXPECT_EQ(world.events(), "");
}

TEST_F(Handler, EmptyTagKeepsTheTargetsBeforeItAndNoServices)
{
    const std::string text = document(targetof(monitored(element("name", "a"))) +
                                      targetof(monitored("<name>b</name><stopcmd/>")));
    folder.write("config.xml", text);
    EXPECT_THROW(xmlparser::parse(folder.path("config.xml")), std::out_of_range);
    EXPECT_EQ(targetnames(), (Names{"a"}));
    EXPECT_TRUE(xmlparser::allservices.empty());
}

TEST_F(Handler, EndTagWithNothingOpenDoesNothing)
{
    characters("text");
    endElement("name");
    EXPECT_TRUE(xercecstack.empty());
    EXPECT_EQ(monitorservice.name, "");
    EXPECT_EQ(monservicedep.name, "");
}

TEST_F(Handler, FieldWithNothingAroundItIsTheDependents)
{
    field("name", "alone");
    EXPECT_TRUE(xercecstack.empty());
    EXPECT_EQ(monitorservice.name, "");
    EXPECT_EQ(monservicedep.name, "alone");
}

TEST_F(Handler, CharactersKeepTheLastTextEvenAnEmptyOne)
{
    characters("one");
    characters("two");
    EXPECT_EQ(charparse, "two");
    characters("");
    EXPECT_EQ(charparse, "");
}

TEST_F(Handler, TargetStartEmptiesTheDependentListAndNothingElse)
{
    monservicedepends.resize(2);
    monservicedep.name = "kept";
    monitorservice.name = "kept too";
    startElement("wdmonitortarget");
    EXPECT_TRUE(monservicedepends.empty());
    EXPECT_EQ(monservicedep.name, "kept");
    EXPECT_EQ(monitorservice.name, "kept too");
}

TEST_F(Handler, AddserviceKeepsTheFirstOfAName)
{
    std::vector<service> services;
    service first;
    first.name = "a";
    first.startcmd = "one";
    EXPECT_EQ(addservice(first, services), 1);
    service second = first;
    second.startcmd = "two";
    EXPECT_EQ(addservice(second, services), 0);
    second.name = "A";
    EXPECT_EQ(addservice(second, services), 1);
    EXPECT_EQ(names(services), (Names{"a", "A"}));
    EXPECT_EQ(services[0].startcmd, "one");
}

TEST_F(Handler, EmptyNamesDenoteTheSameService)
{
    std::vector<service> services{service{}};
    service commanded;
    commanded.startcmd = "something";
    EXPECT_EQ(addservice(commanded, services), 0);
    EXPECT_EQ(services[0].startcmd, "");
}

TEST_F(Handler, ValuesAreKeptAsTextWhateverTheySay)
{
    load(document(targetof(monitored(element("genpinginterval", "abc")))));
    EXPECT_EQ(xmlparser::alltargets[0].monitoredservice.genpinginterval, "abc");
}

TEST_F(Handler, CommandNeverGivenIsEmptyNotNull)
{
    load(document(targetof(monitored(element("name", "a")))));
    EXPECT_EQ(xmlparser::alltargets[0].monitoredservice.functionalpingcmd, "");
    EXPECT_NE(xmlparser::alltargets[0].monitoredservice.functionalpingcmd, kNoCommand);
}

// An end tag for the reader: the service ends there, and the service's end tag ends the target.
TEST_F(Handler, CommentWithASlashEndsTheServiceEarly)
{
    load(document(targetof(monitored(element("name", "good") + element("startcmd", "start-good"))) +
                  targetof(monitored(element("name", "web") + "<!-- see /etc/web -->\n" +
                                     element("startcmd", "start-web")) +
                           dependent(element("name", "d")))));
    ASSERT_EQ(targetnames(), (Names{"good", "web"}));
    EXPECT_EQ(xmlparser::alltargets[1].monitoredservice.startcmd, "start-good");
    EXPECT_TRUE(xmlparser::alltargets[1].dependentservices.empty());
}

TEST_F(Handler, EndOfDocumentRebuildsTheServices)
{
    xmlparser::allservices.resize(3);
    endDocument();
    EXPECT_TRUE(xmlparser::allservices.empty());
}

TEST_F(Handler, ListingShowsTargetThenDependents)
{
    load(document(targetof(fullservice("wdmonitorservice", "webagent", "-m") +
                           fullservice("wdmondependsev", "datastore", "-d"))));
    const std::string blank = "DEBUG [wdxmlparserhandler ] ";
    EXPECT_EQ(world.events(), lines({
                                  blank + std::string(64, '%') + "webagent",
                                  blank + std::string(30, '*') + ":webagent",
                                  blank + "binarypath-m",
                                  blank + "startcmd-m",
                                  blank + "stopcmd-m",
                                  blank + "functionalpingcmd-m",
                                  blank + "genpinginterval genpinginterval-m",
                                  blank + "funpinginterval funpinginterval-m",
                                  blank + "maxattemp maxattemptofwakeup-m",
                                  blank + "messageformat-m",
                                  "DEBUG Max number of FP skippable: MaxFPSkips-m",
                                  "DEBUG Threshold value of CPU usage: ThresholdAverageCPUUsage-m",
                                  "DEBUG Threshold value of thread count: ThresholdThreadCount-m",
                                  "DEBUG Threshold value of memory usage: ThresholdMemoryUsage-m",
                                  "DEBUG Threshold value of handle count: ThresholdHandleCount-m",
                                  blank + "datastore",
                                  blank + "binarypath-d",
                                  blank + "startcmd-d",
                                  blank + "stopcmd-d",
                                  blank + "functionalpingcmd-d",
                                  blank + "genpinginterval genpinginterval-d",
                                  blank + "funpinginterval funpinginterval-d",
                                  blank + "maxattempt maxattemptofwakeup-d",
                                  blank + "messageformat-d",
                                  "DEBUG Max number of FP skippable: MaxFPSkips-d",
                                  "DEBUG Threshold value of CPU usage: ThresholdAverageCPUUsage-d",
                                  "DEBUG Threshold value of thread count: ThresholdThreadCount-d",
                                  "DEBUG Threshold value of memory usage: ThresholdMemoryUsage-d",
                                  "DEBUG Threshold value of handle count: ThresholdHandleCount-d",
                              }));
}

TEST_F(Handler, LoadingIsSilentWithoutDebug)
{
    debugenable = false;
    load(document(targetof(fullservice("wdmonitorservice", "webagent", ""))));
    EXPECT_EQ(xmlparser::alltargets.size(), 1U);
    EXPECT_EQ(world.events(), "");
}

} // namespace
