"""The changes that one node of a syntax tree allows: (start, end, new text), in bytes of a file."""

import ctypes

import changes
from clang import cindex
from clang.cindex import CursorKind, TypeKind

OPERATORS = {CursorKind.BINARY_OPERATOR, CursorKind.COMPOUND_ASSIGNMENT_OPERATOR}
LABELS = {CursorKind.CASE_STMT, CursorKind.DEFAULT_STMT}
JUMPS = {CursorKind.RETURN_STMT, CursorKind.BREAK_STMT, CursorKind.CONTINUE_STMT}
ARRAYS = {TypeKind.CONSTANTARRAY, TypeKind.INCOMPLETEARRAY}
LITERALS = {
    CursorKind.INTEGER_LITERAL: changes.of_integer,
    CursorKind.CHARACTER_LITERAL: changes.of_character,
    CursorKind.STRING_LITERAL: changes.of_string,
    CursorKind.CXX_BOOL_LITERAL_EXPR: lambda text: changes.BOOLEAN.get(text, []),
}
SYMMETRIC = ("min", "max", "swap")


class Node:
    """A cursor and where it is written. What comes from a macro's own text lies where the macro is
    used, with its arguments, so the rules look at the text before they take a node for its kind."""

    def __init__(self, cursor, parent=None):
        self.cursor = cursor
        self.kind = cursor.kind
        self.parent = parent
        self.start = _offset(cursor.extent.start)
        self.end = _offset(cursor.extent.end)

    def children(self):
        return [Node(child, self.cursor) for child in self.cursor.get_children()]

    def arguments(self):
        return [Node(argument, self.cursor) for argument in self.cursor.get_arguments()]

    def text(self, data):
        return data[self.start : self.end].decode()


def changes_of(node, data):
    """All changes of this node; those of its children are theirs."""
    if node.start >= node.end:
        return
    for rule in (_operator, _unary, _condition, _literal, _statement, _swapped):
        yield from rule(node, data)


def _operator(node, data):
    sides = node.children() if node.kind in OPERATORS else _sides_of_overloaded(node)
    if len(sides) != 2 or not node.start <= sides[0].end < sides[1].start < node.end:
        return
    between = data[sides[0].end : sides[1].start].decode()
    start = sides[0].end + len(between) - len(between.lstrip())
    known = changes.BINARY.get(between.strip(), [])
    if node.kind not in OPERATORS and between.strip() not in changes.COMPARISONS:
        known = []
    for new in known:
        yield start, start + len(between.strip()), new


def _sides_of_overloaded(node):
    is_operator = node.kind == CursorKind.CALL_EXPR and node.cursor.spelling.startswith("operator")
    return node.arguments() if is_operator else []


def _unary(node, data):
    children = node.children() if node.kind == CursorKind.UNARY_OPERATOR else []
    if len(children) != 1:
        return
    operand = children[0]
    for start, end in ((node.start, operand.start), (operand.end, node.end)):
        sign = data[start:end].decode()
        for new in changes.UNARY.get(sign.strip(), []):
            yield start, end, sign.replace(sign.strip(), new)


def _condition(node, data):
    condition = _condition_of(node, data)
    if condition is None or not node.start <= condition.start < condition.end <= node.end:
        return
    for new in changes.of_condition(condition.text(data), _has_opposite(condition, data)):
        yield condition.start, condition.end, new


def _condition_of(node, data):
    children = node.children()
    if node.kind == CursorKind.CONDITIONAL_OPERATOR:
        return children[0] if children[0].start == node.start < children[0].end else None
    keyword = {
        CursorKind.IF_STMT: b"if",
        CursorKind.WHILE_STMT: b"while",
        CursorKind.DO_STMT: b"do",
        CursorKind.FOR_STMT: b"for",
    }.get(node.kind)
    if keyword is None or not data.startswith(keyword, node.start):
        return None
    if node.kind == CursorKind.DO_STMT:
        return children[-1]
    if node.kind == CursorKind.FOR_STMT:
        return children[1] if len(children) == 4 else _condition_without_start(node, data, children)
    expressions = [child for child in children if child.kind.is_expression()]
    declares = any(child.kind.is_declaration() for child in children)
    return expressions[0] if expressions and not declares else None


def _condition_without_start(node, data, children):
    """Of "for (; condition; step)"."""
    nothing_first = data[node.start : children[0].start].decode().endswith("(; ")
    return children[0] if nothing_first and len(children) > 1 else None


def _has_opposite(condition, data):
    """Whether a changed operator makes the opposite."""
    while condition.kind == CursorKind.UNEXPOSED_EXPR and len(condition.children()) == 1:
        condition = condition.children()[0]
    if condition.text(data).startswith("!") and condition.kind == CursorKind.UNARY_OPERATOR:
        return True
    changed = [data[start:end].decode() for start, end, _ in _operator(condition, data)]
    return any(operator in changes.COMPARISONS for operator in changed)


def _literal(node, data):
    change = LITERALS.get(node.kind)
    if change is None:
        return
    if node.parent.kind.is_declaration() and node.parent.type.kind in ARRAYS:
        change = changes.of_array_size if node.kind == CursorKind.INTEGER_LITERAL else change
    for new in change(node.text(data)):
        yield node.start, node.end, new


def _statement(node, data):
    if node.parent is None or not _is_statement(node, data):
        return
    yield node.start, node.end, changes.removed(node.text(data))


def _is_statement(node, data):
    if not data[node.end :].lstrip().startswith(b";") or not _stands_alone(node):
        return False
    if node.kind in JUMPS:
        return not node.children() and data[node.start : node.end] in (
            b"return",
            b"break",
            b"continue",
        )
    if node.kind == CursorKind.CSTYLE_CAST_EXPR:
        return any(child.kind == CursorKind.CALL_EXPR for child in node.children())
    is_macro = node.kind == CursorKind.DO_STMT and not data.startswith(b"do", node.start)
    return is_macro or node.kind.is_expression()


def _stands_alone(node):
    """Whether the node is a statement and not a part of one."""
    parent = node.parent
    if parent.kind == CursorKind.COMPOUND_STMT:
        return True
    siblings = [child.cursor for child in Node(parent).children()]
    if parent.kind in LABELS or parent.kind in (CursorKind.WHILE_STMT, CursorKind.FOR_STMT):
        return siblings[-1] == node.cursor
    if parent.kind == CursorKind.DO_STMT:
        return siblings[0] == node.cursor
    return parent.kind == CursorKind.IF_STMT and siblings[0] != node.cursor


def _swapped(node, data):
    if node.kind != CursorKind.CALL_EXPR or node.cursor.spelling in SYMMETRIC:
        return
    if _sides_of_overloaded(node):
        return
    arguments = node.arguments()
    for left, right in zip(arguments, arguments[1:]):
        if not node.start <= left.start < left.end < right.start < right.end <= node.end:
            continue
        texts = left.text(data), right.text(data)
        if _types(left) & _types(right) and texts[0] != texts[1]:
            between = data[left.end : right.start].decode()
            yield left.start, right.end, texts[1] + between + texts[0]


def _types(node):
    """The type of an argument, and the one that it has before it is converted."""
    types = {node.cursor.type.get_canonical().spelling}
    children = node.children() if node.kind == CursorKind.UNEXPOSED_EXPR else []
    return types | (_types(children[0]) if len(children) == 1 else set())


def _offset(location):
    """Where a location is written: in a macro's argument, or where the macro is used."""
    file, offset = cindex.c_object_p(), ctypes.c_uint()
    nothing = ctypes.byref(ctypes.c_uint())
    cindex.conf.lib.clang_getFileLocation(
        location, ctypes.byref(file), nothing, nothing, ctypes.byref(offset)
    )
    return offset.value
