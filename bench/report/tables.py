"""The tables of a run, as Markdown."""

from goals import GOALS, LIBRARY
from texts import METHOD, SECTIONS, WORKS


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


def goals_table(run):
    rows = []
    for goal in GOALS:
        measured, met = goal.outcome(run)
        if measured is None:
            continue
        verdict = "yes" if met else "**no**"
        rows.append([goal.work, goal.text, f"{measured:.{goal.digits}f}", verdict])
    return table(["work", "goal for the library", "measured", "met"], rows)


def work_table(run, work):
    reference = run.reference(work)
    rates = run.rate(work, LIBRARY) is not None
    rows = []
    for contender in run.contenders(work):
        row = [contender, amount(run.median(work, contender), run.units[work])]
        if reference:
            row.append(f"{run.ratio(work, contender, reference):.2f}")
        if rates:
            row.append(f"{run.rate(work, contender):.2f}")
        rows.append(row)
    heading = ["contender", "time" if run.units[work] == "ns" else "memory"]
    heading += [f"times the {reference}"] if reference else []
    heading += ["GB/s"] if rates else []
    return table(heading, rows)


def section_page(run, section, plot=None):
    title, what = SECTIONS[section]
    text = f"# {title}\n\n{what} What the contenders are: [README.md](README.md).\n"
    if plot:
        text += f"\n![{title}: times the reference]({plot})\n"
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


def front_page(run, counts):
    text = "# The library beside its floors and its peers\n\n"
    text += "Made by `./dev bench`; do not edit.\n\n"
    text += environment(run) + "\n## How it is measured\n\n" + METHOD
    text += "\n## Goals\n\n" + goals_table(run) + "\n## All works\n\n"
    for section in run.sections:
        text += f"- [{SECTIONS[section][0]}]({section}.md): {SECTIONS[section][1]}\n"
    return text + counts
