"""A process under measurement, in a sandbox of its own, and the record of the commands it runs."""

import collections
import os
import pathlib
import shutil
import signal
import subprocess
import tempfile
import time

HERE = pathlib.Path(__file__).resolve().parent
SANDBOX = HERE.parents[1] / "scripts" / "sandbox.sh"

# The usual limit of a service. It counts: some programs close all descriptors that there could be
# before they start a command, and with a limit of 20,000 a ping of theirs costs four times as much.
DESCRIPTORS = 1024

# Where a process sees, in its sandbox, what it is given.
FOLDER = "/opt/bench"
COMMANDS = "/opt/commands"
TOOLS = "/opt/tools"

PATIENCE_SECONDS = 60
GLANCE_SECONDS = 0.005

Entry = collections.namedtuple("Entry", "nanoseconds name verb answer")


def wait_until(condition, what, patience=PATIENCE_SECONDS):
    deadline = time.monotonic() + patience
    while not condition():
        if time.monotonic() > deadline:
            raise TimeoutError(f"{what}: not in {patience} s")
        time.sleep(GLANCE_SECONDS)


class Record:
    """The commands that have been run so far, one line each, as record.h writes them."""

    def __init__(self, path):
        path.touch()
        path.chmod(0o666)
        self._stream = path.open(encoding="ascii")
        self._begun = ""
        self._entries = []
        self._pings = 0

    def entries(self):
        """All entries so far. The last line may still be on its way."""
        *lines, self._begun = (self._begun + self._stream.read()).split("\n")
        for line in lines:
            words = line.split()
            if len(words) != 4:
                raise ValueError(f"a torn line in the record: {line!r}")
            self._entries.append(Entry(int(words[0]), *words[1:]))
            self._pings += words[2] == "status"
        return self._entries

    def statuses(self):
        """The status commands so far."""
        return [entry for entry in self.entries() if entry.verb == "status"]

    def pings(self):
        """How many status commands there have been."""
        self.entries()
        return self._pings

    def launched(self):
        """When the process became its program, in nanoseconds."""
        return self.first(lambda entry: entry.name == "launch").nanoseconds

    def first(self, condition):
        """The first entry of its kind, or None."""
        return next(filter(condition, self.entries()), None)

    def await_pings(self, count, patience=PATIENCE_SECONDS):
        wait_until(lambda: self.pings() >= count, f"{count} pings", patience)

    def await_quiet(self, seconds):
        """Waits until nothing has been recorded for so long."""
        while True:
            before = len(self.entries())
            time.sleep(seconds)
            if len(self.entries()) == before:
                return

    def close(self):
        self._stream.close()


class Sandboxed:
    """A program that runs in a sandbox, where its `service` command is the benchmark's.

    `files` are put where it sees them in FOLDER. With `metered` its processor time can be asked
    for. Everything ends with the `with` statement.
    """

    def __init__(self, tools, command, files, programs=(), metered=False,
                 descriptors=DESCRIPTORS):
        self._tools = tools
        self._folder = pathlib.Path(tempfile.mkdtemp(prefix="tolkwd-bench."))
        self._folder.chmod(0o755)
        self._state = self._folder / "state"
        self._state.mkdir()
        for name, text in files.items():
            (self._folder / name).write_text(text, encoding="ascii")
        self.record = Record(self._folder / "record")
        self._name = pathlib.Path(command[0]).name
        self._meters = 0
        if metered:
            self._next_meter()
            command = ["env", f"LD_PRELOAD={TOOLS}/cpumeter.so", *command]
        self._process = subprocess.Popen(self._command_line(command, programs, descriptors),
                                         stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL)
        self._pid = None

    def _command_line(self, command, programs, descriptors):
        line = [SANDBOX, "--bind", self._folder, FOLDER,
                "--ro-bind", self._tools / "service", f"{COMMANDS}/service",
                "--ro-bind", HERE / "enter.sh", "/opt/enter.sh",
                "--setenv", "PATH", f"{COMMANDS}:/usr/sbin:/usr/bin:/sbin:/bin"]
        for tool in ("launch", "threadfloor", "cpumeter.so"):
            line += ["--ro-bind", self._tools / tool, f"{TOOLS}/{tool}"]
        for program in programs:
            line += ["--ro-bind", program, f"/opt/programs/{program.name}"]
        return [*line, "--", "/opt/enter.sh", str(descriptors), *command]

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self._process.kill()  # the sandbox, which takes with it what is inside
        self._process.wait()
        if self._pid is not None:
            wait_until(lambda: not self._proc.exists(), f"end of {self._name}")
        self.record.close()
        shutil.rmtree(self._folder)

    @property
    def pid(self):
        """The process id of the program as it is known outside the sandbox."""
        if self._pid is None:
            wait_until(self._find, f"start of {self._name}")
        return self._pid

    def _find(self):
        if self._process.poll() is not None:
            raise ChildProcessError(f"{self._name} has ended with {self._process.returncode}")
        pid = self._process.pid
        try:
            while pathlib.Path(f"/proc/{pid}/comm").read_text().strip() != self._name[:15]:
                children = pathlib.Path(f"/proc/{pid}/task/{pid}/children").read_text().split()
                if not children:
                    return False
                pid = int(children[0])
        except (FileNotFoundError, ProcessLookupError):  # it has ended meanwhile
            return False
        self._pid = pid
        return True

    @property
    def _proc(self):
        return pathlib.Path(f"/proc/{self.pid}")

    def proc(self, name):
        """A file of the process in /proc."""
        return (self._proc / name).read_text()

    def children(self):
        """How many children the main thread has."""
        return len(self.proc(f"task/{self.pid}/children").split())

    def pss(self):
        """Proportional set size, in kB."""
        return kilobytes(self.proc("smaps_rollup"), "Pss")

    def own_memory(self):
        """What it shares with nobody and has in no file, in kB."""
        return kilobytes(self.proc("smaps_rollup"), "Pss_Anon")

    def pauses(self):
        """How often its threads have gone to sleep so far."""
        return sum(kilobytes(path.read_text(), "voluntary_ctxt_switches")
                   for path in self._proc.glob("task/*/status"))

    def cpu(self):
        """Microseconds of processor time so far: its own, and those of its ended children."""
        meter = self._folder / f"cpu.{self._meters - 1}"
        self._next_meter()
        own, children = meter.read_text(encoding="ascii").split()
        return int(own), int(children)

    def _next_meter(self):
        os.mkfifo(self._folder / f"cpu.{self._meters}")
        self._meters += 1

    def stop(self):
        os.kill(self.pid, signal.SIGSTOP)

    def go_on(self):
        os.kill(self.pid, signal.SIGCONT)

    def let_die(self, service):
        """Lets a service die; the moment, in nanoseconds."""
        (self._state / f"{service}.stopped").touch()
        return time.monotonic_ns()


def kilobytes(text, field):
    """The figure of a field in one of the kernel's "Field: figure" texts."""
    return next(int(line.split()[1]) for line in text.splitlines()
                if line.startswith(field + ":"))
