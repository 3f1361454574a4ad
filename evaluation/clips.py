#!/usr/bin/python3
"""Cuts clips out of the tracks of evaluation/manifest.jsonl and degrades them.

    evaluation/clips.py tune|report [KIND...]     without kinds: all of them

Writes <cache>/clips/<half>/<kind>/<number>.<suffix> and, beside the clips of a kind, truth.jsonl:
one object a clip with its file, kind, role ("known" or "stranger"), track, the place of its first
sample in the track (`position` in frames, `seconds`), and speed, tempo and pitch. Clips that
truth.jsonl has already are left as they are. The same seeds, clips and bytes come out every time, with
the same versions of sox, FFmpeg, espeak-ng and numpy.

A kind has 150 clips of known tracks in `report`, 100 in `tune`, and 60 of strangers. A place is drawn again, up to 30 times,
when the clip there is below -50 dB of full scale or silent for a fifth of its length.
"""

import concurrent.futures
import hashlib
import json
import pathlib
import sys
import wave

import numpy

import corpus
import degrade
import voices

COUNTS = {"tune": {"known": 104, "stranger": 60}, "report": {"known": 156, "stranger": 60}}
QUIETEST = 10 ** (-50 / 20)
SILENT = 10 ** (-60 / 20)


class Random:
    """A generator of random numbers that also holds the voices to draw from."""

    voices = []  # of the half; set before the processes are forked

    def __init__(self, name):
        seed = int.from_bytes(hashlib.sha256(name.encode()).digest()[:8], "big")
        generator = numpy.random.Generator(numpy.random.PCG64(seed))
        self.integers = generator.integers
        self.standard_normal = generator.standard_normal
        self.permutation = generator.permutation


def samples_of(track):
    """A view of the track's samples: frames by channels, 16 bits."""
    file = corpus.CACHE / "tracks" / f"{track['id']}.wav"
    with wave.open(str(file), "rb") as opened:
        channels, frames = opened.getnchannels(), opened.getnframes()
    start = file.stat().st_size - 2 * channels * frames
    return numpy.memmap(file, "<i2", "r", start, (frames, channels))


def audible(clip, rate):
    if degrade.level(clip) < QUIETEST:
        return False
    block = rate // 4
    blocks = clip[:len(clip) // block * block].mean(axis=1).reshape(-1, block)
    return (numpy.sqrt((blocks ** 2).mean(axis=1)) < SILENT).mean() < 0.2


def cut(track, kind, random):
    """A place at random and the samples from there, or None when it is silent everywhere."""
    samples = samples_of(track)
    rate = track["rate"]
    # A stretched clip gets half a second more, which is cut off after stretching.
    more = 0.5 if kind.stretch != 1 or kind.cents else 0
    count = round((kind.seconds * kind.stretch + more) * rate)
    for _ in range(30):
        position = int(random.integers(len(samples) - count))
        clip = samples[position:position + count].astype(numpy.float64) / 32768
        if audible(clip, rate):
            return position, clip
    return None


def make_clip(half, name, role, number, track):
    """Writes a clip; its line of truth, or None when the track is silent."""
    kind = degrade.all_kinds()[name]
    random = Random(f"{half} {name} {role} {number}")
    found = cut(track, kind, random)
    if found is None:
        return None
    position, clip = found
    folder = corpus.CACHE / "clips" / half / name
    file = kind.make(clip, track["rate"], random, folder / f"{role[0]}{number:04}")
    return {"file": str(pathlib.Path(file).relative_to(folder.parent)), "kind": name, "role": role,
            "track": track["id"], "position": position, "rate": track["rate"],
            "seconds": round(position / track["rate"], 6), "length": kind.seconds, **kind.truth}


def chosen(tracks, half, name, role, count):
    """So many tracks of a role, none a second time before each was there once."""
    members = [track for track in tracks if track["role"] == role]
    picks = []
    lap = 0
    while len(picks) < count:
        order = Random(f"{half} {name} {role} tracks {lap}").permutation(len(members))
        picks += [members[place] for place in order]
        lap += 1
    return picks[:count]


def work(arguments):
    return make_clip(*arguments)


def jobs_of(half, name, tracks):
    """Which clips a kind has: role and number of each, and the track."""
    return {(role, number): track for role, count in COUNTS[half].items()
            for number, track in enumerate(chosen(tracks, half, name, role, count))
            if track["music"] or role == "stranger"}


def place_of(line):
    """Role and number, which the file's name holds."""
    return line["role"], int(pathlib.Path(line["file"]).stem[1:])


def make_kind(pool, half, name, tracks):
    folder = corpus.CACHE / "clips" / half / name
    folder.mkdir(parents=True, exist_ok=True)
    truth = folder / "truth.jsonl"
    lines = truth.read_text(encoding="utf-8").splitlines() if truth.exists() else []
    made = {place_of(line): line for line in map(json.loads, lines)}
    wanted = jobs_of(half, name, tracks)
    if truth.exists() and made.keys() == wanted.keys():
        return
    missing = [(half, name, *place, track) for place, track in wanted.items() if place not in made]
    new = [line for line in pool.map(work, missing, chunksize=5) if line is not None]
    made |= {place_of(line): line for line in new}
    text = "".join(json.dumps(made[place], sort_keys=True) + "\n" for place in wanted if place in made)
    truth.with_suffix(".part").write_text(text, encoding="utf-8")
    truth.with_suffix(".part").rename(truth)
    print(f"{half} {name}: {len(made)} clips", file=sys.stderr, flush=True)


def main():
    half, names = sys.argv[1], sys.argv[2:] or list(degrade.all_kinds())
    tracks = corpus.manifest(half)
    Random.voices = voices.recordings(corpus.CACHE / "voices", half)
    with concurrent.futures.ProcessPoolExecutor(corpus.JOBS) as pool:
        for name in names:
            make_kind(pool, half, name, tracks)


if __name__ == "__main__":
    main()
