#include "json.h"

#include <algorithm>
#include <array>
#include <iomanip>

#include <nlohmann/json.hpp>

#include "textjson.h"

namespace check {

namespace {

using nlohmann::ordered_json;

std::string_view wordof(severity level)
{
    constexpr std::array<std::string_view, 3> kWords{"note", "warning", "error"};
    return kWords.at(static_cast<std::size_t>(level));
}

ordered_json findingjson(const sourcetext& source, const finding& found)
{
    ordered_json result{{"rule", found.rule}, {"severity", wordof(found.level)}};
    if (found.place != kNoPlace) {
        const position where = source.at(found.place);
        result["line"] = where.line;
        result["column"] = where.column;
        result["offset"] = std::min(found.place, source.text().size());
    }
    result["message"] = tools::textjson(found.message);
    return result;
}

ordered_json recordjson(const service& record)
{
    ordered_json result = ordered_json::object();
    for (const fieldelement& field : kFieldElements) {
        result[std::string(field.name)] = tools::textjson(record.*field.field);
    }
    return result;
}

ordered_json targetjson(const targetview& target)
{
    ordered_json dependents = ordered_json::array();
    for (const serviceview& each : target.dependents) {
        dependents.push_back(recordjson(*each.record));
    }
    return {{"monitored", recordjson(*target.monitored.record)}, {"dependents", dependents}};
}

} // namespace

ordered_json resultjson(const std::string& name, const sourcetext& source, const daemonview& view,
                        const std::vector<finding>& found)
{
    ordered_json list = ordered_json::array();
    for (const finding& each : found) {
        list.push_back(findingjson(source, each));
    }
    ordered_json targets = ordered_json::array();
    if (view.loaded) {
        for (const targetview& each : view.targets) {
            targets.push_back(targetjson(each));
        }
    }
    return {{"version", kFormatVersion},
            {"file", tools::textjson(name)},
            {"loaded", view.loaded},
            {"findings", list},
            {"targets", targets}};
}

void writeresult(std::ostream& out, const std::string& name, const sourcetext& source,
                 const daemonview& view, const std::vector<finding>& found,
                 const std::vector<targetplan>* plan, const std::vector<targetprobe>* probes)
{
    auto result = resultjson(name, source, view, found);
    if (plan != nullptr) {
        result["plan"] = planjson(*plan);
    }
    if (probes != nullptr) {
        result["probe"] = probejson(*probes);
    }
    out << std::setw(2) << result << '\n';
}

} // namespace check
