"""What one method said about a clip beside the truth, and what follows for a kind of clips.

A truth is a line of a kind's truth.jsonl (evaluation/clips.py); an answer is an object as
`kzfp match --format json --candidates 2` prints it, or what evaluation/peers.py writes.
"""

import math
import pathlib

NEAR = 0.030  # seconds
# By how much the threshold of 15,000 tracks (13.8 million codes) is higher than that of the
# evaluation's catalogues: 0.12 for each doubling from 216,000 codes on.
RAISED = 0.12 * math.log2(13_800_000 / 216_000)


def track_of(found):
    """The track's id: kzfp reports the file it was added from, a peer the id."""
    return pathlib.Path(found["source"]).stem if "source" in found else found["track"]


class Clip:
    """What one method said about a clip, beside the truth."""

    def __init__(self, truth, answer, shared):
        self.truth = truth
        self.answer = answer
        self.known = truth["role"] == "known"
        candidates = answer.get("candidates") or answer.get("matches") or []
        self.best = candidates[0] if candidates else None
        self.score = self.best["score"] if self.best else -math.inf
        self.found = track_of(self.best) if self.best else None
        self.threshold = self.best.get("threshold", math.inf) if self.best else math.inf
        self.related = self.found is not None and frozenset((self.found, truth["track"])) in shared
        self.right = self.known and self.found == truth["track"]
        self.accepted = answer.get("verdict") == "match"
        self.lenient = self.accepted
        if self.accepted and answer["matches"]:
            self.found = track_of(answer["matches"][0])

    @property
    def error(self):
        """How far the place is off, in seconds."""
        return abs(self.best["offset"] - self.truth["seconds"])


def accept_above_strangers(clips):
    """For methods without a threshold: accepts what scores higher than every stranger.

    `lenient` is set where a clip scores higher than 99 strangers in a hundred.
    """
    strangers = [clip.score for clip in clips if not clip.known and not clip.related]
    highest = max(strangers, default=1)
    usual = quantile(strangers, 0.99) if strangers else 1
    for clip in clips:
        clip.accepted = clip.score > highest
        clip.lenient = clip.score > usual


def share(flags):
    flags = list(flags)
    return sum(flags) / len(flags) if flags else math.nan


def quantile(values, part):
    values = sorted(values)
    return values[min(len(values) - 1, int(part * len(values)))] if values else math.nan


def row_of(clips):
    """What the table reports of one kind and one method."""
    known = [clip for clip in clips if clip.known and not (clip.related and not clip.right)]
    strangers = [clip for clip in clips if not clip.known and not clip.related]
    right = [clip for clip in known if clip.accepted and clip.right]
    errors = [clip.error for clip in right]
    return {
        "clips": len(known),
        "top1": share(clip.right for clip in known),
        "accepted": share(clip.accepted and clip.right for clip in known),
        "lenient": share(clip.lenient and clip.right for clip in known),
        "raised": share(clip.accepted and clip.right and clip.score >= clip.threshold + RAISED
                        for clip in known),
        "wrong": sum(clip.accepted and not clip.right for clip in known),
        "median": 1000 * quantile(errors, 0.5),
        "p95": 1000 * quantile(errors, 0.95),
        "near": share(error <= NEAR for error in errors),
        "strangers": len(strangers),
        "false": sum(clip.accepted for clip in strangers),
        "highest": max((clip.score for clip in strangers), default=math.nan),
    }
