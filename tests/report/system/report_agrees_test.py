"""What the report says is what happened, to the second of the daemon's clock.

The daemon is the real one, on a clock that skips its pauses and does not move while a command runs.
What it finds at each ping and check is told by a story (stories.py), and when each of them ran is
known from the clock's own journal: so what is compared with the report is what happened, and not
what the log says of it.
"""

import itertools
import json
import signal
import subprocess
import time

import daemonlog
import pytest
import stories

LIMIT_SECONDS = 60


@pytest.fixture
def report(request):
    """report(ARGUMENT...): the exit status and the JSON."""
    program = request.config.getoption("tolkwd_report").resolve()

    def run(*arguments):
        done = subprocess.run([program, *arguments], stdin=subprocess.DEVNULL,
                              stdout=subprocess.PIPE, timeout=LIMIT_SECONDS)
        return done.returncode, json.loads(done.stdout)

    return run


def seconds_of(iso):
    return time.mktime(time.strptime(iso, "%Y-%m-%dT%H:%M:%S"))


def end_of(log):
    """When its last line was written."""
    times = [daemonlog.LINE.match(line) for line in log.read_text().splitlines()]
    return max(time.mktime(time.strptime(found[1])) for found in times if found)


def spans_in(events, service):
    """[(state, since, inferred)] as the events tell it: each state as long as it lasted at all."""
    began = [(event["state"], event["time"], event["inferred"]) for event in events
             if event["service"] == service and event["state"]]
    began.sort(key=lambda each: each[1])  # what is inferred is known later than it happened
    lasting = [each for each, after in itertools.zip_longest(began, began[1:])
               if after is None or after[1] > each[1]]
    return [each for before, each in zip([None, *lasting], lasting)
            if before is None or before[0] != each[0]]


def agree(told, expected, course):
    """Whether the spans are the expected ones, with what is known of whether they are inferred."""
    wanted = [(span.state, stories.isotime(course.seconds(span.since)),
               told[place][2] if span.inferred is None and place < len(told) else span.inferred)
              for place, span in enumerate(expected)]
    assert told == wanted


def test_the_events_tell_what_happened(played, report):
    for log in played.logs:
        status, document = report("events", "--json", str(log))
        assert status == 0
        for service, expected in played.truth().items():
            agree(spans_in(document["events"], service), expected, played.course)


class Reckoned:
    """What follows from the spans of a service, up to the end of the log."""

    def __init__(self, spans, course, end):
        begins = [course.seconds(span.since) for span in spans]
        stretches = list(zip(spans, begins, [*begins[1:], end]))
        self.last, self.since, _ = stretches[-1]
        self.endedby = None  # the span behind the last outage
        self.outages = []
        for out, group in itertools.groupby(stretches, lambda each: each[0].state
                                            in stories.OUTAGES):
            group = list(group)
            if out:
                self.outages.append((group[0][1], group[-1][2]))
                self.endedby = None
            elif self.outages and self.endedby is None:
                self.endedby = group[0][0]
        self.outageseconds = sum(to - begin for begin, to in self.outages)
        self.watchedseconds = sum(to - begin for span, begin, to in stretches
                                  if span.state != stories.UNWATCHED)

    def lastoutage(self, told):
        """As it has to be told; whether its end is inferred is as told where that may be or not."""
        if not self.outages:
            return None
        begin, to = self.outages[-1]
        inferred = self.endedby is not None and self.endedby.inferred
        return {"from": stories.isotime(begin),
                "to": None if self.endedby is None else stories.isotime(to),
                "seconds": to - begin,
                "inferred": told and told["inferred"] if inferred is None else inferred}


def test_the_status_is_what_has_become_of_it(played, report):
    for log in played.logs:
        end = end_of(log)
        _, document = report("status", "--json", str(log))
        assert document["log"]["to"] == stories.isotime(end)
        assert document["log"]["torn"] == 0
        assert document["loadfailed"] == played.story.loadfailed
        told = {each["service"]: each for each in document["services"]}
        for service, expected in played.truth().items():
            reckoned = Reckoned(expected, played.course, end)
            figures = played.story.figures.get(service, stories.Figures())
            found = told[service]
            assert found["availability"] == pytest.approx(
                1 - reckoned.outageseconds / reckoned.watchedseconds, abs=5e-5)
            assert {name: found[name] for name in found if name not in (
                "inferred", "availability")} == {
                    "service": service,
                    "state": reckoned.last.state,
                    "since": stories.isotime(reckoned.since),
                    "seconds": end - reckoned.since,
                    "path": f"/usr/sbin/{service}",
                    "lastoutage": reckoned.lastoutage(found["lastoutage"]),
                    "outages": len(reckoned.outages),
                    "outageseconds": reckoned.outageseconds,
                    "recoveries": {"tried": figures.tried, "successful": figures.successful},
                    "skippedchecks": figures.skipped,
                    "gaveup": figures.gaveup,
                    "watchedseconds": reckoned.watchedseconds}


def test_the_exit_status_says_whether_somebody_should_look(played, report):
    for log in played.logs:
        status, document = report("status", "--json", str(log))
        states = {each["state"] for each in document["services"]}
        assert status == int(played.story.loadfailed or bool(
            states & (stories.OUTAGES | {stories.NO_CHECK})))


def test_nothing_of_the_daemons_is_taken_for_anothers(played, report):
    """Only what start and stop commands say is. Behind a debug line with their command it may as
    well go on with that line."""
    for log in played.logs:
        said = len([line for line in log.read_text().splitlines()
                    if line in ("start of web", "stop of web")])
        foreign = report("status", "--json", str(log))[1]["log"]["foreign"]
        assert foreign <= said if played.debug else foreign == said


@pytest.mark.parametrize("debug", [True, False])
@pytest.mark.parametrize("name", ["a recovery succeeds", "a check fails until it is given up"])
def test_each_moment_of_an_outage_is_told_as_it_was(play, report, tmp_path, name, debug):
    """The log up to any of its lines: where the service is in trouble then, it is told so."""
    played = play(stories.STORIES[name], debug)
    lines = played.logs[0].read_text().splitlines(keepends=True)
    spans = [(span.state, played.course.seconds(span.since)) for span in played.truth()["web"]]
    times = [time.mktime(time.strptime(daemonlog.LINE.match(line)[1])) for line in lines]
    part = tmp_path / "part.log"
    tried = set()
    for place, (now, after) in enumerate(zip(times, times[1:])):
        passed = [state for state, since in spans if since <= now]
        if after == now or not passed:
            continue  # not all that happened in this second has been written
        part.write_text("".join(lines[:place + 1]))
        _, document = report("status", "--json", str(part))
        told = {each["service"]: each["state"] for each in document["services"]}
        assert told["web"] == passed[-1], lines[place]
        tried.add(passed[-1])
    assert tried == {state for state, _ in spans}


def test_who_follows_is_told_the_same(play, report, request, tmp_path):
    program = request.config.getoption("tolkwd_report").resolve()
    played = play(stories.STORIES["the second recovery succeeds"], True)
    text = played.logs[0].read_text()
    log = tmp_path / "tolkwd.log"
    log.write_text("")
    _, document = report("events", "--json", "--all", str(played.logs[0]))
    wanted = [event for event in document["events"] if event["message"] is not None]
    with subprocess.Popen([program, "events", "--json", "--all", "--follow", log],
                          stdout=subprocess.PIPE, text=True) as follower:
        try:
            with log.open("a") as growing:
                for piece in range(0, len(text), 1000):  # lines are cut anywhere
                    growing.write(text[piece:piece + 1000])
                    growing.flush()
            told = []
            for line in follower.stdout:
                event = json.loads(line)
                assert event.pop("version") == document["version"]
                if event["message"] is not None:
                    told.append(event)
                if len(told) == len(wanted):
                    break
        finally:
            follower.send_signal(signal.SIGTERM)
    assert told == wanted
