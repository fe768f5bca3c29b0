"""twlogctl doctor and create among other users: what they write reaches no terminal and no command,
and what they made is told."""

import os
import pathlib
import re
import shlex
import subprocess

import pytest

import shared_record
from conftest import HANG, LOG_DIRECTORY, SETTINGS_DIRECTORY
from doctor_fixtures import (
    HAVE_LIBRARY,
    LOG,
    NOTIFICATIONS,
    SETTINGS,
    as_nobody,
    doctor,
    healthy,
    library,
    mounted,
    only,
    other_process,
    rotation,
)

pytestmark = pytest.mark.native

NOBODY = 65534

# A process with the library in its memory, under a name of its choice.
NAMED = """
import ctypes, sys
name = sys.argv.pop(1)
ctypes.CDLL(None).prctl(15, name.encode(), 0, 0, 0)
""" + HAVE_LIBRARY

# 15 bytes are a forged line, a command, and control sequences.
FORGED = "a;reboot\nok  b"
CLEARING = "\x1b[2J\x1b]0;pw\n\a"


@pytest.fixture
def named_process(other_process, library):
    """named_process(name, *arguments): a process of that name; with prefix= of another user."""

    def begin(name, *args, **options):
        return other_process(NAMED, name, library, *args, **options)

    return begin


def new_record(uid=0, mode=0o660):
    """A record that another user made."""
    subprocess.run(["ipcrm", "-M", hex(shared_record.KEY)], check=False, capture_output=True)
    words = ["setpriv", f"--reuid={uid}", f"--regid={uid}", "--clear-groups"] if uid else []
    # The module is handed over, because other users may not read the tests' directory.
    text = pathlib.Path(shared_record.__file__).read_text()
    code = f"{text}\nmake(mode={mode})"
    made = subprocess.run([*words, "/usr/bin/python3", "-c", code], check=False)
    if made.returncode != 0:
        pytest.skip("there is no other user here")


# What a process calls itself


@pytest.mark.parametrize("name", [FORGED, CLEARING, "\u202etoor", "x\x9b2J"])
def test_no_name_of_a_process_moves_the_cursor_or_begins_a_line(run, healthy, named_process, name):
    named_process(name)
    result = run("twlogctl", "doctor")
    assert result.returncode == 1
    text = result.stdout
    assert not re.search(r"[\x00-\x09\x0b-\x1f\x7f-\x9f\u202e]", text)
    assert all(
        re.match(r"(ok   |note |wrong)  \S|       fix:      \S|$|\d+ things? (is|are) wrong$", line)
        for line in text.splitlines()
    ), text


@pytest.mark.parametrize("name", [FORGED, CLEARING, "a$(reboot)", "it's `id`", "python3"])
def test_a_name_is_one_word_of_the_proposed_command(doctor, healthy, named_process, name):
    named_process(name)
    fix = only(doctor(), "daemons")["fix"]
    assert "\n" not in fix and "\x1b" not in fix
    words = subprocess.run(
        ["bash", "-c", f"printf '%s\\0' {fix}"], capture_output=True, check=True
    ).stdout.split(b"\0")
    assert words == [b"start", name.encode()[:15], b"again", b""]


def test_a_name_does_not_look_like_two_processes(run, record, named_process):
    child = named_process("a (1), b")
    assert f": 'a (1), b' ({child.pid})\n" in _created_again(run)


def _created_again(run):
    assert run("twlogctl", "remove", "--yes").returncode == 0
    return run("twlogctl", "create").stderr


def test_a_file_name_in_an_error_message_is_escaped(run):
    result = run("twlogctl", "show", "--file", "/no/\x1b[2J\u202e\n")
    assert result.stderr == "twlogctl: /no/\\x1B[2J\\u202E\\n: No such file or directory\n"


@pytest.mark.parametrize("tool", ["twlogctl", "twhttp", "twcamsim"])
def test_an_argument_in_an_error_message_is_escaped(run, tool):
    result = run(tool, "\x1b[2J\u202e")
    assert result.returncode == 2
    assert "\x1b" not in result.stderr and "\u202e" not in result.stderr
    assert "\\x1B[2J\\u202E" in result.stderr


# What a process of another user is given


@pytest.fixture
def rights_for_nobody():
    return re.compile(r"setfacl|chmod|chown|prlimit|usermod|--group|nobody")


def test_a_process_of_another_user_gets_no_right_to_the_logs(
    doctor, healthy, named_process, as_nobody, rights_for_nobody
):
    child = named_process("camerad", prefix=as_nobody)
    findings = doctor()["daemons"]
    assert {finding["fix"] for finding in findings} == {
        f"ps -o user,pid,lstart,args -p {child.pid}"
    }
    assert all(f"camerad ({child.pid}) runs as nobody, " in each["text"] for each in findings)
    assert not any(rights_for_nobody.search(finding["fix"]) for finding in findings)
    shown = subprocess.run(shlex.split(findings[0]["fix"]), capture_output=True, check=True).stdout
    assert b"nobody" in shown


def test_a_process_of_another_user_gets_no_larger_files(
    doctor, healthy, other_process, library, as_nobody, rights_for_nobody
):
    LOG.write_bytes(b"x" * 2047 + b"\n")
    child = other_process(HAVE_LIBRARY, library, 2048, prefix=as_nobody)
    finding = doctor()["limit"][0]
    assert f"python3 ({child.pid}) of nobody may write files of 2.0 KiB" in finding["text"]
    assert not rights_for_nobody.search(finding["fix"])


def test_a_daemon_that_may_not_attach_is_not_to_be_started_again(
    doctor, healthy, named_process, as_nobody
):
    named_process("camerad", prefix=as_nobody)
    texts = [finding["text"] for finding in doctor()["daemons"]]
    assert any("may not attach the record of root:root with mode 0660" in text for text in texts)


# What others made


@pytest.mark.parametrize("mode", [0o777, 0o1777, 0o755, 0o751, 0o757])
def test_a_directory_open_to_other_users_is_wrong_and_the_fix_closes_it(doctor, healthy, mode):
    LOG_DIRECTORY.chmod(mode)
    finding = only(doctor(), "folder")
    assert f"mode {mode:04o}" in finding["text"]
    subprocess.run(finding["fix"], shell=True, check=True)
    assert doctor() == {}
    assert LOG_DIRECTORY.stat().st_mode & 0o007 == 0


def test_a_directory_of_another_user_is_wrong_and_the_fix_takes_it_back(doctor, healthy):
    os.chown(LOG_DIRECTORY, NOBODY, NOBODY)
    finding = only(doctor(), "folder")
    assert "nobody can put a link or another file in the place of each file" in finding["text"]
    subprocess.run(finding["fix"], shell=True, check=True)
    assert doctor() == {}


def test_a_directory_that_a_group_may_write_is_worth_a_note(run, healthy):
    os.chown(LOG_DIRECTORY, 0, NOBODY)
    LOG_DIRECTORY.chmod(0o2770)
    result = run("twlogctl", "doctor")
    assert result.returncode == 0
    assert "note   folder    /var/log/tarnwick, root:nogroup, mode 2770: each user" in result.stdout


def test_the_log_of_a_user_of_the_directories_group_is_right(doctor, healthy):
    os.chown(LOG_DIRECTORY, 0, NOBODY)
    LOG_DIRECTORY.chmod(0o2770)
    os.chown(LOG, NOBODY, NOBODY)
    assert doctor() == {}


@pytest.mark.parametrize("path", [LOG, NOTIFICATIONS])
def test_a_log_that_another_user_made(doctor, healthy, path):
    path.touch()
    os.chown(path, NOBODY, NOBODY)
    finding = only(doctor(), "file")
    assert finding["text"].startswith(f"{path} was made by nobody, ")
    subprocess.run(finding["fix"], shell=True, check=True)
    assert doctor() == {}


@pytest.mark.parametrize("path, check", [(LOG, "file"), (SETTINGS, "settings")])
def test_a_file_that_anybody_may_write(doctor, healthy, path, check):
    path.chmod(0o666)
    finding = only(doctor(), check)
    assert "anybody can c" in finding["text"] and "mode 0666" in finding["text"]
    subprocess.run(finding["fix"], shell=True, check=True)
    assert doctor() == {}


@pytest.mark.parametrize("path, check", [(LOG, "file"), (SETTINGS, "settings")])
def test_a_link_in_the_place_of_a_file(doctor, healthy, tmp_path, path, check):
    target = tmp_path / "target\x1b"
    target.write_bytes(path.read_bytes())
    path.unlink()
    path.symlink_to(target)
    finding = only(doctor(), check)
    assert finding["text"].startswith(f"{path} is a link that leads to $'{tmp_path}/target\\033', ")
    subprocess.run(finding["fix"], shell=True, check=True)
    assert not path.is_symlink() and target.exists()


@pytest.mark.parametrize("path, check", [(LOG, "file"), (SETTINGS, "settings")])
@pytest.mark.parametrize("kind", ["fifo", "directory", "device"])
def test_something_else_in_the_place_of_a_file(doctor, healthy, path, check, kind):
    path.unlink()
    if kind == "fifo":
        os.mkfifo(path)
    elif kind == "directory":
        path.mkdir()
    else:
        _make_device(path)
    finding = only(doctor(), check)
    assert finding["text"] == f"{path} is no regular file"
    subprocess.run(finding["fix"], shell=True, check=True)
    assert not path.exists()


def _make_device(path):
    try:
        os.mknod(path, 0o600 | 0o020000, os.makedev(1, 3))
    except PermissionError:
        pytest.skip("no devices can be made here")


def test_settings_of_another_user(doctor, healthy):
    os.chown(SETTINGS, NOBODY, NOBODY)
    finding = only(doctor(), "settings")
    assert finding["text"].startswith(f"{SETTINGS} belongs to nobody, ")
    subprocess.run(finding["fix"], shell=True, check=True)
    assert doctor() == {}


def test_a_settings_directory_that_anybody_may_write(doctor, healthy):
    SETTINGS_DIRECTORY.chmod(0o777)
    finding = only(doctor(), "settings")
    assert f"{SETTINGS_DIRECTORY}: anybody can put a link" in finding["text"]
    subprocess.run(finding["fix"], shell=True, check=True)
    assert doctor() == {}


def test_the_directory_may_be_a_link_of_roots(doctor, healthy, tmp_path):
    with mounted(LOG_DIRECTORY.parent, "-o", "mode=0755"):
        tmp_path.chmod(0o750)
        LOG_DIRECTORY.symlink_to(tmp_path)
        assert doctor() == {}
        os.chown(LOG_DIRECTORY, NOBODY, NOBODY, follow_symlinks=False)
        assert f"{LOG_DIRECTORY} is a link that leads to " in only(doctor(), "folder")["text"]


# The record


def test_a_record_of_another_user_is_wrong_and_create_refuses_it(command, run, doctor, healthy):
    new_record(uid=NOBODY)
    finding = only(doctor(), "record")
    assert "made or is owned by nobody, who can change every level" in finding["text"]
    result = run("twlogctl", "create")
    assert (result.returncode, result.stdout) == (1, "")
    assert "made or owned by nobody" in result.stderr
    tool = shlex.join(command("twlogctl"))
    subprocess.run(finding["fix"].replace("twlogctl", tool), shell=True, check=True)
    assert doctor() == {}


def test_a_record_that_its_maker_has_given_to_root_is_still_the_makers(run, healthy):
    subprocess.run(["ipcrm", "-M", hex(shared_record.KEY)], check=True)
    text = pathlib.Path(shared_record.__file__).read_text()
    give = "state = (ctypes.c_ubyte * 256)()\nsegment = make(mode=0o660)\n"
    give += "assert _libc.shmctl(segment, 2, state) == 0\n"  # IPC_STAT
    give += "struct.pack_into('=I', state, 4, 0)\n"  # the owner of struct ipc_perm
    give += "assert _libc.shmctl(segment, 1, state) == 0\n"  # IPC_SET
    words = ["setpriv", f"--reuid={NOBODY}", f"--regid={NOBODY}", "--clear-groups"]
    made = subprocess.run([*words, "/usr/bin/python3", "-c", text + give], check=False)
    if made.returncode != 0:
        pytest.skip("there is no other user here")
    result = run("twlogctl", "create")
    assert result.returncode == 1
    assert "made or owned by nobody" in result.stderr


def test_create_keeps_a_record_of_its_own_user(run, record):
    assert run("twlogctl", "create").returncode == 0


def test_a_record_that_anybody_may_write(doctor, healthy):
    new_record(mode=0o666)
    assert "anybody can change every level" in only(doctor(), "record")["text"]


# Levels that are none


@pytest.mark.parametrize("level, passes", [(8, "every"), (99, "every"), (-5, "no")])
def test_a_level_out_of_range_is_shown_as_what_it_is(run, doctor, healthy, level, passes):
    shared_record.set_level(26, level)
    assert f"http           {level}, out of range\n" in run("twlogctl", "status").stdout
    finding = only(doctor(), "levels")
    told = f"http stands at {level}, out of range, which lets {passes} line through"
    assert finding["text"] == told
    assert finding["fix"] == "twlogctl set http=notice"
    assert run("twlogctl", "set", "http=notice").stdout == f"http: {level}, out of range -> notice\n"
    assert doctor() == {}


def test_levels_of_one_number_are_one_finding(doctor, healthy):
    for categ in range(74):
        shared_record.set_level(categ, -0x7F7F7F80)
    finding = only(doctor(), "levels")
    assert finding["text"].startswith("all 74 categories stand at -2139062144, out of range, ")
    assert finding["fix"] == "twlogctl set all=notice"
    shared_record.set_level(3, 3)
    assert only(doctor(), "levels")["fix"].count("=notice") == 73
