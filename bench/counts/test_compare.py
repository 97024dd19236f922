"""Tests of compare.py: what it makes of the counts, with a valgrind and a program made up here."""

import json
import sys

import pytest

import compare

BUILT = {"compiler": "12.2.0", "libc": "2.36"}
UNITS = [{"name": "line", "title": "a log line", "repetitions": 10}]

# The start costs 5,000, each repetition COST; a child that has not become a command reports, too.
VALGRIND = """#!/bin/sh
echo "==1== I   refs:      7" >&2
count=$((5000 + COST * $3))
echo "==$$== I   refs:      $((count / 1000)),$(printf %03d $((count % 1000)))" >&2
"""
PROGRAM = f"""#!/bin/sh
[ "$1" != --describe ] || echo '{json.dumps({"units": UNITS, "built": BUILT})}'
"""


def command(path, text):
    path.write_text(text)
    path.chmod(0o700)
    return path


@pytest.fixture
def run(tmp_path, monkeypatch, capsys):
    """Runs compare.py where a log line costs so much; returns what it prints."""
    program = command(tmp_path / "program", PROGRAM)
    kept = tmp_path / "kept.json"

    def play(cost, *options):
        valgrind = command(tmp_path / "valgrind", VALGRIND.replace("COST", str(cost)))
        monkeypatch.setattr(compare, "VALGRIND", [valgrind])
        monkeypatch.setattr(sys, "argv", ["compare.py", "--program", str(program),
                                          "--kept", str(kept), *map(str, options)])
        assert compare.main() == 0
        return capsys.readouterr().out

    play.kept = kept
    return play


def test_the_start_is_not_counted(run):
    run(700, "--keep")
    assert json.loads(run.kept.read_text())["counts"] == {"line": 700}


def test_an_excess_is_shown(run):
    run(1000, "--keep")
    assert ("MORE THAN 5 % ABOVE: a log line: 1051 instructions, 1000 kept (+5.1 %)"
            in run(1051).splitlines())


def test_five_per_cent_above_are_none(run):
    run(1000, "--keep")
    assert "MORE THAN" not in run(1050)


def test_what_has_become_cheaper_should_be_kept(run):
    run(1000, "--keep")
    said = run(949)
    assert "More than 5 % below: a log line (-5.1 %). Keep it: compare.py --keep" in said
    assert "ABOVE" not in said
    assert "below" not in run(950)


def test_nothing_is_kept_unless_asked_for(run):
    run(1000, "--keep")
    run(2000)
    assert json.loads(run.kept.read_text())["counts"] == {"line": 1000}


def test_a_unit_without_a_kept_count_is_told(run):
    assert "Not kept yet: a log line." in run(1000)
    assert not run.kept.exists()


def test_another_compiler_is_told(run):
    run(1000, "--keep")
    kept = json.loads(run.kept.read_text())
    kept["built"]["compiler"] = "11.1.0"
    run.kept.write_text(json.dumps(kept))
    assert ("The counts kept are for another compiler (11.1.0; now 12.2.0): the comparison means "
            "less." in run(1000).splitlines())


def test_the_same_build_is_not_remarked_on(run):
    run(1000, "--keep")
    assert "another" not in run(1000)


def test_the_report_holds_the_excess(run, tmp_path):
    run(1000, "--keep")
    run(1200, "--out", tmp_path / "out.json")
    table = json.loads((tmp_path / "out.json").read_text())["tables"][0]
    assert table["rows"] == [["a log line", 1000, 1200, 20.0]]
    assert "MORE THAN 5 % ABOVE: a log line" in table["note"]


def test_work_that_fails_is_a_fault(tmp_path, monkeypatch):
    failing = command(tmp_path / "failing", "#!/bin/sh\necho a ping failed >&2\nexit 1\n")
    monkeypatch.setattr(compare, "VALGRIND", [failing])
    with pytest.raises(compare.Fault, match="a ping failed"):
        compare.instructions("program", "line", 1, tmp_path)


def test_a_valgrind_that_counts_nothing_is_a_fault(tmp_path, monkeypatch):
    silent = command(tmp_path / "silent", "#!/bin/sh\necho '==1== I   refs:  5' >&2\n")
    monkeypatch.setattr(compare, "VALGRIND", [silent])
    with pytest.raises(compare.Fault, match="no count"):
        compare.instructions("program", "line", 1, tmp_path)
