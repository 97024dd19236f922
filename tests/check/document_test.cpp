// The plain reading of a file.

#include "document.h"

#include <string>

#include <gtest/gtest.h>

#include "daemonview.h"

using namespace check;

namespace {

const std::string kOpen = "<wdtargets><wdmonitortarget><wdmonitorservice>";
const std::string kClose = "</wdmonitorservice></wdmonitortarget></wdtargets>";

// The document of one service with these fields; the first field's value, or "-" where there is
// none.
std::string valueof(const std::string& fields)
{
    const std::string text = kOpen + fields + kClose;
    const document doc = readdocument(text);
    if (doc.targets.empty() || doc.targets[0].services.empty() ||
        doc.targets[0].services[0].fields.empty()) {
        return "-";
    }
    return doc.targets[0].services[0].fields[0].value;
}

std::string kinds(const std::string& fields)
{
    constexpr std::array<const char*, 19> kNames{
        "comment",    "cdata",        "doctype",     "instruction", "attribute",
        "entity",     "emptytag",     "unknown",     "lessthan",    "brokentag",
        "mismatched", "strayclosing", "lateclosing", "unclosed",    "misplaced",
        "lostfield",  "straytext",    "trailing",    "unfinished"};
    std::string list;
    const std::string text = kOpen + fields + kClose;
    for (const oddity& odd : readdocument(text).oddities) {
        list +=
            std::string(list.empty() ? "" : " ") + kNames.at(static_cast<std::size_t>(odd.kind));
    }
    return list;
}

TEST(Document, ValuesAreWhatTheirTextMeans)
{
    EXPECT_EQ(valueof("<name> web \n</name>"), "web");
    EXPECT_EQ(valueof("<name>a<!-- b -->c</name>"), "ac");
    EXPECT_EQ(valueof("<name><![CDATA[a < b]]></name>"), "a < b");
    EXPECT_EQ(valueof("<name>a &amp;&lt;&#65;&#x42;&#8364; &b; &</name>"), "a &<AB€ &b; &");
    EXPECT_EQ(valueof("<name>&#228;&#xe4;&#128512;</name>"), "ää😀");
    EXPECT_EQ(valueof("<name>&#x110000;</name>"), "&#x110000;"); // beyond the last one
    EXPECT_EQ(valueof("<name>a < b</name>"), "a < b");
    EXPECT_EQ(valueof("<name>a </b >c</name>"), "a </b >c");
    EXPECT_EQ(valueof("<name>a <b >c</name>"), "a <b >c");
    EXPECT_EQ(valueof("<name x='>'>web</name>"), "'>web"); // as everybody's daemon reads it
    EXPECT_EQ(valueof("<name></name>"), "");
    EXPECT_EQ(valueof("<name/>"), "");
    EXPECT_EQ(valueof("<nome>x</nome>"), "-");
}

TEST(Document, ForgottenTagsAreMadeUp)
{
    EXPECT_EQ(valueof("<name>web<startcmd>x</startcmd>"), "web");
    EXPECT_EQ(valueof("<name>web</nmae>"), "web");
    EXPECT_EQ(valueof("<name>web</startcmd>"), "web");
    EXPECT_EQ(valueof("<namevalue</name>"), "-");
    EXPECT_EQ(valueof("<name\n<startcmd>x</startcmd>"), "");
}

TEST(Document, OddThingsAreNoted)
{
    EXPECT_EQ(kinds("<name>web</name>\n\t"), "");
    EXPECT_EQ(kinds("< name >web</ name >"), "");
    EXPECT_EQ(kinds("<!-- a --><![CDATA[]]><!DOCTYPE a [<!ENTITY b 'c'>]><?php ?>"),
              "comment cdata doctype instruction");
    EXPECT_EQ(kinds("<name a='1'>&gt;</name>"), "attribute entity");
    EXPECT_EQ(kinds("<name/><><  ></>"), "emptytag emptytag emptytag emptytag");
    EXPECT_EQ(kinds("<other>text</other>"), "unknown");
    EXPECT_EQ(kinds("<name>a < b</name><startcmd>c <d</startcmd>"), "lessthan lessthan");
    EXPECT_EQ(kinds("<name\n<startcmd>x</startcmd>"), "brokentag unclosed");
    EXPECT_EQ(kinds("<name>a</nmae>"), "mismatched");
    EXPECT_EQ(kinds("<name>a</name></name>"), "strayclosing");
    EXPECT_EQ(kinds("<name>a<startcmd>b</startcmd>"), "unclosed");
    EXPECT_EQ(kinds("text"), "straytext");
    EXPECT_EQ(kinds("</wdmonitorservice><name>x</name><wdmonitorservice>"), "lostfield");
    EXPECT_EQ(kinds("</wdmonitorservice></wdmonitortarget><wdmondependsev></wdmondependsev>"
                    "<wdmonitortarget><wdmonitorservice>"),
              "misplaced");
}

TEST(Document, WhatStandsInsideTheWrongElementDoesNotMoveTheRest)
{
    const std::string inside = "<wdmondependsev><name>b</name></wdmondependsev>";
    EXPECT_EQ(kinds("<name>a</name>" + inside), "unclosed lateclosing");
    EXPECT_EQ(kinds("<wdmonitorservice><name>a</name></wdmonitorservice>"), "unclosed lateclosing");
    const document nested = readdocument("<wdtargets><wdmonitortarget><wdmonitortarget>"
                                         "</wdmonitortarget></wdmonitortarget></wdtargets>");
    EXPECT_TRUE(nested.rootend);
    EXPECT_EQ(nested.targets.size(), 2U);
}

TEST(Document, ClosingTagsOfInnerElementsCloseNothingThatGoesOn)
{
    const std::string target = "<wdmonitortarget></wdmonitortarget>";
    const document doubled =
        readdocument("<wdtargets>" + target + "</wdmonitortarget>" + target + "</wdtargets>");
    ASSERT_EQ(doubled.oddities.size(), 1U);
    EXPECT_EQ(doubled.oddities[0].kind, oddkind::strayclosing);
    EXPECT_TRUE(doubled.rootend);
    const document misspelt = readdocument("<wdtargets>" + target + "</wdmonitortarget>");
    ASSERT_EQ(misspelt.oddities.size(), 1U);
    EXPECT_EQ(misspelt.oddities[0].kind, oddkind::mismatched);
    EXPECT_EQ(kinds("</wdmonitorservice></wdmonitorservice><wdmonitorservice>"), "strayclosing");
}

// The daemon skips it to its first "?" only.
TEST(Document, OnlyAPlainDeclarationAtTheBeginningIsOrdinary)
{
    const std::string root = "<wdtargets></wdtargets>";
    EXPECT_TRUE(readdocument("<?xml version='1.0'?>" + root).oddities.empty());
    for (const char* const odd : {"\n<?xml version='1.0'?>", "<?xml version='1.0' a='?'?>"}) {
        const document doc = readdocument(odd + root);
        ASSERT_EQ(doc.oddities.size(), 1U) << odd;
        EXPECT_EQ(doc.oddities[0].kind, oddkind::instruction) << odd;
    }
}

// What is looked for and missing is not looked for at each beginning anew: with the square of its
// length this would take hours.
TEST(Document, ATextOfNothingButBeginningsIsReadAtOnce)
{
    constexpr std::size_t kBeginnings = 150000;
    for (const std::string_view beginning : {"<!-- >", "<![CDATA[>", "<!DOCTYPE [>"}) {
        std::string text = "<wdtargets>";
        for (std::size_t i = 0; i < kBeginnings; ++i) {
            text += beginning;
        }
        EXPECT_EQ(readdocument(text).oddities.size(), kBeginnings + 1) << beginning; // no end
    }
}

TEST(Document, EndIsTold)
{
    EXPECT_EQ(readdocument("<wdtargets></wdtargets>").rootend, 11U);
    EXPECT_EQ(readdocument("<wdtargets></wdtargets >").rootclosing, "wdtargets ");
    EXPECT_FALSE(readdocument("<wdtargets>").rootend);
    EXPECT_EQ(readdocument("<wdtargets>").oddities.at(0).kind, oddkind::unfinished);
    EXPECT_EQ(readdocument("<wdtargets></wdtargets>\nx").oddities.at(0).kind, oddkind::trailing);
    EXPECT_TRUE(readdocument("").oddities.empty());
}

TEST(Document, UnfinishedTargetsAreThereAsFarAsTheyGo)
{
    const document doc = readdocument(kOpen + "<name>web");
    ASSERT_EQ(doc.targets.size(), 1U);
    ASSERT_NE(doc.targets[0].monitored(), nullptr);
    const writtenfield* name = doc.targets[0].monitored()->find(fieldindex("name"));
    ASSERT_NE(name, nullptr);
    EXPECT_EQ(name->value, "web");
}

} // namespace
