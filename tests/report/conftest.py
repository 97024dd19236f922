"""The option that all tests of the report take."""

import pathlib

import pytest


def pytest_addoption(parser):
    parser.getgroup("tolkwd").addoption("--tolkwd-report", type=pathlib.Path, required=True,
                                        help="the program to test")


@pytest.fixture(scope="session")
def program(request):
    return request.config.getoption("tolkwd_report").resolve()
