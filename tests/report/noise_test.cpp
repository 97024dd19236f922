// Any messages in any order: what the tracker tells keeps its form.
#include "tracker.h"

#include <array>
#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "story.h"

namespace {

using report::account;
using report::event;
using report::line;
using report::messageid;
using report::span;
using report::story;

// Names and paths are from few, so that threads are mistaken for each other.
class noise {
public:
    explicit noise(unsigned seed) : chance(seed) {}

    line next()
    {
        const auto id = static_cast<messageid>(pick(static_cast<int>(messageid::kForeign)));
        when += pick(20) == 0 ? pick(12000) : pick(3);
        return {when - pick(1), static_cast<std::uint64_t>(pick(6)) * 4096, id, textfor(id)};
    }

private:
    int pick(int most) { return std::uniform_int_distribution(0, most)(chance); }

    std::string textfor(messageid id)
    {
        static const std::array<std::string, 6> kNames{"web", "mail", "", "(/web)", "a\nb", "\xff"};
        static const std::array<std::string, 4> kPaths{"/web", "/mail", "", "NULL"};
        switch (id) {
        case messageid::kBinaryPathNamed:
        case messageid::kCheckBegins:
        case messageid::kCheckSkipped:
        case messageid::kCannotSkip:
        case messageid::kNoFigures:
            return kPaths.at(static_cast<std::size_t>(pick(3)));
        case messageid::kStatusAnswered:
            return "service " + kNames.at(static_cast<std::size_t>(pick(5))) + " status 1>x 2>x";
        default:
            return kNames.at(static_cast<std::size_t>(pick(5)));
        }
    }

    std::mt19937 chance;
    std::int64_t when = 0;
};

class Noise : public testing::TestWithParam<unsigned> {};

constexpr int kLines = 2000;

TEST_P(Noise, LeavesSpansThatTouchAndFiguresThatAgree)
{
    noise heard(GetParam());
    story told;
    line each;
    for (int count = 0; count < kLines; ++count) {
        each = heard.next();
        told.play({each});
    }
    told.teller().conclude(report::at(each.at + 2), true);
    const std::vector<account> accounts = told.accounts();
    ASSERT_LE(told.allspans().size(), accounts.size());
    for (std::size_t service = 0; service < told.allspans().size(); ++service) {
        const std::vector<span>& spans = told.allspans()[service];
        std::int64_t watched = 0;
        for (std::size_t at = 0; at < spans.size(); ++at) {
            const std::int64_t length = secondsbetween(spans[at].from, spans[at].to);
            ASSERT_GT(length, 0);
            ASSERT_TRUE(at == 0 || spans[at - 1].to.elapsed == spans[at].from.elapsed);
            ASSERT_TRUE(at == 0 || spans[at - 1].what != spans[at].what);
            watched += spans[at].what == report::state::kNotWatched ? 0 : length;
        }
        const account& figures = accounts[service];
        EXPECT_EQ(figures.watchedseconds, watched);
        EXPECT_LE(figures.outageseconds, watched);
        EXPECT_EQ(figures.lastoutage.has_value(), figures.outages > 0);
        EXPECT_EQ(isoutage(figures.now.what), figures.lastoutage && !figures.lastoutage->to);
    }
}

TEST_P(Noise, IsHeardTheSameWhoeverAsksMeanwhile)
{
    noise heard(GetParam());
    story asked;
    story unasked;
    line each;
    for (int count = 0; count < kLines; ++count) {
        each = heard.next();
        asked.play({each});
        unasked.play({each});
        asked.teller().conclude(report::at(each.at + count), false);
    }
    asked.teller().conclude(report::at(each.at + 2), false);
    unasked.teller().conclude(report::at(each.at + 2), false);
    const std::vector<account> one = asked.accounts();
    const std::vector<account> other = unasked.accounts();
    ASSERT_EQ(one.size(), other.size());
    for (std::size_t service = 0; service < one.size(); ++service) {
        EXPECT_EQ(one[service].now.what, other[service].now.what);
        EXPECT_EQ(one[service].now.from, other[service].now.from);
        EXPECT_EQ(one[service].outages, other[service].outages);
        EXPECT_EQ(one[service].outageseconds, other[service].outageseconds);
        EXPECT_EQ(one[service].watchedseconds, other[service].watchedseconds);
    }
}

TEST_P(Noise, TellsEachMessageOnce)
{
    noise heard(GetParam());
    story told;
    for (int count = 0; count < kLines; ++count) {
        told.play({heard.next()});
    }
    int sources = 0;
    for (const event& each : told.allevents()) {
        sources += each.source == nullptr ? 0 : 1;
        ASSERT_TRUE(!each.service || *each.service < told.teller().services());
    }
    EXPECT_EQ(sources, kLines);
}

INSTANTIATE_TEST_SUITE_P(Seeds, Noise, testing::Range(0U, SEEDS));

} // namespace
