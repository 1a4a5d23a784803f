"""Diagnostics that are skipped: because the user says so, a part is absent, or the run stopped before them."""

import json
import unittest
import xml.etree.ElementTree

from command_line_fixture import SCENARIO, WORKING, RecordTest, analyze, events_in, quazor

BOTH = ("Fake.One", "Fake.Two")
HOT = ("--skip", "Fake.Two=it is hot, \"very\"")


class SkipTest(RecordTest):
    def verdicts(self, *arguments, names=BOTH, code=0):
        done = self.run_fake("--format", "json", "--record", self.record, "--replace", *arguments,
                             names=names)
        self.assertEqual(done.returncode, code, done.stdout + done.stderr)
        self.assert_verifies(self.record)
        return [(one["verdict"], one.get("skip")) for one in json.loads(done.stdout)["diagnostics"]]

    def test_a_skip_needs_permission(self):
        hot = {"kind": "not-allowed", "reason": 'it is hot, "very"'}
        self.assertEqual(self.verdicts(*HOT, code=2), [("pass", None), ("skip", hot)])
        self.assertEqual(self.verdicts(*HOT, "--allow-skips"), [("pass", None), ("skip", hot)])

    def test_a_run_of_skips_alone_is_never_allowed(self):
        self.verdicts("--skip", "Fake.*=x", "--allow-skips", code=2)

    def test_an_error_keeps_its_exit_code(self):
        self.verdicts(*HOT, "--allow-skips", names=("Broken.Factory", *BOTH), code=2)

    def test_a_failure_precedes_a_skip(self):
        self.assertEqual([one for one, _ in self.verdicts(*HOT, "--limit", "Count < 0", code=1)], ["fail", "skip"])

    def test_a_limit_that_only_a_skipped_one_could_meet_is_an_error(self):
        limit = "Fake.Two:Count >= 0"
        done = self.run_fake(*HOT, "--allow-skips", "--limit", limit, names=BOTH)
        self.assertEqual(done.returncode, 2, done.stderr)
        self.assertIn(f"the limit '{limit}' (command line) was compared with nothing: every diagnostic for which it is "
                      "meant was skipped", done.stdout)

    def test_a_limit_of_a_profile_is_not_missed_where_its_diagnostic_is_skipped(self):
        path = self.directory / "profile.json"
        path.write_text(json.dumps({"schema": 1, "diagnostics": {"Fake.Two": {"limits": [{"limit": "Count >= 0"}]}}}))
        self.assertEqual(self.verdicts(*HOT, "--allow-skips", "--parameters", path)[1][0], "skip")

    def test_a_limit_that_fits_nothing_is_not_excused_by_a_skip(self):
        self.verdicts(*HOT, "--allow-skips", "--limit", "Nothing >= 0", code=2)

    def test_a_phone_says_what_is_absent(self):
        self.phone = self.write("phone.json", json.dumps(SCENARIO | {"absent": {
            "*.Two": "This board has no second camera.", "Fake.One": {"kind": "not-allowed", "reason": "It is hot."},
            "Others.*": "They fit nothing here."}}))
        self.assertEqual(self.verdicts(code=2),
                         [("skip", {"kind": "not-allowed", "reason": "It is hot."}),
                          ("skip", {"kind": "no-such-hardware", "reason": "This board has no second camera."})])
        self.assertEqual(self.verdicts("--skip", "Fake.Two=mine", code=2)[1][1], {"kind": "not-allowed", "reason": "mine"})

    def test_what_a_phone_says_is_checked(self):
        for absent in ({"Fake.One": ""}, {"Fake.One": {"kind": "gone", "reason": "x"}}, ["Fake.One"], {"": "x"}):
            with self.subTest(absent=absent):
                self.phone = self.write("phone.json", json.dumps(SCENARIO | {"absent": absent}))
                self.assert_refused(self.run_fake("--output", self.output), 66, "absent")

    def test_a_skip_that_is_refused(self):
        for text in ("Fake.One", "=x", "Fake.One=", "Nowhere.*=x", "Fake.Two=x"):
            with self.subTest(text=text):
                self.assert_refused(self.run_fake("--skip", text, "--output", self.output), 64, "--skip '")

    def test_a_run_stops_on_an_error(self):
        found = self.verdicts("--stop-on", "error", names=("Fake.One", "Broken.Factory", "Fake.Two"), code=2)
        self.assertEqual(found[1], ("error", None))
        self.assertEqual(found[2], ("skip", {"kind": "not-reached", "reason":
                                             "The run stopped after Broken.Factory had ended in an error."}))

    def test_a_run_stops_on_a_failure(self):
        failing = ("--limit", "Fake.One:Count < 0")
        self.assertEqual([one for one, _ in self.verdicts("--stop-on", "error", *failing, code=1)], ["fail", "pass"])
        found = self.verdicts("--stop-on", "fail", *failing, code=1)
        self.assertEqual(found[1], ("skip", {"kind": "not-reached", "reason": "The run stopped after Fake.One had failed."}))
        self.assertEqual([one for one, _ in self.verdicts("--stop-on", "fail", "--allow-skips", *failing, code=1)],
                         ["fail", "skip"])

    def test_a_skipped_one_is_not_begun(self):
        self.verdicts(*HOT, code=2)
        events = [event for event in events_in(self.record) if event["event"] not in ("runBegan", "runEnded")]
        second = events[[event["event"] for event in events].index("diagnosticEnded") + 1:]
        self.assertEqual([event["event"] for event in second], ["diagnosticBegan", "skipped", "diagnosticEnded"])
        self.assertEqual(second[-1]["verdict"], "skip")

    def test_every_report_has_the_kind_and_the_reason(self):
        done = self.run_fake(*HOT, "--verbose", "--output", f"junit:{self.directory / 'j'}",
                             "--output", f"ocp:{self.directory / 'o'}", "--output", f"csv:{self.directory / 'c'}", names=BOTH)
        self.assertEqual(done.returncode, 2, done.stderr)
        self.assertIn('  SKIP\n    not-allowed: it is hot, "very"\n', done.stdout)
        self.assertIn("2 diagnostics: 1 passed, 0 failed, 0 ended in an error, 1 skipped\n", done.stdout)
        self.assertIn("\nSKIP  Fake.Two: not-allowed: it is hot", done.stdout)
        short = self.run_fake(*HOT, names=BOTH).stdout
        self.assertRegex(short, r'(?m)^SKIP  Fake\.Two +not-allowed: it is hot, "very"$')
        suite = xml.etree.ElementTree.parse(self.directory / "j").getroot().findall("testsuite")[1]
        self.assertEqual([suite.get(key) for key in ("tests", "failures", "errors", "skipped")], ["1", "0", "0", "1"])
        self.assertEqual(suite.find("testcase/skipped").get("message"), 'it is hot, "very"')
        ends = [json.loads(line) for line in (self.directory / "o").read_text().splitlines() if "testRunEnd" in line]
        self.assertEqual(ends[1]["testRunArtifact"]["testRunEnd"], {"status": "SKIP", "result": "NOT_APPLICABLE"})
        self.assertIn('Fake.Two,skip,,,,,,,,,,,,,,,not-allowed,"it is hot, ""very"""', (self.directory / "c").read_text())

    def test_a_record_that_says_more_of_a_skipped_one_is_wrong(self):
        self.verdicts(*HOT, code=2)

        def claim_a_skip(events):
            first = next(event for event in events if event["event"] == "diagnosticEnded")
            first["event"], first["kind"], first["reason"] = "skipped", "not-allowed", "x"
            for key in ("verdict", "date"):
                del first[key]
            events.insert(events.index(first) + 1, {"event": "diagnosticEnded", "verdict": "skip",
                                                    "date": "2026-11-21T01:08:00.000000000Z"})
            for place, event in enumerate(events):
                event["sequence"] = place

        done = quazor("verify", self.changed(claim_a_skip))
        self.assertEqual(done.returncode, 1, done.stdout)
        self.assertIn("Fake.One was skipped, but something of it is recorded", done.stdout)

    def test_only_failed_repeats_a_skipped_one(self):
        self.verdicts(*HOT, code=2)
        done = self.run_fake("--only", "failed", "--of", self.record, "--format", "json", names=())
        self.assertEqual([one["name"] for one in json.loads(done.stdout)["diagnostics"]], ["Fake.Two"])

    def test_analyze_and_diff_know_a_skipped_one(self):
        self.verdicts(*HOT, code=2)
        done = analyze(self.record)
        self.assertEqual(done.returncode, 0, done.stderr)
        self.assertIn("Fake.Two has no experiment result", done.stderr)
        other = self.recorded(record=self.directory / "other.jsonl", names=BOTH)
        done = quazor("diff", self.record, other)
        self.assertEqual(done.returncode, 1)
        self.assertIn("Fake.Two: verdict was skip and is pass", done.stdout)
        self.assertIn("Fake.Two: skip is only in the first: not-allowed: it is hot", done.stdout)

    def test_the_last_line_of_the_text_says_that_a_skip_is_the_reason(self):
        reason = "What was skipped makes the exit code 2, unless --allow-skips is given.\n"
        done = self.run_fake(*HOT, names=BOTH)
        self.assertEqual(done.returncode, 2, done.stderr)
        self.assertTrue(done.stdout.endswith(reason), done.stdout)
        self.assertNotIn(reason, self.run_fake(*HOT, "--allow-skips", names=BOTH).stdout)
        done = self.run_fake("--skip", "Fake.*=hot", "--allow-skips", names=BOTH)
        self.assertEqual(done.returncode, 2, done.stderr)
        self.assertTrue(done.stdout.endswith("Nothing passed, so the exit code is 2, in spite of --allow-skips.\n"), done.stdout)
        junit = self.directory / "junit"
        for options, code in (((), 2), (("--allow-skips",), 0)):
            self.assertEqual(self.run_fake(*HOT, *options, "--output", f"junit:{junit}", names=BOTH).returncode, code)
            suites = list(xml.etree.ElementTree.parse(junit).iter("testsuite"))
            self.assertEqual(len(suites), 2)
            for suite in suites:
                found = {one.get("name"): one.get("value") for one in suite.findall("properties/property")}
                self.assertEqual((found["run.verdict"], found["run.exitCode"]), ("skip", str(code)))

    def test_an_experiment_can_be_skipped(self):
        done = quazor("experiment", "FakeExperiment", "--plugin", WORKING, "--phone", self.phone, "--profile", "none",
                      "--skip", "FakeExperiment=x")
        self.assertEqual(done.returncode, 2, done.stderr)
        self.assertIn("  SKIP\n    not-allowed: x\n", done.stdout)


if __name__ == "__main__":
    unittest.main()
