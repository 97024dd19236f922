// The rules: what the checker looks for, told for operators. The manual page has a line for each,
// tests/check/rules a folder.
#pragma once

#include <span>
#include <string_view>

namespace check {

struct rule {
    std::string_view name;        // as --allow and --explain take it
    std::string_view summary;     // one line
    std::string_view explanation; // a paragraph: what the daemon does, and what to do
    std::string_view wrong;       // a piece of a file, or a command, that breaks it
    std::string_view right;       // the same mended
};

// All of them, by name. Any thread.
std::span<const rule> allrules() noexcept;

// Whether there is one of this name. Any thread.
bool isrule(std::string_view name) noexcept;

// The rule of this name; raises std::out_of_range where there is none. Any thread.
const rule& rulenamed(std::string_view name);

} // namespace check
