#include "instant.h"

#include <array>
#include <chrono>
#include <string_view>

namespace report {

namespace {

constexpr std::uint64_t kMinuteSeconds = 60;
constexpr std::uint64_t kHourSeconds = 3600;
constexpr std::uint64_t kDaySeconds = 86400;

// Filled up with zeros to at least `digits`.
template <typename Number>
std::string padded(Number value, std::size_t digits)
{
    const std::string text = std::to_string(value);
    return text.size() < digits ? std::string(digits - text.size(), '0') + text : text;
}

std::string datetext(const instant& when, std::string_view between)
{
    using std::chrono::floor;
    const std::chrono::sys_seconds moment{std::chrono::seconds(when.clock)};
    const auto day = floor<std::chrono::days>(moment);
    const std::chrono::year_month_day date(day);
    const std::chrono::hh_mm_ss time(moment - day);
    return padded(static_cast<int>(date.year()), 4)
        .append("-")
        .append(padded(static_cast<unsigned>(date.month()), 2))
        .append("-")
        .append(padded(static_cast<unsigned>(date.day()), 2))
        .append(between)
        .append(padded(time.hours().count(), 2))
        .append(":")
        .append(padded(time.minutes().count(), 2))
        .append(":")
        .append(padded(time.seconds().count(), 2));
}

struct unit {
    std::uint64_t seconds;
    std::string_view name;
};

constexpr std::array<unit, 4> kUnits = {
    {{kDaySeconds, " d"}, {kHourSeconds, " h"}, {kMinuteSeconds, " min"}, {1, " s"}}};

} // namespace

std::string clocktext(const instant& when)
{
    return datetext(when, " ");
}

std::string isotext(const instant& when)
{
    return datetext(when, "T");
}

std::string spantext(std::int64_t seconds)
{
    std::string text = seconds < 0 ? "-" : "";
    const auto bits = static_cast<std::uint64_t>(seconds);
    const std::uint64_t length = seconds < 0 ? 0 - bits : bits;
    std::size_t largest = 0;
    while (largest + 1 < kUnits.size() && length < kUnits.at(largest).seconds) {
        ++largest;
    }
    const unit& whole = kUnits.at(largest);
    text.append(std::to_string(length / whole.seconds)).append(whole.name);
    if (largest + 1 < kUnits.size()) {
        const unit& part = kUnits.at(largest + 1);
        const std::uint64_t rest = length % whole.seconds / part.seconds;
        if (rest > 0) {
            text.append(" ").append(std::to_string(rest)).append(part.name);
        }
    }
    return text;
}

} // namespace report
