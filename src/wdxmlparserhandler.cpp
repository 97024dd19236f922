#include "wdxmlparserhandler.h"

#include <algorithm>
#include <string_view>
#include <unordered_set>

#include "wdlogbuffer.h"
#include "xmlparser.h"

std::stack<std::string> xercecstack;
std::string charparse;
service monitorservice;
service monservicedep;
std::vector<service> monservicedepends;
wdmonitortarget target;

using namespace std::string_view_literals;

namespace {

// The two module names of the listing. Log filters in use know both, the trailing blank included.
constexpr const char* kListingModule = "wdxmlparserhandler ";
constexpr const char* kLimitsModule = "wdxmlparserhandler";

// The field that an element of this name fills, or null. Most files give the fields in this order:
// the search begins behind the field found before.
std::string service::*fieldnamed(std::string_view element)
{
    static std::size_t next = 0;
    for (std::size_t i = 0; i < kFieldElements.size(); ++i) {
        const auto& known = kFieldElements.at(next);
        next = (next + 1) % kFieldElements.size();
        if (element == known.name) {
            return known.field;
        }
    }
    return nullptr;
}

// A field element has ended and left the stack. Only what directly encloses it decides whose field
// it is; anywhere but in wdmonitorservice it is the dependent service's.
void storefield(std::string service::*field)
{
    const bool monitored = !xercecstack.empty() && xercecstack.top() == "wdmonitorservice"sv;
    (monitored ? monitorservice : monservicedep).*field = charparse;
}

void storetarget()
{
    target.monitoredservice = monitorservice;
    target.dependentservices = monservicedepends;
    xmlparser::alltargets.push_back(target);
}

// Thread count stands before memory usage, and the handlers are left out: scripts read this
// listing by position.
void listlimits(const service& svc)
{
    wdlog(kLimitsModule, kLevelDebug, "Max number of FP skippable: ", svc.MaxFPSkips);
    wdlog(kLimitsModule, kLevelDebug,
          "Threshold value of CPU usage: ", svc.ThresholdAverageCPUUsage);
    wdlog(kLimitsModule, kLevelDebug,
          "Threshold value of thread count: ", svc.ThresholdThreadCount);
    wdlog(kLimitsModule, kLevelDebug,
          "Threshold value of memory usage: ", svc.ThresholdMemoryUsage);
    wdlog(kLimitsModule, kLevelDebug,
          "Threshold value of handle count: ", svc.ThresholdHandleCount);
}

void listcommands(const service& svc)
{
    wdlog(kListingModule, kLevelDebug, svc.binarypath);
    wdlog(kListingModule, kLevelDebug, svc.startcmd);
    wdlog(kListingModule, kLevelDebug, svc.stopcmd);
    wdlog(kListingModule, kLevelDebug, svc.functionalpingcmd);
    wdlog(kListingModule, kLevelDebug, "genpinginterval ", svc.genpinginterval);
    wdlog(kListingModule, kLevelDebug, "funpinginterval ", svc.funpinginterval);
}

// "maxattemp" without its t for monitored services, "maxattempt" for dependent ones: the label
// tells the two apart in a log.
void listmonitored(const service& svc)
{
    wdlog(kListingModule, kLevelDebug,
          "%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%%", svc.name);
    wdlog(kListingModule, kLevelDebug, "******************************:", svc.name);
    listcommands(svc);
    wdlog(kListingModule, kLevelDebug, "maxattemp ", svc.maxattemptofwakeup);
    wdlog(kListingModule, kLevelDebug, svc.messageformat);
    listlimits(svc);
}

void listdependent(const service& svc)
{
    wdlog(kListingModule, kLevelDebug, svc.name);
    listcommands(svc);
    wdlog(kListingModule, kLevelDebug, "maxattempt ", svc.maxattemptofwakeup);
    wdlog(kListingModule, kLevelDebug, svc.messageformat);
    listlimits(svc);
}

} // namespace

void startElement(const std::string& name)
{
    xercecstack.push(name);
    if (name == "wdmonitortarget"sv) {
        monservicedepends.clear();
    }
}

void characters(const std::string& text)
{
    charparse = text;
}

void endElement(const std::string& /*name*/)
{
    if (xercecstack.empty()) {
        return;
    }
    const std::string& closing = xercecstack.top(); // until it is popped
    if (const auto field = fieldnamed(closing); field != nullptr) {
        xercecstack.pop();
        storefield(field);
    } else if (closing == "wdmonitorservice"sv || closing == "wdtargets"sv) {
        xercecstack.pop();
    } else if (closing == "wdmondependsev"sv) {
        xercecstack.pop();
        monservicedepends.push_back(monservicedep);
    } else if (closing == "wdmonitortarget"sv) {
        xercecstack.pop();
        storetarget();
    }
}

void endDocument()
{
    collectservices();
    for (const auto& finished : xmlparser::alltargets) {
        listmonitored(finished.monitoredservice);
        for (const auto& dependent : finished.dependentservices) {
            listdependent(dependent);
        }
    }
}

// Adds as addservice does, but with an index of the names: searching the list for every service of
// a file takes a time that grows with their square.
void collectservices()
{
    xmlparser::allservices.clear();
    std::unordered_set<std::string_view> names;
    const auto add = [&names](const service& candidate) {
        if (names.insert(candidate.name).second) {
            xmlparser::allservices.push_back(candidate);
        }
    };
    for (const auto& finished : xmlparser::alltargets) {
        add(finished.monitoredservice);
        std::for_each(finished.dependentservices.begin(), finished.dependentservices.end(), add);
    }
}

int addservice(const service& candidate, std::vector<service>& services)
{
    const bool known = std::any_of(services.begin(), services.end(), [&](const service& present) {
        return present.name == candidate.name;
    });
    if (known) {
        return 0;
    }
    services.push_back(candidate);
    return 1;
}
