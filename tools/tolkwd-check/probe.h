// Tries each target once: its status command and its check, as the daemon runs them, and the
// figures of its process. Never starts or stops a service.
#pragma once

#include <ostream>
#include <vector>

#include <nlohmann/json_fwd.hpp>

#include "daemonview.h"
#include "finding.h"
#include "load.h"

namespace check {

struct targetprobe {};

// Runs what has to be run, for as long as it takes, and adds to `found` what it shows. The main
// thread only: the daemon's functions log to standard output, which is kept from them meanwhile.
std::vector<targetprobe> probetargets(const daemonview& view, findings& found);

// How long the commands took, for each target.
std::vector<durations> durationsof(const std::vector<targetprobe>& probes);

// Writes the results in words. One thread.
void writeprobe(std::ostream& out, const std::vector<targetprobe>& probes, bool colour);

nlohmann::ordered_json probejson(const std::vector<targetprobe>& probes);

} // namespace check
