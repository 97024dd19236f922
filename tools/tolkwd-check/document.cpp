#include "document.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <unordered_map>
#include <utility>

#include "daemonview.h"
#include "xmlscan.h"

namespace check {

namespace {

constexpr std::size_t npos = std::string_view::npos;
constexpr std::size_t kOddKinds = static_cast<std::size_t>(oddkind::unfinished) + 1;

// What more of a kind there is, a file of nothing but mistakes, is not worth its memory.
constexpr std::size_t kMostOfAKind = 200000;

std::string_view trimmed(std::string_view text)
{
    const std::string_view blanks(control, kControlCount);
    const std::size_t begin = text.find_first_not_of(blanks);
    if (begin == npos) {
        return {};
    }
    return text.substr(begin, text.find_last_not_of(blanks) - begin + 1);
}

bool beginsname(char c)
{
    return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || c == '_';
}

// What kind of element a name is. Ours have their rank: nothing is inside one of its own rank.
enum class rank { root, target, service, field, unknown };
constexpr std::size_t kRanks = 5;

std::size_t indexof(rank level)
{
    return static_cast<std::size_t>(level);
}

rank rankof(std::string_view name)
{
    if (name == "wdtargets") {
        return rank::root;
    }
    if (name == "wdmonitortarget") {
        return rank::target;
    }
    if (name == "wdmonitorservice" || name == "wdmondependsev") {
        return rank::service;
    }
    return fieldindex(name) != kFieldElements.size() ? rank::field : rank::unknown;
}

void appendutf8(std::string& text, unsigned long code)
{
    const auto byte = [&text](unsigned long value) {
        text += static_cast<char>(static_cast<unsigned char>(value));
    };
    if (code < 0x80) {
        byte(code);
    } else if (code < 0x800) {
        byte(0xc0 | (code >> 6U));
        byte(0x80 | (code & 0x3fU));
    } else if (code < 0x10000) {
        byte(0xe0 | (code >> 12U));
        byte(0x80 | ((code >> 6U) & 0x3fU));
        byte(0x80 | (code & 0x3fU));
    } else {
        byte(0xf0 | (code >> 18U));
        byte(0x80 | ((code >> 12U) & 0x3fU));
        byte(0x80 | ((code >> 6U) & 0x3fU));
        byte(0x80 | (code & 0x3fU));
    }
}

// Appends the character that a reference stands for: `name` is what is between "&" and ";". False
// where it is none.
bool appendreferred(std::string& text, std::string_view name)
{
    constexpr std::array<std::pair<std::string_view, char>, 5> kNamed{
        {{"amp", '&'}, {"lt", '<'}, {"gt", '>'}, {"quot", '"'}, {"apos", '\''}}};
    const auto* const known = std::find_if(kNamed.begin(), kNamed.end(),
                                           [name](const auto& each) { return each.first == name; });
    if (known != kNamed.end()) {
        text += known->second;
        return true;
    }
    if (!name.starts_with('#')) {
        return false;
    }
    constexpr unsigned long kMost = 0x10ffff;
    const bool hexadecimal = name.starts_with("#x");
    const std::string_view digits = name.substr(hexadecimal ? 2 : 1);
    unsigned long code = 0;
    const auto [end, error] =
        std::from_chars(digits.data(), digits.data() + digits.size(), code, hexadecimal ? 16 : 10);
    if (error != std::errc() || end != digits.data() + digits.size() || code > kMost) {
        return false;
    }
    appendutf8(text, code);
    return true;
}

// An element that is open.
struct openelement {
    rank level;
    std::string_view name;
    std::size_t begin;
};

// Builds the document piece by piece.
class reader {
public:
    explicit reader(std::string_view whole) : text(whole) {}

    document read()
    {
        while (pos < text.size()) {
            if (text[pos] == '<') {
                readmarkup();
            } else {
                readtext();
            }
        }
        finish();
        return std::move(result);
    }

private:
    void note(oddkind kind, std::size_t begin, std::size_t end, std::string_view name = {},
              std::string_view other = {})
    {
        if (++noted.at(static_cast<std::size_t>(kind)) <= kMostOfAKind) {
            result.oddities.push_back({kind, begin, end, name, other});
        }
    }

    [[nodiscard]] bool rootclosed() const { return result.rootend && stack.empty(); }

    [[nodiscard]] bool infield() const { return field.has_value(); }

    [[nodiscard]] bool inunknown() const
    {
        return !stack.empty() && stack.back().level == rank::unknown;
    }

    // The place behind the next `mark`, or, where there is none, behind the next ">" or at the
    // text's end.
    [[nodiscard]] std::size_t behind(std::string_view mark, std::size_t from)
    {
        // Once a mark is not found, it is not looked for again: a text of nothing but beginnings
        // would take a time that grows with its square.
        std::size_t& missingfrom = missing[mark];
        if (missingfrom == 0 || from < missingfrom) {
            const std::size_t found = text.find(mark, from);
            if (found != npos) {
                return found + mark.size();
            }
            missingfrom = from;
        }
        const std::size_t bracket = mark == ">" ? npos : text.find('>', from);
        return bracket == npos ? text.size() : bracket + 1;
    }

    void readtext()
    {
        const std::size_t begin = pos;
        pos = std::min(text.find('<', pos), text.size());
        taketext(begin, pos);
    }

    void taketext(std::size_t begin, std::size_t end)
    {
        const std::string_view piece = text.substr(begin, end - begin);
        if (infield()) {
            appendmeant(piece, begin);
        } else if (!trimmed(piece).empty() && seenmarkup && !inunknown()) {
            const auto first =
                begin + static_cast<std::size_t>(trimmed(piece).data() - piece.data());
            note(rootclosed() ? oddkind::trailing : oddkind::straytext, first, end);
        }
    }

    // Text of a field, its references resolved.
    void appendmeant(std::string_view piece, std::size_t begin)
    {
        constexpr std::size_t kLongestReference = 12;
        for (std::size_t at = 0; at < piece.size();) {
            const std::size_t mark = std::min(piece.find('&', at), piece.size());
            meant += piece.substr(at, mark - at);
            at = mark;
            if (at == piece.size()) {
                break;
            }
            const std::size_t semicolon = piece.substr(at, kLongestReference).find(';');
            if (semicolon != npos && appendreferred(meant, piece.substr(at + 1, semicolon - 1))) {
                note(oddkind::entity, begin + at, begin + at + semicolon + 1,
                     piece.substr(at, semicolon + 1));
                at += semicolon + 1;
            } else {
                meant += piece[at++];
            }
        }
    }

    void readmarkup()
    {
        const std::size_t begin = pos;
        const std::string_view rest = text.substr(pos);
        const bool first = !std::exchange(seenmarkup, true);
        if (rest.starts_with("<!--")) {
            constexpr std::size_t kOpening = 4;
            pos = behind("-->", pos + kOpening);
            noteforeign(oddkind::comment, begin);
        } else if (rest.starts_with("<![CDATA[")) {
            readcdata();
        } else if (rest.starts_with("<!")) {
            readdoctype();
        } else if (rest.starts_with("<?")) {
            readinstruction(first && begin == 0);
        } else {
            readtag();
        }
    }

    void noteforeign(oddkind kind, std::size_t begin) { note(kind, begin, pos); }

    // Only a declaration at the first byte is skipped, and only to its first "?".
    void readinstruction(bool allowed)
    {
        constexpr std::size_t kBracketAndMark = 2;
        const std::size_t begin = pos;
        pos = behind("?>", pos + kBracketAndMark);
        if (!allowed || text.find('?', kBracketAndMark) != pos - kBracketAndMark) {
            noteforeign(oddkind::instruction, begin);
        }
    }

    void readcdata()
    {
        constexpr std::string_view kOpening = "<![CDATA[";
        constexpr std::string_view kClosing = "]]>";
        const std::size_t begin = pos;
        pos = behind(kClosing, pos + kOpening.size());
        std::string_view inside =
            text.substr(begin + kOpening.size(), pos - std::min(pos, begin + kOpening.size()));
        if (inside.ends_with(kClosing)) {
            inside.remove_suffix(kClosing.size());
        }
        note(oddkind::cdata, begin, pos);
        if (infield()) {
            meant += inside;
        }
    }

    void readdoctype()
    {
        const std::size_t begin = pos;
        const std::size_t end = behind(">", pos);
        const bool subset = text.substr(begin, end - begin).find('[') != npos;
        pos = subset ? std::max(end, behind("]>", pos)) : end;
        note(oddkind::doctype, begin, pos);
    }

    // A "<" that may begin a tag. The tag ends at the next ">"; another "<" before that tells that
    // the ">" was forgotten, or that the "<" is none of a tag.
    void readtag()
    {
        const std::size_t begin = pos;
        const std::size_t stop = text.find_first_of("<>", pos + 1);
        const std::size_t limit = std::min(stop, text.size());
        std::string_view inside = text.substr(begin + 1, limit - begin - 1);
        const bool closing = trimmed(inside).starts_with('/');
        if (closing) {
            inside.remove_prefix(inside.find('/') + 1);
        }
        const std::string_view name = nameof(inside);
        if (stop == npos || text[stop] == '<') {
            if (name.empty() || rankof(name) == rank::unknown) {
                takeliteral(begin);
                return;
            }
            pos = limit;
            note(oddkind::brokentag, begin, pos, name);
        } else if (rankof(name) == rank::unknown && isinvalue(limit + 1)) {
            takeliteral(begin);
            return;
        } else {
            pos = limit + 1;
        }
        if (closing) {
            readclosing(begin, inside, name);
        } else {
            readopening(begin, inside, name);
        }
    }

    // The name at the beginning of what is inside a tag, without blanks before it.
    static std::string_view nameof(std::string_view inside)
    {
        const std::string_view blanks(control, kControlCount);
        inside.remove_prefix(std::min(inside.find_first_not_of(blanks), inside.size()));
        return inside.substr(0, std::min(inside.find_first_of("\n\r\t /=>"), inside.size()));
    }

    // Whether the field that is open goes on to its own closing tag from `place`: what stands
    // before that in the look of a tag is rather a redirection of its command.
    [[nodiscard]] bool isinvalue(std::size_t place) const
    {
        if (!infield() || inunknown()) {
            return false;
        }
        const std::string_view rest = text.substr(std::min(text.find('<', place), text.size()));
        return rest.starts_with("</") && nameof(rest.substr(2)) == stack.back().name;
    }

    void takeliteral(std::size_t begin)
    {
        note(oddkind::lessthan, begin, begin + 1);
        pos = begin + 1;
        if (infield()) {
            meant += '<';
        }
    }

    void readopening(std::size_t begin, std::string_view inside, std::string_view name)
    {
        const std::size_t slash = std::min(inside.find('/'), inside.size());
        const bool nothingbehind = trimmed(inside.substr(slash)) == "/";
        if (trimmed(inside).empty() || nothingbehind) {
            note(oddkind::emptytag, begin, pos, name);
        } else if (!beginsname(name.empty() ? '\0' : name.front())) {
            takeliteral(begin);
            return;
        } else if (trimmed(inside).size() != name.size()) {
            note(oddkind::attribute, begin, pos, name);
        }
        const bool selfclosing = trimmed(inside).ends_with('/');
        if (!name.empty() && !nothingbehind && !selfclosing) {
            open(begin, name);
        } else if (rankof(name) == rank::field && !infield()) {
            open(begin, name);
            close();
        }
    }

    void open(std::size_t begin, std::string_view name)
    {
        const rank level = rankof(name);
        if (rootclosed()) {
            note(oddkind::trailing, begin, pos, name);
        }
        if (level == rank::unknown) {
            note(oddkind::unknown, begin, pos, name);
        } else {
            closefrom(level);
        }
        switch (level) {
        case rank::root:
            result.rootopened = true;
            result.rootend.reset();
            break;
        case rank::target:
            target = writtentarget{begin, begin, {}};
            break;
        case rank::service:
            if (target) {
                service = writtenservice{begin, begin, name == "wdmonitorservice", {}};
            } else {
                note(oddkind::misplaced, begin, pos, name);
            }
            break;
        case rank::field:
            if (!service && (stack.empty() || stack.back().level != rank::service)) {
                note(oddkind::lostfield, begin, pos, name);
            }
            field = writtenfield{fieldindex(name), begin, begin, {}};
            meant.clear();
            break;
        case rank::unknown:
            break;
        }
        if (level != rank::unknown) {
            known.push_back(stack.size());
        }
        stack.push_back({level, name, begin});
        ++openof[name];
    }

    // Closes what is open of this rank and of those inside it: whoever opens another one means
    // that these have ended.
    void closefrom(rank level)
    {
        const auto first = std::find_if(known.begin(), known.end(), [&](std::size_t index) {
            return stack[index].level >= level;
        });
        if (first != known.end()) {
            ++endedearly.at(indexof(stack[*first].level));
            closedown(*first);
        }
    }

    // Whether this closing tag belongs to an element that was taken to have ended where another one
    // began. Inside one of the same rank it is rather that one's, and misspelt.
    bool comeslate(rank level)
    {
        std::size_t& early = endedearly.at(indexof(level));
        const bool late = early > 0 && stack.back().level < level;
        early -= late ? 1 : 0;
        return late;
    }

    void closedown(std::size_t kept)
    {
        while (stack.size() > kept) {
            if (stack.back().level != rank::unknown) {
                note(oddkind::unclosed, stack.back().begin, stack.back().begin + 1,
                     stack.back().name);
            }
            close();
        }
    }

    // Whether a closing tag of another name may be the misspelt one of the element that is open:
    // not if it names what stands inside that, and the element goes on behind it.
    [[nodiscard]] bool ismeantforopen(rank level) const
    {
        if (infield() || inunknown() || level == rank::unknown || level <= stack.back().level) {
            return true;
        }
        return level != rank::field && !goeson();
    }

    // Whether the next tag is one of the element that is open, its own closing tag or the beginning
    // of something that belongs inside it.
    [[nodiscard]] bool goeson() const
    {
        const std::string_view rest = text.substr(std::min(text.find('<', pos), text.size()));
        if (rest.starts_with("</")) {
            return nameof(rest.substr(2)) == stack.back().name;
        }
        return !rest.empty() &&
               indexof(rankof(nameof(rest.substr(1)))) == indexof(stack.back().level) + 1;
    }

    void readclosing(std::size_t begin, std::string_view inside, std::string_view name)
    {
        if (trimmed(inside).empty()) {
            note(oddkind::emptytag, begin, pos);
            return;
        }
        if (stack.empty()) {
            note(rootclosed() ? oddkind::trailing : oddkind::strayclosing, begin, pos, name);
        } else if (openof[name] > 0) {
            const auto found = std::find_if(stack.rbegin(), stack.rend(),
                                            [name](const auto& each) { return each.name == name; });
            closedown(static_cast<std::size_t>(stack.rend() - found));
            if (stack.back().level == rank::root) {
                result.rootend = begin;
                result.rootclosing = inside;
            }
            close();
        } else if (comeslate(rankof(name))) {
            note(oddkind::lateclosing, begin, pos, name);
        } else if (ismeantforopen(rankof(name))) {
            note(oddkind::mismatched, begin, pos, name, stack.back().name);
            close();
        } else {
            note(oddkind::strayclosing, begin, pos, name);
        }
    }

    // Closes the innermost element, which ends at the present place.
    void close()
    {
        const openelement closed = stack.back();
        stack.pop_back();
        --openof[closed.name];
        if (closed.level != rank::unknown) {
            known.pop_back();
            std::fill(endedearly.begin() + indexof(closed.level) + 1, endedearly.end(), 0);
        }
        switch (closed.level) {
        case rank::root:
        case rank::unknown:
            break;
        case rank::target:
            target->end = pos;
            result.targets.push_back(std::move(*target));
            target.reset();
            break;
        case rank::service:
            if (target && service) {
                service->end = pos;
                target->add(std::move(*service));
                service.reset();
            }
            break;
        case rank::field:
            field->end = pos;
            field->value = trimmed(meant);
            if (service) {
                service->add(std::move(*field));
            }
            field.reset();
            break;
        }
    }

    void finish()
    {
        if (!stack.empty()) {
            const std::size_t last =
                text.find_last_not_of(std::string_view(control, kControlCount));
            note(oddkind::unfinished, last, text.size(), stack.back().name);
            while (!stack.empty()) {
                close();
            }
            result.rootend.reset();
        }
        std::stable_sort(
            result.oddities.begin(), result.oddities.end(),
            [](const oddity& one, const oddity& other) { return one.begin < other.begin; });
    }

    std::string_view text;
    std::size_t pos = 0;
    bool seenmarkup = false;
    std::vector<openelement> stack;
    std::vector<std::size_t> known; // where ours are on the stack: one of each rank at most
    std::unordered_map<std::string_view, std::size_t> openof; // how many of a name are open
    std::unordered_map<std::string_view, std::size_t> missing;
    std::array<std::size_t, kRanks> endedearly{}; // how many of a rank, in what is open
    std::optional<writtentarget> target;
    std::optional<writtenservice> service;
    std::optional<writtenfield> field;
    std::string meant;
    std::array<std::size_t, kOddKinds> noted{}; // of each kind
    document result;
};

} // namespace

void writtenservice::add(writtenfield field)
{
    last.at(field.field) = fields.size();
    fields.push_back(std::move(field));
}

const writtenfield* writtenservice::find(std::size_t field) const noexcept
{
    const auto& place = last[field];
    return place ? &fields[*place] : nullptr;
}

void writtentarget::add(writtenservice service)
{
    if (service.monitored) {
        lastmonitored = services.size();
    }
    services.push_back(std::move(service));
}

const writtenservice* writtentarget::monitored() const noexcept
{
    return lastmonitored ? &services[*lastmonitored] : nullptr;
}

document readdocument(std::string_view text)
{
    return reader(text).read();
}

} // namespace check
