"""twlogctl top."""

import json
import os
import re
import shlex
import signal
import subprocess
import sys
import time

import pexpect
import pytest

from conftest import HANG, RECORD_KEY, plain_environment, wait_until
from log_help import LOG, Screen, line, processor_seconds, without_privileges

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


def test_categories_stand_above_and_the_log_below(top, record, run):
    run("twlogctl", "set", "audio=debug2")
    append(line("known"))
    screen = top()
    screen.wait_for("camerad:57:Probe(): known")
    rows = screen.rows()
    assert str(LOG) in rows[0] and "record of levels attached" in rows[1]
    assert row_of(screen, "account").split()[1] == "notice"
    assert row_of(screen, "audio").split()[1] == "debug2"
    log = next(index for index, row in enumerate(rows) if row.startswith("-- log"))
    assert rows[log + 1].startswith("Mar  5 14:03:09 [812][camera][warn]")
    leave(screen)


def test_right_and_left_change_the_level_of_the_chosen_category(top, record, run):
    screen = top()
    press(screen, DOWN, DOWN, RIGHT, RIGHT)
    wait_for_levels(run, {"archive": "debug"})
    screen.wait_for(lambda rows: row_of(screen, "archive").split()[1] == "debug")
    press(screen, UP, LEFT)
    wait_for_levels(run, {"archive": "debug", "account-api": "warn"})
    press(screen, "n")
    wait_for_levels(run, {"archive": "debug"})
    leave(screen)
    assert levels(run) == {"archive": "debug"}


def test_a_level_stops_at_both_ends(top, record, run):
    screen = top()
    press(screen, *9 * [RIGHT])
    wait_for_levels(run, {"account": "debug3"})
    press(screen, *9 * [LEFT])
    wait_for_levels(run, {"account": "alarm"})


def test_pages_and_ends_are_reached_by_their_keys(top, record, run):
    screen = top()
    press(screen, END, RIGHT)
    wait_for_levels(run, {"share_lib": "info"})
    screen.wait_for(" share_lib")
    press(screen, PAGE_UP, RIGHT)  # nine rows
    wait_for_levels(run, {"share_lib": "info", "task": "info"})
    press(screen, HOME, PAGE_DOWN, RIGHT)
    wait_for_levels(run, {"share_lib": "info", "task": "info", "camera-api": "info"})
    press(screen, HOME, UP, RIGHT)
    wait_until(lambda: levels(run).get("account") == "info", "the first category")


def test_a_change_by_somebody_else_is_seen(top, record, run):
    screen = top()
    run("twlogctl", "set", "account=alarm")
    screen.wait_for(lambda rows: row_of(screen, "account").split()[1] == "alarm")


def test_lines_are_counted_as_they_come(top, record):
    screen = top()
    append(10 * now_line("x", "[archive][warn]"))
    screen.wait_for(lambda rows: row_of(screen, "archive").split()[-1] == "10")
    # Five seconds later they count no more.
    screen.wait_for(lambda rows: float(row_of(screen, "archive").split()[2]) == 0)
    assert row_of(screen, "archive").split()[-1] == "10"


def test_the_loudest_come_first_on_demand(top, record, run):
    screen = top()
    press(screen, "s")
    append(50 * now_line("x", "[web][warn]"))
    screen.wait_for(lambda rows: rows[3].startswith(" web "))
    press(screen, HOME, RIGHT)
    wait_for_levels(run, {"web": "info"})


def test_only_the_chosen_category_s_lines_are_shown_on_demand(top, record):
    append(line("mine", tags="[account][warn]") + line("other"))
    screen = top()
    screen.wait_for("other")
    press(screen, "o")
    screen.wait_for("-- log of account")
    screen.wait_for(lambda rows: not any("other" in row for row in rows))
    assert "mine" in screen.text()
    press(screen, "o")
    screen.wait_for("other")


def test_the_log_can_be_held(top, record):
    append(line("before"))
    screen = top()
    screen.wait_for("before")
    press(screen, " ")
    screen.wait_for(", held")
    append(now_line("meanwhile", "[account][warn]"))
    screen.wait_for(lambda rows: row_of(screen, "account").split()[-1] == "1")
    assert "meanwhile" not in screen.text()
    press(screen, " ")
    screen.wait_for("meanwhile")


def test_a_question_mark_explains_the_keys(top, record, run):
    screen = top()
    press(screen, "?")
    screen.wait_for("Any key goes back.")
    text = screen.text()
    for word in ("Left, Right", "PgUp", "alarm error warn notice info", "hold the log", "leave"):
        assert word in text
    press(screen, RIGHT)
    screen.wait_for(" category ")
    assert levels(run) == {}


def test_without_a_record_it_is_read_only_and_says_so(top):
    screen = top()
    assert "no record of levels: read only" in screen.rows()[1]
    press(screen, RIGHT)
    screen.wait_for("refused: no record of levels")
    assert row_of(screen, "account").split()[1] == "notice"


def test_a_record_that_comes_and_goes_is_taken_and_left(top, run):
    screen = top()
    run("twlogctl", "create")
    screen.wait_for("record of levels attached")
    press(screen, RIGHT)
    wait_for_levels(run, {"account": "info"})
    assert run("twlogctl", "remove", "--yes").returncode == 0
    screen.wait_for("no record of levels")
    screen.wait_for(lambda rows: row_of(screen, "account").split()[1] == "notice")


def test_a_record_of_another_size_is_left_alone(top):
    make_segment(100, 0o600)
    screen = top()
    assert "wrong size" in screen.rows()[1]
    press(screen, RIGHT)
    screen.wait_for("refused")


def test_a_record_without_the_right_to_change_it_is_shown(command, terminal):
    make_segment(300, 0o400)  # its levels are all zero
    screen = Screen(terminal(without_privileges(command("twlogctl", "top"))))
    screen.wait_for("may not be changed: read only")
    screen.wait_for(lambda rows: (row_of(screen, "account") or "- -").split()[1] == "alarm")
    press(screen, RIGHT)
    screen.wait_for("refused")


def test_a_missing_log_is_waited_for(top, record):
    screen = top(columns=120)
    assert "No such file or directory" in screen.rows()[0]
    append(line("there"))
    screen.wait_for("there")
    screen.wait_for(lambda rows: "No such file" not in rows[0])


def test_the_log_is_followed_through_a_rotation(top, record):
    append(line("old"))
    screen = top()
    screen.wait_for("old")
    LOG.rename(f"{LOG}.1")
    append(line("new"))
    screen.wait_for("Probe(): new")
    assert "Probe(): old" in screen.text()


def test_control_bytes_and_wide_characters_do_no_harm(top, record):
    append(line("\x1b[2J\x07" + 100 * "漢" + "\n\x1b[H\tend"))
    screen = top()
    screen.wait_for(r"\x1B[2J\x07漢")
    screen.wait_for(r"\x1B[H\tend")
    assert "twlogctl top" in screen.rows()[0]


def test_in_a_plain_locale_other_characters_are_marked(top, record):
    append(line("gr\u00fcn"))
    screen = top(env={"LC_ALL": "C"})
    screen.wait_for("gr??n")


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
