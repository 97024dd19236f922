// Where the bytes of a log come from, for those who read it.
#pragma once

#include <cstddef>
#include <functional>

namespace report {

// Puts the next bytes of a log, up to so many, to a place, and returns their number; 0 at the end.
using bytesource = std::function<std::size_t(char*, std::size_t)>;

} // namespace report
