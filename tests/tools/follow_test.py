"""twlogctl follow."""

import collections
import fcntl
import json
import os
import pathlib
import re
import signal
import subprocess
import sys
import time

import pytest

from conftest import HANG, LOG_DIRECTORY, plain_environment, wait_until
from log_help import LOG, Output, line, processor_seconds, run_plain, without_privileges

WRITERS = 4


def append(text, path=LOG):
    with open(path, "a", encoding="utf-8") as log:
        log.write(text)


@pytest.fixture
def follow(start):
    """follow(*args): the output of a follower that is at work: it has shown the log's last line."""
    outputs = []

    def follow_log(*args, log=LOG, env=None):
        if not log.exists():
            append(line("first"), log)
        last = log.read_text().splitlines()[-1]
        output = Output(start("twlogctl", "follow", *args, env=env))
        outputs.append(output)
        output.wait_for(json.dumps(last.split("(): ", 1)[1]) if "--json" in args else last)
        return output

    yield follow_log
    for output in outputs:
        output.end()


class Writers:
    """Processes that write numbered lines through the library until they are told to stop."""

    def __init__(self, tools, count):
        library = pathlib.Path(tools["twlogctl"]).parents[2] / "tarnwick/libtarnwick.so"
        script = pathlib.Path(__file__).with_name("log_writer.py")
        self._children = [
            subprocess.Popen(
                [sys.executable, script, library, str(number)],
                stdin=subprocess.PIPE,
                stdout=subprocess.PIPE,
                text=True,
            )
            for number in range(count)
        ]

    def end(self):
        """Results: how many lines each of them has written."""
        counts = [int(child.communicate(timeout=HANG)[0]) for child in self._children]
        assert all(child.returncode == 0 for child in self._children)
        return counts

    def kill(self):
        for child in self._children:
            child.kill()
            child.communicate()


@pytest.fixture
def writers(tools):
    group = Writers(tools, WRITERS)
    yield group
    group.kill()


def last_line(path):
    with open(path, encoding="utf-8") as log:
        lines = log.read().splitlines()
    return lines[-1] if lines else ""


def seen(output, text):
    # Only what came lately is looked at: the lines are many.
    return any(text == known for known in output.lines[-2000:])


def wait_for_file(output):
    """Waits until the follower has shown a line of the file that is at the path now."""

    def shown():
        try:
            with open(LOG, encoding="utf-8") as log:
                first = log.readline()
        except FileNotFoundError:
            return False
        return first.endswith("\n") and first.rstrip("\n") in output.lines

    wait_until(shown, "a line of the present file")


def rename(output, number):
    LOG.rename(LOG_DIRECTORY / f"tarnwick.log.{number}")


def remove(output, number):
    LOG.unlink()


def truncate(output, number):
    """Under the writers' lock, when the follower has seen all: what a truncation takes before
    anybody has read it is gone for everybody."""
    with open(LOG, "r+", encoding="utf-8") as log:
        fcntl.flock(log, fcntl.LOCK_EX)
        wait_until(lambda: seen(output, last_line(LOG)), "the last line before the truncation")
        log.truncate(0)


@pytest.mark.parametrize(
    "steps",
    [[rename], [remove], [truncate], [rename, truncate, remove]],
    ids=["renamed", "removed", "truncated", "all"],
)
def test_each_line_of_four_writers_appears_once_whatever_happens_to_the_file(
    follow, writers, steps
):
    output = follow("-n", "1000000")
    for number in range(24):
        wait_for_file(output)
        steps[number % len(steps)](output, number)
    wait_for_file(output)
    expected = {
        f"writer {number} line {index}": 1
        for number, count in enumerate(writers.end())
        for index in range(count)
    }
    pattern = re.compile(r"writer \d+ line \d+$")

    def found():
        return [match.group() for match in map(pattern.search, list(output.lines)) if match]

    wait_until(lambda: len(found()) >= len(expected), f"{len(expected)} lines")
    assert collections.Counter(found()) == expected


def test_a_truncation_is_seen_although_the_file_is_longer_than_before(follow, start):
    output = follow("-n", "1")
    os.kill(output._child.pid, signal.SIGSTOP)
    LOG.write_text("".join(line(f"new {number}") for number in range(100)))
    os.kill(output._child.pid, signal.SIGCONT)
    output.wait_for("new 99")
    assert [known for known in output.lines if "new" in known] == [
        line(f"new {number}").rstrip("\n") for number in range(100)
    ]


def test_lines_reach_the_old_file_after_its_removal(follow):
    append(line("first"))
    with open(LOG, "a", encoding="utf-8") as late:
        output = follow("-n", "1")
        LOG.unlink()
        append(line("new file"))
        output.wait_for("new file")
        late.write(line("late"))
        late.flush()
        output.wait_for("late")


def test_a_file_that_comes_back_under_its_name_is_read_on(follow):
    append(line("first") + line("second"))
    output = follow("-n", "10")
    aside = LOG_DIRECTORY / "aside"
    LOG.rename(aside)
    append(line("another file"))
    output.wait_for("another file")
    aside.rename(LOG)
    append(line("back"))
    output.wait_for("back")
    assert [known.split()[-1] for known in output.lines] == ["first", "second", "file", "back"]


def test_an_incomplete_line_waits_for_its_end(follow):
    output = follow("-n", "1")
    whole = line("in two parts")
    append(whole[:30])
    append_later = LOG_DIRECTORY / "twnotification.log"
    append(line("x"), append_later)  # events of other files are no reason to show it
    time.sleep(0.5)
    assert len(output.lines) == 1
    append(whole[30:])
    output.wait_for(whole.rstrip("\n"))


def test_a_log_that_is_missing_is_waited_for(start):
    child = start("twlogctl", "follow")
    output = Output(child)
    missing = f"twlogctl: {LOG}: No such file or directory; waiting for it\n"
    assert child.stderr.readline() == missing
    append(line("there"))
    output.wait_for("there")
    assert child.stderr.readline() == f"twlogctl: {LOG}: it is there\n"
    output.end()


def test_a_directory_that_is_removed_and_made_again_is_followed(start, tmp_path):
    directory = tmp_path / "logs"
    directory.mkdir()
    log = directory / "copy.log"
    append(line("old"), log)
    output = Output(start("twlogctl", "follow", "--file", log))
    output.wait_for("old")
    log.unlink()
    directory.rmdir()
    directory.mkdir()
    append(line("new"), log)
    output.wait_for("new")
    output.end()


def test_the_last_ten_messages_are_shown_first(follow):
    append("".join(line(f"number {number}") for number in range(30)))
    output = follow()
    assert [known.split()[-1] for known in output.lines] == [str(n) for n in range(20, 30)]


def waits_for_the_log(pid):
    """True when the process has the log open and sleeps."""
    try:
        links = [os.readlink(entry.path) for entry in os.scandir(f"/proc/{pid}/fd")]
    except FileNotFoundError:  # closed meanwhile
        return False
    with open(f"/proc/{pid}/stat", encoding="ascii") as stat:
        return str(LOG) in links and stat.read().rsplit(")")[1].split()[0] == "S"


def test_none_of_the_old_messages_is_shown_when_nobody_asks_for_them(start):
    append(line("old\nlines"))
    child = start("twlogctl", "follow", "-n", "0")
    output = Output(child)
    wait_until(lambda: waits_for_the_log(child.pid), "the follower at work")
    append(line("new"))
    output.wait_for("new")
    assert output.lines == [line("new").rstrip("\n")]
    output.end()


def test_all_messages_of_a_span_are_shown_first(follow):
    now, old = (time.strftime("%b %e %T", time.localtime(time.time() - ago)) for ago in (5, 7200))
    append(line("old", old) + "".join(line(f"number {number}", now) for number in range(30)))
    assert len(follow("--since", "1h").lines) == 30


def test_it_ends_by_itself_when_its_time_is_over(run):
    append(line("x"))
    result = run("twlogctl", "follow", "--until", "200ms")
    assert (result.returncode, result.stdout) == (0, line("x"))


def test_messages_are_chosen_as_show_chooses_them(follow):
    append(line("first", tags="[http][warn]"))
    output = follow("-c", "http", "-l", "warn", "-g", "r", "--json")
    append(line("other") + line("r\nbody", tags="[http][error]") + line("r", tags="[http][info]"))
    append(line("rest", tags="[http][alarm]"))
    output.wait_for("rest")
    texts = [json.loads(known)["message"] for known in output.lines]
    assert texts == ["first", "r\nbody", "rest"]


def test_the_notification_log_can_be_followed(follow, run):
    path = LOG_DIRECTORY / "twnotification.log"
    output = follow("--notification", log=path)
    assert run("twlogctl", "write", "--notification", "rang").returncode == 0
    output.wait_for("rang")


def test_it_takes_no_lock_and_waits_for_none(follow):
    append(line("first"))
    with open(LOG, "a", encoding="utf-8") as log:
        fcntl.flock(log, fcntl.LOCK_EX)
        output = follow("-n", "1")
        log.write(line("under the lock"))
        log.flush()
        output.wait_for("under the lock")
    with open("/proc/locks", encoding="ascii") as locks:
        assert not [entry for entry in locks if f" {output._child.pid} " in entry]


def test_a_terminal_gets_colours_and_no_control_bytes(spawn):
    append(line("\x1b[2J \x07", tags="[http][alarm]"))
    child = spawn("twlogctl", "follow")
    child.expect(r"\x1b\[31mMar  5 .*\\x1B\[2J \\x07\x1b\[0m\r\n")


def test_idle_it_uses_less_than_a_hundredth_of_a_processor(follow):
    output = follow("-n", "1")
    before, began = processor_seconds(output._child.pid), time.monotonic()
    time.sleep(4)
    used = processor_seconds(output._child.pid) - before
    assert used < 0.01 * (time.monotonic() - began)


def test_a_reader_that_goes_ends_it_before_the_next_message_comes(command):
    append(line("x"))
    child = subprocess.Popen(
        command("twlogctl", "follow"), stdout=subprocess.PIPE, env=plain_environment()
    )
    child.stdout.readline()
    child.stdout.close()
    assert child.wait(timeout=HANG) == -signal.SIGPIPE


def test_a_reader_that_goes_ends_it_even_if_the_signal_is_ignored(command):
    append(line("x"))
    child = subprocess.Popen(
        ["sh", "-c", 'trap "" PIPE; exec "$@"', "sh", *command("twlogctl", "follow")],
        stdout=subprocess.PIPE,
        env=plain_environment(),
    )
    child.stdout.readline()
    child.stdout.close()
    assert child.wait(timeout=HANG) == -signal.SIGPIPE


def test_control_c_ends_it(spawn):
    append(line("x"))
    child = spawn("twlogctl", "follow")
    child.expect("x")
    child.sendintr()
    child.expect_exact("^C")
    child.wait()
    assert child.signalstatus == signal.SIGINT


def test_a_log_without_permission_is_named(command):
    append(line("secret"))
    LOG.chmod(0)
    result = run_plain(without_privileges(command("twlogctl", "follow")))
    assert (result.returncode, result.stdout) == (1, "")
    assert result.stderr == f"twlogctl: {LOG}: Permission denied\n"


def test_a_directory_is_no_log(run, tmp_path):
    result = run("twlogctl", "follow", "--file", tmp_path)
    assert (result.returncode, result.stderr) == (1, f"twlogctl: {tmp_path}: Is a directory\n")


@pytest.mark.parametrize(
    "args, phrase",
    [
        (["-c", "htpt"], "did you mean http?"),
        (["-l", "wran"], "did you mean warn"),
        (["-p", "x"], "no whole number"),
        (["-n", "-1"], "no whole number"),
        (["-g", "(", "--regex"], "Unmatched ("),
        (["--regex"], "--regex"),
        (["--since", "soon"], "neither a time"),
        (["--until", "soon"], "neither a time"),
        (["--file", "x", "--notification"], "excludes"),
        (["--file", "-"], "standard input cannot be followed"),
        (["http"], "http"),
    ],
)
def test_wrong_arguments_are_explained(run, args, phrase):
    result = run("twlogctl", "follow", *args)
    assert (result.returncode, result.stdout) == (2, "")
    assert phrase in result.stderr
