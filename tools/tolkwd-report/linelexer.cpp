#include "linelexer.h"

namespace report {

namespace {

void addcounted(std::int64_t clock, std::vector<lexed>& into)
{
    if (!into.empty() && into.back().what == lexed::kind::kCounted &&
        into.back().said.clock == clock) {
        ++into.back().lines;
        return;
    }
    lexed& added = into.emplace_back();
    added.what = lexed::kind::kCounted;
    added.said.clock = clock;
}

void addmessage(const linehead& head, const recogniser::found& found, std::string_view text,
                std::vector<lexed>& into)
{
    lexed& added = into.emplace_back();
    added.what = lexed::kind::kMessage;
    added.said.clock = head.clock;
    added.said.who = head.who;
    added.said.thread = numberof(head.thread);
    added.said.found = found;
    added.said.text = text;
}

// Lines in succession are one, for there may be as many of them as bytes.
void addother(std::string_view line, std::vector<lexed>& into)
{
    if (!into.empty() && into.back().what == lexed::kind::kOther) {
        std::string_view& before = into.back().said.text;
        before = {before.data(), before.size() + line.size()};
        return;
    }
    into.emplace_back().said.text = line;
}

} // namespace

void linelexer::lex(std::string_view bytes, lexedbytes& into)
{
    into.bytes = bytes;
    into.lines.clear();
    linehead head;
    for (;;) {
        const bool hashead = heads.read(bytes, head);
        const std::size_t end = bytes.find('\n', hashead ? head.bytes : 0);
        if (end == std::string_view::npos) {
            break;
        }
        if (!hashead || end > kLongestLineBytes ||
            !lexmessage(head, withoutreturn(bytes.substr(head.bytes, end - head.bytes)),
                        into.lines)) {
            addother(bytes.substr(0, end + 1), into.lines);
        }
        bytes.remove_prefix(end + 1);
    }
    into.rest = bytes;
}

bool linelexer::lexmessage(const linehead& head, std::string_view text, std::vector<lexed>& into)
{
    if (const auto* const same = memo.find(head.who, text)) {
        if (isheard(same->form())) {
            addmessage(head, same->in(text), text, into);
        } else {
            addcounted(head.clock, into);
        }
        return true;
    }
    const recogniser::found found = recognise(head.who, text);
    if (found.form == nullptr) {
        return false;
    }
    if (isheard(*found.form)) {
        addmessage(head, found, text, into);
    } else {
        addcounted(head.clock, into);
    }
    return true;
}

recogniser::found linelexer::plainmessage(speakerid who, std::string_view text)
{
    const auto* const same = memo.find(who, text);
    return same != nullptr ? same->in(text) : recognise(who, text);
}

// What the memo does not hold.
recogniser::found linelexer::recognise(speakerid who, std::string_view text)
{
    const recogniser::found found = known.find(who, text);
    if (found.form == nullptr || text.find(kThreadMark) != std::string_view::npos) {
        return {};
    }
    if (!found.form->varies) {
        memo.keep(who, text, found);
    }
    return found;
}

} // namespace report
