// Moments and spans as text.

#include "instant.h"

#include <limits>

#include <gtest/gtest.h>

using namespace report;

namespace {

constexpr std::int64_t kAMoment = 1795275577; // 2026-11-21 15:39:37

TEST(Instant, IsShownByTheLogsClock)
{
    EXPECT_EQ(clocktext({kAMoment, 5}), "2026-11-21 15:39:37");
    EXPECT_EQ(isotext({kAMoment, 5}), "2026-11-21T15:39:37");
    EXPECT_EQ(clocktext({}), "1970-01-01 00:00:00");
    EXPECT_EQ(clocktext({-1, 0}), "1969-12-31 23:59:59");
    EXPECT_EQ(isotext({253402300799, 0}), "9999-12-31T23:59:59");
    EXPECT_EQ(isotext({1709164800, 0}), "2024-02-29T00:00:00");
}

TEST(Instant, IsReckonedWithByWhatHasElapsed)
{
    EXPECT_EQ(secondsbetween({1000, 20}, {500, 90}), 70);
}

TEST(SpanText, HasTwoUnitsAtMost)
{
    EXPECT_EQ(spantext(0), "0 s");
    EXPECT_EQ(spantext(45), "45 s");
    EXPECT_EQ(spantext(60), "1 min");
    EXPECT_EQ(spantext(210), "3 min 30 s");
    EXPECT_EQ(spantext(3599), "59 min 59 s");
    EXPECT_EQ(spantext(3659), "1 h");
    EXPECT_EQ(spantext(7500), "2 h 5 min");
    EXPECT_EQ(spantext(86400), "1 d");
    EXPECT_EQ(spantext(273'659), "3 d 4 h");
    EXPECT_EQ(spantext(34'560'000), "400 d");
}

TEST(SpanText, TakesAnyNumber)
{
    EXPECT_EQ(spantext(-45), "-45 s");
    EXPECT_EQ(spantext(std::numeric_limits<std::int64_t>::min()), "-106751991167300 d 15 h");
    EXPECT_EQ(spantext(std::numeric_limits<std::int64_t>::max()), "106751991167300 d 15 h");
}

} // namespace
