#!/usr/bin/env python3
"""bench_report.py RATIOS DOCUMENT

Writes the rows of RATIOS (family, ours, peer, ratio, goal, with tabs between) into DOCUMENT.md, between its two
marker lines, and plots them by family in DOCUMENT.svg with gnuplot: a point a row, a bar where its goal is."""
import os
import platform
import re
import subprocess
import sys

if sys.argv[1:] in (["-h"], ["--help"]):
    print(__doc__)
    sys.exit()

BEGIN, END = "<!-- written by scripts/bench --report -->\n", "<!-- end -->\n"


def first_line(*command):
    return subprocess.run(command, check=True, capture_output=True, text=True).stdout.splitlines()[0]


def machine():
    with open("/proc/cpuinfo") as file:
        model = re.search(r"model name\s*: (.*)", file.read())
    return (f"{os.cpu_count()} processors ({model.group(1) if model else platform.machine()}), Linux, "
            f"{first_line('g++', '--version')}, {' '.join(platform.libc_ver())}")


def table(rows):
    lines = ["| Family | Ours | Peer | Ratio | Goal |", "|---|---|---|---|---|"]
    for family, ours, peer, ratio, goal in rows:
        shown = f"**{ratio:.2f}**" if 0 < goal < ratio else f"{ratio:.2f}"
        lines.append(f"| {family} | `{ours}` | `{peer}` | {shown} | {f'{goal:.2f}' if goal else '-'} |")
    return "\n".join(lines) + "\n"


def plot(rows, path):
    families = sorted({row[0] for row in rows})
    points = "\n".join(f"{families.index(family) + 1} {ratio} {goal or 'NaN'} {1 if 0 < goal < ratio else 0}"
                       for family, _, _, ratio, goal in rows)
    names = ", ".join(f'"{family}" {number}' for number, family in enumerate(families, 1))
    script = f"""
set terminal svg size 1000,520 background "white" font "sans,12"
set output "{path}"
set title "Time of ours over that of the peer, below 1 is faster" noenhanced
set logscale y
set ytics (0.05, 0.1, 0.2, 0.5, 1, 2, 5, 10)
set grid ytics
set xrange [0.3:{len(families) + 0.7}]
set xtics ({names}) rotate by -35 noenhanced
set key top left
$rows << EOD
{points}
EOD
plot 1 with lines lc "gray" notitle, \\
    $rows using 1:($4 == 0 ? $2 : NaN) with points pt 7 lc "web-blue" title "row", \\
    $rows using 1:($4 == 1 ? $2 : NaN) with points pt 7 lc "red" title "row above its goal", \\
    $rows using ($1 - 0.2):3:(0.4):(0) with vectors nohead lw 2 lc "dark-green" title "goal"
"""
    subprocess.run(["gnuplot"], input=script, text=True, check=True)


def main():
    ratios, document = sys.argv[1:]
    with open(ratios) as file:
        fields = [line.rstrip("\n").replace("/real_time", "").split("\t") for line in file]
    # Where a family has means, the rows that they are of are too many to show.
    with_means = {row[0] for row in fields if "geometric mean" in row[1]}
    fields = [row for row in fields if row[0] not in with_means or "geometric mean" in row[1]]
    rows = [(family, ours, peer, float(ratio), float(goal)) for family, ours, peer, ratio, goal in fields]
    with open(document + ".md") as file:
        before, rest = file.read().split(BEGIN)
    report = f"Measured on {machine()}.\n\n![Ratios by family]({os.path.basename(document)}.svg)\n\n{table(rows)}"
    with open(document + ".md", "w") as file:
        file.write(before + BEGIN + report + END + rest.split(END)[1])
    plot(rows, document + ".svg")


main()
