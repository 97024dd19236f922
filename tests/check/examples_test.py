"""The mistakes that doc/OPERATING.md shows: their files are in examples/, and what the guide shows
of them is what the program says of them."""

import pathlib
import re
import subprocess

import pytest

import guide

HERE = pathlib.Path(__file__).resolve().parent
PROJECT = HERE.parents[1]

EXAMPLES = guide.examples("13. Checking a configuration before it is used", "tolkwd-check")
TIME_LIMIT = 60  # seconds

# Of a machine on which cron runs. The folder's files belong to root there.
PLAY = """
mkdir -p /opt/varden/tolk/bin
service cron start >/dev/null || exit 99
until [ "$(pidof cron)" = "$(cat /run/crond.pid)" ]; do sleep 0.05; done
cp -R --no-preserve=mode,ownership /run/examples /opt/examples && cd /opt/examples || exit 99
PATH=$PATH:/run/program
exec "$@"
"""


def without_figures(text):
    """A probe's text without what each machine and each run has of its own."""
    return re.sub(r"\d+(\.\d+)?( s\b| pages| MiB|: threads)|answers \"\d+\"|^ *\"\d+\"$", "N", text,
                  flags=re.M)


def output_of(program, arguments):
    result = subprocess.run(
        [PROJECT / "scripts" / "sandbox.sh",
         "--ro-bind", program, "/run/program/tolkwd-check",
         "--ro-bind", HERE / "examples", "/run/examples",
         "--", "sh", "-c", PLAY, "sh", "tolkwd-check", *arguments],
        stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
        encoding="utf-8", timeout=TIME_LIMIT)
    assert result.stderr == ""
    return result.stdout


@pytest.mark.parametrize("arguments, excerpt, shown", EXAMPLES,
                         ids=lambda value: " ".join(value[:3]) if value else "-")
def test_the_guide_shows_what_is_said(program, arguments, excerpt, shown):
    if excerpt:
        text = (HERE / "examples" / arguments[-1]).read_text(encoding="utf-8")
        assert "\n".join(excerpt) in re.sub(r"^ +", "", text, flags=re.M)
    output = output_of(program, arguments)
    assert output
    guide.assert_shown(shown, output, without_figures)


def test_the_guide_shows_each_file():
    shown = {arguments[-1] for arguments, _, _ in EXAMPLES}
    assert shown == {file.name for file in (HERE / "examples").iterdir()}


def test_an_answer_by_exit_status_is_found_by_a_trial_only(program):
    assert output_of(program, ["check.xml"]) == ""


@pytest.mark.parametrize("shown, output, same", [
    (["one two", "    three"], "one two three\n", True),
    (["one two"], "one two three\n", False),
    (["one", "...", "three", "..."], "one two three four\n", True),
    (["three", "...", "one"], "one two three\n", False),
    (["answers \"27\" in 0.01 s"], "answers \"28\" in 0.02 s\n", True),
    (["recovery 1 of 3"], "recovery 1 of 2\n", False),
    (["|  ^"], "|   ^\n", False),
])
def test_a_difference_is_noticed(shown, output, same):
    if same:
        guide.assert_shown(shown, output, without_figures)
    else:
        with pytest.raises(AssertionError):
            guide.assert_shown(shown, output, without_figures)
