"""packaging/logrotate.conf under daemons that go on writing."""

import gzip
import re
import shutil
import subprocess
import time

import pytest

from conftest import HANG, LOG_DIRECTORY, LOGS

LINE = re.compile(rb"\S+ \S+ .*\[camera\]\[notice\] writer\.py:1:(writer\d)\(\): (\d+) (x*)\.\n")
LIMIT = 10 * 1024 * 1024  # as it stands in the file
KEPT = 5
GROUP = "daemon"  # of Debian; any one does


@pytest.fixture
def rotate(outside_the_checkout, tmp_path):
    """rotate(*options): runs logrotate once, the way its timer does."""
    configuration = outside_the_checkout("logrotate.conf")

    def run(*options):
        done = logrotate(configuration, tmp_path, *options)
        assert (done.returncode, done.stderr) == (0, "")

    return run


def logrotate(configuration, directory, *options):
    command = ["logrotate", "-s", str(directory / "state"), *options, str(configuration)]
    return subprocess.run(command, capture_output=True, text=True, timeout=HANG, check=False)


def rotated(log):
    """The renamed files of a log, the oldest first."""
    files = LOG_DIRECTORY.glob(log + ".*")
    return sorted(files, key=lambda file: int(file.name.split(".")[2]), reverse=True)


def content(file):
    return gzip.decompress(file.read_bytes()) if file.suffix == ".gz" else file.read_bytes()


def numbers_of(text):
    """The numbers of the lines by writer. A line that is torn is a failure."""
    numbers = {}
    for line in text.splitlines(keepends=True):
        match = LINE.fullmatch(line)
        assert match, f"a torn line: {line[:100]}"
        numbers.setdefault(match.group(1).decode(), []).append(int(match.group(2)))
    return numbers


def test_four_running_writers_lose_no_line(rotate, start_writers):
    writers = start_writers(count=4, length=3000)
    deadline = time.monotonic() + HANG
    while any(len(rotated(log)) < 3 for log in LOGS):
        assert time.monotonic() < deadline, "the logs do not grow"
        rotate()
        time.sleep(0.02)
    written = writers.stop()

    for log in LOGS:
        files = rotated(log)
        assert len(files) <= KEPT, "more would have been removed, and their lines counted as lost"
        everything = b"".join(map(content, files)) + (LOG_DIRECTORY / log).read_bytes()
        found = numbers_of(everything)
        # In one log, lines of one writer may come in another order only around a rotation.
        assert {name: sorted(lines) for name, lines in found.items()} == {
            name: list(range(count)) for name, count in written.items()
        }


def test_nothing_but_the_logs_and_their_rotations_comes_to_lie_in_the_directory(rotate, start_writers):
    writers = start_writers(count=4, length=3000)
    deadline = time.monotonic() + HANG
    while any(len(rotated(log)) < 3 for log in LOGS):
        assert time.monotonic() < deadline, "the logs do not grow"
        rotate()
    writers.stop()
    wanted = {log + end for log in LOGS for end in ("", ".1", ".2.gz", ".3.gz")}
    names = {file.name for file in LOG_DIRECTORY.iterdir()}
    assert names - {log + f".{n}.gz" for log in LOGS for n in (4, 5)} == wanted


def test_a_log_below_the_limit_stays(rotate):
    for log in LOGS:
        (LOG_DIRECTORY / log).write_bytes(b"x" * (LIMIT - 1))
    rotate()
    assert [rotated(log) for log in LOGS] == [[], []]


@pytest.mark.parametrize("log", LOGS)
def test_a_log_above_the_limit_is_renamed_and_no_new_one_made(rotate, log):
    (LOG_DIRECTORY / log).write_bytes(b"x" * (LIMIT + 1))
    rotate()
    assert [file.name for file in LOG_DIRECTORY.iterdir()] == [log + ".1"]


@pytest.mark.parametrize("log", LOGS)
def test_what_a_slow_writer_adds_to_the_renamed_file_is_kept(rotate, log):
    with open(LOG_DIRECTORY / log, "ab", buffering=0) as slow:
        slow.write(b"early\n")
        rotate("--force")
        slow.write(b"late\n")
    (LOG_DIRECTORY / log).write_bytes(b"new\n")
    rotate("--force")
    assert content(LOG_DIRECTORY / (log + ".2.gz")) == b"early\nlate\n"


def test_the_oldest_rotation_goes(rotate):
    log = LOG_DIRECTORY / LOGS[0]
    for number in range(KEPT + 2):
        log.write_bytes(b"%d\n" % number)
        rotate("--force")
    kept = [content(file) for file in rotated(LOGS[0])]
    assert kept == [b"%d\n" % number for number in range(2, KEPT + 2)]


def test_machines_without_logs_are_no_failure(rotate):
    rotate()
    assert not list(LOG_DIRECTORY.iterdir())


def test_a_directory_that_a_group_writes_wants_the_told_line(outside_the_checkout, tmp_path):
    configuration = outside_the_checkout("logrotate.conf")
    shutil.chown(LOG_DIRECTORY, group=GROUP)
    LOG_DIRECTORY.chmod(0o2770)
    for log in LOGS:
        (LOG_DIRECTORY / log).write_bytes(b"a line\n")

    refused = logrotate(configuration, tmp_path, "--force")
    assert "insecure permissions" in refused.stderr
    assert rotated(LOGS[0]) == []

    line = f"\tsu root {GROUP}\n}}\n"
    configuration.write_text(configuration.read_text().replace("}\n", line))
    done = logrotate(configuration, tmp_path, "--force")
    assert (done.returncode, done.stderr) == (0, "")
    assert [len(rotated(log)) for log in LOGS] == [1, 1]
