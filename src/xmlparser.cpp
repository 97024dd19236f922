#include "xmlparser.h"

#include <array>
#include <cstdio>
#include <stdexcept>
#include <string_view>

#include <unistd.h>

#include "ProcessStatistics_Linux.h"
#include "wdLocalLog_linux.h"
#include "wdxmlparserhandler.h"

const char control[20] = {'\n', '\r', '\t', ' '};

std::vector<service> xmlparser::allservices;
std::vector<wdmonitortarget> xmlparser::alltargets;

namespace {

constexpr std::size_t npos = std::string_view::npos;
constexpr std::size_t kReadBlockBytes = 65536;

std::string readfile(const std::string& path)
{
    std::string text;
    const auto file = Utility::OpenToRead(path);
    if (!file) {
        // The 0 stands where a reason would; scripts that watch standard error match it.
        writestandard(STDERR_FILENO, "error, unable to open the input file: 0\n");
        return text;
    }
    std::array<char, kReadBlockBytes> block{};
    for (std::size_t got = 0; (got = std::fread(block.data(), 1, block.size(), file.get())) > 0;) {
        text.append(block.data(), got);
    }
    return text;
}

// Without white space at both ends. A token of nothing else is an error that ends the reading.
std::string trimmed(std::string_view token)
{
    const std::size_t first = token.find_first_not_of(control, 0, kControlCount);
    if (first == npos) {
        throw std::out_of_range("basic_string::substr");
    }
    const std::size_t last = token.find_last_not_of(control, npos, kControlCount);
    return std::string(token.substr(first, last - first + 1));
}

// The scan of one text. `cur` is where the next token begins; `pos` is where the search for it
// does. They differ behind an end tag, where `pos` stays on the ">": the next pass finds that ">"
// as a piece of text and delivers it. Empty elements get their value from this.
class scan {
public:
    explicit scan(std::string_view whole)
        : text(whole), pos(whole.find('<')), cur(pos), last(whole.rfind('>')),
          behinddeclaration(placebehinddeclaration(whole))
    {
    }

    // Tokens to the end: either the last ">" of the text or, outside the dialect, the text's end.
    void run()
    {
        while (cur != last && cur != npos) {
            skipdeclaration();
            pos = text.find_first_not_of(control, pos, kControlCount);
            cur = pos;
            if (cur == npos) {
                return;
            }
            if (text[cur] == '<') {
                readtag();
            } else {
                readtext();
            }
        }
    }

private:
    // Where the text goes on behind a declaration at its first byte; without the "?" that ends one,
    // at the declaration's first "?".
    static std::size_t placebehinddeclaration(std::string_view whole)
    {
        constexpr std::size_t kInsideDeclaration = 2;
        constexpr std::size_t kDeclarationEndBytes = 2;
        constexpr std::size_t kWithoutMark = 1;
        const std::size_t mark = whole.find('?', kInsideDeclaration);
        return mark == npos ? kWithoutMark : mark + kDeclarationEndBytes;
    }

    // There is one place behind a declaration, wherever the "<?" stands. From a later one it would
    // lead back over text already read, without end; there the "<?" is read as any other tag.
    void skipdeclaration()
    {
        if (text.substr(cur, 2) == "<?" && behinddeclaration >= cur) {
            pos = behinddeclaration;
        }
    }

    void readtext()
    {
        pos = text.find('<', pos + 1);
        characters(trimmed(text.substr(cur, pos == npos ? npos : pos - cur)));
        cur = pos;
    }

    // A "/" anywhere before the ">" makes an end tag of it, attributes or not.
    void readtag()
    {
        pos = text.find_first_of(">/", pos);
        if (pos == npos) {
            cur = npos;
        } else if (text[pos] == '>') {
            readstarttag();
        } else {
            readendtag();
        }
    }

    void readstarttag()
    {
        startElement(trimmed(text.substr(cur + 1, pos - cur - 1)));
        ++pos;
        cur = pos;
    }

    void readendtag()
    {
        const std::size_t slash = pos;
        pos = text.find('>', slash);
        if (pos == npos) {
            cur = npos;
            return;
        }
        const std::string_view name = text.substr(slash + 1, pos - slash - 1);
        endElement(trimmed(name));
        // Only the root's closing tag leaves `cur` on its ">", which ends the reading there if it
        // is the last one of the file. The name is compared untrimmed.
        cur = name == "wdtargets" ? pos : pos + 1;
    }

    std::string_view text;
    std::size_t pos;
    std::size_t cur;
    std::size_t last;
    std::size_t behinddeclaration;
};

} // namespace

int xmlparser::parse(std::string path)
{
    allservices.clear();
    alltargets.clear();
    const std::string text = readfile(path);
    scan(text).run();
    endDocument();
    return 0;
}
