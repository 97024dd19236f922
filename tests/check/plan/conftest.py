"""Further options of the tests that let the daemon do what it is planned to do."""

import pathlib
import sys

import pytest

HERE = pathlib.Path(__file__).resolve().parent
TESTS = HERE.parents[1]
sys.path[:0] = [str(TESTS / "system"), str(TESTS / "support" / "stepclock")]

import outages  # noqa: E402 -- needs the paths


def pytest_addoption(parser):
    group = parser.getgroup("tolkwd")
    group.addoption("--tolkwd", type=pathlib.Path, required=True, help="the daemon")
    group.addoption("--clock", type=pathlib.Path, required=True, help="the clock to preload")


@pytest.fixture
def machine(request, tmp_path):
    """A machine for one outage, with results of its own."""
    def program(name):
        return request.config.getoption(name).resolve()
    return outages.Machine(program("tolkwd"), program("tolkwd_check"), program("clock"), tmp_path)
