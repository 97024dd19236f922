// Text of a stranger's file, made fit for a terminal: what could steer it is written out.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace tools {

// `text` with control characters, invisible characters that change the direction or the look of
// text, and bytes that are not UTF-8 as \xNN or \u{NNNN}. A tab stays, for it keeps what stands
// below it in line; all else is one line. Any thread.
std::string printable(std::string_view text);

// The same without the tab, for a message: `text` of more than 60 characters is cut and ends in
// "...". Any thread.
std::string brief(std::string_view text);

// The same in quotes. Any thread.
std::string inquotes(std::string_view text);

// How many characters `text` has; a byte that is not UTF-8 counts as one. Any thread.
std::size_t characters(std::string_view text) noexcept;

// Whether all of `text` is UTF-8. Any thread.
bool isutf8(std::string_view text) noexcept;

} // namespace tools
