// What the daemon will do about each target, in seconds: reckoned with its own constants, its own
// conversions and its own commands.
//
// The daemon's commands have no time limit, and how long they take is known only when they are run.
// So a time is so many seconds of pauses, and so many checks and recoveries that come on top.
//
// The JSON form is an array with an object for each target, in the file's order. Commands, names
// and messages are strings as textjson() gives them. A time is an object {"seconds", "checks",
// "recoveries"}: so many seconds, plus so many times what the target's check takes, plus so many
// times what all the commands of one recovery take. Seconds that are more than 9223372036854775807
// are that number. The members of a target are
//
//   name, program    its name and its binarypath
//   state            "watched"; "given up" (maxattemptofwakeup is 0: given up as soon as watching
//                    begins) or "spinning" (it is negative: never asked, and a processor is busy)
//   attempts         maxattemptofwakeup as a number: how many recoveries there are in a row
//   status           how it is asked: "command", the shell's whole line, and "every", a time
//   check            null where there is none, else
//     command        the shell's whole line
//     every          a time: when none is left out
//     skips          how many may be left out in a row; null: any number
//     busy           when they are: "never", "over threshold", "always"
//     unnoticed      a time: how long a failure stays unnoticed if as many are left out as may be;
//                    null: without end
//     thresholds     what counts as busy is more than one of "processorpercent" (of one processor),
//                    "memorybytes" (resident) and "threads"
//   recovery         the commands of one recovery in their order, each with "service", "does"
//                    ("stop" or "start"), "command" and "unless": null, or "down" for the one that
//                    is left out when the last status line said that the service does not run
//   outages          empty unless the state is "watched". The first is that the service does not
//                    run, the second, where there is a check, that it runs and its check fails.
//                    Times count from the outage, which begins just after the service was last
//                    found well
//     kind           "general" or "functional"
//     noticed        when it is noticed, at the latest; null: never
//     round          how long it takes from a recovery to the next one
//     recoveries     of more than three the first, the second and the last one, each with
//       number       which one it is, from 1
//       noticed      the failing ping or check that led to it
//       retries      when it is asked or checked again before
//       begins       when the recovery begins
//       again        when the service is asked or checked next; null: not any more
//       recovered    when the line is logged that it was recovered, if it works again; null: never
//     givenup        when it is given up; null: never
//     unproven       true: the check that would follow a recovery is always left out as the service
//                    is always busy, which the daemon takes for a success; so it never gives up
//     log            the messages, without what stands before them in the log: "noticed", "begins",
//                    "recovered" and "givenup"
//   refresh          when a target that was given up is watched again: after "seconds" at the
//                    latest, if no other target is in a round then; else when these rounds have
//                    ended, which takes up to "others" (seconds, without commands) while all of
//                    these are well
#pragma once

#include <array>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include <nlohmann/json_fwd.hpp>

#include "daemonview.h"
#include "wdmonitorthread_linux.h"

namespace check {

// A time, or a length of time. Sums and multiples that do not fit are the greatest number.
struct plannedtime {
    long long seconds = 0;
    long long checks = 0;     // plus so many times what the check takes
    long long recoveries = 0; // plus so many times what the commands of a recovery take

    friend bool operator==(const plannedtime&, const plannedtime&) = default;
};

// Both are of no negative times. Any thread.
plannedtime operator+(const plannedtime& one, const plannedtime& other) noexcept;
plannedtime operator*(long long times, const plannedtime& one) noexcept;

enum class busyness {
    never,         // nobody looks at the thresholds
    overthreshold, //
    always,        // a threshold is one that every process is over
};

struct checkplan {
    std::string command{}; // as the shell gets it
    plannedtime every{};
    long long skips = 0; // below 0: any number
    busyness busy = busyness::never;
    std::optional<plannedtime> unnoticed{}; // nothing: without end
    double processorpercent = 0;            // of one processor
    double memorybytes = 0;
    long long threads = 0;
};

struct recoverystep {
    std::string service{};
    bool stops = false;
    std::string command{};
    bool unlessdown = false; // left out when the last status line said that it does not run
};

// Times count from the outage.
struct recoveryplan {
    long long number = 1;
    plannedtime noticed{};
    std::array<plannedtime, kRetries> retries{};
    plannedtime begins{};
    std::optional<plannedtime> again{};     // nothing: neither asked nor checked any more
    std::optional<plannedtime> recovered{}; // the line in the log, if it works
};

struct outagemessages {
    std::string noticed{};
    std::string begins{};
    std::string recovered{};
    std::string givenup{};
};

struct outageplan {
    bool functional = false; // its check fails; else it does not run
    std::optional<plannedtime> noticed{};
    plannedtime round{};
    std::vector<recoveryplan> recoveries{}; // the first, the second and the last one
    std::optional<plannedtime> givenup{};
    bool unproven = false; // no check follows a recovery, and that counts as success
    outagemessages log{};
};

enum class watching { kept, givenup, spinning };

struct targetplan {
    std::string name{};
    std::string program{};
    watching state = watching::kept;
    std::string attemptstext{}; // maxattemptofwakeup as the file has it
    long long attempts = 0;
    std::string statuscommand{}; // as the shell gets it
    plannedtime every{};
    std::optional<checkplan> check{};
    std::vector<recoverystep> recovery{};
    std::vector<outageplan> outages{};
    std::string givenuplog{};               // of a state of givenup
    long long refresh = 0;                  // seconds
    std::optional<long long> othersround{}; // seconds; nothing: there are no others
};

// The plan of each target; none for a file whose load fails. `refresh` is the daemon's refresh
// period in seconds, as globalrefresh. One thread.
std::vector<targetplan> makeplan(const daemonview& view, int refresh);

// Writes it in words. One thread.
void writeplan(std::ostream& out, const std::vector<targetplan>& plan, bool colour);

nlohmann::ordered_json planjson(const std::vector<targetplan>& plan);

} // namespace check
