#!/usr/bin/env python3
"""Boots copies of the base system, with systemd or the init of System V, and works on them.

    tests/machine/machine.py systemd|sysv

boots one and opens a shell on it; the machine is gone when the shell ends.
"""

import contextlib
import pathlib
import shlex
import subprocess
import sys
import time

import systems

HERE = pathlib.Path(__file__).resolve().parent
COMMAND_LIMIT_SECONDS = 120
# A busy computer that runs other tests, too, takes its time.
AWAIT_SECONDS = 60

# Succeeds once a machine has started all its services.
BOOTED = {
    "systemd": "systemctl is-system-running | grep -x running || { systemctl --failed; false; }",
    "sysv": "test -e /run/booted",
}

# These change by themselves, or with every run of dpkg.
UNSTEADY = ("dev", "proc", "run", "sys", "tmp", "var/cache", "var/lib/dpkg", "var/log/apt",
            "var/log/dpkg.log", "var/log/alternatives.log", "var/tmp")


class Machine:
    """A machine that runs. Commands are shell commands, and run as root."""

    def __init__(self, kind, process):
        self.kind = kind
        self._enter = [
            *systems.AS_ROOT, "nsenter", "--target", str(process), "--mount", "--pid", "--net",
            "--ipc", "--uts", "--cgroup", "--root", "env", "--ignore-environment", "--chdir=/",
            "PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin",
            "DEBIAN_FRONTEND=noninteractive", "TERM=linux"]

    def run(self, command, expect=0, given=""):
        """Returns the command's output, after a check of its exit status."""
        status, said = self._try(command, given)
        assert status == expect, f"{command}: status {status}\n{said}"
        return said

    def await_success(self, command, seconds=AWAIT_SECONDS):
        """Repeats the command until it succeeds, and returns its output."""
        deadline = time.monotonic() + seconds
        while True:
            status, said = self._try(command)
            if status == 0:
                return said
            assert time.monotonic() < deadline, f"after {seconds} s, {command}: {said}"
            time.sleep(0.2)

    def await_line(self, name, text):
        """Waits until a line of the file holds the text."""
        quoted = shlex.quote(name)
        self.await_success(f"grep -qF {shlex.quote(text)} {quoted} || {{ tail {quoted}; false; }}")

    def copy_in(self, source, name):
        """Copies a file from outside."""
        self.write(name, pathlib.Path(source).read_bytes())

    def write(self, name, contents):
        self.run(f"cat >{shlex.quote(name)}", given=contents)

    def read(self, name):
        return self.run(f"cat {shlex.quote(name)}")

    def exists(self, name):
        quoted = shlex.quote(name)
        return self._try(f"test -e {quoted} || test -L {quoted}")[0] == 0

    def files(self):
        """The paths of all files and folders, but for those that come and go."""
        skipped = " -o ".join(f"-path /{name}" for name in UNSTEADY)
        return set(self.run(f"find / '(' {skipped} ')' -prune -o -print").splitlines())

    def shell(self):
        subprocess.run([*self._enter, "bash"])

    def _try(self, command, given=""):
        done = subprocess.run(
            [*self._enter, "sh", "-c", command],
            input=given.encode() if isinstance(given, str) else given,
            stdout=subprocess.PIPE, stderr=subprocess.STDOUT, timeout=COMMAND_LIMIT_SECONDS)
        return done.returncode, done.stdout.decode(errors="replace")


@contextlib.contextmanager
def booted(system, kind):
    """A machine that has started its services. It is gone afterwards, with all it has written."""
    # In a session of its own, it outlives an interrupt and ends in order when the pipe is closed.
    keeper = subprocess.Popen(
        [*systems.AS_ROOT, HERE / "boot.sh", system, kind], stdin=subprocess.PIPE,
        stdout=subprocess.PIPE, text=True, start_new_session=True)
    try:
        process = keeper.stdout.readline().strip()
        assert process, "the machine did not start: see standard error"
        machine = Machine(kind, process)
        machine.await_success(BOOTED[kind])
        yield machine
    finally:
        keeper.stdin.close()
        keeper.wait()
        keeper.stdout.close()


if __name__ == "__main__":
    if sys.argv[1:] not in ([kind] for kind in BOOTED):
        sys.exit(__doc__)
    try:
        system = systems.base_system()
    except systems.Impossible as reason:
        sys.exit(f"no machine can be booted: {reason}")
    with booted(system, sys.argv[1]) as found:
        found.shell()
