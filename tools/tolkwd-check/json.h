// The results for other programs. The form is documented in tolkwd-check(8).
#pragma once

#include <ostream>
#include <string>
#include <vector>

#include <nlohmann/json_fwd.hpp>

#include "daemonview.h"
#include "finding.h"
#include "plan.h"
#include "probe.h"
#include "sourcetext.h"

namespace check {

// Raised whenever a member of the form changes its meaning or goes away; new ones may come.
inline constexpr int kFormatVersion = 1;

// What was found, and what the daemon reads. One thread.
nlohmann::ordered_json resultjson(const std::string& name, const sourcetext& source,
                                  const daemonview& view, const std::vector<finding>& found);

// Writes the same, with the plan and the probe unless they are null. One thread.
void writeresult(std::ostream& out, const std::string& name, const sourcetext& source,
                 const daemonview& view, const std::vector<finding>& found,
                 const std::vector<targetplan>* plan, const std::vector<targetprobe>* probes);

} // namespace check
