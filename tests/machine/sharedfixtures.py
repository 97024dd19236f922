"""What the tests of the packages and of the machines share: the packages and the base system."""

import os
import pathlib
import subprocess

import pytest

import systems


def pytest_addoption(parser):
    parser.getgroup("tolkwd").addoption("--build", type=pathlib.Path, required=True,
                                        help="the build folder whose packages are tested")


def pytest_sessionfinish(session, exitstatus):
    """Where every test is skipped, pytest would end as if they had passed."""
    reporter = session.config.pluginmanager.get_plugin("terminalreporter")
    if reporter and exitstatus == pytest.ExitCode.OK:
        if "skipped" in reporter.stats and "passed" not in reporter.stats:
            session.exitstatus = systems.SKIPPED


@pytest.fixture(scope="session")
def build(request):
    return request.config.getoption("build").resolve()


@pytest.fixture(scope="session")
def project():
    return systems.PROJECT


@pytest.fixture(scope="session")
def packed(build, tmp_path_factory):
    """packed(KIND): the package of this kind. cpack makes it once for all workers of a run."""
    folder = tmp_path_factory.getbasetemp()
    if "PYTEST_XDIST_WORKER" in os.environ:
        folder = folder.parent

    def pack(kind):
        with systems.locked(folder / f"{kind}.lock"):
            if not (folder / kind).exists():
                subprocess.run(["cpack", "-G", kind, "-B", folder / kind], cwd=build, check=True,
                               stdout=subprocess.DEVNULL)
        package, = (folder / kind).glob(f"*.{kind.lower()}")
        return package

    return pack


@pytest.fixture(scope="session")
def base_system():
    try:
        return systems.base_system()
    except systems.Impossible as reason:
        pytest.skip(f"no machine could be booted: {reason}")
