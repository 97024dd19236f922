"""The completion of tolkwd-check for bash."""

import os
import re
import subprocess

import pytest

import bash
import rules


@pytest.fixture
def offered(program, tmp_path):
    """offered(WORD...): what bash offers behind these words, in a folder with some files."""
    for name in ("tolkwd.xml", "other.xml", "two words.xml", "notes.txt"):
        (tmp_path / name).touch()
    (tmp_path / "old").mkdir()
    (tmp_path / "old" / "first.xml").touch()

    def ask(*words):
        return bash.offered("tolkwd-check", words, tmp_path,
                            f"{program.parent}:{os.environ['PATH']}")

    return ask


def test_configurations_and_folders(offered):
    assert offered("") == ["old", "other.xml", "tolkwd.xml", "two words.xml"]
    assert offered("t") == ["tolkwd.xml", "two words.xml"]
    assert offered("old/") == ["old/first.xml"]
    assert offered("n") == []
    assert offered("--json", "o") == ["old", "other.xml"]


def test_options(offered, program):
    shown = subprocess.run([program, "--help"], check=True, capture_output=True, text=True).stdout
    known = set(re.findall(r"(?<![\w-])--?[a-z]+", shown.split("Options:")[1]))
    assert offered("-") == sorted(known - {"-h"})
    assert offered("--p") == ["--plan", "--probe"]


@pytest.mark.parametrize("words", [("--allow",), ("--explain",), ("--allow", "=")])
def test_rules_behind_the_options_that_take_one(offered, program, words):
    known = sorted(rules.rules_of(program))
    assert offered(*words, "") == known
    assert offered(*words, known[0][:-1]) == [rule for rule in known
                                              if rule.startswith(known[0][:-1])]
    assert offered(*words, "no such rule") == []


def test_rules_right_behind_the_sign(offered, program):
    assert offered("--allow", "=") == sorted(rules.rules_of(program))


def test_nothing_behind_a_number(offered):
    assert offered("-t", "") == []
    assert offered("-t", "t") == []


def test_nothing_where_there_is_no_program(tmp_path):
    assert bash.offered("tolkwd-check", ["--allow", ""], tmp_path, "/nowhere") == []
