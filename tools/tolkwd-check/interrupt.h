// Lets the user end a work that runs commands, however long these take: system() keeps the signals
// of the keyboard from whoever waits for a command, and a command may not get or heed them either.
#pragma once

#include <functional>

namespace check {

// Runs `work` in a thread of its own, waits for its end, and then runs `tidy`; what `work` raises
// is passed on. `work` is given a function that it calls before each of its steps, and returns
// where that says no: there was an interrupt.
//
// SIGINT, SIGTERM and SIGHUP, unless they are ignored, are interrupts. `work` is then waited for no
// longer than a second, `tidy` is run, and the process ends with the signal's number and 128 as its
// status, without any destructor. The main thread only, one call at a time; SIGUSR1 is taken
// meanwhile.
void workuntilinterrupted(const std::function<void(const std::function<bool()>&)>& work,
                          const std::function<void()>& tidy);

} // namespace check
