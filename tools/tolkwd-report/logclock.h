// The log's clock: dates without a zone, as asctime writes them -> moments. That clock can be set,
// and changes by an hour twice a year; the zone of the process tells when.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <optional>

#include "instant.h"

namespace report {

// One thread's.
class logclock {
public:
    static constexpr std::size_t kDateBytes = 24; // "Sat Nov 21 15:39:37 2026"

    // Two threads take the time before they write: their lines may stand so much out of order.
    static constexpr std::int64_t kDisorderSeconds = 60;

    // Reads the process's zone (TZ).
    logclock();

    // The local time, as instant::clock, of the kDateBytes that begin at `date`; none where they
    // are no date.
    [[nodiscard]] std::optional<std::int64_t> read(const char* date) noexcept
    {
        if (std::memcmp(date, hourtext.data(), kHourBytes) != 0 ||
            std::memcmp(date + kYearAt, yeartext.data(), kYearBytes) != 0) {
            if (!readhour(date)) {
                return std::nullopt;
            }
        }
        return readwithin(date + kHourBytes);
    }

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
    // The hour of the last date, for most dates are of the same hour.
    static constexpr std::size_t kHourBytes = 14; // "Sat Nov 21 15:"
    static constexpr std::size_t kYearAt = 19;    // " 2026"
    static constexpr std::size_t kYearBytes = kDateBytes - kYearAt;
    static constexpr std::int64_t kHourSeconds = 3600;
    std::array<char, kHourBytes> hourtext{'T', 'h', 'u', ' ', 'J', 'a', 'n',
                                          ' ', ' ', '1', ' ', '0', '0', ':'};
    std::array<char, kYearBytes> yeartext{' ', '1', '9', '7', '0'};
    std::int64_t hourclock = 0; // its beginning

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

    [[nodiscard]] bool readhour(const char* date) noexcept;
    [[nodiscard]] std::optional<std::int64_t> readwithin(const char* time) const noexcept
    {
        const auto digit = [&](std::size_t place) {
            return static_cast<unsigned>(static_cast<unsigned char>(time[place])) - '0';
        };
        if (digit(0) > 5 || digit(1) > 9 || time[2] != ':' || digit(3) > 5 || digit(4) > 9) {
            return std::nullopt;
        }
        const unsigned seconds = (digit(0) * 10 + digit(1)) * 60 + digit(3) * 10 + digit(4);
        return hourclock + seconds;
    }
    instant advancefar(std::int64_t clock);
    [[nodiscard]] std::int64_t utcof(std::int64_t clock);
    [[nodiscard]] std::int64_t choose(std::int64_t earlier, std::int64_t later) const noexcept;
};

} // namespace report
