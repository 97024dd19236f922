"""What doc/OPERATING.md shows of the log in examples/ is what the program says of it."""

import os
import pathlib
import subprocess

import pytest

import guide

HERE = pathlib.Path(__file__).resolve().parent

EXAMPLES = guide.examples("14. What was up, and what was down", "tolkwd-report")
TIME_LIMIT = 60  # seconds


@pytest.mark.parametrize("arguments, shown", [
    pytest.param(arguments, shown, id=" ".join(arguments)) for arguments, _, shown in EXAMPLES])
def test_the_guide_shows_what_is_said(program, arguments, shown):
    done = subprocess.run([program, *arguments], cwd=HERE / "examples",
                          env={**os.environ, "TZ": "UTC"}, stdin=subprocess.DEVNULL,
                          stdout=subprocess.PIPE, text=True, timeout=TIME_LIMIT)
    assert done.stdout
    guide.assert_shown(shown, done.stdout)


def test_the_guide_shows_a_table_and_a_history():
    assert [arguments[0] for arguments, _, _ in EXAMPLES] == ["status", "events"]
