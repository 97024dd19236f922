#include "textmemo.h"

#include <cstring>

namespace report {

textmemo::textmemo() : texts(kPlaces) {}

void textmemo::keep(speakerid who, std::string_view text, const recogniser::found& found) noexcept
{
    if (text.size() < kLeastBytes || text.size() > kMostBytes) {
        return;
    }
    const std::size_t place = placeof(who, text);
    known& kept = texts[place];
    texts[neighbour(place)] = kept;
    kept.meant = found.form;
    kept.size = static_cast<std::uint8_t>(text.size());
    kept.who = who;
    kept.first = known::partof(text, found.what.first);
    kept.second = known::partof(text, found.what.second);
    std::memcpy(kept.text.data(), text.data(), text.size());
}

recogniser::found textmemo::known::in(std::string_view same) const noexcept
{
    return {.form = meant,
            .what = {.id = meant->id,
                     .first = same.substr(first.begin, first.size),
                     .second = same.substr(second.begin, second.size)}};
}

textmemo::known::part textmemo::known::partof(std::string_view text,
                                              std::string_view value) noexcept
{
    if (value.empty()) {
        return {};
    }
    return {static_cast<std::uint8_t>(value.data() - text.data()),
            static_cast<std::uint8_t>(value.size())};
}

} // namespace report
