"""The tables of a run, as Markdown."""

from goals import GOALS, HTTP_PEERS, LIBRARY, LOG_PEERS
from texts import METHOD, SECTIONS, UNMET, WORKS


def table(heading, rows):
    lines = [heading, ["---"] * len(heading), *rows]
    return "".join("| " + " | ".join(line) + " |\n" for line in lines)


def amount(value, unit):
    """Three digits and a unit that fits."""
    steps = (
        [(1e9, "s"), (1e6, "ms"), (1e3, "µs"), (1, "ns")]
        if unit == "ns"
        else [(1 << 20, "MiB"), (1 << 10, "KiB"), (1, "bytes")]
    )
    for size, name in steps:
        if value >= size:
            break
    number = value / size
    return f"{number:.{max(0, 3 - len(str(int(number))))}f} {name}"


def number(value):
    """Of things that are counted, for one operation."""
    return "–" if value is None else f"{value:,.0f}"


def goals_table(run):
    rows = []
    for goal in GOALS:
        measured, met = goal.outcome(run)
        if measured is None:
            continue
        verdict = "yes" if met else "**no**"
        rows.append([goal.work, goal.text, f"{measured:,.{goal.digits}f}", verdict])
    return table(["work", "goal for the library", "measured", "met"], rows)


def unmet(run):
    """A paragraph for each goal that is missed."""
    goals = [goal for goal in GOALS if goal.outcome(run)[1] is False]
    if not goals:
        return ""
    text = "\n### What is not met\n"
    for goal in goals:
        reason = UNMET.get((goal.work, goal.text), "Not explained yet.")
        text += f"\n**{goal.work}, {goal.text}**: {reason}\n"
    return text


def beside_peers(run, peers):
    """The library's time, and how many times as long its peers take."""
    rows = []
    for work in [work for works in run.sections.values() for work in works]:
        ratios = [run.ratio(work, peer, LIBRARY) for peer in peers]
        if run.units[work] != "ns" or not any(ratios):
            continue
        cells = ["–" if ratio is None else f"{ratio:.2f}" for ratio in ratios]
        row = [f"{work}: {WORKS[work]}", amount(run.median(work, LIBRARY), "ns"), *cells]
        rows.append(row)
    return table(["work", "the library takes", *peers], rows)


def work_table(run, work):
    reference = run.reference(work)
    rates = run.rate(work, LIBRARY) is not None
    counted = run.instructions(work, LIBRARY) is not None
    rows = []
    for contender in run.contenders(work):
        row = [contender, amount(run.median(work, contender), run.units[work])]
        if reference:
            row.append(f"{run.ratio(work, contender, reference):.2f}")
        if rates:
            row.append(f"{run.rate(work, contender):.2f}")
        if counted:
            row += [number(run.instructions(work, contender)), number(run.calls(work, contender))]
        rows.append(row)
    heading = ["contender", "time" if run.units[work] == "ns" else "memory"]
    heading += [f"times the {reference}"] if reference else []
    heading += ["GB/s"] if rates else []
    heading += ["instructions", "system calls"] if counted else []
    return table(heading, rows)


PLOT = """\
The line is the required floor, or the floor where the interface asks for no system call: who is
above it takes longer.
"""


def picture(section, plot):
    return f"![{SECTIONS[section][0]}: time, by the reference's]({plot})\n"


def section_page(run, section, plot=None):
    title, what = SECTIONS[section]
    text = f"# {title}\n\n{what} What the contenders are: [README.md](README.md).\n"
    if plot:
        text += f"\n{picture(section, plot)}\n{PLOT}"
    for work in run.sections[section]:
        text += f"\n## {work}\n\n{WORKS[work][0].upper() + WORKS[work][1:]}.\n\n"
        text += work_table(run, work)
    return text


def environment(run):
    facts = run.environment
    machine = f"{facts['processors']} processors, {facts['processor']} ({facts['architecture']})"
    versions = ", ".join(f"{name} {version}" for name, version in facts["versions"].items())
    return (
        f"Measured on {facts['date']} in {run.rounds()} rounds, on {machine}, Linux "
        f"{facts['kernel']}, with {versions}.\n"
    )


def front_page(run, counts, plots):
    """plots: {section: its picture}"""
    text = "# The library beside its floors and its peers\n\n"
    text += "Made by `./dev bench`; do not edit.\n\n"
    text += environment(run)
    text += "\n## Beside its peers\n\nHow many times as long as the library each of them takes: "
    text += "above 1, the library is faster.\n\n"
    text += beside_peers(run, HTTP_PEERS) + "\n" + beside_peers(run, LOG_PEERS) + "\n"
    for section in ("request", "log"):
        text += picture(section, plots[section]) if section in plots else ""
    text += "\n" + PLOT
    text += "\n## Goals\n\n" + goals_table(run) + unmet(run)
    text += "\n## How it is measured\n\n" + METHOD + "\n## All works\n\n"
    for section in run.sections:
        text += f"- [{SECTIONS[section][0]}]({section}.md): {SECTIONS[section][1]}\n"
    return text + counts
