"""What tolkwd-check does with command lines, outputs and files that nobody means."""

import json
import subprocess

import pytest

TIME_LIMIT = 60  # seconds
ESCAPE = "\x1b[31m"

TARGET = "<wdmonitortarget>{}</wdmonitortarget>"
NAME = "<name>web</name>"


def check(program, *arguments, text="", stdout=subprocess.PIPE):
    return subprocess.run([program, *arguments], input=text, stdout=stdout, stderr=subprocess.PIPE,
                          text=True, encoding="utf-8", timeout=TIME_LIMIT)


@pytest.mark.parametrize("arguments", [
    ["-", ESCAPE], ["--" + ESCAPE], ["-t", ESCAPE, "-"], ["--plan=" + ESCAPE, "-"],
    ["--explain", ESCAPE], ["--allow", ESCAPE, "-"],
])
def test_refused_command_line_does_not_steer_the_terminal(program, arguments):
    result = check(program, *arguments)
    assert result.returncode == 64
    assert "\x1b" not in result.stdout + result.stderr
    assert "\\x1b[31m" in result.stderr


@pytest.mark.parametrize("option", ["--help", "--version", "--rules", "-"])
def test_output_that_cannot_be_written_is_a_failure(program, option):
    with open("/dev/full", "w", encoding="utf-8") as full:
        result = check(program, option, stdout=full)
    assert result.returncode == 70
    assert result.stderr == "tolkwd-check: the output cannot be written\n"


def test_without_proc_nothing_is_told_about_the_file(program):
    result = subprocess.run(
        ["bwrap", "--ro-bind", "/", "/", "--tmpfs", "/proc", "--dev", "/dev", "--", program, "-"],
        input=f"<wdtargets>{TARGET.format(NAME)}</wdtargets>", stdout=subprocess.PIPE,
        stderr=subprocess.PIPE, text=True, timeout=TIME_LIMIT)
    assert result.returncode == 70
    assert result.stdout == ""
    assert result.stderr == "tolkwd-check: /proc/self/fd: No such file or directory\n"


def test_parts_asked_for_are_there_without_a_file(program):
    result = check(program, "--json", "--plan", "--probe", "/no/such/file")
    assert result.returncode == 2
    parts = json.loads(result.stdout)
    assert parts["findings"][0]["rule"] == "unreadable-file"
    assert parts["plan"] == parts["probe"] == []


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
