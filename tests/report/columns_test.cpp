#include "columns.h"

#include <string>

#include <gtest/gtest.h>

namespace report {
namespace {

TEST(ColumnsOf, CountsWhatATerminalShows)
{
    EXPECT_EQ(columnsof(""), 0U);
    EXPECT_EQ(columnsof("web"), 3U);
    EXPECT_EQ(columnsof("für"), 3U);
    EXPECT_EQ(columnsof("数据库"), 6U);
    EXPECT_EQ(columnsof("e\xcc\x81t\xc3\xa9"), 3U); // an accent of its own
    EXPECT_EQ(columnsof("\xff\xfe"), 2U);
}

TEST(Fitted, LeavesWhatFits)
{
    EXPECT_EQ(fitted("redis-server", 12), "redis-server");
    EXPECT_EQ(fitted("数据库", 6), "数据库");
}

TEST(Fitted, CutsWhatDoesNot)
{
    EXPECT_EQ(fitted("redis-server", 11), "redis-se...");
    EXPECT_EQ(fitted("redis-server", 3), "...");
    EXPECT_EQ(fitted("数据库", 5), "数...");
    EXPECT_EQ(fitted("数据库连接", 8), "数据...");
}

TEST(Fitted, WritesOutWhatSteersATerminal)
{
    EXPECT_EQ(fitted("a\033[31mb\tc\n", 80), "a\\x1b[31mb\\x09c\\x0a");
    EXPECT_EQ(fitted("\xff", 80), "\\xff");
    EXPECT_EQ(fitted("\xe2\x80\x8b txt", 80), "\\u{200b} txt");
}

TEST(Filled, CountsColumnsNotBytes)
{
    EXPECT_EQ(filledbehind("数", 4), "数  ");
    EXPECT_EQ(filledbefore("für", 5), "  für");
    EXPECT_EQ(filledbehind("too long", 4), "too long");
    EXPECT_EQ(filledbefore("too long", 4), "too long");
}

} // namespace
} // namespace report
