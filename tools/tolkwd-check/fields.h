// The values of a record as the checks look at them: which its own service wrote, where they stand,
// and whether the daemon does anything with them.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "daemonview.h"

namespace check {

using field = std::string service::*;

// As the configuration names it. Any thread.
std::string_view fieldname(field which) noexcept;

// Whether this very service wrote the value: it was not carried over, and no empty element took it
// from elsewhere. Any thread.
bool isown(const serviceview& view, field which) noexcept;

// Where the value stands; the service's own place where it is not its own. Any thread.
std::size_t placeof(const serviceview& view, field which) noexcept;

// "FIELD of NAME" and "FIELD of NAME is VALUE", for messages. Any thread.
std::string fieldof(const serviceview& view, field which);
std::string valueof(const serviceview& view, field which);

// With four digits that count at most. Any thread.
std::string shortnumber(double value);

// Whether a functional check is made at all. Any thread.
bool ischecked(const service& record);

// Whether the daemon compares the thresholds and looks at the program: for a check that may be left
// out. Any thread.
bool looksatthresholds(const service& record);

// Whether the value is a spelling of "no command" other than the daemon's own, so that it would be
// run. Any thread.
bool isnullspelling(std::string_view command);

// Whether the name is one that the shell and the folder of the pings take as it stands. Any thread.
bool isplainname(std::string_view name) noexcept;

// Whether the shell takes the path as it stands. Any thread.
bool isplainpath(std::string_view path) noexcept;

} // namespace check
