"""twlogctl status."""

import json
import os

from levels_support import DEBUG, HTTP, SOCKET, WARN, as_nobody


def test_status_without_a_record_says_so_and_fails(ctl):
    result = ctl("status")
    assert result.returncode == 1
    assert result.stdout.startswith("record       missing, key 0x18180004")


def test_status_without_a_record_says_so_in_json(ctl):
    result = ctl("status", "--json")
    assert result.returncode == 1
    assert json.loads(result.stdout) == {"record": False, "key": "0x18180004"}


def test_status_tells_the_segment_and_the_levels_that_are_not_notice(ctl, record):
    record.set_level(HTTP, DEBUG)
    result = ctl("status")
    assert result.returncode == 0
    assert result.stdout == (
        "record       present, key 0x18180004\n"
        "size         300 bytes\n"
        "owner        root:root\n"
        "mode         0660\n"
        "attached     0 processes\n"
        "time stamps  seconds\n"
        "\n"
        "http           debug\n"
        "73 categories at notice\n"
    )


def test_status_of_all_categories_has_a_line_for_each(ctl, record):
    lines = ctl("status", "--all").stdout.split("\n\n")[1].splitlines()
    assert len(lines) == 74
    assert lines[0].split() == ["account", "notice"]
    assert lines[73].split() == ["share_lib", "notice"]


def test_status_in_json_is_one_object_on_one_line(ctl, record):
    record.set_level(SOCKET, WARN)
    result = ctl("status", "--json")
    assert result.stdout.count("\n") == 1
    assert json.loads(result.stdout) == {
        "record": True,
        "key": "0x18180004",
        "size": 300,
        "owner": "root",
        "group": "root",
        "mode": "0660",
        "attached": 0,
        "processes": [],
        "time_stamps": "seconds",
        "levels": {"socket": "warn"},
    }


def test_status_names_the_processes_that_have_the_record(ctl, record):
    with record.attached():
        status = json.loads(ctl("status", "--json").stdout)
    assert status["attached"] == 1
    assert [process["pid"] for process in status["processes"]] == [os.getpid()]


def test_a_level_without_a_name_is_shown_as_its_number(ctl, record):
    record.set_level(HTTP, 12)
    assert "http           12, out of range\n" in ctl("status").stdout


def test_status_on_a_terminal_is_coloured_unless_no_color_is_set(spawn, record):
    record.set_level(HTTP, DEBUG)
    assert "\x1b[33mdebug\x1b[0m" in spawn("twlogctl", "status").read()
    assert "\x1b" not in spawn("twlogctl", "status", env={"NO_COLOR": "1"}).read()


def test_status_tells_the_segment_to_those_who_may_not_read_it(as_nobody, record):
    result = as_nobody("status")
    assert result.returncode == 1
    assert "mode         0660\n" in result.stdout
    assert "may not be read: Permission denied; it belongs to root:root with mode 0660" in (
        result.stderr
    )


def test_a_record_that_others_may_read_shows_its_levels_to_them(as_nobody, ctl):
    ctl("create", "--mode", "0664")
    assert "74 categories at notice" in as_nobody("status").stdout
