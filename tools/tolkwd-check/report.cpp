#include "report.h"

#include <algorithm>
#include <map>
#include <string_view>

#include "printable.h"
#include "terminal.h"

namespace check {

namespace {

// Of a line of any length, so much is shown around its place.
constexpr std::size_t kShownBytes = 120;
constexpr std::size_t kShownBefore = 60;
constexpr std::size_t kNumberWidth = 5;

// Whoever has this many to mend needs no more of them.
constexpr std::size_t kShownOfARule = 1000;

struct look {
    std::string_view word;
    std::string_view colour;
};

look lookof(severity level)
{
    switch (level) {
    case severity::error:
        return {"error", tools::kRed};
    case severity::warning:
        return {"warning", tools::kMagenta};
    case severity::note:
        break;
    }
    return {"note", tools::kCyan};
}

bool continues(char byte)
{
    return (static_cast<unsigned char>(byte) & 0xc0U) == 0x80;
}

// What stands below `text` to reach its end: blanks, and tabs where it has some.
std::string below(const std::string& text)
{
    std::string blanks;
    for (const char byte : text) {
        if (!continues(byte)) {
            blanks += byte == '\t' ? '\t' : ' ';
        }
    }
    return blanks;
}

void writesource(std::ostream& out, const sourcetext& source, std::size_t place, bool colour)
{
    const auto line = source.lineof(place);
    const std::size_t column = std::min(place - line.begin, line.text.size());
    std::size_t begin = column > kShownBefore ? column - kShownBefore : 0;
    while (begin > 0 && begin < column && continues(line.text[begin])) {
        ++begin;
    }
    std::size_t end = std::min(begin + kShownBytes, line.text.size());
    while (end < line.text.size() && end > column && continues(line.text[end])) {
        --end;
    }
    std::string_view shown = line.text.substr(begin, end - begin);
    if (end == line.text.size() && shown.ends_with('\r')) {
        shown.remove_suffix(1);
    }
    const std::string cut = begin > 0 ? "..." : "";
    const std::string before = cut + tools::printable(shown.substr(0, column - begin));
    std::string number = std::to_string(source.linenumber(place));
    number.insert(0, kNumberWidth - std::min(kNumberWidth, number.size()), ' ');
    out << number << " | " << cut << tools::printable(shown)
        << (end < line.text.size() ? "..." : "") << '\n'
        << std::string(number.size(), ' ') << " | " << below(before)
        << tools::coloured(tools::kGreen, "^", colour) << '\n';
}

void writefinding(std::ostream& out, const std::string& file, const sourcetext& source,
                  const finding& each, bool colour)
{
    const bool placed = each.place != kNoPlace;
    const position where = placed ? source.at(each.place) : position{1, 1};
    const std::string prefix =
        file + ":" + std::to_string(where.line) + ":" + std::to_string(where.column) + ":";
    const look look = lookof(each.level);
    out << tools::coloured(tools::kBold, prefix, colour) << ' '
        << tools::coloured(look.colour, std::string(look.word) + ":", colour) << ' '
        << tools::printable(each.message) << " [" << each.rule << "]\n";
    if (placed && !source.text().empty()) {
        writesource(out, source, each.place, colour);
    }
}

} // namespace

void writefindings(std::ostream& out, const std::string& name, const sourcetext& source,
                   const std::vector<finding>& found, bool colour)
{
    const std::string file = tools::printable(name);
    std::map<std::string_view, std::size_t> count;
    for (const finding& each : found) {
        if (each.place == kNoPlace || ++count[each.rule] <= kShownOfARule) {
            writefinding(out, file, source, each, colour);
        }
    }
    for (const auto& [rule, all] : count) {
        if (all > kShownOfARule) {
            out << file << ": " << all - kShownOfARule << " more of one rule; --json has all ["
                << rule << "]\n";
        }
    }
}

int statusof(const std::vector<finding>& found) noexcept
{
    int status = 0;
    for (const finding& each : found) {
        status = std::max(status, static_cast<int>(each.level));
    }
    return status;
}

} // namespace check
