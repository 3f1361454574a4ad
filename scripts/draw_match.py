#!/usr/bin/env python3
"""Draws docs/match.svg and docs/set_list.svg: drawings out of the pages of kzfp match --report.

    scripts/draw_match.py KZFP [FOLDER]    FOLDER is docs when none is named

The first clip is 18 s out of the middle of "Trip on the Funny Boat" by JDruid, over a telephone, after
6 s of another tune; the second one is a mix of both tunes with noise between them. The sounds are those
of scripts/demo.sh, which downloads them: run ./run demo first. Needs sox.
"""

import os
import pathlib
import re
import subprocess
import sys
import tempfile

ROOT = pathlib.Path(__file__).resolve().parent.parent
MEDIA = pathlib.Path(os.environ.get("KZ_MEDIA", ROOT / "build/media")).resolve()
TUNE = MEDIA / "funnyboat.ogg"
OTHER = MEDIA / "demo/holotz-castle.wav"


def sox(folder, *words):
    subprocess.run(["sox", "-D", "-R", "-V1", *map(str, words)], cwd=folder, check=True)


def make_telephone_clip(folder):
    sox(folder, OTHER, "-r", 8000, "-c", 1, "other.wav", "trim", 20, 6)
    sox(folder, TUNE, "-r", 8000, "-c", 1, "tune.wav", "trim", 62, 18)
    sox(folder, "other.wav", "tune.wav", "-e", "u-law", "telephone.wav", "sinc", "300-3400")


def make_mix(folder):
    sox(folder, TUNE, "-r", 22050, "-c", 1, "a.wav", "trim", 40, 45)
    sox(folder, "-n", "-r", 22050, "-c", 1, "-b", 16, "b.wav", "synth", 20, "pinknoise", "vol", 0.3)
    sox(folder, OTHER, "-r", 22050, "-c", 1, "c.wav", "trim", 10, 40)
    sox(folder, TUNE, "-r", 22050, "-c", 1, "d.wav", "trim", 100, 30)
    sox(folder, "a.wav", "b.wav", "c.wav", "d.wav", "mix.wav")


def page_of(kzfp, folder, *words):
    report = pathlib.Path(folder) / "page.html"
    subprocess.run([kzfp, "match", "--report", str(report), *words], cwd=folder, check=True)
    return report.read_text(encoding="utf-8")


def drawing_of(page, title):
    """The first drawing of a figure whose title begins so, as a file of its own."""
    figure = next(part for part in page.split("<figure>")[1:] if f"<h3>{title}" in part)
    drawing = re.search(r"<svg (?!class=.swatch).*?</svg>", figure, re.DOTALL).group()
    style = re.search(r"<style>(.*?)</style>", page, re.DOTALL).group(1)
    style = style.split("*{box-sizing")[0].strip()  # what follows is about the page around it
    paper = '<rect width="100%" height="100%" class="paper"/>'
    head, body = drawing.split(">", 1)
    if "xmlns=" not in head:
        head += ' xmlns="http://www.w3.org/2000/svg"'
    return f"{head}><style>{style}</style>{paper}{body}\n"


def main():
    if len(sys.argv) not in (2, 3):
        sys.exit(__doc__)
    kzfp = str(pathlib.Path(sys.argv[1]).resolve())
    docs = pathlib.Path(sys.argv[2] if len(sys.argv) == 3 else ROOT / "docs")
    with tempfile.TemporaryDirectory() as folder:
        make_telephone_clip(folder)
        make_mix(folder)
        subprocess.run([kzfp, "add", "music.kzc", str(TUNE), str(OTHER)], cwd=folder, check=True)
        match = page_of(kzfp, folder, "music.kzc", "telephone.wav")
        (docs / "match.svg").write_text(drawing_of(match, "Why it matches"), encoding="utf-8")
        mix = page_of(kzfp, folder, "--all", "music.kzc", "mix.wav")
        (docs / "set_list.svg").write_text(drawing_of(mix, "What ran when"), encoding="utf-8")


if __name__ == "__main__":
    main()
