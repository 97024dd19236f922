"""What a manual page tells of the members of JSON, and what a program has written of them."""

import re


def paths_told(section):
    """The members that a section of the page names, as {"outages.log.begins"}: those of each list
    belong to the item that it stands in. One list for each that stands in none."""
    lists = []
    items = []  # the names of each item that is open
    for line in section.splitlines():
        if line.startswith(".Bl "):
            if not items:
                lists.append(set())
            items.append([])
        elif line.startswith(".El"):
            items.pop()
        elif line.startswith(".It Cm "):
            names = [name.replace("\\", "") for name in line.removeprefix(".It Cm ").split(" , ")]
            above = items[-2] if len(items) > 1 else [""]
            items[-1] = [f"{path}{name}." for path in above for name in names]
            lists[-1] |= {path.rstrip(".") for path in items[-1]}
    return lists


def paths_in(value, time=frozenset(), path=""):
    """The same of what the program has written. An object of the members of a `time` has none of
    its own here."""
    if isinstance(value, list):
        return set().union(*(paths_in(each, time, path) for each in value))
    if not isinstance(value, dict) or value.keys() == time:
        return {path.rstrip(".")} - {""}
    inside = (paths_in(each, time, f"{path}{name}.") for name, each in value.items())
    return set().union({path.rstrip(".")} - {""}, *inside)


def section(page, title):
    """What stands below a heading, up to the next one."""
    below = re.split(rf"^\.S[hs] {re.escape(title)}\n", page, flags=re.M)[1]
    return re.split(r"^\.S[hs] ", below, maxsplit=1, flags=re.M)[0]
