// What the daemon reads otherwise than the file's author plainly meant it.
#pragma once

#include "daemonview.h"
#include "finding.h"
#include "sourcetext.h"

namespace check {

// Adds to `found` what differs between the daemon's reading and the plain one of the same text.
// One thread.
void checkshape(const sourcetext& source, const daemonview& view, findings& found);

} // namespace check
