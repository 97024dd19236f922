"""How soon things happen: the first pings, and the start of a service that has died."""

import contextlib
import statistics
import time

import programs as setup
from results import say
from sandboxed import wait_until

NANOSECONDS_IN_A_MILLISECOND = 1_000_000
MANDATED_START_MS = 1000        # the daemon's second before it starts its monitors
MANDATED_RECOVERY_MS = 210_000  # 30 seconds, and three times 60
RECOVERY_INTERVAL = 2           # seconds
BETWEEN_DEATHS_SECONDS = 0.9    # the recoveries as far apart, and no two at the same phase
TOLERATED_MS = 50


def milliseconds(begin, end):
    return (end - begin) / NANOSECONDS_IN_A_MILLISECOND


def _first_pings(process, targets):
    """Milliseconds to the first ping of any, and to the first ping of the last target."""
    seen = {}
    process.record.await_pings(targets)
    for entry in process.record.statuses():
        seen.setdefault(entry.name, entry.nanoseconds)
    if len(seen) != targets:
        raise ValueError(f"{len(seen)} targets asked, not {targets}")
    begin = process.record.launched()
    return milliseconds(begin, min(seen.values())), milliseconds(begin, max(seen.values()))


def start_up(programs, results, plan):
    """A row for each of the plan's (targets, rounds)."""
    rows = []
    for targets, rounds in plan:
        say(f"time to the first ping: {targets} targets, {rounds} rounds")
        ours, theirs = [], []
        for _ in range(rounds):
            with programs.tolkwd(targets, setup.FOR_EVER) as process:
                ours.append(_first_pings(process, targets))
            with programs.monit(targets, setup.FOR_EVER) as process:
                theirs.append(_first_pings(process, targets))
        first, last = map(statistics.median, zip(*ours))
        if first < MANDATED_START_MS:
            raise ValueError(f"the first ping came after {first} ms, before its time")
        rows.append([targets, round(first - MANDATED_START_MS, 1),
                     round(last - MANDATED_START_MS, 1),
                     *(round(statistics.median(side), 1) for side in zip(*theirs)), rounds])
    rows.sort()
    results.table(
        "process-start", "From exec to the first ping of a target, milliseconds",
        ["targets", "tolkwd, first", "tolkwd, last", "monit, first", "monit, last", "rounds"], rows,
        "Medians, in turns. The second that tolkwd lets pass before it starts its monitors is left "
        "out; monit has none. A ping is counted when its command begins.")
    results.curve("start", "From exec to the last first ping", ("targets", "milliseconds"),
                  {"tolkwd": [[row[0], row[2]] for row in rows],
                   "monit": [[row[0], row[4]] for row in rows]}, logy=True)


def check_that_monit_restarts(programs):
    """The peer must do what it is measured for: restart a dead service, and its dependent."""
    say("monit must restart a service")
    with programs.monit(1, 1) as monit:
        monit.record.await_pings(1)
        monit.let_die("s1")
        for name in ("s1", "d1"):
            wait_until(lambda: monit.record.first(_is_start_of(name)), f"start of {name} by monit")


def _is_start_of(name):
    return lambda entry: entry.name == name and entry.verb == "start"


class Recovery:
    """Services that die one after the other, under a daemon that goes on beside what follows."""

    def __init__(self, programs, services):
        self._programs = programs
        self._names = [f"s{number}" for number in range(1, services + 1)]
        self._stack = contextlib.ExitStack()
        self._daemon = None
        self._deaths = {}

    def __enter__(self):
        say(f"recovery: {len(self._names)} services die")
        with contextlib.ExitStack() as stack:
            self._daemon = stack.enter_context(
                self._programs.tolkwd(len(self._names), RECOVERY_INTERVAL))
            self._daemon.record.await_pings(len(self._names))
            for name in self._names:
                time.sleep(BETWEEN_DEATHS_SECONDS)
                self._deaths[name] = self._daemon.let_die(name)
            self._stack = stack.pop_all()
        return self

    def __exit__(self, *error):
        return self._stack.__exit__(*error)

    def _missed(self, name):
        """The first ping that found it dead, or None."""
        return self._daemon.record.first(
            lambda entry: entry.name == name and entry.answer == "stopped")

    def _started(self, name):
        return self._daemon.record.first(_is_start_of(name))

    def _await_all(self, event, what, patience):
        say(f"recovery: until all {what}")
        wait_until(lambda: all(map(event, self._names)), f"all {what}", patience)

    def report_detection(self, results):
        self._await_all(self._missed, "are missed", 2 * RECOVERY_INTERVAL)
        found = [milliseconds(self._deaths[name], self._missed(name).nanoseconds)
                 for name in self._names]
        limit = RECOVERY_INTERVAL * 1000 + TOLERATED_MS
        if max(found) > RECOVERY_INTERVAL * 1000 + 1000:
            raise ValueError(f"a death was seen after {max(found)} ms only")
        results.table(
            "process-detection", "From a service's death to the ping that fails, milliseconds",
            ["general interval", "median", "worst", "services"],
            [[RECOVERY_INTERVAL * 1000, round(statistics.median(found)), round(max(found)),
              len(found)]],
            "The services die at different phases of the interval.")
        results.at_most("detection", "from a service's death to the failing ping, worst case, "
                        f"at a general interval of {RECOVERY_INTERVAL} s",
                        round(max(found), 1), limit, "ms")

    def report_recovery(self, results):
        self._await_all(self._started, "are started", MANDATED_RECOVERY_MS / 1000 + 60)
        found = [milliseconds(self._missed(name).nanoseconds, self._started(name).nanoseconds)
                 - MANDATED_RECOVERY_MS for name in self._names]
        if min(found) < 0:
            raise ValueError(f"a recovery came {-min(found)} ms before its time")
        results.table(
            "process-recovery", "From the ping that fails to the service's start, beyond the "
            "pauses, milliseconds", ["pauses", "median", "worst", "services"],
            [[MANDATED_RECOVERY_MS, round(statistics.median(found), 1), round(max(found), 1),
              len(found)]],
            "On the real clock; each with a dependent, which is stopped before. The retries and "
            "the recovery make six status commands and a stop before the start. Other "
            "measurements went on beside it.")
        results.at_most("recovery-beyond-pauses", "from the failing ping to the service's start, "
                        "beyond the pauses, worst case", round(max(found), 1), TOLERATED_MS, "ms")
