// The supervisor on the main thread: loads the configuration, runs one monitor thread per target,
// and every globalrefresh seconds stops them all, reads the configuration afresh and starts a new
// generation. A monitor that gave up is revived by this. Owns the life of the lock `pingreclock`.
#pragma once

#include <string>
#include <vector>

#include "wdLocalLog_linux.h"
#include "wdmonitortarget.h"
#include "wdmonitorthread_linux.h"

// For the main thread only. Takes no lock.
class wdmanager {
public:
    // Sends the log to `log`, loads `config` and lets monitor threads run.
    wdmanager(std::string config, std::string log);

    // The same without touching the log, whose path must have been set before.
    explicit wdmanager(const char* config);

    // Does not join: the monitor threads must have ended.
    ~wdmanager() = default;
    wdmanager(const wdmanager&) = delete;
    wdmanager& operator=(const wdmanager&) = delete;

    // Reads `path` and takes over its targets. Where that fails: an ERROR line, and the targets
    // stay as they were.
    void loadservices(std::string path);

    // Forgets all targets and loads the configuration again. Always 1.
    int refreshconfig();

    // Supervises, one-second tick by tick. Does not return; ends the main thread through
    // pthread_exit, before any monitor thread of the generation exists, when the lock cannot be
    // made.
    void wdstart();

private:
    void startgeneration();
    void stopgeneration();

    std::string configfile;
    std::vector<wdmonitortarget> targets; // until the threads of a generation take them over

    // Running threads work on these very elements: all are here before the first one starts, and
    // the vector stays as it is until all are joined.
    std::vector<wdmonitorthread> threads;

    wdLocalLog* locallog = nullptr; // only made to set the path; never deleted
    std::string logpath;            // like configfile, what this manager was started with
};
