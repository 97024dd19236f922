"""Lets a service fail under the real daemon, and gives what the daemon logged and ran, and when."""

import dataclasses
import json
import os
import pathlib
import subprocess
import threading
import typing

import daemonlog

HERE = pathlib.Path(__file__).resolve().parent
SANDBOX = HERE.parents[2] / "scripts" / "sandbox.sh"

# The clock skips all pauses, so even an outage of hours is over in a few seconds.
LIMIT_SECONDS = 60

# What tolkwd-check may end with after it has read a file: what it finds there is not asked here.
READ = (0, 1, 2)


@dataclasses.dataclass
class Command:
    """One that the daemon ran, with its times on the daemon's clock."""

    begin: float
    end: float
    text: str


@dataclasses.dataclass
class Ran:
    """What the daemon did up to the line that was waited for."""

    lines: typing.List[daemonlog.Line]
    commands: typing.List[Command]

    def times(self, message):
        """When each line with this message was logged."""
        return [line.seconds for line in self.lines if line.message == message]

    def begun(self, command):
        """When each run of this command began."""
        return [each.begin for each in self.commands if each.text == command]

    def ended(self, command):
        """When each run of this command ended."""
        return [each.end for each in self.commands if each.text == command]


@dataclasses.dataclass
class Machine:
    tolkwd: pathlib.Path
    tolkwd_check: pathlib.Path
    clock: pathlib.Path
    results: pathlib.Path

    def configure(self, text):
        (self.results / "tolkwd.xml").write_text(text, encoding="ascii")

    def plan(self, refresh):
        """The plan of the only target."""
        done = subprocess.run([self.tolkwd_check, "--plan", "--json", "-t", str(refresh),
                               self.results / "tolkwd.xml"], stdout=subprocess.PIPE)
        assert done.returncode in READ
        (plan,) = json.loads(done.stdout)["plan"]
        return plan

    def run(self, refresh, environment, until, times=1):
        """Runs the daemon until it has logged this message so many times."""
        command = [SANDBOX]
        # Its log has local times, which are read here.
        zone = {"TZ": os.environ["TZ"]} if "TZ" in os.environ else {}
        for name, value in dict(environment, **zone).items():
            command += ["--setenv", name, value]
        for source, target in ((HERE / "machine", "/opt/machine"), (self.clock, "/opt/clock.so"),
                               (self.tolkwd, "/opt/tolkwd/tolkwd")):
            command += ["--ro-bind", source, target]
        command += ["--bind", self.results, "/opt/results", "--", "/opt/machine/enter.sh",
                    str(refresh)]
        lines = daemonlog.parsed(self._read(command, until, times))
        # It was not ended at once: what it has run since then is left out.
        return Ran(lines, [each for each in self._journal() if each.begin <= lines[-1].seconds])

    def _read(self, command, until, times):
        """What the daemon logs, which goes to standard output as well, up to that line."""
        read = []
        with subprocess.Popen(command, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                              text=True) as process:
            limit = threading.Timer(LIMIT_SECONDS, process.kill)
            limit.start()
            try:
                for line in process.stdout:
                    read.append(line)
                    times -= line.endswith(f" {until}\n")
                    if times == 0:
                        return "".join(read)
            finally:
                limit.cancel()
                process.kill()  # the sandbox, which takes with it what is inside
        raise TimeoutError(f"not logged in {LIMIT_SECONDS} s: {until}\n" + "".join(read[-20:]))

    def _journal(self):
        journal = self.results / "journal"
        if not journal.exists():
            return []
        commands = []
        # The daemon may have been about to write a line when it was ended.
        for line in journal.read_text().split("\n")[:-1]:
            begin, end, text = line.split(" ", 2)
            commands.append(Command(float(begin), float(end), text))
        return commands
