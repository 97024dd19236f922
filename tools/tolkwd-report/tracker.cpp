#include "tracker.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <deque>
#include <utility>

#include "generations.h"
#include "roster.h"
#include "servicestate.h"

namespace report {

namespace {

// A clock that is set by less has been adjusted.
constexpr std::int64_t kClockChangeSeconds = 60;

// A daemon that writes debug lines and has been silent for so long before its new start had ended.
constexpr std::int64_t kSilentDaemonSeconds = 600;

// From the first line of a new daemon to its first announcement: a second, and the time to load.
constexpr std::int64_t kStartSeconds = 60;

// So many announcements wait for the lines that tell their paths; no daemon has as many threads
// between the two.
constexpr std::size_t kMostWaiting = 1000;

// What a message is to the tracker, besides what it tells about the state of a service.
enum class role : std::uint8_t {
    kStep,       // of the thread that says it
    kMain,       // the main thread's, about no service
    kAnnounces,  // names its thread's service
    kNames,      // names it in the middle of the message, so the name is whole
    kEndsNamed,  // names it at the end, where a torn line may have cut the name
    kBinaryPath, // the second line of an announcement
    kPath,       // names the path of its thread's service
    kCommand,    // names the service in its command
    kLeaves,     // the thread ends
    kNoLoad,     // nothing is watched until the next load
    kNoDaemon,   // the daemon ends, or has ended
};

role roleof(messageid id) noexcept
{
    switch (id) {
    case messageid::kServiceNamed:
        return role::kAnnounces;
    case messageid::kServiceFailed:
    case messageid::kServiceUnknown:
    case messageid::kRecovered:
    case messageid::kGaveUp:
    case messageid::kCheckFailed:
    case messageid::kCheckNotRecognised:
    case messageid::kFunctionallyRecovered:
    case messageid::kFunctionalGaveUp:
        return role::kNames;
    case messageid::kRecoveryTried:
    case messageid::kFunctionalRecoveryTried:
        return role::kEndsNamed;
    case messageid::kBinaryPathNamed:
        return role::kBinaryPath;
    case messageid::kCheckBegins:
    case messageid::kCheckSkipped:
    case messageid::kCannotSkip:
    case messageid::kNoFigures:
        return role::kPath;
    case messageid::kStatusAnswered:
        return role::kCommand;
    case messageid::kThreadLeft:
        return role::kLeaves;
    case messageid::kLoadFailed:
    case messageid::kConfigurationUnreadable:
        return role::kNoLoad;
    case messageid::kNoLock:
    case messageid::kNoLog:
    case messageid::kCommandLineRefused:
        return role::kNoDaemon;
    case messageid::kThreadCreated:
    case messageid::kThreadJoined:
    case messageid::kRefreshBegins:
    case messageid::kBeforeJoin:
    case messageid::kAfterJoin:
    case messageid::kListing:
    case messageid::kForeign:
        return role::kMain;
    default:
        return role::kStep;
    }
}

eventkind kindof(messageid id) noexcept
{
    switch (id) {
    case messageid::kServiceNamed:
        return eventkind::kWatched;
    case messageid::kThreadLeft:
        return eventkind::kUnwatched;
    case messageid::kServiceFailed:
    case messageid::kCheckFailed:
        return eventkind::kFailed;
    case messageid::kRecoveryTried:
    case messageid::kFunctionalRecoveryTried:
        return eventkind::kRecoveryTried;
    case messageid::kRecovered:
    case messageid::kFunctionallyRecovered:
        return eventkind::kRecovered;
    case messageid::kGaveUp:
    case messageid::kFunctionalGaveUp:
        return eventkind::kGaveUp;
    case messageid::kServiceUnknown:
    case messageid::kCheckNotRecognised:
        return eventkind::kUnknown;
    case messageid::kCheckSkipped:
        return eventkind::kSkipped;
    case messageid::kCheckBegins:
        return eventkind::kChecked;
    case messageid::kRefreshBegins:
    case messageid::kLoadFailed:
    case messageid::kConfigurationUnreadable:
    case messageid::kNotConfigured:
        return eventkind::kConfiguration;
    case messageid::kNoLock:
    case messageid::kNoLog:
    case messageid::kCommandLineRefused:
    case messageid::kNoTarget:
        return eventkind::kDaemon;
    case messageid::kNoFigures:
    case messageid::kFigures:
        return eventkind::kFigures;
    default:
        return eventkind::kStep;
    }
}

// A name or path may hold a newline. Where the message ends with it the log has it up to there
// only, so that is what it is known by.
std::string_view firstline(std::string_view text) noexcept
{
    return text.substr(0, text.find('\n'));
}

// The name in "service NAME status 1>FILE 2>FILE"; none in anything else.
std::optional<std::string_view> nameincommand(std::string_view command) noexcept
{
    constexpr std::string_view kBefore = "service ";
    constexpr std::string_view kBehind = " status 1>";
    const std::size_t end = command.find(kBehind);
    if (!command.starts_with(kBefore) || end == std::string_view::npos || end < kBefore.size()) {
        return std::nullopt;
    }
    return command.substr(kBefore.size(), end - kBefore.size());
}

constexpr std::array<std::string_view, 14> kKindWords{
    "watched", "unwatched", "state",   "failed",        "recovery-tried", "recovered", "gave-up",
    "unknown", "skipped",   "checked", "configuration", "daemon",         "figures",   "step",
};
static_assert(kKindWords.size() == static_cast<std::size_t>(eventkind::kStep) + 1);

} // namespace

std::string_view wordof(eventkind kind) noexcept
{
    return kKindWords.at(static_cast<std::size_t>(kind));
}

std::string_view wordsof(inference why) noexcept
{
    switch (why) {
    case inference::kAnnounced:
        return "taken to be up until the first word about it";
    case inference::kRetryHelped:
        return "taken to have come up by the last retry, for no recovery followed";
    case inference::kCheckHelped:
        return "taken to have come up, for no failure followed its check";
    case inference::kLeftOut:
        return "no longer watched, for the others were announced anew without it";
    case inference::kNothingLoaded:
        return "no longer watched, for no configuration is in force";
    case inference::kDaemonEnded:
        return "no longer watched, for the daemon has ended";
    case inference::kWatchedAnew:
        return "all services are watched anew, after a refresh or a new start of the daemon";
    case inference::kStartedAnew:
        return "the daemon was started anew";
    case inference::kClockChanged:
        return "the clock was changed";
    default:
        return "";
    }
}

std::string knownname(std::string_view text)
{
    constexpr std::size_t kLongestCharacterBytes = 4;
    if (text.size() <= kLongestNameBytes) {
        return std::string(text);
    }
    const auto goeson = [text](std::size_t place) {
        return (static_cast<unsigned char>(text[place]) & 0xc0U) == 0x80;
    };
    std::size_t end = kLongestNameBytes;
    while (goeson(end) && end + kLongestCharacterBytes > kLongestNameBytes + 1) {
        --end;
    }
    return std::string(text.substr(0, end)) + "...";
}

std::optional<double> account::availability() const noexcept
{
    if (watchedseconds <= 0) {
        return std::nullopt;
    }
    return static_cast<double>(watchedseconds - outageseconds) /
           static_cast<double>(watchedseconds);
}

class tracker::work {
public:
    explicit work(witness listener) : listens(std::move(listener)) {}

    void hear(const message& said);
    void conclude(const instant& when, bool final);
    [[nodiscard]] serviceid count() const noexcept;
    [[nodiscard]] std::string_view nameof(serviceid service) const { return who.nameof(service); }
    [[nodiscard]] account accountof(serviceid service) const;

    bool loadfailed = false;

private:
    // What was heard of a service.
    struct past {
        explicit past(const servicestate& before) : course(before) {}

        servicestate course;
        std::uint32_t monitors = 0;     // how often it was announced in its last generation
        std::uint64_t failing = 0;      // the thread that told of the last failure; 0: none yet
        std::vector<std::uint64_t> due; // threads whose functional recovery has its stops and
                                        // starts to come
    };

    struct watched {
        instant announced;             // the first announcement
        std::uint32_t announcedin = 0; // the generation in which it was announced last; 0: never
        std::uint32_t seen = 0;        // the generation in which it was heard of last
        bool pathexpected = true;      // its path, if one is known, is of a former generation
        bool isactive = false;         // is in `active`
        std::unique_ptr<past> heard;   // null while that is one announcement at most
    };

    // An announcement that may belong to a service of which the path is known already: the next
    // line tells the path.
    struct announcement {
        std::uint64_t thread;
        std::string name;
        instant when;
    };

    void advance(const instant& when);
    void noteclock(const instant& before);

    void announced(const message& said);
    void begingeneration(generations::start how);
    void watch(serviceid service, std::uint64_t thread, const instant& when);
    void watchwaiting(const message* said);
    bool watchwaiting(const announcement& due, const message* said);
    void pathnamed(const message& said);
    void threadleft(const message& said);
    void nothingloaded(const message& said);
    void daemonended(const message& said);
    void statetold(const std::optional<serviceid>& service, const message& said);
    static bool continuesrecovery(past& one, const message& said);
    static servicestate::speaker speakerof(past& one, const message& said);

    [[nodiscard]] std::optional<serviceid> speaker(std::uint64_t thread) const noexcept;
    std::optional<serviceid> named(std::uint64_t thread, std::string_view name, bool whole);
    std::optional<serviceid> commanded(std::uint64_t thread, std::string_view command);
    std::optional<serviceid> pathed(std::uint64_t thread, std::string_view path);
    serviceid tied(std::uint64_t thread, serviceid service);
    void setpath(serviceid service, std::string_view path);
    serviceid add(std::string_view name);
    serviceid addnameless(std::string_view path);
    std::string_view shortened(std::string_view text);
    [[nodiscard]] servicestate courseof(const watched& one) const;
    past& pastof(watched& one);
    void activate(serviceid service);
    template <typename Stays>
    void sift(Stays stays);

    void unwatch(serviceid service, const instant& when, bool inferred, inference why);
    void unwatchall(const instant& when, bool inferred, inference why);
    void unwatchsilent();
    void leaveout();
    [[nodiscard]] servicestate concluded(serviceid service, turns& into) const;

    void tellturns(serviceid service);
    void tell(const std::optional<serviceid>& service, const message& said, eventkind kind);
    void tellofall(eventkind kind, inference why);

    witness listens;
    generations generation;
    roster who;
    std::deque<watched> services;  // growing moves none of them
    std::vector<serviceid> active; // all others are not watched
    std::vector<announcement> waiting;
    turns told;           // of the message that is being heard
    bool complete = true; // whom the generation leaves out is known
    bool started = false; // anything was heard
    instant last;         // the message that is being heard, or was
    instant silentfrom;   // the last long pause of all threads
    instant silentto;
    std::optional<instant> clockchange; // the last one
    instant judged;                     // see conclude
    std::string longname;               // see shortened
};

void tracker::work::hear(const message& said)
{
    advance(said.when);
    if (!listens.happened && waiting.empty() && !matters(said.id)) {
        return; // most debug lines
    }
    generation.hear(said.id, last);
    if (!waiting.empty()) {
        watchwaiting(&said);
    }
    told.clear();
    switch (roleof(said.id)) {
    case role::kAnnounces:
        return announced(said);
    case role::kBinaryPath:
        return pathnamed(said);
    case role::kLeaves:
        return threadleft(said);
    case role::kNames:
        return statetold(named(said.thread, shortened(firstline(said.first)), true), said);
    case role::kEndsNamed:
        return statetold(named(said.thread, shortened(said.first), false), said);
    case role::kPath:
        return statetold(pathed(said.thread, shortened(firstline(said.first))), said);
    case role::kCommand:
        return tell(commanded(said.thread, said.first), said, kindof(said.id));
    case role::kNoLoad:
        return nothingloaded(said);
    case role::kNoDaemon:
        return daemonended(said);
    case role::kMain:
        return tell(std::nullopt, said, kindof(said.id));
    case role::kStep:
        return statetold(speaker(said.thread), said);
    }
}

void tracker::work::conclude(const instant& when, bool final)
{
    if (final) {
        watchwaiting(nullptr);
    }
    judged = started && secondsbetween(last, when) < 0 ? last : when;
    if (!final || (!listens.happened && !listens.ended)) {
        return;
    }
    for (serviceid service = 0; service < services.size(); ++service) {
        told.clear();
        (void)concluded(service, told);
        tellturns(service);
    }
}

serviceid tracker::work::count() const noexcept
{
    return static_cast<serviceid>(services.size());
}

account tracker::work::accountof(serviceid service) const
{
    turns ignored;
    account result;
    result.name = who.nameof(service);
    result.path = who.pathof(service);
    concluded(service, ignored).fill(result);
    return result;
}

// The order of the log is the order of time, whatever a line's own stamp says.
void tracker::work::advance(const instant& when)
{
    const instant before = last;
    last = when;
    if (started && secondsbetween(before, when) < 0) {
        last.elapsed = before.elapsed;
    }
    if (started) {
        noteclock(before);
    }
    started = started || when != instant{}; // standard error has no time of its own
    if (!complete && generation.iscomplete(last)) {
        leaveout();
    }
}

void tracker::work::noteclock(const instant& before)
{
    const std::int64_t passed = secondsbetween(before, last);
    if (passed > kSilentDaemonSeconds) {
        silentfrom = before;
        silentto = last;
    }
    if (std::abs(last.clock - before.clock - passed) > kClockChangeSeconds) {
        clockchange = last;
        tellofall(eventkind::kDaemon, inference::kClockChanged);
    }
}

void tracker::work::announced(const message& said)
{
    const std::string_view name = shortened(said.first);
    const std::optional<serviceid> known = who.byname(name);
    const auto* const tie = who.bythread(said.thread);
    const bool threadagain = tie != nullptr && tie->generation == generation.number();
    const bool serviceagain = known && services[*known].seen == generation.number();
    begingeneration(generation.announced(last, threadagain, serviceagain, !services.empty()));
    if (!known && who.hasnameless()) {
        if (waiting.size() == kMostWaiting) {
            (void)watchwaiting(waiting.front(), nullptr);
            waiting.erase(waiting.begin());
        }
        waiting.push_back({said.thread, std::string(name), last});
        return tell(std::nullopt, said, eventkind::kWatched);
    }
    const serviceid service = known ? *known : add(name);
    watch(service, said.thread, last);
    tellturns(service);
    tell(service, said, eventkind::kWatched);
}

void tracker::work::begingeneration(generations::start how)
{
    if (how == generations::start::kNone) {
        return;
    }
    complete = false;
    loadfailed = false;
    if (how == generations::start::kEither) {
        tellofall(eventkind::kConfiguration, inference::kWatchedAnew);
    } else if (how == generations::start::kAnew) {
        if (silentto != instant{} && secondsbetween(silentto, last) <= kStartSeconds) {
            unwatchsilent();
        }
        tellofall(eventkind::kDaemon, inference::kStartedAnew);
    }
}

void tracker::work::watch(serviceid service, std::uint64_t thread, const instant& when)
{
    tied(thread, service);
    activate(service);
    watched& one = services[service];
    one.pathexpected = true;
    if (one.announcedin == 0 && !one.heard) {
        one.announced = when;
        one.announcedin = generation.number();
        servicestate(clockchange)
            .hear(messageid::kServiceNamed, when, generation.hassteps(),
                  servicestate::speaker::kOwn, told);
        return;
    }
    past& heard = pastof(one);
    heard.monitors = one.announcedin == generation.number() ? heard.monitors + 1 : 1;
    one.announcedin = generation.number();
    heard.failing = 0;
    heard.due.clear();
    heard.course.hear(messageid::kServiceNamed, when, generation.hassteps(),
                      servicestate::speaker::kOwn, told);
}

// `said`: the next message of whatever thread; null at the end.
void tracker::work::watchwaiting(const message* said)
{
    std::erase_if(waiting, [&](const announcement& due) { return watchwaiting(due, said); });
}

// Whether this one is done.
bool tracker::work::watchwaiting(const announcement& due, const message* said)
{
    const bool isown = said != nullptr && said->thread == due.thread;
    if (said != nullptr && !isown && secondsbetween(due.when, last) <= kCompleteSeconds) {
        return false;
    }
    std::optional<serviceid> service = who.byname(due.name); // announced twice
    if (!service && isown && said->id == messageid::kBinaryPathNamed) {
        service = who.bypath(shortened(said->first));
        if (service && !who.isnameless(*service)) {
            service.reset();
        } else if (service) {
            who.name(*service, due.name);
        }
    }
    if (!service) {
        service = add(due.name);
    }
    told.clear();
    watch(*service, due.thread, due.when);
    for (beginning& begun : told.begun) {
        begun.bymessage = false; // its own has been told, as nobody's
    }
    tellturns(*service);
    return true;
}

void tracker::work::pathnamed(const message& said)
{
    std::optional<serviceid> service = speaker(said.thread);
    const std::string_view path = shortened(said.first);
    if (service && services[*service].pathexpected) {
        setpath(*service, path);
    } else if (who.bypath(path)) { // the line with the name is lost
        service = pathed(said.thread, path);
    }
    tell(service, said, kindof(said.id));
}

// Another thread may watch the same service.
void tracker::work::threadleft(const message& said)
{
    const std::optional<serviceid> service = speaker(said.thread);
    who.untie(said.thread);
    if (service && who.watchers(*service, generation.number()) == 0) {
        pastof(services[*service])
            .course.hear(said.id, last, generation.hassteps(), servicestate::speaker::kOwn, told);
        tellturns(*service);
    }
    tell(service, said, kindof(said.id));
}

void tracker::work::nothingloaded(const message& said)
{
    generation.endbyload();
    loadfailed = true;
    tell(std::nullopt, said, kindof(said.id));
    unwatchall(last, false, inference::kNothingLoaded);
}

void tracker::work::daemonended(const message& said)
{
    generation.endwithdaemon();
    tell(std::nullopt, said, kindof(said.id));
    unwatchall(last, false, inference::kDaemonEnded);
}

void tracker::work::statetold(const std::optional<serviceid>& service, const message& said)
{
    bool again = false;
    if (service && servicestate::tells(said.id)) {
        services[*service].seen = generation.number();
        activate(*service);
        past& one = pastof(services[*service]);
        again = continuesrecovery(one, said);
        if (!again) {
            one.course.hear(said.id, last, generation.hassteps(), speakerof(one, said), told);
            tellturns(*service);
        }
    }
    tell(service, said, again ? eventkind::kStep : kindof(said.id)); // a recovery is told once
}

// The functional recovery names its general part, too: that is no recovery of its own. Between the
// two its thread says nothing else, but other threads may.
bool tracker::work::continuesrecovery(past& one, const message& said)
{
    constexpr std::size_t kMostDue = 4; // a part that is lost is waited for no longer than that
    const bool wasdue = std::erase(one.due, said.thread) != 0;
    if (said.id == messageid::kFunctionalRecoveryTried) {
        if (one.due.size() == kMostDue) {
            one.due.erase(one.due.begin());
        }
        one.due.push_back(said.thread);
    }
    return wasdue && said.id == messageid::kRecoveryTried;
}

servicestate::speaker tracker::work::speakerof(past& one, const message& said)
{
    switch (said.id) {
    case messageid::kServiceFailed:
    case messageid::kCheckFailed:
    case messageid::kFunctionalRecoveryTried:
    case messageid::kRecoveryTried:
        one.failing = said.thread;
        break;
    default:
        break;
    }
    const bool several = one.monitors > 1 && one.failing != 0;
    return several && one.failing != said.thread ? servicestate::speaker::kOther
                                                 : servicestate::speaker::kOwn;
}

std::optional<serviceid> tracker::work::speaker(std::uint64_t thread) const noexcept
{
    const auto* const tie = who.bythread(thread);
    return tie == nullptr ? std::nullopt : std::optional(tie->service);
}

// A name that is not the one of the thread's service: the thread's id has been used again, and the
// announcement is lost. `whole`: the name is sure not to be cut.
std::optional<serviceid> tracker::work::named(std::uint64_t thread, std::string_view name,
                                              bool whole)
{
    const std::optional<serviceid> before = speaker(thread);
    const bool isnameless = before && who.isnameless(*before);
    if (before && !isnameless && who.nameof(*before) == name) {
        return tied(thread, *before);
    }
    if (const std::optional<serviceid> known = who.byname(name)) {
        if (isnameless) { // nobody's after all
            unwatch(*before, last, true, inference::kLeftOut);
        }
        return tied(thread, *known);
    }
    if (isnameless) {
        who.name(*before, name);
        return tied(thread, *before);
    }
    return tied(thread, before && !whole ? *before : add(name));
}

std::optional<serviceid> tracker::work::commanded(std::uint64_t thread, std::string_view command)
{
    const std::optional<std::string_view> name = nameincommand(command);
    return name ? named(thread, shortened(firstline(*name)), true) : speaker(thread);
}

// Another path than that of the thread's service tells the same. A path that nobody is known to
// have makes a service without a name; one that several have tells nothing.
std::optional<serviceid> tracker::work::pathed(std::uint64_t thread, std::string_view path)
{
    if (const std::optional<serviceid> before = speaker(thread)) {
        if (who.pathof(*before) == path) {
            return tied(thread, *before);
        }
        if (services[*before].pathexpected) {
            setpath(*before, path);
            return tied(thread, *before);
        }
    }
    if (const std::optional<serviceid> only = who.bypath(path)) {
        return tied(thread, *only);
    }
    who.untie(thread);
    return who.knowspath(path) ? std::nullopt : std::optional(tied(thread, addnameless(path)));
}

serviceid tracker::work::tied(std::uint64_t thread, serviceid service)
{
    const auto* const tie = who.bythread(thread);
    if (thread != 0 &&
        (tie == nullptr || tie->service != service || tie->generation != generation.number())) {
        who.tie(thread, service, generation.number());
    }
    services[service].seen = generation.number();
    return service;
}

void tracker::work::setpath(serviceid service, std::string_view path)
{
    who.setpath(service, path);
    services[service].pathexpected = false;
}

serviceid tracker::work::add(std::string_view name)
{
    services.emplace_back();
    return who.add(name);
}

serviceid tracker::work::addnameless(std::string_view path)
{
    services.emplace_back().pathexpected = false;
    return who.addnameless(std::string("(").append(path).append(")"), path);
}

void tracker::work::unwatch(serviceid service, const instant& when, bool inferred, inference why)
{
    told.clear();
    pastof(services[service]).course.unwatch(when, inferred, why, generation.hassteps(), told);
    tellturns(service);
    told.clear();
}

void tracker::work::unwatchall(const instant& when, bool inferred, inference why)
{
    sift([&](serviceid service) {
        unwatch(service, when, inferred, why);
        return false;
    });
}

// The daemon had ended when all fell silent. A service without a thread had been silent before, and
// what became of it does not depend on the daemon.
void tracker::work::unwatchsilent()
{
    sift([&](serviceid service) {
        const state before = pastof(services[service]).course.current();
        const bool stays = before == state::kGaveUp || before == state::kUnknownService;
        if (!stays) {
            unwatch(service, silentfrom, true, inference::kDaemonEnded);
        }
        return stays;
    });
}

// All that are configured have been announced, at about the same time.
void tracker::work::leaveout()
{
    complete = true;
    sift([&](serviceid service) {
        const bool stays = services[service].seen == generation.number();
        if (!stays) {
            unwatch(service, generation.since(), true, inference::kLeftOut);
        }
        return stays;
    });
}

// Valid until the next text that is too long.
std::string_view tracker::work::shortened(std::string_view text)
{
    if (text.size() <= kLongestNameBytes) {
        return text;
    }
    longname = knownname(text);
    return longname;
}

servicestate tracker::work::courseof(const watched& one) const
{
    if (one.heard) {
        return one.heard->course;
    }
    servicestate course(clockchange);
    if (one.announcedin != 0) {
        turns toldbefore;
        course.hear(messageid::kServiceNamed, one.announced, generation.hassteps(),
                    servicestate::speaker::kOwn, toldbefore);
    }
    return course;
}

tracker::work::past& tracker::work::pastof(watched& one)
{
    if (!one.heard) {
        one.heard = std::make_unique<past>(courseof(one));
        one.heard->monitors = one.announcedin == 0 ? 0 : 1;
    }
    return *one.heard;
}

void tracker::work::activate(serviceid service)
{
    if (!std::exchange(services[service].isactive, true)) {
        active.push_back(service);
    }
}

// Asks of each active service whether it stays so.
template <typename Stays>
void tracker::work::sift(Stays stays)
{
    std::sort(active.begin(), active.end());
    std::erase_if(active, [&](serviceid service) {
        services[service].isactive = stays(service);
        return !services[service].isactive;
    });
}

// A copy: what is to come may tell something else.
servicestate tracker::work::concluded(serviceid service, turns& into) const
{
    const watched& one = services[service];
    servicestate course = courseof(one);
    const bool steps = generation.hassteps();
    if (!complete && one.seen != generation.number()) {
        course.unwatch(generation.since(), true, inference::kLeftOut, steps, into);
    }
    course.conclude(judged, steps, into);
    return course;
}

// The spans that have ended, and the states that have begun without a message.
void tracker::work::tellturns(serviceid service)
{
    if (listens.ended) {
        for (const span& over : told.ended) {
            listens.ended(service, over);
        }
    }
    if (listens.happened) {
        for (const beginning& begun : told.begun) {
            if (!begun.bymessage) {
                listens.happened(
                    {begun.what == state::kNotWatched ? eventkind::kUnwatched : eventkind::kState,
                     begun.when, service, begun.what, begun.inferred, begun.why, nullptr});
            }
        }
    }
}

// What was said, and the state that began with it.
void tracker::work::tell(const std::optional<serviceid>& service, const message& said,
                         eventkind kind)
{
    if (!listens.happened) {
        return;
    }
    event result{kind, last, service, std::nullopt, false, inference::kNone, &said};
    for (const beginning& begun : told.begun) {
        if (begun.bymessage) {
            result.became = begun.what;
            result.inferred = begun.inferred;
            result.why = begun.why;
        }
    }
    if (result.became && kind == eventkind::kStep) {
        result.kind = eventkind::kState;
    }
    listens.happened(result);
}

void tracker::work::tellofall(eventkind kind, inference why)
{
    if (listens.happened) {
        listens.happened({kind, last, std::nullopt, std::nullopt, true, why, nullptr});
    }
}

tracker::tracker(witness told) : self(std::make_unique<work>(std::move(told))) {}

tracker::~tracker() = default;

void tracker::hear(const message& said)
{
    self->hear(said);
}

void tracker::conclude(const instant& when, bool final)
{
    self->conclude(when, final);
}

serviceid tracker::services() const noexcept
{
    return self->count();
}

std::string_view tracker::nameof(serviceid service) const
{
    return self->nameof(service);
}

account tracker::accountof(serviceid service) const
{
    return self->accountof(service);
}

bool tracker::loadfailed() const noexcept
{
    return self->loadfailed;
}

} // namespace report
