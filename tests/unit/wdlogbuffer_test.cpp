#include "wdlogbuffer.h"

#include <ios>
#include <type_traits>

#include <gtest/gtest.h>

#include "daemontest.h"

namespace {

TEST(LogBuffer, TextAndCharactersAreJoinedWithoutAStream)
{
    WDLogBuffer buffer;
    std::string& text = buffer.str(buffer << "one " << std::string("two") << '!');
    EXPECT_EQ(text, "one two!");
    EXPECT_FALSE(buffer.hasStream());
}

TEST(LogBuffer, FreshBufferIsEmptyAndHasNoStream)
{
    WDLogBuffer buffer;
    EXPECT_FALSE(buffer.hasStream());
    EXPECT_EQ(buffer.str(buffer), "");
}

TEST(LogBuffer, NumberBetweenTextsGoesThroughTheStream)
{
    WDLogBuffer buffer;
    std::string& text = buffer.str(buffer << "Thread id :" << 42UL << "thread created...");
    EXPECT_EQ(text, "Thread id :42thread created...");
    EXPECT_TRUE(buffer.hasStream());
}

TEST(LogBuffer, NumberFirstStartsAnEmptyStream)
{
    WDLogBuffer buffer;
    EXPECT_EQ(buffer.str(buffer << 7 << " left"), "7 left");
}

TEST(LogBuffer, CharacterAfterNumberIsAllThatTextHolds)
{
    WDLogBuffer buffer;
    buffer << "n=" << 1;
    buffer << 'x';
    EXPECT_EQ(buffer.str(buffer), "x");
    EXPECT_EQ(buffer.str(static_cast<std::ostream&>(buffer)), "n=1x");
}

TEST(LogBuffer, TextAfterNumberGoesToTheStreamToo)
{
    WDLogBuffer buffer;
    buffer << 1;
    buffer << "a";
    buffer << std::string("b");
    std::string c = "c";
    buffer << c.data();
    EXPECT_EQ(buffer.str(static_cast<std::ostream&>(buffer)), "1abc");
}

TEST(LogBuffer, NullPointersAreWrittenAsNull)
{
    WDLogBuffer buffer;
    const char* nothing = nullptr;
    char* nothingelse = nullptr;
    EXPECT_EQ(buffer.str(buffer << nothing << ' ' << nothingelse), "null null");
    buffer << 1;
    buffer << nothing;
    EXPECT_EQ(buffer.str(static_cast<std::ostream&>(buffer)), "null null1null");
}

TEST(LogBuffer, ChainOfTextStaysOnTheBuffer)
{
    static_assert(
        std::is_same_v<decltype(std::declval<WDLogBuffer&>() << "a" << 'b'), WDLogBuffer&>);
    static_assert(
        std::is_same_v<decltype(std::declval<WDLogBuffer&>() << "a" << 1 << "b"), std::ostream&>);
}

// What one formatted value looks like.
template <typename Value>
std::string formatted(Value value)
{
    WDLogBuffer buffer;
    return buffer.str(buffer << value);
}

TEST(LogBuffer, ValuesAreFormattedAsStreamsFormatThem)
{
    EXPECT_EQ(formatted(-5), "-5");
    EXPECT_EQ(formatted(static_cast<short>(-6)), "-6");
    EXPECT_EQ(formatted(-7L), "-7");
    EXPECT_EQ(formatted(4294967295U), "4294967295");
    EXPECT_EQ(formatted(18446744073709551615UL), "18446744073709551615");
    EXPECT_EQ(formatted(true), "1");
    EXPECT_EQ(formatted(false), "0");
    EXPECT_EQ(formatted(0.5F), "0.5");
    EXPECT_EQ(formatted(0.25), "0.25");
    EXPECT_EQ(formatted(1.5L), "1.5");
    // NOLINTNEXTLINE(performance-no-int-to-ptr)
    EXPECT_EQ(formatted(reinterpret_cast<void*>(0x1f)), "0x1f");
}

TEST(LogBuffer, ManipulatorAppliesToWhatFollows)
{
    WDLogBuffer buffer;
    EXPECT_EQ(buffer.str(buffer << "x" << std::hex << 255), "xff");
    EXPECT_TRUE(buffer.hasStream());
}

class LogHelper : public DaemonTest {
protected:
    LogHelper() : DaemonTest("m") {}
};

TEST_F(LogHelper, ComposesAndWritesOneLine)
{
    wdlog("m", kLevelError, "left: ", 2, " of ", std::string("3"));
    wdlog("m", kLevelInfo, "text only");
    EXPECT_EQ(world.events(), lines({"ERROR left: 2 of 3", "INFO text only"}));
}

// Counts how often it is looked at.
struct CountedPiece {
    int& count;
    operator const std::string&() const
    {
        static const std::string text = "counted";
        ++count;
        return text;
    }
};

TEST_F(LogHelper, LineThatIsDroppedIsNotComposed)
{
    int count = 0;
    wdlog("m", kLevelDebug, CountedPiece{count});
    debugenable = false;
    wdlog("m", kLevelDebug, CountedPiece{count});
    wdlog("m", kLevelInfo, CountedPiece{count});
    EXPECT_EQ(world.events(), lines({"DEBUG counted", "INFO counted"}));
    EXPECT_EQ(count, 2);
}

} // namespace
