// Whether a command seems to carry a password, by a few usual forms.
#pragma once

#include <string_view>

namespace check {

// The form in which a password seems to stand in `command`, such as: "password=" and a value. It
// names no piece of the command. Empty where there seems to be none; what the shell puts in, as
// with "$NAME" or "$(cat FILE)", is none. Any thread.
std::string_view passwordform(std::string_view command);

} // namespace check
