"""What bench/table.py and bench/counts.py conclude."""

import pathlib
import sys
import tempfile
import unittest

sys.path.insert(0, str(pathlib.Path(__file__).parents[3] / "bench"))

import counts  # noqa: E402
import table  # noqa: E402


def spread(lower, median, upper):
    return {"lower": lower, "median": median, "upper": upper, "best": lower}


def a_case(ratio, time=spread(9, 10, 11)):
    peer = {"name": "peer", "time": spread(1, 1, 1), "ratio": ratio}
    return {"name": "case", "unit": "µs", "time": time, "peers": [peer]}


class Verdicts(unittest.TestCase):
    def test_a_limit_is_met_when_the_upper_quartile_keeps_it(self):
        case = a_case(spread(0.1, 0.2, 0.3))
        self.assertEqual(table.verdict({"peer": "peer", "most": 0.3}, case), "≤ 0.300: **met**")

    def test_a_limit_that_only_the_median_keeps_is_just_met(self):
        case = a_case(spread(0.1, 0.2, 0.3))
        self.assertEqual(table.verdict({"peer": "peer", "most": 0.25}, case), "≤ 0.250: just")

    def test_a_limit_that_the_median_breaks_is_told_by_how_much(self):
        case = a_case(spread(0.1, 0.2, 0.3))
        self.assertEqual(table.verdict({"peer": "peer", "most": 0.1}, case), "≤ 0.100: no, 2.00 ×")

    def test_a_limit_without_a_peer_is_of_our_own_time(self):
        case = a_case(spread(0.1, 0.2, 0.3))
        self.assertEqual(table.verdict({"peer": None, "most": 5}, case), "≤ 5.00 µs: no, 2.00 ×")

    def test_a_limit_of_a_peer_that_is_missing_is_not_judged(self):
        case = a_case(spread(0.1, 0.2, 0.3))
        told = table.verdict({"peer": "other", "most": 1}, case)
        self.assertEqual(told, "≤ 1.00 of other: no peer")


class Documents(unittest.TestCase):
    def test_results_go_into_their_own_place(self):
        pairs = "<!-- pairs -->\nold\n<!-- end -->\n"
        growth = "<!-- growth -->\nold\n<!-- end -->\n"
        told = table.put_into("a\n" + pairs + "b\n" + growth, "growth", "new\n")
        self.assertEqual(told, "a\n" + pairs + "b\n<!-- growth -->\n\nnew\n\n<!-- end -->\n")

    def test_a_document_without_the_place_is_refused(self):
        with self.assertRaises(ValueError):
            table.put_into("nothing", "pairs", "new")


class Counts(unittest.TestCase):
    def test_a_rise_of_three_percent_passes_and_a_larger_one_does_not(self):
        self.assertEqual(counts.rises({"a": 1000, "b": 1000}, {"a": 1030, "b": 1031}), ["b"])

    def test_a_case_that_is_no_longer_counted_fails(self):
        self.assertEqual(counts.rises({"a": 1000}, {}), ["a"])

    def test_a_fall_passes(self):
        self.assertEqual(counts.rises({"a": 1000}, {"a": 10}), [])

    def test_a_part_without_a_name_is_passed_over(self):
        with tempfile.TemporaryDirectory() as directory:
            part = pathlib.Path(directory, "counts")
            part.write_text("desc: Trigger: Client Request: a_case\n\ntotals: 12\n")
            self.assertEqual(counts.read_part(part), ("a_case", 12))
            part.write_text("desc: Trigger: Program termination\n\ntotals: 0\n")
            self.assertIsNone(counts.read_part(part))


if __name__ == "__main__":
    unittest.main()
