// How the tools speak to a terminal, and to what is none.
#pragma once

#include <string>
#include <string_view>

namespace tools {

// Switch the terminal's colours, and back.
inline constexpr std::string_view kPlain = "\033[m";
inline constexpr std::string_view kBold = "\033[1m";
inline constexpr std::string_view kRed = "\033[1;31m";
inline constexpr std::string_view kGreen = "\033[1;32m";
inline constexpr std::string_view kYellow = "\033[1;33m";
inline constexpr std::string_view kMagenta = "\033[1;35m";
inline constexpr std::string_view kCyan = "\033[1;36m";
inline constexpr std::string_view kFaint = "\033[2m";

// Exit statuses of the tools beside those of their answers, as sysexits numbers them.
inline constexpr int kUsageStatus = 64;
inline constexpr int kFailureStatus = 70; // of the tool itself, not of what it looked at

// Whether standard output is a terminal that shows colours, and NO_COLOR does not forbid them. Any
// thread, while none changes the environment.
bool colourwanted();

// `text` between the switch to `colour` and the one back, or alone where colours are not `wanted`.
// Any thread.
std::string coloured(std::string_view colour, std::string_view text, bool wanted);

// `status`, once everything written to std::cout has been taken; throws std::runtime_error if it
// has not. One thread.
int delivered(int status);

} // namespace tools
