#!/usr/bin/env python3
"""Prints the tables of docs/closeness.md that are not held by a test: what moves a fingerprint.

    scripts/measure_closeness.py KZFP [TUNE...]

Each row changes the music of `./run demo` in one way with sox and compares the fingerprint with the
unchanged one's: mean and largest absolute difference of the 30 values. The distances between all
pairs of the TUNEs, if there are any, follow as one line. The music is in build/media, or in
$KZ_MEDIA; scripts/make_clips.sh --music-only provides it.
"""

import itertools
import os
import pathlib
import subprocess
import sys
import tempfile

MEDIA = pathlib.Path(os.environ.get("KZ_MEDIA", pathlib.Path(__file__).parent.parent / "build/media"))
MUSIC = MEDIA / "music.wav"


def sox(*arguments):
    """Without dither and with a fixed seed, so that the same bytes come out every time."""
    subprocess.run(["sox", "-D", "-R", "-V1", *map(str, arguments)], check=True)


def values_of(kzfp, *arguments):
    """The 30 values, or None when there is no fingerprint."""
    done = subprocess.run([kzfp, "--format", "values", *map(str, arguments)], capture_output=True,
                          text=True, check=False)
    return [int(value) for value in done.stdout.split()] or None


def distance(first, second):
    if first is None or second is None:
        return "no fingerprint"
    differences = [abs(a - b) for a, b in zip(first, second, strict=True)]
    return f"{sum(differences) / len(differences):.1f} / {max(differences)}"


def table(title, rows):
    print(f"| {title} | mean / largest |\n|---|---:|")
    for name, cell in rows:
        print(f"| {name} | {cell} |")
    print()


def effect(*arguments):
    return lambda into: sox(MUSIC, "-b", "16", into, *arguments)


def coded(suffix, quality):
    def make(into):
        with tempfile.NamedTemporaryFile(suffix=suffix) as part:
            sox(MUSIC, "-C", quality, part.name)
            sox(part.name, "-b", "16", into)
    return make


def rms(sound):
    said = subprocess.run(["sox", sound, "-n", "stat"], capture_output=True, text=True, check=True)
    return next(float(line.split()[-1]) for line in said.stderr.splitlines()
                if line.startswith("RMS     amplitude"))


def with_noise(decibels):
    """Pink noise so far below the music, both lowered by 3 dB so that nothing is clipped."""
    def make(into):
        with tempfile.NamedTemporaryFile(suffix=".wav") as noise:
            sox("-n", "-r", 44100, "-c", 2, "-b", 16, noise.name, "synth", 30, "pinknoise")
            level = rms(MUSIC) / rms(noise.name) * 10 ** (-decibels / 20)
            sox("-m", "-v", 0.7, MUSIC, "-v", 0.7 * level, noise.name, "-b", 16, into)
    return make


CHANGES = {
    "coding": [
        *[(f"MP3, {rate} kbit/s", coded(".mp3", rate)) for rate in (320, 128, 64, 32)],
        *[(f"Ogg Vorbis, quality {quality}", coded(".ogg", quality)) for quality in (4, 0, -1)],
    ],
    "loudness": [(f"{level:+} dB", effect("gain", level))
                 for level in (6, -6, -12, -20, -25, -30, -40, -50)],
    "noise": [(f"pink noise {level} dB below the music", with_noise(level)) for level in (30, 20, 10, 0)],
    "speed and tempo": [
        *[(f"speed {factor}", effect("speed", factor, "rate", "-v", 44100))
          for factor in (1.001, 1.003, 0.99, 1.01, 0.98, 1.02, 1.05)],
        *[(f"tempo {factor}, same pitch", effect("tempo", "-m", factor)) for factor in (1.01, 1.03)],
    ],
    "filters and rooms": [
        ("low-pass at 4 kHz", effect("lowpass", 4000)),
        ("treble +6 dB", effect("gain", -8, "treble", "+6")),
        ("bass +3 dB", effect("gain", -8, "bass", "+3")),
        ("bass +6 dB", effect("gain", -8, "bass", "+6")),
        ("compressor", effect("gain", -6, "compand", "0.3,1", "6:-70,-60,-20", -5, -90, 0.2)),
        ("left channel alone", effect("remix", 1)),
        ("reverberation", effect("gain", -6, "reverb", 50)),
        ("telephone band, 300 to 3400 Hz", effect("sinc", "300-3400")),
    ],
}
STARTS = (0.005, 0.01, 0.02, 0.05, 0.1, 0.2, 0.5, 1, 2, 5, 10)


def main():
    if len(sys.argv) < 2:
        sys.exit(__doc__)
    kzfp, tunes = sys.argv[1], sys.argv[2:]
    reference = values_of(kzfp, MUSIC)
    table("start later by", [(f"{seconds} s", distance(reference, values_of(kzfp, "--start", seconds, MUSIC)))
                             for seconds in STARTS])
    with tempfile.TemporaryDirectory() as folder:
        changed = pathlib.Path(folder) / "changed.wav"
        for title, changes in CHANGES.items():
            rows = []
            for name, make in changes:
                make(changed)
                rows.append((name, distance(reference, values_of(kzfp, changed))))
            table(title, rows)
    if len(tunes) > 1:
        means = sorted(float(distance(values_of(kzfp, a), values_of(kzfp, b)).split()[0])
                       for a, b in itertools.combinations(tunes, 2))
        print(f"{len(tunes)} tunes, {len(means)} pairs: means from {means[0]} to {means[-1]}, "
              f"half of them below {means[len(means) // 2]}")


if __name__ == "__main__":
    main()
