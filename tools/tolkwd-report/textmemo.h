// What the texts of messages have been recognised as. A log has the same few hundred texts again
// and again: looking one up is quicker than recognising it, and gives the same.
#pragma once

#include <algorithm>
#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

#include "bytes.h"
#include "recogniser.h"

namespace report {

// One thread's. Of fixed size: a text takes the place of another, which moves on to the next place
// once before it is forgotten.
class textmemo {
public:
    static constexpr std::size_t kLeastBytes = 2 * kWordBytes; // shorter texts,
    static constexpr std::size_t kMostBytes = 232;             // and longer ones, are not kept

    // One that is kept.
    class known {
    public:
        [[nodiscard]] const pattern& form() const noexcept { return *meant; }

        // As it was recognised, its values being parts of `same`, which is the text that was kept.
        [[nodiscard]] recogniser::found in(std::string_view same) const noexcept;

    private:
        friend class textmemo;

        struct part {
            std::uint8_t begin = 0;
            std::uint8_t size = 0;
        };

        const pattern* meant = nullptr;
        std::uint8_t size = 0;
        speakerid who = 0;
        part first;
        part second;
        std::array<char, kMostBytes> text{};

        [[nodiscard]] static part partof(std::string_view text, std::string_view value) noexcept;
        [[nodiscard]] bool is(speakerid by, std::string_view said) const noexcept;
    };

    textmemo();

    // `text` of `who`; null where it is not kept. Valid until the next keep().
    [[nodiscard]] const known* find(speakerid who, std::string_view text) const noexcept
    {
        if (text.size() < kLeastBytes || text.size() > kMostBytes) {
            return nullptr;
        }
        const std::size_t place = placeof(who, text);
        if (texts[place].is(who, text)) {
            return &texts[place];
        }
        const known& other = texts[neighbour(place)];
        return other.is(who, text) ? &other : nullptr;
    }

    // Keeps what it is, which has a form.
    void keep(speakerid who, std::string_view text, const recogniser::found& found) noexcept;

private:
    static constexpr std::size_t kPlaces = 1024; // a power of two

    std::vector<known> texts;

    [[nodiscard]] static std::size_t placeof(speakerid who, std::string_view text) noexcept;

    // Where a text is that was at `place` until another one took it.
    [[nodiscard]] static constexpr std::size_t neighbour(std::size_t place) noexcept
    {
        return place ^ 1U;
    }
};

// Two words at a time, of which the last overlap the ones before.
inline bool textmemo::known::is(speakerid by, std::string_view said) const noexcept
{
    if (size != said.size() || who != by) {
        return false;
    }
    const auto differ = [&](std::size_t place) {
        return (wordat(text.data() + place) ^ wordat(said.data() + place)) |
               (wordat(text.data() + place + kWordBytes) ^
                wordat(said.data() + place + kWordBytes));
    };
    const std::size_t last = said.size() - 2 * kWordBytes;
    std::uint64_t difference = differ(last);
    for (std::size_t place = 0; place < last; place += 2 * kWordBytes) {
        difference |= differ(place);
    }
    return difference == 0;
}

// From the words at both ends and in the middle: names stand there, and words far apart tell the
// messages apart. Without a branch, for what the next text is cannot be foreseen.
inline std::size_t textmemo::placeof(speakerid who, std::string_view text) noexcept
{
    // Odd numbers without a pattern, to spread bits with.
    constexpr std::uint64_t kSpread = 0x9e3779b97f4a7c15;
    constexpr std::uint64_t kOtherSpread = 0xc2b2ae3d27d4eb4f;
    constexpr unsigned kHighBits = 40;
    const std::size_t last = text.size() - kWordBytes;
    const auto word = [&](std::size_t place) {
        return wordat(text.data() + std::min(place, last));
    };
    const std::uint64_t begin = word(0) ^ std::rotl(word(kWordBytes), 21) ^ who;
    const std::uint64_t behind = word(2 * kWordBytes) ^ std::rotl(word(3 * kWordBytes), 21);
    const std::uint64_t middle = word(last / 2) ^ std::rotl(word(last - kWordBytes), 21);
    const std::uint64_t end = word(last) + text.size();
    const std::uint64_t all =
        (begin + std::rotl(behind, 37)) * kSpread ^ (end + std::rotl(middle, 37)) * kOtherSpread;
    return static_cast<std::size_t>((all * kSpread) >> kHighBits) % kPlaces;
}

} // namespace report
