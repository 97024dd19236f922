#include "logreader.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <limits>
#include <memory>
#include <optional>
#include <thread>
#include <utility>

#include "lexahead.h"
#include "linehead.h"
#include "linelexer.h"
#include "logclock.h"
#include "recogniser.h"

namespace report {

namespace {

constexpr std::size_t kMostHeldBytes = 1 << 16; // of lines that follow a message
constexpr std::size_t kMostHeldLines = 1000;
constexpr std::size_t kBlockBytes = std::size_t{256} * 1024; // some stay in a processor's cache
constexpr std::size_t kSmallLogBytes = std::size_t{4} * 1024 * 1024; // not worth other threads
constexpr unsigned kMostThreads = 4;             // the reader's own cannot keep up with more
constexpr std::size_t kLongestPrefixBytes = 512; // of the journal's, with its host name

constexpr std::string_view kPrefixEnd = "]: ";

constexpr std::string_view kExportBegins = "__CURSOR=";
constexpr std::string_view kExportMessage = "MESSAGE";
constexpr std::size_t kExportLengthBytes = 8;
constexpr std::size_t kLongestFieldNameBytes = 64;

constexpr bool isdigit(char byte) noexcept
{
    return byte >= '0' && byte <= '9';
}

// Who wrote a line, by the journal: the "tolkwd[123]: " that its prefix ends in.
std::string_view writerin(std::string_view prefix)
{
    return prefix.substr(prefix.substr(0, prefix.size() - 1).find_last_of(' ') + 1);
}

// The length of the journal's prefix of a line that does not tell itself where it begins; 0 where
// there is none.
std::size_t prefixbytes(std::string_view line)
{
    const std::size_t end = line.substr(0, kLongestPrefixBytes).find(kPrefixEnd);
    const bool isprefix = end != std::string_view::npos && end > 0 && isdigit(line[end - 1]);
    return isprefix ? end + kPrefixEnd.size() : 0;
}

bool isfieldname(std::string_view name)
{
    return !name.empty() && name.size() <= kLongestFieldNameBytes &&
           std::all_of(name.begin(), name.end(), [](char byte) {
               return (byte >= 'A' && byte <= 'Z') || isdigit(byte) || byte == '_';
           });
}

// A message that lines behind it may belong to.
struct heldmessage {
    message said{}; // without its texts
    speakerid who = recogniser::kNobody;
    std::int64_t clock = 0;
    std::string text{};
    std::string more{};
    std::size_t lines = 0; // behind its first one
};

} // namespace

class logreader::work {
public:
    work(wanted which, listener hear)
        : everything(which == wanted::kAll), told(std::move(hear)), lexer(everything)
    {
    }

    void feed(std::string_view bytes);
    void feedall(const bytesource& read, const pace& how);
    void pause();
    void endfile();

    readcount count;
    logclock clock;

private:
    // What the next bytes are.
    enum class part : std::uint8_t {
        kLine,
        kFieldLength, // of a field of the export format that may hold anything
        kField,
        kFieldEnd, // its newline
    };

    // What the lines behind a message are.
    enum class following : std::uint8_t {
        kStrange, // somebody else's
        kGoesOn,  // they belong to it
        kUnwhole, // the message is not whole without them
    };

    const bool everything;
    const listener told;
    const recogniser& known = recogniser::ofall();
    headreader heads;
    linelexer lexer;
    lexedbytes apart; // the bytes at hand
    const speakerid standarderror = known.speakerof(loglevel::kStandardError, {});

    part at = part::kLine;
    std::string partial;       // of a line, or of a field, whose end has not come yet
    bool overlong = false;     // what has come of it is not kept
    bool isfirst = true;       // line of its file
    bool exported = false;     // this file has the export format
    bool ismessage = false;    // this field is one
    std::uint64_t missing = 0; // bytes of the field
    std::uint64_t line = 0;    // the number of the one at hand

    following behind = following::kStrange;
    std::string writer;   // of the message that they follow
    bool hastime = false; // a message had
    bool isheld = false;  // `held` holds a message
    heldmessage held;

    void feedlexed(const lexedbytes& block);
    std::string_view takelines(std::string_view bytes);
    std::string_view takelexed(const lexedbytes& block);
    std::string_view takeothers(std::string_view text);
    void takemessage(const saidline& said);
    void takecounted(std::int64_t when, std::uint32_t lines);
    std::string_view takeline(std::string_view bytes);
    std::string_view takerest(std::string_view bytes);
    std::string_view takelength(std::string_view bytes);
    std::string_view takefield(std::string_view bytes);
    void keep(std::string_view piece);
    void endline(std::string_view text);
    void endfield();
    void endpartial();

    void readline(std::string_view text);
    void readexported(std::string_view text);
    void readentry(std::string_view text);
    void readlogged(linehead head, std::string_view text, std::string_view from);
    void readunlogged(std::string_view text);
    void follow(std::string_view text);

    std::size_t findnext(const recogniser::found& found, std::string_view text);
    void take(const saidline& said, std::string_view from);
    void takefragment(const saidline& said, std::string_view from);
    [[nodiscard]] message messageof(const saidline& said, const instant& when) const;
    void hold(const saidline& said, const message& whole);
    void complete();
    void settle();
    void dropunwhole();
    void tellheld();
    instant moment(std::int64_t when);
};

// ---- From bytes to lines.

void logreader::work::feed(std::string_view bytes)
{
    count.bytes += bytes.size();
    while (!bytes.empty()) {
        switch (at) {
        case part::kLine:
            if (!partial.empty() || overlong) {
                bytes = takerest(bytes);
            } else {
                bytes = exported ? takeline(bytes) : takelines(bytes);
            }
            break;
        case part::kFieldLength:
            bytes = takelength(bytes);
            break;
        case part::kField:
            bytes = takefield(bytes);
            break;
        case part::kFieldEnd:
            if (bytes.front() == '\n') {
                bytes.remove_prefix(1);
                ++count.lines;
            }
            at = part::kLine;
            break;
        }
    }
}

void logreader::work::feedall(const bytesource& read, const pace& how)
{
    const auto block = std::make_unique_for_overwrite<char[]>(how.blockbytes);
    for (std::size_t ahead = 0; how.helpers == 0 || ahead < how.alone;) {
        const std::size_t got = read(block.get(), how.blockbytes);
        if (got == 0) {
            return;
        }
        feed({block.get(), got});
        ahead += got;
    }
    lexahead ahead({everything, how.blockbytes, how.helpers}, read);
    while (const lexedbytes* const lines = ahead.next()) {
        feedlexed(*lines);
    }
}

// What was taken apart counts only where it does begin with a line.
void logreader::work::feedlexed(const lexedbytes& block)
{
    if (at != part::kLine || !partial.empty() || overlong || exported) {
        feed(block.bytes);
        return;
    }
    count.bytes += block.bytes.size();
    const std::string_view left = takelexed(block);
    count.bytes -= left.size(); // and now again
    feed(left);
}

std::string_view logreader::work::takelines(std::string_view bytes)
{
    lexer.lex(bytes, apart);
    return takelexed(apart);
}

// Returns what was not taken: that is what stands behind the first line of a file, if that line
// tells that the file has the export format.
std::string_view logreader::work::takelexed(const lexedbytes& block)
{
    for (const lexed& next : block.lines) {
        switch (next.what) {
        case lexed::kind::kMessage:
            takemessage(next.said);
            break;
        case lexed::kind::kCounted:
            takecounted(next.said.clock, next.lines);
            break;
        case lexed::kind::kOther:
            const std::string_view left = takeothers(next.said.text);
            if (exported) {
                return block.bytes.substr(
                    static_cast<std::size_t>(left.data() - block.bytes.data()));
            }
            break;
        }
    }
    keep(block.rest);
    return {};
}

// Whole lines. Returns what was not taken, likewise.
std::string_view logreader::work::takeothers(std::string_view text)
{
    while (!text.empty() && !exported) {
        text = takeline(text);
    }
    return text;
}

void logreader::work::takemessage(const saidline& said)
{
    line = ++count.lines;
    isfirst = false;
    settle();
    take(said, {});
}

void logreader::work::takecounted(std::int64_t when, std::uint32_t lines)
{
    count.lines += lines;
    count.messages += lines;
    isfirst = false;
    settle();
    behind = following::kStrange;
    (void)moment(when);
}

// Returns what stands behind the line.
std::string_view logreader::work::takeline(std::string_view bytes)
{
    const std::size_t end = bytes.find('\n');
    if (end == std::string_view::npos) {
        keep(bytes);
        return {};
    }
    endline(bytes.substr(0, end));
    return bytes.substr(end + 1);
}

// The same of a line whose beginning has been kept.
std::string_view logreader::work::takerest(std::string_view bytes)
{
    const std::size_t end = bytes.find('\n');
    keep(bytes.substr(0, end));
    if (end == std::string_view::npos) {
        return {};
    }
    endpartial();
    return bytes.substr(end + 1);
}

void logreader::work::keep(std::string_view piece)
{
    if (overlong || piece.size() > kLongestLineBytes - partial.size()) {
        overlong = true;
        partial.clear();
    } else {
        partial.append(piece);
    }
}

void logreader::work::endpartial()
{
    if (std::exchange(overlong, false)) {
        ++count.lines;
        ++count.torn;
        isfirst = false;
        return;
    }
    const std::string text = std::exchange(partial, {});
    endline(text);
}

void logreader::work::endline(std::string_view text)
{
    line = ++count.lines;
    if (text.size() > kLongestLineBytes) {
        ++count.torn;
    } else {
        readline(text);
    }
    isfirst = false;
}

std::string_view logreader::work::takelength(std::string_view bytes)
{
    const std::string_view piece = bytes.substr(0, kExportLengthBytes - partial.size());
    partial.append(piece);
    if (partial.size() == kExportLengthBytes) {
        missing = 0;
        for (std::size_t i = kExportLengthBytes; i > 0; --i) {
            missing = missing << 8U | static_cast<unsigned char>(partial[i - 1]);
        }
        partial.clear();
        at = missing > 0 ? part::kField : part::kFieldEnd;
    }
    return bytes.substr(piece.size());
}

std::string_view logreader::work::takefield(std::string_view bytes)
{
    const std::string_view piece =
        bytes.substr(0, static_cast<std::size_t>(std::min<std::uint64_t>(missing, bytes.size())));
    missing -= piece.size();
    count.lines += static_cast<std::uint64_t>(std::count(piece.begin(), piece.end(), '\n'));
    if (ismessage) {
        keep(piece);
    }
    if (missing == 0) {
        endfield();
        at = part::kFieldEnd;
    }
    return bytes.substr(piece.size());
}

void logreader::work::endfield()
{
    if (std::exchange(overlong, false)) {
        ++count.torn;
    }
    const std::string text = std::exchange(partial, {});
    if (!std::exchange(ismessage, false)) {
        return;
    }
    for (std::string_view rest = text; !rest.empty();) {
        const std::string_view entry = rest.substr(0, rest.find('\n'));
        readentry(entry);
        rest.remove_prefix(std::min(entry.size() + 1, rest.size()));
    }
}

void logreader::work::readline(std::string_view text)
{
    text = withoutreturn(text);
    exported = exported || (isfirst && text.starts_with(kExportBegins));
    if (exported) {
        readexported(text);
    } else {
        readentry(text);
    }
}

// A line of the export format: a field, or the name of one that may hold anything, or the empty
// line between two entries.
void logreader::work::readexported(std::string_view text)
{
    const std::size_t sign = text.find('=');
    const std::string_view name = text.substr(0, sign);
    if (text.empty()) {
        return;
    }
    if (!isfieldname(name)) {
        ++count.foreign;
    } else if (sign == std::string_view::npos) {
        ismessage = name == kExportMessage;
        at = part::kFieldLength;
    } else if (name == kExportMessage) {
        readentry(text.substr(sign + 1));
    }
}

// ---- From lines to messages.

// A line as somebody wrote it, or as the journal prints it.
void logreader::work::readentry(std::string_view text)
{
    linehead head;
    if (heads.read(text, head)) {
        readlogged(head, text, {});
        return;
    }
    const std::string_view prefixes = text.substr(0, kLongestPrefixBytes);
    for (std::size_t end = prefixes.find(kPrefixEnd); end != std::string_view::npos;
         end = prefixes.find(kPrefixEnd, end + 1)) {
        const std::size_t begin = end + kPrefixEnd.size();
        if (heads.read(text.substr(begin), head)) {
            readlogged(head, text.substr(begin), writerin(text.substr(0, begin)));
            return;
        }
    }
    readunlogged(text);
}

// A text that begins with a head, and may hold others where writing was cut off before them.
void logreader::work::readlogged(linehead head, std::string_view text, std::string_view from)
{
    for (;;) {
        settle();
        saidline said{.clock = head.clock,
                      .who = head.who,
                      .thread = numberof(head.thread),
                      .text = text.substr(head.bytes)};
        said.found = lexer.plainmessage(head.who, said.text);
        if (said.found.form != nullptr) {
            take(said, from);
            return;
        }
        said.found = known.find(head.who, said.text);
        const std::size_t next = findnext(said.found, said.text);
        if (next == std::string_view::npos) {
            take(said, from);
            return;
        }
        ++count.torn;
        text = said.text.substr(next);
        (void)heads.read(text, head);
    }
}

// What no head begins.
void logreader::work::readunlogged(std::string_view text)
{
    const std::size_t prefix = prefixbytes(text);
    const std::string_view from = prefix > 0 ? writerin(text.substr(0, prefix)) : "";
    const std::string_view said = text.substr(prefix);
    const recogniser::found found = known.find(standarderror, said);
    if (found.form != nullptr) {
        settle();
        take({.who = standarderror, .found = found, .text = said}, from);
        return;
    }
    const std::size_t next = heads.find(text);
    if (next != std::string_view::npos) {
        ++count.torn;
        linehead head;
        (void)heads.read(text.substr(next), head);
        readlogged(head, text.substr(next), {});
        return;
    }
    if (behind != following::kStrange && from == writer) {
        follow(said);
    } else if (isfirst &&
               (text.find(kThreadMark) != std::string_view::npos || known.endsmessage(text))) {
        ++count.torn;
    } else {
        ++count.foreign;
    }
}

// A line that belongs to the message before.
void logreader::work::follow(std::string_view text)
{
    if (!isheld) {
        return; // of a message that is counted only, or has been told
    }
    std::string& into = behind == following::kUnwhole ? held.text : held.more;
    const bool room = into.size() + text.size() < kMostHeldBytes && held.lines < kMostHeldLines;
    if (behind == following::kUnwhole) {
        ++held.lines;
        if (!room) {
            dropunwhole();
            return;
        }
        into.append("\n").append(text);
        complete();
    } else if (room) {
        ++held.lines;
        into.append(text).append("\n");
    }
}

// Where the next line begins within a text that was cut off: one that is no message, or one with a
// line's head in a text of the configuration. What commands have printed may hold anything.
std::size_t logreader::work::findnext(const recogniser::found& found, std::string_view text)
{
    if (text.find(kThreadMark) == std::string_view::npos) {
        return std::string_view::npos;
    }
    const auto hashead = [&](std::string_view value) {
        return heads.find(value) != std::string_view::npos;
    };
    const bool istorn = found.form == nullptr ||
                        (found.form->isconfigured[0] && hashead(found.what.first)) ||
                        (found.form->isconfigured[1] && hashead(found.what.second));
    return istorn ? heads.find(text) : std::string_view::npos;
}

void logreader::work::take(const saidline& said, std::string_view from)
{
    behind = following::kStrange;
    if (said.found.form == nullptr) {
        takefragment(said, from);
        return;
    }
    const pattern& form = *said.found.form;
    ++count.messages;
    const instant when = said.who == standarderror ? count.last : moment(said.clock);
    if (form.goeson) {
        behind = following::kGoesOn;
        writer.assign(from);
    }
    if (!everything && !form.matters) {
        return;
    }
    const message whole = messageof(said, when);
    if (form.goeson) {
        hold(said, whole);
    } else {
        told(whole);
    }
}

// What is no message.
void logreader::work::takefragment(const saidline& said, std::string_view from)
{
    switch (known.fragmentof(said.who, said.text)) {
    case fragment::kNone:
        ++count.foreign;
        break;
    case fragment::kCut:
        ++count.torn;
        break;
    case fragment::kMayFollow:
        behind = following::kUnwhole;
        writer.assign(from);
        hold(said, messageof(said, {}));
        break;
    }
}

message logreader::work::messageof(const saidline& said, const instant& when) const
{
    return {.id = said.found.what.id,
            .level = known.speakers()[said.who].level,
            .thread = said.thread,
            .when = when,
            .first = said.found.what.first,
            .second = said.found.what.second,
            .text = said.text,
            .line = line};
}

void logreader::work::hold(const saidline& said, const message& whole)
{
    isheld = true;
    held = {.said = whole, .who = said.who, .clock = said.clock, .text = std::string(said.text)};
}

// The message that was not whole may be now.
void logreader::work::complete()
{
    const recogniser::found found = known.find(held.who, held.text);
    if (found.form == nullptr) {
        return;
    }
    ++count.messages;
    held.said.id = found.what.id;
    held.said.when = moment(held.clock);
    behind = found.form->goeson ? following::kGoesOn : following::kStrange;
    isheld = everything || matters(found.what.id);
    if (isheld && behind == following::kStrange) {
        tellheld();
    }
}

// Another message begins: nothing more follows the one before.
void logreader::work::settle()
{
    if (!isheld) {
        return;
    }
    if (behind == following::kUnwhole) {
        dropunwhole();
    } else {
        tellheld();
    }
}

// The beginning of a message whose end has not come, and the lines behind it.
void logreader::work::dropunwhole()
{
    ++count.torn;
    count.foreign += held.lines;
    isheld = false;
    behind = following::kStrange;
}

void logreader::work::tellheld()
{
    const recogniser::found found = known.find(held.who, held.text);
    held.said.first = found.what.first;
    held.said.second = found.what.second;
    held.said.text = held.text;
    held.said.more = held.more;
    isheld = false;
    told(held.said);
}

instant logreader::work::moment(std::int64_t when)
{
    const instant now = clock.advance(when);
    if (!hastime) {
        hastime = true;
        count.first = now;
    }
    count.last = now;
    count.clockchanges = clock.changes();
    return now;
}

void logreader::work::pause()
{
    if (isheld && behind == following::kGoesOn) {
        tellheld();
    }
}

void logreader::work::endfile()
{
    if (at == part::kLine && !partial.empty()) {
        endpartial();
    } else if (overlong || at == part::kFieldLength || at == part::kField) {
        ++count.torn;
    }
    settle();
    at = part::kLine;
    partial.clear();
    overlong = false;
    ismessage = false;
    exported = false;
    isfirst = true;
    behind = following::kStrange;
}

pace pace::ofmachine() noexcept
{
    const unsigned processors = std::max(std::thread::hardware_concurrency(), 1U);
    return {kBlockBytes, kSmallLogBytes, std::min(processors, kMostThreads) - 1};
}

logreader::logreader(wanted which, listener hear)
    : self(std::make_unique<work>(which, std::move(hear)))
{
}

logreader::~logreader() = default;

void logreader::feed(std::string_view bytes)
{
    self->feed(bytes);
}

void logreader::feedall(const bytesource& read, const pace& how)
{
    self->feedall(read, how);
}

void logreader::pause()
{
    self->pause();
}

void logreader::endfile()
{
    self->endfile();
}

const readcount& logreader::count() const noexcept
{
    return self->count;
}

instant logreader::at(std::time_t utc) const
{
    return self->clock.at(utc);
}

} // namespace report
