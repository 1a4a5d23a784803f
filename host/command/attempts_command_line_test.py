"""Attempts after an error, repetitions, and what of them counts."""

import csv
import io
import json
import unittest
import xml.etree.ElementTree

from command_line_fixture import PLUGINS, RecordTest, events_in, quazor, without_run

SCRIPTED = PLUGINS / "scripted_plugin.so"
BOTH = ("Scripted.One", "Scripted.Two")


class AttemptsTest(RecordTest):
    """A script has a character for each run of an experiment: p(ass), f(ail), e(rror), n(ot a number), c(rash)."""

    def run_script(self, script, *arguments, names=BOTH, command="run", **options):
        file = self.write("script", script)
        done = quazor(command, *names, "--plugin", SCRIPTED, "--phone", self.phone, "--profile", "none", *arguments,
                      env={"QUAZOR_SCRIPT": str(file)}, **options)
        self.left = file.read_text()
        return done

    def document(self, script, *arguments, code=0, **options):
        done = self.run_script(script, "--format", "json", "--record", self.record, "--replace", *arguments, **options)
        self.assertEqual(done.returncode, code, done.stdout + done.stderr)
        self.assert_verifies(self.record)
        return json.loads(done.stdout)

    def entries(self, script, *arguments, **options):
        document = self.document(script, *arguments, **options)
        return [(one["name"][-3:], one.get("repetition"), one.get("attempt"), one["verdict"])
                for one in document["diagnostics"]]

    def assert_wrong(self, change, text):
        done = quazor("verify", self.changed(change))
        self.assertEqual(done.returncode, 1, done.stdout + done.stderr)
        self.assertIn(text, done.stdout)

    def test_an_error_is_tried_again_until_it_passes(self):
        expected = [("One", None, 1, "error"), ("One", None, 2, "error"), ("One", None, 3, "pass"),
                    ("Two", None, 1, "pass")]
        self.assertEqual(self.entries("ecp", "--attempts", "3", code=2), expected)
        self.assertEqual(self.entries("nep", "--attempts", "3", "--accept-flaky"), expected)

    def test_a_failure_is_final(self):
        # An error that was accepted does not excuse a limit that fits no result.
        self.document("ep", "--attempts", "2", "--accept-flaky", "--limit", "Nothing >= 1", names=BOTH[:1], code=2)
        self.assertEqual(self.entries("fp", "--attempts", "9", "--accept-flaky", code=1),
                         [("One", None, 1, "fail"), ("Two", None, 1, "pass")])
        self.assertEqual(self.entries("efpp", "--attempts", "9", "--accept-flaky", code=1),
                         [("One", None, 1, "error"), ("One", None, 2, "fail"), ("Two", None, 1, "pass")])
        self.entries("efpp", "--attempts", "9", code=2)

    def test_the_last_attempt_counts(self):
        self.assertEqual(self.entries("eeep", "--attempts", "3", "--accept-flaky", code=2),
                         [("One", None, 1, "error"), ("One", None, 2, "error"), ("One", None, 3, "error"),
                          ("Two", None, 1, "pass")])

    def test_repetitions_are_rounds_and_the_worst_counts(self):
        self.assertEqual(self.entries("ppfp", "--repeat", "3", code=1),
                         [("One", 1, None, "pass"), ("Two", 1, None, "pass"), ("One", 2, None, "fail"),
                          ("Two", 2, None, "pass"), ("One", 3, None, "pass"), ("Two", 3, None, "pass")])
        self.entries("epppfp", "--repeat", "3", code=2)
        self.assertEqual(self.entries("pep", "--repeat", "2", "--attempts", "2", "--accept-flaky"),
                         [("One", 1, 1, "pass"), ("Two", 1, 1, "error"), ("Two", 1, 2, "pass"),
                          ("One", 2, 1, "pass"), ("Two", 2, 1, "pass")])

    def test_one_seed_gives_one_run_and_each_attempt_another_seed(self):
        def seeds(*arguments):
            document = self.document("eepeep", "--attempts", "3", "--repeat", "2", *arguments, code=2)
            return [one["seed"] for one in document["diagnostics"]]

        first = seeds("--seed", "5")
        self.assertEqual(first[0], 5)
        self.assertEqual(first, seeds("--seed", "5"))
        self.assertNotEqual(first[1:], seeds("--seed", "6")[1:])
        # One: three attempts, Two: three attempts, then the second repetition of both.
        self.assertEqual((first[0:3], first[6]), (first[3:6], first[7]))
        self.assertEqual(len(set(first)), 4)
        recorded = [event["seed"] for event in events_in(self.record) if event["event"] == "diagnosticBegan"]
        self.assertEqual(len(recorded), 8)

    def test_only_failed_repeats_the_first_entry_that_did_not_pass(self):
        # Rounds of One and Two: One fails in the second, Two in the third.
        document = self.document("ppfpff", "--repeat", "3", "--seed", "5", code=1)
        seeds = {(one["name"], one["repetition"]): one["seed"] for one in document["diagnostics"]}
        done = self.run_script("pp", "--only", "failed", "--of", self.record, "--format", "json", names=())
        again = json.loads(done.stdout)
        self.assertEqual({one["name"]: one["seed"] for one in again["diagnostics"]},
                         {"Scripted.One": seeds["Scripted.One", 2], "Scripted.Two": seeds["Scripted.Two", 3]})
        self.assertEqual(again["run"]["seed"], seeds["Scripted.One", 2])
        done = self.run_script("pp", "--only", "failed", "--of", self.record, "--format", "json", "--seed", "5", names=())
        self.assertEqual([one["seed"] for one in json.loads(done.stdout)["diagnostics"]], [5, 5])

    def test_without_the_options_nothing_is_added(self):
        for arguments in ((), ("--attempts", "1"), ("--repeat", "1")):
            document = self.document("p", *arguments)
            self.assertEqual(set(document), {"schema", "diagnostics", "run"})
            self.assertEqual(set(events_in(self.record)[-1]), {"sequence", "event", "date"})
            text = self.record.read_text()
            for key in ("attempt", "repetition", "acceptFlaky"):
                self.assertNotIn(key, text)

    def test_what_cannot_run_is_not_tried_again(self):
        done = self.run_fake("--all", "--attempts", "3", "--format", "json", names=(), duration=None)
        document = json.loads(done.stdout)
        self.assertEqual((done.returncode, document["verdict"]), (2, "error"))
        missing = [one for one in document["diagnostics"] if one["name"] == "Fake.One"]
        self.assertEqual([(one["attempt"], one["error"]["code"]) for one in missing], [(1, 16)])
        described = [one for one in document["diagnostics"] if one["name"] == "Broken.Factory"]
        self.assertEqual([one["attempt"] for one in described], [1])

    def test_skips_and_stops(self):
        self.assertEqual(self.entries("ep", "--attempts", "2", "--accept-flaky", "--skip", "Scripted.Two=x",
                                      "--allow-skips"),
                         [("One", None, 1, "error"), ("One", None, 2, "pass"), ("Two", None, 1, "skip")])
        self.entries("ep", "--attempts", "2", "--skip", "Scripted.Two=x", "--allow-skips", code=2)
        self.assertEqual(self.entries("epee", "--attempts", "2", "--repeat", "2", "--stop-on", "error", code=2),
                         [("One", 1, 1, "error"), ("One", 1, 2, "pass"), ("Two", 1, 1, "error"), ("Two", 1, 2, "error"),
                          ("One", 2, 1, "skip"), ("Two", 2, 1, "skip")])

    def test_bad_numbers_are_refused(self):
        for option in ("--attempts", "--repeat"):
            for number in ("0", "1001", "x", "-1", "1.5", ""):
                with self.subTest(option=option, number=number):
                    self.assert_refused(self.run_script("", option, number, "--output", self.output), 64, option)
        self.assert_refused(self.run_script("", "--accept-flaky", "--output", self.output), 64,
                            "--accept-flaky requires --attempts")
        self.assertEqual(quazor("selftest", "--attempts", "2").returncode, 64)

    def test_failing_repetitions_are_shown_once_for_each_kind(self):
        def blocks(*arguments):
            text = self.run_script("fffefe", "--repeat", "6", *arguments, names=BOTH[:1]).stdout
            beginning = text[:text.index("What varied")]
            return [line for line in beginning.splitlines() if "Scripted.One" in line], beginning.count("Limit")

        lines, tables = blocks()
        self.assertEqual(([line.split()[:4] for line in lines], tables),
                         ([["FAIL", "Scripted.One", "repetition", "1"], ["ERROR", "Scripted.One", "repetition", "4"]], 1))
        self.assertEqual(len(blocks("--verbose")[0]), 6)

    def test_every_report_has_attempts_and_repetitions(self):
        self.run_script("epn", "--attempts", "2", "--repeat", "2", "--accept-flaky", "--output",
                        f"junit:{self.directory / 'j'}", "--output", f"csv:{self.directory / 'c'}", "--output",
                        f"ocp:{self.directory / 'o'}")
        expected = [("1", "1"), ("2", "1"), ("1", "1"), ("2", "1"), ("1", "2"), ("1", "2")]
        root = xml.etree.ElementTree.parse(self.directory / "j").getroot()
        properties = [{one.get("name"): one.get("value") for one in suite.find("properties")} for suite in root]
        self.assertEqual([(one["attempt"], one["repetition"]) for one in properties], expected)
        # Errors that do not count must not make a build fail.
        self.assertEqual((root.get("errors"), root.get("failures"), root.get("skipped")), ("0", "0", "2"))
        self.assertIn("accepted because a later attempt had none", root.find(".//skipped").get("message"))
        rows = list(csv.DictReader(io.StringIO((self.directory / "c").read_text())))
        self.assertEqual(list(dict.fromkeys((row["diagnostic"], row["attempt"], row["repetition"]) for row in rows)),
                         [("Scripted.One", "1", "1"), ("Scripted.One", "2", "1"), ("Scripted.Two", "1", "1"),
                          ("Scripted.Two", "2", "1"), ("Scripted.One", "1", "2"), ("Scripted.Two", "1", "2")])
        seeds = {(row["diagnostic"], row["attempt"], row["repetition"]): row["seed"] for row in rows}
        self.assertEqual(seeds["Scripted.One", "1", "1"], "0")
        self.assertEqual(len(set(seeds.values())), 3)  # attempts and repetitions of one number share a seed
        self.assertEqual(list(seeds.values()), [one["seed"] for one in properties])
        lines = [json.loads(line) for line in (self.directory / "o").read_text().splitlines()]
        starts = [line["testRunArtifact"]["testRunStart"]["metadata"] for line in lines
                  if "testRunStart" in line.get("testRunArtifact", {})]
        self.assertEqual([(str(one["attempt"]), str(one["repetition"])) for one in starts], expected)

    def test_the_text_says_that_it_passed_after_an_error(self):
        done = self.run_script("ep", "--attempts", "3")
        self.assertIn("ERROR Scripted.One  attempt 1 of 3\n", done.stdout)
        self.assertIn("PASS  Scripted.One  pass in attempt 2 of 3, 2 results", done.stdout)
        self.assertTrue(done.stdout.endswith(
            "2 diagnostics: 1 passed, 0 failed, 0 ended in an error, 1 flaky\n"
            "A pass after an error counts as an error, unless --accept-flaky is given.\n"
            "FLAKY Scripted.One: Script code 7 (pass in attempt 2 of 3)\n"), done.stdout)
        done = self.run_script("ep", "--attempts", "3", "--accept-flaky", "--verbose")
        self.assertIn("\n  PASS\n    pass in attempt 2 of 3\n", done.stdout)
        self.assertNotIn("counts as an error", done.stdout)

    def test_the_text_says_why_a_failure_after_an_error_exits_with_2(self):
        failure = "A failure after an error counts as an error, unless --accept-flaky is given.\n"
        done = self.run_script("efp", "--attempts", "3")
        self.assertEqual(done.returncode, 2)
        self.assertIn(failure, done.stdout)
        done = self.run_script("efp", "--attempts", "3", "--accept-flaky")
        self.assertEqual(done.returncode, 1)
        self.assertNotIn("counts as an error", done.stdout)
        self.assertNotIn("counts as an error", self.run_script("fp", "--attempts", "3").stdout)

    def test_what_varied(self):
        done = self.run_script("ppfpepfp", "--repeat", "4", "--output", f"json:{self.output}")
        self.assertIn("What varied between the repetitions (#: the first repetition with that value; Outlier: the one "
                      "whose rare value differs most, and its seed):\n"
                      "Scripted.One: 1 passed, 2 failed, 1 ended in an error\n"
                      "  Result  Count  Minimum  #  Median  Maximum  #  Outlier  Seed  Unit    Limit\n"
                      "  Value       3        1  2       1       10  1        -     -  frames  Enough: >= 5\n"
                      "  1 other result never varied\n"
                      "Scripted.Two: 4 passed\n"
                      "  2 results never varied\n", done.stdout)
        self.assertRegex(done.stdout, r"\nFAIL  Scripted.One: Value \(2 times, first in repetition 2 of 4, seed \d+\)\n")
        one, two = json.loads(self.output.read_text())["variation"]
        self.assertEqual(one["verdicts"], {"pass": 1, "flaky": 0, "fail": 2, "error": 1, "skip": 0})
        self.assertEqual([(it["name"], it["values"], it["minimum"], it["median"], it["maximum"], it["limit"]["name"])
                          for it in one["varying"]], [("Value", 3, 1, 1, 10, "Enough")])
        self.assertEqual([(it["minimumRepetition"], it["maximumRepetition"]) for it in one["varying"]], [(2, 1)])
        self.assertEqual([(it["outlierRepetition"], it["outlierSeed"]) for it in one["varying"]], [(None, None)])
        self.assertEqual((one["constant"], two["constant"], two["varying"]), (1, 2, []))

    def test_the_outlier_can_be_run_alone(self):
        document = self.document("ppppfppp", "--repeat", "4", "--seed", "5", code=1)
        [value] = document["variation"][0]["varying"]
        seeds = {one["repetition"]: one["seed"] for one in document["diagnostics"]}
        self.assertEqual((value["outlierRepetition"], value["outlierSeed"]), (3, seeds[3]))
        alone = self.document("f", "--seed", value["outlierSeed"], code=1)
        self.assertEqual(alone["diagnostics"][0]["seed"], seeds[3])

    def test_the_text_of_repetitions_has_a_line_for_each_and_what_did_not_pass(self):
        script = "ppfpep"
        seeds = [one["seed"] for one in self.document(script, "--repeat", "3", code=2)["diagnostics"][::2]]
        expected = ("Repetition 1 of 3: 2 passed\n"
                    f"FAIL  Scripted.One  repetition 2 of 3, seed {seeds[1]}, 2 results, 2 with limits, 1 failed\n"
                    "Repetition 2 of 3: 1 passed, 1 failed\n"
                    f"ERROR Scripted.One  repetition 3 of 3, seed {seeds[2]}, Script code 7: the script says so\n"
                    "Repetition 3 of 3: 1 passed, 1 ended in an error\n")
        report = self.directory / "report.txt"
        done = self.run_script(script, "--repeat", "3", "--output", f"text:{report}")
        self.assertEqual(done.stdout, report.read_text())
        short = [line + "\n" for line in done.stdout.splitlines() if line.startswith(("PASS", "FAIL  S", "ERROR S", "Rep"))]
        self.assertEqual("".join(short[:5]), expected)
        self.assertIn("Repetition 3 of 3: 1 passed, 1 ended in an error\n\nWhat varied", done.stdout)
        self.assertRegex(done.stdout, r"\n  Value +1  frames  Enough: >= 5  fail\n")
        beside = self.run_script(script, "--repeat", "3", "--format", "json", "--output", self.output).stdout
        self.assertTrue(beside.startswith("Repetition 1 of 3: 2 passed\nFAIL  Scripted.One\nRepetition 2 of 3: "), beside)
        verbose = self.run_script(script, "--repeat", "3", "--verbose").stdout
        self.assertEqual(verbose.count("\n  PASS\n    repetition "), 4)
        self.assertNotIn("Repetition ", verbose)

    def test_what_the_text_of_repetitions_does_not_leave_out(self):
        text = self.run_script("pepp", "--repeat", "2", "--attempts", "2").stdout
        self.assertIn("ERROR Scripted.Two  repetition 1 of 2, attempt 1 of 2, seed 0\n", text)
        self.assertIn("PASS  Scripted.Two  repetition 1 of 2, pass in attempt 2 of 2, 2 results", text)
        self.assertIn("\nRepetition 1 of 2: 1 passed, 1 flaky\nRepetition 2 of 2: 2 passed\n", text)
        text = self.run_script("pppp", "--repeat", "2", "--skip", "Scripted.Two=covered", "--allow-skips").stdout
        self.assertTrue(without_run(text).startswith("Repetition 1 of 2: 1 passed, 1 skipped\nRepetition 2 of 2: "), text)
        self.assertIn("\nSKIP  Scripted.Two: not-allowed: covered (2 times, first in repetition 1 of 2)\n", text)
        profile = self.write("warn.json", json.dumps({"schema": 1, "diagnostics": {"Scripted.One": {"limits": [
            {"limit": "Value > 10", "severity": "warn"}]}}}))
        text = self.run_script("pppp", "--repeat", "2", "--parameters", profile).stdout
        self.assertEqual(text.count("PASS  Scripted.One  repetition "), 2)
        self.assertNotIn("PASS  Scripted.Two", text)

    def test_what_varied_has_the_limits_of_the_user(self):
        done = self.run_script("ppfp", "--repeat", "2", "--limit", "Scripted.One:Value >= 3 frames", "--limit",
                               "Value == 10 +- 9", "--output", f"json:{self.output}")
        one, _ = json.loads(self.output.read_text())["variation"]
        row = "  Value       2        1  2     5.5       10  1        -     -  frames  "
        self.assertIn(f"  Result  Count  Minimum  #  Median  Maximum  #  Outlier  Seed  Unit    Limit\n"
                      f"{row}Enough: >= 5\n"
                      f"{row}Value >= 3 frames (command line)\n"
                      f"{row}Value == 10 +- 9 (command line)\n"
                      "  1 other result never varied\n", done.stdout)
        self.assertEqual(one["varying"][0]["userLimits"],
                         [{"limit": "Scripted.One:Value >= 3 frames", "name": "", "severity": "fail", "source": "command line"},
                          {"limit": "Value == 10 +- 9", "name": "", "severity": "fail", "source": "command line"}])

    def test_experiments_are_tried_again_and_repeated(self):
        done = self.run_script("epf", "--attempts", "2", "--repeat", "2", names=("ScriptedExperiment",),
                               command="experiment")
        self.assertEqual(done.returncode, 2, done.stderr)
        self.assertIn("ScriptedExperiment: 1 returned a result, 1 flaky\n", done.stdout)
        self.assertRegex(done.stdout, r"\n  Value       2        1  2     5\.5       10  1        -     -  frames  -\n")
        self.assertEqual(done.stdout.count("\n  Measurement "), 2)
        self.assertNotIn("Repetition ", done.stdout)
        self.assertIn("2 runs: 1 returned a result, 0 ended in an error, 1 flaky\n", done.stdout)

    def test_only_what_counts_is_run_again(self):
        def again(*arguments):
            self.run_script("ep", "--attempts", "2", *arguments)
            done = quazor("run", "--only", "failed", "--format", "json", env={"QUAZOR_SCRIPT": str(self.write("s", ""))})
            return [one["name"] for one in json.loads(done.stdout)["diagnostics"]]

        self.assertEqual(again(), ["Scripted.One"])
        self.assertEqual(again("--accept-flaky"), [])

    def test_an_analysis_keeps_attempts_and_cannot_heal(self):
        self.document("npff", "--attempts", "2", "--repeat", "2", code=2)
        again = self.directory / "again.jsonl"
        done = quazor("analyze", self.record, "--plugin", SCRIPTED, "--format", "json", "--record", again)
        self.assertEqual(done.returncode, 2, done.stdout + done.stderr)
        self.assert_verifies(again)
        document = json.loads(done.stdout)
        self.assertEqual([(one["attempt"], one["repetition"], one["verdict"]) for one in document["diagnostics"]],
                         [(1, 1, "error"), (2, 1, "pass"), (1, 1, "fail"), (1, 2, "fail"), (1, 2, "pass")])
        self.document("epp", "--attempts", "2", code=2)
        done = quazor("analyze", self.record, "--plugin", SCRIPTED)  # the error has no result to analyze
        self.assertEqual(done.returncode, 2, done.stdout + done.stderr)

    def test_records_differ_by_attempt(self):
        self.document("ep", "--attempts", "2", "--accept-flaky")
        other = self.directory / "other.jsonl"
        self.run_script("pp", "--record", other)
        done = quazor("diff", self.record, other)
        self.assertEqual(done.returncode, 1)
        self.assertIn("Scripted.One: verdict was error and is pass\n", done.stdout)
        self.assertIn("Scripted.One (attempt 2) is only in the first\n", done.stdout)

    def test_a_record_that_was_changed_is_found(self):
        self.document("epefp", "--attempts", "2", "--repeat", "2", code=2)

        def accept(events):
            events[0]["acceptFlaky"] = True

        def number(key, value):
            def change(events):
                events[0][key] = value
            return change

        def without_first(events):
            at = [event["event"] for event in events].index("diagnosticEnded")
            del events[1:at + 1]
            for place, event in enumerate(events):
                event["sequence"] = place

        def without_verdict(events):
            del events[-1]["verdict"]

        def another_attempt(events):
            begun = [event for event in events if event["event"] == "diagnosticBegan"]
            begun[1]["attempt"] = 1

        self.assert_wrong(without_first, "no attempt before it ended in an error")
        self.assert_wrong(number("attempts", 1), "attempt 2 of a run that has 1")
        self.assert_wrong(number("repetitions", 3), "repetition 3, was selected to run but is missing")
        self.assert_wrong(without_verdict, "the recorded verdict of the run is none")
        self.assert_wrong(another_attempt, "attempt 2 is missing")
        self.document("ep", "--attempts", "2", code=2)
        self.assert_wrong(accept, "the recorded verdict of the run is error, but its entries give pass")


if __name__ == "__main__":
    unittest.main()
