// A file that is there as a whole or not at all.
#pragma once

#include <functional>
#include <ostream>
#include <string>

namespace report {

// Has `write` write a new file beside `name`, which then takes the place of what had that name: a
// reader sees the old one or the new one, never a part. "-" is standard output; what is there and
// is no plain file is written to. Throws std::system_error with the name, and leaves the old one,
// where that cannot be done. One thread.
void writewhole(const std::string& name, const std::function<void(std::ostream&)>& write);

} // namespace report
