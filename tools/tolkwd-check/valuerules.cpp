#include "ruletables.h"

#include <array>

namespace check {

namespace {

constexpr std::array<rule, 22> kRules{{
    {"attempts-negative",
     "a negative number of recoveries: nothing is asked, a processor is kept busy",
     "With a negative maxattemptofwakeup the monitor asks nothing, gives nothing up, and "
     "turns without a pause: it keeps one processor busy. There is no value for \"without "
     "end\". Write 2 or more.",
     "<maxattemptofwakeup>-1</maxattemptofwakeup>", "<maxattemptofwakeup>3</maxattemptofwakeup>"},
    {"attempts-one", "the service is given up even if its recovery worked",
     "After the last recovery that maxattemptofwakeup allows, the service is given up "
     "until the next refresh without another ping. With 1 the first recovery is the last "
     "one: a service that runs again is not watched any more. Write 2 or more.",
     "<maxattemptofwakeup>1</maxattemptofwakeup>", "<maxattemptofwakeup>3</maxattemptofwakeup>"},
    {"attempts-zero", "no recovery is allowed, so the service is never asked",
     "With a maxattemptofwakeup of 0 the daemon asks the service nothing and gives it up "
     "at once. Write one more than the recoveries that are to be relied on: 2 or more.",
     "<maxattemptofwakeup>0</maxattemptofwakeup>", "<maxattemptofwakeup>3</maxattemptofwakeup>"},
    {"check-output", "a check whose output does not go where the daemon reads it",
     "The daemon appends 1>FILE 2>FILE to the check and reads the first line of FILE. Of "
     "several commands in a row only the last one has that redirection; where it does not "
     "run, FILE still holds the answer before. Behind a comment, \"&\" or \";\" it belongs "
     "to nothing. Put the whole check in parentheses.",
     "<functionalpingcmd>timeout 5 probe && echo service: ok</functionalpingcmd>",
     "<functionalpingcmd>(timeout 5 probe && echo service: ok)</functionalpingcmd>"},
    {"conflicting-commands", "one service, and different commands to start or stop it",
     "A service that several targets name, one of them as its own and others as a "
     "dependent, has its commands in each. Where they differ, which one is run depends on "
     "the target that is recovered. Mostly one was changed and the other forgotten.",
     "<startcmd>service web start</startcmd> here, <startcmd>/opt/web/run</startcmd> there",
     "<startcmd>/opt/web/run</startcmd> in both"},
    {"dependent-not-started", "a dependent service is stopped and not started again",
     "A recovery stops each dependent service and starts it again. With a startcmd that "
     "does nothing, or that is the stopcmd once more, it stays stopped, and nobody watches "
     "it. Write the command that starts it.",
     "<startcmd>timeout -k 5 60 service web stop</startcmd>",
     "<startcmd>timeout -k 5 60 service web start</startcmd>"},
    {"duplicate-service", "two targets watch one service",
     "Two targets of one name share the files of their pings, so that each may read the "
     "other's answer, and both recover the service: it is stopped and started twice. Name "
     "each service in one target.",
     "<name>web</name> in two wdmonitorservice elements", "<name>web</name> in one of them"},
    {"empty-command", "a command that does nothing",
     "A command such as \":\" or \"true\" is run and does nothing. As startcmd, it leaves "
     "the service stopped after a recovery. As functionalpingcmd, it prints nothing, which "
     "is a failed check: the service is restarted until it is given up. Write NULL for the "
     "usual command, or for no check.",
     "<functionalpingcmd>true</functionalpingcmd>", "<functionalpingcmd>NULL</functionalpingcmd>"},
    {"interval-zero", "the service is asked without a pause",
     "genpinginterval is the pause at the end of each round. Where it is 0, and no check "
     "with a funpinginterval makes another one, one status command follows the other "
     "without end, which costs a processor and holds up recoveries. Write the seconds "
     "between two rounds.",
     "<genpinginterval>0</genpinginterval>", "<genpinginterval>60</genpinginterval>"},
    {"lock-starved", "too many pings and checks at once for a recovery to get its turn",
     "A recovery begins when no status command and no check is under way, and new ones may "
     "begin while it waits. Add up, over all targets, how long both take, divided by the "
     "length of a round: from 1 on a recovery waits about as long as a check takes, from 8 "
     "on mostly for ever. Without --probe their lengths are guessed. Take longer "
     "intervals, or shorter checks.",
     "<genpinginterval>1</genpinginterval> for a hundred services",
     "<genpinginterval>60</genpinginterval> for each of them"},
    {"name-keyword", "a name that holds a word by which status lines are rated",
     "The first line of a status command is searched for running, not, stopped, unused and "
     "other words, also inside the service's name: \"notifyd is running\" holds \"not\" "
     "and counts as a service that does not run, which is then recovered and given up. "
     "Give the service another name, for instance by a link to its init script or an "
     "Alias= of its unit.",
     "<name>notifyd</name>", "<name>messaged</name>"},
    {"negative-number", "a negative interval or threshold",
     "A negative interval makes no pause. A negative threshold is below every figure, so "
     "that the service always counts as busy and its checks are left out. There is no "
     "value for \"off\": to leave a figure out, write a number that it cannot reach.",
     "<ThresholdThreadCount>-1</ThresholdThreadCount>",
     "<ThresholdThreadCount>2147483647</ThresholdThreadCount>"},
    {"not-a-number", "a number with no digits at its beginning, or with more than digits",
     "The daemon reads the digits at the beginning of the value and ignores what follows: "
     "60s is 60, 1.5 is 1, 0x10 is 0. Text that begins with something else is 0. Neither "
     "is reported. Write digits only.",
     "<genpinginterval>1m</genpinginterval>", "<genpinginterval>60</genpinginterval>"},
    {"nul-byte", "a command with a byte of value 0, which ends it",
     "The shell gets a command up to its first byte of value 0. A check loses what the daemon "
     "appends to it, too, 1>FILE 2>FILE: what it prints is not read. Such a byte is shown as "
     "\\x00. Take it out.",
     "<startcmd>service web\\x00 start</startcmd>", "<startcmd>service web start</startcmd>"},
    {"null-spelling", "a spelling of NULL that is run as a command",
     "Only the four letters NULL mean that there is no command of one's own. \"null\", "
     "\"none\" or \"-\" is handed to the shell, which knows no such program: the service "
     "is not started or not stopped, and a check of that kind fails for ever. Write NULL.",
     "<stopcmd>none</stopcmd>", "<stopcmd>NULL</stopcmd>"},
    {"number-range", "a number that is too large",
     "MaxFPSkips or a threshold beyond 2147483647 becomes that number, and an interval beyond "
     "4294967295 seconds becomes that long a pause, in which nothing is asked. So many "
     "recoveries as a maxattemptofwakeup beyond 2147483647 allows are never used up. Write "
     "the number that is meant.",
     "<genpinginterval>60000000000</genpinginterval>", "<genpinginterval>60</genpinginterval>"},
    {"service-name", "a name that the shell or the file system takes otherwise",
     "The name stands in `service NAME status`, which the shell runs as root, and in the "
     "name of the file agent.NAME. Blanks, slashes and what the shell understands break "
     "both, or run something else. Letters, digits and . _ @ : + - are safe; a - at the "
     "beginning would be an option.",
     "<name>web server</name>", "<name>web</name>"},
    {"shared-ping-file", "two services write their answers to one file",
     "A status command's answer goes to agent.NAME, a check's to "
     "agent.functionalping.NAME. The status of a service called functionalping.web and the "
     "check of web so share a file, and each may be rated by the other's answer. Rename "
     "one of them.",
     "<name>functionalping.web</name>", "<name>web-check</name>"},
    {"skips-negative", "checks are left out without end while the service is busy",
     "MaxFPSkips is how many checks in a row may be left out because the service is above "
     "a threshold. No count is ever negative, so a negative limit is never met: a service "
     "that stays busy, or hangs with a full processor, is never checked. Write 0 or more.",
     "<MaxFPSkips>-1</MaxFPSkips>", "<MaxFPSkips>5</MaxFPSkips>"},
    {"threshold-unit", "a threshold that seems to be in another unit",
     "ThresholdAverageCPUUsage counts 1000 for each per cent of one processor, and "
     "ThresholdMemoryUsage counts pages, mostly of 4096 bytes. A number of per cent is far "
     "too small, so that checks are left out, and a number of bytes is never reached.",
     "<ThresholdAverageCPUUsage>90</ThresholdAverageCPUUsage>",
     "<ThresholdAverageCPUUsage>90000</ThresholdAverageCPUUsage>"},
    {"threshold-zero", "a threshold of 0, which is always passed",
     "0 does not switch a threshold off. Threads and memory of a live process are above "
     "it, and so is its processor time with the first tick: the service counts as busy, "
     "and its check is left out as often as MaxFPSkips allows. A check left out counts "
     "as a good one: behind a recovery it is reported as recovered, though nothing has "
     "shown it, and the service is never given up. To leave a figure out, write a number "
     "that it cannot reach.",
     "<ThresholdMemoryUsage>0</ThresholdMemoryUsage>",
     "<ThresholdMemoryUsage>2147483647</ThresholdMemoryUsage>"},
    {"unbounded-command", "a command without a time limit",
     "Commands have no time limit of their own. A check that hangs keeps every recovery "
     "waiting; a start or stop command that hangs stops all watching. NULL is `service "
     "NAME start` or `stop`, without a limit either. Write timeout -k 5 60 before the "
     "command.",
     "<startcmd>NULL</startcmd>", "<startcmd>timeout -k 5 60 service web start</startcmd>"},
}};

} // namespace

std::span<const rule> valuerules() noexcept
{
    return kRules;
}

} // namespace check
