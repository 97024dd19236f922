#include "plan.h"

#include <algorithm>
#include <iterator>
#include <limits>

#include "ProcessStatistics_Linux.h"
#include "fields.h"
#include "units.h"

namespace check {

namespace {

constexpr long long kGreatest = std::numeric_limits<long long>::max();

constexpr plannedtime kOneCheck{.checks = 1};
constexpr plannedtime kOneRecovery{.recoveries = 1};

long long sum(long long one, long long other) noexcept
{
    return one > kGreatest - other ? kGreatest : one + other;
}

long long product(long long times, long long one) noexcept
{
    return one != 0 && times > kGreatest / one ? kGreatest : times * one;
}

plannedtime seconds(long long count) noexcept
{
    return {.seconds = count};
}

plannedtime generalpause(const service& svc)
{
    return seconds(pauseseconds(settingnumber(svc.genpinginterval)));
}

plannedtime functionalpause(const service& svc)
{
    return seconds(pauseseconds(settingnumber(svc.funpinginterval)));
}

watching stateof(long long attempts)
{
    if (attempts == 0) {
        return watching::givenup;
    }
    return attempts < 0 ? watching::spinning : watching::kept;
}

// From one ping to the next while all is well.
plannedtime roundof(const service& svc)
{
    const plannedtime general = generalpause(svc);
    return ischecked(svc) ? general + functionalpause(svc) + kOneCheck : general;
}

busyness busynessof(const service& svc, long long skips)
{
    if (skips == 0) {
        return busyness::never;
    }
    // Whatever lives has a thread and memory, and has used no less than no time.
    const bool always = Utility::str2int(svc.ThresholdThreadCount) < 1 ||
                        Utility::str2int(svc.ThresholdMemoryUsage) < 1 ||
                        Utility::str2int(svc.ThresholdAverageCPUUsage) < 0;
    return always ? busyness::always : busyness::overthreshold;
}

// How long a failing check stays unnoticed if as many are left out as may be. One that is left out
// takes no time.
std::optional<plannedtime> longestunnoticed(const service& svc, long long skips)
{
    if (skips < 0) {
        return std::nullopt;
    }
    return (skips + 1) * (generalpause(svc) + functionalpause(svc)) + kOneCheck;
}

std::optional<checkplan> checkof(const service& svc)
{
    if (!ischecked(svc)) {
        return std::nullopt;
    }
    const long long skips = Utility::str2int(svc.MaxFPSkips);
    return checkplan{
        .command = functionalcommand(svc),
        .every = roundof(svc),
        .skips = skips,
        .busy = busynessof(svc, skips),
        .unnoticed = longestunnoticed(svc, skips),
        .processorpercent = processorpercent(Utility::str2int(svc.ThresholdAverageCPUUsage)),
        .memorybytes = pagesinbytes(Utility::str2int(svc.ThresholdMemoryUsage)),
        .threads = Utility::str2int(svc.ThresholdThreadCount),
    };
}

// A recovery asks as well, but is refused every answer. So it leaves out nothing but the stop of a
// service whose last status line, before it, said that it is down. Services of a file that was
// loaded are all among xmlparser::allservices: none is passed over as unknown.
std::vector<recoverystep> recoveryof(const targetview& target)
{
    std::vector<recoverystep> steps{};
    const auto add = [&steps](const service& svc, bool stops, bool unlessdown) {
        steps.push_back(
            {svc.name, stops, stops ? stopcommand(svc) : startcommand(svc), unlessdown});
    };
    const service& monitored = *target.monitored.record;
    add(monitored, true, true);
    for (const serviceview& dependent : target.dependents) {
        add(*dependent.record, true, false);
    }
    add(monitored, false, false);
    for (const serviceview& dependent : target.dependents) {
        add(*dependent.record, false, false);
    }
    return steps;
}

// What the time line of an outage is made of.
struct course {
    plannedtime noticed{};                       // from the outage
    std::array<plannedtime, kRetries> retries{}; // from the failing ping or check
    plannedtime begins{};                        // likewise
    plannedtime again{};                         // from the recovery
    plannedtime recovered{};                     // likewise
    plannedtime round{};                         // from one recovery to the next one
};

void addrecovery(outageplan& outage, const course& course, long long number, bool last)
{
    const plannedtime noticed = course.noticed + (number - 1) * course.round;
    recoveryplan recovery{.number = number, .noticed = noticed, .begins = noticed + course.begins};
    std::transform(course.retries.begin(), course.retries.end(), recovery.retries.begin(),
                   [&noticed](const plannedtime& retry) { return noticed + retry; });
    if (!last) {
        recovery.again = recovery.begins + course.again;
        recovery.recovered = recovery.begins + course.recovered;
    }
    outage.recoveries.push_back(recovery);
}

// The last recovery is followed by one more pause and not by another ping.
void addrecoveries(outageplan& outage, const course& course, long long attempts)
{
    for (long long number = 1; number <= std::min(attempts, 2LL); ++number) {
        addrecovery(outage, course, number, number == attempts);
    }
    if (attempts > 2) {
        addrecovery(outage, course, attempts, true);
    }
}

outageplan generaloutage(const service& svc, long long attempts)
{
    course course{.noticed = roundof(svc)};
    course.begins = seconds(kFirstRetryPauseSeconds);
    for (plannedtime& retry : course.retries) {
        course.begins = course.begins + seconds(kGeneralRetryPauseSeconds);
        retry = course.begins;
    }
    course.again = kOneRecovery + generalpause(svc);
    course.recovered = course.again + roundof(svc);
    course.round = course.begins + course.again;

    const std::string& name = svc.name;
    outageplan outage{.noticed = course.noticed, .round = course.round};
    addrecoveries(outage, course, attempts);
    outage.givenup = course.noticed + attempts * course.round;
    outage.log = {
        "General ping failed for service " + name +
            ". Try to general ping more times now, if failed 3 times, will generally recover this "
            "service.",
        "Try the general recover for service " + name,
        "General ping failed for service " + name +
            ", but this service has been general recoverred successfully.",
        "Failed to general recover the sevice " + name + " after try the max times."};
    return outage;
}

outagemessages functionalmessages(const std::string& name)
{
    return {"Functionalping failed for service " + name +
                ". Try to ping more times now, if failed 3 times, will functionally recover this "
                "service.",
            "Try the functional recover for service " + name,
            "Functional ping failed for service " + name +
                ", but this service has been successfully functional recovered.",
            "Failed to functional recover the sevice " + name +
                " after try the max times. Will log and send indication to Kelmora Server"};
}

// Here the pause stands behind each retry.
course functionalcourse(const service& svc)
{
    const plannedtime pause = functionalpause(svc);
    course course{.noticed = roundof(svc)};
    course.begins = seconds(kFirstRetryPauseSeconds);
    for (plannedtime& retry : course.retries) {
        retry = course.begins;
        course.begins = course.begins + kOneCheck + seconds(kFunctionalRetryPauseSeconds);
    }
    course.again = kOneRecovery + seconds(kFunctionalRecoveryPauseSeconds) + pause;
    course.recovered = course.again + kOneCheck + pause;
    course.round = course.begins + course.again + kOneCheck;
    return course;
}

// A service that always counts as busy: what should prove a recovery is left out, and that counts
// as a success. It is checked next when as many have been left out as may be.
void leaveoutproof(course& course, const service& svc, long long skips)
{
    const plannedtime pause = functionalpause(svc);
    course.recovered = course.again + pause;
    course.again = course.again + skips * (pause + generalpause(svc));
    course.round = course.begins + course.again + kOneCheck;
}

outageplan functionaloutage(const service& svc, const checkplan& check, long long attempts)
{
    outageplan outage{.functional = true, .log = functionalmessages(svc.name)};
    course course = functionalcourse(svc);
    if (check.busy == busyness::always) {
        if (!check.unnoticed) {
            return outage;
        }
        course.noticed = *check.unnoticed;
        outage.unproven = attempts > 1;
    }
    if (outage.unproven) {
        leaveoutproof(course, svc, check.skips);
        addrecovery(outage, course, 1, false);
    } else {
        addrecoveries(outage, course, attempts);
        // The last round has no check at its end.
        outage.givenup = course.noticed + attempts * course.round;
        --outage.givenup->checks;
    }
    outage.noticed = course.noticed;
    outage.round = course.round;
    return outage;
}

targetplan planof(const targetview& target)
{
    const service& svc = *target.monitored.record;
    targetplan plan{.name = svc.name,
                    .program = svc.binarypath,
                    .attemptstext = svc.maxattemptofwakeup,
                    .attempts = settingnumber(svc.maxattemptofwakeup),
                    .statuscommand = statuscommand(svc),
                    .every = roundof(svc),
                    .check = checkof(svc),
                    .recovery = recoveryof(target)};
    plan.state = stateof(plan.attempts);
    if (plan.state == watching::kept) {
        plan.outages.push_back(generaloutage(svc, plan.attempts));
        if (plan.check) {
            plan.outages.push_back(functionaloutage(svc, *plan.check, plan.attempts));
        }
    } else {
        plan.givenuplog = generaloutage(svc, 0).log.givenup;
    }
    return plan;
}

// A refresh is due a tick before its period is over, counted from the start of the generation, and
// the next generation starts a tick later. Before that, all rounds have to end.
void addrefresh(std::vector<targetplan>& plans, int refresh)
{
    long long longest = 0;
    long long second = 0;
    const auto round = [](const targetplan& plan) {
        return plan.state == watching::kept ? plan.every.seconds : 0;
    };
    for (const targetplan& plan : plans) {
        second = std::max(second, std::min(longest, round(plan)));
        longest = std::max(longest, round(plan));
    }
    for (targetplan& plan : plans) {
        plan.refresh = refresh;
        if (plans.size() > 1) {
            plan.othersround = round(plan) == longest ? second : longest;
        }
    }
}

} // namespace

plannedtime operator+(const plannedtime& one, const plannedtime& other) noexcept
{
    return {sum(one.seconds, other.seconds), sum(one.checks, other.checks),
            sum(one.recoveries, other.recoveries)};
}

plannedtime operator*(long long times, const plannedtime& one) noexcept
{
    return {product(times, one.seconds), product(times, one.checks),
            product(times, one.recoveries)};
}

std::vector<targetplan> makeplan(const daemonview& view, int refresh)
{
    std::vector<targetplan> plans{};
    if (view.loaded) {
        plans.reserve(view.targets.size());
        std::transform(view.targets.begin(), view.targets.end(), std::back_inserter(plans), planof);
        addrefresh(plans, refresh);
    }
    return plans;
}

} // namespace check
