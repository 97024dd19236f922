// A file that is replaced atomically.
#pragma once

#include <functional>
#include <ostream>
#include <string>
#include <vector>

namespace report {

// Has `write` write a new file beside `name`, which then replaces the file of that name: a reader
// sees the old one or the new one, never a part. The new one has the mode, the owner and the group
// of the old one as far as this user may set them; a group that cannot be kept leaves group and
// others what both had. "-" is standard output; what exists and is not a regular file is written
// to. Symbolic links are followed.
//
// Throws std::system_error or std::runtime_error with the name, and leaves the old file as it is,
// where that cannot be done, where the file is one of `inputs`, names of logs as readlogs() takes
// them, and where root would follow another user's symbolic link. One thread.
void writewhole(const std::string& name, const std::vector<std::string>& inputs,
                const std::function<void(std::ostream&)>& write);

} // namespace report
