"""tolkwd-check(8) has a line for each rule and each option of the program, and no other."""

import re
import subprocess

import pytest

import rules

PAGE = rules.PAGE.read_text()


def difference(known, page):
    """What only one of the two has, to be read; empty where they agree."""
    listed = rules.rules_in(page)
    return ([f"not in the page: {name}" for name in sorted(known.keys() - listed.keys())]
            + [f"no rule of the program: {name}" for name in sorted(listed.keys() - known.keys())]
            + [f"another summary: {name}\n  program: {known[name]}\n  page:    {listed[name]}"
               for name in sorted(known.keys() & listed.keys()) if known[name] != listed[name]])


def test_the_page_lists_the_rules_of_the_program(program):
    known = rules.rules_of(program)
    assert known
    found = difference(known, PAGE)
    if found or rules.list_in(PAGE) != rules.written(known):
        pytest.fail("\n".join([*found, "written anew by: tests/documents/rules.py PROGRAM"]),
                    pytrace=False)


def test_the_page_tells_every_option(program):
    shown = subprocess.run([program, "--help"], check=True, capture_output=True, text=True).stdout
    options = set(re.findall(r"(?<![\w-])--?[a-z]+", shown.split("Options:")[1]))
    section = PAGE.split(".Sh OPTIONS")[1].split(".Sh ")[0]
    told = {option.replace("\\", "") for line in re.findall(r"^\.It Fl (.*)$", section, re.M)
            for option in re.findall(r"(?<!\S)(?:\\-)?[a-z]+", line.split(" Ar ")[0])}
    assert "-t" in options
    assert {"-" + name for name in told} == options


@pytest.mark.parametrize("page, expected", [
    (rules.with_list(PAGE, {"b": "two"}), ["not in the page: a", "no rule of the program: b"]),
    (rules.with_list(PAGE, {"a": "two"}), ["another summary: a\n  program: one\n  page:    two"]),
    (rules.with_list(PAGE, {"a": "one"}), []),
])
def test_a_difference_is_noticed(page, expected):
    assert difference({"a": "one"}, page) == expected


def test_any_summary_survives_the_page():
    known = {"a-rule": "a 'word' and ~/-x, \\x1b and ^`", "b": ".it " + "a long one " * 20 + "..."}
    known["b"] = known["b"].strip()
    assert rules.rules_in(rules.with_list(PAGE, known)) == known
