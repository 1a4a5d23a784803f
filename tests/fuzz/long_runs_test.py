#!/usr/bin/env python3
"""Tests of the long fuzzing with shell scripts in place of fuzzers."""

import json
import pathlib
import signal
import subprocess
import sys
import tempfile
import time
import unittest
from unittest import mock

import long_runs

PROGRAM = pathlib.Path(__file__).resolve().parent / "long_runs.py"
SEEDS = 'mkdir -p "$2/quick" "$2/slow" && echo seed >"$2/quick/one" && echo seed >"$2/slow/one"\n'
# What a fuzzer does: it runs until its time is over, finds an input, and prints statistics, also if it is terminated.
FUZZER = """for argument; do
  case $argument in
    -max_total_time=*) seconds=${argument#*=} ;;
    -artifact_prefix=*) failing=${argument#*=} ;;
    -*) ;;
    *) inputs+=("$argument") ;;
  esac
done
finish() { echo "#9 DONE   cov: 21 ft: 3 corp: 1/1b"; echo "stat::number_of_executed_units: 100"; exit "${1:-0}"; }
trap 'finish 72' TERM
[ -d "${inputs[0]}" ] || { grep -q bad "${inputs[0]}" && [ ! -e MENDED ] && exit 77; exit 0; }
echo found >"${inputs[0]}/found"
echo "#1 NEW    cov: 7 ft: 1 corp: 1/1b"
"""


WORK = "for ((i = 0; i < 20000; i++)); do :; done\n"  # uses processor time


class LongRunsTest(unittest.TestCase):
    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.build = pathlib.Path(scratch.name) / "build"
        self.state = pathlib.Path(scratch.name) / "state"
        self.mended = pathlib.Path(scratch.name) / "mended"
        (self.build / "fuzz").mkdir(parents=True)
        self.write("fuzz_seeds", SEEDS)
        for name in ("quick", "slow"):
            self.write(f"{name}_fuzzer", FUZZER + WORK + "finish\n")

    def write(self, name, text):
        program = self.build / "fuzz" / name
        program.write_text("#!/bin/bash\n" + text.replace("MENDED", str(self.mended)), encoding="utf-8")
        program.chmod(0o755)

    def command(self, *arguments):
        return [sys.executable, "-B", str(PROGRAM), "--state", str(self.state), *arguments, str(self.build)]

    def run_long(self, *arguments, fuzzers=()):
        return subprocess.run([*self.command(*arguments), *fuzzers], capture_output=True, text=True, timeout=300,
                              check=False)

    def sums(self):
        return json.loads((self.state / "state.json").read_text(encoding="utf-8"))

    def test_runs_every_fuzzer_until_its_time_is_over(self):
        done = self.run_long("--seconds", "0.1", "--slice", "0.2")
        self.assertEqual(done.returncode, 0, done.stderr)
        for name in ("quick", "slow"):
            self.assertGreaterEqual(self.sums()[name]["seconds"], 0.1)
            self.assertGreaterEqual(self.sums()[name]["executions"], 100)
            self.assertEqual(self.sums()[name]["coverage"], 21)
        rows = [line.split() for line in done.stdout.splitlines()]
        self.assertEqual(rows[0], ["fuzzer", "seconds", "executions", "corpus", "coverage"])
        self.assertEqual([(row[0], row[3], row[4]) for row in rows[1:]], [("quick", "1", "21"), ("slow", "1", "21")])  # one input each

    def test_a_later_call_adds_to_the_sums_and_runs_no_longer_than_needed(self):
        self.assertEqual(self.run_long("--seconds", "0.05").returncode, 0)
        first = self.sums()["quick"]
        self.assertEqual(self.run_long("--seconds", "0.05").returncode, 0)
        self.assertEqual(self.sums()["quick"], first)
        self.assertEqual(self.run_long("--seconds", str(first["seconds"] + 0.03)).returncode, 0)
        self.assertGreater(self.sums()["quick"]["executions"], first["executions"])

    def test_counts_processor_time_and_no_time_of_waiting(self):
        self.write("quick_fuzzer", FUZZER + "sleep 0.5\nfinish\n")
        process = subprocess.Popen([*self.command("--seconds", "0.4"), "quick"], stdout=subprocess.PIPE)
        self.addCleanup(process.stdout.close)
        self.addCleanup(process.wait)
        self.addCleanup(process.terminate)
        while process.poll() is None and not ((self.state / "state.json").exists() and
                                              self.sums()["quick"]["executions"] >= 300):
            time.sleep(0.05)
        self.assertGreaterEqual(self.sums()["quick"]["executions"], 300)
        self.assertLess(self.sums()["quick"]["seconds"], 0.4)

    def test_an_interruption_keeps_what_was_done(self):
        self.write("slow_fuzzer", FUZZER + "sleep 30 & wait $!\nfinish\n")
        process = subprocess.Popen([*self.command("--seconds", "30"), "slow"], stdout=subprocess.PIPE, text=True)
        while not (self.state / "slow" / "corpus" / "found").exists():
            time.sleep(0.05)
        process.send_signal(signal.SIGTERM)
        output, _ = process.communicate(timeout=30)
        self.assertEqual(process.returncode, 2)
        self.assertIn("slow", output)
        self.assertEqual(self.sums()["slow"]["executions"], 100)
        self.assertGreater(self.sums()["slow"]["seconds"], 0)

    def test_an_input_that_fails_is_kept_and_named_until_it_passes(self):
        self.write("quick_fuzzer", FUZZER + 'if [ -e MENDED ]; then\n' + WORK + 'finish\nfi\necho bad >"${failing}crash-1"\nexit 77\n')
        done = self.run_long("--seconds", "0.05", fuzzers=["quick"])
        kept = self.state / "quick" / "failing" / "crash-1"
        self.assertEqual(done.returncode, 1)
        self.assertIn(f"the quick fuzzer fails with {kept}", done.stdout)
        again = self.run_long("--seconds", "0.05", fuzzers=["quick"])
        self.assertEqual(again.returncode, 1)
        self.assertTrue(kept.exists())
        self.mended.touch()
        mended = self.run_long("--seconds", "0.05", fuzzers=["quick"])
        self.assertEqual(mended.returncode, 0, mended.stdout)
        self.assertFalse(kept.exists())
        self.assertTrue((self.state / "quick" / "corpus" / "crash-1").exists())

    def test_an_input_that_only_waited_for_the_processor_is_not_too_slow(self):
        slow = 'if [ ! -e MENDED ]; then echo good >"${failing}timeout-1"; touch MENDED; exit 70; fi\n'
        self.write("quick_fuzzer", FUZZER + slow + WORK + "finish\n")
        done = self.run_long("--seconds", "0.05", fuzzers=["quick"])
        self.assertEqual(done.returncode, 0, done.stdout)
        self.assertTrue((self.state / "quick" / "corpus" / "timeout-1").exists())

    def test_an_input_that_crashed_once_is_reported(self):
        self.write("quick_fuzzer", FUZZER + 'echo good >"${failing}crash-1"\nexit 77\n')
        done = self.run_long("--seconds", "0.05", fuzzers=["quick"])
        self.assertEqual(done.returncode, 1)
        self.assertIn("crash-1", done.stdout)

    def test_an_input_that_needs_the_processor_for_long_is_too_slow(self):
        self.write("quick_fuzzer", "while :; do :; done\n")
        self.write("slow_fuzzer", "sleep 2\n")
        with mock.patch.object(long_runs, "LONGEST_UNIT", 1):
            self.assertTrue(long_runs.fails(self.build / "fuzz", "quick", "input"))
            self.assertFalse(long_runs.fails(self.build / "fuzz", "slow", "input"))

    def test_a_fuzzer_that_ends_in_another_way_fails_too(self):
        self.write("quick_fuzzer", "exit 5\n")
        done = self.run_long("--seconds", "0.05", fuzzers=["quick"])
        self.assertEqual(done.returncode, 1)
        self.assertIn("exit code 5 and no input", done.stdout)

    def test_refuses_an_unknown_fuzzer(self):
        done = self.run_long(fuzzers=["nothing"])
        self.assertEqual(done.returncode, 1)
        self.assertIn("there is no fuzzer nothing; the fuzzers are quick, slow", done.stderr)

    def test_refuses_a_state_that_is_in_use(self):
        self.write("slow_fuzzer", FUZZER + "sleep 30 & wait $!\nfinish\n")
        process = subprocess.Popen([*self.command("--seconds", "30"), "slow"], stdout=subprocess.PIPE)
        self.addCleanup(process.stdout.close)
        self.addCleanup(process.wait)
        self.addCleanup(process.terminate)
        while not (self.state / "slow" / "corpus" / "found").exists():
            time.sleep(0.05)
        self.assertIn("another call uses", self.run_long().stderr)


if __name__ == "__main__":
    unittest.main()
