"""The option that all tests of the checker take."""

import pathlib
import sys

import pytest

# For what the tests share.
sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[1] / "support"))


def pytest_addoption(parser):
    parser.getgroup("tolkwd").addoption("--tolkwd-check", type=pathlib.Path, required=True,
                                        help="the program to test")


@pytest.fixture(scope="session")
def program(request):
    return request.config.getoption("tolkwd_check").resolve()
