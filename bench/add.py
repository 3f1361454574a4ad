#!/usr/bin/env python3
"""Measures what `kzfp add` costs: time beside decoding alone and beside fpcalc, and memory.

    bench/add.py [--program build/release/tools/kzfp/kzfp] [--files 10000]

Times are those of the processor, user and system together, since others may use the machine; the
median of seven runs counts. Without ffmpeg or fpcalc, what needs them is left out.
"""

import argparse
import array
import math
import os
import pathlib
import random
import shutil
import statistics
import subprocess
import sys
import tempfile
import time
import wave

RATE = 44100
ROUNDS = 7


def peak_of(process):
    """KiB of resident memory at most, as long as the process lives; what is reported at its end
    would include the memory of this program, which it was forked from."""
    try:
        status = pathlib.Path(f"/proc/{process}/status").read_text(encoding="ascii")
    except OSError:
        return 0
    return max((int(line.split()[1]) for line in status.splitlines()
                if line.startswith("VmHWM")), default=0)


def run(command, may_fail=False):
    """Processor seconds, wall seconds and peak KiB of a command."""
    with tempfile.TemporaryFile() as messages:
        began = time.monotonic()
        process = subprocess.Popen(command, stdout=subprocess.DEVNULL, stderr=messages)
        peak = ended = 0
        while not ended:
            peak = max(peak, peak_of(process.pid))
            time.sleep(0.005)
            ended, status, usage = os.wait4(process.pid, os.WNOHANG)
        clock = time.monotonic() - began
        process.returncode = os.waitstatus_to_exitcode(status)
        messages.seek(0)
        if process.returncode != 0 and not may_fail:
            sys.exit(f"{command[0]} failed: {messages.read().decode(errors='replace')}")
    return usage.ru_utime + usage.ru_stime, clock, peak


def median_of(action):
    """The run of a median processor time."""
    return sorted((action() for _ in range(ROUNDS)), key=lambda result: result[0])[ROUNDS // 2]


def seconds_of(path):
    with wave.open(str(path)) as sound:
        return sound.getnframes() / sound.getframerate()


def write_wav(path, rate, channels, samples):
    with wave.open(str(path), "wb") as sound:
        sound.setnchannels(channels)
        sound.setsampwidth(2)
        sound.setframerate(rate)
        sound.writeframes(samples.tobytes())


def melody(seed, rate, seconds):
    """Notes of three partials, by integers and a table, in one channel."""
    table = [int(6000 * math.sin(2 * math.pi * i / 4096)) for i in range(4096)]
    notes = random.Random(seed)
    samples = array.array("h")
    while len(samples) < rate * seconds:
        step = int(4096 * notes.uniform(110, 1400) / rate * 256)
        for i in range(rate // 4):
            at = i * step >> 8
            samples.append(table[at & 4095] + table[2 * at & 4095] // 2 + table[3 * at & 4095] // 3)
    return samples[: int(rate * seconds)]


def make_tracks(folder, count, seconds):
    """Stereo WAV files of the kind that CDs hold."""
    paths = []
    for seed in range(count):
        one = melody(seed, RATE, 20)
        both = array.array("h", [0]) * (2 * len(one))
        both[0::2] = one
        both[1::2] = one[1000:] + one[:1000]
        path = folder / f"{seed}.wav"
        write_wav(path, RATE, 2, both * (seconds // 20))
        paths.append(path)
    return paths


def add(program, folder, files, jobs=1):
    catalogue = folder / "measured.kzc"
    for path in folder.glob("measured.kzc*"):
        path.unlink()
    return run([program, "add", "-q", "-j", str(jobs), str(catalogue), *map(str, files)])


DECODE = """
import ctypes, sys
if len(sys.argv) > 1:
    lib = ctypes.CDLL("libsndfile.so.1")
class Info(ctypes.Structure):
    _fields_ = [("frames", ctypes.c_int64)] + [(n, ctypes.c_int) for n in
                ("rate", "channels", "format", "sections", "seekable")]
for path in sys.argv[1:]:
    lib.sf_open.restype = ctypes.c_void_p
    lib.sf_readf_float.restype = ctypes.c_int64
    info = Info()
    file = ctypes.c_void_p(lib.sf_open(path.encode(), 0x10, ctypes.byref(info)))
    block = (ctypes.c_float * (16384 * info.channels))()
    while lib.sf_readf_float(file, block, ctypes.c_int64(16384)) > 0:
        pass
"""


def decoding_seconds(paths):
    """Processor seconds of libsndfile alone, as floats, in a process of its own."""
    python = [sys.executable, "-I", "-c", DECODE]
    return run(python + [str(path) for path in paths])[0] - run(python)[0]


def measure_tracks(program, folder):
    tracks = make_tracks(folder, 4, 240)
    sound = sum(seconds_of(path) for path in tracks)
    spent = statistics.median(add(program, folder, tracks)[0] for _ in range(ROUNDS))
    print(f"WAV, 44100 Hz stereo: {sound / spent:.0f} x real time a core")
    if shutil.which("ffmpeg") is None:
        print("MP3: left out, since ffmpeg is missing (scripts/setup.sh clips)")
        return
    coded = []
    for path in tracks:
        coded.append(path.with_suffix(".mp3"))
        run(["ffmpeg", "-v", "error", "-y", "-i", str(path), "-b:a", "192k", str(coded[-1])])
    pairs = [(add(program, folder, coded)[0], decoding_seconds(coded)) for _ in range(ROUNDS)]
    ratio = statistics.median(ours / alone for ours, alone in pairs)
    ours, alone = (statistics.median(column) for column in zip(*pairs))
    print(f"MP3, 192 kbit/s: {sound / ours:.0f} x real time a core, {ratio:.2f} x decoding alone "
          f"({sound / alone:.0f} x real time)")
    measure_beside_fpcalc(program, folder, coded)


def measure_beside_fpcalc(program, folder, files):
    if shutil.which("fpcalc") is None:
        print("fpcalc: left out, since it is missing (scripts/setup.sh evaluation)")
        return
    jobs = os.cpu_count() or 1
    names = folder / "names"
    names.write_bytes(b"\0".join(str(path).encode() for path in files))
    for length, what in (("0", "all of each file"), ("120", "120 s of each file, its default")):
        command = ["xargs", "-0", "-a", str(names), "-n", "1", "-P", str(jobs),
                   "fpcalc", "-length", length]
        # It prints the fingerprint and fails when it comes to the end of an MP3 file.
        peer = median_of(lambda: run(command, may_fail=True))
        print(f"fpcalc, xargs -P {jobs}, {what}: {len(files) / peer[0]:.1f} files a second of "
              f"processor time ({len(files) / peer[1]:.1f} by the clock)")
    ours = median_of(lambda: add(program, folder, files, jobs))
    print(f"kzfp add -j {jobs}, all of each file: {len(files) / ours[0]:.1f} files a second of "
          f"processor time ({len(files) / ours[1]:.1f} by the clock)")


def make_small_files(folder, count):
    long = melody(99, 8000, 120)
    chance = random.Random(1)
    (folder / "small").mkdir()
    paths = []
    for i in range(count):
        first, second = (chance.randrange(len(long) - 8000) for _ in range(2))
        path = folder / "small" / f"{i:05}.wav"
        write_wav(path, 8000, 1, long[first:first + 8000] + long[second:second + 8000])
        paths.append(path)
    return paths


def measure_memory(program, folder, most):
    """Many small files, each with sound of its own."""
    files = make_small_files(folder, most)
    count = 100
    while count <= most:
        names = folder / "names"
        names.write_text("\n".join(map(str, files[:count])), encoding="utf-8")
        for path in folder.glob("measured.kzc*"):
            path.unlink()
        spent, clock, peak = run([program, "add", "-q", "--files-from", str(names),
                                  str(folder / "measured.kzc")])
        print(f"{count} files of 2 s: {peak / 1024:.1f} MiB at most, {count / spent:.0f} files a "
              f"second of processor time ({count / clock:.0f} by the clock)")
        count *= 10


def main():
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--program", default="build/release/tools/kzfp/kzfp")
    parser.add_argument("--files", type=int, default=10000, help="for the measure of memory")
    options = parser.parse_args()
    with tempfile.TemporaryDirectory(prefix="kzfp-add-") as name:
        folder = pathlib.Path(name)
        measure_tracks(options.program, folder)
        measure_memory(options.program, folder, options.files)


if __name__ == "__main__":
    main()
