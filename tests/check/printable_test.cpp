// What a stranger's bytes look like on a terminal.

#include "printable.h"

#include <string>

#include <gtest/gtest.h>

using namespace tools;

namespace {

TEST(Printable, LeavesOrdinaryTextAndTabsAlone)
{
    EXPECT_EQ(printable("web\t/usr/sbin/webd"), "web\t/usr/sbin/webd");
    EXPECT_EQ(printable("für 10 €, 語 😀"), "für 10 €, 語 😀");
    EXPECT_EQ(printable(""), "");
}

TEST(Printable, WritesControlCharactersOut)
{
    EXPECT_EQ(printable("\x1b[31m\n\r\a\x7f"), "\\x1b[31m\\x0a\\x0d\\x07\\x7f");
    EXPECT_EQ(printable(std::string("a\0b", 3)), "a\\x00b");
    EXPECT_EQ(printable("\u009b31m"), "\\u{9b}31m"); // the control sequence introducer of C1
}

// Misleading is what they have to be.
// NOLINTBEGIN(misc-misleading-bidirectional)
TEST(Printable, WritesOutWhatTurnsOrHidesText)
{
    const std::string reversal =
        std::string("\xe2\x80") + "\xae"; // in one piece it turns this text
    const std::string isolate = std::string("\xe2\x81") + "\xa6";
    EXPECT_EQ(printable("a" + reversal + "b"), "a\\u{202e}b");
    EXPECT_EQ(printable("a\u200bb\ufeff"), "a\\u{200b}b\\u{feff}");
    EXPECT_EQ(printable("a\u200fb"), "a\\u{200f}b");
    EXPECT_EQ(printable(isolate + "\xf3\xa0\x81\x81"), "\\u{2066}\\u{e0041}");
}
// NOLINTEND(misc-misleading-bidirectional)

TEST(Printable, WritesBytesThatAreNotUtf8Out)
{
    EXPECT_EQ(printable("\xff\xfe"), "\\xff\\xfe");
    EXPECT_EQ(printable("\xc3"), "\\xc3");                            // cut off
    EXPECT_EQ(printable("\xc0\xaf"), "\\xc0\\xaf");                   // too long for what it says
    EXPECT_EQ(printable("\xe0\x80\xaf"), "\\xe0\\x80\\xaf");          // the same
    EXPECT_EQ(printable("\xed\xa0\x80"), "\\xed\\xa0\\x80");          // half of a pair
    EXPECT_EQ(printable("\xed\xbf\xbf"), "\\xed\\xbf\\xbf");          // the other half
    EXPECT_EQ(printable("\xf4\x90\x80\x80"), "\\xf4\\x90\\x80\\x80"); // beyond the last one
}

TEST(Printable, QuotesAreOneLineAndNoLongerThanSixtyCharacters)
{
    EXPECT_EQ(inquotes("a\tb"), "\"a\\x09b\"");
    EXPECT_EQ(inquotes(std::string(60, 'x')), '"' + std::string(60, 'x') + '"');
    EXPECT_EQ(inquotes(std::string(61, 'x')), '"' + std::string(60, 'x') + "...\"");
}

TEST(Printable, CountsCharactersAndKnowsUtf8)
{
    EXPECT_EQ(characters("für"), 3U);
    EXPECT_EQ(characters("\xff\xc3x"), 3U);
    EXPECT_TRUE(isutf8("für"));
    EXPECT_FALSE(isutf8("f\xfcr"));
}

} // namespace
