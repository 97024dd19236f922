// The local log: one line per event, to the log file and, the same line, to standard output.
//
// The file is opened, appended to and closed for every message, so an operator can move or remove
// it at any time, and it is emptied once it has grown past 1023999 bytes. A log file that cannot
// be opened ends the process: a watchdog that nobody can hear is no watchdog.
#pragma once

#include <string>

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
    // line on standard error. Any thread; takes no lock.
    static void LogMessage(std::string module, int level, std::string message);

    // Where the messages go. Set by the constructor; read by every thread, so change it only while
    // no other thread logs.
    static std::string logFilePath;
};
