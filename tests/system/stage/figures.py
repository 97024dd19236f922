"""figures.py REFRESHES FILE: reads a daemon's standard output until it has refreshed so often.

In each generation, when all monitors have begun and none can have ended, it notes how large the
daemon is, how many descriptors it has had open since the generation before, and how many threads it
has. It ends with status 1 when one of these is larger after the last refreshes than after the first
ten, and leaves a line of figures in FILE.
"""

import contextlib
import os
import pathlib
import sys

SETTLED = 10  # refreshes
# Pages that come and go with the moment at which the kernel is asked.
SLACK_KB = 256

PING = "Entering of general ping function, before get read lock."
REFRESH = "After globalrefresh times refreshconfig,join threadas*"
CHECK = "fp cmd is: "

# In the middle of a generation of fifty monitors, of which each pings twice.
SAMPLED_PING = 60


def daemon():
    """The process id of the daemon."""
    for comm in pathlib.Path("/proc").glob("[0-9]*/comm"):
        if comm.read_text() == "tolkwd\n":
            return comm.parent
    raise SystemExit("there is no daemon")


def open_files(process):
    """Each open descriptor with what it refers to."""
    found = set()
    for descriptor in (process / "fd").iterdir():
        with contextlib.suppress(FileNotFoundError):  # closed meanwhile
            found.add((descriptor.name, os.readlink(descriptor)))
    return found


def sample(process, kept):
    """Resident kB, the number of the descriptors kept, and threads."""
    status = dict(line.split(":\t", 1)
                  for line in (process / "status").read_text().splitlines() if ":\t" in line)
    return int(status["VmRSS"].split()[0]), len(kept), int(status["Threads"])


def main():
    refreshes, file = int(sys.argv[1]), pathlib.Path(sys.argv[2])
    process = None
    before = None
    samples = []
    refreshed = pings = checks = since_refresh = 0
    for line in sys.stdin:
        if line.endswith(PING + "\n"):
            pings += 1
            since_refresh += 1
            if since_refresh == SAMPLED_PING:
                process = process or daemon()
                now = open_files(process)
                # A log line or a pipe that is half-way through is not there a generation later.
                samples.append(sample(process, now & (before or now)))
                before = now
        elif CHECK in line:
            checks += 1
        elif line.endswith(REFRESH + "\n"):
            since_refresh = 0
            refreshed += 1
            if refreshed == refreshes:
                break
    else:
        raise SystemExit("the daemon has ended")
    # The kernel's count of pages varies.
    first = [min(kind) for kind in zip(*samples[SETTLED:2 * SETTLED])]
    last = [min(kind) for kind in zip(*samples[-SETTLED:])]
    text = (f"{refreshes} refreshes, {pings} pings, {checks} checks: "
            f"resident {first[0]} -> {last[0]} kB, "
            f"descriptors {first[1]} -> {last[1]}, threads {first[2]} -> {last[2]}")
    print(text)
    file.write_text(text + "\n")
    if last[0] > first[0] + SLACK_KB or last[1] > first[1] or last[2] > first[2]:
        raise SystemExit("the daemon has grown")


main()
