"""What the tests of the log's readers share: lines of known content, readers of a running tool, and
a screen for the full-screen tool."""

import subprocess
import threading
import time

import pexpect
import pyte

from conftest import HANG, LOG_DIRECTORY, plain_environment, wait_until

LOG = LOG_DIRECTORY / "tarnwick.log"


def line(text, stamp="Mar  5 14:03:09", pid="812", tags="[camera][warn]"):
    """A log line as the library writes it."""
    return f"{stamp} [{pid}]{tags} camerad:57:Probe(): {text}\n"


class Output:
    """The lines of a tool's standard output, read as they come."""

    def __init__(self, child):
        self.lines = []
        self._child = child
        self._thread = threading.Thread(target=self._read, daemon=True)
        self._thread.start()

    def _read(self):
        for text in self._child.stdout:
            self.lines.append(text.rstrip("\n"))

    def wait_for(self, text):
        wait_until(lambda: any(text in known for known in self.lines), f"{text!r} in the output")

    def end(self):
        self._child.terminate()
        self._child.wait(timeout=HANG)
        self._thread.join(timeout=HANG)


class Screen:
    """The screen that a spawned tool has drawn."""

    def __init__(self, child, rows=24, columns=80):
        self.child = child
        self._screen = pyte.Screen(columns, rows)
        self._stream = pyte.Stream(self._screen)

    def rows(self):
        return list(self._screen.display)

    def text(self):
        return "\n".join(self.rows())

    def feed(self):
        try:
            self._stream.feed(self.child.read_nonblocking(65536, timeout=0.1))
        except (pexpect.TIMEOUT, pexpect.EOF):
            pass

    def wait_for(self, condition):
        """Waits for a text, or until a function of the rows returns something true."""
        if isinstance(condition, str):
            wanted = condition
            condition = lambda rows: any(wanted in row for row in rows)
        deadline = time.monotonic() + HANG
        while not condition(self.rows()):
            assert time.monotonic() < deadline, f"waited in vain; the screen:\n{self.text()}"
            self.feed()

    def resize(self, rows, columns):
        self._screen.resize(rows, columns)
        self._screen.reset()
        self.child.setwinsize(rows, columns)


def processor_seconds(pid):
    """What a process has used of the processor so far."""
    with open(f"/proc/{pid}/schedstat", encoding="ascii") as statistics:
        return int(statistics.read().split()[0]) / 1e9


def without_privileges(words):
    """The words of a command that has none of root's privileges over files and segments."""
    return ["setpriv", "--bounding-set=-all", "--inh-caps=-all", "--", *words]


def run_plain(words):
    return subprocess.run(
        words, capture_output=True, text=True, env=plain_environment(), timeout=HANG, check=False
    )
