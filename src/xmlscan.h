// Cuts the text of a configuration file into tokens: start tags, pieces of text, end tags.
//
// The dialect is narrow: elements with text, no attributes, no comments, no entities, one
// declaration at the first byte, and a root `wdtargets` whose closing tag holds the last ">" of the
// file. What strays from it is not diagnosed but read by the rules in xmlscan.cpp. Reading always
// ends at the end of the text and never leaves it.
#pragma once

#include <cstddef>
#include <functional>
#include <stdexcept>
#include <string>
#include <string_view>

// The tokenizer's white space: the first kControlCount characters, nothing else.
extern const char control[20];
inline constexpr std::size_t kControlCount = 4;

struct xmltoken {
    enum kind { kStartTag, kText, kEndTag };

    kind what;
    // A tag's name, or a text; trimmed, never empty. An end tag's is what stands behind its "/".
    std::string_view content;
    // Where it begins, in bytes from the file's start: a tag at its "<".
    std::size_t place;
};

// Takes a token, whose content is valid until it returns.
using xmlreceiver = std::function<void(const xmltoken&)>;

// A tag without a name.
class emptytag : public std::out_of_range {
public:
    explicit emptytag(std::size_t where) : std::out_of_range("basic_string::substr"), place(where)
    {
    }
    std::size_t place; // of its "<", in bytes from the file's start
};

// Hands all tokens of the file `path` to `receiver`, in order. One that cannot be opened gives one
// line on standard error and no token; one that opens but cannot be read (a folder) is an empty
// text. A tag without a name raises emptytag, and the reading is over. Any thread, no lock.
void scanfile(const std::string& path, const xmlreceiver& receiver);
