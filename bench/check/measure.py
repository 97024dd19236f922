#!/usr/bin/python3
"""Measures how long tolkwd-check takes for a configuration of 10,000 targets, beside the daemon's
own load of it, and tells the report what came of it.

Whole processes, in turns: each round runs the checker, the load, and the load without its listing,
one right after the other. The medians of the rounds' times and of their ratios count.
"""

import argparse
import json
import pathlib
import statistics
import subprocess
import sys
import tempfile
import time

TARGETS = 10000
BRIEF_TARGETS = 50
ROUNDS = 9

FIELDS = {
    "name": "{name}", "binarypath": "/usr/sbin/{name}d",
    "startcmd": "timeout -k 5 60 service {name} start",
    "stopcmd": "timeout -k 5 60 service {name} stop",
    "functionalpingcmd": "(timeout -k 1 10 /usr/bin/{name}-check && echo service: ok)",
    "genpinginterval": "60", "funpinginterval": "300", "maxattemptofwakeup": "3",
    "messageformat": "plain", "hackmessagehandler": "NULL", "sendmessagehandler": "NULL",
    "MaxFPSkips": "5", "ThresholdAverageCPUUsage": "90000", "ThresholdMemoryUsage": "262144",
    "ThresholdThreadCount": "200", "ThresholdHandleCount": "1000"}
DEPENDENT = {"functionalpingcmd": "NULL"}


def service(element, name, fields):
    """A service of the file."""
    lines = "".join(f"<{key}>{value.format(name=name)}</{key}>\n"
                    for key, value in fields.items())
    return f"<{element}>\n{lines}</{element}>\n"


def configuration(targets, **changed):
    """The text of a configuration of so many targets with one dependent each; in the watched
    services these fields have these values."""
    parts = ["<?xml version='1.0'?>\n<wdtargets>\n"]
    for number in range(targets):
        parts += ["<wdmonitortarget>\n",
                  service("wdmonitorservice", f"web{number:05}", FIELDS | changed),
                  service("wdmondependsev", f"php{number:05}", FIELDS | DEPENDENT),
                  "</wdmonitortarget>\n"]
    return "".join([*parts, "</wdtargets>\n"])


class Programs:
    """What is run."""

    def __init__(self, check, load):
        self._check = check
        self._load = load

    def found(self, path, allowed):
        """The rules of all findings, these left out."""
        # Its exit status tells what it found.
        said = subprocess.run([self._check, "--json", *allow(allowed), path], capture_output=True)
        return [finding["rule"] for finding in json.loads(said.stdout)["findings"]]

    def round(self, path, allowed, targets):
        """Seconds that each of the three takes."""
        return {"check": self._seconds([self._check, *allow(allowed), path], None),
                "load": self._seconds([self._load, path], targets),
                "reading": self._seconds([self._load, path, "--unlisted"], targets)}

    @staticmethod
    def _seconds(command, targets):
        """The time of one process. `targets`: as many as it has to tell of."""
        out = subprocess.DEVNULL if targets is None else subprocess.PIPE
        start = time.monotonic()
        done = subprocess.run(command, stdout=out)
        taken = time.monotonic() - start
        if targets is None and done.returncode not in (0, 1, 2):
            sys.exit(f"{command[0]} failed with status {done.returncode}")
        if targets is not None and (done.returncode, int(done.stdout)) != (0, targets):
            sys.exit(f"{command[0]} did not load {targets} targets")
        return taken


def allow(rules):
    """The options that leave these rules out."""
    return [f"--allow={rule}" for rule in sorted(rules)]


def measure(programs, path, allowed, targets, rounds):
    """The median times in seconds, and the medians of the checker's ratios to the two others."""
    times = []
    for number in range(rounds):
        print(f"check: {path.name}, round {number + 1} of {rounds}", file=sys.stderr)
        times.append(programs.round(path, allowed, targets))
    return ({who: statistics.median(each[who] for each in times) for who in times[0]},
            {who: statistics.median(each["check"] / each[who] for each in times)
             for who in ("load", "reading")})


def milliseconds(seconds):
    """For the table."""
    return round(seconds * 1000, 1)


def results(programs, folder, targets, rounds):
    """The table and the goals."""
    right, wrong = folder / "right.xml", folder / "wrong.xml"
    right.write_text(configuration(targets))
    # Such an element stores the last text before it, which is ">".
    wrong.write_text(configuration(targets, messageformat=""))
    # What this machine has or has not is not the matter.
    allowed = set(programs.found(right, []))
    rows, goals = [], []
    for ident, path, what, least in (
            ("check-right", right, "without a finding", 0),
            ("check-wrong", wrong, "with a finding in every target", targets)):
        findings = len(programs.found(path, allowed))
        if findings < least:
            sys.exit(f"{path.name}: {findings} findings, expected at least {least}")
        times, ratios = measure(programs, path, allowed, targets, rounds)
        rows.append([what, findings, milliseconds(times["check"]), milliseconds(times["load"]),
                     round(ratios["load"], 2), milliseconds(times["reading"]),
                     round(ratios["reading"], 2)])
        goals.append({"id": ident, "text": f"time to check {targets:,} targets {what}, to that of "
                      "the daemon's load", "measured": round(ratios["load"], 3), "limit": 2.0,
                      "unit": "ratio", "sense": "at most"})
    size = right.stat().st_size / 1e6
    table = {"id": "check", "title": "Checking a configuration",
             "columns": ["", "findings", "tolkwd-check (ms)", "the daemon's load (ms)",
                         "to the load", "without its listing (ms)", "to that"],
             "rows": rows,
             "note": f"Whole processes on a file of {size:.1f} MB: {targets:,} targets, each with "
             "one dependent and every field written out. Left out by --allow: "
             f"{', '.join(sorted(allowed)) or 'nothing'}."}
    return {"tables": [table], "curves": [], "goals": goals}


def parse_arguments():
    """Returns the command line's options."""
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--check", type=pathlib.Path, required=True, help="tolkwd-check")
    parser.add_argument("--load", type=pathlib.Path, required=True, help="bench_check_load")
    parser.add_argument("--out", type=pathlib.Path, required=True, metavar="FILE.json",
                        help="where the results go")
    parser.add_argument("--brief", action="store_true",
                        help="one round of a small file: to see that all works")
    return parser.parse_args()


def main():
    """Measures, and writes the results."""
    options = parse_arguments()
    programs = Programs(options.check.resolve(), options.load.resolve())
    targets, rounds = (BRIEF_TARGETS, 1) if options.brief else (TARGETS, ROUNDS)
    with tempfile.TemporaryDirectory(prefix="tolkwd-check-", dir=pathlib.Path.cwd()) as folder:
        found = results(programs, pathlib.Path(folder), targets, rounds)
    options.out.write_text(json.dumps(found, indent=1) + "\n")


if __name__ == "__main__":
    main()
