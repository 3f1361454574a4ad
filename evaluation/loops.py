#!/usr/bin/python3
"""Makes what must never match: drum loops of one tempo, metronomes, tones, hum, silence.

    evaluation/loops.py

Writes a minute of each into <cache>/loops/known (for the catalogue) or <cache>/loops/strangers, and
clips of the strangers into <cache>/clips/loops, with their truth.jsonl as evaluation/clips.py writes
it. Of each tempo several loops are known and several are strangers: other rhythms on the same drums,
and the same rhythm on other drums. The tones, hums and metronomes of both roles differ in phase
only: they are no music, and a match between them says nothing.
"""

import json
import pathlib
import wave

import numpy

import clips
import corpus
import degrade

RATE = 44100
LENGTH = 60
TEMPI = (80, 90, 100, 110, 120, 128, 140, 174)

# Sixteenths of a bar: kick, snare, closed hat.
RHYTHMS = {
    "rock": ("x.......x.x.....", "....x.......x...", "x.x.x.x.x.x.x.x."),
    "house": ("x...x...x...x...", "....x.......x...", "..x...x...x...x."),
    "break": ("x.x.......x..x..", "....x..x.x..x..x", "x.x.x.x.x.x.x.x."),
    "half": ("x.....x...x.....", "........x.......", "x.xxx.x.x.xxx.x."),
    "plain": ("x.......x.......", "....x.......x...", "x...x...x...x..."),
}
# Of each drum kit: pitch and decay of the kick, decay of the snare, decay of the hat.
KITS = {"deep": (48, 0.18, 0.16, 0.03), "tight": (62, 0.09, 0.09, 0.02), "room": (55, 0.3, 0.28, 0.07)}
KNOWN = (("rock", "deep"), ("house", "tight"), ("break", "room"))
STRANGERS = (("rock", "tight"), ("house", "deep"), ("half", "deep"), ("plain", "tight"), ("plain", "room"))
NOISES = ("dither", "white", "pink")
KINDS = ("clean", "mp3_32", "white_10", "mic")


def decaying(count, seconds):
    return numpy.exp(-numpy.arange(count) / (seconds * RATE))


def drums(kit, random):
    """The sounds of a kit: kick, snare, hat."""
    pitch, kick, snare, hat = KITS[kit]
    times = numpy.arange(RATE // 2) / RATE
    sweep = 2 * numpy.pi * (pitch * times + 1.8 * (1 - numpy.exp(-times / 0.02)))
    hiss = random.standard_normal((2, RATE // 2))
    bright = numpy.diff(hiss[1], 2, append=[0, 0])
    tone = numpy.sin(2 * numpy.pi * 190 * times)
    return (0.9 * numpy.sin(sweep) * decaying(len(times), kick),
            (0.25 * hiss[0] + 0.2 * tone) * decaying(len(times), snare),
            0.08 * bright * decaying(len(times), hat))


def drum_loop(rhythm, kit, tempo):
    random = clips.Random(f"kit {kit}")
    made = numpy.zeros((LENGTH + 1) * RATE)
    step = 60 / tempo / 4
    for pattern, sound in zip(RHYTHMS[rhythm], drums(kit, random)):
        for number in range(int(LENGTH / step)):
            if pattern[number % 16] == "x":
                start = round(number * step * RATE)
                made[start:start + len(sound)] += sound
    return made[:LENGTH * RATE]


def metronome(tempo, pitch, shift):
    made = numpy.zeros((LENGTH + 1) * RATE)
    times = numpy.arange(RATE // 20) / RATE
    for number in range(int(LENGTH * tempo / 60)):
        high = 1.5 if number % 4 == 0 else 1.0
        start = round((number * 60 / tempo + shift) * RATE)
        made[start:start + len(times)] += 0.6 * numpy.sin(2 * numpy.pi * pitch * high * times) * decaying(
            len(times), 0.01)
    return made[:LENGTH * RATE]


def tone(frequency, phase, harmonics=1):
    times = numpy.arange(LENGTH * RATE) / RATE
    return sum(0.4 / number * numpy.sin(2 * numpy.pi * frequency * number * times + phase * number)
               for number in range(1, harmonics + 1))


def hiss(slope, name):
    return 0.1 * degrade.shaped(clips.Random(name), LENGTH * RATE, RATE, slope)[:, 0]


def signals(role):
    """What is neither loop nor music; the two roles differ in phase or seed."""
    phase = 0.0 if role == "known" else 1.1
    dither = clips.Random(f"dither {role}").integers(-1, 2, LENGTH * RATE) / 32768
    return {
        "silence": numpy.zeros(LENGTH * RATE),
        "constant": numpy.full(LENGTH * RATE, 0.3),
        "dither": dither,
        "hum50": tone(50, phase, 8),
        "hum60": tone(60, phase, 8),
        "sine440": tone(440, phase),
        "sine1000": tone(1000, phase),
        "metronome60": metronome(60, 1000, phase / 10),
        "metronome120": metronome(120, 1000, phase / 10),
        "metronome120-low": metronome(120, 700, phase / 10),
        "white": hiss(0, f"white {role}"),
        "pink": hiss(1, f"pink {role}"),
    }


def sounds(role):
    loops = KNOWN if role == "known" else STRANGERS
    made = {f"loop{tempo}-{rhythm}-{kit}": drum_loop(rhythm, kit, tempo)
            for tempo in TEMPI for rhythm, kit in loops}
    return made | signals(role)


def write(file, samples):
    file.parent.mkdir(parents=True, exist_ok=True)
    with wave.open(str(file), "wb") as opened:
        opened.setnchannels(1)
        opened.setsampwidth(2)
        opened.setframerate(RATE)
        opened.writeframes(numpy.clip(numpy.round(samples * 32767), -32768, 32767).astype("<i2").tobytes())


def cut(samples, name, kind):
    """A clip at a random place, degraded; its line of truth."""
    random = clips.Random(f"loops {name} {kind}")
    count = round(14.3 * RATE)
    position = int(random.integers(len(samples) - count))
    folder = corpus.CACHE / "clips" / "loops" / kind
    folder.mkdir(parents=True, exist_ok=True)
    clip = samples[position:position + count, None]
    if kind != "clean" and degrade.level(clip) == 0:
        return None
    file = pathlib.Path(degrade.all_kinds()[kind].make(clip, RATE, random, folder / name))
    return {"file": str(file.relative_to(folder.parent)), "kind": kind, "role": "stranger",
            "track": name, "position": position, "rate": RATE, "seconds": position / RATE,
            "length": 14.3, "speed": 1.0, "tempo": 1.0, "pitch": 1.0}


def main():
    for role in ("known", "strangers"):
        for name, samples in sounds(role).items():
            write(corpus.CACHE / "loops" / role / f"{role}-{name}.wav", samples)
    lines = [cut(samples, name, kind) for name, samples in sounds("strangers").items() for kind in KINDS]
    # Tones and clicks do not even match themselves; a recording of noise does, as it should.
    lines += [cut(samples, f"same-{name}", "clean") for name, samples in signals("known").items()
              if name not in NOISES]
    truth = corpus.CACHE / "clips" / "loops" / "truth.jsonl"
    truth.write_text("".join(json.dumps(line, sort_keys=True) + "\n" for line in lines if line))


if __name__ == "__main__":
    main()
