#include "servicestate.h"

#include <utility>

#include "wdmonitorthread_linux.h"

namespace report {

namespace {

// From a failure to the last retry: of the status command there is a pause before each, of the
// check behind each.
constexpr std::int64_t kLastGeneralRetrySeconds =
    kFirstRetryPauseSeconds + kRetries * kGeneralRetryPauseSeconds;
constexpr std::int64_t kLastFunctionalRetrySeconds =
    kFirstRetryPauseSeconds + (kRetries - 1) * kFunctionalRetryPauseSeconds;

// From a failure to the recovery.
constexpr std::int64_t kFunctionalRetriesSeconds =
    kFirstRetryPauseSeconds + kRetries * kFunctionalRetryPauseSeconds;

std::int64_t lastretryseconds(state failing) noexcept
{
    return failing == state::kSuspect ? kLastGeneralRetrySeconds : kLastFunctionalRetrySeconds;
}

std::int64_t retriesseconds(state failing) noexcept
{
    return failing == state::kSuspect ? kLastGeneralRetrySeconds : kFunctionalRetriesSeconds;
}

instant earlier(const instant& one, const instant& other) noexcept
{
    return secondsbetween(one, other) < 0 ? other : one;
}

instant later(const instant& when, std::int64_t seconds) noexcept
{
    return {when.clock + seconds, when.elapsed + seconds};
}

// Whether only the result of a check ends this state.
bool waitsforcheck(state what) noexcept
{
    return what == state::kFunctionalRecovering || what == state::kCommandNotRecognised;
}

} // namespace

bool servicestate::tells(messageid id) noexcept
{
    switch (id) {
    case messageid::kServiceNamed:
    case messageid::kThreadLeft:
    case messageid::kPingSucceeded:
    case messageid::kPingSucceededByStatus:
    case messageid::kServiceFailed:
    case messageid::kServiceUnknown:
    case messageid::kRecoveryTried:
    case messageid::kRecovered:
    case messageid::kGaveUp:
    case messageid::kCheckBegins:
    case messageid::kCheckSucceeded:
    case messageid::kCheckFailed:
    case messageid::kCheckNotRecognised:
    case messageid::kFunctionalRecoveryTried:
    case messageid::kFunctionallyRecovered:
    case messageid::kFunctionalGaveUp:
    case messageid::kCheckSkipped:
    case messageid::kCannotSkip:
    case messageid::kNoFigures:
        return true;
    default:
        return false;
    }
}

void servicestate::hear(messageid id, const instant& when, bool steps, speaker who, turns& told)
{
    speaks = who;
    switch (id) {
    case messageid::kServiceNamed:
        return announce(when, steps, told);
    case messageid::kThreadLeft:
        settle(when, told);
        return beginbymessage(state::kNotWatched, when, told);
    case messageid::kPingSucceeded:
    case messageid::kPingSucceededByStatus:
        return pingsucceeds(when, told);
    case messageid::kServiceFailed:
        return fails(state::kSuspect, when, told);
    case messageid::kServiceUnknown:
        return fails(state::kUnknownService, when, told);
    case messageid::kRecoveryTried:
        ++recoveriestried;
        return troubled(state::kRecovering, when, told);
    case messageid::kRecovered:
        return recovered(when, told);
    case messageid::kGaveUp:
    case messageid::kFunctionalGaveUp:
        return givesup(when, told);
    case messageid::kCheckBegins:
        return checkbegins(when, told);
    case messageid::kCheckSucceeded:
        return checksucceeds(when, told);
    case messageid::kCheckFailed:
        return checkfails(state::kFunctionalFailure, when, told);
    case messageid::kCheckNotRecognised:
        return checkfails(state::kCommandNotRecognised, when, told);
    case messageid::kFunctionalRecoveryTried:
        ++recoveriestried;
        return troubled(state::kFunctionalRecovering, when, told);
    case messageid::kFunctionallyRecovered:
        return recovered(when, told);
    case messageid::kCheckSkipped:
        return checkskipped(when, told);
    default: // kCannotSkip, kNoFigures
        return runs(when, told);
    }
}

void servicestate::unwatch(const instant& when, bool inferred, inference why, bool steps,
                           turns& told)
{
    if (!known) {
        return;
    }
    speaks = speaker::kOwn;
    settlesilence(when, steps, told);
    if (why != inference::kDaemonEnded) {
        settle(when, told);
    }
    checkopen = false;
    begin({state::kNotWatched, when, inferred, why, false}, told);
}

void servicestate::conclude(const instant& when, bool steps, turns& told)
{
    if (!known) {
        now = {state::kNotWatched, when, when, true};
        return;
    }
    settlesilence(when, steps, told);
    if (held) {
        count(*held);
        told.ended.push_back(*held);
        held.reset();
    }
    now.to = secondsbetween(now.from, when) < 0 ? now.from : when;
    count(now);
    if (now.from.elapsed != now.to.elapsed) {
        told.ended.push_back(now);
    }
}

void servicestate::fill(account& result) const
{
    result.now = now;
    result.lastoutage = lastoutage;
    result.outages = outages;
    result.recoveriestried = recoveriestried;
    result.recoveriessuccessful = recoveriessuccessful;
    result.skippedchecks = skippedchecks;
    result.gaveup = gaveup;
    result.outageseconds = outageseconds;
    result.watchedseconds = watchedseconds;
}

// A thread that is announced while a failure is retried has not made these retries: before a
// refresh they were made, before a new start of the daemon they were not. The first word tells. A
// functional recovery comes to its end before a refresh, so only a new start cuts it short.
void servicestate::announce(const instant& when, bool steps, turns& told)
{
    settlesilence(when, steps, told);
    if (isfresh(when)) { // announced twice: the first one has told nothing
        refute(when, told);
    }
    if (checkopen && now.what == state::kCommandNotRecognised) {
        settle(when, told);
    }
    checkopen = false;
    announced = when;
    if (known && now.what == state::kUp) {
        open = doubt::kNone;
        return;
    }
    if (isretried() && !steps && secondsbetween(lastretry(), when) > 0) {
        settleretry(when, told);
    } else {
        begin({state::kUp, when, true, inference::kAnnounced, true}, told);
    }
    open = doubt::kAnnounced;
}

// A line about its check: the status command of this round has found it running.
void servicestate::runs(const instant& when, turns& told)
{
    if (open == doubt::kBeingChecked) { // a round has passed since
        open = doubt::kNone;
    }
    certify(when);
    settle(when, told);
    if (!known || now.what == state::kRecovering || now.what == state::kNotWatched ||
        now.what == state::kUnknownService || now.what == state::kGaveUp) {
        beginbymessage(state::kUp, when, told);
        open = doubt::kUnchecked;
    }
}

// Of a retry that is told, the time is certain.
void servicestate::pingsucceeds(const instant& when, turns& told)
{
    if (known && now.what == state::kSuspect) {
        beginbymessage(state::kUp, when, told);
        return;
    }
    const bool before = open == doubt::kUnchecked;
    runs(when, told);
    if (before) { // and again: a round has passed
        open = doubt::kNone;
    }
}

void servicestate::checkbegins(const instant& when, turns& told)
{
    runs(when, told);
    if (now.what == state::kBusy) {
        beginbymessage(state::kUp, when, told);
    }
    if (open == doubt::kUnchecked) {
        open = doubt::kBeingChecked;
    }
    if (isanothers(when)) {
        return;
    }
    checkopen = waitsforcheck(now.what);
    checkbegan = when;
}

void servicestate::checksucceeds(const instant& when, turns& told)
{
    certify(when);
    if (isanothers(when)) {
        return;
    }
    checkopen = false;
    beginbymessage(state::kUp, when, told);
    open = doubt::kNone;
}

void servicestate::checkskipped(const instant& when, turns& told)
{
    ++skippedchecks;
    if (isanothers(when)) {
        return;
    }
    if (isfresh(when) && held && held->what == state::kBusy) {
        refute(when, told);
    }
    certify(when);
    settle(when, told);
    beginbymessage(state::kBusy, when, told);
}

// The first ping of a round has failed.
void servicestate::fails(state into, const instant& when, turns& told)
{
    if (isfresh(when)) {
        refute(when, told);
    } else {
        settle(when, told);
    }
    beginbymessage(into, when, told);
    failed = when;
}

// The first check of a round has failed. What that round's ping has just found running has not
// come up by that.
void servicestate::checkfails(state into, const instant& when, turns& told)
{
    if (isanothers(when)) {
        return;
    }
    checkopen = false;
    if (isretried() && now.what == into && secondsbetween(failed, when) == 0) {
        return; // the same failure, found by another target's thread
    }
    const bool doubted = isfresh(when) || open == doubt::kUnchecked || open == doubt::kBeingChecked;
    const bool goeson = held && (held->what == into || (isoutage(held->what) && isoutage(into)));
    if (doubted && goeson) {
        refute(when, told);
    } else {
        certify(when);
        settle(when, told);
    }
    beginbymessage(into, when, told);
    failed = when;
}

// A service that is busy stays so: its check was left out.
void servicestate::recovered(const instant& when, turns& told)
{
    ++recoveriessuccessful;
    settle(when, told);
    checkopen = false;
    if (!known || isoutage(now.what) || now.what == state::kNotWatched) {
        beginbymessage(state::kUp, when, told);
    }
    open = doubt::kNone;
}

void servicestate::givesup(const instant& when, turns& told)
{
    ++gaveup;
    troubled(state::kGaveUp, when, told);
}

// Whatever it is, the announcement had found it so.
void servicestate::troubled(state into, const instant& when, turns& told)
{
    checkopen = false;
    if (isfresh(when)) {
        refute(when, told);
    }
    beginbymessage(into, when, told);
}

bool servicestate::isfresh(const instant& when) const noexcept
{
    return open == doubt::kAnnounced && secondsbetween(announced, when) <= kFirstWordSeconds;
}

bool servicestate::isretried() const noexcept
{
    return known && (now.what == state::kSuspect || now.what == state::kFunctionalFailure);
}

// Whether the check that is failing, and of which more is to be told, is another thread's.
bool servicestate::isanothers(const instant& when) const noexcept
{
    if (!known || speaks == speaker::kOwn) {
        return false;
    }
    return now.what == state::kFunctionalRecovering ||
           (now.what == state::kFunctionalFailure &&
            secondsbetween(failed, when) <= retriesseconds(now.what) + kPatienceSeconds);
}

instant servicestate::lastretry() const noexcept
{
    const instant result = later(failed, lastretryseconds(now.what));
    const std::optional<instant>& changed = *clockchange;
    if (changed && secondsbetween(failed, *changed) > 0 && secondsbetween(*changed, result) >= 0) {
        return later(*changed, secondsbetween(*changed, result));
    }
    return result;
}

// It runs: if this is the first word since the announcement, and comes soon enough, it tells how
// the announcement found it.
void servicestate::certify(const instant& when) noexcept
{
    if (isfresh(when)) {
        if (now.from == announced) {
            now.inferred = false;
        }
        open = doubt::kUnchecked;
    } else if (open == doubt::kAnnounced) {
        open = doubt::kNone;
    }
}

// The thread speaks of something else than what was open: that has come to a good end.
void servicestate::settle(const instant& when, turns& told)
{
    if (isanothers(when)) {
        return;
    }
    if (checkopen) {
        checkopen = false;
        begin({state::kUp, checkbegan, true, inference::kCheckHelped, false}, told);
    } else if (isretried()) {
        settleretry(when, told);
    }
}

void servicestate::settleretry(const instant& when, turns& told)
{
    begin({state::kUp, earlier(lastretry(), when), true, inference::kRetryHelped, false}, told);
}

// With debug lines silence is no success: a retry would have told it.
void servicestate::settlesilence(const instant& when, bool steps, turns& told)
{
    if (!steps && isretried() &&
        secondsbetween(failed, when) > retriesseconds(now.what) + kPatienceSeconds) {
        settleretry(when, told);
    }
}

// What is now has never begun: what was before goes on, at least until `when`.
void servicestate::refute(const instant& when, turns& told)
{
    if (told.begun.empty()) {
        retold = true;
    } else {
        told.begun.pop_back();
    }
    open = doubt::kNone;
    if (held) {
        now = *held;
        held.reset();
        least = when;
    } else {
        known = false;
    }
}

void servicestate::begin(const beginning& next, turns& told)
{
    beginning begun = next;
    if (known && secondsbetween(least, begun.when) < 0) {
        begun.when = least;
    }
    if (known && now.what != begun.what && now.from.elapsed == begun.when.elapsed) {
        refute(begun.when, told); // it would be an empty span
    }
    open = doubt::kNone;
    const bool again = std::exchange(retold, false);
    if (known && now.what == begun.what) {
        if (again) {
            told.begun.push_back(begun);
        }
        return;
    }
    if (held) {
        count(*held);
        told.ended.push_back(*held);
        held.reset();
    }
    if (known) {
        held = now;
        held->to = begun.when;
    }
    known = true;
    now = {begun.what, begun.when, begun.when, begun.inferred};
    least = begun.when;
    told.begun.push_back(begun);
}

void servicestate::beginbymessage(state what, const instant& when, turns& told)
{
    begin({what, when, false, inference::kNone, true}, told);
}

void servicestate::count(const span& over)
{
    const std::int64_t seconds = secondsbetween(over.from, over.to);
    const bool isnow = isoutage(over.what);
    if (over.what != state::kNotWatched) {
        watchedseconds += seconds;
    }
    if (isnow) {
        outageseconds += seconds;
        if (!wasoutage) {
            ++outages;
            lastoutage = outage{.from = over.from};
        }
    } else if (wasoutage) {
        lastoutage->to = over.from;
        lastoutage->inferred = over.inferred;
    }
    wasoutage = isnow;
}

} // namespace report
