"""The programs whose documents are looked at."""

import pathlib

import pytest


def pytest_addoption(parser):
    group = parser.getgroup("tolkwd")
    group.addoption("--tolkwd-check", type=pathlib.Path,
                    help="the checker whose page and completion are tested")
    group.addoption("--tolkwd-report", type=pathlib.Path, help="the report, likewise")


@pytest.fixture(scope="session")
def program(request):
    return request.config.getoption("tolkwd_check").resolve(strict=True)


@pytest.fixture(scope="session")
def report(request):
    return request.config.getoption("tolkwd_report").resolve(strict=True)
