"""Lets a service fail under the real daemon, and gives what the daemon logged and ran, and when."""

import dataclasses
import json
import pathlib
import subprocess
import typing

import daemonlog
import stepped

HERE = pathlib.Path(__file__).resolve().parent

# What tolkwd-check may end with after it has read a file: what it finds there is not asked here.
READ = (0, 1, 2)


@dataclasses.dataclass
class Ran:
    """What the daemon did up to the line that was waited for."""

    lines: typing.List[daemonlog.Line]
    commands: typing.List[stepped.Command]

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
        daemon = stepped.Daemon(self.tolkwd, self.clock, HERE / "machine", self.results)
        left = times

        def last(line):
            nonlocal left
            left -= line.endswith(f" {until}\n")
            return left == 0

        lines = daemonlog.parsed(daemon.run([refresh], environment, last))
        assert left == 0, f"the daemon has ended, and not logged: {until}"
        # It was not ended at once: what it has run since then is left out.
        commands = [each for each in daemon.commands() if each.begin <= lines[-1].seconds]
        return Ran(lines, commands)
