"""Which tests see a line: a map that is made once for a state of the sources.

A group of tests is one case of the library's own tests, and one suite of those whose suites start
servers or have hundreds of cases. A line is seen by a group that executes it."""

import json
import multiprocessing.pool
import os
import re
import subprocess
import sys

import running

BY_CASE = ("platform", "log", "utils", "net", "http", "documents")
BY_SUITE = ("hostile", "interop")
BATCH = 25  # cases for which one sandbox is made
LIMIT = 1200  # seconds


def program_of(folder):
    return f"tests/{_inner(folder)}tarnwick_test_{folder}"


def _inner(folder):
    return f"{folder}/" if folder in ("interop", "documents") else ""


class LinesSeen:
    """groups: {"program", "filter", "seconds", "passed", "without"} of each; seen: {path: {line:
    bits}}."""

    def __init__(self, groups, seen):
        self.groups = groups
        self._seen = seen

    def of(self, candidate):
        """The groups that see the candidate: its line, or else its function, or else its file. The
        tests have copies of the functions in headers, whose lines are not counted: of a header the
        tests of its own folder are groups too."""
        lines = self._seen.get(candidate.path, {})
        bits = lines.get(str(candidate.line))
        if not bits:
            first, last = candidate.lines
            inner = [lines.get(str(line), 0) for line in range(first, last + 1)]
            counted = bits is not None or any(str(n) in lines for n in range(first, last + 1))
            bits = _union(inner)
            if not bits and not counted:
                bits = _union(lines.values())
            if not bits and candidate.path.endswith(".h"):
                bits = (1 << len(self.groups)) - 1
        if candidate.path.endswith(".h"):
            bits |= self._of_folder(os.path.basename(os.path.dirname(candidate.path)))
        return [g for n, g in enumerate(self.groups) if bits >> n & 1 and g["passed"]]

    def _of_folder(self, folder):
        own = [group["program"] == program_of(folder) for group in self.groups]
        return _union(int(is_own) << n for n, is_own in enumerate(own))

    def left_out(self):
        """The tests that fail in their groups; with all others, whose order is another, they may
        pass."""
        names = [group.get("without") or [group["filter"]] for group in self.groups]
        failed = [bool(g.get("without")) or not g["passed"] for g in self.groups]
        return [name for of, bad in zip(names, failed) if bad for name in of]

    def save(self, path):
        seen = {p: {n: hex(bits) for n, bits in of.items()} for p, of in self._seen.items()}
        with open(path + ".new", "w", encoding="utf-8") as file:
            json.dump({"groups": self.groups, "seen": seen}, file)
        os.replace(path + ".new", path)

    @classmethod
    def load(cls, path):
        with open(path, encoding="utf-8") as file:
            stored = json.load(file)
        seen = {p: {n: int(b, 16) for n, b in of.items()} for p, of in stored["seen"].items()}
        return cls(stored["groups"], seen)


def _union(all_bits):
    result = 0
    for bits in all_bits:
        result |= bits
    return result


def collect(root, build, scratch):
    """Runs every group in `build`, which counts executed lines."""
    batches = [batch for folder in (*BY_SUITE, *BY_CASE) for batch in _batches(build, folder)]
    pool = multiprocessing.pool.ThreadPool()
    jobs = [(root, build, os.path.join(scratch, str(n)), b) for n, b in enumerate(batches)]
    groups, seen = [], {}
    for number, found in enumerate(pool.imap(_collect_batch, jobs)):
        print(f"\rlines: {number + 1} of {len(batches)} parts", end="", file=sys.stderr)
        for group in found:
            for path, counts in group.pop("lines").items():
                lines = seen.setdefault(path, {})
                for line, executed in counts.items():
                    lines[line] = lines.get(line, 0) | bool(executed) << len(groups)
            groups.append(group)
    print(file=sys.stderr)
    return LinesSeen(groups, seen)


def _batches(build, folder):
    program = program_of(folder)
    command = [os.path.join(build, program), "--gtest_list_tests"]
    listed = subprocess.run(command, check=True, text=True, stdout=subprocess.PIPE).stdout
    names = filters_of(listed, folder in BY_CASE)
    groups = [{"program": program, "filter": name} for name in names]
    size = BATCH if folder in BY_CASE else 1
    return [groups[n : n + size] for n in range(0, len(groups), size)]


def filters_of(listed, by_case):
    """The filters of all groups, from what --gtest_list_tests prints."""
    filters, suite = [], ""
    for line in listed.splitlines():
        words = re.sub(r"#.*", "", line).split()
        if not words or "DISABLED_" in line:
            continue
        if line[0] != " ":
            suite = words[0]
            filters += [] if by_case else [f"{suite}*"]
        elif by_case:
            filters.append(suite + words[0])
    return filters


def _collect_batch(job):
    root, build, scratch, groups = job
    os.makedirs(scratch, exist_ok=True)
    order, found = os.path.join(scratch, "groups.json"), os.path.join(scratch, "found.json")
    with open(order, "w", encoding="utf-8") as file:
        json.dump({"root": root, "build": build, "scratch": scratch, "groups": groups}, file)
    script = os.path.join(os.path.dirname(os.path.abspath(__file__)), "count_lines.py")
    command = running.sandboxed(root, ["/usr/bin/python3", script, order, found])
    outcome = running.run(command, LIMIT * len(groups), root)
    if not outcome.well():
        sys.exit(f"the lines of {groups[0]} cannot be counted:\n{outcome.output}")
    with open(found, encoding="utf-8") as file:
        return json.load(file)
