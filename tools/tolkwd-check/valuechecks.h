// The parts of values.h: what commands, numbers and names say. One thread each, as there.
#pragma once

#include "daemonview.h"
#include "finding.h"

namespace check {

// What the commands of one service come to when they are run.
void checkcommands(const serviceview& view, bool monitored, findings& found);

// What the numbers of a monitored service come to.
void checknumbers(const serviceview& view, findings& found);

// Whether the names may stand where the daemon puts them, and what services share.
void checknames(const daemonview& view, findings& found);

} // namespace check
