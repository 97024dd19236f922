// Keeps what changes from run to run from changing the number of instructions. The program is
// linked so that the daemon's requests come by here (--wrap, in CMakeLists.txt).
//
// The clock stands still until it is set on; the process has always the same id; and the figures of
// the process under watch are read from a file that never changes. What libraries ask of the system
// by themselves is not reached, such as a clock of std::chrono.
#pragma once

// The process that `pidof` finds, and the file that is opened in place of its stat file.
inline constexpr const char* kWatchedProcess = "4242";
inline constexpr const char* kFigures = "figures";

// Sets the clock on.
void passseconds(int seconds);

// How often the figures have been opened.
int figuresopened();
