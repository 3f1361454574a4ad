#!/usr/bin/env python3
"""Recognises a clip of a tune that it plays to itself, step by step, as in a notebook.

    python3 listen.py [FOLDER]

The pictures go to FOLDER, the current one by default, where matplotlib is installed.
"""

# %% [markdown]
# The sound: a scale of notes in an order that does not repeat itself, one every fifth of a second.

# %%
import pathlib
import sys

import numpy as np

import kzsdk

RATE = 22050
NOTES = (262, 294, 330, 349, 392, 440, 494, 523, 587)


def play(seed, seconds):
    """A tune, as float32 samples with a full scale of 1."""
    pitches = np.random.default_rng(seed).choice(NOTES, size=seconds * 5)
    time = np.arange(RATE // 5) / RATE
    fading = np.linspace(1, 0.1, len(time))
    notes = [fading * (2 * (time * pitch % 1) - 1) for pitch in pitches]
    return (0.3 * np.concatenate(notes)).astype(np.float32)


tunes = {f"Tune {number}": play(number, 40) for number in (1, 2, 3)}

# %% [markdown]
# A catalogue in memory, and a clip out of the second tune under noise.

# %%
catalogue = kzsdk.Catalogue(None)
for name, tune in tunes.items():
    catalogue.add(tune, rate=RATE, title=name)

clip = tunes["Tune 2"][17 * RATE:25 * RATE]
noisy = clip + np.random.default_rng(0).normal(0, 0.05, len(clip)).astype(np.float32)
answer = catalogue.recognise(noisy, rate=RATE)
for match in answer.matches:
    print(f"{match.title}, from second {match.offset:.1f} on "
          f"(score {match.score:.1f}, {match.threshold:.1f} needed)")

# %% [markdown]
# How the score of the clip falls while the noise grows.

# %%
levels = (0.0, 0.1, 0.2, 0.4, 0.8, 1.6)
scores = []
for level in levels:
    noise = np.random.default_rng(1).normal(0, level, len(clip)).astype(np.float32)
    best = catalogue.recognise(clip + noise, rate=RATE, candidates=1).candidates[0]
    scores.append(best.score)
    print(f"noise {level:4.2f}: {best.title}, score {best.score:5.1f}")

# %% [markdown]
# The thirty numbers of two tunes, and of one of them at half the level and with fewer bits.

# %%
prints = {name: kzsdk.fingerprint(tune, rate=RATE) for name, tune in tunes.items()}
first, second = prints["Tune 1"], prints["Tune 2"]
softer = kzsdk.fingerprint((tunes["Tune 1"] * 16000).astype(np.int16), rate=RATE)
print(f"Tune 1 and itself, softer: {first.distance(softer):.1f}, {first.verdict(softer)}")
print(f"Tune 1 and Tune 2: {first.distance(second):.1f}, {first.verdict(second)}")

# %% [markdown]
# A fingerprint from a stream that comes piece by piece.

# %%
progress = []
with kzsdk.Stream(rate=RATE, channels=1, format="float32") as stream:
    for start in range(0, 20 * RATE, RATE):
        if stream.feed(tunes["Tune 1"][start:start + RATE]):
            break
        progress.append(stream.progress)
    print(f"complete after {stream.state.frames / RATE:.1f} s, "
          f"equal: {stream.fingerprint() == first}")

# %% [markdown]
# The pictures.

# %%
try:
    import matplotlib
except ImportError:
    matplotlib = None
    print("no pictures: matplotlib is not installed")

if matplotlib is not None:
    matplotlib.use("Agg")
    from matplotlib import pyplot as plt

    folder = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ".")
    figure, (left, right) = plt.subplots(1, 2, figsize=(10, 3.5), constrained_layout=True)
    for name in ("Tune 1", "Tune 2"):
        left.step(range(30), prints[name].values, where="mid", label=name)
    left.set(title="Thirty numbers", xlabel="means, then spreads, of 15 bands", ylabel="share")
    left.legend()
    right.plot(levels, scores, marker="o")
    right.axhline(answer.matches[0].threshold, linestyle="--", color="grey", label="needed")
    right.set(title="A clip under noise", xlabel="level of the noise", ylabel="score")
    right.legend()
    figure.savefig(folder / "listen.png", dpi=100)
    print(f"pictures: {folder / 'listen.png'}")

catalogue.close()
