"""packaging/build.sh: which package it makes, and what it installs for that. Stubs stand in for
cmake and cpack, and for dpkg-query, which finds every package installed."""

import subprocess

import pytest

TIME_LIMIT = 60  # seconds

# Each writes down what it is called with.
STUBS = {
    "cmake": "",
    "cpack": "touch /run/project/build/packages/tolkwd.deb /run/project/build/packages/tolkwd.rpm",
    "dpkg-query": "printf installed",
}


@pytest.fixture
def run_build(project, tmp_path):
    """run_build(ARGUMENT...): the finished script, and the last argument of each call of each stub.
    In a sandbox, because the script installs what is missing."""
    stubs, build = tmp_path / "stubs", tmp_path / "build"
    stubs.mkdir()
    (build / "packages").mkdir(parents=True)
    for name, action in STUBS.items():
        (stubs / name).write_text(f"#!/bin/sh\nshift $(($# - 1))\n"
                                  f"echo \"$1\" >>/run/project/build/{name}\n{action}\n")
        (stubs / name).chmod(0o755)

    def run(*arguments):
        done = subprocess.run(
            [project / "scripts/sandbox.sh",
             "--ro-bind", project / "scripts", "/run/project/scripts",
             "--ro-bind", project / "packaging", "/run/project/packaging",
             "--bind", build, "/run/project/build", "--ro-bind", stubs, "/run/stubs",
             "--setenv", "PATH", "/run/stubs:/usr/sbin:/usr/bin:/sbin:/bin",
             "--", "/run/project/packaging/build.sh", *arguments],
            capture_output=True, text=True, timeout=TIME_LIMIT)
        calls = {name: (build / name).read_text().split() if (build / name).exists() else []
                 for name in STUBS}
        return done, calls

    return run


@pytest.mark.parametrize("arguments, generator, needed, made", [
    ([], "DEB", "dpkg-dev", "tolkwd.deb"),
    (["rpm"], "RPM", "rpm", "tolkwd.rpm"),
], ids=["deb", "rpm"])
def test_one_package_is_made_with_what_it_needs(run_build, arguments, generator, needed, made):
    done, calls = run_build(*arguments)
    assert (done.returncode, done.stderr) == (0, "")
    assert calls["cpack"] == [generator]
    assert {"cmake", "g++", needed} <= set(calls["dpkg-query"])
    others = {"dpkg-dev", "lintian", "rpm"} - {needed}
    assert set(calls["dpkg-query"]) & others == set()
    assert done.stdout.splitlines()[-1] == made


@pytest.mark.parametrize("arguments", [["deb", "rpm"], ["RPM"]], ids=str)
def test_other_words_are_refused_before_anything_is_done(run_build, arguments):
    done, calls = run_build(*arguments)
    assert (done.returncode, done.stderr) == (1, "usage: packaging/build.sh [rpm]\n")
    assert calls == {name: [] for name in STUBS}
