// Where tokens stand in the file. What they are is tried through the reader, in xmlparser_test.cpp.

#include "xmlscan.h"

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "temporaryfolder.h"

namespace {

class Scan : public ::testing::Test {
protected:
    // The tokens of a file that holds `text`, each as its place and its content.
    std::vector<std::string> read(std::string_view text)
    {
        folder.write("config.xml", text);
        std::vector<std::string> tokens;
        scanfile(folder.path("config.xml"), [&tokens](const xmltoken& token) {
            tokens.push_back(std::to_string(token.place) + " " + std::string(token.content));
        });
        return tokens;
    }

    TemporaryFolder folder;
};

using Tokens = std::vector<std::string>;

TEST_F(Scan, TagsBeginAtTheirBracketAndTextsAtTheirFirstLetter)
{
    EXPECT_EQ(read("<a>  x y </ a ></wdtargets>"),
              (Tokens{"0 a", "5 x y", "9 a", "14 >", "15 wdtargets"}));
}

TEST_F(Scan, PlacesCountWhatStandsBeforeTheFirstTag)
{
    EXPECT_EQ(read("<?xml version='1.0'?>\n<a>1</wdtargets>"),
              (Tokens{"22 a", "25 1", "26 wdtargets"}));
    EXPECT_EQ(read("abc\n<a></wdtargets>"), (Tokens{"4 a", "7 wdtargets"}));
}

TEST_F(Scan, PlacesGoOnInALongFile)
{
    const std::string text = "<a>" + std::string(200000, 'x') + "</a>";
    const Tokens tokens = read(text + text + "</wdtargets>");
    ASSERT_EQ(tokens.size(), 9U);
    EXPECT_EQ(tokens[4], "200007 a");
    EXPECT_EQ(tokens[8], "400014 wdtargets");
}

// The first mark after the text's start decides where a declaration leads to, long after the scan
// has finished with it; here it is the first byte of the second piece that is read.
TEST_F(Scan, FirstMarkIsKnownWhereverAPieceOfTheFileBegins)
{
    constexpr std::size_t kPieceBytes = 65536;
    const std::string first = "<a>" + std::string(kPieceBytes - 3, 'x') + "?</a>";
    std::string rest(10 * kPieceBytes, ' ');
    const Tokens tokens = read(first + rest + "<?b>" + rest + "?</wdtargets>");
    ASSERT_EQ(tokens.size(), 7U);
    EXPECT_EQ(tokens[4], std::to_string(first.size() + rest.size()) + " ?b");
}

TEST_F(Scan, TagWithoutANameTellsWhereItIs)
{
    try {
        read("<a>\n< >");
        FAIL() << "it was read";
    } catch (const emptytag& failure) {
        EXPECT_EQ(failure.place, 4U);
        EXPECT_STREQ(failure.what(), "basic_string::substr");
    }
    try {
        read("<a>\n1<b/></a>");
        FAIL() << "it was read";
    } catch (const emptytag& failure) {
        EXPECT_EQ(failure.place, 5U);
    }
}

} // namespace
