#include "configuration.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <memory>
#include <string_view>

#include <expat.h>
#include <pugixml.hpp>

namespace {

constexpr int kBlockBytes = 65536;

struct fieldelement {
    std::string_view name;
    std::string service::*field;
    std::string_view value; // what configurationtext() writes; empty: made from the service's name
};

constexpr std::array<fieldelement, 16> kFields{{
    {"name", &service::name, ""},
    {"binarypath", &service::binarypath, ""},
    {"startcmd", &service::startcmd, "NULL"},
    {"stopcmd", &service::stopcmd, "NULL"},
    {"functionalpingcmd", &service::functionalpingcmd, ""},
    {"genpinginterval", &service::genpinginterval, "60"},
    {"funpinginterval", &service::funpinginterval, "300"},
    {"maxattemptofwakeup", &service::maxattemptofwakeup, "3"},
    {"messageformat", &service::messageformat, "plain"},
    {"hackmessagehandler", &service::hackmessagehandler, "NULL"},
    {"sendmessagehandler", &service::sendmessagehandler, "NULL"},
    {"MaxFPSkips", &service::MaxFPSkips, "5"},
    {"ThresholdAverageCPUUsage", &service::ThresholdAverageCPUUsage, "90000"},
    {"ThresholdMemoryUsage", &service::ThresholdMemoryUsage, "80000"},
    {"ThresholdThreadCount", &service::ThresholdThreadCount, "200"},
    {"ThresholdHandleCount", &service::ThresholdHandleCount, "1000"},
}};

std::string service::*fieldnamed(std::string_view name)
{
    const auto* found = std::find_if(kFields.begin(), kFields.end(),
                                     [&](const auto& known) { return known.name == name; });
    return found == kFields.end() ? nullptr : found->field;
}

std::string valueof(const fieldelement& element, const std::string& service)
{
    if (element.name == "name") {
        return service;
    }
    if (element.name == "binarypath") {
        return "/usr/sbin/" + service + "d";
    }
    if (element.name == "functionalpingcmd") {
        return "/usr/bin/" + service + "-check";
    }
    return std::string(element.value);
}

void appendservice(std::string& text, const char* element, const std::string& name)
{
    text.append("    <").append(element).append(">\n");
    for (const auto& field : kFields) {
        text.append("      <").append(field.name).append(">").append(valueof(field, name));
        text.append("</").append(field.name).append(">\n");
    }
    text.append("    </").append(element).append(">\n");
}

// What expat's handlers share.
struct expatreader {
    std::vector<wdmonitortarget>& targets;
    wdmonitortarget target{};
    service* current = nullptr; // the service whose element is open
    std::string text{};         // of the innermost element
};

void expatstart(void* user, const XML_Char* name, const XML_Char** /*attributes*/)
{
    auto& reader = *static_cast<expatreader*>(user);
    const std::string_view element = name;
    reader.text.clear();
    if (element == "wdmonitorservice") {
        reader.current = &reader.target.monitoredservice;
    } else if (element == "wdmondependsev") {
        reader.current = &reader.target.dependentservices.emplace_back();
    }
}

void expattext(void* user, const XML_Char* text, int length)
{
    static_cast<expatreader*>(user)->text.append(text, static_cast<std::size_t>(length));
}

void expatend(void* user, const XML_Char* name)
{
    auto& reader = *static_cast<expatreader*>(user);
    const std::string_view element = name;
    if (element == "wdmonitortarget") {
        reader.targets.push_back(std::move(reader.target));
        reader.target = {};
    } else if (element == "wdmonitorservice" || element == "wdmondependsev") {
        reader.current = nullptr;
    } else if (reader.current != nullptr) {
        if (const auto field = fieldnamed(element); field != nullptr) {
            reader.current->*field = std::string_view(reader.text);
        }
    }
}

void fillservice(service& svc, const pugi::xml_node& element)
{
    for (const pugi::xml_node& child : element.children()) {
        if (const auto field = fieldnamed(child.name()); field != nullptr) {
            svc.*field = std::string_view(child.child_value());
        }
    }
}

bool sameservice(const service& left, const service& right)
{
    return std::all_of(kFields.begin(), kFields.end(),
                       [&](const auto& known) { return left.*known.field == right.*known.field; });
}

} // namespace

std::string configurationtext(std::size_t targets)
{
    std::string text = "<?xml version='1.0'?>\n<wdtargets>\n";
    for (std::size_t i = 0; i < targets; ++i) {
        const std::string number = std::to_string(i);
        text.append("  <wdmonitortarget>\n");
        appendservice(text, "wdmonitorservice", "service" + number);
        appendservice(text, "wdmondependsev", "dependent" + number);
        text.append("  </wdmonitortarget>\n");
    }
    return text.append("</wdtargets>\n");
}

bool readbyexpat(const std::string& path, std::vector<wdmonitortarget>& targets)
{
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(path.c_str(), "re"),
                                                               std::fclose);
    const std::unique_ptr<XML_ParserStruct, void (*)(XML_Parser)> parser(XML_ParserCreate(nullptr),
                                                                         XML_ParserFree);
    if (!file || !parser) {
        return false;
    }
    expatreader reader{targets};
    XML_SetUserData(parser.get(), &reader);
    XML_SetElementHandler(parser.get(), expatstart, expatend);
    XML_SetCharacterDataHandler(parser.get(), expattext);
    for (bool last = false; !last;) {
        void* block = XML_GetBuffer(parser.get(), kBlockBytes);
        if (block == nullptr) {
            return false;
        }
        const std::size_t got = std::fread(block, 1, kBlockBytes, file.get());
        last = got == 0;
        if (XML_ParseBuffer(parser.get(), static_cast<int>(got), last ? 1 : 0) != XML_STATUS_OK) {
            return false;
        }
    }
    return true;
}

bool readbypugixml(const std::string& path, std::vector<wdmonitortarget>& targets)
{
    pugi::xml_document document;
    if (!document.load_file(path.c_str())) {
        return false;
    }
    for (const pugi::xml_node& element : document.child("wdtargets").children("wdmonitortarget")) {
        wdmonitortarget& target = targets.emplace_back();
        for (const pugi::xml_node& child : element.children()) {
            if (std::string_view(child.name()) == "wdmonitorservice") {
                fillservice(target.monitoredservice, child);
            } else {
                fillservice(target.dependentservices.emplace_back(), child);
            }
        }
    }
    return true;
}

bool sametargets(const std::vector<wdmonitortarget>& left,
                 const std::vector<wdmonitortarget>& right)
{
    return std::equal(left.begin(), left.end(), right.begin(), right.end(),
                      [](const auto& one, const auto& other) {
                          return sameservice(one.monitoredservice, other.monitoredservice) &&
                                 std::equal(one.dependentservices.begin(),
                                            one.dependentservices.end(),
                                            other.dependentservices.begin(),
                                            other.dependentservices.end(), sameservice);
                      });
}
