#include "xmlparser.h"

#include <algorithm>
#include <memory>
#include <stdexcept>
#include <string_view>
#include <utility>

#include <unistd.h>

#include "wdLocalLog_linux.h"
#include "wdinputfile.h"
#include "wdxmlparserhandler.h"

const char control[20] = {'\n', '\r', '\t', ' '};

std::vector<service> xmlparser::allservices;
std::vector<wdmonitortarget> xmlparser::alltargets;

namespace {

constexpr std::size_t npos = std::string_view::npos;
constexpr std::size_t kLeastRoomBytes = 4096;

// The bytes of a whole file. Not a string, which would be filled twice.
class filetext {
public:
    explicit filetext(const std::string& path)
    {
        wdinputfile file(path);
        if (!file.isopen()) {
            // The 0 stands where a reason would; scripts that watch standard error match it.
            writestandard(STDERR_FILENO, "error, unable to open the input file: 0\n");
            return;
        }
        grow(file.size() + 1); // one more, so that the end shows without growing
        for (std::size_t got = 1; got > 0; used += got) {
            if (used == room) {
                grow(2 * room);
            }
            got = file.read({bytes.get() + used, room - used}).size();
        }
    }

    [[nodiscard]] std::string_view text() const { return {bytes.get(), used}; }

private:
    void grow(std::size_t wanted)
    {
        room = std::max(wanted, kLeastRoomBytes);
        auto larger = std::make_unique_for_overwrite<char[]>(room);
        std::copy_n(bytes.get(), used, larger.get());
        bytes = std::move(larger);
    }

    std::unique_ptr<char[]> bytes;
    std::size_t room = 0;
    std::size_t used = 0;
};

// An object, not a function, so that it is inlined where it is handed over.
constexpr auto blank = [](char c) {
    return c == control[0] || c == control[1] || c == control[2] || c == control[3];
};

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
            while (pos < text.size() && blank(text[pos])) {
                ++pos;
            }
            cur = pos;
            if (cur >= text.size()) {
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
        const bool mark = cur + 1 < text.size() && text[cur] == '<' && text[cur + 1] == '?';
        if (mark && behinddeclaration >= cur) {
            pos = behinddeclaration;
        }
    }

    // Without white space at both ends. A token of nothing else is an error that ends the reading.
    static std::string_view trimmed(std::string_view untrimmed)
    {
        while (!untrimmed.empty() && blank(untrimmed.front())) {
            untrimmed.remove_prefix(1);
        }
        if (untrimmed.empty()) {
            throw std::out_of_range("basic_string::substr");
        }
        while (blank(untrimmed.back())) {
            untrimmed.remove_suffix(1);
        }
        return untrimmed;
    }

    // `token` as a string, in `kept`, where it may be already from the token before.
    static const std::string& keep(std::string& kept, std::string_view token)
    {
        if (kept != token) {
            kept.assign(token);
        }
        return kept;
    }

    void readtext()
    {
        pos = text.find('<', pos + 1);
        std::string& kept = text[cur] == '>' ? bracket : value;
        characters(keep(kept, trimmed(text.substr(cur, pos == npos ? npos : pos - cur))));
        cur = pos;
    }

    // A "/" anywhere before the ">" makes an end tag of it, attributes or not.
    void readtag()
    {
        pos = text.find('>', pos);
        if (pos == npos) {
            cur = npos;
            return;
        }
        const std::string_view inside = text.substr(cur + 1, pos - cur - 1);
        const std::size_t slash = inside.starts_with('/') ? 0 : inside.find('/');
        if (slash != npos) {
            readendtag(inside.substr(slash + 1));
        } else {
            readstarttag(inside);
        }
    }

    void readstarttag(std::string_view inside)
    {
        startElement(keep(name, trimmed(inside)));
        ++pos;
        cur = pos;
    }

    void readendtag(std::string_view untrimmed)
    {
        endElement(keep(name, trimmed(untrimmed)));
        // Only the root's closing tag leaves `cur` on its ">", which ends the reading there if it
        // is the last one of the file. The name is compared untrimmed.
        cur = untrimmed == "wdtargets" ? pos : pos + 1;
    }

    std::string_view text;
    std::size_t pos;
    std::size_t cur;
    std::size_t last;
    std::size_t behinddeclaration;

    // The last tokens of each kind. Most end tags have the name of the tag before, and most texts
    // behind an end tag are its ">".
    std::string name;
    std::string value;
    std::string bracket;
};

} // namespace

int xmlparser::parse(std::string path)
{
    allservices.clear();
    alltargets.clear();
    const filetext file(path);
    scan(file.text()).run();
    endDocument();
    return 0;
}
