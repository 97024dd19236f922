// What the daemon makes of a file, and where in the file each value comes from: read by its own
// tokenizer and its own handler, which are only watched at their work.
#pragma once

#include <array>
#include <cstddef>
#include <string_view>
#include <vector>

#include "finding.h"
#include "wdmonitortarget.h"
#include "wdxmlparserhandler.h"

namespace check {

// Where a value of a record comes from. kNoPlace: from nowhere, it is the empty text of a daemon
// that has just started.
struct origin {
    std::size_t element = kNoPlace; // "<" of the start tag of the field element that stored it
    std::size_t text = kNoPlace;    // the text that was stored; kNoPlace: there was no text yet
};

// One record of the daemon's. `record` lies in xmlparser::alltargets.
struct serviceview {
    const service* record = nullptr;
    // The "<" of the start tag and of the end tag of the element that it was made of. kNoPlace: a
    // target without a service of its own, whose record is the one of the target before.
    std::size_t begin = kNoPlace;
    std::size_t end = kNoPlace;
    std::array<origin, kFieldElements.size()> origins; // in the order of kFieldElements
};

struct targetview {
    std::size_t begin = kNoPlace; // the "<" of its start tag
    std::size_t end = kNoPlace;   // the "<" of the end tag that completed it
    serviceview monitored;
    std::vector<serviceview> dependents;
};

struct daemonview {
    // False: the load fails, nothing is watched, and `failure` is the place of the tag without a
    // name that is to blame. `targets` then holds those before it, which the daemon drops.
    bool loaded = true;
    std::size_t failure = kNoPlace;
    std::vector<targetview> targets;

    // Where start tags of unknown names stand that stay open for ever, in order.
    std::vector<std::size_t> neverclosed;
};

// The index in kFieldElements of the field of this name, or kFieldElements.size().
std::size_t fieldindex(std::string_view name) noexcept;

// The index of the field that is this member.
std::size_t fieldindex(std::string service::*field) noexcept;

// Reads `text` as a daemon does that has just started; xmlparser::alltargets and allservices hold
// the result until the next call. Raises std::system_error where the system does not let it.
// The main thread only: the handler's state is the process's.
daemonview readasdaemon(std::string_view text);

} // namespace check
