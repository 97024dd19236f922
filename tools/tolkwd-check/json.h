// The results for other programs. The form is documented in tolkwd-check(8).
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include <nlohmann/json.hpp>

#include "daemonview.h"
#include "finding.h"
#include "sourcetext.h"

namespace check {

// Raised whenever a member of the form changes its meaning or goes away; new ones may come.
inline constexpr int kFormatVersion = 1;

// A text of the file: a string, or where it is not UTF-8, an object with its bytes in hexadecimal
// digits as "hex". Any thread.
nlohmann::ordered_json textjson(std::string_view text);

// What was found, and what the daemon reads. One thread.
nlohmann::ordered_json resultjson(const std::string& name, const sourcetext& source,
                                  const daemonview& view, const std::vector<finding>& found);

} // namespace check
