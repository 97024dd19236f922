// tolkwd-check: tells what the daemon will make of a configuration, before it does. The command
// line, and the order of the steps.

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <functional>
#include <iostream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include <unistd.h>

#include "commandline.h"
#include "daemonview.h"
#include "files.h"
#include "finding.h"
#include "interrupt.h"
#include "json.h"
#include "load.h"
#include "machine.h"
#include "plan.h"
#include "printable.h"
#include "probe.h"
#include "report.h"
#include "rules.h"
#include "shape.h"
#include "sourcetext.h"
#include "surroundings.h"
#include "terminal.h"
#include "values.h"
#include "wdLocalLog_linux.h"
#include "wdsettings.h"

namespace {

using namespace check;

struct options {
    std::string file;
    std::vector<std::string> allowed;
    std::string explained;
    int refresh = kDefaultRefreshSeconds;
    bool listrules = false;
    bool plan = false;
    bool probe = false;
    bool yes = false;
    bool json = false;
};

// `text` in lines that a terminal shows whole.
std::string folded(std::string_view text)
{
    constexpr std::size_t kColumns = 80;
    std::string lines;
    while (text.size() > kColumns) {
        const std::size_t end = std::min(text.rfind(' ', kColumns), text.size());
        lines.append(text.substr(0, end)).append("\n");
        text.remove_prefix(std::min(end + 1, text.size()));
    }
    return lines.append(text);
}

int explain(const std::string& name)
{
    const rule& wanted = rulenamed(name);
    std::cout << wanted.name << ": " << wanted.summary << "\n\n"
              << folded(wanted.explanation) << "\n\nwrong:\n"
              << wanted.wrong << "\n\nright:\n"
              << wanted.right << '\n';
    return 0;
}

int listrules()
{
    for (const rule& each : allrules()) {
        std::cout << each.name << "  " << each.summary << '\n';
    }
    return 0;
}

// Ends the process where the command line is wrong, or asks for nothing but help.
options parse(int argc, char** argv)
{
    tools::commandline line(
        "tolkwd-check",
        "Tells what tolkwd will make of a configuration, and what is wrong with it.");
    options chosen;
    const tools::valuecheck arule = [](const std::string& name) {
        return isrule(name) ? std::string() : "no rule is named " + tools::inquotes(name);
    };
    line.addoption(
        {.name = "FILE", .type = "TEXT", .help = "The configuration; - for standard input"},
        chosen.file);
    line.addflag("--plan", "Tell what an outage of each service will look like", chosen.plan);
    line.addoption({.name = "-t",
                    .type = "SECONDS",
                    .help = "The daemon's -t, its refresh period in seconds, for --plan"},
                   chosen.refresh);
    line.addflag("--probe", "Run each status command and each check once, after asking",
                 chosen.probe);
    line.addflag("--yes", "Do not ask before --probe runs anything", chosen.yes);
    line.addflag("--json", "Write everything as one JSON object", chosen.json);
    line.addoption({.name = "--allow",
                    .type = "RULE",
                    .help = "Do not report what this rule finds; repeatable",
                    .check = arule},
                   chosen.allowed);
    line.addoption({.name = "--explain",
                    .type = "RULE",
                    .help = "Explain a rule, with examples",
                    .check = arule},
                   chosen.explained);
    line.addflag("--rules", "List all rules", chosen.listrules);
    line.parse(argc, argv);
    if (chosen.file.empty() && chosen.explained.empty() && !chosen.listrules) {
        line.refusewithout("FILE");
    }
    return chosen;
}

// A probe runs what the file says, as who asks for it: nobody is to do that by mistake. What was
// read from standard input cannot be followed by an answer.
bool probeconfirmed(const options& chosen, const daemonview& view)
{
    if (const auto obstacle = probeobstacle(view)) {
        std::cerr << *obstacle << '\n';
        return false;
    }
    const auto question = probequestion(view);
    if (chosen.yes || !question) {
        return true;
    }
    if (chosen.file == "-" && isatty(STDIN_FILENO) == 0) {
        std::cerr << "standard input is the configuration and cannot answer whether to run its "
                     "commands: give --yes, or the name of a file\n";
        return false;
    }
    std::cerr << *question << std::flush;
    std::string answer;
    std::getline(std::cin, answer);
    std::cerr << (isatty(STDIN_FILENO) == 0 ? "\n" : ""); // nobody has pressed Return
    return answer == "y" || answer == "yes";
}

// With what was asked for besides the findings.
void writejson(const options& chosen, const sourcetext& source, const daemonview& view,
               const std::vector<finding>& found, const std::vector<targetplan>& plan,
               const std::vector<targetprobe>& probes)
{
    writeresult(std::cout, chosen.file, source, view, found, chosen.plan ? &plan : nullptr,
                chosen.probe ? &probes : nullptr);
}

int unreadable(const options& chosen, const std::string& reason)
{
    findings found({chosen.allowed.begin(), chosen.allowed.end()});
    found.add("unreadable-file", severity::error, kNoPlace, "the file cannot be read: " + reason);
    const sourcetext nothing("");
    daemonview view;
    view.loaded = false;
    const auto sorted = found.sorted();
    if (chosen.json) {
        writejson(chosen, nothing, view, sorted, {}, {});
    } else {
        writefindings(std::cout, chosen.file, nothing, sorted, tools::colourwanted());
    }
    return statusof(sorted);
}

// `folder`: for the output of commands, where there is a probe.
int checkfile(const options& chosen, const sourcetext& source, const std::string& folder)
{
    findings found({chosen.allowed.begin(), chosen.allowed.end()});
    const daemonview view = readasdaemon(source.text());
    if (chosen.probe && !probeconfirmed(chosen, view)) {
        std::cerr << "nothing was run\n";
        return tools::kUsageStatus;
    }
    checkshape(source, view, found);
    checkvalues(view, found);
    checkmachine(chosen.file, view, found);
    std::vector<targetprobe> probes;
    if (chosen.probe) {
        // The caller's may lack sbin, or hold programs that the daemon does not find.
        setenv("PATH", std::string(kDaemonPath).c_str(), 1);
        probes = probetargets(view, folder, found);
    }
    checkload(view, durationsof(probes), found);
    const auto sorted = found.sorted();
    const auto plan =
        chosen.plan ? makeplan(view, refreshperiod(chosen.refresh)) : std::vector<targetplan>();
    if (chosen.json) {
        writejson(chosen, source, view, sorted, plan, probes);
    } else {
        const bool colour = tools::colourwanted();
        writefindings(std::cout, chosen.file, source, sorted, colour);
        // An empty line between the parts.
        bool written = !sorted.empty();
        if (chosen.plan) {
            std::cout << (written ? "\n" : "");
            writeplan(std::cout, plan, colour);
            written = true;
        }
        if (!probes.empty()) {
            std::cout << (written ? "\n" : "");
            writeprobe(std::cout, probes, colour);
        }
    }
    return statusof(sorted);
}

// What `work` returns, if all that it says has been written.
int guarded(const std::function<int()>& work)
{
    try {
        return tools::delivered(work());
    } catch (const std::exception& error) {
        (void)std::fprintf(stderr, "tolkwd-check: %s\n", error.what());
        return tools::kFailureStatus;
    }
}

int run(const options& chosen)
{
    if (!chosen.explained.empty()) {
        return explain(chosen.explained);
    }
    if (chosen.listrules) {
        return listrules();
    }
    // What the daemon's functions log has to go somewhere; as debug lines are off, nothing does.
    const wdLocalLog log("/dev/null");
    _tmp_file_path = kPingFolder;
    std::string text;
    try {
        text = readwhole(chosen.file);
    } catch (const std::system_error& error) {
        return unreadable(chosen, error.code().message());
    }
    const sourcetext source(std::move(text));
    if (!chosen.probe) {
        return checkfile(chosen, source, "");
    }
    const outputfolder folder;
    return runinterruptibly(
        [&] { return guarded([&] { return checkfile(chosen, source, folder.path()); }); });
}

} // namespace

int main(int argc, char** argv)
{
    return guarded([&] { return run(parse(argc, argv)); });
}
