// The process-wide settings. The command line (wdmain) fills them once, before any thread exists;
// everybody else only reads them. They stand apart from wdmain.h so that the log and the pings can
// read them without knowing the program's entry.
#pragma once

#include <string>

// Path of the XML configuration ("-i").
inline std::string configPath;

// Path of the local log file ("-l").
inline std::string wdlocallogpath;

// A refresh period below the least is the default. Seconds.
inline constexpr int kLeastRefreshSeconds = 120;
inline constexpr int kDefaultRefreshSeconds = 10800;

// What a refresh period of so many seconds comes to, in seconds. Any thread.
constexpr int refreshperiod(int seconds) noexcept
{
    return seconds < kLeastRefreshSeconds ? kDefaultRefreshSeconds : seconds;
}

// Refresh period in seconds ("-t"): after so many one-second ticks the configuration is read
// afresh.
inline int globalrefresh = 0;

// Whether DEBUG lines are written ("-g").
inline bool debugenable = false;

// The value of _tmp_file_path.
inline constexpr const char* kPingFolder = "/opt/varden/tolk/bin/";

// Folder, with trailing slash, of the files that capture what the pings' commands print.
// Its users know it by this name, reserved or not.
// NOLINTNEXTLINE(bugprone-reserved-identifier)
inline std::string _tmp_file_path;
