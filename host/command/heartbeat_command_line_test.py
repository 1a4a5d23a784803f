"""The heartbeat of a run: a line on standard error without a terminal, and an event in the record."""

import os
import re
import signal
import subprocess
import threading
import unittest

from command_line_fixture import PROGRAM, RecordTest, events_in, fill, quazor
from terminal_fixture import on_terminal

LINE = re.compile(r"^quazor: running (\S+) \((\d+) of (\d+)\), stage (\w+), for (\d+) s$", re.MULTILINE)


def realtime(seconds, *diagnostics):
    """The arguments of a run of as many real seconds for each diagnostic."""
    return ["run", *(diagnostics or ["CameraSyncDiagnostic.Back"]), "--realtime", "--set", f"duration={seconds}"]


def beats_in(record):
    return [event for event in events_in(record) if event["event"] == "heartbeat"]


class HeartbeatTest(RecordTest):
    def test_a_run_says_that_it_goes_on(self):
        result = quazor(*realtime(3, "CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front"), "--heartbeat", "1",
                        "--record", self.record)
        self.assertEqual(result.returncode, 0, result.stderr)
        lines = LINE.findall(result.stderr)
        self.assertGreaterEqual(len(lines), 4, result.stderr)
        self.assertEqual(len(lines), len(result.stderr.splitlines()))
        self.assertEqual({(name, n, m) for name, n, m, *_ in lines}, {("CameraSyncDiagnostic.Back", "1", "2"),
                                                                     ("CameraSyncDiagnostic.Front", "2", "2")})
        self.assertIn("run", {stage for *_, stage, _ in lines})
        beats = beats_in(self.record)
        self.assertEqual([(beat["stage"], beat["nanoseconds"] // 10**9) for beat in beats],
                         [(stage, int(seconds)) for *_, stage, seconds in lines])
        self.assert_verifies(self.record)
        for command in (["analyze", self.record], ["diff", self.record, self.record]):
            read = quazor(*command)
            self.assertEqual(read.returncode, 0, read.stderr)

    def test_a_diagnostic_that_hangs_shows_it(self):
        result = quazor("run", "CameraSyncDiagnostic.Back", "--phone", "camera_sync/start_hangs", "--realtime",
                        "--deadline", "run=3", "--heartbeat", "1", "--record", self.record)
        self.assertEqual(result.returncode, 2, result.stderr)
        self.assertIn("stage run, for 2 s\n", result.stderr)
        self.assertIn("run", {beat["stage"] for beat in beats_in(self.record)})
        self.assert_verifies(self.record)

    def test_the_reports_do_not_change(self):
        rows = []
        for seconds in ("1", "0"):
            result = quazor(*realtime(2), "--heartbeat", seconds, "--format", "csv")
            self.assertEqual(result.returncode, 0, result.stderr)
            rows.append([line.split(",")[:11] for line in result.stdout.splitlines()])
        self.assertEqual(rows[0], rows[1])
        self.assertEqual(len(rows[0]), 10)  # a header and nine results

    def test_zero_is_off_and_a_short_run_has_none(self):
        result = quazor(*realtime(2), "--heartbeat", "0", "--record", self.record)
        self.assertEqual((result.returncode, result.stderr), (0, ""))
        self.assertEqual(beats_in(self.record), [])
        result = quazor("run", "--all", "--heartbeat", "1", "--record", self.record, "--replace")
        self.assertEqual((result.returncode, result.stderr), (0, ""))
        self.assertEqual(beats_in(self.record), [])

    def test_a_terminal_has_the_progress_instead(self):
        code, output = on_terminal(80, *realtime(3), "--heartbeat", "1", "--record", self.record)
        self.assertEqual(code, 0, output)
        self.assertEqual(LINE.findall(output.decode()), [])
        self.assertNotIn("stage run", output.decode())
        self.assertGreaterEqual(len(beats_in(self.record)), 2)

    def test_other_times_are_refused(self):
        for text in ("0.5", "-1", "soon", "nan", ""):
            with self.subTest(text):
                self.assert_refused(quazor("run", "--all", "--heartbeat", text), 64, "--heartbeat")
        self.assertEqual(quazor("list", "--heartbeat", "2").returncode, 64)

    def test_a_standard_error_that_nobody_reads_does_not_stop_the_run(self):
        reader, writer = os.pipe()
        fill(writer)
        process = subprocess.Popen([PROGRAM, *realtime(3), "--heartbeat", "1", "--record", self.record],
                                   stdout=subprocess.PIPE, stderr=writer)
        os.close(writer)
        # Ends a run that waits for its reader, so that the test fails instead of hanging.
        watchdog = threading.Timer(90, lambda: process.send_signal(signal.SIGKILL))
        watchdog.start()
        output, _ = process.communicate()
        watchdog.cancel()
        os.close(reader)
        self.assertEqual(process.returncode, 0)
        self.assertIn(b"\n\nPASS  CameraSyncDiagnostic.Back", output)
        self.assertGreaterEqual(len(beats_in(self.record)), 2)


if __name__ == "__main__":
    unittest.main()
