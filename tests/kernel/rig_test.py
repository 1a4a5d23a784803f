#!/usr/bin/env python3
"""Tests of the rig without a kernel: any program that writes parcels can be the machine; steps must be able to fail."""

import contextlib
import io
import pathlib
import shlex
import subprocess
import sys
import tempfile
import time
import types
import unittest

import machine
import rig
from arrived import CheckFailed, expect
from parcels_test import archive_of, parcel
from steps import STEPS, Step

HERE = pathlib.Path(__file__).resolve().parent
WHOLE = {"exit": "0\n", "leftovers": "", "kernel.log": "", "log": "a line of the log\n", "began": "1", "ended": "2"}
REMARK = ("==77==WARNING: ASan doesn't fully support makecontext/swapcontext functions and may produce false positives "
          "in some cases!")
END = parcel("end", archive_of({}))


def sent(name, **changes):
    """The parcel of a step with some files replaced; None omits a file."""
    files = {**WHOLE, "closed": f"closed {name}\n", **{file.replace("_", "."): text for file, text in changes.items()}}
    return parcel(name, archive_of({file: text for file, text in files.items() if text is not None}))


class RigTest(unittest.TestCase):
    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.results = pathlib.Path(scratch.name)

    def run_machine(self, content, steps=("one",), check=lambda step: None, seconds=10.0, after="true"):
        """Runs a plan on a machine that sends `content`; returns the output and the failed steps."""
        source = self.results / "content"
        source.write_bytes(content)
        plan = rig.Plan("boot-1", [Step(name, "something", check) for name in steps], b"", 1, seconds, 1)

        def command(_kernel, _initramfs, _memory, target):
            return ["sh", "-c", f"cat {shlex.quote(str(source))} >>{shlex.quote(str(target))}; {after}"]

        printed = io.StringIO()
        original, rig.command_of = rig.command_of, command
        try:
            with contextlib.redirect_stdout(printed):
                rig.run_plan(plan, types.SimpleNamespace(image=None), self.results)
        finally:
            rig.command_of = original
        return printed.getvalue(), plan.failed

    def test_a_step_passes_when_all_holds(self):
        printed, failed = self.run_machine(sent("one") + sent("two") + END, ("one", "two"))
        self.assertEqual(failed, [])
        self.assertRegex(printed, r"pass .*boot-1: one: something\npass .*boot-1: two")
        self.assertEqual((self.results / "boot-1/one/log").read_text(), "a line of the log\n")

    def test_a_remark_of_a_sanitizer_is_no_finding(self):
        self.assertEqual(self.run_machine(sent("one", found_77=REMARK + "\n") + END)[1], [])

    def test_what_makes_a_step_fail(self):
        rows = {
            "no closing line": ({"closed": None}, "the closing line is ''"),
            "the closing line of another step": ({"closed": "closed two\n"}, "the closing line is"),
            "an exit code": ({"exit": "1\n"}, "the exit code of the script is '1'"),
            "killed, as it took too long": ({"exit": "137\n", "closed": None}, "the exit code of the script is '137'"),
            "a process that is left": ({"leftovers": "/proc/7 quazor\n"}, "left running"),
            "a kernel's complaint": ({"kernel_log": "[ 1.0] WARNING: CPU: 0\n"}, "the kernel complains"),
            "what a sanitizer found": ({"found_77": "heap-use-after-free\n"}, "a sanitizer found: heap-use-after-free"),
            "what it found after a remark": ({"found_77": f"{REMARK}\nstack-overflow\n"},
                                             "a sanitizer found: stack-overflow"),
            "no kernel log": ({"kernel_log": None}, "there is no kernel.log"),
        }
        for name, (changes, sentence) in rows.items():
            with self.subTest(name):
                printed, failed = self.run_machine(sent("one", **changes) + sent("two") + END, ("one", "two"))
                self.assertEqual(failed, ["one"])
                self.assertIn(sentence, printed)
                self.assertIn("a line of the log", printed)
                self.assertIn("pass", printed)

    def test_a_check_that_does_not_hold_fails_its_step(self):
        def not_so(_step):
            expect(False, "the count is 3, expected 4")

        printed, failed = self.run_machine(sent("one") + END, check=not_so)
        self.assertEqual(failed, ["one"])
        self.assertIn("the count is 3, expected 4", printed)

    def test_a_report_of_another_form_fails_its_step(self):
        rows = {
            "no file": lambda step: step.exit_code("absent"),
            "no number": lambda step: int("x"),
            "no key": lambda step: {}["x"],
        }
        for name, check in rows.items():
            with self.subTest(name):
                self.assertEqual(self.run_machine(sent("one") + END, check=check)[1], ["one"])

    def test_a_step_whose_parcel_never_comes_has_failed(self):
        printed, failed = self.run_machine(sent("one") + END, ("one", "two"))
        self.assertEqual(failed, ["two"])
        self.assertIn("boot-1: two: its closing line never came", printed)

    def test_a_machine_that_stops_early_has_failed(self):
        for content in (sent("one"), sent("one") + END[:-1], b""):
            with self.subTest(length=len(content)):
                printed, failed = self.run_machine(content)
                self.assertIn("(the boot)", failed)
                self.assertIn("the machine ended by itself", printed)

    def test_a_machine_that_hangs_is_killed_and_has_failed(self):
        for how, after in (("waits", "exec sleep 60"), ("works", "while :; do :; done")):
            with self.subTest(how):
                printed, failed = self.run_machine(sent("one"), ("one", "two"), seconds=0.5, after=after)
                self.assertEqual(failed, ["two", "(the boot)"])
                self.assertIn("did not end in 0.5 s of processor time", printed)

    def test_the_processor_time_of_a_machine_is_told(self):
        with subprocess.Popen(["sh", "-c", "while :; do :; done"]) as process:
            try:
                while machine.processor_seconds(process.pid) < 0.2:
                    time.sleep(0.05)
            finally:
                process.kill()
        with subprocess.Popen(["sleep", "60"]) as process:
            try:
                time.sleep(0.2)
                self.assertLess(machine.processor_seconds(process.pid), 0.1)
            finally:
                process.kill()

    def test_what_an_earlier_machine_sent_does_not_count(self):
        (self.results / "boot-1").mkdir()
        (self.results / "boot-1/sent").write_bytes(sent("one") + END)
        self.assertEqual(self.run_machine(b"")[1], ["one", "(the boot)"])
        came = []
        (self.results / "sent").write_bytes(sent("one") + END)
        machine.boot(["true"], self.results, 10, came.append)
        self.assertEqual(came, [])

    def test_every_step_has_a_script_and_every_script_a_step(self):
        names = [step.name for step in STEPS]
        self.assertEqual(len(names), len(set(names)))
        self.assertEqual(sorted(names), sorted(script.stem for script in (HERE / "guest/steps").glob("*.sh")))

    def test_the_long_steps_run_only_if_asked_for(self):
        long = {step.name for step in STEPS if step.thorough}
        self.assertTrue(long)
        self.assertEqual({step.name for step in rig.chosen_steps([], False)}, {step.name for step in STEPS} - long)
        self.assertEqual(rig.chosen_steps([], True), STEPS)
        (name, *_) = long
        self.assertEqual([step.name for step in rig.chosen_steps([name], False)], [name])

    def test_an_unknown_step_is_refused(self):
        original, sys.argv = sys.argv, ["run", "no_such_step"]
        try:
            with contextlib.redirect_stderr(io.StringIO()) as printed, self.assertRaises(SystemExit):
                rig.arguments()
        finally:
            sys.argv = original
        self.assertIn("there is no step no_such_step", printed.getvalue())

    def test_expect_raises_the_sentence(self):
        with self.assertRaisesRegex(CheckFailed, "a sentence"):
            expect(False, "a sentence")
        expect(True, "another")


if __name__ == "__main__":
    unittest.main()
