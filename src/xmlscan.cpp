#include "xmlscan.h"

#include <algorithm>
#include <memory>

#include <unistd.h>

#include "wdLocalLog_linux.h"
#include "wdinputfile.h"

const char control[20] = {'\n', '\r', '\t', ' '};

namespace {

constexpr std::size_t npos = std::string_view::npos;
constexpr std::size_t kWindowBytes = 65536;
constexpr std::size_t kBehindMark = 2; // a declaration's own "?" is not the one that ends it

bool blank(int c)
{
    return c == control[0] || c == control[1] || c == control[2] || c == control[3];
}

// The text of a file, read as the scan gets on. Places are counted from the text's start, but only
// what the scan has not yet finished with is held: a window that grows to the longest token.
class filetext {
public:
    static constexpr int kEnd = -1;

    explicit filetext(const std::string& path) : file(path)
    {
        if (!file.isopen()) {
            // The 0 stands where a reason would; scripts that watch standard error match it.
            writestandard(STDERR_FILENO, "error, unable to open the input file: 0\n");
        }
    }

    // The place of the first `c` at or after `from`, or npos.
    std::size_t find(char c, std::size_t from)
    {
        const std::size_t found = from < limit ? held().find(c, from - start) : npos;
        return found != npos ? start + found : findinrest(c, std::max(from, limit));
    }

    // The character at `place`, or kEnd.
    int at(std::size_t place)
    {
        const bool there = place < limit || readto(place);
        return there ? static_cast<unsigned char>(window[place - start]) : kEnd;
    }

    // From a place up to another, or to the text's end for npos; all of it has to have been found,
    // and not to be finished with. Valid until more is looked for.
    [[nodiscard]] std::string_view from(std::size_t place, std::size_t to) const
    {
        return {window.get() + (place - start), (to == npos ? limit : to) - place};
    }

    // Nothing before `place` will be asked for any more.
    void finishedto(std::size_t place) { needed = place; }

    // The place of the text's first "?" from its third character on, or npos.
    std::size_t firstmark() { return mark == npos ? find('?', kBehindMark) : mark; }

private:
    [[nodiscard]] std::string_view held() const { return {window.get(), limit - start}; }

    std::size_t findinrest(char c, std::size_t from)
    {
        std::size_t found = npos;
        while (found == npos && readto(from)) {
            found = held().find(c, from - start);
            from = limit;
        }
        return found != npos ? start + found : npos;
    }

    bool readto(std::size_t place)
    {
        while (place >= limit) {
            if (!readon()) {
                return false;
            }
        }
        return true;
    }

    // False at the end of the file, which is not asked again: a terminal would give more.
    bool readon()
    {
        if (ended) {
            return false;
        }
        if (limit - start == room) {
            makeroom();
        }
        const std::size_t used = limit - start;
        const auto piece = file.read({window.get() + used, room - used});
        if (mark == npos) {
            const std::size_t skipped = limit < kBehindMark ? kBehindMark - limit : 0;
            const std::size_t found = piece.find('?', skipped);
            mark = found == npos ? npos : limit + found;
        }
        limit += piece.size();
        ended = piece.empty();
        return !ended;
    }

    // Drops what is finished with; grows where that is less than half.
    void makeroom()
    {
        const std::string_view rest = held().substr(needed - start);
        if (rest.size() > room / 2) {
            room *= 2;
            auto larger = std::make_unique_for_overwrite<char[]>(room);
            std::copy(rest.begin(), rest.end(), larger.get());
            window = std::move(larger);
        } else {
            std::copy(rest.begin(), rest.end(), window.get());
        }
        start = limit - rest.size();
    }

    wdinputfile file;
    std::size_t room = kWindowBytes;
    std::unique_ptr<char[]> window = std::make_unique_for_overwrite<char[]>(room);
    std::size_t start = 0;  // of the window
    std::size_t limit = 0;  // the first place that is not yet read
    std::size_t needed = 0; // the first place that is not finished with
    std::size_t mark = npos;
    bool ended = false;
};

// The scan of one text. `cur` is where the next token begins; `pos` is where the search for it
// does. They differ behind an end tag, where `pos` stays on the ">": the next pass finds that ">"
// as a piece of text and delivers it. Empty elements get their value from this.
class scan {
public:
    scan(const std::string& path, const xmlreceiver& receiver)
        : receive(receiver), text(path), pos(text.find('<', 0)), cur(pos)
    {
    }

    // Tokens to the end: either the last ">" of the text or, outside the dialect, the text's end.
    void run()
    {
        while (cur != npos) {
            text.finishedto(pos);
            int character = text.at(cur);
            if (character == '>' && text.find('>', cur + 1) == npos) {
                return;
            }
            if (character == '<' && text.at(cur + 1) == '?') {
                skipdeclaration();
            }
            for (character = text.at(pos); blank(character); character = text.at(pos)) {
                ++pos;
            }
            cur = pos;
            if (character == '<') {
                readtag();
            } else if (character != filetext::kEnd) {
                readtext();
            } else {
                return;
            }
        }
    }

private:
    // There is one place behind a declaration, wherever the "<?" stands: behind the text's first
    // "?" that can end one and the character after it, or, without such a "?", on the second
    // character. From a later "<?" it would lead back over text already read, without end; there
    // the "<?" is read as any other tag.
    void skipdeclaration()
    {
        constexpr std::size_t kMarkAndBracket = 2;
        constexpr std::size_t kSecondCharacter = 1;
        const std::size_t mark = text.firstmark();
        const std::size_t behind = mark == npos ? kSecondCharacter : mark + kMarkAndBracket;
        if (behind >= cur) {
            pos = behind;
        }
    }

    // Without white space at both ends. A token of nothing else is an error that ends the reading.
    [[nodiscard]] std::string_view trimmed(std::string_view untrimmed) const
    {
        while (!untrimmed.empty() && blank(untrimmed.front())) {
            untrimmed.remove_prefix(1);
        }
        if (untrimmed.empty()) {
            throw emptytag(cur);
        }
        while (blank(untrimmed.back())) {
            untrimmed.remove_suffix(1);
        }
        return untrimmed;
    }

    void readtext()
    {
        pos = text.find('<', pos + 1);
        receive({xmltoken::kText, trimmed(text.from(cur, pos)), cur});
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
        const std::string_view inside = text.from(cur + 1, pos);
        const std::size_t slash = inside.starts_with('/') ? 0 : inside.find('/');
        if (slash != npos) {
            readendtag(inside.substr(slash + 1));
        } else {
            readstarttag(inside);
        }
    }

    void readstarttag(std::string_view inside)
    {
        receive({xmltoken::kStartTag, trimmed(inside), cur});
        ++pos;
        cur = pos;
    }

    void readendtag(std::string_view untrimmed)
    {
        receive({xmltoken::kEndTag, trimmed(untrimmed), cur});
        // Only the root's closing tag leaves `cur` on its ">", which ends the reading there if it
        // is the last one of the file. The name is compared untrimmed.
        cur = untrimmed == "wdtargets" ? pos : pos + 1;
    }

    const xmlreceiver& receive;
    filetext text;
    std::size_t pos;
    std::size_t cur;
};

} // namespace

void scanfile(const std::string& path, const xmlreceiver& receiver)
{
    scan(path, receiver).run();
}
