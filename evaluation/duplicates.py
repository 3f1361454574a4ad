#!/usr/bin/python3
"""Measures how well `kzfp duplicates` finds planted copies among other music.

    evaluation/duplicates.py make tune|report        plants the copies
    evaluation/duplicates.py run KZFP tune|report    looks for them and prints the table
    evaluation/duplicates.py scale KZFP COUNT        the same for report, among COUNT tracks more

The music is what `corpus.py fetch` provides. Forty-two tracks of `report`, or ten of `tune`, are
copied in eleven ways each, into <cache>/duplicates/<half>/<kind>/. The copies, their originals and
all other tracks of the half are one catalogue. Every pair of files that `kzfp duplicates` puts into
one group is right when both are of the same track, or when the two tracks are listed in shared.tsv,
and false otherwise. The tracks of `scale` are four minutes each of codes of real tracks, rotated by
an even number of bits and, from the 32nd turn on, reversed in time.
"""

import concurrent.futures
import hashlib
import json
import pathlib
import shutil
import struct
import subprocess
import sys
import time

import numpy

import corpus

TRACKS = {"tune": 10, "report": 42}
SHORTEST, LONGEST = 40, 100  # seconds of the tracks that are copied
FOLDER = corpus.CACHE / "duplicates"


FAST = ("-compression_level", "0")


def seeded(name):
    seed = int.from_bytes(hashlib.sha256(name.encode()).digest()[:8], "big")
    return numpy.random.Generator(numpy.random.PCG64(seed))


def encoded(suffix, *options):
    return lambda track, random: (suffix, [], options)


def opus(track, random):
    return "opus", [], ("-c:a", "libopus", "-b:a", "64k")


def resampled(track, random):
    rate = 48000 if track["rate"] == 44100 else 44100
    return "flac", [], (*FAST, "-ar", str(rate))


def cut(track, random):
    """2 to 5 s less at either end."""
    begin, end = random.uniform(2, 5, 2)
    seconds = track["frames"] / track["rate"]
    return "flac", ["-ss", f"{begin:.4f}", "-t", f"{seconds - begin - end:.4f}"], FAST


def excerpt(track, random):
    begin = random.uniform(0, track["frames"] / track["rate"] - 20)
    return "flac", ["-ss", f"{begin:.4f}", "-t", "20"], FAST


def leading_silence(track, random):
    return "flac", [], (*FAST, "-af", f"adelay={random.integers(1000, 5000)}:all=1")


KINDS = {
    "mp3_64": encoded("mp3", "-c:a", "libmp3lame", "-b:a", "64k"),
    "mp3_128": encoded("mp3", "-c:a", "libmp3lame", "-b:a", "128k"),
    "ogg": encoded("ogg", "-c:a", "libvorbis", "-q:a", "4"),
    "opus_64": opus,
    "flac": encoded("flac", *FAST),
    "resampled": resampled,
    "quieter_6db": encoded("flac", *FAST, "-af", "volume=-6dB"),
    "mono": encoded("flac", *FAST, "-ac", "1"),
    "cut_both_ends": cut,
    "leading_silence": leading_silence,
    "excerpt_20s": excerpt,
}


def original(track):
    return corpus.CACHE / "tracks" / f"{track['id']}.wav"


def chosen(half):
    """Tracks drawn at random; nature is no recording of music."""
    tracks = [track for track in corpus.manifest(half)
              if track["music"] and SHORTEST <= track["frames"] / track["rate"] <= LONGEST]
    order = seeded(f"{half} duplicates").permutation(len(tracks))
    return [tracks[place] for place in order[:TRACKS[half]]]


def plant(half, kind, track):
    suffix, before, after = KINDS[kind](track, seeded(f"{half} {kind} {track['id']}"))
    target = FOLDER / half / kind / f"{track['id']}.{suffix}"
    if target.exists():
        return
    part = target.with_name("part." + target.name)
    done = corpus.run("ffmpeg", "-v", "error", "-nostdin", "-y", *before, "-i", original(track),
                      *after, part)
    if done.returncode != 0:
        sys.exit(f"{target}: {done.stderr.decode()}")
    part.rename(target)


def make(half):
    for kind in KINDS:
        (FOLDER / half / kind).mkdir(parents=True, exist_ok=True)
    with concurrent.futures.ThreadPoolExecutor(corpus.JOBS) as pool:
        jobs = [pool.submit(plant, half, kind, track) for kind in KINDS for track in chosen(half)]
        for job in jobs:
            job.result()


def catalogue_of(kzfp, half):
    """Holds the copies and all tracks of the half."""
    file = FOLDER / f"{half}.kzc"
    files = [original(track) for track in corpus.manifest(half)]
    subprocess.run([kzfp, "add", "--quiet", file, *files, *(FOLDER / half / kind for kind in KINDS)],
                   check=True, stdout=subprocess.DEVNULL)
    return file


CODES = 1292  # of a track of `scale`


def crc32c(rows):
    """Of each row of bytes."""
    table = numpy.arange(256, dtype=numpy.uint32)
    for _ in range(8):
        table = numpy.where(table & 1, table >> 1 ^ 0x82F63B78, table >> 1).astype(numpy.uint32)
    state = numpy.full(len(rows), 0xFFFFFFFF, dtype=numpy.uint32)
    for column in numpy.ascontiguousarray(rows.T):
        state = table[(state ^ column) & 255] ^ state >> 8
    return ~state


def real_codes():
    """The codes of the known tracks, which kzscale has written, in a row."""
    files = [corpus.CACHE / "trails" / f"{track['id']}.kzt"
             for half in ("tune", "report") for track in corpus.known(half)]
    if not all(file.exists() for file in files):
        sys.exit("trails are missing: run kzscale once with --half tune and once with --half report")
    return numpy.concatenate([numpy.fromfile(file, "<u8", offset=64) for file in files])


def changed(codes, turn):
    """Another way for each turn from 1 to 62."""
    bits = numpy.uint64(2 * (turn % 31 + 1))
    return (codes << bits | codes >> numpy.uint64(64) - bits)[::1 if turn <= 31 else -1]


def write_trails(folder, count):
    """Trail files of codes that no real track has."""
    real = real_codes()
    turns = -(-count * CODES // len(real))
    if turns > 62:
        sys.exit(f"there can be {62 * len(real) // CODES} tracks")
    codes = numpy.concatenate([changed(real, turn) for turn in range(1, turns + 1)])[:count * CODES]
    rows = codes.reshape(count, CODES).view(numpy.uint8)
    head = struct.pack("<8sIIQQ24x", b"\x89KZT\r\n\x1a\n", 1, 1, 4096 + 2048 * (CODES - 1), CODES)
    heads = numpy.zeros((count, 60), dtype=numpy.uint8)
    heads[:, :56] = numpy.frombuffer(head, numpy.uint8)
    heads[:, 56:] = crc32c(rows).astype("<u4").view(numpy.uint8).reshape(count, 4)
    checks = crc32c(heads).astype("<u4")
    folder.mkdir(parents=True)
    for number in range(count):
        (folder / f"{number:05}.kzt").write_bytes(
            heads[number].tobytes() + checks[number].tobytes() + rows[number].tobytes())


def scale(kzfp, count):
    catalogue = FOLDER / f"scale{count}.kzc"
    if not catalogue.exists():
        folder = FOLDER / "scale"
        write_trails(folder, count)
        subprocess.run([kzfp, "add", "--quiet", catalogue, folder], check=True,
                       stdout=subprocess.DEVNULL)
        subprocess.run([kzfp, "merge", "--quiet", catalogue, catalogue_of(kzfp, "report")],
                       check=True, stdout=subprocess.DEVNULL)
        shutil.rmtree(folder)
    conclude(kzfp, "report", catalogue)


def shared_pairs():
    lines = (corpus.HERE / "shared.tsv").read_text(encoding="utf-8").splitlines()
    return {frozenset(line.split("\t")[:2]) for line in lines if not line.startswith("#")}


def label(file):
    """The kind of a copy, or "tracks" for an original, and the track's id."""
    path = pathlib.Path(file)
    return path.parent.name, path.name.rsplit(".", 1)[0]


def duplicates(kzfp, catalogue):
    """The groups, as lists of files with their kinds and ids, and the seconds that it took."""
    began = time.monotonic()
    done = subprocess.run([kzfp, "duplicates", "--quiet", "--format", "json", catalogue],
                          check=True, capture_output=True)
    seconds = time.monotonic() - began
    groups = [json.loads(line)["files"] for line in done.stdout.splitlines()]
    for group in groups:
        for file in group:
            file["kind"], file["id"] = label(file["file"])
    return groups, seconds


def found_copies(groups):
    """The copies that are in one group with their originals, by kind and id."""
    copies = {}
    for group in groups:
        originals = {file["id"] for file in group if file["kind"] == "tracks"}
        for file in group:
            if file["id"] in originals:
                copies.setdefault((file["kind"], file["id"]), []).append(file)
    return copies


def false_pairs(groups):
    """Tracks that share no sound and are in one group all the same."""
    shared = shared_pairs()
    pairs = {frozenset((one["id"], other["id"])) for group in groups
             for one in group for other in group if one["id"] != other["id"]}
    return sorted(sorted(pair) for pair in pairs - shared)


def table(half, groups):
    tracks = chosen(half)
    copies = found_copies(groups)
    print("| kind | planted | found | relation right | bits that differ: median, most |")
    print("|---|---:|---:|---:|---:|")
    for kind in KINDS:
        right = {"excerpt"} if kind == "excerpt_20s" else {
            "best", "same recording", "identical sound", "identical bytes"}
        found = [copies[kind, track["id"]] for track in tracks if (kind, track["id"]) in copies]
        named = sum(any(file["relation"] in right for file in files) for files in found)
        errors = [file["error_rate"] for files in found for file in files] or [0]
        print(f"| {kind} | {len(tracks)} | {len(found)} | {named} | "
              f"{numpy.median(errors):.3f}, {max(errors):.3f} |")
        for track in tracks:
            if (kind, track["id"]) not in copies:
                print(f"not found: {kind} {track['id']}", file=sys.stderr)


def conclude(kzfp, half, catalogue):
    groups, seconds = duplicates(kzfp, catalogue)
    table(half, groups)
    whole = [[file for file in group if file["relation"] != "excerpt"] for group in groups]
    planted = {track["id"] for track in chosen(half)}
    best = [group[0] for group in groups if group[0]["id"] in planted]
    print(f"\n{sum(map(len, groups))} files in {len(groups)} groups, {seconds:.1f} s")
    print(f"best files: {len(best)}, lossless: {sum(file['lossless'] for file in best)}, "
          f"of {sorted({file['kind'] for file in best})}")
    for name, some in (("as the same recording", whole), ("in any way", groups)):
        pairs = false_pairs(some)
        print(f"pairs of different tracks that were grouped {name}: {len(pairs)}")
        for pair in pairs:
            print("   ", *pair)


def main():
    if len(sys.argv) == 3 and sys.argv[1] == "make":
        make(sys.argv[2])
    elif len(sys.argv) == 4 and sys.argv[1] == "run":
        conclude(sys.argv[2], sys.argv[3], catalogue_of(sys.argv[2], sys.argv[3]))
    elif len(sys.argv) == 4 and sys.argv[1] == "scale":
        scale(sys.argv[2], int(sys.argv[3]))
    else:
        sys.exit(__doc__)


if __name__ == "__main__":
    main()
