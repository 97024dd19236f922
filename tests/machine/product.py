"""The package on a machine: its files, installing it with a configuration, a later version."""

import re
import subprocess

CONFIGURATION = "/etc/opt/varden/tolk/tolkwd.xml"
EXAMPLE = "/etc/opt/varden/tolk/tolkwd.xml.example"
DEFAULTS = "/etc/default/tolkwd"
PINGS = "/opt/varden/tolk/bin"
LOG = "/var/log/tolkwd.log"

# A minute of the daemon's passes in a second.
CLOCK = {
    "systemd": r"""
mkdir -p /run/systemd/system/tolkwd.service.d
printf '[Service]\nEnvironment=LD_PRELOAD=%s FAKETIME_ONLY_CMDS=tolkwd "FAKETIME=+0 x60"\n' \
    /usr/lib/*/faketime/libfaketimeMT.so.1 >/run/systemd/system/tolkwd.service.d/clock.conf
systemctl daemon-reload
""",
    "sysv": """
cat >>/etc/default/tolkwd <<'END'
export LD_PRELOAD=$(echo /usr/lib/*/faketime/libfaketimeMT.so.1)
export FAKETIME="+0 x60" FAKETIME_ONLY_CMDS=tolkwd
END
""",
}

# The commands that the installation and the manual name.
ENABLE = {
    "systemd": "systemctl enable --now tolkwd",
    "sysv": "update-rc.d tolkwd enable && service tolkwd start",
}
DISABLE = {
    "systemd": "systemctl disable --now tolkwd",
    "sysv": "service tolkwd stop && update-rc.d tolkwd disable",
}


def watching(name, program, check="NULL"):
    """A configuration with this service."""
    return f"""<?xml version='1.0'?>
<wdtargets>
  <wdmonitortarget>
    <wdmonitorservice>
      <name>{name}</name>
      <binarypath>{program}</binarypath>
      <startcmd>NULL</startcmd>
      <stopcmd>NULL</stopcmd>
      <functionalpingcmd>{check}</functionalpingcmd>
      <genpinginterval>20</genpinginterval>
      <funpinginterval>20</funpinginterval>
      <maxattemptofwakeup>3</maxattemptofwakeup>
      <messageformat>plain</messageformat>
      <hackmessagehandler>NULL</hackmessagehandler>
      <sendmessagehandler>NULL</sendmessagehandler>
      <MaxFPSkips>0</MaxFPSkips>
      <ThresholdAverageCPUUsage>90000</ThresholdAverageCPUUsage>
      <ThresholdMemoryUsage>262144</ThresholdMemoryUsage>
      <ThresholdThreadCount>200</ThresholdThreadCount>
      <ThresholdHandleCount>1000</ThresholdHandleCount>
    </wdmonitorservice>
  </wdmonitortarget>
</wdtargets>
"""


WATCH_CRON = watching("cron", "/usr/sbin/cron")


def install(machine, package):
    machine.copy_in(package, "/package.deb")
    return machine.run("dpkg --install /package.deb")


def configure(machine, configuration, options):
    machine.write(CONFIGURATION, configuration)
    machine.run(CLOCK[machine.kind] + f"echo 'TOLKWD_OPTIONS=\"{options}\"' >>{DEFAULTS}")


def set_up(machine, package, configuration=WATCH_CRON):
    """Installs the package with this configuration, and sees it at work."""
    install(machine, package)
    configure(machine, configuration, "-g")
    machine.run(ENABLE[machine.kind])
    machine.await_line(LOG, "General ping successful!")


def daemon(machine):
    """The daemon's process id."""
    if machine.kind == "systemd":
        return machine.run("systemctl show --property MainPID --value tolkwd").strip()
    return machine.read("/run/tolkwd.pid").strip()


def enabled(machine):
    """Whether the machine starts the daemon at boot."""
    links = {"systemd": "/etc/systemd/system/*/tolkwd.service", "sysv": "/etc/rc2.d/S??tolkwd"}
    return machine.run(f"ls {links[machine.kind]} 2>/dev/null || true") != ""


def newer(package, folder):
    """The package, as a later version with another example."""
    tree = folder / "tree"
    subprocess.run(["dpkg-deb", "--raw-extract", package, tree], check=True)
    control = tree / "DEBIAN" / "control"
    text, count = re.subn(r"^Version: .*$", "Version: 9.0.0-1", control.read_text(), flags=re.M)
    assert count == 1
    control.write_text(text)
    with (tree / EXAMPLE[1:]).open("a") as example:
        example.write("\n")
    subprocess.run(["dpkg-deb", "--root-owner-group", "-Znone", "--build", tree,
                    folder / "newer.deb"], check=True, stdout=subprocess.DEVNULL)
    return folder / "newer.deb"


def upgrade(machine, package, folder):
    """To a version whose example is another; what an operator has edited is kept."""
    machine.copy_in(newer(package, folder), "/newer.deb")
    machine.run("dpkg --force-confdef --install /newer.deb")
