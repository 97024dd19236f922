// Events in plain words: for the history on a terminal, in JSON and on the page.
#pragma once

#include <cstdint>
#include <deque>
#include <optional>
#include <string>

#include "tracker.h"

namespace report {

// What the words about a service's next event depend on.
struct tale {
    std::optional<instant> outage{}; // since when it lasts
    bool whole = false;              // the log has that outage from its first failure on
    bool fresh = false;              // its thread has said nothing but whom it watches
    std::uint64_t recoveries = 0;    // in this outage
    std::uint64_t recoveriesdue = 0; // its check has asked for them, and they have not begun yet
    std::optional<instant> before{}; // since when the outage had lasted before the announcement
    instant announced{};             // that took it to be over
};

// Tells what happens to the services. What an event means depends on those before it: which
// recovery of an outage it is, and how long the outage lasted. Needs constant memory per service.
class narrator {
public:
    // `what` in plain words, without its time and its service: one line, fit for a terminal; the
    // log's own values in it are cut where they are long. Each event is to be told or passed
    // over once, in the order in which the tracker tells it. One thread.
    std::string wordsof(const event& what);

    // The same for an event that nobody wants to read.
    void passover(const event& what);

private:
    tale& taleof(const event& what);

    std::deque<tale> tales; // by service
    tale nobody;            // of events that belong to no service
};

} // namespace report
