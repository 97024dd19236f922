"""The completion of tolkwd-report for bash."""

import os
import re
import subprocess

import pytest

import bash

COMMANDS = ["events", "html", "messages", "status"]

# In place of the program: what it says of a log whose services have strange names.
PROGRAM = """#!/bin/sh
cat <<'END'
{"services":[{"service":"nginx","state":"up"},{"service": "getty@tty1","state":"up"},
{"service":"$(touch harm)","state":"up"},{"service":"two words","state":"up"},
{"service":{"hex":"ff"},"state":"up"}]}
END
"""


@pytest.fixture
def offered(report, tmp_path):
    """offered(WORD...): what bash offers behind these words, in a folder with some files."""
    for name in ("tolkwd.log", "two words.log", "notes.txt"):
        (tmp_path / name).touch()
    (tmp_path / "old").mkdir()
    (tmp_path / "old" / "first.log").touch()

    def ask(*words):
        return bash.offered("tolkwd-report", words, tmp_path,
                            f"{report.parent}:{os.environ['PATH']}")

    return ask


def options_of(program, command):
    shown = subprocess.run([program, *command, "--help"], check=True, capture_output=True,
                           text=True).stdout
    return set(re.findall(r"(?<![\w-])--?[a-z]+", shown.split("Options:")[1].split("\n\n")[0]))


def test_commands_and_options_come_first(offered, report):
    assert offered("") == sorted(COMMANDS + sorted(options_of(report, []) - {"-h"}))
    assert offered("s") == ["status"]


@pytest.mark.parametrize("command", COMMANDS)
def test_options_of_each_command(offered, report, command):
    assert offered(command, "-") == sorted(options_of(report, [command]) - {"-h"})


def test_options_behind_other_words(offered):
    assert offered("events", "--json", "tolkwd.log", "--s") == ["--service", "--since"]


@pytest.mark.parametrize("command", ["status", "events", "html"])
def test_logs_and_folders(offered, command):
    assert offered(command, "t") == ["tolkwd.log", "two words.log"]
    assert offered(command, "--json", "o") == ["old"]
    assert offered(command, "old/") == ["old/first.log"]


def test_pages(offered):
    assert offered("html", "-o", "n") == ["notes.txt"]


def test_kinds(offered, report):
    refused = subprocess.run([report, "events", "--kind", "no such kind"], capture_output=True,
                             text=True)
    known = re.search(r"these are: (.*)", refused.stderr)[1].split(", ")
    assert offered("events", "--kind", "") == sorted(known)
    assert offered("events", "--kind", "=") == sorted(known)
    assert offered("events", "--kind", "=", "reco") == ["recovered", "recovery-tried"]


def test_nothing_behind_a_time_and_messages(offered):
    assert offered("events", "--since", "t") == []
    assert offered("events", "--until", "=") == []
    assert offered("messages", "t") == []


def test_services_of_the_log_whose_names_are_plain(tmp_path):
    program = tmp_path / "tolkwd-report"
    program.write_text(PROGRAM)
    program.chmod(0o755)
    path = f"{tmp_path}:{os.environ['PATH']}"
    words = ["events", "--service"]
    assert bash.offered("tolkwd-report", [*words, ""], tmp_path, path) == ["getty@tty1", "nginx"]
    assert bash.offered("tolkwd-report", [*words, "=", "n"], tmp_path, path) == ["nginx"]
    assert not (tmp_path / "harm").exists()


def test_nothing_where_there_is_no_program(tmp_path):
    assert bash.offered("tolkwd-report", ["events", "--service", ""], tmp_path) == []
