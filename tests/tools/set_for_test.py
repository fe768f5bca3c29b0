"""twlogctl set --for: levels that go back by themselves."""

import os
import signal
import subprocess

import pytest

from conftest import wait_until
from levels_support import DEBUG, HTTP, NOTICE, SOCKET, WARN


@pytest.mark.parametrize("span", ["0", "", "x", "-5s", "10 weeks", "1e9d", "3661d", "nan"])
def test_a_span_that_is_none_is_wrong_usage(ctl, record, span):
    result = ctl("set", "http=debug", f"--for={span}")
    assert result.returncode == 2
    assert "--for" in result.stderr
    assert record.level(HTTP) == NOTICE


def test_after_the_span_the_old_levels_are_back(ctl, record):
    record.set_level(SOCKET, WARN)
    result = ctl("set", "http,socket=debug", "--for", "200ms")
    assert result.returncode == 0
    assert result.stdout == "http: notice -> debug\nsocket: warn -> debug\n"
    assert "for 200 ms" in result.stderr
    assert "the levels are back" in result.stderr
    assert (record.level(HTTP), record.level(SOCKET)) == (NOTICE, WARN)


def test_a_change_that_changes_nothing_does_not_wait(ctl, record):
    assert ctl("set", "http=notice", "--for", "1h").returncode == 0


def hold(start, *assignments):
    """Starts `set --for 1h` and returns when the levels are set and its second process waits."""
    child = start("twlogctl", "set", *assignments, "--for", "1h")
    assert "Ctrl-C puts the old levels back" in child.stderr.readline()
    return child


def reverter_of(pid):
    children = subprocess.run(
        ["ps", "--ppid", str(pid), "-o", "pid="], capture_output=True, text=True, check=False
    )
    return int(children.stdout.split()[0])


@pytest.mark.parametrize("number", [signal.SIGINT, signal.SIGTERM, signal.SIGHUP])
def test_a_signal_puts_the_levels_back_and_ends_the_tool_by_itself(start, record, number):
    child = hold(start, "http=debug")
    assert record.level(HTTP) == DEBUG
    child.send_signal(number)
    assert child.wait(timeout=120) == -number
    assert record.level(HTTP) == NOTICE
    assert "interrupted: the levels are back" in child.stderr.read()


def test_ctrl_c_on_a_terminal_puts_the_levels_back(spawn, record):
    child = spawn("twlogctl", "set", "http=debug", "--for", "10m")
    child.expect_exact("for 10 min, until ")
    assert record.level(HTTP) == DEBUG
    child.sendintr()
    child.read()
    child.close()
    assert child.signalstatus == signal.SIGINT
    assert record.level(HTTP) == NOTICE


def test_a_terminal_that_is_closed_puts_the_levels_back(spawn, record):
    child = spawn("twlogctl", "set", "http=debug", "--for", "10m")
    child.expect_exact("for 10 min, until ")
    child.close(force=False)
    wait_until(lambda: record.level(HTTP) == NOTICE, "the old level")


def test_sigkill_puts_the_levels_back(start, record):
    child = hold(start, "http=debug", "socket=debug2")
    child.kill()
    wait_until(lambda: record.level(HTTP) == record.level(SOCKET) == NOTICE, "the old levels")
    assert child.stderr.read() == ""


def test_the_whole_process_group_killed_puts_the_levels_back(start, record):
    child = hold_in_group(start)
    os.killpg(child.pid, signal.SIGKILL)
    wait_until(lambda: record.level(HTTP) == NOTICE, "the old level")


def hold_in_group(start):
    child = start("twlogctl", "set", "http=debug", "--for", "1h", start_new_session=True)
    assert "Ctrl-C puts the old levels back" in child.stderr.readline()
    return child


def test_a_reverter_that_is_killed_ends_the_span(start, record):
    child = hold(start, "http=debug")
    os.kill(reverter_of(child.pid), signal.SIGKILL)
    assert child.wait(timeout=120) == 1
    assert "was killed: the levels are back early" in child.stderr.read()
    assert record.level(HTTP) == NOTICE


def test_a_level_that_somebody_else_has_changed_stays_theirs(start, record):
    child = hold(start, "http=debug", "socket=debug")
    record.set_level(HTTP, WARN)
    child.send_signal(signal.SIGTERM)
    child.wait(timeout=120)
    assert (record.level(HTTP), record.level(SOCKET)) == (WARN, NOTICE)
    assert "http was changed to warn meanwhile and stays so" in child.stderr.read()


def test_a_level_that_stood_there_already_is_not_put_back(start, record):
    record.set_level(SOCKET, DEBUG)
    child = hold(start, "http=debug", "socket=debug")
    record.set_level(SOCKET, DEBUG)
    child.send_signal(signal.SIGTERM)
    child.wait(timeout=120)
    assert record.level(SOCKET) == DEBUG


def test_a_removed_record_does_not_disturb_the_reverter(start, ctl, record):
    child = hold(start, "http=debug")
    assert ctl("remove", "--yes").returncode == 0
    ctl("create")
    child.send_signal(signal.SIGTERM)
    assert child.wait(timeout=120) == -signal.SIGTERM
    assert record.levels() == [NOTICE] * 74
