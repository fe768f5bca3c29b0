"""A plot a section: each contender's time as a multiple of the reference's, by work."""

import subprocess

# One for each contender, the same in all plots, in the order of the bars.
COLOURS = {
    "floor": "#aaaaaa",
    "required": "#555555",
    "library": "#c02020",
    "libcurl": "#3060a0",
    "cpp-httplib": "#60a0d0",
    "Poco": "#208060",
    "Beast": "#90b040",
    "std::remove": "#c09020",
    "spdlog": "#3060a0",
    "glog": "#60a0d0",
    "log4cplus": "#208060",
    "syslog": "#90b040",
}

SCRIPT = """\
set terminal svg size 960,420 font "sans-serif,12" background "white"
set output "{output}"
set style fill solid 0.9 noborder
set logscale y 2
set ytics format "%g"
set ylabel "time, by the reference's"
set grid ytics
set key outside right top
set xtics scale 0 rotate by -20 ({labels})
set xrange [-0.6:{last}]
set yrange [*<0.5:2<*]
plot {bars}, 1 with lines linecolor rgb "black" notitle
"""


def works_with_reference(run, section):
    return [work for work in run.sections[section] if run.reference(work)]


def bars(run, works):
    """{contender: its bars}; each goes from 1, which is the reference, to the contender."""
    blocks = {}
    for place, work in enumerate(works):
        reference = run.reference(work)
        contenders = [name for name in COLOURS if name in run.contenders(work)]
        contenders.remove(reference)
        width = 0.8 / max(5, len(contenders))
        for index, name in enumerate(contenders):
            left = place + (index - len(contenders) / 2) * width
            ratio = run.ratio(work, name, reference)
            line = f"{left + width / 2} 1 {left} {left + width} 1 {ratio:.4f}"
            blocks.setdefault(name, []).append(line)
    return blocks


def plot(run, section, path):
    """Results: false when the section has nothing to compare with."""
    works = works_with_reference(run, section)
    if not works:
        return False
    script, drawn = "", []
    for index, (name, lines) in enumerate(sorted(bars(run, works).items(), key=place_of)):
        script += f"$bars{index} << END\n" + "\n".join(lines) + "\nEND\n"
        drawn.append(f"$bars{index} with boxxyerror title '{name}' linecolor rgb '{COLOURS[name]}'")
    labels = ", ".join(f"'{work.replace('_', '-')}' {index}" for index, work in enumerate(works))
    script += SCRIPT.format(
        output=path, labels=labels, last=len(works) - 0.4, bars=", ".join(drawn)
    )
    subprocess.run(["gnuplot"], input=script, text=True, check=True)
    return True


def place_of(item):
    return list(COLOURS).index(item[0])
