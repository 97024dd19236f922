// The tracker against a model of the daemon's rounds: with debug lines it must know all that the
// daemon knows, to the second; without them it may be late, but by no more than the rules allow.
#include "tracker.h"

#include <algorithm>
#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "story.h"

namespace {

using report::line;
using report::span;
using report::state;
using report::story;
using enum report::messageid;

constexpr std::int64_t kEndSeconds = 200000;
constexpr std::int64_t kRefreshSeconds = 10800;
constexpr std::int64_t kMostCommandSeconds = 3;

// What the daemon does with one service of fickle health, and what it knows of its state.
class daemonmodel {
public:
    explicit daemonmodel(unsigned seed) : chance(seed)
    {
        maxrecoveries = pick(1, 3);
        generalinterval = pick(1, 300);
        functionalinterval = pick(1, 300);
        haschecks = pick(0, 3) != 0;
        while (now < kEndSeconds) {
            generation();
        }
    }

    std::vector<line> lines;
    std::vector<span> truth; // what each state is, and its beginning
    std::int64_t generalinterval;
    std::int64_t functionalinterval;

private:
    std::int64_t pick(std::int64_t least, std::int64_t most)
    {
        return std::uniform_int_distribution(least, most)(chance);
    }
    bool oneof(std::int64_t many) { return pick(1, many) == 1; }

    void say(report::messageid id, const std::string& first = {})
    {
        lines.push_back({now, thread, id, first});
    }

    void become(state what, std::int64_t when)
    {
        while (!truth.empty() && truth.back().from.elapsed >= when) {
            truth.pop_back();
        }
        if (truth.empty() || truth.back().what != what) {
            truth.push_back({what, report::at(when), report::at(when), false});
        }
    }
    void become(state what) { become(what, now); }

    // The announcement counts from what the first ping finds.
    void generation()
    {
        thread = 4096 * static_cast<std::uint64_t>(pick(1, 1000));
        say(kThreadEntered);
        say(kServiceNamed, "web");
        say(kBinaryPathNamed, "/web");
        announcedat = now;
        const std::int64_t refresh = now + kRefreshSeconds;
        bool alive = true;
        while (alive && now < refresh) {
            alive = round();
        }
        now = std::max(now, refresh);
        lines.push_back({now, 1, kRefreshBegins});
        if (alive) {
            say(kThreadLeft);
            become(state::kNotWatched);
        }
        now += pick(1, 9);
    }

    bool ping()
    {
        now += pick(0, kMostCommandSeconds);
        sick = sick ? !oneof(4) : oneof(30);
        say(sick ? kPingFailed : kPingSucceeded);
        return !sick;
    }

    void foundrunning()
    {
        justup =
            truth.empty() || isoutage(truth.back().what) || truth.back().what == state::kNotWatched;
        const state before = truth.empty() ? state::kNotWatched : truth.back().what;
        if (announcedat >= 0) {
            become(state::kUp, announcedat);
            justup = justup || before != state::kUp;
        } else if (justup) {
            become(state::kUp);
        }
        beforeup = before;
        announcedat = -1;
    }

    bool round()
    {
        bool running = false;
        std::int64_t recoveries = 0;
        while (recoveries < maxrecoveries && !running) {
            running = ping();
            if (!running && oneof(40)) {
                say(kServiceUnknown, "web");
                become(state::kUnknownService);
                announcedat = -1;
                return false;
            }
            if (running) {
                foundrunning();
                if (haschecks && !functionalphase()) {
                    return false;
                }
            } else {
                running = retry();
                if (!running) {
                    say(kRecoveryTried, "web");
                    become(state::kRecovering);
                    now += pick(0, 20);
                    ++recoveries;
                }
            }
            now += generalinterval;
        }
        if (recoveries > 0 && running) {
            say(kRecovered, "web");
        }
        if (recoveries == maxrecoveries && !running) {
            say(kGaveUp, "web");
            become(state::kGaveUp);
            return false;
        }
        return true;
    }

    bool retry()
    {
        say(kServiceFailed, "web");
        become(state::kSuspect);
        announcedat = -1;
        now += 30;
        for (int left = 3; left > 0; --left) {
            now += 60;
            if (ping()) {
                become(state::kUp);
                return true;
            }
        }
        return false;
    }

    report::messageid check()
    {
        now += pick(0, kMostCommandSeconds);
        faulty = faulty ? !oneof(4) : oneof(20);
        say(faulty ? kCheckUnclear : kCheckSucceeded);
        if (!faulty) {
            become(state::kUp);
        }
        return faulty ? kCheckUnclear : kCheckSucceeded;
    }

    bool functionalphase()
    {
        bool fine = false;
        std::int64_t recoveries = 0;
        while (recoveries < maxrecoveries && !fine) {
            if (oneof(15)) {
                say(kCheckSkipped, "/web");
                become(state::kBusy);
                fine = true;
            } else if (firstcheck() == kCheckNotFound) {
                break;
            } else {
                fine = !faulty || retrycheck();
                if (!fine) {
                    say(kFunctionalRecoveryTried, "web");
                    become(state::kFunctionalRecovering);
                    now += pick(0, 9); // the lock
                    say(kRecoveryTried, "web");
                    now += 1;
                    ++recoveries;
                }
            }
            justup = false;
            now += functionalinterval;
        }
        if (recoveries > 0 && fine) {
            say(kFunctionallyRecovered, "web");
        }
        if (recoveries == maxrecoveries && !fine) {
            say(kFunctionalGaveUp, "web");
            become(state::kGaveUp);
            return false;
        }
        return true;
    }

    report::messageid firstcheck()
    {
        if (oneof(9)) {
            say(kCannotSkip, "/web");
        }
        say(kCheckBegins, "/web");
        if (truth.back().what == state::kBusy) {
            become(state::kUp);
        }
        if (oneof(60)) {
            say(kCheckNotFound);
            say(kCheckNotRecognised, "web");
            takeback(state::kCommandNotRecognised);
            become(state::kCommandNotRecognised);
            return kCheckNotFound;
        }
        return check();
    }

    bool retrycheck()
    {
        say(kCheckFailed, "web");
        takeback(state::kFunctionalFailure);
        become(state::kFunctionalFailure);
        now += 30;
        for (int left = 3; left > 0; --left) {
            const bool fine = check() == kCheckSucceeded;
            now += 60;
            if (fine) {
                return true;
            }
        }
        return false;
    }

    // What this round's ping has found running has not come up by that.
    void takeback(state into)
    {
        const bool goeson = beforeup == into || (isoutage(beforeup) && isoutage(into));
        if (justup && goeson && truth.size() > 1) {
            truth.pop_back();
        }
        justup = false;
    }

    std::mt19937 chance;
    std::int64_t now = 0;
    std::uint64_t thread = 0;
    std::int64_t announcedat = -1;
    std::int64_t maxrecoveries;
    bool haschecks;
    bool sick = false;
    bool faulty = false;
    bool justup = false; // this round's ping has ended what was before
    state beforeup = state::kNotWatched;
};

std::vector<line> withoutsteps(std::vector<line> lines)
{
    std::erase_if(lines, [](const line& each) {
        return report::levelof(each.id) == report::loglevel::kDebug;
    });
    return lines;
}

std::string shown(const std::vector<span>& spans)
{
    std::string result;
    for (const span& each : spans) {
        result += std::to_string(each.from.elapsed) + " " + std::string(wordof(each.what)) + "\n";
    }
    return result;
}

// The state of each second, as known to these spans.
std::vector<state> seconds(const std::vector<span>& spans, std::int64_t end)
{
    std::vector<state> result(static_cast<std::size_t>(end), state::kNotWatched);
    for (const span& each : spans) {
        std::fill(result.begin() + each.from.elapsed, result.end(), each.what);
    }
    return result;
}

class Rounds : public testing::TestWithParam<unsigned> {};

TEST_P(Rounds, AreKnownToTheSecondWithDebugLines)
{
    const daemonmodel model(GetParam());
    story told(model.lines);
    told.finish("web", model.lines.back().at + 1);
    EXPECT_EQ(shown(told.allspans().at(0)), shown(model.truth));
}

// An outage that has begun is noticed at once, one that has ended by the next word at the latest.
// It may be noticed too early by the time of the commands: of three retries, or of the check that a
// functional recovery waits for.
TEST_P(Rounds, AreKnownInTimeWithoutDebugLines)
{
    const daemonmodel model(GetParam());
    const std::int64_t end = model.lines.back().at + 1;
    story told(withoutsteps(model.lines));
    told.finish("web", end);
    const std::vector<state> truth = seconds(model.truth, end);
    const std::vector<state> known = seconds(told.allspans().at(0), end);
    const std::int64_t mostlate =
        std::max<std::int64_t>(150, model.generalinterval + model.functionalinterval) + 210;
    std::int64_t late = 0;
    std::int64_t early = 0;
    for (std::size_t at = 0; at < truth.size(); ++at) {
        const bool down = isoutage(truth[at]);
        late = !down && isoutage(known[at]) ? late + 1 : 0;
        early = down && !isoutage(known[at]) ? early + 1 : 0;
        ASSERT_LE(late, mostlate) << "down for too long at " << at;
        ASSERT_LE(early, 3 * kMostCommandSeconds) << "up too early at " << at;
    }
}

TEST_P(Rounds, NeedOnlyTheMessagesThatMatter)
{
    daemonmodel model(GetParam());
    story all(model.lines);
    const std::string expected = all.finish("web", kEndSeconds * 2);
    std::erase_if(model.lines, [](const line& each) { return !report::matters(each.id); });
    story some(model.lines);
    EXPECT_EQ(some.finish("web", kEndSeconds * 2), expected);
}

TEST_P(Rounds, LeaveFiguresThatAgreeWithTheirSpans)
{
    for (const bool steps : {true, false}) {
        const daemonmodel model(GetParam());
        story told(steps ? model.lines : withoutsteps(model.lines));
        told.finish("web", model.lines.back().at + 1);
        std::int64_t watched = 0;
        std::int64_t down = 0;
        std::uint64_t outages = 0;
        bool before = false;
        const std::vector<span>& spans = told.allspans().at(0);
        for (std::size_t each = 0; each < spans.size(); ++each) {
            const std::int64_t length = secondsbetween(spans[each].from, spans[each].to);
            const bool isdown = isoutage(spans[each].what);
            ASSERT_GT(length, 0);
            if (each > 0) {
                ASSERT_EQ(spans[each - 1].to, spans[each].from);
                ASSERT_NE(spans[each - 1].what, spans[each].what);
            }
            watched += spans[each].what == state::kNotWatched ? 0 : length;
            down += isdown ? length : 0;
            outages += isdown && !before ? 1 : 0;
            before = isdown;
        }
        EXPECT_EQ(told.of("web").watchedseconds, watched);
        EXPECT_EQ(told.of("web").outageseconds, down);
        EXPECT_EQ(told.of("web").outages, outages);
    }
}

INSTANTIATE_TEST_SUITE_P(Seeds, Rounds, testing::Range(0U, SEEDS));

} // namespace
