// Findings as they are shown.

#include "report.h"

#include <algorithm>
#include <sstream>

#include <gtest/gtest.h>

using namespace check;

namespace {

std::string shown(const std::string& text, const std::vector<finding>& found, bool colour = false)
{
    std::ostringstream out;
    writefindings(out, "web.xml", sourcetext(text), found, colour);
    return out.str();
}

std::vector<finding> at(std::size_t place)
{
    return {{place, severity::warning, "comment", "what"}};
}

TEST(Report, PointsToThePlaceInItsLine)
{
    EXPECT_EQ(shown("a\n\tbcd\n", at(4)), "web.xml:2:3: warning: what [comment]\n"
                                          "    2 | \tbcd\n"
                                          "      | \t ^\n");
}

TEST(Report, LineNumbersMayBeLong)
{
    EXPECT_EQ(shown(std::string(1234567, '\n') + "x", at(1234567)),
              "web.xml:1234568:1: warning: what [comment]\n"
              "1234568 | x\n"
              "        | ^\n");
}

TEST(Report, OfALongLineShowsWhatIsAroundThePlace)
{
    const std::string text = std::string(500, 'a') + 'X' + std::string(500, 'b');
    EXPECT_EQ(shown(text, at(500)), "web.xml:1:501: warning: what [comment]\n"
                                    "    1 | ..." +
                                        std::string(60, 'a') + 'X' + std::string(59, 'b') +
                                        "...\n" + "      |    " + std::string(60, ' ') + "^\n");
}

TEST(Report, CaretStandsBelowItsPlaceWhateverIsBeforeIt)
{
    EXPECT_EQ(shown("für\x1b[m\xffX", at(8)), "web.xml:1:8: warning: what [comment]\n"
                                              "    1 | für\\x1b[m\\xffX\n"
                                              "      |              ^\n");
}

TEST(Report, LineEndsOfOtherSystemsAreNotShown)
{
    EXPECT_EQ(shown("ab\r\nc", at(1)), "web.xml:1:2: warning: what [comment]\n"
                                       "    1 | ab\n"
                                       "      |  ^\n");
}

TEST(Report, FindingsWithoutAPlaceShowNoLine)
{
    EXPECT_EQ(shown("ab", at(kNoPlace)), "web.xml:1:1: warning: what [comment]\n");
}

TEST(Report, EscapesWhatMessagesAndNamesHold)
{
    std::ostringstream out;
    writefindings(out, "a\x1b.xml", sourcetext(""), {{0, severity::error, "comment", "b\x1b"}},
                  false);
    EXPECT_EQ(out.str(), "a\\x1b.xml:1:1: error: b\\x1b [comment]\n");
}

TEST(Report, IsColouredWhereThatIsWanted)
{
    EXPECT_EQ(shown("ab", at(0), true),
              "\033[1mweb.xml:1:1:\033[m \033[1;35mwarning:\033[m what [comment]\n"
              "    1 | ab\n"
              "      | \033[1;32m^\033[m\n");
}

TEST(Report, ShowsAThousandOfARuleAndCountsTheRest)
{
    std::vector<finding> found(1003, {0, severity::note, "comment", "what"});
    found.push_back({kNoPlace, severity::note, "entity", "other"});
    const std::string text = shown("", found);
    EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 1002);
    EXPECT_TRUE(text.ends_with("web.xml:1:1: note: other [entity]\n"
                               "web.xml: 3 more of one rule; --json has all [comment]\n"));
}

TEST(Report, StatusIsThatOfTheGravestFinding)
{
    EXPECT_EQ(statusof({}), 0);
    EXPECT_EQ(statusof({{0, severity::note, "comment", ""}}), 0);
    EXPECT_EQ(statusof({{0, severity::note, "comment", ""}, {0, severity::warning, "entity", ""}}),
              1);
    EXPECT_EQ(statusof({{0, severity::error, "comment", ""}, {0, severity::note, "entity", ""}}),
              2);
}

TEST(Findings, AreCountedWhereThereAreTooMany)
{
    constexpr std::size_t kKept = 100000;
    findings found;
    for (std::size_t i = 0; i < kKept + 7; ++i) {
        found.add("comment", severity::note, i, "what");
    }
    found.add("comment", severity::error, 3, "grave");
    const auto sorted = found.sorted();
    ASSERT_EQ(sorted.size(), kKept + 2);
    EXPECT_EQ(sorted.back().message, "7 more are not kept");
    EXPECT_EQ(sorted.back().level, severity::note);
    EXPECT_EQ(statusof(sorted), 2);
}

TEST(Findings, AreSortedAndToldOnce)
{
    findings found({"entity"});
    found.add("comment", severity::note, 7, "b");
    found.add("comment", severity::error, 7, "a");
    found.add("no-target", severity::warning, kNoPlace, "c");
    found.add("comment", severity::note, 3, "d");
    found.add("comment", severity::note, 3, "d");
    found.add("entity", severity::error, 0, "left out");
    std::string order;
    for (const finding& each : found.sorted()) {
        order += each.message;
    }
    EXPECT_EQ(order, "dabc");
    EXPECT_THROW(found.add("nonsense", severity::note, 0, ""), std::out_of_range);
}

} // namespace
