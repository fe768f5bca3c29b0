"""The list of mutants that behave like the unchanged library: equivalent.txt tells its form."""

import os

LIST = os.path.join(os.path.dirname(os.path.abspath(__file__)), "equivalent.txt")
KEYS = ("file: ", "function: ", "- ", "+ ", "because: ")


class Equivalents:
    def __init__(self, text):
        blocks = [block for block in text.split("\n\n") if not block.startswith("#")]
        self._reasons = dict(_entry(block) for block in blocks if block.strip())
        self._names = list(self._reasons)

    @classmethod
    def stored(cls):
        with open(LIST, encoding="utf-8") as file:
            return cls(file.read())

    def reason(self, candidate):
        """Why it is equivalent; None when the list does not say so."""
        return self._reasons.get(_name(candidate))

    def astray(self, candidates):
        """The entries that name no candidate, or more than one."""
        count = dict.fromkeys(self._reasons, 0)
        for candidate in candidates:
            if _name(candidate) in count:
                count[_name(candidate)] += 1
        return ["\n".join(name) for name, found in count.items() if found != 1]


def _name(candidate):
    return (candidate.path, candidate.function, candidate.before, candidate.after)


def _entry(block):
    """(path, function, before, after), reason"""
    lines = block.strip("\n").split("\n")
    for line, key in zip(lines, KEYS):
        if not line.startswith(key):
            raise ValueError(f"equivalent.txt: {key!r} is missing in:\n{block}")
    values = [line[len(key) :] for line, key in zip(lines, KEYS)]
    reason = " ".join([values[4], *(line.strip() for line in lines[5:])])
    return tuple(values[:4]), reason
