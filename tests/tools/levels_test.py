"""twlogctl: the shared record of levels, the settings file and lines for the log."""

import fcntl
import json
import os
import re
import shutil
import signal
import subprocess

import pytest

import shared_record
from conftest import LOG_FOLDER, SETTINGS_FOLDER, wait_until

ACCOUNT, HTTP, SOCKET, UTILS = 0, 26, 57, 66
ALARM, ERROR, WARN, NOTICE, INFO, DEBUG, DEBUG2, DEBUG3 = range(8)
SETTINGS = SETTINGS_FOLDER / "settings.conf"
LOG = LOG_FOLDER / "tarnwick.log"
COMMANDS = (
    "status create remove set timescale save load diff follow show stats top write doctor".split()
)


@pytest.fixture
def as_nobody(command):
    """as_nobody(*args): twlogctl's CompletedProcess as a user who owns nothing."""
    prefix = ["setpriv", "--reuid=65534", "--regid=65534", "--clear-groups"]

    def run_as_nobody(*args):
        words = [*prefix, *command("twlogctl", *args)]
        return subprocess.run(words, capture_output=True, text=True, timeout=120, check=False)

    if run_as_nobody("--help").returncode != 0:
        pytest.skip("there is no other user here, or the tool is out of that user's reach")
    return run_as_nobody


def saved(levels, flag="no"):
    listed = ",".join(map(str, levels))
    return f'tw_dbglog_settings="{listed}"\ntw_dbglog_time_scale="{flag}"\n'


# What every sub-command has in common.


@pytest.mark.parametrize("name", COMMANDS)
def test_each_sub_command_explains_itself(ctl, name):
    result = ctl(name, "--help")
    assert result.returncode == 0
    assert f"Usage: twlogctl {name}" in result.stdout
    assert result.stderr == ""


@pytest.mark.parametrize("name", COMMANDS)
def test_an_unknown_option_is_wrong_usage(ctl, name):
    result = ctl(name, "--no-such-option")
    assert result.returncode == 2
    assert result.stdout == ""
    assert result.stderr.startswith("twlogctl: ")
    assert f'try "twlogctl {name} --help"' in result.stderr


def test_without_a_sub_command_it_is_wrong_usage(ctl):
    assert ctl().returncode == 2


def test_an_unknown_sub_command_names_the_nearest_one(ctl):
    result = ctl("doctro")
    assert result.returncode == 2
    assert 'unknown sub-command "doctro" (did you mean doctor?)' in result.stderr


def test_help_lists_every_sub_command_and_the_exit_codes(ctl):
    text = ctl("--help").stdout
    for name in COMMANDS:
        assert re.search(rf"^  {name} ", text, re.MULTILINE), name
    assert "Exit codes: 0 " in text


def test_a_reader_that_is_gone_ends_it_as_sigpipe_does(command, record):
    read_end, write_end = os.pipe()
    os.close(read_end)
    with os.fdopen(write_end, "wb") as gone:
        child = subprocess.run(
            command("twlogctl", "status", "--all"),
            stdout=gone,
            stderr=subprocess.PIPE,
            timeout=120,
            check=False,
        )
    assert child.returncode == -signal.SIGPIPE
    assert child.stderr == b""


def test_output_that_cannot_be_written_is_a_failure(command, record):
    with open("/dev/full", "wb") as full:
        child = subprocess.run(
            command("twlogctl", "status"),
            stdout=full,
            stderr=subprocess.PIPE,
            text=True,
            timeout=120,
            check=False,
        )
    assert child.returncode == 1
    assert "twlogctl: cannot write the output" in child.stderr


# status


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


# set


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


# set --for


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
    """Starts `set --for 1h` and returns when the levels are set and the guardian waits."""
    child = start("twlogctl", "set", *assignments, "--for", "1h")
    assert "Ctrl-C puts the old levels back" in child.stderr.readline()
    return child


def guardian_of(pid):
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


def test_a_guardian_that_is_killed_ends_the_span(start, record):
    child = hold(start, "http=debug")
    os.kill(guardian_of(child.pid), signal.SIGKILL)
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


def test_a_removed_record_does_not_disturb_the_guardian(start, ctl, record):
    child = hold(start, "http=debug")
    assert ctl("remove", "--yes").returncode == 0
    ctl("create")
    child.send_signal(signal.SIGTERM)
    assert child.wait(timeout=120) == -signal.SIGTERM
    assert record.levels() == [NOTICE] * 74


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


# save, load and diff


def test_save_writes_levels_and_flag_and_keeps_the_other_lines(ctl, record):
    SETTINGS.write_text('language="en"\n' + saved([NOTICE] * 74) + "# end\n")
    ctl("set", "http=debug")
    ctl("timescale", "on")
    result = ctl("save")
    assert result.returncode == 0
    assert result.stdout == f"saved in {SETTINGS}\n"
    levels = [DEBUG if categ == HTTP else NOTICE for categ in range(74)]
    assert SETTINGS.read_text() == 'language="en"\n' + saved(levels, "yes") + "# end\n"


@pytest.mark.parametrize("name", ["save", "load", "diff"])
def test_without_a_record_nothing_is_saved_loaded_or_compared(ctl, name):
    SETTINGS.write_text(saved([NOTICE] * 74))
    assert ctl(name).returncode == 1


def test_save_on_a_full_disk_leaves_the_file_as_it_was(ctl, record):
    subprocess.run(["mount", "-t", "tmpfs", "-o", "size=8k", "tmpfs", SETTINGS_FOLDER], check=True)
    try:
        SETTINGS.write_text(saved([INFO] * 74))
        (SETTINGS_FOLDER / "filler").write_bytes(b"x" * 4096)
        result = ctl("save")
        assert result.returncode == 1
        assert "No space left on device; the file is as it was" in result.stderr
        assert SETTINGS.read_text() == saved([INFO] * 74)
        assert sorted(os.listdir(SETTINGS_FOLDER)) == ["filler", "settings.conf"]
    finally:
        subprocess.run(["umount", SETTINGS_FOLDER], check=True)


SECOND_WRITE_FAILS = r"""
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
int QLIBCFileSetKeyValue(const char* path, const char* key, const char* value, const char* format) {
  static int calls;
  if (++calls == 2) {
    errno = ENOSPC;
    return -1;
  }
  int (*next)(const char*, const char*, const char*, const char*) =
      (int (*)(const char*, const char*, const char*, const char*))dlsym(RTLD_NEXT,
                                                                         "QLIBCFileSetKeyValue");
  return next(path, key, value, format);
}
"""


def test_save_that_fails_half_way_puts_the_first_half_back(ctl, record, tmp_path):
    if os.environ.get("TARNWICK_TEST_EMULATOR") or not shutil.which("cc"):
        pytest.skip("a library for the tool's architecture cannot be compiled here")
    source, library = tmp_path / "fail.c", tmp_path / "fail.so"
    source.write_text(SECOND_WRITE_FAILS)
    subprocess.run(["cc", "-shared", "-fPIC", "-o", library, source], check=True)
    SETTINGS.write_text(saved([INFO] * 74, "yes"))
    # A tool with the address sanitizer insists on being first.
    preload = {"LD_PRELOAD": str(library), "ASAN_OPTIONS": "verify_asan_link_order=0"}
    result = ctl("save", env=preload)
    assert result.returncode == 1
    assert "No space left on device; the file is as it was" in result.stderr
    assert SETTINGS.read_text() == saved([INFO] * 74, "yes")


def test_save_into_a_missing_folder_fails(ctl, record):
    subprocess.run(["mount", "-t", "tmpfs", "tmpfs", SETTINGS_FOLDER.parent], check=True)
    try:
        result = ctl("save")
        assert result.returncode == 1
        assert "No such file or directory" in result.stderr
    finally:
        subprocess.run(["umount", SETTINGS_FOLDER.parent], check=True)


def test_save_by_somebody_else_fails(as_nobody, ctl):
    ctl("create", "--mode", "0664")
    result = as_nobody("save")
    assert result.returncode == 1
    assert "Permission denied" in result.stderr
    assert not SETTINGS.exists()


def test_load_sets_what_was_saved(ctl, record):
    SETTINGS.write_text(saved([NOTICE] * 73 + [DEBUG], "yes"))
    result = ctl("load")
    assert result.returncode == 0
    assert result.stdout == (
        "share_lib: notice -> debug\ntime stamps: seconds -> milliseconds\n"
    )
    assert record.levels() == [NOTICE] * 73 + [DEBUG]
    assert record.milliseconds() == 1


def test_load_of_a_shorter_list_changes_the_first_categories_and_says_so(ctl, record):
    SETTINGS.write_text(saved([DEBUG, INFO]))
    result = ctl("load")
    assert result.returncode == 0
    assert "for the first 2 categories only" in result.stderr
    assert record.levels() == [DEBUG, INFO] + [NOTICE] * 72


BROKEN = {
    "no number": ('tw_dbglog_settings="3,x,3"\ntw_dbglog_time_scale="no"\n', "1:23: ", '"x"'),
    "an empty field": ('tw_dbglog_settings="3,,3"\ntw_dbglog_time_scale="no"\n', "1:23: ", '""'),
    "a level of 8": ('\ntw_dbglog_settings="8"\ntw_dbglog_time_scale="no"\n', "2:21: ", '"8"'),
    "a negative level": ('tw_dbglog_settings="-1"\ntw_dbglog_time_scale="no"\n', "1:21: ", '"-1"'),
    "75 levels": (saved([3] * 75), "1:169: ", "more levels than categories"),
    "half a list": ('a="b"\ntw_dbglog_settings="3,3,3', "2:26: ", "closing quote"),
    "an empty value": ('tw_dbglog_settings=\ntw_dbglog_time_scale="no"\n', "1:20: ", '""'),
    "a bold flag": (saved([3] * 74, "YES"), "2:23: ", '"YES"'),
    "bytes of a terminal": (saved(["\x1b[2J"]), "1:21: ", '"\\x1B[2J"'),
    "no levels": ('tw_dbglog_time_scale="no"\n', " ", "no line tw_dbglog_settings"),
    "no flag": ('tw_dbglog_settings="3"\n', " ", "no line tw_dbglog_time_scale"),
}


@pytest.mark.parametrize("name", ["load", "diff"])
@pytest.mark.parametrize("case", BROKEN)
def test_a_broken_file_is_refused_with_the_position(ctl, record, case, name):
    text, position, words = BROKEN[case]
    SETTINGS.write_text(text)
    record.set_level(ACCOUNT, DEBUG2)
    result = ctl(name)
    assert result.returncode == 1
    assert f"{SETTINGS}:{position}" in result.stderr
    assert words in result.stderr
    assert record.levels() == [DEBUG2] + [NOTICE] * 73


@pytest.mark.parametrize("name", ["load", "diff"])
def test_a_missing_or_unreadable_file_is_refused(ctl, record, name):
    result = ctl(name)
    assert result.returncode == 1
    assert "No such file or directory" in result.stderr
    SETTINGS.mkdir()
    assert "Is a directory" in ctl(name).stderr


def test_values_without_quotes_and_blanks_are_read_as_the_library_reads_them(ctl, record):
    SETTINGS.write_text("  tw_dbglog_settings = 5, 4\r\ntw_dbglog_time_scale=yes\n")
    assert ctl("load").returncode == 0
    assert record.levels() == [DEBUG, INFO] + [NOTICE] * 72


def test_diff_of_the_same_is_silent_success(ctl, record):
    ctl("save")
    result = ctl("diff")
    assert result.returncode == 0
    assert result.stdout == "record and file are the same\n"
    assert ctl("diff", "--json").stdout == ""


def test_diff_tells_what_record_and_file_hold(ctl, record):
    ctl("save")
    ctl("set", "http=debug")
    ctl("timescale", "on")
    result = ctl("diff")
    assert result.returncode == 1
    assert result.stdout == (
        "http: record debug, file notice\ntime stamps: record milliseconds, file seconds\n"
    )
    assert [json.loads(line) for line in ctl("diff", "--json").stdout.splitlines()] == [
        {"category": "http", "record": "debug", "file": "notice"},
        {"setting": "time_stamps", "record": "milliseconds", "file": "seconds"},
    ]


# write


LINE = r"[A-Z][a-z]{2} [ \d]\d \d\d:\d\d:\d\d \[\d+\]"


def test_write_adds_a_line_as_a_daemon_does(ctl):
    result = ctl("write", "-c", "http", "-l", "warn", "a text with 100%s")
    assert result.returncode == 0
    assert result.stdout == result.stderr == ""
    assert re.fullmatch(
        LINE + r"\[http\]\[warn\] twlogctl:0:write\(\): a text with 100%s\n", LOG.read_text()
    )


def test_write_names_another_source_and_another_log(ctl):
    assert ctl("write", "--notification", "--source", "backup.sh", "done").returncode == 0
    text = (LOG_FOLDER / "twnotification.log").read_text()
    assert re.fullmatch(LINE + r"\[utils\]\[notice\] backup\.sh:0:write\(\): done\n", text)
    assert not LOG.exists()


def test_write_below_the_level_writes_nothing_and_says_so(ctl, record):
    result = ctl("write", "-c", "http", "-l", "info", "text")
    assert result.returncode == 1
    assert "not written: http is at notice, which leaves info out" in result.stderr
    assert not LOG.exists()


def test_write_follows_the_record(ctl, record):
    ctl("set", "http=info")
    assert ctl("write", "-c", "http", "-l", "info", "text").returncode == 0
    assert LOG.read_text().endswith("text\n")


def test_write_can_be_forced(ctl):
    assert ctl("write", "-c", "http", "-l", "debug3", "--force", "text").returncode == 0
    assert "[http][debug3]" in LOG.read_text()


def test_write_takes_the_lines_of_standard_input(ctl):
    result = ctl("write", "--json", "-", input="one\ntwo\n\nfour")
    assert json.loads(result.stdout) == {"written": 4, "log": str(LOG)}
    assert [line.split("(): ")[1] for line in LOG.read_text().splitlines()] == [
        "one", "two", "", "four",
    ]


def test_a_line_feed_in_the_text_begins_a_line_of_its_own(ctl):
    ctl("write", "one\nJan  1 00:00:00 [1][http][alarm] forged")
    lines = LOG.read_text().splitlines()
    assert len(lines) == 2
    assert all(re.match(LINE + r"\[utils\]\[notice\] twlogctl:", line) for line in lines)


@pytest.mark.parametrize(
    "words",
    [
        [],
        ["-c", "htpt", "x"],
        ["-l", "wran", "x"],
        ["-c", "-1", "x"],
        ["-l", "8", "x"],
        ["-c"],
        ["-l"],
        ["x", "--source"],
        ["x", "y"],
    ],
)
def test_write_with_wrong_arguments_is_wrong_usage(ctl, words):
    assert ctl("write", *words).returncode == 2
    assert not LOG.exists()


def test_write_names_the_nearest_category_and_level(ctl):
    assert "did you mean http?" in ctl("write", "-c", "htpt", "x").stderr
    assert "did you mean warn?" in ctl("write", "-l", "wran", "x").stderr


def test_a_line_that_did_not_get_into_the_log_is_a_failure(ctl):
    LOG.mkdir()
    result = ctl("write", "text")
    assert result.returncode == 1
    assert f"the line is not in {LOG}" in result.stderr


def test_write_on_a_full_disk_is_a_failure(ctl):
    subprocess.run(["mount", "-t", "tmpfs", "-o", "size=4k", "tmpfs", LOG_FOLDER], check=True)
    try:
        (LOG_FOLDER / "filler").write_bytes(b"x" * 4096)
        assert ctl("write", "text").returncode == 1
    finally:
        subprocess.run(["umount", LOG_FOLDER], check=True)


def test_write_tells_that_it_waits_for_the_lock_and_writes_afterwards(start):
    with open(LOG, "ab") as log:
        fcntl.flock(log, fcntl.LOCK_EX)
        child = start("twlogctl", "write", "text")
        assert "waits for the lock" in child.stderr.readline()
        assert LOG.read_bytes() == b""
        fcntl.flock(log, fcntl.LOCK_UN)
        assert child.wait(timeout=120) == 0
    assert LOG.read_text().endswith("text\n")
