#include "linehead.h"

#include <algorithm>
#include <array>

namespace report {

namespace {

constexpr std::array<std::uint64_t, kWordBytes + 1> kPowersOfTen = {
    1, 10, 100, 1'000, 10'000, 100'000, 1'000'000, 10'000'000, 100'000'000};

// The number of a thread that `text` begins with, as its digits; empty where there is none, or a
// blank does not follow it.
std::string_view threadin(std::string_view text)
{
    constexpr std::string_view kMost = "18446744073709551615";
    std::size_t size = 0;
    for (std::size_t digits = kWordBytes; digits == kWordBytes && size <= kMost.size();) {
        digits = digitsin(wordof(text, size));
        size += digits;
    }
    const std::string_view thread = text.substr(0, size);
    const bool fits = size < kMost.size() || (size == kMost.size() && thread <= kMost);
    return fits && size < text.size() && text[size] == ' ' ? thread : "";
}

} // namespace

std::uint64_t numberof(std::string_view digits) noexcept
{
    std::uint64_t value = 0;
    while (!digits.empty()) {
        const std::size_t size = std::min(digits.size(), kWordBytes);
        value = value * kPowersOfTen[size] + numberin(wordof(digits, 0), size);
        digits.remove_prefix(size);
    }
    return value;
}

bool headreader::read(std::string_view text, linehead& head) noexcept
{
    if (text.size() <= datereader::kDateBytes) {
        return false;
    }
    const std::string_view rest = text.substr(datereader::kDateBytes);
    head.who = known.speakerof(rest);
    if (head.who == recogniser::kNobody) {
        return false;
    }
    const std::size_t before = known.speakers()[head.who].head.size();
    head.thread = threadin(rest.substr(before));
    if (head.thread.empty()) {
        return false;
    }
    const auto clocktime = dates.read(text.data());
    if (!clocktime) {
        return false;
    }
    head.clock = *clocktime;
    head.bytes = datereader::kDateBytes + before + head.thread.size() + 1;
    return true;
}

// Where in `text` the first head begins.
std::size_t headreader::find(std::string_view text) noexcept
{
    for (std::size_t mark = text.find(kThreadMark); mark != std::string_view::npos;
         mark = text.find(kThreadMark, mark + 1)) {
        const std::size_t end = mark + kThreadMark.size();
        for (const speaker& voice : known.speakers()) {
            const std::size_t before = datereader::kDateBytes + voice.head.size();
            linehead head;
            if (end >= before && text.substr(0, end).ends_with(voice.head) &&
                read(text.substr(end - before), head)) {
                return end - before;
            }
        }
    }
    return std::string_view::npos;
}

} // namespace report
