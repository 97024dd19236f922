#include "status.h"

#include <algorithm>
#include <array>
#include <numeric>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include <fmt/format.h>

#include "columns.h"
#include "servicestate.h"
#include "terminal.h"
#include "wdmonitorthread_linux.h"

namespace report {

namespace {

constexpr std::int64_t kHourSeconds = 3600;
constexpr std::int64_t kDaySeconds = 24 * kHourSeconds;

// A failure about which nothing more has been said for so long is most likely over.
constexpr std::int64_t kSilenceSeconds =
    kFirstRetryPauseSeconds + kRetries * kGeneralRetryPauseSeconds + kPatienceSeconds;

// From the end of a refresh's last thread to the first announcement: a second, and the time to
// load.
constexpr std::int64_t kRefreshSeconds = 10;

constexpr std::size_t kLeastNameColumns = 8;

// How a state is shown: never by its colour alone.
struct look {
    char mark;
    std::string_view colour;
    std::string_view shortword; // where its word would take the room of a service's name
};

look lookof(state which)
{
    switch (which) {
    case state::kUp:
        return {'+', tools::kGreen, "up"};
    case state::kBusy:
        return {'*', tools::kCyan, "busy"};
    case state::kNotWatched:
        return {'-', tools::kFaint, "not-watched"};
    case state::kCommandNotRecognised:
        return {'?', tools::kYellow, "cmd-not-found"};
    case state::kSuspect:
        return {'!', tools::kYellow, "suspect"};
    case state::kFunctionalFailure:
        return {'!', tools::kYellow, "func-failure"};
    case state::kRecovering:
        return {'!', tools::kMagenta, "recovering"};
    case state::kFunctionalRecovering:
        return {'!', tools::kMagenta, "func-recovery"};
    case state::kUnknownService:
        return {'X', tools::kRed, "unknown"};
    case state::kGaveUp:
        return {'X', tools::kRed, "gave-up"};
    }
    return {' ', tools::kPlain, ""};
}

// How much room a table takes: the first of these that fits is taken, the last one with its names
// cut.
struct room {
    bool fulltimes;
    bool fullwords;
};
constexpr std::array<room, 3> kRooms{{{true, true}, {false, true}, {false, false}}};

// "15:39" within a day before `end`, "Nov 21" within most of a year, else "Nov'25". Threads' lines,
// and the hour that comes twice, may make a time seem later than the end.
std::string shorttime(const instant& when, const instant& end)
{
    constexpr std::int64_t kNearDays = 300;
    const std::int64_t age = end.clock - when.clock;
    const std::string text = clocktext(when); // "2026-11-21 15:39:37"
    if (age >= -kHourSeconds && age < kDaySeconds) {
        return text.substr(11, 5);
    }
    constexpr std::array<std::string_view, 12> kMonths{"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                                       "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
    const auto month = static_cast<std::size_t>(std::stoi(text.substr(5, 2)) - 1);
    const bool near = age >= 0 && age < kNearDays * kDaySeconds;
    return fmt::format("{}{}{}", kMonths.at(month), near ? ' ' : '\'',
                       near ? text.substr(8, 2) : text.substr(2, 2));
}

// The same as spantext, in 6 columns: "45s", "3m30s", "2h05m", "3d04h".
std::string shortspan(std::int64_t seconds)
{
    constexpr std::int64_t kMinuteSeconds = 60;
    if (seconds < kMinuteSeconds) {
        return fmt::format("{}s", seconds);
    }
    if (seconds < kHourSeconds) {
        return fmt::format("{}m{:02}s", seconds / kMinuteSeconds, seconds % kMinuteSeconds);
    }
    if (seconds < kDaySeconds) {
        return fmt::format("{}h{:02}m", seconds / kHourSeconds,
                           seconds % kHourSeconds / kMinuteSeconds);
    }
    constexpr std::int64_t kManyDays = 100;
    if (seconds < kManyDays * kDaySeconds) {
        return fmt::format("{}d{:02}h", seconds / kDaySeconds,
                           seconds % kDaySeconds / kHourSeconds);
    }
    return fmt::format("{}d", seconds / kDaySeconds);
}

// In 4 columns: "9999", "123k", "12M". Rounded down.
std::string shortcount(std::uint64_t count)
{
    constexpr std::uint64_t kThousand = 1000;
    constexpr std::uint64_t kMillion = kThousand * kThousand;
    if (count < 10 * kThousand) {
        return std::to_string(count);
    }
    return count < kMillion ? fmt::format("{}k", count / kThousand)
                            : fmt::format("{}M", count / kMillion);
}

// Rounded down, so that only what was never out has 100 %.
std::string availabilitytext(const account& service)
{
    if (service.watchedseconds <= 0) {
        return "-";
    }
    if (service.outageseconds <= 0) {
        return "100%";
    }
    constexpr std::int64_t kHundredths = 10000;
    const std::int64_t share =
        (service.watchedseconds - service.outageseconds) * kHundredths / service.watchedseconds;
    return fmt::format("{}.{:02}%", share / 100, share % 100);
}

// One column of the table.
struct column {
    std::string_view header;
    bool right = false; // for numbers
    std::size_t width = 0;
};

// In the order in which the lines have them.
enum place : std::size_t { kName, kState, kSince, kLast, kOutages, kRecoveries, kSkips, kShare };
constexpr std::size_t kColumns = kShare + 1;

// What a line has in each column.
using cells = std::array<std::string, kColumns>;

using rows = std::vector<serviceid>;

rows sorted(const overview& seen)
{
    std::vector<state> states;
    states.reserve(seen.services);
    for (serviceid service = 0; service < seen.services; ++service) {
        states.push_back(seen.accountof(service).now.what);
    }
    rows result(seen.services);
    std::iota(result.begin(), result.end(), serviceid{0});
    std::sort(result.begin(), result.end(), [&](serviceid one, serviceid other) {
        return states[one] != states[other]
                   ? states[one] > states[other]
                   : std::tuple(seen.nameof(one), one) < std::tuple(seen.nameof(other), other);
    });
    return result;
}

// Makes each line twice, to measure it and to write it: a million would take too much memory.
class table {
public:
    table(const overview& all, room taken) : seen(all), how(taken)
    {
        if (how.fulltimes) {
            columns[kRecoveries].header = "RECOVERED";
            columns[kSkips].header = "SKIPPED";
            columns[kShare].header = "AVAILABLE";
        }
        for (column& each : columns) {
            each.width = columnsof(each.header);
        }
        for (serviceid service = 0; service < seen.services; ++service) {
            const cells line = cellsof(seen.accountof(service));
            for (std::size_t i = 0; i < kColumns; ++i) {
                columns.at(i).width = std::max(columns.at(i).width, columnsof(line.at(i)));
            }
        }
    }

    // What its lines take, but for the names.
    [[nodiscard]] std::size_t widthwithoutnames() const
    {
        std::size_t sum = kMarkColumns;
        for (std::size_t i = kState; i < columns.size(); ++i) {
            sum += columns.at(i).width + gapbefore(i).size();
        }
        return sum;
    }

    [[nodiscard]] std::size_t namewidth() const { return columns[kName].width; }

    void cutnames(std::size_t most)
    {
        longestname = most;
        column& names = columns[kName];
        if (names.width <= most) {
            return;
        }
        names.width = columnsof(names.header);
        for (serviceid service = 0; service < seen.services; ++service) {
            names.width = std::max(names.width, columnsof(fitted(seen.nameof(service), most)));
        }
    }

    void write(std::ostream& out, const rows& lines, bool colour) const
    {
        std::string header = "  ";
        for (std::size_t i = 0; i < columns.size(); ++i) {
            header += gapbefore(i);
            header += filled(i, std::string(columns.at(i).header));
        }
        out << tools::coloured(tools::kBold, header, colour) << '\n';
        for (const serviceid service : lines) {
            const account each = seen.accountof(service);
            const cells line = cellsof(each);
            const look shown = lookof(each.now.what);
            out << tools::coloured(shown.colour, std::string(1, shown.mark), colour) << ' ';
            for (std::size_t i = 0; i < columns.size(); ++i) {
                out << gapbefore(i)
                    << tools::coloured(shown.colour, filled(i, line.at(i)), colour && i == kState);
            }
            out << '\n';
        }
    }

private:
    static constexpr std::size_t kMarkColumns = 2;

    static std::string_view gapbefore(std::size_t where) noexcept
    {
        return where == kName ? "" : where <= kLast ? "  " : " ";
    }

    [[nodiscard]] std::string filled(std::size_t where, std::string text) const
    {
        const column& all = columns.at(where);
        return all.right ? filledbefore(std::move(text), all.width)
                         : filledbehind(std::move(text), all.width);
    }

    [[nodiscard]] cells cellsof(const account& service) const
    {
        const state now = service.now.what;
        cells line;
        line[kName] = fitted(service.name, longestname);
        line[kState] = how.fullwords ? wordof(now) : lookof(now).shortword;
        line[kSince] = (service.now.inferred ? '~' : ' ') + timetext(service.now.from);
        line[kLast] = lastoutage(service);
        line[kOutages] = shortcount(service.outages);
        line[kRecoveries] = fmt::format("{}/{}", shortcount(service.recoveriessuccessful),
                                        shortcount(service.recoveriestried));
        line[kSkips] = shortcount(service.skippedchecks);
        line[kShare] = availabilitytext(service);
        return line;
    }

    [[nodiscard]] std::string timetext(const instant& when) const
    {
        return how.fulltimes ? clocktext(when) : shorttime(when, seen.judged);
    }

    // When it began and how long it took, maybe by inference; one that lasts has taken longer.
    [[nodiscard]] std::string lastoutage(const account& service) const
    {
        if (!service.lastoutage) {
            return "-";
        }
        const outage& last = *service.lastoutage;
        const std::int64_t seconds = secondsbetween(last.from, last.to.value_or(seen.judged));
        const std::size_t width = how.fulltimes ? 14 : 7; // ">59 min 59 s", ">59m59s"
        return timetext(last.from) + ' ' +
               filledbefore((!last.to        ? ">"
                             : last.inferred ? "~"
                                             : "") +
                                (how.fulltimes ? spantext(seconds) : shortspan(seconds)),
                            width);
    }

    const overview& seen;
    room how;
    std::size_t longestname = std::string::npos;
    std::array<column, kColumns> columns{{{"SERVICE"},
                                          {"STATE"},
                                          {" SINCE"},
                                          {"LAST OUTAGE"},
                                          {"OUTAGES", true},
                                          {"RECOV", true},
                                          {"SKIPS", true},
                                          {"AVAIL", true}}};
};

void writetable(std::ostream& out, const overview& seen, std::size_t columns, bool colour)
{
    for (const room& each : kRooms) {
        table tried(seen, each);
        const std::size_t rest = tried.widthwithoutnames();
        const bool last = &each == &kRooms.back();
        if (rest + tried.namewidth() <= columns || last) {
            tried.cutnames(std::max(kLeastNameColumns, columns - std::min(columns, rest)));
            tried.write(out, sorted(seen), colour);
            return;
        }
    }
}

std::string counted(std::uint64_t count, std::string_view one, std::string_view many)
{
    return fmt::format("{} {}", count, count == 1 ? one : many);
}

// What is no line of the daemon's, or no whole one.
std::string oddwords(const readcount& count)
{
    std::vector<std::string> words;
    if (count.foreign > 0) {
        words.push_back(counted(count.foreign, "is another's", "are others'"));
    }
    if (count.torn > 0) {
        words.push_back(counted(count.torn, "is torn", "are torn"));
    }
    return fmt::format("{}", fmt::join(words, ", "));
}

// How far the log's last line is from the present by which it is judged. A last line of a time to
// come, which counts as the present then, is mostly one of another zone.
std::string distancetolog(const overview& seen)
{
    const std::int64_t seconds = secondsbetween(seen.count.last, seen.judged);
    return seconds <= 0 && seen.judged.clock < seen.count.last.clock
               ? "before the last line: is TZ that of the daemon?"
               : spantext(seconds) + " after the last line";
}

void writesources(std::ostream& out, const overview& seen)
{
    const readcount& count = seen.count;
    if (count.messages == 0) {
        out << "no message of tolkwd in " << counted(count.lines, "line", "lines") << '\n';
        return;
    }
    if (!hastime(count)) {
        out << counted(count.lines, "line", "lines") << ", none of which tells when it was\n";
        return;
    }
    out << fmt::format("log from {} to {}, {}\n", clocktext(count.first), clocktext(count.last),
                       counted(count.lines, "line", "lines"));
    const std::string oddities = oddwords(count);
    if (!oddities.empty()) {
        out << "  of these " << oddities << '\n';
    }
    if (count.clockchanges > 0) {
        out << "the clock was set back " << counted(count.clockchanges, "time", "times")
            << ": times above may repeat\n";
    }
    if (seen.asofnow) {
        out << fmt::format("judged as of {}, {}\n", clocktext(seen.judged), distancetolog(seen));
    }
}

// Whether any service is so.
template <typename Isso>
bool anyone(const overview& seen, Isso isso)
{
    for (serviceid service = 0; service < seen.services; ++service) {
        if (isso(seen.accountof(service))) {
            return true;
        }
    }
    return false;
}

// Names the services within whose retries the log ends, although these are over by now.
void writesilent(std::ostream& out, const overview& seen)
{
    constexpr std::size_t kNameColumns = 16;
    constexpr std::size_t kMostNames = 3;
    std::vector<std::string> names;
    std::size_t more = 0;
    for (serviceid service = 0; service < seen.services; ++service) {
        const account each = seen.accountof(service);
        const bool retrying =
            each.now.what == state::kSuspect || each.now.what == state::kFunctionalFailure;
        if (!(retrying && !seen.asofnow &&
              secondsbetween(each.now.from, seen.present) > kSilenceSeconds)) {
            continue;
        }
        if (names.size() < kMostNames) {
            names.push_back(fitted(each.name, kNameColumns));
        } else {
            ++more;
        }
    }
    if (!names.empty()) {
        out << fmt::format("no word since the failure: {}", fmt::join(names, ", "))
            << (more > 0 ? fmt::format(" and {} more", more) : "")
            << "\n  a retry that succeeds leaves no message; --now judges as of the present\n";
    }
}

// No thread is left that would tell of anything; a refresh that is under way takes a moment.
bool nothingwatched(const overview& seen)
{
    return seen.services != 0 && !anyone(seen, [&](const account& each) {
               return each.now.what != state::kNotWatched ||
                      secondsbetween(each.now.from, seen.present) <= kRefreshSeconds;
           });
}

// Why there is nothing to be told of any service from now on.
std::string_view standstill(const overview& seen)
{
    if (seen.loadfailed) {
        return "the configuration could not be loaded: nothing is watched until a refresh can";
    }
    if (nothingwatched(seen)) {
        return "nothing is watched: the daemon has ended, or has found no service to watch";
    }
    return {};
}

void writecautions(std::ostream& out, const overview& seen)
{
    const auto inferred = [](const account& each) {
        return each.now.inferred || (each.lastoutage && each.lastoutage->inferred);
    };
    if (anyone(seen, inferred)) {
        out << "~ inferred: no message says so, or when\n";
    }
    writesilent(out, seen);
}

} // namespace

void writestatus(std::ostream& out, const overview& seen, std::size_t columns, bool colour)
{
    if (const std::string_view why = standstill(seen); !why.empty()) {
        out << tools::coloured(tools::kRed, std::string(why), colour) << '\n';
    }
    if (seen.services == 0) {
        out << "no service is named in the log\n";
    } else {
        writetable(out, seen, columns, colour);
    }
    out << '\n';
    writesources(out, seen);
    writecautions(out, seen);
}

int statusof(const overview& seen)
{
    const bool trouble = seen.services == 0 || !standstill(seen).empty() ||
                         anyone(seen, [](const account& each) { return istrouble(each.now.what); });
    return trouble ? 1 : 0;
}

} // namespace report
