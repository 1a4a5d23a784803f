"""The installed profile 'strict' on the installed phones: what it detects, and that it raises no false alarm."""

import json
import os
import unittest

from command_line_fixture import CommandLineTest, quazor

SEEDS = 1000 if os.environ.get("QUAZOR_THOROUGH") else 100
LONG = 1800  # seconds; a sanitizer makes it slow


def selftest(*arguments):
    """The document of a self-test, which is faster without a process for each diagnostic."""
    result = quazor("selftest", *arguments, "--in-process", "--format", "json", timeout=LONG)
    return result.returncode, json.loads(result.stdout)


def measured(phone):
    """What is measured on the phone: per diagnostic the results with their values."""
    result = quazor("run", "--all", "--phone", phone, "--profile", "strict", "--seed", "0", "--format", "json")
    diagnostics = json.loads(result.stdout)["diagnostics"]
    return {one["name"]: [(each["name"], each["value"], each["unit"]) for each in one["measuredResults"]]
            for one in diagnostics}


class StrictProfileTest(CommandLineTest):
    def test_fails_phones_that_pass_by_default(self):
        for phone, code in (("healthy", 0), ("camera_sync/frames_dropped", 1), ("camera_sync/frame_rate_drift", 1),
                            ("camera_sync/start_delayed", 1), ("projector_fault/start_delayed", 1)):
            with self.subTest(phone=phone):
                self.assertEqual(quazor("run", "--all", "--phone", phone).returncode, 0)
                self.assertEqual(quazor("run", "--all", "--phone", phone, "--profile", "strict").returncode, code)

    def test_the_healthy_phone_passes_with_every_seed(self):
        code, document = selftest("healthy", "--seeds", SEEDS)
        phone, = document["phones"]
        for profile in ("default", "strict"):
            self.assertEqual(phone[profile], {"seeds": SEEDS, "detected": 0, "reasons": []})
        self.assertEqual((code, phone["kind"]), (0, "healthy"))

    def test_finds_every_phone_whose_fault_results_show(self):
        code, document = selftest("--seeds", 1)
        totals = document["totals"]
        self.assertEqual((code, document["refused"], totals["strict"]["falseAlarms"]), (0, [], 0))
        passed = [one["phone"] for one in document["phones"]
                  if one["kind"] == "faulty" and not one["strict"]["detected"]]
        self.assertEqual(len(passed), totals["strict"]["blindSpots"])
        self.assertGreater(totals["strict"]["detected"], totals["default"]["detected"])
        healthy = measured("healthy")
        self.assertTrue(all(healthy.values()), healthy)
        for phone in passed:
            with self.subTest(phone=phone):
                self.assertEqual(measured(phone), healthy)


if __name__ == "__main__":
    unittest.main()
