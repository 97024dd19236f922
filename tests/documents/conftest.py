"""The program whose documents are looked at."""

import pathlib

import pytest


def pytest_addoption(parser):
    parser.getgroup("tolkwd").addoption("--tolkwd-check", type=pathlib.Path,
                                        help="the checker whose page and completion are tested")


@pytest.fixture(scope="session")
def program(request):
    return request.config.getoption("tolkwd_check").resolve(strict=True)
