// The table of all services: how they are, since when, and what they have been through.
#pragma once

#include <cstddef>
#include <ostream>

#include "overview.h"

namespace report {

// Writes a line for each service, what needs somebody first, in so many columns, which are 80 or
// more; below it, what was read and how sure it is. `colour`: with the terminal's colours. One
// thread.
void writestatus(std::ostream& out, const overview& seen, std::size_t columns, bool colour);

// The exit status: 1 where somebody should look at a service or nothing is watched for want of a
// configuration or of any service, else 0.
int statusof(const overview& seen);

} // namespace report
