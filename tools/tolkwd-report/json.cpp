#include "json.h"

#include <nlohmann/json.hpp>

#include "textjson.h"

namespace report {

namespace {

using nlohmann::ordered_json;

ordered_json timejson(const readcount& count, const instant& when)
{
    return hastime(count) ? ordered_json(isotext(when)) : ordered_json();
}

ordered_json logjson(const overview& seen)
{
    ordered_json files = ordered_json::array();
    for (const std::string& name : seen.files) {
        files.push_back(tools::textjson(name));
    }
    const readcount& count = seen.count;
    return {{"files", files},
            {"from", timejson(count, count.first)},
            {"to", timejson(count, count.last)},
            {"lines", count.lines},
            {"messages", count.messages},
            {"foreign", count.foreign},
            {"torn", count.torn}};
}

ordered_json outagejson(const outage& last, const instant& judged)
{
    return {{"from", isotext(last.from)},
            {"to", last.to ? ordered_json(isotext(*last.to)) : ordered_json()},
            {"seconds", secondsbetween(last.from, last.to.value_or(judged))},
            {"inferred", last.inferred}};
}

ordered_json servicejson(const account& service, const instant& judged)
{
    const auto availability = service.availability();
    return {{"service", tools::textjson(service.name)},
            {"state", wordof(service.now.what)},
            {"inferred", service.now.inferred},
            {"since", isotext(service.now.from)},
            {"seconds", secondsbetween(service.now.from, judged)},
            {"path", service.path.empty() ? ordered_json() : tools::textjson(service.path)},
            {"lastoutage",
             service.lastoutage ? outagejson(*service.lastoutage, judged) : ordered_json()},
            {"outages", service.outages},
            {"outageseconds", service.outageseconds},
            {"recoveries",
             {{"tried", service.recoveriestried}, {"successful", service.recoveriessuccessful}}},
            {"skippedchecks", service.skippedchecks},
            {"gaveup", service.gaveup},
            {"watchedseconds", service.watchedseconds},
            {"availability", availability ? ordered_json(*availability) : ordered_json()}};
}

// The message as it was written, with the lines that belong to it.
ordered_json saidjson(const message* said)
{
    if (said == nullptr) {
        return {};
    }
    std::string text(said->text);
    if (!said->more.empty()) {
        text.append("\n").append(said->more);
        text.erase(text.find_last_not_of('\n') + 1);
    }
    return tools::textjson(text);
}

constexpr int kIndent = 2;

// `text`, which is JSON, so many levels deeper: strings in JSON hold no newline.
std::string indented(const std::string& text, std::size_t levels)
{
    const std::string blanks(levels * kIndent, ' ');
    std::string result = blanks;
    for (const char byte : text) {
        result += byte;
        if (byte == '\n') {
            result += blanks;
        }
    }
    return result;
}

// Text that steers no terminal, with an indent of `indent` blanks, or in one line if that is -1.
std::string textof(const ordered_json& document, int indent)
{
    constexpr bool kAsciiOnly = true; // some of the other characters are control characters
    return document.dump(indent, ' ', kAsciiOnly);
}

} // namespace

// One service after the other: a log may name a million.
void writestatusjson(std::ostream& out, const overview& seen)
{
    out << "{\n" << indented(R"("version": )" + textof(kFormatVersion, kIndent), 1);
    out << ",\n" << indented(R"("log": )" + textof(logjson(seen), kIndent), 1);
    out << ",\n" << indented(R"("loadfailed": )" + textof(seen.loadfailed, kIndent), 1);
    out << ",\n" << indented(R"("services": [)", 1);
    for (serviceid service = 0; service < seen.services; ++service) {
        const ordered_json one = servicejson(seen.accountof(service), seen.judged);
        out << (service == 0 ? "\n" : ",\n") << indented(textof(one, kIndent), 2);
    }
    out << (seen.services == 0 ? "" : "\n" + indented("", 1)) << "]\n}\n";
}

std::string eventjson(const event& what, const std::string* name, std::string_view words,
                      bool withversion)
{
    ordered_json object;
    if (withversion) {
        object["version"] = kFormatVersion;
    }
    object.update(
        {{"time", isotext(what.when)},
         {"service", name == nullptr ? ordered_json() : tools::textjson(*name)},
         {"state", what.became ? ordered_json(wordof(*what.became)) : ordered_json()},
         {"kind", wordof(what.kind)},
         {"inferred", what.inferred},
         {"words", words},
         {"message", saidjson(what.source)},
         {"line", what.source == nullptr ? ordered_json() : ordered_json(what.source->line)}});
    return textof(object, -1);
}

} // namespace report
