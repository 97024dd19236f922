#include "ruletables.h"

#include <array>

namespace check {

namespace {

constexpr std::array<rule, 5> kRules{{
    {"probe-busy", "a figure of the process is above its threshold now",
     "With --probe. A service whose process is above one of its thresholds counts as busy, and the "
     "daemon leaves its check out, as often in a row as MaxFPSkips says. There is no value for "
     "\"off\": a threshold that is left out or no number is 0, and above it is every process. If "
     "the service is no busier now than it always is, raise the threshold above what it mostly "
     "needs; to leave a figure out, give a number that it cannot reach.",
     "<ThresholdThreadCount>10</ThresholdThreadCount>   for a service that has 12 threads",
     "<ThresholdThreadCount>200</ThresholdThreadCount>"},
    {"probe-check", "the check of a running service fails",
     "With --probe. The service runs, and the first line that its check prints does not say that "
     "it works; its exit status does not count. The daemon would make three more checks and then "
     "stop and start the service. If the line says that the command is missing, it does nothing at "
     "all, whatever becomes of the service. Run the check by hand, as root: it has to print "
     "\"service: ok\", or another of the words of tolkwd.xml(5), when all is well.",
     "<functionalpingcmd>curl -s http://127.0.0.1/</functionalpingcmd>",
     "<functionalpingcmd>(curl -fs -o /dev/null http://127.0.0.1/ && echo service: "
     "ok)</functionalpingcmd>"},
    {"probe-process", "the process of a running service is not found",
     "With --probe. The service runs, but pidof finds no process of its binarypath. The daemon "
     "then writes an ERROR line at each check and compares the last figures that it has, at first "
     "0, with the thresholds: the service never counts as busy, or always. Give the path of the "
     "program as /proc/PID/exe shows it; of a script, the process is its interpreter's. If the "
     "thresholds are not to count, set MaxFPSkips to 0.",
     "<binarypath>/etc/init.d/nginx</binarypath>", "<binarypath>/usr/sbin/nginx</binarypath>"},
    {"probe-status", "the status command does not say that the service runs",
     "With --probe. What `service NAME status` says on its first line, and where that holds none "
     "of the words of tolkwd.xml(5), its exit status, tells the daemon whether the service runs. "
     "If it does not, the daemon would ping three more times and then start it, and if the answer "
     "is not clear, stop it before. If the answer is that the system does not know the service, "
     "the daemon watches it no more until its next refresh. Correct the name, or start the "
     "service.",
     "<name>ngnix</name>", "<name>nginx</name>"},
    {"probe-users", "processes of several users count as the service's",
     "With --probe. pidof finds the processes of a program whoever started them, and the daemon "
     "compares the first one with the thresholds. A user who runs the program with many threads "
     "makes the service count as busy: its check is left out as often in a row as MaxFPSkips says, "
     "and a check that is left out counts as a success. Write 0 for MaxFPSkips where users are not "
     "trusted. A process that another one of them started, as a master starts its workers, is no "
     "reason for this warning.",
     "<MaxFPSkips>5</MaxFPSkips>", "<MaxFPSkips>0</MaxFPSkips>"},
}};

} // namespace

std::span<const rule> proberules() noexcept
{
    return kRules;
}

} // namespace check
