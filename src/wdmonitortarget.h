// The two records that carry what the configuration says: one service, and one unit of monitoring.
//
// Plain values, copied freely: the lists of the reader, the manager's list and every monitor
// thread hold copies of their own. All values stay the text that the file gave; they are converted
// at each use, and text without a number counts as 0 there. Two service records denote the same
// service when their names are equal byte for byte.
#pragma once

#include <string>
#include <vector>

#include "ProcessStatistics_Linux.h"

// The text that stands for "nothing is configured" in a command. An empty command is not that.
inline constexpr const char* kNoCommand = "NULL";

// The sixteen texts are named by their configuration keys. The braces allow service{.name = "web"}
// without a warning.
struct service {
    std::string name{};
    std::string binarypath{}; // executable: path or name
    std::string startcmd{};
    std::string stopcmd{};
    std::string functionalpingcmd{};
    std::string genpinginterval{};    // seconds
    std::string funpinginterval{};    // seconds
    std::string maxattemptofwakeup{}; // recoveries before the monitor gives up
    std::string messageformat{};      // listed only
    std::string hackmessagehandler{}; // kept only
    std::string sendmessagehandler{}; // kept only
    std::string MaxFPSkips{};         // functional pings that may be skipped in a row
    std::string ThresholdAverageCPUUsage{};
    std::string ThresholdMemoryUsage{}; // pages
    std::string ThresholdThreadCount{};
    std::string ThresholdHandleCount{}; // listed only
    ProcessStatistics statistics{};     // of the running process; no configuration key
};

struct wdmonitortarget {
    service monitoredservice{};
    std::vector<service> dependentservices{}; // in file order, which is the order of recovery
};
