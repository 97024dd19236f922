#include "events.h"

#include <stdexcept>
#include <string_view>
#include <utility>

#include <fmt/core.h>

#include "columns.h"
#include "json.h"
#include "terminal.h"

namespace report {

namespace {

constexpr std::size_t kNameColumns = 16;

constexpr std::size_t kKinds = static_cast<std::size_t>(eventkind::kStep) + 1;

std::string_view colourof(const event& what)
{
    if (!what.became) {
        return tools::kPlain;
    }
    switch (*what.became) {
    case state::kUp:
        return tools::kGreen;
    case state::kBusy:
        return tools::kCyan;
    case state::kNotWatched:
        return tools::kFaint;
    case state::kUnknownService:
    case state::kGaveUp:
        return tools::kRed;
    default:
        return tools::kYellow;
    }
}

// Time, mark, service and words. A long name is not cut, but moves its line's words.
void writeline(std::ostream& out, const event& what, const std::string* name,
               const std::string& words, bool colour)
{
    const std::string shown = name == nullptr ? "-" : fitted(*name, std::string::npos);
    out << clocktext(what.when) << (what.inferred ? " ~ " : "   ")
        << filledbehind(shown, kNameColumns) << "  "
        << tools::coloured(colourof(what), words, colour && what.became) << '\n';
}

// Not written before it is sure that the log can be read.
std::string documentbegin()
{
    return fmt::format(R"({{"version":{},"events":[)", kFormatVersion);
}

void ensure(const std::ostream& out)
{
    if (!out) {
        throw std::runtime_error("the output cannot be written");
    }
}

} // namespace

bool isroutine(const event& what) noexcept
{
    if (what.became) {
        return false;
    }
    switch (what.kind) {
    case eventkind::kStep:
    case eventkind::kChecked:
    case eventkind::kSkipped:
    case eventkind::kFigures:
    case eventkind::kWatched: // at each refresh, as before
    case eventkind::kUnknown: // at each round, as before
        return true;
    default: // the listing is the configuration once more
        return what.source != nullptr && what.source->id == messageid::kListing;
    }
}

bool iswanted(const eventfilter& filter, const event& what, const std::string* name)
{
    if (!filter.services.empty() && (name == nullptr || !filter.services.contains(*name))) {
        return false;
    }
    if (!filter.kinds.empty() && !filter.kinds.contains(what.kind)) {
        return false;
    }
    if ((filter.since && what.when.clock < *filter.since) ||
        (filter.until && what.when.clock > *filter.until)) {
        return false;
    }
    return filter.all || !filter.kinds.empty() || !isroutine(what);
}

eventwriter::eventwriter(std::ostream& stream, eventfilter wished, eventform written)
    : out(stream), filter(std::move(wished)), form(written)
{
}

void eventwriter::told(const event& what, const std::string* name)
{
    if (!iswanted(filter, what, name)) {
        story.passover(what);
        return;
    }
    const std::string words = story.wordsof(what);
    switch (form) {
    case eventform::kText:
    case eventform::kColouredText:
        writeline(out, what, name, words, form == eventform::kColouredText);
        break;
    case eventform::kDocument:
        out << (std::exchange(first, false) ? documentbegin() + "\n" : ",\n")
            << eventjson(what, name, words, false);
        break;
    case eventform::kLines:
        out << eventjson(what, name, words, true) << '\n';
        break;
    }
    ensure(out);
}

void eventwriter::flush()
{
    out.flush();
    ensure(out);
}

void eventwriter::end()
{
    if (form == eventform::kDocument) {
        out << (first ? documentbegin() : "\n") << "]}\n";
    }
}

std::vector<std::string> eventkindwords()
{
    std::vector<std::string> words;
    for (std::size_t i = 0; i < kKinds; ++i) {
        words.emplace_back(wordof(static_cast<eventkind>(i)));
    }
    return words;
}

std::optional<eventkind> eventkindof(std::string_view word) noexcept
{
    for (std::size_t i = 0; i < kKinds; ++i) {
        if (wordof(static_cast<eventkind>(i)) == word) {
            return static_cast<eventkind>(i);
        }
    }
    return std::nullopt;
}

} // namespace report
