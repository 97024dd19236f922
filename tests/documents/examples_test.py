"""The example configurations: the manual's is the one that is installed and played, and all of them
give every service its sixteen keys."""

import pathlib
import re
import xml.etree.ElementTree

import pytest

PROJECT = pathlib.Path(__file__).resolve().parents[2]

KEYS = ["name", "binarypath", "startcmd", "stopcmd", "functionalpingcmd", "genpinginterval",
        "funpinginterval", "maxattemptofwakeup", "messageformat", "hackmessagehandler",
        "sendmessagehandler", "MaxFPSkips", "ThresholdAverageCPUUsage", "ThresholdMemoryUsage",
        "ThresholdThreadCount", "ThresholdHandleCount"]


def in_manual():
    """The example of tolkwd.xml(5), as man shows it."""
    page = (PROJECT / "doc" / "tolkwd.xml.5").read_text()
    display, = re.findall(r"^\.Bd -literal\n(<\?xml.*?)^\.Ed$", page, re.M | re.S)
    return display.replace(r"\(aq", "'").replace(r"\-", "-").replace(r"\e", "\\")


def in_guide():
    guide = (PROJECT / "doc" / "OPERATING.md").read_text()
    block, = re.findall(r"^```xml\n(.*?)^```$", guide, re.M | re.S)
    return block


def installed(name):
    return (PROJECT / "config" / name).read_text()


def services(text):
    """(element, {key: value}) of each service, in order. "&" is written as it is in these files."""
    root = xml.etree.ElementTree.fromstring(text.replace("&", "&amp;"))
    return [(service.tag, {key.tag: key.text.strip() for key in service})
            for service in root.iter() if service.tag in ("wdmonitorservice", "wdmondependsev")]


def test_the_manuals_example_is_the_one_that_is_installed():
    assert services(in_manual()) == services(installed("nginx-php-fpm.xml"))


@pytest.mark.parametrize("text", [in_manual(), in_guide(), installed("tolkwd.xml"),
                                  installed("nginx-php-fpm.xml")],
                         ids=["manual", "guide", "sample", "example"])
def test_every_service_has_its_sixteen_keys(text):
    found = services(text)
    assert [element for element, _ in found] == ["wdmonitorservice", "wdmondependsev"]
    for _, values in found:
        assert list(values) == KEYS
        assert all(values.values())
