#!/usr/bin/env python3
"""Tests of bench/figures.py with numbers that were worked out by hand.

Usage: figures-test.py FOLDER_OF_THE_PROJECT"""
import pathlib
import sys
import unittest

sys.path.insert(0, str(pathlib.Path(sys.argv.pop(1)) / "bench"))
sys.dont_write_bytecode = True
import figures
import report


class Percentiles(unittest.TestCase):
    def test_are_values_that_were_measured(self):
        values = list(range(100, 0, -1))
        self.assertEqual([figures.percentile(values, p) for p in (50, 95, 99, 100)], [50, 95, 99, 100])

    def test_of_few_values_take_the_next_higher_one(self):
        self.assertEqual(figures.percentile([30, 10, 20], 50), 20)
        self.assertEqual(figures.percentile([30, 10, 20], 95), 30)
        self.assertEqual(figures.percentile([7], 1), 7)

    def test_of_nothing_are_refused(self):
        self.assertRaises(ValueError, figures.percentile, [], 50)

    def test_cover_all_batches(self):
        self.assertEqual(figures.summary([[1, 2], [3, 4]]), {"p50": 2, "p95": 4, "p99": 4})


class Ratios(unittest.TestCase):
    def test_are_of_rates_so_that_less_time_is_more(self):
        self.assertEqual(figures.rate_ratio([[10]], [[20]]), 2)
        self.assertEqual(figures.rate_ratio([[20]], [[10]]), 0.5)

    def test_are_formed_pair_by_pair(self):
        # The machine became four times slower on the way; both sides met that.
        self.assertEqual(figures.rate_ratio([[10], [10], [40]], [[10], [10], [40]]), 1)
        self.assertEqual(figures.rate_ratio([[100], [100], [400]], [[85], [85], [340]]), 0.85)

    def test_take_the_median_of_a_batch_and_of_the_pairs(self):
        self.assertEqual(figures.rate_ratio([[10, 10, 9999]], [[20, 20, 1]]), 2)
        self.assertEqual(figures.rate_ratio([[10], [10], [9999]], [[20], [20], [1]]), 2)

    def test_need_both_sides(self):
        self.assertRaises(ValueError, figures.rate_ratio, [[1]], [[1], [2]])
        self.assertRaises(ValueError, figures.rate_ratio, [], [])

    def test_differences_are_of_pairs_as_well(self):
        self.assertEqual(figures.difference([[110], [1100], [120]], [[100], [1000], [100]]), 20)
        self.assertRaises(ValueError, figures.difference, [[1]], [])


class Gate(unittest.TestCase):
    field_ping = [[15000]]

    def test_lets_a_rival_of_eight_tenths_of_the_fields_rate_pass(self):
        self.assertTrue(figures.gate("socket", [[1e9 / 33700]], self.field_ping)[0])
        self.assertFalse(figures.gate("socket", [[1e9 / 33500]], self.field_ping)[0])

    def test_knows_each_protocol(self):
        for kind, least in (("socket", 33600), ("hislip", 39200), ("vxi11", 20800)):
            self.assertAlmostEqual(figures.gate(kind, [[1]], self.field_ping)[2], least)

    def test_asks_less_of_a_slower_machine_and_more_of_a_faster_one(self):
        rival = [[1e9 / 20000]]
        self.assertFalse(figures.gate("socket", rival, self.field_ping)[0])
        self.assertTrue(figures.gate("socket", rival, [[30000]])[0])
        self.assertFalse(figures.gate("socket", [[1e9 / 40000]], [[7500]])[0])


class Growth(unittest.TestCase):
    sizes = [10 ** k for k in range(7)]

    def test_tells_linear_from_quadratic(self):
        self.assertAlmostEqual(figures.growth_exponent([(n, 7 * n) for n in self.sizes]), 1)
        self.assertAlmostEqual(figures.growth_exponent([(n, 7 * n * n) for n in self.sizes]), 2)

    def test_is_not_hidden_by_a_fixed_cost(self):
        self.assertGreater(figures.growth_exponent([(n, 1e6 + n * n) for n in self.sizes]), 1.5)

    def test_of_a_fixed_cost_is_none(self):
        self.assertAlmostEqual(figures.growth_exponent([(n, 500) for n in self.sizes]), 0)

    def test_needs_two_points(self):
        self.assertRaises(ValueError, figures.growth_exponent, [(1, 1)])


class Rows(unittest.TestCase):
    series = {"ours": [[100]], "rival": [[90]]}

    def rows(self):
        return report.Rows()

    def test_are_met_from_their_target_on(self):
        rows = self.rows()
        rows.at_least("just", self.series, "ours", "rival", 0.9)
        rows.at_least("not quite", self.series, "ours", "rival", 0.91)
        self.assertEqual([row["verdict"] for row in rows.rows], ["ok", "MISSED"])
        self.assertFalse(rows.all_met())

    def test_do_not_count_when_the_rival_is_too_slow(self):
        rows = self.rows()
        rows.at_least("gated", self.series, "ours", "rival", 0.5, gate=(False, 1000.0, 33600.0))
        self.assertEqual(rows.rows[0]["verdict"], "rival too slow here")
        self.assertFalse(rows.all_met())

    def test_have_limits_too(self):
        rows = self.rows()
        rows.at_most("below", 24.9, 25, "%")
        rows.at_most("above", 25.1, 25, "%")
        self.assertEqual([row["verdict"] for row in rows.rows], ["ok", "MISSED"])

    def test_of_growth_fail_when_it_is_clearly_more_than_linear(self):
        rows = self.rows()
        rows.growth("linear", [(n, 5 * n) for n in Growth.sizes], "lines")
        rows.growth("quadratic", [(n, n * n) for n in Growth.sizes], "lines")
        self.assertEqual([row["verdict"] for row in rows.rows], ["ok", "MISSED"])


class Record(unittest.TestCase):
    def test_replaces_what_stands_between_the_marks_alone(self):
        text = f"before\n{report.BEGIN}\nold\n{report.END}\nbehind\n"
        self.assertEqual(report.replaced(text, "new\n"), f"before\n{report.BEGIN}\nnew\n{report.END}\nbehind\n")

    def test_needs_the_marks(self):
        self.assertRaises(ValueError, report.replaced, "no marks\n", "new\n")


if __name__ == "__main__":
    unittest.main()
