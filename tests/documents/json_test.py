"""tolkwd-check(8) names each member of the plan and of the probe that the program writes, at its
place, and no other."""

import json
import pathlib
import subprocess

import pytest

from manual import paths_in, paths_told, section

PROJECT = pathlib.Path(__file__).resolve().parents[2]
PAGE = (PROJECT / "doc" / "tolkwd-check.8").read_text()
TIME_LIMIT = 60  # seconds

# The sample has a check and a dependent, so that nothing is null that could be an object.
SAMPLE = PROJECT / "config" / "tolkwd.xml"


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
    time, members = paths_told(section(PAGE, "The plan"))
    assert time == {"seconds", "checks", "recoveries"}
    assert paths_in(written["plan"], time) == members


def test_the_page_tells_every_member_of_the_probe(written):
    members, = paths_told(section(PAGE, "The probe"))
    assert paths_in(written["probe"], {}) == members


def test_the_page_tells_every_member_around_them(written):
    members, = paths_told(section(PAGE, "JSON"))
    assert set(written) == members


def test_members_of_lists_belong_to_their_item():
    told = (".Bl -tag\n.It Cm a , b\nText.\n.Bl -tag\n.It Cm c\n.It Cm d\\-e\n.El\n.It Cm f\n.El\n"
            ".Bl -tag\n.It Cm g\n.El\n")
    assert paths_told(told) == [{"a", "b", "a.c", "a.d-e", "b.c", "b.d-e", "f"}, {"g"}]


def test_members_of_objects_in_arrays_are_found():
    assert paths_in([{"a": [{"b": 1}, {"c": None}], "t": {"s": 1}}], {"s"}) == {"a", "a.b", "a.c",
                                                                                "t"}
