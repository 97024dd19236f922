// How the daemon reads numbers, told once more: white space, a sign, decimal digits, and whatever
// follows them. 0 where there is no digit, the nearest bound where the number does not fit.
#pragma once

#include <algorithm>
#include <charconv>
#include <limits>
#include <string_view>
#include <system_error>

template <typename Number>
Number leadingnumber(std::string_view text)
{
    text.remove_prefix(std::min(text.find_first_not_of(" \f\n\r\t\v"), text.size()));
    if (text.starts_with('+') && !text.starts_with("+-")) {
        text.remove_prefix(1);
    }
    Number number = 0;
    const auto error = std::from_chars(text.data(), text.data() + text.size(), number).ec;
    if (error != std::errc::result_out_of_range) {
        return number;
    }
    using Limits = std::numeric_limits<Number>;
    return text.starts_with('-') ? Limits::min() : Limits::max();
}
