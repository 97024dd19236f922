// A moment of the log. The log knows local time without its zone, in whole seconds; that clock is
// set, and changes by an hour twice a year. So a moment has two faces: what the log says, to be
// shown, and seconds that only go forward, to reckon with.
#pragma once

#include <compare>
#include <cstdint>
#include <string>

namespace report {

struct instant {
    std::int64_t clock = 0; // the log's local time, in seconds since 1970 as if it were UTC
    std::int64_t elapsed =
        0; // seconds on a clock that never goes back; its beginning means nothing

    friend bool operator==(const instant&, const instant&) = default;
};

// From `from` to `to`, in seconds.
inline std::int64_t secondsbetween(const instant& from, const instant& to) noexcept
{
    return to.elapsed - from.elapsed;
}

// "2026-11-21 15:39:37". Any thread.
std::string clocktext(const instant& when);

// "2026-11-21T15:39:37", as JSON has it. Any thread.
std::string isotext(const instant& when);

// "45 s", "3 min 30 s", "2 h 5 min", "3 d 4 h": never more than two units. Any thread.
std::string spantext(std::int64_t seconds);

} // namespace report
