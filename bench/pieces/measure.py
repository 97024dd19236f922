#!/usr/bin/python3
"""Measures the daemon's pieces against their peers, and tells the report what came of it.

bench_pieces runs every benchmark of a pair once, one right after the other; this is repeated, and
of each benchmark's times, and of the pairs' ratios, the medians count: what disturbs the machine
for a while disturbs both of a pair.
"""

import argparse
import collections
import json
import os
import pathlib
import statistics
import subprocess
import sys
import tempfile

# What is measured how often: commands' times differ more than the rest.
ROUNDS = {"^(line|suppressed|together|records|load)": 9, "^(generalping|functionalping|check)": 25}
SECONDS_EACH = 0.1
BRIEF_SECONDS_EACH = 0.001
MICROSECONDS = 1e-3  # of the nanoseconds that the results are in
IN_NANOSECONDS = {"ns": 1, "us": 1e3, "ms": 1e6, "s": 1e9}

PLACES = {"disk": "on disk", "shm": "on /dev/shm"}


class Results:
    """The times of all rounds, in nanoseconds, by the benchmarks' names."""

    def __init__(self):
        self.times = collections.defaultdict(list)
        self.own = collections.defaultdict(list)

    def add(self, benchmarks):
        """Takes one round's results."""
        for benchmark in benchmarks:
            if benchmark.get("error_occurred"):
                raise SystemExit(f"{benchmark['name']}: {benchmark['error_message']}")
            name = benchmark["name"]
            self.times[name].append(benchmark["real_time"]
                                    * IN_NANOSECONDS[benchmark["time_unit"]])
            self.own[name].append(benchmark.get("own", 0) * IN_NANOSECONDS["s"])

    def has(self, name):
        """Whether there is a benchmark of this name."""
        return name in self.times

    def time(self, name):
        """Its median."""
        return statistics.median(self.times[name])

    def own_time(self, name):
        """The median of the processor time that it spent itself."""
        return statistics.median(self.own[name])

    def ratio(self, ours, peers):
        """The median of the ratios of the two, round by round."""
        return statistics.median(one / other for one, other
                                 in zip(self.times[ours], self.times[peers]))

    def own_ratio(self, ours, peers):
        """The same of the processor times that they spent themselves."""
        return statistics.median(one / other for one, other
                                 in zip(self.own[ours], self.own[peers]))

    def sizes(self, stem):
        """The sizes that the benchmark was run with."""
        return sorted(int(name.rsplit("/", 1)[1]) for name in self.times
                      if name.startswith(stem + "/"))


def table(ident, title, columns, rows, note):
    """A table for the report."""
    return {"id": ident, "title": title, "columns": columns, "rows": rows, "note": note}


def goal(ident, text, measured, limit, sense="at most"):
    """A goal for the report; it is a ratio."""
    return {"id": ident, "text": text, "measured": round(measured, 3), "limit": limit,
            "unit": "ratio", "sense": sense}


def counted(targets):
    """So many targets, in words."""
    return "one target" if targets == 1 else f"{targets:,} targets"


def lines(results):
    """One log line against its system calls alone."""
    rows, goals = [], []
    for place, where in PLACES.items():
        rate = 1 / results.ratio(f"line/tolkwd/{place}", f"line/bare/{place}")
        suppressed = 1 / results.ratio(f"suppressed/tolkwd/{place}", f"suppressed/bare/{place}")
        with_number = 1 / results.ratio(f"line/number/{place}", f"line/bare/{place}")
        for what, ours, peers, ratio in (
                ("a line of text", "line/tolkwd", "line/bare", rate),
                ("a line with a number", "line/number", "line/bare", with_number),
                ("a dropped debug line", "suppressed/tolkwd", "suppressed/bare", suppressed)):
            rows.append([f"{what}, {where}", round(results.time(f"{ours}/{place}")),
                         round(results.time(f"{peers}/{place}")), round(ratio, 2)])
        goals += [goal(f"line-{place}", f"rate of a log line {where} to that of its system calls",
                       rate, 0.85, "at least"),
                  goal(f"suppressed-{place}", f"rate of a dropped debug line {where} to that of "
                       "open, lseek and close", suppressed, 0.95, "at least")]
    return [table("line", "One log line", ["", "tolkwd (ns)", "system calls alone (ns)",
                                           "its rate to theirs"], rows,
                  "Composing and writing one message, against open, lseek, two writes and close of "
                  "a line already made; for a dropped line, against open, lseek and close. "
                  "Standard output is /dev/null.")], [], goals


def together(results):
    """Many threads that log at once."""
    rows, series = [], []
    threads = sorted({int(name.rsplit(":", 1)[1]) for name in results.times
                      if name.startswith("together/")})

    def rate(who, place, count):
        name = f"together/{who}/{place}/real_time/threads:{count}"
        return round(IN_NANOSECONDS["s"] / results.time(name))

    for count in threads:
        rows.append([count] + [rate(who, place, count) for place in PLACES
                               for who in ("tolkwd", "bare")])
    for place, where in PLACES.items():
        for who, name in (("tolkwd", "tolkwd"), ("bare", "system calls alone")):
            series.append({"name": f"{name}, {where}",
                           "points": [[count, rate(who, place, count)] for count in threads]})
    note = ("Lines per second of all threads together. Each run checks that every line of the "
            "file is whole; the file is emptied at its limit by both.")
    columns = ["threads", "tolkwd, disk", "system calls, disk", "tolkwd, /dev/shm",
               "system calls, /dev/shm"]
    curve = {"id": "together", "title": "Log lines per second", "xlabel": "threads",
             "ylabel": "lines per second", "logx": True, "logy": False, "series": series}
    return [table("together", "Threads that log at once", columns, rows, note)], [curve], []


def records(results):
    """Reading a configuration, beside two libraries."""
    rows, goals = [], []
    readers = ("tolkwd", "expat", "pugixml")
    sizes = results.sizes("records/tolkwd")
    for size in sizes:
        to_expat, to_pugixml = (results.ratio(f"records/tolkwd/{size}", f"records/{peer}/{size}")
                                for peer in readers[1:])
        rows.append([size, *(round(results.time(f"records/{who}/{size}") * MICROSECONDS, 1)
                             for who in readers), round(to_expat, 2), round(to_pugixml, 2)])
        goals += [goal(f"expat-{size}", f"reading {counted(size)}, to expat's time", to_expat,
                       0.35),
                  goal(f"pugixml-{size}", f"reading {counted(size)}, to pugixml's time",
                       to_pugixml, 1.0)]
    curve = {"id": "records", "title": "Reading a configuration", "xlabel": "targets",
             "ylabel": "microseconds per target", "logx": True, "logy": False,
             "series": [{"name": who,
                         "points": [[size, results.time(f"records/{who}/{size}")
                                     * MICROSECONDS / size] for size in sizes]}
                        for who in readers]}
    return [table("records", "Reading a configuration",
                  ["targets", "tolkwd (µs)", "expat (µs)", "pugixml (µs)", "to expat",
                   "to pugixml"], rows,
                  "From the file to the records of all targets, each with one dependent and every "
                  "field written out; the libraries fill the same records, which is checked.")], \
        [curve], goals


def load(results):
    """The whole load, the listing in the log included."""
    sizes = results.sizes("load/tolkwd")
    times = {size: results.time(f"load/tolkwd/{size}") * MICROSECONDS for size in sizes}
    rows = [[size, round(times[size] / 1000, 3), round(times[size] / size, 1)] for size in sizes]
    goals = []
    if {1000, 20000} <= set(sizes):
        goals.append(goal("load-linear", "time to load 20,000 targets to that of 1,000",
                          times[20000] / times[1000], 22))
    return [table("load", "The whole load", ["targets", "time (ms)", "per target (µs)"], rows,
                  "Reading, the list of all services, and the listing's 29 debug lines a target, "
                  "for each of which the log is opened though debug lines are off.")], [], goals


def pings(results):
    """Pings and checks, against running and reading alone."""
    rows, goals = [], []
    for what, title, limit, own_limit in (
            ("generalping", "general ping", 1.03, 1.3),
            ("functionalping", "functional ping", 1.03, 1.3),
            ("check", "threshold check", 1.05, None)):
        ours, bare = f"{what}/tolkwd/manual_time", f"{what}/bare/manual_time"
        ratio, own_ratio = results.ratio(ours, bare), results.own_ratio(ours, bare)
        rows.append([title, *(round(time * MICROSECONDS, 1) for time in
                              (results.time(ours), results.time(bare))), round(ratio, 3),
                     *(round(time * MICROSECONDS, 1) for time in
                       (results.own_time(ours), results.own_time(bare))), round(own_ratio, 2)])
        goals.append(goal(what, f"processor time of one {title}, commands included, to the bare "
                          "loop's", ratio, limit))
        if own_limit:
            goals.append(goal(f"{what}-own", f"processor time of one {title}, commands left out, "
                              "to the bare loop's", own_ratio, own_limit))
    return [table("pings", "One ping, one check",
                  ["", "with commands (µs)", "bare loop (µs)", "ratio", "without commands (µs)",
                   "bare loop (µs)", "ratio"], rows,
                  "Processor time. The bare loop runs the same command by system(), opens what it "
                  "printed, reads a line and closes it; for the check it runs pidof and reads "
                  "/proc/PID/stat.")], [], goals


def run_once(program, service, which, brief):
    """One round: these benchmarks once, in a folder of its own. Returns their results."""
    with tempfile.TemporaryDirectory(prefix="tolkwd-pieces-", dir=pathlib.Path.cwd()) as folder, \
            tempfile.TemporaryDirectory(prefix="tolkwd-pieces-", dir="/dev/shm") as shm:
        pathlib.Path(folder, "shm").symlink_to(shm)
        seconds = BRIEF_SECONDS_EACH if brief else SECONDS_EACH
        command = [program, *(["--brief"] if brief else []), f"--benchmark_filter={which}",
                   f"--benchmark_min_time={seconds}", "--benchmark_out=results.json",
                   "--benchmark_out_format=json"]
        environment = dict(os.environ, PATH=f"{service.parent}:{os.environ['PATH']}")
        subprocess.run(command, cwd=folder, env=environment, check=True,
                       stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        return json.loads(pathlib.Path(folder, "results.json").read_text())["benchmarks"]


def parse_arguments():
    """Returns the command line's options."""
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--program", type=pathlib.Path, required=True, help="bench_pieces")
    parser.add_argument("--service", type=pathlib.Path, required=True,
                        help="what stands for the service command; of that name")
    parser.add_argument("--out", type=pathlib.Path, required=True, metavar="FILE.json",
                        help="where the results go")
    parser.add_argument("--brief", action="store_true",
                        help="one short round of the small sizes: to see that all works")
    return parser.parse_args()


def main():
    """Measures, and writes the results."""
    options = parse_arguments()
    results = Results()
    for which, rounds in ROUNDS.items():
        rounds = 1 if options.brief else rounds
        for number in range(rounds):
            print(f"pieces: {which}, round {number + 1} of {rounds}", file=sys.stderr)
            results.add(run_once(options.program.resolve(), options.service.resolve(), which,
                                 options.brief))
    out = {"tables": [], "curves": [], "goals": []}
    for part in (lines, together, records, load, pings):
        for key, found in zip(out, part(results)):
            out[key] += found
    options.out.write_text(json.dumps(out, indent=1) + "\n")


if __name__ == "__main__":
    main()
