// Reads the configuration file: hands each of its tokens (xmlscan.h) to the handler
// (wdxmlparserhandler.h). Owns the two lists that loading a file fills.
#pragma once

#include <string>
#include <vector>

#include "wdmonitortarget.h"
#include "xmlscan.h" // for its users: `control`

class xmlparser {
public:
    // Every distinct service of the file by name, first occurrence kept, in order of appearance.
    static std::vector<service> allservices;

    // Every target of the file, in file order.
    static std::vector<wdmonitortarget> alltargets;

    // Empties both lists and fills them from the file `path`. Always returns 0. A file that cannot
    // be opened gives one line on standard error and empty lists; one that opens but cannot be
    // read (a folder) is an empty text. An empty tag name raises std::out_of_range: alltargets
    // then holds the targets before it, and allservices is empty.
    // The manager's thread only, and only while no monitor thread exists: they read allservices
    // without a lock.
    static int parse(std::string path);
};
