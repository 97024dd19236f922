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
        self._cpu, self._pings = (0, 0), 0

    def skip(self, pings):
        """Lets so many pings pass, at least, and waits for the end of the last one's commands."""
        self._process.record.await_pings(self._pings + pings)
        self._process.record.await_quiet(QUIET_SECONDS)
        self._cpu, self._pings = self._process.cpu(), self._process.record.pings()

    def window(self, pings):
        """Microseconds per ping of the next pings: of the process, and of its commands."""
        cpu, before = self._cpu, self._pings
        self.skip(pings)
        return [(now - then) / (self._pings - before) for now, then in zip(self._cpu, cpu)]


def _medians(windows):
    """Of the processes themselves, and with their commands."""
    return (round(statistics.median(own for own, _ in windows)),
            round(statistics.median(own + commands for own, commands in windows)))


def _rounds(free, driven, targets, rounds):
    """The medians of a process that keeps its own time, and of others, all in turns.

    The others have a single thread for all pings. Each is stopped, and goes on, its pause long
    over, when the one before has finished its round. (Many threads would all wake at once then.)
    """
    free_meter, meters = Meter(free), [Meter(process) for process in driven]
    for process, meter in zip(driven, meters):
        meter.skip(WARM_UP_ROUNDS * targets)
        process.stop()
    free_meter.skip(WARM_UP_ROUNDS * targets)
    found = [[] for _ in (free, *driven)]
    for _ in range(rounds):
        found[0].append(free_meter.window(targets))
        for process, meter, windows in zip(driven, meters, found[1:]):
            process.go_on()
            windows.append(meter.window(targets))
            process.stop()
    return list(map(_medians, found))


def cost_of_one(programs, results, rounds):
    """Of one target, also what the command costs through the shell and nothing else."""
    say(f"processor time per ping: 1 target, beside a thread alone, {rounds} rounds")
    with programs.tolkwd(1, 2, metered=True) as tolkwd, \
            programs.monit(1, 1, metered=True) as monit, \
            programs.threadfloor(1, 1, metered=True) as floor:
        found = _rounds(tolkwd, [monit, floor], 1, rounds)
    results.table(
        "process-cpu-floor", "Processor time of a ping, microseconds, one target",
        ["program", "the program itself", "with its commands", "rounds"],
        [[name, *medians, rounds]
         for name, medians in zip(("tolkwd", "monit", "thread alone"), found)],
        "Median over rounds, in turns. Thread alone: a program that runs the same command through "
        "the shell and pauses, and nothing else: what the shell costs.")


def cpu_per_ping(programs, plan):
    """The medians, a row for each of the plan's (targets, interval, rounds)."""
    rows = []
    for targets, interval, rounds in plan:
        say(f"processor time per ping: {targets} targets, {rounds} rounds")
        with programs.tolkwd(targets, interval, metered=True) as tolkwd, \
                programs.monit(targets, 1, metered=True, through_shell=True) as alike, \
                programs.monit(targets, 1, metered=True) as direct:
            found = _rounds(tolkwd, [alike, direct], targets, rounds)
        (own, ours), (alike_own, alikes), (direct_own, directs) = found
        say(f"    tolkwd {ours}, monit {alikes}, without a shell {directs} microseconds")
        rows.append([targets, ours, own, alikes, alike_own, round(ours / alikes, 3),
                     directs, direct_own, rounds])
    return rows


def report_cpu_per_ping(results, rows):
    results.table(
        "process-cpu", "Processor time per ping, microseconds",
        ["targets", "tolkwd", "of it tolkwd itself", "monit", "of it monit itself",
         "tolkwd / monit", "monit, no shell", "of it monit itself", "rounds"], rows,
        "Median over rounds, in turns. All time of the program and of its commands, by getrusage "
        "of the process itself and of its ended children, which a thread loaded into both asks "
        "for (/proc gives the children's in ticks of 10 ms only); divided by the pings that the "
        "command has recorded. Both run the same command line, which begins a shell; monit can "
        "also do without. Both are limited to 1,024 "
        "descriptors, as services usually are, at 1,000 targets to 3,100, which monit needs there: "
        "it closes as many before each command, so its figure grows with the limit.")
    results.curve("cpu", "Processor time per ping", ("targets", "microseconds"),
                  {"tolkwd": [[row[0], row[1]] for row in rows],
                   "monit": [[row[0], row[3]] for row in rows],
                   "monit, no shell": [[row[0], row[6]] for row in rows]})
    for targets, _, _, _, _, ratio, *_ in rows:
        results.at_most(f"cpu-per-ping-below-monit-{targets}", "processor time per ping to "
                        f"monit's for the same command line, {targets:,} targets", ratio, 1.0)


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
        rows = [[count, process.own_memory(), *_medians(side)]
                for count, process, side in zip(sizes, processes, zip(*found))]
    results.table(
        "process-cpu-by-size", "Processor time per ping as the daemon grows",
        ["dependents in the configuration", "own memory, kB", "microseconds, the daemon itself",
         "microseconds, with its commands"], rows,
        f"One target. Median of {windows} windows of {pings} pings, all sizes beside each other. "
        "To start a command no page of the daemon is copied. Own memory: what is in no file.")
    results.at_most("cpu-per-ping-by-size", "processor time per ping with "
                    f"{sizes[-1]:,} dependents in the configuration, to that with {sizes[0]}",
                    round(rows[-1][3] / rows[0][3], 3), 1.1)
    results.curve("cpu-by-size", "Processor time per ping as the daemon grows",
                  ("own memory, kB", "microseconds"),
                  {"tolkwd": [[row[1], row[3]] for row in rows]})
