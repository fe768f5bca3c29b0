"""twlogctl top: what it shows, and its keys."""

import pytest

from conftest import wait_until
from log_help import LOG, Screen, line, without_privileges
from top_support import (
    DOWN,
    END,
    HOME,
    LEFT,
    PAGE_DOWN,
    PAGE_UP,
    RIGHT,
    UP,
    append,
    leave,
    levels,
    make_segment,
    now_line,
    press,
    record,
    row_of,
    terminal,
    top,
    wait_for_levels,
)

pytestmark = pytest.mark.native


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
