// The file as its author plainly meant it: read as XML would be, leniently, with the place of
// everything. What strays from the daemon's dialect is understood all the same, and noted as an
// oddity: whether it does any harm shows when the daemon's own reading is held against this one.
#pragma once

#include <array>
#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "wdxmlparserhandler.h"

namespace check {

struct writtenfield {
    std::size_t field = 0; // index in kFieldElements
    std::size_t begin = 0; // the "<" of its start tag
    std::size_t end = 0;   // behind it all
    std::string value;     // what its text means, trimmed
};

struct writtenservice {
    std::size_t begin = 0;
    std::size_t end = 0;
    bool monitored = false; // else it is a dependent
    std::vector<writtenfield> fields;
    // Where in `fields` each stands last: a service may have as many as the file has room for.
    std::array<std::optional<std::size_t>, kFieldElements.size()> last{};

    void add(writtenfield field);

    // The field as it is written last, or null.
    [[nodiscard]] const writtenfield* find(std::size_t field) const noexcept;
};

struct writtentarget {
    std::size_t begin = 0;
    std::size_t end = 0;
    std::vector<writtenservice> services;
    std::optional<std::size_t> lastmonitored{}; // in `services`

    void add(writtenservice service);

    // The monitored service as it is written last, or null.
    [[nodiscard]] const writtenservice* monitored() const noexcept;
};

enum class oddkind {
    comment,
    cdata,
    doctype,
    instruction,  // also a declaration that is not at the first byte
    attribute,    // a start tag with more than its name
    entity,       //
    emptytag,     // no name, or a "/" before the ">": the load fails
    unknown,      // an element of another name
    lessthan,     // a "<" that begins no tag
    brokentag,    // a tag of ours without its ">"
    mismatched,   // a closing tag of another name
    strayclosing, // a closing tag of nothing that is open
    lateclosing,  // the closing tag of an element around others of ours that may not stand in it
    unclosed,     // an element of ours that is never closed
    misplaced,    // a group of ours where it does not belong
    lostfield,    // a field outside a service
    straytext,    // text between elements
    trailing,     // anything behind the root
    unfinished,   // the end of the text while something is open
};

struct oddity {
    oddkind kind;
    std::size_t begin;
    std::size_t end;
    std::string_view name;       // of the element or the tag, where it has one
    std::string_view other = {}; // mismatched: the element that it closes
};

struct document {
    std::vector<writtentarget> targets; // in the order of the file; they do not overlap
    std::vector<oddity> oddities;       // by their beginning
    bool rootopened = false;
    std::optional<std::size_t> rootend; // the "<" of the root's closing tag
    std::string_view rootclosing;       // its name as written, blanks included
};

// Reads `text`, which has to outlive the result. Any text; time in proportion to its length. Any
// thread.
document readdocument(std::string_view text);

} // namespace check
