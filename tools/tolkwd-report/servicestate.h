// What becomes of one service: the state machine behind the tracker. It takes what the daemon says
// about the service, one message after the other, and tells which states begin and end. It knows
// nothing of threads, names and generations.
//
// What is not certain stays open until the next word about the service: a state that has just begun
// may be taken back by the message that refutes it. So a span is told as ended only when the one
// behind it stands.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "tracker.h"

namespace report {

// How long after its announcement the first word about a service may come and still tell how the
// announcement found it: the time of a status command.
inline constexpr std::int64_t kFirstWordSeconds = 5;

// How long the commands of the retries, and the wait for other services' recoveries, may take
// before silence counts as a success.
inline constexpr std::int64_t kPatienceSeconds = 120;

// A state that begins.
struct beginning {
    state what = state::kNotWatched;
    instant when;
    bool inferred = false;
    inference why = inference::kNone;
    bool bymessage = false; // by the message that was heard, and not by what it tells about before
};

// What came of one message.
struct turns {
    std::vector<beginning> begun;
    std::vector<span> ended;

    void clear() noexcept
    {
        begun.clear();
        ended.clear();
    }
};

// A plain value, in constant memory: a copy may be concluded to see what is known by now. One
// thread.
class servicestate {
public:
    // `changed`: when the log's clock was changed last, if ever; outlives this. What is inferred to
    // have been later is dated by the new clock.
    explicit servicestate(const std::optional<instant>& changed) noexcept : clockchange(&changed) {}

    // Whether a message of this kind, about the service, can change its state or its figures.
    static bool tells(messageid id) noexcept;

    // Who speaks. Several targets may name the same service; each of their threads has a check of
    // its own, and one thread's success does not end the failure that another one has found.
    enum class speaker : std::uint8_t {
        kOwn,   // the thread that told of the failure, or the only one
        kOther, // another one
    };

    // A message about the service, one of those that tell; the general part of a functional
    // recovery is not one. `steps`: debug lines are on, so that a retry that succeeds is told. What
    // comes of it is added to `told`.
    void hear(messageid id, const instant& when, bool steps, speaker who, turns& told);

    // No thread watches the service from `when` on. Unless the daemon has ended, which may be at
    // any moment, its thread had come to the end of its round first.
    void unwatch(const instant& when, bool inferred, inference why, bool steps, turns& told);

    // Draws the conclusions that silence up to `when` allows, and ends the last span there. Nothing
    // may be heard after it.
    void conclude(const instant& when, bool steps, turns& told);

    // The state it is in; not watched where nothing is known.
    [[nodiscard]] state current() const noexcept { return now.what; }

    // The figures, up to date after conclude(), into `result`; its texts stay as they are.
    void fill(account& result) const;

private:
    // What may still be refuted about `now`.
    enum class doubt : std::uint8_t {
        kNone,
        kAnnounced,    // nothing was heard since the announcement
        kUnchecked,    // the status command has just found it running, the check is to come
        kBeingChecked, // and has begun
    };

    void announce(const instant& when, bool steps, turns& told);
    void runs(const instant& when, turns& told);
    void pingsucceeds(const instant& when, turns& told);
    void checkbegins(const instant& when, turns& told);
    void checksucceeds(const instant& when, turns& told);
    void checkskipped(const instant& when, turns& told);
    void fails(state into, const instant& when, turns& told);
    void checkfails(state into, const instant& when, turns& told);
    void recovered(const instant& when, turns& told);
    void givesup(const instant& when, turns& told);
    void troubled(state into, const instant& when, turns& told);

    [[nodiscard]] bool isfresh(const instant& when) const noexcept;
    [[nodiscard]] bool isretried() const noexcept;
    [[nodiscard]] bool isanothers(const instant& when) const noexcept;
    [[nodiscard]] instant lastretry() const noexcept;
    void certify(const instant& when) noexcept;
    void settle(const instant& when, turns& told);
    void settleretry(const instant& when, turns& told);
    void settlesilence(const instant& when, bool steps, turns& told);
    void refute(const instant& when, turns& told);
    void begin(const beginning& next, turns& told);
    void beginbymessage(state what, const instant& when, turns& told);
    void count(const span& over);

    bool known = false;
    bool checkopen = false;         // a check was begun in a state that only its result ends
    speaker speaks = speaker::kOwn; // the message that is being heard
    bool retold = false;            // the beginning that was told last has been refuted
    doubt open = doubt::kNone;
    span now;
    instant least;            // `now` lasts until then
    std::optional<span> held; // the one before, not told yet
    instant announced;
    instant failed;
    instant checkbegan;
    const std::optional<instant>* clockchange;

    // Of the spans that stand.
    bool wasoutage = false;
    std::optional<outage> lastoutage;
    std::uint64_t outages = 0;
    std::int64_t outageseconds = 0;
    std::int64_t watchedseconds = 0;
    // Of the messages.
    std::uint64_t recoveriestried = 0;
    std::uint64_t recoveriessuccessful = 0;
    std::uint64_t skippedchecks = 0;
    std::uint64_t gaveup = 0;
};

} // namespace report
