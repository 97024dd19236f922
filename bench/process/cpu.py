"""What a ping costs in processor time, everything that the program and its commands use."""

import contextlib
import statistics

from results import say

QUIET_SECONDS = 0.1
WARM_UP_ROUNDS = 1
DEPENDENTS_INTERVAL = 1  # second


class Meter:
    """Processor time per ping between two moments in which the process is quiet."""

    def __init__(self, process):
        self._process = process
        self._cpu = self._pings = 0

    def skip(self, pings):
        """Lets so many pings pass, at least, and waits for the end of the last one's commands."""
        self._process.record.await_pings(self._pings + pings)
        self._process.record.await_quiet(QUIET_SECONDS)
        self._cpu, self._pings = self._process.cpu(), self._process.record.pings()

    def window(self, pings):
        """Microseconds per ping of the next pings."""
        cpu, before = self._cpu, self._pings
        self.skip(pings)
        return (self._cpu - cpu) / (self._pings - before)


def _rounds(programs, targets, interval, rounds):
    """Microseconds per ping in each round, of tolkwd and of monit.

    tolkwd keeps its own time. monit, whose one thread works through its list whenever it wakes, is
    stopped while tolkwd has its round and goes on, its pause long over, when tolkwd has finished.
    """
    with programs.tolkwd(targets, interval, metered=True) as tolkwd, \
            programs.monit(targets, 1, metered=True) as monit:
        ours, theirs = Meter(tolkwd), Meter(monit)
        theirs.skip(WARM_UP_ROUNDS * targets)
        monit.stop()
        ours.skip(WARM_UP_ROUNDS * targets)
        found = [], []
        for _ in range(rounds):
            found[0].append(ours.window(targets))
            monit.go_on()
            found[1].append(theirs.window(targets))
            monit.stop()
        return found


def cpu_per_ping(programs, plan):
    """The medians, a row for each of the plan's (targets, interval, rounds)."""
    rows = []
    for targets, interval, rounds in plan:
        say(f"processor time per ping: {targets} targets, {rounds} rounds")
        ours, theirs = (statistics.median(side)
                        for side in _rounds(programs, targets, interval, rounds))
        say(f"    tolkwd {ours:.0f}, monit {theirs:.0f} microseconds")
        rows.append([targets, round(ours), round(theirs), round(ours / theirs, 3), rounds])
    return rows


def report_cpu_per_ping(results, rows):
    results.table(
        "process-cpu", "Processor time per ping, microseconds",
        ["targets", "tolkwd", "monit", "tolkwd / monit", "rounds"], rows,
        "Median over rounds, in turns. All time of the program and of its commands, by getrusage "
        "of the process itself and of its ended children, which a thread loaded into both asks "
        "for (/proc gives the children's in ticks of 10 ms only); divided by the pings that the "
        "command has recorded. A ping is the same command on both sides. tolkwd runs it through "
        "the shell and reads a file, monit directly through a pipe. Both are limited to 1,024 "
        "descriptors, as services usually are, at 1,000 targets to 3,100, which monit needs there: "
        "it closes as many before each command, so its figure grows with the limit.")
    results.curve("cpu", "Processor time per ping", ("targets", "microseconds"),
                  {"tolkwd": [[row[0], row[1]] for row in rows],
                   "monit": [[row[0], row[2]] for row in rows]})
    for targets, _, _, ratio, _ in rows:
        results.at_most(f"cpu-per-ping-below-monit-{targets}",
                        f"processor time per ping below monit's, {targets} targets", ratio, 1.0)


def cost_by_size(programs, results, sizes, windows, pings):
    """One target with more and more dependents: records that are not asked while it is well."""
    say(f"processor time per ping of a larger and larger process: {windows} windows")
    with contextlib.ExitStack() as stack:
        processes = [stack.enter_context(programs.tolkwd(1, DEPENDENTS_INTERVAL, dependents=count,
                                                         metered=True)) for count in sizes]
        meters = [Meter(process) for process in processes]
        for meter in meters:
            meter.skip(WARM_UP_ROUNDS)
        found = [[meter.window(pings) for meter in meters] for _ in range(windows)]
        costs = [round(statistics.median(side)) for side in zip(*found)]
        rows = [[count, process.pss(), cost]
                for count, process, cost in zip(sizes, processes, costs)]
    results.table(
        "process-cpu-by-size", "Processor time per ping as the daemon grows",
        ["dependents in the configuration", "proportional set size, kB", "microseconds per ping"],
        rows,
        f"One target. Median of {windows} windows of {pings} pings, all sizes beside each other. "
        "To start a command no page of the daemon is copied.")
    results.curve("cpu-by-size", "Processor time per ping as the daemon grows",
                  ("proportional set size, kB", "microseconds"),
                  {"tolkwd": [row[1:] for row in rows]})
