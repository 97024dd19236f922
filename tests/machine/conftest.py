"""The machines: each test gets one of each kind."""

import pytest

import machine as machines

pytest_plugins = ["sharedfixtures"]


@pytest.fixture(scope="session", params=["systemd", "sysv"])
def kind(request):
    return request.param


@pytest.fixture
def machine(kind, base_system):
    with machines.booted(base_system, kind) as booted:
        yield booted


@pytest.fixture(scope="session")
def package(packed):
    return packed("DEB")
