// The answers for other programs. The form is documented in tolkwd-report(1).
#pragma once

#include <string>
#include <string_view>

#include <nlohmann/json.hpp>

#include "overview.h"
#include "tracker.h"

namespace report {

// Raised whenever a member of the form changes its meaning or goes away; new ones may come.
inline constexpr int kFormatVersion = 1;

// All that the table tells, and more. One thread.
nlohmann::ordered_json statusjson(const overview& seen);

// `what`, of the service `name`, null for none, in these `words`. Any thread.
nlohmann::ordered_json eventjson(const event& what, const std::string* name,
                                 std::string_view words);

// `document` as text that steers no terminal, in lines with an indent of `indent` blanks, or in one
// line where that is -1. One thread.
std::string textof(const nlohmann::ordered_json& document, int indent);

} // namespace report
