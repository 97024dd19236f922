"""The machine on which the package is tried."""

import pathlib
import sys

import pytest

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[1] / "machine"))

import machine as machines  # noqa: E402 -- needs the path

pytest_plugins = ["sharedfixtures"]


def pytest_configure(config):
    config.addinivalue_line("markers", "machine: needs a fresh machine")


@pytest.fixture
def machine(base_system):
    """A machine without systemd."""
    with machines.booted(base_system, "sysv") as booted:
        yield booted
