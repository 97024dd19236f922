#include "timeexpression.h"

#include <cstdlib>
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "instant.h"

namespace report {
namespace {

using testing::Optional;

// What `text` means at Sat Nov 21 16:00:00 2026 in Berlin, an hour before Greenwich.
constexpr std::time_t kNow = 1795273200;

std::optional<std::int64_t> meant(const char* text, std::time_t now = kNow)
{
    setenv("TZ", "Europe/Berlin", 1); // each test is a process of its own
    tzset();
    return clockof(text, now);
}

// A clock's seconds as date and time, for the tests' own words.
std::int64_t at(int year, int month, int day, int hour = 0, int minute = 0, int second = 0)
{
    std::tm parts{};
    parts.tm_year = year - 1900;
    parts.tm_mon = month - 1;
    parts.tm_mday = day;
    parts.tm_hour = hour;
    parts.tm_min = minute;
    parts.tm_sec = second;
    return timegm(&parts);
}

TEST(TimeExpression, NowIsTheLogsClock)
{
    EXPECT_THAT(meant("now"), Optional(at(2026, 11, 21, 16)));
}

TEST(TimeExpression, SomethingAgoIsCountedBackFromNow)
{
    EXPECT_THAT(meant("2 hours ago"), Optional(at(2026, 11, 21, 14)));
    EXPECT_THAT(meant("1 hour ago"), Optional(at(2026, 11, 21, 15)));
    EXPECT_THAT(meant("30 min ago"), Optional(at(2026, 11, 21, 15, 30)));
    EXPECT_THAT(meant("90s ago"), Optional(at(2026, 11, 21, 15, 58, 30)));
    EXPECT_THAT(meant("1 day 2h ago"), Optional(at(2026, 11, 20, 14)));
    EXPECT_THAT(meant("3 weeks ago"), Optional(at(2026, 10, 31, 16)));
}

TEST(TimeExpression, AnHourAgoIsAnHourAlsoWhereTheClockGoesBack)
{
    const std::time_t justafter = 1792893600; // Sun Oct 25 03:00:00 in winter time
    EXPECT_THAT(meant("now", justafter), Optional(at(2026, 10, 25, 3)));
    EXPECT_THAT(meant("1 hour ago", justafter), Optional(at(2026, 10, 25, 2)));
    EXPECT_THAT(meant("2 hours ago", justafter), Optional(at(2026, 10, 25, 2)));
    EXPECT_THAT(meant("3 hours ago", justafter), Optional(at(2026, 10, 25, 1)));
}

TEST(TimeExpression, ADayIsItsBeginning)
{
    EXPECT_THAT(meant("today"), Optional(at(2026, 11, 21)));
    EXPECT_THAT(meant("Yesterday"), Optional(at(2026, 11, 20)));
    EXPECT_THAT(meant("2026-11-02"), Optional(at(2026, 11, 2)));
    EXPECT_THAT(meant("Nov 2"), Optional(at(2026, 11, 2)));
}

TEST(TimeExpression, ATimeIsTodays)
{
    EXPECT_THAT(meant("14:05"), Optional(at(2026, 11, 21, 14, 5)));
    EXPECT_THAT(meant("14:05:30"), Optional(at(2026, 11, 21, 14, 5, 30)));
    EXPECT_THAT(meant("9:05"), Optional(at(2026, 11, 21, 9, 5)));
}

TEST(TimeExpression, ATimeBehindADayIsThatDays)
{
    EXPECT_THAT(meant("yesterday 14:00"), Optional(at(2026, 11, 20, 14)));
    EXPECT_THAT(meant("  today   1:02:03 "), Optional(at(2026, 11, 21, 1, 2, 3)));
    EXPECT_THAT(meant("2026-11-21 14:05"), Optional(at(2026, 11, 21, 14, 5)));
    EXPECT_THAT(meant("2026-11-21T14:05:30"), Optional(at(2026, 11, 21, 14, 5, 30)));
    EXPECT_THAT(meant("Nov 21 14:05"), Optional(at(2026, 11, 21, 14, 5)));
}

TEST(TimeExpression, ADateWithoutAYearIsTheLastThatIsNoMoreThanADayAhead)
{
    EXPECT_THAT(meant("Nov 22"), Optional(at(2026, 11, 22)));
    EXPECT_THAT(meant("Nov 23"), Optional(at(2025, 11, 23)));
    EXPECT_THAT(meant("dec 31 23:59"), Optional(at(2025, 12, 31, 23, 59)));
    EXPECT_THAT(meant("Feb 29"), Optional(at(2024, 2, 29)));
    EXPECT_THAT(meant("Jan 1", 1798754400), Optional(at(2027, 1, 1))); // Dec 31 2026
}

TEST(TimeExpression, TheLogsOwnStampAndSecondsAreUnderstood)
{
    EXPECT_THAT(meant("Sat Nov 21 15:39:37 2026"), Optional(at(2026, 11, 21, 15, 39, 37)));
    EXPECT_THAT(meant("Mon Nov  2 15:39:37 2026"), Optional(at(2026, 11, 2, 15, 39, 37)));
    EXPECT_THAT(meant("@1795273200"), Optional(at(2026, 11, 21, 16)));
    EXPECT_THAT(meant("@0"), Optional(at(1970, 1, 1, 1)));
}

class NotUnderstood : public testing::TestWithParam<const char*> {};

TEST_P(NotUnderstood, IsNoTime)
{
    EXPECT_EQ(meant(GetParam()), std::nullopt);
}

INSTANTIATE_TEST_SUITE_P(
    TimeExpression, NotUnderstood,
    testing::Values("", " ", "ago", "2 ago", "hours ago", "2 hours", "2 fortnights ago", "-1 h ago",
                    "2 hours ago ago", "999999999999 s ago", "tomorrow", "yesterday today", "24:00",
                    "14:60", "14:05:60", "14:", "14:05:", ":05", "14:05:30:1", "1405", "2026-02-29",
                    "2026-13-01", "2026-11-21T", "2026-11-21T25:00", "26-11-21", "2026-11-21-1",
                    "2026-11-21 14", "Nov", "Nov 31", "Feb 30", "Nox 1", "Nov 21 2026", "@", "@x",
                    "@-1", "@999999999999", "Xxx Nov 21 15:39:37 2026", "Sat Nov 31 15:39:37 2026",
                    "Sat Nov 21 15:39 2026 UTC", "Sat Nov 21 2026 15:39:37", "n\xc3\xb6v 2"));

} // namespace
} // namespace report
