// The states that a service is in, as far as the log tells.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

namespace report {

// In the order in which trouble is listed: the worst last.
enum class state : std::uint8_t {
    kUp,
    kBusy,                 // over a threshold: it runs, its checks are skipped
    kNotWatched,           // no thread watches it: not in the configuration, or none is in force
    kCommandNotRecognised, // it runs, its check cannot be run
    kSuspect,              // its status command failed and is being retried
    kFunctionalFailure,    // its check failed and is being retried
    kRecovering,           // stopped and started because of its status
    kFunctionalRecovering, // stopped and started because of its check
    kUnknownService,       // its status command does not know it; no thread watches it any more
    kGaveUp,               // recovered in vain; no thread watches it any more
};

inline constexpr std::size_t kStates = 10;

// As users write and read it: "functional-failure".
std::string_view wordof(state which) noexcept;

// Whether the service counts as unavailable in this state: suspect, functional-failure, both
// recoveries, unknown-service and gave-up.
constexpr bool isoutage(state which) noexcept
{
    return which >= state::kSuspect;
}

// Whether somebody should look: an outage, or command-not-recognised.
constexpr bool istrouble(state which) noexcept
{
    return which >= state::kCommandNotRecognised;
}

} // namespace report
