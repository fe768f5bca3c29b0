"""A machine for the tests of twlogctl doctor, and other processes and users on it."""

import contextlib
import json
import pathlib
import subprocess

import pytest

from conftest import HANG, LOG_DIRECTORY, SETTINGS_DIRECTORY

SETTINGS = SETTINGS_DIRECTORY / "settings.conf"
LOG = LOG_DIRECTORY / "tarnwick.log"
NOTIFICATIONS = LOG_DIRECTORY / "twnotification.log"
ROTATION = pathlib.Path("/etc/logrotate.d")

AS_NOBODY = ["setpriv", "--reuid=65534", "--regid=65534", "--clear-groups"]


@contextlib.contextmanager
def mounted(directory, *options):
    """An empty file system over a directory, for a while."""
    subprocess.run(["mount", "-t", "tmpfs", *options, "tmpfs", directory], check=True)
    try:
        yield
    finally:
        subprocess.run(["umount", directory], check=True)


@pytest.fixture
def rotation():
    """/etc/logrotate.d, empty."""
    if not ROTATION.is_dir():
        pytest.skip(f"{ROTATION} is missing")
    with mounted(ROTATION):
        yield ROTATION


@pytest.fixture
def healthy(run, rotation):
    """A machine on which nothing stops logging."""
    assert run("twlogctl", "create").returncode == 0
    assert run("twlogctl", "save").returncode == 0
    (rotation / "product").write_text("/var/log/tarnwick/*.log {\n  weekly\n}\n")
    LOG_DIRECTORY.chmod(0o750)
    LOG.touch()


@pytest.fixture
def doctor(run):
    """doctor(): the findings that are wrong, as {check: [finding]}, after a check of their form."""

    def examine():
        result = run("twlogctl", "doctor", "--json")
        assert result.stderr == ""
        findings = [json.loads(line) for line in result.stdout.splitlines()]
        wrong = {}
        for finding in findings:
            assert finding["text"]
            assert ("fix" in finding) == (finding["verdict"] == "wrong"), finding
            if finding["verdict"] == "wrong":
                wrong.setdefault(finding["check"], []).append(finding)
        assert result.returncode == (1 if wrong else 0)
        return wrong

    return examine


def only(wrong, check):
    """The one finding of the one check that found something."""
    assert list(wrong) == [check], wrong
    assert len(wrong[check]) == 1, wrong
    return wrong[check][0]


@pytest.fixture
def other_process():
    """other_process(code, *args): a Python program that has printed "ready"; the test ends it."""
    children = []

    def begin(code, *args, prefix=(), **options):
        child = subprocess.Popen(
            [*prefix, "/usr/bin/python3", "-c", code, *map(str, args)],
            stdout=subprocess.PIPE,
            text=True,
            **options,
        )
        children.append(child)
        assert child.stdout.readline() == "ready\n"
        return child

    yield begin
    for child in children:
        child.kill()
        child.wait(timeout=HANG)
        child.stdout.close()


HOLD_LOCK = """
import fcntl, sys, time
log = open(sys.argv[1], "ab")
fcntl.flock(log, fcntl.LOCK_EX)
print("ready", flush=True)
time.sleep(1000)
"""

# A process whose memory looks as if it had loaded the library.
HAVE_LIBRARY = """
import mmap, resource, sys, time
with open(sys.argv[1], "rb") as library:
    memory = mmap.mmap(library.fileno(), 0, access=mmap.ACCESS_READ)
if len(sys.argv) > 2:
    resource.setrlimit(resource.RLIMIT_FSIZE, (int(sys.argv[2]), resource.RLIM_INFINITY))
print("ready", flush=True)
time.sleep(1000)
"""


@pytest.fixture
def library():
    # The sandbox's scratch space: other users do not reach pytest's temporary directories.
    path = pathlib.Path("/mnt/libtarnwick.so.1")
    path.write_bytes(b"\x7fELF" + b"x" * 4096)
    yield path
    path.unlink()


@pytest.fixture
def as_nobody(library):
    """The words in front of a command that another user runs."""
    if subprocess.run([*AS_NOBODY, "test", "-r", library], check=False).returncode != 0:
        pytest.skip("there is no other user here, or the directory is out of that user's reach")
    return AS_NOBODY
