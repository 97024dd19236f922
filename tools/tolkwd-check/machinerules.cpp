#include "ruletables.h"

#include <array>

namespace check {

namespace {

constexpr std::array<rule, 8> kRules{{
    {"binary-blank", "a program's path that the shell takes apart",
     "binarypath stands in the shell command `pidof PATH`: a blank makes two words of it, "
     "and other characters mean something to the shell. A blank in the name of the process "
     "also shifts the fields of /proc/PID/stat, so that the thresholds are compared with "
     "other figures. Give the program a name of letters, digits and . _ + -.",
     "<binarypath>/opt/my web/webd</binarypath>", "<binarypath>/opt/my-web/webd</binarypath>"},
    {"binary-missing", "the program is not on this machine",
     "binarypath is the program whose process is compared with the thresholds, by its "
     "path, or by its name on the PATH. Where pidof finds no process of it, nor of its "
     "last component, each check writes an ERROR line and the thresholds see nothing. A "
     "relative path is looked at from /.",
     "<binarypath>/usr/sbin/ngnix</binarypath>", "<binarypath>/usr/sbin/nginx</binarypath>"},
    {"binary-script", "the program is a script",
     "pidof does not find a script: its process is that of its interpreter. Each check "
     "writes an ERROR line, and the thresholds see nothing. Name the program that the "
     "script ends up as, or write 0 for MaxFPSkips.",
     "<binarypath>/etc/init.d/web</binarypath>", "<binarypath>/usr/sbin/webd</binarypath>"},
    {"command-missing", "a command names a program that is not on this machine",
     "The first word of each part of a command is looked up where the daemon's unit and "
     "init script look: /usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin. A "
     "check that is missing is a failed one where the shell says \"not found\", as "
     "Debian's does: a healthy service is restarted. Behind timeout it is reported as "
     "missing, and nothing is restarted. A start or stop command that is missing does "
     "nothing, without a word. What the checker cannot follow it leaves out.",
     "<functionalpingcmd>chekc-web</functionalpingcmd>",
     "<functionalpingcmd>timeout -k 1 10 check-web</functionalpingcmd>"},
    {"password-readable",
     "a command that seems to carry a password, in a file that others can read",
     "Commands stand in the configuration, with -g also in the log and in the journal, and while "
     "they run in the list of processes. The forms that are looked for: password=VALUE at the end "
     "of "
     "any name, and so passwd=, passphrase=, secret=, token=, _PWD= and _AUTH=; --password VALUE "
     "and "
     "--pass VALUE; -p of mysql and mariadb, -a of redis-cli, -u of curl; NAME:VALUE@ in a URL. "
     "What "
     "the shell puts in, as of $(cat FILE), is no password. The value is not shown, nor its line. "
     "chmod 600 the configuration, and keep the password in a file of root's.",
     "<functionalpingcmd>(redis-cli -a tiger ping | grep -q PONG && echo service: ok)"
     "</functionalpingcmd>",
     "<functionalpingcmd>(REDISCLI_AUTH=$(cat /root/redis-password) redis-cli ping | grep -q PONG "
     "&& "
     "echo service: ok)</functionalpingcmd>"},
    {"ping-folder", "the folder for what pings print is missing",
     "Status commands and checks write into /opt/varden/tolk/bin. Without it the shell "
     "runs none of them: every ping fails, and every service is stopped, started and given "
     "up. The package makes it; the daemon does not.",
     "rmdir /opt/varden/tolk/bin", "mkdir -p /opt/varden/tolk/bin"},
    {"unknown-service", "this machine has no service of that name",
     "The service command finds an init script /etc/init.d/NAME or a unit NAME.service. "
     "Where there is neither, an init system of the old kind says \"unrecognized service\" "
     "and it is not watched; systemd's answer counts as a failure, and it is recovered in "
     "vain and given up. A dependent service with commands of its own needs no such thing.",
     "<name>ngnix</name>", "<name>nginx</name>"},
    {"writable-file", "others than root can write what the daemon reads or runs as root",
     "Whoever can write the configuration, a program or script that it names, the folder of what "
     "pings print, or any folder above one of them, up to /, can have root run what he likes. "
     "Symbolic links are followed, and so are the folders above them. A folder with the sticky "
     "bit, such as /tmp, does not count where what the path goes on to is root's, for others can "
     "add to it, but not replace that; as the folder of what pings print it counts. Who is not "
     "root and checks a file of his own gets a note only, for it is mostly a draft.",
     "chmod 666 /etc/opt/varden/tolk/tolkwd.xml", "chmod 644 /etc/opt/varden/tolk/tolkwd.xml"},
}};

} // namespace

std::span<const rule> machinerules() noexcept
{
    return kRules;
}

} // namespace check
