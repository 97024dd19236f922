// What stands before a message in its line: "Sat Nov 21 15:39:37 2026 ERROR wdmanager|TID1234 ".
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "datereader.h"
#include "recogniser.h"

namespace report {

// What stands in each line's head, between its level and module and its thread.
inline constexpr std::string_view kThreadMark = "|TID";

struct linehead {
    std::int64_t clock = 0; // as instant::clock
    speakerid who = recogniser::kNobody;
    std::string_view thread{}; // its digits
    std::size_t bytes = 0;     // the head's length
};

// The number that digits make, which fits.
std::uint64_t numberof(std::string_view digits) noexcept;

// One thread's. What it tells of a text depends on that text only.
class headreader {
public:
    // Whether `text` begins with a head, and which. A head holds no newline.
    [[nodiscard]] bool read(std::string_view text, linehead& head) noexcept;

    // Where in `text` the first head begins; npos where there is none.
    [[nodiscard]] std::size_t find(std::string_view text) noexcept;

private:
    const recogniser& known = recogniser::ofall();
    datereader dates;
};

} // namespace report
