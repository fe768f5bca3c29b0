"""twlogctl set and timescale."""

import json

import pytest

from levels_support import ALARM, DEBUG, DEBUG2, DEBUG3, HTTP, INFO, NOTICE, SOCKET, UTILS

pytestmark = pytest.mark.native


def test_set_changes_levels_and_tells_old_and_new(ctl, record):
    result = ctl("set", "http=debug", "socket,utils=debug2")
    assert result.returncode == 0
    assert result.stdout == (
        "http: notice -> debug\nsocket: notice -> debug2\nutils: notice -> debug2\n"
    )
    assert [record.level(categ) for categ in (HTTP, SOCKET, UTILS)] == [DEBUG, DEBUG2, DEBUG2]


def test_numbers_and_capital_letters_name_the_same(ctl, record):
    assert ctl("set", "26,Socket=7", "UTILS=Alarm").returncode == 0
    assert [record.level(categ) for categ in (HTTP, SOCKET, UTILS)] == [DEBUG3, DEBUG3, ALARM]


def test_all_means_the_categories_that_are_not_named_wherever_it_stands(ctl, record):
    result = ctl("set", "http=debug", "all=info")
    assert result.stdout == "http: notice -> debug\n73 categories: notice -> info\n"
    assert record.levels() == [DEBUG if categ == HTTP else INFO for categ in range(74)]


def test_a_level_that_stays_is_told_too_when_it_was_named(ctl, record):
    assert ctl("set", "http=notice").stdout == "http: notice -> notice\n"
    assert ctl("set", "all=notice").stdout == "nothing changes\n"


def test_set_in_json_has_a_line_for_each_change(ctl, record):
    lines = ctl("set", "http=debug", "all=info", "--json").stdout.splitlines()
    assert len(lines) == 74
    assert {"category": "http", "old": "notice", "new": "debug"} in map(json.loads, lines)


@pytest.mark.parametrize(
    ("words", "complaint"),
    [
        (["htpt=debug"], 'unknown category "htpt" (did you mean http?)'),
        (["http=debg"], 'unknown level "debg" (did you mean debug'),
        (["http=8"], 'unknown level "8"'),
        (["http=-1"], 'unknown level "-1"'),
        (["74=debug"], 'unknown category "74"'),
        (["http"], '"http" is not of the form CATEGORY=LEVEL'),
        (["=debug"], '"=debug" is not of the form CATEGORY=LEVEL'),
        (["http="], 'unknown level ""'),
        (["http,,utils=info"], 'unknown category ""'),
        (["http=debug", "26=info"], 'category "26" is given two levels'),
        (["all=debug", "all=info"], '"all" is given two levels'),
    ],
)
def test_a_mistake_among_the_assignments_changes_nothing(ctl, record, words, complaint):
    result = ctl("set", "utils=debug", *words)
    assert result.returncode == 2
    assert complaint in result.stderr
    assert "nothing was changed" in result.stderr
    assert result.stdout == ""
    assert record.levels() == [NOTICE] * 74


def test_all_mistakes_are_told_at_once(ctl, record):
    result = ctl("set", "htpt=debug", "sokcet=inof")
    for text in ("htpt", "sokcet", "inof"):
        assert f'"{text}"' in result.stderr


def test_without_a_record_levels_cannot_be_set(ctl):
    result = ctl("set", "http=debug")
    assert result.returncode == 1
    assert "twlogctl create" in result.stderr


def test_a_mistake_is_wrong_usage_with_or_without_a_record(ctl):
    assert ctl("set", "htpt=debug").returncode == 2


def test_set_without_an_assignment_is_wrong_usage(ctl, record):
    assert ctl("set").returncode == 2


# timescale


def test_timescale_switches_the_milliseconds(ctl, record):
    assert ctl("timescale", "on").stdout == "time stamps: seconds -> milliseconds\n"
    assert record.milliseconds() == 1
    assert json.loads(ctl("timescale", "off", "--json").stdout) == {
        "time_stamps": "seconds",
        "old": "milliseconds",
    }
    assert record.milliseconds() == 0


@pytest.mark.parametrize("words", [[], ["maybe"], ["on", "off"]])
def test_timescale_of_anything_else_is_wrong_usage(ctl, record, words):
    assert ctl("timescale", *words).returncode == 2


def test_timescale_needs_a_record(ctl):
    assert ctl("timescale", "on").returncode == 1
