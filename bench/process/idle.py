"""How often the programs wake up while there is nothing to do."""

import contextlib
import time

import programs as setup
from results import say

USUAL_SECONDS = 30  # what monit's own example sets
QUIET_SECONDS = 0.2


class Idle:
    """Idle processes of each kind and size, and what they have done at a moment."""

    def __init__(self, programs, sizes):
        self._programs = programs
        self._sizes = sizes
        self._stack = contextlib.ExitStack()
        self._processes = {}
        self._before = {}
        self._begun = None

    def __enter__(self):
        kinds = [("tolkwd", self._programs.tolkwd, setup.FOR_EVER),
                 ("monit", self._programs.monit, setup.FOR_EVER),
                 ("monit, usual", self._programs.monit, USUAL_SECONDS)]
        with contextlib.ExitStack() as stack:
            for targets in self._sizes:
                say(f"idle: {targets} targets")
                for kind, start, interval in kinds:
                    process = stack.enter_context(start(targets, interval))
                    process.record.await_pings(targets)
                    process.record.await_quiet(QUIET_SECONDS)
                    self._processes[kind, targets] = process
            self._stack = stack.pop_all()
        self._before = self._figures()
        self._begun = time.monotonic()
        return self

    def __exit__(self, *error):
        return self._stack.__exit__(*error)

    def _figures(self):
        return {key: (process.pauses(), process.record.pings())
                for key, process in self._processes.items()}

    def report(self, results, seconds):
        """To be called any time later; waits until so long has passed since the beginning."""
        say(f"idle: until {seconds} s have passed")
        time.sleep(max(0, self._begun + seconds - time.monotonic()))
        after, passed = self._figures(), time.monotonic() - self._begun
        rows = []
        for targets in self._sizes:
            row = [targets]
            for kind in ("tolkwd", "monit", "monit, usual"):
                pauses, pings = (now - then for now, then in
                                 zip(after[kind, targets], self._before[kind, targets]))
                row.append(round(pauses * 60 / passed, 1))
                if kind == "monit, usual":
                    row.append(pings)
                elif pings:
                    raise ValueError(f"{kind} with {targets} targets was not idle: {pings} pings")
            rows.append(row)
        results.table(
            "process-wake-ups", "Wake-ups per minute when idle",
            ["targets", "tolkwd", "monit", f"monit, every {USUAL_SECONDS} s",
             "its pings meanwhile"], rows,
            f"Voluntary context switches of all threads in {passed:.0f} s, no ping due but in the "
            "last two columns. tolkwd's are the one-second ticks by which it counts to its "
            "refresh; its monitors sleep.")
