"""The figures that repeat: instructions and system calls, as bench/count has recorded them."""

import glob
import os

from tables import table

BENCH = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))


def read(path):
    """{(work, contender): their figures}"""
    with open(path, encoding="utf-8") as file:
        rows = (line.split() for line in file if not line.startswith("#"))
        return {(row[0], row[1]): row[2:] for row in rows if row}


def counts():
    recorded = {
        path.rsplit(".", 1)[1]: read(path) for path in sorted(glob.glob(f"{BENCH}/expected.*"))
    }
    if not recorded:
        return ""
    operations = list(dict.fromkeys(name for figures in recorded.values() for name in figures))
    heading = ["work", "contender"]
    for architecture in recorded:
        heading += [f"instructions, {architecture}", f"system calls, {architecture}"]
    rows = []
    for operation in operations:
        row = [*operation]
        for figures in recorded.values():
            row += [f"{float(figure):,.0f}" for figure in figures.get(operation, [])] or ["–", "–"]
        rows.append(row)
    return (
        "\n## Instructions and system calls of one operation\n\n"
        "Of the library and its floors; "
        "`./dev cost` fails when one of them changes by more than 2 %. callgrind and strace count "
        "for amd64. For armhf, where callgrind is not there, QEMU's user emulator counts both by a "
        "plugin of our own (`bench/emulator`): an instruction counts when it is reached, also when "
        "its condition keeps it from doing anything. The two are built with the same options.\n\n"
    ) + table(heading, rows)
