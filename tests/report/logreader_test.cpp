// Bytes of a log -> messages: whole and torn lines, those of others, the journal's forms; and that
// it is the same in pieces of any size, and with several threads.

#include "logreader.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <initializer_list>
#include <stdexcept>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using namespace report;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

namespace {

constexpr std::size_t kMebibyte = 1 << 20;

// A message with texts of its own.
struct heard {
    messageid id;
    loglevel level;
    std::uint64_t thread;
    instant when;
    std::string first;
    std::string second;
    std::string text;
    std::string more;
    std::uint64_t line;

    friend bool operator==(const heard&, const heard&) = default;
};

struct outcome {
    std::vector<heard> messages;
    readcount count;

    [[nodiscard]] std::vector<std::string> texts() const
    {
        std::vector<std::string> all;
        for (const heard& each : messages) {
            all.push_back(each.text);
        }
        return all;
    }
};

heard copyof(const message& said)
{
    return {said.id,
            said.level,
            said.thread,
            said.when,
            std::string(said.first),
            std::string(said.second),
            std::string(said.text),
            std::string(said.more),
            said.line};
}

bool samecount(const readcount& one, const readcount& other)
{
    const auto numbers = [](const readcount& count) {
        return std::vector<std::uint64_t>{count.bytes,   count.lines, count.messages,
                                          count.foreign, count.torn,  count.clockchanges};
    };
    return numbers(one) == numbers(other) && one.first == other.first && one.last == other.last;
}

outcome readin(const std::vector<std::string>& files, std::size_t piece, wanted which)
{
    outcome result;
    logreader reader(which, [&](const message& said) { result.messages.push_back(copyof(said)); });
    for (const std::string& file : files) {
        for (std::size_t place = 0; place < file.size(); place += piece) {
            // A copy of its own: nothing may be kept of a piece, nor read behind it.
            const std::string own = file.substr(place, piece);
            reader.feed(own);
        }
        reader.endfile();
    }
    result.count = reader.count();
    return result;
}

// Gives a text, at most so many bytes at once.
bytesource sourceof(const std::string& text, std::size_t piece)
{
    return [&text, piece, place = std::size_t{0}](char* into, std::size_t most) mutable {
        const std::size_t got = text.copy(into, std::min(most, piece), place);
        place += got;
        return got;
    };
}

// Read in blocks by two threads, or more.
outcome readahead(const std::vector<std::string>& files, const pace& how, wanted which)
{
    outcome result;
    logreader reader(which, [&](const message& said) { result.messages.push_back(copyof(said)); });
    for (const std::string& file : files) {
        reader.feedall(sourceof(file, kMebibyte), how);
        reader.endfile();
    }
    result.count = reader.count();
    return result;
}

// Whoever takes the lines apart, and wherever the blocks end, it is the same.
void expectsameahead(const std::vector<std::string>& files, wanted which, const outcome& expected)
{
    for (const pace& how :
         {pace{.blockbytes = 1, .alone = 0, .helpers = 1},
          pace{.blockbytes = 100, .alone = 0, .helpers = 2},
          pace{.blockbytes = 300, .alone = 200, .helpers = 1},
          pace{.blockbytes = 4096, .alone = 0, .helpers = 3},
          pace{.blockbytes = 2 * kMebibyte, .alone = 0, .helpers = 0}, pace::ofmachine()}) {
        const outcome ahead = readahead(files, how, which);
        EXPECT_EQ(ahead.messages, expected.messages) << "in blocks of " << how.blockbytes;
        EXPECT_TRUE(samecount(ahead.count, expected.count)) << "in blocks of " << how.blockbytes;
    }
}

// What is read of these files: the same in pieces of any size, by any threads, and by one who wants
// to hear less.
outcome read(const std::vector<std::string>& files)
{
    outcome whole = readin(files, std::string::npos, wanted::kAll);
    for (const std::size_t piece : {1U, 2U, 7U, 64U, 4096U}) {
        const outcome pieces = readin(files, piece, wanted::kAll);
        EXPECT_EQ(pieces.messages, whole.messages) << "in pieces of " << piece;
        EXPECT_TRUE(samecount(pieces.count, whole.count)) << "in pieces of " << piece;
    }
    std::vector<heard> important = whole.messages;
    std::erase_if(important, [](const heard& each) { return !matters(each.id); });
    for (const std::size_t piece : {std::size_t{1}, std::string::npos}) {
        const outcome less = readin(files, piece, wanted::kWhatMatters);
        EXPECT_EQ(less.messages, important);
        EXPECT_TRUE(samecount(less.count, whole.count));
    }
    expectsameahead(files, wanted::kAll, whole);
    expectsameahead(files, wanted::kWhatMatters, {important, whole.count});
    EXPECT_EQ(whole.count.messages, whole.messages.size());
    return whole;
}

outcome read(const std::string& text)
{
    return read(std::vector{text});
}

// A line of the log without its newline, at this second behind 15:39.
std::string logged(int second, const std::string& text,
                   const std::string& who = "DEBUG wdmonitorthread", std::uint64_t thread = 7)
{
    const std::string digits = std::to_string(100 + second).substr(1);
    return "Sat Nov 21 15:39:" + digits + " 2026 " + who + "|TID" + std::to_string(thread) + " " +
           text;
}

const std::string kDebug = "DEBUG wdmonitorthread";
const std::string kInfo = "INFO wdmonitorthread";
const std::string kError = "ERROR wdmonitorthread";
const std::string kListing = "DEBUG wdxmlparserhandler ";
const std::string kPing = "General ping successful!";
const std::string kTry = "Try the general recover for service ";
const std::string kFailed = "General ping failed for service ";
const std::string kFailedEnd = ". Try to general ping more times now, if failed 3 times, will "
                               "generally recover this service.";

std::string lines(std::initializer_list<std::string> all)
{
    std::string text;
    for (const std::string& each : all) {
        text.append(each).append("\n");
    }
    return text;
}

class Reader : public ::testing::Test {
protected:
    void SetUp() override { setenv("TZ", "UTC0", 1); }
};

TEST_F(Reader, TakesALineApart)
{
    const outcome result =
        read(lines({logged(37, kFailed + "web" + kFailedEnd, kError, 140217598289792)}));
    ASSERT_EQ(result.messages.size(), 1U);
    const heard& said = result.messages[0];
    EXPECT_EQ(said.id, messageid::kServiceFailed);
    EXPECT_EQ(said.level, loglevel::kError);
    EXPECT_EQ(said.thread, 140217598289792U);
    EXPECT_EQ(said.when.clock, 1795275577);
    EXPECT_EQ(said.first, "web");
    EXPECT_EQ(said.text, kFailed + "web" + kFailedEnd);
    EXPECT_EQ(said.line, 1U);
    EXPECT_EQ(result.count.lines, 1U);
    EXPECT_EQ(result.count.first, said.when);
    EXPECT_EQ(result.count.last, said.when);
}

TEST_F(Reader, KnowsEachModuleAndLevel)
{
    const outcome result =
        read(lines({logged(1, "Loadservices error.", "ERROR wdmanager"),
                    logged(2, "before join......", "DEBUG wdmanager"),
                    logged(3, "(/b) Threshold is reached",
                           "DEBUG "
                           "ProcessStatistics"),
                    logged(4, "maxattemp 3", kListing), logged(5, "", kListing),
                    logged(6, "Max number of FP skippable: 1", "DEBUG wdxmlparserhandler"),
                    logged(7, "(/b) Executing functional ping now ... ", kInfo),
                    "Unable to open the log file"}));
    std::vector<messageid> ids;
    for (const heard& each : result.messages) {
        ids.push_back(each.id);
    }
    EXPECT_THAT(ids, ElementsAre(messageid::kLoadFailed, messageid::kBeforeJoin,
                                 messageid::kFigures, messageid::kListing, messageid::kListing,
                                 messageid::kListing, messageid::kCheckBegins, messageid::kNoLog));
}

TEST_F(Reader, StandardErrorHasTheTimeOfTheLineBefore)
{
    const outcome result = read(lines({"error, unable to open the input file: 0", logged(3, kPing),
                                       "error, unable to open the input file: 0"}));
    ASSERT_EQ(result.messages.size(), 3U);
    EXPECT_EQ(result.messages[0].when, instant{});
    EXPECT_EQ(result.messages[2].when, result.messages[1].when);
    EXPECT_EQ(result.messages[2].thread, 0U);
    EXPECT_EQ(result.messages[2].level, loglevel::kStandardError);
    EXPECT_EQ(result.count.first, result.messages[1].when);
}

TEST_F(Reader, LinesOfOthersAreCountedOnly)
{
    const outcome result =
        read(lines({"Starting web: done.", logged(1, kTry + "web", kError), "", "ok",
                    "Xxx Foo 99 15:39:37 2026 ERROR wdmanager|TID1 x", logged(2, kPing)}));
    EXPECT_THAT(result.texts(), ElementsAre(kTry + "web", kPing));
    EXPECT_EQ(result.count.foreign, 4U);
    EXPECT_EQ(result.count.torn, 0U);
    EXPECT_EQ(result.count.lines, 6U);
}

TEST_F(Reader, WhatOnlyLooksLikeALineIsNone)
{
    for (const std::string head :
         {"Sat Feb 31 15:39:37 2026 DEBUG wdmonitorthread|TID7 ",
          "Sat Nov 21 25:39:37 2026 DEBUG wdmonitorthread|TID7 ",
          "Sat Nov 21 15:39:37 2026 DEBUG wdmonitorthread|TID18446744073709551616 ",
          "Sat Nov 21 15:39:37 2026 DEBUG wdmonitorthread|TID ",
          "Sat Nov 21 15:39:37 2026 DEBUG wdmonitorthread|TIDx ",
          "Sat Nov 21 15:39:37 2026 DEBUG wdmonitorthread|TID7",
          "Sat Nov 21 15:39:37 2026  wdmonitorthread|TID7 ",
          "Sat Nov 21 15:39:37 2026 DEBUG nobody|TID7 ",
          "Sat Nov 21 15:39:37 2026 DEBUG wdmonitorthread |TID7 ",
          "Sat Nov 21 15:39:37 2026 INFO wdmonitorthread|TID7 ", "Sat Nov 21 15:39:37 2026",
          "Sat Nov 21 15:39:37 2026 "}) {
        const outcome result = read(lines({logged(1, kPing), head + kPing, head}));
        EXPECT_THAT(result.texts(), ElementsAre(kPing)) << head;
    }
    EXPECT_EQ(read(lines({logged(1, kPing, "DEBUG wdmonitorthread", UINT64_MAX)})).count.messages,
              1U);
}

TEST_F(Reader, TellsTheSecondsThatHaveElapsed)
{
    const outcome result = read(lines({logged(30, kPing), logged(29, kPing), logged(31, kPing)}));
    ASSERT_EQ(result.messages.size(), 3U);
    EXPECT_EQ(secondsbetween(result.messages[0].when, result.messages[1].when), 0);
    EXPECT_EQ(result.messages[1].when.clock - result.messages[0].when.clock, -1);
    EXPECT_EQ(secondsbetween(result.messages[0].when, result.messages[2].when), 1);
}

TEST_F(Reader, CountsWhenTheClockWasSetBack)
{
    std::string early = logged(0, kPing);
    early[11] = '0';
    EXPECT_EQ(read(lines({logged(0, kPing), early})).count.clockchanges, 1U);
}

TEST_F(Reader, TakesLinesThatEndInTwoBytes)
{
    const outcome result = read(logged(1, kPing) + "\r\nforeign\r\n" + logged(2, kPing) + "\r\n");
    EXPECT_THAT(result.texts(), ElementsAre(kPing, kPing));
    EXPECT_EQ(result.count.foreign, 1U);
}

// ---- Messages of several lines.

TEST_F(Reader, LinesThatFollowACommandBelongToIt)
{
    const std::string check = "Performing functional ping, process id is: 1, fp cmd is: (a";
    const outcome result =
        read(lines({logged(1, check), "b", "", "c)", logged(2, "Executing start command x"), "y",
                    logged(3, kPing), "z"}));
    ASSERT_EQ(result.messages.size(), 3U);
    EXPECT_EQ(result.messages[0].text, check);
    EXPECT_EQ(result.messages[0].second, "(a");
    EXPECT_EQ(result.messages[0].more, "b\n\nc)\n");
    EXPECT_EQ(result.messages[0].line, 1U);
    EXPECT_EQ(result.messages[1].more, "y\n");
    EXPECT_EQ(result.messages[2].more, "");
    EXPECT_EQ(result.count.foreign, 1U); // "z"
}

TEST_F(Reader, WhatFollowsANameIsSomebodyElses)
{
    const outcome result = read(lines({logged(1, kTry + "web", kError), "Starting web."}));
    EXPECT_THAT(result.texts(), ElementsAre(kTry + "web"));
    EXPECT_EQ(result.messages[0].more, "");
    EXPECT_EQ(result.count.foreign, 1U);
}

TEST_F(Reader, AMessageGoesOnUntilItsEndComes)
{
    const std::string text = kFailed + "two\nlines" + kFailedEnd;
    const outcome result = read(lines({logged(1, text, kError), "behind", logged(2, kPing)}));
    EXPECT_THAT(result.texts(), ElementsAre(text, kPing));
    EXPECT_EQ(result.messages[0].first, "two\nlines");
    EXPECT_EQ(result.messages[0].line, 1U);
    EXPECT_EQ(result.messages[1].line, 4U);
    EXPECT_EQ(result.count.foreign, 1U);
}

TEST_F(Reader, AMessageWhoseEndDoesNotComeIsTorn)
{
    const outcome result =
        read(lines({logged(1, kFailed + "web", kError), "one", "two", logged(2, kPing)}));
    EXPECT_THAT(result.texts(), ElementsAre(kPing));
    EXPECT_EQ(result.count.torn, 1U);
    EXPECT_EQ(result.count.foreign, 2U);
}

TEST_F(Reader, StandardErrorBelongsToNoMessage)
{
    const outcome result =
        read(lines({logged(1, "Executing start command x"), "Unable to open the log file"}));
    ASSERT_EQ(result.messages.size(), 2U);
    EXPECT_EQ(result.messages[0].more, "");
    EXPECT_EQ(result.messages[1].id, messageid::kNoLog);
}

TEST_F(Reader, APauseHandsOnWhatWasHeldBack)
{
    std::vector<std::string> texts;
    std::vector<std::string> more;
    logreader reader(wanted::kAll, [&](const message& said) {
        texts.emplace_back(said.text);
        more.emplace_back(said.more);
    });
    reader.feed(lines({logged(1, "Executing start command x"), "y"}) + logged(2, "General "));
    EXPECT_THAT(texts, IsEmpty());
    reader.pause();
    EXPECT_THAT(texts, ElementsAre("Executing start command x"));
    EXPECT_THAT(more, ElementsAre("y\n"));
    reader.feed("ping successful!\n");
    EXPECT_THAT(texts, ElementsAre("Executing start command x", kPing));
}

TEST_F(Reader, WhatComesBehindAPauseStillBelongsToTheMessage)
{
    logreader reader(wanted::kAll, [](const message&) {});
    reader.feed(lines({logged(1, "Executing start command x")}));
    reader.pause();
    reader.feed("y\n");
    EXPECT_EQ(reader.count().foreign, 0U);
}

// ---- Torn lines.

TEST_F(Reader, FindsTheNextLineWithinACutOne)
{
    for (const std::string& cut :
         {logged(1, "General ping succ"), logged(1, kFailed + "we", kError),
          logged(1, kTry + "we", kError), logged(1, ""), logged(1, kFailed + "x", kInfo),
          logged(1, kPing).substr(0, 40), logged(1, kPing).substr(0, 24), std::string("Sat"),
          std::string(5, '\0'), logged(1, "Executing start command wh")}) {
        const std::string next = logged(2, kTry + "b", kError);
        const outcome result = read(lines({logged(0, kPing), std::string(cut).append(next)}));
        EXPECT_THAT(result.texts(), ElementsAre(kPing, kTry + "b")) << cut;
        EXPECT_EQ(result.count.torn, 1U) << cut;
        EXPECT_EQ(result.count.foreign, 0U) << cut;
    }
}

TEST_F(Reader, FindsALineBehindSeveralCutOnes)
{
    const outcome result =
        read(lines({logged(1, kFailed + "a", kError) + logged(2, kFailed + "b", kError) +
                    logged(3, kFailed + "c" + kFailedEnd, kError)}));
    EXPECT_THAT(result.texts(), ElementsAre(kFailed + "c" + kFailedEnd));
    EXPECT_EQ(result.count.torn, 2U);
}

TEST_F(Reader, WhatACommandPrintedMayHoldALine)
{
    const std::string inner = logged(1, kTry + "b", kError);
    for (const std::string& text :
         {"command = c, result = " + inner + ", state = 1",
          "Functionalping result correct functional ping, thread id is 1, ping result is " + inner,
          "Functional ping failed with return 3: " + inner + std::string(48, '@')}) {
        EXPECT_THAT(read(lines({logged(2, text)})).texts(), ElementsAre(text));
    }
}

TEST_F(Reader, AFileMayBeginInTheMiddleOfALine)
{
    const std::string line = logged(1, kPing);
    for (const std::size_t from : {1U, 20U, 30U, 45U, 50U, 60U}) {
        const outcome result = read(lines({line.substr(from), line}));
        EXPECT_THAT(result.texts(), ElementsAre(kPing)) << from;
        EXPECT_EQ(result.count.torn, 1U) << from;
        EXPECT_EQ(result.count.foreign, 0U) << from;
    }
    EXPECT_EQ(read(std::vector{lines({line}), lines({"ping successful!"})}).count.torn, 1U);
}

TEST_F(Reader, AFileMayEndInTheMiddleOfALine)
{
    const outcome result = read(lines({logged(1, kPing)}) + logged(2, "General ping succ"));
    EXPECT_EQ(result.count.messages, 1U);
    EXPECT_EQ(result.count.torn, 1U);
    EXPECT_EQ(result.count.lines, 2U);
}

TEST_F(Reader, ALastLineWithoutItsNewlineIsTakenAsItIs)
{
    EXPECT_THAT(read(logged(1, kPing)).texts(), ElementsAre(kPing));
}

TEST_F(Reader, LinesOfTwoFilesDoNotMix)
{
    const outcome result = read(std::vector<std::string>{logged(1, "Executing start command x"),
                                                         "y\n" + lines({logged(2, kPing)})});
    EXPECT_THAT(result.texts(), ElementsAre("Executing start command x", kPing));
    EXPECT_EQ(result.messages[0].more, "");
    EXPECT_EQ(result.messages[1].line, 3U);
    EXPECT_EQ(result.count.foreign, 1U);
}

// ---- The journal.

TEST_F(Reader, TakesTheJournalsPrefixesOff)
{
    for (const char* prefix :
         {"Nov 21 15:39:37 host tolkwd[123]: ", "2026-11-21T15:39:37+0100 host tolkwd[123]: ",
          "Sat 2026-11-21 15:39:37 CET host tolkwd.service[1]: ", "1795275577.123456 h x[1]: ",
          "[ 1234.567890] host tolkwd[9]: ", "Nov 21 15:39:37 [a]: b tolkwd[123]: "}) {
        const outcome result =
            read(lines({prefix + logged(1, kPing), prefix + std::string("Starting web.")}));
        EXPECT_THAT(result.texts(), ElementsAre(kPing)) << prefix;
        EXPECT_EQ(result.count.foreign, 1U) << prefix;
        EXPECT_EQ(result.count.torn, 0U) << prefix;
    }
}

TEST_F(Reader, FollowsTheDaemonsOwnLinesInTheJournal)
{
    const std::string daemon = "Nov 21 15:39:37 host tolkwd[123]: ";
    const std::string command = "Nov 21 15:39:37 host tolkwd[456]: ";
    const outcome result = read(lines(
        {daemon + logged(1, "Executing start command a"), daemon + "b", command + "Starting web.",
         daemon + logged(2, kPing), daemon + "error, unable to open the input file: 0"}));
    ASSERT_EQ(result.messages.size(), 3U);
    EXPECT_EQ(result.messages[0].more, "b\n");
    EXPECT_EQ(result.messages[2].id, messageid::kConfigurationUnreadable);
    EXPECT_EQ(result.messages[2].text, "error, unable to open the input file: 0");
    EXPECT_EQ(result.count.foreign, 1U);
}

std::string binaryfield(const std::string& name, const std::string& value)
{
    std::string length(8, '\0');
    for (std::size_t i = 0; i < 4; ++i) {
        length[i] = static_cast<char>(value.size() >> (8 * i));
    }
    return name + "\n" + length + value + "\n";
}

std::string exported(const std::string& message)
{
    return "__CURSOR=s=1;i=2\n__REALTIME_TIMESTAMP=1795275577000000\n" + message +
           "_PID=123\n_COMM=tolkwd\n\n";
}

TEST_F(Reader, TakesTheExportFormat)
{
    const std::string answer = "command = c, result = \x1b[1mup\x1b[0m, state = 0";
    const outcome result = read(
        exported("MESSAGE=" + logged(1, kPing) + "\n") +
        exported(binaryfield("MESSAGE", logged(2, answer))) + exported("MESSAGE=Starting web.\n") +
        exported(binaryfield("OTHER", logged(3, kPing) + "\n")) +
        exported(binaryfield("MESSAGE", "")) + exported("MESSAGE=" + logged(4, kPing) + "\n"));
    EXPECT_THAT(result.texts(), ElementsAre(kPing, answer, kPing));
    EXPECT_EQ(result.count.foreign, 1U);
    EXPECT_EQ(result.count.torn, 0U);
}

TEST_F(Reader, NumbersTheLinesOfTheExportFormatAsTheyStand)
{
    const outcome result = read(exported(binaryfield("OTHER", "a\nb")) +
                                exported("MESSAGE=" + logged(4, kPing) + "\n"));
    ASSERT_EQ(result.messages.size(), 1U);
    EXPECT_EQ(result.messages[0].line, 11U);
    EXPECT_EQ(result.count.lines, 14U);
}

TEST_F(Reader, AMessageOfTheExportFormatMayHaveSeveralLines)
{
    const outcome result = read(exported(binaryfield(
        "MESSAGE", logged(1, "Executing start command a") + "\nb\n" + logged(2, kPing))));
    EXPECT_THAT(result.texts(), ElementsAre("Executing start command a", kPing));
    EXPECT_EQ(result.messages[0].more, "b\n");
}

TEST_F(Reader, AnExportThatBreaksOffIsTorn)
{
    const std::string field = binaryfield("MESSAGE", logged(1, kPing));
    EXPECT_EQ(read("__CURSOR=1\n" + field.substr(0, 12)).count.torn, 1U);
    EXPECT_EQ(read("__CURSOR=1\n" + field.substr(0, 30)).count.torn, 1U);
    const std::string endless = "__CURSOR=1\nMESSAGE\n" + std::string(8, '\xff') + "abc";
    EXPECT_EQ(read(endless).count.torn, 1U);
    // The next file is read afresh.
    EXPECT_THAT(read({endless, lines({logged(2, kPing)})}).texts(), ElementsAre(kPing));
}

// ---- Bounds.

TEST_F(Reader, ALineOfMoreThanAMebibyteIsTorn)
{
    const std::string head = logged(1, "Executing start command ");
    const std::string most = head + std::string(kMebibyte - head.size(), 'x');
    const std::vector<std::string> longest = {lines({most, logged(2, kPing)})};
    const std::vector<std::string> longer = {lines({most + "x", logged(2, kPing)})};
    for (const std::size_t piece : {std::size_t{4099}, std::string::npos}) {
        const outcome taken = readin(longest, piece, wanted::kAll);
        ASSERT_EQ(taken.messages.size(), 2U);
        EXPECT_EQ(taken.messages[0].text.size(), kMebibyte - head.size() + 24);
        EXPECT_EQ(taken.count.torn, 0U);
        const outcome cut = readin(longer, piece, wanted::kAll);
        EXPECT_THAT(cut.texts(), ElementsAre(kPing));
        EXPECT_EQ(cut.count.torn, 1U);
        EXPECT_EQ(cut.count.lines, 2U);
        EXPECT_EQ(cut.messages[0].line, 2U);
    }
    const std::string unended(3 * kMebibyte, 'x');
    EXPECT_EQ(readin({unended}, kMebibyte, wanted::kAll).count.torn, 1U);
}

TEST_F(Reader, HoldsBackNoMoreThanItMust)
{
    const std::string line(100, 'y');
    std::string following;
    for (int i = 0; i < 2000; ++i) {
        following.append(line).append("\n");
    }
    const outcome command = readin({lines({logged(1, "Executing start command x")}) + following},
                                   kMebibyte, wanted::kAll);
    ASSERT_EQ(command.messages.size(), 1U);
    EXPECT_LE(command.messages[0].more.size(), 1U << 16U);
    EXPECT_GT(command.messages[0].more.size(), 1U << 15U);
    EXPECT_EQ(command.count.foreign, 0U); // they belong to it all the same

    const outcome endless =
        readin({lines({logged(1, kFailed + "x", kError)}) + following}, kMebibyte, wanted::kAll);
    EXPECT_EQ(endless.count.torn, 1U);
    EXPECT_EQ(endless.count.foreign, 2000U);
}

TEST_F(Reader, TakesAnyBytes)
{
    const std::string nul(3, '\0');
    const outcome result = read(lines({nul, nul + logged(1, kPing), logged(2, kTry + nul, kError),
                                       "\xff\xfe", logged(3, kPing)}));
    EXPECT_THAT(result.texts(), ElementsAre(kPing, kTry + nul, kPing));
}

TEST_F(Reader, ReadsALongLogWithSeveralThreadsInItsOrder)
{
    std::string log;
    for (std::size_t number = 0; number < 20'000; ++number) {
        const std::uint64_t thread = 140217598280000 + number % 50;
        log += logged(static_cast<int>(number / 10 % 60), "General ping sleep 60", kDebug, thread);
        log += "\n" + logged(static_cast<int>(number / 10 % 60), kPing, kDebug, thread) + "\n";
        if (number % 7 == 0) {
            log += "a line of somebody else\n";
        }
    }
    const outcome alone = readin({log}, std::string::npos, wanted::kWhatMatters);
    ASSERT_EQ(alone.messages.size(), 20'000U);
    const pace how{.blockbytes = 1000, .alone = 5000, .helpers = 2};
    const outcome ahead = readahead({log}, how, wanted::kWhatMatters);
    EXPECT_EQ(ahead.messages, alone.messages);
    EXPECT_TRUE(samecount(ahead.count, alone.count));
}

TEST_F(Reader, AReadThatFailsIsThrownBehindTheMessagesBefore)
{
    const std::string log = lines({logged(1, kPing), logged(2, kPing), logged(3, kPing)});
    std::size_t heardof = 0;
    logreader reader(wanted::kAll, [&](const message&) { ++heardof; });
    bytesource bytes = sourceof(log, log.size());
    const auto failing = [&](char* into, std::size_t most) {
        const std::size_t got = bytes(into, most);
        return got > 0 ? got : throw std::system_error(EIO, std::generic_category(), "web.log");
    };
    const pace how{.blockbytes = log.size(), .alone = 0, .helpers = 2};
    EXPECT_THROW(reader.feedall(failing, how), std::system_error);
    EXPECT_EQ(heardof, 3U);
}

TEST_F(Reader, AListenerThatThrowsEndsTheReading)
{
    const std::string log = lines({logged(1, kPing), logged(2, kPing), logged(3, kPing)});
    logreader reader(wanted::kAll, [](const message&) { throw std::runtime_error("enough"); });
    const pace how{.blockbytes = 100, .alone = 0, .helpers = 2};
    EXPECT_THROW(reader.feedall(sourceof(log, log.size()), how), std::runtime_error);
}

TEST_F(Reader, NothingIsNothing)
{
    EXPECT_EQ(read("").count.lines, 0U);
    const outcome result = read("\n");
    EXPECT_EQ(result.count.lines, 1U);
    EXPECT_EQ(result.count.foreign, 1U);
    EXPECT_EQ(result.count.first, instant{});
}

} // namespace
