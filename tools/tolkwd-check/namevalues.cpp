#include "valuechecks.h"

#include <algorithm>
#include <array>
#include <string>
#include <string_view>
#include <unordered_map>

#include "fields.h"
#include "printable.h"
#include "wdmonitorthread_linux.h"

namespace check {

namespace {

// What ratestatus looks for and a name can hold.
constexpr std::array kRatedWords = {
    std::string_view("not"),          std::string_view("NOT"),     std::string_view("running"),
    std::string_view("RUNNING"),      std::string_view("stopped"), std::string_view("unused"),
    std::string_view("unrecognized"),
};

// A usual first line of a status command: NAME stands for the service's name.
struct statusline {
    std::string_view text;
    int state; // the exit status that comes with it
    bool runs; // what it says
};

constexpr int kNotRunningState = 3;

constexpr std::array kStatusLines = {
    statusline{"NAME is running", 0, true},
    statusline{"NAME is stopped", kNotRunningState, false},
    statusline{"NAME is not running", kNotRunningState, false},
    statusline{"NAME.service", 0, true}, // systemd's, without a description
    statusline{"NAME.service", kNotRunningState, false},
};

bool holdsratedword(const std::string& name)
{
    return std::any_of(kRatedWords.begin(), kRatedWords.end(), [&name](std::string_view word) {
        return name.find(word) != std::string::npos;
    });
}

std::string_view consequence(generalpingresult rating)
{
    switch (rating) {
    case kServiceRunning:
        return "a service that runs, so that it is never recovered";
    case kServiceUnknown:
        return "a service that the system does not know, so that it is not watched any more";
    default:
        return "a service that does not run, so that it is recovered and given up though it runs";
    }
}

void checkrating(const serviceview& view, findings& found)
{
    const std::string& name = view.record->name;
    for (const statusline& each : kStatusLines) {
        const std::string line =
            name + std::string(each.text.substr(std::string_view("NAME").size()));
        const generalpingresult rating = ratestatus(line, each.state);
        if ((rating == kServiceRunning) == each.runs) {
            continue;
        }
        found.add("name-keyword", severity::warning, placeof(view, &service::name),
                  "the name " + tools::inquotes(name) +
                      " holds a word that decides: the status line " + tools::inquotes(line) +
                      " with exit status " + std::to_string(each.state) + " is taken for " +
                      std::string(consequence(rating)));
        return;
    }
}

void checkname(const serviceview& view, findings& found)
{
    const std::string& name = view.record->name;
    if (!isown(view, &service::name)) {
        return;
    }
    if (!isplainname(name)) {
        found.add("service-name", severity::error, placeof(view, &service::name),
                  "the name " + tools::inquotes(name) +
                      " cannot be a service's: it stands in a shell command and in a file's name, "
                      "so it may hold letters, digits and . _ @ : + - only, and not begin with -");
    } else if (holdsratedword(name)) {
        checkrating(view, found);
    }
}

// Which monitored service uses which file of the pings' folder.
class pingfiles {
public:
    explicit pingfiles(findings& collected) : found(collected) {}

    void take(const serviceview& view)
    {
        const service& record = *view.record;
        if (!isown(view, &service::name) || !isplainname(record.name)) {
            return;
        }
        use(view, statusfile(record));
        if (ischecked(record)) {
            use(view, functionalfile(record));
        }
    }

private:
    void use(const serviceview& view, const std::string& path)
    {
        const std::string& name = view.record->name;
        const std::string& other = owners.emplace(path, name).first->second;
        if (other != name) {
            found.add("shared-ping-file", severity::error, placeof(view, &service::name),
                      tools::inquotes(name) + " and " + tools::inquotes(other) +
                          " write their answers to one file, " + tools::inquotes(path) +
                          ": each may get the other's; rename one of them");
        }
    }

    findings& found;
    std::unordered_map<std::string, std::string> owners;
};

// What the services of one name say first, and whether later ones say the same.
class namesakes {
public:
    explicit namesakes(findings& collected) : found(collected) {}

    void take(const serviceview& view, bool monitored)
    {
        const service& record = *view.record;
        if (!isown(view, &service::name)) {
            return;
        }
        bool& watched = known[record.name].watched;
        if (monitored && watched) {
            found.add("duplicate-service", severity::error, placeof(view, &service::name),
                      tools::inquotes(record.name) +
                          " is watched by an earlier target already: both ask it through one file "
                          "and both recover it; watch each service in one target only");
        }
        watched = watched || monitored;
        compare(view, monitored, &service::startcmd, startcommand(record));
        compare(view, monitored, &service::stopcmd, stopcommand(record));
    }

private:
    struct said {
        std::string command;
        bool bymonitored = false;
    };
    struct entry {
        bool watched = false;
        said start{};
        said stop{};
    };

    void compare(const serviceview& view, bool monitored, field which, const std::string& command)
    {
        if (!isown(view, which)) {
            return;
        }
        entry& names = known[view.record->name];
        said& first = which == &service::startcmd ? names.start : names.stop;
        if (first.command.empty()) {
            first = {command, monitored};
        } else if (first.command != command && !(first.bymonitored && monitored)) {
            found.add("conflicting-commands", severity::warning, placeof(view, which),
                      fieldof(view, which) +
                          " is another command than where the file names this "
                          "service before: " +
                          tools::inquotes(first.command) +
                          "; which one is run depends on the target that is recovered");
        }
    }

    findings& found;
    std::unordered_map<std::string, entry> known;
};

} // namespace

void checknames(const daemonview& view, findings& found)
{
    pingfiles files(found);
    namesakes names(found);
    for (const targetview& target : view.targets) {
        checkname(target.monitored, found);
        files.take(target.monitored);
        names.take(target.monitored, true);
        for (const serviceview& dependent : target.dependents) {
            checkname(dependent, found);
            names.take(dependent, false);
        }
    }
}

} // namespace check
