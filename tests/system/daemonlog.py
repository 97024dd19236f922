"""Reads the daemon's log, and what a scenario expects of it.

A scenario's file `log` has sections, each for one thread: [manager], or [NAME] for the thread that
watches the service NAME, over all generations. In it stand messages as "LEVEL text", those of a
module other than the thread's own as "LEVEL [module] text":

    # a comment
    DEBUG General ping sleep 10
    +30 DEBUG Entering ...   at least 30 seconds of the daemon's clock after the line before; how
                             long at most is for the unit tests to say, which have no real clock
    ...                      any lines, or none
    ! ERROR Try ...          nowhere in this thread's log

Lines that follow each other here follow each other in the thread's log. {n} stands for a number,
{any} for any text, {blank} for a blank at the end of a line.
"""

import dataclasses
import difflib
import re
import time

LINE = re.compile(r"(\w{3} \w{3} [ \d]\d \d\d:\d\d:\d\d \d{4}) (\w*) ([^|]*)\|TID(\d+) (.*)")
NAMED = "INFO Name of the service being monitored: "
ENTRY = "DEBUG This is the entry of threadfunc"
OWN_MODULE = "wdmonitorthread"
MANAGERS_MODULE = "wdmanager"

# The clock is read before the line is written, in whole seconds.
CLOCK_SECONDS = 1


@dataclasses.dataclass
class Line:
    """One message."""

    seconds: float
    level: str
    module: str
    message: str
    thread: int  # the log's id; several threads may have it, one after another
    owner: str = "manager"  # or the service that the thread watches

    @property
    def text(self):
        """As a scenario expects it: "LEVEL text" or "LEVEL [module] text"."""
        own = MANAGERS_MODULE if self.owner == "manager" else OWN_MODULE
        return self.plain if self.module == own else f"{self.level} [{self.module}] {self.message}"

    @property
    def plain(self):
        """Without the module."""
        return f"{self.level} {self.message}"


class Torn(Exception):
    """A line of the log is not one message."""


def parsed(text):
    """The lines of a log, with their owners. All must be whole: no message here has two lines."""
    lines = []
    # The daemon was killed: what stands behind the last newline can be a part of a line.
    for raw in text.split("\n")[:-1]:
        match = LINE.fullmatch(raw)
        if not match or LINE.search(match[5]):
            raise Torn(raw)
        when, level, module, thread, message = match.groups()
        seconds = time.mktime(time.strptime(when))
        lines.append(Line(seconds, level, module.rstrip(), message, int(thread)))
    _find_owners(lines)
    return lines


def _find_owners(lines):
    owners = {}
    pending = {}  # lines of a thread before it has said whom it watches
    for line in lines:
        if line.plain == ENTRY:
            owners.pop(line.thread, None)
            pending[line.thread] = []
        if line.thread in pending:
            pending[line.thread].append(line)
            if line.plain.startswith(NAMED):
                owners[line.thread] = line.plain[len(NAMED):]
                for early in pending.pop(line.thread):
                    early.owner = owners[line.thread]
        else:
            line.owner = owners.get(line.thread, "manager")


@dataclasses.dataclass
class Wanted:
    """One line that a scenario expects."""

    text: str
    pause: int = 0  # seconds since the line before, at least

    def __post_init__(self):
        delayed = re.fullmatch(r"\+(\d+) (.*)", self.text)
        if delayed:
            self.pause, self.text = int(delayed[1]), delayed[2]
            if self.pause <= CLOCK_SECONDS:
                raise ValueError(f"a pause that the clock cannot show: {delayed[0]}")
        self.text = self.text.replace("{blank}", " ")
        pattern = re.escape(self.text).replace(r"\{n\}", r"\d+").replace(r"\{any\}", ".*")
        self.pattern = re.compile(pattern, re.DOTALL)

    def fits(self, lines, index):
        """Whether the line at `index` is this one."""
        if not self.pattern.fullmatch(lines[index].text):
            return False
        if self.pause == 0:
            return True
        since = lines[index].seconds - lines[index - 1].seconds if index > 0 else 0
        return since >= self.pause - CLOCK_SECONDS


@dataclasses.dataclass
class Section:
    owner: str
    blocks: list = dataclasses.field(default_factory=lambda: [[]])
    forbidden: list = dataclasses.field(default_factory=list)


def expectations(text):
    """The sections of a scenario's file `log`."""
    sections = []
    for raw in text.splitlines():
        line = raw.strip()
        if not line or line.startswith("#"):
            continue
        if line.startswith("["):
            sections.append(Section(line.strip("[]")))
        elif line == "...":
            sections[-1].blocks.append([])
        elif line.startswith("! "):
            sections[-1].forbidden.append(Wanted(line[2:]))
        else:
            sections[-1].blocks[-1].append(Wanted(line))
    return sections


def difference(section, lines):
    """How the log differs from what the section expects, to be read; empty where it does not."""
    own = [line for line in lines if line.owner == section.owner]
    if not own:
        return f"[{section.owner}] has logged nothing"
    for wanted in section.forbidden:
        for line in own:
            if wanted.pattern.fullmatch(line.text):
                return f"[{section.owner}] should not have logged:\n  {line.text}"
    start = 0
    for block in section.blocks:
        found = _find(block, own, start)
        if found is None:
            return _shown(section.owner, block, own[start:])
        start = found + len(block)
    return ""


def _find(block, lines, start):
    """The first place at or behind `start` where the block stands, or None."""
    for first in range(start, len(lines) - len(block) + 1):
        if all(wanted.fits(lines, first + place) for place, wanted in enumerate(block)):
            return first
    return None


def _shown(owner, block, lines):
    """The block beside what was logged instead, without what was logged before and behind it."""
    expected = [f"{wanted.text}   (+{wanted.pause} s)" if wanted.pause else wanted.text
                for wanted in block]
    logged = []
    for place, line in enumerate(lines):
        text = line.text
        for wanted, spelt in zip(block, expected):
            if wanted.fits(lines, place):
                text = spelt
                break
            if wanted.pattern.fullmatch(line.text):
                text = f"{line.text}   (+{line.seconds - lines[place - 1].seconds:.0f} s)"
        logged.append(text)
    lines_of_diff = list(difflib.unified_diff(expected, logged, lineterm="", n=len(block)))[3:]
    shared = [i for i, text in enumerate(lines_of_diff) if not text.startswith("+")]
    context = lines_of_diff[max(shared[0] - 3, 0):shared[-1] + 4]
    return (f"[{owner}] should have logged (-), but did log (+), in this order:\n"
            + "\n".join(context))
