// Makes the surroundings of this process those in which the daemon runs its commands.
#pragma once

#include <array>
#include <map>
#include <optional>
#include <string>
#include <string_view>

#include <csignal>

namespace check {

// A private folder for the output of commands, gone when this is.
class outputfolder {
public:
    // Raises std::system_error where it cannot be made.
    outputfolder();
    ~outputfolder();
    outputfolder(const outputfolder&) = delete;
    outputfolder& operator=(const outputfolder&) = delete;

    // With a slash at its end.
    [[nodiscard]] const std::string& path() const noexcept { return folder; }

private:
    std::string folder;
};

// As long as it lives, commands are run as the unit and the init script have the daemon run them:
// in the folder /, with no input, answers in English, and SIGPIPE ignored. Their output goes to
// another folder than the pings' one, where a running daemon would take it for that of its own
// commands; what they and the log write besides goes to /dev/null. Then all is as it was before.
//
// It changes the whole process: one at a time, and no other thread may write to the standard
// streams or use the environment while one is made or destroyed.
class surroundings {
public:
    // `folder`: for the commands' output, with a slash at its end.
    explicit surroundings(const std::string& folder);
    ~surroundings();
    surroundings(const surroundings&) = delete;
    surroundings& operator=(const surroundings&) = delete;

    // Writes `text` to the standard error of before, if that is a terminal.
    void tell(std::string_view text) const;

private:
    void setvariable(const std::string& name, const char* value);

    std::string pingfolder;
    std::map<std::string, std::optional<std::string>> variables;
    std::array<int, 3> streams{}; // copies of the standard streams; -1: it was closed
    int workingfolder = -1;       // -1: there was none to go back to
    struct sigaction pipesignal {};
};

} // namespace check
