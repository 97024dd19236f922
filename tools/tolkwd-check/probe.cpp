#include "probe.h"

#include <algorithm>
#include <chrono>
#include <iterator>
#include <sstream>
#include <thread>
#include <utility>

#include "ProcessStatistics_Linux.h"
#include "fields.h"
#include "owners.h"
#include "printable.h"
#include "reason.h"
#include "surroundings.h"
#include "wdmonitorthread_linux.h"

namespace check {

namespace {

using clocktype = std::chrono::steady_clock;

// The daemon's clock has whole seconds: with fewer between two readings a figure would be coarse.
constexpr std::chrono::seconds kLeastBetweenReadings{2};

// More than it takes until a process gets a signal that is sent to its whole group.
constexpr std::chrono::seconds kUntilInterrupted{1};

double secondssince(clocktype::time_point begin)
{
    return std::chrono::duration<double>(clocktype::now() - begin).count();
}

// Shows on one line of a terminal what is waited for.
class progress {
public:
    explicit progress(const surroundings& around) : out(around) {}

    void show(const std::string& text)
    {
        const std::size_t width = tools::characters(text);
        const std::size_t blanks = shown > width ? shown - width : 0;
        out.tell('\r' + text + std::string(blanks, ' '));
        shown = width;
    }
    void clear() { out.tell('\r' + std::string(shown, ' ') + '\r'); }

private:
    const surroundings& out;
    std::size_t shown = 0;
};

commandprobe madeof(std::string command, pingoutcome outcome, double seconds)
{
    return {.command = std::move(command),
            .firstline = std::move(outcome.firstline),
            .readable = outcome.opened,
            .state = outcome.state,
            .seconds = seconds,
            .result = 0,
            .reason = {}};
}

// The daemon's function says what an answer means; words that lead elsewhere are no reason.
void rate(commandprobe& tried, int result, reason why)
{
    tried.result = result;
    if (why.verdict == result) {
        tried.reason = std::move(why.text);
    }
}

commandprobe trystatus(const service& svc)
{
    const auto begin = clocktype::now();
    pingoutcome outcome = askstatus(svc);
    const double seconds = secondssince(begin);
    commandprobe tried = madeof("service " + svc.name + " status", std::move(outcome), seconds);
    rate(tried, ratestatus(tried.firstline, tried.state),
         statusreason(tried.firstline, tried.state));
    return tried;
}

commandprobe trycheck(const service& svc)
{
    const auto begin = clocktype::now();
    pingoutcome outcome = askfunction(svc);
    const double seconds = secondssince(begin);
    commandprobe tried = madeof(svc.functionalpingcmd, std::move(outcome), seconds);
    rate(tried, rateanswer(tried.firstline), answerreason(tried.firstline));
    return tried;
}

std::vector<int> numbersin(const std::string& text)
{
    std::istringstream stream(text);
    return {std::istream_iterator<int>(stream), {}};
}

// The figures of a target's process, taken twice, for the processor's is one over time.
class processreading {
public:
    explicit processreading(const service& svc) : path(svc.binarypath)
    {
        statistics.SetName(path);
        statistics.SetThresholdAverageCPUUsage(svc.ThresholdAverageCPUUsage);
        statistics.SetThresholdMemoryUsage(svc.ThresholdMemoryUsage);
        statistics.SetThresholdThreadCount(svc.ThresholdThreadCount);
    }

    // Whether there is a process to read from.
    bool read()
    {
        const std::string printed = Utility::pidof(path);
        before = std::exchange(pid, Utility::str2int(printed));
        users = startersof(numbersin(printed));
        if (pid == 0) {
            return false;
        }
        statistics.UpdatePID();
        known = statistics.Refresh() == 0;
        return known;
    }

    [[nodiscard]] processprobe result() const
    {
        processprobe process;
        process.pid = known ? pid : 0;
        process.users = users;
        process.threads.threshold = statistics.GetThresholdThreadCount();
        process.memory.threshold = statistics.GetThresholdMemoryUsage();
        process.processor.threshold = statistics.GetThresholdAverageCPUUsage();
        if (process.pid != 0) {
            process.threads.value = statistics.GetNumberOfThreads();
            process.memory.value = statistics.GetMemoryUsage();
        }
        if (process.pid != 0 && before == pid) {
            process.processor.value = statistics.GetAverageCPUUsage();
        }
        return process;
    }

private:
    std::string path;
    ProcessStatistics statistics;
    int pid = 0;
    int before = 0;
    std::vector<uid_t> users;
    bool known = false;
};

// An interrupt from the keyboard ends a command's shell and this process, in either order: after
// such a command nothing more is run too early.
void awaitinterrupt(const commandprobe& tried)
{
    if (tried.state < 0) {
        std::this_thread::sleep_for(kUntilInterrupted);
    }
}

targetprobe trytarget(const service& svc, progress& shown)
{
    targetprobe probe{.name = svc.name,
                      .binarypath = svc.binarypath,
                      .maxskips = svc.MaxFPSkips,
                      .status = {},
                      .check = {},
                      .process = {}};
    shown.show("waiting for the status command of " + tools::inquotes(probe.name));
    probe.status = trystatus(svc);
    awaitinterrupt(probe.status);
    if (ischecked(svc)) {
        shown.show("waiting for the check of " + tools::inquotes(probe.name));
        probe.check = trycheck(svc);
        awaitinterrupt(*probe.check);
    }
    return probe;
}

// Reads the figures of all; whether there is a process to read from.
bool readfigures(std::vector<processreading>& readings)
{
    bool any = false;
    for (processreading& reading : readings) {
        any = reading.read() || any;
    }
    return any;
}

// Runs everything, in the surroundings made for it.
std::vector<targetprobe> tryall(const daemonview& view, const surroundings& around)
{
    progress shown(around);
    std::vector<processreading> readings;
    readings.reserve(view.targets.size());
    for (const targetview& target : view.targets) {
        readings.emplace_back(*target.monitored.record);
    }
    const bool any = readfigures(readings);
    const auto begin = clocktype::now();
    std::vector<targetprobe> probes;
    probes.reserve(view.targets.size());
    for (const targetview& target : view.targets) {
        probes.push_back(trytarget(*target.monitored.record, shown));
    }
    if (any) {
        shown.show("waiting for the figures of the processes");
        std::this_thread::sleep_until(begin + kLeastBetweenReadings);
    }
    readfigures(readings);
    shown.clear();
    for (std::size_t i = 0; i < probes.size(); ++i) {
        probes[i].process = readings[i].result();
        probes[i].process.counts = looksatthresholds(*view.targets[i].monitored.record);
    }
    return probes;
}

// The place of a value, or of what watches without having one.
std::size_t placeof(const targetview& target, field which)
{
    const std::size_t place = check::placeof(target.monitored, which);
    return place != kNoPlace ? place : target.begin;
}

std::string answerwords(const commandprobe& tried)
{
    if (tried.firstline.empty()) {
        return tried.reason.empty() ? "answers nothing" : "answers " + tried.reason;
    }
    return "answers " + tools::inquotes(tried.firstline) +
           (tried.reason.empty() ? "" : " (" + tried.reason + ")");
}

void findstatus(const targetview& target, const targetprobe& probe, findings& found)
{
    const std::size_t place = placeof(target, &service::name);
    const std::string name = tools::inquotes(probe.name);
    const std::string answer =
        tools::inquotes(probe.status.command) + ' ' + answerwords(probe.status);
    switch (probe.status.result) {
    case kServiceUnknown:
        found.add("probe-status", severity::error, place,
                  "the system does not know the service " + name + ": " + answer +
                      "; the daemon ends this monitor until its next refresh: correct the name");
        break;
    case kServiceNotRunning:
        found.add("probe-status", severity::warning, place,
                  "the service " + name + " does not run: " + answer +
                      "; the daemon would start it after three more pings");
        break;
    case kServiceUnclear:
        found.add("probe-status", severity::warning, place,
                  "whether the service " + name + " runs is not clear: " + answer +
                      "; to the daemon it has failed, and after three more pings it would be "
                      "stopped and started");
        break;
    default:
        break;
    }
}

void findcheck(const targetview& target, const targetprobe& probe, findings& found)
{
    // Of a service that does not run, no check can work, and the daemon makes none.
    if (!probe.check || probe.status.result != kServiceRunning) {
        return;
    }
    const std::size_t place = placeof(target, &service::functionalpingcmd);
    const std::string about = " of the service " + tools::inquotes(probe.name) + ' ';
    const std::string answer = answerwords(*probe.check);
    if (probe.check->result == kCommandNotFound) {
        found.add("probe-check", severity::error, place,
                  "the check" + about + answer +
                      ": to the daemon its command is missing, and it does nothing when the "
                      "service fails: correct functionalpingcmd");
    } else if (isfailure(probe.check->result)) {
        found.add("probe-check", severity::warning, place,
                  "the check" + about + answer +
                      ": to the daemon the service fails, and after three more checks it would be "
                      "stopped and started; let the check print \"service: ok\", and nothing else, "
                      "when all is well");
    }
}

std::string abovewords(std::string_view key, const figureprobe& figure)
{
    return std::string(key) + " (" + std::to_string(*figure.value) + " of " +
           std::to_string(figure.threshold) + ")";
}

std::string allabove(const processprobe& process)
{
    std::string words;
    for (const auto& [key, figure] : {std::pair{"ThresholdThreadCount", process.threads},
                                      std::pair{"ThresholdMemoryUsage", process.memory},
                                      std::pair{"ThresholdAverageCPUUsage", process.processor}}) {
        if (figure.busy()) {
            words += (words.empty() ? "" : " and ") + abovewords(key, figure);
        }
    }
    return words;
}

// Such as: root, www and 3 more
std::string userwords(const std::vector<uid_t>& users)
{
    constexpr std::size_t kShown = 3;
    std::string words;
    for (std::size_t i = 0; i < std::min(users.size(), kShown); ++i) {
        words += (i > 0 ? ", " : "") + username(users[i]);
    }
    return users.size() > kShown ? words + " and " + std::to_string(users.size() - kShown) + " more"
                                 : words;
}

void findusers(const targetview& target, const targetprobe& probe, findings& found)
{
    if (probe.process.users.size() > 1) {
        found.add("probe-users", severity::warning, placeof(target, &service::binarypath),
                  "several users run processes of " + tools::inquotes(probe.binarypath) + " (" +
                      userwords(probe.process.users) +
                      "): the daemon compares the first one that pidof prints with the "
                      "thresholds, whoever started it, so each of these users can make " +
                      tools::inquotes(probe.name) +
                      " count as busy and have its check left out; write 0 for MaxFPSkips unless "
                      "you trust them all");
    }
}

void findprocess(const targetview& target, const targetprobe& probe, findings& found)
{
    const processprobe& process = probe.process;
    if (!process.counts) {
        return;
    }
    findusers(target, probe, found);
    const std::string name = tools::inquotes(probe.name);
    if (process.pid == 0 && probe.status.result == kServiceRunning) {
        found.add("probe-process", severity::warning, placeof(target, &service::binarypath),
                  "the service " + name + " runs, but pidof finds no process of " +
                      tools::inquotes(probe.binarypath) +
                      ": the daemon would compare old figures with the thresholds, at first 0: "
                      "correct binarypath");
    }
    if (process.busy()) {
        const int skips = Utility::str2int(probe.maxskips);
        const std::string often =
            skips < 0 ? "without end" : "up to " + std::to_string(skips) + " times in a row";
        found.add("probe-busy", severity::warning, placeof(target, &service::name),
                  "the service " + name + " is above " + allabove(process) +
                      " now: the daemon takes it for busy and would leave its check out, " + often);
    }
}

} // namespace

std::vector<targetprobe> probetargets(const daemonview& view, const std::string& folder,
                                      findings& found)
{
    if (!view.loaded || view.targets.empty()) {
        return {};
    }
    std::vector<targetprobe> probes = tryall(view, surroundings(folder));
    for (std::size_t i = 0; i < probes.size(); ++i) {
        findstatus(view.targets[i], probes[i], found);
        findcheck(view.targets[i], probes[i], found);
        findprocess(view.targets[i], probes[i], found);
    }
    return probes;
}

std::vector<durations> durationsof(const std::vector<targetprobe>& probes)
{
    std::vector<durations> taken;
    taken.reserve(probes.size());
    for (const targetprobe& probe : probes) {
        durations each{.status = probe.status.seconds, .functional = std::nullopt};
        if (probe.check) {
            each.functional = probe.check->seconds;
        }
        taken.push_back(each);
    }
    return taken;
}

} // namespace check
