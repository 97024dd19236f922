#!/usr/bin/python3
"""Puts what the benchmarks have measured into doc/PERFORMANCE.md, and draws its curves.

The document is written by hand but for the places between two marks: `<!-- table:ID -->`, or
`goals` or `machine` in place of `table:ID`, and `<!-- end -->`. Each table of the results has to
have its place and each place its table. Each curve becomes an SVG in doc/performance.
"""

import argparse
import datetime
import json
import os
import pathlib
import platform
import re
import subprocess
import sys

ROOT = pathlib.Path(__file__).resolve().parents[2]
PLACE = re.compile(r"(<!-- (table:[\w-]+|goals|machine) -->\n).*?(<!-- end -->)", re.DOTALL)

PLOT = """\
set terminal svg size 860,400 font 'sans-serif,13' background '#ffffff'
set output '{path}'
set title "{title}"
set xlabel "{xlabel}"
set ylabel "{ylabel}"
set key outside right center vertical Left reverse samplen 2
set grid back linecolor '#dddddd'
set border 3
set tics nomirror
set format y '%.12g'
{scale}
plot {series}
"""
COLOURS = ("#1b6ca8", "#d1495b", "#66a182", "#8d6a9f", "#edae49", "#555555")


def said_by(*command):
    """What a command prints, trimmed."""
    return subprocess.run(command, check=True, capture_output=True, text=True,
                          cwd=ROOT).stdout.strip()


def machine():
    """What the figures hold for."""
    fields = dict(line.split(":", 1) for line in said_by("lscpu").splitlines() if ":" in line)
    memory = os.sysconf("SC_PAGE_SIZE") * os.sysconf("SC_PHYS_PAGES") / 2**30
    system = platform.freedesktop_os_release()["PRETTY_NAME"]
    changes = said_by("git", "status", "--porcelain", "--", "src", "tools", "bench")
    commit = said_by("git", "log", "-1", "--format=%h") + (" with changes" if changes else "")
    date = datetime.datetime.now(datetime.timezone.utc).strftime("%Y-%m-%d %H:%M UTC")
    packages = ("monit", "supervisor", "libexpat1", "libpugixml1v5")
    versions = ", ".join(f"{name} {said_by('dpkg-query', '-W', '-f=${Version}', name)}"
                         for name in packages)
    rows = [["processor", f"{os.cpu_count()} × {fields['Model name'].strip()}"],
            ["memory", f"{memory:.1f} GiB"],
            ["system", f"{system}, Linux {platform.release()}, {' '.join(platform.libc_ver())}"],
            ["compiler", said_by("c++", "--version").splitlines()[0] + ", RelWithDebInfo"],
            ["peers", versions],
            ["commit", commit],
            ["date", date]]
    return markdown(["", ""], rows)


def cell(value):
    """A table's cell: numbers with thousands set apart."""
    if isinstance(value, bool) or not isinstance(value, (int, float)):
        return "–" if value is None else str(value)
    return f"{value:,}"


def markdown(columns, rows):
    """A table in Markdown, numbers to the right."""
    numbers = [bool(rows) and all(isinstance(row[i], (int, float)) or row[i] is None
                                  for row in rows) for i in range(len(columns))]
    lines = [columns, ["---:" if number else "---" for number in numbers],
             *([cell(value) for value in row] for row in rows)]
    return "".join("| " + " | ".join(line) + " |\n" for line in lines)


def is_met(goal):
    """Whether the figure is on the right side of its limit."""
    if goal["sense"] == "at most":
        return goal["measured"] <= goal["limit"]
    return goal["measured"] >= goal["limit"]


def goals_table(goals):
    """All goals, and whether they are met."""
    rows = [[goal["text"], f"{goal['sense']} {goal['limit']} {goal['unit']}".replace(" ratio", ""),
             goal["measured"], "met" if is_met(goal) else "**not met**"] for goal in goals]
    met = sum(map(is_met, goals))
    return markdown(["goal", "limit", "measured", ""], rows) + f"\n{met} of {len(goals)} met.\n"


def draw(curve, folder):
    """Draws one curve."""
    data, parts = "", []
    for number, series in enumerate(curve["series"]):
        data += f"$s{number} << END\n"
        data += "".join(" ".join(map(str, point)) + "\n" for point in series["points"]) + "END\n"
        colour = COLOURS[number % len(COLOURS)]
        parts.append(f"$s{number} using 1:2 with linespoints linewidth 2 pointtype 7 "
                     f"pointsize 0.6 linecolor '{colour}' title \"{series['name']}\"")
    scale = "".join(f"set logscale {axis}\n" for axis in "xy" if curve.get(f"log{axis}"))
    if not curve.get("logy"):
        scale += "set yrange [0:*]\n"
    path = folder / f"{curve['id']}.svg"
    script = data + PLOT.format(path=path, title=curve["title"], xlabel=curve["xlabel"],
                                ylabel=curve["ylabel"], scale=scale,
                                series=", \\\n     ".join(parts))
    subprocess.run(["gnuplot"], input=script, text=True, check=True)


def fill(document, places):
    """The document with each place filled; ends the program where one is missing."""
    wanted = [match.group(2) for match in PLACE.finditer(document)]
    if sorted(wanted) != sorted(places):
        sys.exit(f"places and results differ: {sorted(set(wanted) ^ set(places))}")
    return PLACE.sub(lambda match: match.group(1) + "\n" + places[match.group(2)] + "\n"
                     + match.group(3), document)


def main():
    """Reads all results and writes the document."""
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--document", type=pathlib.Path, default=ROOT / "doc/PERFORMANCE.md")
    parser.add_argument("results", type=pathlib.Path, nargs="+", metavar="RESULTS.json")
    options = parser.parse_args()
    found = [json.loads(path.read_text()) for path in options.results]
    goals = [goal for result in found for goal in result["goals"]]
    places = {"machine": machine(), "goals": goals_table(goals)}
    for result in found:
        for table in result["tables"]:
            places[f"table:{table['id']}"] = (markdown(table["columns"], table["rows"])
                                              + f"\n{table['note']}\n")
    options.document.write_text(fill(options.document.read_text(), places))
    folder = options.document.parent / "performance"
    folder.mkdir(exist_ok=True)
    for result in found:
        for curve in result["curves"]:
            draw(curve, folder)
    print(places["goals"])


if __name__ == "__main__":
    main()
