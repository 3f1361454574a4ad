#!/usr/bin/env python3
"""Counts instructions with callgrind and compares them with those on record.

    bench/counts.py PROGRAM            compare; fails where a count rose by more than 3 %
    bench/counts.py PROGRAM --record   write the counts of this build to bench/instructions.json

PROGRAM is a kzbench. Each variant of the inner loops has its own figures; one that this machine or
this build does not have is skipped, and keeps its figures when others are recorded. Counts
depend on the compiler, so those of another compiler are not compared.
"""

import argparse
import json
import os
import pathlib
import re
import subprocess
import sys
import tempfile

FIGURES = pathlib.Path(__file__).with_name("instructions.json")
MOST_RISE = 0.03
VARIANTS = ("plain", "sse41", "avx2", "neon")

CASES = """
    fp1_44100s fp1_48000s fp1_22050m fp1_11025m fp1_8000m fp2_44100s fp2_48000s
    dct_fixed_16384 dct_fixed_32768 dct_float_32768
    rs_fixed_48000 rs_fixed_44100 rs_fixed_22050 rs_fixed_8000 rs_float_48000 rs_float_44100
    hist_eq decimate2 frame detector_silence convert_pcm16_stereo serialize create_free_1
    create_free_2
""".split()

# The goals.
GOALS = {"avx2": {"fp1_44100s": 25_000_000, "fp1_48000s": 35_000_000}}


class Counts:
    """What a run under callgrind printed."""

    def __init__(self, build, variant, by_case):
        self.build = build
        self.variant = variant
        self.by_case = by_case


def read_part(path):
    """The case's name and its count from one of callgrind's files, or None."""
    text = path.read_text(encoding="utf-8")
    name = re.search(r"^desc: Trigger: Client Request: (\S+)$", text, re.MULTILINE)
    total = re.search(r"^totals: (\d+)$", text, re.MULTILINE)
    return (name[1], int(total[1])) if name and total else None


def count(program, variant):
    """Runs the cases with a variant pinned; the library takes its best one for an unknown name."""
    with tempfile.TemporaryDirectory() as directory:
        output = pathlib.Path(directory, "counts")
        done = subprocess.run(
            ["valgrind", "-q", "--tool=callgrind", "--instr-atstart=no",
             f"--callgrind-out-file={output}", program, "count", *CASES],
            env={**os.environ, "KZSDK_KERNELS": variant},
            stdout=subprocess.PIPE, check=True, text=True)
        parts = [read_part(path) for path in pathlib.Path(directory).iterdir()]
    build, used = done.stdout.splitlines()
    return Counts(build, used, dict(part for part in parts if part))


def change(was, now):
    return (now - was) / was


def rises(recorded, counted):
    """The cases whose counts rose too far, and those of which there is no count any more."""
    return [name for name, was in recorded.items()
            if name not in counted or change(was, counted[name]) > MOST_RISE]


def print_comparison(recorded, counted):
    print(f"{'':24}{'recorded':>14}{'now':>14}{'change':>10}")
    for name, now in sorted(counted.items(), key=lambda item: CASES.index(item[0])):
        was = recorded.get(name)
        told = f"{was:14,}{now:14,}{change(was, now):+10.2%}" if was else f"{'':14}{now:14,}"
        print(f"{name:24}{told}")


def print_goals(counts):
    for name, most in GOALS.get(counts.variant, {}).items():
        now = counts.by_case[name]
        print(f"goal: {name} ≤ {most:,}: {'met' if now <= most else f'no, {now / most:.2f} ×'}")


def compare(program, figures):
    failed = []
    for variant, recorded in figures["instructions"].items():
        print(f"\nvariant {variant}")
        counts = count(program, variant)
        if counts.variant != variant:
            print(f"skipped: neither in this build nor on this machine; {counts.variant} is")
            continue
        if counts.build != figures["build"]:
            print(f"skipped: recorded with {figures['build']}, this is {counts.build}")
            continue
        print_comparison(recorded, counts.by_case)
        print_goals(counts)
        failed += [f"{variant} {name}" for name in rises(recorded, counts.by_case)]
    if failed:
        print(f"\nMore than {MOST_RISE:.0%} above the record: {', '.join(failed)}.\n"
              "Where the rise has a good reason, record anew and give the reason in the commit: "
              "./run bench-counts --record")
    return 1 if failed else 0


def record(program, figures):
    for variant in VARIANTS:
        counts = count(program, variant)
        if counts.variant != variant:
            print(f"no {variant} here")
            continue
        if counts.build != figures.get("build"):
            figures = {"build": counts.build, "instructions": {}}
        print(f"\nvariant {variant}")
        print_comparison(figures["instructions"].get(variant, {}), counts.by_case)
        figures["instructions"][variant] = {name: counts.by_case[name] for name in CASES}
    FIGURES.write_text(json.dumps(figures, indent=2) + "\n", encoding="utf-8")
    return 0


def main():
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("program", type=os.path.abspath)
    parser.add_argument("--record", action="store_true")
    chosen = parser.parse_args()
    figures = json.loads(FIGURES.read_text(encoding="utf-8")) if FIGURES.exists() else {}
    return (record if chosen.record else compare)(chosen.program, figures)


if __name__ == "__main__":
    sys.exit(main())
