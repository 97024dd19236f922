#include "recogniser.h"

#include <algorithm>
#include <cassert>

namespace report {

namespace {

constexpr std::array<std::string_view, 7> kNumbers = {"N",   "SECONDS", "STATUS", "PID",
                                                      "OLD", "NEW",     "TID"};
constexpr std::string_view kLimit = "LIMIT"; // a number, but in the listing

// The first line of what a command printed.
constexpr std::array<std::string_view, 2> kPrinted = {"LINE", "ANSWER"};

// A name or a path at the end of a message is taken to be one line, for what follows it in the
// journal is mostly what a command has printed.
constexpr std::array<std::string_view, 2> kOneLine = {"NAME", "PATH"};
constexpr std::string_view kDependent = "DEPENDENT";

template <typename Words>
bool isamong(const Words& words, std::string_view word)
{
    return std::find(words.begin(), words.end(), word) != words.end();
}

std::string_view levelword(loglevel level) noexcept
{
    switch (level) {
    case loglevel::kError:
        return "ERROR";
    case loglevel::kInfo:
        return "INFO";
    case loglevel::kDebug:
        return "DEBUG";
    default:
        return {};
    }
}

// Takes the next literal, up to a value or the end, off `text`.
std::string_view takeliteral(std::string_view& text)
{
    const std::string_view literal = text.substr(0, text.find('{'));
    text.remove_prefix(literal.size());
    return literal;
}

// Takes the name of a value, in braces, off `text`.
std::string_view takevalue(std::string_view& text)
{
    const std::size_t end = text.find('}');
    const std::string_view name = text.substr(1, end - 1);
    text.remove_prefix(end + 1);
    return name;
}

pattern takeapart(const messageform& form, speakerid who)
{
    const bool listing = form.id == messageid::kListing;
    pattern made{.id = form.id, .who = who, .matters = matters(form.id)};
    std::string_view rest = form.text;
    made.literals[0] = takeliteral(rest);
    std::string_view last;
    bool commandbefore = false;
    while (!rest.empty()) {
        const std::string_view name = takevalue(rest);
        if (made.values > 0 && made.literals.at(made.values).empty()) {
            --made.values; // two values without anything between them are one
            commandbefore = true;
        }
        const bool number = !listing && (isamong(kNumbers, name) || name == kLimit);
        made.isnumber.at(made.values) = number;
        made.isconfigured.at(made.values) = !number && !isamong(kPrinted, name);
        ++made.values;
        made.literals.at(made.values) = takeliteral(rest);
        last = name;
    }
    made.varies = std::count(made.isnumber.begin(), made.isnumber.end(), true) > 1;
    const bool oneline = isamong(kOneLine, last) || (last == kDependent && !commandbefore);
    made.goeson = made.values > 0 && made.literals.at(made.values).empty() &&
                  made.isconfigured.at(made.values - 1) && (listing || !oneline);
    return made;
}

constexpr bool isdigit(char byte) noexcept
{
    return byte >= '0' && byte <= '9';
}

bool isnumber(std::string_view text) noexcept
{
    if (text.starts_with('-')) {
        text.remove_prefix(1);
    }
    return !text.empty() && std::all_of(text.begin(), text.end(), isdigit);
}

// Takes the number that `text` ends in, and `before` in front of it, off `text`.
bool takenumberback(std::string_view& text, std::string_view before, std::string_view& number)
{
    std::size_t begin = text.size();
    while (begin > 0 && isdigit(text[begin - 1])) {
        --begin;
    }
    if (begin > 0 && text[begin - 1] == '-' && !text.substr(0, begin).ends_with(before)) {
        --begin;
    }
    number = text.substr(begin);
    text = text.substr(0, begin);
    if (!isnumber(number) || !text.ends_with(before)) {
        return false;
    }
    text.remove_suffix(before.size());
    return true;
}

// Takes the number that `text` begins with, and `behind` after it, off `text`.
bool takenumber(std::string_view& text, std::string_view behind, std::string_view& number)
{
    std::size_t end = text.starts_with('-') ? 1 : 0;
    while (end < text.size() && isdigit(text[end])) {
        ++end;
    }
    number = text.substr(0, end);
    text.remove_prefix(end);
    if (!isnumber(number) || !text.starts_with(behind)) {
        return false;
    }
    text.remove_prefix(behind.size());
    return true;
}

using valuetexts = std::array<std::string_view, pattern::kMostValues>;

// Finds the values of `text`, what stands before the first and behind the last taken off. A number
// cannot hold the words that stand beside it, anything else can: so numbers are taken first, from
// the ends.
bool takevalues(const pattern& form, std::string_view text, valuetexts& values)
{
    std::size_t low = 0;
    std::size_t high = form.values - 1;
    for (; low < high && form.isnumber.at(high); --high) {
        if (!takenumberback(text, form.literals.at(high), values.at(high))) {
            return false;
        }
    }
    for (; low < high && form.isnumber.at(low); ++low) {
        if (!takenumber(text, form.literals.at(low + 1), values.at(low))) {
            return false;
        }
    }
    if (low < high) {
        const std::string_view between = form.literals.at(high);
        const std::size_t place = text.find(between);
        if (place == std::string_view::npos) {
            return false;
        }
        values.at(low) = text.substr(0, place);
        values.at(high) = text.substr(place + between.size());
        return true;
    }
    values.at(low) = text;
    return !form.isnumber.at(low) || isnumber(text);
}

bool fits(const pattern& form, std::string_view text, recognised& what)
{
    if (!text.starts_with(form.literals[0])) {
        return false;
    }
    text.remove_prefix(form.literals[0].size());
    if (form.values == 0) {
        what = {.id = form.id};
        return text.empty();
    }
    const std::string_view last = form.literals.at(form.values);
    if (!text.ends_with(last)) {
        return false;
    }
    text.remove_suffix(last.size());
    valuetexts values;
    if (!takevalues(form, text, values)) {
        return false;
    }
    what = {.id = form.id, .first = values[0], .second = values[1]};
    return true;
}

fragment fragmentof(const pattern& form, std::string_view text)
{
    const std::string_view begins = form.literals[0];
    if (!text.starts_with(begins)) {
        return begins.starts_with(text) ? fragment::kCut : fragment::kNone;
    }
    const bool mayfollow = std::find(form.isconfigured.begin(), form.isconfigured.end(), true) !=
                           form.isconfigured.end();
    if (form.values == 0) {
        return fragment::kNone; // longer than the message
    }
    return mayfollow ? fragment::kMayFollow : fragment::kCut;
}

} // namespace

const recogniser& recogniser::ofall()
{
    static const recogniser all(messageforms());
    return all;
}

recogniser::recogniser(std::span<const messageform> forms)
{
    for (const messageform& form : forms) {
        if (speakerof(form.level, form.module) == kNobody) {
            addspeaker(form);
        }
        patterns.push_back(takeapart(form, speakerof(form.level, form.module)));
    }
    next.assign(patterns.size(), kNone);
    for (std::size_t index = patterns.size(); index > 0; --index) {
        enlist(index - 1);
    }
}

void recogniser::addspeaker(const messageform& form)
{
    speaker& added = voices.emplace_back(speaker{form.level, form.module});
    if (form.level == loglevel::kStandardError) {
        keys.push_back({.third = 1}); // no text's: there that word is the first one, which is 0
    } else {
        added.head.append(" ").append(levelword(form.level)).append(" ").append(form.module);
        added.head.append("|TID");
        assert(added.head.size() >= speaker::kLeastHeadBytes &&
               added.head.size() <= speaker::kMostHeadBytes);
        keys.push_back(keyof(added.head));
        guesses.at(guessof(keys.back().first, keys.back().second)) =
            static_cast<speakerid>(keys.size() - 1);
    }
    starts.emplace_back().first.fill(kNone);
}

void recogniser::enlist(std::size_t index)
{
    chains& mine = starts[patterns[index].who];
    const std::string_view begins = patterns[index].literals[0];
    std::uint8_t& chain =
        begins.empty() ? mine.anything : mine.first.at(static_cast<unsigned char>(begins.front()));
    next[index] = chain;
    chain = static_cast<std::uint8_t>(index);
}

recogniser::headkey recogniser::keyof(std::string_view head) noexcept
{
    const std::size_t tail = head.size() - 2 * kWordBytes;
    return {wordat(head.data()), wordat(head.data() + kWordBytes), wordat(head.data() + tail),
            wordat(head.data() + tail + kWordBytes), tail};
}

speakerid recogniser::searchspeaker(std::string_view text) const noexcept
{
    for (std::size_t who = 0; who < voices.size(); ++who) {
        if (!voices[who].head.empty() && text.starts_with(voices[who].head)) {
            return static_cast<speakerid>(who);
        }
    }
    return kNobody;
}

speakerid recogniser::speakerof(loglevel level, std::string_view module) const noexcept
{
    for (std::size_t who = 0; who < voices.size(); ++who) {
        if (voices[who].level == level && voices[who].module == module) {
            return static_cast<speakerid>(who);
        }
    }
    return kNobody;
}

recogniser::found recogniser::findin(std::size_t chain, std::string_view text) const noexcept
{
    found result;
    for (; chain != kNone; chain = next[chain]) {
        if (fits(patterns[chain], text, result.what)) {
            result.form = &patterns[chain];
            return result;
        }
    }
    return {};
}

recogniser::found recogniser::find(speakerid who, std::string_view text) const noexcept
{
    if (who == kNobody) {
        return {};
    }
    const chains& mine = starts[who];
    if (!text.empty()) {
        const found result = findin(mine.first[static_cast<unsigned char>(text.front())], text);
        if (result.form != nullptr) {
            return result;
        }
    }
    return findin(mine.anything, text);
}

fragment recogniser::fragmentof(speakerid who, std::string_view text) const noexcept
{
    fragment most = fragment::kNone;
    for (const pattern& form : patterns) {
        if (form.who == who) {
            most = std::max(most, report::fragmentof(form, text));
        }
    }
    return most;
}

bool recogniser::endsmessage(std::string_view text) const noexcept
{
    return std::any_of(patterns.begin(), patterns.end(), [&](const pattern& form) {
        const std::string_view last = form.literals.at(form.values);
        return !last.empty() && !text.empty() && (text.ends_with(last) || last.ends_with(text));
    });
}

} // namespace report
