"""Which mutants are drawn: any beginning of the order takes from each file its part."""

import collections
import random


def ordered(candidates, seed):
    """All candidates in the order of drawing. The same seed and sources make the same order."""
    by_path = collections.defaultdict(list)
    for candidate in candidates:
        by_path[candidate.path].append(candidate)
    places = []
    for path, of_path in sorted(by_path.items()):
        chance = random.Random(f"{seed} {path}")
        chance.shuffle(of_path)
        first = chance.random()
        places += [((n + first) / len(of_path), path, c) for n, c in enumerate(of_path)]
    return [candidate for _, _, candidate in sorted(places)]
