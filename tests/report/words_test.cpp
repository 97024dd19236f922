#include "words.h"

#include <optional>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace report {
namespace {

using testing::HasSubstr;

// Tells a narrator what happens to one service, in seconds since the first event.
class story {
public:
    // What is said of a message.
    std::string said(std::int64_t second, messageid id, std::optional<state> became = {},
                     std::string_view first = "web", std::string_view second_value = "")
    {
        const message source{.id = id,
                             .level = loglevel::kError,
                             .when = at(second),
                             .first = first,
                             .second = second_value,
                             .text = "the daemon's own text",
                             .more = "",
                             .line = 1};
        return teller.wordsof({.kind = eventkind::kState,
                               .when = at(second),
                               .service = service,
                               .became = became,
                               .inferred = false,
                               .why = inference::kNone,
                               .source = &source});
    }

    // What is said of what no message tells.
    std::string inferred(std::int64_t second, state became, inference why = inference::kNone)
    {
        return teller.wordsof({.kind = eventkind::kState,
                               .when = at(second),
                               .service = service,
                               .became = became,
                               .inferred = true,
                               .why = why,
                               .source = nullptr});
    }

    std::optional<serviceid> service = 0;
    narrator teller;

private:
    static instant at(std::int64_t second) { return {.clock = 1000 + second, .elapsed = second}; }
};

TEST(Words, TellAnOutageThatARecoveryEnds)
{
    story web;
    EXPECT_EQ(web.said(0, messageid::kServiceNamed, state::kUp),
              "watched from now on, and taken to be up");
    EXPECT_EQ(web.said(0, messageid::kBinaryPathNamed, {}, "/usr/sbin/webd"),
              "its program is /usr/sbin/webd");
    EXPECT_EQ(web.said(60, messageid::kServiceFailed, state::kSuspect),
              "its status command failed; asked again for 3 min 30 s before it is recovered");
    EXPECT_EQ(web.said(270, messageid::kRecoveryTried, state::kRecovering),
              "recovery 1 begins: stopped and started, with those that depend on it");
    EXPECT_EQ(web.said(330, messageid::kServiceFailed, state::kSuspect),
              "its status command failed; asked again for 3 min 30 s before it is recovered");
    EXPECT_THAT(web.said(540, messageid::kRecoveryTried, state::kRecovering),
                HasSubstr("recovery 2 begins"));
    EXPECT_EQ(web.said(600, messageid::kPingSucceeded, state::kUp),
              "up again, after 9 min: found running");
    EXPECT_EQ(web.said(660, messageid::kRecovered), "the daemon reports its recovery");
}

TEST(Words, CountRecoveriesAnewInEachOutage)
{
    story web;
    web.said(0, messageid::kServiceFailed, state::kSuspect);
    web.said(210, messageid::kRecoveryTried, state::kRecovering);
    web.said(300, messageid::kRecovered, state::kUp);
    web.said(400, messageid::kServiceFailed, state::kSuspect);
    EXPECT_THAT(web.said(610, messageid::kRecoveryTried, state::kRecovering),
                HasSubstr("recovery 1 begins"));
}

TEST(Words, CountARecoveryForTheChecksSakeOnce)
{
    story web;
    EXPECT_EQ(web.said(0, messageid::kCheckFailed, state::kFunctionalFailure),
              "it runs, but its check failed; checked again for 3 min 30 s before it is recovered");
    EXPECT_EQ(web.said(210, messageid::kFunctionalRecoveryTried, state::kFunctionalRecovering),
              "recovery 1 is due: its check still fails");
    EXPECT_THAT(web.said(211, messageid::kRecoveryTried), HasSubstr("recovery 1 begins"));
    EXPECT_THAT(web.said(500, messageid::kFunctionalRecoveryTried), HasSubstr("recovery 2 is due"));
    EXPECT_THAT(web.said(501, messageid::kRecoveryTried), HasSubstr("recovery 2 begins"));
    EXPECT_EQ(web.said(600, messageid::kFunctionalGaveUp, state::kGaveUp),
              "given up after 2 recoveries; nobody watches it until the next refresh");
}

TEST(Words, CountEachRecoveryOfTwoTargetsOnce)
{
    story web;
    web.said(0, messageid::kCheckFailed, state::kFunctionalFailure);
    web.said(210, messageid::kFunctionalRecoveryTried, state::kFunctionalRecovering);
    web.said(211, messageid::kFunctionalRecoveryTried);
    web.said(212, messageid::kRecoveryTried);
    EXPECT_THAT(web.said(230, messageid::kRecoveryTried), HasSubstr("recovery 2 begins"));
}

TEST(Words, DoNotCountWhatTheLogDoesNotHave)
{
    story web;
    EXPECT_EQ(web.said(0, messageid::kRecoveryTried, state::kRecovering),
              "a recovery begins: stopped and started, with those that depend on it");
    EXPECT_EQ(web.said(60, messageid::kGaveUp, state::kGaveUp),
              "given up after its recoveries; nobody watches it until the next refresh");
}

TEST(Words, TellThatAServiceMayHaveNoRecovery)
{
    story web;
    web.said(0, messageid::kServiceNamed, state::kUp);
    web.said(0, messageid::kBinaryPathNamed, {}, "/usr/sbin/webd");
    EXPECT_EQ(
        web.said(0, messageid::kGaveUp, state::kGaveUp),
        "given up unasked: it may have no recovery; nobody watches it until the next refresh");
}

TEST(Words, TellHowLongAnOutageLastedAlsoWhereItIsInferred)
{
    story web;
    web.said(0, messageid::kServiceFailed, state::kSuspect);
    EXPECT_EQ(web.inferred(210, state::kUp, inference::kRetryHelped),
              "up again, after about 3 min 30 s: " + std::string(wordsof(inference::kRetryHelped)));
}

TEST(Words, OfAnOutageThatNobodyFollowsDoNotSayThatItIsOver)
{
    story web;
    web.said(0, messageid::kServiceFailed, state::kSuspect);
    EXPECT_EQ(web.inferred(60, state::kNotWatched),
              "an outage of 1 min is not followed further: nobody watches it any more");
}

TEST(Words, TellThatAnAnnouncementEndsNoOutageForSure)
{
    story web;
    web.said(0, messageid::kServiceFailed, state::kSuspect);
    web.said(210, messageid::kGaveUp, state::kGaveUp);
    EXPECT_EQ(web.said(1000, messageid::kServiceNamed, state::kUp),
              "watched anew, and taken to be up, after an outage of 16 min 40 s");
    web.said(1001, messageid::kServiceFailed, state::kSuspect);
    EXPECT_THAT(web.said(1211, messageid::kRecoveryTried, state::kRecovering),
                HasSubstr("recovery 1 begins"));
    EXPECT_EQ(web.said(1300, messageid::kPingSucceeded, state::kUp),
              "up again, after 21 min 40 s: found running");
}

TEST(Words, BeginAnOutageLongAfterAnAnnouncementAnew)
{
    story web;
    web.said(0, messageid::kGaveUp, state::kGaveUp);
    web.said(1000, messageid::kServiceNamed, state::kUp);
    web.said(1100, messageid::kServiceFailed, state::kSuspect);
    EXPECT_EQ(web.said(1160, messageid::kPingSucceeded, state::kUp),
              "up again, after 1 min: found running");
}

TEST(Words, FollowWhatIsPassedOver)
{
    story web;
    const message failed{.id = messageid::kServiceFailed,
                         .when = {},
                         .first = {},
                         .second = {},
                         .text = {},
                         .more = {}};
    web.teller.passover({.kind = eventkind::kFailed,
                         .when = {},
                         .service = 0,
                         .became = state::kSuspect,
                         .inferred = false,
                         .why = inference::kNone,
                         .source = &failed});
    EXPECT_THAT(web.said(210, messageid::kRecoveryTried, state::kRecovering),
                HasSubstr("recovery 1 begins"));
}

TEST(Words, KeepServicesApart)
{
    story tale;
    tale.said(0, messageid::kServiceFailed, state::kSuspect);
    tale.said(210, messageid::kRecoveryTried, state::kRecovering);
    tale.service = 7;
    tale.said(220, messageid::kServiceFailed, state::kSuspect);
    EXPECT_THAT(tale.said(430, messageid::kRecoveryTried, state::kRecovering),
                HasSubstr("recovery 1 begins"));
    tale.service = std::nullopt;
    EXPECT_THAT(tale.said(440, messageid::kRecoveryTried), HasSubstr("a recovery begins"));
}

TEST(Words, TellWhatTheDaemonFound)
{
    story web;
    EXPECT_EQ(web.said(0, messageid::kStatusAnswered, {}, "service web status", "web is running"),
              "its status command says: web is running");
    EXPECT_EQ(web.said(0, messageid::kStatusAnswered, {}, "service web status", ""),
              "its status command has ended, without a word");
    EXPECT_EQ(web.said(0, messageid::kCheckUnclear, {}, ""), "its check gave no answer");
    EXPECT_EQ(web.said(0, messageid::kCheckSkipped, state::kBusy, "/usr/sbin/webd", "3"),
              "too busy to be checked; 3 left out in a row");
}

TEST(Words, AreFitForATerminal)
{
    story web;
    const std::string words =
        web.said(0, messageid::kCheckUnclear, {}, "\033[31m\n\t" + std::string(1000, 'x'));
    EXPECT_THAT(words, HasSubstr("\\x1b[31m\\x0a\\x09xxx"));
    EXPECT_LT(words.size(), 120U);
    EXPECT_EQ(words.find_first_of("\033\n\t"), std::string::npos);
}

TEST(Words, HaveSomethingToSayOfEveryMessage)
{
    for (int id = 0; id <= static_cast<int>(messageid::kForeign); ++id) {
        story web;
        EXPECT_NE(web.said(0, static_cast<messageid>(id)), "") << id;
    }
}

TEST(Words, HaveSomethingToSayOfEveryStateAndKind)
{
    for (std::size_t which = 0; which < kStates; ++which) {
        story web;
        EXPECT_NE(web.inferred(0, static_cast<state>(which)), "") << which;
    }
    for (int kind = 0; kind <= static_cast<int>(eventkind::kStep); ++kind) {
        narrator teller;
        EXPECT_NE(
            teller.wordsof(
                {.kind = static_cast<eventkind>(kind), .when = {}, .service = {}, .became = {}}),
            "")
            << kind;
    }
}

} // namespace
} // namespace report
