"""A run of the comparison: the lines that tarnwick_bench has printed."""

import json
from statistics import median

from goals import FLOOR, REQUIRED


class Run:
    def __init__(self, path):
        self.environment = {}
        self.sections = {}  # name: its works in order
        self.units = {}  # of a work: "ns" or "bytes"
        self._handles = {}  # bytes that one operation of a work handles
        self._values = {}  # (work, contender): a value for each round
        self._counted = {}  # (work, contender): instructions and system calls of one operation
        with open(path, encoding="utf-8") as file:
            for line in file:
                self._take(json.loads(line))

    def _take(self, record):
        if "work" not in record:
            self.environment = record
            return
        work = record["work"]
        if "instructions" in record:
            counted = (record["instructions"], record["calls"])
            self._counted[work, record["contender"]] = counted
            return
        works = self.sections.setdefault(record["section"], [])
        if work not in works:
            works.append(work)
        self.units[work] = "ns" if "ns" in record else "bytes"
        self._handles[work] = record["handles"]
        values = self._values.setdefault((work, record["contender"]), [])
        values.append(record[self.units[work]])

    def contenders(self, work):
        return [contender for measured, contender in self._values if measured == work]

    def rounds(self):
        return max(len(values) for values in self._values.values())

    def reference(self, work):
        """What the others are compared with: the required floor, or the floor where the interface
        asks for no system call. None where there is neither."""
        for name in (REQUIRED, FLOOR):
            if (work, name) in self._values and self.units[work] == "ns":
                return name
        return None

    def median(self, work, contender):
        values = self._values.get((work, contender))
        return median(values) if values else None

    def ratio(self, work, contender, against):
        """The median of the rounds' ratios: in one round both saw the same machine."""
        ours = self._values.get((work, contender))
        theirs = self._values.get((work, against))
        if not ours or not theirs or not all(theirs):
            return None
        return median(one / other for one, other in zip(ours, theirs))

    def instructions(self, work, contender):
        """Of one operation; None where they have not been counted."""
        return self._counted.get((work, contender), (None, None))[0]

    def calls(self, work, contender):
        """System calls, as instructions."""
        return self._counted.get((work, contender), (None, None))[1]

    def rate(self, work, contender):
        """GB/s."""
        time = self.median(work, contender)
        return self._handles[work] / time if time and self._handles[work] else None
