#include "commandline.h"

#include <cstdlib>
#include <utility>

#include <CLI/CLI.hpp>

#include "printable.h"
#include "terminal.h"

namespace tools {

namespace {

// CLI11 repeats every byte of a word that it does not understand.
std::string refusal(const CLI::App* /*app*/, const CLI::Error& error)
{
    return printable(error.what()) + "\nRun with --help for more information.\n";
}

template <typename Value>
CLI::Option& add(CLI::App& app, const option& what, Value& value)
{
    CLI::Option& added = *app.add_option(what.name, value, what.help);
    added.type_name(what.type)->required(what.required);
    if (what.check != nullptr) {
        added.check(what.check);
    }
    return added;
}

[[noreturn]] void end(const CLI::App& app, const CLI::ParseError& reason)
{
    std::exit(app.exit(reason) == 0 ? delivered(0) : kUsageStatus);
}

} // namespace

commandline::commandline(const std::string& program, const std::string& purpose)
    : app(std::make_shared<CLI::App>(purpose, program))
{
    app->failure_message(refusal);
}

commandline::commandline(std::shared_ptr<CLI::App> command) noexcept : app(std::move(command)) {}

void commandline::addflag(const std::string& name, const std::string& help, bool& given)
{
    app->add_flag(name, given, help);
}

void commandline::addoption(const option& what, int& value)
{
    add(*app, what, value);
}

void commandline::addoption(const option& what, std::string& value)
{
    add(*app, what, value);
}

void commandline::addoption(const option& what, std::vector<std::string>& values)
{
    CLI::Option& added = add(*app, what, values);
    added.allow_extra_args(added.get_positional());
}

commandline commandline::addcommand(const std::string& name, const std::string& purpose,
                                    const std::function<void()>& given)
{
    CLI::App* const command = app->add_subcommand(name, purpose)->callback(given);
    return commandline(app->get_subcommand_ptr(command));
}

void commandline::setfooter(const std::string& text)
{
    app->footer(text);
}

void commandline::parse(int argc, char** argv)
{
    app->set_version_flag("--version", app->get_name() + " " TOLKWD_VERSION); // below the others
    app->require_subcommand(0, 1); // a word in its place is refused by its name
    try {
        app->parse(argc, argv);
    } catch (const CLI::ParseError& reason) {
        end(*app, reason);
    }
}

void commandline::refusewithout(const std::string& what) const
{
    end(*app, CLI::RequiredError(what));
}

} // namespace tools
