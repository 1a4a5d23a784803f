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
FOUND_BY_OTHERS = ("projector_fault/fault_events_before_streaming", "projector_fault/channel_in_another_group",
                   "projector_fault/channel_without_count", "projector_fault/first_port_type_unreadable",
                   "report_channels/channel_in_extended_subgroup")
FOUND_BY_OTHERS_WITH_STRICT = ("projector_fault/frames_dropped", "projector_fault/start_delayed")


def real_phone(expected, **others):
    """A binding without cameras, whose file expects this of a diagnostic that needs one."""
    return {"title": "No camera", "expect": {"SingleCameraDiagnostic": expected}, **others}


NO_CAMERA = {"verdict": "error", "error": {"domain": "SingleCameraErrorDomain", "code": 1,
                                           "message": "There is no capture device."}}


class RealPhoneTest(CommandLineTest):
    def judged(self, phones, *names, code):
        for name, phone in phones.items():
            (self.directory / name).write_text(json.dumps(phone))
        result = quazor("selftest", *(f"linux:{self.directory / name}" for name in [*phones, *names]), "--seeds", "2",
                        "--format", "json")
        self.assertEqual(result.returncode, code, result.stderr)
        document = json.loads(result.stdout) if result.stdout else None
        return document, result.stderr

    def test_a_fault_of_a_real_phone_is_detected(self):
        document, errors = self.judged({"none.json": real_phone(NO_CAMERA)}, code=0)
        self.assertEqual(errors, "")
        row, = document["rows"]
        self.assertEqual((row["name"], row["runs"], row["asExpected"], row["outcome"]),
                         ("SingleCameraDiagnostic", 2, 2, "detected"))
        self.assertEqual([(one["kind"], one["default"]["detected"]) for one in document["phones"]], [("faulty", 2)])

    def test_what_must_pass_and_does_not_is_a_false_alarm(self):
        document, _ = self.judged({"first.json": real_phone({"verdict": "pass"}),
                                   "second.json": real_phone({"verdict": "pass"})}, code=1)
        self.assertEqual([row["outcome"] for row in document["rows"]], ["false alarm"] * 2)
#The others are compared with the first.
        self.assertEqual([one["kind"] for one in document["phones"]], ["healthy", "changed"])
        self.assertEqual(document["totals"]["default"]["falseAlarms"], 2)

    def test_only_what_the_file_names_is_run(self):
        document, _ = self.judged({"none.json": real_phone(NO_CAMERA)}, code=0)
        self.assertEqual(document["phones"][0]["default"]["reasons"], [])
        self.assertEqual(len(document["rows"]), 1)

    def test_a_fault_that_never_fires_is_invalid(self):
        fault = {"operation": "CapturePlugIn.device", "occurrence": 99, "action": "nothing"}
        document, _ = self.judged({"never.json": real_phone(NO_CAMERA, faults=[fault])}, code=1)
        self.assertEqual([row["outcome"] for row in document["rows"]], ["invalid"])

    def test_mistakes_are_refused_and_the_others_are_run(self):
        wrong = real_phone({"verdict": "perfect"})
        document, errors = self.judged({"none.json": real_phone(NO_CAMERA), "wrong.json": wrong}, "missing.json", code=66)
        self.assertEqual(len(document["rows"]), 1)
        self.assertIn("wrong.json:1: expect.SingleCameraDiagnostic.verdict: ", errors)
        self.assertIn("missing.json: the file does not exist", errors)
        self.assertIn("2 of 3 phones were refused", errors)

    def test_a_binding_that_expects_nothing_is_not_tested(self):
        document, errors = self.judged({"none.json": {"title": "No camera"}}, code=66)
        self.assertIsNone(document)
        self.assertIn("no phone has an expected outcome", errors)

    def test_beside_simulated_phones(self):
        (self.directory / "none.json").write_text(json.dumps(real_phone(NO_CAMERA)))
        result = quazor("selftest", f"linux:{self.directory / 'none.json'}", REFUSED, "--seeds", "1", "--format", "json")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual([one["phone"] for one in json.loads(result.stdout)["phones"]],
                         [REFUSED, f"linux:{self.directory / 'none.json'}"])


class SelftestTest(CommandLineTest):
    def test_a_fault_that_its_file_expects_to_pass_is_a_blind_spot_with_the_reasons_of_each_profile(self):
        result = quazor("selftest", "healthy", DROPPED, REFUSED, "--seeds", "1")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertRegex(result.stdout, rf"\n{DROPPED} +not detected +not detected +detected\n")
        self.assertRegex(result.stdout, rf"\n{REFUSED} +detected +detected +detected\n")
        self.assertRegex(result.stdout, r"\nhealthy +passed +passed +passed\n")
        self.assertIn(f"\nNot detected, and why:\n\n  {DROPPED} (by default as its file expects)\n", result.stdout)
        self.assertRegex(" ".join(result.stdout.split()), r"By default: not detected .*BackTele\.Total is 87 frames "
                         r"instead of 90 frames: its limit changes with it .* By strict: detected ")
        self.assertIn("\nPhones: 2 with a fault, 1 healthy; runs: ", result.stdout)
        self.assertIn("By default: 1 of 2 faults detected, 1 blind spot, 0 false alarms\n", result.stdout)
        self.assertIn("By strict: 2 of 2 faults detected, 0 blind spots, 0 false alarms\n", result.stdout)

    def test_the_document_has_the_same(self):
        result = quazor("selftest", DROPPED, "--seeds", "1", "--format", "json")
        document = json.loads(result.stdout)
        self.assertEqual(document["totals"]["default"], {"detected": 0, "blindSpots": 1, "falseAlarms": 0, "changesPassed": 0})
        self.assertEqual(document["totals"]["strict"],
                         {"detected": 1, "blindSpots": 0, "falseAlarms": 0, "changesPassed": 0})
        self.assertEqual((document["totals"]["faulty"], document["totals"]["changed"]), (1, 0))
        phone, = document["phones"]
        self.assertEqual((phone["phone"], phone["kind"], phone["expectsDetection"]), (DROPPED, "faulty", False))
        self.assertTrue(any("BackTele.Total" in one for one in phone["default"]["reasons"]), phone)
        self.assertEqual(phone["strict"]["reasons"], [])
        self.assertFalse(document["interrupted"])
        self.assertEqual(document["unusedLimits"], [])

    def test_what_run_all_finds_is_detected_whatever_the_phone_expects(self):
#Their files expect nothing of the diagnostics that notice these.
        result = quazor("selftest", *FOUND_BY_OTHERS, *FOUND_BY_OTHERS_WITH_STRICT, "--seeds", "1", "--format", "json")
        self.assertEqual(result.returncode, 0, result.stderr)
        for one in json.loads(result.stdout)["phones"]:
            with self.subTest(one["phone"]):
                self.assertEqual(one["default"]["detected"], 1 if one["phone"] in FOUND_BY_OTHERS else 0, one)
                self.assertEqual(one["strict"]["detected"], 1, one)
                run = quazor("run", "--all", "--phone", one["phone"])
                self.assertEqual(run.returncode == 0, one["default"]["detected"] == 0)

    def test_what_the_phone_says_it_lacks_is_skipped(self):
        result = quazor("selftest", "single_camera/one_camera", "--seeds", "1", "--format", "json")
        self.assertEqual(result.returncode, 0, result.stderr)
        document = json.loads(result.stdout)
        phone, = document["phones"]
        self.assertEqual((phone["kind"], phone["default"]["detected"]), ("changed", 0))
        self.assertIn("TesselFaultDiagnostic is skipped: This phone has no depth camera.", phone["default"]["reasons"])
#An inherited expectation of such a diagnostic is left out, one of the file itself is a contradiction.
        absent = {"TesselFault*": "It has no projector."}
        inherits = self.write("inherits.json", json.dumps({"base": "healthy", "title": "Mine", "absent": absent}))
        result = quazor("selftest", inherits, "--seeds", "1", "--format", "json")
        self.assertEqual(result.returncode, 0, result.stdout + result.stderr)
        self.assertNotIn("TesselFaultDiagnostic", [row["name"] for row in json.loads(result.stdout)["rows"]])
        both = {"base": "healthy", "title": "Mine", "absent": absent, "expect": {"TesselFaultDiagnostic": {"verdict": "pass"}}}
        self.assert_refused(quazor("selftest", self.write("both.json", json.dumps(both))), 66, "expect.TesselFaultDiagnostic: ",
                            '"absent" says: It has no projector.')

    def test_false_alarms_are_counted_by_both_profiles(self):
        own = {"base": "healthy", "title": "Mine", "cameras": {"back-tele": {"droppedFrames": [3]}},
               "expect": {BACK: {"verdict": "pass"}}}
        phone = self.write("mine.json", json.dumps(own))
        result = quazor("selftest", phone, "--seeds", "1")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertRegex(result.stdout, r"mine\.json +passed +passed +FALSE ALARM\n")
        self.assertIn("1 with a change that must pass", result.stdout)
        self.assertIn("By default: 0 of 0 faults detected, 0 blind spots, 0 false alarms, 1 of 1 change passed\n", result.stdout)
        self.assertIn("By strict: 0 of 0 faults detected, 0 blind spots, 1 false alarm, 0 of 1 change passed\n", result.stdout)
        self.assertRegex(" ".join(result.stdout.split()), rf"False alarms: .* By strict: FALSE ALARM - {BACK} fails: BackTele\.Total")
        own["faults"] = [{"operation": "CaptureStream.stop", "object": "back-tele", "action": "fail"}]
        phone.write_text(json.dumps(own))
        result = quazor("selftest", phone, "--seeds", "1", "--format", "json")
        self.assertEqual(json.loads(result.stdout)["phones"][0]["kind"], "faulty", result.stderr)

    def test_the_limit_on_log_lines_holds_in_this_process_too(self):
        def reasons(*arguments):
            result = quazor("selftest", STOP_REFUSED, "--seeds", "1", "--format", "json", *arguments)
            self.assertEqual(result.returncode, 0, result.stderr)
            return [one.rsplit(": ", 1)[-1] for one in json.loads(result.stdout)["phones"][0]["default"]["reasons"]]

        everything = reasons()
        self.assertEqual(len(everything), 2)
        self.assertEqual(reasons("--in-process"), everything)
        limited = [everything[0], "1 more log line was left out (--log-limit)"]
        self.assertEqual(reasons("--log-limit", "1"), limited)
        self.assertEqual(reasons("--log-limit", "1", "--in-process"), limited)


class LimitsOfProfilesTest(CommandLineTest):
    def selftest(self, limit, profile, phone):
        entries = {"CameraSyncDiagnostic.*": {"limits": [{"limit": limit}]}}
        folder = self.directory / "data/quazor/profiles"
        folder.mkdir(parents=True, exist_ok=True)
        (folder / f"{profile}.json").write_text(json.dumps({"schema": 1, "base": profile, "diagnostics": entries}))
        env = {"XDG_DATA_HOME": str(self.directory / "data")}
        result = quazor("selftest", phone, "--seeds", "1", "--format", "json", env=env)
        self.assertEqual(result.returncode, 0, result.stdout + result.stderr)
        return json.loads(result.stdout), quazor("run", "--all", "--phone", phone, env=env)

    def test_those_of_an_own_default_profile_count_by_default(self):
        document, run = self.selftest("*.Total == 90 frames", "default", DROPPED)
        self.assertEqual(run.returncode, 1)
        self.assertEqual(document["phones"][0]["default"]["detected"], 1)
        self.assertEqual(document["totals"]["default"]["blindSpots"], 0)

    def test_one_that_holds_is_told_as_a_reason(self):
        document, run = self.selftest("*.Total > 80 frames", "default", DROPPED)
        self.assertEqual(run.returncode, 0, run.stdout)
        reasons = [one for one in document["phones"][0]["default"]["reasons"] if "BackTele.Total" in one]
        self.assertRegex(reasons[0], r"it is within the limit .*> 80 frames .*profile default\.json")

    def test_one_that_fits_no_result_is_told(self):
        for profile in ("default", "strict"):
            with self.subTest(profile):
                document, _ = self.selftest("*.Totals == 90 frames", profile, "healthy")
                unused, = (one for one in document["unusedLimits"] if one["profile"] == profile)
                self.assertIn("was compared with nothing: no result has the name '*.Totals'", unused["problem"])


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

    def test_an_expectation_of_the_file_itself_is_told_if_its_diagnostic_is_not_loaded(self):
        entry = {"experiment": "NimbeImageExperiment", "verdict": "pass"}
        phone = self.on_healthy("named.json", **{BACK: {"verdict": "error"}, "One image": entry, "Removed": {"verdict": "fail"}})
        for more in ((), ("--in-process",)):
            result = self.selftest(phone, *more)
            self.assertEqual(result.returncode, 0, result.stderr)
            self.assertEqual(result.stderr, f"quazor: {phone}: what it expects of {BACK}, NimbeImageExperiment, Removed is "
                             "not compared, because no loaded plug-in has them\n")
            document = json.loads(result.stdout)
            self.assertEqual([row["name"] for row in document["rows"]], ["EventCountDiagnostic"])
            self.assertEqual(document["notJudged"], [])

    def test_a_misspelt_name_in_an_expectation_is_refused(self):
        for wrong, right in ((BACK.replace("Back", "Bakc"), BACK), ("EventCountDiagnostik", "EventCountDiagnostic")):
            phone = self.on_healthy("named.json", **{wrong: {"verdict": "pass"}})
            line = phone.read_text()[:phone.read_text().index(wrong)].count("\n") + 1
            self.assert_refused(self.selftest(phone), 66, f"{phone}:{line}: expect.{wrong}: no loaded plug-in has {wrong}; "
                                f"did you mean '{right}'?")

    def test_a_phone_of_a_removed_plug_in_is_named_and_the_others_are_judged(self):
        data = self.directory / "data"
        folder = data / "quazor/scenarios/mine"
        folder.mkdir(parents=True)
        env = {"XDG_DATA_HOME": str(data), "XDG_STATE_HOME": str(data)}
        (folder / "left.json").write_text(json.dumps({"title": "Left", "cameras": {}, "groups": {}, "faults": [],
                                                      "expect": {"Removed": {"verdict": "fail"}}}))
        told = "what it expects of Removed is not compared, because no loaded plug-in has it"
        result = quazor("selftest", "mine/*", "healthy", "--seeds", "1", env=env)
        self.assertEqual((result.returncode, result.stderr), (0, f"quazor: mine/left: {told}\n"))
        self.assertIn(f"\nNot judged: mine/left: {told}\n", result.stdout.replace("\n  ", " "))
        result = quazor("selftest", "mine/left", "--plugin", EXAMPLE, "--seeds", "1", env=env)
        self.assert_refused(result, 66, "nothing was tested: no loaded plug-in has what the phones expect something of")
        doctor = quazor("doctor", env=env)
        self.assertEqual(doctor.returncode, 0, doctor.stdout)
        self.assertIn(f"REMARK   phone {folder / 'left.json'}\n           it expects something of Removed, which no installed "
                      "plug-in has; if the plug-in was removed, remove the phone, too\n", doctor.stdout)

    def test_a_phone_that_is_refused_does_not_keep_the_others_from_being_tested(self):
        data = self.directory / "data"
        folder = data / "quazor/scenarios/mine"
        folder.mkdir(parents=True)
        env = {"XDG_DATA_HOME": str(data)}
        self.on_healthy("good.json").rename(folder / "good.json")
        (folder / "broken.json").write_text('{\n  "title": "Broken",\n  "cameras": 7\n}\n')
        named = self.on_healthy("named.json", **{BACK + "k": {"verdict": "pass"}})
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


    def test_a_faulty_phone_that_says_nothing_is_told_how_to_say_it(self):
        phone = self.phone_file("mine.json", faults=[{"operation": "CaptureStream.start", "action": "fail"}])
        result = quazor("selftest", phone, "--seeds", "1")
        self.assertEqual(result.returncode, 1, result.stderr)
        self.assertNotIn("FALSE ALARM", result.stdout)
        self.assertRegex(result.stdout, r"mine\.json +nothing said +detected +detected\n")
        self.assertRegex(result.stdout, r"mine\.json +SingleCameraDiagnostic +nothing; its base: pass +0 of 1 +NOT SAID\n")
        told = result.stdout.split("add to it:")[1] if "add to it:" in result.stdout else result.stdout.split("to it:")[1]
        expect = json.loads("{" + told.split("\n\n")[0] + "}")["expect"]
        self.assertIn(BACK, expect)
        phone = self.phone_file("mine.json", faults=[{"operation": "CaptureStream.start", "action": "fail"}], expect=expect)
        result = quazor("selftest", phone, "--seeds", "1")
        self.assertEqual(result.returncode, 0, result.stdout + result.stderr)
        self.assertIn("Every run ended as its phone expects.", result.stdout)
        bare = self.write("bare.json", json.dumps({"title": "Bare", "cameras": {}, "groups": {}, "faults": []}))
        self.assert_refused(quazor("selftest", bare), 66, "no phone has an expected outcome; say it in the phone's file, as in "
                            '"expect": {"DIAGNOSTIC": {"verdict": "fail"}}')

    def test_a_plug_in_alone_means_the_phones_that_expect_something_of_it(self):
        result = quazor("selftest", "--plugin", EXAMPLE, "--seeds", "1")
        self.assert_refused(result, 66, "no installed phone expects anything of what --plugin names", "phones/*.json")
        self.assertNotIn("REFUSED", result.stderr)
        folder = self.directory / "data/quazor/scenarios/mine"
        folder.mkdir(parents=True)
        self.on_healthy("good.json").rename(folder / "good.json")
        result = self.selftest(env={"XDG_DATA_HOME": str(self.directory / "data")})
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual([row["phone"] for row in json.loads(result.stdout)["rows"]], ["mine/good"])

    def test_the_table_of_runs_counts_what_each_profile_detects(self):
        result = quazor("selftest", "healthy", DROPPED, REFUSED, "--seeds", "1")
        row = next(line for line in result.stdout.splitlines() if line.startswith(f"{BACK} "))
        self.assertEqual(row.split()[1:], ["2", "1", "1", "2", "0", "0", "of", "1", "0"], result.stdout)


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
