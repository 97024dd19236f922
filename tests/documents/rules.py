#!/usr/bin/python3
"""The list of rules in tolkwd-check(8), made of what the program says.

    tests/documents/rules.py build/release/tools/tolkwd-check/tolkwd-check

writes the page's list anew. rules_test.py fails while the page has another one.
"""

import pathlib
import re
import subprocess
import sys
import textwrap

PAGE = pathlib.Path(__file__).resolve().parents[2] / "doc" / "tolkwd-check.8"

# The longest line that mandoc has nothing to say about.
WIDTH = 80

_LIST = re.compile(r'(?<=^\.\\" Rules, as tests/documents/rules\.py writes them\.\n)'
                   r'.*?(?=^\.\\" End of the rules\.\n)', re.M | re.S)


def rules_of(program):
    """{rule: summary} of the program, in its order."""
    listed = subprocess.run([program, "--rules"], check=True, capture_output=True, text=True)
    return dict(line.split("  ", 1) for line in listed.stdout.splitlines())


def _in_roff(text):
    for plain, escape in (("\\", r"\e"), ("-", r"\-"), ("'", r"\(aq"), ("^", r"\(ha"),
                          ("~", r"\(ti"), ("`", r"\(ga")):
        text = text.replace(plain, escape)
    return text


def _in_plain(text):
    for plain, escape in (("-", r"\-"), ("'", r"\(aq"), ("^", r"\(ha"), ("~", r"\(ti"),
                          ("`", r"\(ga"), ("\\", r"\e")):
        text = text.replace(escape, plain)
    return text.replace(r"\&", "")


def written(rules):
    """The list as it stands in the page."""
    lines = []
    for name, summary in rules.items():
        lines.append(".It Cm " + _in_roff(name))
        for line in textwrap.wrap(_in_roff(summary), WIDTH - 2, break_on_hyphens=False):
            lines.append(r"\&" + line if line.startswith(".") else line)
    return "".join(line + "\n" for line in lines)


def list_in(page):
    """The list in the text of the page, as it stands there."""
    found, = _LIST.findall(page)
    return found


def rules_in(page):
    """{rule: summary} of the text of the page."""
    items = re.findall(r"^\.It Cm (.*)\n((?:(?!\.It).*\n)*)", list_in(page), re.M)
    return {_in_plain(name): _in_plain(" ".join(summary.split())) for name, summary in items}


def with_list(page, rules):
    """The text of the page with these rules."""
    return _LIST.sub(lambda _: written(rules), page)


if __name__ == "__main__":
    PAGE.write_text(with_list(PAGE.read_text(), rules_of(sys.argv[1])))
