"""Services that the daemon starts write lines like its own into the journal: which of them pass
which filter, and that the one in doc/OPERATING.md passes the daemon's lines only."""

import collections
import re

import pytest

from product import LOG, configure, install, watching
from systems import PROJECT

pytestmark = pytest.mark.parametrize("kind", ["systemd"], indirect=True, scope="session")

PROGRAM = "/opt/varden/tolk/bin/tolkwd"
FORGERS = {"root", "user", "program", "was-root", "was-root-program", "stream"}

# Runs the forgers. All but the last write to the standard output that they inherit; that one opens
# a stream to the journal itself. "program" is an ordinary user who runs the daemon's program. What
# begins with "was-root" prints a line as root and then drops its rights, while the journal is held
# up: it reads in /proc what a process is only when it gets to its lines.
START = f"""#!/bin/bash
[ ! -e /run/forged ] || exit 0
say() {{
    echo "$(date '+%a %b %d %T %Y') ERROR wdmonitorthread|TID1 Failed to recover the sevice $1"
}}
export -f say
journal=$(systemctl show --property MainPID --value systemd-journald)
as_nobody=(setpriv --reuid nobody --clear-groups)
run_tolkwd() {{ # NAME COMMAND...: runs COMMAND with the daemon's arguments until it has logged NAME
    local log
    log=$(mktemp --dry-run) # which nobody makes
    "${{@:2}}" {PROGRAM} -i "/run/$1.xml" -l "$log" -g &
    until grep -qs "$1" "$log"; do sleep 0.05; done
    kill -CONT "$journal"
    journalctl --sync
    kill $!
    wait $!
    rm "$log"
}}
as_nobody_after_a_line() {{ echo starting; exec "${{as_nobody[@]}}" "$@"; }}

bash -c 'say root'
"${{as_nobody[@]}}" bash -c 'say user'
run_tolkwd program "${{as_nobody[@]}}"
kill -STOP "$journal"
(as_nobody_after_a_line bash -c 'say was-root')
run_tolkwd was-root-program as_nobody_after_a_line
"${{as_nobody[@]}}" systemd-cat --identifier tolkwd bash -c 'say stream; exec sleep infinity' &
touch /run/forged
"""


def start_forgers(machine, package, redirection=""):
    """Has the daemon run the forgers in a recovery, with this redirection of their output."""
    install(machine, package)
    machine.write("/usr/local/sbin/start-forgers", START)
    for name in ("program", "was-root-program"):
        machine.write(f"/run/{name}.xml", watching(name, "/usr/bin/nothing"))
    # The marks of an installation, which a program that an ordinary user runs cannot set.
    machine.run("chmod 755 /usr/local/sbin/start-forgers"
                " && touch /etc/opt/varden/tolk/cimom /etc/opt/varden/tolk/wd.nxinstalled")
    configuration = watching("forgers", "/usr/bin/nothing").replace(
        "<startcmd>NULL<", f"<startcmd>/usr/local/sbin/start-forgers{redirection}<")
    configure(machine, configuration, "-g")
    machine.run("systemctl start tolkwd")
    machine.await_success("test -e /run/forged")
    machine.await_line(LOG, "Exit of general recover after release write lock")
    machine.await_success("journalctl --sync && journalctl --identifier tolkwd | grep 'e stream$'")


def lines(machine, filtering):
    return machine.run(f"{filtering} --output cat").splitlines()


def forgers(found):
    """Who of them wrote one of these lines: an error, or a line of the listing."""
    pattern = re.compile(rf"(?:sevice |\*:)({'|'.join(FORGERS)})$")
    return {match[1] for line in found if (match := pattern.search(line))}


def documented_filter():
    guide = (PROJECT / "doc" / "OPERATING.md").read_text()
    command, = re.findall(r"^```sh\n(journalctl _PID=.*?)\n```$", guide, re.M | re.S)
    return command


def test_the_documented_filter_passes_the_daemons_lines_only(machine, package):
    start_forgers(machine, package)
    logged = collections.Counter(line.rstrip() for line in machine.read(LOG).splitlines())
    passed = collections.Counter(lines(machine, documented_filter()))
    logged_since = collections.Counter(line.rstrip() for line in machine.read(LOG).splitlines())
    assert sum(logged.values()) > 0
    assert logged - passed == {}
    assert passed - logged_since == {}


def test_no_other_filter_keeps_all_forgers_out(machine, package):
    start_forgers(machine, package)
    unit = "journalctl _SYSTEMD_UNIT=tolkwd.service"
    assert forgers(lines(machine, "journalctl --unit tolkwd")) == FORGERS
    assert forgers(lines(machine, f"{unit} _UID=0")) == {"root", "was-root", "was-root-program"}
    assert forgers(lines(machine, f"{unit} _EXE={PROGRAM}")) == {"program", "was-root-program"}
    assert forgers(lines(machine, f"{unit} _UID=0 _EXE={PROGRAM}")) == {"was-root-program"}


def test_a_redirection_keeps_out_what_is_printed(machine, package):
    start_forgers(machine, package, " >/dev/null 2>&1")
    assert forgers(lines(machine, "journalctl --unit tolkwd")) == {"stream"}
