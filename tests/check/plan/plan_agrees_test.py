"""What tolkwd-check --plan says is what the daemon does, to the second of the daemon's clock.

The daemon is the real one. Its clock is one that skips its pauses (stepclock.cpp) and does not move
while a command runs: how fast the machine is makes no difference, and the plan's figures, which
count pauses only, can be told from the log. Where commands should take their time, they are given a
length on that clock, and the plan's counts of checks and recoveries are tried, too.
"""

import dataclasses

import pytest

CHECK_SECONDS = 3
START_SECONDS = 7  # all else of a recovery takes no time
LASTING = f"ask={CHECK_SECONDS};service web start={START_SECONDS}"

WATCHED = "Name of the service being monitored: web"
STARTED = "This is the entry of threadfunc"


@dataclasses.dataclass
class Outage:
    """A configuration, and what happens to the service."""

    lost: str = "runs"  # "runs": it does not run any more; "works": its check fails
    after: str = "status"
    check: str = "NULL"
    general: int = 10
    functional: int = 0
    attempts: int = 2
    skips: int = 0
    threads: int = 1
    busy: bool = False
    dependents: tuple = ()
    refresh: int = 3000

    def configuration(self):
        fields = self._fields("web", "NULL") + "".join(
            f"<{name}>{value}</{name}>" for name, value in (
                ("genpinginterval", self.general),
                ("funpinginterval", self.functional),
                ("maxattemptofwakeup", self.attempts),
                ("MaxFPSkips", self.skips),
                ("ThresholdAverageCPUUsage", 2000000000),
                ("ThresholdMemoryUsage", 2000000000),
                ("ThresholdThreadCount", self.threads)))
        dependents = "".join(f"<wdmondependsev>{self._fields(name, stop)}</wdmondependsev>\n"
                             for name, stop in self.dependents)
        return (f"<wdtargets>\n<wdmonitortarget>\n<wdmonitorservice>{fields}</wdmonitorservice>\n"
                f"{dependents}</wdmonitortarget>\n</wdtargets>\n")

    def _fields(self, name, stop):
        return (f"<name>{name}</name><binarypath>/usr/sbin/{name}</binarypath>"
                f"<startcmd>NULL</startcmd><stopcmd>{stop}</stopcmd>"
                f"<functionalpingcmd>{self.check}</functionalpingcmd>")

    def environment(self, helps=False):
        return {"LOST": self.lost, "AFTER": self.after, "STEPCLOCK_LASTING": LASTING,
                "HELPS": "yes" if helps else "", "BUSY": "yes" if self.busy else ""}


# A check that goes on to answer is what makes the worst case of a service that does not run: else
# the check would notice first.
OUTAGES = {
    "not running, with dependents": Outage(
        dependents=(("one", "NULL"), ("two", "timeout -k 5 60 service two stop"))),
    "not running, 60/60, with a check": Outage(
        check="ask", general=60, functional=60, attempts=3),
    "failing check": Outage(
        lost="works", after="check", check="ask", general=20, functional=35, attempts=3,
        dependents=(("one", "NULL"),)),
    "failing check, left out while busy": Outage(
        lost="works", after="check", check="ask", general=60, functional=300, skips=2, busy=True,
        refresh=10800),
    "one attempt": Outage(attempts=1, refresh=120),
    "one attempt, failing check": Outage(
        lost="works", after="check", check="ask", functional=5, attempts=1, refresh=120),
    "no pauses, with a check": Outage(check="ask", general=0, functional=0),
    "many attempts": Outage(attempts=7, refresh=120),
}

each_outage = pytest.mark.parametrize("outage", OUTAGES.values(), ids=OUTAGES.keys())


def length(time):
    """A time of the plan in seconds, with commands as long as they are here."""
    return (time["seconds"] + time["checks"] * CHECK_SECONDS
            + time["recoveries"] * START_SECONDS)


def same(planned, happened, what):
    assert happened == planned, f"{what}: planned {planned} s, but {happened} s"


def kind_of(outage):
    return "general" if outage.lost == "runs" else "functional"


class Course:
    """An outage as it was planned beside what the daemon did. All times are from the outage."""

    def __init__(self, outage, plan, ran):
        self.plan = plan
        self.ran = ran
        (self.planned,) = (each for each in plan["outages"] if each["kind"] == kind_of(outage))
        self.log = self.planned["log"]
        self.asking = (plan["status"] if outage.lost == "runs" else plan["check"])["command"]
        ended = ran.ended((plan["check"] if outage.after == "check" else plan["status"])["command"])
        self.begin = ended[2]  # it fails just after the third one
        # One that is left out while busy is noticed as much later.
        worst = plan["check"]["unnoticed"] if outage.busy else self.planned["noticed"]
        self.late = length(worst) - length(self.planned["noticed"])

    def happened(self, message):
        """When this was logged."""
        return [time - self.begin for time in self.ran.times(message) if time >= self.begin]

    def asked(self):
        """When it was asked, or checked."""
        return [time - self.begin for time in self.ran.begun(self.asking)]

    def agree(self, time, happened, what):
        same(length(time) + self.late, happened, what)

    def agree_on_recovery(self, recovery):
        number = recovery["number"]
        noticed = self.happened(self.log["noticed"])[number - 1]
        begins = self.happened(self.log["begins"])[number - 1]
        self.agree(recovery["noticed"], noticed, f"noticed before recovery {number}")
        # Not the failing one itself.
        asked = [time for time in self.asked() if noticed < time <= begins]
        assert len(asked) == len(recovery["retries"])
        for planned, happened in zip(recovery["retries"], asked):
            self.agree(planned, happened, f"retry before recovery {number}")
        self.agree(recovery["begins"], begins, f"recovery {number}")
        after = [time for time in self.asked() if time > begins]
        if recovery["again"]:
            self.agree(recovery["again"], after[0], f"after recovery {number}")

    def agree_on_commands(self, stopped):
        """The commands of the first recovery; `stopped`: the monitored service was stopped, too."""
        wanted = [step["command"] for step in self.plan["recovery"]
                  if stopped or step["unless"] != "down"]
        begin = self.begin + self.happened(self.log["begins"])[0]
        asking = [self.plan["status"]["command"], (self.plan["check"] or {}).get("command")]
        ran = [each.text for each in self.ran.commands
               if each.begin >= begin and each.text not in asking]
        assert ran[:len(wanted)] == wanted
        assert set(ran) == set(wanted)


@each_outage
def test_an_outage_that_no_recovery_ends_goes_as_planned(machine, outage):
    machine.configure(outage.configuration())
    plan = machine.plan(outage.refresh)
    ran = machine.run(outage.refresh, outage.environment(), until=WATCHED, times=2)
    course = Course(outage, plan, ran)

    course.agree(course.planned["noticed"], course.happened(course.log["noticed"])[0], "noticed")
    assert len(course.happened(course.log["begins"])) == plan["attempts"] == outage.attempts
    for recovery in course.planned["recoveries"]:
        course.agree_on_recovery(recovery)
    course.agree_on_commands(stopped=outage.lost == "works")
    (givenup,) = course.happened(course.log["givenup"])
    course.agree(course.planned["givenup"], givenup, "given up")
    assert not course.happened(course.log["recovered"])
    last = course.happened(course.log["begins"])[-1]
    assert not [time for time in course.asked() if last < time <= givenup]
    revived = course.happened(WATCHED)[-1]
    assert 0 < revived - givenup <= plan["refresh"]["seconds"]


@pytest.mark.parametrize("outage", [each for each in OUTAGES.values() if each.attempts > 1],
                         ids=[name for name, each in OUTAGES.items() if each.attempts > 1])
def test_an_outage_that_the_first_recovery_ends_goes_as_planned(machine, outage):
    machine.configure(outage.configuration())
    plan = machine.plan(outage.refresh)
    (planned,) = (each for each in plan["outages"] if each["kind"] == kind_of(outage))
    ran = machine.run(outage.refresh, outage.environment(helps=True),
                      until=planned["log"]["recovered"])
    course = Course(outage, plan, ran)

    recovery = planned["recoveries"][0]
    course.agree_on_recovery(recovery)
    (recovered,) = course.happened(planned["log"]["recovered"])
    course.agree(recovery["recovered"], recovered, "recovered")
    assert len(course.happened(planned["log"]["begins"])) == 1


def test_a_healthy_service_is_asked_and_checked_as_often_as_planned(machine):
    outage = Outage(check="ask", general=20, functional=35)
    machine.configure(outage.configuration())
    plan = machine.plan(outage.refresh)
    ran = machine.run(outage.refresh, dict(outage.environment(), AFTER="never"),
                      until="General ping sleep 20", times=10)
    for asking in (plan["status"], plan["check"]):
        begun = ran.begun(asking["command"])
        assert len(begun) == 10
        for before, after in zip(begun, begun[1:]):
            same(length(asking["every"]), after - before, asking["command"])


def test_who_is_always_busy_is_recovered_without_proof_as_planned(machine):
    outage = Outage(lost="works", after="check", check="ask", general=20, functional=35, skips=2,
                    threads=0)
    machine.configure(outage.configuration())
    plan = machine.plan(outage.refresh)
    (_, planned) = plan["outages"]
    assert planned["unproven"] and planned["givenup"] is None
    ran = machine.run(outage.refresh, outage.environment(), until=planned["log"]["begins"],
                      times=5)
    course = Course(outage, plan, ran)

    (recovery,) = planned["recoveries"]
    course.agree_on_recovery(recovery)
    course.agree(recovery["recovered"], course.happened(planned["log"]["recovered"])[0],
                 "recovered without proof")
    begins = course.happened(planned["log"]["begins"])
    assert len(begins) == 5  # though there are two attempts only
    for before, after in zip(begins, begins[1:]):
        same(length(planned["round"]), after - before, "from recovery to recovery")
    assert not course.happened(planned["log"]["givenup"])


def test_who_may_always_be_left_out_and_is_always_busy_is_never_checked(machine):
    outage = Outage(check="ask", general=20, functional=35, skips=-1, threads=0)
    machine.configure(outage.configuration())
    (_, planned) = machine.plan(outage.refresh)["outages"]
    assert planned["noticed"] is None
    ran = machine.run(outage.refresh, dict(outage.environment(), AFTER="never"),
                      until="General ping sleep 20", times=30)
    assert not [each for each in ran.commands if "ask" in each.text]


@pytest.mark.parametrize("attempts", [0, "two"])
def test_who_is_never_asked_is_given_up_at_each_refresh(machine, attempts):
    outage = Outage(attempts=attempts, refresh=120)
    machine.configure(outage.configuration())
    plan = machine.plan(outage.refresh)
    assert plan["state"] == "given up" and not plan["outages"]
    ran = machine.run(outage.refresh, outage.environment(),
                      until="Failed to general recover the sevice web after try the max times.",
                      times=3)
    begun = ran.times(STARTED)
    for before, after in zip(begun, begun[1:]):
        same(plan["refresh"]["seconds"], after - before, "given up again")
    assert not ran.commands
