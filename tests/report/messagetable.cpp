// Prints the table of messages, a form a line: level, module and text, parted by tabs. What is
// compared with the sources of the daemon.
#include <cstdio>
#include <string>

#include "message.h"

namespace {

const char* wordof(report::loglevel level)
{
    switch (level) {
    case report::loglevel::kError:
        return "ERROR";
    case report::loglevel::kInfo:
        return "INFO";
    case report::loglevel::kDebug:
        return "DEBUG";
    default:
        return "stderr";
    }
}

} // namespace

int main()
{
    for (const report::messageform& form : report::messageforms()) {
        const std::string line = std::string(wordof(form.level))
                                     .append("\t")
                                     .append(form.module)
                                     .append("\t")
                                     .append(form.text)
                                     .append("\n");
        if (std::fputs(line.c_str(), stdout) < 0) {
            return 1;
        }
    }
    return std::fflush(stdout) == 0 ? 0 : 1;
}
