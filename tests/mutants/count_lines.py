"""Inside the sandbox: runs groups of tests one by one and tells the lines that each executes.

count_lines.py ORDER FOUND; lines_seen.py writes the one and reads the other."""

import json
import os
import re
import subprocess
import sys
import time

FAILED = re.compile(r"^\[  FAILED  \] (\S+?)(?:, where .*)? \(\d+ ms\)$", re.M)
LIMIT = 300  # seconds for a group


def count(root, build, scratch, group):
    """The group with its time, its result and its lines: {path: {line: 0 or 1}}. Cases that fail
    are `without`; one that fails alone may pass after others."""
    counted = _counted_files(scratch)
    for path in counted:
        os.remove(path)
    command = [os.path.join(build, group["program"]), "--gtest_filter=" + group["filter"]]
    environment = {**os.environ, "GCOV_PREFIX": scratch, "GTEST_COLOR": "no"}
    start = time.monotonic()
    passed, without = _result(command, environment)
    result = {"seconds": time.monotonic() - start, "passed": passed, "without": without}
    return {**group, **result, "lines": _lines(root, scratch)}


def _result(command, environment):
    pipes = {"stdin": subprocess.DEVNULL, "stdout": subprocess.PIPE, "stderr": subprocess.STDOUT}
    try:
        done = subprocess.run(command, env=environment, check=False, timeout=LIMIT, **pipes)
    except subprocess.TimeoutExpired:
        return False, []
    if done.returncode == 0:
        return True, []
    output = done.stdout.decode(errors="replace")
    without = sorted(set(FAILED.findall(output)))
    return bool(without) and "[       OK ]" in output, without


def _counted_files(scratch):
    return [
        os.path.join(folder, name)
        for folder, _, names in os.walk(scratch)
        for name in names
        if name.endswith(".gcda")
    ]


def _lines(root, scratch):
    counted = _counted_files(scratch)
    for path in counted:
        notes = path[: -len(".gcda")] + ".gcno"
        if not os.path.lexists(notes):
            os.symlink(notes[len(scratch) :], notes)
    if not counted:
        return {}
    command = ["gcov", "--json-format", "--stdout", *counted]
    pipes = {"stdout": subprocess.PIPE, "stderr": subprocess.DEVNULL, "text": True}
    printed = subprocess.run(command, cwd=scratch, check=True, **pipes).stdout
    lines = {}
    for report in printed.splitlines():
        _add(lines, json.loads(report), os.path.join(root, ""))
    return lines


def _add(lines, report, root):
    for file in report["files"]:
        path = os.path.relpath(file["file"], root) if file["file"].startswith(root) else ""
        if not path.startswith("tarnwick/"):
            continue
        of_file = lines.setdefault(path, {})
        for line in file["lines"]:
            number = line["line_number"]
            of_file[number] = int(of_file.get(number, 0) or line["count"] > 0)


def main():
    with open(sys.argv[1], encoding="utf-8") as file:
        order = json.load(file)
    groups = order.pop("groups")
    found = [count(group=group, **order) for group in groups]
    with open(sys.argv[2], "w", encoding="utf-8") as file:
        json.dump(found, file)


if __name__ == "__main__":
    main()
