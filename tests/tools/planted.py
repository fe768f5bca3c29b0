"""What may stand at a path where a tool expects a regular file of its own."""

import contextlib
import os
import pathlib
import socket
import stat

import pytest

OTHER = 65534
MIB = 1 << 20
TEXT = "of another program\n"


def _fifo(path, target):
    os.mkfifo(path)


def _held_fifo(path, target):
    os.mkfifo(path)
    return os.open(path, os.O_RDWR | os.O_NONBLOCK | os.O_CLOEXEC)


def _device(minor):
    def make(path, target):
        try:
            os.mknod(path, 0o666 | stat.S_IFCHR, os.makedev(1, minor))
            os.close(os.open(path, os.O_RDONLY | os.O_CLOEXEC))
        except PermissionError:
            pytest.skip("no devices can be made here")

    return make


def _socket(path, target):
    listener = socket.socket(socket.AF_UNIX)
    # The length of a socket's path is limited.
    with_directory = os.open(pathlib.Path(path).parent, os.O_PATH | os.O_CLOEXEC)
    listener.bind(f"/proc/self/fd/{with_directory}/{pathlib.Path(path).name}")
    os.close(with_directory)
    return listener


def _link_of_another(path, target):
    path.symlink_to(target)
    try:
        os.chown(path, OTHER, OTHER, follow_symlinks=False)
    except OSError:
        pytest.skip("there is no other user here")


def _large(path, target):
    path.write_bytes((b"x" * 1023 + b"\n") * 3 * 1024)


def _sparse(path, target):
    path.touch()
    os.truncate(path, 1024 * MIB)


KINDS = {
    "fifo": _fifo,
    "held fifo": _held_fifo,
    "null device": _device(3),
    "endless device": _device(5),
    "link to a device": lambda path, target: path.symlink_to("/dev/zero"),
    "directory": lambda path, target: path.mkdir(),
    "socket": _socket,
    "dangling link": lambda path, target: path.symlink_to("/no/such/directory/file"),
    "link in a circle": lambda path, target: path.symlink_to(path.name),
    "link of another user": _link_of_another,
    "hard link": lambda path, target: os.link(target, path),
    "three MiB": _large,
    "sparse GiB": _sparse,
}

# What open(2), or a look at the file's type, tells of each that is no regular file.
NO_FILES = {
    "fifo": "Invalid argument",
    "held fifo": "Invalid argument",
    "null device": "Invalid argument",
    "endless device": "Invalid argument",
    "link to a device": "Invalid argument",
    "directory": "Is a directory",
    "socket": "No such device or address",
    "dangling link": "No such file or directory",
    "link in a circle": "Too many levels of symbolic links",
}


class Planted:
    """One of KINDS at `path`. Links lead to `target`, whose text has to stay, and what is written to
    a FIFO that is read is found."""

    def __init__(self, kind, path):
        path = pathlib.Path(path)
        self.target = path.parent / "target"
        self.target.write_text(TEXT)
        self._kept = KINDS[kind](path, self.target)

    def untouched(self):
        return self.target.read_text() == TEXT and self._taken() == b""

    def _taken(self):
        if not isinstance(self._kept, int):
            return b""
        try:
            return os.read(self._kept, 4096)
        except BlockingIOError:
            return b""

    def __enter__(self):
        return self

    def __exit__(self, *_):
        if isinstance(self._kept, int):
            os.close(self._kept)
        elif self._kept is not None:
            self._kept.close()


@pytest.fixture
def plant():
    """plant(kind, path): a Planted, which goes away with the test."""
    with contextlib.ExitStack() as planted:
        yield lambda kind, path: planted.enter_context(Planted(kind, path))
