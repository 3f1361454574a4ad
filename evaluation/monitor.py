#!/usr/bin/python3
"""Measures how well `kzfp monitor` follows a stream that is mixed from the tracks of the manifest.

    evaluation/monitor.py KZFP [--half report] [--hours 1] [--seed 1]

The stream is made of parts of tracks that are in the catalogue (13 in 20), of strangers (5 in 20)
and of silence (2 in 20), each at a random place of its track; a fifth of the parts is played as it
is, the others through MP3 of 48 kbit/s, a telephone line, pink noise 10 dB below, or 2 % faster.
One change in four is a crossfade of 4 s. What is printed: parts that were recognised, missed, named
wrongly, reported although nothing of them ran; how far reported borders are from the true ones; how
long after its beginning a track was reported; and the processor time. Needs FFmpeg, and the tracks
of evaluation/corpus.py.
"""

import argparse
import json
import pathlib
import random
import resource
import statistics
import subprocess
import sys
import tempfile

import numpy

import corpus

RATE = 22050
FADE = 4 * RATE
NEAR = 2.0  # seconds
LEAST = 6.0  # seconds that a part or an entry lasts to be counted
FILTERS = {
    "plain": "anull",
    "telephone": "aresample=8000,highpass=f=300,lowpass=f=3400",
    "faster": f"asetrate={round(RATE * 1.02)}",
}


def decoded(track, begin, seconds, treatment):
    """Samples of a part of a track, treated."""
    source = corpus.CACHE / "tracks" / f"{track}.wav"
    cut = ["ffmpeg", "-v", "error", "-nostdin", "-ss", str(begin), "-t", str(seconds), "-i", str(source), "-ac", "1"]
    raw = ["-ar", str(RATE), "-f", "s16le", "-"]
    if treatment == "mp3":
        coded = subprocess.run([*cut, "-b:a", "48k", "-f", "mp3", "-"], check=True, capture_output=True).stdout
        command = ["ffmpeg", "-v", "error", "-f", "mp3", "-i", "-", *raw]
        data = subprocess.run(command, input=coded, check=True, capture_output=True).stdout
    else:
        filters = f"aresample={RATE}," + FILTERS.get(treatment, "anull")
        data = subprocess.run([*cut, "-af", filters, *raw], check=True, capture_output=True).stdout
    samples = numpy.frombuffer(data[:len(data) // 2 * 2], dtype="<i2").astype(numpy.float64)
    return with_noise(samples) if treatment == "noise" else samples


def with_noise(samples):
    """Pink noise 10 dB below."""
    command = ["ffmpeg", "-v", "error", "-f", "lavfi", "-i",
               f"anoisesrc=c=pink:r={RATE}:d={len(samples) / RATE + 1}:s=1:a=1", "-f", "s16le", "-"]
    noise = numpy.frombuffer(subprocess.run(command, check=True, capture_output=True).stdout, dtype="<i2")
    noise = noise[:len(samples)].astype(numpy.float64)
    return samples + noise * (level(samples) / level(noise) * 10**(-10 / 20))


def level(samples):
    """Root of the mean square."""
    return numpy.sqrt(numpy.mean(samples**2))


def rounded(samples):
    return numpy.clip(numpy.rint(samples), -32768, 32767).astype("<i2")


def drawn(generator, tracks, seconds):
    """Parts at random: (kind, track, begin, seconds, treatment)."""
    total = 0
    while total < seconds:
        kind = generator.choice(["known"] * 13 + ["stranger"] * 5 + ["silence"] * 2)
        if kind == "silence":
            part = (kind, None, 0, generator.uniform(4, 12), "plain")
        else:
            track = generator.choice([one for one in tracks if one["role"] == kind])
            length = track["frames"] / track["rate"]
            wanted = min(generator.uniform(20, 120), length - 1)
            treatment = generator.choice(["plain", "mp3", "telephone", "noise", "faster"])
            part = (kind, track["id"], generator.uniform(0, length - wanted), wanted, treatment)
        total += part[3]
        yield part


def mixed(parts, generator):
    """The bytes of the stream, and the truth: kind, track, begin, end, fades."""
    stream = []
    length, truth = 0, []
    for kind, track, begin, seconds, treatment in parts:
        samples = numpy.zeros(int(seconds * RATE)) if track is None else decoded(track, begin, seconds, treatment)
        fades = truth and "silence" not in (kind, truth[-1]["kind"]) and len(samples) > 3 * FADE
        fade = FADE if fades and generator.random() < 0.25 else 0
        if fade:
            rise = numpy.arange(fade) / fade
            stream[-1][-fade:] = rounded(stream[-1][-fade:] * (1 - rise) + samples[:fade] * rise)
            truth[-1].update(end=truth[-1]["end"] - fade / 2 / RATE, faded_out=True)
        start = length - fade
        stream.append(rounded(samples[fade:]))
        length = start + len(samples)
        truth.append({"kind": kind, "track": track, "treatment": treatment, "place": begin, "faded_in": fade > 0,
                      "faded_out": False, "begin": (start + fade / 2) / RATE, "end": length / RATE})
    return b"".join(part.tobytes() for part in stream), truth


def shared_pairs():
    lines = (corpus.HERE / "shared.tsv").read_text().splitlines()
    return {frozenset(line.split("\t")[:2]) for line in lines if line and not line.startswith("#")}


def overlap(entry, part):
    return min(entry["end"], part["end"]) - max(entry["begin"], part["begin"])


def named(entry):
    return pathlib.Path(entry["source"]).stem


def score(truth, entries, shared):
    """Lines of a table; what was wrong goes to standard error."""
    def same(entry, part):
        return named(entry) == part["track"] or frozenset((named(entry), part["track"])) in shared
    heard = [entry for entry in entries if entry["heard"] == "track"]
    found, borders, late = {}, {"cut": [], "fade": []}, []
    for part in truth:
        if part["kind"] != "known":
            continue
        mine = [entry for entry in heard if same(entry, part) and overlap(entry, part) > LEAST / 2]
        seen, pieces = found.setdefault(part["treatment"], [0, 0, 0]), len(mine)
        seen[0] += 1
        seen[1] += pieces > 0
        seen[2] += pieces > 1
        if not mine:
            print("missed", json.dumps(part), file=sys.stderr)
            continue
        borders["fade" if part["faded_in"] else "cut"].append(mine[0]["begin"] - part["begin"])
        borders["fade" if part["faded_out"] else "cut"].append(mine[-1]["end"] - part["end"])
        late.append(mine[0]["reported"] - part["begin"])
    wrong = [entry for entry in heard
             if not any(part["kind"] == "known" and same(entry, part) and overlap(entry, part) > 0 for part in truth)]
    for entry in wrong:
        print("wrong", json.dumps(entry), file=sys.stderr)
    yield "| played | parts | recognised | in several pieces |"
    yield "|---|---:|---:|---:|"
    for treatment, (parts, seen, pieces) in sorted(found.items()):
        yield f"| {treatment} | {parts} | {seen} | {pieces} |"
    yield ""
    yield f"entries that name a track which did not run: {len(wrong)}"
    for what, errors in borders.items():
        sizes = sorted(abs(error) for error in errors)
        near = sum(size <= NEAR for size in sizes)
        yield (f"borders, {what}: {len(sizes)}; median {statistics.median(sizes):.2f} s, 95 % within "
               f"{sizes[int(0.95 * len(sizes))]:.2f} s, {near} within {NEAR:.0f} s")
    yield f"reported after: median {statistics.median(late):.1f} s, longest {max(late):.1f} s"
    quiet = [entry for entry in entries if entry["heard"] == "silence"]
    true_quiet = [part for part in truth if part["kind"] == "silence"]
    missed = [part for part in true_quiet
              if not any(overlap(entry, part) > 0.8 * (part["end"] - part["begin"]) for entry in quiet)]
    for part in missed:
        near = [entry for entry in entries if overlap(entry, part) > 0]
        print("missed", json.dumps(part), "instead:", json.dumps(near), file=sys.stderr)
    yield f"silences: {len(true_quiet) - len(missed)} of {len(true_quiet)} reported"


def entries_of(lines):
    """Entries that have ended, with how much of the stream had been heard when each was reported."""
    begun, entries = {}, []
    for line in lines:
        event = json.loads(line)
        key = (event.get("heard"), event.get("begin"))
        if event["event"] == "begins":
            begun[key] = event["known"]
        elif event["event"] == "ends":
            entries.append({**event, "reported": begun[key]})
    return entries


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("kzfp")
    parser.add_argument("--half", default="report")
    parser.add_argument("--hours", type=float, default=1)
    parser.add_argument("--seed", type=int, default=1)
    parser.add_argument("--catalogue", help="of the known tracks of this half; made when it is missing")
    options = parser.parse_args()
    tracks = [track for track in map(json.loads, corpus.MANIFEST.open()) if track["half"] == options.half]
    generator = random.Random(options.seed)
    with tempfile.TemporaryDirectory() as folder:
        catalogue = options.catalogue or f"{folder}/known.kzc"
        files = [str(corpus.CACHE / "tracks" / f"{one['id']}.wav") for one in tracks if one["role"] == "known"]
        if not pathlib.Path(catalogue).exists():
            subprocess.run([options.kzfp, "add", catalogue, *files], check=True, stdout=subprocess.DEVNULL)
        stream, truth = mixed(drawn(generator, tracks, options.hours * 3600), generator)
        before = resource.getrusage(resource.RUSAGE_CHILDREN)
        command = [options.kzfp, "monitor", "-f", "json", "--raw", f"{RATE},1,s16", catalogue, "-"]
        lines = subprocess.run(command, input=stream, check=True, capture_output=True).stdout.splitlines()
        after = resource.getrusage(resource.RUSAGE_CHILDREN)
    seconds = len(stream) / 2 / RATE
    used = after.ru_utime + after.ru_stime - before.ru_utime - before.ru_stime
    print(f"{seconds / 60:.0f} minutes, {len(truth)} parts, {len(files)} tracks in the catalogue; "
          f"{used:.1f} s of processor time: {seconds / used:.0f} times as fast as it is played\n")
    print("\n".join(score(truth, entries_of(lines), shared_pairs())))


if __name__ == "__main__":
    main()
