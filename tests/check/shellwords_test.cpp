#include "shellwords.h"

#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using check::shelltext;
using check::splitshell;
using testing::ElementsAre;
using testing::IsEmpty;

std::vector<std::string> programsin(std::string_view text)
{
    std::vector<std::string> names;
    for (const check::program& each : splitshell(text).programs) {
        names.push_back(each.name);
    }
    return names;
}

TEST(Programs, AreTheFirstWordsOfTheParts)
{
    EXPECT_THAT(programsin("a x; b y & c && d || e | f\ng"),
                ElementsAre("a", "b", "c", "d", "e", "f", "g"));
    EXPECT_THAT(programsin("(a; { b; }; (c))"), ElementsAre("a", "b", "c"));
}

TEST(Programs, StandBehindKeywords)
{
    EXPECT_THAT(programsin("if a; then b; elif ! c; then d; else e; fi"),
                ElementsAre("a", "b", "c", "d", "e"));
    EXPECT_THAT(programsin("while a; do b; done; for i in x y; do c $i; done"),
                ElementsAre("a", "b", "c"));
}

TEST(Programs, StandBehindAssignmentsAndStarters)
{
    EXPECT_THAT(programsin("A=1 B='x y' a"), ElementsAre("a"));
    EXPECT_THAT(programsin("A=1"), IsEmpty());
    EXPECT_THAT(programsin("timeout -k 5 --signal=INT -s KILL 60 a -k b"),
                ElementsAre("timeout", "a"));
    EXPECT_THAT(programsin("exec nice -n 5 env -i -u X A=1 nohup sudo -u web -n a"),
                ElementsAre("nice", "env", "nohup", "sudo", "a"));
    EXPECT_THAT(programsin("prlimit --fsize=65536 a; timeout 5 prlimit -p 1 --nofile"),
                ElementsAre("prlimit", "a", "timeout", "prlimit"));
    EXPECT_THAT(programsin("timeout -k"), ElementsAre("timeout"));
}

TEST(Programs, AreNoBuiltinsAndNothingExpanded)
{
    EXPECT_THAT(programsin("cd /x; echo b; [ -e x ]; test -e x; $CMD x; ~/a; 'a' b; \"a b\" c"),
                IsEmpty());
    EXPECT_THAT(programsin("echo $(a; b) ${x:-c d} `e f`; g"), ElementsAre("g"));
}

TEST(Programs, AreNoQuotedTextAndNoComment)
{
    EXPECT_THAT(programsin("a 'b; c' \"d | $(e) \\\" f\" g\\;h # i; j\nk#l"),
                ElementsAre("a", "k#l"));
}

TEST(Programs, AreNoRedirections)
{
    EXPECT_THAT(programsin(">x a 2>&1 >>y; b 2>/dev/null | c"), ElementsAre("a", "b", "c"));
}

TEST(Programs, AreToldApartByWhoStartsThem)
{
    const shelltext split = splitshell("timeout 5 a; exec b");
    ASSERT_EQ(split.programs.size(), 3U);
    EXPECT_FALSE(split.programs[0].started);
    EXPECT_TRUE(split.programs[1].started);
    EXPECT_FALSE(split.programs[2].started);
}

TEST(Programs, IncludeTheScriptOfAnInterpreter)
{
    const shelltext split = splitshell("timeout 5 bash /opt/x y; sh -e /opt/z");
    ASSERT_EQ(split.programs.size(), 4U);
    EXPECT_EQ(split.programs[2].name, "/opt/x");
    EXPECT_TRUE(split.programs[2].argument);
    EXPECT_EQ(split.programs[3].name, "sh");
}

TEST(Programs, MayBeMissingWhereTheTextLooksForThem)
{
    for (const char* const text :
         {"[ -x a ] && a", "command -v a && a", "if a; then b; fi", "a || b", "which a && a",
          ". /x; a", "PATH=/x a", "export PATH=/x; a", "env PATH=/x a"}) {
        EXPECT_FALSE(splitshell(text).needed) << text;
    }
    for (const char* const text : {"a && b", "(a | b; c)", "X=PATH a", "for i in x; do a; done"}) {
        EXPECT_TRUE(splitshell(text).needed) << text;
    }
}

TEST(Bounded, IsWhatTimeoutStarts)
{
    EXPECT_TRUE(splitshell("(env timeout 5 a && echo x)").bounded);
    EXPECT_TRUE(splitshell("sh -c 'timeout 5 a; timeout 5 b'").bounded);
    EXPECT_FALSE(splitshell("a timeout 5").bounded);
    EXPECT_FALSE(splitshell("sh -c 'a'").bounded);
}

TEST(Compound, IsWhatStandsInARowOutsideAllElse)
{
    for (const char* const text : {"a; b", "a && b", "a || b", "a & b", "a\nb", "(a) && b",
                                   "a | b && c", "if a; then b; fi; c"}) {
        EXPECT_TRUE(splitshell(text).compound) << text;
        EXPECT_FALSE(splitshell(text).openend) << text;
    }
}

TEST(Compound, IsNotOneCommandNorOneInParentheses)
{
    for (const char* const text :
         {"a", "(a; b)", "{ a && b; }", "if a; then b; fi", "for i in 1 2; do a; done", "a | b",
          "a 'b; c'", "a \"b && c\"", "a \\; b", "(a; b) | c", "a >x 2>&1"}) {
        EXPECT_FALSE(splitshell(text).compound) << text;
        EXPECT_FALSE(splitshell(text).openend) << text;
        EXPECT_TRUE(splitshell(text).sure) << text;
    }
}

TEST(OpenEnd, IsACommentOrASeparatorAtTheEnd)
{
    for (const char* const text : {"a &", "a;", "a # b", "(a) # b", "a; b &"}) {
        EXPECT_TRUE(splitshell(text).openend) << text;
        EXPECT_FALSE(splitshell(text).compound) << text;
    }
    EXPECT_FALSE(splitshell("# a\nb").openend);
    EXPECT_FALSE(splitshell("a b#c").openend);
}

TEST(Sure, IsNothingThatIsNotFollowed)
{
    for (const char* const text :
         {"a 'b", "a \"b", "a `b", "a $(b", "(a", "a)", "a &&", "a |", "{ a;", "fi", "a >",
          "case x in a) b;; esac", "f() { a; }", "a <<E\nb\nE", "a $(b 'c)')", "a \"$(b \"c\")\"",
          "select x in y; do a; done"}) {
        EXPECT_FALSE(splitshell(text).sure) << text;
    }
    for (const char* const text : {"", "a", "(a; b)", "a $(b (c) d) ${e}", "a\n\n", "\n a"}) {
        EXPECT_TRUE(splitshell(text).sure) << text;
    }
}

TEST(Sure, EndsWithTheTextWhereverItIsCutOff)
{
    const std::string text =
        "A=1 timeout -k 5 6 a \"b $(c ${d})\" 'e' `f` \\g 2>&1 <h; for i in j; "
        "do (k && l) || { m; }; done # n";
    for (std::size_t end = 0; end <= text.size(); ++end) {
        // A keyword that is cut off is a program.
        EXPECT_LE(splitshell(std::string_view(text).substr(0, end)).programs.size(), 6U);
    }
    EXPECT_TRUE(splitshell(text).sure);
}

} // namespace
