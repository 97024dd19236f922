// Messages -> what became of each service. Follows thread ids to services within a generation of
// monitor threads and across refreshes, where ids are used again, and keeps for each service its
// state and its figures; what happens goes to a witness.
//
// What only debug lines tell, the log without them leaves open. Then:
//   - Between its announcement and the first word about it a service is taken to be up.
//   - A retry that succeeds leaves no message. When the silence after a failure has outlasted all
//     the retries, or the thread speaks of something else, the service is taken to have come up at
//     the last retry that there would have been, or when its thread spoke again, if that is
//     earlier.
//   - A check that succeeds leaves none either: the next word about the service tells.
// Whatever begins by such a rule is marked as inferred.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "message.h"
#include "state.h"

namespace report {

using serviceid = std::uint32_t; // an index, in the order in which the log names them

// A stretch of one state.
struct span {
    state what = state::kNotWatched;
    instant from;
    instant to;            // of the last one: the end of the log
    bool inferred = false; // no message says that it began, or when
};

// A stretch in which a service was unavailable, from its first failure until it was up again or no
// longer watched.
struct outage {
    instant from;
    std::optional<instant> to{}; // none: it lasts
    bool inferred = false;       // no message says that it ended, or when
};

// Names and paths of more than so many bytes are known by their beginning.
inline constexpr std::size_t kLongestNameBytes = 4096;

// The name or path by which `text` is known: itself, or its first kLongestNameBytes and "...". No
// character of UTF-8 is cut in two. Any thread.
std::string knownname(std::string_view text);

// All that is known of one service, in constant memory. Times in seconds.
struct account {
    std::string name; // as the log has it, see knownname; may hold anything
    std::string path; // its binarypath; empty where the log does not tell
    span now;         // the state it is in, up to the last message of the log
    std::optional<outage> lastoutage;
    std::uint64_t outages = 0;
    std::uint64_t recoveriestried = 0;
    std::uint64_t recoveriessuccessful = 0; // as the daemon says
    std::uint64_t skippedchecks = 0;
    std::uint64_t gaveup = 0;        // how often
    std::int64_t outageseconds = 0;  // in all, the one that lasts included
    std::int64_t watchedseconds = 0; // in all: every state but not-watched

    // The share of the watched time in which the service was no outage, 0 to 1; none if there was
    // no such time.
    [[nodiscard]] std::optional<double> availability() const noexcept;
};

// What happened, for the history.
enum class eventkind : std::uint8_t {
    kWatched,   // a thread watches the service from now on
    kUnwatched, // no longer
    kState,     // a state begins, by inference or by a step that only debug lines tell
    kFailed,    // a ping or check failed and will be retried
    kRecoveryTried,
    kRecovered,
    kGaveUp,
    kUnknown,       // unknown service, command not recognised
    kSkipped,       // a check
    kChecked,       // a check is made
    kConfiguration, // load, refresh, a service that is not configured
    kDaemon,        // it started, ended, or the clock changed
    kFigures,       // of the process
    kStep,          // all that debug lines tell
};

// As users write it behind --kind: "recovery-tried".
std::string_view wordof(eventkind kind) noexcept;

// What something was inferred from.
enum class inference : std::uint8_t {
    kNone,          // not inferred
    kAnnounced,     // a service is taken to be up until the first word about it
    kRetryHelped,   // nothing came of a failure: a retry has succeeded
    kCheckHelped,   // no failure followed a check: it has succeeded
    kLeftOut,       // the others were announced anew, this service was not
    kNothingLoaded, // there was no configuration in force
    kDaemonEnded,   // the daemon ended, or had been silent for long when it was started anew
    kWatchedAnew,   // announcements begin anew: a refresh or a new start
    kStartedAnew,   // they do without a refresh
    kClockChanged,  // the log's clock went back, or by an hour forth
};

// In plain words, as half a sentence: "taken to be up until the first word about it". Any thread.
std::string_view wordsof(inference why) noexcept;

struct event {
    eventkind kind = eventkind::kStep;
    instant when;
    std::optional<serviceid> service; // none: about the daemon, or a thread that is not known
    std::optional<state> became;      // the state that it began
    bool inferred = false;
    inference why = inference::kNone;
    const message* source = nullptr; // none: inferred. Lives until the witness returns
};

// What the tracker tells while it hears. Functions that are not set are not called.
struct witness {
    // In the order of the log, but that an inferred one comes when it is known and is dated when it
    // happened.
    std::function<void(const event&)> happened;
    // A span that has come to its end, once it is sure that it has. Those of one service come in
    // order, touch each other, and are never empty.
    std::function<void(serviceid, const span&)> ended;
};

class tracker {
public:
    explicit tracker(witness told);
    ~tracker();
    tracker(const tracker&) = delete;
    tracker& operator=(const tracker&) = delete;

    // The next message. One thread.
    void hear(const message& said);

    // What is known at `when`, which is not before the last message: draws the conclusions that
    // silence up to then allows, and brings the open spans and all figures up to date. May be
    // called again, and hear() after it; conclusions that a later message refutes are taken back.
    // `final`: also ends the open spans for the witness; nothing is heard after it.
    void conclude(const instant& when, bool final);

    // How many services there are, in the order in which the log names them.
    [[nodiscard]] serviceid services() const noexcept;

    // A service's name, valid until the next message, and all that is known of it, as of the last
    // conclude().
    [[nodiscard]] std::string_view nameof(serviceid service) const;
    [[nodiscard]] account accountof(serviceid service) const;

    // Whether the last load of the configuration failed, so that nothing is watched.
    [[nodiscard]] bool loadfailed() const noexcept;

private:
    class work;
    std::unique_ptr<work> self;
};

} // namespace report
