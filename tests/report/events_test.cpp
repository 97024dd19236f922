#include "events.h"

#include <sstream>
#include <stdexcept>
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace report {
namespace {

using testing::HasSubstr;
using testing::Not;

const std::string kWeb = "web";

constexpr std::int64_t kNoon = 1795262400; // 2026-11-21 12:00:00 on the log's clock

event happened(eventkind kind, const message* source = nullptr)
{
    return {.kind = kind,
            .when = {.clock = kNoon, .elapsed = kNoon},
            .service = 0,
            .became = {},
            .inferred = false,
            .why = inference::kNone,
            .source = source};
}

message said(messageid id, std::string_view text)
{
    return {.id = id,
            .when = {.clock = kNoon, .elapsed = kNoon},
            .first = "web",
            .second = {},
            .text = text,
            .more = {},
            .line = 12};
}

TEST(Routine, IsWhatHealthyServicesMakeAllDay)
{
    for (const eventkind kind : {eventkind::kStep, eventkind::kChecked, eventkind::kSkipped,
                                 eventkind::kFigures, eventkind::kWatched, eventkind::kUnknown}) {
        EXPECT_TRUE(isroutine(happened(kind))) << wordof(kind);
    }
    for (const eventkind kind :
         {eventkind::kUnwatched, eventkind::kState, eventkind::kFailed, eventkind::kRecoveryTried,
          eventkind::kRecovered, eventkind::kGaveUp, eventkind::kConfiguration,
          eventkind::kDaemon}) {
        EXPECT_FALSE(isroutine(happened(kind))) << wordof(kind);
    }
}

TEST(Routine, IsNothingThatBeginsAState)
{
    event skipped = happened(eventkind::kSkipped);
    skipped.became = state::kBusy;
    EXPECT_FALSE(isroutine(skipped));
}

TEST(Routine, IsWhatOnlyRepeatsTheConfiguration)
{
    const message listing = said(messageid::kListing, "");
    const message unloaded = said(messageid::kLoadFailed, "");
    EXPECT_TRUE(isroutine(happened(eventkind::kConfiguration, &listing)));
    EXPECT_FALSE(isroutine(happened(eventkind::kConfiguration, &unloaded)));
}

TEST(Filter, LeavesOutTheRoutineUnlessAskedForIt)
{
    EXPECT_TRUE(iswanted({}, happened(eventkind::kFailed), &kWeb));
    EXPECT_FALSE(iswanted({}, happened(eventkind::kStep), &kWeb));
    EXPECT_TRUE(iswanted({.all = true}, happened(eventkind::kStep), &kWeb));
    EXPECT_TRUE(iswanted({.kinds = {eventkind::kStep}}, happened(eventkind::kStep), &kWeb));
}

TEST(Filter, TakesTheNamedServicesOnly)
{
    const eventfilter filter{.services = {"db", "web"}};
    const std::string other = "we";
    EXPECT_TRUE(iswanted(filter, happened(eventkind::kFailed), &kWeb));
    EXPECT_FALSE(iswanted(filter, happened(eventkind::kFailed), &other));
    EXPECT_FALSE(iswanted(filter, happened(eventkind::kDaemon), nullptr));
    EXPECT_TRUE(iswanted({}, happened(eventkind::kDaemon), nullptr));
}

TEST(Filter, TakesTheNamedKindsOnly)
{
    const eventfilter filter{.kinds = {eventkind::kFailed, eventkind::kGaveUp}, .all = true};
    EXPECT_TRUE(iswanted(filter, happened(eventkind::kGaveUp), &kWeb));
    EXPECT_FALSE(iswanted(filter, happened(eventkind::kRecovered), &kWeb));
}

TEST(Filter, TakesATimeWithBothItsEnds)
{
    const event noon = happened(eventkind::kFailed);
    EXPECT_TRUE(iswanted({.since = kNoon, .until = kNoon}, noon, &kWeb));
    EXPECT_FALSE(iswanted({.since = kNoon + 1}, noon, &kWeb));
    EXPECT_FALSE(iswanted({.until = kNoon - 1}, noon, &kWeb));
}

TEST(EventWriter, WritesALineForEachEvent)
{
    std::ostringstream out;
    eventwriter writer(out, {}, eventform::kText);
    const message failed = said(messageid::kServiceFailed, "");
    writer.told(happened(eventkind::kFailed, &failed), &kWeb);
    event up = happened(eventkind::kState);
    up.became = state::kUp;
    up.inferred = true;
    writer.told(up, &kWeb);
    writer.told(happened(eventkind::kStep), &kWeb);
    const message unloaded = said(messageid::kLoadFailed, "");
    writer.told(happened(eventkind::kConfiguration, &unloaded), nullptr);
    writer.end();
    EXPECT_EQ(out.str(),
              "2026-11-21 12:00:00   web               its status command failed; asked again for "
              "3 min 30 s before it is recovered\n"
              "2026-11-21 12:00:00 ~ web               up\n"
              "2026-11-21 12:00:00   -                 the configuration holds an empty tag: "
              "nothing is watched until the next refresh\n");
}

TEST(EventWriter, WritesNoNameThatSteersATerminal)
{
    std::ostringstream out;
    eventwriter writer(out, {}, eventform::kText);
    const std::string name = "a\033[31m\tb\nc\xff";
    writer.told(happened(eventkind::kFailed), &name);
    EXPECT_THAT(out.str(), HasSubstr("  a\\x1b[31m\\x09b\\x0ac\\xff  "));
}

TEST(EventWriter, HasColoursOnlyWhereTheyAreWanted)
{
    event gaveup = happened(eventkind::kGaveUp);
    gaveup.became = state::kGaveUp;
    std::ostringstream coloured;
    eventwriter(coloured, {}, eventform::kColouredText).told(gaveup, &kWeb);
    EXPECT_THAT(coloured.str(), HasSubstr("\033[1;31m"));
    std::ostringstream plain;
    eventwriter(plain, {}, eventform::kText).told(gaveup, &kWeb);
    EXPECT_THAT(plain.str(), Not(HasSubstr("\033")));
}

TEST(EventWriter, WritesOneDocument)
{
    std::ostringstream out;
    eventwriter writer(out, {}, eventform::kDocument);
    message failed = said(messageid::kServiceFailed, "General ping failed for service web");
    failed.more = "more of it\n";
    event first = happened(eventkind::kFailed, &failed);
    first.became = state::kSuspect;
    writer.told(first, &kWeb);
    writer.told(happened(eventkind::kDaemon), nullptr);
    writer.end();
    const auto said = nlohmann::json::parse(out.str());
    EXPECT_EQ(said["version"], 1);
    ASSERT_EQ(said["events"].size(), 2U);
    EXPECT_EQ(said["events"][0]["time"], "2026-11-21T12:00:00");
    EXPECT_EQ(said["events"][0]["service"], "web");
    EXPECT_EQ(said["events"][0]["state"], "suspect");
    EXPECT_EQ(said["events"][0]["inferred"], false);
    EXPECT_EQ(said["events"][0]["message"], "General ping failed for service web\nmore of it");
    EXPECT_EQ(said["events"][0]["line"], 12);
    for (const char* member : {"service", "state", "message", "line"}) {
        EXPECT_TRUE(said["events"][1][member].is_null()) << member;
    }
}

TEST(EventWriter, WritesADocumentAlsoOfNothing)
{
    std::ostringstream out;
    eventwriter(out, {}, eventform::kDocument).end();
    EXPECT_EQ(nlohmann::json::parse(out.str()),
              nlohmann::json::parse(R"({"version":1,"events":[]})"));
}

TEST(EventWriter, WritesAnObjectALine)
{
    std::ostringstream out;
    eventwriter writer(out, {}, eventform::kLines);
    writer.told(happened(eventkind::kFailed), &kWeb);
    writer.told(happened(eventkind::kDaemon), nullptr);
    writer.end();
    std::istringstream lines(out.str());
    int count = 0;
    for (std::string line; std::getline(lines, line); ++count) {
        EXPECT_EQ(nlohmann::json::parse(line)["version"], 1);
    }
    EXPECT_EQ(count, 2);
}

TEST(EventWriter, DoesNotGoOnWhereNothingCanBeWritten)
{
    std::ostringstream out;
    eventwriter writer(out, {}, eventform::kText);
    out.setstate(std::ios::badbit);
    EXPECT_THROW(writer.told(happened(eventkind::kFailed), &kWeb), std::runtime_error);
    EXPECT_THROW(writer.flush(), std::runtime_error);
}

TEST(EventKinds, AreKnownByTheirWords)
{
    const auto words = eventkindwords();
    ASSERT_EQ(words.size(), static_cast<std::size_t>(eventkind::kStep) + 1);
    for (std::size_t i = 0; i < words.size(); ++i) {
        EXPECT_EQ(eventkindof(words[i]), static_cast<eventkind>(i)) << words[i];
    }
    EXPECT_EQ(eventkindof("fail"), std::nullopt);
}

} // namespace
} // namespace report
