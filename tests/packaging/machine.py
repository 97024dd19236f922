"""A fresh minimal Debian system, and copies of it on which a package is tried.

The system is made by debootstrap from the mirror that this machine itself installs from, and kept
in the build folder for the next run. A copy runs in a sandbox with process ids and a network of its
own, and ends with the test.
"""

import contextlib
import json
import os
import pathlib
import shutil
import struct
import subprocess
import time

# cron is the service that is watched, libfaketime the clock that does not wait; with the init of
# System V, service and update-rc.d use init scripts.
PACKAGES = "cron,libfaketime,sysvinit-core"
LIMIT_SECONDS = 900
COMMAND_LIMIT_SECONDS = 120

# These change whenever dpkg runs, or belong to what runs, or are what services leave behind.
UNSTEADY = ("dev", "proc", "run", "sys", "tmp", "var/cache", "var/lib/dpkg", "var/log/dpkg.log",
            "var/log/apt", "var/log/alternatives.log")

# What init leaves in utmp when it has booted into runlevel 2; maintainer scripts start services
# only where that is known. The type RUN_LVL, and both levels as a process id.
BOOTED = struct.pack("=hxxi376x", 1, ord("2") + 256 * ord("N"))

AS_ROOT = [] if os.geteuid() == 0 else ["sudo", "--non-interactive"]
SEPARATE = ["--unshare-pid", "--unshare-net", "--unshare-ipc", "--unshare-uts", "--die-with-parent",
            "--cap-add", "ALL"]


class Impossible(Exception):
    """This machine cannot make such a system."""


def mirror():
    """The release that this machine runs, and where it gets it from."""
    release = {}
    for line in pathlib.Path("/etc/os-release").read_text().splitlines():
        key, _, value = line.partition("=")
        release[key] = value.strip('"')
    codename = release.get("VERSION_CODENAME", "")
    sources = subprocess.run(
        ["apt-get", "indextargets", "--format", "$(REPO_URI)", "Created-By: Packages",
         f"Codename: {codename}"], capture_output=True, text=True, check=True).stdout.split()
    if not codename or not sources:
        raise Impossible("this machine's release, or its source of packages, is not known")
    return codename, sources[0]


def minimal_system(cache):
    """The folder of the system; made now unless it is there from an earlier run."""
    missing = programs_missing()
    if missing:
        raise Impossible(f"{', '.join(missing)} missing")
    tried = subprocess.run([*AS_ROOT, "bwrap", *SEPARATE, "--bind", "/", "/", "true"],
                           stdin=subprocess.DEVNULL, capture_output=True, text=True)
    if tried.returncode != 0:
        raise Impossible(f"no sandbox: {tried.stderr.strip()}")
    codename, source = mirror()
    system = cache / f"{codename}-{PACKAGES.replace(',', '-')}"
    if system.is_dir():
        return system
    unfinished = system.with_suffix(".unfinished")
    subprocess.run([*AS_ROOT, "rm", "-rf", unfinished], check=True)
    cache.mkdir(parents=True, exist_ok=True)
    try:
        made = subprocess.run(
            [*AS_ROOT, "debootstrap", "--variant=minbase", f"--include={PACKAGES}", codename,
             unfinished, source],
            stdin=subprocess.DEVNULL, capture_output=True, text=True, timeout=LIMIT_SECONDS)
    except subprocess.TimeoutExpired as late:
        raise Impossible(f"debootstrap took more than {LIMIT_SECONDS} s") from late
    if made.returncode != 0:
        raise Impossible("debootstrap failed:\n" + "\n".join(made.stdout.splitlines()[-5:]))
    # What no test needs, and every copy would take along.
    for folder in ("var/cache/apt", "var/lib/apt/lists", "usr/share/doc", "usr/share/locale"):
        subprocess.run([*AS_ROOT, "find", unfinished / folder, "-mindepth", "1", "-delete"],
                       check=True)
    subprocess.run([*AS_ROOT, "mv", unfinished, system], check=True)
    return system


class Machine:
    """A running copy of the system. Commands go on running between calls of `run`."""

    def __init__(self, root, process):
        self.root = root
        self._process = process

    def run(self, command, expect=0, given=b""):
        """What the shell command printed; it must end with the exit status `expect`."""
        done = subprocess.run(
            [*AS_ROOT, "nsenter", "--target", str(self._process), "--mount", "--pid", "--net",
             "--ipc", "--uts", "--root", "env", "-i", "--chdir=/",
             "PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin",
             "DEBIAN_FRONTEND=noninteractive", "sh", "-c", command],
            input=given, stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
            timeout=COMMAND_LIMIT_SECONDS)
        said = done.stdout.decode(errors="replace")
        assert done.returncode == expect, f"{command}: status {done.returncode}\n{said}"
        return said

    def path(self, name):
        """A file of the machine, seen from outside."""
        return self.root / name.lstrip("/")

    def exists(self, name):
        return os.path.lexists(self.path(name))

    def put(self, source, name):
        """Copies a file from outside."""
        subprocess.run([*AS_ROOT, "cp", source, self.path(name)], check=True)

    def write(self, name, text):
        subprocess.run([*AS_ROOT, "tee", self.path(name)], input=text, text=True, check=True,
                       stdout=subprocess.DEVNULL)

    def await_line(self, name, text, seconds=120):
        """Waits until the file holds the text."""
        deadline = time.monotonic() + seconds
        while not (self.exists(name) and text in self.path(name).read_text()):
            assert time.monotonic() < deadline, f"not in {name}: {text}\n{self.tail(name)}"
            time.sleep(0.05)

    def tail(self, name):
        if not self.exists(name):
            return f"{name} is not there"
        return "\n".join(self.path(name).read_text().splitlines()[-20:])

    def files(self):
        """Every file and folder that should be there for longer than a moment."""
        found = set()
        for folder, folders, files in os.walk(self.root):
            here = pathlib.Path(folder).relative_to(self.root)
            folders[:] = [name for name in folders if str(here / name) not in UNSTEADY]
            found |= {str(here / name) for name in folders + files
                      if str(here / name) not in UNSTEADY}
        return found


@contextlib.contextmanager
def running(system, folder):
    """A copy of the system in this folder, running."""
    root = folder / "root"
    try:
        subprocess.run([*AS_ROOT, "cp", "-a", "--reflink=auto", system, root], check=True)
        with sandbox(root) as process:
            machine = Machine(root, process)
            machine.run("cat >/run/utmp", given=BOOTED)
            yield machine
    finally:
        subprocess.run([*AS_ROOT, "rm", "-rf", root], check=True)


@contextlib.contextmanager
def sandbox(root):
    """A sandbox around this root folder, in which nothing happens yet: its first process."""
    # On standard output bwrap tells the process id, and then closes it; sudo passes on no other
    # descriptor than these three.
    outside = subprocess.Popen(
        [*AS_ROOT, "bwrap", *SEPARATE, "--bind", root, "/", "--dev", "/dev", "--proc", "/proc",
         "--tmpfs", "/run", "--tmpfs", "/tmp", "--info-fd", "1", "--",
         "sh", "-c", "echo ready >&2; exec sleep infinity"],
        stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)
    process = json.load(outside.stdout)["child-pid"]
    try:
        assert outside.stderr.readline() == "ready\n"
        yield process
    finally:
        # The first process of its name space: what runs in it ends with it.
        subprocess.run([*AS_ROOT, "kill", "-KILL", str(process)], check=True)
        outside.wait()


def programs_missing():
    """What cannot be done without, and is not there."""
    path = os.environ["PATH"] + ":/usr/sbin:/sbin"
    needed = ["debootstrap", "bwrap", "nsenter", *AS_ROOT[:1]]
    return [name for name in needed if not shutil.which(name, path=path)]
