// The reader on its own: the handler is replaced at link time by functions that write the tokens
// down. What reader and handler make of a file together is in wdxmlparserhandler_test.cpp.

#include "xmlparser.h"

#include <fstream>
#include <stdexcept>
#include <thread>
#include <vector>

#include <sys/stat.h>

#include <gtest/gtest.h>

#include "temporaryfolder.h"
#include "wdxmlparserhandler.h"

namespace {

std::vector<std::string> tokens;

} // namespace

void startElement(const std::string& name)
{
    tokens.push_back("<" + name + ">");
}

void characters(const std::string& text)
{
    tokens.push_back(text);
}

void endElement(const std::string& name)
{
    tokens.push_back("</" + name + ">");
}

void endDocument()
{
    tokens.emplace_back("END");
}

namespace {

using Tokens = std::vector<std::string>;

class Reader : public ::testing::Test {
protected:
    void SetUp() override { tokens.clear(); }

    // The tokens of a file that holds `text`.
    Tokens read(std::string_view text)
    {
        folder.write("config.xml", text);
        EXPECT_EQ(xmlparser::parse(folder.path("config.xml")), 0);
        return tokens;
    }

    // The tokens before an empty tag ends the reading.
    Tokens readuntilraise(std::string_view text)
    {
        try {
            folder.write("config.xml", text);
            xmlparser::parse(folder.path("config.xml"));
            ADD_FAILURE() << "nothing was raised";
        } catch (const std::out_of_range& raised) {
            EXPECT_STREQ(raised.what(), "basic_string::substr");
        }
        return tokens;
    }

    const TemporaryFolder folder;
};

TEST_F(Reader, MissingFileIsOneLineOnStandardErrorAndEmptyLists)
{
    xmlparser::alltargets.resize(2);
    xmlparser::allservices.resize(3);
    ::testing::internal::CaptureStderr();
    EXPECT_EQ(xmlparser::parse(folder.path("missing.xml")), 0);
    EXPECT_EQ(::testing::internal::GetCapturedStderr(),
              "error, unable to open the input file: 0\n");
    EXPECT_EQ(tokens, (Tokens{"END"}));
    EXPECT_TRUE(xmlparser::alltargets.empty());
    EXPECT_TRUE(xmlparser::allservices.empty());
}

TEST_F(Reader, FolderIsAnEmptyTextWithoutComplaint)
{
    ::testing::internal::CaptureStderr();
    EXPECT_EQ(xmlparser::parse(folder.path()), 0);
    EXPECT_EQ(::testing::internal::GetCapturedStderr(), "");
    EXPECT_EQ(tokens, (Tokens{"END"}));
}

TEST_F(Reader, EmptyFileAndWhiteSpaceGiveNoToken)
{
    EXPECT_EQ(read(""), (Tokens{"END"}));
    tokens.clear();
    EXPECT_EQ(read(" \n\t\r "), (Tokens{"END"}));
}

TEST_F(Reader, TextWithoutATagGivesNoToken)
{
    EXPECT_EQ(read("just words"), (Tokens{"END"}));
    tokens.clear();
    EXPECT_EQ(read("a > b"), (Tokens{"END"}));
}

TEST_F(Reader, DeclarationAtTheFirstByteIsSkipped)
{
    EXPECT_EQ(read("<?xml version='1.0'?>\n<wdtargets></wdtargets>"),
              (Tokens{"<wdtargets>", "</wdtargets>", "END"}));
}

TEST_F(Reader, DeclarationAfterOneBlankBecomesAHarmlessText)
{
    EXPECT_EQ(read(" <?xml version='1.0'?>\n<wdtargets></wdtargets>"),
              (Tokens{"ml version='1.0'?>", "<wdtargets>", "</wdtargets>", "END"}));
}

TEST_F(Reader, DeclarationAfterTwoBlanksBecomesAHarmlessText)
{
    EXPECT_EQ(read("  <?xml version='1.0'?><wdtargets></wdtargets>"),
              (Tokens{"ml version='1.0'?>", "<wdtargets>", "</wdtargets>", "END"}));
}

TEST_F(Reader, ValueIsTrimmedOutsideAndKeptInside)
{
    EXPECT_EQ(read("<wdtargets><name>  /usr/sbin/svc -x  \n\t\r</name></wdtargets>"),
              (Tokens{"<wdtargets>", "<name>", "/usr/sbin/svc -x", "</name>", ">", "</wdtargets>",
                      "END"}));
}

TEST_F(Reader, LineBreakWithinAValueStays)
{
    EXPECT_EQ(read("<wdtargets><name>a\n b</name></wdtargets>")[2], "a\n b");
}

TEST_F(Reader, OnlyFourCharactersAreWhiteSpace)
{
    EXPECT_EQ(read("<wdtargets><name>\fa\v</name></wdtargets>")[2], "\fa\v");
}

TEST_F(Reader, ValueMayHoldAGreaterThan)
{
    EXPECT_EQ(read("<wdtargets><startcmd>cmd > /dev/null 2>&1</startcmd></wdtargets>")[2],
              "cmd > /dev/null 2>&1");
}

TEST_F(Reader, EntitiesAreNotDecoded)
{
    EXPECT_EQ(read("<wdtargets><name>a &amp; b</name></wdtargets>")[2], "a &amp; b");
}

TEST_F(Reader, NulBytesAreKept)
{
    using namespace std::string_literals;
    EXPECT_EQ(read("<wdtargets><name>\0a\0b\0</name></wdtargets>"s)[2], "\0a\0b\0"s);
}

TEST_F(Reader, EveryEndTagButTheRootsIsFollowedByItsBracketAsText)
{
    EXPECT_EQ(read("<wdtargets><name>a</name> \n <binarypath>b</binarypath></wdtargets>"),
              (Tokens{"<wdtargets>", "<name>", "a", "</name>", ">", "<binarypath>", "b",
                      "</binarypath>", ">", "</wdtargets>", "END"}));
}

TEST_F(Reader, ElementWithoutTextHasNoTextToken)
{
    EXPECT_EQ(read("<wdtargets><name> </name></wdtargets>"),
              (Tokens{"<wdtargets>", "<name>", "</name>", ">", "</wdtargets>", "END"}));
}

TEST_F(Reader, WhiteSpaceBehindTheRootChangesNothing)
{
    EXPECT_EQ(read("<wdtargets></wdtargets>\n\n"), (Tokens{"<wdtargets>", "</wdtargets>", "END"}));
}

TEST_F(Reader, TagNamesAreTrimmed)
{
    EXPECT_EQ(read("<wdtargets>< name >a</ name\n></wdtargets>"),
              (Tokens{"<wdtargets>", "<name>", "a", "</name>", ">", "</wdtargets>", "END"}));
}

TEST_F(Reader, RootsClosingTagWithABlankDoesNotEndTheReading)
{
    EXPECT_EQ(read("<wdtargets></wdtargets >"),
              (Tokens{"<wdtargets>", "</wdtargets>", ">", "END"}));
}

TEST_F(Reader, AttributesAreAPartOfTheName)
{
    EXPECT_EQ(read("<wdtargets><a x='1'></a></wdtargets>")[1], "<a x='1'>");
}

TEST_F(Reader, SlashInsideAStartTagMakesAnEndTag)
{
    EXPECT_EQ(read("<wdtargets><a x='/b'></wdtargets>")[1], "</b'>");
}

TEST_F(Reader, CommentIsAStartTag)
{
    EXPECT_EQ(read("<wdtargets><!-- note --></wdtargets>")[1], "<!-- note -->");
}

TEST_F(Reader, EmptyTagsRaise)
{
    EXPECT_EQ(readuntilraise("<wdtargets><></wdtargets>"), (Tokens{"<wdtargets>"}));
    tokens.clear();
    EXPECT_EQ(readuntilraise("<wdtargets>< ></wdtargets>"), (Tokens{"<wdtargets>"}));
    tokens.clear();
    EXPECT_EQ(readuntilraise("<wdtargets><stopcmd/></wdtargets>"), (Tokens{"<wdtargets>"}));
    tokens.clear();
    EXPECT_EQ(readuntilraise("<wdtargets></></wdtargets>"), (Tokens{"<wdtargets>"}));
}

TEST_F(Reader, ListsAreEmptiedAtTheStart)
{
    xmlparser::alltargets.resize(2);
    xmlparser::allservices.resize(3);
    readuntilraise("<>");
    EXPECT_TRUE(xmlparser::alltargets.empty());
    EXPECT_TRUE(xmlparser::allservices.empty());
}

// Outside the dialect: always to the end of the text, and never past it.

TEST_F(Reader, TextBehindTheRootIsReadToItsEnd)
{
    EXPECT_EQ(read("<wdtargets></wdtargets><!-- end -->"),
              (Tokens{"<wdtargets>", "</wdtargets>", ">", "<!-- end -->", "END"}));
    tokens.clear();
    EXPECT_EQ(read("<wdtargets></wdtargets>trailing > text"),
              (Tokens{"<wdtargets>", "</wdtargets>", ">trailing > text", "END"}));
}

TEST_F(Reader, MissingRootEndTagIsReadToTheEnd)
{
    EXPECT_EQ(read("<wdtargets><name>a</name>"),
              (Tokens{"<wdtargets>", "<name>", "a", "</name>", ">", "END"}));
}

TEST_F(Reader, UnclosedTagEndsTheReading)
{
    EXPECT_EQ(read("<wdtargets><name"), (Tokens{"<wdtargets>", "END"}));
    tokens.clear();
    EXPECT_EQ(read("<wdtargets></wdtargets"), (Tokens{"<wdtargets>", "END"}));
    tokens.clear();
    EXPECT_EQ(read("<"), (Tokens{"END"}));
    tokens.clear();
    EXPECT_EQ(read("</"), (Tokens{"END"}));
}

TEST_F(Reader, SecondDeclarationIsReadAsATag)
{
    EXPECT_EQ(
        read("<?xml version='1.0'?><wdtargets><?more?><name>a</name></wdtargets>"),
        (Tokens{"<wdtargets>", "<?more?>", "<name>", "a", "</name>", ">", "</wdtargets>", "END"}));
}

TEST_F(Reader, LateFirstDeclarationIsEnteredBehindItsMark)
{
    EXPECT_EQ(read("<wdtargets><?late?></wdtargets>"),
              (Tokens{"<wdtargets>", "ate?>", "</wdtargets>", "END"}));
}

TEST_F(Reader, DeclarationWithoutItsEndIsAHarmlessText)
{
    EXPECT_EQ(read("<?xml version='1.0'><wdtargets></wdtargets>"),
              (Tokens{"?xml version='1.0'>", "<wdtargets>", "</wdtargets>", "END"}));
    tokens.clear();
    EXPECT_EQ(read("<?"), (Tokens{"?", "END"}));
    tokens.clear();
    EXPECT_EQ(read("<??"), (Tokens{"END"}));
}

TEST_F(Reader, EveryCutOfAFileEndsTheReading)
{
    const std::string whole = "<?xml version='1.0'?>\n<wdtargets>\n <wdmonitortarget>\n"
                              "  <name>a > b</name>\n  <?again?>\n </wdmonitortarget>\n"
                              "</wdtargets>\n";
    for (std::size_t length = 0; length <= whole.size(); ++length) {
        tokens.clear();
        EXPECT_EQ(read(whole.substr(0, length)).back(), "END") << length;
    }
}

// Every text of four characters out of these ends; a hang shows as the test's time limit.
TEST_F(Reader, GarbageEndsTheReading)
{
    const std::string alphabet = "<>/?a ";
    for (const char first : alphabet) {
        for (const char second : alphabet) {
            for (const char third : alphabet) {
                for (const char fourth : alphabet) {
                    const std::string text{'<', 'a', '>', first, second, third, fourth};
                    tokens.clear();
                    try {
                        folder.write("config.xml", text);
                        xmlparser::parse(folder.path("config.xml"));
                        EXPECT_EQ(tokens.back(), "END") << text;
                    } catch (const std::out_of_range&) {
                        EXPECT_TRUE(tokens.empty() || tokens.back() != "END") << text;
                    }
                }
            }
        }
    }
}

// A search through the long name for each of the tags would take minutes.
TEST_F(Reader, ManyLateDeclarationsAreReadInOneGo)
{
    constexpr std::size_t kNameBytes = 16'000'000;
    constexpr std::size_t kTags = 1'000'000;
    std::string text = "<" + std::string(kNameBytes, 'n') + "><b>";
    for (std::size_t tag = 0; tag < kTags; ++tag) {
        text += "<?>";
    }
    EXPECT_EQ(read(text).size(), kTags + 2);
}

// The text is held in pieces of this size.
TEST_F(Reader, TokensMayLieAcrossAnyEdge)
{
    constexpr std::size_t kWindow = 65536;
    const std::string rest = "</a>\n<bb> c </bb></wdtargets>\n";
    for (std::size_t before = 0; before <= rest.size(); ++before) {
        const std::string filling(kWindow - 3 - before, 't');
        tokens.clear();
        const Tokens found = read(std::string("<a>").append(filling).append(rest));
        EXPECT_EQ(found, (Tokens{"<a>", filling, "</a>", ">", "<bb>", "c", "</bb>", ">",
                                 "</wdtargets>", "END"}))
            << before;
    }
}

TEST_F(Reader, LateDeclarationIsRememberedAcrossTheEdge)
{
    const std::string filling(200000, 't');
    EXPECT_EQ(read("<a?>" + filling + "<?b></wdtargets>"),
              (Tokens{"<a?>", filling, "<?b>", "</wdtargets>", "END"}));
}

TEST_F(Reader, LongPipeIsReadWhole)
{
    const std::string name = folder.path("pipe");
    ASSERT_EQ(mkfifo(name.c_str(), 0600), 0);
    const std::string longtext(200000, 't');
    std::thread writer([&] { std::ofstream(name) << "<a>" << longtext << "</a>"; });
    xmlparser::parse(name);
    writer.join();
    EXPECT_EQ(tokens, (Tokens{"<a>", longtext, "</a>", ">", "END"}));
}

TEST_F(Reader, FileLongerThanOneReadIsWhole)
{
    const std::string longname(200000, 'n');
    EXPECT_EQ(read("<wdtargets><name>" + longname + "</name></wdtargets>")[2], longname);
}

} // namespace
