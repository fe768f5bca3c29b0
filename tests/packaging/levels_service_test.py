"""packaging/tarnwick-levels.service: its commands in their order, and what systemd says to it."""

import os
import shlex
import shutil
import subprocess

import pytest

from conftest import HANG, PACKAGING, RECORD_KEY, SETTINGS_DIRECTORY, TOOLS

UNIT = PACKAGING / "tarnwick-levels.service"
TWLOGCTL = str(TOOLS / "twlogctl/twlogctl")


def commands():
    """The unit's commands, each with whether it may fail."""
    lines = [line for line in UNIT.read_text().splitlines() if line.startswith("ExecStart=")]
    for line in lines:
        words = shlex.split(line.split("=", 1)[1])
        may_fail = words[0].startswith("-")
        assert words[0].lstrip("-") == "/usr/bin/twlogctl"
        yield may_fail, [TWLOGCTL, *words[1:]]


def start_unit():
    for may_fail, words in commands():
        done = subprocess.run(words, capture_output=True, text=True, timeout=HANG, check=False)
        assert may_fail or done.returncode == 0, done.stderr


def twlogctl(*words):
    done = subprocess.run(
        [TWLOGCTL, *words], capture_output=True, text=True, timeout=HANG, check=True
    )
    return done.stdout


def mode_of_record():
    lines = subprocess.run(["ipcs", "-m"], capture_output=True, text=True, check=True).stdout
    return [line.split()[3] for line in lines.splitlines() if line.startswith(RECORD_KEY)]


def save_level():
    twlogctl("create")
    twlogctl("set", "camera=debug2")
    twlogctl("save")
    twlogctl("remove", "--yes")


def test_a_new_machine_without_settings_gets_a_record_that_others_cannot_write():
    start_unit()
    assert mode_of_record() in (["660"], ["600"])


def test_the_saved_levels_count_from_the_first_daemon_on():
    save_level()
    start_unit()
    assert "debug2" in next(l for l in twlogctl("status").splitlines() if "camera" in l)


def test_a_second_start_takes_the_saved_levels_again():
    save_level()
    start_unit()
    twlogctl("set", "camera=error")
    start_unit()
    assert "debug2" in next(l for l in twlogctl("status").splitlines() if "camera" in l)


def test_a_record_that_another_user_made_first_makes_the_unit_fail_and_say_whose_it_is():
    words = ["setpriv", "--reuid=65534", "--regid=65534", "--clear-groups"]
    made = subprocess.run([*words, TWLOGCTL, "create"], capture_output=True, check=False)
    if made.returncode != 0:
        pytest.skip("there is no other user here, or the tool is out of that user's reach")
    may_fail, create = next(commands())
    done = subprocess.run(create, capture_output=True, text=True, timeout=HANG, check=False)
    assert not may_fail
    assert (done.returncode, done.stdout) == (1, "")
    assert "there is a record already, made or owned by nobody, " in done.stderr


def test_running_writers_do_not_keep_it_from_its_work(start_writers):
    save_level()
    writers = start_writers()
    start_unit()
    writers.stop()
    assert "debug2" in next(l for l in twlogctl("status").splitlines() if "camera" in l)


def test_systemd_finds_nothing_wrong_with_the_unit(tmp_path):
    root = tmp_path / "root"
    units = root / "etc/systemd/system"
    units.mkdir(parents=True)
    shutil.copytree("/lib/systemd/system", root / "lib/systemd/system", symlinks=True)
    shutil.copyfile(UNIT, units / UNIT.name)
    program = root / "usr/bin/twlogctl"
    program.parent.mkdir(parents=True)
    program.write_text("#!/bin/sh\n")
    program.chmod(0o755)
    # Without the other units of the machine, whose findings are not ours.
    environment = {**os.environ, "SYSTEMD_LOG_LEVEL": "warning"}
    done = subprocess.run(
        ["systemd-analyze", "verify", "--man=no", "--root", str(root), UNIT.name],
        capture_output=True, text=True, timeout=HANG, env=environment, check=False,
    )
    assert (done.returncode, done.stderr) == (0, "")
