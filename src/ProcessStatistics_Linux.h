// Resource figures of one running program, read from /proc and compared with thresholds, so that a
// busy service is not disturbed by functional checks; and the helpers around it (Utility).
//
// Thresholds have no "off": 0, which is also what an absent or non-numeric setting gives, is
// exceeded by any positive figure. Every live process has a thread, so a service without a
// ThresholdThreadCount is always over its thresholds.
#pragma once

#include <cstdio>
#include <memory>
#include <string>
#include <vector>

// Shell commands, process ids and text. No state; every function may be called from any thread.
class Utility {
public:
    // Runs `command` through the shell, waits until it has closed its output and leaves what it
    // printed on standard output in `output`. 0 when the command was started, whatever became of
    // it; 1 when it could not be, `output` then being left as it was.
    static int exec(std::string command, std::string& output);

    // What pidof prints for `program`, a name or a path: ids separated by blanks and a newline, or
    // nothing. Looks for the path as it is, then for its last component.
    static std::string pidof(std::string program);

    // The decimal integer at the start of `text` after white space; 0 where there is none, the
    // nearest int where it does not fit.
    static int str2int(std::string text);

    // Appends the pieces of `text` between `separator`s to `pieces` and returns `pieces`. Two
    // separators in a row enclose an empty piece; one at the very end is followed by none.
    static std::vector<std::string>& split2(const std::string& text, char separator,
                                            std::vector<std::string>& pieces);

    // The same pieces in a vector of their own.
    static std::vector<std::string> split(const std::string& text, char separator);

    struct StreamCloser {
        void operator()(std::FILE* stream) const noexcept;
    };
    using InputFile = std::unique_ptr<std::FILE, StreamCloser>;

    // `path` opened for reading, or null. Close-on-exec: the services that the daemon starts
    // inherit none of its files.
    static InputFile OpenToRead(const std::string& path);
};

// Belongs to one service record and is used by the one monitor thread that owns it: no lock.
// Copied with its record.
class ProcessStatistics {
public:
    ProcessStatistics() = default;
    // `program` as for SetName.
    explicit ProcessStatistics(std::string program);

    // What the process is looked up by: a program name or the path of its executable.
    void SetName(std::string program);

    // Thresholds as the configuration's text; text without a number is 0.
    void SetThresholdAverageCPUUsage(std::string text); // as averageCPUUsage
    void SetThresholdThreadCount(std::string text);     // threads
    void SetThresholdMemoryUsage(std::string text);     // pages

    [[nodiscard]] int GetThresholdAverageCPUUsage() const noexcept;
    [[nodiscard]] int GetThresholdThreadCount() const noexcept;
    [[nodiscard]] int GetThresholdMemoryUsage() const noexcept;

    // The figures of the last Refresh that could read them.
    [[nodiscard]] int GetAverageCPUUsage() const noexcept;
    [[nodiscard]] int GetNumberOfThreads() const noexcept;
    [[nodiscard]] int GetMemoryUsage() const noexcept;

    // Looks the process up again; a new id, or none (0), makes the next Refresh a fresh baseline.
    void UpdatePID();

    // Replaces `fields` by the blank-separated fields of the process's stat file, however many
    // there are, and returns 0. Where the file cannot be opened: logs an ERROR, leaves `fields`
    // alone and returns 1.
    int FetchStatisticsFromSystem(std::vector<std::string>& fields);

    // Takes new figures and returns 0. Where the stat file cannot be opened or is too short to
    // hold them: an ERROR in the log, 1, and nothing changes.
    int Refresh();

    // Looks the process up, takes new figures and tells whether one of them is above its
    // threshold. Decides on the last figures where no new ones are to be had.
    bool IsThresholdReached();

private:
    int averageCPUUsage = 0; // user-mode clock ticks per second between the last two refreshes,
                             // times 1000: at 100 ticks a second, 1000 is 1 % of a processor
    int numberOfThreads = 0;
    int memoryUsage = 0;              // resident set, pages
    int thresholdAverageCPUUsage = 0; // as averageCPUUsage
    int thresholdThreadCount = 0;
    int thresholdMemoryUsage = 0; // pages
    std::string name;
    int pid = -1;
    int lastRefreshTime = 0; // seconds since the epoch; 0: no baseline yet
    int lastUserTime = 0;    // clock ticks at that time
};
