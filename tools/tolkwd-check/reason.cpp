#include "reason.h"

#include <algorithm>
#include <optional>
#include <span>
#include <string_view>

#include "printable.h"
#include "wdmonitorthread_linux.h"

namespace check {

namespace {

// Fits a line that holds `word`, and `also`, and not `without`; those that are empty do not count.
struct wordrule {
    int verdict;
    std::string_view word;
    std::string_view also;
    std::string_view without;
};

// Both in the order of the daemon's functions.
constexpr wordrule kStatusRules[]{
    {kServiceRunning, "running", "", "not"},      {kServiceRunning, "RUNNING", "", "NOT"},
    {kServiceNotRunning, "stopped", "", ""},      {kServiceNotRunning, "not", "running", ""},
    {kServiceNotRunning, "NOT", "RUNNING", ""},   {kServiceNotRunning, "unused", "", ""},
    {kServiceUnknown, "no such service", "", ""}, {kServiceUnknown, "unrecognized", "", ""},
};
constexpr wordrule kAnswerRules[]{
    {kAnswerCorrect, "CreationClassName", "", ""},
    {kAnswerCorrect, "running", "", "not"},
    {kAnswerCorrect, "service:", "", ""},
    {kAnswerCorrect, "InstanceID=", "", ""},
    {kAnswerCorrect, "initialized", "", "not"},
    {kAnswerException, "CIMException", "", ""},
    {kCommandNotFound, "command not found", "", ""},
    {kCommandNotFound, " No such file or directory", "", ""},
};

bool has(std::string_view line, std::string_view word)
{
    return line.find(word) != std::string_view::npos;
}

bool fits(const wordrule& rule, std::string_view line)
{
    return has(line, rule.word) && has(line, rule.also) &&
           (rule.without.empty() || !has(line, rule.without));
}

const wordrule* firstfitting(std::span<const wordrule> rules, std::string_view line)
{
    const auto found = std::find_if(rules.begin(), rules.end(),
                                    [line](const wordrule& rule) { return fits(rule, line); });
    return found == rules.end() ? nullptr : &*found;
}

bool isletter(char byte)
{
    const auto within = [byte](char low, char high) {
        return byte >= low && byte <= high;
    };
    return within('a', 'z') || within('A', 'Z') || within('0', '9') || byte == '_' || byte == '-';
}

// All that stands around the word at `place` without a blank or a sign between.
std::string_view wholeword(std::string_view line, std::string_view word, std::size_t place)
{
    std::size_t begin = place;
    std::size_t end = place + word.size();
    while (isletter(word.front()) && begin > 0 && isletter(line[begin - 1])) {
        --begin;
    }
    while (isletter(word.back()) && end < line.size() && isletter(line[end])) {
        ++end;
    }
    return line.substr(begin, end - begin);
}

// The word as it stands in the line: where it is only found inside others, with the first of them.
std::string asfound(std::string_view line, std::string_view word)
{
    std::string_view first;
    for (std::size_t place = line.find(word); place != std::string_view::npos;) {
        const std::string_view whole = wholeword(line, word, place);
        if (whole == word) {
            return tools::inquotes(word);
        }
        if (first.empty()) {
            first = whole;
        }
        // Once more inside the same whole, it would be no word of its own either; and a whole may
        // be as long as the line.
        place = line.find(word, static_cast<std::size_t>(whole.end() - line.begin()));
    }
    return tools::inquotes(word) + " inside " + tools::inquotes(first);
}

std::string explained(const wordrule& rule, std::string_view line)
{
    std::string text = "contains " + asfound(line, rule.word);
    if (!rule.also.empty()) {
        const bool simple = !has(text, " inside ");
        text += (simple ? " and " : ", and ") + asfound(line, rule.also);
    }
    if (!rule.without.empty()) {
        text += " and not " + tools::inquotes(rule.without);
    }
    return text;
}

// A word that would have meant that all is well, and what takes its meaning away.
std::optional<std::string> spoilt(std::span<const wordrule> rules, std::string_view line)
{
    for (const wordrule& rule : rules) {
        if (!rule.without.empty() && has(line, rule.word) && has(line, rule.without)) {
            return "contains " + asfound(line, rule.word) + ", but also " +
                   asfound(line, rule.without);
        }
    }
    return std::nullopt;
}

std::string withoutword(std::string_view line)
{
    return line.empty() ? "nothing on the first line" : "no keyword";
}

} // namespace

reason statusreason(const std::string& line, int state)
{
    if (const wordrule* const rule = firstfitting(kStatusRules, line); rule != nullptr) {
        return {rule->verdict, explained(*rule, line)};
    }
    const std::string ending =
        state < 0 ? "did not end normally" : "exit status " + std::to_string(state);
    return {state == 0 ? kServiceRunning : kServiceUnclear, withoutword(line) + ", " + ending};
}

reason answerreason(const std::string& line)
{
    if (const wordrule* const rule = firstfitting(kAnswerRules, line); rule != nullptr) {
        return {rule->verdict, explained(*rule, line)};
    }
    return {kAnswerUnclear, spoilt(kAnswerRules, line).value_or(withoutword(line))};
}

} // namespace check
