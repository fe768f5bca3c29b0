"""Reads the project's C++ through libclang."""

import json
import os
import shlex
import sys

try:
    from clang import cindex
except ImportError:
    sys.exit("install python3-clang-14")

ROOT = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))


def compile_arguments(source):
    """The options that build/lint compiles `source` with, without compiler and file names."""
    for entry in _commands():
        if os.path.realpath(entry["file"]) == os.path.realpath(source):
            words = shlex.split(entry["command"])[1:]
            return words[: words.index("-o")] + _clang_headers()
    sys.exit(f"{source} is not compiled: is it missing from a CMakeLists.txt?")


def parse(source, arguments):
    """Parses `source` and fails on what the compiler would fail on."""
    unit = cindex.Index.create().parse(source, args=arguments)
    errors = [d for d in unit.diagnostics if d.severity >= cindex.Diagnostic.Error]
    for error in errors:
        print(error, file=sys.stderr)
    if errors:
        sys.exit(f"cannot parse {source}")
    return unit


def walk(cursor, wanted):
    """All cursors below `cursor` that stand in a file for which `wanted(path)` is true."""
    for child in cursor.get_children():
        path = child.location.file.name if child.location.file else ""
        if wanted(os.path.realpath(path)):
            yield child
            yield from walk(child, wanted)


def _commands():
    with open(os.path.join(ROOT, "build/lint/compile_commands.json"), encoding="utf-8") as file:
        return json.load(file)


def _clang_headers():
    """stddef.h and the like: the library cannot find them from where Python loads it."""
    return ["-isystem", "/usr/lib/llvm-14/lib/clang/14.0.6/include"]
