#include "roster.h"

#include <cstdint>
#include <map>
#include <random>

#include <gtest/gtest.h>

namespace report {
namespace {

// An id as threads have it: the address of a stack, one below the other.
std::uint64_t thread(std::uint64_t number)
{
    constexpr std::uint64_t kLast = 0x7ffff7a00700;
    constexpr std::uint64_t kStackBytes = 0x801000;
    return kLast - number * kStackBytes;
}

// What the table is to hold.
using threadmap = std::map<std::uint64_t, serviceid>;

void expectthreads(const threadtable& table, const threadmap& expected, std::uint64_t threads)
{
    for (std::uint64_t i = 0; i < threads; ++i) {
        const auto* const found = table.find(thread(i));
        const auto wanted = expected.find(thread(i));
        ASSERT_EQ(found != nullptr, wanted != expected.end()) << i;
        if (found != nullptr) {
            ASSERT_EQ(found->service, wanted->second) << i;
        }
    }
}

class SomeThreads : public testing::TestWithParam<unsigned> {};

TEST_P(SomeThreads, AreFoundWhoeverHasGone)
{
    constexpr std::uint64_t kThreads = 120; // near half of its places: many want the same one
    constexpr serviceid kTurns = 5000;
    std::mt19937 chance(GetParam());
    std::uniform_int_distribution<std::uint64_t> any(0, kThreads - 1);
    threadtable table;
    threadmap expected;
    for (serviceid turn = 0; turn < kTurns; ++turn) {
        const std::uint64_t one = thread(any(chance));
        if (turn % 3 == 0) {
            table.remove(one);
            expected.erase(one);
        } else {
            table.set({one, turn, 1});
            expected[one] = turn;
        }
        ASSERT_NO_FATAL_FAILURE(expectthreads(table, expected, kThreads)) << turn;
    }
}

INSTANTIATE_TEST_SUITE_P(ThreadTable, SomeThreads, testing::Range(0U, 5U));

TEST(ThreadTable, GrowsWithTheThreads)
{
    constexpr serviceid kThreads = 3000;
    threadtable table;
    threadmap expected;
    for (serviceid i = 0; i < kThreads; ++i) {
        table.set({thread(i), i, 1});
        expected[thread(i)] = i;
    }
    expectthreads(table, expected, kThreads);
}

TEST(Roster, KeepsTheLastFewThreadsOfAService)
{
    constexpr std::uint64_t kThreads = 5;
    roster who;
    const serviceid web = who.add("web");
    for (std::uint64_t i = 0; i < kThreads; ++i) {
        who.tie(thread(i), web, 1);
    }
    EXPECT_EQ(who.bythread(thread(0)), nullptr);
    EXPECT_EQ(who.watchers(web, 1), kThreads - 1);
    who.untie(thread(kThreads - 1));
    EXPECT_EQ(who.watchers(web, 1), kThreads - 2);
    EXPECT_EQ(who.watchers(web, 2), 0U);
}

TEST(Roster, KeepsTheThreadsBeforeOneThatIsGone)
{
    roster who;
    const serviceid web = who.add("web");
    for (const std::uint64_t number : {1U, 2U, 3U}) {
        who.tie(thread(number), web, 1);
    }
    who.untie(thread(3));
    who.tie(thread(4), web, 1);
    EXPECT_EQ(who.watchers(web, 1), 3U);
    who.tie(thread(5), web, 1);
    EXPECT_EQ(who.bythread(thread(1)), nullptr);
    EXPECT_EQ(who.watchers(web, 1), 3U);
}

TEST(Roster, KeepsNameAndPathWhicheverChanges)
{
    roster who;
    const serviceid one = who.addnameless("(/one)", "/one");
    const serviceid web = who.add("web");
    EXPECT_EQ(who.nameof(one), "(/one)");
    EXPECT_EQ(who.byname("(/one)"), std::nullopt);
    who.name(one, "mail");
    who.setpath(web, "/web");
    EXPECT_EQ(who.byname("mail"), one);
    EXPECT_EQ(who.pathof(one), "/one");
    EXPECT_EQ(who.bypath("/one"), one);
    EXPECT_EQ(who.nameof(web), "web");
}

TEST(Roster, FollowsAPathFromServiceToService)
{
    roster who;
    const serviceid web = who.add("web");
    const serviceid mail = who.add("mail");
    who.setpath(web, "/usr/sbin/one");
    EXPECT_EQ(who.bypath("/usr/sbin/one"), web);
    who.setpath(mail, "/usr/sbin/one");
    EXPECT_EQ(who.bypath("/usr/sbin/one"), std::nullopt);
    EXPECT_TRUE(who.knowspath("/usr/sbin/one"));
    who.setpath(web, "/usr/sbin/other");
    EXPECT_EQ(who.bypath("/usr/sbin/one"), mail);
    who.setpath(mail, "");
    EXPECT_FALSE(who.knowspath("/usr/sbin/one"));
}

} // namespace
} // namespace report
