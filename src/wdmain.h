// Start-up: the wait for the installer, the command line, and the program's entry. The only place
// where the daemon is put together. All of it runs once, on the main thread, before any other
// thread exists.
#pragma once

#include <string>
#include <vector>

#include "wdsettings.h"

// 1 when both the installation and the marker that the daemon itself sets exist, else 0.
int isInstalledNX();

// Waits, 60 seconds at a time, until the installer's pid file is gone. Returns the last access()
// result, never 0.
int wd_postpone();

// Fills the settings from the command line. Ends the process with status 2, after a message on
// standard error, when the value of an option is missing or is another option's word.
void parseArg(int argc, char** argv);

// The index of the first of `arguments` that equals `name`, or -1.
int findarg(std::string name, std::vector<std::string> arguments);

// Ends the process with status 2, after a message on standard error, when a path is missing. A
// refresh period below 120 seconds becomes 10800.
void checkParsed();

// Sets the folder of the pings' output files.
void set_tmp_file_path();
