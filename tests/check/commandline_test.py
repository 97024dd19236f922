"""The command line of tolkwd-check: its exit statuses, what it writes where, and files that nobody
means. Runs nothing that the files say."""

import json
import os
import subprocess

import pytest

import terminal
from configurations import configuration

LIMIT_SECONDS = 60
ESCAPE = "\x1b[31m"

SOUND = configuration({})
NOTED = configuration({}, before="<!-- web -->\n")
WARNED = configuration({"maxattemptofwakeup": "1"}, before="<!-- für --><!-- web -->\n")
WRONG = configuration({"maxattemptofwakeup": "0"}, before="<!-- web -->\n")


@pytest.fixture(scope="session")
def machinerules(program):
    """The options that leave out what depends on the machine."""
    return [word for rule in ["binary-missing", "ping-folder", "unknown-service", "writable-file"]
            for word in ("--allow", rule)]


@pytest.fixture
def run(program, machinerules, tmp_path):
    def runprogram(*arguments, text=None, **options):
        names = []
        if text is not None:
            (tmp_path / "web.xml").write_text(text)
            names = [*machinerules, "web.xml"]
        options = {"stdout": subprocess.PIPE, **options}
        return subprocess.run([program, *arguments, *names], cwd=tmp_path,
                              stdin=subprocess.DEVNULL, stderr=subprocess.PIPE,
                              encoding="utf-8", timeout=LIMIT_SECONDS, **options)
    return runprogram


@pytest.mark.parametrize("text, status", [(SOUND, 0), (NOTED, 0), (WARNED, 1), (WRONG, 2)])
@pytest.mark.parametrize("form", [[], ["--json"], ["--plan"]])
def test_status_is_that_of_the_gravest_finding(run, form, text, status):
    result = run(*form, text=text)
    assert result.returncode == status
    assert result.stderr == ""


@pytest.mark.parametrize("arguments", [["."], ["no/such/file"], ["--plan", "."],
                                       ["--probe", "--yes", "."]])
def test_a_file_that_cannot_be_read_is_an_error(run, arguments):
    result = run(*arguments)
    assert (result.returncode, result.stderr) == (2, "")
    assert result.stdout.startswith(f"{arguments[-1]}:1:1: error: the file cannot be read: ")
    assert result.stdout.endswith(" [unreadable-file]\n")


def test_a_file_that_cannot_be_read_is_not_loaded(run):
    result = run("--json", "--plan", "--probe", ".")
    said = json.loads(result.stdout)
    assert (result.returncode, result.stderr) == (2, "")
    assert [each["rule"] for each in said.pop("findings")] == ["unreadable-file"]
    assert said == {"version": 1, "file": ".", "loaded": False, "targets": [], "plan": [],
                    "probe": []}


def test_an_empty_file_is_an_error(run):
    result = run(text="")
    assert (result.returncode, result.stderr) == (2, "")
    assert result.stdout == ("web.xml:1:1: error: the file is empty: nothing is watched "
                             "[no-target]\n")


@pytest.mark.parametrize("arguments, said", [
    ([], "FILE is required"),
    (["--plan"], "FILE is required"),
    ([""], "FILE is required"),
    (["one.xml", "two.xml"], "not expected: two.xml"),
    (["--plann", "one.xml"], "not expected: --plann"),
    (["--allow", "coment", "one.xml"], 'no rule is named "coment"'),
    (["--explain", "coment"], 'no rule is named "coment"'),
    (["--explain"], "1 required RULE missing"),
    (["--plan", "-t", "1h", "one.xml"], "-t = 1h"),
])
def test_a_wrong_command_line_ends_with_the_status_of_usage(run, arguments, said):
    result = run(*arguments)
    assert (result.returncode, result.stdout) == (64, "")
    assert said in result.stderr


@pytest.mark.parametrize("arguments", [
    ["-", ESCAPE], ["--" + ESCAPE], ["-t", ESCAPE, "-"], ["--plan=" + ESCAPE, "-"],
    ["--explain", ESCAPE], ["--allow", ESCAPE, "-"],
])
def test_a_refused_command_line_does_not_steer_the_terminal(run, arguments):
    result = run(*arguments)
    assert result.returncode == 64
    assert "\x1b" not in result.stdout + result.stderr
    assert "\\x1b[31m" in result.stderr


@pytest.mark.parametrize("arguments, begin", [
    (["--help"], "Tells what tolkwd will make of a configuration"),
    (["--version"], "tolkwd-check "), (["--rules"], "attempts-negative  "),
    (["--explain", "comment"], "comment: ")])
def test_who_asks_for_help_needs_no_file(run, arguments, begin):
    result = run(*arguments)
    assert result.returncode == 0
    assert result.stdout.startswith(begin)
    assert result.stderr == ""


@pytest.mark.parametrize("arguments, text", [([], WARNED), (["--plan"], SOUND),
                                             (["--json"], SOUND), (["--rules"], None),
                                             (["--help"], None), (["--version"], None),
                                             (["--explain", "comment"], None), (["."], None)])
def test_output_that_cannot_be_written_is_a_failure_of_its_own(run, arguments, text):
    with open("/dev/full", "w") as full:
        result = run(*arguments, text=text, stdout=full)
    assert result.returncode == 70
    assert result.stderr == "tolkwd-check: the output cannot be written\n"


@pytest.mark.parametrize("variables, coloured", [
    ({"TERM": "xterm"}, True), ({"TERM": "xterm", "NO_COLOR": ""}, True),
    ({"TERM": "xterm", "NO_COLOR": "1"}, False), ({"TERM": "dumb"}, False)])
def test_only_a_terminal_that_wants_them_gets_colours(run, variables, coloured):
    kept = {name: value for name, value in os.environ.items() if name not in ("TERM", "NO_COLOR")}
    leader, follower = os.openpty()
    run(text=WARNED, stdout=follower, env={**kept, **variables})
    os.close(follower)
    shown = terminal.read_to_end(leader)
    os.close(leader)
    assert (b"\033[" in shown) == coloured
    assert b"\033" not in run(text=WARNED).stdout.encode()


@pytest.mark.parametrize("options, seconds", [
    ([], 10800), (["-t", "120"], 120), (["-t", "119"], 10800), (["-t", "-1"], 10800),
    (["-t", "5000"], 5000)])
def test_a_plan_takes_the_refresh_period_as_the_daemon_does(run, options, seconds):
    assert f"; a refresh comes every {seconds} s (-t).\n" in run(
        "--plan", *options, text=SOUND).stdout
    plan = json.loads(run("--plan", "--json", *options, text=SOUND).stdout)["plan"]
    assert [target["refresh"]["seconds"] for target in plan] == [seconds]


def test_an_empty_line_stands_between_findings_and_plan_only(run):
    assert run("--plan", text=SOUND).stdout.startswith("1 target; ")
    findings = run(text=WARNED).stdout
    assert run("--plan", text=WARNED).stdout.startswith(findings + "\n1 target; ")


def test_json_tells_what_is_found_and_where(run):
    result = json.loads(run("--json", text=WARNED).stdout)
    attempts, comments = result["findings"][-1], result["findings"][:-1]
    assert [each["severity"] for each in comments] == ["note", "note"]
    assert [(each["line"], each["column"]) for each in comments] == [(3, 1), (3, 13)]
    assert comments[1]["offset"] == WARNED.encode().index(b"<!-- web")
    assert attempts["rule"] == "attempts-one"
    assert attempts["severity"] == "warning"
    lines = WARNED.splitlines()
    assert lines[attempts["line"] - 1][attempts["column"] - 1:].startswith("1</maxattempt")
    assert json.loads(run("--json", text=WRONG).stdout)["findings"][-1]["severity"] == "error"


def test_what_an_allowed_rule_finds_does_not_count(run):
    result = run("--allow", "attempts-one", "--allow", "comment", text=WARNED)
    assert (result.returncode, result.stdout) == (0, "")


def test_without_proc_nothing_is_told_about_the_file(program):
    result = subprocess.run(
        ["bwrap", "--ro-bind", "/", "/", "--tmpfs", "/proc", "--dev", "/dev", "--", program, "-"],
        input=SOUND, stdout=subprocess.PIPE,
        stderr=subprocess.PIPE, text=True, timeout=LIMIT_SECONDS)
    assert result.returncode == 70
    assert result.stdout == ""
    assert result.stderr == "tolkwd-check: /proc/self/fd: No such file or directory\n"


TARGET = "<wdmonitortarget>{}</wdmonitortarget>"
NAME = "<name>web</name>"


def monitored(fields):
    return TARGET.format(f"<wdmonitorservice>{fields}</wdmonitorservice>")


MEGABYTE = 1000000
LARGE_FILES = {
    "one service of many fields": monitored(NAME + 400000 * "<startcmd>a</startcmd>"),
    "a large service and many that lack all": (
        monitored(200000 * "<startcmd>a</startcmd>") + 40000 * monitored("")),
    "many lost dependents": TARGET.format(
        f"<wdmonitorservice>{NAME}</wdmonitorservice></name>"
        + 400000 * "<wdmondependsev></wdmondependsev>"),
    "many signs in values, and blanks behind": (
        monitored(100000 * "<startcmd>a <b></startcmd>") + "</wdtargets>" + 4 * MEGABYTE * " "),
    "a long unknown name and many closing tags": (
        "<" + 12 * MEGABYTE * "x" + ">" + 400000 * "</a>"),
}


@pytest.mark.parametrize("kind", LARGE_FILES)
def test_time_does_not_grow_with_the_square_of_the_file(program, kind):
    result = subprocess.run([program, "-"], input=f"<wdtargets>{LARGE_FILES[kind]}",
                            stdout=subprocess.PIPE, encoding="utf-8", timeout=LIMIT_SECONDS)
    assert result.returncode == 2
    assert result.stdout.startswith("-:1:")
