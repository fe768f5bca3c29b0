"""Writes numbered lines to both logs through the library until its standard input ends, then prints
how many it has written to each.

    writer.py LIBRARY NAME LENGTH      LENGTH: bytes beside the number
"""

import ctypes
import select
import sys


def main():
    library, name, length = sys.argv[1], sys.argv[2].encode(), int(sys.argv[3])
    # void TWPrintf(LOG_TYPE, const char* categ, const char* level, const char* file, int line,
    #               const char* func, const char* format, ...)
    printf = getattr(ctypes.CDLL(library), "_Z8TWPrintf8LOG_TYPEPKcS1_S1_iS1_S1_z")
    printf.restype = None
    padding = b"x" * length
    number = 0
    while not select.select([sys.stdin], [], [], 0)[0]:
        for log in (0, 1):
            printf(log, b"camera", b"notice", b"writer.py", 1, name, b"%d %s.\n", number, padding)
        number += 1
    print(number)


main()
