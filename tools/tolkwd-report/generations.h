// When a new generation of monitor threads begins. All threads of one are started at once, after
// the start of the daemon and after each refresh, and announce themselves. Only debug lines say
// that a refresh is made; without them a refresh and a new start of the daemon look alike.
#pragma once

#include <cstdint>

#include "message.h"

namespace report {

// Two targets may name the same service: its second announcement comes so soon after the one before
// it, whichever that is. Nobody starts the daemon twice in this time, which would be the other way
// to read it.
inline constexpr std::int64_t kSameBurstSeconds = 3;

// A thread that is announced so long after the one before it is of another generation.
inline constexpr std::int64_t kBurstPauseSeconds = 30;

// How long after the last announcement the generation is taken to be complete.
inline constexpr std::int64_t kCompleteSeconds = 10;

// One thread.
class generations {
public:
    enum class start : std::uint8_t {
        kNone,      // the announcement belongs to the generation that there is
        kFirst,     // nothing was known before it
        kRefreshed, // there was a refresh
        kAnew,      // the daemon was started anew
        kEither,    // one of these two
    };

    // A message of any kind.
    void hear(messageid id, const instant& when) noexcept;

    // The configuration could not be loaded, or the daemon has ended: what is announced next is a
    // new generation.
    void endbyload() noexcept { over = true; }
    void endwithdaemon() noexcept;

    // An announcement; whether its thread, and its service, were heard of in this generation
    // before, and whether any service is known at all. What it begins.
    start announced(const instant& when, bool threadagain, bool serviceagain, bool anything);

    // 0 before the first announcement.
    [[nodiscard]] std::uint32_t number() const noexcept { return count; }
    // The first announcement of the generation that there is.
    [[nodiscard]] const instant& since() const noexcept { return begun; }
    // Whether debug lines are on.
    [[nodiscard]] bool hassteps() const noexcept { return steps; }
    // Whether all threads of this generation can be taken to have announced themselves.
    [[nodiscard]] bool iscomplete(const instant& when) const noexcept
    {
        return secondsbetween(last, when) > kCompleteSeconds;
    }

private:
    [[nodiscard]] start kindofstart(bool anything) const noexcept;

    std::uint32_t count = 0;
    instant begun;
    instant last;    // announcement
    instant entered; // when a thread said so, in debug lines, last
    bool hasentered = false;
    bool steps = false;
    bool refreshed = false; // a refresh is under way
    bool over = false;
    bool ended = false; // the daemon has
};

} // namespace report
