"""The mistakes that doc/OPERATING.md shows: their files are in examples/, and what the guide shows
of them is what the program says of them.

In that section of the guide, an indented block that begins with "tolkwd-check" is a command and its
output, folded where it is long; "..." stands for lines left out. One that begins with "<" stands in
the file of the next command. The rest is prose."""

import pathlib
import re
import subprocess

import pytest

HERE = pathlib.Path(__file__).resolve().parent
PROJECT = HERE.parents[1]
SECTION = "## 13. Checking a configuration before it is used\n"
LEFT_OUT = "..."
TIME_LIMIT = 60  # seconds

# Of a machine on which cron runs. The folder's files belong to root there.
PLAY = """
mkdir -p /opt/varden/tolk/bin
service cron start >/dev/null || exit 99
cp -R --no-preserve=mode,ownership /run/examples /opt/examples && cd /opt/examples || exit 99
PATH=$PATH:/run/program
exec "$@"
"""


def blocks():
    """The indented blocks of the section, each as its lines; an output's empty line is kept."""
    section = (PROJECT / "doc" / "OPERATING.md").read_text(encoding="utf-8").split(SECTION)[1]
    section = section.split("\n## ")[0]
    found = []
    for paragraph in section.split("\n\n"):
        lines = paragraph.strip("\n").split("\n")
        if not all(line.startswith("    ") for line in lines):
            continue
        lines = [line[4:] for line in lines]
        if lines[0].startswith(("<", "tolkwd-check ")):
            found.append(lines)
        else:
            found[-1] += ["", *lines]
    return found


def examples():
    """(arguments, lines of the file that are shown, output that is shown) of each command."""
    found = []
    excerpt = []
    for lines in blocks():
        if lines[0].startswith("<"):
            excerpt = lines
        else:
            found.append((lines[0].split()[1:], excerpt, lines[1:]))
            excerpt = []
    return found


def unfolded(text):
    """On one line. Blanks inside a line stay: the mark has to stand below its place."""
    return re.sub(r"\s*\n\s*", " ", text.strip())


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


def pieces_of(shown):
    """The runs of lines between those left out."""
    return [piece.strip("\n") for piece in re.split(rf"^{re.escape(LEFT_OUT)}$", "\n".join(shown),
                                                    flags=re.M)]


def assert_shown(shown, output):
    """Each piece of what is shown follows the one before it in the output; where nothing is said
    to be left out, nothing is."""
    pieces = [unfolded(without_figures(piece)) for piece in pieces_of(shown)]
    said = unfolded(without_figures(output))
    if len(pieces) == 1:
        assert pieces[0] == said
    for piece in pieces:
        assert piece in said
        said = said.split(piece, 1)[1] if piece else said


@pytest.mark.parametrize("arguments, excerpt, shown", examples(),
                         ids=lambda value: " ".join(value[:3]) if value else "-")
def test_the_guide_shows_what_is_said(program, arguments, excerpt, shown):
    if excerpt:
        text = (HERE / "examples" / arguments[-1]).read_text(encoding="utf-8")
        assert "\n".join(excerpt) in re.sub(r"^ +", "", text, flags=re.M)
    output = output_of(program, arguments)
    assert output
    assert_shown(shown, output)


def test_the_guide_shows_each_file():
    shown = {arguments[-1] for arguments, _, _ in examples()}
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
        assert_shown(shown, output)
    else:
        with pytest.raises(AssertionError):
            assert_shown(shown, output)
