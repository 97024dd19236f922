// Where a log comes from: files in order, standard input, and one file as it grows.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include <sys/stat.h>

#include "logreader.h"

namespace report {

inline constexpr const char* kDefaultLog = "/var/log/tolkwd.log";
inline constexpr const char* kStandardInput = "-"; // in place of a log's name

// Reads the logs of these names, in order, into the reader; "-" is standard input. Throws
// std::system_error with the file's name where one cannot be read. One thread.
void readlogs(const std::vector<std::string>& names, logreader& into);

// Whether one of the logs of these names is this file, by whatever name. Any thread.
bool islog(const std::vector<std::string>& names, const struct stat& file);

// A fifth of a second, or until a signal is caught. Any thread.
void pausebetweenlooks();

// Goes on with the file `name` from its beginning, as it grows, is emptied or is replaced by
// another: all that the file holds whenever it is looked at is read. After each look that found
// something the reader is paused and `caughtup` called; `proceed` is asked before each look, and
// `pause` called behind it. Throws std::system_error where the file cannot be read at the
// beginning; a file that vanishes is waited for. What is no file, such as standard input or a named
// pipe, is read to its end, as it comes. One thread.
void followlog(const std::string& name, logreader& into, const std::function<void()>& caughtup,
               const std::function<bool()>& proceed,
               const std::function<void()>& pause = pausebetweenlooks);

} // namespace report
