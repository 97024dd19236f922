#include "logclock.h"

#include <algorithm>
#include <chrono>
#include <cstring>
#include <string_view>

namespace report {

namespace {

constexpr std::int64_t kHourSeconds = 3600;
constexpr std::int64_t kDaySeconds = 86400;

constexpr std::string_view kDays = "SunMonTueWedThuFriSat";
constexpr std::string_view kMonths = "JanFebMarAprMayJunJulAugSepOctNovDec";
constexpr std::size_t kWordBytes = 3;
constexpr int kFirstYear = 1900; // asctime's

// Which of the words of three letters; none where it is none of them.
std::optional<unsigned> wordin(std::string_view words, std::string_view word)
{
    for (std::size_t place = 0; place < words.size(); place += kWordBytes) {
        if (words.substr(place, kWordBytes) == word) {
            return static_cast<unsigned>(place / kWordBytes);
        }
    }
    return std::nullopt;
}

constexpr bool isdigit(char byte) noexcept
{
    return byte >= '0' && byte <= '9';
}

// A number that fills all of `text`; -1 where it is none. A blank may stand for the first digit.
int numberof(std::string_view text, bool blankfirst = false)
{
    if (blankfirst && text.starts_with(' ')) {
        text.remove_prefix(1);
    }
    int value = 0;
    for (const char byte : text) {
        if (!isdigit(byte)) {
            return -1;
        }
        value = value * 10 + (byte - '0');
    }
    return value;
}

// The beginning of the hour of "Sat Nov 21 15:" and " 2026".
std::optional<std::int64_t> hourof(std::string_view hour, std::string_view year)
{
    using namespace std::chrono;
    const auto month = wordin(kMonths, hour.substr(4, kWordBytes));
    const int dayofmonth = numberof(hour.substr(8, 2), true);
    const int hourofday = numberof(hour.substr(11, 2));
    const int yearnumber = numberof(year.substr(1));
    if (!wordin(kDays, hour.substr(0, kWordBytes)) || !month || dayofmonth < 1 || hourofday < 0 ||
        hourofday > 23 || yearnumber < kFirstYear || hour[3] != ' ' || hour[7] != ' ' ||
        hour[10] != ' ' || hour[13] != ':' || year[0] != ' ') {
        return std::nullopt;
    }
    const year_month_day date{std::chrono::year(yearnumber), std::chrono::month(*month + 1),
                              day(static_cast<unsigned>(dayofmonth))};
    if (!date.ok()) {
        return std::nullopt;
    }
    return sys_days(date).time_since_epoch().count() * kDaySeconds + hourofday * kHourSeconds;
}

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

bool logclock::readhour(const char* date) noexcept
{
    const auto hour = hourof({date, kHourBytes}, {date + kYearAt, kYearBytes});
    if (!hour) {
        return false;
    }
    std::memcpy(hourtext.data(), date, kHourBytes);
    std::memcpy(yeartext.data(), date + kYearAt, kYearBytes);
    hourclock = *hour;
    return true;
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
