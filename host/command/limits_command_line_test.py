"""User-defined limits on the command line, in profiles and in records."""

import json
import pathlib
import subprocess
import unittest

from command_line_fixture import PLUGINS, CommandLineTest, WORKING, events_in, quazor, start


class LimitsTest(CommandLineTest):
    def run_limited(self, *arguments):
        return self.run_fake(*arguments)

    def results_of(self, *arguments):
        done = self.run_limited("--format", "json", *arguments)
        diagnostic = json.loads(done.stdout)["diagnostics"][0]
        return done.returncode, diagnostic["verdict"], diagnostic["measuredResults"]

    def setUp(self):
        super().setUp()
        code, verdict, results = self.results_of()
        self.assertEqual((code, verdict), (0, "pass"))
        self.result = results[0]
        self.name = self.result["name"]
        self.value = int(self.result["value"])

    def test_a_limit_makes_a_verdict_stricter(self):
        for limit, code, verdict in ((f"{self.name} <= {self.value}", 0, "pass"),
                                     (f"Fake.One:{self.name} < {self.value}", 1, "fail"),
                                     (f"Fake*:* > {self.value + 1} {self.result['unit']}", 1, "fail"),
                                     (f"{self.name} > 0 parsecs", 2, "error"),
                                     (f"{self.name} == Nothing", 2, "error")):
            with self.subTest(limit=limit):
                found = self.results_of("--limit", limit)
                self.assertEqual(found[:2], (code, verdict))
                self.assertEqual(found[2][0]["verdict"], self.result["verdict"])
                self.assertEqual([one["limit"] for one in found[2][0]["userLimits"]], [limit])
                self.assertEqual(found[2][0]["userLimits"][0]["source"], "command line")

    def test_a_limit_without_a_result_is_an_error(self):
        for limit in (f"{self.name}x > 0", f"Fake.*:{self.name}x > 0"):
            with self.subTest(limit=limit):
                record = self.directory / "record.jsonl"
                done = self.run_limited("--limit", limit, "--record", record, "--replace")
                self.assertEqual(done.returncode, 2, done.stdout)
                self.assertIn(f"code 14: the limit '{limit}' (command line) was compared with nothing", done.stdout)
                self.assertEqual(quazor("verify", record).returncode, 0)

    def test_a_limit_for_a_diagnostic_that_was_not_selected_is_told_before_the_run_and_is_an_error_of_it(self):
        for name, suggestion in (("Nowhere", ""), ("Fake.Oen", "; did you mean 'Fake.One'?"), ("Nowhere.*", ""),
                                 ("Fake", "; did you mean 'Fake.One'?"), ("Fake.Two", "")):
            with self.subTest(name=name):
                done = self.run_limited("--limit", f"{name}:A > 0")
                why = f"no diagnostic was selected that has the name '{name}'{suggestion}\n"
                self.assertEqual(done.returncode, 2, done.stderr)
                self.assertIn(why, done.stdout)
                self.assertTrue(done.stderr.startswith(
                    f"quazor: the limit '{name}:A > 0' (command line) will be compared with nothing: {why}"), done.stderr)
        # A profile may have limits for what is not selected.
        profile = self.directory / "profile.json"
        profile.write_text(json.dumps({"schema": 1, "base": "default", "diagnostics": {
            "Fake.Two": {"limits": [{"limit": "A > 0"}]}}}))
        done = quazor("run", "Fake.One", "--plugin", WORKING, "--phone", self.phone, "--profile", profile, "--set", "duration=1")
        self.assertEqual(done.returncode, 0, done.stderr)
        self.assertNotIn("will be compared", done.stderr)

    def test_a_result_that_the_explanations_do_not_name_is_told_before_anything_runs(self):
        back = "CameraSyncDiagnostic.Back"
        told = "quazor: the limit '{}' (command line) may be compared with nothing: the explanations name no result {}\n"
        for limit, rest in ((f"{back}:BackTele.Totl >= 1", f"'BackTele.Totl' of {back}; did you mean 'BackTele.Total'?"),
                            ("*.Totals >= 1", "'*.Totals' of the selected diagnostics; did you mean '*.Total'?"),
                            ("Zebra >= 1", "'Zebra' of the selected diagnostics"),
                            ("BackTele.Total == BackWide.Totl",
                             "'BackWide.Totl' of the selected diagnostics; did you mean 'BackWide.Total'?")):
            with self.subTest(limit=limit):
                with start("run", back, "--limit", limit, stderr=subprocess.STDOUT) as process:
                    output = process.communicate()[0]
                self.assertEqual(process.returncode, 2, output)
                self.assertTrue(output.startswith(told.format(limit, rest) + "Run "), output)
                self.assertEqual(output.count("may be compared"), 1, output)

    def test_nothing_is_told_before_of_results_that_may_be_there(self):
        known = ["--limit", "BackTele.Total == BackWide.Total +- 90", "--limit", "*.Fr* >= 0"]
        self.assertEqual(quazor("run", "CameraSyncDiagnostic.Back", *known).stderr, "")
        for names in (("Fake.One",), ("Fake.One", "CameraSyncDiagnostic.Back")):  # no result of it is explained
            done = self.run_fake("--plugin", "camera_sensor_diagnostics", "--limit", "Nothing > 0", names=names)
            self.assertNotIn("may be compared", done.stderr)
        # Also not of what does not run, nor if the explanations cannot be read.
        back, front = "CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front"
        done = quazor("run", back, front, "--skip", f"{front}=later", "--limit", f"{front}:Zebra > 0")
        self.assertNotIn("may be compared", done.stderr)
        explanations = self.directory / "quazor" / "explanations"
        explanations.mkdir(parents=True)
        (explanations / "mine.json").write_text("{")
        done = quazor("run", back, "--limit", "Zebra > 0", env={"XDG_DATA_HOME": str(self.directory)})
        self.assertEqual((done.returncode, done.stderr), (2, ""))

    def test_a_limit_that_fitted_nothing_is_told_when_its_diagnostic_has_ended(self):
        back, front = "CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front"
        limit = f"{back}:Front.Total > 0"
        told = f"the limit '{limit}' (command line) was compared with nothing: no result has the name 'Front.Total'"

        def output_of(*arguments):
            with start("run", *arguments, stderr=subprocess.STDOUT) as process:
                return process.communicate()[0]

        output = output_of(back, front, "--limit", limit)
        parts = output.split(f"quazor: {told}")
        self.assertEqual(len(parts), 2, output)
        self.assertIn(f"PASS  {back}", parts[0])
        self.assertNotIn(f"PASS  {front}", parts[0])
        self.assertIn(told, parts[1])  # and in the report
        # At the end the report alone tells it; so it does if the diagnostic ended in an error, or another may fit.
        self.assertNotIn("quazor: ", output_of(back, "--limit", limit))
        self.assertNotIn("quazor: ", output_of(back, front, "--limit", "Front.Total > 0"))
        self.assertNotIn("quazor: the", output_of(back, front, "--limit", limit, "--phone", "camera_sync/port_missing_in_group"))
        # Of a run with repetitions, the first one tells it.
        output = output_of(back, "--repeat", 3, "--limit", limit)
        self.assertEqual(output.count(f"quazor: so far, {told}"), 1, output)
        self.assertLess(output.index("so far"), output.index("Repetition 1"), output)

    def test_what_is_not_a_limit_is_refused_before_anything_runs(self):
        record = self.directory / "record.jsonl"
        for limit in ("", "Total", "Total = 1", "Total > 1 +- 1", "Total in [2, 1]", "Total in 1..2", "Total > nan", "*.A == *.A"):
            with self.subTest(limit=limit):
                done = self.run_limited("--limit", limit, "--record", record, "--replace")
                self.assertEqual(done.returncode, 64)
                self.assertIn(f"--limit '{limit}': ", done.stderr)
                self.assertFalse(record.exists())

    def profile(self, entry):
        return self.write("profile.json", json.dumps({"schema": 1, "diagnostics": entry}))

    def test_a_profile_has_limits_with_a_name_and_a_severity(self):
        limit = {"limit": f"{self.name} < {self.value}", "name": "as small as can be", "severity": "warn"}
        profile = self.profile({"Fake.*": {"limits": [limit]}})
        done = self.run_limited("--parameters", profile)
        self.assertEqual(done.returncode, 0)
        self.assertRegex(done.stdout, r"as small as can be: Count < 0 \(profile profile.json\) +warn")
        code, verdict, results = self.results_of("--parameters", profile)
        self.assertEqual((code, verdict, results[0]["userLimits"][0]["verdict"]), (0, "pass", "warn"))
        del limit["severity"]
        profile = self.profile({"Fake.*": {"limits": [limit]}})
        self.assertEqual(self.results_of("--parameters", profile)[:2], (1, "fail"))

    def test_the_profile_of_the_document_can_be_given_in_both_ways(self):
        document = (pathlib.Path(__file__).resolve().parents[2] / "docs" / "user_limits.md").read_text()
        file = self.write("mine.json", document.split("```json\n")[1].split("```")[0])
        for option in ("--profile", "--parameters"):
            done = quazor("run", "--all", option, file)
            self.assertEqual((done.returncode, done.stderr), (0, ""), done.stdout)

    def test_a_limit_of_a_profile_counts_only_for_selected_diagnostics(self):
        profile = json.loads(self.profile({}).read_text())
        profile["diagnostics"]["Fake.*"] = {"limits": [{"limit": "Nowhere > 0"}]}
        path = self.write("profile.json", json.dumps(profile))
        self.assertEqual(self.run_limited("--parameters", path).returncode, 2)
        profile["diagnostics"]["Fake.Two"] = profile["diagnostics"].pop("Fake.*")
        path = self.write("profile.json", json.dumps(profile))
        self.assertEqual(self.run_limited("--parameters", path).returncode, 0)

    def test_a_profile_is_refused_with_the_place_of_a_wrong_limit(self):
        for limit, problem in (({"limit": "A >"}, "a number or the name of a result is missing"),
                               ({"limit": "D:A > 1"}, "names a diagnostic"),
                               ({"limit": "A > 1", "severity": "mild"}, "severity"),
                               ({"name": "x"}, "limit"),
                               ({"limit": "A > 1", "source": "x"}, "unknown key")):
            with self.subTest(limit=limit):
                path = self.profile({"Fake.*": {"limits": [limit]}})
                done = self.run_limited("--parameters", path)
                self.assertEqual(done.returncode, 66)
                self.assertIn(f"{path}:1: ", done.stderr)
                self.assertIn(problem, done.stderr)

    def test_the_record_keeps_the_limits(self):
        record = self.directory / "record.jsonl"
        limit = f"{self.name} < {self.value}"
        self.assertEqual(self.run_limited("--limit", limit, "--record", record, "--replace").returncode, 1)
        self.assertEqual(events_in(record)[0]["limits"],
                         [{"limit": limit, "severity": "fail", "source": "command line", "onlyIfSelected": False}])
        self.assertEqual(quazor("verify", record).returncode, 0)
        forged = self.write("forged.jsonl", record.read_text().replace('"verdict":"fail"', '"verdict":"pass"'))
        done = quazor("verify", forged)
        self.assertEqual(done.returncode, 1)
        self.assertIn("the recorded verdict is pass", done.stdout)
        # The limits of the record hold for a new analysis, unless others are given.
        for limits, code in (((), 1), (("--limit", f"{self.name} <= {self.value}"), 0)):
            done = quazor("analyze", record, "--plugin", WORKING, *limits)
            self.assertEqual(done.returncode, code, done.stdout + done.stderr)

    def test_an_analysis_keeps_the_limits_on_other_results(self):
        record = self.directory / "record.jsonl"
        self.run_limited("--limit", f"{self.name} < {self.value}", "--record", record, "--replace")
        path = self.profile({"Fake.*": {"limits": [{"limit": "* >= 0", "severity": "warn"}]}})
        done = quazor("analyze", record, "--plugin", WORKING, "--parameters", path)
        self.assertEqual((done.returncode, done.stderr), (1, ""), done.stdout)

    def test_an_analysis_tells_the_limits_of_the_record_that_others_replace(self):
        """Those on the same results, in whatever words; a relation stays unless its left result is the same."""
        record = self.directory / "record.jsonl"
        other = next(one["name"] for one in self.results_of()[2] if one["name"] != self.name)
        self.run_limited("--limit", f"Fake.One:{self.name} < {self.value}", "--limit", f"{other} < {self.name}", "--record",
                         record, "--replace")
        profile = self.profile({"Fake.*": {"limits": [{"limit": f"{self.name} >= 0"}]}})
        for given, new in ((("--limit", f"{self.name} >= 0"), f"{self.name} >= 0' (command line)"),
                           (("--parameters", profile), f"Fake.*:{self.name} >= 0' (profile profile.json)")):
            done = quazor("analyze", record, "--plugin", WORKING, "--format", "json", *given)
            self.assertEqual(done.stderr, f"quazor: the limit 'Fake.One:{self.name} < {self.value}' of the record is replaced "
                                          f"by '{new}\n")
            limits = [one["limit"] for result in json.loads(done.stdout)["diagnostics"][0]["measuredResults"]
                      for one in result["userLimits"]]
            self.assertEqual(sorted(limits), sorted([new.split("'")[0], f"{other} < {self.name}"]))
        # The same one is not told.
        done = quazor("analyze", record, "--plugin", WORKING, "--limit", f"{other} < {self.name}")
        self.assertEqual(done.stderr, "")

    def test_a_limit_on_what_was_not_reached_leaves_nothing_unknown(self):
        back, front = "CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front"
        done = quazor("run", back, front, "--stop-on", "fail", "--limit", f"{back}:BackTele.Total < 5", "--limit",
                      f"{front}:Front.Total > 0", "--limit", "*.Total > 0", "--format", "ocp")
        self.assertEqual(done.returncode, 1, done.stderr)
        artifacts = [json.loads(line).get("testRunArtifact", {}) for line in done.stdout.splitlines()]
        self.assertEqual([(one["testRunEnd"]["status"], one["testRunEnd"]["result"]) for one in artifacts if "testRunEnd" in one],
                         [("COMPLETE", "FAIL"), ("SKIP", "NOT_APPLICABLE")])
        self.assertIn("BackTele.Total-limit-fail", done.stdout)
        self.assertNotIn("UNKNOWN", done.stdout)

    def test_a_limit_that_is_given_twice_is_refused(self):
        done = self.run_limited("--limit", f"{self.name} >= 1", "--limit", f"{self.name}>=1.0")
        self.assertEqual(done.returncode, 64, done.stdout)
        self.assertIn("this limit is given twice", done.stderr)

    def test_a_limit_on_what_ended_in_an_error_or_of_a_profile_on_what_was_skipped_is_not_missed(self):
        """Neither in the run nor in an analysis of its record, in which these diagnostics have no result."""
        back, front = "CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front"
        record, again = self.directory / "record.jsonl", self.directory / "again.jsonl"
        ways = {"skipped": ((f"{front}=no room", "healthy"), front, {"skip"}, 2),
                "error": ((f"{front}x*=none", "camera_sync/port_missing_in_group"), back, {"error"}, 2)}
        for way, ((skip, phone), without, verdicts, code) in ways.items():
            for where in ("command line", "profile") if way == "error" else ("profile",):
                with self.subTest(way=way, where=where):
                    limit = ["--limit", f"{without}:*.Total > 0"]
                    if where == "profile":
                        limit = ["--parameters", self.profile({without: {"limits": [{"limit": "*.Total > 0"}]}})]
                    skips = ["--skip", skip] if way == "skipped" else []
                    done = quazor("run", back, front, *skips, "--phone", phone, *limit, "--format", "json",
                                  "--record", record, "--replace")
                    self.assertEqual(done.returncode, code, done.stderr)
                    found = {one["name"]: one["verdict"] for one in json.loads(done.stdout)["diagnostics"]}
                    self.assertEqual(found, {back: "pass", front: "pass"} | {without: verdicts.pop()})
                    verdicts.add(found[without])
                    done = quazor("analyze", record, "--format", "json", "--record", again, "--replace")
                    self.assertEqual(done.returncode, 0, done.stdout + done.stderr)
                    self.assertEqual(len(json.loads(done.stdout)["diagnostics"]), 1)
                    self.assertEqual(quazor("verify", record, again).returncode, 0)
        # What is given for the analysis itself must fit, and so must a limit that fitted nothing in the run.
        limit = f"{back}:*.Total > 0"
        self.assertEqual(quazor("analyze", record, "--limit", limit).returncode, 2)
        quazor("run", back, front, "--skip", f"{back}=no room", "--limit", limit, "--record", record, "--replace")
        self.assertEqual(quazor("analyze", record).returncode, 2)
        quazor("run", front, "--limit", f"{front}:Front.Total > 0", "--record", record, "--replace")
        record.write_text(record.read_text().replace(f"{front}:Front.Total", "TesselFaultDiagnostic:A"))
        self.assertEqual(quazor("analyze", record).returncode, 2)

    def test_an_entry_that_was_removed_is_missed(self):
        record = self.directory / "record.jsonl"
        self.run_limited("--limit", "Nowhere > 0", "--record", record, "--replace")
        events = events_in(record)
        begin = next(i for i, one in enumerate(events) if one.get("name") == "Nowhere > 0")
        del events[begin:begin + 3]
        for sequence, event in enumerate(events):
            event["sequence"] = sequence
        forged = self.write("forged.jsonl", "".join(json.dumps(one) + "\n" for one in events))
        done = quazor("verify", forged)
        self.assertEqual(done.returncode, 1, done.stdout)
        self.assertIn("the limit 'Nowhere > 0' fits no result, but this is not recorded as an error", done.stdout)

    def test_a_limit_without_a_result_is_not_counted_as_a_diagnostic(self):
        done = self.run_limited("--limit", "Nowhere > 0", "--limit", "Nobody > 0")
        self.assertEqual(done.returncode, 2, done.stderr)
        self.assertIn(": 1 passed, 0 failed, 0 ended in an error, 2 limits without a result\n", done.stdout)

    def test_failed_diagnostics_are_run_again_with_their_limits(self):
        limit = f"{self.name} < {self.value}"
        self.assertEqual(self.run_limited("--limit", limit).returncode, 1)
        self.assertEqual(quazor("run", "--only", "failed", "--plugin", WORKING).returncode, 1)
        self.assertEqual(self.run_limited("--limit", "Nowhere > 0").returncode, 2)
        done = quazor("run", "--only", "failed", "--plugin", WORKING)
        self.assertEqual(done.returncode, 64)
        self.assertIn("the limit 'Nowhere > 0' fits no result", done.stderr)


    def test_limits_of_the_default_profile_of_today_are_not_those_of_the_run_before(self):
        names = ["CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front"]
        record = self.directory / "run.jsonl"
        self.assertEqual(quazor("run", *names, "--record", record).returncode, 0)
        lines = record.read_text().splitlines(keepends=True)
        second = [i for i, line in enumerate(lines) if '"event":"diagnosticBegan"' in line][1]
        began = json.loads(lines[0])
        del began["planned"]  # as earlier records
        record.write_text("".join([json.dumps(began) + "\n", *lines[1:second]]))
        profiles = self.directory / "quazor/profiles"
        profiles.mkdir(parents=True)
        (profiles / "default.json").write_text(json.dumps({"schema": 1, "base": "default", "diagnostics": {
            "CameraSyncDiagnostic.*": {"limits": [{"limit": "*.Total >= 1000"}]}}}))
        home = {"XDG_DATA_HOME": str(self.directory)}
        self.assertEqual(quazor("run", names[1], env=home).returncode, 1)
        done = quazor("run", "--only", "failed", "--of", record, env=home)
        self.assertEqual(done.returncode, 0, done.stdout)
        self.assertIn(f"{names[1]}: that run ended before this diagnostic began", done.stderr)


if __name__ == "__main__":
    unittest.main()
