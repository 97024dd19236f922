// The results for other programs. The form is documented in tolkwd-check(8).
#pragma once

#include <string>
#include <vector>

#include <nlohmann/json.hpp>

#include "daemonview.h"
#include "finding.h"
#include "sourcetext.h"

namespace check {

// Raised whenever a member of the form changes its meaning or goes away; new ones may come.
inline constexpr int kFormatVersion = 1;

// What was found, and what the daemon reads. One thread.
nlohmann::ordered_json resultjson(const std::string& name, const sourcetext& source,
                                  const daemonview& view, const std::vector<finding>& found);

} // namespace check
