// The local log: one line per event, to the log file and, the same line, to standard output.
//
// The file is opened, appended to and closed for every message, so an operator can move or remove
// it at any time, and it is emptied once it has grown past 1023999 bytes. A log file that cannot
// be opened ends the process: a watchdog that nobody can hear is no watchdog. All that the daemon
// itself writes to standard output and standard error goes through here, too.
#pragma once

#include <string>
#include <string_view>

// Levels of LogMessage. Any other number is written with an empty level word.
enum loglevel : int {
    kLevelDebug = -1, // written only while debugenable is set
    kLevelInfo = 0,
    kLevelError = 1,
};

class wdLocalLog {
public:
    // Sends all further messages of the process to the file `path`. Call it while no other thread
    // logs.
    explicit wdLocalLog(const std::string& path);

    // Writes one line: local time, level word, `module` + "|TID" + thread id, `message` as it is.
    // A message of level kLevelDebug is dropped unless debugenable is set, but the file is opened
    // (and emptied, if it is over its limit) all the same. A failing write is not reported: the
    // daemon carries on. A file that cannot be opened ends the process with status 200 after one
    // line on standard error. Any thread; threads take turns on a standard output that somebody
    // reads, and on no file.
    static void LogMessage(std::string module, int level, std::string message);

    // Where the messages go. Set by the constructor; read by every thread, so change it only while
    // no other thread logs.
    static std::string logFilePath;
};

// Writes `text` to `fd`, which is standard output or standard error, and never lets whoever should
// read it stop or end the daemon. A reader that has stopped reading is waited for 5 seconds; then
// what there is no room for, be it the rest of a line, is left out until there is room again. A
// reader that has gone is replaced by /dev/null. Other failures are not reported. Any thread; they
// take turns.
void writestandard(int fd, std::string_view text);
