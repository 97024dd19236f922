#!/usr/bin/env python3
"""Makes the Debian system that the tests' machines are copies of.

    tests/machine/systems.py

makes it in build/cache, or in the folder that TOLKWD_TEST_CACHE names, unless an earlier run has.
One system serves both kinds of machine. It comes from the mirror that this machine installs from.
"""

import contextlib
import fcntl
import hashlib
import os
import pathlib
import shutil
import subprocess
import sys

HERE = pathlib.Path(__file__).resolve().parent
PROJECT = HERE.parents[1]
LIMIT_SECONDS = 900
TIMED_OUT = 124  # timeout(1)'s exit status
SKIPPED = 77  # the exit status that ctest takes for a skipped test

AS_ROOT = [] if os.geteuid() == 0 else ["sudo", "--non-interactive"]

# What the kernel and the permissions must allow, each with a command that tries it.
NEEDED = {
    "namespaces": "unshare --cgroup --pid --mount --net --uts --ipc --fork true",
    "overlays in memory": "unshare --mount sh -ec 'mount -t tmpfs tmpfs /run; cd /run; mkdir u w r;"
                          " mount -t overlay -o lowerdir=/etc,upperdir=u,workdir=w overlay r'",
    "control groups": "unshare --mount --cgroup mount -t cgroup2 cgroup2 /mnt"
                      " && groups=$(findmnt -nft cgroup2 -o TARGET)"
                      " && group=$(mktemp -d $groups/tolkwd.XXXXXX) && rmdir $group",
}


class Impossible(Exception):
    """A machine cannot be booted here, for no fault of the project."""


def check_possible():
    """Raises Impossible where this machine cannot boot another one."""
    path = os.environ["PATH"] + ":/usr/sbin:/sbin"
    programs = ["debootstrap", "ip", "nsenter", "setpriv", "unshare", *AS_ROOT[:1]]
    missing = [name for name in programs if not shutil.which(name, path=path)]
    if missing:
        raise Impossible(f"{', '.join(missing)} missing")
    for what, command in NEEDED.items():
        tried = subprocess.run([*AS_ROOT, "sh", "-c", command], stdin=subprocess.DEVNULL,
                               stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, text=True)
        if tried.returncode != 0:
            raise Impossible(f"no {what}: {' '.join(tried.stderr.split()) or command}")


def codename():
    """The release that this machine runs."""
    for line in pathlib.Path("/etc/os-release").read_text().splitlines():
        key, _, value = line.partition("=")
        if key == "VERSION_CODENAME":
            return value.strip('"')
    raise Impossible("this machine's release is not known")


def mirror(release):
    """The URI that this machine installs packages of the release from."""
    sources = subprocess.run(
        ["apt-get", "indextargets", "--format", "$(REPO_URI)", "Created-By: Packages",
         f"Codename: {release}"], capture_output=True, text=True, check=True).stdout.split()
    if not sources:
        raise Impossible("this machine's source of packages is not known")
    return sources[0]


@contextlib.contextmanager
def locked(path):
    """Holds the lock of this file; others who want it wait."""
    path.parent.mkdir(parents=True, exist_ok=True)
    with path.open("w") as file:
        fcntl.flock(file, fcntl.LOCK_EX)
        yield


def base_system():
    """The folder of the system, which is made unless an earlier run has."""
    check_possible()
    cache = pathlib.Path(os.environ.get("TOLKWD_TEST_CACHE") or PROJECT / "build" / "cache")
    release = codename()
    recipe = HERE / "makesystem.sh"
    version = hashlib.sha256(recipe.read_bytes()).hexdigest()[:12]
    system = cache.resolve() / f"machine-{release}-{version}"
    with locked(cache / "machine.lock"):
        if not system.is_dir():
            make([recipe, system, release, mirror(release)])
    return system


def make(command):
    """Runs the recipe. Raises Impossible if the mirror does not answer."""
    made = subprocess.run([*AS_ROOT, "timeout", str(LIMIT_SECONDS), *command],
                          stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                          stderr=subprocess.STDOUT, text=True)
    if made.returncode == TIMED_OUT:
        raise Impossible(f"debootstrap took more than {LIMIT_SECONDS} s")
    if made.returncode != 0:
        said = " ".join(made.stdout.splitlines()[-5:])
        if "Failed getting release" in said or "Couldn't download" in said:
            raise Impossible(f"no mirror: {said}")
        raise RuntimeError(f"no system was made: {said}")


if __name__ == "__main__":
    try:
        print(base_system())
    except Impossible as reason:
        print(f"no machine could be booted: {reason}")
        sys.exit(SKIPPED)
