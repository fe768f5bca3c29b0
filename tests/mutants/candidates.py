"""The mutants that the library's sources allow, found in their syntax trees."""

import dataclasses
import multiprocessing
import os
import re

import changes
import clang_index
import syntax
from clang.cindex import CursorKind

FUNCTIONS = {
    CursorKind.FUNCTION_DECL,
    CursorKind.CXX_METHOD,
    CursorKind.CONSTRUCTOR,
    CursorKind.DESTRUCTOR,
    CursorKind.CONVERSION_FUNCTION,
    CursorKind.FUNCTION_TEMPLATE,
}
VARIABLES = {CursorKind.VAR_DECL, CursorKind.FIELD_DECL}
CLASSES = {CursorKind.CLASS_DECL, CursorKind.STRUCT_DECL, CursorKind.CLASS_TEMPLATE}
SCOPES = CLASSES | {CursorKind.NAMESPACE, CursorKind.LINKAGE_SPEC, CursorKind.UNEXPOSED_DECL}
NOT_IN_BODIES = {CursorKind.PARM_DECL, CursorKind.STATIC_ASSERT, CursorKind.ENUM_DECL}


@dataclasses.dataclass(frozen=True, order=True)
class Candidate:
    """One change of one source. Two of the same lines in one function differ in `nth`."""

    path: str  # from the project's root
    start: int  # in bytes
    end: int
    text: str  # what stands there afterwards
    function: str
    line: int
    lines: tuple  # the first and the last line of the function
    before: str  # the changed lines, as one
    after: str
    nth: int = 0

    def name(self):
        """What stays when lines move."""
        return (self.path, self.function, self.before, self.after, self.nth)

    def applied_to(self, data):
        return data[: self.start] + self.text.encode() + data[self.end :]

    def diff(self):
        return f"--- {self.path}:{self.line}  {self.function}\n- {self.before}\n+ {self.after}"


def of_library(root):
    """All candidates of tarnwick/ below `root`, in a fixed order."""
    sources = [
        os.path.join(folder, name)
        for folder, _, names in os.walk(os.path.join(root, "tarnwick"))
        for name in names
        if name.endswith(".cpp")
    ]
    found = set()
    with multiprocessing.Pool() as pool:
        jobs = [(source, root) for source in sorted(sources)]
        for candidates in pool.starmap(_of_library_source, jobs):
            found.update(candidates)  # headers are read with each source that includes them
    return numbered(found)


def _of_library_source(source, root):
    try:
        arguments = clang_index.compile_arguments(source)
        return of_source(source, arguments, root, os.path.join(root, "tarnwick"))
    except SystemExit as error:  # a pool waits for ever for a process that ends
        raise RuntimeError(error) from error


def of_source(source, arguments, root, folder):
    """The candidates of a source and of the headers in `folder` that it includes."""
    unit = clang_index.parse(source, arguments)
    return list(_Search(root, folder).of_declarations(unit.cursor))


def numbered(candidates):
    """Sorted, and the ones with equal lines in one function told apart."""
    seen, result = {}, []
    for candidate in sorted(candidates):
        nth = seen.get(candidate.name(), 0)
        seen[candidate.name()] = nth + 1
        result.append(dataclasses.replace(candidate, nth=nth))
    return result


class _Search:
    def __init__(self, root, folder):
        self._root = root
        self._folder = os.path.join(os.path.realpath(folder), "")
        self._files = {}

    def of_declarations(self, parent):
        for cursor in parent.get_children():
            path = cursor.location.file.name if cursor.location.file else ""
            if not os.path.realpath(path).startswith(self._folder):
                continue
            if cursor.kind in FUNCTIONS:
                if cursor.is_definition():
                    yield from self._of_definition(cursor, cursor, path)
            elif cursor.kind in VARIABLES:
                if path.endswith(".cpp"):
                    yield from self._of_definition(cursor, cursor, path)
            elif cursor.kind in SCOPES:
                yield from self.of_declarations(cursor)

    def _of_definition(self, cursor, definition, path):
        for part in cursor.get_children():
            if part.kind in NOT_IN_BODIES:
                continue
            tree = syntax.Node(part, cursor)
            for start, end, text in syntax.changes_of(tree, self._data(path)):
                yield self._candidate(definition, path, start, end, text)
            yield from self._of_definition(part, definition, path)

    def _candidate(self, definition, path, start, end, text):
        data = self._data(path)
        first = data.rfind(b"\n", 0, start) + 1
        last = data.find(b"\n", end)
        last = len(data) if last < 0 else last
        after = data[first:start] + text.encode() + data[end:last]
        return Candidate(
            path=os.path.relpath(os.path.realpath(path), self._root),
            start=start,
            end=end,
            text=text,
            function=_full_name(definition),
            line=data.count(b"\n", 0, start) + 1,
            lines=(definition.extent.start.line, definition.extent.end.line),
            before=_one_line(data[first:last]),
            after=_one_line(after),
        )

    def _data(self, path):
        if path not in self._files:
            with open(path, "rb") as file:
                self._files[path] = file.read()
        return self._files[path]


def _one_line(data):
    return re.sub(r"\s*\n\s*", " ", data.decode()).strip()


def _full_name(cursor):
    parent = cursor.semantic_parent
    if parent is not None and parent.kind in CLASSES:
        return f"{_full_name(parent)}::{cursor.spelling}"
    return cursor.spelling
