"""Records: written, verified, compared, and used for another run."""

import json
import pathlib
import random
import re
import resource
import unittest
import xml.etree.ElementTree

from command_line_fixture import (EXPERIMENTS, PLUGINS, WORKING, RecordTest, analyze, events_in, quazor,
                                  without_run)


class MakingTest(RecordTest):
    def test_a_record_holds_all_of_a_run(self):
        events = events_in(self.recorded("--set", "measured=90", "--seed", "9", names=["Fake.*"]))
        self.assertEqual([event["sequence"] for event in events], list(range(len(events))))
        self.assertEqual(events[0]["record"], 3)
        self.assertEqual(events[0]["names"], ["Fake.One", "Fake.Two"])
        self.assertEqual((events[0]["seed"], events[0]["phone"], events[0]["plugins"]), (9, str(self.phone), [WORKING]))
        ended = [event["verdict"] for event in events if event["event"] == "diagnosticEnded"]
        self.assertEqual(ended, ["pass", "pass"])
        self.assertEqual(events[-1]["event"], "runEnded")
        self.assertNotIn("interrupted", events[-1])
        self.assert_verifies(self.record)

    def test_every_verdict_is_recorded_and_verifies(self):
        for arguments, code, verdict in (([], 0, "pass"), (["--set", "minimum=1"], 1, "fail"),
                                         (["--set", "experiment.behaviour=5"], 2, "error")):
            with self.subTest(verdict):
                events = events_in(self.recorded(*arguments, code=code))
                self.assertEqual(events[-2]["verdict"], verdict)
                self.assert_verifies(self.record)

    def test_an_experiment_is_recorded_too(self):
        result = quazor("experiment", "Alone.*", "--plugin", EXPERIMENTS, "--phone", self.phone, "--profile", "none",
                        "--set", "images=1", "--set", "duration=1", "--record", self.record)
        self.assertEqual(result.returncode, 2)
        self.assertTrue(events_in(self.record)[0]["ofExperiments"])
        self.assert_verifies(self.record)

    def test_a_plugin_that_cannot_be_loaded_stands_in_the_record(self):
        result = quazor("run", "--all", "--plugin", PLUGINS / "fatal_plugin.so", "--plugin", WORKING, "--profile",
                        "none", "--set", "duration=1", "--phone", self.phone, "--record", self.record)
        self.assertEqual(result.returncode, 2)
        self.assertEqual(events_in(self.record)[0]["names"][:2], ["fatal_plugin.so", "Fake.One"])
        self.assertIn("fatal_plugin.so' crashed: its process was terminated by signal 6 (SIGABRT)", result.stdout)
        self.assert_verifies(self.record)

    def test_a_record_that_cannot_be_made_is_refused_before_anything_runs(self):
        rows = {self.directory / "nowhere" / "out": "No such file or directory",
                self.phone / "out": "Not a directory"}
        for path, why in rows.items():
            with self.subTest(path):
                self.assert_refused(self.run_fake("--record", path), 73,
                                    f"the record '{path}' cannot be written: {why}")
        self.assert_refused(self.run_fake("--record", ""), 64, "--record: the value is empty")

    def test_a_record_that_turns_out_not_to_be_writable_is_an_error(self):
        result = self.run_fake("--record", "/dev/full")
        self.assertEqual(result.returncode, 73)
        self.assertIn("QuazorHostErrorDomain code 10: the record '/dev/full' cannot be written", result.stdout)
        self.assertIn("quazor: the record '/dev/full' cannot be written: No space left on device", result.stderr)

    def test_a_limit_on_file_sizes_is_an_error_and_not_the_end(self):
        # Room for the first lines of the record, and for the whole report.
        limit = 1000
        record = self.directory / "run.jsonl"
        result = self.run_fake("--record", record,
                               preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (limit, limit)))
        self.assertEqual(result.returncode, 73, result.stderr)
        self.assertIn(f"quazor: the record '{record}' cannot be written: File too large", result.stderr)
        self.assertIn("code 10: the record", result.stdout)
        self.assertIn("ERROR", result.stdout)
        self.assertEqual(record.stat().st_size, limit)

    def test_a_file_is_not_written_twice(self):
        one = self.write("one", "precious")
        (self.directory / "link").symlink_to(one)
        for arguments in (["--record", "one", "--output", "one"], ["--output", "json:one", "--output", "csv:./one"],
                          ["--record", "one", "--output", "junit:link"],
                          ["--record", "new", "--output", f"../{self.directory.name}/new"]):
            with self.subTest(arguments):
                result = self.run_fake(*arguments, cwd=self.directory)
                self.assert_refused(result, 64, "would be written twice")
                self.assertEqual(one.read_text(), "precious")
        self.assertEqual(self.run_fake("--record", "/dev/null", "--output", "/dev/null").returncode, 0)


class VerifyTest(RecordTest):
    def setUp(self):
        super().setUp()
        self.recorded("--set", "measured=90", "--set", "minimum=90")

    def test_it_counts_what_it_has_seen(self):
        result = quazor("verify", self.record)
        self.assertEqual((result.returncode, result.stderr), (0, ""))
        self.assertRegex(result.stdout, r"^\d+ events, 1 verdict \(1 pass\), 0 problems\n$")

    def test_it_finds_what_was_changed(self):
        def of(events, kind):
            return next(event for event in events if event["event"] == kind)

        def without(kind):
            def change(events):
                events.remove(of(events, kind))
                for number, event in enumerate(events):
                    event["sequence"] = number
            return change

        def value(events):
            of(events, "found")["results"][0]["measurement"][0] = 89.0

        def limit(events):
            of(events, "found")["results"][0]["limit"]["lower"][0][0] = 91.0

        def unit(events):
            of(events, "found")["results"][0]["measurement"][1] = "errors"

        def verdict(events):
            of(events, "diagnosticEnded")["verdict"] = "fail"

        for change in (value, limit, unit, verdict, without("found"), without("diagnosticCompleted")):
            with self.subTest(change.__name__):
                result = quazor("verify", self.changed(change))
                self.assertEqual(result.returncode, 1, result.stdout)
                self.assertTrue(result.stdout.startswith("WRONG  Fake.One: the recorded "), result.stdout)

    def assert_wrong(self, record, sentence):
        result = quazor("verify", record)
        self.assertEqual((result.returncode, result.stderr), (1, ""))
        self.assertEqual(result.stdout.splitlines()[0], f"WRONG  the record '{record}', {sentence}")

    def test_a_record_of_a_later_version_is_refused_with_both_versions(self):
        def later(events):
            events[0]["record"] = 5
            events[2]["event"] = "somethingNew"

        record = self.changed(later)
        wrote = json.loads(record.read_text().splitlines()[0])["program"]
        sentence = (f"the record '{record}' says version 5, but this program reads versions 1 to 4; read it with the quazor "
                    f"that wrote it, {wrote}, or a later one")
        for arguments in (["verify", record], ["diff", self.record, record], ["diff", record, self.record],
                          ["analyze", record, "--plugin", WORKING], ["run", "--only", "failed", "--of", record]):
            with self.subTest(arguments[0]):
                result = quazor(*arguments)
                self.assertEqual((result.returncode, result.stdout, result.stderr), (66, "", f"quazor: {sentence}\n"))
        result = quazor("verify", record, self.record)
        self.assertEqual(result.returncode, 66)
        self.assertIn(f"UNREADABLE  {record}: {sentence}\n", result.stdout)

    def test_an_event_that_a_known_version_does_not_have_is_a_line_that_is_wrong(self):
        def unknown(events):
            events[2]["event"] = "somethingNew"

        self.assert_wrong(self.changed(unknown), "line 3: unknown event 'somethingNew'")

    def test_lines_that_are_wrong(self):
        def missing_line(events):
            del events[3]

        self.assert_wrong(self.changed(missing_line),
                          "line 4: the sequence number is 4 instead of 3; a line is missing or has been moved")
        self.assert_wrong(self.write("text", "hello\n"), "line 1: not valid JSON")
        self.assert_wrong(self.write("document", "{}\n"), "line 1: \"record\" is missing")
        self.assert_wrong(WORKING, "line 1: not valid JSON")
        twice = self.record.read_text().replace('"verdict":"pass"', '"verdict":"fail","verdict":"pass"')
        line = 1 + next(i for i, line in enumerate(twice.splitlines()) if '"verdict":"fail"' in line)
        self.assert_wrong(self.write("twice", twice), f'line {line}: the key "verdict" is duplicated')

    def test_what_is_no_record_is_refused(self):
        rows = [
            (self.directory / "missing", "cannot be read: No such file or directory"),
            (self.write("empty", ""), "contains no events"),
            (self.phone, "contains no events"),
            (self.write("half", self.record.read_text()[:20]), "contains no events"),
            ("/dev/null", "contains no events"),
        ]
        for path, problem in rows:
            with self.subTest(problem):
                self.assert_refused(quazor("verify", path), 66, f"the record '{path}'", problem)
        self.assert_refused(quazor("verify"), 64, "RECORD")
        self.assert_refused(quazor("verify", ""), 64, "RECORD: the value is empty")

    def test_a_record_that_was_cut_off_anywhere_is_not_wrong(self):
        whole = self.record.read_bytes()
        first = whole.index(b"\n")
        for size in sorted(random.Random(1).sample(range(first + 1, len(whole)), 20)):
            with self.subTest(size):
                cut = self.directory / "cut"
                cut.write_bytes(whole[:size])
                result = quazor("verify", cut)
                self.assertEqual(result.returncode, 3, result.stderr)
                self.assertIn("The record is incomplete: the run did not end", result.stdout)

    def test_what_follows_the_end_is_wrong_also_if_it_is_cut_off(self):
        text = self.record.read_text()
        for tail in ("{", '{"sequence":', "\0" * 100, text.splitlines()[1]):
            with self.subTest(tail[:10]):
                record = self.write("tail.jsonl", text + tail)
                result = quazor("verify", record)
                self.assertEqual(result.returncode, 1, result.stdout)
                self.assertTrue(result.stdout.startswith("WRONG  an incomplete line follows the end of the run\n"), result.stdout)
        count = len(text.splitlines())
        self.assert_wrong(self.write("tail.jsonl", text + text.splitlines(keepends=True)[1]),
                          f"line {count + 1}: the sequence number is 1 instead of {count}; a line is missing or has been moved")

    def test_dates_that_no_clock_can_have(self):
        line = self.record.read_text().splitlines(keepends=True)[0]
        for year in ("2262", "9999", "1677", "0000"):
            with self.subTest(year):
                record = self.write("date.jsonl", re.sub(r'"date":"[0-9]{4}', f'"date":"{year}', line))
                self.assert_wrong(record, 'line 1: "date" is not a timestamp of the years 1678 to 2261')

    def test_values_in_many_levels_do_not_crash_it(self):
        deep = '{"array":[' * 100_000 + "]}" * 100_000
        line = '{"sequence":1,"event":"collected","key":"k","value":' + deep + "}\n"
        record = self.write("deep", self.record.read_text().splitlines(keepends=True)[0] + line)
        self.assert_wrong(record, "line 2: the line is nested more than 2016 levels deep")
        for members in ('"faults":[{"fault":%s,"fired":1}],"event":"faultsCounted"', '"event":%s'):
            line = '{"sequence":1,' + members % ("[" * 100_000 + "]" * 100_000) + "}\n"
            record = self.write("deep", self.record.read_text().splitlines(keepends=True)[0] + line)
            self.assert_wrong(record, "line 2: the line is nested more than 2016 levels deep")
            for command in (["analyze", record], ["diff", record, self.record],
                            ["run", "--only", "failed", "--of", record]):
                self.assert_refused(quazor(*command), 66, "line 2: the line is nested more than 2016 levels deep")

    def test_a_record_cut_before_the_failing_diagnostic_is_incomplete(self):
        self.recorded("--set", "measured=1", "--set", "minimum=90", code=1)
        lines = self.record.read_text().splitlines(keepends=True)
        begins = next(i for i, line in enumerate(lines) if '"diagnosticBegan"' in line)
        for count in (begins, len(lines) - 1):
            result = quazor("verify", self.write("cut.jsonl", "".join(lines[:count])))
            self.assertEqual(result.returncode, 3, result.stdout)

    def test_a_standard_output_that_is_full(self):
        with open("/dev/full", "w") as full:
            for command in (["verify", self.record], ["diff", self.record, self.record]):
                result = quazor(*command, stdout=full)
                self.assertEqual(result.returncode, 73)
                self.assertIn("standard output cannot be written", result.stderr)


class DiffTest(RecordTest):
    def test_two_runs_with_one_seed_tell_the_same(self):
        first = self.recorded("--set", "measured=90", names=["Fake.*"])
        second = self.recorded("--set", "measured=90", names=["Fake.*"], record=self.directory / "second.jsonl")
        result = quazor("diff", first, second)
        self.assertEqual((result.returncode, result.stdout), (0, "The records do not differ.\n"))

    def test_differences_are_told(self):
        first = self.recorded("--set", "measured=90", "--set", "minimum=90")
        second = self.recorded("--set", "measured=89", "--set", "minimum=90", code=1,
                               record=self.directory / "second.jsonl", names=["Fake.*"])
        result = quazor("diff", first, second)
        self.assertEqual(result.returncode, 1)
        self.assertEqual(result.stdout.splitlines(), [
            "Fake.One: verdict was pass and is fail",
            "Fake.One: parameter experiment.measured was 90 and is 89",
            "Fake.One: measurement Count was 90 frames and is 89 frames",
            "Fake.One: result Count was 90 frames, Enough: >= 90, pass and is 89 frames, Enough: >= 90, fail",
            "Fake.One: result Echo was 90 frames, -, none and is 89 frames, -, none",
            "Fake.Two is only in the second"])

    def test_an_analysis_differs_only_in_what_it_makes_of_the_result(self):
        first = self.recorded("--set", "measured=90")
        second = self.directory / "second.jsonl"
        analyze(first, "--record", second)
        result = quazor("diff", first, second)
        self.assertEqual((result.returncode, result.stdout), (0, "The records do not differ.\n"))

    def test_what_is_refused(self):
        record = self.recorded()
        self.assert_refused(quazor("diff", record), 64, "RECORD")
        self.assert_refused(quazor("diff", record, self.directory / "missing"), 66, "missing' cannot be read")
        self.assert_refused(quazor("diff", self.phone, record), 66, "contains no events")


class OnlyFailedTest(RecordTest):
    def setUp(self):
        super().setUp()
        self.state = {"XDG_STATE_HOME": str(self.directory / "state")}

    def run_names(self, *names, code):
        # A parameter is refused if no diagnostic can be described.
        result = self.run_fake(names=names, env=self.state, duration=1 if "Fake.One" in names else None)
        self.assertEqual(result.returncode, code, result.stderr)

    def only_failed(self, *arguments, duration=None):
        return self.run_fake("--only", "failed", *arguments, names=[], env=self.state, duration=duration)

    def test_it_runs_what_did_not_pass_the_last_time(self):
        self.run_names("Fake.One", "Broken.Nothing", "Fake.Two", "Broken.Factory", code=2)
        result = self.only_failed("--format", "json")
        self.assertEqual(result.returncode, 2)
        self.assertEqual([record["name"] for record in json.loads(result.stdout)["diagnostics"]],
                         ["Broken.Nothing", "Broken.Factory"])

    def test_what_passes_then_is_no_longer_among_them(self):
        self.assertEqual(self.run_fake("--set", "minimum=1", names=["Fake.*"], env=self.state).returncode, 1)
        self.assertEqual(self.only_failed("--set", "minimum=0").returncode, 0)
        result = self.only_failed()
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertTrue(without_run(result.stdout).startswith("Everything passed in the last run.\n"), result.stdout)

    def test_what_is_asked_for_is_written_also_when_everything_passed(self):
        self.run_names("Fake.One", code=0)
        junit = self.directory / "run.xml"
        result = self.only_failed("--format", "json", "--record", self.record, "--output", f"junit:{junit}")
        self.assertEqual((result.returncode, result.stderr), (0, "Everything passed in the last run.\n"))
        self.assertEqual(json.loads(result.stdout)["diagnostics"], [])
        self.assertEqual(xml.etree.ElementTree.parse(junit).getroot().get("tests"), "0")
        self.assert_verifies(self.record)
        self.assert_refused(self.only_failed("--output", self.directory / "missing" / "a"), 73, "cannot be written")

    def test_it_runs_as_it_was_run(self):
        failing = ["--set", "measured=1", "--set", "minimum=90"]
        self.assertEqual(self.run_fake(*failing, names=["Fake.One"], env=self.state).returncode, 1)
        result = quazor("run", "--only", "failed", "--format", "json", "--record", self.record, env=self.state)
        self.assertEqual(result.returncode, 1, result.stderr)
        self.assertEqual(json.loads(result.stdout)["diagnostics"][0]["parameters"],
                         {"experiment": {"duration": 1, "measured": 1}, "analysis": {"minimum": 90}})
        self.assertEqual(events_in(self.record)[0]["phone"], str(self.phone))
        result = quazor("run", "--only", "failed", "--set", "minimum=0", env=self.state)
        self.assertEqual(result.returncode, 0, result.stderr)

    def test_it_has_the_seed_and_the_tags_of_that_run(self):
        given = ("--seed", "7043", "--tag", "serial=C02X", "--tag", "station=S3", "--set", "minimum=90")
        self.assertEqual(self.run_fake(*given, env=self.state).returncode, 1)

        def rerun(*arguments):
            document = json.loads(self.only_failed("--format", "json", *arguments).stdout)
            return document["run"]["seed"], document["diagnostics"][0]["seed"], document["run"]["tags"]

        # The rerun is the last run then, so that a seed that was given stays.
        self.assertEqual(rerun("--set", "minimum=90"), (7043, 7043, {"serial": "C02X", "station": "S3"}))
        self.assertEqual(rerun("--set", "minimum=90", "--tag", "station=S4"),
                         (7043, 7043, {"serial": "C02X", "station": "S4"}))
        self.assertEqual(rerun("--seed", "0", "--set", "minimum=90")[:2], (0, 0))

    def test_a_record_in_which_everything_passed_is_named(self):
        self.recorded()
        result = self.only_failed("--of", self.record)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertTrue(without_run(result.stdout).startswith(f"Everything passed in the run of '{self.record}'.\n"), result.stdout)

    def test_a_seed_is_not_ignored_where_the_phone_of_that_run_was_a_machine(self):
        binding = self.write("machine.json", '{"title": "Nothing"}')
        result = quazor("run", "Broken.Nothing", "--plugin", WORKING, "--phone", f"linux:{binding}", env=self.state)
        self.assertEqual(result.returncode, 2, result.stderr)
        for option in (["--seed", "3"], ["--seed", "0"], ["--realtime"]):
            result = quazor("run", "--only", "failed", *option, env=self.state)
            self.assert_refused(result, 64, "only to simulated phones, but that run used 'linux:")
        self.assertEqual(quazor("run", "--only", "failed", env=self.state).returncode, 2)

    def test_what_was_not_begun_runs_as_planned_or_in_an_earlier_record_with_the_installed_profile(self):
        self.run_fake(names=["Fake.One", "Fake.Two"], env=self.state)
        last = pathlib.Path(self.state["XDG_STATE_HOME"]) / "quazor/last_run.jsonl"
        began = events_in(last)[0]
        last.write_text(json.dumps(began) + "\n")
        result = quazor("run", "--only", "failed", "--format", "json", env=self.state)
        self.assertEqual(result.returncode, 0, result.stderr)
        durations = [one["parameters"]["experiment"]["duration"] for one in json.loads(result.stdout)["diagnostics"]]
        self.assertEqual(durations, [1, 1])
        del began["planned"]
        last.write_text(json.dumps(began) + "\n")
        result = quazor("run", "--only", "failed", env=self.state)
        self.assert_refused(result, 64, "duration")  # a parameter that no profile sets

    def test_it_takes_a_record(self):
        self.recorded(code=2, names=["Fake.One", "Broken.Nothing"])
        self.run_names("Fake.One", code=0)
        result = self.only_failed("--of", self.record, "--format", "json")
        self.assertEqual([record["name"] for record in json.loads(result.stdout)["diagnostics"]], ["Broken.Nothing"])

    def test_experiments_and_analyses_are_no_last_run(self):
        self.recorded("--set", "minimum=1", code=1)
        self.run_names("Broken.Nothing", code=2)
        analyze(self.record, env=self.state)
        quazor("experiment", "FakeExperiment", "--plugin", WORKING, "--profile", "none", "--set", "duration=1",
               "--phone", self.phone, env=self.state)
        result = self.only_failed("--format", "json")
        self.assertEqual([record["name"] for record in json.loads(result.stdout)["diagnostics"]], ["Broken.Nothing"])

    def test_a_refused_run_is_no_last_run(self):
        self.run_names("Broken.Nothing", code=2)
        self.assertEqual(self.run_fake("--set", "bogus=1", env=self.state).returncode, 64)
        result = self.only_failed("--format", "json")
        self.assertEqual([record["name"] for record in json.loads(result.stdout)["diagnostics"]], ["Broken.Nothing"])

    def test_what_is_refused(self):
        self.assert_refused(self.only_failed(), 66, "no previous run is recorded; use --of RECORD to name a record")

    def test_takes_the_plug_ins_of_that_run(self):
        failing = ["--set", "measured=1", "--set", "minimum=90"]
        self.assertEqual(self.run_fake(*failing, env=self.state).returncode, 1)
        result = quazor("run", "--only", "failed", "--phone", self.phone, "--profile", "none", "--set", "duration=1",
                        env=self.state)
        self.assertIn("Fake.One", result.stdout, result.stderr)

    def test_a_plug_in_that_could_not_be_loaded(self):
        self.run_fake("--plugin", PLUGINS / "fatal_plugin.so", env=self.state)
        self.assert_refused(self.only_failed(), 66, "the plug-in fatal_plugin.so could not be loaded in that run")
        self.assert_refused(self.only_failed("--of", self.directory / "missing"), 66, "missing' cannot be read")
        self.assert_refused(self.only_failed("--of", self.phone), 66, "contains no events")
        self.assert_refused(self.only_failed("--all"), 64, "cannot be combined with names or --all")
        self.assert_refused(self.run_fake("--only", "failed"), 64, "cannot be combined with names or --all")
        self.assert_refused(self.run_fake("--of", self.phone), 64, "--of requires --only failed")
        self.assert_refused(self.run_fake("--only", "faild", names=[]), 64, "--only: faild not in {failed}")

    def test_a_place_for_the_last_run_that_cannot_be_used_changes_nothing(self):
        for state in (str(self.phone), "relative", ""):
            with self.subTest(state):
                result = self.run_fake(env={"XDG_STATE_HOME": state, "HOME": str(self.directory)})
                self.assertEqual(result.returncode, 0, result.stderr)
                warnings = [line for line in result.stderr.splitlines() if line.startswith("quazor: ")]
                self.assertEqual(len(warnings), 1 if state == str(self.phone) else 0, warnings)
                for warning in warnings:
                    self.assertRegex(warning, "^quazor: 'run --only failed' will not know this run: .* cannot be written: ")


class OutputsTest(RecordTest):
    def test_one_run_in_every_format(self):
        files = {name: self.directory / f"report.{name}" for name in ("text", "json", "csv", "ocp", "junit")}
        outputs = [argument for name, file in files.items() for argument in ("--output", f"{name}:{file}")]
        result = self.run_fake("--set", "minimum=1", *outputs)
        self.assertEqual(result.returncode, 1, result.stderr)
        self.assertEqual(files["text"].read_text(), result.stdout)
        self.assertEqual(json.loads(files["json"].read_text())["diagnostics"][0]["verdict"], "fail")
        self.assertTrue(files["csv"].read_text().splitlines()[1].startswith("Fake.One,fail,Count,"))
        self.assertIn("testRunEnd", files["ocp"].read_text().splitlines()[-1])
        suites = xml.etree.ElementTree.parse(files["junit"]).getroot()
        self.assertEqual(suites.get("failures"), "1")

    def test_the_report_itself_goes_to_a_file_without_a_format(self):
        junit = self.directory / "report.xml"
        result = self.run_fake("--format", "json", "--output", self.output, "--output", f"junit:{junit}")
        self.assertEqual(result.stdout.splitlines()[0], "PASS  Fake.One")
        self.assertEqual(json.loads(self.output.read_text())["diagnostics"][0]["verdict"], "pass")
        self.assertTrue(junit.read_text().startswith("<?xml"))

    def test_what_is_refused(self):
        self.assert_refused(self.run_fake("--output", "json:"), 64, "--output 'json:': the file name is missing")
        self.assert_refused(self.run_fake("--output", "a", "--output", "b"), 64, "--output 'a' and --output 'b'")
        self.assert_refused(quazor("list", "--plugin", WORKING, "--output", "a", "--output", "b"), 64,
                            "this command writes only one file")


if __name__ == "__main__":
    unittest.main()
