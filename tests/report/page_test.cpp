// What the page is made of: its data, and what it must not hold. What a browser makes of it is
// tried in page/.

#include "page.h"

#include <array>
#include <sstream>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

using namespace report;
using nlohmann::json;
using testing::HasSubstr;
using testing::Not;

namespace {

constexpr instant kFirst{1794700800, 1000};

instant later(std::int64_t seconds, std::int64_t clockset = 0)
{
    return {kFirst.clock + seconds + clockset, kFirst.elapsed + seconds};
}

std::string page(const pagecontents& contents)
{
    std::ostringstream out;
    writepage(out, contents);
    return out.str();
}

// The text of the element that holds the data, as a browser ends it.
std::string datatext(const std::string& page)
{
    constexpr std::string_view kBegin = R"(<script type="application/json" id="data">)";
    const std::size_t begin = page.find(kBegin) + kBegin.size();
    return page.substr(begin, page.find("</script", begin) - begin);
}

json data(const pagecontents& contents)
{
    return json::parse(datatext(page(contents)));
}

pagecontents withservice(std::string name)
{
    pagecontents contents;
    contents.count.first = kFirst;
    contents.count.last = later(60);
    contents.services.emplace_back();
    pageservice& service = contents.services.back();
    service.figures.name = std::move(name);
    service.figures.now = {state::kUp, kFirst, later(60), true};
    service.spans = {service.figures.now};
    return contents;
}

TEST(Page, DataOfNothingIsWhole)
{
    const json all = data({});
    EXPECT_EQ(all["services"], json::array());
    EXPECT_EQ(all["marks"], json::array());
    EXPECT_EQ(all["log"]["from"], nullptr);
    EXPECT_EQ(all["log"]["to"], nullptr);
    EXPECT_EQ(all["loadfailed"], false);
}

TEST(Page, SaysWhatWasRead)
{
    pagecontents contents;
    contents.files = {"a.log", "-"};
    contents.loadfailed = true;
    contents.count = {1300, 10, 6, 3, 1, 2, kFirst, later(90, -3600)};
    const json all = data(contents);
    EXPECT_EQ(all["clock"], kFirst.clock);
    EXPECT_EQ(all["loadfailed"], true);
    EXPECT_EQ(all["log"], json::parse(R"({"files": ["a.log", "-"], "from": [0, 0],
        "to": [90, -3510], "bytes": 1300, "lines": 10, "messages": 6, "foreign": 3, "torn": 1,
        "clockchanges": 2})"));
}

TEST(Page, NamesStatesAndKindsByTheirPlaces)
{
    const json all = data({});
    ASSERT_EQ(all["states"].size(), kStates);
    EXPECT_EQ(all["states"][static_cast<std::size_t>(state::kUp)], "up");
    EXPECT_EQ(all["states"][static_cast<std::size_t>(state::kGaveUp)], "gave-up");
    EXPECT_EQ(all["kinds"][static_cast<std::size_t>(eventkind::kRecoveryTried)], "recovery-tried");
    EXPECT_EQ(all["kinds"].back(), wordof(eventkind::kStep));
    EXPECT_EQ(all["troubles"].front(), wordof(state::kCommandNotRecognised));
    EXPECT_EQ(all["troubles"].back(), wordof(state::kGaveUp));
}

// The page looks a state up by its word, and falls back on a plain look where it has none.
TEST(Page, HasALookForEachState)
{
    const std::string text = page({});
    for (std::size_t which = 0; which < kStates; ++which) {
        const std::string_view word = wordof(static_cast<state>(which));
        EXPECT_THAT(text, HasSubstr(fmt::format("'{}': {{means: '", word)));
        EXPECT_THAT(text, HasSubstr(fmt::format(".{0} {{ --colour: var(--{0});", word)));
    }
}

TEST(Page, TellsAllFiguresOfAService)
{
    pagecontents contents = withservice("web");
    account& figures = contents.services[0].figures;
    figures.path = "/usr/sbin/nginx";
    figures.now = {state::kGaveUp, later(20), later(60), false};
    figures.lastoutage = outage{later(20), std::nullopt};
    figures.outages = 3;
    figures.recoveriestried = 5;
    figures.recoveriessuccessful = 2;
    figures.skippedchecks = 7;
    figures.gaveup = 1;
    figures.outageseconds = 15;
    figures.watchedseconds = 60;
    contents.services[0].spans = {{state::kUp, kFirst, later(20), true}, figures.now};
    EXPECT_EQ(data(contents)["services"][0], json::parse(R"({
        "name": "web", "path": "/usr/sbin/nginx", "now": [9, 0, 20, 60],
        "lastoutage": {"from": [20, 20], "to": null}, "outages": 3, "outageseconds": 15, "tried": 5,
        "successful": 2, "gaveup": 1, "skipped": 7, "watched": 60, "availability": 0.75,
        "spans": [[0, 1, 0, 20], [9, 0, 20, 60]]})"));
}

TEST(Page, AnOutageThatIsOverSaysWhen)
{
    pagecontents contents = withservice("web");
    contents.services[0].figures.lastoutage = outage{later(20), later(50, 3600)};
    EXPECT_EQ(data(contents)["services"][0]["lastoutage"],
              json::parse(R"({"from": [20, 20], "to": [50, 3650]})"));
}

TEST(Page, WithoutWatchedTimeThereIsNoAvailability)
{
    EXPECT_EQ(data(withservice("web"))["services"][0]["availability"], nullptr);
}

TEST(Page, ASpanHasTheClockOnlyWhereItWasSet)
{
    pagecontents contents = withservice("web");
    contents.services[0].spans = {{state::kUp, kFirst, later(20), false},
                                  {state::kBusy, later(20), later(40, -3600), false},
                                  {state::kUp, later(40, -3600), later(60, -3600), false}};
    EXPECT_EQ(data(contents)["services"][0]["spans"],
              json::parse("[[0,0,0,20],[1,0,20,40,20,-3560],[0,0,40,60,-3560,-3540]]"));
}

TEST(Page, ASpanHasTheClockAlsoWhereItWasSetRightAgain)
{
    pagecontents contents = withservice("web");
    contents.services[0].spans = {{state::kBusy, later(20, -3600), later(40), false}};
    EXPECT_EQ(data(contents)["services"][0]["spans"], json::parse("[[1,0,20,40,-3580,40]]"));
}

TEST(Page, AServiceWithoutASpanIsDrawnAsWhatItIs)
{
    pagecontents contents = withservice("web");
    contents.services[0].spans.clear();
    contents.services[0].figures.now = {state::kSuspect, later(60), later(60), false};
    EXPECT_EQ(data(contents)["services"][0]["spans"], json::parse("[[4,0,60,60]]"));
}

TEST(Page, ASpanBeforeTheFirstMessageIsTheBeginning)
{
    pagecontents contents = withservice("web");
    contents.count.first = later(30);
    const json all = data(contents);
    EXPECT_EQ(all["clock"], kFirst.clock);
    EXPECT_EQ(all["log"]["from"], json::parse("[30, 30]"));
    EXPECT_EQ(all["services"][0]["spans"][0], json::parse("[0, 1, 0, 60]"));
}

TEST(Page, MarksNameTheirService)
{
    pagecontents contents = withservice("web");
    contents.marks = {{0, eventkind::kGaveUp, later(5, 3600), true, "given up"}};
    EXPECT_EQ(data(contents)["marks"], json::parse(R"([[0, [6, 1, 5, 3605, "given up"]]])"));
}

// Wherever a stranger's text stands, no tag begins in the data, and the text is what it was.
TEST(Page, NoTextEndsTheData)
{
    constexpr std::array kTexts{"</script><script>alert(1)</script>", "<!--<script>", "]]>", "<"};
    for (const std::string text : kTexts) {
        pagecontents contents = withservice(text);
        contents.files = {text};
        contents.services[0].figures.path = text;
        contents.marks = {{0, eventkind::kGaveUp, kFirst, false, text}};
        EXPECT_THAT(datatext(page(contents)), Not(HasSubstr("<")));
        const json all = data(contents);
        EXPECT_EQ(all["log"]["files"][0], text);
        EXPECT_EQ(all["services"][0]["name"], text);
        EXPECT_EQ(all["services"][0]["path"], text);
        EXPECT_EQ(all["marks"][0][1][4], text);
    }
}

TEST(Page, BytesThatAreNoTextAreWrittenOut)
{
    EXPECT_EQ(data(withservice("f\xfcr\n\x01"))["services"][0]["name"], "f\\xfcr\\x0a\\x01");
}

TEST(Page, NamesNothingOutsideItself)
{
    const std::string text = page(withservice("web"));
    EXPECT_THAT(text, Not(testing::ContainsRegex("(src|href)=\"?(http|//)")));
    EXPECT_THAT(text, Not(testing::ContainsRegex("@import|url\\(.?http")));
    EXPECT_THAT(text, Not(HasSubstr("{{")));
}

TEST(Page, ItsPolicyAllowsItsOwnScriptsAndStyleOnly)
{
    const std::string text = page({});
    EXPECT_THAT(text,
                testing::ContainsRegex("content=\"default-src 'none'; script-src "
                                       "'sha256-[A-Za-z0-9+/]*=' 'sha256-[A-Za-z0-9+/]*='; "
                                       "style-src 'sha256-[A-Za-z0-9+/]*='; img-src data:; "));
    EXPECT_THAT(text, Not(HasSubstr("unsafe")));
}

// A copy of the library has to go with its licence.
TEST(Page, HasTheLicenceOfItsLibrary)
{
    const std::string text = page({});
    EXPECT_THAT(text, HasSubstr("Redistributions of source code must retain"));
    EXPECT_THAT(text, HasSubstr("Mike Bostock"));
}

} // namespace
