// Times as users write them: "2 hours ago", "yesterday 14:00", "Nov 21 14:05".
#pragma once

#include <array>
#include <cstdint>
#include <ctime>
#include <optional>
#include <string_view>

namespace report {

// What is understood, for a refusal and for help.
inline constexpr std::array<std::string_view, 13> kTimeExamples{"\"2 hours ago\"",
                                                                "\"30 min ago\"",
                                                                "now",
                                                                "today",
                                                                "yesterday",
                                                                "\"yesterday 14:00\"",
                                                                "14:05",
                                                                "14:05:30",
                                                                "2026-11-21",
                                                                "\"2026-11-21 14:05\"",
                                                                "\"Nov 21 14:05\"",
                                                                "\"Sat Nov 21 15:39:37 2026\"",
                                                                "@SECONDS since 1970"};

// The moment that `text` names, on the log's clock (see instant); none where it is not understood.
// `now` is the present. A day without a time is its beginning, a time without a day is today's, a
// date without a year the last one that is no more than a day ahead. Any thread, while none changes
// the zone.
std::optional<std::int64_t> clockof(std::string_view text, std::time_t now);

} // namespace report
