"""The public headers as documentation: what they declare for everybody, with its comments."""

import os
import re
from dataclasses import dataclass

ROOT = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))

# The words that open a part of a contract.
PARTS = (
    "Arguments",
    "Results",
    "State",
    "Errors",
    "Blocks",
    "Threads",
    "REQUIRES",
    "Failures",
    "Logs",
    "The line",
    "Fork",
    "End of the process",
    "Cancellation",
)
PART = re.compile(r"(?:^|(?<=[.;)] ))(%s): " % "|".join(PARTS))
TEMPLATE = re.compile(r"^template <\w+ \w+>\s*")
SCOPE = re.compile(r'^(class|struct|namespace|extern "C")[^;]*\{$')
SCOPE_END = re.compile(r"^\};?( +//.*)?$")
HIDDEN = re.compile(r"= delete;|^static_assert|^typedef|TARNWICK_LOCAL|^friend|^(class|struct) \w+;")


def read(path):
    with open(os.path.join(ROOT, path), encoding="utf-8") as file:
        return file.read()


def public_headers():
    """The headers that are installed, but for export.h, which declares nothing to call."""
    lists = read("tarnwick/CMakeLists.txt")
    names = re.search(r"set\(TARNWICK_PUBLIC_HEADERS(.*?)\)", lists, re.S).group(1).split()
    return [f"tarnwick/{name}" for name in names if name != "platform/export.h"]


def plain(line):
    """A line of a comment without its slashes."""
    return line.removeprefix("//").removeprefix(" ")


def about_and_rest(lines):
    """The comment at the head of a header, and the lines that follow it."""
    count = next(i for i, line in enumerate(lines) if not line.startswith("//"))
    return [plain(line) for line in lines[:count]], lines[count:]


def paragraphs(comment):
    """(kind, lines) of each paragraph: the word that opens a part, "code" of an example, or ""."""
    kind, lines = "", []
    for line in comment:
        if line.startswith("  ") and not lines and kind in ("", "code"):
            kind = "code"  # indented after an empty line
        if kind == "code" and (not line or line.startswith("  ")):
            lines.append(line[2:])
            continue
        opens = line.startswith(("Blocks ", "Throws "))
        if not line or opens or kind == "code" or (kind and not line.startswith("  ")):
            yield kind, lines
            kind, lines = "", []
        before, *parts = PART.split(line.strip())
        lines.append(before)
        for part, text in zip(parts[::2], parts[1::2]):
            yield kind, lines
            kind, lines = part, [text]
        lines = [line for line in lines if line]
    yield kind, lines


@dataclass
class Group:
    """Declarations under one comment."""

    scope: str  # the class, or nothing
    comment: list
    declarations: list

    def is_called(self, wanted):
        prefix = f"{self.scope}::" if self.scope else ""
        names = [name_of(declaration) for declaration in self.declarations]
        return any(wanted in (prefix + name, prefix + "*") for name in names)


def name_of(declaration):
    """What a declaration introduces; an enumeration without a name is called as its first value."""
    patterns = (
        r"enum (?:(\w+)|\{ *(\w+))",
        r"#define (\w+)",
        r"class .*?(\w+)(?: : [^{]*)? *\{$",
        r".*?(~?\w+)\(",
        r".*?(\w+)(?: = .*)?;",
    )
    matches = (re.match(pattern, declaration.replace("\n", " ")) for pattern in patterns)
    return next(match.expand(r"\1") or match.group(2) for match in matches if match)


class Header:
    """The comment at the head of a header, and what it declares for everybody, in groups."""

    def __init__(self, path):
        self.about, lines = about_and_rest(read(path).splitlines())
        self.groups, self.scopes, self.public = [], [], True
        self.comment, self.declarations = [], []
        statement = ""
        for line in lines:
            bare = line.strip()
            if not statement and (not bare or bare.startswith("//")):
                self.take_comment(bare)
                continue
            statement = f"{statement}\n{bare}".lstrip("\n")
            if is_whole(statement):
                self.take_statement(TEMPLATE.sub("", statement))
                statement = ""
        self.flush()

    def flush(self):
        if self.declarations:
            scope = self.scopes[-1] if self.scopes else ""
            self.groups.append(Group(scope, self.comment, self.declarations))
        self.comment, self.declarations = [], []

    def take_comment(self, bare):
        if not bare or self.declarations:
            self.flush()
        if bare:
            self.comment.append(plain(bare))

    def take_statement(self, text):
        if text in ("public:", "protected:", "private:"):
            self.flush()
            self.public = text == "public:"
        elif SCOPE.match(text):
            self.enter(text)
        elif SCOPE_END.match(text):
            self.flush()
            self.scopes.pop()
            self.public = True
        elif text.startswith("#"):
            if text.startswith("#define") and self.comment:
                self.declarations.append(text)
        elif self.public and not HIDDEN.search(text) and not text.startswith("template <>"):
            self.declarations.append(text)
        else:
            self.flush()

    def enter(self, text):
        is_class = text.startswith("class")
        if is_class:
            self.declarations.append(text)
        self.flush()
        self.scopes.append(name_of(text) if is_class else "")
        self.public = not text.startswith("namespace")


def is_whole(statement):
    """Whether a declaration, a line for the preprocessor or the head of a scope ends here."""
    if statement.startswith("#"):
        return not statement.endswith("\\")
    code = re.sub(r'"[^"]*"|//.*', "", statement).rstrip()
    depth = sum(code.count(c) for c in "({") - sum(code.count(c) for c in ")}")
    return bool(SCOPE.match(TEMPLATE.sub("", statement))) or (
        code.endswith((";", "}", ":")) and depth <= 0
    )
