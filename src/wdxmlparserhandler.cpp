#include "wdxmlparserhandler.h"

#include <algorithm>
#include <array>

#include "wdlogbuffer.h"
#include "xmlparser.h"

std::stack<std::string> xercecstack;
std::string charparse;
service monitorservice;
service monservicedep;
std::vector<service> monservicedepends;
wdmonitortarget target;

namespace {

// The two module names of the listing. Log filters in use know both, the trailing blank included.
constexpr const char* kListingModule = "wdxmlparserhandler ";
constexpr const char* kLimitsModule = "wdxmlparserhandler";

struct fieldelement {
    const char* name;
    wdtext service::*field;
};

constexpr std::array<fieldelement, 16> kFieldElements{{
    {"name", &service::name},
    {"binarypath", &service::binarypath},
    {"startcmd", &service::startcmd},
    {"stopcmd", &service::stopcmd},
    {"functionalpingcmd", &service::functionalpingcmd},
    {"genpinginterval", &service::genpinginterval},
    {"funpinginterval", &service::funpinginterval},
    {"maxattemptofwakeup", &service::maxattemptofwakeup},
    {"messageformat", &service::messageformat},
    {"hackmessagehandler", &service::hackmessagehandler},
    {"sendmessagehandler", &service::sendmessagehandler},
    {"MaxFPSkips", &service::MaxFPSkips},
    {"ThresholdAverageCPUUsage", &service::ThresholdAverageCPUUsage},
    {"ThresholdMemoryUsage", &service::ThresholdMemoryUsage},
    {"ThresholdThreadCount", &service::ThresholdThreadCount},
    {"ThresholdHandleCount", &service::ThresholdHandleCount},
}};

// The field that an element of this name fills, or null.
wdtext service::*fieldnamed(const std::string& element)
{
    for (const auto& known : kFieldElements) {
        if (element == known.name) {
            return known.field;
        }
    }
    return nullptr;
}

// A field element has ended and left the stack. Only what directly encloses it decides whose field
// it is; anywhere but in wdmonitorservice it is the dependent service's.
void storefield(wdtext service::*field)
{
    const bool monitored = !xercecstack.empty() && xercecstack.top() == "wdmonitorservice";
    (monitored ? monitorservice : monservicedep).*field = std::string_view(charparse);
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
    if (name == "wdmonitortarget") {
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
    const std::string closing = xercecstack.top();
    if (const auto field = fieldnamed(closing); field != nullptr) {
        xercecstack.pop();
        storefield(field);
    } else if (closing == "wdmonitorservice" || closing == "wdtargets") {
        xercecstack.pop();
    } else if (closing == "wdmondependsev") {
        xercecstack.pop();
        monservicedepends.push_back(monservicedep);
    } else if (closing == "wdmonitortarget") {
        xercecstack.pop();
        storetarget();
    }
}

void endDocument()
{
    xmlparser::allservices.clear();
    for (const auto& finished : xmlparser::alltargets) {
        addservice(finished.monitoredservice, xmlparser::allservices);
        listmonitored(finished.monitoredservice);
        for (const auto& dependent : finished.dependentservices) {
            addservice(dependent, xmlparser::allservices);
            listdependent(dependent);
        }
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
