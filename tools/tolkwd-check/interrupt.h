// Lets the user end a work that runs commands, however long these take: system() keeps the signals
// of the keyboard from whoever waits for a command, and a command may not get or heed them either.
#pragma once

#include <functional>

namespace check {

// Runs `work` in a process of its own and returns what it returns, a status of at most 255. SIGINT,
// SIGTERM and SIGHUP, unless they are ignored, end that process at once, and so do a failure or a
// signal of its own: then 128 and the signal's number is returned, behind a line on standard error.
// Raises std::system_error where there can be no process. The main thread only, without others;
// what was written to streams before has to be flushed.
int runinterruptibly(const std::function<int()>& work);

} // namespace check
