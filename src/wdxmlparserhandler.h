// Turns the reader's tokens into records: a value goes where the stack of open elements says, a
// finished target goes to xmlparser::alltargets, and the end of the document rebuilds
// xmlparser::allservices and lists the whole configuration in the log at DEBUG.
//
// Three habits of this file format live here; configurations in use rely on them:
//   carry-over      The work records are never cleared. A field that a service leaves out keeps
//                   the value of the previous service of its kind, across targets and refreshes.
//   empty elements  An element without text stores the last text token before it, which nearly
//                   always is the ">" that the reader delivers behind an end tag.
//   unknown names   An element of another name, a comment included, stays open for ever. Inside a
//                   target it loses that target; between targets it is harmless. One with a "/" in
//                   it comes as an end tag instead and closes whatever is open.
//
// Everything here runs on the manager's thread, called by xmlparser::parse; it takes no lock and
// raises nothing of its own. The state outlives a parse and is reset by nobody.
#pragma once

#include <array>
#include <stack>
#include <string>
#include <string_view>
#include <vector>

#include "wdmonitortarget.h"

// A field element's name and the field that it fills.
struct fieldelement {
    std::string_view name;
    std::string service::*field;
};

// All that there are.
inline constexpr std::array<fieldelement, 16> kFieldElements{{
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

extern std::stack<std::string> xercecstack;    // elements opened and not closed, innermost on top
extern std::string charparse;                  // the last text token
extern service monitorservice;                 // work record of wdmonitorservice
extern service monservicedep;                  // work record of wdmondependsev
extern std::vector<service> monservicedepends; // dependents of the current wdmonitortarget
extern wdmonitortarget target;                 // the target being built

// A start tag: `name` is everything between its brackets, trimmed.
void startElement(const std::string& name);

// A piece of text, trimmed.
void characters(const std::string& text);

// An end tag. Closes the innermost open element, whatever `name` says; does nothing when none is
// open or the innermost one is of an unknown name.
void endElement(const std::string& name);

// The end of the file: collects the services and lists all in the log.
void endDocument();

// Rebuilds xmlparser::allservices from xmlparser::alltargets.
void collectservices();

// Appends a copy of `candidate` to `services` and returns 1, unless a service of that name is
// there already: then 0, and nothing changes. Searches the whole list: collectservices, which adds
// thousands, keeps an index instead.
int addservice(const service& candidate, std::vector<service>& services);
