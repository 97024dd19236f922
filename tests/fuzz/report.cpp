// The reader of the log on any bytes. The first byte of the unit says in how large pieces it gets
// the rest: it hears the same as from the whole, also with another thread's help, and one who wants
// to hear less hears a part of it.

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz.h"
#include "logreader.h"
#include "message.h"

namespace {

// Changes its clock twice a year, so that some hours come twice and some not at all.
const bool zoned = setenv("TZ", "CET-1CEST,M3.5.0,M10.5.0/3", 1) == 0;

struct Heard {
    report::messageid id;
    std::uint64_t thread;
    report::instant when;
    std::string text;
    std::string first;
    std::string second;
    std::string more;
    std::uint64_t line;

    friend bool operator==(const Heard&, const Heard&) = default;
};

struct Outcome {
    std::vector<Heard> messages;
    report::readcount count;
};

bool isin(std::string_view part, std::string_view whole)
{
    return part.empty() || (part.data() >= whole.data() &&
                            part.data() + part.size() <= whole.data() + whole.size());
}

Heard copyof(const report::message& said)
{
    demand(isin(said.first, said.text) && isin(said.second, said.text),
           "values are parts of the text");
    return {said.id,
            said.thread,
            said.when,
            std::string(said.text),
            std::string(said.first),
            std::string(said.second),
            std::string(said.more),
            said.line};
}

Outcome read(std::string_view log, std::size_t piece, report::wanted which, Stopwatch& watch)
{
    Outcome result;
    const Stopwatch::Lap lap(watch);
    report::logreader reader(
        which, [&](const report::message& said) { result.messages.push_back(copyof(said)); });
    for (std::size_t place = 0; place < log.size(); place += piece) {
        reader.feed(std::string(log.substr(place, piece)));
    }
    reader.endfile();
    result.count = reader.count();
    return result;
}

Outcome readahead(std::string_view log, std::size_t block, Stopwatch& watch)
{
    Outcome result;
    const Stopwatch::Lap lap(watch);
    report::logreader reader(report::wanted::kAll, [&](const report::message& said) {
        result.messages.push_back(copyof(said));
    });
    reader.feedall(
        [&log](char* into, std::size_t most) {
            const std::size_t got = log.copy(into, most);
            log.remove_prefix(got);
            return got;
        },
        {.blockbytes = block, .alone = 0, .helpers = 1});
    reader.endfile();
    result.count = reader.count();
    return result;
}

bool same(const report::readcount& one, const report::readcount& other)
{
    return one.bytes == other.bytes && one.lines == other.lines && one.messages == other.messages &&
           one.foreign == other.foreign && one.torn == other.torn &&
           one.clockchanges == other.clockchanges && one.first == other.first &&
           one.last == other.last;
}

void trycounts(const Outcome& all, std::string_view log)
{
    const auto newlines = static_cast<std::uint64_t>(std::count(log.begin(), log.end(), '\n'));
    demand(all.count.bytes == log.size(), "all bytes are counted");
    demand(all.count.lines <= newlines + 1, "there are no more lines than newlines tell");
    demand(all.count.messages == all.messages.size(), "each message is heard");
    demand(all.count.messages + all.count.foreign <= all.count.lines,
           "a line is one message or somebody else's");
}

void tryorder(const std::vector<Heard>& messages, const report::readcount& count)
{
    const Heard* before = nullptr;
    for (const Heard& each : messages) {
        const bool hastime = each.when != report::instant{};
        demand(each.line >= 1 && each.line <= count.lines, "a message stands in a line");
        if (before != nullptr && before->when != report::instant{}) {
            demand(hastime && secondsbetween(before->when, each.when) >= 0,
                   "time goes forward only");
        }
        demand(before == nullptr || before->line <= each.line, "messages come in order");
        before = &each;
    }
    demand(messages.empty() || messages.back().when == count.last, "the last moment is told");
}

} // namespace

std::size_t tryunit(const std::string& unit, Stopwatch& watch)
{
    const std::size_t piece =
        unit.empty() ? 1 : std::max<std::size_t>(static_cast<unsigned char>(unit.front()), 1);
    const std::string_view log =
        std::string_view(unit).substr(std::min<std::size_t>(1, unit.size()));
    const Outcome all =
        read(log, std::max<std::size_t>(log.size(), 1), report::wanted::kAll, watch);
    const Outcome pieces = read(log, piece, report::wanted::kAll, watch);
    demand(pieces.messages == all.messages && same(pieces.count, all.count),
           "pieces of any size are read alike");
    Outcome important = all;
    std::erase_if(important.messages, [](const Heard& each) { return !matters(each.id); });
    const Outcome ahead = readahead(log, piece, watch);
    demand(ahead.messages == all.messages && same(ahead.count, all.count),
           "several threads read alike");
    const Outcome less = read(log, piece, report::wanted::kWhatMatters, watch);
    demand(less.messages == important.messages && same(less.count, all.count),
           "what matters is a part of it");
    trycounts(all, log);
    tryorder(all.messages, all.count);
    return 4 * unit.size();
}
