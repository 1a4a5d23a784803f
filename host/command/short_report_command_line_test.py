"""The text report as people see it: short by default, complete with --verbose, failures at its end."""

import shlex
import unittest

from command_line_fixture import RecordTest, analyze, quazor, without_run

DROPPED = "camera_sync/frames_dropped"


class ShortReportTest(RecordTest):
    def test_a_diagnostic_that_passes_is_one_line_with_what_it_says_in_words(self):
        result = quazor("run", "--all")
        self.assertEqual(result.returncode, 0, result.stderr)
        *verdicts, counts = without_run(result.stdout).splitlines()
        self.assertEqual(counts, "5 diagnostics: 5 passed, 0 failed, 0 ended in an error")
        said = verdicts.index("  Camera: 0, BackFacingCamera, back-wide")
        self.assertTrue(verdicts[said - 1].startswith("PASS  SingleCameraDiagnostic "), verdicts)
        del verdicts[said]
        self.assertEqual(sorted(line.split()[:2] for line in verdicts),
                         [["PASS", "CameraSyncDiagnostic.Back"], ["PASS", "CameraSyncDiagnostic.Front"],
                          ["PASS", "SingleCameraDiagnostic"], ["PASS", "TesselFaultDiagnostic"],
                          ["PASS", "TesselTelemonDiagnostic"]])
        self.assertIn("PASS  CameraSyncDiagnostic.Back   9 results, 2 with limits\n", result.stdout)
        self.assertIn("PASS  CameraSyncDiagnostic.Front  6 results, 1 with a limit\n", result.stdout)

    def test_verbose_shows_every_row(self):
        result = quazor("run", "CameraSyncDiagnostic.Back", "--verbose")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual(result.stdout.count("frames"), 9, result.stdout)
        self.assertTrue(result.stdout.endswith("\n  PASS\n\n"), result.stdout)

    def test_what_failed_is_at_the_end_with_a_command_that_explains_it(self):
        for verbose in ([], ["--verbose"]):
            with self.subTest(verbose):
                result = quazor("run", "--all", "--phone", DROPPED, "--profile", "strict", *verbose)
                self.assertEqual(result.returncode, 1, result.stderr)
                self.assertEqual(result.stdout.splitlines()[-4:], [
                    "5 diagnostics: 3 passed, 2 failed, 0 ended in an error",
                    "FAIL  CameraSyncDiagnostic.Back: BackTele.Total",
                    "FAIL  CameraSyncDiagnostic.Front: FrontInfrared.Total",
                    "Next: quazor explain BackTele.Total FrontInfrared.Total"])
                explained = quazor(*shlex.split(result.stdout.splitlines()[-1].removeprefix("Next: "))[1:])
                self.assertEqual(explained.returncode, 0, explained.stderr)

    def test_every_result_that_failed_is_explained(self):
        result = quazor("run", "CameraSyncDiagnostic.Back", "SingleCameraDiagnostic", *(
            word for name in ("BackTele.Total", "BackWide.Frames", "BackWide.FrameOffset", "BackTele.Frames", "Jitter")
            for word in ("--limit", f"{name} < -1000")))
        self.assertEqual(result.returncode, 1, result.stderr)
        *commands, more = result.stdout.split("Next: ")[1].splitlines()
        topics = [topic for command in commands for topic in shlex.split(command)[2:]]
        self.assertEqual((len(topics), topics[-1], more), (4, "Jitter", "      and 1 more"), commands)
        for command in commands:
            explained = quazor(*shlex.split(command)[1:])
            self.assertEqual(explained.returncode, 0, explained.stderr)
            for topic in shlex.split(command)[2:]:
                self.assertIn(f"{topic}\n", explained.stdout)

    def test_an_error_is_explained_by_its_domain_and_code(self):
        result = quazor("run", "CameraSyncDiagnostic.Back", "--phone", "camera_sync/start_refused_on_first")
        self.assertEqual(result.returncode, 2, result.stderr)
        end = result.stdout.splitlines()[-2:]
        self.assertRegex(end[0], r"^ERROR CameraSyncDiagnostic\.\w+: \w+ code \d+$")
        name, code = end[0].split(": ")[1].split(" code ")
        self.assertEqual(end[1], f"Next: quazor explain {name}:{code}")

    def test_names_are_quoted_for_a_shell(self):
        # The name of this result contains a blank.
        result = quazor("run", "TesselFaultDiagnostic", "--limit", "I2C Errors > 0")
        self.assertEqual(result.returncode, 1, result.stderr)
        self.assertEqual(result.stdout.splitlines()[-1], "Next: quazor explain 'I2C Errors'")

    def test_nothing_is_suggested_that_has_no_explanation(self):
        result = self.run_fake("--set", "minimum=1000")
        self.assertEqual(result.returncode, 1, result.stderr)
        self.assertEqual(result.stdout.splitlines()[-1], "FAIL  Fake.One: Count")
        self.assertEqual(quazor("explain", "Count").returncode, 64)

    def test_rows_that_fail_or_have_a_limit_of_the_user_are_shown(self):
        result = quazor("run", "--all", "--phone", DROPPED, "--profile", "strict")
        back = result.stdout.split("FAIL  CameraSyncDiagnostic.Back ")[1].split("\n\n")[1]
        self.assertNotIn(".Frames ", back)
        self.assertIn("  fail\n", back)
        self.assertEqual(back.count("every camera delivers 3 s of frames"), 3, back)
        passed = quazor("run", "CameraSyncDiagnostic.Back", "--limit", "BackTele.Total >= 90")
        self.assertEqual(passed.returncode, 0)
        self.assertRegex(passed.stdout, r"\n  BackTele.Total +90  frames  BackTele.Total >= 90 \(command line\)  pass\n")
        self.assertNotIn("BackTele.Frames", passed.stdout)

    def test_a_warning_is_shown_although_the_diagnostic_passes(self):
        profile = self.write("warn.json", '{"schema": 1, "diagnostics": {"CameraSyncDiagnostic.Back": {"limits": '
                                          '[{"limit": "BackTele.Total > 90", "severity": "warn"}]}}}')
        result = quazor("run", "CameraSyncDiagnostic.Back", "--parameters", profile)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertIn("PASS  CameraSyncDiagnostic.Back  9 results, 2 with limits, 1 warning\n", result.stdout)
        self.assertRegex(result.stdout, r"\n  BackTele.Total .*  warn\n")

    def test_analyze_and_reports_in_files_follow_the_same_switch(self):
        record = self.recorded()
        short, full = (without_run(analyze(record, *options).stdout) for options in ([], ["--verbose"]))
        self.assertTrue(short.startswith("PASS  Fake.One  2 results"), short)
        self.assertTrue(full.startswith("Fake.One\n"), full)
        for options, expected in (([], short), (["--verbose"], full)):
            file = self.directory / "report.txt"
            ran = analyze(record, *options, "--output", f"text:{file}")
            self.assertEqual(ran.stdout, file.read_text())
            self.assertEqual(without_run(ran.stdout), expected)

    def test_the_verdicts_beside_a_report_in_a_file_end_with_what_failed(self):
        result = quazor("run", "--all", "--phone", DROPPED, "--profile", "strict", "--format", "json", "--output",
                        self.output)
        self.assertEqual(result.returncode, 1, result.stderr)
        self.assertEqual(result.stdout.splitlines()[-1], "Next: quazor explain BackTele.Total FrontInfrared.Total")

    def test_experiments_have_no_switch(self):
        self.assertEqual(quazor("experiment", "CameraSyncExperiment.Back", "--verbose").returncode, 64)
        result = quazor("experiment", "CameraSyncExperiment.Back")
        self.assertIn("  Measurement ", result.stdout)


if __name__ == "__main__":
    unittest.main()
