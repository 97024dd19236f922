"""The command line of tolkwd-report: its exit statuses, what it writes where, filters, a log that
grows, and names that nobody means."""

import contextlib
import json
import os
import re
import select
import signal
import subprocess
import termios
import time

import pytest

import terminal

LIMIT_SECONDS = 60
ESCAPE = "\x1b[31m"

# Sat Nov 21 15:00:00 2026, in the zone in which all tests run.
BEGIN = 1795273200
ZONE = {"TZ": "UTC"}


def line(second, message, level="ERROR", thread=1, module="wdmonitorthread"):
    """A line of the log, so many seconds after its beginning."""
    stamp = time.asctime(time.gmtime(BEGIN + second))
    return f"{stamp} {level} {module}|TID{thread} {message}\n"


def watched(name, second=0, thread=1):
    return (line(second, f"Name of the service being monitored: {name}", "INFO", thread)
            + line(second, f"Binary path of service being monitored: /usr/sbin/{name}d", "INFO",
                   thread))


def failed(name, second, thread=1):
    return line(second, f"General ping failed for service {name}. Try to general ping more times "
                "now, if failed 3 times, will generally recover this service.", thread=thread)


def tried(name, second, thread=1):
    return line(second, f"Try the general recover for service {name}", thread=thread)


def recovered(name, second, thread=1):
    return line(second, f"General ping failed for service {name}, but this service has been "
                "general recoverred successfully.", "INFO", thread)


def gaveup(name, second, thread=1):
    return line(second, f"Failed to general recover the sevice {name} after try the max times.",
                thread=thread)


HEALTHY = watched("web") + watched("db", thread=2)
RECOVERED = (HEALTHY + failed("web", 60) + tried("web", 270) + failed("web", 330)
             + tried("web", 540) + recovered("web", 660))
GIVEN_UP = HEALTHY + failed("web", 60) + tried("web", 270) + gaveup("web", 330)
UNLOADED = HEALTHY + line(100, "Loadservices error.", module="wdmanager")
ENDED = line(100, "Failed to init the pingreclock.", module="wdmanager")


@pytest.fixture
def run(program, tmp_path):
    def runprogram(*arguments, log=None, **options):
        """With the text of a log as its standard input, or with none."""
        options = {"stdout": subprocess.PIPE, "env": {**os.environ, **ZONE}, **options}
        return subprocess.run([program, *arguments, *([] if log is None else ["-"])],
                              cwd=tmp_path, input=log or "", stderr=subprocess.PIPE,
                              encoding="utf-8", timeout=LIMIT_SECONDS, **options)
    return runprogram


@pytest.mark.parametrize("log, status", [
    (HEALTHY, 0), (RECOVERED, 0), (HEALTHY + failed("web", 60), 1), (GIVEN_UP, 1), (UNLOADED, 1),
    (HEALTHY + ENDED, 1), ("", 1), ("nobody\nwrote\nthis\n", 1)])
@pytest.mark.parametrize("form", [[], ["--json"]])
def test_the_status_tells_whether_somebody_should_look(run, form, log, status):
    result = run("status", *form, log=log)
    assert (result.returncode, result.stderr) == (status, "")


def test_trouble_stands_first(run):
    lines = run("status", log=GIVEN_UP).stdout.splitlines()
    assert lines[0].split()[:3] == ["SERVICE", "STATE", "SINCE"]
    assert lines[1].startswith("X web")
    assert lines[2].startswith("+ db")
    assert "log from 2026-11-21 15:00:00 to 2026-11-21 15:05:30, 7 lines" in lines


@pytest.mark.parametrize("command", [["status"], ["status", "--json"], ["events"],
                                     ["events", "--json"], ["events", "--follow"],
                                     ["html", "-o", "page.html"]])
@pytest.mark.parametrize("name, reason", [("no/such/log", "No such file or directory"),
                                          (".", "Is a directory"),
                                          (ESCAPE, "No such file or directory")])
def test_a_log_that_cannot_be_read_has_a_status_of_its_own(run, tmp_path, command, name, reason):
    result = run(*command, name)
    shown = name.replace("\x1b", "\\x1b")
    first, second = result.stderr.splitlines()
    assert (result.returncode, result.stdout) == (2, "")
    assert first == f"tolkwd-report: {shown}: {reason}"
    assert "tolkwd-report status -" in second
    assert not (tmp_path / "page.html").exists()


@pytest.mark.parametrize("arguments, said", [
    ([], "one of status, events, html and messages is required"),
    (["stat"], "not expected: stat"),
    (["status", "--all"], "not expected: --all"),
    (["events", "--kind", "fail", "-"], '"fail" is no kind of event; these are: watched, '),
    (["events", "--since", "tomorrow", "-"], '"tomorrow" is no time; understood are "2 hours ago"'),
    (["events", "--until", "25:00", "-"], '"25:00" is no time'),
    (["events", "--service"], "1 required NAME missing"),
    (["html", "-"], "-o is required"),
    (["messages", "log"], "not expected: log"),
])
def test_a_wrong_command_line_ends_with_the_status_of_usage(run, arguments, said):
    result = run(*arguments)
    assert (result.returncode, result.stdout) == (64, "")
    assert said in result.stderr
    assert "--help" in result.stderr


@pytest.mark.parametrize("arguments", [
    [ESCAPE], ["status", "--" + ESCAPE], ["events", "--kind", ESCAPE],
    ["events", "--since", ESCAPE], ["events", "--all=" + ESCAPE]])
def test_a_refused_command_line_does_not_steer_the_terminal(run, arguments):
    result = run(*arguments)
    assert result.returncode == 64
    assert "\x1b" not in result.stdout + result.stderr
    assert "\\x1b[31m" in result.stderr


@pytest.mark.parametrize("arguments, said", [
    (["--help"], "Answers from tolkwd's log"), (["--version"], "tolkwd-report "),
    (["status", "--help"], "--now"), (["events", "--help"], "recovery-tried"),
    (["html", "--help"], "-o FILE"), (["messages", "--help"], "messages"),
    (["messages"], "ERROR wdmanager Loadservices error.\n")])
def test_who_asks_for_help_needs_no_log(run, arguments, said):
    result = run(*arguments)
    assert (result.returncode, result.stderr) == (0, "")
    assert said in result.stdout


@pytest.mark.parametrize("arguments", [["--help"], ["--version"], ["messages"], ["status", "-"],
                                       ["status", "--json", "-"], ["events", "-"],
                                       ["events", "--json", "-"], ["events", "--follow", "-"],
                                       ["html", "-o", "-", "-"]])
def test_output_that_cannot_be_written_is_a_failure_of_its_own(program, arguments):
    with open("/dev/full", "w") as full:
        result = subprocess.run([program, *arguments], input=GIVEN_UP, stdout=full,
                                stderr=subprocess.PIPE, encoding="utf-8", timeout=LIMIT_SECONDS)
    assert result.returncode == 70
    assert result.stderr == "tolkwd-report: the output cannot be written\n"


# The form of the JSON documents: a member's type, or the types that it may have; a list holds the
# form of its elements.
TIME = re.compile(r"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d")
TEXT = (str, dict)  # a text that is not UTF-8 is {"hex": ...}
NOTHING = type(None)
STATES = {"up", "busy", "not-watched", "command-not-recognised", "suspect", "functional-failure",
          "recovering", "functional-recovering", "unknown-service", "gave-up"}
STATUS = {
    "version": int,
    "log": {"files": [TEXT], "from": (TIME, NOTHING), "to": (TIME, NOTHING), "lines": int,
            "messages": int, "foreign": int, "torn": int},
    "loadfailed": bool,
    "services": [{
        "service": TEXT, "state": STATES, "inferred": bool, "since": TIME, "seconds": int,
        "path": (*TEXT, NOTHING),
        "lastoutage": ({"from": TIME, "to": (TIME, NOTHING), "seconds": int,
                        "inferred": bool}, NOTHING),
        "outages": int, "outageseconds": int, "recoveries": {"tried": int, "successful": int},
        "skippedchecks": int, "gaveup": int, "watchedseconds": int,
        "availability": (float, int, NOTHING)}],
}
EVENT = {"time": TIME, "service": (*TEXT, NOTHING), "state": (STATES, NOTHING), "kind": str,
         "inferred": bool, "words": str, "message": (*TEXT, NOTHING), "line": (int, NOTHING)}
EVENTS = {"version": int, "events": [EVENT]}


def has_form(value, form):
    if isinstance(form, tuple):
        return any(has_form(value, each) for each in form)
    if isinstance(form, dict):
        return (isinstance(value, dict) and list(value) == list(form)
                and all(has_form(value[key], form[key]) for key in form))
    if isinstance(form, list):
        return isinstance(value, list) and all(has_form(each, form[0]) for each in value)
    if isinstance(form, set):
        return value in form
    if isinstance(form, re.Pattern):
        return isinstance(value, str) and form.fullmatch(value) is not None
    return type(value) is form


UNTIMED = "error, unable to open the input file: 0\n"
LOGS = {"nothing": "", "no time": UNTIMED, "foreign lines": "nobody\nwrote this\n",
        "healthy": HEALTHY, "recovered": RECOVERED, "given up": GIVEN_UP, "not loaded": UNLOADED,
        "an outage that lasts": HEALTHY + failed("web", 60)}


@pytest.mark.parametrize("name", LOGS)
def test_json_has_its_form(run, name):
    said = json.loads(run("status", "--json", log=LOGS[name]).stdout)
    assert has_form(said, STATUS), said
    said = json.loads(run("events", "--all", "--json", log=LOGS[name]).stdout)
    assert has_form(said, EVENTS), said
    for text in run("events", "--json", "--follow", log=LOGS[name]).stdout.splitlines():
        assert has_form(json.loads(text), {"version": int, **EVENT}), text


@pytest.mark.parametrize("name", LOGS)
def test_json_is_laid_out_as_one_document(run, name):
    text = run("status", "--json", log=LOGS[name]).stdout
    assert text == json.dumps(json.loads(text), indent=2) + "\n"


def test_a_log_without_a_time_tells_none(run):
    said = json.loads(run("status", "--json", log=UNTIMED).stdout)
    assert (said["log"]["from"], said["log"]["to"], said["log"]["messages"]) == (None, None, 1)
    assert "1 line, none of which tells when it was" in run("status", "--now", log=UNTIMED).stdout


def test_json_tells_what_the_table_tells(run):
    said = json.loads(run("status", "--json", log=GIVEN_UP).stdout)
    web, database = said["services"]
    assert said["log"] == {"files": ["-"], "from": "2026-11-21T15:00:00",
                           "to": "2026-11-21T15:05:30", "lines": 7, "messages": 7, "foreign": 0,
                           "torn": 0}
    assert (web["service"], web["state"], web["since"]) == ("web", "gave-up", "2026-11-21T15:05:30")
    assert (web["path"], web["gaveup"]) == ("/usr/sbin/webd", 1)
    assert web["recoveries"] == {"tried": 1, "successful": 0}
    assert web["lastoutage"] == {"from": "2026-11-21T15:01:00", "to": None, "seconds": 270,
                                 "inferred": False}
    assert web["watchedseconds"] == 330
    assert web["availability"] == pytest.approx(1 - 270 / 330)
    assert (database["state"], database["outages"], database["lastoutage"]) == ("up", 0, None)


def test_json_has_the_services_in_the_order_of_the_log(run):
    said = json.loads(run("status", "--json", log=HEALTHY + failed("db", 60, thread=2)).stdout)
    assert [(each["service"], each["state"]) for each in said["services"]] == [
        ("web", "up"), ("db", "suspect")]


def words_of(result):
    """Time and words of each line, for names that fit into their column."""
    return [(text[11:19], text[40:]) for text in result.stdout.splitlines()]


def test_events_tell_the_story(run):
    story = words_of(run("events", "--service", "web", log=RECOVERED))
    expected = [("15:00:00", "watched from now on"), ("15:01:00", "its status command failed"),
                ("15:04:30", "recovery 1 begins"), ("15:05:30", "its status command failed"),
                ("15:09:00", "recovery 2 begins"), ("15:11:00", "up again, after 10 min")]
    assert len(story) == len(expected)
    for (when, words), (expected_time, begin) in zip(story, expected):
        assert when == expected_time
        assert words.startswith(begin)


def test_what_is_inferred_is_marked(run):
    log = HEALTHY + failed("web", 60) + watched("other", 1000, thread=2)
    lines = run("events", "--service", "web", "--kind", "state", log=log).stdout.splitlines()
    assert [text[:22] for text in lines] == ["2026-11-21 15:04:30 ~ "]
    said = json.loads(run("events", "--service", "web", "--kind", "state", "--json",
                          log=log).stdout)["events"]
    assert [(each["time"], each["state"], each["inferred"], each["message"], each["line"])
            for each in said] == [("2026-11-21T15:04:30", "up", True, None, None)]


@pytest.mark.parametrize("filters, times", [
    ([], ["00:00", "00:00", "01:00", "04:30", "05:30"]),
    (["--service", "db"], ["00:00"]),
    (["--service", "web"], ["00:00", "01:00", "04:30", "05:30"]),
    (["--service", "web", "--service", "db"], ["00:00", "00:00", "01:00", "04:30", "05:30"]),
    (["--kind", "gave-up"], ["05:30"]),
    (["--kind", "failed", "--kind", "recovery-tried"], ["01:00", "04:30"]),
    (["--kind", "failed", "--service", "db"], []),
    (["--since", "2026-11-21 15:01"], ["01:00", "04:30", "05:30"]),
    (["--since", "2026-11-21T15:01:01"], ["04:30", "05:30"]),
    (["--until", "Sat Nov 21 15:01:00 2026"], ["00:00", "00:00", "01:00"]),
    (["--since", f"@{BEGIN + 60}", "--until", f"@{BEGIN + 270}"], ["01:00", "04:30"]),
    (["--since", "2026-11-22"], []),
    (["--all"], ["00:00", "00:00", "00:00", "00:00", "01:00", "04:30", "05:30"]),
])
def test_each_filter_leaves_out_what_it_does_not_name(run, filters, times):
    result = run("events", *filters, log=GIVEN_UP)
    assert (result.returncode, result.stderr) == (0, "")
    assert [f"15:{each}" for each in times] == [when for when, _ in words_of(result)]


def test_a_service_that_the_log_does_not_name_is_noted(run):
    result = run("events", "--service", "wbe" + ESCAPE, log=GIVEN_UP)
    assert (result.returncode, result.stdout) == (0, "")
    assert result.stderr == 'tolkwd-report: the log names no service "wbe\\x1b[31m"\n'


def test_steps_are_told_to_who_wants_all(run):
    log = HEALTHY + line(10, "General ping sleep 60", "DEBUG")
    assert "15:00:10" not in run("events", log=log).stdout
    assert ("15:00:10", "to be asked again in 60 s") in words_of(run("events", "--all", log=log))
    assert ("15:00:10", "to be asked again in 60 s") in words_of(
        run("events", "--kind", "step", log=log))


def test_a_refresh_is_told_once(run):
    log = HEALTHY + watched("web", 10800) + watched("db", 10800, thread=2)
    assert len(run("events", log=log).stdout.splitlines()) == 3
    assert "all services are watched anew" in run("events", log=log).stdout
    assert ("18:00:00", "watched anew") in words_of(run("events", "--all", log=log))


def test_logs_are_read_in_order(run, tmp_path):
    (tmp_path / "one.log").write_text(HEALTHY + failed("web", 60))
    (tmp_path / "two.log").write_text(tried("web", 270) + gaveup("web", 330))
    said = json.loads(run("status", "--json", "one.log", "two.log").stdout)
    assert said["log"]["files"] == ["one.log", "two.log"]
    assert said["services"] == json.loads(run("status", "--json", log=GIVEN_UP).stdout)["services"]


def test_a_log_may_be_named_like_a_command(run, tmp_path):
    (tmp_path / "events").write_text(HEALTHY)
    assert json.loads(run("status", "--json", "events").stdout)["log"]["files"] == ["events"]


def test_now_lets_silence_tell(run):
    log = HEALTHY + failed("web", 60)
    assert run("status", log=log).returncode == 1
    result = run("status", "--now", log=log)
    assert result.returncode == 0
    assert "judged as of " in result.stdout


NASTY = "x" + ESCAPE + "\u202e\t\x9b" + 300 * "y"


@pytest.mark.parametrize("arguments", [["status"], ["events"], ["events", "--all"],
                                       ["events", "--follow"], ["status", "--json"],
                                       ["events", "--json"]])
def test_no_name_steers_the_terminal(run, arguments):
    shown = run(*arguments, log=watched(NASTY) + failed(NASTY, 60)).stdout
    for sign in "\x1b\t\x9b\u202e":
        assert sign not in shown
    assert "x\\x1b[31m" in shown or "x\\u001b[31m" in shown


def test_a_name_that_is_no_text_is_given_in_bytes(program):
    log = watched("w\udcffb").encode("utf-8", "surrogateescape")
    result = subprocess.run([program, "status", "--json", "-"], input=log, stdout=subprocess.PIPE,
                            timeout=LIMIT_SECONDS)
    assert json.loads(result.stdout)["services"][0]["service"] == {"hex": "77ff62"}


def terminal_output(program, arguments, columns, variables, log):
    """What the program shows on a terminal of so many columns."""
    kept = {name: value for name, value in os.environ.items() if name not in ("TERM", "NO_COLOR")}
    leader, follower = os.openpty()
    termios.tcsetwinsize(follower, (24, columns))
    subprocess.run([program, *arguments], input=log, stdout=follower, encoding="utf-8",
                   env={**kept, **ZONE, **variables}, timeout=LIMIT_SECONDS)
    os.close(follower)
    shown = terminal.read_to_end(leader).decode()
    os.close(leader)
    return shown


@pytest.mark.parametrize("command", [["status", "-"], ["events", "-"]])
@pytest.mark.parametrize("variables, coloured", [
    ({"TERM": "xterm"}, True), ({"TERM": "xterm", "NO_COLOR": ""}, True),
    ({"TERM": "xterm", "NO_COLOR": "1"}, False), ({"TERM": "dumb"}, False)])
def test_only_a_terminal_that_wants_them_gets_colours(run, program, command, variables, coloured):
    shown = terminal_output(program, command, 80, variables, GIVEN_UP)
    assert ("\x1b[" in shown) == coloured
    assert "\x1b" not in run(*command[:1], log=GIVEN_UP).stdout


@pytest.mark.parametrize("columns", [40, 80, 100, 200])
def test_the_table_takes_the_terminals_width(program, columns):
    name = 60 * "w"
    log = watched(name) + failed(name, 60)
    lines = terminal_output(program, ["status", "-"], columns, {"TERM": "dumb"}, log).splitlines()
    assert len(lines[1]) <= max(columns, 80)
    assert (name in lines[1]) == (columns == 200)


def test_a_page_is_whole_or_not_there(run, tmp_path):
    assert run("html", "-o", "page.html", log=GIVEN_UP).returncode == 0
    page = (tmp_path / "page.html").read_text()
    assert page.startswith("<!DOCTYPE html>") and page.rstrip().endswith("</html>")
    assert run("html", "-o", "-", log=GIVEN_UP).stdout == page
    assert run("html", "-o", "page.html", "missing.log").returncode == 2
    assert (tmp_path / "page.html").read_text() == page
    result = run("html", "-o", "missing/page.html", log=GIVEN_UP)
    assert result.returncode == 70
    assert result.stderr == "tolkwd-report: missing/page.html: No such file or directory\n"
    assert [each.name for each in tmp_path.iterdir()] == ["page.html"]


def test_a_page_never_replaces_its_log(program, run, tmp_path):
    log = tmp_path / "evil.log"
    log.write_text(GIVEN_UP)
    os.link(log, tmp_path / "hard.log")
    os.symlink("evil.log", tmp_path / "soft.log")
    for output in ("evil.log", "./evil.log", "hard.log", "soft.log"):
        result = run("html", "-o", output, "evil.log")
        assert (result.returncode, result.stdout) == (70, "")
        assert result.stderr == f"tolkwd-report: {output}: the output is also an input\n"
    for redirected in ("html -o evil.log - < evil.log", "html -o - evil.log >> evil.log",
                       "html -o /dev/stdout - < evil.log >> evil.log"):
        result = subprocess.run(["sh", "-c", f'"$1" {redirected}', "sh", program], cwd=tmp_path,
                                stderr=subprocess.PIPE, encoding="utf-8", timeout=LIMIT_SECONDS)
        assert result.returncode == 70
        assert result.stderr.endswith(": the output is also an input\n")
    assert log.read_text() == GIVEN_UP


@pytest.mark.parametrize("output", ["/dev/stdout", "/proc/self/fd/1"])
def test_a_page_goes_to_a_pipe_that_has_no_name(run, output):
    assert run("html", "-o", output, log=GIVEN_UP).stdout.startswith("<!DOCTYPE html>")


class Follower:
    """The program with --follow, line by line."""

    def __init__(self, program, folder, *arguments):
        self.process = subprocess.Popen(
            [program, "events", "--follow", *arguments], cwd=folder, stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE, stderr=subprocess.PIPE, env={**os.environ, **ZONE})
        self.pending = b""

    def next(self):
        """The next line, as soon as it is there."""
        limit = time.monotonic() + LIMIT_SECONDS
        while b"\n" not in self.pending:
            ready, _, _ = select.select([self.process.stdout], [], [], limit - time.monotonic())
            assert ready, "nothing came"
            piece = os.read(self.process.stdout.fileno(), 65536)
            assert piece, "it has ended"
            self.pending += piece
        text, self.pending = self.pending.split(b"\n", 1)
        return text.decode()

    def end(self):
        self.process.kill()
        self.process.communicate(timeout=LIMIT_SECONDS)


@pytest.fixture
def follow(program, tmp_path):
    with contextlib.ExitStack() as ends:
        def start(*arguments):
            follower = Follower(program, tmp_path, *arguments)
            ends.callback(follower.end)
            return follower
        yield start


def append(path, text):
    with open(path, "a") as log:
        log.write(text)


def test_following_goes_on_as_the_log_grows(follow, tmp_path):
    log = tmp_path / "tolkwd.log"
    log.write_text(watched("web"))
    follower = follow("tolkwd.log")
    assert "watched from now on" in follower.next()
    append(log, failed("web", 60))
    assert "its status command failed" in follower.next()
    whole = tried("web", 270)
    append(log, whole[:50])
    append(log, whole[50:] + gaveup("web", 330))
    assert "recovery 1 begins" in follower.next()
    assert "given up" in follower.next()


def test_following_takes_a_log_that_is_emptied_or_replaced(follow, tmp_path):
    log = tmp_path / "tolkwd.log"
    log.write_text(watched("web"))
    follower = follow("tolkwd.log")
    follower.next()
    log.write_text(failed("web", 60))  # the same file, emptied
    assert "its status command failed" in follower.next()
    log.rename(tmp_path / "tolkwd.log.1")
    append(tmp_path / "tolkwd.log.1", tried("web", 270))
    assert "recovery 1 begins" in follower.next()
    log.write_text(gaveup("web", 330))
    assert "given up after 1 recovery" in follower.next()


def test_following_begins_with_the_logs_before(follow, tmp_path):
    (tmp_path / "old.log").write_text(watched("web"))
    (tmp_path / "tolkwd.log").write_text(failed("web", 60))
    follower = follow("--json", "old.log", "tolkwd.log")
    assert [json.loads(follower.next())["state"] for _ in range(2)] == ["up", "suspect"]


def test_following_a_stream_ends_with_it(run):
    result = run("events", "--follow", log=GIVEN_UP)
    assert (result.returncode, result.stderr) == (0, "")
    assert result.stdout == run("events", log=GIVEN_UP).stdout


@pytest.mark.parametrize("number", [signal.SIGINT, signal.SIGTERM])
def test_following_ends_quietly_when_told_to(follow, tmp_path, number):
    (tmp_path / "tolkwd.log").write_text(HEALTHY)
    follower = follow("tolkwd.log")
    follower.next()
    follower.process.send_signal(number)
    _, errors = follower.process.communicate(timeout=LIMIT_SECONDS)
    assert (follower.process.returncode, errors) == (-number, b"")


def test_following_ends_when_its_reader_goes_away(follow, tmp_path):
    (tmp_path / "tolkwd.log").write_text(HEALTHY)
    follower = follow("tolkwd.log")
    follower.next()
    follower.process.stdout.close()  # and nothing more is logged
    assert follower.process.wait(timeout=LIMIT_SECONDS) == -signal.SIGPIPE
    assert follower.process.stderr.read() == b""


def test_a_reader_that_goes_away_is_no_failure(program, tmp_path):
    (tmp_path / "tolkwd.log").write_text(HEALTHY + 2000 * failed("web", 60))
    with subprocess.Popen([program, "events", tmp_path / "tolkwd.log"], stdout=subprocess.PIPE,
                          stderr=subprocess.PIPE) as process:
        process.stdout.readline()
        process.stdout.close()
        assert process.wait(timeout=LIMIT_SECONDS) == -signal.SIGPIPE
        assert process.stderr.read() == b""
