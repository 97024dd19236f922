// Local times -> moments, in zones that change their clocks, and with clocks that are set.

#include "logclock.h"

#include <cstdlib>
#include <string>

#include <gtest/gtest.h>

#include "datereader.h"

using namespace report;

namespace {

constexpr const char* kBerlin = "CET-1CEST,M3.5.0,M10.5.0/3";
constexpr const char* kHalfHour = "<+1030>-10:30<+11>-11,M10.1.0,M4.1.0"; // changes by half an hour

logclock clockin(const char* zone)
{
    setenv("TZ", zone, 1);
    return {};
}

std::int64_t clockof(const std::string& date)
{
    EXPECT_EQ(date.size(), datereader::kDateBytes);
    const auto local = datereader().read(date.data());
    EXPECT_TRUE(local) << date;
    return local.value_or(0);
}

std::int64_t elapsed(logclock& clock, const std::string& date)
{
    return clock.advance(clockof(date)).elapsed;
}

TEST(LogClock, CountsSecondsAcrossTheChangesOfItsZone)
{
    logclock spring = clockin(kBerlin);
    const auto night = elapsed(spring, "Sun Mar 29 01:59:59 2026");
    EXPECT_EQ(elapsed(spring, "Sun Mar 29 03:00:00 2026") - night, 1);

    logclock autumn = clockin(kBerlin);
    const auto before = elapsed(autumn, "Sun Oct 25 01:59:59 2026");
    EXPECT_EQ(elapsed(autumn, "Sun Oct 25 02:00:00 2026") - before, 1);
    EXPECT_EQ(elapsed(autumn, "Sun Oct 25 02:59:59 2026") - before, 3600);
    EXPECT_EQ(elapsed(autumn, "Sun Oct 25 02:00:00 2026") - before, 3601);
    EXPECT_EQ(elapsed(autumn, "Sun Oct 25 02:30:00 2026") - before, 5401);
    EXPECT_EQ(elapsed(autumn, "Sun Oct 25 02:59:59 2026") - before, 7200);
    EXPECT_EQ(elapsed(autumn, "Sun Oct 25 03:00:00 2026") - before, 7201);
    EXPECT_EQ(spring.changes() + autumn.changes(), 0U);
}

TEST(LogClock, KnowsChangesWithinAnHour)
{
    logclock clock = clockin(kHalfHour);
    const auto before = elapsed(clock, "Sun Apr  5 01:29:59 2026");
    EXPECT_EQ(elapsed(clock, "Sun Apr  5 01:59:59 2026") - before, 1800);
    EXPECT_EQ(elapsed(clock, "Sun Apr  5 01:30:00 2026") - before, 1801);
    EXPECT_EQ(elapsed(clock, "Sun Apr  5 02:00:00 2026") - before, 3601);
    EXPECT_EQ(clock.changes(), 0U);
}

TEST(LogClock, KnowsHoursOfWhichHalfIsLeftOut)
{
    logclock clock = clockin(kHalfHour);
    const auto before = elapsed(clock, "Sun Oct  4 01:59:59 2026");
    EXPECT_EQ(elapsed(clock, "Sun Oct  4 02:30:00 2026") - before, 1);
    EXPECT_EQ(elapsed(clock, "Sun Oct  4 02:59:59 2026") - before, 1800);
    EXPECT_EQ(elapsed(clock, "Sun Oct  4 03:00:00 2026") - before, 1801);
}

TEST(LogClock, TakesATimeThatWasLeftOutForALaterOne)
{
    logclock clock = clockin(kBerlin);
    const auto before = elapsed(clock, "Sun Mar 29 01:59:59 2026");
    EXPECT_EQ(elapsed(clock, "Sun Mar 29 02:10:00 2026") - before, 601);
    EXPECT_EQ(elapsed(clock, "Sun Mar 29 03:10:00 2026") - before, 601);
}

TEST(LogClock, DisorderOfAMinuteElapsesNothing)
{
    logclock clock = clockin("UTC0");
    const auto first = elapsed(clock, "Sat Nov 21 15:39:37 2026");
    EXPECT_EQ(elapsed(clock, "Sat Nov 21 15:39:36 2026"), first);
    EXPECT_EQ(elapsed(clock, "Sat Nov 21 15:38:37 2026"), first);
    EXPECT_EQ(elapsed(clock, "Sat Nov 21 15:39:38 2026"), first + 1);
    EXPECT_EQ(clock.changes(), 0U);
}

TEST(LogClock, GoesOnWhereTheClockWasSetBack)
{
    logclock clock = clockin("UTC0");
    const auto first = elapsed(clock, "Sat Nov 21 15:39:37 2026");
    const instant set = clock.advance(clockof("Sat Nov 21 15:38:36 2026"));
    EXPECT_EQ(set.elapsed, first);
    EXPECT_EQ(set.clock, clockof("Sat Nov 21 15:38:36 2026"));
    EXPECT_EQ(clock.changes(), 1U);
    EXPECT_EQ(elapsed(clock, "Sat Nov 21 15:38:46 2026"), first + 10);
    EXPECT_EQ(elapsed(clock, "Thu Jan  1 00:00:00 1970"), first + 10);
    EXPECT_EQ(clock.changes(), 2U);
}

TEST(LogClock, OutlastsAClockThatIsSetBackForEver)
{
    logclock clock = clockin("UTC0");
    const std::int64_t early = clockof("Mon Jan  1 00:00:00 1900");
    const std::int64_t late = clockof("Fri Dec 31 23:59:59 9999");
    std::int64_t last = clock.advance(early).elapsed;
    constexpr int kTurns = 10'000;
    for (int i = 0; i < kTurns; ++i) {
        clock.advance(late);
        const std::int64_t now = clock.advance(early).elapsed;
        ASSERT_GE(now, last);
        last = now;
    }
    EXPECT_GT(clock.changes(), 1000U);
    EXPECT_GT(last, late * 1000);
}

TEST(LogClock, GivesThePresentOnBothClocks)
{
    logclock clock = clockin(kBerlin);
    const auto last = elapsed(clock, "Sat Nov 21 15:39:37 2026");
    const instant now = clock.at(1795275577 - 3600 + 100);
    EXPECT_EQ(now.elapsed, last + 100);
    EXPECT_EQ(now.clock, clockof("Sat Nov 21 15:41:17 2026"));
    EXPECT_EQ(clock.at(0).elapsed, last);
}

} // namespace
