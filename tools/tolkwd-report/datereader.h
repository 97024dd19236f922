// Dates without a zone, as asctime writes them -> local times.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>

#include "bytes.h"

namespace report {

// One thread's.
class datereader {
public:
    static constexpr std::size_t kDateBytes = 24; // "Sat Nov 21 15:39:37 2026"

    datereader() noexcept;

    // The local time, as instant::clock, of the kDateBytes that begin at `date`; none where they
    // are no date.
    [[nodiscard]] std::optional<std::int64_t> read(const char* date) noexcept
    {
        const std::uint64_t day = wordat(date) ^ first;
        const std::uint64_t minute = wordat(date + kWordBytes) ^ second;
        const std::uint64_t rest = wordat(date + 2 * kWordBytes) ^ third;
        if ((day | minute | rest) == 0) {
            return lastclock; // many lines are of the same second as the one before
        }
        if ((day | (minute & ~kMinutes) | (rest & ~kSeconds)) != 0) {
            const std::optional<std::int64_t> hour = hourof(date);
            return hour ? readwithin(date, *hour) : std::nullopt;
        }
        return readwithin(date, hourclock);
    }

private:
    // The last date: "Sat Nov ", "21 15:39", ":37 2026".
    std::uint64_t first = 0;
    std::uint64_t second = 0;
    std::uint64_t third = 0;
    std::int64_t lastclock = 0;
    std::int64_t hourclock = 0; // the beginning of its hour

    // What may differ from it within an hour.
    static constexpr std::uint64_t kMinutes = 0xffff'0000'0000'0000; // of the second word
    static constexpr std::uint64_t kSeconds = 0x0000'0000'00ff'ff00; // of the third

    // The beginning of a date's hour; none where all but its minute and second is no date.
    [[nodiscard]] static std::optional<std::int64_t> hourof(const char* date) noexcept;

    // A date of this hour; the last one then.
    [[nodiscard]] std::optional<std::int64_t> readwithin(const char* date,
                                                         std::int64_t hour) noexcept
    {
        const auto digit = [&](std::size_t place) {
            return static_cast<unsigned>(static_cast<unsigned char>(date[place])) - '0';
        };
        if (digit(14) > 5 || digit(15) > 9 || date[16] != ':' || digit(17) > 5 || digit(18) > 9) {
            return std::nullopt;
        }
        first = wordat(date);
        second = wordat(date + kWordBytes);
        third = wordat(date + 2 * kWordBytes);
        hourclock = hour;
        const unsigned minute = digit(14) * 10 + digit(15);
        const unsigned seconds = minute * 60 + digit(17) * 10 + digit(18);
        lastclock = hour + seconds;
        return lastclock;
    }
};

} // namespace report
