// What the values lead to that nobody can have wanted: looked at as the daemon got them.
#pragma once

#include "daemonview.h"
#include "finding.h"

namespace check {

// Adds to `found` what is wrong with the records' values, whatever the machine. One thread.
void checkvalues(const daemonview& view, findings& found);

} // namespace check
