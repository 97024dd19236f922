"""tolkwd-report(1) tells each command, option, kind, state and member of JSON of the program, and
no other; and the times that it tells are understood."""

import json
import pathlib
import re
import subprocess

import pytest

from manual import paths_in, paths_told, section

PROJECT = pathlib.Path(__file__).resolve().parents[2]
PAGE = (PROJECT / "doc" / "tolkwd-report.1").read_text()
COMMANDS = ("status", "events", "html", "messages")
OPTION = re.compile(r"(?<![\w-])--?[a-z]+")

USAGE_STATUS = 64
TIME_LIMIT = 60  # seconds

# Something of everything: an outage that is over, so that nothing is null that could be an object.
LOG = """\
Sat Nov 21 15:00:00 2026 INFO wdmonitorthread|TID1 Name of the service being monitored: web
Sat Nov 21 15:00:00 2026 INFO wdmonitorthread|TID1 Binary path of service being monitored: /bin/web
Sat Nov 21 15:01:00 2026 ERROR wdmonitorthread|TID1 General ping failed for service web. Try to \
general ping more times now, if failed 3 times, will generally recover this service.
Sat Nov 21 15:04:30 2026 ERROR wdmonitorthread|TID1 Try the general recover for service web
Sat Nov 21 15:05:40 2026 INFO wdmonitorthread|TID1 General ping failed for service web, but this \
service has been general recoverred successfully.
"""


@pytest.fixture
def said(report):
    """said(ARGUMENT...): what the program says of the log, with its exit status."""
    def run(*arguments):
        done = subprocess.run([report, *arguments], input=LOG, capture_output=True, text=True,
                              timeout=TIME_LIMIT)
        return done.returncode, done.stdout, done.stderr

    return run


def items(text, macro):
    """The names of the items of the lists in a part of the page, in their order."""
    names = re.findall(rf"^\.It {macro} (.*)$", text, re.M)
    return [re.sub(r" No \*$", "", name).replace("\\", "") for name in names]


def options_of(help_text):
    return set(OPTION.findall(help_text.split("Options:")[1].split("\n\n")[0]))


def options_in_synopsis(command):
    """Those of one form of the program."""
    synopsis, = re.findall(rf"^\.Nm\n\.Cm {command}\n((?:(?!\.Nm).*\n)*)",
                           section(PAGE, "SYNOPSIS"), re.M)
    return {"-" + name.replace("\\", "") for name in re.findall(r"Fl (\S+)", synopsis)}


def test_the_page_tells_every_command(said):
    status, shown, _ = said("--help")
    listed = re.findall(r"^  ([a-z]+)", shown.split("Subcommands:")[1], re.M)
    assert status == 0
    assert set(listed) == set(COMMANDS) == set(items(section(PAGE, "COMMANDS"), "Cm"))


@pytest.mark.parametrize("command", COMMANDS)
def test_the_synopsis_tells_every_option(said, command):
    _, shown, _ = said(command, "--help")
    assert options_in_synopsis(command) == options_of(shown) - {"-h", "--help"}


def test_the_page_tells_every_option(said):
    known = options_of(said("--help")[1]).union(
        *(options_of(said(command, "--help")[1]) for command in COMMANDS))
    told = {"-" + option.split()[0] for line in items(section(PAGE, "OPTIONS"), "Fl")
            for option in re.sub(r" Ar \w+", "", line).replace("Fl ", "").split(" , ")}
    assert told == known


def test_the_page_tells_every_kind_in_its_order(said):
    status, _, refusal = said("events", "--kind", "no such kind", "-")
    known = re.search(r"these are: (.*)", refusal)[1].split(", ")
    assert status == USAGE_STATUS
    assert items(section(PAGE, "Kinds of events"), "Cm") == known


def test_the_page_tells_every_state_the_worst_first():
    source = (PROJECT / "tools" / "tolkwd-report" / "state.cpp").read_text()
    words = re.findall(r'"([a-z-]+)"', re.sub(r"#include.*", "", source))
    assert items(section(PAGE, "STATES"), "Cm") == words[::-1]


@pytest.mark.parametrize("when", items(section(PAGE, "Times"), "Ql"))
def test_every_time_that_the_page_tells_is_understood(said, when):
    status, _, refusal = said("events", "--since", when, "--until", when, "-")
    assert (status, refusal) == (0, "")


def test_what_is_no_time_is_refused(said):
    assert said("events", "--since", "some day", "-")[0] == USAGE_STATUS


def test_the_page_tells_every_member_of_the_status(said):
    members, = paths_told(section(PAGE, "The status"))
    assert paths_in(json.loads(said("status", "--json", "-")[1])) == members


def test_the_page_tells_every_member_of_the_events(said):
    members, = paths_told(section(PAGE, "The events"))
    assert paths_in(json.loads(said("events", "--json", "-")[1])) == members


def test_followed_events_have_the_version_too(said):
    whole = json.loads(said("events", "--json", "-")[1])
    lines = said("events", "--json", "--follow", "-")[1].splitlines()
    assert lines
    assert [json.loads(line) for line in lines] == [
        {"version": whole["version"], **event} for event in whole["events"]]
