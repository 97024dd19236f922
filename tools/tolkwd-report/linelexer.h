// Bytes of a log -> its lines, as far as each of them tells by itself. This is most of the work of
// reading a log and depends on nothing that was read before, so it can be done ahead, by several
// threads: the same bytes always make the same lines. What is more than one message on one line, or
// less, is left to the reader.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

#include "linehead.h"
#include "recogniser.h"
#include "textmemo.h"

namespace report {

// What is longer is no line.
inline constexpr std::size_t kLongestLineBytes = 1 << 20;

// A message as its line tells it.
struct saidline {
    std::int64_t clock = 0; // as instant::clock
    speakerid who = recogniser::kNobody;
    std::uint64_t thread = 0;
    recogniser::found found{};
    std::string_view text{};
};

// A line or several in succession.
struct lexed {
    enum class kind : std::uint8_t {
        kMessage, // one line, a message
        kCounted, // messages of the same second that nobody wants to hear, and nothing follows
        kOther,   // anything else
    };

    kind what = kind::kOther;
    std::uint32_t lines = 1; // of kCounted
    saidline said{};         // of kCounted the clock only, of kOther the lines, with newlines
};

// Bytes that begin with a line.
struct lexedbytes {
    std::string_view bytes{};
    std::vector<lexed> lines{};
    std::string_view rest{}; // behind the last newline
};

// Of a line whose end was turned into two bytes on another system.
inline std::string_view withoutreturn(std::string_view line) noexcept
{
    return line.substr(0, line.size() - (line.ends_with('\r') ? 1 : 0));
}

// One thread's.
class linelexer {
public:
    // `all`: messages that do not matter, as matters() says, are wanted, too, not only counted.
    explicit linelexer(bool all) : everything(all) {}

    // Takes the lines of `bytes`, which begin with a line, apart. `into` becomes these; all of it
    // are parts of `bytes`.
    void lex(std::string_view bytes, lexedbytes& into);

    // A whole message, in which no other line begins; without a form where `text` is none. What is
    // no whole message, or may hold a line, is to be looked at more closely.
    [[nodiscard]] recogniser::found plainmessage(speakerid who, std::string_view text);

private:
    const bool everything;
    const recogniser& known = recogniser::ofall();
    headreader heads;
    textmemo memo;

    bool lexmessage(const linehead& head, std::string_view text, std::vector<lexed>& into);
    [[nodiscard]] recogniser::found recognise(speakerid who, std::string_view text);
    [[nodiscard]] bool isheard(const pattern& form) const noexcept
    {
        return everything || form.matters || form.goeson;
    }
};

} // namespace report
