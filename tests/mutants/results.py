"""The verdicts, a line each as they come, and their summary."""

import json
import os
import threading

KILLED, SURVIVED, UNBUILT, EQUIVALENT = "killed", "survived", "build", "equivalent"
COUNTED = (KILLED, SURVIVED, EQUIVALENT)


class Results:
    def __init__(self, path):
        self._path = path
        self._lock = threading.Lock()
        self._records = {}
        if os.path.exists(path):
            with open(path, encoding="utf-8") as file:
                for line in file:
                    self._take(json.loads(line))

    def _take(self, record):
        self._records[tuple(record["name"])] = record

    def of(self, candidate):
        return self._records.get(candidate.name())

    def add(self, candidate, record):
        record = {"name": candidate.name(), "line": candidate.line, **record}
        with self._lock:
            self._take(record)
            with open(self._path, "a", encoding="utf-8") as file:
                file.write(json.dumps(record) + "\n")


def summary(records):
    """The text for these records, survivors first."""
    parts = []
    for record in sorted(records, key=lambda r: (r["name"][0], r["line"])):
        if record["verdict"] == SURVIVED:
            parts.append(difference(record))
    by_path = {}
    for record in records:
        by_path.setdefault(record["name"][0], []).append(record)
    head = ("file", "drawn", "not built", "killed", "survived", "equivalent", "share killed")
    rows = [head, *(_row(path, of) for path, of in sorted(by_path.items())), _row("all", records)]
    parts.append("\n".join(_line(row) for row in rows))
    doubts = sorted({str(name) for record in records for name in record.get("doubts", [])})
    if doubts:
        parts.append("\n  ".join(["failed, but not again or without a change too:", *doubts]))
    seconds = sum(record.get("seconds", 0) for record in records)
    parts.append(f"{seconds / 60:.0f} minutes of building and testing, all copies added up")
    return "\n\n".join(parts)


def difference(record):
    path, function, before, after, _ = record["name"]
    note = "no test sees it" if record["tests"] == 0 else f"{record['tests']} groups of tests"
    return f"survived: {path}:{record['line']} {function} ({note})\n- {before}\n+ {after}"


def _row(name, records):
    verdicts = [record["verdict"] for record in records]
    counts = [verdicts.count(v) for v in (UNBUILT, KILLED, SURVIVED, EQUIVALENT)]
    judged = counts[1] + counts[2]
    share = f"{100 * counts[1] / judged:.1f} %" if judged else "-"
    return (name, len(records), *counts, share)


def _line(row):
    return f"{row[0]:34}" + "".join(f"{cell:>13}" for cell in row[1:])
