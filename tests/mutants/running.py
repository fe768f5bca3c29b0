"""Runs programs that may do anything: in the sandbox, among processes of their own, with a limit of
time, memory and output."""

import contextlib
import dataclasses
import os
import selectors
import signal
import subprocess
import time

MEMORY = 8 << 30  # bytes of addresses; a server of the tests reserves gigabytes that it never uses
OUTPUT = 1 << 16  # bytes at the end that are kept

# The first process of the namespace ends all others with it, and ignores signals that have no
# handler, so it is not the program under test. /tmp may hold the checkout.
WRAPPER = """
case $PWD/ in
  /tmp/*) ;;
  *) mount -t tmpfs -o size=1g tmpfs /tmp ;;
esac
"$@"
exit $?
"""


@dataclasses.dataclass
class Outcome:
    status: int  # 0 when all went well
    ended: bool  # before the limit
    output: str
    seconds: float

    def in_time(self):
        return self.ended and self.status != 128 + signal.SIGXCPU  # as a shell tells it

    def well(self):
        return self.status == 0 and self.ended


def sandboxed(root, words, processor=None):
    """The words that run `words` in the sandbox of the checkout `root`, each process for at most so
    many seconds of the processor."""
    user = [] if os.geteuid() == 0 else ["--user", "--map-root-user"]
    namespaces = [*user, "--mount", "--pid", "--fork", "--kill-child=KILL", "--mount-proc"]
    signals = "--default-signal=HUP,INT,QUIT,TERM"
    limits = [f"--as={MEMORY}"]
    if processor:
        limits.append(f"--cpu={round(processor)}:{round(processor) + 5}")  # first SIGXCPU
    command = ["env", signals, "prlimit", *limits, os.path.join(root, "scripts/sandbox"), *words]
    shell = ["sh", "-c", WRAPPER, "sh", *command]
    return ["setpriv", "--pdeathsig=KILL", "unshare", *namespaces, "--", *shell]


def run(words, seconds, folder, environment=None):
    """Runs `words` in `folder` for at most `seconds`."""
    start = time.monotonic()
    unset = {"http_proxy", "https_proxy", "all_proxy", "HTTPS_PROXY", "ALL_PROXY"}
    kept = {name: value for name, value in os.environ.items() if name not in unset}
    kept.update({"GTEST_COLOR": "no", **(environment or {})})
    with subprocess.Popen(
        words,
        cwd=folder,
        env=kept,
        stdin=subprocess.DEVNULL,
        stdout=subprocess.PIPE,
        stderr=subprocess.STDOUT,
    ) as process:
        output, ended = _read(process.stdout, start + seconds)
        with contextlib.suppress(subprocess.TimeoutExpired):
            process.wait(max(start + seconds - time.monotonic(), 1))
        ended = ended and process.poll() is not None
        process.kill()
        status = process.wait()
    return Outcome(status, ended, output.decode(errors="replace"), time.monotonic() - start)


def _read(stream, deadline):
    """The last bytes up to the end of the stream, and whether it ended before the deadline."""
    kept = b""
    with selectors.DefaultSelector() as selector:
        selector.register(stream, selectors.EVENT_READ)
        while (left := deadline - time.monotonic()) > 0:
            if not selector.select(left):
                continue
            piece = os.read(stream.fileno(), OUTPUT)
            if not piece:
                return kept, True
            kept = (kept + piece)[-OUTPUT:]
    return kept, False
