"""The self-test as people see it: what is not detected and why, its progress, and an interrupt."""

import json
import os
import pty
import re
import select
import signal
import subprocess
import time
import unittest

from command_line_fixture import PROGRAM, CommandLineTest, quazor

DROPPED = "camera_sync/frames_dropped"
STOP_REFUSED = "camera_sync/stop_refused"
REFUSED = "camera_sync/start_refused_on_first"


class SelftestTest(CommandLineTest):
    def test_a_blind_spot_has_its_reason_and_what_the_profile_strict_finds(self):
        result = quazor("selftest", "healthy", DROPPED, REFUSED, "--seeds", "1")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertRegex(result.stdout, rf"\n{DROPPED} +not detected +not detected +detected\n")
        self.assertRegex(result.stdout, rf"\n{REFUSED} +detected +detected +detected\n")
        self.assertRegex(result.stdout, r"\nhealthy +passed +passed +passed\n")
        self.assertIn(f"\n  {DROPPED} (by strict: detected)\n", result.stdout)
        self.assertRegex(" ".join(result.stdout.split()), r"BackTele\.Total is 87 frames instead of 90 frames: its "
                         r"limit changes with it")
        self.assertIn("By default: 1 of 2 faults detected, 1 blind spot, 0 false alarms\n", result.stdout)
        self.assertIn("By strict: 2 of 2 faults detected, 0 blind spots, 0 false alarms\n", result.stdout)

    def test_the_document_has_the_same(self):
        result = quazor("selftest", DROPPED, "--seeds", "1", "--format", "json")
        document = json.loads(result.stdout)
        self.assertEqual(document["totals"]["default"], {"detected": 0, "blindSpots": 1, "falseAlarms": 0})
        self.assertEqual(document["totals"]["strict"], {"detected": 1, "blindSpots": 0, "falseAlarms": 0})
        phone, = document["phones"]
        self.assertEqual((phone["phone"], phone["expectsDetection"]), (DROPPED, False))
        self.assertTrue(any("BackTele.Total" in one for one in phone["reasons"]), phone)
        self.assertFalse(document["interrupted"])


    def test_the_limit_on_log_lines_holds_in_this_process_too(self):
        def reasons(*arguments):
            result = quazor("selftest", STOP_REFUSED, "--seeds", "1", "--format", "json", *arguments)
            self.assertEqual(result.returncode, 0, result.stderr)
            return [one.rsplit(": ", 1)[-1] for one in json.loads(result.stdout)["phones"][0]["reasons"]]

        everything = reasons()
        self.assertEqual(len(everything), 2)
        self.assertEqual(reasons("--in-process"), everything)
        limited = [everything[0], "1 more log line was left out (--log-limit)"]
        self.assertEqual(reasons("--log-limit", "1"), limited)
        self.assertEqual(reasons("--log-limit", "1", "--in-process"), limited)


class InterruptedSelftestTest(CommandLineTest):
    def start(self, *arguments):
        """Starts the self-test of all phones with a terminal as its standard error."""
        controller, terminal = pty.openpty()
        process = subprocess.Popen([PROGRAM, "selftest", *arguments], stdout=subprocess.PIPE, stderr=terminal,
                                   env={**os.environ, "TERM": "xterm"})
        os.close(terminal)
        self.addCleanup(os.close, controller)
        return process, controller

    def seen(self, controller, wanted):
        """What the terminal shows until `wanted` is on it."""
        shown, end = b"", time.monotonic() + 120
        while not re.search(wanted, shown):
            self.assertLess(time.monotonic(), end, shown)
            if select.select([controller], [], [], 1)[0]:
                shown += os.read(controller, 65536)
        return shown

    def test_it_shows_its_progress_and_keeps_what_was_done(self):
        process, controller = self.start("--format", "json", "--seeds", "1")
        shown = self.seen(controller, rb"Selftest: [1-9]\d* of \d+ phones done, now \w+/\w+")
        phones = int(re.search(rb"of (\d+) phones", shown)[1])
        process.send_signal(signal.SIGINT)
        written = process.communicate(timeout=120)[0]
        self.assertEqual(process.returncode, 130)
        document = json.loads(written)
        self.assertTrue(document["interrupted"])
        self.assertEqual(document["phonesWanted"], phones)
        done = len(document["phones"])
        self.assertGreater(done, 0)
        self.seen(controller, rb"interrupted: %d of %d phones were run" % (done, phones))


if __name__ == "__main__":
    unittest.main()
