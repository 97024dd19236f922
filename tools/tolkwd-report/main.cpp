// tolkwd-report: answers from the daemon's log: what is up, what was down, since when, how often.
// The command line, and what each sub-command does.

#include <algorithm>
#include <array>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <exception>
#include <functional>
#include <iostream>
#include <iterator>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

#include <poll.h>
#include <unistd.h>

#include <fmt/format.h>
#include <fmt/ranges.h>

#include "columns.h"
#include "commandline.h"
#include "events.h"
#include "history.h"
#include "json.h"
#include "messages.h"
#include "newfile.h"
#include "overview.h"
#include "page.h"
#include "pagecontents.h"
#include "printable.h"
#include "sources.h"
#include "status.h"
#include "terminal.h"
#include "timeexpression.h"

namespace {

using namespace report;

constexpr int kUnreadableStatus = 2;
constexpr int kSignalStatus = 128;

struct options {
    std::vector<std::string> logs;
    std::vector<std::string> services;
    std::vector<std::string> kinds;
    std::string since;
    std::string until;
    std::string page;
    bool asofnow = false;
    bool all = false;
    bool follow = false;
    bool json = false;
    std::function<int(const options&)> run; // the sub-command
};

int runstatus(const options& chosen)
{
    const overview seen = readoverview(chosen.logs, chosen.asofnow, {});
    if (chosen.json) {
        writestatusjson(std::cout, seen);
    } else {
        writestatus(std::cout, seen, outputcolumns(), tools::colourwanted());
    }
    return statusof(seen);
}

// The expressions have been checked before.
eventfilter filterof(const options& chosen)
{
    eventfilter filter{.all = chosen.all};
    for (const std::string& name : chosen.services) {
        filter.services.insert(knownname(name));
    }
    for (const std::string& word : chosen.kinds) {
        if (const auto kind = eventkindof(word)) {
            filter.kinds.insert(*kind);
        }
    }
    const std::time_t now = std::time(nullptr);
    filter.since = clockof(chosen.since, now);
    filter.until = clockof(chosen.until, now);
    return filter;
}

eventform formof(const options& chosen)
{
    if (chosen.json) {
        return chosen.follow ? eventform::kLines : eventform::kDocument;
    }
    return tools::colourwanted() ? eventform::kColouredText : eventform::kText;
}

// Whether somebody can still read what is written.
bool hasreader()
{
    pollfd output{STDOUT_FILENO, 0, 0};
    return poll(&output, 1, 0) <= 0;
}

// As if it had written to a reader that is gone.
int endwithoutreader()
{
    (void)std::raise(SIGPIPE);
    return kSignalStatus + SIGPIPE; // whoever started this has it ignored
}

// A name that nobody has may be misspelt.
void noteunknown(const options& chosen, const std::set<std::string, std::less<>>& unknown)
{
    for (const std::string& name : chosen.services) {
        if (unknown.contains(knownname(name))) {
            std::cerr << "tolkwd-report: the log names no service " << tools::inquotes(name)
                      << '\n';
        }
    }
}

int runevents(const options& chosen)
{
    const eventfilter filter = filterof(chosen);
    const wanted which = filter.all || !filter.kinds.empty() ? wanted::kAll : wanted::kWhatMatters;
    eventwriter writer(std::cout, filter, formof(chosen));
    const auto told = [&writer](const event& what, const std::string* name) {
        writer.told(what, name);
    };
    if (!chosen.follow) {
        auto unknown = filter.services;
        readhistory(chosen.logs, which, told, [&unknown](std::string_view name) {
            if (const auto found = unknown.find(name); found != unknown.end()) {
                unknown.erase(found);
            }
        });
        noteunknown(chosen, unknown);
        writer.end();
        return 0;
    }
    followhistory(
        chosen.logs, which, told, [&writer] { writer.flush(); }, hasreader);
    return hasreader() ? 0 : endwithoutreader();
}

int runhtml(const options& chosen)
{
    const pagecontents contents = readpage(chosen.logs, chosen.asofnow);
    writewhole(chosen.page, chosen.logs, [&](std::ostream& out) { writepage(out, contents); });
    return 0;
}

int runmessages(const options& /*chosen*/)
{
    writemessages(std::cout, messageforms());
    return 0;
}

std::string kindcheck(const std::string& word)
{
    return eventkindof(word)
               ? std::string()
               : fmt::format("{} is no kind of event; these are: {}", tools::inquotes(word),
                             fmt::join(eventkindwords(), ", "));
}

std::string timecheck(const std::string& text)
{
    return clockof(text, std::time(nullptr))
               ? std::string()
               : fmt::format("{} is no time; understood are {}", tools::inquotes(text),
                             fmt::join(kTimeExamples, ", "));
}

// `items` in lines that a terminal shows whole, with commas between.
template <typename Items>
std::string listed(const Items& items)
{
    constexpr std::size_t kColumns = 80;
    std::string lines;
    std::string line = " ";
    for (const auto& item : items) {
        if (line.size() + item.size() + 2 > kColumns) {
            lines.append(line).append("\n");
            line = " ";
        }
        line.append(" ").append(item).append(&item == &*std::prev(std::end(items)) ? "" : ",");
    }
    return lines + line;
}

void addlogs(tools::commandline& command, options& chosen)
{
    command.addoption(
        {.name = "LOG",
         .type = "",
         .help = fmt::format("Logs, oldest first; - is standard input [{}]", kDefaultLog)},
        chosen.logs);
}

void addasofnow(tools::commandline& command, options& chosen)
{
    command.addflag("--now", "Judge as of the present, not of the log's last line", chosen.asofnow);
}

void addstatus(tools::commandline& line, options& chosen)
{
    tools::commandline command = line.addcommand("status", "Tell how each service is, and was",
                                                 [&chosen] { chosen.run = runstatus; });
    addlogs(command, chosen);
    addasofnow(command, chosen);
    command.addflag("--json", "Write one JSON object", chosen.json);
    command.setfooter(
        "While all is well a daemon may write nothing for long; a log does not tell that\n"
        "from its end. A state marked with ~ is inferred: no message says so, or when.\n\n"
        "Exit status: 0 where all services are up, busy or not watched, 1 where somebody\n"
        "should look or nothing is watched at all, 2 where a log cannot be read.");
}

void addeventfilters(tools::commandline& command, options& chosen)
{
    command.addoption(
        {.name = "--service", .type = "NAME", .help = "Only of this service; repeatable"},
        chosen.services);
    command.addoption({.name = "--kind",
                       .type = "KIND",
                       .help = "Only of this kind; repeatable",
                       .check = kindcheck},
                      chosen.kinds);
    command.addoption(
        {.name = "--since", .type = "WHEN", .help = "Only from this time on", .check = timecheck},
        chosen.since);
    command.addoption(
        {.name = "--until", .type = "WHEN", .help = "Only up to this time", .check = timecheck},
        chosen.until);
    command.addflag("--all", "Also what is routine: checks, figures and all steps", chosen.all);
}

void addevents(tools::commandline& line, options& chosen)
{
    tools::commandline command =
        line.addcommand("events", "Tell what happened, a line for each event",
                        [&chosen] { chosen.run = runevents; });
    addlogs(command, chosen);
    addeventfilters(command, chosen);
    command.addflag("--follow", "Go on as the last log grows", chosen.follow);
    command.addflag("--json", "Write one JSON object; with --follow, one a line", chosen.json);
    command.setfooter(fmt::format(
        "KIND:\n{}\nWHEN, on the log's clock; a day alone is its beginning:\n{}\n\n"
        "A line marked with ~ is inferred: no message says so, or when. It stands where\n"
        "the log makes it certain.",
        listed(eventkindwords()), listed(kTimeExamples)));
}

void addhtml(tools::commandline& line, options& chosen)
{
    tools::commandline command =
        line.addcommand("html", "Make a page with a time line for each service",
                        [&chosen] { chosen.run = runhtml; });
    addlogs(command, chosen);
    command.addoption({.name = "-o",
                       .type = "FILE",
                       .help = "The page's file; - for standard output",
                       .required = true},
                      chosen.page);
    addasofnow(command, chosen);
}

// Ends the process where the command line is wrong, or asks for nothing but help.
options parse(int argc, char** argv)
{
    tools::commandline line(
        "tolkwd-report",
        "Answers from tolkwd's log: what is up, what was down, since when, how often.");
    options chosen;
    addstatus(line, chosen);
    addevents(line, chosen);
    addhtml(line, chosen);
    line.addcommand("messages", "List the daemon's messages, and what they mean",
                    [&chosen] { chosen.run = runmessages; });
    line.parse(argc, argv);
    if (!chosen.run) {
        line.refusewithout("one of status, events, html and messages");
    }
    if (chosen.logs.empty()) {
        chosen.logs.emplace_back(kDefaultLog);
    }
    return chosen;
}

// What `work` returns, if all that it says has been written.
int guarded(const std::function<int()>& work)
{
    try {
        return tools::delivered(work());
    } catch (const unreadablelog& error) {
        (void)std::fprintf(stderr,
                           "tolkwd-report: %s\n"
                           "Give the log's name, or - for standard input: "
                           "journalctl -u tolkwd -o cat | tolkwd-report status -\n",
                           error.what());
        return kUnreadableStatus;
    } catch (const std::exception& error) {
        (void)std::fprintf(stderr, "tolkwd-report: %s\n", tools::printable(error.what()).c_str());
        return tools::kFailureStatus;
    }
}

} // namespace

int main(int argc, char** argv)
{
    std::ios::sync_with_stdio(false);
    return guarded([&] {
        const options chosen = parse(argc, argv);
        return chosen.run(chosen);
    });
}
