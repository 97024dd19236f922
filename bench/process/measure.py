#!/usr/bin/python3
"""measure.py --tolkwd PROGRAM --service PROGRAM --out FILE [--brief]

Measures the daemon as a whole, beside monit and supervisord: memory, processor time per ping, time
to the first ping, wake-ups, and the time from a service's death to its start. The programs that are
built with `service` are expected in its folder. Takes six to seven minutes on two
processors; with --brief a few seconds, the figures of which mean nothing.
"""

import argparse
import concurrent.futures
import contextlib
import os
import pathlib
import signal
import sys

import cpu
import idle
import memory
import timing
from programs import Programs
from results import Results, say

SIZES = [1, 10, 100, 1000]


def arguments():
    parser = argparse.ArgumentParser(description=__doc__.split("\n\n")[1])
    parser.add_argument("--tolkwd", type=pathlib.Path, required=True)
    parser.add_argument("--service", type=pathlib.Path, required=True)
    parser.add_argument("--out", type=pathlib.Path, required=True)
    parser.add_argument("--brief", action="store_true")
    return parser.parse_args()


def measure(programs, results):
    """The recovery takes minutes, of which nearly all is sleep: most is measured meanwhile.

    What loads the machine more than a little comes when no retry is due, or after the recovery.
    """
    with contextlib.ExitStack() as stack:
        with idle.Idle(programs, SIZES) as sleepers:
            recovery = stack.enter_context(timing.Recovery(programs, services=7))
            recovery.report_detection(results)
            cpu.cost_by_size(programs, results, [0, 1000, 10_000, 50_000], windows=7, pings=5)
            sleepers.report(results, seconds=60)
        timing.check_that_monit_restarts(programs)
        timing.start_up(programs, results, [(1000, 3), (1, 7), (10, 7), (100, 7)])
        cpu.cost_of_one(programs, results, rounds=9)
        costs = cpu.cpu_per_ping(programs, [(1, 1, 15), (10, 1, 15), (100, 2, 15)])
        of_supervisord = memory.supervisord(programs, SIZES)
        recovery.report_recovery(results)
    costs += cpu.cpu_per_ping(programs, [(1000, 10, 7)])
    cpu.report_cpu_per_ping(results, costs)
    memory.memory(programs, results, SIZES, 3, of_supervisord)


def measure_briefly(programs, results):
    """The same at the smallest size, all at once, and no recovery to its end."""
    def sleepers():
        with idle.Idle(programs, [1]) as processes:
            processes.report(results, seconds=1)

    def detection():
        with timing.Recovery(programs, services=1) as recovery:
            recovery.report_detection(results)

    def costs():
        cpu.report_cpu_per_ping(results, cpu.cpu_per_ping(programs, [(1, 1, 1)]))

    def sizes():
        memory.memory(programs, results, [1], 1, memory.supervisord(programs, [1]))

    steps = [sleepers, detection, costs, sizes,
             lambda: cpu.cost_by_size(programs, results, [0, 100], windows=1, pings=1),
             lambda: timing.check_that_monit_restarts(programs),
             lambda: timing.start_up(programs, results, [(1, 1)]),
             lambda: cpu.cost_of_one(programs, results, rounds=1)]
    with concurrent.futures.ThreadPoolExecutor(len(steps)) as pool:
        for running in [pool.submit(step) for step in steps]:
            running.result()


def main():
    asked = arguments()
    if os.geteuid() != 0:  # to look into what runs as root in the sandboxes
        os.execvp("sudo", ["sudo", sys.executable, *sys.argv])
    signal.signal(signal.SIGTERM, lambda *_: sys.exit("terminated"))  # to leave nothing behind
    results = Results()
    programs = Programs(asked.tolkwd, asked.service)
    (measure_briefly if asked.brief else measure)(programs, results)
    results.write(asked.out)
    say("done")


if __name__ == "__main__":
    main()
