"""twlogctl top and its terminal: sizes, the way it is left, and what it costs."""

import os
import re
import shlex
import signal
import time

import pytest

from conftest import wait_until
from log_help import line, processor_seconds
from top_support import DOWN, PLAIN, append, leave, now_line, press, record, terminal, top

pytestmark = pytest.mark.native


@pytest.mark.parametrize("rows, columns", [(10, 40), (12, 50), (50, 200), (150, 80), (24, 80)])
def test_it_fits_into_every_size_from_ten_lines_of_forty_columns(top, record, rows, columns):
    append(100 * now_line("x" * 300))
    screen = top(rows=rows, columns=columns)
    screen.wait_for("-- log")
    assert "twlogctl top" in screen.rows()[0]
    assert "account " in screen.rows()[3]


def test_a_screen_that_is_too_small_is_told_and_can_grow(top, record):
    screen = top()
    for rows, columns in ((9, 80), (24, 39), (1, 1), (2, 20)):
        screen.resize(rows, columns)
        screen.wait_for("too small"[:columns])
    screen.resize(24, 80)
    screen.wait_for("q leave")
    screen.wait_for("account-api")
    leave(screen)


def test_many_sizes_in_a_row_do_it_no_harm(top, record):
    append(100 * line("x" * 300))
    screen = top()
    for number in range(60):
        screen.resize(5 + number * 7 % 60, 20 + number * 13 % 150)
        press(screen, DOWN)
    screen.resize(24, 80)
    screen.wait_for("-- log")
    leave(screen)


@pytest.fixture
def shell(command, terminal):
    """A shell in a terminal, which tells the terminal's settings before and after top."""
    words = shlex.join(command("twlogctl", "top"))
    inner = shlex.quote(f'echo "pid=$$="; exec {words}')
    script = f'trap : INT QUIT; stty -g; sh -c {inner}; echo "status=$?="; stty -g; echo over'
    return terminal(["sh", "-c", script], {"TERM": "xterm-256color"})


def settings_of(text):
    return re.search(r"([0-9a-f]+:){10,}[0-9a-f]+", text).group()


def end_by_key(child, pid):
    child.send("q")


def end_by_control_c(child, pid):
    child.sendintr()


def end_by_quit(child, pid):
    child.send("\x1c")


def end_by_term(child, pid):
    os.kill(pid, signal.SIGTERM)


def end_by_hangup(child, pid):
    os.kill(pid, signal.SIGHUP)


@pytest.mark.parametrize(
    "end, status",
    [
        (end_by_key, 0),
        (end_by_control_c, 130),
        (end_by_quit, 131),
        (end_by_term, 143),
        (end_by_hangup, 129),
    ],
)
def test_the_terminal_is_left_as_it_was(shell, record, end, status):
    shell.expect(r"pid=(\d+)=")
    before, pid = settings_of(shell.before), int(shell.match.group(1))
    shell.expect("q leave")
    end(shell, pid)
    shell.expect(r"status=(\d+)=")
    assert int(shell.match.group(1)) == status
    drawn = "\x1b[?1049h\x1b[?25l" + shell.before  # these two came before the first picture
    assert drawn.rindex("\x1b[?25h") > drawn.rindex("\x1b[?25l")
    assert drawn.rindex("\x1b[?1049l") > drawn.rindex("\x1b[?1049h")
    shell.expect("over")
    assert settings_of(shell.before) == before


def test_stopped_it_gives_the_terminal_back_until_it_goes_on(command, terminal, record):
    words = shlex.join(command("twlogctl", "top"))
    script = f'set -m; {words}; echo "stopped=$?="; fg; echo "status=$?="'
    child = terminal(["sh", "-c", script], {"TERM": "xterm-256color"})
    child.expect("q leave")
    child.send("\x1a")
    child.expect_exact("\x1b[?1049l")
    child.expect(r"stopped=148=")
    child.expect("q leave")
    child.send("q")
    child.expect("status=0=")


def test_a_terminal_that_goes_away_ends_it(top, record):
    screen = top()
    os.close(screen.child.child_fd)
    screen.child.ptyproc.closed = True
    wait_until(lambda: not screen.child.isalive(), "the end of the process")
    assert screen.child.signalstatus == signal.SIGHUP


def test_idle_it_uses_less_than_a_hundredth_of_a_processor(top, record):
    append(line("x"))
    screen = top()
    screen.wait_for("Probe(): x")
    before, began = processor_seconds(screen.child.pid), time.monotonic()
    while time.monotonic() - began < 4:
        screen.feed()
    used = processor_seconds(screen.child.pid) - before
    assert used < 0.01 * (time.monotonic() - began)


def test_without_a_terminal_it_refuses(run):
    result = run("twlogctl", "top")
    assert (result.returncode, result.stdout) == (1, "")
    assert "top needs a terminal" in result.stderr


@pytest.mark.parametrize("kind", ["", "no-such-terminal"])
def test_an_unknown_terminal_is_refused(spawn, kind):
    child = spawn("twlogctl", "top", env={"TERM": kind})
    assert "top does not know this terminal" in child.read()
    child.wait()
    assert child.exitstatus == 1


def test_no_colour_is_used_against_the_will(spawn, record):
    append(line("x", tags="[http][alarm]"))
    child = spawn("twlogctl", "top", env={**PLAIN, "NO_COLOR": "1"})
    child.expect(r"Probe\(\): x")
    assert not re.search("\x1b\\[[0-9;]*3[0-7]m", child.before)


@pytest.mark.parametrize(
    "args, phrase",
    [
        (["--file", "x", "--notification"], "excludes"),
        (["--file", "-"], "standard input cannot be followed"),
        (["--json"], "--json"),
        (["http"], "http"),
    ],
)
def test_wrong_arguments_are_explained(run, args, phrase):
    result = run("twlogctl", "top", *args)
    assert (result.returncode, result.stdout) == (2, "")
    assert phrase in result.stderr
