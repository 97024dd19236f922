// The two records that carry what the configuration says: one service, and one unit of monitoring.
//
// Plain values, copied freely: the lists of the reader, the manager's list and every monitor
// thread hold copies of their own (which share their texts, see wdtext.h). All values stay the text
// that the file gave; whoever needs a number converts it at each use, and text without a number
// counts as 0 there. Two service records denote the same service when their names are equal byte
// for byte.
#pragma once

#include <string>
#include <vector>

#include "ProcessStatistics_Linux.h"
#include "wdtext.h"

// The text that stands for "nothing is configured" in a command. An empty command is not that.
inline constexpr const char* kNoCommand = "NULL";

// The sixteen texts are named by their configuration keys.
struct service {
    wdtext name;
    wdtext binarypath; // executable: path or name
    wdtext startcmd;
    wdtext stopcmd;
    wdtext functionalpingcmd;
    wdtext genpinginterval;    // seconds
    wdtext funpinginterval;    // seconds
    wdtext maxattemptofwakeup; // recoveries before the monitor gives up
    wdtext messageformat;      // listed only
    wdtext hackmessagehandler; // kept only
    wdtext sendmessagehandler; // kept only
    wdtext MaxFPSkips;         // functional pings that may be skipped in a row
    wdtext ThresholdAverageCPUUsage;
    wdtext ThresholdMemoryUsage; // pages
    wdtext ThresholdThreadCount;
    wdtext ThresholdHandleCount;  // listed only
    ProcessStatistics statistics; // of the running process; no configuration key
};

struct wdmonitortarget {
    service monitoredservice;
    std::vector<service> dependentservices; // in file order, which is the order of recovery
};
