"""What the measurements have found, in the form in which all benchmarks hand it over."""

import json
import sys
import time

_BEGUN = time.monotonic()


def say(text):
    """A line of progress."""
    print(f"[{time.monotonic() - _BEGUN:5.0f} s] {text}", file=sys.stderr, flush=True)


class Results:
    def __init__(self):
        self._tables = []
        self._curves = []
        self._goals = []

    def table(self, name, title, columns, rows, note):
        self._tables.append({"id": name, "title": title, "columns": columns, "rows": rows,
                             "note": note})

    def curve(self, name, title, labels, series, logy=False):
        """`labels` are those of the two axes, `series` the points of each name."""
        self._curves.append({
            "id": name, "title": title, "xlabel": labels[0], "ylabel": labels[1],
            "logx": True, "logy": logy,
            "series": [{"name": key, "points": points} for key, points in series.items()]})

    def at_most(self, name, text, measured, limit, unit="ratio"):
        self._goals.append({"id": name, "text": text, "measured": measured, "limit": limit,
                            "unit": unit, "sense": "at most"})

    def write(self, path):
        path.write_text(json.dumps(
            {"tables": self._tables, "curves": self._curves, "goals": self._goals}, indent=1)
            + "\n", encoding="utf-8")
