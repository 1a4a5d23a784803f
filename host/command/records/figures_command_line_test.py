"""The figures of quazor records, on made-up records whose answers are known."""

import random
import statistics
import unittest

from records_fixture import DIAGNOSTIC, StoreTest, day, result


def good(value=0.5):
    return [result("Offset", value, -1, 1)]


BAD = [result("Offset", 5, -1, 1)]


class YieldTest(StoreTest):
    def test_the_first_run_of_a_phone_counts(self):
        self.make(good(), serial="A", station="S1")
        self.make(BAD, serial="A", station="S1")    # too late to matter
        self.make(BAD, serial="B", station="S1")
        self.make(good(), serial="B", station="S1")
        self.make([], error=True, serial="C", station="S1")
        self.make(good(), serial="C", station="S1")
        self.make(good(), station="S1")             # nobody knows which phone
        self.make(BAD, serial="A", station="S2", on=1)
        self.make(good(), serial="D", station="S2", on=1)
        self.imported(imported=9)
        rows = {row["station"]: row for row in self.rows("yield")}
        self.assertEqual({name: [row[key] for key in ("passed", "failed", "neither", "runs", "no_serial")]
                          for name, row in rows.items()},
                         {"S1": [1, 1, 1, 7, 1], "S2": [1, 1, 0, 2, 0], "(all)": [2, 1, 1, 9, 1]})
        self.assertEqual(rows["S1"]["first_pass_yield"], 0.5)
        # The interval of Wilson for 1 of 2, computed by hand with 1.96.
        self.assertAlmostEqual(rows["S1"]["low"], 0.0945, 4)
        self.assertAlmostEqual(rows["S1"]["high"], 0.9055, 4)
        since = self.rows("yield", "--since", day(1))
        self.assertEqual([(row["station"], row["passed"], row["failed"]) for row in since], [("S2", 1, 1)])
        self.assertEqual(self.rows("yield", "--station", "S1"), [rows["S1"]])

    def test_by_another_tag(self):
        for serial, lot, verdict in (("A", "1", good()), ("A", "1", BAD), ("A", "2", BAD), ("B", "2", good()), ("C", "", BAD)):
            tags = [["serial", serial], ["station", "S1"]] + ([["lot", lot]] if lot else [])
            self.make(verdict, tags=tags)
        self.imported(imported=5)
        rows = {row["group"]: (row["passed"], row["failed"], row["runs"]) for row in self.rows("yield", "--by", "lot")}
        # A phone counts once in each lot, and once in all.
        self.assertEqual(rows, {"": (0, 1, 1), "1": (1, 0, 2), "2": (1, 1, 2), "(all)": (2, 1, 5)})

    def test_a_yield_that_chance_does_not_explain(self):
        for number in range(40):
            self.make(BAD if number % 4 == 0 else good(), serial=f"A{number}", station="S1")
            self.make(good(), serial=f"B{number}", station="S2")
            self.make(good(), serial=f"C{number}", station="S3")
        self.imported(imported=120)
        rows = {row["station"]: row["chance"] for row in self.rows("yield")}
        # 10 or more of 40 if 10 of 120 fail: 0.00132 (scipy), below 0.01 / 3.
        self.assertAlmostEqual(rows["S1"], 0.0013236, 6)
        self.assertEqual((rows["S2"], rows["S3"], rows["(all)"]), (1, 1, None))
        self.assertIn("Lower than chance explains: S1. Chance is", self.records("yield").stdout)
        self.assertNotIn("explain", self.records("yield", "--station", "S1").stdout)

    def test_nothing_judged_has_no_yield(self):
        self.make([], error=True, serial="A")
        self.imported(imported=1)
        row = self.rows("yield")[0]
        self.assertEqual((row["first_pass_yield"], row["low"], row["high"]), (None, None, None))


class FailuresTest(StoreTest):
    def test_what_fails_most_is_first(self):
        for number in range(10):
            self.make([result("Rare", 5 if number < 2 else 0, -1, 1), result("Often", 5 if number < 6 else 0, -1, 1),
                       result("Never", 0, -1, 1), result("Free", 5)], serial=f"P{number % 2}", station=f"S{number % 2}")
        self.make([], error=True)
        self.imported(imported=11)
        rows = self.rows("failures")
        self.assertEqual([(row["result"], row["failed"], row["judged"], row["rate"], row["share"]) for row in rows],
                         [("Often", 6, 10, 0.6, 0.75), ("Rare", 2, 10, 0.2, 1)])
        self.assertEqual(self.rows("failures", table="errors"),
                         [{"runs": 1, "diagnostic": DIAGNOSTIC, "domain": "Made", "code": 7,
                           "message": "The operation failed (Made error 7)."}])
        # By serial number the answer comes from the results, by station from the summary.
        by_serial, by_station = self.rows("failures", "--serial", "P0"), self.rows("failures", "--station", "S0")
        self.assertEqual([row["failed"] for row in by_serial], [3, 1])
        self.assertEqual(by_serial, by_station)
        self.assertEqual(self.rows("failures", "--result", "N*"), [])
        self.assertEqual(self.rows("failures", "--diagnostic", "Other"), [])


class FlakyTest(StoreTest):
    def found(self, *arguments):
        return [(row["serial"], row["passed"], row["failed"]) for row in self.rows("flaky", *arguments)]

    def test_both_verdicts_of_one_phone(self):
        for serial, runs in (("A", (good(), BAD, good())), ("B", (good(), good())), ("C", (BAD, BAD)), ("", (good(), BAD))):
            for one in runs:
                self.make(one, serial=serial)
        self.make(good(), serial="D")
        self.make([], error=True, serial="D")                          # an error is no failure
        self.make([result("Offset", 5, -9, 9)], serial="E")
        self.make([result("Offset", 5, -1, 1)], serial="E")            # the limit changed, not the phone
        self.make(good(), serial="F", on=1)
        self.make(BAD, serial="F", on=2)
        self.imported(imported=15)
        self.assertEqual(self.found(), [("F", 1, 1), ("A", 2, 1)])
        self.assertEqual(self.found("--since", day(2)), [])
        self.assertEqual(self.found("--serial", "A"), [("A", 2, 1)])

    def test_where_a_phone_failed(self):
        for verdict, station in ((good(), "S1"), (BAD, "S3"), (BAD, "S2"), (good(), "S2"), (BAD, "S3")):
            self.make(verdict, serial="A", station=station)
        self.imported(imported=5)
        self.assertEqual([row["failed_at"] for row in self.rows("flaky")], ["S2, S3"])

    def test_a_repair_between(self):
        self.make(BAD, serial="A")
        self.imported(imported=1)
        self.records("mark", "--serial", "A", "--repaired", "--note", "new flex")
        self.make(good(), serial="A", on=36500)  # long after the repair
        self.imported(imported=1, known=1)
        self.assertEqual(self.found(), [])
        self.make(BAD, serial="A", on=36501)
        self.imported(imported=1, known=2)
        self.assertEqual(self.found(), [("A", 1, 1)])
        told = self.records("mark", "--serial", "Z", "--repaired").stdout
        self.assertIn("The store has no run with this serial number.", told.replace("\n", " "))


class DriftTest(StoreTest):
    def fill(self, mean_of):
        """Ten days of five values at two stations."""
        chance = random.Random(1)
        for number in range(10):
            for station in ("S1", "S2"):
                for _ in range(5):
                    self.make([result("Offset", chance.gauss(mean_of(station, number), 0.1), -1, 1)], station=station, on=number)
        self.imported(imported=100)

    def test_one_station_drifts(self):
        self.fill(lambda station, number: 0.05 * number if station == "S2" else 0)
        rows = {row["station"]: row for row in self.rows("drift")}
        self.assertEqual(rows["S1"]["signals"], "")
        self.assertIn("rule 1 on ", rows["S2"]["signals"])
        self.assertEqual([row["days"] for row in rows.values()], [10, 10])
        days = self.rows("drift", "--station", "S2")
        self.assertEqual([row["day"] for row in days], [day(number) for number in range(10)])
        self.assertIn("Not stable: one day is more than 3 standard errors from the mean (rule 1, first on",
                      self.records("drift", "--station", "S2").stdout.replace("\n", " "))
        self.assertIn("Stable: no rule", self.records("drift", "--station", "S1").stdout)
        self.assertIn("the process is not stable: ", self.rows("capability", "--result", "Offset")[0]["why_not"])

    def test_days_without_spread(self):
        for number in range(3):
            self.make(good(), on=number)
        self.imported(imported=3)
        self.assertIn("show no drift", self.records("drift").stdout)


class CapabilityTest(StoreTest):
    def test_both_figures(self):
        chance = random.Random(2)
        groups = {}
        for number in range(40):
            station, on = f"S{number % 2}", number // 20
            value = chance.gauss(0.2, 0.1)
            groups.setdefault((station, on), []).append(value)
            self.make([result("Offset", value, -1, 1)], station=station, on=on)
        self.imported(imported=40)
        row = self.rows("capability")[0]
        values = [value for group in groups.values() for value in group]
        mean, overall = statistics.fmean(values), statistics.stdev(values)
        within = (sum(statistics.variance(group) * (len(group) - 1) for group in groups.values()) / (40 - 4)) ** 0.5
        self.assertEqual(row["why_not"], "")
        self.assertAlmostEqual(row["cpk"], min(1 - mean, mean + 1) / (3 * within), 9)
        self.assertAlmostEqual(row["ppk"], min(1 - mean, mean + 1) / (3 * overall), 9)

    def test_refusals_say_why(self):
        chance = random.Random(3)
        for number in range(25):
            self.make([result("Free", chance.random()), result("Count", number % 3, 0, 5), result("Same", 0.5, 0, 1),
                       result("Zero", 0.5, 0.5, 0.5)] + ([result("Rare", chance.random(), 0, 1)] if number else []))
        self.imported(imported=25)
        why = {row["result"]: row["why_not"] for row in self.rows("capability", "--result", "*")}
        self.assertEqual(why, {"Free": "it has no limit with a bound",
                               "Count": "all values are whole numbers, as those of a count are; its rate says more",
                               "Same": "all values are the same", "Zero": "only one value meets its limit",
                               "Rare": "24 of the 25 runs that it takes"})
        self.assertEqual(self.rows("capability"), [])
        self.assertIn("5 results without a figure", self.records("capability").stdout)


class GaugeTest(StoreTest):
    def test_a_full_table_and_one_with_a_gap(self):
        chance = random.Random(4)
        for part in range(3):
            for station in ("S1", "S2"):
                for _ in range(2):
                    self.make([result("Offset", part + chance.gauss(0, 0.01), -9, 9)], serial=f"P{part}", station=station)
        self.imported(imported=12)
        row = self.rows("gauge", "--result", "Offset")[0]
        self.assertEqual((row["phones"], row["stations"], row["repetitions"], row["why_not"]), (3, 2, 2, ""))
        self.assertAlmostEqual(row["part_to_part"], 1, 1)
        self.assertLess(row["share"], 0.05)
        self.make([result("Offset", 1, -9, 9)], serial="P0", station="S1")
        self.imported(imported=1, known=12)
        self.assertEqual(self.rows("gauge", "--result", "Offset")[0]["why_not"],
                         "the table is not full: phone P0 at station S2 has 2 of the 3 values that phone P0 at station S1 has")


if __name__ == "__main__":
    unittest.main()
