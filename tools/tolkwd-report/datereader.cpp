#include "datereader.h"

#include <chrono>
#include <string_view>

namespace report {

namespace {

constexpr std::size_t kHourBytes = 14; // "Sat Nov 21 15:"
constexpr std::size_t kYearAt = 19;    // " 2026"
constexpr std::size_t kYearBytes = datereader::kDateBytes - kYearAt;

constexpr std::int64_t kHourSeconds = 3600;
constexpr std::int64_t kDaySeconds = 86400;

constexpr std::string_view kDays = "SunMonTueWedThuFriSat";
constexpr std::string_view kMonths = "JanFebMarAprMayJunJulAugSepOctNovDec";
constexpr std::size_t kNameBytes = 3;
constexpr int kFirstYear = 1900; // asctime's

// Which of the words of three letters; none where it is none of them.
std::optional<unsigned> wordin(std::string_view words, std::string_view word)
{
    for (std::size_t place = 0; place < words.size(); place += kNameBytes) {
        if (words.substr(place, kNameBytes) == word) {
            return static_cast<unsigned>(place / kNameBytes);
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
    const auto month = wordin(kMonths, hour.substr(4, kNameBytes));
    const int dayofmonth = numberof(hour.substr(8, 2), true);
    const int hourofday = numberof(hour.substr(11, 2));
    const int yearnumber = numberof(year.substr(1));
    if (!wordin(kDays, hour.substr(0, kNameBytes)) || !month || dayofmonth < 1 || hourofday < 0 ||
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

} // namespace

// Begins with any date, so that there always is a last one.
datereader::datereader() noexcept
{
    (void)read("Thu Jan  1 00:00:00 1970");
}

std::optional<std::int64_t> datereader::hourof(const char* date) noexcept
{
    return report::hourof({date, kHourBytes}, {date + kYearAt, kYearBytes});
}

} // namespace report
