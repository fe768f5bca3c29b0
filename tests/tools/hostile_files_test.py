"""Whatever stands at the paths of the library's files: twlogctl neither waits for it, nor writes to
it, nor fills its memory with it, and says what is wrong."""

import os
import signal
import subprocess
import threading

import pytest

import shared_record
from conftest import HANG, LOG_DIRECTORY, SETTINGS_DIRECTORY
from doctor_fixtures import LOG, NOTIFICATIONS, SETTINGS, doctor, healthy, mounted, rotation
from log_help import line
from planted import KINDS, MIB, NO_FILES, Planted, plant

pytestmark = pytest.mark.native

# A guard against a hang, so that a test that finds one ends soon.
SOON = 30

# No tool needs as much, a sanitizer's memory included; a file of 1 GiB in memory is more.
MOST_KIB = 800 * 1024

NEW_SETTINGS = SETTINGS_DIRECTORY / "settings.conf.tarnwick-new"


@pytest.fixture
def soon(command):
    """soon(*args): twlogctl's exit code, output and error output, within SOON."""

    def run_soon(*args):
        words = command("twlogctl", *args)
        done = subprocess.run(
            words, capture_output=True, stdin=subprocess.DEVNULL, timeout=SOON, check=False
        )
        return done.returncode, done.stdout, done.stderr.decode()

    return run_soon


# The logs


@pytest.mark.parametrize("words", [["show"], ["stats"], ["show", "--notification"]])
@pytest.mark.parametrize("kind", NO_FILES)
def test_a_log_that_is_no_file_is_refused(soon, plant, kind, words):
    log = NOTIFICATIONS if "--notification" in words else LOG
    planted = plant(kind, log)
    assert soon(*words) == (1, b"", f"twlogctl: {log}: {NO_FILES[kind]}\n")
    assert planted.untouched()


@pytest.mark.parametrize("kind", sorted(set(NO_FILES) - {"dangling link"}))
def test_a_log_that_is_no_file_is_not_followed(soon, plant, kind):
    plant(kind, LOG)
    assert soon("follow") == (1, b"", f"twlogctl: {LOG}: {NO_FILES[kind]}\n")


@pytest.mark.parametrize("path, option", [(LOG, []), (NOTIFICATIONS, ["--notification"])])
@pytest.mark.parametrize("kind", NO_FILES)
def test_a_line_for_a_log_that_is_no_file_is_missing(soon, record, plant, kind, path, option):
    planted = plant(kind, path)
    code, output, error = soon("write", *option, "text")
    assert (code, output) == (1, b"")
    assert error == f'twlogctl: the line is not in {path}; "twlogctl doctor" tells why\n'
    assert planted.untouched()


@pytest.mark.parametrize("path", [LOG, NOTIFICATIONS, SETTINGS])
@pytest.mark.parametrize("kind", KINDS)
def test_doctor_and_status_wait_for_no_file(soon, record, rotation, plant, kind, path):
    planted = plant(kind, path)
    assert soon("doctor")[0] == 1
    assert soon("status")[0] == 0
    assert planted.untouched()


@pytest.mark.parametrize("words", [["show"], ["show", "-n", "2"], ["follow"]])
def test_a_log_without_a_line_end_does_not_fill_the_memory(command, plant, words):
    plant("sparse GiB", LOG)
    assert peak_of(command("twlogctl", *words)) < MOST_KIB


def peak_of(words):
    """The most memory, in KiB, that a program has held when its first output comes."""
    child = subprocess.Popen(words, stdout=subprocess.PIPE)
    guard = threading.Timer(HANG, child.kill)
    guard.start()
    assert child.stdout.read(1) == b"\0"
    child.terminate()
    _, status, usage = os.wait4(child.pid, 0)
    guard.cancel()
    child.stdout.close()
    child.returncode = os.waitstatus_to_exitcode(status)
    assert child.returncode == -signal.SIGTERM
    return usage.ru_maxrss


def test_a_long_message_among_the_last_ones_is_whole(soon):
    body = "".join(f"{number:07}" + "x" * 1016 + "\n" for number in range(3072))
    last = line("second\n" + body) + line("third")
    LOG.write_text(line("first") + last)
    assert soon("show", "-n", "2") == (0, last.encode(), "")


# The settings


@pytest.mark.parametrize("kind", NO_FILES)
def test_settings_that_are_no_file_are_neither_loaded_nor_replaced(soon, record, plant, kind):
    planted = plant(kind, SETTINGS)
    code, output, error = soon("load")
    assert (code, output) == (1, b"")
    assert error.startswith(f"twlogctl: {SETTINGS}: {NO_FILES[kind]}")
    if kind != "dangling link":  # a link of the caller, of which the library makes the file
        cannot = f"twlogctl: cannot write {SETTINGS}: {NO_FILES[kind]}; the file is as it was\n"
        assert soon("save") == (1, b"", cannot)
    assert planted.untouched()


@pytest.mark.parametrize(
    "kind, told",
    [
        ("link of another user", "Too many levels of symbolic links"),
        ("three MiB", "File too large"),
        ("sparse GiB", "File too large"),
    ],
)
def test_settings_that_are_not_to_be_replaced_stay(soon, record, plant, kind, told):
    planted = plant(kind, SETTINGS)
    before = os.lstat(SETTINGS)
    assert soon("save")[2] == f"twlogctl: cannot write {SETTINGS}: {told}; the file is as it was\n"
    after = os.lstat(SETTINGS)
    assert (after.st_ino, after.st_size) == (before.st_ino, before.st_size)
    assert planted.untouched()


def test_settings_with_a_second_name_are_replaced_under_their_own(soon, record, plant):
    planted = plant("hard link", SETTINGS)
    assert soon("save")[0] == 0
    assert "tw_dbglog_settings" in SETTINGS.read_text()
    assert planted.untouched()


@pytest.mark.parametrize("kind", sorted(set(KINDS) - {"directory"}))
def test_what_has_the_new_settings_name_is_put_away_unwritten(soon, record, plant, kind):
    planted = plant(kind, NEW_SETTINGS)
    assert soon("save")[0] == 0
    assert "tw_dbglog_settings" in SETTINGS.read_text()
    assert not os.path.lexists(NEW_SETTINGS)
    assert planted.untouched()


def test_a_directory_of_the_new_settings_name_is_told(soon, record, plant):
    plant("directory", NEW_SETTINGS)
    told = f"twlogctl: cannot write {SETTINGS}: File exists; the file is as it was\n"
    assert soon("save") == (1, b"", told)
    assert NEW_SETTINGS.is_dir()


# The directories


DIRECTORY_KINDS = sorted(set(NO_FILES) - {"directory"}) + ["three MiB"]


@pytest.mark.parametrize("kind", DIRECTORY_KINDS)
def test_a_log_directory_that_is_none_is_told(soon, record, kind):
    with mounted(LOG_DIRECTORY.parent, "-o", "mode=0755"), Planted(kind, LOG_DIRECTORY) as planted:
        assert soon("show")[0] == 1
        assert soon("write", "text")[0] == 1
        code, output, _ = soon("doctor")
        assert code == 1 and b"wrong  folder    /var/log/tarnwick" in output
        assert planted.untouched()


@pytest.mark.parametrize("kind", DIRECTORY_KINDS)
def test_a_settings_directory_that_is_none_is_told(soon, record, kind):
    above = SETTINGS_DIRECTORY.parent
    with mounted(above, "-o", "mode=0755"), Planted(kind, SETTINGS_DIRECTORY) as planted:
        assert soon("load")[0] == 1
        assert soon("save")[0] == 1
        assert soon("doctor")[0] == 1
        assert planted.untouched()


@pytest.mark.parametrize("kind", KINDS)
def test_doctor_waits_for_nothing_among_the_rotations(soon, healthy, rotation, plant, kind):
    planted = plant(kind, rotation / "another")
    assert soon("doctor")[0] == 0
    assert planted.untouched()


# The record


@pytest.mark.parametrize("size", [1, 4, 299, 301, 3 * MIB])
@pytest.mark.parametrize("mode", [0, 0o660])
def test_a_segment_of_another_size_is_neither_read_nor_changed(soon, size, mode):
    shared_record.make(size=size, mode=mode)
    for words in (["create"], ["set", "http=debug"], ["save"], ["load"], ["doctor"], ["status"]):
        code, _, error = soon(*words)
        assert code in (0, 1) and error.count("\n") <= 1, (words, error)
    assert not SETTINGS.exists()
    assert soon("set", "http=debug")[0] == 1
