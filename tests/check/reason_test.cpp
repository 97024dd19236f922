#include "reason.h"

#include <array>
#include <ctime>
#include <random>
#include <string>
#include <string_view>
#include <vector>

#include <gtest/gtest.h>

#include "wdLocalLog_linux.h"
#include "wdmonitorthread_linux.h"

namespace {

using namespace check;

// All words that the daemon looks for, some of them damaged or inside others, and some that mean
// nothing to it.
constexpr std::array<std::string_view, 32> kPieces{
    "running",
    "RUNNING",
    "Running",
    "not",
    "NOT",
    "cannot",
    "notifyd",
    "stopped",
    "unstopped",
    "unused",
    "Unused",
    "no such service",
    "no such",
    "unrecognized",
    "unrecognised",
    "CreationClassName",
    "creationclassname",
    "service:",
    "service",
    "InstanceID=",
    "InstanceID",
    "initialized",
    "uninitialized",
    "CIMException",
    "cimexception",
    "command not found",
    "command",
    " No such file or directory",
    "No such file or directory",
    "web",
    "\xff\x1b[2J",
    "",
};

constexpr std::array<int, 4> kStates{-1, 0, 1, 3};

class Reason : public testing::Test {
protected:
    const wdLocalLog log{"/dev/null"};
};

void expectagreement(const std::string& line)
{
    for (const int state : kStates) {
        EXPECT_EQ(statusreason(line, state).verdict, ratestatus(line, state))
            << '"' << line << "\", " << state;
    }
    EXPECT_EQ(answerreason(line).verdict, rateanswer(line)) << '"' << line << '"';
}

TEST_F(Reason, AgreesWithTheDaemonOnAllLinesOfUpToThreeWords)
{
    for (const std::string_view first : kPieces) {
        for (const std::string_view second : kPieces) {
            for (const std::string_view third : kPieces) {
                expectagreement(std::string(first).append(second).append(" ").append(third));
            }
        }
    }
}

TEST_F(Reason, AgreesWithTheDaemonOnLinesOfManyWords)
{
    // NOLINTNEXTLINE(cert-msc51-cpp): the same lines each time
    std::mt19937 random(20260101);
    std::uniform_int_distribution<std::size_t> anypiece(0, kPieces.size() - 1);
    std::uniform_int_distribution<int> anycount(4, 9);
    for (int i = 0; i < 20000; ++i) {
        std::string line;
        for (int count = anycount(random); count > 0; --count) {
            line += kPieces.at(anypiece(random));
            line += (random() & 1U) != 0 ? " " : "";
        }
        expectagreement(line);
    }
}

// Were the words of the two lists not the daemon's, all of the above could agree by saying the
// least: each result has to occur.
TEST_F(Reason, KnowsEachResult)
{
    EXPECT_EQ(statusreason("web is running", 3).verdict, kServiceRunning);
    EXPECT_EQ(statusreason("web is stopped", 0).verdict, kServiceNotRunning);
    EXPECT_EQ(statusreason("web: unrecognized service", 0).verdict, kServiceUnknown);
    EXPECT_EQ(statusreason("web", 3).verdict, kServiceUnclear);
    EXPECT_EQ(answerreason("service: web").verdict, kAnswerCorrect);
    EXPECT_EQ(answerreason("CIMException").verdict, kAnswerException);
    EXPECT_EQ(answerreason("bash: web: command not found").verdict, kCommandNotFound);
    EXPECT_EQ(answerreason("web").verdict, kAnswerUnclear);
}

TEST_F(Reason, NamesTheWordsOfAStatus)
{
    EXPECT_EQ(statusreason("web is running.", 0).text, R"(contains "running" and not "not")");
    EXPECT_EQ(statusreason("web is RUNNING", 3).text, R"(contains "RUNNING" and not "NOT")");
    EXPECT_EQ(statusreason("web is not running", 3).text, R"(contains "not" and "running")");
    EXPECT_EQ(statusreason("stopped", 0).text, R"(contains "stopped")");
    EXPECT_EQ(statusreason("web: unrecognized service", 1).text, R"(contains "unrecognized")");
}

TEST_F(Reason, TellsInsideWhatAWordStands)
{
    EXPECT_EQ(statusreason("cannot tell that it is running", 0).text,
              R"(contains "not" inside "cannot", and "running")");
    EXPECT_EQ(statusreason("notifyd is running", 0).text,
              R"(contains "not" inside "notifyd", and "running")");
    EXPECT_EQ(answerreason("microservice: ok").text,
              R"(contains "service:" inside "microservice:")");
}

TEST_F(Reason, PrefersTheWordThatStandsAlone)
{
    EXPECT_EQ(statusreason("notifyd is not running", 3).text, R"(contains "not" and "running")");
    EXPECT_EQ(answerreason("microservice:service: ok").text, R"(contains "service:")");
}

// A minute of processor time where each occurrence is followed to both ends of the line.
TEST_F(Reason, TakesATimeThatGrowsAsTheLineDoes)
{
    std::string line;
    while (line.size() < std::size_t{1} << 20U) {
        line += "running";
    }
    const std::clock_t begin = std::clock();
    EXPECT_EQ(answerreason(line).verdict, kAnswerCorrect);
    EXPECT_LT(std::clock() - begin, 10 * CLOCKS_PER_SEC);
}

TEST_F(Reason, TellsWhatTakesAWordItsMeaning)
{
    EXPECT_EQ(answerreason("running, but cannot answer").text,
              R"(contains "running", but also "not" inside "cannot")");
    EXPECT_EQ(answerreason("not initialized").text, R"(contains "initialized", but also "not")");
}

TEST_F(Reason, NamesTheExitStatusWhereNoWordDecides)
{
    EXPECT_EQ(statusreason("web - a server", 0).text, "no keyword, exit status 0");
    EXPECT_EQ(statusreason("web - a server", 4).text, "no keyword, exit status 4");
    EXPECT_EQ(statusreason("web - a server", -1).text, "no keyword, did not end normally");
    EXPECT_EQ(statusreason("", 0).text, "nothing on the first line, exit status 0");
    EXPECT_EQ(answerreason("").text, "nothing on the first line");
    EXPECT_EQ(answerreason("ok").text, "no keyword");
}

TEST_F(Reason, KeepsTheTerminalFromWhatALineHolds)
{
    const std::string text = answerreason("\x1b[2Jservice:\x1b[2J").text;
    EXPECT_EQ(text.find('\x1b'), std::string::npos) << text;
}

} // namespace
