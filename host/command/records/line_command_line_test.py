"""Two simulated lines of 40 phones a day: the questions find what is wrong with one, and nothing with the other."""

import random
import unittest

from records_fixture import StoreTest, day, result

DAYS = 60
PHONES = 40  # a day
STATIONS = ("S1", "S2", "S3")
LOT = 5  # days in which the parts of a lot are used
LIMIT = 1


class Line:
    """What goes wrong."""

    def __init__(self, drifting=None, flaky=None, bad_lot=None):
        self.drifting, self.flaky, self.bad_lot = drifting, flaky, bad_lot


class SimulatedLineTest(StoreTest):
    def fill(self, line, seed):
        chance = random.Random(seed)
        for number in range(DAYS):
            lot = f"L{number // LOT}"
            for phone in range(PHONES):
                station = STATIONS[phone % len(STATIONS)]
                weak = lot == line.bad_lot and chance.random() < 0.1
                dust = 2 if chance.random() < 0.005 else 0  # happens on every line, and stays
                for _ in range(2):  # what failed is tried again
                    if not self.run_of(line, chance, f"P{number}-{phone}", station, number, lot, weak, dust):
                        break
        self.imported(imported=self.made)

    def run_of(self, line, chance, serial, station, number, lot, weak, dust):
        offset = chance.gauss(0.004 * number if station == line.drifting else 0, 0.1)
        gain = chance.gauss(1, 0.02)
        # A contact that fails now and then, and a part that is bad.
        level = 2 if station == line.flaky and chance.random() < 0.03 else chance.gauss(0, 0.1)
        noise = chance.gauss(1.5, 0.05) if weak else abs(chance.gauss(0, 0.1))
        results = [result("Offset", offset, -LIMIT, LIMIT), result("Gain", gain, 0.8, 1.2),
                   result("Level", level, -LIMIT, LIMIT), result("Noise", noise, None, LIMIT),
                   result("Dust", dust, None, LIMIT)]
        self.make(results, serial=serial, station=station, on=number, tags=[["serial", serial], ["station", station], ["lot", lot]])
        return level > LIMIT or noise > LIMIT or dust > LIMIT

    def drifts(self):
        return [(row["result"], row["station"], row["drifts"]) for row in self.rows("drift") if row["drifts"]]

    def low_yields(self, *arguments):
        text = " ".join(self.records("yield", *arguments).stdout.split())
        if "No yield is lower than chance explains." in text:
            return ""
        return text.partition("Lower than chance explains: ")[2].partition(". Chance is")[0]

    def test_a_line_with_a_drifting_station_a_flaky_fixture_and_a_bad_lot(self):
        self.fill(Line(drifting="S2", flaky="S3", bad_lot="L7"), seed=1)
        self.assertEqual(self.drifts(), [("Offset", "S2", "up")])
        self.assertEqual(self.low_yields("--by", "lot"), "L7")
        flaky = [row for row in self.rows("flaky") if row["result"] == "Level"]
        self.assertGreater(len(flaky), 10)
        self.assertEqual({row["failed_at"] for row in flaky}, {"S3"})
        self.assertEqual({row["result"] for row in self.rows("failures")[:2]}, {"Level", "Noise"})
        worst = self.rows("failures", "--since", day(7 * LOT), "--until", day(8 * LOT - 1))[0]
        self.assertEqual(worst["result"], "Noise")

    def test_a_line_without_them_raises_no_alarm(self):
        self.fill(Line(), seed=2)
        self.assertEqual(self.drifts(), [])
        self.assertEqual(self.low_yields("--by", "lot"), "")
        self.assertEqual(self.low_yields(), "")
        self.assertEqual(self.rows("flaky"), [])
        self.assertEqual({row["result"] for row in self.rows("failures")}, {"Dust"})


if __name__ == "__main__":
    unittest.main()
