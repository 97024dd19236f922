// The units of thresholds and figures in those that people think in, and numbers in words.
#pragma once

#include <string>
#include <string_view>

namespace check {

inline constexpr double kBytesPerMebibyte = 1024.0 * 1024.0;

// What a figure or threshold of the processor time comes to, in per cent of one processor: the
// daemon counts thousandths of clock ticks a second. Any thread.
double processorpercent(double figure) noexcept;

// What so many pages of memory are in bytes. Any thread.
double pagesinbytes(double pages) noexcept;

// The value with one digit behind the point, or none where that is 0. Any thread.
std::string rounded(double value);

// "1 thread", "2 threads"; the largest number is "endless". Any thread.
std::string counted(long long count, std::string_view one, std::string_view many);

// `count` in digits; the largest number is "endless". Any thread.
std::string numberwords(long long count);

} // namespace check
