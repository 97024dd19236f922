"""Every folder of scenarios/ is one test; README.md tells what is in it."""

import difflib
import re

import pytest

import daemonlog
import exclusion
import stage as stages

SCENARIOS = sorted(steps.parent for steps in (stages.HERE / "scenarios").glob("*/steps.sh"))


def commands(journal):
    """What the daemon ran to change something, in the order in which it began."""
    begun = [line.split(" ", 2)[2] for line in journal.splitlines() if line.startswith("begin ")]
    return [command for command in begun
            if not exclusion.asks(command) and not command.startswith("pidof ")]


def shown(expected, actual):
    return "\n".join(difflib.unified_diff(expected, actual, "expected", "run", lineterm="", n=99))


@pytest.mark.parametrize("scenario", SCENARIOS, ids=lambda folder: folder.name)
def test_scenario(scenario, stage):
    played = stage.play(scenario)
    if played.reports():
        pytest.fail(played.reports(), pytrace=False)
    if played.status != 0:
        log = "\n".join(played.text("tolkwd.log").splitlines()[-40:])
        errors = played.text("stderr")[-2000:]
        pytest.fail(f"{played.output}\n-- end of the log\n{log}\n-- standard error\n{errors}",
                    pytrace=False)

    print(played.output)
    lines = daemonlog.parsed(played.text("tolkwd.log"))
    expected = scenario / "log"
    if expected.exists():
        for section in daemonlog.expectations(expected.read_text()):
            difference = daemonlog.difference(section, lines)
            if difference:
                pytest.fail(difference, pytrace=False)

    journal = played.text("journal")
    expected = scenario / "commands"
    if expected.exists():
        run = [re.sub(r"^(kill .*?)\d+", r"\1{n}", command) for command in commands(journal)]
        difference = shown(expected.read_text().splitlines(), run)
        if difference:
            pytest.fail(f"commands:\n{difference}", pytrace=False)

    intruders = exclusion.intruders(lines) + exclusion.overlaps(journal)
    if intruders:
        pytest.fail("\n".join(intruders), pytrace=False)
