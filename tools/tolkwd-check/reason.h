// Why the daemon understands an answer as it does, in words. What it understands is for its own
// functions to say (ratestatus and rateanswer of wdmonitorthread_linux.h); here only the words are
// looked for that made them say so.
#pragma once

#include <string>

namespace check {

struct reason {
    int verdict;      // what the words lead to: a generalpingresult or functionalpingresult
    std::string text; // such as: contains "not" inside "cannot", and "running"
};

// For the first line of a status command's output and its exit status, -1 where it did not end
// normally. The text is fit for a terminal. Any thread.
reason statusreason(const std::string& line, int state);

// For the first line that a check printed. Any thread.
reason answerreason(const std::string& line);

} // namespace check
