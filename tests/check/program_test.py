"""What tolkwd-check does with files that nobody means."""

import subprocess

import pytest

TIME_LIMIT = 60  # seconds
TARGET = "<wdmonitortarget>{}</wdmonitortarget>"
NAME = "<name>web</name>"


def check(program, *arguments, text="", stdout=subprocess.PIPE):
    return subprocess.run([program, *arguments], input=text, stdout=stdout, stderr=subprocess.PIPE,
                          text=True, encoding="utf-8", timeout=TIME_LIMIT)


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
    result = check(program, "-", text=f"<wdtargets>{LARGE_FILES[kind]}")
    assert result.returncode in (1, 2)
    assert result.stdout.startswith("-:1:")
