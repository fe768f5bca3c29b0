"""What the tools' tests share. They run inside scripts/sandbox, where the record of levels, the log
directory and the settings file belong to the run:

    scripts/sandbox python3 -m pytest tests/tools -q

With pytest-xdist, each worker has a sandbox and process numbers of its own (run_tools in ./dev).

TARNWICK_TOOLS_DIR is the build's directory of tools, build/debug/tools when it is unset.
TARNWICK_TEST_EMULATOR is a command that runs a tool of another architecture ("qemu-arm -L root").
"""

import os
import pathlib
import shlex
import shutil
import signal
import subprocess
import time

import pexpect
import pytest
import shared_record

ROOT = pathlib.Path(__file__).resolve().parents[2]
TOOLS = ("twlogctl", "twhttp", "twcamsim")
LOG_DIRECTORY = pathlib.Path("/var/log/tarnwick")
SETTINGS_DIRECTORY = pathlib.Path("/var/packages/Tarnwick/etc")
RECORD_KEY = "0x18180004"

# A guard against a hang; no test waits for it to pass.
HANG = 120


def end_by_signals_again():
    """What started the run may have it ignore these, as a shell does in the background; the tools
    under test would inherit that and outlive Ctrl-C."""
    for number in (signal.SIGHUP, signal.SIGINT, signal.SIGQUIT, signal.SIGTERM):
        if signal.getsignal(number) == signal.SIG_IGN:
            signal.signal(number, signal.SIG_DFL)


def pytest_sessionstart(session):
    end_by_signals_again()
    if session.config.getoption("dist", "no") != "no":  # this process hands the tests to workers
        if os.environ.get("TARNWICK_SANDBOX"):
            pytest.exit("workers need a sandbox each: see run_tools in ./dev", returncode=3)
        return
    if not os.environ.get("TARNWICK_SANDBOX"):
        pytest.exit("these tests write system paths: run them in scripts/sandbox", returncode=3)
    provide_terminals()


def provide_terminals():
    """The sandbox's /dev/ptmx is mounted by itself, and the kernel finds no /dev/pts beside it."""
    try:
        for end in os.openpty():
            os.close(end)
    except OSError:
        new = ["mount", "-t", "devpts", "-o", "newinstance,ptmxmode=0666", "devpts", "/dev/pts"]
        subprocess.run(new, check=True)
        subprocess.run(["mount", "--bind", "/dev/pts/ptmx", "/dev/ptmx"], check=True)


def plain_environment():
    """The environment of every tool under test: what the person at the keyboard has set is gone."""
    unset = {"NO_COLOR", "COLUMNS", "LINES", "http_proxy", "https_proxy", "all_proxy"}
    kept = {name: value for name, value in os.environ.items() if name not in unset}
    return {**kept, "LC_ALL": "C.UTF-8", "TERM": "xterm-256color"}


@pytest.fixture(scope="session")
def tools():
    """The path of each built tool."""
    named = os.environ.get("TARNWICK_TOOLS_DIR", ROOT / "build/debug/tools")
    directory = pathlib.Path(named).resolve()
    return {name: str(directory / name / name) for name in TOOLS}


@pytest.fixture(scope="session")
def command(tools):
    """command(tool, *args): the words that run a tool, those of the emulator first."""
    emulator = shlex.split(os.environ.get("TARNWICK_TEST_EMULATOR", ""))
    return lambda tool, *args: [*emulator, tools[tool], *map(str, args)]


@pytest.fixture(scope="session")
def run(command):
    """run(tool, *args): its CompletedProcess, with texts."""

    def run_tool(tool, *args, input=None, env=None, timeout=HANG, **options):
        return subprocess.run(
            command(tool, *args),
            input=input,
            stdin=subprocess.DEVNULL if input is None else None,
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            encoding="utf-8",
            errors="surrogateescape",
            env={**plain_environment(), **(env or {})},
            timeout=timeout,
            check=False,
            **options,
        )

    return run_tool


@pytest.fixture
def ctl(run):
    """ctl(*args): twlogctl's CompletedProcess."""
    return lambda *args, **options: run("twlogctl", *args, **options)


@pytest.fixture
def record(ctl):
    """A new record, every category at notice."""
    assert ctl("create").returncode == 0
    return shared_record


@pytest.fixture
def start(command):
    """start(tool, *args): a Popen with pipes, ended with the test."""
    children = []

    def start_tool(tool, *args, env=None, **options):
        pipes = {"stdin": subprocess.DEVNULL, "stdout": subprocess.PIPE, "stderr": subprocess.PIPE}
        child = subprocess.Popen(
            command(tool, *args),
            encoding="utf-8",
            errors="surrogateescape",
            env={**plain_environment(), **(env or {})},
            **{**pipes, **options},
        )
        children.append(child)
        return child

    yield start_tool
    for child in children:
        if child.poll() is None:
            child.kill()
        child.wait(timeout=HANG)
        for stream in (child.stdin, child.stdout, child.stderr):
            if stream:
                stream.close()


@pytest.fixture
def spawn(command):
    """spawn(tool, *args): a pexpect child in a pseudo-terminal, ended with the test."""
    children = []

    def spawn_tool(tool, *args, env=None, timeout=HANG, dimensions=(24, 80), **options):
        words = command(tool, *args)
        child = pexpect.spawn(
            words[0],
            words[1:],
            timeout=timeout,
            encoding="utf-8",
            codec_errors="replace",
            dimensions=dimensions,
            env={**plain_environment(), **(env or {})},
            **options,
        )
        children.append(child)
        return child

    yield spawn_tool
    for child in children:
        child.close(force=True)


def remove_record():
    subprocess.run(["ipcrm", "-M", RECORD_KEY], stderr=subprocess.DEVNULL, check=False)


def empty(directory):
    directory.chmod(0o755)
    for entry in directory.iterdir():
        if entry.is_dir() and not entry.is_symlink():
            shutil.rmtree(entry)
        else:
            entry.unlink()


@pytest.fixture(autouse=True)
def clean_product():
    """Neither record, log nor settings before and after each test."""

    def clean():
        remove_record()
        empty(LOG_DIRECTORY)
        empty(SETTINGS_DIRECTORY)

    clean()
    yield
    clean()


def wait_until(condition, what):
    """Waits until `condition` returns something true, which it returns."""
    deadline = time.monotonic() + HANG
    while time.monotonic() < deadline:
        found = condition()
        if found:
            return found
        time.sleep(0.02)
    raise AssertionError(f"waited in vain: {what}")
