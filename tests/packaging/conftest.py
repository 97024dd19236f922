"""The packages, made once, and the machines on which they are tried."""

import os
import pathlib
import subprocess

import pytest

import machine as machines


def pytest_addoption(parser):
    parser.getgroup("tolkwd").addoption("--build", type=pathlib.Path, required=True,
                                        help="the build folder whose packages are tested")


def pytest_configure(config):
    config.addinivalue_line("markers", "machine: needs a fresh machine")


@pytest.fixture(scope="session")
def build(request):
    return request.config.getoption("build").resolve()


@pytest.fixture(scope="session")
def project():
    return pathlib.Path(__file__).resolve().parents[2]


@pytest.fixture(scope="session")
def packed(build, tmp_path_factory):
    """packed(KIND): the package of this kind, as cpack makes it."""
    made = {}

    def pack(kind):
        if kind not in made:
            folder = tmp_path_factory.mktemp(kind)
            subprocess.run(["cpack", "-G", kind, "-B", folder], cwd=build, check=True,
                           stdout=subprocess.DEVNULL)
            made[kind], = folder.glob(f"*.{kind.lower()}")
        return made[kind]

    return pack


@pytest.fixture(scope="session")
def minimal_system(build):
    cache = os.environ.get("TOLKWD_TEST_CACHE")
    try:
        return machines.minimal_system(pathlib.Path(cache) if cache else build.parent / "cache")
    except machines.Impossible as reason:
        pytest.skip(f"no fresh system could be made: {reason}")


@pytest.fixture
def machine(minimal_system, tmp_path):
    """A fresh machine, running."""
    with machines.running(minimal_system, tmp_path) as running:
        yield running
