"""What doc/OPERATING.md shows of a program, to be held against what the program says.

In a section of the guide, an indented block that begins with the program's name is a command and
its output, folded where it is long; "..." stands for lines left out. One that begins with "<"
stands in the file of the next command. The rest is prose, and commands of others."""

import pathlib
import re

GUIDE = pathlib.Path(__file__).resolve().parents[2] / "doc" / "OPERATING.md"
LEFT_OUT = "..."


def _section(title):
    return GUIDE.read_text(encoding="utf-8").split(f"## {title}\n")[1].split("\n## ")[0]


def commands(title, word):
    """The indented lines of the section that hold the word."""
    return [line[4:] for line in _section(title).splitlines()
            if line.startswith("    ") and word in line]


def script(title, word):
    """The script of the section that holds the word."""
    found, = [block for block in re.findall(r"^```sh\n(.*?)^```$", _section(title), re.M | re.S)
              if word in block]
    return found


def _blocks(title, program):
    """The indented blocks of the section that are of this program, each as its lines. An output's
    empty line is kept."""
    found = []
    inside = False  # such a block
    for paragraph in _section(title).split("\n\n"):
        lines = paragraph.strip("\n").split("\n")
        indented = all(line.startswith("    ") for line in lines)
        lines = [line[4:] for line in lines]
        if indented and lines[0].startswith(("<", f"{program} ")):
            inside = True
            found.append(lines)
        elif indented and inside:
            found[-1] += ["", *lines]
        else:
            inside = False
    return found


def examples(title, program):
    """(arguments, lines of the file that are shown, output that is shown) of each command."""
    found = []
    excerpt = []
    for lines in _blocks(title, program):
        if lines[0].startswith("<"):
            excerpt = lines
        else:
            found.append((lines[0].split()[1:], excerpt, lines[1:]))
            excerpt = []
    return found


def unfolded(text):
    """On one line. Blanks inside a line stay: what has its place has to stand there."""
    return re.sub(r"\s*\n\s*", " ", text.strip())


def pieces_of(shown):
    """The runs of lines between those left out."""
    return [piece.strip("\n") for piece in re.split(rf"^{re.escape(LEFT_OUT)}$", "\n".join(shown),
                                                    flags=re.M)]


def assert_shown(shown, output, comparable=lambda text: text):
    """Each piece of what is shown follows the one before it in the output; where nothing is said
    to be left out, nothing is. What differs each time is for `comparable` to take out."""
    pieces = [unfolded(comparable(piece)) for piece in pieces_of(shown)]
    said = unfolded(comparable(output))
    if len(pieces) == 1:
        assert pieces[0] == said
    for piece in pieces:
        assert piece in said
        said = said.split(piece, 1)[1] if piece else said
