// makepage STORY > PAGE: writes a page about invented services, for the tests that open it in a
// browser, and for pictures.

#include <array>
#include <cstdint>
#include <exception>
#include <functional>
#include <iostream>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "page.h"

using namespace report;

namespace {

constexpr std::int64_t kBeginning = 1794700800; // 2026-11-15 00:00:00
constexpr std::int64_t kMinute = 60;
constexpr std::int64_t kHour = 60 * kMinute;
constexpr std::int64_t kDay = 24 * kHour;
// What `elapsed` counts from means nothing; so it is something odd here.
constexpr std::int64_t kElapsedAtBeginning = 4711;

instant at(std::int64_t seconds, std::int64_t clockset = 0)
{
    return {kBeginning + seconds + clockset, kElapsedAtBeginning + seconds};
}

// One service's story: what it does from when on. Keeps the figures as they have to be.
class story {
public:
    story(pagecontents& into, std::string name, std::string path)
        : contents(into), id(static_cast<serviceid>(into.services.size()))
    {
        contents.services.emplace_back();
        self().figures.name = std::move(name);
        self().figures.path = std::move(path);
    }

    story& from(std::int64_t seconds, state what, bool inferred = false)
    {
        end(seconds);
        self().figures.now = {what, at(seconds, clockset), at(seconds, clockset), inferred};
        begun = true;
        account& figures = self().figures;
        if (isoutage(what) && (!figures.lastoutage || figures.lastoutage->to)) {
            figures.lastoutage = outage{.from = at(seconds, clockset)};
            ++figures.outages;
        }
        if (!isoutage(what) && figures.lastoutage && !figures.lastoutage->to) {
            figures.lastoutage->to = at(seconds, clockset);
        }
        return *this;
    }

    story& mark(std::int64_t seconds, eventkind kind, std::string words, bool inferred = false)
    {
        self().figures.recoveriestried += kind == eventkind::kRecoveryTried ? 1 : 0;
        self().figures.recoveriessuccessful += kind == eventkind::kRecovered ? 1 : 0;
        self().figures.gaveup += kind == eventkind::kGaveUp ? 1 : 0;
        contents.marks.push_back({id, kind, at(seconds, clockset), inferred, std::move(words)});
        return *this;
    }

    // From now on the log's clock is that far ahead of where it was at the beginning.
    story& setclock(std::int64_t seconds)
    {
        clockset = seconds;
        return *this;
    }

    story& skipped(std::uint64_t checks)
    {
        self().figures.skippedchecks += checks;
        return *this;
    }

    void end(std::int64_t seconds)
    {
        span& now = self().figures.now;
        now.to = at(seconds, clockset);
        if (!begun || now.to.elapsed == now.from.elapsed) {
            return;
        }
        self().spans.push_back(now);
        const std::int64_t length = secondsbetween(now.from, now.to);
        self().figures.watchedseconds += now.what == state::kNotWatched ? 0 : length;
        self().figures.outageseconds += isoutage(now.what) ? length : 0;
    }

private:
    pagecontents& contents;
    serviceid id;
    std::int64_t clockset = 0;
    bool begun = false;

    pageservice& self() { return contents.services[id]; }
};

void describe(pagecontents& contents, std::int64_t to, std::uint64_t lines)
{
    contents.files = {"/var/log/tolkwd.log"};
    contents.count.lines = lines;
    contents.count.messages = lines - lines / 50;
    contents.count.foreign = lines / 50 - 1;
    contents.count.torn = 1;
    contents.count.bytes = lines * 130;
    contents.count.first = at(0);
    contents.count.last = at(to);
}

// A failure, two retries' silence, a recovery that works.
void outageof(story& told, std::int64_t when, const std::string& name)
{
    told.from(when, state::kSuspect)
        .mark(when, eventkind::kFailed, "its status command failed, it is being retried")
        .from(when + 210, state::kRecovering)
        .mark(when + 210, eventkind::kRecoveryTried, "recovery of " + name + " tried")
        .from(when + 400, state::kUp)
        .mark(when + 420, eventkind::kRecovered, name + " recovered");
}

// A week of a web shop's machine, with everything that happens.
pagecontents week()
{
    pagecontents contents;
    const std::int64_t end = 7 * kDay;
    describe(contents, end, 48123);

    story web(contents, "nginx", "/usr/sbin/nginx");
    web.from(0, state::kUp, true);
    outageof(web, kDay + 7 * kHour, "nginx");
    outageof(web, 3 * kDay + 15 * kHour, "nginx");
    web.end(end);

    story cache(contents, "redis-server", "/usr/bin/redis-server");
    cache.from(0, state::kUp, true)
        .from(2 * kDay, state::kBusy)
        .from(2 * kDay + 5 * kHour, state::kUp)
        .from(5 * kDay + 3 * kHour, state::kFunctionalFailure)
        .mark(5 * kDay + 3 * kHour, eventkind::kFailed, "its check failed, it is being retried")
        .from(5 * kDay + 3 * kHour + 240, state::kFunctionalRecovering)
        .mark(5 * kDay + 3 * kHour + 240, eventkind::kRecoveryTried, "functional recovery tried")
        .from(5 * kDay + 11 * kHour, state::kUp)
        .mark(5 * kDay + 11 * kHour + 300, eventkind::kRecovered, "functionally recovered")
        .skipped(112)
        .end(end);

    story database(contents, "postgresql", "/usr/lib/postgresql/15/bin/postgres");
    database.from(0, state::kUp, true).from(4 * kDay + 2 * kHour, state::kSuspect);
    for (std::int64_t attempt = 0; attempt < 3; ++attempt) {
        const std::int64_t when = 4 * kDay + 4 * kHour + attempt * 3 * kHour;
        database.from(when, state::kRecovering)
            .mark(when, eventkind::kRecoveryTried, "recovery tried")
            .from(when + 2 * kHour, state::kSuspect);
    }
    database.from(4 * kDay + 14 * kHour, state::kGaveUp)
        .mark(4 * kDay + 14 * kHour, eventkind::kGaveUp, "given up after 3 recoveries")
        .end(end);

    story mail(contents, "postfix", "/usr/lib/postfix/sbin/master");
    mail.from(0, state::kUp, true)
        .from(kDay + 9 * kHour, state::kNotWatched)
        .from(3 * kDay, state::kUp, true)
        .from(6 * kDay + 2 * kHour, state::kCommandNotRecognised)
        .mark(6 * kDay + 2 * kHour, eventkind::kUnknown, "its check is not a command")
        .end(end);

    story shop(contents, "php8.2-fpm", "/usr/sbin/php-fpm8.2");
    shop.from(0, state::kUp, true);
    for (std::int64_t round = 0; round < 24; ++round) {
        const std::int64_t outagebegins = 2 * kDay + 9 * kHour + round * 25 * kMinute;
        shop.from(outagebegins, state::kSuspect).from(outagebegins + 210, state::kUp, true);
    }
    shop.end(end);

    story queue(contents, "an-example-of-a-service-whose-name-is-much-longer-than-its-column",
                "/opt/queue/bin/queue");
    queue.from(12 * kHour, state::kUp, true)
        .from(kDay, state::kUnknownService)
        .mark(kDay, eventkind::kUnknown, "its status command does not know it")
        .end(end);

    for (const char* name : {"cron", "ssh", "rsyslog", "chrony"}) {
        story quiet(contents, name, std::string("/usr/sbin/") + name);
        quiet.from(0, state::kUp, true).end(end);
    }
    return contents;
}

// Services that fail again and again; every span and every mark is an event.
pagecontents crowd(std::size_t services, std::size_t events)
{
    pagecontents contents;
    const std::int64_t end = 30 * kDay;
    describe(contents, end, events * 5);
    // The same each time, and with any library.
    std::mt19937 chance(20261121); // NOLINT(cert-msc51-cpp): a test repeats itself
    const std::size_t rounds = events / services / 5;
    for (std::size_t i = 0; i < services; ++i) {
        const std::string name = "service-" + std::to_string(i + 1);
        story told(contents, name, "/usr/sbin/" + name);
        told.from(0, state::kUp, true);
        for (std::size_t round = 0; round < rounds; ++round) {
            const std::uint64_t room = static_cast<std::uint64_t>(end) / rounds;
            const auto when =
                kHour + static_cast<std::int64_t>(round * room + chance() % (room / 2));
            told.from(when, state::kSuspect)
                .from(when + 210, state::kRecovering)
                .mark(when + 210, eventkind::kRecoveryTried, "recovery tried")
                .from(when + 400, state::kUp)
                .mark(when + 460, eventkind::kRecovered, "recovered");
        }
        if (i % 17 == 5) {
            told.from(end - 2 * kHour, state::kGaveUp);
        }
        told.end(end);
    }
    return contents;
}

// What follows is shown from right to left.
constexpr const char* kTurned =
    "\xe2\x80\xaegnp.exe"; // NOLINT(misc-misleading-bidirectional): that is the test

// Names that a page had better not take at their word.
pagecontents hostile()
{
    pagecontents contents;
    describe(contents, kDay, 100);
    contents.files = {"</script><script>alert(1)</script>.log"};
    const std::string longname(500, 'x');
    for (const char* name : {longname.c_str(), "<script>alert(1)</script>", "</script>",
                             "<!--<script>", "\"onmouseover=\"alert(1)", "&lt;b&gt;", "f\xfcr",
                             "a\nb\tc", kTurned, "", "{{data}}", "]]>"}) {
        story told(contents, name, name);
        told.from(0, state::kUp, true)
            .from(kHour, state::kGaveUp)
            .mark(kHour, eventkind::kGaveUp, std::string("given up: ") + name)
            .end(kDay);
    }
    return contents;
}

// A log without a service.
pagecontents nothing()
{
    pagecontents contents;
    contents.files = {"-"};
    contents.count.lines = 3;
    contents.count.foreign = 3;
    return contents;
}

// All of it within one second: there are states, but no spans.
pagecontents moment()
{
    pagecontents contents;
    describe(contents, 0, 60);
    story one(contents, "web", "/usr/sbin/nginx");
    one.from(0, state::kUp, true);
    story other(contents, "mail", "");
    other.from(0, state::kGaveUp);
    return contents;
}

// The hour that comes twice in autumn, and a clock that was an hour slow.
pagecontents clocks()
{
    pagecontents contents;
    describe(contents, kDay, 500);
    contents.count.clockchanges = 1;
    contents.count.last = at(kDay, -kHour);
    story told(contents, "web", "/usr/sbin/nginx");
    told.from(0, state::kUp, true)
        .from(11 * kHour, state::kSuspect)
        .from(11 * kHour + 210, state::kUp)
        .setclock(-kHour)
        .from(12 * kHour, state::kSuspect)
        .mark(12 * kHour, eventkind::kFailed, "its status command failed")
        .from(12 * kHour + 210, state::kUp)
        .end(kDay);
    return contents;
}

// Three years of which little is to be told.
pagecontents years()
{
    pagecontents contents;
    const std::int64_t end = 1095 * kDay;
    describe(contents, end, 5000);
    story told(contents, "web", "/usr/sbin/nginx");
    told.from(0, state::kUp, true);
    outageof(told, 400 * kDay, "web");
    told.end(end);
    return contents;
}

// The daemon could not read its configuration any more.
pagecontents failedload()
{
    pagecontents contents;
    describe(contents, kDay, 500);
    contents.loadfailed = true;
    story told(contents, "web", "/usr/sbin/nginx");
    told.from(0, state::kUp, true).from(3 * kHour, state::kNotWatched).end(kDay);
    return contents;
}

const std::map<std::string, std::function<pagecontents()>>& stories()
{
    static const std::map<std::string, std::function<pagecontents()>> all{
        {"week", week},
        {"crowd",
         [] {
             return crowd(50, 10000);
         }},
        {"thousand",
         [] {
             return crowd(1000, 20000);
         }},
        {"dense",
         [] {
             return crowd(1, 20000);
         }},
        {"hostile", hostile},
        {"nothing", nothing},
        {"moment", moment},
        {"clocks", clocks},
        {"years", years},
        {"failedload", failedload},
    };
    return all;
}

} // namespace

int main(int argc, char** argv)
{
    try {
        const std::vector<std::string> arguments(argv + 1, argv + argc);
        writepage(std::cout, stories().at(arguments.at(0))());
        return std::cout.flush() ? 0 : 1;
    } catch (const std::exception& problem) {
        std::cerr << "makepage: " << problem.what() << '\n';
        return 1;
    }
}
