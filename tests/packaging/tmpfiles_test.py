"""packaging/tmpfiles.conf on a new machine and under daemons that are writing."""

import os
import stat
import subprocess

import pytest

from conftest import HANG, LOG_DIRECTORY, LOGS, SETTINGS_DIRECTORY

CLOSED = [str(LOG_DIRECTORY), str(SETTINGS_DIRECTORY)]
NOBODY = 65534


@pytest.fixture
def create(outside_the_checkout):
    """create(*options): what the system does with the file at its start."""
    configuration = outside_the_checkout("tmpfiles.conf")

    def run(*options):
        command = ["systemd-tmpfiles", "--create", *map(str, options), str(configuration)]
        done = subprocess.run(command, capture_output=True, text=True, timeout=HANG, check=False)
        assert (done.returncode, done.stderr) == (0, "")

    return run


def mode_and_owner(path):
    state = os.stat(path)
    return stat.S_IMODE(state.st_mode), state.st_uid, state.st_gid


@pytest.mark.parametrize("directory", CLOSED)
def test_a_new_machine_gets_directories_that_are_closed_to_other_users(create, tmp_path, directory):
    create("--root", tmp_path)
    assert mode_and_owner(tmp_path / directory[1:]) == (0o750, 0, 0)


def test_settings_that_are_there_stay(create, tmp_path):
    settings = tmp_path / "var/packages/Tarnwick/etc/settings.conf"
    settings.parent.mkdir(parents=True)
    settings.write_text('unique="yes"\n')
    create("--root", tmp_path)
    assert settings.read_text() == 'unique="yes"\n'
    assert mode_and_owner(settings.parent) == (0o750, 0, 0)


def test_an_open_directory_is_closed_under_running_writers_and_no_line_is_lost(create, start_writers):
    LOG_DIRECTORY.chmod(0o777)
    writers = start_writers()
    for _ in range(5):
        create()
    written = writers.stop()
    assert mode_and_owner(LOG_DIRECTORY) == (0o750, 0, 0)
    for log in LOGS:
        assert (LOG_DIRECTORY / log).read_bytes().count(b"\n") == sum(written.values())


@pytest.mark.parametrize("log", LOGS)
def test_another_user_cannot_take_the_lock_of_a_log(create, log):
    path = LOG_DIRECTORY / log
    path.touch(mode=0o666)
    # flock opens for reading, which is enough to lock: 66 is its "cannot open".
    lock = ["setpriv", "--reuid", str(NOBODY), "--regid", str(NOBODY), "--clear-groups"]
    lock += ["flock", "--exclusive", str(path), "true"]
    assert subprocess.run(lock, capture_output=True, timeout=HANG, check=False).returncode == 0
    create()
    assert subprocess.run(lock, capture_output=True, timeout=HANG, check=False).returncode == 66
