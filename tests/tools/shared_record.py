"""The shared record of levels, as another process of the machine sees it."""

import contextlib
import ctypes
import os
import struct

KEY = 0x18180004
SIZE = 300
IPC_CREAT, IPC_RMID = 0o1000, 0

_libc = ctypes.CDLL(None, use_errno=True)
_libc.shmat.restype = ctypes.c_void_p
_libc.shmat.argtypes = [ctypes.c_int, ctypes.c_void_p, ctypes.c_int]
_libc.shmdt.argtypes = [ctypes.c_void_p]
_libc.shmget.argtypes = [ctypes.c_int, ctypes.c_size_t, ctypes.c_int]


def _checked(result):
    if result in (-1, ctypes.c_void_p(-1).value):
        error = ctypes.get_errno()
        raise OSError(error, os.strerror(error))
    return result


def make(size=SIZE, mode=0o660):
    return _checked(_libc.shmget(KEY, size, IPC_CREAT | mode))


def exists():
    return _libc.shmget(KEY, 0, 0) != -1


@contextlib.contextmanager
def attached():
    """The record as a bytes-like object that reads and writes it."""
    address = _checked(_libc.shmat(_checked(_libc.shmget(KEY, 0, 0)), None, 0))
    try:
        yield (ctypes.c_ubyte * SIZE).from_address(address)
    finally:
        _libc.shmdt(address)


def level(categ):
    with attached() as record:
        return struct.unpack_from("=i", record, 4 + 4 * categ)[0]


def set_level(categ, value):
    with attached() as record:
        struct.pack_into("=i", record, 4 + 4 * categ, value)


def levels():
    with attached() as record:
        return list(struct.unpack_from("=74i", record, 4))


def milliseconds():
    with attached() as record:
        return record[0]
