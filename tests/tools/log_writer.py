"""A process that logs through the library, as a daemon does:

    python3 log_writer.py LIBRARY NUMBER

It writes "writer NUMBER line 0", "... line 1" and so on until its standard input ends, and then
prints how many lines it has written. Where this interpreter cannot load the library, because it is
of another architecture or has a sanitizer, it writes in the library's way itself.
"""

import ctypes
import fcntl
import os
import select
import subprocess
import sys
import time

LOG = "/var/log/tarnwick/tarnwick.log"
LOG_TYPE_MAIN = 0


def can_load(library):
    """Tried in another process: a sanitizer that cannot work ends the one that loads it."""
    words = [sys.executable, "-c", "import ctypes, sys; ctypes.CDLL(sys.argv[1])", library]
    return subprocess.run(words, stderr=subprocess.DEVNULL, check=False).returncode == 0


def library_writer(library):
    write = ctypes.CDLL(library)["_Z8TWPrintf8LOG_TYPEPKcS1_S1_iS1_S1_z"]
    write.restype = None
    write.argtypes = [ctypes.c_int] + 3 * [ctypes.c_char_p] + [ctypes.c_int] + 3 * [ctypes.c_char_p]
    return lambda text: write(
        LOG_TYPE_MAIN, b"http", b"notice", b"writer", 1, b"main", b"%s\n", text.encode()
    )


def own_writer(text):
    stamp = time.strftime("%b %e %T")
    log = os.open(LOG, os.O_WRONLY | os.O_CREAT | os.O_APPEND, 0o666)
    fcntl.flock(log, fcntl.LOCK_EX)
    os.write(log, f"{stamp} [{os.getpid()}][http][notice] writer:1:main(): {text}\n".encode())
    os.close(log)


def main():
    library, number = sys.argv[1:]
    write = library_writer(library) if can_load(library) else own_writer
    count = 0
    while not select.select([sys.stdin], [], [], 0.001)[0]:
        write(f"writer {number} line {count}")
        count += 1
    print(count)


main()
