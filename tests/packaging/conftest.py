"""What the tests of packaging/ share. They run as root inside scripts/sandbox, where the record of
levels, the log directory and the settings file belong to the run:

    scripts/sandbox python3 -m pytest tests/packaging -q

TARNWICK_TOOLS_DIR is the build's directory of tools, build/debug/tools when it is unset.
"""

import os
import pathlib
import shutil
import subprocess
import sys

import pytest

ROOT = pathlib.Path(__file__).resolve().parents[2]
PACKAGING = ROOT / "packaging"
TOOLS = pathlib.Path(os.environ.get("TARNWICK_TOOLS_DIR", ROOT / "build/debug/tools")).resolve()
LOG_DIRECTORY = pathlib.Path("/var/log/tarnwick")
LOGS = ("tarnwick.log", "twnotification.log")
SETTINGS_DIRECTORY = pathlib.Path("/var/packages/Tarnwick/etc")
RECORD_KEY = "0x18180004"

# A guard against a hang; no test waits for it to pass.
HANG = 240


def pytest_sessionstart(session):
    if session.config.getoption("dist", "no") != "no":
        return  # this process hands the tests to workers, each in a sandbox of its own
    if not os.environ.get("TARNWICK_SANDBOX"):
        pytest.exit("these tests write system paths: run them in scripts/sandbox", returncode=3)


def empty(directory):
    os.chown(directory, 0, 0)
    directory.chmod(0o755)
    for entry in directory.iterdir():
        entry.unlink()


@pytest.fixture(autouse=True)
def clean_product():
    """Neither record, log nor settings before and after each test."""

    def clean():
        subprocess.run(["ipcrm", "-M", RECORD_KEY], stderr=subprocess.DEVNULL, check=False)
        empty(LOG_DIRECTORY)
        empty(SETTINGS_DIRECTORY)

    clean()
    yield
    clean()


@pytest.fixture
def outside_the_checkout(tmp_path):
    """outside_the_checkout(name): a copy of a file of packaging/ with the mode of an installed one,
    whatever the umask of the checkout was."""

    def copy(name):
        target = tmp_path / name
        shutil.copyfile(PACKAGING / name, target)
        target.chmod(0o644)
        return target

    return copy


class Writers:
    """Processes that write numbered lines through the library until they are stopped."""

    def __init__(self, count, length):
        program = pathlib.Path(__file__).with_name("writer.py")
        library = TOOLS.parent / "tarnwick/libtarnwick.so"
        self.processes = [
            subprocess.Popen(
                [sys.executable, program, library, f"writer{number}", str(length)],
                stdin=subprocess.PIPE,
                stdout=subprocess.PIPE,
                text=True,
            )
            for number in range(count)
        ]

    def stop(self):
        """How many lines each writer has written to each of the logs, by its name."""
        written = {}
        for number, process in enumerate(self.processes):
            output, _ = process.communicate(timeout=HANG)  # closes its input, which ends it
            assert process.returncode == 0
            written[f"writer{number}"] = int(output)
        return written

    def kill(self):
        for process in self.processes:
            if process.poll() is None:
                process.kill()
                process.communicate(timeout=HANG)


@pytest.fixture
def start_writers():
    """start_writers(count, length): running Writers, ended with the test."""
    started = []

    def start(count=4, length=20):
        started.append(Writers(count, length))
        return started[-1]

    yield start
    for writers in started:
        writers.kill()
