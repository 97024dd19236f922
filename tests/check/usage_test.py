"""How tolkwd-check answers a wrong command line, and files that are none."""

import json
import subprocess

import pytest

TIME_LIMIT = 60  # seconds
FULL = "/dev/full"  # refuses whatever is written to it


def answer(program, *arguments, text="", output=subprocess.PIPE):
    return subprocess.run([program, *arguments], input=text, stdout=output, stderr=subprocess.PIPE,
                          text=True, encoding="utf-8", timeout=TIME_LIMIT)


@pytest.mark.parametrize("arguments, said", [
    ([], "FILE is required"),
    ([""], "FILE is required"),
    (["one.xml", "two.xml"], "not expected: two.xml"),
    (["--plann", "one.xml"], "not expected: --plann"),
    (["--allow", "coment", "one.xml"], 'no rule is named "coment"'),
    (["--explain", "coment"], 'no rule is named "coment"'),
    (["--explain"], "1 required RULE missing"),
    (["--plan", "-t", "1h", "one.xml"], "-t = 1h"),
])
def test_a_wrong_command_line(program, arguments, said):
    done = answer(program, *arguments)
    assert (done.returncode, done.stdout) == (64, "")
    assert said in done.stderr


@pytest.mark.parametrize("arguments", [["."], ["no/such/file"], ["--plan", "."],
                                       ["--probe", "--yes", "."]])
def test_a_file_that_cannot_be_read(program, arguments):
    done = answer(program, *arguments)
    assert (done.returncode, done.stderr) == (2, "")
    assert done.stdout.startswith(f"{arguments[-1]}:1:1: error: the file cannot be read: ")
    assert done.stdout.endswith(" [unreadable-file]\n")


def test_a_file_that_cannot_be_read_is_not_loaded(program):
    done = answer(program, "--json", "--plan", "--probe", ".")
    said = json.loads(done.stdout)
    assert (done.returncode, done.stderr) == (2, "")
    assert [each["rule"] for each in said.pop("findings")] == ["unreadable-file"]
    assert said == {"version": 1, "file": ".", "loaded": False, "targets": [], "plan": [],
                    "probe": []}


def test_an_empty_file_through_a_pipe(program):
    done = answer(program, "--allow", "ping-folder", "--allow", "writable-file", "-")
    assert (done.returncode, done.stderr) == (2, "")
    assert done.stdout == "-:1:1: error: the file is empty: nothing is watched [no-target]\n"


@pytest.mark.parametrize("arguments", [["--help"], ["--version"], ["--rules"],
                                       ["--explain", "comment"], ["."], ["--json", "."]])
def test_an_output_that_cannot_be_written(program, arguments):
    with open(FULL, "w", encoding="utf-8") as full:
        done = answer(program, *arguments, output=full)
    assert done.returncode == 70
    assert done.stderr == "tolkwd-check: the output cannot be written\n"
