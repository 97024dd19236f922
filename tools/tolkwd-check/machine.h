// What the configuration names and this machine does not have, or has open to others than root.
#pragma once

#include <string>

#include "daemonview.h"
#include "finding.h"

namespace check {

// Adds to `found` what this machine lacks or leaves open of what the records name. `path` is the
// file that was read, "-" for standard input. Looks at files only; runs nothing. One thread.
void checkmachine(const std::string& path, const daemonview& view, findings& found);

} // namespace check
