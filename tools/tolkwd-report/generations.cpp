#include "generations.h"

namespace report {

namespace {

// From a thread's first debug line to its announcement.
constexpr std::int64_t kEntrySeconds = 5;

bool isrefresh(messageid id) noexcept
{
    switch (id) {
    case messageid::kRefreshBegins:
    case messageid::kBeforeJoin:
    case messageid::kAfterJoin:
    case messageid::kThreadJoined:
    case messageid::kThreadLeft:
        return true;
    default:
        return false;
    }
}

// The debug lines that tell something: one of them comes with each ping.
bool isstep(messageid id) noexcept
{
    switch (id) {
    case messageid::kPingSucceeded:
    case messageid::kPingSucceededByStatus:
    case messageid::kStatusAnswered:
    case messageid::kCheckSucceeded:
        return true;
    default:
        return false;
    }
}

} // namespace

void generations::hear(messageid id, const instant& when) noexcept
{
    if (isrefresh(id)) {
        steps = true;
        refreshed = true;
    } else if (isstep(id)) {
        steps = true;
    } else if (id == messageid::kThreadEntered) {
        steps = true;
        entered = when;
        hasentered = true;
    }
}

void generations::endwithdaemon() noexcept
{
    over = true;
    ended = true;
    refreshed = false;
}

generations::start generations::announced(const instant& when, bool threadagain, bool serviceagain,
                                          bool anything)
{
    const std::int64_t pause = secondsbetween(last, when);
    const bool begins = count == 0 || over || refreshed || threadagain ||
                        (serviceagain && pause > kSameBurstSeconds) || pause > kBurstPauseSeconds;
    last = when;
    if (!begins) {
        return start::kNone;
    }
    const start result = kindofstart(anything);
    if (result != start::kRefreshed) { // maybe with another command line
        steps = hasentered && secondsbetween(entered, when) <= kEntrySeconds;
    }
    ++count;
    begun = when;
    refreshed = false;
    over = false;
    ended = false;
    return result;
}

// Whoever writes debug lines tells of a refresh, too.
generations::start generations::kindofstart(bool anything) const noexcept
{
    if (refreshed) {
        return start::kRefreshed;
    }
    if (ended) {
        return start::kAnew;
    }
    if (!anything) {
        return start::kFirst;
    }
    return steps ? start::kAnew : start::kEither;
}

} // namespace report
