"""The option of the checker's tests."""

import pathlib


def pytest_addoption(parser):
    group = parser.getgroup("tolkwd-check")
    group.addoption("--tolkwd-check", type=pathlib.Path, required=True,
                    help="the program to test")
