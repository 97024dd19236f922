#include "logclock.h"

#include <algorithm>

namespace report {

namespace {

constexpr std::int64_t kDaySeconds = 86400;

// East of Greenwich, in seconds, at a moment.
std::int64_t offsetat(std::time_t utc)
{
    std::tm local{};
    return localtime_r(&utc, &local) != nullptr ? local.tm_gmtoff : 0;
}

// The moments that a local time may stand for: two where an hour comes twice. A time that was left
// out when the clock went forward stands for the one as much later.
struct candidates {
    std::int64_t earlier;
    std::int64_t later;
};

candidates momentsof(std::int64_t clock)
{
    const std::int64_t before = offsetat(clock - kDaySeconds);
    const std::int64_t behind = offsetat(clock + kDaySeconds);
    const std::int64_t first = clock - before;
    const std::int64_t second = clock - behind;
    const bool isfirst = offsetat(first) == before;
    const bool issecond = offsetat(second) == behind;
    if (isfirst && issecond) {
        return {std::min(first, second), std::max(first, second)};
    }
    return issecond ? candidates{second, second} : candidates{first, first};
}

} // namespace

logclock::logclock()
{
    tzset();
}

instant logclock::advancefar(std::int64_t clock)
{
    const std::int64_t utc = utcof(clock);
    if (!begun) {
        begun = true;
        latest = utc;
    }
    const std::int64_t elapsed = std::min(utc + shift, kEndOfTime);
    if (elapsed < latest - kDisorderSeconds) {
        ++setback;
        shift = latest - utc;
    }
    latest = std::max(latest, elapsed);
    return {clock, latest};
}

instant logclock::at(std::time_t utc) const
{
    return {utc + offsetat(utc), std::max(latest, std::min(utc + shift, kEndOfTime))};
}

std::int64_t logclock::utcof(std::int64_t clock)
{
    if (isplain && clock >= plainhour && clock < plainhour + kHourSeconds) {
        return clock - plainoffset;
    }
    const std::int64_t hour = clock - (clock % kHourSeconds + kHourSeconds) % kHourSeconds;
    const candidates begin = momentsof(hour);
    const candidates end = momentsof(hour + kHourSeconds - 1);
    plainhour = hour;
    plainoffset = hour - begin.earlier;
    isplain = begin.earlier == begin.later && end.earlier == end.later &&
              end.earlier - begin.earlier == kHourSeconds - 1;
    if (isplain) {
        return clock - plainoffset;
    }
    const candidates moments = momentsof(clock);
    return choose(moments.earlier, moments.later);
}

std::int64_t logclock::choose(std::int64_t earlier, std::int64_t later) const noexcept
{
    const std::int64_t least = latest - shift - kDisorderSeconds;
    return begun && earlier < least && later >= least ? later : earlier;
}

} // namespace report
