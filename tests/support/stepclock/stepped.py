"""Runs the real daemon in a sandbox, on the clock that skips its pauses (stepclock.cpp), and gives
what it printed, what it ran, and when."""

import dataclasses
import os
import pathlib
import subprocess
import threading

HERE = pathlib.Path(__file__).resolve().parent
SANDBOX = HERE.parents[2] / "scripts" / "sandbox.sh"

# The clock skips all pauses, so even an outage of hours is over in a few seconds.
LIMIT_SECONDS = 60


@dataclasses.dataclass
class Command:
    """One that the daemon ran, with its times on the daemon's clock."""

    begin: float
    end: float
    text: str


@dataclasses.dataclass
class Daemon:
    """A daemon to be run. `machine` is a folder of programs whose enter.sh sets up the machine and
    goes on as /opt/become.sh. `results` is a folder that stays, /opt/results inside: it has the
    configuration, and gets the log."""

    tolkwd: pathlib.Path
    clock: pathlib.Path
    machine: pathlib.Path
    results: pathlib.Path

    def run(self, arguments, environment, last=lambda line: False):
        """What enter.sh with these arguments prints, up to a line that is the last one wanted, or
        to its end."""
        command = [SANDBOX]
        # Its log has local times, which are read here.
        zone = {"TZ": os.environ["TZ"]} if "TZ" in os.environ else {}
        for name, value in dict(environment, **zone).items():
            command += ["--setenv", name, value]
        for source, target in ((self.machine, "/opt/machine"), (self.clock, "/opt/clock.so"),
                               (HERE / "become.sh", "/opt/become.sh"),
                               (self.tolkwd, "/opt/tolkwd/tolkwd")):
            command += ["--ro-bind", source, target]
        command += ["--bind", self.results, "/opt/results", "--", "/opt/machine/enter.sh",
                    *(str(each) for each in arguments)]
        printed, ended = self._read(command, last)
        if not ended:
            raise TimeoutError(f"not over in {LIMIT_SECONDS} s\n" + "".join(printed[-20:]))
        return "".join(printed)

    def commands(self):
        """What it has run, in the order of their ends."""
        journal = self.results / "journal"
        if not journal.exists():
            return []
        commands = []
        # The daemon may have been about to write a line when it was ended.
        for line in journal.read_text().split("\n")[:-1]:
            begin, end, text = line.split(" ", 2)
            commands.append(Command(float(begin), float(end), text))
        return commands

    @staticmethod
    def _read(command, last):
        """What is printed, and whether that was all that is wanted."""
        printed = []
        late = threading.Event()
        with subprocess.Popen(command, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                              text=True) as process:
            def end():
                late.set()
                process.kill()

            limit = threading.Timer(LIMIT_SECONDS, end)
            limit.start()
            try:
                for line in process.stdout:
                    printed.append(line)
                    if last(line):
                        return printed, True
            finally:
                limit.cancel()
                process.kill()  # the sandbox, which takes with it what is inside
                process.stdout.read()  # when that has ended, too, and writes no more
        return printed, not late.is_set()
