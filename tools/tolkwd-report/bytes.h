// Eight bytes at a time, the first of them the lowest of the number whatever the machine.
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace report {

inline constexpr std::size_t kWordBytes = sizeof(std::uint64_t);

// Those that begin at `bytes`. Any thread.
inline std::uint64_t wordat(const char* bytes) noexcept
{
    std::uint64_t word = 0;
    std::memcpy(&word, bytes, kWordBytes);
    if constexpr (std::endian::native == std::endian::big) {
        word = __builtin_bswap64(word);
    }
    return word;
}

// Those at `place` of `text`, with zeros for what is behind its end. Any thread.
inline std::uint64_t wordof(std::string_view text, std::size_t place) noexcept
{
    if (place + kWordBytes <= text.size()) {
        return wordat(text.data() + place);
    }
    std::uint64_t word = 0;
    for (std::size_t i = text.size(); i > place; --i) {
        word = word << 8U | static_cast<unsigned char>(text[i - 1]);
    }
    return word;
}

// How many digits a word begins with, 0 to 8. Any thread.
inline std::size_t digitsin(std::uint64_t word) noexcept
{
    constexpr std::uint64_t kZeros = 0x3030303030303030;     // of '0'
    constexpr std::uint64_t kToHighest = 0x7676767676767676; // from 10 on, a byte's highest bit
    constexpr std::uint64_t kLowest = 0x7f7f7f7f7f7f7f7f;
    const std::uint64_t values = word ^ kZeros; // below 10 where there is a digit
    const std::uint64_t others = (((values & kLowest) + kToHighest) | values) & ~kLowest;
    return static_cast<std::size_t>(std::countr_zero(others)) / 8;
}

// The number that the first `digits` bytes of a word make, 1 to 8, all digits. Any thread.
inline std::uint64_t numberin(std::uint64_t word, std::size_t digits) noexcept
{
    constexpr std::uint64_t kValues = 0x0f0f0f0f0f0f0f0f;
    // Zeros in front make them eight; then pairs of neighbours are joined, three times.
    word = (word & kValues) << (8 * (kWordBytes - digits));
    word = (word * 10 + (word >> 8U)) & 0x00ff00ff00ff00ff;
    word = (word * 100 + (word >> 16U)) & 0x0000ffff0000ffff;
    return (word * 10000 + (word >> 32U)) & 0x00000000ffffffff;
}

} // namespace report
