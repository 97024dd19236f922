// The file's text in memory, and the lines and columns of its bytes.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace check {

// Both count from 1. A column is a character, or a byte that is no part of one.
struct position {
    std::size_t line;
    std::size_t column;
};

// One thread's; no lock.
class sourcetext {
public:
    explicit sourcetext(std::string text);

    [[nodiscard]] std::string_view text() const noexcept { return content; }

    // Of the byte at `place`; a place behind the end is the end. Quick for places in ascending
    // order, also in a line of megabytes.
    [[nodiscard]] position at(std::size_t place) const;

    // The line's number alone.
    [[nodiscard]] std::size_t linenumber(std::size_t place) const;

    // The line, without its end, in which `place` stands, and where it begins.
    struct line {
        std::string_view text;
        std::size_t begin;
    };
    [[nodiscard]] line lineof(std::size_t place) const;

private:
    [[nodiscard]] std::size_t lineindex(std::size_t place) const;

    std::string content;
    std::vector<std::size_t> begins; // of each line

    // How many characters of a line stand before a place: where at() has counted to.
    struct count {
        std::size_t index = 0;
        std::size_t place = 0;
        std::size_t characters = 0;
    };
    mutable count counted;
};

// The whole content of the file `path`, or of standard input for "-"; raises std::system_error
// where it cannot be read, or is
// longer than a GiB.
std::string readwhole(const std::string& path);

} // namespace check
