"""The messages that tolkwd-report knows are those that the daemon's sources write, letter by
letter. REPORT_TABLE is the program that prints them."""

import os
import pathlib
import subprocess

import messages

SOURCES = pathlib.Path(__file__).resolve().parents[2] / "src"
TIME_LIMIT = 60  # seconds


def known():
    """The table, in its order."""
    done = subprocess.run([os.environ["REPORT_TABLE"]], check=True, capture_output=True, text=True,
                          timeout=TIME_LIMIT)
    return [messages.Message(*line.split("\t")) for line in done.stdout.splitlines()]


def test_the_table_has_what_the_sources_write_and_nothing_else():
    table = set(known())
    written = messages.from_sources(SOURCES)
    assert sorted(map(str, written - table)) == [], "not in the table"
    assert sorted(map(str, table - written)) == [], "not in the sources"


def test_the_table_has_nothing_twice():
    table = known()
    assert len(table) == len(set(table))
