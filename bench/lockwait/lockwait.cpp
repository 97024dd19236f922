// Measures how long a recovery waits for the write side of the daemon's lock, while the daemon's
// own monitors ping and check.
//
//   bench_lockwait --out FILE.json [--brief]
//
// Part one, "usual": many monitors at a usual interval, begun at once as the daemon begins them,
// and recoveries at random moments. Part two, "starving": more and more checks in flight, until a
// recovery hardly ever gets its turn. --brief makes the same in seconds, for figures of no worth.
#include <algorithm>
#include <atomic>
#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <future>
#include <iostream>
#include <memory>
#include <numeric>
#include <optional>
#include <random>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <getopt.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

#include "observed.h"
#include "prediction.h"
#include "temporaryfolder.h"
#include "wdLocalLog_linux.h"
#include "wdmonitorthread_linux.h"
#include "wdsettings.h"
#include "xmlparser.h"

namespace {

using nlohmann::json;
using Seconds = std::chrono::duration<double>;

// What is measured, and for how long.
struct Plan {
    std::vector<int> targets;     // of part one
    int interval;                 // seconds between the pings of each
    std::size_t moments;          // at which recoveries come, within such an interval
    int calibrating;              // checks that tell how long one lasts
    std::vector<double> inflight; // of part two: mean number of checks in flight
    std::vector<double> trying;   // seconds for each; what a last try takes longer, the next loses
    std::size_t most;             // tries for each
    Seconds bound;                // of one try
};

const Plan kWholePlan{.targets = {10, 100, 1000},
                      .interval = 10,
                      .moments = 120,
                      .calibrating = 20,
                      .inflight = {0.05, 0.1, 0.25, 0.5, 1, 2, 3, 4, 5, 6, 8},
                      .trying = {5, 5, 5, 5, 5, 7, 14, 18, 22, 26, 30},
                      .most = 1000,
                      .bound = Seconds(15)};
const Plan kBriefPlan{.targets = {10},
                      .interval = 1,
                      .moments = 10,
                      .calibrating = 3,
                      .inflight = {0.5, 8},
                      .trying = {1, 1},
                      .most = 3,
                      .bound = Seconds(0.5)};

// A check that lasts 0.1 seconds and answers, and how many monitors make it.
constexpr const char* kCheck = "sleep 0.1; echo running";
constexpr int kCheckers = 400;

std::mt19937& dice()
{
    thread_local std::mt19937 generator{std::random_device()()};
    return generator;
}

double between(double least, double most)
{
    return std::uniform_real_distribution(least, most)(dice());
}

double exponential(double mean)
{
    return std::exponential_distribution(1 / mean)(dice());
}

Clock::duration seconds(double count)
{
    return std::chrono::duration_cast<Clock::duration>(Seconds(count));
}

double count(Clock::duration length)
{
    return Seconds(length).count();
}

// So many digits behind the point as a table needs.
double rounded(double value, int digits)
{
    const double scale = std::pow(10, digits);
    return std::round(value * scale) / scale;
}

// Of values in ascending order, the one that this part of them does not exceed.
double quantile(const std::vector<double>& ascending, double part)
{
    const auto place = std::ceil(part * static_cast<double>(ascending.size()));
    return ascending.at(std::max<std::size_t>(1, static_cast<std::size_t>(place)) - 1);
}

double mean(const std::vector<double>& values)
{
    return std::accumulate(values.begin(), values.end(), 0.0) / static_cast<double>(values.size());
}

// How long one of the pings or checks lasted on average.
double averagelength(const Reads& reads)
{
    return count(reads.total) / static_cast<double>(reads.count);
}

wdmonitortarget makewatched(const std::string& name, const std::string& check, int interval)
{
    wdmonitortarget watched;
    service& svc = watched.monitoredservice;
    svc.name = name;
    svc.binarypath = "/usr/sbin/" + name;
    svc.startcmd = ":";
    svc.stopcmd = ":";
    svc.functionalpingcmd = check;
    svc.genpinginterval = std::to_string(interval);
    svc.funpinginterval = svc.genpinginterval;
    svc.maxattemptofwakeup = "3";
    svc.MaxFPSkips = "0";
    return watched;
}

std::vector<wdmonitorthread> makemonitors(int number, const std::string& check, int interval)
{
    std::vector<wdmonitorthread> monitors;
    monitors.reserve(static_cast<std::size_t>(number));
    for (int i = 0; i < number; ++i) {
        monitors.emplace_back(makewatched("web" + std::to_string(i), check, interval));
    }
    return monitors;
}

// The daemon's surroundings: a folder for the log and the pings' files, and a `service` command
// that says of each that it runs. Standard output belongs to the daemon, and goes nowhere.
class Surroundings {
public:
    Surroundings()
    {
        folder.write("service", "#!/bin/sh\necho running\n");
        std::filesystem::permissions(folder.path("service"), std::filesystem::perms::owner_all);
        const char* before = std::getenv("PATH");
        setenv("PATH",
               (folder.path() + ":" + (before != nullptr ? before : "/usr/bin:/bin")).c_str(), 1);
        wdLocalLog::logFilePath = folder.path("log");
        _tmp_file_path = folder.path();
        const int null = open("/dev/null", O_WRONLY | O_CLOEXEC);
        dup2(null, STDOUT_FILENO);
        close(null);
        pthread_rwlock_init(&pingreclock, nullptr);
    }
    ~Surroundings() { pthread_rwlock_destroy(&pingreclock); }
    Surroundings(const Surroundings&) = delete;
    Surroundings& operator=(const Surroundings&) = delete;

    // How many recoveries the log tells of.
    [[nodiscard]] long loggedrecoveries() const
    {
        std::ifstream log(wdLocalLog::logFilePath);
        long found = 0;
        for (std::string line; std::getline(log, line);) {
            found += line.ends_with("Try the general recover for service failing") ? 1 : 0;
        }
        return found;
    }

private:
    TemporaryFolder folder;
};

// The monitor whose service fails. Its thread is whoever calls recover(), one at a time.
class Failing {
public:
    Failing() : monitor(watched) { xmlparser::allservices.push_back(watched.monitoredservice); }

    // A whole recovery: nothing to stop, and `:` to start.
    WriteRequest recover()
    {
        monitor.generalrecover(kServiceNotRunning);
        ++recoveries;
        return lastwriterequest();
    }

    [[nodiscard]] long made() const { return recoveries; }

private:
    const wdmonitortarget watched = makewatched("failing", kNoCommand, 0);
    wdmonitorthread monitor;
    long recoveries = 0;
};

// The monitors of one configuration, from the daemon's start of them until they have all ended.
class Generation {
public:
    Generation(int targets, int interval) : monitors(makemonitors(targets, kNoCommand, interval))
    {
        Pauses::current().begin();
        std::atomic_ref(globalenable).store(1);
        for (wdmonitorthread& monitor : monitors) {
            monitor.create();
        }
    }
    ~Generation()
    {
        std::atomic_ref(globalenable).store(0);
        Pauses::current().end();
        for (wdmonitorthread& monitor : monitors) {
            monitor.join();
        }
    }
    Generation(const Generation&) = delete;
    Generation& operator=(const Generation&) = delete;

private:
    std::vector<wdmonitorthread> monitors;
};

// The waits of recoveries that come at random moments of the interval to come. A moment that passes
// while an earlier recovery waits is given what is left of that wait: the lock lets whoever waits
// for the write side in at the same moment, whenever they came. Without that long waits would be
// counted once, and short ones as often as they come.
std::vector<double> waitsatmoments(Failing& failing, const Plan& plan)
{
    std::vector<double> moments(plan.moments);
    std::generate(moments.begin(), moments.end(), [&] { return between(0, plan.interval); });
    std::sort(moments.begin(), moments.end());
    const auto start = Clock::now();
    std::vector<double> waits;
    WriteRequest last{start, start};
    for (const double moment : moments) {
        const auto come = start + seconds(moment);
        if (come > last.held) {
            std::this_thread::sleep_until(come);
            last = failing.recover();
            waits.push_back(count(last.held - last.entered));
        } else {
            waits.push_back(count(last.held - come));
        }
    }
    std::sort(waits.begin(), waits.end());
    return waits;
}

json usualrow(Failing& failing, const Plan& plan, int targets)
{
    const long before = failing.made();
    std::vector<double> waits;
    takereads();
    {
        const Generation generation(targets, plan.interval);
        // From the middle between the first two rounds on, for a whole interval, so that the second
        // round lies within. By the time an outage leads to a recovery the first is long past.
        Pauses::current().pause(seconds(plan.interval / 2.0));
        if (takereads().count < targets) {
            throw std::runtime_error("not every target has been pinged");
        }
        waits = waitsatmoments(failing, plan);
    }
    const Reads pings = takereads();
    const double lasting = averagelength(pings);
    const auto milliseconds = [](double value) {
        return rounded(value * 1000, 3);
    };
    const auto free = std::count_if(waits.begin(), waits.end(), [](double w) { return w < 0.001; });
    return {targets,
            pings.count,
            milliseconds(lasting),
            rounded(targets * lasting / (plan.interval + lasting), 3),
            waits.size(),
            failing.made() - before,
            100 * free / static_cast<long>(waits.size()),
            milliseconds(quantile(waits, 0.5)),
            milliseconds(quantile(waits, 0.95)),
            milliseconds(waits.back())};
}

// Part one.
json measureusual(Failing& failing, const Plan& plan)
{
    json rows = json::array();
    for (const int targets : plan.targets) {
        rows.push_back(usualrow(failing, plan, targets));
    }
    return {
        {"id", "lockwait-usual"},
        {"title", "How long a recovery waits for its turn, at a usual interval"},
        {"columns",
         {"targets", "pings", "a ping lasts (ms)", "mean in flight", "moments", "recoveries made",
          "no wait, below 1 ms (%)", "median wait (ms)", "95th percentile (ms)", "longest (ms)"}},
        {"rows", rows},
        {"note",
         "The daemon's own monitors, begun at once, with a `service` command of one line, and "
         "recoveries at random moments of the interval around the second round of pings: from "
         "entering to holding the write side. The interval is " +
             std::to_string(plan.interval) + " s where 60 s are usual: a recovery meets a round " +
             std::to_string(60 / plan.interval) +
             " times as often as usual, but waits no longer then. Moments that pass while an "
             "earlier recovery waits count with the rest of its wait."}};
}

// Monitors that make their check at random moments, each with a thread of its own.
class Checkers {
public:
    explicit Checkers(double meanpause) : monitors(makemonitors(kCheckers, kCheck, 0))
    {
        Pauses::current().begin();
        for (wdmonitorthread& monitor : monitors) {
            threads.emplace_back([&monitor, meanpause] { check(monitor, meanpause); });
        }
    }
    // Lets those in flight end.
    ~Checkers()
    {
        Pauses::current().end();
        threads.clear(); // joins
    }
    Checkers(const Checkers&) = delete;
    Checkers& operator=(const Checkers&) = delete;

    // Whether all checks so far, of all checkers, have been answered.
    static bool allanswered() { return unanswered == 0; }

private:
    static void check(wdmonitorthread& monitor, double meanpause)
    {
        while (Pauses::current().pause(seconds(exponential(meanpause)))) {
            if (monitor.functionalping() != kAnswerCorrect) {
                ++unanswered;
            }
        }
    }

    static inline std::atomic<long> unanswered = 0;
    std::vector<wdmonitorthread> monitors;
    std::vector<std::jthread> threads;
};

// How long one check lasts where nothing else goes on.
double lonelycheck(int calibrating)
{
    takereads();
    wdmonitorthread monitor(makewatched("alone", kCheck, 0));
    for (int i = 0; i < calibrating; ++i) {
        monitor.functionalping();
    }
    return averagelength(takereads());
}

// What the tries against one number of checks in flight gave.
struct Tries {
    std::vector<double> waits; // ascending; those that reached the bound are left out
    std::size_t all = 0;

    // Nothing where it lies beyond the bound.
    [[nodiscard]] std::optional<double> median() const
    {
        const std::size_t place = (all - 1) / 2;
        return place < waits.size() ? std::optional(waits[place]) : std::nullopt;
    }

    // Nothing where one of the tries reached the bound.
    [[nodiscard]] std::optional<double> average() const
    {
        return waits.size() == all ? std::optional(mean(waits)) : std::nullopt;
    }
};

// Tries until the time is up, at least once. Between two tries lies a pause of 1 to 2 checks: by
// then whatever the recovery has kept waiting is over, and its end does not tell when the next
// moment without checks will be.
Tries tryrecoveries(Failing& failing, const Plan& plan, Clock::time_point deadline,
                    double meanpause, double lasting)
{
    Tries tries;
    auto checkers = std::make_unique<Checkers>(meanpause);
    do {
        std::this_thread::sleep_for(seconds(between(lasting, 2 * lasting)));
        auto recovery = std::async(std::launch::async, [&] { return failing.recover(); });
        ++tries.all;
        if (recovery.wait_for(plan.bound) == std::future_status::timeout) {
            checkers.reset(); // and the recovery gets its turn
            recovery.wait();
            checkers = std::make_unique<Checkers>(meanpause);
        } else {
            const WriteRequest request = recovery.get();
            tries.waits.push_back(count(request.held - request.entered));
        }
    } while (tries.all < plan.most && Clock::now() < deadline);
    std::sort(tries.waits.begin(), tries.waits.end());
    return tries;
}

// Part two.
class Starving {
public:
    Starving(Failing& victim, const Plan& whole)
        : failing(victim), plan(whole), lasting(lonelycheck(whole.calibrating))
    {
    }

    json table()
    {
        auto deadline = Clock::now();
        for (std::size_t i = 0; i < plan.inflight.size(); ++i) {
            deadline += seconds(plan.trying[i]);
            measure(plan.inflight[i], deadline);
        }
        return {{"id", "lockwait-starving"},
                {"title", "How long a recovery waits for its turn, by the checks in flight"},
                {"columns",
                 {"mean in flight", "checks made", "a check lasts (ms)", "recoveries tried",
                  "without a turn", "median wait (checks)", "reckoned", "mean wait (checks)",
                  "reckoned mean"}},
                {"rows", rows},
                {"note", note()}};
    }

    [[nodiscard]] json curve() const
    {
        return {{"id", "lockwait-starving"},
                {"title", "How long a recovery waits for its turn"},
                {"xlabel", "mean number of checks in flight"},
                {"ylabel", "wait, in lengths of a check"},
                {"logx", false},
                {"logy", true},
                {"series",
                 {{{"name", "median"}, {"points", medians}},
                  {{"name", "median, reckoned"}, {"points", reckonedmedians}},
                  {{"name", "mean"}, {"points", means}},
                  {{"name", "mean, reckoned"}, {"points", reckonedmeans}}}}};
    }

private:
    // Waits below that are those for an idle lock, and no part of a logarithmic curve.
    static constexpr double kLeastDrawn = 0.001;

    void measure(double inflight, Clock::time_point deadline)
    {
        // Each of N checkers is in flight for a part lasting / (lasting + pause) of its time.
        const double meanpause = kCheckers * lasting / inflight - lasting;
        takereads();
        const Tries tries = tryrecoveries(failing, plan, deadline, meanpause, lasting);
        const Reads checks = takereads();
        const double length = checks.count > 0 ? averagelength(checks) : lasting;
        addrow(kCheckers * length / (meanpause + length), length, checks.count, tries);
    }

    void addrow(double inflight, double length, long checks, const Tries& tries)
    {
        const double x = rounded(inflight, 2);
        const auto shown = [&](std::optional<double> wait, std::vector<json>& points) -> json {
            if (!wait) {
                return "above " + std::to_string(std::lround(plan.bound.count() / length));
            }
            draw(points, x, *wait / length);
            return rounded(*wait / length, 2);
        };
        draw(reckonedmedians, x, medianwait(inflight));
        draw(reckonedmeans, x, meanwait(inflight));
        rows.push_back({x, checks, rounded(length * 1000, 1), tries.all,
                        tries.all - tries.waits.size(), shown(tries.median(), medians),
                        rounded(medianwait(inflight), 2), shown(tries.average(), means),
                        rounded(meanwait(inflight), 2)});
    }

    static void draw(std::vector<json>& points, double x, double y)
    {
        if (y >= kLeastDrawn) {
            points.push_back({x, rounded(y, 4)});
        }
    }

    [[nodiscard]] std::string note() const
    {
        return std::to_string(kCheckers) +
               " monitors make a check of a tenth of a second at random moments; recoveries are "
               "tried one after the other, each for at most " +
               std::to_string(std::lround(plan.bound.count())) +
               " s. Waits are in lengths of a check. Reckoned: checks of one length that begin "
               "independently of each other; the mean is then (e^r - 1)/r - 1 for r in flight. "
               "To know r for a configuration, add up over all pings and checks how long one "
               "lasts, "
               "divided by the time from one to the next, which is the sum of both intervals where "
               "a service has a check: 100 checks of 1.2 s, 60 s and 60 s, are 1. Keep r below 1, "
               "where a recovery waits for less than one check on average; each further 1 makes it "
               "wait two to three times as long, and at 6 it waits for more than a minute if a "
               "check "
               "lasts a second.";
    }

    Failing& failing;
    const Plan& plan;
    const double lasting; // seconds
    std::vector<json> rows;
    std::vector<json> medians;
    std::vector<json> reckonedmedians;
    std::vector<json> means;
    std::vector<json> reckonedmeans;
};

// What would make all figures worthless.
void refusewrong(const Surroundings& surroundings, const Failing& failing)
{
    if (surroundings.loggedrecoveries() != failing.made()) {
        throw std::runtime_error("the log does not tell of each recovery");
    }
    if (!Checkers::allanswered()) {
        throw std::runtime_error("a check has not been answered");
    }
}

json measureall(const Plan& plan)
{
    const Surroundings surroundings;
    Failing failing;
    const json usual = measureusual(failing, plan);
    Starving starving(failing, plan);
    const json starvingtable = starving.table();
    refusewrong(surroundings, failing);
    return {{"tables", {usual, starvingtable}},
            {"curves", json::array({starving.curve()})},
            {"goals", json::array()}};
}

struct Options {
    std::string out;
    bool brief = false;
};

Options readoptions(int argc, char** argv)
{
    constexpr option kOptions[] = {
        {"out", required_argument, nullptr, 'o'}, {"brief", no_argument, nullptr, 'b'}, {}};
    Options options;
    for (int found = 0; (found = getopt_long(argc, argv, "", kOptions, nullptr)) != -1;) {
        if (found == 'o') {
            options.out = optarg;
        } else if (found == 'b') {
            options.brief = true;
        } else {
            throw std::invalid_argument("unknown option");
        }
    }
    if (options.out.empty() || optind != argc) {
        throw std::invalid_argument("usage: bench_lockwait --out FILE.json [--brief]");
    }
    return options;
}

} // namespace

int main(int argc, char** argv)
{
    try {
        const Options options = readoptions(argc, argv);
        const json results = measureall(options.brief ? kBriefPlan : kWholePlan);
        std::ofstream out(options.out);
        out << results.dump(1) << '\n';
        if (!out.flush()) {
            throw std::runtime_error("cannot write " + options.out);
        }
    } catch (const std::exception& fault) {
        std::cerr << fault.what() << '\n';
        return EXIT_FAILURE;
    }
    return EXIT_SUCCESS;
}
