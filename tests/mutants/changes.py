"""What a piece of C++ is changed to: texts in, texts out."""

import re

# Where two are given, each is a mutant of its own.
BINARY = {
    "+": ["-"],
    "-": ["+"],
    "*": ["/"],
    "/": ["*"],
    "%": ["/"],
    "==": ["!="],
    "!=": ["=="],
    "<": ["<=", ">="],
    "<=": ["<", ">"],
    ">": [">=", "<="],
    ">=": [">", "<"],
    "&&": ["||"],
    "||": ["&&"],
    "&": ["|"],
    "|": ["&"],
    "^": ["&"],
    "<<": [">>"],
    ">>": ["<<"],
    "+=": ["-="],
    "-=": ["+="],
    "*=": ["/="],
    "/=": ["*="],
    "%=": ["/="],
    "&=": ["|="],
    "|=": ["&="],
    "^=": ["&="],
    "<<=": [">>="],
    ">>=": ["<<="],
}
COMPARISONS = ("==", "!=", "<", "<=", ">", ">=")
UNARY = {"!": [""], "-": [""], "~": [""], "++": ["--"], "--": ["++"]}
BOOLEAN = {"true": ["false"], "false": ["true"]}

_INTEGER = re.compile(r"(0[xX][0-9a-fA-F]+|0[0-7]+|[0-9]+)([uUlLzZ]*)")
_STRING = re.compile(r'(?:"(?:[^"\\\n]|\\.)*"\s*)+')
_CHARACTER = re.compile(r"'([^'\\]|\\.|\\x[0-9a-fA-F]+|\\[0-7]+)'")


def of_integer(text):
    """One more, one less and 0, in the literal's own base and with its suffix."""
    match = _INTEGER.fullmatch(text)
    if not match:
        return []
    digits, suffix = match.groups()
    base = 16 if digits[:2] in ("0x", "0X") else 8 if len(digits) > 1 and digits[0] == "0" else 10
    value = int(digits, base)
    form = {16: "0x{:x}", 8: "0{:o}", 10: "{}"}[base]
    values = sorted({value + 1, value - 1, 0} - {value})
    return [(form.format(new) if new > 0 else str(new)) + suffix for new in values]


def of_array_size(text):
    """One less: a larger array is no fault."""
    return [new for new in of_integer(text) if re.match("[1-9]", new)][:1]


def of_character(text):
    """Another character."""
    if not _CHARACTER.fullmatch(text):
        return []
    return ["'y'" if text == "'x'" else "'x'"]


def of_string(text):
    """No string, and one whose first character is another. A format keeps its directives, because
    the arguments after it fit no others."""
    if not _STRING.fullmatch(text) or set(text) <= set('" \n'):
        return []
    first = re.search(r'"(\\x[0-9a-fA-F]+|\\[0-7]{1,3}|\\.|[^"\\%])', text)
    if not first:
        return ['""']
    other = "y" if first.group(1) == "x" else "x"
    return ['""', text[: first.start(1)] + other + text[first.end(1) :]]


def of_condition(text, negated):
    """True, false and, unless another change does that (`negated`), the opposite."""
    return ["true", "false"] + ([] if negated else [f"!({text})"])


def removed(text):
    """Nothing, in as many lines, so that the lines after it keep their numbers."""
    return "\n" * text.count("\n")
