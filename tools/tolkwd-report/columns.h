// Fits text into the columns of a terminal.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace report {

// How many columns of a terminal the UTF-8 `text` takes: two for a wide character, none for one
// that joins the character before it. Any thread.
std::size_t columnsof(std::string_view text);

// `text` of the log in one line that a terminal shows whole, in at most `most` columns, which are 3
// or more: what is longer is cut and ends in "...". Any thread.
std::string fitted(std::string_view text, std::size_t most);

// `text` with blanks behind it, or before it, up to `width` columns. Any thread.
std::string filledbehind(std::string text, std::size_t width);
std::string filledbefore(std::string text, std::size_t width);

// How many columns standard output has: a terminal's, but at least 80; else 80. Any thread.
std::size_t outputcolumns() noexcept;

} // namespace report
