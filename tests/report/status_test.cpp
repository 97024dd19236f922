#include "status.h"

#include <optional>
#include <sstream>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "columns.h"

namespace report {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

constexpr std::int64_t kEnd = 1795275577; // 2026-11-21 15:39:37 on the log's clock
constexpr std::int64_t kDay = 86400;

instant ago(std::int64_t seconds)
{
    return {.clock = kEnd - seconds, .elapsed = kEnd - seconds};
}

account service(const std::string& name, state now = state::kUp, std::int64_t since = 3600)
{
    account result;
    result.name = name;
    result.now = {.what = now, .from = ago(since), .to = ago(0)};
    result.watchedseconds = since;
    return result;
}

// All figures as wide as they get.
account eventful(const std::string& name, state now)
{
    account result = service(name, now, 400 * kDay);
    result.now.inferred = true;
    result.lastoutage = outage{.from = ago(99 * kDay)};
    result.outages = 987654321;
    result.recoveriestried = 99999;
    result.recoveriessuccessful = 9999;
    result.skippedchecks = 5000000;
    result.watchedseconds = 400 * kDay;
    result.outageseconds = 200 * kDay;
    return result;
}

overview seen(std::vector<account> services)
{
    overview result;
    result.files = {"tolkwd.log"};
    result.services = static_cast<serviceid>(services.size());
    result.accountof = [services](serviceid service) {
        return services.at(service);
    };
    result.nameof = [services = std::move(services)](serviceid service) -> std::string_view {
        return services.at(service).name;
    };
    result.count.lines = 100;
    result.count.messages = 100;
    result.count.first = ago(kDay);
    result.count.last = result.judged = result.present = ago(0);
    return result;
}

std::vector<std::string> linesof(const overview& all, std::size_t columns = 80)
{
    std::ostringstream out;
    writestatus(out, all, columns, false);
    std::vector<std::string> lines;
    std::istringstream text(out.str());
    for (std::string line; std::getline(text, line);) {
        lines.push_back(line);
    }
    return lines;
}

std::string textof(const overview& all, std::size_t columns = 80)
{
    std::ostringstream out;
    writestatus(out, all, columns, false);
    return out.str();
}

TEST(Status, HasALineForEachServiceBelowItsHeader)
{
    const auto lines = linesof(seen({service("web"), service("db")}));
    ASSERT_GE(lines.size(), 3U);
    EXPECT_THAT(lines[0], HasSubstr("SERVICE"));
    EXPECT_THAT(lines[1], StartsWith("+ db "));
    EXPECT_THAT(lines[2], StartsWith("+ web "));
    EXPECT_EQ(lines[3], "");
}

TEST(Status, TellsTroubleFirst)
{
    const auto lines = linesof(seen({service("a", state::kUp), service("b", state::kSuspect),
                                     service("c", state::kGaveUp), service("d", state::kBusy)}));
    EXPECT_THAT(lines.at(1), StartsWith("X c "));
    EXPECT_THAT(lines.at(2), StartsWith("! b "));
    EXPECT_THAT(lines.at(3), StartsWith("* d "));
    EXPECT_THAT(lines.at(4), StartsWith("+ a "));
}

TEST(Status, TellsEachFigure)
{
    account web = service("web", state::kUp, 600);
    web.lastoutage = outage{.from = ago(912), .to = ago(600)};
    web.outages = 2;
    web.recoveriestried = 3;
    web.recoveriessuccessful = 1;
    web.skippedchecks = 7;
    web.watchedseconds = 1000;
    web.outageseconds = 1;
    EXPECT_EQ(linesof(seen({web})).at(0),
              "  SERVICE  STATE   SINCE  LAST OUTAGE   OUTAGES RECOV SKIPS  AVAIL");
    EXPECT_EQ(linesof(seen({web})).at(1),
              "+ web      up      15:29  15:24   5m12s       2   1/3     7 99.90%");
    EXPECT_EQ(linesof(seen({web}), 200).at(1),
              "+ web      up      2026-11-21 15:29:37  2026-11-21 15:24:25     5 min 12 s"
              "       2       1/3       7    99.90%");
}

TEST(Status, MarksWhatIsInferredAndAnOutageThatLasts)
{
    account web = service("web", state::kSuspect, 61);
    web.now.inferred = true;
    web.lastoutage = outage{.from = ago(61)};
    const auto lines = linesof(seen({web}));
    EXPECT_THAT(lines.at(1), HasSubstr(" ~15:38 "));
    EXPECT_THAT(lines.at(1), HasSubstr(" >1m01s "));
    EXPECT_EQ(lines.back(), "~ inferred: no message says so, or when");
    EXPECT_THAT(textof(seen({service("web")})), Not(HasSubstr("~")));
}

TEST(Status, MarksTheLengthOfAnOutageOfWhichTheEndIsInferred)
{
    account web = service("web", state::kBusy, 60);
    web.lastoutage = outage{ago(912), ago(600), true};
    const auto lines = linesof(seen({web}));
    EXPECT_THAT(lines.at(1), HasSubstr(" 15:24  ~5m12s "));
    EXPECT_EQ(lines.back(), "~ inferred: no message says so, or when");
    EXPECT_THAT(linesof(seen({web}), 200).at(1), HasSubstr(" ~5 min 12 s "));
}

TEST(Status, TellsATimeByAsMuchAsItTakes)
{
    const auto since = [](std::int64_t seconds) {
        return linesof(seen({service("web", state::kUp, seconds)})).at(1);
    };
    EXPECT_THAT(since(kDay - 1), HasSubstr(" 15:39 "));
    EXPECT_THAT(since(kDay), HasSubstr(" Nov 20 "));
    EXPECT_THAT(since(200 * kDay), HasSubstr(" May 05 "));
    EXPECT_THAT(since(400 * kDay), HasSubstr(" Oct'25 "));
    EXPECT_THAT(since(-kDay), HasSubstr(" Nov'26 ")); // the clock was set back
}

TEST(Status, DoesNotRoundAnOutageAway)
{
    account web = service("web");
    web.watchedseconds = 1000000000;
    web.outageseconds = 1;
    EXPECT_THAT(linesof(seen({web})).at(1), EndsWith(" 99.99%"));
    web.outageseconds = 0;
    EXPECT_THAT(linesof(seen({web})).at(1), EndsWith("  100%"));
    web.watchedseconds = 0;
    EXPECT_THAT(linesof(seen({web})).at(1), EndsWith("     -"));
}

class AnyState : public testing::TestWithParam<std::size_t> {};

TEST_P(AnyState, FitsInto80Columns)
{
    const auto what = static_cast<state>(GetParam());
    for (const std::string& name :
         {std::string("web"), std::string(300, 'x'), std::string("数据库服务器连接"),
          std::string(20, '\033'), std::string("\xff\xfe\n\t"), std::string()}) {
        const auto lines = linesof(seen({eventful(name, what), service("web", state::kUp)}));
        EXPECT_LE(columnsof(lines.at(0)), 80U) << lines[0];
        EXPECT_EQ(columnsof(lines.at(0)), columnsof(lines.at(1))) << lines[1];
        EXPECT_EQ(columnsof(lines.at(0)), columnsof(lines.at(2))) << lines[2];
        EXPECT_EQ(lines.at(3), "") << lines[3];
    }
}

TEST_P(AnyState, IsToldInFullWhereThereIsRoom)
{
    const auto what = static_cast<state>(GetParam());
    EXPECT_THAT(linesof(seen({service("web", what), service("zeb")})).at(1),
                HasSubstr(' ' + std::string(wordof(what)) + ' '));
    EXPECT_THAT(linesof(seen({eventful(std::string(100, 'x'), what), service("zeb")}), 250).at(1),
                HasSubstr(std::string(100, 'x') + "  " + std::string(wordof(what))));
}

TEST_P(AnyState, LeadsToItsExitStatus)
{
    const auto what = static_cast<state>(GetParam());
    const bool fine = what == state::kUp || what == state::kBusy || what == state::kNotWatched;
    EXPECT_EQ(statusof(seen({service("web"), service("db", what)})), fine ? 0 : 1);
}

INSTANTIATE_TEST_SUITE_P(Status, AnyState, testing::Range<std::size_t>(0, kStates));

TEST(Status, IsOneTableAlsoWithAllStatesAndAThousandServices)
{
    std::vector<account> services;
    for (std::size_t i = 0; i < 1000; ++i) {
        services.push_back(
            eventful("service-" + std::to_string(i), static_cast<state>(i % kStates)));
    }
    const auto lines = linesof(seen(services));
    ASSERT_GE(lines.size(), 1001U);
    for (std::size_t i = 0; i < 1001; ++i) {
        ASSERT_EQ(columnsof(lines[i]), columnsof(lines[0])) << lines[i];
    }
    EXPECT_LE(columnsof(lines[0]), 80U);
}

TEST(Status, HasColoursOnlyWhereTheyAreWanted)
{
    std::ostringstream coloured;
    writestatus(coloured, seen({service("web"), service("db", state::kGaveUp)}), 80, true);
    EXPECT_THAT(coloured.str(), HasSubstr("\033[1;31m"));
    EXPECT_THAT(coloured.str(), HasSubstr("\033[1;32m"));
    EXPECT_THAT(textof(seen({service("web")})), Not(HasSubstr("\033")));
}

TEST(Status, OfALogWithoutServicesAsksForALook)
{
    EXPECT_EQ(statusof(seen({})), 1);
    EXPECT_THAT(textof(seen({})), StartsWith("no service is named in the log\n\nlog from "));
    overview empty;
    EXPECT_EQ(textof(empty), "no service is named in the log\n\nno message of tolkwd in 0 lines\n");
}

TEST(Status, OfALogWithoutATimeTellsNone)
{
    overview untimed; // no more than what went to standard error
    untimed.count.lines = untimed.count.messages = 1;
    EXPECT_THAT(textof(untimed), EndsWith("\n1 line, none of which tells when it was\n"));
}

TEST(Status, OfAFailedLoadAsksForALook)
{
    overview all = seen({service("web"), service("db", state::kNotWatched)});
    EXPECT_EQ(statusof(all), 0);
    all.loadfailed = true;
    EXPECT_EQ(statusof(all), 1);
    EXPECT_THAT(textof(all), StartsWith("the configuration could not be loaded"));
}

TEST(Status, AsOfAPresentBeforeTheLastLineAsksForTheZone)
{
    overview all = seen({service("web")});
    all.asofnow = true;
    all.judged = all.present = {.clock = kEnd - 3600, .elapsed = kEnd};
    EXPECT_THAT(textof(all), HasSubstr("\njudged as of 2026-11-21 14:39:37, before the last line: "
                                       "is TZ that of the daemon?\n"));
    all.judged.elapsed += 60; // in the hour that comes twice
    EXPECT_THAT(textof(all), HasSubstr("\njudged as of 2026-11-21 14:39:37, 1 min after the last"));
}

TEST(Status, WhereNothingIsWatchedAsksForALook)
{
    const overview all =
        seen({service("web", state::kNotWatched), service("db", state::kNotWatched, 11)});
    EXPECT_EQ(statusof(all), 1);
    EXPECT_THAT(textof(all), StartsWith("nothing is watched: "));
    const overview one = seen({service("web", state::kNotWatched), service("db")});
    EXPECT_EQ(statusof(one), 0);
    EXPECT_THAT(textof(one), Not(HasSubstr("nothing is watched")));
}

TEST(Status, LeavesARefreshTheTimeThatItTakes)
{
    const overview all =
        seen({service("web", state::kNotWatched, 700), service("db", state::kNotWatched, 10)});
    EXPECT_EQ(statusof(all), 0);
    EXPECT_THAT(textof(all), Not(HasSubstr("nothing is watched")));
}

TEST(Status, TellsWhatWasRead)
{
    overview all = seen({service("web")});
    EXPECT_THAT(textof(all),
                EndsWith("\nlog from 2026-11-20 15:39:37 to 2026-11-21 15:39:37, 100 lines\n"));
    all.count.foreign = 3;
    all.count.torn = 1;
    EXPECT_EQ(linesof(all).back(), "  of these 3 are others', 1 is torn");
    all.count.clockchanges = 2;
    EXPECT_EQ(linesof(all).back(), "the clock was set back 2 times: times above may repeat");
}

TEST(Status, TellsAsOfWhenItJudges)
{
    overview all = seen({service("web")});
    all.asofnow = true;
    all.judged = all.present = ago(-125);
    EXPECT_EQ(linesof(all).back(),
              "judged as of 2026-11-21 15:41:42, 2 min 5 s after the last line");
}

TEST(Status, TellsThatSilenceMayMeanThatAServiceHasComeUp)
{
    overview all = seen({service("web", state::kSuspect, 60), service("gone", state::kGaveUp),
                         service("db", state::kFunctionalFailure, 60)});
    EXPECT_THAT(textof(all), Not(HasSubstr("no word")));
    all.present = ago(-271); // the retries are over
    EXPECT_THAT(textof(all), EndsWith("no word since the failure: web, db\n  a retry that succeeds "
                                      "leaves no message; --now judges as of the present\n"));
    all.asofnow = true;
    EXPECT_THAT(textof(all), Not(HasSubstr("no word")));
}

TEST(Status, NamesNoMoreThanThreeThatAreSilent)
{
    overview all = seen({service("a", state::kSuspect), service("b", state::kSuspect),
                         service("c", state::kSuspect), service("d", state::kSuspect),
                         service("e", state::kSuspect)});
    EXPECT_THAT(textof(all), HasSubstr("failure: a, b, c and 2 more\n"));
    for (const std::string& line : linesof(all)) {
        EXPECT_LE(columnsof(line), 80U) << line;
    }
}

} // namespace
} // namespace report
