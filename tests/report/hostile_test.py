"""Logs that somebody made to take memory and time: very many names, and very long ones."""

import json
import os
import resource
import subprocess
import sys

import pytest

LIMIT_SECONDS = 60
LONGEST = 4096
MEGABYTE = 10**6
STAMP = "Sat Nov 21 15:00:00 2026"


def announced(name, thread):
    return (f"{STAMP} INFO wdmonitorthread|TID{thread} "
            f"Name of the service being monitored: {name}\n"
            f"{STAMP} INFO wdmonitorthread|TID{thread} "
            f"Binary path of service being monitored: /usr/sbin/{name}\n")


def failed(name, thread):
    return (f"{STAMP} ERROR wdmonitorthread|TID{thread} General ping failed for service {name}. "
            "Try to general ping more times now, if failed 3 times, will generally recover this "
            "service.\n")


# Itself small: a process that it starts counts as being as large as this one at least.
MEASURE = """
import os, sys
process = os.posix_spawn(sys.argv[1], sys.argv[1:], os.environ)
print(os.wait4(process, 0)[2].ru_maxrss, file=sys.stderr)
"""


def peak_megabytes(command):
    """The most memory that a command takes."""
    done = subprocess.run([sys.executable, "-S", "-c", MEASURE, *command], check=True,
                          stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, encoding="utf-8",
                          env={**os.environ, "TZ": "UTC"}, timeout=LIMIT_SECONDS)
    return int(done.stderr) * 1024 / MEGABYTE


COMMANDS = [["status"], ["status", "--json"], ["events"], ["events", "--json"]]


@pytest.fixture(scope="module")
def many(tmp_path_factory):
    path = tmp_path_factory.mktemp("many") / "tolkwd.log"
    path.write_text("".join(announced(f"service{i:06}", 4096 * (i + 1)) for i in range(100000)))
    return path


@pytest.mark.parametrize("command", COMMANDS)
def test_a_hundred_thousand_services_take_little_memory(program, many, command):
    assert peak_megabytes([program, *command, many]) < 60


@pytest.fixture(scope="module")
def long(tmp_path_factory):
    path = tmp_path_factory.mktemp("long") / "tolkwd.log"
    with path.open("w") as log:
        for i in range(40):
            log.write(announced(f"{i}{MEGABYTE * 'x'}", i + 1))
    return path


@pytest.mark.parametrize("command", COMMANDS)
def test_names_of_a_megabyte_take_little_memory(program, long, command):
    assert peak_megabytes([program, *command, long]) < 30


@pytest.mark.parametrize("filling", ["x", "\t", "<", "é", "\u202e", "\udcff"])
@pytest.mark.parametrize("command", [["status"], ["html", "-o", "-"]])
def test_names_of_a_megabyte_take_little_time(program, command, filling):
    size = MEGABYTE // len(filling.encode(errors="surrogateescape"))
    log = "".join(failed(f"{i}{size * filling}", i + 1) for i in range(5))
    done = subprocess.run([program, *command, "-"], input=log, errors="surrogateescape",
                          encoding="utf-8", stdout=subprocess.DEVNULL, timeout=LIMIT_SECONDS,
                          preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_CPU, (5, 5)))
    assert done.returncode in (0, 1)


def report(program, log, *arguments):
    done = subprocess.run([program, *arguments, "--json", "-"], input=log, encoding="utf-8",
                          stdout=subprocess.PIPE, stderr=subprocess.PIPE, timeout=LIMIT_SECONDS)
    assert (done.returncode in (0, 1), done.stderr) == (True, "")
    return json.loads(done.stdout)


def test_a_name_that_is_cut_is_marked(program):
    begin = LONGEST * "x"
    log = announced(begin, 1) + announced(begin + "y", 2) + failed(begin + "z", 2)
    known = report(program, log, "status")["services"]
    path = f"/usr/sbin/{begin}"[:LONGEST] + "..."
    assert [(each["service"], each["state"], each["path"]) for each in known] == [
        (begin, "up", path), (begin + "...", "suspect", path)]


def test_a_service_is_found_by_a_name_that_is_cut(program):
    begin = LONGEST * "x"
    told = report(program, failed(begin + "y", 1), "events", "--service", begin + "z")["events"]
    assert [each["service"] for each in told] == [begin + "..."]
