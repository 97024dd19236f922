#include "printable.h"

#include <array>
#include <cstdint>
#include <cstdio>

namespace tools {

namespace {

constexpr std::size_t kBriefCharacters = 60;

struct character {
    char32_t code;      // meaningless where it is not valid
    std::size_t length; // bytes
    bool valid;
};

// The character at the beginning of `text`, which is not empty; a byte that begins none is one of
// length 1.
character first(std::string_view text) noexcept
{
    const auto byte = [text](std::size_t i) {
        return static_cast<std::uint8_t>(text[i]);
    };
    const std::uint8_t lead = byte(0);
    if (lead < 0x80) {
        return {lead, 1, true};
    }
    const std::size_t length = lead >= 0xf0 ? 4 : lead >= 0xe0 ? 3 : 2;
    if (lead < 0xc2 || lead > 0xf4 || text.size() < length) {
        return {0, 1, false};
    }
    char32_t code = lead & (0x7fU >> length);
    for (std::size_t i = 1; i < length; ++i) {
        if ((byte(i) & 0xc0U) != 0x80) {
            return {0, 1, false};
        }
        code = (code << 6U) | (byte(i) & 0x3fU);
    }
    constexpr std::array<char32_t, 5> kLeast{0, 0, 0x80, 0x800, 0x10000};
    const bool surrogate = code >= 0xd800 && code <= 0xdfff;
    if (code < kLeast.at(length) || code > 0x10ffff || surrogate) {
        return {0, 1, false};
    }
    return {code, length, true};
}

// What a terminal does not simply show: control characters of both sets, marks that turn the
// direction of text, joiners and separators that cannot be seen, and tags.
bool steers(char32_t code) noexcept
{
    const auto within = [code](char32_t low, char32_t high) {
        return code >= low && code <= high;
    };
    return within(0, 0x1f) || within(0x7f, 0x9f) || code == 0xad || code == 0x61c ||
           within(0x200b, 0x200f) || within(0x2028, 0x202e) || within(0x2060, 0x206f) ||
           code == 0xfeff || within(0xfff9, 0xfffb) || within(0xe0000, 0xe0fff);
}

std::string hexadecimal(const char* format, unsigned value)
{
    std::array<char, 16> text{};
    const int length = std::snprintf(text.data(), text.size(), format, value);
    return {text.data(), static_cast<std::size_t>(length)};
}

std::string shown(std::string_view text, bool keeptabs, std::size_t most)
{
    std::string result;
    std::size_t count = 0;
    while (!text.empty()) {
        if (count++ == most) {
            return result + "...";
        }
        const character next = first(text);
        if (!next.valid ||
            (steers(next.code) && next.code < 0x80 && !(keeptabs && next.code == '\t'))) {
            result += hexadecimal("\\x%02x", static_cast<std::uint8_t>(text.front()));
        } else if (next.code >= 0x80 && steers(next.code)) {
            result += hexadecimal("\\u{%x}", static_cast<unsigned>(next.code));
        } else {
            result += text.substr(0, next.length);
        }
        text.remove_prefix(next.length);
    }
    return result;
}

} // namespace

std::string printable(std::string_view text)
{
    return shown(text, true, static_cast<std::size_t>(-1));
}

std::string brief(std::string_view text)
{
    return shown(text, false, kBriefCharacters);
}

std::string inquotes(std::string_view text)
{
    return '"' + brief(text) + '"';
}

std::size_t characters(std::string_view text) noexcept
{
    std::size_t count = 0;
    for (; !text.empty(); ++count) {
        text.remove_prefix(first(text).length);
    }
    return count;
}

bool isutf8(std::string_view text) noexcept
{
    while (!text.empty()) {
        const character next = first(text);
        if (!next.valid) {
            return false;
        }
        text.remove_prefix(next.length);
    }
    return true;
}

} // namespace tools
