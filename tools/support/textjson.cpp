#include "textjson.h"

#include <string>

#include <nlohmann/json.hpp>

#include "printable.h"

namespace tools {

namespace {

std::string hexdigits(std::string_view bytes)
{
    constexpr std::string_view kDigits = "0123456789abcdef";
    std::string digits;
    digits.reserve(2 * bytes.size());
    for (const char byte : bytes) {
        const auto value = static_cast<unsigned char>(byte);
        digits += kDigits[value >> 4U];
        digits += kDigits[value & 0xfU];
    }
    return digits;
}

} // namespace

nlohmann::ordered_json textjson(std::string_view text)
{
    if (isutf8(text)) {
        return std::string(text);
    }
    return {{"hex", hexdigits(text)}};
}

} // namespace tools
