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

from command_line_fixture import PLUGINS, PROGRAM, CommandLineTest, quazor

DROPPED = "camera_sync/frames_dropped"
STOP_REFUSED = "camera_sync/stop_refused"
REFUSED = "camera_sync/start_refused_on_first"
EXAMPLE = PLUGINS / "event_count.so"
BACK = "CameraSyncDiagnostic.Back"


class SelftestTest(CommandLineTest):
    def test_a_change_that_must_pass_has_its_reason_and_what_the_profile_strict_finds(self):
        result = quazor("selftest", "healthy", DROPPED, REFUSED, "--seeds", "1")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertRegex(result.stdout, rf"\n{DROPPED} +passed +passed +detected\n")
        self.assertRegex(result.stdout, rf"\n{REFUSED} +detected +detected +detected\n")
        self.assertRegex(result.stdout, r"\nhealthy +passed +passed +passed\n")
        self.assertIn(f"\n  {DROPPED} (by strict: detected)\n", result.stdout)
        self.assertRegex(" ".join(result.stdout.split()), r"BackTele\.Total is 87 frames instead of 90 frames: its "
                         r"limit changes with it")
        self.assertIn("\nPassed by default as the phone expects, and what differs:\n", result.stdout)
        self.assertNotIn("Not detected by default", result.stdout)
        self.assertIn("\nPhones: 1 with a fault, 1 with a change that must pass, 1 healthy; runs: ", result.stdout)
        self.assertIn("By default: 1 of 1 fault detected, 0 blind spots, 0 false alarms, 1 of 1 change passed\n", result.stdout)
        self.assertIn("By strict: 1 of 1 fault detected, 0 blind spots, 0 false alarms, 0 of 1 change passed\n", result.stdout)

    def test_the_document_has_the_same(self):
        result = quazor("selftest", DROPPED, "--seeds", "1", "--format", "json")
        document = json.loads(result.stdout)
        self.assertEqual(document["totals"]["default"], {"detected": 0, "blindSpots": 0, "falseAlarms": 0, "changesPassed": 1})
        self.assertEqual(document["totals"]["strict"],
                         {"detected": 0, "blindSpots": 0, "falseAlarms": 0, "changesPassed": 0})
        self.assertEqual((document["totals"]["faulty"], document["totals"]["changed"]), (0, 1))
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


class PhonesOfAUserTest(CommandLineTest):
    def phone_file(self, name, **entries):
        return self.write(name, json.dumps({"base": "healthy", "title": name, **entries}, indent=1))

    def on_healthy(self, name, **expected):
        events = {"Backlight": {"Backlight Events": {"Level changes": 31}}}
        return self.phone_file(name, reports=events, expect={"EventCountDiagnostic": {"verdict": "pass"}, **expected})

    def selftest(self, *phones, **options):
        return quazor("selftest", *phones, "--plugin", EXAMPLE, "--seeds", "1", "--format", "json", **options)

    def test_an_inherited_expectation_of_a_diagnostic_that_is_not_loaded_is_left_out(self):
        phone = self.on_healthy("mine.json")
        above = self.phone_file("above.json", base="mine.json")
        for file in (phone, above):
            with self.subTest(file):
                result = self.selftest(file)
                self.assertEqual(result.returncode, 0, result.stderr)
                self.assertEqual([row["name"] for row in json.loads(result.stdout)["rows"]], ["EventCountDiagnostic"])
        nothing = self.phone_file("nothing.json")
        self.assert_refused(self.selftest(nothing), 66, "nothing was tested")

    def test_an_expectation_of_the_file_itself_needs_its_diagnostic(self):
        phone = self.on_healthy("named.json", **{BACK: {"verdict": "pass"}})
        line = phone.read_text()[:phone.read_text().index(BACK)].count("\n") + 1
        self.assert_refused(self.selftest(phone), 66, f"{phone}:{line}: expect.{BACK}: ", f"no loaded plug-in has {BACK}",
                            "--plugin")
        entry = {"experiment": "NimbeImageExperiment", "verdict": "pass"}
        phone = self.on_healthy("experiment.json", **{"One image": entry})
        self.assert_refused(self.selftest(phone), 66, f"{phone}:", "expect.One image: ",
                            "no loaded plug-in has NimbeImageExperiment")

    def test_a_phone_that_is_refused_does_not_keep_the_others_from_being_tested(self):
        data = self.directory / "data"
        folder = data / "quazor/scenarios/mine"
        folder.mkdir(parents=True)
        env = {"XDG_DATA_HOME": str(data)}
        self.on_healthy("good.json").rename(folder / "good.json")
        (folder / "broken.json").write_text('{\n  "title": "Broken",\n  "cameras": 7\n}\n')
        named = self.on_healthy("named.json", **{BACK: {"verdict": "pass"}})
        result = self.selftest("mine/*", named, env=env)
        self.assertEqual(result.returncode, 66, result.stderr)
        self.assertIn("quazor: REFUSED phone mine/broken: ", result.stderr)
        self.assertIn(f"{folder}/broken.json:3: cameras: ", result.stderr)
        self.assertIn(f"quazor: REFUSED phone {named}: ", result.stderr)
        self.assertIn("2 of 3 phones were refused", result.stderr.splitlines()[-1])
        document = json.loads(result.stdout)
        self.assertEqual([row["phone"] for row in document["rows"]], ["mine/good"])
        self.assertEqual([one["phone"] for one in document["refused"]], ["mine/broken", str(named)])
        self.assertIn("broken.json:3: cameras: ", document["refused"][0]["reason"])
        self.assertFalse(document["interrupted"])
        text = quazor("selftest", "mine/*", "--plugin", EXAMPLE, "--seeds", "1", env=env)
        self.assertEqual(text.returncode, 66)
        self.assertIn("\nRefused: 1 of 2 phones\n", text.stdout)
        (folder / "broken.json").unlink()
        self.assertEqual(self.selftest("mine/*", env=env).returncode, 0)


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
