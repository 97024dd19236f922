// What all pages have in common: everything but the data. The build puts it together from the files
// in page/ and from d3 (page/embed.cmake), and makes this module's source of it.
#pragma once

#include <string_view>

namespace report {

// The page up to its data, and from there to its end. Any thread.
std::string_view pagebeforedata() noexcept;
std::string_view pageafterdata() noexcept;

} // namespace report
