#include "messages.h"

#include <array>
#include <sstream>
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace report {
namespace {

std::string listed(loglevel level, std::string_view module, std::string_view text,
                   std::string_view meaning)
{
    const std::array<messageform, 1> forms{{{messageid::kListing, level, module, text, meaning}}};
    std::ostringstream out;
    writemessages(out, forms);
    return out.str();
}

TEST(Messages, AreListedWithTheirMeaningBelow)
{
    EXPECT_EQ(listed(loglevel::kError, "wdmanager", "Loadservices error.", "nothing is watched"),
              "ERROR wdmanager Loadservices error.\n    nothing is watched\n");
    EXPECT_EQ(listed(loglevel::kStandardError, "", "Unable to open the log file", "it ends"),
              "stderr Unable to open the log file\n    it ends\n");
    EXPECT_EQ(listed(loglevel::kInfo, "m", "a", ""), "INFO m a\n");
}

TEST(Messages, HaveVisibleBlanksWhereNobodyWouldSeeThem)
{
    EXPECT_EQ(listed(loglevel::kDebug, "module ", " a b  c ", ""), "DEBUG module␠ ␠a b␠␠c␠\n");
}

TEST(Messages, HaveMeaningsOfAnyLength)
{
    std::string meaning = "of";
    for (int i = 0; i < 50; ++i) {
        meaning += " words";
    }
    std::istringstream lines(listed(loglevel::kInfo, "m", "a", meaning));
    std::string line;
    std::getline(lines, line);
    std::string joined;
    while (std::getline(lines, line)) {
        EXPECT_LE(line.size(), 80U);
        joined += (joined.empty() ? "" : " ") + line.substr(4);
    }
    EXPECT_EQ(joined, meaning);
    EXPECT_EQ(listed(loglevel::kInfo, "m", "a", std::string(100, 'x')),
              "INFO m a\n    " + std::string(100, 'x') + "\n");
}

} // namespace
} // namespace report
