"""What evaluation/scoring.py concludes from answers and the truth."""

import math
import pathlib
import sys
import unittest

sys.path.insert(0, str(pathlib.Path(__file__).parents[3] / "evaluation"))

import scoring  # noqa: E402


def truth(track="a", role="known", seconds=10.0):
    return {"file": "clean/k0001.flac", "kind": "clean", "role": role, "track": track,
            "seconds": seconds}


def found(track="a", score=20.0, offset=10.0):
    return {"source": f"/music/{track}.wav", "score": score, "threshold": 7.6, "offset": offset}


def answer(*tracks, verdict="match"):
    return {"verdict": verdict, "candidates": list(tracks),
            "matches": list(tracks) if verdict == "match" else []}


def clip(told, true=None, shared=()):
    return scoring.Clip(true or truth(), told, {frozenset(pair) for pair in shared})


class Clips(unittest.TestCase):
    def test_the_right_track_is_right_below_the_threshold_too(self):
        low = clip(answer(found(score=6.0), verdict="no match"))
        self.assertTrue(low.right)
        self.assertFalse(low.accepted)

    def test_an_answer_without_any_track_is_not_right(self):
        nothing = clip({"verdict": "too quiet", "candidates": [], "matches": []})
        self.assertFalse(nothing.right)
        self.assertEqual(nothing.score, -math.inf)

    def test_a_stranger_is_never_right(self):
        self.assertFalse(clip(answer(found()), truth(role="stranger")).right)

    def test_a_track_with_the_same_audio_is_related(self):
        self.assertTrue(clip(answer(found("b")), truth(), [("a", "b")]).related)
        self.assertFalse(clip(answer(found("c")), truth(), [("a", "b")]).related)

    def test_a_track_is_known_by_its_source_or_its_id(self):
        self.assertEqual(scoring.track_of({"source": "/x/a.b.wav", "track": 3}), "a.b")
        self.assertEqual(scoring.track_of({"track": "a"}), "a")


class Rows(unittest.TestCase):
    def test_shares_are_of_all_known_clips(self):
        row = scoring.row_of([clip(answer(found())), clip(answer(found(), verdict="not sure")),
                              clip(answer(found("b"))), clip(answer(verdict="no match"))])
        self.assertEqual((row["clips"], row["top1"], row["accepted"]), (4, 0.5, 0.25))

    def test_another_track_accepted_is_wrong(self):
        self.assertEqual(scoring.row_of([clip(answer(found("b")))])["wrong"], 1)

    def test_places_are_measured_where_the_track_is_right(self):
        row = scoring.row_of([clip(answer(found(offset=10.02))), clip(answer(found(offset=9.9))),
                              clip(answer(found("b", offset=99.0)))])
        self.assertEqual(row["near"], 0.5)
        self.assertAlmostEqual(row["p95"], 100)

    def test_an_accepted_stranger_is_false(self):
        row = scoring.row_of([clip(answer(found()), truth("b", "stranger")),
                              clip(answer(found(score=5.0), verdict="no match"), truth("b", "stranger"))])
        self.assertEqual((row["strangers"], row["false"], row["highest"]), (2, 1, 20.0))

    def test_shared_audio_counts_neither_way(self):
        row = scoring.row_of([clip(answer(found("b")), truth(), [("a", "b")]),
                              clip(answer(found("b")), truth(role="stranger"), [("a", "b")])])
        self.assertEqual((row["clips"], row["strangers"]), (0, 0))

    def test_peers_are_accepted_above_every_stranger(self):
        clips = [clip(answer(found(score=0.3), verdict="")), clip(answer(found(score=0.2), verdict="")),
                 clip(answer(found(score=0.2), verdict=""), truth(role="stranger"))]
        scoring.accept_above_strangers(clips)
        self.assertEqual([one.accepted for one in clips], [True, False, False])

    def test_lenience_lets_one_stranger_in_a_hundred_through(self):
        clips = [clip(answer(found(score=number), verdict=""), truth(role="stranger"))
                 for number in range(200)]
        scoring.accept_above_strangers(clips)
        self.assertEqual(sum(one.lenient for one in clips), 1)
        self.assertEqual(sum(one.accepted for one in clips), 0)


if __name__ == "__main__":
    unittest.main()
