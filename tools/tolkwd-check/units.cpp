#include "units.h"

#include <array>
#include <cstdio>
#include <limits>

#include <unistd.h>

namespace check {

namespace {

constexpr double kThousandths = 1000;
constexpr double kPercent = 100;

} // namespace

double processorpercent(double figure) noexcept
{
    return figure * kPercent / (kThousandths * static_cast<double>(sysconf(_SC_CLK_TCK)));
}

double pagesinbytes(double pages) noexcept
{
    return pages * static_cast<double>(sysconf(_SC_PAGESIZE));
}

std::string rounded(double value)
{
    std::array<char, 64> text{};
    (void)std::snprintf(text.data(), text.size(), "%.1f", value);
    std::string number = text.data();
    if (number.ends_with(".0")) {
        number.resize(number.size() - 2);
    }
    return number;
}

std::string counted(long long count, std::string_view one, std::string_view many)
{
    return numberwords(count).append(" ").append(count == 1 ? one : many);
}

std::string numberwords(long long count)
{
    return count == std::numeric_limits<long long>::max() ? "endless" : std::to_string(count);
}

} // namespace check
