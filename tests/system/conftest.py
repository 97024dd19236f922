"""Options of the system tests, and the stage that each scenario is played on."""

import pathlib

import pytest

import stage as stages


def pytest_addoption(parser):
    group = parser.getgroup("tolkwd")
    group.addoption("--tolkwd", type=pathlib.Path, required=True, help="the program to test")
    group.addoption("--short", action="store_true", help="repeat a tenth of what is repeated")
    group.addoption("--refreshes", type=int, default=40, help="how many the soak has")
    group.addoption("--wrapper", default="", help="a command line that runs the program")


@pytest.fixture
def stage(request, tmp_path):
    """A place to play a scenario on, with results of its own."""
    return stages.Stage(
        program=request.config.getoption("tolkwd").resolve(),
        results=tmp_path,
        refreshes=request.config.getoption("refreshes"),
        short=request.config.getoption("short"),
        wrapper=request.config.getoption("wrapper"),
    )
