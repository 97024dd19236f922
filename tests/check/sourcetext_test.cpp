// Lines and columns.

#include "sourcetext.h"

#include <fstream>
#include <system_error>

#include <gtest/gtest.h>

using namespace check;

namespace {

std::string at(const sourcetext& source, std::size_t place)
{
    const position where = source.at(place);
    return std::to_string(where.line) + ":" + std::to_string(where.column);
}

TEST(SourceText, CountsLinesAndColumnsFromOne)
{
    const sourcetext source("ab\ncd\n\ne");
    EXPECT_EQ(at(source, 0), "1:1");
    EXPECT_EQ(at(source, 2), "1:3"); // the line's end belongs to it
    EXPECT_EQ(at(source, 3), "2:1");
    EXPECT_EQ(at(source, 6), "3:1");
    EXPECT_EQ(at(source, 7), "4:1");
}

TEST(SourceText, ColumnsAreCharacters)
{
    const sourcetext source("für\n\xff\xfex");
    EXPECT_EQ(at(source, 3), "1:3");
    EXPECT_EQ(at(source, 7), "2:3");
    EXPECT_EQ(at(source, 5), "2:1"); // also before the place that was asked for last
}

TEST(SourceText, PlacesBehindTheEndAreTheEnd)
{
    EXPECT_EQ(at(sourcetext("ab"), 99), "1:3");
    EXPECT_EQ(at(sourcetext(""), 99), "1:1");
    EXPECT_EQ(at(sourcetext("a\n"), 99), "2:1");
}

TEST(SourceText, GivesTheLineOfAPlace)
{
    const sourcetext source("ab\ncd\n\ne");
    EXPECT_EQ(source.lineof(4).text, "cd");
    EXPECT_EQ(source.lineof(4).begin, 3U);
    EXPECT_EQ(source.lineof(6).text, "");
    EXPECT_EQ(source.lineof(99).text, "e");
}

TEST(SourceText, FilesAreReadWholeOrNotAtAll)
{
    const std::string path = ::testing::TempDir() + "sourcetext";
    const std::string text = std::string("a\0b\n", 4) + std::string(3000000, 'x');
    std::ofstream(path, std::ios::binary) << text;
    EXPECT_EQ(readwhole(path), text);
    EXPECT_THROW(readwhole(path + ".missing"), std::system_error);
    EXPECT_THROW(readwhole("/"), std::system_error);
}

} // namespace
