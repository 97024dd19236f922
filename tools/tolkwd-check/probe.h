// Tries each target once: its status command and its check, as the daemon runs them, and the
// figures of its process. Never starts or stops a service.
#pragma once

#include <optional>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

#include <sys/types.h>

#include <nlohmann/json_fwd.hpp>

#include "daemonview.h"
#include "finding.h"
#include "load.h"

namespace check {

// What a command said, and what the daemon makes of it.
struct commandprobe {
    std::string command;   // without the redirection of its output
    std::string firstline; // of its output
    bool readable = false; // whether there was any output file to read
    int state = -1;        // its exit status, or -1 where it did not end normally
    double seconds = 0;    // how long it took
    int result = 0;        // the daemon's generalpingresult or functionalpingresult
    std::string reason;    // fit for a terminal; empty: not known
};

// A figure of a process, and the threshold above which the service counts as busy.
struct figureprobe {
    std::optional<int> value; // nothing: it could not be read
    int threshold = 0;

    [[nodiscard]] bool busy() const noexcept { return value && *value > threshold; }
};

struct processprobe {
    int pid = 0;                // 0: pidof found none
    std::vector<uid_t> users{}; // who started the processes that it found
    bool counts = false;        // whether the daemon looks at the figures at all
    figureprobe threads;        //
    figureprobe memory;         // resident pages
    figureprobe processor;      // user ticks per second, times 1000

    [[nodiscard]] bool busy() const noexcept
    {
        return threads.busy() || memory.busy() || processor.busy();
    }
};

struct targetprobe {
    std::string name;
    std::string binarypath;
    std::string maxskips; // MaxFPSkips
    commandprobe status;
    std::optional<commandprobe> check; // nothing: there is none
    processprobe process;
};

// What a probe of these targets is going to run, and as whom, as a question to its user; nothing
// where it would run nothing. One thread.
std::optional<std::string> probequestion(const daemonview& view);

// Why these targets cannot be probed: with such a name or binarypath the shell would run something
// else than a status command or pidof, as in "web stop". Nothing where they can. One thread.
std::optional<std::string> probeobstacle(const daemonview& view);

// Runs what has to be run, one after the other, for as long as it takes, and adds to `found` what
// it shows. Gives as many results as there are targets, or none where the file does not load. The
// main thread only, without others: meanwhile the surroundings of the process are those of the
// daemon's commands (surroundings.h), and its output, which the daemon's functions log to, is lost.
// `folder`, with a slash at its end, takes the commands' output.
std::vector<targetprobe> probetargets(const daemonview& view, const std::string& folder,
                                      findings& found);

// How long the commands took, for each target.
std::vector<durations> durationsof(const std::vector<targetprobe>& probes);

// Writes the results in words; `colour`: with the terminal's colours. One thread.
void writeprobe(std::ostream& out, const std::vector<targetprobe>& probes, bool colour);

// The results for other programs: an array, in the order of the targets, of objects with
//   name       the service; this and other texts of the file or of commands as textjson() has them
//   status     what the status command did:
//     command      as the daemon runs it, without the redirection of its output
//     line         the first line of its output
//     readable     whether there was an output to read
//     exit-status  a number; null: it did not end normally
//     seconds      how long it took
//     result       "running", "not running", "unknown" (the monitor would end) or "unclear"
//     reason       why, in words
//   check      the same of the functional check, or null where there is none; its result is
//              "works", "exception", "missing" or "unclear"
//   process    the process that the daemon compares with the thresholds:
//     pid          a number; null: pidof finds none
//     counts       whether the daemon looks at it: there is a check, and MaxFPSkips is not 0
//     busy         whether one of its figures is above its threshold
//     threads, memory (resident pages), processor (user ticks per second, times 1000)
//                  each an object with value, null where it is not known, and threshold
nlohmann::ordered_json probejson(const std::vector<targetprobe>& probes);

} // namespace check
