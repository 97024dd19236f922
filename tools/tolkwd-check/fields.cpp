#include "fields.h"

#include <algorithm>
#include <array>
#include <cstdio>

#include "ProcessStatistics_Linux.h"
#include "printable.h"

namespace check {

namespace {

constexpr std::array kNoCommandSpellings = {
    std::string_view("null"), std::string_view("nil"), std::string_view("none"),
    std::string_view("n/a"),  std::string_view("-"),   std::string_view("--"),
};

char lowered(char letter)
{
    return letter >= 'A' && letter <= 'Z' ? static_cast<char>(letter - 'A' + 'a') : letter;
}

bool isplain(char letter)
{
    const char low = lowered(letter);
    return (low >= 'a' && low <= 'z') || (letter >= '0' && letter <= '9') ||
           std::string_view("._@:+-").find(letter) != std::string_view::npos;
}

std::string_view withoutquotes(std::string_view text)
{
    const bool quoted = text.size() >= 2 && text.front() == text.back() &&
                        (text.front() == '"' || text.front() == '\'');
    return quoted ? text.substr(1, text.size() - 2) : text;
}

} // namespace

std::string_view fieldname(field which) noexcept
{
    return kFieldElements[fieldindex(which)].name;
}

// An empty element stored a text that stands before it.
bool isown(const serviceview& view, field which) noexcept
{
    const origin& from = view.origins[fieldindex(which)];
    return from.element != kNoPlace && from.element >= view.begin && from.element < view.end &&
           from.text != kNoPlace && from.text > from.element;
}

std::size_t placeof(const serviceview& view, field which) noexcept
{
    return isown(view, which) ? view.origins[fieldindex(which)].text : view.begin;
}

std::string fieldof(const serviceview& view, field which)
{
    return std::string(fieldname(which)) + " of " + tools::inquotes(view.record->name);
}

std::string valueof(const serviceview& view, field which)
{
    return fieldof(view, which) + " is " + tools::inquotes(view.record->*which);
}

std::string shortnumber(double value)
{
    std::array<char, 32> text{};
    (void)std::snprintf(text.data(), text.size(), "%.4g", value);
    return text.data();
}

bool ischecked(const service& record)
{
    return record.functionalpingcmd != kNoCommand;
}

bool looksatthresholds(const service& record)
{
    return ischecked(record) && Utility::str2int(record.MaxFPSkips) != 0;
}

bool isnullspelling(std::string_view command)
{
    if (command == kNoCommand) {
        return false;
    }
    std::string low(withoutquotes(command));
    std::transform(low.begin(), low.end(), low.begin(), lowered);
    return std::find(kNoCommandSpellings.begin(), kNoCommandSpellings.end(), low) !=
           kNoCommandSpellings.end();
}

bool isplainname(std::string_view name) noexcept
{
    return !name.empty() && name.front() != '-' && std::all_of(name.begin(), name.end(), isplain);
}

bool isplainpath(std::string_view path) noexcept
{
    return std::all_of(path.begin(), path.end(), [](char letter) {
        return (letter >= 'a' && letter <= 'z') || (letter >= 'A' && letter <= 'Z') ||
               (letter >= '0' && letter <= '9') ||
               std::string_view("/._@:+,=%-").find(letter) != std::string_view::npos ||
               (static_cast<unsigned char>(letter) & 0x80U) != 0;
    });
}

} // namespace check
