"""twlogctl save, load and diff: the record and the settings file."""

import json
import os
import shutil
import subprocess

import pytest

from conftest import SETTINGS_DIRECTORY
from levels_support import ACCOUNT, DEBUG, DEBUG2, HTTP, INFO, NOTICE, SETTINGS, as_nobody, saved

pytestmark = pytest.mark.native


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
    mount = ["mount", "-t", "tmpfs", "-o", "size=8k", "tmpfs", SETTINGS_DIRECTORY]
    subprocess.run(mount, check=True)
    try:
        SETTINGS.write_text(saved([INFO] * 74))
        (SETTINGS_DIRECTORY / "filler").write_bytes(b"x" * 4096)
        result = ctl("save")
        assert result.returncode == 1
        assert "No space left on device; the file is as it was" in result.stderr
        assert SETTINGS.read_text() == saved([INFO] * 74)
        assert sorted(os.listdir(SETTINGS_DIRECTORY)) == ["filler", "settings.conf"]
    finally:
        subprocess.run(["umount", SETTINGS_DIRECTORY], check=True)


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


def test_save_into_a_missing_directory_fails(ctl, record):
    subprocess.run(["mount", "-t", "tmpfs", "tmpfs", SETTINGS_DIRECTORY.parent], check=True)
    try:
        result = ctl("save")
        assert result.returncode == 1
        assert "No such file or directory" in result.stderr
    finally:
        subprocess.run(["umount", SETTINGS_DIRECTORY.parent], check=True)


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
