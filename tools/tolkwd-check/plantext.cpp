#include "plan.h"

#include <algorithm>
#include <string_view>

#include "printable.h"
#include "terminal.h"
#include "units.h"
#include "wdmonitortarget.h"

namespace check {

namespace {

// Of what stands before the text of a line: the names of a target's parts, and the seconds of a
// time line.
constexpr std::string_view kIndent = "            ";
constexpr std::size_t kTimeWidth = kIndent.size() - 4;

std::string inseconds(const plannedtime& time)
{
    return numberwords(time.seconds) + " s";
}

std::string each(const plannedtime& time)
{
    return time.seconds == 0 ? "without a pause between" : "every " + inseconds(time);
}

// A message of the daemon, as far as it is needed to find it in the log.
std::string message(std::string_view level, const std::string& text)
{
    std::string_view shown = text;
    std::string_view end;
    for (const std::string_view rest : {", if failed ", ". Will log "}) {
        if (const std::size_t place = shown.rfind(rest); place != std::string_view::npos) {
            shown = shown.substr(0, place);
            end = " ...";
        }
    }
    return std::string(level)
        .append(" \"")
        .append(tools::printable(shown))
        .append(end)
        .append("\"");
}

// Writes what a target's time line tells.
class timeline {
public:
    explicit timeline(std::ostream& stream) : out(stream) {}

    void at(const plannedtime& time, const std::string& text)
    {
        std::string when = inseconds(time);
        when.insert(0, kTimeWidth - std::min(kTimeWidth, when.size()), ' ');
        out << "  " << when << "  " << text << '\n';
    }
    void more(const std::string& text) { out << kIndent << text << '\n'; }

private:
    std::ostream& out;
};

void writenotasked(std::ostream& out, const targetplan& plan)
{
    out << "  never asked, for maxattemptofwakeup is " << tools::inquotes(plan.attemptstext);
    if (plan.state == watching::givenup) {
        out << ", which counts as 0.\n"
            << "  It is given up as soon as watching begins, and again after each refresh:\n"
            << kIndent << message("ERROR", plan.givenuplog) << "\n";
    } else {
        out << ".\n"
            << "  A negative number asks nothing either, logs nothing, and keeps a processor busy\n"
            << "  as long as the daemon runs.\n";
    }
    out << "  Give the number of recoveries that you want to rely on, and one more.\n";
}

std::string busywords(const checkplan& check)
{
    return "more than " + rounded(check.processorpercent) + " % of a processor, " +
           rounded(check.memorybytes / kBytesPerMebibyte) + " MiB or " +
           counted(check.threads, "thread", "threads");
}

void writebusiness(timeline& lines, const checkplan& check)
{
    if (check.busy == busyness::never) {
        lines.more("never left out, however busy the service is (MaxFPSkips is 0)");
    } else if (check.busy == busyness::always) {
        lines.more("A service that is busy is not checked, and with these thresholds every one");
        lines.more("that lives is busy: " + busywords(check) + ".");
        lines.more(check.unnoticed ? "Up to " + numberwords(check.skips) +
                                         " in a row are left out (MaxFPSkips), " +
                                         "so one is made every " + inseconds(*check.unnoticed) + "."
                                   : "So it is never checked (MaxFPSkips is negative).");
    } else {
        lines.more(check.unnoticed
                       ? "left out while the service is busy, at most " + numberwords(check.skips) +
                             " in a row; a failure then stays"
                       : "left out as long as the service is busy (MaxFPSkips is negative); "
                         "a failure then stays");
        lines.more(check.unnoticed
                       ? "unnoticed for up to " + inseconds(*check.unnoticed) + ". Busy is"
                       : "unnoticed without end. Busy is");
        lines.more(busywords(check));
    }
}

void writeasking(std::ostream& out, const targetplan& plan)
{
    timeline lines(out);
    out << "  asked     " << each(plan.every) << ":\n";
    lines.more("  " + tools::printable(plan.statuscommand));
    if (plan.check) {
        out << "  checked   each time it was asked and runs:\n";
        lines.more("  " + tools::printable(plan.check->command));
        writebusiness(lines, *plan.check);
    } else {
        out << "  checked   never: functionalpingcmd is " << kNoCommand << '\n';
    }
}

void writerecovery(std::ostream& out, const targetplan& plan)
{
    timeline lines(out);
    out << "  recovered by these commands, one after the other. As long as they run, no service "
           "is\n"
        << kIndent << "asked, checked or recovered:\n";
    std::size_t place = 0;
    for (const recoverystep& step : plan.recovery) {
        lines.more("  " + std::to_string(++place) + ". " +
                   (step.command.empty()
                        ? "nothing is run to " + std::string(step.stops ? "stop " : "start ") +
                              tools::printable(step.service)
                        : tools::printable(step.command)));
        if (step.unlessdown) {
            lines.more("     left out when the last status line said that it does not run");
        }
    }
}

// The words in which the two outages differ.
struct outagewords {
    std::string_view begin;
    std::string_view cause;
    std::string_view again;
    std::string_view works;
};

outagewords wordsof(const outageplan& outage, bool checked)
{
    if (outage.functional) {
        return {"when it runs and its check fails", "its check fails, just after it was made",
                "checked again", "works"};
    }
    return {"when it does not run",
            checked ? "it stops, just after its check" : "it stops, just after it was asked",
            "asked again", "runs"};
}

void writenoticed(timeline& lines, const targetplan& plan, const outageplan& outage)
{
    lines.at(*outage.noticed, "noticed at the latest:");
    lines.more(message("ERROR", outage.log.noticed));
    if (!outage.functional) {
        if (plan.check) {
            lines.more("(One that stops before its check is noticed by the check, see below.)");
        }
    } else if (plan.check->busy == busyness::overthreshold) {
        lines.more(plan.check->unnoticed
                       ? "(At " + inseconds(*plan.check->unnoticed) +
                             " if it is busy all the time; all the rest is later then, too.)"
                       : "(When it is no longer busy, if it is.)");
    }
}

void writeretries(timeline& lines, const recoveryplan& recovery, const outagewords& words)
{
    std::size_t count = 0;
    for (const plannedtime& retry : recovery.retries) {
        lines.at(retry, std::string(words.again).append(", retry ") + std::to_string(++count) +
                            " of " + std::to_string(recovery.retries.size()));
    }
}

// A service that always counts as busy: nothing proves that it was recovered.
void writeunproven(timeline& lines, const outageplan& outage, const recoveryplan& recovery)
{
    lines.at(*recovery.recovered, "for the daemon it works again, as no check is made while busy:");
    lines.more(message("INFO", outage.log.recovered));
    lines.at(*recovery.again, "checked; if it fails, all this again, and it is never given up");
}

void writeagain(timeline& lines, const targetplan& plan, const outageplan& outage,
                const recoveryplan& recovery, const outagewords& words)
{
    std::string again(words.again);
    if (outage.functional && plan.check->busy != busyness::never) {
        again += ", unless it is busy, which counts as if it worked";
    }
    lines.at(*recovery.again, again);
    if (recovery.number == 1) {
        lines.more(std::string("if it ").append(words.works) + ", " +
                   numberwords(recovery.recovered->seconds - recovery.again->seconds) +
                   " s later:");
        lines.more(message("INFO", outage.log.recovered));
        lines.more("if not: from \"noticed\" on once more");
    }
}

void writerecoveries(timeline& lines, const targetplan& plan, const outageplan& outage,
                     const outagewords& words)
{
    long long before = 0;
    for (const recoveryplan& recovery : outage.recoveries) {
        if (recovery.number > before + 1) {
            lines.more("... a recovery every " + inseconds(outage.round) + " ...");
        }
        before = recovery.number;
        lines.at(recovery.begins, outage.unproven
                                      ? "a recovery begins"
                                      : "recovery " + numberwords(recovery.number) + " of " +
                                            numberwords(plan.attempts) + " begins");
        if (recovery.number == 1) {
            lines.more(message("ERROR", outage.log.begins));
        }
        if (outage.unproven) {
            writeunproven(lines, outage, recovery);
        } else if (recovery.again) {
            writeagain(lines, plan, outage, recovery, words);
        }
    }
}

void writerevival(timeline& lines, const targetplan& plan)
{
    lines.more("It is watched again after the next refresh, at most " + numberwords(plan.refresh) +
               " s later" + (plan.othersround ? "," : "."));
    if (plan.othersround) {
        lines.more("and when the rounds of all others have ended: " +
                   numberwords(*plan.othersround) + " s more if they are well.");
    }
}

void writegivenup(timeline& lines, const targetplan& plan, const outageplan& outage,
                  const outagewords& words)
{
    const plannedtime& time = *outage.givenup;
    lines.at(time, std::string("given up, ")
                       .append(outage.functional ? "not checked" : "not asked")
                       .append(" once more, even if it ")
                       .append(words.works)
                       .append(" now:"));
    lines.more(message("ERROR", outage.log.givenup));
    lines.more(
        "Until here, " +
        (time.checks > 0 ? counted(time.checks, "check", "checks") + " and " : std::string()) +
        "the commands of " + counted(time.recoveries, "recovery", "recoveries") + " come on top.");
    writerevival(lines, plan);
}

void writeoutage(std::ostream& out, const targetplan& plan, const outageplan& outage)
{
    const outagewords words = wordsof(outage, plan.check.has_value());
    timeline lines(out);
    out << "\n  " << words.begin << '\n';
    lines.at({}, std::string(words.cause));
    if (!outage.noticed) {
        lines.more("never noticed: it is not checked");
        return;
    }
    writenoticed(lines, plan, outage);
    writeretries(lines, outage.recoveries.front(), words);
    writerecoveries(lines, plan, outage, words);
    if (outage.givenup) {
        writegivenup(lines, plan, outage, words);
    }
}

void writetarget(std::ostream& out, const targetplan& plan, bool colour)
{
    const std::string name = plan.name.empty() ? "(no name)" : tools::printable(plan.name);
    out << '\n' << tools::coloured(tools::kBold, name, colour);
    if (!plan.program.empty()) {
        out << " (" << tools::printable(plan.program) << ')';
    }
    out << '\n';
    if (plan.state != watching::kept) {
        writenotasked(out, plan);
        return;
    }
    writeasking(out, plan);
    writerecovery(out, plan);
    for (const outageplan& outage : plan.outages) {
        writeoutage(out, plan, outage);
    }
}

// What holds for every target.
void writehead(std::ostream& out, const std::vector<targetplan>& plan)
{
    out << counted(static_cast<long long>(plan.size()), "target", "targets")
        << "; a refresh comes every " << plan.front().refresh << " s (-t).\n"
        << "Times are at worst, and count the pauses only: what the commands themselves take "
           "comes\n"
        << "on top, and they have no time limit. The worst is a failure just after the service "
           "was\n"
        << "found well; while a refresh waits for a failing service, nobody asks the others.\n"
        << "A service that its status command does not know is not watched until the next refresh\n"
        << "(ERROR \"..., unrecognized service.\"); a check that is missing itself restarts "
           "nothing\n"
        << "(ERROR \"..., unrecognized command.\").\n";
}

} // namespace

void writeplan(std::ostream& out, const std::vector<targetplan>& plan, bool colour)
{
    if (plan.empty()) {
        out << "Nothing is watched: the file has no target that the daemon sees, or its load "
               "fails.\n";
        return;
    }
    writehead(out, plan);
    for (const targetplan& target : plan) {
        writetarget(out, target, colour);
    }
}

} // namespace check
