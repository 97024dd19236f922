"""How large the programs are."""

import collections
import dataclasses
import re
import resource
import time

import sandboxed
from results import say

QUIET_SECONDS = 0.2
SETTLING_SECONDS = 1
# Limits of the size relative to monit's. Of many targets, most of it is two pages of stack for each
# thread.
LIMIT = 0.65
MANY_TARGETS = 1000
LIMIT_OF_MANY = 1.10
ARENA_BYTES = 64 << 20  # what malloc reserves for the arena of a thread, and aligns it to

MAPPING = re.compile(r"^([0-9a-f]+)-([0-9a-f]+) \S+ \S+ \S+ \S+ *(.*)$")


@dataclasses.dataclass
class Sizes:
    """kB by target count."""

    tolkwd: dict = dataclasses.field(default_factory=dict)
    monit: dict = dataclasses.field(default_factory=dict)
    tolkwd_alone: dict = dataclasses.field(default_factory=dict)
    monit_alone: dict = dataclasses.field(default_factory=dict)
    floor: dict = dataclasses.field(default_factory=dict)


def settle(process, pings):
    """Lets the process make its rounds."""
    process.record.await_pings(pings)
    process.record.await_quiet(QUIET_SECONDS)


def supervisord(programs, sizes):
    """kB of supervisord without its children, by their number."""
    found = {}
    for count in sizes:
        say(f"memory: supervisord, {count}")
        with programs.supervisord(count) as process:
            sandboxed.wait_until(lambda: process.children() == count, f"{count} children")
            time.sleep(SETTLING_SECONDS)
            found[count] = process.pss()
    return found


def _kind(begin, end, name, stack_bytes):
    """What a mapping holds. Arenas are told by their alignment, stacks by their size."""
    if name == "[heap]":
        return "malloc: the heap"
    if name.startswith("["):
        return "main thread's stack and the kernel's pages"
    if name:
        return "program and libraries"
    if end - begin == stack_bytes:
        return "threads' stacks"
    if begin % ARENA_BYTES == 0:
        return "malloc: threads' arenas"
    return "other anonymous memory"


def breakdown(smaps, stack_bytes):
    """kB and number of the resident mappings, by what they hold."""
    size, count = collections.Counter(), collections.Counter()
    kind = None
    for line in smaps.splitlines():
        mapping = MAPPING.match(line)
        if mapping:
            kind = _kind(int(mapping[1], 16), int(mapping[2], 16), mapping[3], stack_bytes)
        elif line.startswith("Pss:"):
            kb = int(line.split()[1])
            size[kind] += kb
            count[kind] += kb > 0
    return [[kind, kb, count[kind]] for kind, kb in size.most_common()]


def _pair(programs, targets, dependents, interval, pings):
    """tolkwd's kB and mappings, and monit's kB; measured beside each other."""
    say(f"memory: tolkwd and monit, {targets} targets, {dependents} dependent each")
    with programs.tolkwd(targets, interval, dependents) as tolkwd, \
            programs.monit(targets, interval, dependents) as monit:
        settle(tolkwd, pings)
        ours, smaps, status = tolkwd.pss(), tolkwd.proc("smaps"), tolkwd.proc("status")
        settle(monit, pings)
        return ours, monit.pss(), smaps, sandboxed.kilobytes(status, "VmPTE")


def memory(programs, results, sizes, rounds, of_supervisord):
    """To be called while no other tolkwd runs: they would share pages, and seem smaller."""
    found = Sizes()
    stack_bytes = resource.getrlimit(resource.RLIMIT_STACK)[0]
    for targets in sizes:
        interval, pings = 3 if targets >= 1000 else 1, rounds * targets
        found.tolkwd[targets], found.monit[targets], smaps, tables = \
            _pair(programs, targets, 1, interval, pings)
        found.tolkwd_alone[targets], found.monit_alone[targets], *_ = \
            _pair(programs, targets, 0, interval, pings)
        say(f"memory: threads alone, {targets}")
        with programs.threadfloor(targets, interval) as floor:
            settle(floor, pings)
            found.floor[targets] = floor.pss()
    results.table(
        "process-memory", "Proportional set size, kB",
        ["targets", "tolkwd", "monit", "tolkwd, no dependents", "monit, no dependents",
         "threads alone", "supervisord"],
        [[n, found.tolkwd[n], found.monit[n], found.tolkwd_alone[n], found.monit_alone[n],
          found.floor[n], of_supervisord[n]] for n in sizes],
        f"After {rounds} rounds of pings, between two rounds; a dependent service to each target "
        "but where it says otherwise. Threads alone: a program that has a thread for each target, "
        "which runs the same command through the shell and pauses, and nothing else. supervisord: "
        "that many running children, which are not counted, limits raised by its own settings. "
        "Pages of libraries are divided among all processes that have them at the time: libc with "
        "all, libstdc++ with none of ours; supervisord shares the interpreter with the "
        "benchmark.")
    results.table(
        "process-memory-parts", f"What tolkwd's memory is, {sizes[-1]} targets",
        ["what", "kB", "mappings"], breakdown(smaps, stack_bytes),
        "Proportional set size by mapping, a dependent service to each target. "
        f"Not in it, as in no process's: {tables} kB of page tables, and the kernel's own stacks.")
    series = {"tolkwd": found.tolkwd, "monit": found.monit, "threads alone": found.floor,
              "supervisord": of_supervisord}
    results.curve("memory", "Proportional set size", ("targets", "kB"),
                  {name: [[n, kb[n]] for n in sizes] for name, kb in series.items()}, logy=True)
    for n in sizes:
        results.at_most(f"memory-to-monit-{n}",
                        f"proportional set size to monit's, {n:,} targets, one dependent each",
                        round(found.tolkwd[n] / found.monit[n], 3),
                        LIMIT_OF_MANY if n >= MANY_TARGETS else LIMIT)
