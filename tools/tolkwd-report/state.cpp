#include "state.h"

namespace report {

namespace {

constexpr std::array<std::string_view, kStates> kWords{
    "up",
    "busy",
    "not-watched",
    "command-not-recognised",
    "suspect",
    "functional-failure",
    "recovering",
    "functional-recovering",
    "unknown-service",
    "gave-up",
};

} // namespace

std::string_view wordof(state which) noexcept
{
    return kWords.at(static_cast<std::size_t>(which));
}

} // namespace report
