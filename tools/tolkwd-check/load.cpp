#include "load.h"

#include <cmath>
#include <string>

#include "fields.h"
#include "wdmonitorthread_linux.h"

namespace check {

namespace {

// Taken where nothing has been measured. Seconds.
constexpr double kGuessedStatus = 0.05;
constexpr double kGuessedCheck = 1;

// How many pings and checks under way at once, on average, are too many.
constexpr double kTooMany = 1;
constexpr double kTenths = 10;

double seconds(const std::string& interval)
{
    return pauseseconds(settingnumber(interval));
}

// The part of the time that a target's pings and checks are under way: 1 is always.
double shareof(const service& record, const durations& taken)
{
    const double working = taken.status + taken.functional.value_or(0);
    const double pause =
        seconds(record.genpinginterval) + (ischecked(record) ? seconds(record.funpinginterval) : 0);
    return pause > 0 ? working / (pause + working) : 1;
}

durations guessed(const service& record)
{
    durations guess{.status = kGuessedStatus, .functional = {}};
    if (ischecked(record)) {
        guess.functional = kGuessedCheck;
    }
    return guess;
}

std::string basis(bool guess)
{
    return guess ? " if a status command takes " + shortnumber(kGuessedStatus) + " s and a check " +
                       shortnumber(kGuessedCheck) + " s, which are guesses (--probe measures)"
                 : " as they took now";
}

} // namespace

void checkload(const daemonview& view, const std::vector<durations>& measured, findings& found)
{
    double sum = 0;
    for (std::size_t i = 0; i < view.targets.size(); ++i) {
        const service& record = *view.targets[i].monitored.record;
        if (settingnumber(record.maxattemptofwakeup) > 0) { // else it is never asked
            sum += shareof(record, measured.empty() ? guessed(record) : measured.at(i));
        }
    }
    if (sum < kTooMany) {
        return;
    }
    found.add("lock-starved", severity::warning, kNoPlace,
              "about " + shortnumber(std::round(sum * kTenths) / kTenths) +
                  " status commands and checks are under way at once" + basis(measured.empty()) +
                  ": a recovery waits until none is, from 8 on mostly in vain; take longer "
                  "intervals or shorter checks, so that it is less than 1");
}

} // namespace check
