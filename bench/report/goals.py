"""What the library is to reach, and whether a run shows it."""

from dataclasses import dataclass
from typing import Callable, Optional

LIBRARY, REQUIRED, FLOOR = "library", "required", "floor"
HTTP_PEERS = ("libcurl", "cpp-httplib", "Poco", "Beast")
LOG_PEERS = ("spdlog", "glog", "log4cplus", "syslog")
MIB = 1 << 20


@dataclass
class Goal:
    work: str
    text: str  # what is measured, and the limit
    limit: float
    measure: Callable  # of a Run; None where the run has not measured it
    at_least: bool = False
    digits: int = 2

    def outcome(self, run):
        """The measured value, and whether it is met as it is printed."""
        value = self.measure(run)
        if value is None:
            return None, None
        printed = round(value, self.digits)
        return printed, printed >= self.limit if self.at_least else printed <= self.limit


def times(work, against, limit):
    """At most so many times what another contender takes."""
    text = f"at most {limit:.2f} times {NAMES.get(against, against)}"
    return Goal(work, text, limit, lambda run: run.ratio(work, LIBRARY, against))


def ahead(work, peers, by=1.0):
    """The fastest of the peers takes so many times what the library takes."""

    def measure(run):
        ratios = [run.ratio(work, peer, LIBRARY) for peer in peers]
        known = [ratio for ratio in ratios if ratio is not None]
        return min(known) if known else None

    names = peers[0] if len(peers) == 1 else "the fastest peer"
    text = f"{names} takes at least {by:.2f} times as long"
    return Goal(work, text, by, measure, at_least=True)


def rate(work, gigabytes):
    text = f"at least {gigabytes:.2f} GB/s"
    return Goal(work, text, gigabytes, lambda run: run.rate(work, LIBRARY), at_least=True)


def linear(work, smaller, limit):
    """The larger work costs at most so many times as much for each byte as the smaller one."""

    def measure(run):
        large, small = run.rate(work, LIBRARY), run.rate(smaller, LIBRARY)
        return small / large if large and small else None

    return Goal(work, f"at most {limit:.2f} times as much per byte as {smaller}", limit, measure)


def as_linear(work, smaller, limit):
    """As linear as the floor, which leaves the processor's caches as well."""

    def grows(run, contender):
        large, small = run.rate(work, contender), run.rate(smaller, contender)
        return small / large if large and small else None

    def measure(run):
        library, floor = grows(run, LIBRARY), grows(run, FLOOR)
        return library / floor if library and floor else None

    text = f"its cost per byte grows against {smaller} at most {limit:.2f} times as much as the floor's does"
    return Goal(work, text, limit, measure)


def value(work, limit, text, scale=1.0, digits=2):
    def measure(run):
        median = run.median(work, LIBRARY)
        return None if median is None else median / scale

    return Goal(work, text, limit, measure, digits=digits)


def instructions_above(work, against, limit):
    """So many instructions more than another contender's, for one operation."""

    def measure(run):
        ours, theirs = run.instructions(work, LIBRARY), run.instructions(work, against)
        return ours - theirs if ours is not None and theirs is not None else None

    text = f"at most {limit:,} instructions more than {NAMES.get(against, against)}"
    return Goal(work, text, limit, measure, digits=0)


def fewest_instructions(work, peers):
    """Below each of the peers that do the work."""

    def measure(run):
        ours = run.instructions(work, LIBRARY)
        counts = [run.instructions(work, peer) for peer in peers]
        known = [count for count in counts if count is not None]
        return ours / min(known) if known and ours is not None else None

    text = "fewer instructions than any peer (times the fewest of theirs)"
    return Goal(work, text, 0.99, measure)


def as_much(work, other, limit):
    """The two works' values beside each other: each further client costs the same."""

    def measure(run):
        one, two = run.median(work, LIBRARY), run.median(other, LIBRARY)
        return one / two if one is not None and two else None

    return Goal(work, f"at most {limit:.2f} times as much per client as {other}", limit, measure)


NAMES = {REQUIRED: "the required floor", FLOOR: "the floor"}

GOALS = [
    times("log_disabled", FLOOR, 1.00),
    times("log_disabled_record", FLOOR, 1.50),
    times("log_line", REQUIRED, 1.00),
    times("log_line", "log4cplus", 1.00),
    times("log_line_4_processes", REQUIRED, 1.00),
    times("log_line_16_processes", REQUIRED, 1.00),
    times("json_get", REQUIRED, 1.05),
    instructions_above("json_get", REQUIRED, 12000),
    times("digest_get", REQUIRED, 1.05),
    fewest_instructions("digest_get", HTTP_PEERS),
    times("form_post", REQUIRED, 1.05),
    ahead("form_post", HTTP_PEERS),
    times("soap_post_4k", REQUIRED, 1.05),
    ahead("soap_post_4k", HTTP_PEERS),
    times("head_30", FLOOR, 3.50),
    rate("lines", 1.0),
    times("chunked_64", FLOOR, 1.40),
    ahead("chunked_64", ("Beast",)),
    times("chunked_4k", FLOOR, 1.10),
    times("body_64m", REQUIRED, 0.90),
    ahead("body_64m", HTTP_PEERS),
    linear("body_64m", "body_1m", 1.40),
    times("body_chunked_64m", REQUIRED, 0.90),
    ahead("body_chunked_64m", HTTP_PEERS),
    linear("body_chunked_64m", "body_chunked_1m", 1.40),
    times("pieces_64m", REQUIRED, 1.02),
    times("tls_get", REQUIRED, 1.02),
    times("tls_body_16m", REQUIRED, 1.02),
    times("upload_256m", REQUIRED, 1.02),
    value("upload_memory", 1.0, "grows by at most 1 MiB while it sends 256 MiB", MIB),
    times("url_encode_64", FLOOR, 1.15),
    ahead("url_encode_64", ("Poco",), 3.0),
    ahead("url_encode_64", ("libcurl",), 5.0),
    times("url_encode_4k", FLOOR, 1.05),
    ahead("url_encode_4k", ("Poco",), 3.0),
    ahead("url_encode_4k", ("libcurl",), 5.0),
    times("base64_32", FLOOR, 1.05),
    times("base64_4k", FLOOR, 1.05),
    times("line_ends_16m", FLOOR, 1.10),
    as_linear("line_ends_16m", "line_ends_1m", 1.10),
    value("idle_64", 16.0, "at most 16 KiB for each further client", 1024),
    as_much("idle_1000", "idle_64", 1.10),
    value("load", 1.0, "at most 1 ms beyond its dependencies'", 1e6),
]
