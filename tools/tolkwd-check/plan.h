// What the daemon will do about each target, in seconds: reckoned with its own constants, its own
// conversions and its own commands.
#pragma once

#include <ostream>
#include <vector>

#include <nlohmann/json_fwd.hpp>

#include "daemonview.h"

namespace check {

struct targetplan {};

// The plan of each target. `refresh` is the daemon's refresh period in seconds, as globalrefresh.
// One thread.
std::vector<targetplan> makeplan(const daemonview& view, int refresh);

// Writes it in words. One thread.
void writeplan(std::ostream& out, const std::vector<targetplan>& plan, bool colour);

nlohmann::ordered_json planjson(const std::vector<targetplan>& plan);

} // namespace check
