#!/usr/bin/python3
"""Counts the instructions of the daemon's pieces of work, and compares them with those kept.

Each piece of work is done N and 2N times under valgrind; the difference, divided by N, is what it
costs, free of the program's start. Only the daemon's own process is counted, not the commands that
it runs. counts.json holds the counts that were kept, and what they were built with.

The result informs and decides nothing: the exit status is 0 whatever the counts are, and another
one only where a piece of work could not be done.
"""

import argparse
import json
import pathlib
import platform
import re
import subprocess
import sys
import tempfile

KEPT = pathlib.Path(__file__).with_name("counts.json")
NOTABLE_PERCENT = 5

# Nothing of the machine's own: its time zone, its locale, and which of the C library's variants of
# a function fit its processor.
SPECIAL_PROCESSORS = "-AVX512VL,-AVX512BW,-AVX2,-AVX,-BMI2,-ERMS,-FSRM"
ENVIRONMENT = {"PATH": ".:/usr/bin:/bin", "TZ": "UTC0", "LC_ALL": "C",
               "GLIBC_TUNABLES": f"glibc.cpu.hwcaps={SPECIAL_PROCESSORS}"}
VALGRIND = ["valgrind", "--tool=cachegrind", "--cache-sim=no", "--trace-children=no",
            "--cachegrind-out-file=/dev/null"]


class Fault(Exception):
    """A piece of work could not be done or counted."""


def run(command, folder):
    """Runs a command in the folder and returns it, ended; raises where it fails."""
    with subprocess.Popen(command, cwd=folder, env=ENVIRONMENT, text=True,
                          stdout=subprocess.DEVNULL, stderr=subprocess.PIPE) as process:
        process.errors = process.stderr.read()
    if process.returncode != 0:
        raise Fault(f"{' '.join(map(str, command))}:\n{process.errors}")
    return process


def instructions(program, unit, repetitions, folder):
    """How many instructions so many repetitions take, the program's start included."""
    ended = run([*VALGRIND, program, unit, str(repetitions)], folder)
    # A child that has not yet become a command would report with an id of its own.
    found = re.search(rf"^=={ended.pid}== I +refs: +([\d,]+)$", ended.errors, re.MULTILINE)
    if not found:
        raise Fault(f"no count in what valgrind said:\n{ended.errors}")
    return int(found.group(1).replace(",", ""))


def count(program, units):
    """Returns the instructions of each unit once, by its name."""
    counts = {}
    with tempfile.TemporaryDirectory(prefix="tolkwd-counts-") as folder:
        run([program, "--prepare"], folder)
        for unit in units:
            once, twice = (instructions(program, unit["name"], times * unit["repetitions"], folder)
                           for times in (1, 2))
            counts[unit["name"]] = round((twice - once) / unit["repetitions"])
    return counts


def describe(program):
    """What the program says of itself: its units, and what it was built with."""
    described = json.loads(subprocess.run([program, "--describe"], check=True,
                                          capture_output=True, text=True).stdout)
    described["built"]["machine"] = platform.machine()
    return described


def excess(kept, now):
    """By how many per cent `now` is above `kept`; nothing where nothing was kept."""
    return None if not kept else round(100 * (now - kept) / kept, 2)


def compare(units, kept, counts):
    """Returns a row for each unit: what it is, the count kept, the count now, the excess in %."""
    rows = []
    for unit in units:
        before, now = kept["counts"].get(unit["name"]), counts[unit["name"]]
        rows.append([unit["title"], before, now, excess(before, now)])
    return rows


def remarks(rows):
    """Returns the lines that whoever changed the daemon should read."""
    lines = []
    for title, before, now, percent in rows:
        if percent is None:
            lines.append(f"Not kept yet: {title}. Keep it: compare.py --keep")
        elif percent > NOTABLE_PERCENT:
            lines.append(f"MORE THAN {NOTABLE_PERCENT} % ABOVE: {title}: {now} instructions, "
                         f"{before} kept ({percent:+} %)")
        elif percent < -NOTABLE_PERCENT:
            lines.append(f"More than {NOTABLE_PERCENT} % below: {title} ({percent:+} %). "
                         "Keep it: compare.py --keep")
    return lines


def differences(kept, built):
    """Returns a line for each thing that makes the comparison mean less."""
    return [f"The counts kept are for another {name} ({kept.get(name)}; now {built.get(name)}): "
            "the comparison means less."
            for name in sorted(kept.keys() | built.keys()) if kept.get(name) != built.get(name)]


def shown(rows):
    """Returns the rows as a table for people."""
    def cells(row):
        return ["" if cell is None else str(cell) for cell in row]

    table = [["", "kept", "now", "difference (%)"], *map(cells, rows)]
    widths = [max(map(len, column)) for column in zip(*table)]
    return "\n".join("  ".join([row[0].ljust(widths[0]),
                                *(cell.rjust(width) for cell, width in zip(row[1:], widths[1:]))])
                     for row in table)


def report(rows, said):
    """The results as the report of all benchmarks takes them."""
    note = ("Instructions of the daemon's own process, counted by valgrind; the commands that it "
            "runs are not among them. The clock stands still while lines are written, and passes a "
            "minute between two pings or looks.")
    return {"tables": [{"id": "counts", "title": "Instructions of each piece of work",
                        "columns": ["", "kept", "now", "difference (%)"],
                        "rows": [["" if cell is None else cell for cell in row] for row in rows],
                        "note": " ".join([note, *said])}],
            "curves": [], "goals": []}


def keep(path, built, counts):
    """Makes these counts those that later ones are compared with."""
    path.write_text(json.dumps({"built": built, "counts": counts}, indent=2) + "\n")


def parse_arguments():
    """Returns the command line's options."""
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--program", type=pathlib.Path, required=True, metavar="COUNTED",
                        help="bench_counts, as the release preset builds it")
    parser.add_argument("--keep", action="store_true", help="rewrite counts.json")
    parser.add_argument("--kept", type=pathlib.Path, default=KEPT, metavar="FILE",
                        help="the counts kept; counts.json beside this script by default")
    parser.add_argument("--out", type=pathlib.Path, metavar="FILE.json",
                        help="write the results for the report to FILE.json")
    parser.add_argument("--brief", action="store_true", help="changes nothing: a run is brief")
    return parser.parse_args()


def main():
    """Counts, compares, and returns the exit status."""
    options = parse_arguments()
    program = options.program.resolve()
    try:
        described = describe(program)
        counts = count(program, described["units"])
    except Fault as fault:
        print(fault, file=sys.stderr)
        return 1
    kept = {"built": described["built"], "counts": {}}  # of a first time
    if options.kept.exists():
        kept = json.loads(options.kept.read_text())
    rows = compare(described["units"], kept, counts)
    said = differences(kept["built"], described["built"]) + remarks(rows)
    print("\n".join([shown(rows), *said]))
    if options.out:
        options.out.write_text(json.dumps(report(rows, said), indent=1) + "\n")
    if options.keep:
        keep(options.kept, described["built"], counts)
    return 0


if __name__ == "__main__":
    sys.exit(main())
