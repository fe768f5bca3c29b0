"""twlogctl doctor: it finds what stops logging, names the culprit and one fix each."""

import fcntl
import os
import pathlib
import re
import signal
import subprocess
import time

import pytest

import shared_record
from conftest import HANG, LOG_DIRECTORY, wait_until
from doctor_fixtures import (
    AS_NOBODY,
    HAVE_LIBRARY,
    HOLD_LOCK,
    LOG,
    NOTIFICATIONS,
    ROTATION,
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

def test_a_healthy_machine_has_no_findings(run, healthy):
    result = run("twlogctl", "doctor")
    assert result.returncode == 0
    assert result.stdout.endswith("\nnothing is wrong\n")
    assert "wrong  " not in result.stdout
    assert "fix:" not in result.stdout
    assert result.stderr == ""


def test_each_finding_has_one_fix_below_it(run, rotation):
    LOG_DIRECTORY.chmod(0o750)
    result = run("twlogctl", "doctor")
    assert result.returncode == 1
    assert re.search(r"^wrong  record    there is no record", result.stdout, re.MULTILINE)
    assert len(re.findall(r"^wrong ", result.stdout, re.MULTILINE)) == 2
    assert len(re.findall(r"^wrong .*\n       fix:      \S", result.stdout, re.MULTILINE)) == 2
    assert result.stdout.endswith("\n2 things are wrong\n")


def test_an_argument_is_wrong_usage(run):
    assert run("twlogctl", "doctor", "record").returncode == 2


def test_findings_are_coloured_on_a_terminal_alone(spawn, rotation):
    assert "\x1b[31mwrong\x1b[0m" in spawn("twlogctl", "doctor").read()
    assert "\x1b" not in spawn("twlogctl", "doctor", env={"NO_COLOR": "1"}).read()


# The directory and its disk


def test_a_missing_log_directory(doctor, healthy):
    with mounted(LOG_DIRECTORY.parent):
        finding = only(doctor(), "folder")
    assert finding["text"] == f"{LOG_DIRECTORY}: No such file or directory"
    assert finding["fix"] == f"install -d -m 0750 {LOG_DIRECTORY}"


def test_the_fix_for_the_missing_directory_is_one(doctor, healthy):
    with mounted(LOG_DIRECTORY.parent):
        subprocess.run(doctor()["folder"][0]["fix"], shell=True, check=True)
        assert doctor() == {}


def test_a_file_in_the_place_of_the_log_directory(doctor, healthy):
    with mounted(LOG_DIRECTORY.parent):
        LOG_DIRECTORY.touch()
        assert only(doctor(), "folder")["text"] == f"{LOG_DIRECTORY} is no directory"


def test_a_log_directory_that_its_owner_may_not_write(doctor, healthy):
    LOG_DIRECTORY.chmod(0o550)
    finding = only(doctor(), "folder")
    assert "mode 0550" in finding["text"]
    subprocess.run(finding["fix"], shell=True, check=True)
    assert doctor() == {}


def test_a_disk_that_is_almost_full(doctor, healthy):
    with mounted(LOG_DIRECTORY, "-o", "size=512k,mode=0750"):
        assert "only 512.0 KiB left" in only(doctor(), "space")["text"]


def test_a_disk_without_inodes(doctor, healthy):
    with mounted(LOG_DIRECTORY, "-o", "size=16m,nr_inodes=8,mode=0750"):
        assert re.search("only [0-9]+ more files fit", only(doctor(), "space")["text"])


def test_a_disk_that_is_mounted_read_only(doctor, healthy):
    with mounted(LOG_DIRECTORY, "-o", "ro,mode=0750"):
        assert "mounted read-only" in only(doctor(), "space")["text"]


# The log files


@pytest.mark.parametrize("path", [LOG, NOTIFICATIONS])
def test_something_else_in_the_place_of_a_log(doctor, healthy, path):
    path.unlink(missing_ok=True)
    os.mkfifo(path)
    finding = only(doctor(), "file")
    assert finding["text"] == f"{path} is no regular file"
    assert finding["fix"] == f"mv {path} {path}.old"


def test_a_link_that_leads_nowhere(doctor, healthy):
    LOG.unlink()
    LOG.symlink_to("/no/such/directory/log")
    assert only(doctor(), "file")["text"] == f"{LOG} is a link that leads nowhere"


def test_a_log_that_may_not_be_written(command, healthy):
    LOG_DIRECTORY.chmod(0o755)
    words = [*AS_NOBODY, *command("twlogctl", "doctor")]
    result = subprocess.run(words, capture_output=True, text=True, timeout=HANG, check=False)
    if f"{LOG_DIRECTORY} lets other users open the logs" not in result.stdout:
        pytest.skip("there is no other user here, or the tool is out of that user's reach")
    assert result.returncode == 1
    assert f"{LOG} cannot be written: Permission denied; root:root, mode 0644" in result.stdout
    assert f"fix:      setfacl -m u:nobody:rw {LOG}\n" in result.stdout
    assert "the record cannot be attached here: Permission denied" in result.stdout
    assert "run this as root, or as one of the group root" in result.stdout


# The locks


def test_a_lock_that_is_not_given_back(doctor, healthy, other_process):
    holder = other_process(HOLD_LOCK, LOG)
    finding = only(doctor(), "lock")
    assert f"{LOG} is locked by python3 ({holder.pid}, started " in finding["text"]
    assert "for more than 1 s" in finding["text"]
    assert "stopped" not in finding["text"]
    assert finding["fix"] == f"kill {holder.pid}"
    subprocess.run(finding["fix"], shell=True, check=True)
    holder.wait(timeout=HANG)
    assert doctor() == {}


def test_how_long_a_lock_is_held_is_bounded_by_the_last_line(doctor, healthy, other_process):
    an_hour_ago = time.time() - 3605
    os.utime(LOG, (an_hour_ago, an_hour_ago))
    other_process(HOLD_LOCK, LOG)
    text = only(doctor(), "lock")["text"]
    assert re.search(r"the last line was written 1 h( \d+ min)? ago", text)


def test_the_lock_of_the_notification_log(doctor, healthy, other_process):
    NOTIFICATIONS.touch()
    other_process(HOLD_LOCK, NOTIFICATIONS)
    assert only(doctor(), "lock")["text"].startswith(f"{NOTIFICATIONS} is locked by ")


def test_a_holder_that_was_stopped(doctor, healthy, other_process):
    holder = other_process(HOLD_LOCK, LOG)
    holder.send_signal(signal.SIGSTOP)
    os.waitpid(holder.pid, os.WUNTRACED)
    finding = only(doctor(), "lock")
    assert ", stopped)" in finding["text"]
    assert finding["fix"] == f"kill -CONT {holder.pid}"


def test_a_holder_that_has_ended_leaves_the_lock_to_its_child(doctor, healthy, other_process):
    code = HOLD_LOCK.replace("print", "import os\nif os.fork(): os._exit(0)\nprint")
    holder = other_process(code, LOG)
    holder.wait(timeout=HANG)
    finding = only(doctor(), "lock")
    child = int(re.search(r"python3 \((\d+)", finding["text"])[1])
    assert child != holder.pid
    assert finding["fix"] == f"kill {child}"
    os.kill(child, signal.SIGKILL)


def test_a_waiter_is_not_taken_for_the_holder(doctor, healthy, other_process):
    holder = other_process(HOLD_LOCK, LOG)
    waiter = subprocess.Popen(["flock", LOG, "true"])
    wait_until(
        lambda: re.search(rf"-> FLOCK .* {waiter.pid} ", pathlib.Path("/proc/locks").read_text()),
        "the waiter",
    )
    assert f"({holder.pid}," in only(doctor(), "lock")["text"]
    waiter.kill()
    waiter.wait(timeout=HANG)


def test_a_log_that_grows_while_it_is_locked_is_only_busy(doctor, healthy, other_process):
    grow = HOLD_LOCK.replace(
        "time.sleep(1000)",
        "for _ in range(100000):\n    log.write(b'line\\n')\n    log.flush()\n    time.sleep(0.01)",
    )
    other_process(grow, LOG)
    assert doctor() == {}


def test_the_doctor_leaves_no_lock_behind(doctor, healthy):
    doctor()
    with open(LOG, "ab") as log:
        fcntl.flock(log, fcntl.LOCK_EX | fcntl.LOCK_NB)


# The record


def test_a_missing_record(doctor, healthy):
    subprocess.run(["ipcrm", "-M", hex(shared_record.KEY)], check=True)
    finding = only(doctor(), "record")
    assert "every category stands at notice" in finding["text"]
    assert finding["fix"].startswith("twlogctl create")


def test_a_record_of_another_size(doctor, healthy):
    subprocess.run(["ipcrm", "-M", hex(shared_record.KEY)], check=True)
    shared_record.make(size=296)
    finding = only(doctor(), "record")
    assert "another size than 300: 296 bytes" in finding["text"]


def test_a_record_whose_mode_keeps_its_owner_out(doctor, healthy):
    subprocess.run(["ipcrm", "-M", hex(shared_record.KEY)], check=True)
    shared_record.make(mode=0o440)
    assert "mode 0440" in doctor()["record"][0]["text"]


def test_a_level_that_lets_nothing_through(doctor, healthy):
    shared_record.set_level(26, -1)
    finding = only(doctor(), "levels")
    assert finding["text"] == "http stands at -1, out of range, which lets no line through"
    assert finding["fix"] == "twlogctl set http=notice"


def test_a_low_level_is_worth_a_note(run, healthy):
    shared_record.set_level(26, 0)
    result = run("twlogctl", "doctor")
    assert result.returncode == 0
    assert "note   levels    http writes alarm and worse alone\n" in result.stdout


# The daemons


def test_a_daemon_that_has_not_attached_the_record(doctor, healthy, other_process, library):
    daemon = other_process(HAVE_LIBRARY, library)
    finding = only(doctor(), "daemons")
    assert f"python3 ({daemon.pid}) has not attached the record" in finding["text"]
    assert finding["fix"] == "start python3 again"


def test_a_daemon_of_another_container_is_left_out(doctor, healthy, other_process, library):
    other_process(HAVE_LIBRARY, library, prefix=["unshare", "--ipc"])
    assert doctor() == {}


def test_create_names_the_daemons_that_run_without_the_record(run, other_process, library):
    daemon = other_process(HAVE_LIBRARY, library)
    assert f": python3 ({daemon.pid})\n" in run("twlogctl", "create").stderr


def test_a_daemon_whose_user_may_not_write_the_log(
    doctor, healthy, other_process, library, as_nobody
):
    daemon = other_process(HAVE_LIBRARY, library, prefix=as_nobody)
    texts = [finding["text"] for finding in doctor()["daemons"]]
    told = f"python3 ({daemon.pid}) runs as nobody, who may not write {LOG}; "
    assert any(text.startswith(told) for text in texts), texts


def test_a_daemon_whose_file_size_limit_is_reached(doctor, healthy, other_process, library):
    LOG.write_bytes(b"x" * 2047 + b"\n")
    daemon = other_process(HAVE_LIBRARY, library, 2048)
    finding = doctor()["limit"][0]
    assert f"python3 ({daemon.pid}) may write files of 2.0 KiB" in finding["text"]
    assert finding["fix"] == f"prlimit --pid {daemon.pid} --fsize=unlimited"
    subprocess.run(finding["fix"], shell=True, check=True)
    assert "limit" not in doctor()


# The settings and the rotation


def test_broken_settings_are_told_with_their_position(doctor, healthy):
    SETTINGS.write_text('tw_dbglog_settings="3,3,,3"\ntw_dbglog_time_scale="no"\n')
    finding = only(doctor(), "settings")
    assert finding["text"].startswith(f"{SETTINGS}:1:25: ")


def test_a_directory_in_the_place_of_the_settings(doctor, healthy):
    SETTINGS.unlink()
    SETTINGS.mkdir()
    finding = only(doctor(), "settings")
    assert finding["text"] == f"{SETTINGS} is no regular file"
    assert finding["fix"] == f"mv {SETTINGS} {SETTINGS}.old"


def test_levels_that_were_never_saved_are_no_fault(run, healthy):
    SETTINGS.write_text('language="en"\n')
    result = run("twlogctl", "doctor")
    assert result.returncode == 0
    assert "note   settings  no levels are saved" in result.stdout


def test_logs_that_nothing_rotates(doctor, healthy):
    (ROTATION / "product").unlink()
    finding = only(doctor(), "rotation")
    assert str(LOG) in finding["text"]
    assert str(NOTIFICATIONS) in finding["text"]
    subprocess.run(finding["fix"], shell=True, check=True)
    words = (ROTATION / "tarnwick").read_text().split()
    assert "delaycompress" in words, "a writer may still hold the renamed file"
    assert doctor() == {}


@pytest.mark.parametrize(
    ("name", "text", "missing"),
    [
        ("product", "/var/log/tarnwick/tarnwick.log {\n}\n", [NOTIFICATIONS]),
        ("product", '"/var/log/tarnwick/tarnwick.log" /var/log/tarnwick/twn* {\n}\n', []),
        ("product", "/var/log/tarnwick/tarnwick.log\n/var/log/*/twn*.log\n{\n}\n", []),
        ("product", "# /var/log/tarnwick/*.log\n", [LOG, NOTIFICATIONS]),
        ("product", "/var/log/*.log {\n}\n", [LOG, NOTIFICATIONS]),
        ("product.dpkg-old", "/var/log/tarnwick/*.log {\n}\n", [LOG, NOTIFICATIONS]),
        (".product.swp", "/var/log/tarnwick/*.log {\n}\n", [LOG, NOTIFICATIONS]),
    ],
)
def test_rotation_is_found_by_what_names_the_logs(doctor, healthy, name, text, missing):
    (ROTATION / "product").unlink()
    (ROTATION / name).write_text(text)
    wrong = doctor()
    told = wrong["rotation"][0]["text"] if wrong else ""
    assert [path for path in (LOG, NOTIFICATIONS) if str(path) in told] == missing
