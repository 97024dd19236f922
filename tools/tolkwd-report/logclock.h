// The log's clock: local times -> moments. That clock can be set, and changes by an hour twice a
// year; the zone of the process tells when.
#pragma once

#include <cstdint>
#include <ctime>

#include "instant.h"

namespace report {

// One thread's.
class logclock {
public:
    // Two threads take the time before they write: their lines may stand so much out of order.
    static constexpr std::int64_t kDisorderSeconds = 60;

    // Reads the process's zone (TZ).
    logclock();

    // The next message's moment. An hour that comes twice is the first one unless the message
    // before is later than that. Back by up to kDisorderSeconds is disorder: nothing has elapsed;
    // back by more is a clock that was set: what has elapsed goes on from there.
    instant advance(std::int64_t clock)
    {
        if (isplain && clock >= plainhour && clock < plainhour + kHourSeconds) {
            const std::int64_t elapsed = clock - plainoffset + shift;
            if (elapsed >= latest && elapsed <= kEndOfTime) {
                latest = elapsed;
                return {clock, latest};
            }
        }
        return advancefar(clock);
    }

    // That of the present, without advancing. `utc` in seconds since 1970.
    [[nodiscard]] instant at(std::time_t utc) const;

    // How often it was set back.
    [[nodiscard]] std::uint64_t changes() const noexcept { return setback; }

private:
    static constexpr std::int64_t kHourSeconds = 3600;

    // The hour that advance() was in last, if its local times stand for one moment each.
    std::int64_t plainhour = 0;
    std::int64_t plainoffset = 0; // east of Greenwich, in seconds
    bool isplain = false;

    // Nothing elapses beyond this. No real clock comes there, but one that is set back again and
    // again over thousands of years would.
    static constexpr std::int64_t kEndOfTime = 1'000'000'000'000'000;

    bool begun = false;
    std::int64_t latest = 0; // what has elapsed
    std::int64_t shift = 0;  // from UTC to that
    std::uint64_t setback = 0;

    instant advancefar(std::int64_t clock);
    [[nodiscard]] std::int64_t utcof(std::int64_t clock);
    [[nodiscard]] std::int64_t choose(std::int64_t earlier, std::int64_t later) const noexcept;
};

} // namespace report
