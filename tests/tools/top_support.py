"""A screen of twlogctl top, what is seen on it, and what happens beside it."""

import json
import subprocess
import sys
import time

import pexpect
import pytest

from conftest import HANG, RECORD_KEY, plain_environment, wait_until
from log_help import LOG, Screen, line


# The screen of these tests knows no repetition of characters, which this type does not use.
PLAIN = {"TERM": "linux"}

UP, DOWN, RIGHT, LEFT = "\x1b[A", "\x1b[B", "\x1b[C", "\x1b[D"
PAGE_UP, PAGE_DOWN, HOME, END = "\x1b[5~", "\x1b[6~", "\x1b[1~", "\x1b[4~"


@pytest.fixture
def top(spawn):
    """top(): the screen of a top that has drawn itself."""

    def spawn_top(*args, rows=24, columns=80, env=None):
        environment = {**PLAIN, **(env or {})}
        child = spawn("twlogctl", "top", *args, dimensions=(rows, columns), env=environment)
        screen = Screen(child, rows, columns)
        screen.wait_for("leave")
        return screen

    return spawn_top


@pytest.fixture
def terminal():
    """terminal(words): a command in a terminal of its own."""
    children = []

    def spawn_command(words, env=None):
        children.append(
            pexpect.spawn(
                words[0],
                words[1:],
                timeout=HANG,
                encoding="utf-8",
                codec_errors="replace",
                dimensions=(24, 80),
                env={**plain_environment(), **PLAIN, **(env or {})},
            )
        )
        return children[-1]

    yield spawn_command
    for child in children:
        child.close(force=True)


def make_segment(size, mode):
    """A record as somebody else might have made it."""
    flags = 0o1000 | mode  # IPC_CREAT
    call = f"import ctypes; assert ctypes.CDLL(None).shmget({RECORD_KEY}, {size}, {flags}) != -1"
    subprocess.run([sys.executable, "-c", call], check=True)


@pytest.fixture
def record(run):
    assert run("twlogctl", "create").returncode == 0


def levels(run):
    """The levels of the record that are not notice."""
    return json.loads(run("twlogctl", "status", "--json").stdout)["levels"]


def press(screen, *keys):
    for key in keys:
        screen.child.send(key)


def wait_for_levels(run, expected):
    wait_until(lambda: levels(run) == expected, f"the levels {expected}")


def row_of(screen, category):
    return next((row for row in screen.rows()[3:] if row.startswith(f" {category} ")), None)


def append(text):
    with open(LOG, "a", encoding="utf-8") as log:
        log.write(text)


def now_line(text, tags="[http][warn]"):
    return line(text, time.strftime("%b %e %T"), tags=tags)


def leave(screen):
    press(screen, "q")
    screen.child.wait()
    assert screen.child.exitstatus == 0
