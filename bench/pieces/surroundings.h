// What the pieces find around them: the settings, a folder, commands.
#pragma once

#include <string>

// Sends the log to `logpath`, without debug lines, and the pings' output to the working directory.
void prepare(const std::string& logpath);

// Ends the program where it cannot.
void writefile(const std::string& path, const std::string& text);

// Each part of the program names its benchmarks; `brief` leaves out the large sizes.
void registerload(bool brief);
void registerlog(bool brief);
void registerping(bool brief);
