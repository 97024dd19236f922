// Reader and handler together, on one file after another, as refreshes load them. A unit is the
// files, with a record separator between each two. What they make of the files is held against a
// plain account of the handler that works on the tokens of the reader's model; and some things must
// hold for any text, also where that model leaves the ending open.

#include <algorithm>
#include <array>
#include <iterator>
#include <map>
#include <set>
#include <stdexcept>
#include <string_view>

#include "fuzz.h"
#include "handlerstate.h"
#include "memoryfile.h"
#include "tokenizer_model.h"
#include "wdxmlparserhandler.h"
#include "xmlparser.h"

namespace {

constexpr char kSeparator = '\x1e';

struct Field {
    const char* element;
    std::string service::*value;
};

constexpr std::array<Field, 16> kFields{{
    {"ThresholdHandleCount", &service::ThresholdHandleCount},
    {"ThresholdThreadCount", &service::ThresholdThreadCount},
    {"ThresholdMemoryUsage", &service::ThresholdMemoryUsage},
    {"ThresholdAverageCPUUsage", &service::ThresholdAverageCPUUsage},
    {"MaxFPSkips", &service::MaxFPSkips},
    {"sendmessagehandler", &service::sendmessagehandler},
    {"hackmessagehandler", &service::hackmessagehandler},
    {"messageformat", &service::messageformat},
    {"maxattemptofwakeup", &service::maxattemptofwakeup},
    {"funpinginterval", &service::funpinginterval},
    {"genpinginterval", &service::genpinginterval},
    {"functionalpingcmd", &service::functionalpingcmd},
    {"stopcmd", &service::stopcmd},
    {"startcmd", &service::startcmd},
    {"binarypath", &service::binarypath},
    {"name", &service::name},
}};

// A service as its elements' texts by name, and a target as its services, the monitored one first.
using Record = std::map<std::string, std::string>;
using Target = std::vector<Record>;

Record recordof(const service& svc)
{
    Record record;
    for (const auto& field : kFields) {
        record[field.element] = svc.*field.value;
    }
    return record;
}

std::vector<Target> targetsof(const std::vector<wdmonitortarget>& targets)
{
    std::vector<Target> result;
    for (const auto& each : targets) {
        Target records{recordof(each.monitoredservice)};
        for (const auto& dependent : each.dependentservices) {
            records.push_back(recordof(dependent));
        }
        result.push_back(records);
    }
    return result;
}

// What the handler makes of tokens. Only the list of targets begins anew with each file.
class Account {
public:
    Account()
    {
        for (const auto& field : kFields) {
            monitored[field.element] = "";
        }
        dependent = monitored;
    }

    const std::vector<Target>& load(const std::vector<Token>& tokens)
    {
        targets.clear();
        for (const Token& token : tokens) {
            switch (token.kind) {
            case Token::Kind::startTag:
                open(token.text);
                break;
            case Token::Kind::text:
                lasttext = token.text;
                break;
            case Token::Kind::endTag:
                close();
                break;
            default:
                break;
            }
        }
        return targets;
    }

private:
    void open(const std::string& element)
    {
        elements.push_back(element);
        if (element == "wdmonitortarget") {
            dependents.clear();
        }
    }

    // An element of an unknown name stays open.
    void close()
    {
        static const std::set<std::string> groups{"wdtargets", "wdmonitortarget",
                                                  "wdmonitorservice", "wdmondependsev"};
        if (elements.empty()) {
            return;
        }
        const std::string element = elements.back();
        if (!groups.contains(element) && !monitored.contains(element)) {
            return;
        }
        elements.pop_back();
        if (element == "wdmondependsev") {
            dependents.push_back(dependent);
        } else if (element == "wdmonitortarget") {
            targets.push_back({monitored});
            targets.back().insert(targets.back().end(), dependents.begin(), dependents.end());
        } else if (monitored.contains(element)) {
            const bool inmonitored = !elements.empty() && elements.back() == "wdmonitorservice";
            (inmonitored ? monitored : dependent)[element] = lasttext;
        }
    }

    std::vector<std::string> elements;
    std::string lasttext;
    Record monitored;
    Record dependent;
    std::vector<Record> dependents;
    std::vector<Target> targets;
};

// False where a tag without a name ended it.
bool load(const std::string& path, Stopwatch& watch)
{
    const Stopwatch::Lap lap(watch);
    try {
        demand(xmlparser::parse(path) == 0, "loading gives 0");
        return true;
    } catch (const std::out_of_range&) {
        return false;
    }
}

// The first record of each name, in order.
std::vector<Record> distinct(const std::vector<Target>& targets)
{
    std::vector<Record> services;
    std::set<std::string> names;
    for (const Target& records : targets) {
        for (const Record& record : records) {
            if (names.insert(record.at("name")).second) {
                services.push_back(record);
            }
        }
    }
    return services;
}

std::vector<Record> recordsof(const std::vector<service>& services)
{
    std::vector<Record> records;
    std::transform(services.begin(), services.end(), std::back_inserter(records), recordof);
    return records;
}

bool istrimmed(const std::string& text)
{
    constexpr std::string_view kWhite = "\n\r\t ";
    return text.empty() || (kWhite.find(text.front()) == std::string_view::npos &&
                            kWhite.find(text.back()) == std::string_view::npos);
}

// Values come from this file or from an earlier one, and from nowhere else.
void trytexts(const std::vector<Target>& targets, std::string_view files)
{
    std::set<std::string> texts;
    for (const Target& records : targets) {
        for (const Record& record : records) {
            for (const auto& [element, text] : record) {
                texts.insert(text);
            }
        }
    }
    for (auto elements = xercecstack; !elements.empty(); elements.pop()) {
        demand(!elements.top().empty(), "an open element has a name");
        texts.insert(elements.top());
    }
    for (const std::string& text : texts) {
        demand(istrimmed(text), "names and values have no white space around them");
        demand(files.find(text) != std::string_view::npos, "names and values stand in the files");
    }
}

std::size_t bytesof(const std::vector<Target>& targets)
{
    std::size_t bytes = 0;
    for (const Target& records : targets) {
        for (const Record& record : records) {
            bytes += sizeof(service);
            for (const auto& [element, text] : record) {
                bytes += text.size();
            }
        }
    }
    return bytes;
}

} // namespace

std::size_t tryunit(const std::string& unit, Stopwatch& watch)
{
    static const MemoryFile file;
    resethandler();
    Account account;
    bool accounted = true; // until a file's ending is open
    std::size_t bytes = unit.size();
    for (const std::string& text : cut(unit, kSeparator)) {
        file.write(text);
        const bool loaded = load(file.path(), watch);
        const std::vector<Target> targets = targetsof(xmlparser::alltargets);
        demand(recordsof(xmlparser::allservices) ==
                   (loaded ? distinct(targets) : std::vector<Record>()),
               "the services are the targets' first of each name, or none");
        trytexts(targets, unit);
        const Reading reading = readbymodel(text);
        accounted = accounted && !reading.open;
        demand(!accounted || targets == account.load(reading.tokens),
               "the targets are as accounted");
        bytes += bytesof(targets);
    }
    return bytes;
}
