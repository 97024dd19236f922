#include "page.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string_view>

#include <nlohmann/json.hpp>

#include "pagetext.h"
#include "printable.h"

namespace report {

namespace {

using json = nlohmann::ordered_json;

constexpr std::size_t kEventKinds = static_cast<std::size_t>(eventkind::kStep) + 1;

// A moment that stands for the beginning of the log: all others are written as seconds since it, on
// both of its clocks, which keeps them short.
class timebase {
public:
    explicit timebase(const instant& beginning) noexcept : origin(beginning) {}

    [[nodiscard]] std::int64_t elapsed(const instant& when) const noexcept
    {
        return secondsbetween(origin, when);
    }
    [[nodiscard]] std::int64_t clock(const instant& when) const noexcept
    {
        return when.clock - origin.clock;
    }
    [[nodiscard]] json both(const instant& when) const { return {elapsed(when), clock(when)}; }

private:
    instant origin;
};

// Whether the log tells any time.
bool dated(const readcount& count) noexcept
{
    return count.first != instant{} || count.last != instant{};
}

// Where the log begins: where its first message stands, or the first span, if that is earlier.
instant beginning(const pagecontents& contents)
{
    instant first = contents.count.first;
    bool found = dated(contents.count);
    for (const pageservice& service : contents.services) {
        const instant& from =
            service.spans.empty() ? service.figures.now.from : service.spans.front().from;
        if (!found || from.elapsed < first.elapsed) {
            first = from;
            found = true;
        }
    }
    return first;
}

// [state, inferred, from, to], and both on the log's clock, too, where that has been set since the
// log's beginning.
json spanjson(const span& stretch, const timebase& base)
{
    json result{static_cast<int>(stretch.what), stretch.inferred ? 1 : 0,
                base.elapsed(stretch.from), base.elapsed(stretch.to)};
    if (base.clock(stretch.from) != base.elapsed(stretch.from) ||
        base.clock(stretch.to) != base.elapsed(stretch.to)) {
        result.push_back(base.clock(stretch.from));
        result.push_back(base.clock(stretch.to));
    }
    return result;
}

// A service that has just been named has a state, but no span yet.
json spansjson(const pageservice& service, const timebase& base)
{
    json result = json::array();
    for (const span& stretch : service.spans) {
        result.push_back(spanjson(stretch, base));
    }
    if (result.empty()) {
        result.push_back(spanjson(service.figures.now, base));
    }
    return result;
}

json outagejson(const std::optional<outage>& last, const timebase& base)
{
    if (!last) {
        return nullptr;
    }
    return {{"from", base.both(last->from)},
            {"to", last->to ? base.both(*last->to) : json(nullptr)}};
}

json markjson(const pagemark& mark, const timebase& base)
{
    return {static_cast<int>(mark.kind), mark.inferred ? 1 : 0, base.elapsed(mark.when),
            base.clock(mark.when), tools::printable(mark.words)};
}

json servicejson(const pageservice& service, const timebase& base)
{
    const account& figures = service.figures;
    const std::optional<double> availability = figures.availability();
    return {{"name", tools::printable(figures.name)},
            {"path", tools::printable(figures.path)},
            {"now", spanjson(figures.now, base)},
            {"lastoutage", outagejson(figures.lastoutage, base)},
            {"outages", figures.outages},
            {"outageseconds", figures.outageseconds},
            {"tried", figures.recoveriestried},
            {"successful", figures.recoveriessuccessful},
            {"gaveup", figures.gaveup},
            {"skipped", figures.skippedchecks},
            {"watched", figures.watchedseconds},
            {"availability", availability ? json(*availability) : json(nullptr)},
            {"spans", spansjson(service, base)}};
}

json statewords()
{
    json words = json::array();
    for (std::size_t which = 0; which < kStates; ++which) {
        words.push_back(wordof(static_cast<state>(which)));
    }
    return words;
}

// Those of them in which somebody should look.
json troublewords()
{
    json words = json::array();
    for (std::size_t which = 0; which < kStates; ++which) {
        if (istrouble(static_cast<state>(which))) {
            words.push_back(wordof(static_cast<state>(which)));
        }
    }
    return words;
}

json kindwords()
{
    json words = json::array();
    for (std::size_t kind = 0; kind < kEventKinds; ++kind) {
        words.push_back(wordof(static_cast<eventkind>(kind)));
    }
    return words;
}

json logjson(const pagecontents& contents, const timebase& base)
{
    const readcount& count = contents.count;
    json files = json::array();
    for (const std::string& name : contents.files) {
        files.push_back(tools::printable(name));
    }
    return {{"files", files},
            {"from", dated(count) ? base.both(count.first) : json(nullptr)},
            {"to", dated(count) ? base.both(count.last) : json(nullptr)},
            {"bytes", count.bytes},
            {"lines", count.lines},
            {"messages", count.messages},
            {"foreign", count.foreign},
            {"torn", count.torn},
            {"clockchanges", count.clockchanges}};
}

// In a script element nothing may look like a tag.
void writejson(std::ostream& out, const json& value)
{
    for (const char byte : value.dump()) {
        if (byte == '<') {
            out << "\\u003c";
        } else {
            out << byte;
        }
    }
}

// Begins the next member of the data.
void writename(std::ostream& out, std::string_view name)
{
    out << ",\n\"" << name << "\":";
}

void writemember(std::ostream& out, std::string_view name, const json& value)
{
    writename(out, name);
    writejson(out, value);
}

// One element after the other: a page's data may be large.
template <typename Items, typename Tojson>
void writearray(std::ostream& out, std::string_view name, const Items& items, Tojson tojson)
{
    writename(out, name);
    std::string_view separator = "[\n";
    for (const auto& item : items) {
        out << separator;
        writejson(out, tojson(item));
        separator = ",\n";
    }
    out << (items.empty() ? "[]" : "\n]");
}

} // namespace

void writepage(std::ostream& out, const pagecontents& contents)
{
    const instant first = beginning(contents);
    const timebase base(first);
    out << pagebeforedata() << R"({"version":1)";
    writemember(out, "clock", first.clock);
    writemember(out, "loadfailed", contents.loadfailed);
    writemember(out, "log", logjson(contents, base));
    writemember(out, "states", statewords());
    writemember(out, "troubles", troublewords());
    writemember(out, "kinds", kindwords());
    writearray(out, "services", contents.services,
               [&](const pageservice& service) { return servicejson(service, base); });
    // With the service's place in front.
    writearray(out, "marks", contents.marks, [&](const pagemark& mark) {
        return json{mark.service, markjson(mark, base)};
    });
    out << "}\n" << pageafterdata();
}

} // namespace report
