// Whether pings and checks leave the write lock a chance: whether a recovery gets its turn.
#pragma once

#include <optional>
#include <vector>

#include "daemonview.h"
#include "finding.h"

namespace check {

// How long the commands of one target took when they were tried, in seconds.
struct durations {
    double status = 0;
    std::optional<double> functional; // nothing: there is no check
};

// Adds to `found` where more pings and checks are under way at once, on average, than recoveries
// can bear. `measured` has an entry for each target, or none at all: then guesses take its place.
// One thread.
void checkload(const daemonview& view, const std::vector<durations>& measured, findings& found);

} // namespace check
