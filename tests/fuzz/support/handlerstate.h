// What the daemon keeps between two files, as it is before the first.
#pragma once

#include "wdxmlparserhandler.h"
#include "xmlparser.h"

// A file that breaks off leaves the handler in the middle of a record, and its lists filled.
inline void resethandler()
{
    xercecstack = {};
    charparse.clear();
    monitorservice = {};
    monservicedep = {};
    monservicedepends.clear();
    target = {};
    xmlparser::alltargets.clear();
    xmlparser::allservices.clear();
}
