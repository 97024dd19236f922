#include "tracker.h"

#include <algorithm>
#include <ctime>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "story.h"

namespace {

using report::account;
using report::at;
using report::eventkind;
using report::line;
using report::state;
using report::story;
using testing::ElementsAre;
using testing::IsEmpty;
using enum report::messageid;

constexpr std::uint64_t kMain = 0x7f0000001000;
constexpr std::uint64_t kOne = 0x7f0000802700;
constexpr std::uint64_t kTwo = 0x7f0001003700;
constexpr std::uint64_t kThree = 0x7f0001804700;

std::vector<line> operator+(std::vector<line> before, const std::vector<line>& behind)
{
    before.insert(before.end(), behind.begin(), behind.end());
    return before;
}

std::vector<line> announced(std::int64_t when, std::uint64_t thread, const std::string& name,
                            const std::string& path)
{
    return {{when, thread, kServiceNamed, name}, {when, thread, kBinaryPathNamed, path}};
}

// "web", announced at 0 by the thread kOne.
std::vector<line> web(const std::vector<line>& behind)
{
    return announced(0, kOne, "web", "/web") + behind;
}

TEST(Announcement, IsTakenForUpUntilTheFirstWord)
{
    story told(web({}));
    EXPECT_EQ(told.now("web", 500), "up* 0-");
    EXPECT_EQ(told.finish("web", 500), "up* 0-500");
}

TEST(Announcement, IsCertainOnceTheFirstPingHasFoundItRunning)
{
    story told(web({{1, kOne, kCheckBegins, "/web"}}));
    EXPECT_EQ(told.finish("web", 100), "up 0-100");
}

TEST(Announcement, IsNoStateWhereTheFirstPingFails)
{
    story told(web({{1, kOne, kServiceFailed, "web"}}));
    EXPECT_EQ(told.finish("web", 100), "suspect 1-100");
}

TEST(Announcement, OfAServiceWithoutRecoveriesIsFollowedByGivingUpAtOnce)
{
    story told(web({{0, kOne, kGaveUp, "web"}}));
    EXPECT_EQ(told.finish("web", 100), "gave-up 0-100");
    EXPECT_EQ(told.of("web").gaveup, 1U);
    EXPECT_EQ(told.of("web").recoveriestried, 0U);
}

TEST(Announcement, LeavesAnOutageUnbrokenWhereTheFirstPingFails)
{
    story told(web({{60, kOne, kServiceFailed, "web"},
                    {270, kOne, kRecoveryTried, "web"},
                    {330, kOne, kGaveUp, "web"}}) +
               announced(5000, kTwo, "web", "/web") +
               std::vector<line>{{5001, kTwo, kServiceFailed, "web"}});
    EXPECT_EQ(told.finish("web", 5100),
              "up* 0-60, suspect 60-270, recovering 270-330, gave-up 330-5001, suspect 5001-5100");
    EXPECT_EQ(told.of("web").outages, 1U);
    EXPECT_EQ(told.of("web").lastoutage->from, at(60));
    EXPECT_EQ(told.of("web").lastoutage->to, std::nullopt);
    EXPECT_EQ(told.of("web").outageseconds, 5040);
}

TEST(Announcement, EndsAnOutageWhereNothingFailsBehindIt)
{
    story told(web({{60, kOne, kServiceUnknown, "web"}}) + announced(5000, kTwo, "web", "/web") +
               std::vector<line>{{5900, kTwo, kServiceFailed, "web"}});
    EXPECT_EQ(told.finish("web", 6000),
              "up* 0-60, unknown-service 60-5000, up* 5000-5900, suspect 5900-6000");
    EXPECT_EQ(told.of("web").outages, 2U);
}

TEST(Announcement, CutsRetriesShortSoThatTheFirstWordTells)
{
    const auto restarted =
        web({{60, kOne, kServiceFailed, "web"}}) + announced(80, kTwo, "web", "/web");
    story failing(restarted + std::vector<line>{{82, kTwo, kServiceFailed, "web"}});
    EXPECT_EQ(failing.finish("web", 100), "up* 0-60, suspect 60-100");
    EXPECT_EQ(failing.of("web").outages, 1U);
    story running(restarted + std::vector<line>{{82, kTwo, kCheckBegins, "/web"}});
    EXPECT_EQ(running.finish("web", 100), "up* 0-60, suspect 60-80, up 80-100");
}

TEST(Announcement, BehindTheLastRetryLeavesInferredWhatTheRetryDid)
{
    story told(web({{60, kOne, kServiceFailed, "web"}}) + announced(300, kTwo, "web", "/web") +
               std::vector<line>{{301, kTwo, kCheckBegins, "/web"}});
    EXPECT_EQ(told.finish("web", 400), "up* 0-60, suspect 60-270, up* 270-400");
}

TEST(Announcement, DuringAFunctionalRecoveryLeavesTheCheckToTell)
{
    const auto restarted = web({{10, kOne, kCheckBegins, "/web"},
                                {11, kOne, kCheckFailed, "web"},
                                {221, kOne, kFunctionalRecoveryTried, "web"},
                                {221, kOne, kRecoveryTried, "web"},
                                {300, kOne, kCheckBegins, "/web"}}) +
                           announced(310, kTwo, "web", "/web") +
                           std::vector<line>{{311, kTwo, kCheckBegins, "/web"}};
    story failing(restarted + std::vector<line>{{320, kTwo, kCheckFailed, "web"}});
    EXPECT_EQ(failing.finish("web", 400),
              "up* 0-11, functional-failure 11-221, functional-recovering 221-320, "
              "functional-failure 320-400");
    EXPECT_EQ(failing.of("web").outages, 1U);
    story running(restarted + std::vector<line>{{380, kTwo, kCheckBegins, "/web"}});
    EXPECT_EQ(running.finish("web", 400),
              "up* 0-11, functional-failure 11-221, functional-recovering 221-310, up 310-400");
}

TEST(Failure, IsFollowedByARecoveryThatHelps)
{
    story told(web({{60, kOne, kServiceFailed, "web"},
                    {275, kOne, kRecoveryTried, "web"},
                    {335, kOne, kCheckBegins, "/web"},
                    {395, kOne, kRecovered, "web"}}));
    EXPECT_EQ(told.finish("web", 400), "up* 0-60, suspect 60-275, recovering 275-335, up 335-400");
    const account& web = told.of("web");
    EXPECT_EQ(web.recoveriestried, 1U);
    EXPECT_EQ(web.recoveriessuccessful, 1U);
    EXPECT_EQ(web.outages, 1U);
    EXPECT_EQ(web.lastoutage->from, at(60));
    EXPECT_FALSE(web.lastoutage->inferred);
    EXPECT_EQ(web.lastoutage->to, at(335));
    EXPECT_EQ(web.outageseconds, 275);
    EXPECT_EQ(web.watchedseconds, 400);
    EXPECT_DOUBLE_EQ(web.availability().value(), 125.0 / 400.0);
}

TEST(Failure, WithoutACheckIsOverWhenTheDaemonSaysSo)
{
    story told(web({{60, kOne, kServiceFailed, "web"},
                    {275, kOne, kRecoveryTried, "web"},
                    {395, kOne, kRecovered, "web"}}));
    EXPECT_EQ(told.finish("web", 400), "up* 0-60, suspect 60-275, recovering 275-395, up 395-400");
}

TEST(Failure, AfterARecoveryIsTheSameOutage)
{
    story told(web({{60, kOne, kServiceFailed, "web"},
                    {275, kOne, kRecoveryTried, "web"},
                    {335, kOne, kServiceFailed, "web"},
                    {550, kOne, kRecoveryTried, "web"},
                    {610, kOne, kGaveUp, "web"}}));
    EXPECT_EQ(told.finish("web", 700), "up* 0-60, suspect 60-275, recovering 275-335, "
                                       "suspect 335-550, recovering 550-610, gave-up 610-700");
    EXPECT_EQ(told.of("web").outages, 1U);
    EXPECT_EQ(told.of("web").recoveriestried, 2U);
    EXPECT_EQ(told.of("web").recoveriessuccessful, 0U);
    EXPECT_EQ(told.of("web").gaveup, 1U);
}

TEST(Failure, IsOverWhenSilenceHasOutlastedTheRetries)
{
    story told(web({{60, kOne, kServiceFailed, "web"}}));
    EXPECT_EQ(told.now("web", 60 + 210 + 120), "suspect 60-");
    EXPECT_EQ(told.now("web", 60 + 210 + 121), "up* 270-");
    EXPECT_TRUE(told.of("web").lastoutage->inferred);
    EXPECT_EQ(told.of("web").lastoutage->to, at(270));
    EXPECT_EQ(told.finish("web", 1000), "up* 0-60, suspect 60-270, up* 270-1000");
}

TEST(Failure, WhoseRecoveryComesLateWasNotOver)
{
    story told(web({{60, kOne, kServiceFailed, "web"}}));
    EXPECT_EQ(told.now("web", 900), "up* 270-");
    told.play({{1000, kOne, kRecoveryTried, "web"}});
    EXPECT_EQ(told.finish("web", 1001), "up* 0-60, suspect 60-1000, recovering 1000-1001");
    EXPECT_EQ(told.of("web").outages, 1U);
}

TEST(Failure, IsOverAtTheLatestWhenItsThreadSpeaksOfAnotherRound)
{
    story told(web({{60, kOne, kServiceFailed, "web"}, {200, kOne, kCheckBegins, "/web"}}));
    EXPECT_EQ(told.finish("web", 250), "up* 0-60, suspect 60-200, up* 200-250");
}

TEST(Failure, ThatFollowsAnotherEndsTheOneBefore)
{
    story told(web({{60, kOne, kServiceFailed, "web"}, {900, kOne, kServiceFailed, "web"}}));
    EXPECT_EQ(told.finish("web", 950), "up* 0-60, suspect 60-270, up* 270-900, suspect 900-950");
    EXPECT_EQ(told.of("web").outages, 2U);
}

TEST(Failure, ThatFollowsAnotherAtOnceGoesOnWithTheOutage)
{
    story told(web({{60, kOne, kServiceFailed, "web"}, {180, kOne, kServiceFailed, "web"}}));
    EXPECT_EQ(told.now("web", 180 + 330), "suspect 60-");
    EXPECT_EQ(told.finish("web", 180 + 331), "up* 0-60, suspect 60-390, up* 390-511");
    EXPECT_EQ(told.of("web").outages, 1U);
}

TEST(Failure, OfADaemonWithDebugLinesIsOverWhenTheySaySo)
{
    const auto failing = web({{1, kOne, kPingSucceeded}, {60, kOne, kServiceFailed, "web"}});
    story silent(failing);
    EXPECT_EQ(silent.finish("web", 5000), "up 0-60, suspect 60-5000");
    story told(failing + std::vector<line>{{150, kOne, kPingSucceededByStatus}});
    EXPECT_EQ(told.finish("web", 5000), "up 0-60, suspect 60-150, up 150-5000");
}

TEST(Check, ThatFailsAndSucceedsInARetryLeavesNoWordOfIt)
{
    story told(web({{1, kOne, kCheckBegins, "/web"},
                    {2, kOne, kCheckFailed, "web"},
                    {302, kOne, kCheckBegins, "/web"}}));
    EXPECT_EQ(told.finish("web", 400), "up 0-2, functional-failure 2-152, up* 152-400");
}

// "web" of two targets: the threads kOne and kTwo.
std::vector<line> webtwice(const std::vector<line>& behind)
{
    return announced(0, kOne, "web", "/web") + announced(0, kTwo, "web", "/web") + behind;
}

TEST(TwoTargetsOfAService, DoNotEndEachOthersFailures)
{
    story told(webtwice({{1, kOne, kCheckBegins, "/web"},
                         {2, kOne, kCheckFailed, "web"},
                         {100, kTwo, kCheckBegins, "/web"},
                         {110, kTwo, kCheckSkipped, "/web"},
                         {120, kTwo, kCheckSucceeded},
                         {130, kTwo, kCheckNotRecognised, "web"},
                         {212, kOne, kFunctionalRecoveryTried, "web"},
                         {213, kOne, kRecoveryTried, "web"},
                         {220, kTwo, kCheckBegins, "/web"},
                         {230, kTwo, kCheckSucceeded},
                         {300, kOne, kCheckBegins, "/web"},
                         {400, kOne, kFunctionallyRecovered, "web"}}));
    EXPECT_EQ(told.finish("web", 410), "up 0-2, functional-failure 2-212, "
                                       "functional-recovering 212-300, up* 300-410");
    EXPECT_EQ(told.of("web").outages, 1U);
    EXPECT_EQ(told.of("web").skippedchecks, 1U);
}

TEST(TwoTargetsOfAService, FindItUpWhenTheOneThatFailedIsSilentForLong)
{
    story told(webtwice({{1, kOne, kCheckBegins, "/web"},
                         {2, kOne, kCheckFailed, "web"},
                         {332, kTwo, kCheckBegins, "/web"}}));
    EXPECT_THAT(told.happened({eventkind::kState}), IsEmpty());
    told.play({{333, kTwo, kCheckBegins, "/web"}});
    EXPECT_THAT(told.happened({eventkind::kState}), ElementsAre("152 web state up*"));
}

TEST(TwoTargetsOfAService, CountEachRecoveryOnce)
{
    story told(webtwice({{1, kOne, kCheckFailed, "web"},
                         {1, kTwo, kCheckFailed, "web"},
                         {211, kOne, kFunctionalRecoveryTried, "web"},
                         {212, kTwo, kFunctionalRecoveryTried, "web"},
                         {213, kOne, kRecoveryTried, "web"},
                         {230, kTwo, kRecoveryTried, "web"},
                         {300, kOne, kCheckBegins, "/web"},
                         {310, kTwo, kCheckBegins, "/web"},
                         {400, kOne, kFunctionallyRecovered, "web"},
                         {410, kTwo, kFunctionallyRecovered, "web"}}));
    EXPECT_EQ(told.finish("web", 500), "up 0-1, functional-failure 1-211, "
                                       "functional-recovering 211-400, up 400-500");
    EXPECT_EQ(told.of("web").recoveriestried, 2U);
    EXPECT_EQ(told.of("web").outages, 1U);
    EXPECT_THAT(told.happened({eventkind::kState}), IsEmpty());
    EXPECT_THAT(
        told.happened({eventkind::kRecoveryTried}),
        ElementsAre("211 web recovery-tried functional-recovering", "212 web recovery-tried"));
}

TEST(AName, WithANewlineIsKnownByItsFirstLine)
{
    story told(
        announced(0, kOne, "web", "/bin/web") +
        std::vector<line>{{1, kOne, kCheckBegins, "/bin/web\n-x"},
                          {60, kOne, kServiceFailed, "web\nserver"},
                          {61, kOne, kStatusAnswered, "service web\nserver status 1>/f 2>/f"},
                          {270, kOne, kRecoveryTried, "web"},
                          {400, kOne, kRecovered, "web\nserver"}});
    EXPECT_EQ(told.finish("web", 500), "up 0-60, suspect 60-270, recovering 270-400, up 400-500");
    EXPECT_THAT(told.names(), ElementsAre("web"));
}

TEST(AThreadThatIsNotAnnounced, SpeaksForItsServiceAsTheOneBefore)
{
    story told(web({{1, kOne, kCheckBegins, "/web"},
                    {2, kOne, kCheckFailed, "web"},
                    {100, kTwo, kCheckBegins, "/web"}}));
    EXPECT_EQ(told.finish("web", 200), "up 0-2, functional-failure 2-100, up* 100-200");
}

TEST(Check, ThatKeepsFailingIsRecoveredOnceAndNotTwice)
{
    story told(web({{1, kOne, kCheckBegins, "/web"},
                    {2, kOne, kCheckFailed, "web"},
                    {212, kOne, kFunctionalRecoveryTried, "web"},
                    {240, kOne, kRecoveryTried, "web"},
                    {300, kOne, kCheckBegins, "/web"},
                    {400, kOne, kFunctionallyRecovered, "web"}}));
    EXPECT_EQ(told.now("web", 410), "up* 300-");
    EXPECT_EQ(told.finish("web", 410), "up 0-2, functional-failure 2-212, "
                                       "functional-recovering 212-300, up* 300-410");
    EXPECT_EQ(told.of("web").recoveriestried, 1U);
    EXPECT_EQ(told.of("web").recoveriessuccessful, 1U);
    EXPECT_THAT(told.happened({eventkind::kRecoveryTried}),
                ElementsAre("212 web recovery-tried functional-recovering"));
}

TEST(Check, AfterAFunctionalRecoveryIsOpenUntilTheNextWord)
{
    story told(web({{1, kOne, kCheckBegins, "/web"},
                    {2, kOne, kCheckFailed, "web"},
                    {212, kOne, kFunctionalRecoveryTried, "web"},
                    {212, kOne, kRecoveryTried, "web"},
                    {300, kOne, kCheckBegins, "/web"}}));
    EXPECT_EQ(told.now("web", 9000), "functional-recovering 212-");
    told.play({{9001, kOne, kCheckFailed, "web"},
               {9211, kOne, kFunctionalRecoveryTried, "web"},
               {9211, kOne, kRecoveryTried, "web"},
               {9300, kOne, kFunctionalGaveUp, "web"}});
    EXPECT_EQ(told.finish("web", 9400),
              "up 0-2, functional-failure 2-212, functional-recovering 212-9001, "
              "functional-failure 9001-9211, functional-recovering 9211-9300, gave-up 9300-9400");
    EXPECT_EQ(told.of("web").outages, 1U);
    EXPECT_EQ(told.of("web").recoveriestried, 2U);
}

TEST(Check, WhoseDebugLineSaysSoHasSucceededThen)
{
    story told(web({{1, kOne, kCheckBegins, "/web"},
                    {2, kOne, kCheckFailed, "web"},
                    {212, kOne, kFunctionalRecoveryTried, "web"},
                    {212, kOne, kRecoveryTried, "web"},
                    {300, kOne, kCheckBegins, "/web"},
                    {307, kOne, kCheckSucceeded},
                    {400, kOne, kFunctionallyRecovered, "web"}}));
    EXPECT_EQ(told.finish("web", 410), "up 0-2, functional-failure 2-212, "
                                       "functional-recovering 212-307, up 307-410");
}

TEST(Check, ThatFailsRightAfterARecoveryGoesOnWithTheOutage)
{
    story told(web({{60, kOne, kServiceFailed, "web"},
                    {270, kOne, kRecoveryTried, "web"},
                    {330, kOne, kCheckBegins, "/web"}}));
    EXPECT_EQ(told.now("web", 335), "up 330-");
    told.play({{340, kOne, kCheckFailed, "web"}});
    EXPECT_EQ(told.finish("web", 350), "up* 0-60, suspect 60-270, recovering 270-340, "
                                       "functional-failure 340-350");
    EXPECT_EQ(told.of("web").outages, 1U);
}

TEST(Check, ThatFailsARoundLaterIsAnotherOutage)
{
    story told(web({{60, kOne, kServiceFailed, "web"},
                    {270, kOne, kRecoveryTried, "web"},
                    {330, kOne, kCheckBegins, "/web"},
                    {400, kOne, kCheckBegins, "/web"},
                    {401, kOne, kCheckFailed, "web"}}));
    EXPECT_EQ(told.finish("web", 410), "up* 0-60, suspect 60-270, recovering 270-330, up 330-401, "
                                       "functional-failure 401-410");
    EXPECT_EQ(told.of("web").outages, 2U);
}

TEST(Check, WithoutItsCommandIsNoOutage)
{
    story told(web({{1, kOne, kCheckBegins, "/web"},
                    {2, kOne, kCheckNotRecognised, "web"},
                    {60, kOne, kCheckBegins, "/web"},
                    {61, kOne, kCheckNotRecognised, "web"}}));
    EXPECT_EQ(told.now("web", 100), "command-not-recognised 2-");
    told.play({{120, kOne, kCheckBegins, "/web"}});
    EXPECT_EQ(told.now("web", 900), "command-not-recognised 2-");
    told.play({{900, kOne, kCannotSkip, "/web"}, {900, kOne, kCheckBegins, "/web"}});
    EXPECT_EQ(told.finish("web", 910), "up 0-2, command-not-recognised 2-120, up* 120-910");
    EXPECT_EQ(told.of("web").outages, 0U);
    EXPECT_EQ(told.of("web").lastoutage, std::nullopt);
}

TEST(Check, WithoutItsCommandDoesNotGoOnWithAnOutage)
{
    story told(web({{60, kOne, kServiceFailed, "web"},
                    {270, kOne, kRecoveryTried, "web"},
                    {330, kOne, kCheckBegins, "/web"},
                    {340, kOne, kCheckNotRecognised, "web"}}));
    EXPECT_EQ(told.finish("web", 350), "up* 0-60, suspect 60-270, recovering 270-330, up 330-340, "
                                       "command-not-recognised 340-350");
    EXPECT_EQ(told.of("web").lastoutage->to, at(330));
}

TEST(Check, ThatIsSkippedMeansBusy)
{
    story told(web({{1, kOne, kCheckSkipped, "/web"},
                    {61, kOne, kCheckSkipped, "/web"},
                    {121, kOne, kCannotSkip, "/web"}}));
    EXPECT_EQ(told.now("web", 121), "busy 1-");
    told.play({{122, kOne, kCheckBegins, "/web"}});
    EXPECT_EQ(told.finish("web", 130), "up 0-1, busy 1-122, up 122-130");
    EXPECT_EQ(told.of("web").skippedchecks, 2U);
}

TEST(Check, ThatIsSkippedAfterARecoveryLeavesItBusy)
{
    story told(web({{1, kOne, kCheckBegins, "/web"},
                    {2, kOne, kCheckFailed, "web"},
                    {212, kOne, kFunctionalRecoveryTried, "web"},
                    {212, kOne, kRecoveryTried, "web"},
                    {300, kOne, kCheckSkipped, "/web"},
                    {400, kOne, kFunctionallyRecovered, "web"}}));
    EXPECT_EQ(told.finish("web", 410), "up 0-2, functional-failure 2-212, "
                                       "functional-recovering 212-300, busy 300-410");
    EXPECT_EQ(told.of("web").recoveriessuccessful, 1U);
}

TEST(Check, WithoutFiguresProvesThatTheServiceRuns)
{
    story told(web({{60, kOne, kServiceFailed, "web"},
                    {270, kOne, kRecoveryTried, "web"},
                    {330, kOne, kNoFigures, "/web"}}));
    EXPECT_EQ(told.now("web", 340), "up 330-");
}

TEST(Figures, AreNoneForAServiceThatWasWatchedForNoTime)
{
    story told(web({}));
    EXPECT_EQ(told.finish("web", 0), "");
    EXPECT_EQ(told.of("web").availability(), std::nullopt);
    EXPECT_EQ(told.of("web").path, "/web");
}

TEST(Figures, CountAnOutageThatHasJustBegun)
{
    story told(web({{60, kOne, kServiceFailed, "web"}}));
    EXPECT_EQ(told.now("web", 60), "suspect 60-");
    EXPECT_EQ(told.of("web").outages, 1U);
    EXPECT_EQ(told.of("web").lastoutage->from, at(60));
}

TEST(Figures, AreTheSameHoweverOftenTheyAreAskedFor)
{
    const auto lines = web({{60, kOne, kServiceFailed, "web"},
                            {275, kOne, kRecoveryTried, "web"},
                            {335, kOne, kServiceFailed, "web"},
                            {800, kOne, kCheckBegins, "/web"},
                            {801, kOne, kCheckFailed, "web"}});
    story once(lines);
    story often;
    for (const line& each : lines) {
        often.play({each});
        often.teller().conclude(at(each.at), false);
    }
    EXPECT_EQ(often.finish("web", 2000), once.finish("web", 2000));
    EXPECT_EQ(often.of("web").outageseconds, once.of("web").outageseconds);
    EXPECT_EQ(often.of("web").outages, once.of("web").outages);
}

TEST(Threads, AreUsedAgainForOtherServicesAfterARefresh)
{
    story told(announced(0, kOne, "web", "/web") + announced(0, kTwo, "mail", "/mail") +
               announced(7200, kTwo, "web", "/web") + announced(7200, kOne, "mail", "/mail") +
               std::vector<line>{{7201, kOne, kServiceFailed, "mail"}});
    EXPECT_EQ(told.now("web", 7300), "up* 0-");
    EXPECT_EQ(told.now("mail", 7300), "suspect 7201-");
}

TEST(Threads, AreTiedByTheNamesInMessagesWhereTheAnnouncementIsLost)
{
    story told({{0, kOne, kServiceFailed, "web"}, {100, kOne, kCheckBegins, "/web"}});
    EXPECT_EQ(told.finish("web", 110), "suspect 0-100, up* 100-110");
    EXPECT_EQ(told.of("web").path, "/web");
}

TEST(Threads, AreTiedByTheNameInTheStatusCommand)
{
    story told({{0, kOne, kStatusAnswered,
                 "service my web status 1>/opt/agent.my web 2>/opt/agent.my web"},
                {0, kOne, kPingSucceeded},
                {9, kTwo, kStatusAnswered, "echo"},
                {9, kTwo, kPingSucceeded}});
    EXPECT_EQ(told.finish("my web", 10), "up 0-10");
    EXPECT_THAT(told.names(), ElementsAre("my web"));
}

TEST(Threads, AreTiedByTheirPathWhereOneServiceHasIt)
{
    story told(web({}) + std::vector<line>{{500, kTwo, kCheckSkipped, "/web"}});
    EXPECT_EQ(told.finish("web", 510), "up* 0-500, busy 500-510");
    EXPECT_THAT(told.names(), ElementsAre("web"));
}

TEST(Threads, AreNobodysWhereSeveralServicesHaveTheirPath)
{
    story told(announced(0, kOne, "web", "/java") + announced(0, kTwo, "mail", "/java") +
               std::vector<line>{{500, kThree, kCheckSkipped, "/java"}});
    EXPECT_EQ(told.finish("web", 510), "up* 0-510");
    EXPECT_EQ(told.spansof("mail"), "up* 0-510");
    EXPECT_THAT(told.names(), ElementsAre("web", "mail"));
    EXPECT_THAT(told.happened({eventkind::kSkipped}), ElementsAre("500 - skipped"));
}

TEST(Threads, KnownByAPathOnlyMakeAServiceThatIsNamedLater)
{
    story told({{0, kOne, kCheckBegins, "/web"}, {60, kOne, kCheckBegins, "/web"}});
    EXPECT_EQ(told.now("(/web)", 70), "up 0-");
    told.play({{120, kOne, kServiceFailed, "web"}});
    EXPECT_EQ(told.finish("web", 130), "up 0-120, suspect 120-130");
    EXPECT_THAT(told.names(), ElementsAre("web"));
}

TEST(Threads, KnownByAPathOnlyAreNamedByTheNextAnnouncement)
{
    story told(
        std::vector<line>{{0, kOne, kCheckBegins, "/web"}, {0, kTwo, kCheckSkipped, "/mail"}} +
        announced(900, kTwo, "web", "/web") + announced(900, kThree, "new", "/new") +
        announced(900, kOne, "mail", "/mail"));
    EXPECT_EQ(told.finish("web", 1000), "up 0-1000");
    EXPECT_EQ(told.spansof("mail"), "busy 0-900, up* 900-1000");
    EXPECT_EQ(told.spansof("new"), "up* 900-1000");
    EXPECT_THAT(told.names(), ElementsAre("web", "mail", "new"));
}

TEST(Threads, WhoseIdWasUsedAgainUnnoticedAreFoundByTheNameTheySay)
{
    story told(announced(0, kOne, "web", "/web") + announced(0, kTwo, "mail", "/mail") +
               std::vector<line>{{9000, kOne, kServiceFailed, "mail"},
                                 {9001, kTwo, kServiceFailed, "news"},
                                 {9300, kTwo, kCheckBegins, "/web"}});
    EXPECT_EQ(told.now("web", 9300), "up* 0-");
    EXPECT_EQ(told.now("mail", 9300), "suspect 9000-");
    EXPECT_EQ(told.now("news", 9300), "up* 9211-");
}

TEST(Threads, KeepTheirServiceWhereItsNameMayBeCut)
{
    story told(web({{60, kOne, kServiceFailed, "web"}, {270, kOne, kRecoveryTried, "we"}}));
    EXPECT_EQ(told.finish("web", 280), "up* 0-60, suspect 60-270, recovering 270-280");
    EXPECT_THAT(told.names(), ElementsAre("web"));
}

TEST(Threads, OfAFormerMonitorMayBeTheMainThreadsNow)
{
    story told(web({{500, kOne, kRefreshBegins}, {500, kOne, kLoadFailed}}));
    EXPECT_EQ(told.finish("web", 600), "up* 0-500, not-watched 500-600");
    EXPECT_THAT(told.happened({eventkind::kConfiguration}),
                ElementsAre("500 - configuration", "500 - configuration"));
}

TEST(Threads, OfTwoTargetsWithTheSameServiceSpeakForIt)
{
    story told(announced(0, kOne, "web", "/web") + announced(1, kTwo, "web", "/web") +
               std::vector<line>{{9000, kOne, kServiceFailed, "web"},
                                 {9100, kTwo, kCheckBegins, "/web"},
                                 {9300, kTwo, kThreadLeft},
                                 {9301, kOne, kCheckBegins, "/web"}});
    EXPECT_THAT(told.happened({eventkind::kConfiguration, eventkind::kDaemon}), IsEmpty());
    EXPECT_EQ(told.now("web", 9302), "up* 9100-");
    told.play({{9303, kOne, kThreadLeft}});
    EXPECT_EQ(told.now("web", 9304), "not-watched 9303-");
}

TEST(Generation, LeavesOutWhoIsNotAnnouncedWithTheOthers)
{
    story told(announced(0, kOne, "web", "/web") + announced(0, kTwo, "mail", "/mail") +
               announced(7200, kTwo, "web", "/web"));
    EXPECT_EQ(told.now("mail", 7205), "not-watched* 7200-");
    EXPECT_EQ(told.finish("mail", 7300), "up* 0-7200, not-watched* 7200-7300");
    EXPECT_EQ(told.spansof("web"), "up* 0-7300");
    EXPECT_EQ(told.of("mail").watchedseconds, 7200);
}

TEST(Generation, OfThousandsIsAnnouncedInSomeTime)
{
    constexpr int kServices = 3000;
    story told;
    for (const int start : {0, 9000}) {
        for (int each = 0; each < kServices; ++each) {
            told.play(announced(start + each / 50, kOne + 4096 * static_cast<std::uint64_t>(each),
                                "s" + std::to_string(each), "/s"));
        }
    }
    told.play({{9200, kOne, kServiceFailed, "s0"}});
    EXPECT_EQ(told.finish("s0", 9210), "up* 0-9200, suspect 9200-9210");
    EXPECT_EQ(told.spansof("s2999"), "up* 59-9210");
}

TEST(Generation, WithARefreshInDebugLinesIsNoRestart)
{
    story told(std::vector<line>{{0, kOne, kThreadEntered}} + web({}) +
               std::vector<line>{{500, kMain, kRefreshBegins},
                                 {500, kMain, kBeforeJoin},
                                 {560, kOne, kThreadLeft},
                                 {560, kMain, kThreadJoined},
                                 {560, kMain, kAfterJoin},
                                 {561, kOne, kThreadEntered}} +
               announced(561, kOne, "web", "/web") +
               std::vector<line>{{562, kOne, kPingSucceeded}});
    EXPECT_EQ(told.finish("web", 600), "up* 0-560, not-watched 560-561, up 561-600");
    EXPECT_THAT(told.happened({eventkind::kDaemon}), IsEmpty());
    EXPECT_THAT(told.happened({eventkind::kConfiguration}), ElementsAre("500 - configuration"));
}

TEST(Generation, WithoutARefreshInDebugLinesIsAnewStart)
{
    story told(std::vector<line>{{0, kOne, kThreadEntered}} + web({{1, kOne, kPingSucceeded}}) +
               std::vector<line>{{90, kTwo, kThreadEntered}} + announced(90, kTwo, "web", "/web"));
    EXPECT_THAT(told.happened({eventkind::kDaemon}), ElementsAre("90 - daemon*"));
    EXPECT_EQ(told.finish("web", 100), "up 0-100");
}

TEST(Generation, WithoutDebugLinesMayBeEither)
{
    story told(web({}) + announced(90, kTwo, "web", "/web"));
    EXPECT_THAT(told.happened({eventkind::kDaemon}), IsEmpty());
    EXPECT_THAT(told.happened({eventkind::kConfiguration}), ElementsAre("90 - configuration*"));
}

TEST(Generation, AfterALongSilenceOfDebugLinesWasNotWatchedMeanwhile)
{
    story told(std::vector<line>{{0, kOne, kThreadEntered}} +
               web({{1, kOne, kPingSucceeded}, {61, kOne, kServiceFailed, "web"}}) +
               std::vector<line>{{9000, kMain, kListing}, {9001, kTwo, kThreadEntered}} +
               announced(9001, kTwo, "web", "/web") +
               std::vector<line>{{9002, kTwo, kPingSucceeded}});
    EXPECT_EQ(told.finish("web", 9100), "up 0-61, not-watched* 61-9001, up 9001-9100");
}

TEST(Generation, OfAnotherServiceAloneLeavesOutTheOneBefore)
{
    story told(web({}) + announced(7200, kTwo, "mail", "/mail"));
    EXPECT_EQ(told.now("web", 7300), "not-watched* 7200-");
    EXPECT_EQ(told.now("mail", 7300), "up* 7200-");
}

TEST(Generation, OfANewDaemonMayBeOneWithoutDebugLines)
{
    story told(std::vector<line>{{0, kOne, kThreadEntered}} + web({{1, kOne, kPingSucceeded}}) +
               announced(90, kTwo, "web", "/web") +
               std::vector<line>{{150, kTwo, kServiceFailed, "web"}});
    EXPECT_EQ(told.finish("web", 600), "up 0-150, suspect 150-360, up* 360-600");
}

TEST(Generation, LongAfterASilenceOfDebugLinesWasWatchedMeanwhile)
{
    story told(std::vector<line>{{0, kOne, kThreadEntered}} +
               web({{1, kOne, kPingSucceeded}, {900, kOne, kPingSucceeded}}) +
               std::vector<line>{{1000, kTwo, kThreadEntered}} +
               announced(1000, kTwo, "web", "/web"));
    EXPECT_THAT(told.happened({eventkind::kDaemon}), ElementsAre("1000 - daemon*"));
    EXPECT_EQ(told.finish("web", 1100), "up 0-1100");
}

TEST(Load, ThatFailsLeavesNothingWatchedUntilTheNextAnnouncement)
{
    for (const auto failed : {kLoadFailed, kConfigurationUnreadable}) {
        story told(web({{60, kOne, kServiceFailed, "web"}, {900, kMain, failed}}));
        EXPECT_TRUE(told.teller().loadfailed());
        EXPECT_EQ(told.now("web", 950), "not-watched 900-");
        told.play(announced(1000, kTwo, "web", "/web"));
        EXPECT_FALSE(told.teller().loadfailed());
        EXPECT_EQ(told.finish("web", 1010),
                  "up* 0-60, suspect 60-270, up* 270-900, not-watched 900-1000, up* 1000-1010");
    }
}

TEST(Daemon, ThatEndsLeavesNothingWatched)
{
    for (const auto ended : {kNoLock, kNoLog, kCommandLineRefused}) {
        story told(web({{60, kOne, kServiceFailed, "web"}, {100, 0, ended}}));
        EXPECT_EQ(told.finish("web", 150), "up* 0-60, suspect 60-100, not-watched 100-150");
        EXPECT_EQ(told.of("web").lastoutage->to, at(100));
        EXPECT_THAT(told.happened({eventkind::kDaemon, eventkind::kUnwatched}),
                    ElementsAre("100 - daemon", "100 web unwatched not-watched"));
    }
}

TEST(Daemon, ThatEndsAmidRetriesHasNotSeenThemSucceed)
{
    story told(web({{60, kOne, kServiceFailed, "web"}, {300, 0, kNoLog}}));
    EXPECT_EQ(told.finish("web", 350), "up* 0-60, suspect 60-300, not-watched 300-350");
}

TEST(Daemon, ThatHasEndedIsStartedAnew)
{
    story told(web({{100, 0, kNoLog}}) + announced(200, kTwo, "web", "/web"));
    EXPECT_THAT(told.happened({eventkind::kDaemon, eventkind::kConfiguration}),
                ElementsAre("100 - daemon", "200 - daemon*"));
    EXPECT_EQ(told.finish("web", 300), "up* 0-100, not-watched 100-200, up* 200-300");
}

TEST(Clock, ThatIsSetIsToldAndReckonedWithout)
{
    story told;
    told.hear({0, kOne, kServiceNamed, "web"}, {10000, 0});
    told.hear({0, kOne, kServiceFailed, "web"}, {10060, 60});
    told.hear({0, kOne, kRecoveryTried, "web"}, {10060 + 210 - 3600, 270});
    EXPECT_EQ(told.finish("web", 300), "up* 0-60, suspect 60-270, recovering 270-300");
    EXPECT_THAT(told.happened({eventkind::kDaemon}), ElementsAre("270 - daemon*"));
}

TEST(Clock, ThatIsSetIsTheOneByWhichWhatIsInferredLaterIsDated)
{
    story told;
    told.hear({0, kOne, kServiceFailed, "web"}, {10000, 0});
    told.hear({0, kTwo, kServiceFailed, "mail"}, {10000, 0});
    told.hear({0, kThree, kCheckBegins, "/x"}, {13700, 100});
    told.hear({0, kTwo, kCheckBegins, "/mail"}, {13720, 120});
    told.hear({0, kOne, kCheckBegins, "/web"}, {14600, 1000});
    told.finish("web", 1001);
    EXPECT_EQ(told.of("web").now.from, (report::instant{13810, 210}));
    EXPECT_EQ(told.of("mail").now.from, (report::instant{13720, 120}));
}

TEST(Clock, IsNotSetByALineWithoutATime)
{
    story told;
    told.hear({0, 0, kConfigurationUnreadable}, {});
    told.play(web({}));
    EXPECT_THAT(told.happened({eventkind::kDaemon}), IsEmpty());
    EXPECT_EQ(told.finish("web", 10), "up* 0-10");
}

TEST(Clock, OfLinesThatStandOutOfOrderDoesNotGoBack)
{
    story told(web({}));
    told.hear({0, kOne, kCheckBegins, "/web"}, at(61));
    told.hear({0, kOne, kCheckFailed, "web"}, at(60));
    EXPECT_EQ(told.finish("web", 70), "up* 0-61, functional-failure 61-70");
}

TEST(Name, OfMoreThanFourKibibytesIsCutBetweenCharacters)
{
    const auto cut = [](std::size_t size, const std::string& behind) {
        const std::string known = report::knownname(std::string(size, 'x') + behind);
        return known.substr(known.find_last_of('x') + 1);
    };
    EXPECT_EQ(cut(4095, "y"), "y");
    EXPECT_EQ(cut(4096, "y"), "...");
    EXPECT_EQ(cut(4096, "\u00e9"), "...");
    EXPECT_EQ(cut(4095, "\u00e9"), "...");
    EXPECT_EQ(cut(4094, "\u00e9y"), "\u00e9...");
    EXPECT_EQ(cut(4093, "\U0001f600"), "...");
    EXPECT_EQ(cut(4092, "\U0001f600y"), "\U0001f600...");
    EXPECT_EQ(report::knownname(std::string(4097, '\x80')), std::string(4093, '\x80') + "...");
}

TEST(Name, IsKnownByItsFirstFourKibibytesWhereverItStands)
{
    const std::string begin(4096, 'x');
    const std::string path = "/" + begin;
    story told(announced(0, kOne, begin + "one", path + "one"));
    told.play({{1, kTwo, kServiceFailed, begin + "two"},
               {2, kThree, kStatusAnswered, "service " + begin + "three status 1>a 2>a"},
               {3, kMain, kRecoveryTried, begin + "four"},
               {4, kMain + 1, kCheckBegins, path + "five"}});
    EXPECT_THAT(told.names(), ElementsAre(begin + "..."));
    told.finish(begin + "...", 5);
    EXPECT_EQ(told.of(begin + "...").path, path.substr(0, 4096) + "...");
}

// Very many services, of a hostile log: what a message costs does not depend on their number. Else
// each of these takes a minute.
constexpr int kManyServices = 100000;
constexpr std::clock_t kMostSeconds = 20; // of processor time

class Hostile : public testing::Test {
protected:
    ~Hostile() override { EXPECT_LT(seconds(), kMostSeconds); }

    [[nodiscard]] std::clock_t seconds() const { return (std::clock() - begin) / CLOCKS_PER_SEC; }

    void hear(std::int64_t when, std::int64_t clock, report::messageid id,
              const std::string& first = {})
    {
        report::message said;
        said.id = id;
        said.thread = ++threads;
        said.when = {clock, when};
        said.first = first;
        told.hear(said);
    }

    report::tracker told{{}};
    std::uint64_t threads = 0;
    const std::clock_t begin = std::clock();
};

TEST_F(Hostile, LoadsFailBetweenAnnouncements)
{
    for (int each = 0; each < kManyServices && seconds() < kMostSeconds; ++each) {
        hear(0, 0, kServiceNamed, std::to_string(each));
        hear(0, 0, kLoadFailed);
    }
}

TEST_F(Hostile, EachServiceIsOfAnotherGeneration)
{
    for (int each = 0; each < kManyServices && seconds() < kMostSeconds; ++each) {
        hear(60 * each, 60 * each, kServiceNamed, std::to_string(each));
    }
}

TEST_F(Hostile, TheClockIsSetAgainAndAgain)
{
    for (int each = 0; each < kManyServices && seconds() < kMostSeconds; ++each) {
        hear(0, each % 2 * 1000, kServiceNamed, std::to_string(each));
    }
}

// Else each message would look at all that wait for their paths.
TEST_F(Hostile, NoPathFollowsTheAnnouncements)
{
    constexpr report::serviceid kMostWaiting = 1000;
    hear(0, 0, kCheckBegins, "/path");
    for (report::serviceid each = 0; each < kMostWaiting; ++each) {
        hear(0, 0, kServiceNamed, std::to_string(each));
    }
    EXPECT_EQ(told.services(), 1U);
    hear(0, 0, kServiceNamed, "one more");
    EXPECT_EQ(told.services(), 2U);
    EXPECT_EQ(told.nameof(1), "0");
}

TEST(Daemon, ThatEndsLeavesTheServicesInTheirOrder)
{
    story told(announced(0, kOne, "web", "/web") + announced(0, kTwo, "mail", "/mail") +
               std::vector<line>{{100, 0, kNoLog}} + announced(200, kThree, "mail", "/mail") +
               announced(200, kOne, "web", "/web") + std::vector<line>{{300, 0, kNoLog}});
    EXPECT_THAT(told.happened({eventkind::kUnwatched}),
                ElementsAre("100 web unwatched not-watched", "100 mail unwatched not-watched",
                            "300 web unwatched not-watched", "300 mail unwatched not-watched"));
}

TEST(Events, TellEachMessageOnceAndInferredStatesWithoutOne)
{
    story told(web({{60, kOne, kServiceFailed, "web"},
                    {300, kOne, kCheckBegins, "/web"},
                    {310, kOne, kPingBegins}}));
    const auto& events = told.allevents();
    EXPECT_EQ(std::count_if(events.begin(), events.end(),
                            [](const auto& each) { return each.source != nullptr; }),
              5);
    EXPECT_THAT(told.happened({eventkind::kWatched, eventkind::kFailed, eventkind::kState,
                               eventkind::kChecked, eventkind::kStep}),
                ElementsAre("0 web watched up*", "0 web step", "60 web failed suspect",
                            "270 web state up*", "300 web checked", "310 web step"));
}

TEST(Words, AreThoseOfTheManual)
{
    EXPECT_EQ(wordof(state::kFunctionalFailure), "functional-failure");
    EXPECT_EQ(wordof(state::kUp), "up");
    EXPECT_EQ(wordof(state::kGaveUp), "gave-up");
    EXPECT_EQ(wordof(eventkind::kRecoveryTried), "recovery-tried");
    EXPECT_EQ(wordof(eventkind::kStep), "step");
}

} // namespace
