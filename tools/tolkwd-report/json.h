// The answers for other programs. The form is documented in tolkwd-report(1).
#pragma once

#include <ostream>
#include <string>
#include <string_view>

#include "overview.h"
#include "tracker.h"

namespace report {

// Raised whenever a member of the form changes its meaning or goes away; new ones may come.
inline constexpr int kFormatVersion = 1;

// Writes all that the table tells, and more, as indented lines, one service after the other. Steers
// no terminal. One thread.
void writestatusjson(std::ostream& out, const overview& seen);

// `what`, of the service `name`, null for none, in these `words`, as one line, which begins with
// the version of the form if `withversion`. Steers no terminal. Any thread.
std::string eventjson(const event& what, const std::string* name, std::string_view words,
                      bool withversion);

} // namespace report
