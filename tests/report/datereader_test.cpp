// Dates as asctime writes them -> local times.

#include "datereader.h"

#include <string>

#include <gtest/gtest.h>

using namespace report;

namespace {

// Of a date that comes behind others.
std::int64_t clockof(datereader& dates, const std::string& date)
{
    EXPECT_EQ(date.size(), datereader::kDateBytes);
    const auto local = dates.read(date.data());
    EXPECT_TRUE(local) << date;
    return local.value_or(0);
}

bool isdate(const std::string& text)
{
    return datereader().read(text.data()).has_value();
}

TEST(DateReader, ReadsDatesAsAsctimeWritesThem)
{
    datereader dates;
    EXPECT_EQ(clockof(dates, "Sat Nov 21 15:39:37 2026"), 1795275577);
    EXPECT_EQ(clockof(dates, "Sat Nov 21 15:39:38 2026"), 1795275578);
    EXPECT_EQ(clockof(dates, "Sat Nov 21 15:39:38 2026"), 1795275578);
    EXPECT_EQ(clockof(dates, "Sat Nov 21 15:40:07 2026"), 1795275607);
    EXPECT_EQ(clockof(dates, "Sat Nov 21 15:39:37 2026"), 1795275577);
    EXPECT_EQ(clockof(dates, "Sat Nov 21 16:00:00 2026"), 1795276800);
    EXPECT_EQ(clockof(dates, "Thu Jan  1 00:00:01 1970"), 1);
    EXPECT_EQ(clockof(dates, "Wed Dec 31 23:59:59 1969"), -1);
    EXPECT_EQ(clockof(dates, "Thu Feb 29 00:00:00 2024"), 1709164800);
    EXPECT_EQ(clockof(dates, "Fri Dec 31 23:59:59 9999"), 253402300799);
}

TEST(DateReader, WhatIsNoDateChangesNothing)
{
    datereader dates;
    EXPECT_EQ(clockof(dates, "Sat Nov 21 15:39:37 2026"), 1795275577);
    for (const char* text : {"Sat Nov 21 15:39:61 2026", "Sat Nov 21 15:7x:37 2026",
                             "Sun Nov 22 16:39:6  2026", "Sun Nov 32 16:39:37 2026"}) {
        EXPECT_FALSE(dates.read(text)) << text;
        EXPECT_EQ(clockof(dates, "Sat Nov 21 15:39:37 2026"), 1795275577) << text;
        EXPECT_EQ(clockof(dates, "Sat Nov 21 15:40:37 2026"), 1795275637) << text;
    }
}

TEST(DateReader, RefusesWhatIsNoDate)
{
    for (const char* text :
         {"Sat Feb 29 15:39:37 2026", "Sat Feb 31 15:39:37 2026", "Sat Nov 31 15:39:37 2026",
          "Sat Nov  0 15:39:37 2026", "Sat Nov 21 24:39:37 2026", "Sat Nov 21 15:60:37 2026",
          "Sat Nov 21 15:39:60 2026", "Xxx Nov 21 15:39:37 2026", "Sat Foo 21 15:39:37 2026",
          "atN Nov 21 15:39:37 2026", "Sat anF 21 15:39:37 2026", "Sat Nov 21 15:39:37 202x",
          "Sat Nov 21 15:39:37 0026", "Sat Nov 2  15:39:37 2026", "Sat Nov 21  5:39:37 2026",
          "Sat Nov 21 15:39 37 2026", "Sat Nov 21 15-39:37 2026", "Sat_Nov 21 15:39:37 2026",
          "Sat Nov_21 15:39:37 2026", "Sat Nov 21_15:39:37 2026", "Sat Nov 21 15:39:37_2026",
          "Sat Nov -1 15:39:37 2026", "Sat Nov 21 +5:39:37 2026", "                        "}) {
        EXPECT_FALSE(isdate(text)) << text;
    }
    EXPECT_FALSE(isdate(std::string(14, '\0') + "15:39" + std::string(5, '\0')));
    EXPECT_FALSE(isdate(std::string(datereader::kDateBytes, '\xff')));
    EXPECT_TRUE(isdate("Sat Nov 21 15:39:37 2026"));
}

} // namespace
