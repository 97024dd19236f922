#include "valuechecks.h"

#include <algorithm>
#include <array>
#include <string>
#include <string_view>

#include "fields.h"
#include "printable.h"
#include "shellwords.h"
#include "wdmonitorthread_linux.h"

namespace check {

namespace {

constexpr std::array kDoingNothing = {
    std::string_view(":"),         std::string_view("true"),
    std::string_view("/bin/true"), std::string_view("/usr/bin/true"),
    std::string_view("exit"),      std::string_view("exit 0"),
};

bool doesnothing(std::string_view command)
{
    return std::find(kDoingNothing.begin(), kDoingNothing.end(), command) != kDoingNothing.end();
}

std::string runinstead(const serviceview& view, field which)
{
    if (which == &service::functionalpingcmd) {
        return "a check that no shell knows: the service is restarted for it and given up, or goes "
               "unchecked; only NULL, in these four letters, is no check";
    }
    const std::string verb = which == &service::startcmd ? "start" : "stop";
    return "a command: nothing " + verb + "s the service; only NULL, in these four letters, is " +
           tools::inquotes("service " + view.record->name + " " + verb);
}

void checkspelling(const serviceview& view, field which, findings& found)
{
    if (isown(view, which) && isnullspelling(view.record->*which)) {
        found.add("null-spelling", severity::error, placeof(view, which),
                  valueof(view, which) + ", which is run as " + runinstead(view, which));
    }
}

void checkend(const serviceview& view, field which, findings& found)
{
    const std::string& command = view.record->*which;
    if (!isown(view, which) || command.find('\0') == std::string::npos) {
        return;
    }
    found.add("nul-byte", severity::error, placeof(view, which),
              valueof(view, which) + ", of which the shell gets only what stands before \\x00" +
                  (which == &service::functionalpingcmd
                       ? ", and nothing of the redirection behind it: its answer is not read"
                       : "") +
                  "; take that byte out");
}

void checkmonitoredempty(const serviceview& view, findings& found)
{
    const service& record = *view.record;
    if (isown(view, &service::startcmd) && doesnothing(record.startcmd)) {
        found.add("empty-command", severity::warning, placeof(view, &service::startcmd),
                  valueof(view, &service::startcmd) +
                      ", which does nothing: a recovery stops the service and nothing starts it; "
                      "NULL is \"service NAME start\"");
    }
    if (isown(view, &service::functionalpingcmd) && doesnothing(record.functionalpingcmd)) {
        found.add("empty-command", severity::error, placeof(view, &service::functionalpingcmd),
                  valueof(view, &service::functionalpingcmd) +
                      ", which prints nothing: that is a failed check, so the service is "
                      "restarted until it is given up; NULL is no check");
    }
}

bool mentionsrestart(const std::string& command)
{
    return command.find("restart") != std::string::npos ||
           command.find("reload") != std::string::npos;
}

void checkdependent(const serviceview& view, findings& found)
{
    const service& record = *view.record;
    const std::string& start = record.startcmd;
    if (!isown(view, &service::startcmd) || doesnothing(record.stopcmd)) {
        return;
    }
    if (doesnothing(start)) {
        found.add("dependent-not-started", severity::warning, placeof(view, &service::startcmd),
                  valueof(view, &service::startcmd) +
                      ", which does nothing: a recovery stops this dependent service, and nothing "
                      "starts it again");
    } else if (start != kNoCommand && start == stopcommand(record) && !mentionsrestart(start)) {
        found.add("dependent-not-started", severity::warning, placeof(view, &service::startcmd),
                  fieldof(view, &service::startcmd) +
                      " is what stops it, too: a recovery stops this dependent service twice and "
                      "does not start it");
    }
}

// Whether something of `command` can run on without end, as far as its text tells.
bool isunbounded(const std::string& command)
{
    const shelltext split = splitshell(command);
    return split.sure && !split.bounded && !split.programs.empty();
}

void checkbounds(const serviceview& view, bool monitored, findings& found)
{
    const service& record = *view.record;
    std::string unbounded;
    const auto look = [&](field which, const std::string& command) {
        if (isown(view, which) && !doesnothing(command) && !isnullspelling(command) &&
            isunbounded(command)) {
            unbounded += unbounded.empty() ? "" : ", ";
            unbounded += fieldname(which);
        }
    };
    look(&service::startcmd, startcommand(record));
    look(&service::stopcmd, stopcommand(record));
    if (monitored && ischecked(record)) {
        look(&service::functionalpingcmd, record.functionalpingcmd);
    }
    if (!unbounded.empty()) {
        found.add("unbounded-command", severity::note, placeof(view, &service::name),
                  "no time limit for " + unbounded + " of " + tools::inquotes(record.name) +
                      ": while one of them hangs, no service is recovered; put \"timeout -k 5 60\" "
                      "before what may hang");
    }
}

void checkanswer(const serviceview& view, findings& found)
{
    constexpr field kCheck = &service::functionalpingcmd;
    const std::string& command = view.record->functionalpingcmd;
    if (!isown(view, kCheck) || !ischecked(*view.record)) {
        return;
    }
    const shelltext split = splitshell(command);
    if (!split.sure) {
        return;
    }
    if (split.openend) {
        found.add("check-output", severity::warning, placeof(view, kCheck),
                  fieldof(view, kCheck) +
                      " ends in a comment, \"&\" or \";\": the daemon appends 1>FILE 2>FILE, which "
                      "then takes nothing of its output: the check fails, or an old answer is "
                      "read for ever; leave that end out");
    } else if (split.compound) {
        found.add("check-output", severity::warning, placeof(view, kCheck),
                  fieldof(view, kCheck) +
                      " has several parts, and only the last one's output is read: the daemon "
                      "appends 1>FILE 2>FILE, and where the last part does not run, the answer "
                      "before is read again; put all of it in parentheses");
    }
}

} // namespace

void checkcommands(const serviceview& view, bool monitored, findings& found)
{
    checkspelling(view, &service::startcmd, found);
    checkspelling(view, &service::stopcmd, found);
    checkend(view, &service::startcmd, found);
    checkend(view, &service::stopcmd, found);
    checkbounds(view, monitored, found);
    if (monitored) {
        checkspelling(view, &service::functionalpingcmd, found);
        checkend(view, &service::functionalpingcmd, found);
        checkmonitoredempty(view, found);
        checkanswer(view, found);
    } else {
        checkdependent(view, found);
    }
}

} // namespace check
