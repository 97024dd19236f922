#include "probe.h"

#include <array>
#include <cstdio>

#include <unistd.h>

#include "fields.h"
#include "owners.h"
#include "printable.h"
#include "terminal.h"
#include "units.h"
#include "wdmonitorthread_linux.h"

namespace check {

namespace {

constexpr std::size_t kShownBytes = 160; // of an answer

// Whoever has more of them than a screen holds looks into the file.
constexpr int kShownChecks = 20;

constexpr const char* kIndent = "             ";

struct verdict {
    std::string_view words;
    bool good;
};

verdict statusverdict(int result)
{
    switch (result) {
    case kServiceRunning:
        return {"running", true};
    case kServiceNotRunning:
        return {"not running", false};
    case kServiceUnknown:
        return {"unknown, its monitor would end", false};
    default:
        return {"unclear, counts as failed", false};
    }
}

verdict checkverdict(int result)
{
    switch (result) {
    case kAnswerCorrect:
        return {"works", true};
    case kCommandNotFound:
        return {"missing, nothing would be done", false};
    default:
        return {"fails", false};
    }
}

std::string_view colourof(const verdict& verdict)
{
    return verdict.good ? tools::kGreen : tools::kRed;
}

std::string secondswords(double seconds)
{
    std::array<char, 64> text{};
    (void)std::snprintf(text.data(), text.size(), "%.2f s", seconds);
    return text.data();
}

std::string statewords(int state)
{
    return state < 0 ? "did not end normally" : "exit status " + std::to_string(state);
}

std::string linewords(const commandprobe& tried)
{
    if (!tried.readable) {
        return "no output to read";
    }
    if (tried.firstline.empty()) {
        return "nothing on the first line";
    }
    const bool cut = tried.firstline.size() > kShownBytes;
    return '"' + tools::printable(tried.firstline.substr(0, kShownBytes)) + (cut ? "..." : "\"");
}

void writecommand(std::ostream& out, std::string_view label, const commandprobe& tried,
                  const verdict& verdict, bool colour)
{
    out << label << tools::coloured(colourof(verdict), verdict.words, colour);
    if (!tried.reason.empty()) {
        out << ": " << tried.reason;
    }
    out << "   (" << statewords(tried.state) << ", " << secondswords(tried.seconds) << ")\n"
        << kIndent << linewords(tried) << '\n';
}

std::string withunit(int value, std::string_view unit, const std::string& words)
{
    return std::to_string(value).append(unit).append(words.empty() ? "" : " (" + words + ")");
}

std::string memorywords(int pages)
{
    return rounded(pagesinbytes(pages) / kBytesPerMebibyte) + " MiB";
}

std::string processorwords(int figure)
{
    return rounded(processorpercent(figure)) + " %";
}

std::string nowords(int /*value*/)
{
    return "";
}

// Such as: memory 1755 pages (6.9 MiB) of 262144 (1024 MiB)
std::string figurewords(std::string_view name, const figureprobe& figure, std::string_view unit,
                        std::string (*words)(int))
{
    const std::string value =
        figure.value ? withunit(*figure.value, unit, words(*figure.value)) : "not known";
    return std::string(name).append(" ").append(value).append(" of ").append(
        withunit(figure.threshold, "", words(figure.threshold)));
}

std::string busywords(const targetprobe& probe)
{
    if (!probe.check) {
        return "the thresholds do not count: there is no check";
    }
    if (!probe.process.counts) {
        return "the thresholds do not count: MaxFPSkips is 0";
    }
    if (!probe.process.busy()) {
        return "not busy: the check would be made";
    }
    const int skips = Utility::str2int(probe.maxskips);
    return "busy: the check would be left out, " +
           (skips < 0 ? std::string("without end")
                      : "up to " + std::to_string(skips) + " times in a row");
}

void writeprocess(std::ostream& out, const targetprobe& probe)
{
    const processprobe& process = probe.process;
    out << "  process    ";
    if (process.pid == 0) {
        out << "pidof finds none of " << tools::inquotes(probe.binarypath) << '\n';
        return;
    }
    out << process.pid << ": " << figurewords("threads", process.threads, "", nowords) << ", "
        << figurewords("memory", process.memory, " pages", memorywords) << ", "
        << figurewords("processor", process.processor, "", processorwords) << '\n'
        << kIndent << busywords(probe) << '\n';
}

} // namespace

std::optional<std::string> probequestion(const daemonview& view)
{
    if (!view.loaded || view.targets.empty()) {
        return std::nullopt;
    }
    int checks = 0;
    std::string commands;
    for (const targetview& target : view.targets) {
        if (ischecked(*target.monitored.record) && ++checks <= kShownChecks) {
            commands += "  " + tools::inquotes(target.monitored.record->functionalpingcmd) + '\n';
        }
    }
    if (checks > kShownChecks) {
        commands += "  and " + std::to_string(checks - kShownChecks) + " more\n";
    }
    const auto targets = static_cast<long long>(view.targets.size());
    return (checks > 0 ? "The checks:\n" : "") + commands + "This runs " +
           counted(targets + checks, "command", "commands") + " as " + username(geteuid()) + " (" +
           counted(targets, "status command", "status commands") + ", " +
           counted(checks, "check", "checks") + "), and pidof for " +
           counted(targets, "program", "programs") +
           (geteuid() == 0 ? "" : "; the daemon runs them as root") + ". Go on? [y/N] ";
}

std::optional<std::string> probeobstacle(const daemonview& view)
{
    constexpr std::string_view kOtherwise = " would have the shell run something else than ";
    for (const targetview& target : view.targets) {
        const std::string& name = target.monitored.record->name;
        if (!name.empty() && !isplainname(name)) {
            return "the name " + tools::inquotes(name) + std::string(kOtherwise) +
                   "its status command";
        }
        // A blank only makes two names of it.
        std::string path = target.monitored.record->binarypath;
        std::erase(path, ' ');
        if (!isplainpath(path)) {
            return "the binarypath of " + tools::inquotes(name) + std::string(kOtherwise) + "pidof";
        }
    }
    return std::nullopt;
}

void writeprobe(std::ostream& out, const std::vector<targetprobe>& probes, bool colour)
{
    for (const targetprobe& probe : probes) {
        out << tools::coloured(tools::kBold, tools::printable(probe.name), colour) << '\n';
        writecommand(out, "  status     ", probe.status, statusverdict(probe.status.result),
                     colour);
        if (probe.check) {
            writecommand(out, "  check      ", *probe.check, checkverdict(probe.check->result),
                         colour);
        } else {
            out << "  check      none\n";
        }
        writeprocess(out, probe);
    }
}

} // namespace check
