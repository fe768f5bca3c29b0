"""The figures that repeat: instructions and system calls, as bench/count has recorded them."""

import glob
import os

from tables import table

BENCH = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))


def read(path):
    """{operation: its figures}"""
    with open(path, encoding="utf-8") as file:
        rows = (line.split() for line in file if not line.startswith("#"))
        return {row[0]: row[1:] for row in rows if row}


def counts():
    recorded = {
        path.rsplit(".", 1)[1]: read(path) for path in sorted(glob.glob(f"{BENCH}/expected.*"))
    }
    if not recorded:
        return ""
    operations = list(dict.fromkeys(name for figures in recorded.values() for name in figures))
    heading = ["operation"]
    for architecture in recorded:
        heading += [f"instructions, {architecture}", f"system calls, {architecture}"]
    rows = []
    for operation in operations:
        row = [operation]
        for figures in recorded.values():
            row += (figures.get(operation, []) + ["–", "–"])[:2]
        rows.append(row)
    return (
        "\n## Instructions and system calls of one operation\n\n"
        "They repeat exactly; `bench/count` holds the library against them.\n\n"
    ) + table(heading, rows)
