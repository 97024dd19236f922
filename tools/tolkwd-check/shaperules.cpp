#include "ruletables.h"

#include <array>

namespace check {

namespace {

constexpr std::array<rule, 1> kRules{{
    {"unreadable-file", "the file cannot be read",
     "The daemon cannot open or read this file. It would write one line on standard error and "
     "watch "
     "nothing until the next refresh.",
     "tolkwd-check /etc/opt/varden/tolk/tolkwd.xlm",
     "tolkwd-check /etc/opt/varden/tolk/tolkwd.xml"},
}};

} // namespace

std::span<const rule> shaperules() noexcept
{
    return kRules;
}

} // namespace check
