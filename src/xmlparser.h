// Reads the configuration file with a small tokenizer of its own and hands each token to the
// handler (wdxmlparserhandler.h). Owns the two lists that loading a file fills.
//
// The dialect is narrow: elements with text, no attributes, no comments, no entities, one
// declaration at the first byte, and a root `wdtargets` whose closing tag holds the last ">" of the
// file. What strays from it is not diagnosed but read by the rules in xmlparser.cpp. Reading
// always ends at the end of the text and never leaves it.
#pragma once

#include <string>
#include <vector>

#include "wdmonitortarget.h"

// The tokenizer's white space: the first kControlCount characters, nothing else.
extern const char control[20];
inline constexpr std::size_t kControlCount = 4;

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
