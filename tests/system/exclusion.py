"""The promise of the lock: a recovery has the machine to itself.

Between the first and the last message of a recovery no other thread pings or recovers; while a
command of a recovery runs, no status command or check does.
"""

ENTERED = "DEBUG Entry of general recover after getting write lock"
LEFT = "DEBUG Exit of general recover after release write lock"

# What only a thread that holds the lock writes.
UNDER_LOCK = (
    ENTERED,
    "DEBUG enter of general ping, after get read lock.",
    "DEBUG command = ",
    "DEBUG General ping successful!",
    "DEBUG General ping failed",
    "DEBUG  General Ping failed other cases",
    "DEBUG Performing functional ping",
    "DEBUG Functionalping result",
    "DEBUG  Functionalping result",
    "DEBUG Functional ping failed with return",
    "DEBUG Executing ",
    "ERROR Try the general recover for service ",
)


def intruders(lines):
    """What was logged under the lock while another thread had it for writing.

    The last message of a recovery follows the release, so others may already be at work then.
    """
    found = []
    for first, line in enumerate(lines):
        if line.plain != ENTERED:
            continue
        own = [i for i in range(first, len(lines)) if lines[i].thread == line.thread]
        ends = [place for place, i in enumerate(own) if lines[i].plain == LEFT]
        last = own[ends[0] - 1] if ends else own[-1]
        found += [f"during the recovery of {line.owner}: {other.owner}: {other.plain}"
                  for other in lines[first:last + 1]
                  if other.thread != line.thread and other.plain.startswith(UNDER_LOCK)]
    return found


def asks(command):
    """Whether a command is a status command or a check."""
    return command.startswith("redis-cli ") or command.endswith(" status")


def changes(command):
    """Whether a command starts or stops something."""
    return not asks(command) and not command.startswith(("pidof ", "touch "))


def overlaps(journal):
    """Commands that ran while one that starts or stops something did."""
    running = {}
    found = []
    for event in journal.splitlines():
        kind, process, command = event.split(" ", 2)
        if kind == "end":
            running.pop(process, None)
            continue
        for other in running.values():
            if changes(command) and (changes(other) or asks(other)):
                found.append(f"{command} began during {other}")
            elif changes(other) and asks(command):
                found.append(f"{command} began during {other}")
        running[process] = command
    return found
