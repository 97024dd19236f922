"""What a probe does to the machine: run in a sandbox, with an invented service command."""

import dataclasses
import json
import os
import pathlib
import signal
import subprocess
import time

import pytest

import terminal
from configurations import configuration

PROJECT = pathlib.Path(__file__).resolve().parents[2]
LIMIT_SECONDS = 60

# Other rules have tests of their own.
ALONE = """
others=$(tolkwd-check --rules | sed '/^probe-/d; s/ .*//; s/^/--allow /')
"""

# Writes down how it is called, and goes on as the file of that service says.
SERVICE = """#!/bin/sh
echo "$*" >>/opt/stage/calls
[ ! -e "/opt/stage/$1" ] || . "/opt/stage/$1"
"""

KEYS = {
    "binarypath": "/usr/sbin/no-such-program",
    "startcmd": "touch /opt/stage/started",
    "stopcmd": "touch /opt/stage/stopped",
}


@dataclasses.dataclass
class Sandbox:
    """A machine with nothing but a service command that obeys the test."""

    program: pathlib.Path
    stage: pathlib.Path

    def service(self, name, script):
        """What `service NAME status` does: lines of a shell script."""
        (self.stage / name).write_text(script)

    def configure(self, *targets):
        """The file; a target is a dictionary of the keys that it sets, and its name."""
        (self.stage / "tolkwd.xml").write_text(
            configuration(*({**KEYS, **target} for target in targets)))

    def command(self, shell):
        """The command line that runs these lines of shell in the sandbox."""
        return [PROJECT / "scripts" / "sandbox.sh", "--bind", self.stage, "/opt/stage",
                "--ro-bind", self.program, "/opt/program/tolkwd-check",
                "--ro-bind", self.stage / "bin", "/usr/local/sbin",
                "--setenv", "PATH", "/opt/program:/usr/local/sbin:/usr/sbin:/usr/bin:/sbin:/bin",
                "--", "/bin/bash", "-c",
                "mkdir -p /opt/varden/tolk/bin\n" + ALONE + shell + "\nstatus=$?\n"
                "find /tmp /opt/varden/tolk/bin ! -type d >/opt/stage/left\n"
                "ls -d /tmp/* >>/opt/stage/left 2>/dev/null\n"
                "exit $status\n"]

    def run(self, arguments, answer=b""):
        return subprocess.run(self.command(f"tolkwd-check {arguments}"), input=answer,
                              capture_output=True, timeout=LIMIT_SECONDS)

    def text(self, name):
        path = self.stage / name
        return path.read_text() if path.exists() else ""

    def calls(self):
        return self.text("calls").splitlines()

    def untouched(self):
        """Whether no service was started or stopped, and no file was left behind."""
        assert all(call.endswith(" status") for call in self.calls())
        assert not (self.stage / "started").exists()
        assert not (self.stage / "stopped").exists()
        return self.text("left") == ""


@pytest.fixture
def sandbox(program, tmp_path):
    command = tmp_path / "bin" / "service"
    command.parent.mkdir()
    command.write_text(SERVICE)
    command.chmod(0o755)
    return Sandbox(program, tmp_path)


PROBE = "$others --probe --yes /opt/stage/tolkwd.xml"


def test_tells_what_each_service_and_each_check_answers(sandbox):
    sandbox.service("web", "echo web is running")
    sandbox.service("mail", "echo mail is not running; exit 3")
    sandbox.service("gone", "echo gone: unrecognized service; exit 1")
    sandbox.configure(
        {"name": "web", "functionalpingcmd": "echo I cannot say that it is running"},
        {"name": "mail", "functionalpingcmd": "timeout 5 /no/such/check"},
        {"name": "gone"})
    played = sandbox.run(PROBE)
    findings, report = played.stdout.decode().split("\n\n")
    assert played.returncode == 2
    assert [line.split("[")[-1] for line in findings.splitlines() if line.endswith("]")] == [
        "probe-check]", "probe-status]", "probe-status]"]
    assert 'running: contains "running" and not "not"   (exit status 0, ' in report
    assert 'fails: contains "running", but also "not" inside "cannot"   (' in report
    assert 'not running: contains "not" and "running"   (exit status 3, ' in report
    assert 'missing, nothing would be done: contains " No such file or directory"   (' in report
    assert 'unknown, its monitor would end: contains "unrecognized"   (exit status 1, ' in report
    assert played.stderr == b""
    assert sandbox.calls() == ["web status", "mail status", "gone status"]
    assert sandbox.untouched()


def test_a_daemons_answers_stay_as_they_are(sandbox):
    sandbox.service("web", "file=$(readlink /proc/$$/fd/1); echo $file >/opt/stage/output\n"
                           "echo web is running")
    sandbox.configure({"name": "web"})
    command = sandbox.command(
        "echo daemon >/opt/varden/tolk/bin/agent.web\n"
        f"tolkwd-check {PROBE} || exit\n"
        "cat /opt/varden/tolk/bin/agent.web; rm /opt/varden/tolk/bin/agent.web\n")
    played = subprocess.run(command, capture_output=True, timeout=LIMIT_SECONDS)
    assert played.stdout.endswith(b"\ndaemon\n")
    assert sandbox.text("output").startswith("/tmp/tolkwd-check.")
    assert sandbox.untouched()


def test_the_folder_of_the_answers_is_for_nobody_else(sandbox):
    sandbox.service("web", "echo web is running; stat -c %a /tmp/tolkwd-check.* >/opt/stage/mode")
    sandbox.configure({"name": "web"})
    assert sandbox.run(PROBE).returncode == 0
    assert sandbox.text("mode") == "700\n"


@pytest.mark.parametrize("answer", [b"n\n", b"", b"\n", b"nonsense\n"])
def test_nothing_is_run_unless_the_answer_is_yes(sandbox, answer):
    sandbox.configure({"name": "web", "functionalpingcmd": "touch /opt/stage/started"})
    played = sandbox.run("--probe /opt/stage/tolkwd.xml", answer)
    assert played.returncode == 64
    assert played.stdout == b""
    assert played.stderr == (
        b'The checks:\n  "touch /opt/stage/started"\n'
        b"This runs 2 commands as root (1 status command, 1 check), and pidof for 1 program. "
        b"Go on? [y/N] \nnothing was run\n")
    assert sandbox.calls() == []
    assert sandbox.untouched()


@pytest.mark.parametrize("answer", [b"y\n", b"yes\n"])
def test_what_the_answer_yes_allows_is_run(sandbox, answer):
    sandbox.service("web", "echo web is running")
    sandbox.configure({"name": "web"})
    assert sandbox.run("$others --probe /opt/stage/tolkwd.xml", answer).returncode == 0
    assert sandbox.calls() == ["web status"]


def test_standard_input_cannot_be_both_the_file_and_the_answer(sandbox):
    sandbox.configure({"name": "web"})
    played = sandbox.run("--probe - </opt/stage/tolkwd.xml")
    assert played.returncode == 64
    assert b"give --yes" in played.stderr
    assert sandbox.calls() == []
    assert sandbox.run("$others --probe --yes - </opt/stage/tolkwd.xml").returncode == 0
    assert sandbox.calls() == ["web status"]


def test_a_file_without_targets_is_not_asked_about(sandbox):
    (sandbox.stage / "tolkwd.xml").write_text("<?xml version='1.0'?>\n<wdtargets>\n</wdtargets>\n")
    played = sandbox.run("--probe /opt/stage/tolkwd.xml")
    assert b"Go on?" not in played.stderr
    assert sandbox.calls() == []


def test_other_programs_get_nothing_but_json(sandbox):
    # What the daemon's functions log about a process that ends meanwhile is no part of it, nor is
    # what commands write elsewhere than to the file that is read.
    sandbox.service("web", "echo stray >/proc/1/fd/1; echo web is running")
    sandbox.service("odd", r"printf '\033[2J\377 is running\n'")
    sandbox.configure({"name": "web", "functionalpingcmd": "echo stray; false; echo service: ok",
                       "MaxFPSkips": "3"}, {"name": "odd"})
    command = sandbox.command(f"tolkwd-check --json {PROBE} 1>/opt/stage/json")
    subprocess.run(command, stdout=subprocess.DEVNULL, timeout=LIMIT_SECONDS)
    result = json.loads((sandbox.stage / "json").read_bytes())
    web, odd = result["probe"]
    assert web["status"]["result"] == "running"
    assert web["check"]["result"] == "works"
    assert web["process"] == {
        "pid": None, "counts": True, "busy": False,
        "threads": {"value": None, "threshold": 200},
        "memory": {"value": None, "threshold": 262144},
        "processor": {"value": None, "threshold": 90000}}
    assert odd["status"]["line"] == {"hex": "1b5b324aff2069732072756e6e696e67"}
    assert [found["rule"] for found in result["findings"]] == ["probe-process"]


def test_the_figures_stand_beside_the_thresholds(sandbox):
    sandbox.service("web", "echo web is running")
    sandbox.configure({"name": "web", "functionalpingcmd": "echo service: ok", "MaxFPSkips": "3",
                       "binarypath": "/opt/stage/bin/spinner", "ThresholdAverageCPUUsage": "1000"})
    command = sandbox.command(
        "cp /usr/bin/yes /opt/stage/bin/spinner\n/opt/stage/bin/spinner >/dev/null &\n"
        f"tolkwd-check --json {PROBE}; status=$?; kill $!; (exit $status)")
    played = subprocess.run(command, capture_output=True, timeout=LIMIT_SECONDS)
    assert played.returncode == 1
    result = json.loads(played.stdout)
    process = result["probe"][0]["process"]
    assert process["busy"]
    assert process["threads"] == {"value": 1, "threshold": 200}
    assert process["memory"]["value"] > 0
    assert process["processor"]["value"] > 1000  # one per cent; it does nothing else
    assert [found["rule"] for found in result["findings"]] == ["probe-busy"]
    assert "ThresholdAverageCPUUsage" in result["findings"][0]["message"]


def test_workers_of_another_user_are_their_masters(sandbox):
    """As of nginx: root starts the master, which gives its workers another user."""
    sandbox.service("web", "echo web is running")
    sandbox.configure({"name": "web", "functionalpingcmd": "echo service: ok", "MaxFPSkips": "3",
                       "binarypath": "/opt/stage/bin/master"})
    (sandbox.stage / "master.py").write_text(
        "import os, time\n"
        "if os.fork() == 0:\n"
        "    os.setresuid(65534, 65534, 65534)\n"
        "    print('ready', flush=True)\n"
        "time.sleep(60)\n")
    command = sandbox.command(
        "cp $(readlink -f /usr/bin/python3) /opt/stage/bin/master\n"
        "exec 3< <(exec /opt/stage/bin/master /opt/stage/master.py)\nread -u 3 ready\n"
        f"pidof /opt/stage/bin/master | wc -w\ntolkwd-check {PROBE}")
    played = subprocess.run(command, capture_output=True, timeout=LIMIT_SECONDS)
    assert played.stdout.startswith(b"2\nweb\n")
    assert played.returncode == 0


def test_the_load_is_reckoned_with_what_was_measured(sandbox):
    sandbox.service("web", "sleep 1.5; echo web is running")
    sandbox.configure({"name": "web", "genpinginterval": "1"})
    lint = "$(tolkwd-check --rules | sed '/^lock-starved/d; s/ .*//; s/^/--allow /')"
    assert sandbox.run(f"{lint} /opt/stage/tolkwd.xml").stdout == b""  # as guessed
    sandbox.configure({"name": "web", "genpinginterval": "1"},
                      {"name": "web", "genpinginterval": "1"})
    assert sandbox.run(f"{lint} /opt/stage/tolkwd.xml").stdout == b""
    played = sandbox.run(f"{lint} --probe --yes /opt/stage/tolkwd.xml")
    assert played.returncode == 1
    assert b"as they took now: " in played.stdout
    assert b"[lock-starved]" in played.stdout


MEBIBYTE = 1 << 20

# Of the program and all that it runs, in kilobytes, on standard error: "peak NUMBER".
PEAK = """import os, resource, sys
os.waitpid(os.spawnv(os.P_NOWAIT, sys.argv[1], sys.argv[1:]), 0)
print("peak", resource.getrusage(resource.RUSAGE_CHILDREN).ru_maxrss, file=sys.stderr)
"""


@pytest.mark.parametrize("option", ["", "--json"])
@pytest.mark.parametrize("byte", ["x", r"\377"])
def test_peak_memory_is_bounded_over_an_endless_line(sandbox, option, byte):
    """And a byte that is not UTF-8, of which JSON holds two digits."""
    sandbox.service("web", "echo web is running")
    # A shell runs the check, whose parent is the checker.
    least = "grep VmHWM /proc/$PPID/status >/opt/stage/least; echo service: ok"
    line = f"head -c 100000000 /dev/zero | tr '\\0' '{byte}'"
    sandbox.configure({"name": "web", "functionalpingcmd": f"({least})"},
                      {"name": "web", "functionalpingcmd": f"({line})"})
    (sandbox.stage / "peak.py").write_text(PEAK)
    command = sandbox.command("python3 -I -S /opt/stage/peak.py /opt/program/tolkwd-check "
                              f"$others --probe --yes {option} /opt/stage/tolkwd.xml")
    played = subprocess.run(command, capture_output=True, timeout=LIMIT_SECONDS)
    if option:
        kept = json.loads(played.stdout)["probe"][1]["check"]["line"]
        assert kept == ("x" * MEBIBYTE if byte == "x" else {"hex": "ff" * MEBIBYTE})
    least = int(sandbox.text("least").split()[1])
    assert int(played.stderr.split()[-1]) - least <= 8 << 10


def test_hostile_answers_do_not_reach_the_terminal(sandbox):
    sandbox.service("web", r"printf '\033[2J\r\033]0;x\007 is running\n'")
    sandbox.configure({"name": "web", "functionalpingcmd": r"printf '\033[31m\302\233no\n' >&2"})
    played = sandbox.run(PROBE)
    assert played.returncode == 1
    shown = played.stdout + played.stderr
    assert not any(byte < 0x20 and byte != 0x0a or byte == 0x7f for byte in shown)
    assert b"\xc2\x9b" not in shown
    assert rb'"\x1b[2J\x0d\x1b]0;x\x07 is running"' in played.stdout


@pytest.mark.parametrize("number", [signal.SIGINT, signal.SIGTERM, signal.SIGHUP])
@pytest.mark.parametrize("whom", ["program", "group"])
def test_an_interrupt_ends_the_probe_and_runs_nothing_more(sandbox, number, whom):
    """Also where the command does not get the signal: timeout(1) leaves the terminal's group."""
    sandbox.service("web", "sleep 30; echo web is running")
    sandbox.configure({"name": "web", "functionalpingcmd": "touch /opt/stage/started"},
                      {"name": "mail"})
    kill = "kill -%d -- %s$!" % (number, "-" if whom == "group" else "")
    command = sandbox.command(
        f"set -m; tolkwd-check {PROBE} </dev/null &\n"
        f"until [ -s /opt/stage/calls ]; do sleep 0.05; done\n{kill}\nwait $!")
    begin = time.monotonic()
    # Whoever runs the tests in the background may ignore them, which is inherited.
    played = subprocess.run(command, capture_output=True, timeout=LIMIT_SECONDS,
                            preexec_fn=lambda: signal.signal(number, signal.SIG_DFL))
    assert played.returncode == 128 + number
    assert time.monotonic() - begin < 20
    assert played.stdout == b""
    assert b"tolkwd-check: interrupted\n" in played.stderr
    assert sandbox.calls() == ["web status"]
    assert sandbox.untouched()


def test_an_interrupt_that_the_command_gets_first_runs_nothing_more(sandbox):
    sandbox.service("web", "sleep 30; echo web is running")
    sandbox.configure({"name": "web"}, {"name": "mail"})
    command = sandbox.command(
        f"set -m; tolkwd-check {PROBE} </dev/null &\n"
        "until [ -s /opt/stage/calls ]; do sleep 0.05; done\n"
        "kill -STOP $!; kill -INT -- -$!\n"
        "for i in 1 2 3 4 5; do grep -q mail /opt/stage/calls && break; sleep 0.1; done\n"
        "kill -CONT $!; wait -f $!")  # -f: not only until it stops
    played = subprocess.run(command, capture_output=True, timeout=LIMIT_SECONDS,
                            preexec_fn=lambda: signal.signal(signal.SIGINT, signal.SIG_DFL))
    assert b"tolkwd-check: interrupted\n" in played.stderr
    assert sandbox.calls() == ["web status"]


def test_an_ignored_signal_stays_ignored(sandbox):
    sandbox.service("web", 'echo called >>/opt/stage/called; sleep 1; echo web is running')
    sandbox.configure({"name": "web"})
    command = sandbox.command(
        f"trap '' HUP; tolkwd-check {PROBE} &\n"
        "until [ -e /opt/stage/called ]; do sleep 0.05; done\nkill -HUP $!\nwait $!")
    played = subprocess.run(command, capture_output=True, timeout=LIMIT_SECONDS)
    assert played.returncode == 0
    assert b"web is running" in played.stdout


def test_a_terminal_shows_what_is_waited_for(sandbox):
    sandbox.service("web", "sleep 0.2; echo web is running")
    sandbox.configure({"name": "web", "functionalpingcmd": "echo service: ok"})
    leader, follower = os.openpty()
    played = subprocess.run(sandbox.command(f"tolkwd-check {PROBE}"), stdin=subprocess.DEVNULL,
                            stdout=subprocess.PIPE, stderr=follower, timeout=LIMIT_SECONDS)
    os.close(follower)
    shown = terminal.read_to_end(leader).decode()
    os.close(leader)
    assert played.returncode == 0
    assert '\rwaiting for the status command of "web"' in shown
    assert '\rwaiting for the check of "web"' in shown
    assert shown.split("\r")[-2].strip() == ""  # nothing of it is left


def test_programs_are_looked_for_where_the_daemon_looks(sandbox):
    sandbox.service("web", "echo web is running")
    check = sandbox.stage / "own" / "check-web"
    check.parent.mkdir()
    check.write_text("#!/bin/sh\necho service: ok\n")
    check.chmod(0o755)
    sandbox.configure({"name": "web", "functionalpingcmd": "check-web"})
    command = sandbox.command(f"PATH=/opt/stage/own:/opt/program:/bin tolkwd-check {PROBE}")
    result = subprocess.run(command, capture_output=True, timeout=LIMIT_SECONDS)
    report = result.stdout.decode()
    assert "status     running: " in report
    assert "check-web: not found" in report


@pytest.mark.parametrize("target", [
    {"name": "web stop"},
    {"name": "web status; touch /opt/stage/started;"},
    {"name": "web", "binarypath": "x; touch /opt/stage/started"},
    {"name": "web", "binarypath": "$(touch /opt/stage/started)"},
])
def test_nothing_is_run_where_the_shell_would_run_something_else(sandbox, target):
    sandbox.configure({"name": "db", "MaxFPSkips": "5"}, target)
    result = sandbox.run(PROBE)
    assert result.returncode == 64
    assert b" would have the shell run something else than " in result.stderr
    assert result.stderr.endswith(b"nothing was run\n")
    assert sandbox.calls() == []
    assert sandbox.untouched()
