#!/usr/bin/env python3
"""Lists the lines and branches of both libraries that did not run, and what share of each room did.

scripts/coverage.py EXPORT.json..., the exports of llvm-cov, one of each program. A line or branch that
several programs or instances of a template hold counts once, and has run when one of its copies has. A
branch that the compiler has decided is none.
"""
import collections
import json
import pathlib
import sys

ROOT = str(pathlib.Path(__file__).resolve().parent.parent) + "/"
LIBRARIES = ("kzsdk/", "catalogue/")


def lines_of(segments):
    """{line: times it ran}, by the rule of llvm-cov: the most often run of what a line starts or goes
    on with."""
    found = {}
    by_line = collections.defaultdict(list)
    for segment in segments:
        by_line[segment[0]].append(segment)
    going_on = None
    for line in range(segments[0][0], segments[-1][0] + 1) if segments else []:
        here = by_line.get(line, [])
        entries = [s for s in here if s[3] and s[4] and not s[5]]  # has a count, begins a region, no gap
        counts = [s[2] for s in entries]
        if going_on is not None and going_on[3] and not (here and not here[0][3] and here[0][4]):
            counts.append(going_on[2])
        if counts:
            found[line] = max(counts)
        if here:
            going_on = here[-1]
    return found


def collect(export, lines, branches):
    """Adds to `lines`, {(file, line): times}, and `branches`, {(file, line, column): [times true, times
    false]}."""
    for data in export["data"]:
        for file in data["files"]:
            name = file["filename"].removeprefix(ROOT)
            if not name.startswith(LIBRARIES):
                continue
            for line, times in lines_of(file["segments"]).items():
                lines[name, line] += times
        for function in data["functions"]:
            names = [name.removeprefix(ROOT) for name in function["filenames"]]
            for line, column, _, _, true, false, file, *_ in function["branches"]:
                if names[file].startswith(LIBRARIES):
                    counts = branches[names[file], line, column]
                    counts[0] += true
                    counts[1] += false


def percent(ran, of):
    return f"{ran:6} of {of:6} {100 * ran / max(of, 1):7.2f} %"


def room_of(name):
    """kzsdk/dsp; catalogue alone for the files that lie in that folder itself."""
    return "/".join(name.split("/")[:-1][:2])


def main():
    lines = collections.Counter()
    branches = collections.defaultdict(lambda: [0, 0])
    for name in sys.argv[1:]:
        with open(name) as export:
            collect(json.load(export), lines, branches)
    # Where neither side ran though the line did, the condition was none at run time.
    branches = {at: counts for at, counts in branches.items() if any(counts) or not lines[at[:2]]}
    text = {}
    for (name, line), times in sorted(lines.items()):
        source = text.setdefault(name, pathlib.Path(ROOT, name).read_text().splitlines())
        if not times:
            print(f"{name}:{line}: line: {source[line - 1].strip()}")
    for (name, line, column), counts in sorted(branches.items()):
        for times, side in zip(counts, ("true", "false")):
            if not times:
                print(f"{name}:{line}:{column}: never {side}: {text[name][line - 1].strip()}")
    print("room             lines                          branches")
    for room in [*sorted({room_of(name) for name, _ in lines}), "all"]:
        ran = [times > 0 for (name, _), times in lines.items() if room in ("all", room_of(name))]
        sides = [times > 0 for (name, *_), counts in branches.items() for times in counts
                 if room in ("all", room_of(name))]
        print(f"{room:15} {percent(sum(ran), len(ran))}    {percent(sum(sides), len(sides))}")


main()
