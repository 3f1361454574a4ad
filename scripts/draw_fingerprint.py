#!/usr/bin/env python3
"""Draws docs/fingerprint.svg: the values of a tune, of its MP3 and of another tune, as kzfp prints them.

    scripts/draw_fingerprint.py KZFP > docs/fingerprint.svg

The sounds are those of scripts/demo.sh, which makes them: run ./run demo first.
"""

import os
import pathlib
import subprocess
import sys

MEDIA = pathlib.Path(os.environ.get("KZ_MEDIA", pathlib.Path(__file__).parent.parent / "build/media"))
SOUNDS = [
    (MEDIA / "music.wav", "the tune, from a WAV file", "#1b4f91"),
    (MEDIA / "demo/tune.mp3", "the same tune, from an MP3 of 64 kbit/s", "#8fb8e8"),
    (MEDIA / "demo/holotz-castle.wav", "another tune", "#e08214"),
]
EDGES = [0, 100, 200, 300, 400, 510, 630, 770, 920, 1080, 1270, 1480, 1720, 2000, 2320, 2700]
BANDS = len(EDGES) - 1
WIDTH, HEIGHT, LEFT, PANEL, GROUP = 900, 645, 70, 200, 54
TOPS = (110, 395)
TITLES = ("15 means: how the sound is shared out among the bands",
          "15 spreads: how the movement is shared out among the bands")


def values_of(kzfp, sound):
    done = subprocess.run([kzfp, "--format", "values", str(sound)], capture_output=True, text=True,
                          check=True)
    return [int(value) for value in done.stdout.split()]


def text(x, y, words, anchor="middle", size=13, extra=""):
    return (f'<text x="{x:.0f}" y="{y:.0f}" text-anchor="{anchor}" font-size="{size}"{extra}>'
            f"{words}</text>")


def grid(top, scale):
    """Horizontal lines every 2000, with their numbers."""
    for value in range(0, int(PANEL / scale) + 1, 2000):
        y = top + PANEL - value * scale
        yield (f'<line x1="{LEFT}" x2="{LEFT + BANDS * GROUP}" y1="{y:.1f}" y2="{y:.1f}" '
               f'stroke="#{"444" if value == 0 else "ddd"}"/>')
        yield text(LEFT - 8, y + 4, str(value), "end", 12)


def bars(top, scale, sets):
    bar = (GROUP - 12) / len(sets)
    for band in range(BANDS):
        for number, (values, colour) in enumerate(sets):
            height = values[band] * scale
            yield (f'<rect x="{LEFT + band * GROUP + 6 + number * bar:.1f}" y="{top + PANEL - height:.1f}" '
                   f'width="{bar - 1:.1f}" height="{height:.1f}" fill="{colour}"/>')


def edges(top):
    for band, edge in enumerate(EDGES):
        yield text(LEFT + band * GROUP, top + PANEL + 17, str(edge), size=12)
    yield text(LEFT + BANDS * GROUP / 2, top + PANEL + 34, "edges of the bands in Hz", size=12)


def legend(fingerprints):
    first = fingerprints[0]
    for row, ((_, name, colour), values) in enumerate(zip(SOUNDS, fingerprints, strict=True)):
        y = 24 + row * 20
        mean = sum(abs(a - b) for a, b in zip(first, values, strict=True)) / len(values)
        yield f'<rect x="{LEFT}" y="{y - 11}" width="14" height="14" fill="{colour}"/>'
        yield text(LEFT + 22, y + 1, name if row == 0 else f"{name}: distance {mean:.1f}", "start")


def main():
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    fingerprints = [values_of(sys.argv[1], sound) for sound, _, _ in SOUNDS]
    scale = PANEL / (max(map(max, fingerprints)) * 1.05)
    colours = [colour for _, _, colour in SOUNDS]
    lines = [f'<svg xmlns="http://www.w3.org/2000/svg" width="{WIDTH}" height="{HEIGHT}" '
             f'viewBox="0 0 {WIDTH} {HEIGHT}" font-family="sans-serif">',
             f"<title>{TITLES[0]}; {TITLES[1]}</title>",
             f'<rect width="{WIDTH}" height="{HEIGHT}" fill="white"/>', *legend(fingerprints)]
    for half, (top, title) in enumerate(zip(TOPS, TITLES, strict=True)):
        sets = [(values[half * BANDS:(half + 1) * BANDS], colour)
                for values, colour in zip(fingerprints, colours, strict=True)]
        lines.append(text(LEFT, top - 12, title, "start", 14, ' font-weight="bold"'))
        lines += [*grid(top, scale), *bars(top, scale, sets), *edges(top)]
    print("\n".join([*lines, "</svg>"]))


if __name__ == "__main__":
    main()
