"""Configurations with nothing wrong in them, for tests that spoil one."""

FIELDS = {
    "binarypath": "/usr/sbin/webd",
    "startcmd": "timeout 60 service web start",
    "stopcmd": "timeout 60 service web stop",
    "functionalpingcmd": "NULL",
    "genpinginterval": "60",
    "funpinginterval": "60",
    "maxattemptofwakeup": "3",
    "messageformat": "x",
    "hackmessagehandler": "x",
    "sendmessagehandler": "x",
    "MaxFPSkips": "0",
    "ThresholdAverageCPUUsage": "90000",
    "ThresholdMemoryUsage": "262144",
    "ThresholdThreadCount": "200",
    "ThresholdHandleCount": "100",
}


def configuration(*targets, before=""):
    """A file of these targets, each a dictionary of its name and of the fields that it has
    otherwise, and what is to stand before them."""
    return ("<?xml version='1.0'?>\n<wdtargets>\n" + before + "".join(
        "<wdmonitortarget>\n<wdmonitorservice>\n" +
        "".join(f"<{key}>{value}</{key}>\n"
                for key, value in {"name": "web", **FIELDS, **target}.items()) +
        "</wdmonitorservice>\n</wdmonitortarget>\n" for target in targets) + "</wdtargets>\n")
