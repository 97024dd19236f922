"""Logs as they come, and what the report makes of them.

logs/NAME.log has beside it
  NAME.expected     each service's state at the end, in the order of `status --json`
  NAME.environment  variables for the program, KEY=VALUE on a line; without it TZ=UTC

every-message.log holds each message that the daemon can write."""

import json
import os
import pathlib
import re
import subprocess
import sys

import pytest

HERE = pathlib.Path(__file__).resolve().parent
PROJECT = HERE.parents[1]
LOGS = {log.stem: log for log in sorted((HERE / "logs").glob("*.log"))}
LIMIT_SECONDS = 60

sys.path.insert(0, str(PROJECT / "tests" / "documents"))
import messages  # noqa: E402  (stands beside other tests)

STAMP = re.compile(rb"[A-Z][a-z]{2} [A-Z][a-z]{2} [ 0-9]\d \d\d:\d\d:\d\d \d{4} ")


def environment(log):
    settings = log.with_suffix(".environment")
    lines = settings.read_text().splitlines() if settings.exists() else ["TZ=UTC"]
    return dict(os.environ, **dict(line.split("=", 1) for line in lines))


def report(program, log, *arguments):
    """The document that the program prints about the log."""
    done = subprocess.run([program, *arguments, "--json", log], stdout=subprocess.PIPE,
                          stderr=subprocess.PIPE, env=environment(log), timeout=LIMIT_SECONDS)
    assert (done.returncode in (0, 1), done.stderr) == (True, b"")
    return json.loads(done.stdout)


def test_there_is_a_log_for_each_expectation():
    assert set(LOGS) == {found.stem for found in (HERE / "logs").glob("*.expected")}
    assert "every-message" in LOGS


@pytest.mark.parametrize("name", LOGS)
def test_states_at_the_end(program, name):
    expected = json.loads(LOGS[name].with_suffix(".expected").read_text())
    services = report(program, LOGS[name], "status")["services"]
    assert [{member: service[member] for member in ("service", "state", "inferred", "since")}
            for service in services] == expected


@pytest.mark.parametrize("name", LOGS)
def test_a_log_in_two_pieces_tells_the_same(program, name, tmp_path):
    content = LOGS[name].read_bytes()
    middle = content.index(b"\n", len(content) // 2) + 1
    pieces = [tmp_path / "1", tmp_path / "2"]
    pieces[0].write_bytes(content[:middle])
    pieces[1].write_bytes(content[middle:])
    done = subprocess.run([program, "status", "--json", *pieces], stdout=subprocess.PIPE,
                          env=environment(LOGS[name]), timeout=LIMIT_SECONDS)
    assert json.loads(done.stdout)["services"] == report(program, LOGS[name], "status")["services"]


def form(message):
    """What a line of this message looks like."""
    text = re.sub(r"\\{[A-Z]+\\}", "(?s:.*)", re.escape(message.text))
    if message.level == messages.STANDARD_ERROR:
        return re.compile(text.encode())
    head = re.escape(f"{message.level} {message.module}|TID")
    return re.compile(STAMP.pattern + head.encode() + rb"\d+ " + text.encode())


def test_each_message_of_the_daemon_is_in_the_log():
    lines = LOGS["every-message"].read_bytes().split(b"\n")
    missing = [str(message) for message in messages.from_sources(PROJECT / "src")
               if not any(form(message).fullmatch(line) for line in lines)]
    assert missing == []


def test_each_line_of_every_message_is_told(program):
    log = LOGS["every-message"]
    lines = log.read_bytes().count(b"\n")
    count = report(program, log, "status")["log"]
    assert (count["lines"], count["messages"], count["foreign"], count["torn"]) == (
        lines, lines, 0, 0)
    told = [event["line"] for event in report(program, log, "events", "--all")["events"]
            if event["line"] is not None]
    assert sorted(told) == list(range(1, lines + 1))


def test_each_state_is_in_every_message(program):
    states = {service["state"] for service in report(program, LOGS["every-message"],
                                                     "status")["services"]}
    assert states == {"up", "busy", "not-watched", "command-not-recognised", "suspect",
                      "functional-failure", "recovering", "functional-recovering",
                      "unknown-service", "gave-up"}
