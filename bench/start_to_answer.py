#!/usr/bin/python3
"""Times `kzfp match` from start to answer: a clip of 14.3 s against a catalogue of many tracks.

    bench/start_to_answer.py KZFP [--tracks 10000] [--clips 20]

The catalogue is made once, in $KZ_MEDIA/evaluation/scale/<tracks>.kzc: the trails of evaluation/
and copies of them, reversed in time or with all codes rotated, each of 1292 codes (4 minutes). Printed are medians over
the clips: the time on the clock, the processor's time, and the same for `kzfp help`, which
starts the program and does nothing else.
"""

import argparse
import os
import pathlib
import resource
import statistics
import struct
import subprocess
import sys
import time

import numpy

MEDIA = pathlib.Path(os.environ.get("KZ_MEDIA", "build/media")) / "evaluation"
CODES = 1292  # a track of four minutes
TABLE = numpy.zeros(256, numpy.uint32)
for index in range(256):
    word = index
    for _ in range(8):
        word = (word >> 1) ^ (0x82F63B78 if word & 1 else 0)
    TABLE[index] = word


def crc32c(rows):
    """The checksum of each row of bytes."""
    sums = numpy.full(len(rows), 0xFFFFFFFF, numpy.uint32)
    for column in rows.T:
        sums = TABLE[(sums ^ column) & 0xFF] ^ (sums >> 8)
    return sums ^ 0xFFFFFFFF


def real_codes():
    """The codes of all trails, one after the other."""
    files = sorted((MEDIA / "trails").glob("*.kzt"))
    if not files:
        sys.exit(f"start_to_answer.py: no trails in {MEDIA / 'trails'}; run kzscale once")
    return numpy.concatenate([numpy.fromfile(file, "<u8", offset=64) for file in files])


def write_trails(folder, count):
    folder.mkdir(parents=True, exist_ok=True)
    codes = real_codes()
    rows = codes[:len(codes) // CODES * CODES].reshape(-1, CODES)
    rows = numpy.concatenate([rows, rows[:, ::-1]])
    made = 0
    for turn in range(0, 64, 2):
        turned = (rows << numpy.uint64(turn)) | (rows >> numpy.uint64(64 - turn)) if turn else rows
        turned = numpy.ascontiguousarray(turned[:count - made], "<u8")
        sums = crc32c(turned.view(numpy.uint8).reshape(len(turned), -1))
        head = b"\x89KZT\r\n\x1a\n" + struct.pack("<IIQQ24x", 1, 1, 4096 + 2048 * (CODES - 1), CODES)
        for row, checksum in zip(turned, sums):
            start = head + struct.pack("<I", checksum)
            own = int(crc32c(numpy.frombuffer(start, numpy.uint8)[None, :])[0])
            (folder / f"{made:06}.kzt").write_bytes(start + struct.pack("<I", own) + row.tobytes())
            made += 1
        if made == count:
            return
    sys.exit(f"start_to_answer.py: the trails are enough for {made} tracks only")


def provide(kzfp, count):
    catalogue = MEDIA / "scale" / f"{count}.kzc"
    if not catalogue.exists():
        trails = MEDIA / "scale" / "trails"
        write_trails(trails, count)
        subprocess.run([kzfp, "add", "--quiet", catalogue, trails], check=True,
                       stdout=subprocess.DEVNULL)
        for file in trails.iterdir():
            file.unlink()
        trails.rmdir()
    return catalogue


def timed(*command):
    """Seconds on the clock and of the processor, and the peak of memory in MB."""
    before = resource.getrusage(resource.RUSAGE_CHILDREN)
    begin = time.perf_counter()
    subprocess.run([str(part) for part in command], check=True, stdout=subprocess.DEVNULL)
    clock = time.perf_counter() - begin
    after = resource.getrusage(resource.RUSAGE_CHILDREN)
    return clock, (after.ru_utime + after.ru_stime) - (before.ru_utime + before.ru_stime)


def show(name, times):
    clock, processor = (statistics.median(values) for values in zip(*times))
    print(f"| {name} | {1000 * clock:.0f} ms | {1000 * processor:.0f} ms |")


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("kzfp")
    parser.add_argument("--tracks", type=int, default=10000)
    parser.add_argument("--clips", type=int, default=20)
    options = parser.parse_args()
    catalogue = provide(options.kzfp, options.tracks)
    print("| | on the clock | of the processor |\n|---|---:|---:|")
    show("kzfp help", [timed(options.kzfp, "help") for _ in range(options.clips)])
    show("the first match, which makes the index",
         [timed(options.kzfp, "match", catalogue, next((MEDIA / "clips/report/clean").glob("k*")))])
    for kind, role in (("clean", "k"), ("clean", "s"), ("mp3_64", "k"), ("telephone", "k")):
        clips = sorted((MEDIA / "clips" / "report" / kind).glob(f"{role}*"))[:options.clips]
        name = f"{kind}, {'from a track' if role == 'k' else 'a stranger'}"
        show(name, [timed(options.kzfp, "match", catalogue, clip) for clip in clips])


if __name__ == "__main__":
    main()
