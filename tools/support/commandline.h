// A tool's command line: flags, options and arguments, each with the variable that takes its value.
// CLI11 takes many seconds to compile, so only this module includes it.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace tools {

// Returns what is wrong with a value; empty if nothing is.
using valuecheck = std::string (*)(const std::string& value);

// An option with a value, or if its name has no dash, an argument.
struct option {
    std::string name;
    std::string type; // of the value, in the help
    std::string help;
    valuecheck check = nullptr;
    bool required = false;
};

// A program or one of its sub-commands. A program has --help and --version and takes at most one
// sub-command. The variables must outlive parse(). One thread.
class commandline {
public:
    commandline(const std::string& program, const std::string& purpose);

    void addflag(const std::string& name, const std::string& help, bool& given);
    void addoption(const option& what, int& value);
    void addoption(const option& what, std::string& value);
    // An option can be repeated and takes one value each time; an argument takes all that follow.
    void addoption(const option& what, std::vector<std::string>& values);
    // parse() calls `given` if the command line names the sub-command.
    commandline addcommand(const std::string& name, const std::string& purpose,
                           const std::function<void()>& given);
    // Sets the text below the help.
    void setfooter(const std::string& text);

    // For a program: ends the process if the command line is wrong or asks for help or the version.
    // Throws std::runtime_error if the help cannot be written.
    void parse(int argc, char** argv);
    // For a program: ends the process because the command line lacks `what`.
    [[noreturn]] void refusewithout(const std::string& what) const;

private:
    explicit commandline(std::shared_ptr<CLI::App> command) noexcept;

    std::shared_ptr<CLI::App> app;
};

} // namespace tools
