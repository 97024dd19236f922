// Makes the surroundings of this process those in which the daemon runs its commands.
#pragma once

#include <array>
#include <map>
#include <optional>
#include <string>
#include <string_view>

#include <csignal>

namespace check {

// As long as it lives, commands are run as the unit and the init script have the daemon run them:
// in the folder /, with no input, answers in English, and SIGPIPE ignored. Their output goes to a
// private folder instead of the pings' folder, where a running daemon would take it for that of its
// own commands; what they and the log write besides goes to /dev/null. Then all is as it was
// before, and the private folder is gone.
//
// It changes the whole process: one at a time, and no other thread may write to the standard
// streams or use the environment while one is made or destroyed.
class surroundings {
public:
    // Raises std::system_error where the private folder cannot be made.
    surroundings();
    ~surroundings();
    surroundings(const surroundings&) = delete;
    surroundings& operator=(const surroundings&) = delete;

    // Writes `text` to the standard error of before, if that is a terminal.
    void tell(std::string_view text) const;

private:
    void setvariable(const std::string& name, const char* value);

    std::string folder;
    std::string pingfolder;
    std::map<std::string, std::optional<std::string>> variables;
    std::array<int, 3> streams{}; // copies of the standard streams; -1: it was closed
    int workingfolder = -1;       // -1: there was none to go back to
    struct sigaction pipesignal {};
};

} // namespace check
