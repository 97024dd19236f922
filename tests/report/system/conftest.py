"""Further options of the tests whose log is the daemon's own, and the stories as it plays them."""

import dataclasses
import itertools
import pathlib
import sys
import typing

import pytest

HERE = pathlib.Path(__file__).resolve().parent
TESTS = HERE.parents[1]
sys.path[:0] = [str(TESTS / "system"), str(TESTS / "support" / "stepclock")]

import stepped  # noqa: E402 -- needs the paths
import stories  # noqa: E402


def pytest_addoption(parser):
    group = parser.getgroup("tolkwd")
    group.addoption("--tolkwd", type=pathlib.Path, required=True, help="the daemon")
    group.addoption("--clock", type=pathlib.Path, required=True, help="the clock to preload")


@dataclasses.dataclass
class Played:
    """A story that is over."""

    story: stories.Story
    debug: bool
    logs: typing.List[pathlib.Path]  # the log, and what the journal would have
    course: stories.Course

    def truth(self):
        """What a log like this can tell."""
        return self.story.truth if self.debug else {**self.story.truth, **self.story.known}


@pytest.fixture(scope="session")
def play(request, tmp_path_factory):
    """play(story, debug): lets the daemon run through it."""
    def program(name):
        return request.config.getoption(name).resolve()

    def run(story, debug):
        results = tmp_path_factory.mktemp("results")
        files = {"tolkwd.xml": stories.configuration(*story.services), **story.files}
        files.update({name.replace(" ", "."): "".join(f"{answer}\n" for answer in answers)
                      for name, answers in story.answers.items()})
        for name, text in files.items():
            (results / name).write_text(text, encoding="ascii")
        daemon = stepped.Daemon(program("tolkwd"), program("clock"), HERE / "machine", results)
        # When it says its last word again, the first one is in the log, too.
        words = itertools.count(1)

        def last(line):
            return story.last and line.endswith(f"{story.last}\n") and next(words) == 2

        options = ["-t", story.refresh] + (["-g"] if debug else [])
        journal = "".join(
            daemon.run(options, {"STEPCLOCK_LATER": str(later)}, last) for later in story.later)
        (results / "journal.log").write_text(journal)
        logs = [results / "tolkwd.log", results / "journal.log"]
        return Played(story, debug, logs[1:] if story.journal else logs,
                      stories.Course(daemon.commands()))

    return run


# One list: a story is played once for all tests only where they have the very same parameter.
ALL = [(story, debug) for story in stories.STORIES.values() for debug in (True, False)]
NAMES = [f"{name}{', debug lines' if debug else ''}"
         for name in stories.STORIES for debug in (True, False)]


@pytest.fixture(scope="module", params=ALL, ids=NAMES)
def played(request, play):
    """Each story, with debug lines and without."""
    return play(*request.param)
