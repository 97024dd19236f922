// The table of the daemon's messages, for those who look for one.
#pragma once

#include <ostream>
#include <span>

#include "message.h"

namespace report {

// Writes each form as "LEVEL MODULE MESSAGE", with blanks that would not be seen as U+2420, and its
// meaning below. One thread.
void writemessages(std::ostream& out, std::span<const messageform> forms);

} // namespace report
