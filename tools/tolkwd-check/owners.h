// Who runs the processes that pidof finds.
#pragma once

#include <string>
#include <vector>

#include <sys/types.h>

namespace check {

// The name of the user, fit for a terminal; "user NUMBER" where there is none. One thread.
std::string username(uid_t user);

// The users who started these processes, each once. A process whose parent is one of them, too,
// does not count: it is a worker, to which its master gave the user. One thread.
std::vector<uid_t> startersof(const std::vector<int>& processes);

} // namespace check
