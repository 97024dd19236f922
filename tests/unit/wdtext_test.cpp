#include "wdtext.h"

#include <string>
#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

namespace {

// What the copying of long lists relies on.
static_assert(sizeof(wdtext) == sizeof(void*));
static_assert(std::is_nothrow_move_constructible_v<wdtext>);

constexpr const char* kLong = "a text that does not fit into a string object itself";

bool shared(const wdtext& one, const wdtext& other)
{
    return &one.str() == &other.str();
}

TEST(Text, IsEmptyAtFirst)
{
    const wdtext fresh;
    EXPECT_EQ(fresh, "");
    EXPECT_EQ(fresh, wdtext(""));
}

TEST(Text, HoldsEveryByte)
{
    const std::string bytes("a\0b\xff", 4);
    EXPECT_EQ(wdtext(bytes).str(), bytes);
}

TEST(Text, StandsWhereAStringIsRead)
{
    const wdtext text(kLong);
    const std::string& read = text;
    EXPECT_EQ(read, kLong);
}

TEST(Text, EqualTextsAreEqualWhereverTheyAreHeld)
{
    EXPECT_EQ(wdtext("a"), wdtext("a"));
    EXPECT_NE(wdtext("a"), wdtext("A"));
    EXPECT_NE(wdtext("a"), "ab");
}

TEST(Text, CopiesShareIt)
{
    const wdtext source(kLong);
    const wdtext copy(source); // NOLINT(performance-unnecessary-copy-initialization)
    wdtext assigned("other");
    assigned = source;
    EXPECT_TRUE(shared(source, copy));
    EXPECT_TRUE(shared(source, assigned));
}

TEST(Text, ReplacedCopyLeavesTheOthersAlone)
{
    wdtext source("before");
    const wdtext copy(source);
    source = "after";
    EXPECT_EQ(source, "after");
    EXPECT_EQ(copy, "before");
}

TEST(Text, ReplacedByTheSameTextItGoesOnSharing)
{
    wdtext source(kLong);
    const wdtext copy(source);
    source = std::string(kLong);
    EXPECT_TRUE(shared(source, copy));
}

TEST(Text, ReplacedByNothingItIsEmpty)
{
    wdtext text("x");
    text = "";
    EXPECT_EQ(text, wdtext());
}

TEST(Text, AssignedToItselfItStays)
{
    wdtext text(kLong);
    const wdtext& same = text;
    text = same;
    EXPECT_EQ(text, kLong);
}

TEST(Text, MovedTextIsTaken)
{
    wdtext source(kLong);
    wdtext target("old");
    target = std::move(source);
    const wdtext last(std::move(target));
    EXPECT_EQ(last, kLong);
}

TEST(Text, ManyThreadsMayCopyReplaceAndDropItAtOnce)
{
    constexpr int kRounds = 10'000;
    const std::vector<wdtext> texts{wdtext("one"), wdtext(kLong)};
    std::vector<wdtext> last(4);
    std::vector<std::thread> threads;
    threads.reserve(last.size());
    for (wdtext& mine : last) {
        threads.emplace_back([&texts, &mine] {
            for (int i = 0; i < kRounds; ++i) {
                mine = texts[0];
                wdtext copy(texts[1]);
                mine = std::move(copy);
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    for (const wdtext& mine : last) {
        EXPECT_TRUE(shared(mine, texts[1]));
    }
}

} // namespace
