// What the logs tell, read once from beginning to end.
#pragma once

#include <functional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "logreader.h"
#include "tracker.h"

namespace report {

// A log cannot be read; what() names it and tells why, fit for a terminal.
class unreadablelog : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

// Whether any message that was read has a time; what goes to standard error has none.
inline bool hastime(const readcount& count) noexcept
{
    return count.last != instant{};
}

struct overview {
    std::vector<std::string> files{}; // as they were given
    readcount count{};
    serviceid services = 0; // how many there are, in the order in which the log names them
    std::function<std::string_view(serviceid)> nameof{}; // one's name
    std::function<account(serviceid)> accountof{};       // and all that is known of it
    bool loadfailed = false;                             // see tracker
    instant judged{};                                    // as of when all this holds
    bool asofnow = false; // that is the present, not the log's last line
    instant present{};    // as far as the log's last line tells
};

// Reads the logs of these names and judges as of their last line, or `asofnow`, the present. What
// happens goes to `told`. Throws unreadablelog. One thread.
overview readoverview(const std::vector<std::string>& names, bool asofnow, witness told);

// Calls `reading`, in which a log's name may prove to be none. Throws unreadablelog where it throws
// std::system_error.
void readingalog(const std::function<void()>& reading);

} // namespace report
