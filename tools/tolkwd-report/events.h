// The history: a line for each thing that happened.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <ostream>
#include <set>
#include <string>
#include <vector>

#include "tracker.h"
#include "words.h"

namespace report {

// Which events are wanted. Sets that are empty leave out nothing.
struct eventfilter {
    std::set<std::string, std::less<>> services{};
    std::set<eventkind> kinds{};
    std::optional<std::int64_t> since{}; // on the log's clock, see instant
    std::optional<std::int64_t> until{}; // this second included
    bool all = false;                    // also what is routine
};

// Whether `what` is routine, as healthy services make it all day: checks, those left out, figures,
// announcements and steps, unless a state begins with it. Any thread.
bool isroutine(const event& what) noexcept;

// Whether an event of the service `name`, null for none, is wanted. Whoever names kinds wants the
// routine of these kinds, too. Any thread.
bool iswanted(const eventfilter& filter, const event& what, const std::string* name);

// How events are written.
enum class eventform : std::uint8_t {
    kText,
    kColouredText,
    kDocument, // one JSON document
    kLines,    // a JSON object a line
};

// Writes events as they are told. It needs constant memory per service. One thread.
class eventwriter {
public:
    eventwriter(std::ostream& stream, eventfilter wished, eventform written);

    // Writes what is wanted of them. `name`: the service's, null for none. Throws
    // std::runtime_error where it cannot be written.
    void told(const event& what, const std::string* name);

    // Has all that was told so far on its way. Throws std::runtime_error where it cannot be
    // written.
    void flush();

    // Behind the last event.
    void end();

private:
    std::ostream& out;
    eventfilter filter;
    eventform form;
    bool first = true;
    narrator story;
};

// All words of kinds, for a refusal and for help.
std::vector<std::string> eventkindwords();

// The kind that `word` names, none if it names none. Any thread.
std::optional<eventkind> eventkindof(std::string_view word) noexcept;

} // namespace report
