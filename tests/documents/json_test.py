"""tolkwd-check(8) names each member of the plan and of the probe that the program writes, at its
place, and no other."""

import json
import pathlib
import re
import subprocess

import pytest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
PAGE = (PROJECT / "doc" / "tolkwd-check.8").read_text()
TIME_LIMIT = 60  # seconds

# The sample has a check and a dependent, so that nothing is null that could be an object.
SAMPLE = PROJECT / "config" / "tolkwd.xml"


def paths_told(section):
    """The members that a section of the page names, as {"outages.log.begins"}: those of each list
    belong to the item that it stands in. One list for each that stands in none."""
    lists = []
    items = []  # the names of each item that is open
    for line in section.splitlines():
        if line.startswith(".Bl "):
            if not items:
                lists.append(set())
            items.append([])
        elif line.startswith(".El"):
            items.pop()
        elif line.startswith(".It Cm "):
            names = [name.replace("\\", "") for name in line.removeprefix(".It Cm ").split(" , ")]
            above = items[-2] if len(items) > 1 else [""]
            items[-1] = [f"{path}{name}." for path in above for name in names]
            lists[-1] |= {path.rstrip(".") for path in items[-1]}
    return lists


def paths_in(value, time, path=""):
    """The same of what the program has written. A time has no members of its own here."""
    if isinstance(value, list):
        return set().union(*(paths_in(each, time, path) for each in value))
    if not isinstance(value, dict) or value.keys() == time:
        return {path.rstrip(".")} - {""}
    inside = (paths_in(each, time, f"{path}{name}.") for name, each in value.items())
    return set().union({path.rstrip(".")} - {""}, *inside)


def section(title):
    return re.split(r"^\.S[hs] ", PAGE.split(f".Ss {title}\n")[1], maxsplit=1, flags=re.M)[0]


@pytest.fixture(scope="module")
def written(program):
    """What the program says of the sample, in a sandbox."""
    done = subprocess.run(
        [PROJECT / "scripts" / "sandbox.sh", "--ro-bind", program, "/run/tolkwd-check",
         "--ro-bind", SAMPLE, "/run/sample.xml",
         "--", "/run/tolkwd-check", "--plan", "--probe", "--yes", "--json", "/run/sample.xml"],
        stdin=subprocess.DEVNULL, capture_output=True, text=True, timeout=TIME_LIMIT)
    assert done.stderr == ""
    return json.loads(done.stdout)


def test_the_page_tells_every_member_of_the_plan(written):
    time, members = paths_told(section("The plan"))
    assert time == {"seconds", "checks", "recoveries"}
    assert paths_in(written["plan"], time) == members


def test_the_page_tells_every_member_of_the_probe(written):
    members, = paths_told(section("The probe"))
    assert paths_in(written["probe"], {}) == members


def test_the_page_tells_every_member_around_them(written):
    members, = paths_told(PAGE.split(".Sh JSON\n")[1].split(".Ss ")[0])
    assert set(written) == members


def test_members_of_lists_belong_to_their_item():
    told = (".Bl -tag\n.It Cm a , b\nText.\n.Bl -tag\n.It Cm c\n.It Cm d\\-e\n.El\n.It Cm f\n.El\n"
            ".Bl -tag\n.It Cm g\n.El\n")
    assert paths_told(told) == [{"a", "b", "a.c", "a.d-e", "b.c", "b.d-e", "f"}, {"g"}]


def test_members_of_objects_in_arrays_are_found():
    assert paths_in([{"a": [{"b": 1}, {"c": None}], "t": {"s": 1}}], {"s"}) == {"a", "a.b", "a.c",
                                                                                "t"}
