"""twlogctl write: lines for the log."""

import fcntl
import json
import re
import subprocess

import pytest

from conftest import LOG_DIRECTORY
from levels_support import LOG

pytestmark = pytest.mark.native


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
    text = (LOG_DIRECTORY / "twnotification.log").read_text()
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
    subprocess.run(["mount", "-t", "tmpfs", "-o", "size=4k", "tmpfs", LOG_DIRECTORY], check=True)
    try:
        (LOG_DIRECTORY / "filler").write_bytes(b"x" * 4096)
        assert ctl("write", "text").returncode == 1
    finally:
        subprocess.run(["umount", LOG_DIRECTORY], check=True)


def test_write_tells_that_it_waits_for_the_lock_and_writes_afterwards(start):
    with open(LOG, "ab") as log:
        fcntl.flock(log, fcntl.LOCK_EX)
        child = start("twlogctl", "write", "text")
        assert "waits for the lock" in child.stderr.readline()
        assert LOG.read_bytes() == b""
        fcntl.flock(log, fcntl.LOCK_UN)
        assert child.wait(timeout=120) == 0
    assert LOG.read_text().endswith("text\n")
