#!/usr/bin/python3
"""Looks the same clips up with Chromaprint, as far as Debian has it: fpcalc and bit errors.

    evaluation/peers.py tune|report [KIND...]

Writes <cache>/results/<half>/chromaprint/<kind>.jsonl: one object a clip with its file and the best
two tracks, each with its score (0.5 less the share of differing bits) and the place found. fpcalc is
the peer's own program with its default algorithm; the alignment at every offset is
bit_alignment.cpp, which is compiled for this machine. Other peers (Olaf, audfprint, Panako, dejavu)
are not packaged in Debian 12 and are not run.
"""

import json
import pathlib
import subprocess
import sys

import corpus
import weed

HERE = pathlib.Path(__file__).resolve().parent
HOP = 1365 / 11025  # seconds a value


def aligner():
    """The alignment program, compiled when it is older than its source."""
    source = HERE / "bit_alignment.cpp"
    program = corpus.CACHE / "bit_alignment"
    if not program.exists() or program.stat().st_mtime < source.stat().st_mtime:
        subprocess.run(["g++", "-std=c++20", "-O3", "-march=native", "-o", str(program), str(source)],
                       check=True)
    return program


def write_prints(path, names, files):
    lines = [f"{name} {','.join(map(str, values))}\n"
             for name, values in zip(names, weed.fingerprints(files))]
    path.with_suffix(".part").write_text("".join(lines))
    path.with_suffix(".part").rename(path)


def known_prints(half):
    path = corpus.CACHE / "results" / half / "chromaprint" / "known.txt"
    if not path.exists():
        path.parent.mkdir(parents=True, exist_ok=True)
        names = [track["id"] for track in corpus.known(half)]
        write_prints(path, names, [corpus.CACHE / "tracks" / f"{name}.wav" for name in names])
    return path


def candidates(fields):
    pairs = [fields[place:place + 3] for place in range(0, len(fields), 3)]
    return [{"track": track, "score": float(score), "offset": round(int(offset) * HOP, 3)}
            for track, score, offset in pairs if track != "-"]


def look_up(half, kind):
    clips = corpus.CACHE / "clips" / half
    results = corpus.CACHE / "results" / half / "chromaprint" / f"{kind}.jsonl"
    truth = clips / kind / "truth.jsonl"
    if results.exists() and results.stat().st_mtime > truth.stat().st_mtime:
        return
    names = [json.loads(line)["file"] for line in truth.read_text(encoding="utf-8").splitlines()]
    tracks = known_prints(half)
    prints = results.with_suffix(".txt")
    write_prints(prints, names, [clips / name for name in names])
    found = subprocess.run([aligner(), tracks, prints], check=True, capture_output=True, text=True)
    with results.open("w", encoding="utf-8") as file:
        for line in found.stdout.splitlines():
            name, *fields = line.split(" ")
            file.write(json.dumps({"file": name, "candidates": candidates(fields)}) + "\n")
    prints.unlink()
    print(f"{half} {kind}: {len(names)} clips looked up with Chromaprint", file=sys.stderr, flush=True)


def main():
    half = sys.argv[1]
    made = sorted(path.parent.name for path in (corpus.CACHE / "clips" / half).glob("*/truth.jsonl"))
    for kind in sys.argv[2:] or made:
        look_up(half, kind)


if __name__ == "__main__":
    main()
