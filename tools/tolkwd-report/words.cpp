#include "words.h"

#include <algorithm>
#include <string_view>

#include <fmt/core.h>

#include "printable.h"
#include "servicestate.h"
#include "wdmonitorthread_linux.h"

namespace report {

namespace {

constexpr std::int64_t kGeneralRetriesSeconds =
    kFirstRetryPauseSeconds + kRetries * kGeneralRetryPauseSeconds;
constexpr std::int64_t kFunctionalRetriesSeconds =
    kFirstRetryPauseSeconds + kRetries * kFunctionalRetryPauseSeconds;

// What a message says, where it always says the same. Empty where it needs more than that.
std::string_view fixedwords(messageid id)
{
    switch (id) {
    case messageid::kThreadEntered:
        return "its thread begins";
    case messageid::kThreadLeft:
        return "its thread ends, for a refresh";
    case messageid::kThreadCreated:
        return "a thread was made";
    case messageid::kThreadJoined:
        return "a thread has ended";
    case messageid::kNoTarget:
        return "a thread without a service ends: a fault of the daemon";
    case messageid::kRefreshBegins:
        return "a refresh begins: each service is watched anew once all threads have ended";
    case messageid::kBeforeJoin:
        return "the refresh waits for a thread to end";
    case messageid::kAfterJoin:
        return "the refresh goes on";
    case messageid::kLoadFailed:
        return "the configuration holds an empty tag: nothing is watched until the next refresh";
    case messageid::kNoLock:
        return "the daemon ends: the system has no lock for it";
    case messageid::kConfigurationUnreadable:
        return "the configuration cannot be opened: nothing is watched until the next refresh";
    case messageid::kNoLog:
        return "the daemon ends: its log cannot be opened";
    case messageid::kPingBegins:
        return "to be asked for its state, after recoveries under way";
    case messageid::kPingAsks:
        return "asked for its state";
    case messageid::kNoStatusFile:
        return "its status command left no output";
    case messageid::kPingSucceeded:
    case messageid::kPingSucceededByStatus:
        return "found running";
    case messageid::kPingFailed:
        return "found not running";
    case messageid::kPingUnknown:
        return "not known to its status command";
    case messageid::kPingUnclear:
        return "its status command failed without words that are understood";
    case messageid::kServiceUnknown:
        return "its status command does not know it; nobody watches it until the next refresh";
    case messageid::kPingRetry:
        return "its status is to be asked once more";
    case messageid::kRecoveryWaits:
        return "its recovery waits for its turn";
    case messageid::kRecoveryBegins:
        return "its recovery has its turn";
    case messageid::kNotConfigured:
        return "not among the configured services, so a command is left out: a fault of the "
               "daemon";
    case messageid::kRecoveryEnds:
        return "its recovery is over; the next ping tells whether it helped";
    case messageid::kRecovered:
        return "the daemon reports its recovery";
    case messageid::kNoCheck:
        return "it has no check";
    case messageid::kCheckBegins:
        return "it runs, and is checked";
    case messageid::kNoCheckFile:
        return "its check left no output";
    case messageid::kCheckNotRecognised:
        return "it runs, but its check's command is not found: not checked, not recovered";
    case messageid::kCheckRetry:
        return "checked once more";
    case messageid::kFunctionallyRecovered:
        return "the daemon reports that it works again";
    case messageid::kCannotSkip:
        return "its check is made however busy it is";
    case messageid::kNoFigures:
        return "no process of its program is found, so no figures of it either";
    default:
        return {};
    }
}

std::string_view wordsof(state which)
{
    switch (which) {
    case state::kUp:
        return "up";
    case state::kBusy:
        return "up, and too busy to be checked";
    case state::kNotWatched:
        return "nobody watches it any more";
    case state::kCommandNotRecognised:
        return "it runs, but its check's command is not found";
    case state::kSuspect:
        return "it does not run; being asked again";
    case state::kFunctionalFailure:
        return "it runs, but its check fails; being checked again";
    case state::kRecovering:
    case state::kFunctionalRecovering:
        return "being recovered";
    case state::kUnknownService:
        return "its status command does not know it; nobody watches it";
    case state::kGaveUp:
        return "given up; nobody watches it";
    }
    return {};
}

// What only a kind tells, of an event without a message and without a state.
std::string_view wordsof(eventkind kind)
{
    switch (kind) {
    case eventkind::kWatched:
        return "watched from now on";
    case eventkind::kUnwatched:
        return "nobody watches it any more";
    case eventkind::kConfiguration:
        return "watched anew: a refresh, or the daemon was started again";
    case eventkind::kDaemon:
        return "the daemon was started again, or its clock was set";
    default:
        return wordof(kind);
    }
}

// What a message says with its values in it.
std::string withvalues(const message& said)
{
    const std::string first = tools::brief(said.first);
    const std::string second = tools::brief(said.second);
    switch (said.id) {
    case messageid::kBinaryPathNamed:
        return "its program is " + first;
    case messageid::kCommandLineRefused:
        return "the daemon refuses its command line: " + tools::brief(said.text);
    case messageid::kStatusAnswered:
        return second.empty() ? "its status command has ended, without a word"
                              : "its status command says: " + second;
    case messageid::kRetriesLeft:
        return fmt::format("{} retries of its status command are left", first);
    case messageid::kGeneralPause:
        return fmt::format("to be asked again in {} s", first);
    case messageid::kCheckAsks:
        return "its check is run: " + second;
    case messageid::kCheckSucceeded:
        return "its check succeeded: " + second;
    case messageid::kCheckException:
    case messageid::kCheckUnclear:
        return first.empty() ? "its check gave no answer" : "its check failed: " + first;
    case messageid::kCheckNotFound:
        return "its check's command is not found: " + first;
    case messageid::kFunctionalPause:
        return fmt::format("a pause of {} s", first);
    case messageid::kCheckSkipped:
        return fmt::format("too busy to be checked; {} left out in a row", second);
    default:
        return tools::brief(said.text);
    }
}

std::string failurewords(std::string_view what, std::string_view again, std::int64_t seconds)
{
    return fmt::format("{}; {} for {} before it is recovered", what, again, spantext(seconds));
}

// Which recovery of the outage it is, where the log has those before it.
std::string recoverynumber(const tale& past)
{
    return past.whole ? fmt::format("recovery {}", past.recoveries) : "a recovery";
}

std::string giveupwords(const tale& past)
{
    constexpr std::string_view kRest = "; nobody watches it until the next refresh";
    if (past.fresh) {
        return fmt::format("given up unasked: it may have no recovery{}", kRest);
    }
    if (!past.whole || past.recoveries == 0) {
        return fmt::format("given up after its recoveries{}", kRest);
    }
    return fmt::format("given up after {} recover{}{}", past.recoveries,
                       past.recoveries == 1 ? "y" : "ies", kRest);
}

// What the announcement finds is not known yet.
std::string announcementwords(const event& what, const tale& past)
{
    if (what.became != state::kUp) {
        return "watched anew";
    }
    if (!past.outage) {
        return "watched from now on, and taken to be up";
    }
    return fmt::format("watched anew, and taken to be up, after an outage of {}",
                       spantext(secondsbetween(*past.outage, what.when)));
}

// What a message says whose words depend on what was before.
std::string storywords(const event& what, const tale& past)
{
    switch (what.source->id) {
    case messageid::kServiceNamed:
        return announcementwords(what, past);
    case messageid::kServiceFailed:
        return failurewords("its status command failed", "asked again", kGeneralRetriesSeconds);
    case messageid::kCheckFailed:
        return failurewords("it runs, but its check failed", "checked again",
                            kFunctionalRetriesSeconds);
    case messageid::kFunctionalRecoveryTried:
        return recoverynumber(past) + " is due: its check still fails";
    case messageid::kRecoveryTried:
        return recoverynumber(past) + " begins: stopped and started, with those that depend on it";
    case messageid::kGaveUp:
    case messageid::kFunctionalGaveUp:
        return giveupwords(past);
    default:
        return withvalues(*what.source);
    }
}

// What an event means that no message tells.
std::string_view inferredwords(const event& what)
{
    if (const std::string_view why = wordsof(what.why); !why.empty()) {
        return why;
    }
    return what.became ? wordsof(*what.became) : wordsof(what.kind);
}

std::string plainwords(const event& what, const tale& past)
{
    if (what.source != nullptr) {
        const std::string_view always = fixedwords(what.source->id);
        return always.empty() ? storywords(what, past) : std::string(always);
    }
    return std::string(inferredwords(what));
}

bool beginsoutage(messageid id)
{
    return id == messageid::kServiceFailed || id == messageid::kCheckFailed ||
           id == messageid::kServiceUnknown;
}

// The first of the two messages of a recovery for a check's sake counts it.
void countrecovery(messageid id, tale& past)
{
    if (id == messageid::kFunctionalRecoveryTried) {
        ++past.recoveries;
        ++past.recoveriesdue;
    } else if (id == messageid::kRecoveryTried && past.recoveriesdue > 0) {
        --past.recoveriesdue;
    } else if (id == messageid::kRecoveryTried) {
        ++past.recoveries;
    }
}

bool isannouncement(const event& what)
{
    return what.source != nullptr && what.source->id == messageid::kServiceNamed;
}

// The outage that begins, or one that an announcement had taken to be over goes on.
tale outagebegun(const event& what, const tale& past)
{
    tale result;
    const bool goeson =
        past.before && secondsbetween(past.announced, what.when) <= kFirstWordSeconds;
    result.outage = goeson ? *past.before : what.when;
    result.whole = what.source != nullptr && beginsoutage(what.source->id);
    result.fresh = past.fresh;
    return result;
}

// Before `what` is told.
void beginstory(const event& what, tale& past)
{
    if (what.became && isoutage(*what.became) && !past.outage) {
        past = outagebegun(what, past);
    }
    if (what.source != nullptr) {
        countrecovery(what.source->id, past);
    }
}

// What a thread says before its first ping is answered.
bool saysnothingyet(messageid id)
{
    return id == messageid::kServiceNamed || id == messageid::kBinaryPathNamed ||
           id == messageid::kThreadEntered || id == messageid::kThreadCreated;
}

// After `what` is told.
void endstory(const event& what, tale& past)
{
    if (what.became && !isoutage(*what.became)) {
        tale next;
        if (isannouncement(what)) {
            next.announced = what.when;
            next.before = past.outage;
        }
        past = next;
    }
    past.fresh = isannouncement(what) ||
                 (past.fresh && what.source != nullptr && saysnothingyet(what.source->id));
}

// How long the outage lasted that `what` ends; nothing where it ends none.
std::string endwords(const event& what, const tale& past)
{
    if (!past.outage || !what.became || isoutage(*what.became) || isannouncement(what)) {
        return {};
    }
    const std::string length = spantext(secondsbetween(*past.outage, what.when));
    if (*what.became == state::kNotWatched) {
        return fmt::format("an outage of {} is not followed further: ", length);
    }
    return fmt::format("up again, after {}{}: ", what.inferred ? "about " : "", length);
}

} // namespace

std::string narrator::wordsof(const event& what)
{
    tale& past = taleof(what);
    beginstory(what, past);
    std::string words = endwords(what, past) + plainwords(what, past);
    endstory(what, past);
    return words;
}

void narrator::passover(const event& what)
{
    tale& past = taleof(what);
    beginstory(what, past);
    endstory(what, past);
}

tale& narrator::taleof(const event& what)
{
    if (!what.service) {
        return nobody;
    }
    tales.resize(std::max<std::size_t>(tales.size(), *what.service + std::size_t{1}));
    return tales[*what.service];
}

} // namespace report
