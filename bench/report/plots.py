"""A plot a section: each contender's time as a multiple of the reference's, by work."""

import subprocess

COLOURS = ["#999999", "#555555", "#c02020", "#3060a0", "#60a0d0", "#208060", "#90b040", "#c09020",
           "#8050a0", "#b07050"]  # fmt: skip

SCRIPT = """\
set terminal svg size 960,420 font "sans-serif,12" background "white"
set output "{output}"
set style data histogram
set style histogram clustered gap 1
set style fill solid 0.9 noborder
set logscale y 2
set ytics format "%g"
set ylabel "times the reference"
set grid ytics
set key outside right top
set xtics scale 0 rotate by -20
set datafile missing "?"
plot 1 with lines linecolor rgb "black" notitle, {columns}
"""


def bars(run, section):
    """The works that have a reference, and their contenders in the order of the tables."""
    works = [work for work in run.sections[section] if run.reference(work)]
    contenders = []
    for work in works:
        contenders += [name for name in run.contenders(work) if name not in contenders]
    return works, contenders


def data(run, works, contenders):
    lines = []
    for work in works:
        ratios = (run.ratio(work, name, run.reference(work)) for name in contenders)
        cells = ["?" if ratio is None else f"{ratio:.4f}" for ratio in ratios]
        lines.append(" ".join([work.replace("_", "-"), *cells]))
    return "\n".join(lines) + "\n"


def plot(run, section, path):
    """Results: false when the section has nothing to compare with."""
    works, contenders = bars(run, section)
    if not works:
        return False
    columns = ", ".join(
        f"$ratios using {column}:xtic(1) title '{name}' linecolor rgb '{colour}'"
        for column, (name, colour) in enumerate(zip(contenders, COLOURS), start=2)
    )
    block = "$ratios << END\n" + data(run, works, contenders) + "END\n"
    script = block + SCRIPT.format(output=path, columns=columns)
    subprocess.run(["gnuplot"], input=script, text=True, check=True)
    return True
