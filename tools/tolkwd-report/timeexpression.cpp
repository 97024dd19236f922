#include "timeexpression.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>
#include <span>
#include <string>
#include <vector>

namespace report {

namespace {

using clock_seconds = std::optional<std::int64_t>;
using words = std::span<const std::string>;

constexpr std::int64_t kMinuteSeconds = 60;
constexpr std::int64_t kHourSeconds = 60 * kMinuteSeconds;
constexpr std::int64_t kDaySeconds = 24 * kHourSeconds;
constexpr std::int64_t kWeekSeconds = 7 * kDaySeconds;

// More digits than any count of a user's has, and few enough for all that is reckoned with them.
constexpr std::size_t kMostDigits = 11;

std::string lowercase(std::string_view text)
{
    std::string result(text);
    for (char& letter : result) {
        if (letter >= 'A' && letter <= 'Z') {
            letter = static_cast<char>(letter - 'A' + 'a');
        }
    }
    return result;
}

// The words between blanks, in lower case.
std::vector<std::string> wordsin(std::string_view text)
{
    constexpr std::string_view kBlanks = " \t";
    std::vector<std::string> result;
    for (std::size_t begin = text.find_first_not_of(kBlanks); begin != std::string_view::npos;) {
        const std::size_t end = std::min(text.find_first_of(kBlanks, begin), text.size());
        result.push_back(lowercase(text.substr(begin, end - begin)));
        begin = text.find_first_not_of(kBlanks, end);
    }
    return result;
}

// All of `text` as a number of no more than `digits` digits.
clock_seconds number(std::string_view text, std::size_t digits = kMostDigits)
{
    std::int64_t value = 0;
    const bool plain = !text.empty() && text.size() <= digits &&
                       text.find_first_not_of("0123456789") == std::string_view::npos;
    if (!plain) {
        return std::nullopt;
    }
    std::from_chars(text.data(), text.data() + text.size(), value);
    return value;
}

// What stands before the first `sign`, which is taken away with it; all where there is none.
std::string_view taken(std::string_view& text, char sign)
{
    const std::size_t end = std::min(text.find(sign), text.size());
    const std::string_view result = text.substr(0, end);
    text.remove_prefix(std::min(end + 1, text.size()));
    return result;
}

// "14:05", "14:05:30": seconds of the day.
clock_seconds timeofday(std::string_view text)
{
    const auto signs = std::count(text.begin(), text.end(), ':');
    if (signs < 1 || signs > 2 || text.ends_with(':')) {
        return std::nullopt;
    }
    const auto hour = number(taken(text, ':'), 2);
    const auto minute = number(taken(text, ':'), 2);
    const auto second = signs == 2 ? number(text, 2) : 0;
    if (!hour || !minute || !second || *hour > 23 || *minute > 59 || *second > 59) {
        return std::nullopt;
    }
    return *hour * kHourSeconds + *minute * kMinuteSeconds + *second;
}

// The beginning of a day that the calendar has.
clock_seconds dayof(std::int64_t year, std::int64_t month, std::int64_t day)
{
    const std::chrono::year_month_day date(std::chrono::year(static_cast<int>(year)),
                                           std::chrono::month(static_cast<unsigned>(month)),
                                           std::chrono::day(static_cast<unsigned>(day)));
    if (!date.ok()) {
        return std::nullopt;
    }
    return std::chrono::sys_days(date).time_since_epoch().count() * kDaySeconds;
}

// "2026-11-21".
clock_seconds isodate(std::string_view text)
{
    if (std::count(text.begin(), text.end(), '-') != 2) {
        return std::nullopt;
    }
    const std::string_view yeartext = taken(text, '-');
    const auto year = number(yeartext, 4);
    const auto month = number(taken(text, '-'), 2);
    const auto day = number(text, 2);
    return yeartext.size() == 4 && year && month && day ? dayof(*year, *month, *day) : std::nullopt;
}

// "nov" is 11; 0 for what is no month.
std::int64_t monthof(std::string_view text)
{
    constexpr std::array<std::string_view, 12> kMonths{"jan", "feb", "mar", "apr", "may", "jun",
                                                       "jul", "aug", "sep", "oct", "nov", "dec"};
    const auto* const found = std::find(kMonths.begin(), kMonths.end(), text);
    return found == kMonths.end() ? 0 : found - kMonths.begin() + 1;
}

bool isweekday(std::string_view text)
{
    constexpr std::array<std::string_view, 7> kDays{"mon", "tue", "wed", "thu",
                                                    "fri", "sat", "sun"};
    return std::find(kDays.begin(), kDays.end(), text) != kDays.end();
}

// The present on the log's clock.
clock_seconds localclock(std::time_t when)
{
    std::tm local{};
    if (localtime_r(&when, &local) == nullptr) {
        return std::nullopt;
    }
    return timegm(&local);
}

std::int64_t beginofday(std::int64_t clock)
{
    const std::int64_t rest = clock % kDaySeconds;
    return clock - (rest < 0 ? rest + kDaySeconds : rest);
}

std::int64_t yearof(std::int64_t clock)
{
    const std::chrono::sys_days day{std::chrono::days(beginofday(clock) / kDaySeconds)};
    return static_cast<int>(std::chrono::year_month_day(day).year());
}

// "nov" "21": the last one that is no more than a day ahead, as somebody may read a log of another
// zone. It may be a leap year's.
clock_seconds dayofsomeyear(std::string_view month, std::string_view day, std::int64_t present)
{
    constexpr int kLeapYearsApart = 8;
    const auto dayofmonth = number(day, 2);
    if (monthof(month) == 0 || !dayofmonth) {
        return std::nullopt;
    }
    const std::int64_t thisyear = yearof(present);
    for (std::int64_t year = thisyear + 1; year >= thisyear - kLeapYearsApart; --year) {
        const auto begin = dayof(year, monthof(month), *dayofmonth);
        if (begin && *begin <= present + kDaySeconds) {
            return begin;
        }
    }
    return std::nullopt;
}

// Seconds of a unit; 0 for what is none.
std::int64_t unitseconds(std::string_view unit)
{
    struct unitwords {
        std::int64_t seconds;
        std::array<std::string_view, 5> words;
    };
    constexpr std::array<unitwords, 5> kUnits{{
        {1, {"s", "sec", "secs", "second", "seconds"}},
        {kMinuteSeconds, {"m", "min", "mins", "minute", "minutes"}},
        {kHourSeconds, {"h", "hr", "hrs", "hour", "hours"}},
        {kDaySeconds, {"d", "day", "days"}},
        {kWeekSeconds, {"w", "week", "weeks"}},
    }};
    for (const unitwords& each : kUnits) {
        if (!unit.empty() &&
            std::find(each.words.begin(), each.words.end(), unit) != each.words.end()) {
            return each.seconds;
        }
    }
    return 0;
}

// "2" "hours" "1" "min" before "ago"; count and unit may be one word.
clock_seconds timespan(words given)
{
    std::string joined;
    for (const std::string& each : given) {
        joined += each;
    }
    std::string_view rest = joined;
    std::int64_t seconds = 0;
    while (!rest.empty()) {
        const std::size_t digits = std::min(rest.find_first_not_of("0123456789"), rest.size());
        const auto count = number(rest.substr(0, digits));
        rest.remove_prefix(digits);
        const std::size_t letters = std::min(rest.find_first_of("0123456789"), rest.size());
        const std::int64_t unit = unitseconds(rest.substr(0, letters));
        rest.remove_prefix(letters);
        if (!count || unit == 0) {
            return std::nullopt;
        }
        seconds += *count * unit;
    }
    return seconds;
}

clock_seconds ago(words given, std::time_t now)
{
    const auto span = timespan(given);
    return span ? localclock(now - *span) : std::nullopt;
}

// A day by its words, without a time.
clock_seconds daynamed(words given, std::int64_t present)
{
    if (given.size() == 1 && given[0] == "today") {
        return beginofday(present);
    }
    if (given.size() == 1 && given[0] == "yesterday") {
        return beginofday(present) - kDaySeconds;
    }
    if (given.size() == 2) {
        return dayofsomeyear(given[0], given[1], present);
    }
    return given.size() == 1 ? isodate(given[0]) : std::nullopt;
}

// "sat" "nov" "21" "15:39:37" "2026", as the log has it.
clock_seconds stamp(words given)
{
    const auto time = timeofday(given[3]);
    const auto day = number(given[2], 2);
    const auto year = number(given[4], 4);
    if (!isweekday(given[0]) || monthof(given[1]) == 0 || !time || !day || !year) {
        return std::nullopt;
    }
    const auto date = dayof(*year, monthof(given[1]), *day);
    return date ? std::optional(*date + *time) : std::nullopt;
}

// A time, a day, or a day and a time behind it.
clock_seconds dayandtime(words given, std::int64_t present)
{
    if (const auto day = daynamed(given, present)) {
        return day;
    }
    const auto time = timeofday(given.back());
    const auto day =
        given.size() == 1 ? beginofday(present) : daynamed(given.first(given.size() - 1), present);
    return day && time ? std::optional(*day + *time) : std::nullopt;
}

// "2026-11-21t14:05" in two words.
void parted(std::vector<std::string>& given)
{
    const std::size_t sign = given.front().find('t');
    if (given.size() == 1 && sign != std::string::npos && isodate(given[0].substr(0, sign))) {
        given.push_back(given[0].substr(sign + 1));
        given[0].resize(sign);
    }
}

} // namespace

std::optional<std::int64_t> clockof(std::string_view text, std::time_t now)
{
    constexpr std::size_t kStampWords = 5;
    std::vector<std::string> given = wordsin(text);
    const auto present = localclock(now);
    if (given.empty() || !present) {
        return std::nullopt;
    }
    parted(given);
    if (given.size() == 1 && given[0] == "now") {
        return present;
    }
    if (given.size() == 1 && given[0].starts_with('@')) {
        const auto seconds = number(std::string_view(given[0]).substr(1));
        return seconds ? localclock(*seconds) : std::nullopt;
    }
    if (given.size() > 1 && given.back() == "ago") {
        return ago(words(given).first(given.size() - 1), now);
    }
    if (given.size() == kStampWords) {
        return stamp(given);
    }
    return dayandtime(given, *present);
}

} // namespace report
