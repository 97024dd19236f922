"""The programs that are measured, set up to do the same job by the same commands."""

import pathlib

import sandboxed

MONIT = "/usr/bin/monit"
SUPERVISORD = "/usr/bin/supervisord"
FOR_EVER = 3600

# The fields of a service, as the sample configuration writes them out.
FIELDS = """\
      <name>{name}</name>
      <binarypath>/usr/sbin/{name}</binarypath>
      <startcmd>service {name} start</startcmd>
      <stopcmd>service {name} stop</stopcmd>
      <functionalpingcmd>NULL</functionalpingcmd>
      <genpinginterval>{interval}</genpinginterval>
      <funpinginterval>{interval}</funpinginterval>
      <maxattemptofwakeup>3</maxattemptofwakeup>
      <messageformat>plain</messageformat>
      <hackmessagehandler>NULL</hackmessagehandler>
      <sendmessagehandler>NULL</sendmessagehandler>
      <MaxFPSkips>5</MaxFPSkips>
      <ThresholdAverageCPUUsage>90000</ThresholdAverageCPUUsage>
      <ThresholdMemoryUsage>262144</ThresholdMemoryUsage>
      <ThresholdThreadCount>200</ThresholdThreadCount>
      <ThresholdHandleCount>1000</ThresholdHandleCount>
"""

MONIT_HEAD = """\
set daemon {interval}
set pidfile /tmp/monit.pid
set statefile /tmp/monit.state
set idfile /tmp/monit.id
set logfile /tmp/monit.log
"""

MONIT_SERVICE = """\
check program s{number} with path "{status}"
  start program = "{service} s{number} start"
  stop program = "{service} s{number} stop"
  if status != 0 for 3 cycles then restart
"""

# Never asked, only restarted with the service it depends on: what a dependent of tolkwd is.
MONIT_DEPENDENT = """\
check program d{number} with path "{service} d{number} status"
  every "0 0 1 1 *"
  start program = "{service} d{number} start"
  stop program = "{service} d{number} stop"
  if status != 0 then alert
  depends on s{number}
"""

SUPERVISORD_HEAD = """\
[supervisord]
nodaemon=true
user=root
logfile=/dev/null
logfile_maxbytes=0
pidfile=/tmp/supervisord.pid
childlogdir=/tmp
minfds={descriptors}
"""

SUPERVISORD_PROGRAM = """\
[program:s{number}]
command=/bin/sleep infinity
stdout_logfile=NONE
stderr_logfile=NONE
"""


def _element(name, interval):
    def write(service):
        return f"    <{name}>\n{FIELDS.format(name=service, interval=interval)}    </{name}>\n"
    return write


def tolkwd_configuration(targets, dependents, interval):
    """So many targets with so many dependents each. Dependent M of target N is dN, dN-2, ..."""
    service = _element("wdmonitorservice", interval)
    dependent = _element("wdmondependsev", interval)
    text = ["<?xml version='1.0'?>\n<wdtargets>\n"]
    for number in range(1, targets + 1):
        text += ["  <wdmonitortarget>\n", service(f"s{number}")]
        text += [dependent(f"d{number}" if which == 1 else f"d{number}-{which}")
                 for which in range(1, dependents + 1)]
        text.append("  </wdmonitortarget>\n")
    return "".join([*text, "</wdtargets>\n"])


# What tolkwd runs, to the letter, but for the file's folder.
COMMAND_LINE = "service {name} status 1>/tmp/agent.{name} 2>/tmp/agent.{name}"


def monit_configuration(targets, dependents, interval, through_shell):
    service = f"{sandboxed.COMMANDS}/service"
    text = [MONIT_HEAD.format(interval=interval)]
    for number in range(1, targets + 1):
        status = f"{service} s{number} status"
        if through_shell:
            status = f"/bin/sh -c '{COMMAND_LINE.format(name=f's{number}')}'"
        text.append(MONIT_SERVICE.format(number=number, service=service, status=status))
        if dependents:
            text.append(MONIT_DEPENDENT.format(number=number, service=service))
    return "".join(text)


def supervisord_configuration(targets):
    # Three pipes a child, and what it needs itself.
    text = [SUPERVISORD_HEAD.format(descriptors=4 * targets + 100)]
    text += [SUPERVISORD_PROGRAM.format(number=number) for number in range(1, targets + 1)]
    return "".join(text)


def descriptors_for(targets):
    """The usual limit, or one that lets monit have its three for each target."""
    return max(sandboxed.DESCRIPTORS, 3 * targets + 100)


class Programs:
    """Starts each of the programs in a sandbox."""

    def __init__(self, tolkwd, service):
        self._tolkwd = pathlib.Path(tolkwd).resolve()
        self._tools = pathlib.Path(service).resolve().parent

    def tolkwd(self, targets, interval, dependents=1, metered=False):
        files = {"tolkwd.xml": tolkwd_configuration(targets, dependents, interval)}
        command = [f"/opt/programs/{self._tolkwd.name}", "-i", f"{sandboxed.FOLDER}/tolkwd.xml",
                   "-l", "/tmp/tolkwd.log", "-t", str(FOR_EVER)]
        return sandboxed.Sandboxed(self._tools, command, files, [self._tolkwd], metered,
                                   descriptors_for(targets))

    def monit(self, targets, interval, dependents=1, metered=False, through_shell=False):
        files = {"monitrc": monit_configuration(targets, dependents, interval, through_shell)}
        command = [MONIT, "-I", "-c", "/tmp/monitrc"]
        return sandboxed.Sandboxed(self._tools, command, files, (), metered,
                                   descriptors_for(targets))

    def supervisord(self, targets):
        files = {"supervisord.conf": supervisord_configuration(targets)}
        command = [SUPERVISORD, "-c", f"{sandboxed.FOLDER}/supervisord.conf"]
        return sandboxed.Sandboxed(self._tools, command, files)

    def threadfloor(self, threads, interval, metered=False):
        command = [f"{sandboxed.TOOLS}/threadfloor", str(threads), str(interval)]
        return sandboxed.Sandboxed(self._tools, command, {}, (), metered)
