"""Finds tracks that contain the same recording, by Chromaprint's values of both.

Two tracks have a recording in common where many of their 32-bit values agree exactly at one
distance in time; what is found so is confirmed by the share of differing bits over that stretch.
"""

import concurrent.futures
import json
import os
import subprocess

import numpy

JOBS = int(os.environ.get("JOBS", "2"))
PER_SECOND = 11025 / 1365  # Chromaprint's values
COMMON = 30  # a value that occurs in more places than this says nothing
HITS = 8  # exact agreements on a diagonal that are worth a look
LONGEST = 4096  # values of a track, at most
STRETCH = int(10 * PER_SECOND)  # values that are compared at a time: ten seconds
SAME = 0.12  # share of differing bits below which two stretches are one recording


def fpcalc(files):
    """What fpcalc prints of some files; it reports an error at the end of every FLAC file."""
    done = subprocess.run(["fpcalc", "-ignore-errors", "-raw", "-json", "-length", "240", *files],
                          capture_output=True, text=True, check=False)
    return [numpy.array(json.loads(line)["fingerprint"], dtype=numpy.uint32)
            for line in done.stdout.splitlines() if line.startswith("{")]


def fingerprint_batch(files):
    """The values of each file; none of those in which fpcalc finds no sound."""
    prints = fpcalc(files)
    if len(prints) == len(files):
        return prints
    return [(fpcalc([file]) or [numpy.zeros(0, numpy.uint32)])[0] for file in files]


def fingerprints(files):
    names = [str(file) for file in files]
    batches = [names[place:place + 30] for place in range(0, len(names), 30)]
    with concurrent.futures.ThreadPoolExecutor(JOBS) as pool:
        return [one for batch in pool.map(fingerprint_batch, batches) for one in batch]


def diagonals(prints):
    """Yields pairs of tracks and their distance, where HITS or more values agree exactly."""
    values = numpy.concatenate(prints)
    owner = numpy.repeat(numpy.arange(len(prints)), [len(one) for one in prints])
    place = numpy.concatenate([numpy.arange(len(one)) for one in prints])
    order = numpy.argsort(values, kind="stable")
    values, owner, place = values[order], owner[order], place[order]
    starts = numpy.flatnonzero(numpy.r_[True, values[1:] != values[:-1]])
    occurrences = numpy.diff(numpy.r_[starts, len(values)]).repeat(
        numpy.diff(numpy.r_[starts, len(values)]))
    keys = []
    for step in range(1, COMMON):
        agree = (values[step:] == values[:-step]) & (occurrences[step:] <= COMMON)
        agree &= owner[step:] != owner[:-step]
        first, second = numpy.flatnonzero(agree), numpy.flatnonzero(agree) + step
        # A stable sort keeps the tracks of one value in ascending order.
        distance = place[second] - place[first] + LONGEST
        keys.append((owner[first] * len(prints) + owner[second]) * (2 * LONGEST) + distance)
    found, counts = numpy.unique(numpy.concatenate(keys), return_counts=True)
    for key in found[counts >= HITS]:
        pair, distance = divmod(int(key), 2 * LONGEST)
        yield *divmod(pair, len(prints)), distance - LONGEST


def smallest_difference(first, second, distance):
    """The least share of differing bits over ten seconds, at a distance near the given one."""
    best = 1.0
    for shift in range(distance - 1, distance + 2):
        start = max(0, -shift)
        length = min(len(first) - start, len(second) - start - shift)
        if length < STRETCH:
            continue
        differing = numpy.bitwise_xor(first[start:start + length],
                                      second[start + shift:start + shift + length])
        bits = numpy.unpackbits(differing.view(numpy.uint8)).reshape(length, 32).sum(axis=1)
        sums = numpy.convolve(bits, numpy.ones(STRETCH, int), "valid")
        best = min(best, float(sums.min()) / (32 * STRETCH))
    return best


def pairs(prints):
    """Pairs of tracks with a stretch in common: the share of differing bits and the distance."""
    found = {}
    for a, b, distance in diagonals(prints):
        differing = smallest_difference(prints[a], prints[b], distance)
        if differing < SAME and differing < found.get((a, b), (1.0, 0))[0]:
            found[(a, b)] = (differing, distance)
    return found


def repeated(tracks, cache):
    """Which tracks to leave out, and because of which other track each."""
    prints = fingerprints([cache / "tracks" / f"{track['id']}.wav" for track in tracks])
    left_out = {}
    with (cache / "shared_audio.tsv").open("w") as log:
        for (a, b), (differing, distance) in sorted(pairs(prints).items()):
            first, second = tracks[a]["id"], tracks[b]["id"]
            log.write(f"{first}\t{second}\t{differing:.3f}\t{distance / PER_SECOND:.1f}\n")
            if first not in left_out and second not in left_out:
                left_out[second] = first
    for track, values in zip(tracks, prints):
        if len(numpy.unique(values)) < 0.1 * len(values) + 10:
            left_out.setdefault(track["id"], "almost nothing but silence or one sound")
    return left_out
