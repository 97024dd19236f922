#!/usr/bin/python3
"""Measures how long tolkwd-report takes to tell the state of all services from a log, and how much
memory, beside `wc -l` on the same file, and tells the report what came of it.

Whole processes, in turns: each round runs both, one right after the other. The medians of the
rounds' times and of their ratios count. The file has been read before: it comes from memory.

Then the same, once, of logs that somebody made to take memory and time.
"""

import argparse
import heapq
import json
import os
import pathlib
import random
import statistics
import subprocess
import sys
import tempfile
import time

SERVICES = 50
MEGABYTE = 10**6
GIGABYTE = 10**9
BRIEF_BYTES = 10**7
ROUNDS = 9
START = 1795273200  # 2026-11-21 15:00 UTC
SEED = 1
LOOK_SECONDS = 0.005

MANY_NAMES = 1_000_000
BRIEF_NAMES = 10_000
LONG_NAMES = 300
BRIEF_LONG_NAMES = 3

MONITOR = "DEBUG wdmonitorthread"
NOTICE = "INFO wdmonitorthread"
FIGURES = "DEBUG ProcessStatistics"


# Of the daemon's clock: how long a status command or a check takes, and the pauses.
COMMAND_SECONDS = (0.01, 0.06)
FUNCTIONAL_PAUSE_SECONDS = 5
GENERAL_PAUSE_SECONDS = 60


def announcement(name):
    """What a monitor's thread says first."""
    return [(NOTICE, f"Name of the service being monitored: {name}"),
            (NOTICE, f"Binary path of service being monitored: /usr/sbin/{name}d")]


def healthy_round(name, chance):
    """What it says, with debug lines, of a service that runs: lines that come at once, and the
    seconds behind them."""
    output = f"/opt/varden/tolk/bin/agent.{name}"
    path = f"(/usr/sbin/{name}d)"
    yield [
        (MONITOR, "Entering of general ping function, before get read lock."),
        (MONITOR, "enter of general ping, after get read lock."),
    ], chance.uniform(*COMMAND_SECONDS)
    yield [
        (MONITOR, f"command = service {name} status 1>{output} 2>{output}, "
                  f"result = {name} is running., state = 0"),
        (MONITOR, "General ping successful!"),
        (FIGURES, f"{path} averageCPUUsage/Threshold:{chance.randrange(5000)}/90000"),
        (FIGURES, f"{path} numberOfThreads/Threshold:{chance.randrange(1, 9)}/200"),
        (FIGURES, f"{path} memoryUsage/Threshold:{chance.randrange(3000, 3010)}/262144"),
        (FIGURES, f"{path} Threshold is not reached"),
        (NOTICE, f"{path} Executing functional ping now ... "),
        (MONITOR, f"Performing functional ping, process id is: 112, fp cmd is: "
                  f"(timeout -k 1 10 /usr/bin/{name}-check && echo service: ok)"),
    ], chance.uniform(*COMMAND_SECONDS)
    yield [
        (MONITOR, "Functionalping result correct functional ping, thread id is 112, "
                  "ping result is service: ok"),
        (MONITOR, f"Functional ping sleep {FUNCTIONAL_PAUSE_SECONDS}"),
    ], FUNCTIONAL_PAUSE_SECONDS
    yield [(MONITOR, f"General ping sleep {GENERAL_PAUSE_SECONDS}")], GENERAL_PAUSE_SECONDS


def life(name, chance):
    """What a monitor's thread says, without end."""
    yield announcement(name), 0
    while True:
        yield from healthy_round(name, chance)


def bursts():
    """Who says what when, in the order of the log. The monitors, which begin at once on a machine,
    have drifted apart: their rounds overlap as their commands do."""
    chance = random.Random(SEED)
    lives = [life(f"web{who:02}", chance) for who in range(SERVICES)]
    due = [(START + chance.uniform(0, GENERAL_PAUSE_SECONDS), who) for who in range(SERVICES)]
    heapq.heapify(due)
    while True:
        now, who = due[0]
        said, pause = next(lives[who])
        yield now, who, said
        heapq.heapreplace(due, (now + pause, who))


def write_log(path, size):
    """A log with debug lines of at least so many bytes, and how many lines it has."""
    stamp, second = "", -1
    written = number = 0
    with path.open("w", encoding="ascii") as out:
        for now, who, said in bursts():
            if int(now) != second:
                second = int(now)
                stamp = time.asctime(time.gmtime(second))
            for speaker, text in said:
                written += out.write(f"{stamp} {speaker}|TID{140217598280000 + who} {text}\n")
            number += len(said)
            if written >= size:
                return number


def write_names(path, count, filling):
    """A log that announces so many services, each name with so many bytes more than it needs."""
    stamp = time.asctime(time.gmtime(START))
    with path.open("w", encoding="ascii") as out:
        for who in range(count):
            for level, text in announcement(f"service{who:07}" + filling * "x"):
                out.write(f"{stamp} {level}|TID{140000000000000 + 4096 * who} {text}\n")


# Itself small: a process that it starts counts as being as large as this one at least.
PEAK = """
import os, sys
process = os.posix_spawn(sys.argv[1], sys.argv[1:], os.environ)
print(os.wait4(process, 0)[2].ru_maxrss, file=sys.stderr)
"""


class Programs:
    """What is run."""

    def __init__(self, report):
        self._report = report

    def round(self, path, lines):
        """Seconds that both take."""
        counted, output = self._run(["wc", "-l", path])
        if int(output.split()[0]) != lines:
            sys.exit(f"wc counted {output}, expected {lines} lines")
        taken, output = self._run([self._report, "status", path])
        if output.count("web") < SERVICES:
            sys.exit(f"{self._report} does not tell of {SERVICES} services: {output}")
        return {"wc": counted, "report": taken}

    def memory(self, path):
        """The report's peak memory in KiB, as far as it is seen from outside while it runs."""
        peak = 0
        with subprocess.Popen([self._report, "status", path], stdout=subprocess.DEVNULL) as process:
            status = pathlib.Path(f"/proc/{process.pid}/status")
            while process.poll() is None:
                lines = [line for line in status.read_text().splitlines()
                         if line.startswith("VmHWM:")]
                peak = max([peak] + [int(line.split()[1]) for line in lines])
                time.sleep(LOOK_SECONDS)
        return peak

    def hostile(self, path, *arguments):
        """Seconds that the report takes, and its peak memory in MB."""
        start = time.monotonic()
        done = subprocess.run([sys.executable, "-S", "-c", PEAK, self._report, *arguments, path],
                              check=True, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE,
                              env=os.environ | {"TZ": "UTC"}, text=True)
        return time.monotonic() - start, int(done.stderr) * 1024 / MEGABYTE

    @staticmethod
    def _run(command):
        """The time of one process, and what it printed."""
        start = time.monotonic()
        done = subprocess.run(command, stdout=subprocess.PIPE, env=os.environ | {"TZ": "UTC"},
                              text=True)
        taken = time.monotonic() - start
        if done.returncode != 0:
            sys.exit(f"{command[0]} failed with status {done.returncode}")
        return taken, done.stdout


def measure(programs, path, lines, rounds):
    """The median times in seconds, and the median of their ratios."""
    programs.round(path, lines)  # brings the file into memory
    times = []
    for number in range(rounds):
        print(f"logs: {path.name}, round {number + 1} of {rounds}", file=sys.stderr)
        times.append(programs.round(path, lines))
    return {"wc": statistics.median(each["wc"] for each in times),
            "report": statistics.median(each["report"] for each in times),
            "ratio": statistics.median(each["report"] / each["wc"] for each in times)}


def hostile_results(programs, folder, brief):
    """The table of logs that were made to harm, and their goals."""
    rows, found = [], {}
    path = folder / "hostile.log"
    for name, count, filling, commands in (
            ("short names", BRIEF_NAMES if brief else MANY_NAMES, 0,
             (["status"], ["status", "--json"], ["events", "--json"])),
            ("names of 1 MB", BRIEF_LONG_NAMES if brief else LONG_NAMES, MEGABYTE,
             (["status"], ["status", "--json"]))):
        write_names(path, count, filling)
        for command in commands:
            print(f"logs: {count} {name}, {' '.join(command)}", file=sys.stderr)
            seconds, memory = programs.hostile(path, *command)
            found[name, *command] = {"time": round(seconds, 2), "memory": round(memory, 1)}
            rows.append([f"{count:,} {name}, {path.stat().st_size / MEGABYTE:,.0f} MB",
                         " ".join(command), round(seconds, 2), round(memory, 1)])
        path.unlink()
    table = {"id": "hostile", "title": "Reading a hostile log",
             "columns": ["", "command", "time (s)", "peak memory (MB)"], "rows": rows,
             "note": "Whole processes, once each. Every service is announced with its path by a "
             "thread of its own."}
    goals = [{"id": "logs-names", "text": "peak memory of telling the state of a million services",
              "measured": found["short names", "status"]["memory"], "limit": 300, "unit": "MB",
              "sense": "at most"},
             {"id": "logs-names-json", "text": "peak memory of telling it as JSON",
              "measured": found["short names", "status", "--json"]["memory"], "limit": 400,
              "unit": "MB", "sense": "at most"},
             {"id": "logs-long-names", "text": "telling the state of 300 services with names of "
              "1 MB", "measured": found["names of 1 MB", "status"]["time"], "limit": 3,
              "unit": "s", "sense": "at most"}]
    return table, goals


def results(programs, folder, large, rounds):
    """The table and the goals."""
    rows, found = [], {}
    for name, size in (("small", MEGABYTE), ("large", large)):
        path = folder / f"{name}.log"
        lines = write_log(path, size)
        found[name] = measure(programs, path, lines, rounds)
        megabytes = path.stat().st_size / MEGABYTE
        memory = programs.memory(path) if size == large else None  # the other one is too short
        path.unlink()
        rows.append([f"{megabytes:,.0f} MB", lines,
                     round(found[name]["report"] * 1000, 1), round(found[name]["wc"] * 1000, 1),
                     round(found[name]["ratio"], 2), memory and round(memory / 1024, 1)])
    table = {"id": "logs", "title": "Reading a log",
             "columns": ["", "lines", "tolkwd-report status (ms)", "wc -l (ms)", "to that",
                         "peak memory (MiB)"],
             "rows": rows,
             "note": f"Whole processes, on files that are in memory: debug lines of {SERVICES} "
             "services, every check with its figures, each at its own time, ten lines a second."}
    goals = [{"id": "logs-small", "text": "telling the state from a log of 1 MB",
              "measured": round(found["small"]["report"] * 1000, 1), "limit": 50, "unit": "ms",
              "sense": "at most"},
             {"id": "logs-large", "text": "telling the state from a log of 1 GB, to the time of "
              "wc -l", "measured": round(found["large"]["ratio"], 3), "limit": 3.0,
              "unit": "ratio", "sense": "at most"}]
    hostile_table, hostile_goals = hostile_results(programs, folder, large == BRIEF_BYTES)
    return {"tables": [table, hostile_table], "curves": [], "goals": goals + hostile_goals}


def parse_arguments():
    """Returns the command line's options."""
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--report", type=pathlib.Path, required=True, help="tolkwd-report")
    parser.add_argument("--out", type=pathlib.Path, required=True, metavar="FILE.json",
                        help="where the results go")
    parser.add_argument("--brief", action="store_true",
                        help="one round of a smaller file: to see that all works")
    return parser.parse_args()


def main():
    """Measures, and writes the results."""
    options = parse_arguments()
    programs = Programs(options.report.resolve())
    large, rounds = (BRIEF_BYTES, 1) if options.brief else (GIGABYTE, ROUNDS)
    with tempfile.TemporaryDirectory(prefix="tolkwd-logs-", dir=pathlib.Path.cwd()) as folder:
        found = results(programs, pathlib.Path(folder), large, rounds)
    options.out.write_text(json.dumps(found, indent=1) + "\n")


if __name__ == "__main__":
    main()
