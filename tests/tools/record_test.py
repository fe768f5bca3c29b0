"""twlogctl create and remove: the shared record of levels."""

import json
import os
import re
import signal

import pytest

import shared_record
from levels_support import DEBUG, DEBUG3, HTTP, INFO, NOTICE, SETTINGS, as_nobody, saved


# create


def test_a_created_record_has_every_category_at_notice(ctl):
    result = ctl("create")
    assert result.returncode == 0
    assert result.stdout == "record created, every category at notice: nothing is saved\n"
    assert "start the running ones again" in result.stderr
    assert shared_record.levels() == [NOTICE] * 74
    assert shared_record.milliseconds() == 0


def test_a_created_record_has_the_saved_levels(ctl):
    SETTINGS.write_text(saved([INFO] * 73 + [DEBUG3], "yes"))
    result = ctl("create", "--json")
    assert result.returncode == 0
    assert json.loads(result.stdout) == {"created": True, "saved_levels": True}
    assert shared_record.levels() == [INFO] * 73 + [DEBUG3]
    assert shared_record.milliseconds() == 1


def test_the_mode_and_the_group_are_those_that_were_asked_for(ctl):
    assert ctl("create", "--mode", "640", "--group", "0").returncode == 0
    status = json.loads(ctl("status", "--json").stdout)
    assert (status["mode"], status["group"]) == ("0640", "root")


def test_the_settings_file_of_other_keys_is_no_obstacle(ctl):
    SETTINGS.write_text('language="en"\n')
    assert ctl("create").returncode == 0
    assert shared_record.levels() == [NOTICE] * 74


@pytest.mark.parametrize("mode", ["", "0999", "rw-rw----", "1777", "0444", "0060", "-1"])
def test_a_mode_that_is_none_or_keeps_the_owner_out_is_wrong_usage(ctl, mode):
    result = ctl("create", f"--mode={mode}")
    assert result.returncode == 2
    assert "--mode" in result.stderr
    assert not shared_record.exists()


@pytest.mark.parametrize("group", ["no-such-group", "-5", "12x", ""])
def test_an_unknown_group_is_wrong_usage(ctl, group):
    result = ctl("create", f"--group={group}")
    assert result.returncode == 2
    assert not shared_record.exists()


def test_a_record_that_is_there_stays_as_it_is(ctl, record):
    record.set_level(HTTP, DEBUG)
    result = ctl("create")
    assert result.returncode == 0
    assert "stays as it is" in result.stdout
    assert record.level(HTTP) == DEBUG


def test_a_record_that_is_there_with_another_mode_is_refused(ctl, record):
    result = ctl("create", "--mode", "0600")
    assert result.returncode == 1
    assert "with mode 0660" in result.stderr


@pytest.mark.parametrize("size", [200, 304, 4096])
def test_a_segment_of_another_size_is_refused(ctl, size):
    shared_record.make(size=size)
    result = ctl("create")
    assert result.returncode == 1
    assert f"a segment of {size} bytes" in result.stderr
    assert ctl("set", "http=debug").returncode == 1


def test_broken_settings_keep_the_record_from_being_made(ctl):
    SETTINGS.write_text(saved([NOTICE] * 10 + ["x"]))
    result = ctl("create")
    assert result.returncode == 1
    assert f"{SETTINGS}:1:41: " in result.stderr
    assert not shared_record.exists()


def test_others_cannot_change_the_record(as_nobody, record):
    for words in (["set", "http=debug"], ["timescale", "on"], ["remove"]):
        result = as_nobody(*words)
        assert result.returncode == 1, words
        assert re.search("may not be changed|cannot remove", result.stderr), words
    assert record.level(HTTP) == NOTICE


# remove


def test_without_a_record_there_is_nothing_to_remove(ctl):
    result = ctl("remove")
    assert result.returncode == 1
    assert "no record" in result.stderr


def test_a_record_of_nobody_is_removed_without_a_question(ctl, record):
    assert ctl("remove").returncode == 0
    assert not record.exists()


def test_an_attached_record_is_not_removed_through_a_pipe(ctl, record):
    with record.attached():
        result = ctl("remove")
        assert result.returncode == 1
        assert "one process has it attached" in result.stderr
        assert record.exists()


def test_an_attached_record_is_removed_when_that_is_said(ctl, record):
    with record.attached():
        result = ctl("remove", "--yes", "--json")
        assert result.returncode == 0
        assert json.loads(result.stdout) == {"removed": True}
        assert not record.exists()


@pytest.mark.parametrize(("answer", "stays"), [("n", True), ("", True), ("y", False)])
def test_on_a_terminal_the_attached_record_is_asked_for(spawn, record, answer, stays):
    with record.attached():
        child = spawn("twlogctl", "remove")
        child.expect(r"attached by 1 process: .*\(%d\)" % os.getpid())
        child.expect_exact("Remove it? [y/N] ")
        child.sendline(answer)
        child.read()
        child.close()
        assert child.exitstatus == (1 if stays else 0)
        assert record.exists() == stays


def test_ctrl_c_at_the_question_keeps_the_record(spawn, record):
    with record.attached():
        child = spawn("twlogctl", "remove")
        child.expect_exact("[y/N] ")
        child.sendintr()
        child.read()
        child.close()
        assert child.signalstatus == signal.SIGINT
        assert record.exists()
