// From logs to events, also as they come.
#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "logreader.h"
#include "tracker.h"

namespace report {

// What happened, and the service's name, null for none. Both live until it returns.
using eventlistener = std::function<void(const event&, const std::string*)>;

// Reads the logs of these names and tells what happened up to their last line, and then the name of
// each service to `named`. Throws unreadablelog. One thread.
void readhistory(const std::vector<std::string>& names, wanted which, const eventlistener& told,
                 const std::function<void(std::string_view)>& named);

// The same, but goes on with the last one of the logs as it grows, as long as `proceed` says.
// `caughtup` is called when there is nothing more for now. What silence proves is told only where
// the log has an end, as a stream has.
void followhistory(const std::vector<std::string>& names, wanted which, const eventlistener& told,
                   const std::function<void()>& caughtup, const std::function<bool()>& proceed);

} // namespace report
