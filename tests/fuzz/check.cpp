// The checker on any file: all that it does with one without running anything, as lines, as lines
// with colour, as a plan and as JSON. What it shows cannot steer a terminal, and what it says of
// the daemon's records is what the daemon's own reader makes of the same bytes.

#include <algorithm>
#include <array>
#include <cstdint>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <nlohmann/json.hpp>

#include "daemonview.h"
#include "finding.h"
#include "fuzz.h"
#include "handlerstate.h"
#include "json.h"
#include "load.h"
#include "machine.h"
#include "memoryfile.h"
#include "plan.h"
#include "report.h"
#include "rules.h"
#include "shape.h"
#include "sourcetext.h"
#include "values.h"
#include "wdsettings.h"
#include "wdxmlparserhandler.h"
#include "xmlparser.h"

namespace {

using nlohmann::json;

// Looks at the machine take far longer than all else: one unit in so many, by its size, has them.
constexpr std::size_t kLookEvery = 16;

constexpr std::size_t kNameBytes = 40; // of the unit, as the name of its file

// All that the checker says of one file.
struct Said {
    std::vector<check::finding> found;
    std::string lines;
    std::string colouredlines;
    std::string plan;
    std::string colouredplan;
    std::string asjson;
};

std::string nameof(const std::string& unit)
{
    return unit.substr(0, kNameBytes);
}

Said lint(const std::string& unit)
{
    const std::string name = nameof(unit);
    const check::sourcetext source(unit);
    const check::daemonview view = check::readasdaemon(source.text());
    check::findings found;
    check::checkshape(source, view, found);
    check::checkvalues(view, found);
    if (unit.size() % kLookEvery == 0) {
        check::checkmachine("-", view, found);
    }
    check::checkload(view, {}, found);
    Said said;
    said.found = found.sorted();
    const auto plan = check::makeplan(view, kDefaultRefreshSeconds);
    const auto written = [](const auto& write) {
        std::ostringstream out;
        write(out);
        return out.str();
    };
    const auto lines = [&](bool colour) {
        return written(
            [&](auto& out) { check::writefindings(out, name, source, said.found, colour); });
    };
    const auto planned = [&](bool colour) {
        return written([&](auto& out) { check::writeplan(out, plan, colour); });
    };
    said.lines = lines(false);
    said.colouredlines = lines(true);
    said.plan = planned(false);
    said.colouredplan = planned(true);
    auto result = check::resultjson(name, source, view, said.found);
    result["plan"] = check::planjson(plan);
    said.asjson = result.dump();
    return said;
}

// Whether it is UTF-8, in the eyes of another than the checker.
bool readable(const std::string& text)
{
    try {
        return !json(text).dump().empty();
    } catch (const json::type_error&) {
        return false;
    }
}

bool cansteer(const std::string& text)
{
    return std::any_of(text.begin(), text.end(), [](char byte) {
        const auto value = static_cast<unsigned char>(byte);
        return (value < 0x20 && byte != '\n' && byte != '\t') || value == 0x7f;
    });
}

// Without the sequences that set a colour.
std::string uncoloured(const std::string& text)
{
    std::string plain;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text.compare(i, 2, "\033[") == 0) {
            i = text.find_first_not_of("0123456789;", i + 2);
            demand(i != std::string::npos && text[i] == 'm', "sequences set colours only");
        } else {
            plain += text[i];
        }
    }
    return plain;
}

void trylines(const std::string& lines, const std::string& coloured)
{
    demand(!cansteer(lines), "no line steers a terminal");
    demand(readable(lines), "lines are UTF-8");
    demand(uncoloured(coloured) == lines, "colour adds nothing but colour");
}

// Of a text that is UTF-8.
std::size_t charactersof(const std::string& text)
{
    return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), [](char byte) {
        return (static_cast<unsigned char>(byte) & 0xc0U) != 0x80;
    }));
}

// What stands before this place in its line.
std::string before(const std::string& unit, std::size_t place)
{
    const std::size_t end = place == 0 ? std::string::npos : unit.rfind('\n', place - 1);
    const std::size_t begin = end == std::string::npos ? 0 : end + 1;
    return unit.substr(begin, place - begin);
}

void tryplaces(const std::vector<check::finding>& found, const json& findings,
               const std::string& unit)
{
    demand(found.size() == findings.size(), "all findings are in the JSON");
    std::size_t line = 1;
    std::size_t place = 0;
    for (std::size_t i = 0; i < found.size(); ++i) {
        demand(check::isrule(found[i].rule), "a finding is of a known rule");
        if (found[i].place == check::kNoPlace) {
            demand(!findings[i].contains("offset"), "no place, no offset");
            continue;
        }
        demand(found[i].place <= unit.size(), "findings stand in the file");
        demand(found[i].place >= place, "findings are in the file's order");
        line += static_cast<std::size_t>(
            std::count(unit.begin() + static_cast<std::ptrdiff_t>(place),
                       unit.begin() + static_cast<std::ptrdiff_t>(found[i].place), '\n'));
        place = found[i].place;
        demand(findings[i].at("offset") == place, "the offset is the place");
        demand(findings[i].at("line") == line, "the line is that of the place");
        const std::string left = before(unit, place);
        demand(!readable(left) || findings[i].at("column") == charactersof(left) + 1,
               "the column is that of the place");
    }
}

// The bytes of a text in the JSON.
std::string bytesof(const json& text)
{
    if (text.is_string()) {
        return text.get<std::string>();
    }
    constexpr int kHexadecimal = 16;
    const auto digits = text.at("hex").get<std::string>();
    std::string bytes;
    for (std::size_t i = 0; i < digits.size(); i += 2) {
        bytes += static_cast<char>(std::stoi(digits.substr(i, 2), nullptr, kHexadecimal));
    }
    demand(!readable(bytes), "only what is not UTF-8 is in digits");
    return bytes;
}

bool samerecord(const json& told, const service& record)
{
    return told.size() == kFieldElements.size() &&
           std::all_of(kFieldElements.begin(), kFieldElements.end(), [&](const auto& field) {
               return bytesof(told.at(std::string(field.name))) == record.*field.field;
           });
}

bool sametarget(const json& told, const wdmonitortarget& target)
{
    return samerecord(told.at("monitored"), target.monitoredservice) &&
           std::equal(told.at("dependents").begin(), told.at("dependents").end(),
                      target.dependentservices.begin(), target.dependentservices.end(), samerecord);
}

// False where the daemon cannot load the file. Its records are in xmlparser::alltargets.
bool loadasdaemon(const std::string& unit)
{
    static const MemoryFile file;
    file.write(unit);
    resethandler();
    try {
        return xmlparser::parse(file.path()) == 0;
    } catch (const std::out_of_range&) {
        return false;
    }
}

std::size_t bytesofrecords()
{
    const auto bytes = [](const service& record) {
        std::size_t sum = sizeof(service);
        for (const fieldelement& field : kFieldElements) {
            sum += (record.*field.field).size();
        }
        return sum;
    };
    std::size_t sum = 0;
    for (const wdmonitortarget& each : xmlparser::alltargets) {
        sum += bytes(each.monitoredservice);
        for (const service& dependent : each.dependentservices) {
            sum += bytes(dependent);
        }
    }
    return sum;
}

} // namespace

std::size_t tryunit(const std::string& unit, Stopwatch& watch)
{
    _tmp_file_path = kPingFolder;
    const Said said = [&] {
        const Stopwatch::Lap lap(watch);
        return lint(unit);
    }();
    trylines(said.lines, said.colouredlines);
    trylines(said.plan, said.colouredplan);
    const int status = check::statusof(said.found);
    demand(status >= 0 && status <= 2, "the status is one of the documented ones");

    const json result = json::parse(said.asjson);
    demand(bytesof(result.at("file")) == nameof(unit), "the file's name is told");
    tryplaces(said.found, result.at("findings"), unit);
    const bool loaded = loadasdaemon(unit);
    demand(result.at("loaded") == loaded, "the daemon can load what the checker says it can");
    const auto& told = result.at("targets");
    demand(loaded ? std::equal(told.begin(), told.end(), xmlparser::alltargets.begin(),
                               xmlparser::alltargets.end(), sametarget)
                  : told.empty(),
           "the targets are the daemon's");
    return unit.size() + bytesofrecords() + said.lines.size() + said.plan.size() +
           said.asjson.size();
}
