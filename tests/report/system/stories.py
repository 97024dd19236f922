"""What happens to services under the real daemon, told as data, and what is true of them then.

A story says how each service answers, ask by ask and check by check, so it knows when a service
broke and when it was mended: at which of its commands. A moment is written so: "web status 4" is
when web's status command ran for the fourth time, on the daemon's clock; "-1" is the last time;
"web status 4 +210" is as many seconds later.
"""

import dataclasses
import re
import time
import typing

# From a failure to the last retry.
RETRIES_SECONDS = 210
FUNCTIONAL_RETRIES_SECONDS = 150  # their pauses stand behind them


@dataclasses.dataclass
class Service:
    """A target of the configuration."""

    name: str
    check: bool = False
    general: int = 10
    functional: int = 20
    attempts: int = 3
    skips: int = 0
    threads: int = 1000

    def target(self):
        fields = (("name", self.name), ("binarypath", f"/usr/sbin/{self.name}"),
                  ("startcmd", "NULL"), ("stopcmd", "NULL"),
                  ("functionalpingcmd", f"check {self.name}" if self.check else "NULL"),
                  ("genpinginterval", self.general), ("funpinginterval", self.functional),
                  ("maxattemptofwakeup", self.attempts), ("MaxFPSkips", self.skips),
                  ("ThresholdAverageCPUUsage", 2000000000),
                  ("ThresholdMemoryUsage", 2000000000), ("ThresholdThreadCount", self.threads))
        inside = "".join(f"<{key}>{value}</{key}>" for key, value in fields)
        return (f"<wdmonitortarget>\n<wdmonitorservice>{inside}</wdmonitorservice>\n"
                "</wdmonitortarget>\n")


def configuration(*services):
    targets = "".join(service.target() for service in services)
    return f"<wdtargets>\n{targets}</wdtargets>\n"


# Always well, and heard of at each check: so the log goes on whatever becomes of the others.
BEAT = Service("beat", check=True, general=40, functional=7)
BEATS_SECONDS = BEAT.general + BEAT.functional


@dataclasses.dataclass
class Span:
    """A state, and the moment at which it began."""

    state: str
    since: str
    inferred: typing.Optional[bool] = None  # None: it may be or not


@dataclasses.dataclass
class Figures:
    """What was counted."""

    tried: int = 0
    successful: int = 0
    skipped: int = 0
    gaveup: int = 0


@dataclasses.dataclass
class Story:
    services: typing.Sequence[Service]
    answers: typing.Dict[str, typing.List[str]]  # by "NAME status" and "NAME check"
    truth: typing.Dict[str, typing.List[Span]]  # by service: what happened, which debug lines tell
    # What can be known without them, where it is less.
    known: typing.Dict[str, typing.List[Span]] = dataclasses.field(default_factory=dict)
    figures: typing.Dict[str, Figures] = dataclasses.field(default_factory=dict)
    refresh: int = 10800
    files: typing.Dict[str, str] = dataclasses.field(default_factory=dict)
    last: str = ""  # it ends when this is said a second time; otherwise the answers end
    later: typing.Sequence[int] = (0,)  # the starts of the daemon, in seconds
    loadfailed: bool = False
    journal: bool = False  # some of it is told in the journal only


UP = "up"
DOWN = "suspect"
RECOVERY = "recovering"
FAILS = "functional-failure"
FUNCTIONAL = "functional-recovering"
GIVEN_UP = "gave-up"
UNKNOWN = "unknown-service"
NO_CHECK = "command-not-recognised"
BUSY = "busy"
UNWATCHED = "not-watched"

OUTAGES = {DOWN, RECOVERY, FAILS, FUNCTIONAL, GIVEN_UP, UNKNOWN}

WEB = Service("web")
CHECKED = Service("web", check=True)

well, down, unclear, unknown = ["well"], ["down"], ["unclear"], ["unknown"]
fails, missing, end = ["fails"], ["missing"], ["end"]

BEGIN = Span(UP, "web status 1")

EMPTY_TAG = configuration(WEB, BEAT).replace("<stopcmd>NULL</stopcmd>", "<stopcmd/>")

STORIES = {
    "a retry succeeds": Story(
        (WEB, BEAT),
        {"web status": well * 2 + down * 2 + well * 40},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(UP, "web status 5", False)]},
        {"web": [BEGIN, Span(DOWN, "web status 3", False),
                 Span(UP, f"web status 3 +{RETRIES_SECONDS}", True)]}),

    "the last retry succeeds": Story(
        (WEB, BEAT),
        {"web status": well * 2 + down + unclear * 2 + well * 40},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(UP, "web status 6", False)]},
        {"web": [BEGIN, Span(DOWN, "web status 3", False),
                 Span(UP, f"web status 3 +{RETRIES_SECONDS}", True)]}),

    # Its check speaks, and so the first retry is known to have succeeded.
    "a retry of a checked service succeeds": Story(
        (CHECKED, BEAT),
        {"web status": well * 2 + down + well * 20},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(UP, "web status 4", False)]},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(UP, "web check 3", True)]}),

    "it fails again and again, and comes back by itself": Story(
        (WEB, BEAT),
        {"web status": (well * 2 + down * 2 + well * 40) * 2},
        {"web": [BEGIN, Span(DOWN, "web status 3"), Span(UP, "web status 5"),
                 Span(DOWN, "web status 47"), Span(UP, "web status 49")]},
        {"web": [BEGIN, Span(DOWN, "web status 3"), Span(UP, f"web status 3 +{RETRIES_SECONDS}"),
                 Span(DOWN, "web status 47"), Span(UP, f"web status 47 +{RETRIES_SECONDS}")]}),

    "a recovery succeeds": Story(
        (WEB, BEAT),
        {"web status": well * 2 + down * 4 + well * 40},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(RECOVERY, "web start 1", False),
                 Span(UP, "web status 7", False)]},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(RECOVERY, "web start 1", False),
                 Span(UP, f"web status 7 +{WEB.general}", False)]},
        {"web": Figures(tried=1, successful=1)}),

    "a recovery of a checked service succeeds": Story(
        (CHECKED, BEAT),
        {"web status": well * 2 + unclear * 4 + well * 20},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(RECOVERY, "web start 1", False),
                 Span(UP, "web status 7", False)]},
        {},
        {"web": Figures(tried=1, successful=1)}),

    "the second recovery succeeds": Story(
        (WEB, BEAT),
        {"web status": well * 2 + down * 8 + well * 40},
        {"web": [BEGIN, Span(DOWN, "web status 3"), Span(RECOVERY, "web start 1"),
                 Span(DOWN, "web status 7"), Span(RECOVERY, "web start 2"),
                 Span(UP, "web status 11", False)]},
        {"web": [BEGIN, Span(DOWN, "web status 3"), Span(RECOVERY, "web start 1"),
                 Span(DOWN, "web status 7"), Span(RECOVERY, "web start 2"),
                 Span(UP, f"web status 11 +{WEB.general}", False)]},
        {"web": Figures(tried=2, successful=1)}),

    "it is given up, and revived by a refresh": Story(
        (Service("web", attempts=2), BEAT),
        {"web status": well * 2 + down * 8 + well * 40},
        {"web": [BEGIN, Span(DOWN, "web status 3"), Span(RECOVERY, "web start 1"),
                 Span(DOWN, "web status 7"), Span(RECOVERY, "web start 2"),
                 Span(GIVEN_UP, f"web start 2 +{WEB.general}", False), Span(UP, "web status 11")]},
        {},
        {"web": Figures(tried=2, gaveup=1)},
        refresh=1000),

    "it is given up, and again after the refresh": Story(
        (Service("web", attempts=1), BEAT),
        {"web status": well * 2 + down * 8 + well * 4},
        {"web": [BEGIN, Span(DOWN, "web status 3"), Span(RECOVERY, "web start 1"),
                 Span(GIVEN_UP, f"web start 1 +{WEB.general}"), Span(DOWN, "web status 7"),
                 Span(RECOVERY, "web start 2"), Span(GIVEN_UP, f"web start 2 +{WEB.general}"),
                 Span(UP, "web status 11")]},
        {},
        {"web": Figures(tried=2, gaveup=2)},
        refresh=1000),

    "it may have no recovery": Story(
        (Service("web", attempts=0), BEAT),
        {"beat status": well * 10},
        {"web": [Span(GIVEN_UP, "beat status 1", False)]},
        {},
        {"web": Figures(gaveup=1)}),

    "the system does not know it any more, and does again": Story(
        (WEB, BEAT),
        {"web status": well * 2 + unknown + well * 40},
        {"web": [BEGIN, Span(UNKNOWN, "web status 3", False), Span(UP, "web status 4")]},
        refresh=500),

    "a check fails, and a retry succeeds": Story(
        (CHECKED, BEAT),
        {"web check": well * 2 + fails + well * 20},
        {"web": [BEGIN, Span(FAILS, "web check 3", False), Span(UP, "web check 4", False)]},
        {"web": [BEGIN, Span(FAILS, "web check 3", False), Span(UP, "web check 5", True)]}),

    # The check that follows is later than the last retry that there would have been.
    "a check fails, and a retry succeeds, long intervals": Story(
        (Service("web", check=True, general=300, functional=100), BEAT),
        {"web check": well * 2 + fails + well * 5},
        {"web": [BEGIN, Span(FAILS, "web check 3", False), Span(UP, "web check 4", False)]},
        {"web": [BEGIN, Span(FAILS, "web check 3", False),
                 Span(UP, f"web check 3 +{FUNCTIONAL_RETRIES_SECONDS}", True)]}),

    "a check fails, and a recovery succeeds": Story(
        (CHECKED, BEAT),
        {"web check": well * 2 + fails * 4 + well * 20},
        {"web": [BEGIN, Span(FAILS, "web check 3", False),
                 Span(FUNCTIONAL, "web stop 1", False), Span(UP, "web check 7", False)]},
        # Only what follows the check tells.
        {"web": [BEGIN, Span(FAILS, "web check 3", False),
                 Span(FUNCTIONAL, "web stop 1", False), Span(UP, "web check 7", True)]},
        {"web": Figures(tried=1, successful=1)}),

    "a check fails until it is given up": Story(
        (Service("web", check=True, attempts=2), BEAT),
        {"web check": well * 2 + fails * 8 + well * 20},
        {"web": [BEGIN, Span(FAILS, "web check 3"), Span(FUNCTIONAL, "web stop 1"),
                 Span(FAILS, "web check 7"), Span(FUNCTIONAL, "web stop 2"),
                 Span(GIVEN_UP, f"web stop 2 +{1 + CHECKED.functional}", False),
                 Span(UP, "web check 11")]},
        {},
        {"web": Figures(tried=2, gaveup=1)},
        refresh=1000),

    "a busy service is not checked": Story(
        (Service("web", check=True, skips=-1, threads=1), BEAT),
        {"web status": (well * 2 + ["well touch /run/busy"] + well * 3 + ["well rm /run/busy"]
                        + well * 5)},
        {"web": [BEGIN, Span(BUSY, "web status 3", False), Span(UP, "web status 7")]},
        {},
        {"web": Figures(skipped=4)}),

    "a busy service is checked when no more may be left out": Story(
        (Service("web", check=True, skips=2, threads=1), BEAT),
        {"web status": (well * 2 + ["well touch /run/busy"] + well * 3 + ["well rm /run/busy"]
                        + well * 5)},
        {"web": [BEGIN, Span(BUSY, "web status 3", False), Span(UP, "web status 5"),
                 Span(BUSY, "web status 6"), Span(UP, "web status 7")]},
        {},
        {"web": Figures(skipped=3)}),

    "the check's command is missing": Story(
        (CHECKED, BEAT),
        {"web check": well * 2 + missing * 3 + well * 5},
        {"web": [BEGIN, Span(NO_CHECK, "web check 3", False), Span(UP, "web check 6")]}),

    "two fail at once": Story(
        (WEB, Service("db", check=True), BEAT),
        {"web status": well * 2 + down * 4 + well * 40,
         "db status": well + down * 2 + well * 100},
        {"web": [BEGIN, Span(DOWN, "web status 3"), Span(RECOVERY, "web start 1"),
                 Span(UP, "web status 7")],
         "db": [Span(UP, "db status 1"), Span(DOWN, "db status 2"), Span(UP, "db status 4")]},
        {"web": [BEGIN, Span(DOWN, "web status 3"), Span(RECOVERY, "web start 1"),
                 Span(UP, f"web status 7 +{WEB.general}")],
         "db": [Span(UP, "db status 1"), Span(DOWN, "db status 2"), Span(UP, "db check 2", True)]},
        {"web": Figures(tried=1, successful=1)}),

    # A monitor ends at the end of its round, and the next ones begin when all have ended.
    "a refresh drops one and adds another": Story(
        (WEB, Service("old", general=13), BEAT),
        {"web status": well * 3 + ["well cp /opt/results/next.xml /opt/results/tolkwd.xml"]
         + well * 14},
        {"old": [Span(UP, "old status 1"), Span(UNWATCHED, "old status -1 +13")],
         "new": [Span(UP, "new status 1")],
         "web": [BEGIN, Span(UNWATCHED, f"web status 12 +{WEB.general}"),
                 Span(UP, "new status 1")]},
        {"old": [Span(UP, "old status 1"), Span(UNWATCHED, "new status 1")],
         "web": [BEGIN]},
        refresh=120,
        files={"next.xml": configuration(WEB, Service("new"), BEAT)}),

    "the load fails": Story(
        (WEB, BEAT),
        {"web status": well * 3 + ["well cp /opt/results/next.xml /opt/results/tolkwd.xml"]
         + well * 40},
        {"web": [BEGIN, Span(UNWATCHED, f"web status 12 +{WEB.general}")],
         "beat": [Span(UP, "beat status 1"), Span(UNWATCHED, f"beat check -1 +{BEATS_SECONDS}")]},
        {"web": [BEGIN, Span(UNWATCHED, f"beat check -1 +{BEATS_SECONDS}", False)]},
        refresh=120,
        files={"next.xml": EMPTY_TAG},
        last="Loadservices error.",
        loadfailed=True),

    # Said on standard error only, which has no time: the line before is a check.
    "the configuration is gone": Story(
        (WEB, BEAT),
        {"web status": well * 3 + ["well rm /opt/results/tolkwd.xml"] + well * 40},
        {"web": [BEGIN, Span(UNWATCHED, f"web status 12 +{WEB.general}")],
         "beat": [Span(UP, "beat status 1"), Span(UNWATCHED, f"beat check -1 +{BEATS_SECONDS}")]},
        {"web": [BEGIN, Span(UNWATCHED, "beat check -1", False)],
         "beat": [Span(UP, "beat status 1"), Span(UNWATCHED, "beat check -1", False)]},
        refresh=120,
        last="error, unable to open the input file: 0",
        loadfailed=True,
        journal=True),

    "the daemon is killed in an outage that is over when it is back": Story(
        (WEB, BEAT),
        {"web status": well * 2 + down * 2 + end + well * 5},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(UP, "web status 5")]},
        later=(0, 200)),

    "the daemon is killed in an outage that lasts": Story(
        (WEB, BEAT),
        {"web status": well * 2 + down * 2 + end + down * 4 + well * 40},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(RECOVERY, "web start 1"),
                 Span(UP, "web status 9")]},
        {"web": [BEGIN, Span(DOWN, "web status 3", False), Span(RECOVERY, "web start 1"),
                 Span(UP, f"web status 9 +{WEB.general}")]},
        {"web": Figures(tried=1, successful=1)},
        later=(0, 200)),
}


class Course:
    """When the moments of a story were."""

    def __init__(self, commands):
        self.commands = commands

    def seconds(self, moment):
        name, what, number, later = re.fullmatch(
            r"(\w+) (status|check|start|stop) (-?\d+)(?: \+(\d+))?", moment).groups()
        command = f"check {name} " if what == "check" else f"service {name} {what}"
        begun = [each.begin for each in self.commands if f"{each.text} ".startswith(command)]
        number = int(number)
        return begun[number if number < 0 else number - 1] + int(later or 0)


def isotime(seconds):
    """Local, as the log has it."""
    return time.strftime("%Y-%m-%dT%H:%M:%S", time.localtime(seconds))
