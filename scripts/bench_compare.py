#!/usr/bin/env python3
"""bench_compare.py FOLDER THEN NOW [--summary]

Compares two builds that were measured in alternation: FOLDER has THEN.1.json, NOW.1.json and so on, as Google
Benchmark writes them. A benchmark has changed if the slowest round of one side was faster than the fastest of
the other, and the best rounds differ by more than 2 %. --summary prints one line."""
import glob
import json
import math
import sys

if sys.argv[1:] in (["-h"], ["--help"]):
    print(__doc__)
    sys.exit()

LEAST_CHANGE = 0.02


def times(folder, side):
    """The real times of each benchmark, one a round."""
    found = {}
    for path in glob.glob(f"{folder}/{side}.*.json"):
        with open(path) as file:
            for run in json.load(file)["benchmarks"]:
                if run["real_time"] > 0:  # 0: skipped
                    found.setdefault(run["run_name"], []).append(run["real_time"])
    return found


def main():
    folder, old, new = sys.argv[1:4]
    then, now = times(folder, old), times(folder, new)
    ratios = {name: min(now[name]) / min(then[name]) for name in then if name in now}
    apart = {name for name in ratios if max(now[name]) < min(then[name]) or max(then[name]) < min(now[name])}
    changed = {name: ratio for name, ratio in ratios.items() if name in apart and abs(ratio - 1) > LEAST_CHANGE}
    if not ratios:
        sys.exit("no benchmark is in both")
    mean = math.exp(sum(map(math.log, ratios.values())) / len(ratios))
    if "--summary" in sys.argv:
        rows = ", ".join(f"{name} {100 * (changed[name] - 1):+.1f} %" for name in sorted(changed, key=changed.get))
        print(f"{new:16} mean {100 * (mean - 1):+5.1f} %; beyond noise, of {len(ratios)}: {rows or 'none'}")
        return
    for name, ratio in sorted(changed.items(), key=lambda entry: entry[1]):
        print(f"{name:60} {100 * (ratio - 1):+6.1f} %")
    print(f"{len(changed)} of {len(ratios)} benchmarks changed beyond noise; mean of all {100 * (mean - 1):+.1f} %")
    for side, other, what in ((then, now, "gone"), (now, then, "new")):
        for name in sorted(set(side) - set(other)):
            print(f"{name}: {what}")


main()
