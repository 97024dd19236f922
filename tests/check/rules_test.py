"""The rules of tolkwd-check: each has a folder with a file that breaks it, what is said about that
file, and the same file mended, about which nothing is said.

rules/RULE/ holds
  wrong.xml, right.xml  the two files
  expected              standard output of `tolkwd-check ARGUMENTS wrong.xml` there, and a line with
                        its exit status
  arguments             options for both, on one line; may be missing
  prepare.sh            what the sandbox needs before; run with the word wrong or right, in the
                        folder; may be missing

Of a probe, the findings are compared, and not the report behind the first empty line: it holds
times.

Each file is checked in a sandbox of its own, in a copy of its folder that belongs to root."""

import pathlib
import subprocess

import pytest

HERE = pathlib.Path(__file__).resolve().parent
PROJECT = HERE.parents[1]
FOLDERS = {folder.name: folder for folder in sorted((HERE / "rules").iterdir())}
TIME_LIMIT = 60  # seconds

# $1 is "wrong" or "right".
PLAY = """
mkdir -p /opt/varden/tolk/bin
cp -R --no-preserve=mode,ownership /run/rule /opt/rule && cd /opt/rule || exit 99
if [ -e prepare.sh ]; then sh -eu prepare.sh "$1" >/dev/null || exit 99; fi
arguments=
if [ -e arguments ]; then read -r arguments <arguments; fi
eval "set -- $1 $arguments"
file=$1.xml
shift
exec /run/program/tolkwd-check "$@" "$file"
"""


def sandboxed(program, folder, *command):
    """Runs the command with the program and the folder in /run, which is root's."""
    return subprocess.run(
        [PROJECT / "scripts" / "sandbox.sh",
         "--ro-bind", program, "/run/program/tolkwd-check", "--ro-bind", folder, "/run/rule",
         "--", *command],
        stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
        encoding="utf-8", timeout=TIME_LIMIT)


def said(result):
    assert result.stderr == ""
    return f"{result.stdout}exit status {result.returncode}\n"


def play(program, folder, which):
    result = sandboxed(program, folder, "sh", "-c", PLAY, "sh", which)
    if is_probe(folder):
        findings, _, report = result.stdout.rpartition("\n\n")
        assert "\n  status " in report
        result.stdout = findings and findings + "\n"
    return said(result)


def is_probe(folder):
    arguments = folder / "arguments"
    return arguments.exists() and "--probe" in arguments.read_text(encoding="utf-8")


def known_rules(program):
    listing = subprocess.run([program, "--rules"], stdout=subprocess.PIPE, text=True, check=True,
                             timeout=TIME_LIMIT)
    return {line.split()[0] for line in listing.stdout.splitlines()}


def test_each_rule_has_a_folder(program):
    assert known_rules(program) - set(FOLDERS) == set()


def test_each_folder_belongs_to_a_rule(program):
    assert set(FOLDERS) - known_rules(program) == set()


@pytest.mark.parametrize("name", FOLDERS)
def test_wrong_file_is_found(program, name):
    expected = (FOLDERS[name] / "expected").read_text(encoding="utf-8")
    assert f" [{name}]\n" in expected
    assert play(program, FOLDERS[name], "wrong") == expected


@pytest.mark.parametrize("name", FOLDERS)
def test_right_file_is_silent(program, name):
    assert play(program, FOLDERS[name], "right") == "exit status 0\n"


def test_a_draft_of_ones_own_is_worth_a_note(program):
    """In folders of one's own, about which nothing is said."""
    script = ("sh /run/rule/prepare.sh right; mkdir -p /opt/home/drafts /opt/varden/tolk/bin;"
              "cp /run/rule/right.xml /opt/home/drafts; chown -R 65534 /opt/home;"
              "exec setpriv --reuid=65534 --clear-groups"
              " /run/program/tolkwd-check /opt/home/drafts/right.xml")
    result = sandboxed(program, FOLDERS["writable-file"], "sh", "-c", script)
    line, = result.stdout.splitlines()
    assert line.startswith('/opt/home/drafts/right.xml:1:1: note: "/opt/home/drafts/right.xml", ')
    assert line.endswith(" [writable-file]")
    assert said(result).endswith("exit status 0\n")


@pytest.mark.parametrize("example, arguments", [
    ("config/tolkwd.xml", []),
    ("config/nginx-php-fpm.xml", []),
    # It bounds nothing, for it is killed anyway.
    ("scripts/demo/tolkwd.xml", ["--allow", "unbounded-command"]),
])
def test_shipped_example_is_silent(program, example, arguments):
    example = PROJECT / example
    script = ("mkdir -p /opt/varden/tolk/bin; cp --no-preserve=mode,ownership /run/rule/$1 /opt; "
              'cd /opt; exec /run/program/tolkwd-check "$@"')
    result = sandboxed(program, example.parent, "sh", "-c", script, "sh", example.name, *arguments)
    assert said(result) == "exit status 0\n"
