// The table of messages, prepared for recognising many of them quickly. Besides which message a
// text is, it tells what the reader of a log has to know: how a line of each level and module
// begins, which messages may go on on the next line, and whether a text is the beginning of one.
#pragma once

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "bytes.h"
#include "message.h"

namespace report {

// A level and a module that messages come from.
struct speaker {
    static constexpr std::size_t kLeastHeadBytes = 16; // of those that write to the log
    static constexpr std::size_t kMostHeadBytes = 32;

    loglevel level = loglevel::kStandardError;
    std::string_view module;
    std::string head{}; // what stands between the date and the thread: " ERROR wdmanager|TID"
};

using speakerid = std::uint8_t; // an index

// A form of a message, taken apart: literals[0], value, literals[1], value, ...
struct pattern {
    static constexpr std::size_t kMostValues = 3;

    messageid id = messageid::kForeign;
    speakerid who = 0;
    bool matters = false; // as matters() says
    std::array<std::string_view, kMostValues + 1> literals{};
    std::array<bool, kMostValues> isnumber{};
    std::array<bool, kMostValues> isconfigured{}; // text of the configuration: may hold anything
    std::size_t values = 0;
    bool varies = false; // has several numbers: hardly any text of it comes twice
    bool goeson = false; // ends in a text of the configuration whose further lines may follow
};

// What a text is that is no whole message.
enum class fragment : std::uint8_t {
    kNone,      // nothing of the daemon's
    kCut,       // the beginning of a message, cut off
    kMayFollow, // likewise, but a line break in one of its values may have done it
};

class recogniser {
public:
    static constexpr speakerid kNobody = 0xff;

    // Of messageforms(). Any thread.
    static const recogniser& ofall();

    explicit recogniser(std::span<const messageform> forms);

    // All that write to the log; their indices are their ids.
    [[nodiscard]] const std::vector<speaker>& speakers() const noexcept { return voices; }

    // Whose head `text` begins with; kNobody where it is nobody's.
    [[nodiscard]] speakerid speakerof(std::string_view text) const noexcept
    {
        if (text.size() < speaker::kMostHeadBytes) {
            return searchspeaker(text);
        }
        const std::uint64_t first = wordat(text.data());
        const std::uint64_t second = wordat(text.data() + kWordBytes);
        const auto is = [&](const headkey& key) {
            const char* const tail = text.data() + key.tailat;
            return ((first ^ key.first) | (second ^ key.second) | (wordat(tail) ^ key.third) |
                    (wordat(tail + kWordBytes) ^ key.fourth)) == 0;
        };
        const speakerid likely = guesses[guessof(first, second)];
        if (is(keys[likely])) {
            return likely;
        }
        for (std::size_t who = 0; who < keys.size(); ++who) {
            if (is(keys[who])) {
                return static_cast<speakerid>(who);
            }
        }
        return kNobody;
    }

    // kNobody where no message comes from these.
    [[nodiscard]] speakerid speakerof(loglevel level, std::string_view module) const noexcept;

    // A message, and its form; null for none.
    struct found {
        const pattern* form = nullptr;
        recognised what;
    };
    [[nodiscard]] found find(speakerid who, std::string_view text) const noexcept;

    // Of a text that is no message.
    [[nodiscard]] fragment fragmentof(speakerid who, std::string_view text) const noexcept;

    // Whether `text`, without anything before it, could be the end of a message.
    [[nodiscard]] bool endsmessage(std::string_view text) const noexcept;

private:
    static constexpr std::size_t kNone = 0xff;

    // The patterns of a speaker by the first byte of the text, as chains of indices.
    struct chains {
        std::array<std::uint8_t, 256> first{};
        std::uint8_t anything = kNone; // those that begin with a value
    };

    // A head as its first two and its last two words, which overlap.
    struct headkey {
        std::uint64_t first = 0;
        std::uint64_t second = 0;
        std::uint64_t third = 0;
        std::uint64_t fourth = 0;
        std::size_t tailat = 0; // where these are
    };
    static headkey keyof(std::string_view head) noexcept;

    // Where to look first for a head with these first two words.
    static constexpr std::size_t kGuesses = 64;
    static std::size_t guessof(std::uint64_t first, std::uint64_t second) noexcept
    {
        constexpr std::uint64_t kSpread = 0x9e3779b97f4a7c15; // odd, without a pattern
        constexpr unsigned kHighBits = 40;
        return static_cast<std::size_t>(((first ^ std::rotl(second, 21)) * kSpread) >> kHighBits) %
               kGuesses;
    }
    [[nodiscard]] speakerid searchspeaker(std::string_view text) const noexcept;

    std::vector<speaker> voices;
    std::vector<headkey> keys; // of the speakers; standard error's is that of no line
    std::array<speakerid, kGuesses> guesses{};
    std::vector<pattern> patterns;
    std::vector<std::uint8_t> next; // the pattern to try behind each
    std::vector<chains> starts;     // of each speaker

    void addspeaker(const messageform& form);
    void enlist(std::size_t index);
    [[nodiscard]] found findin(std::size_t chain, std::string_view text) const noexcept;
};

} // namespace report
