"""The package from its installation to its purge, on a machine with systemd and on one without."""

import collections
import json

from product import (CONFIGURATION, DEFAULTS, DISABLE, ENABLE, EXAMPLE, LOG, PINGS, WATCH_CRON,
                     configure, daemon, enabled, install, set_up, upgrade, watching)

# systemd restarts the daemon after 10 seconds, and first gives the checker 20 at most. The rest is
# for a busy computer.
RESTART_LIMIT_SECONDS = 40

# Leaves a process behind when it is run for the first time.
CHECK_THAT_LEAVES_A_PROCESS = """#!/bin/sh
[ -e /run/left.pid ] || { sleep 1000 >/dev/null 2>&1 & echo $! >/run/left.pid; }
echo service: ok
"""

ASK_MEMCACHED = r"""#!/bin/bash
exec 3<>/dev/tcp/127.0.0.1/11211 && printf 'version\r\n' >&3 && read -r answer <&3 &&
    echo "service: ${answer%$'\r'}"
"""


def write_program(machine, name, text):
    machine.write(name, text)
    machine.run(f"chmod 755 {name}")


def process(machine, program):
    """The process id of the service that has this program."""
    return machine.run(f"pidof {program}").strip()


def journal(machine, form="cat"):
    """What the journal has of the unit, systemd's own lines included."""
    return machine.run(f"journalctl --sync && journalctl --unit tolkwd --output {form}")


def report_events(machine, log, given=""):
    """What the report tells of cron up to its recovery, but for the line of each event."""
    told = json.loads(machine.run(f"tolkwd-report events --all --service cron --json {log}",
                                  given=given))
    events = [{**event, "line": None} for event in told["events"]]
    return events[:[event["kind"] for event in events].index("recovered") + 1]


def test_without_a_configuration_nothing_is_enabled_or_started(machine, package):
    assert "there is no configuration yet" in install(machine, package)
    assert not enabled(machine)
    if machine.kind == "systemd":
        machine.run("systemctl start tolkwd")
        assert (f"was skipped because of an unmet condition check (ConditionPathExists="
                f"{CONFIGURATION})") in journal(machine)
    else:
        assert f"there is no {CONFIGURATION}" in machine.run("service tolkwd start", expect=6)
    machine.run("service tolkwd status", expect=3)


def test_a_killed_daemon(machine, package):
    set_up(machine, package)
    killed = daemon(machine)
    machine.run(f"kill -KILL {killed}; rm {LOG}")
    machine.await_success(f"! kill -0 {killed}")
    if machine.kind == "systemd":
        machine.await_success(
            "pid=$(systemctl show --property MainPID --value tolkwd);"
            f" [ $pid != 0 ] && [ $pid != {killed} ]", seconds=RESTART_LIMIT_SECONDS)
    else:
        # Nothing restarts it.
        assert "it has ended by itself" in machine.run("service tolkwd status", expect=1)
        machine.run("service tolkwd start")
    machine.await_line(LOG, "General ping successful!")
    machine.run("service tolkwd status")
    assert daemon(machine) != killed


def test_a_killed_service_is_recovered(machine, package):
    set_up(machine, package)
    killed = process(machine, "cron")
    # After another signal, systemd itself would restart cron.
    machine.run(f"kill -{'TERM' if machine.kind == 'systemd' else 'KILL'} {killed}")
    machine.await_line(LOG, "this service has been general recoverred successfully.")
    machine.run("service cron status")
    assert process(machine, "cron") != killed

    told = json.loads(machine.run("tolkwd-report status --json"))
    service, = told["services"]
    assert (service["service"], service["state"], service["outages"]) == ("cron", "up", 1)
    if machine.kind == "systemd":
        the_journal_tells_the_same(machine)


def the_journal_tells_the_same(machine):
    """The report finds the same in each form of the journal that it understands as in the log."""
    # Blanks at the end of a line do not get into the journal.
    logged = collections.Counter(line.rstrip() for line in machine.read(LOG).splitlines())
    lines = journal(machine).splitlines()
    assert logged - collections.Counter(lines) == {}
    assert any(line.endswith("[unbounded-command]") for line in lines)  # said by the checker
    expected = report_events(machine, LOG)
    for form in ("cat", "short", "export"):
        assert report_events(machine, "-", given=journal(machine, form)) == expected, form


def test_a_service_that_hangs_is_recovered(machine, package):
    write_program(machine, "/usr/local/sbin/ask-memcached", ASK_MEMCACHED)
    set_up(machine, package, watching("memcached", "/usr/bin/memcached",
                                      "timeout -k 1 2 /usr/local/sbin/ask-memcached"))
    machine.await_line(LOG, "correct functional ping")
    hanging = process(machine, "memcached")
    machine.run(f"kill -STOP {hanging}; service memcached status")
    machine.await_line(LOG, "this service has been successfully functional recovered.")
    assert process(machine, "memcached") != hanging
    assert "service: VERSION" in machine.run("/usr/local/sbin/ask-memcached")


def test_an_upgrade_replaces_the_daemon_and_nothing_else(machine, package, tmp_path):
    write_program(machine, "/usr/local/sbin/check", CHECK_THAT_LEAVES_A_PROCESS)
    set_up(machine, package, watching("cron", "/usr/sbin/cron", "/usr/local/sbin/check"))
    machine.await_line("/run/left.pid", "")
    machine.write(EXAMPLE, "edited\n")
    edited = {name: machine.read(name) for name in (CONFIGURATION, DEFAULTS, EXAMPLE)}
    replaced, watched = daemon(machine), process(machine, "cron")

    upgrade(machine, package, tmp_path)
    machine.run("service tolkwd status")
    assert daemon(machine) != replaced
    assert process(machine, "cron") == watched
    machine.run("kill -0 $(cat /run/left.pid)")
    assert {name: machine.read(name) for name in edited} == edited


def test_an_upgrade_starts_and_enables_nothing(machine, package, tmp_path):
    set_up(machine, package)
    machine.run("service tolkwd stop")
    upgrade(machine, package, tmp_path)
    machine.run("service tolkwd status", expect=3)
    assert enabled(machine)

    machine.run(f"service tolkwd start && {DISABLE[machine.kind]}")
    machine.run("dpkg --install /newer.deb")
    machine.run("service tolkwd status", expect=3)
    assert not enabled(machine)


def test_removal_keeps_what_operators_wrote_and_purging_nothing(machine, package):
    fresh = machine.files()
    set_up(machine, package)
    written = {name: machine.read(name) for name in (CONFIGURATION, DEFAULTS, EXAMPLE)}
    removed, watched = daemon(machine), process(machine, "cron")

    machine.run("dpkg --remove tolkwd")
    machine.run(f"kill -0 {removed}", expect=1)
    assert process(machine, "cron") == watched
    assert {name: machine.read(name) for name in written} == written
    assert not machine.exists(PINGS)
    assert not machine.exists("/usr/sbin/tolkwd")
    if machine.kind == "systemd":
        assert "masked" in machine.run("systemctl is-enabled tolkwd", expect=1)

    machine.run("dpkg --install /package.deb")
    machine.run("service tolkwd status")
    assert enabled(machine)

    machine.run("rm /package.deb && dpkg --purge tolkwd")
    assert process(machine, "cron") == watched
    left = machine.files()
    assert left - fresh == set()
    # dpkg removes a folder that is empty and no other package's.
    assert fresh - left <= {"/etc/opt", "/opt"}


def test_wrong_options_are_reported_and_not_tried_again(machine, package):
    install(machine, package)
    configure(machine, WATCH_CRON, "-t -n")
    message = "'-t' used but no check time specified"
    if machine.kind == "systemd":
        machine.run(ENABLE["systemd"])
        machine.await_success("systemctl show --property ExecMainStatus tolkwd | grep '=2$'")
        state = machine.run("systemctl show --property ActiveState,SubState --value tolkwd")
        assert state.split() == ["failed", "failed"]
        assert message in journal(machine)
    else:
        assert message in machine.run(ENABLE["sysv"], expect=1)
        assert "it has ended by itself" in machine.run("service tolkwd status", expect=1)
