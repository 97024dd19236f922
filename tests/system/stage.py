"""Plays a scenario: runs its steps in the sandbox and gives what the daemon logged and ran."""

import dataclasses
import pathlib
import subprocess

HERE = pathlib.Path(__file__).resolve().parent
PROJECT = HERE.parents[1]
DEMO = PROJECT / "scripts" / "demo"

# A scenario waits for its events with bounds of its own; this one is for what they miss.
LIMIT_SECONDS = 1800

# How long each event is waited for where a wrapper makes the daemon slow.
SLOW_SECONDS = 600

# Reports go to files of the results: standard error is a part of what is tested. The order of
# libraries is checked by AddressSanitizer, and the clock's library has to come before it.
SANITIZERS = {
    "ASAN_OPTIONS": "verify_asan_link_order=0:log_path=/opt/results/report.asan",
    "UBSAN_OPTIONS": "print_stacktrace=1:log_path=/opt/results/report.ubsan",
    "TSAN_OPTIONS": "log_path=/opt/results/report.tsan",
}


@dataclasses.dataclass
class Played:
    """What a scenario has left behind."""

    results: pathlib.Path
    status: int
    output: str

    def text(self, name):
        """A file of the results; nothing where there is none."""
        path = self.results / name
        return path.read_text(errors="replace") if path.exists() else ""

    def reports(self):
        """What sanitizers or a wrapper had to report."""
        return "\n".join(path.read_text() for path in sorted(self.results.glob("report.*")))


@dataclasses.dataclass
class Stage:
    program: pathlib.Path
    results: pathlib.Path
    refreshes: int
    short: bool
    wrapper: str

    def play(self, scenario):
        """Plays the scenario of this folder from its first step to its last."""
        environment = dict(SANITIZERS, TOLKWD_WRAPPER=self.wrapper, REFRESHES=str(self.refreshes))
        if self.wrapper:
            environment["PATIENCE"] = str(SLOW_SECONDS)
        if self.short:
            environment["SHORT"] = "yes"
        command = [PROJECT / "scripts" / "sandbox.sh", "--tmpfs", "/etc/init.d"]
        for name, value in environment.items():
            command += ["--setenv", name, value]
        for source, target in self._bound(scenario):
            command += ["--ro-bind", source, target]
        command += ["--bind", self.results, "/opt/results", "--", "/opt/stage/enter.sh"]
        output = self.results / "output"
        with output.open("wb") as stream:
            try:
                status = subprocess.run(command, stdin=subprocess.DEVNULL, stdout=stream,
                                        stderr=stream, timeout=LIMIT_SECONDS).returncode
            except subprocess.TimeoutExpired:
                stream.write(b"FAILED: still not over after %d s\n" % LIMIT_SECONDS)
                status = -1
        return Played(self.results, status, output.read_text(errors="replace"))

    def _bound(self, scenario):
        """What of the machine and the project the scenario sees, and where."""
        return [
            ("/etc/init.d", "/opt/machine/init.d"),
            (HERE / "stage", "/opt/stage"),
            (PROJECT, "/opt/project"),
            (scenario, "/opt/scenario"),
            (self.program, "/opt/tolkwd/tolkwd"),
            (DEMO / "redis.conf", "/etc/redis/redis.conf"),
            (DEMO / "redis-server.default", "/etc/default/redis-server"),
            (DEMO / "nginx.conf", "/etc/nginx/nginx.conf"),
        ]
