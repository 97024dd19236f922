// What a value means to the daemon, in words.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace check {

// Whether the daemon uses this field (an index in kFieldElements) of a service at all; of a
// dependent only the name and the commands count. Any thread.
bool counts(std::size_t field, bool monitored) noexcept;

// What comes of `value` in this field where it was not written for it, such as the text of another
// element: a clause that can follow a colon. Empty where nothing special comes of it. Any thread.
std::string effectof(std::size_t field, const std::string& value);

// What to write into this field where it is empty. Any thread.
std::string_view cureofempty(std::size_t field) noexcept;

} // namespace check
