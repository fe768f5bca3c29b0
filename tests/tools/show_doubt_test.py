"""twlogctl show and follow: lines that cannot be what they say, and the lines of a message."""

import contextlib
import json
import os
import pathlib
import subprocess
import time

import pytest

from log_help import LOG, Output, line

HOUR = 3600
PID_MAX = int(pathlib.Path("/proc/sys/kernel/pid_max").read_text())


def stamped(ago, text, pid="812"):
    moment = time.localtime(time.time() - ago)
    return line(text, stamp=time.strftime("%b %e %T", moment), pid=str(pid))


def doubtful(run, *args):
    """The messages that are told as doubtful, of those that are shown."""
    result = run("twlogctl", "show", "--json", *args)
    assert result.returncode == 0, result.stderr
    records = [json.loads(record) for record in result.stdout.splitlines()]
    assert all(record.get("doubtful", True) is True for record in records)
    return [record["message"] for record in records if "doubtful" in record]


# The file


@pytest.mark.parametrize("margin, told", [(HOUR, []), (3 * HOUR, ["forged"]), (90 * 86400, ["forged"])])
def test_a_stamp_that_runs_backwards_is_doubtful(run, margin, told):
    LOG.write_text(stamped(60, "true") + stamped(60 + margin, "forged") + stamped(50, "later"))
    assert doubtful(run) == told


@pytest.mark.parametrize("ahead, told", [(HOUR, []), (5 * HOUR, ["forged"]), (40 * HOUR, ["forged"])])
def test_a_stamp_after_the_last_change_of_the_file_is_doubtful_and_not_the_next_one(run, ahead, told):
    LOG.write_text(stamped(60, "true") + stamped(-ahead, "forged") + stamped(50, "later"))
    assert doubtful(run) == told


def test_only_the_first_line_after_a_clock_that_was_set_back_is_doubtful(run):
    LOG.write_text(stamped(60, "a") + stamped(9 * HOUR, "b") + stamped(9 * HOUR, "c"))
    assert doubtful(run) == ["b"]


def test_a_line_that_is_not_shown_is_compared_with_as_well(run):
    LOG.write_text(stamped(60, "true") + stamped(9 * HOUR, "forged", pid=7))
    assert doubtful(run, "-p", "7") == ["forged"]
    assert doubtful(run, "-n", "1") == ["forged"]


# The processes


@pytest.mark.parametrize("pid", [0, -4, PID_MAX + 1])
def test_a_number_that_no_process_has_is_doubtful_in_the_machines_own_log_alone(run, tmp_path, pid):
    LOG.write_text(stamped(60, "forged", pid))
    assert doubtful(run) == ["forged"]
    copy = tmp_path / "copy"
    copy.write_bytes(LOG.read_bytes())
    assert doubtful(run, "--file", copy) == []


@contextlib.contextmanager
def system_started(tmp_path, ago, processes):
    """/proc/stat of a system that was started so long ago and has had so many processes."""
    stat = tmp_path / "stat"
    stat.write_text(f"cpu 1 2\nbtime {int(time.time() - ago)}\nprocesses {processes}\n")
    subprocess.run(["mount", "--bind", stat, "/proc/stat"], check=True)
    try:
        yield
    finally:
        subprocess.run(["umount", "/proc/stat"], check=True)


@pytest.mark.parametrize(
    "up, processes, told",
    [
        (90 * HOUR, PID_MAX - 1, ["forged"]),
        (90 * HOUR, PID_MAX, []),  # numbers may have been given again
        (6 * HOUR, 100, []),  # it may be a line of the time before
    ],
)
def test_a_process_that_was_started_after_its_line_is_doubtful_while_numbers_are_unique(
    run, tmp_path, up, processes, told
):
    LOG.write_text(stamped(5 * HOUR, "forged", os.getpid()))
    with system_started(tmp_path, up, processes):
        assert doubtful(run) == told


def test_the_process_of_a_new_line_is_no_doubt(run, tmp_path):
    LOG.write_text(stamped(0, "true", os.getpid()))
    with system_started(tmp_path, 90 * HOUR, 100):
        assert doubtful(run) == []


# What is printed


FORGED = stamped(60, "a response [x") + stamped(9 * HOUR, "forged", 1) + "rest]\n" + stamped(50, "b")


def test_a_pipe_gets_the_bytes_of_the_log_with_doubtful_lines_too(run):
    LOG.write_text(FORGED)
    assert run("twlogctl", "show").stdout == FORGED


def test_marks_are_asked_for_in_a_pipe(run):
    LOG.write_text(FORGED)
    lines = FORGED.splitlines()
    marked = [lines[0], "? " + lines[1], "| " + lines[2], lines[3]]
    assert run("twlogctl", "show", "--mark").stdout.splitlines() == marked


def test_a_terminal_gets_the_marks(spawn):
    LOG.write_text(FORGED)
    lines = FORGED.splitlines()
    marked = [lines[0], "? " + lines[1], "| " + lines[2], lines[3]]
    assert spawn("twlogctl", "show", env={"NO_COLOR": "1"}).read().splitlines() == marked


def test_follow_marks_as_well(start):
    LOG.write_text(stamped(60, "there"))
    child = start("twlogctl", "follow", "--mark")
    output = Output(child)
    output.wait_for("there")
    with LOG.open("a") as log:
        log.write(stamped(9 * HOUR, "forged") + "rest\n")
    output.wait_for("| rest")
    assert [text[:2] for text in output.lines[1:]] == ["? ", "| "]
    output.end()


def test_characters_that_turn_or_hide_text_are_escaped_on_a_terminal(spawn):
    hidden = "\u202e\u2066\u200b\u200d\ufeff\u00ad\u061c\U000e0041"
    LOG.write_text(stamped(60, f"a{hidden}b 漢é"))
    output = spawn("twlogctl", "show", env={"NO_COLOR": "1"}).read()
    assert r"a\u202E\u2066\u200B\u200D\uFEFF\u00AD\u061C\uE0041b 漢é" in output
