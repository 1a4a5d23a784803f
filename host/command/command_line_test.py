"""Invalid input of every kind, output and exit codes of the program."""

import contextlib
import json
import os
import pathlib
import pty
import re
import subprocess
import unittest

from command_line_fixture import (EXPERIMENTS, PLUGINS, PROGRAM, SCENARIO, UNFIRED_FAULT, WORKING, CommandLineTest,
                                  quazor, without_identity, without_run)


class HelpTest(CommandLineTest):
    def test_nothing_at_all_gets_help_on_standard_error(self):
        result = quazor()
        self.assertEqual(result.returncode, 64)
        self.assertIn("Examples:", result.stderr)
        self.assertEqual(result.stdout, "")

    def test_help_has_examples_and_exit_codes(self):
        result = quazor("--help")
        self.assertEqual(result.returncode, 0)
        self.assertIn("quazor run --all", result.stdout)
        for code in ("0 ", "1 ", "2 ", "64", "66", "70", "73", "130"):
            self.assertIn("\n  " + code, result.stdout)

    def test_choices_are_named_once(self):
        for command in ("list", "run", "analyze", "report", "phone", "completion"):
            shown = quazor(command, "--help").stdout
            self.assertNotRegex(shown, r":\{", command)
        self.assertRegex(quazor("list", "--help").stdout, r"--format FORMAT +Report format: text, json\n")
        self.assert_refused(quazor("list", "--format", "pdf"), 64, "pdf", "text", "json")

    def test_version_names_the_contract(self):
        result = quazor("--version")
        self.assertEqual(result.returncode, 0)
        self.assertRegex(result.stdout, r"^quazor \d+\.\d+\.\d+, plug-in contract \d+\n$")


class RefusalTest(CommandLineTest):
    """Invalid command lines: nothing runs and no output file is created."""

    def refuse(self, code, *texts, arguments=(), **options):
        self.assert_refused(self.run_fake("--output", self.output, *arguments, **options), code, *texts)

    def test_an_existing_output_file_is_left_alone(self):
        existing = self.write("existing", "precious")
        result = self.run_fake("--output", existing, "--set", "nothing=1")
        self.assertEqual(result.returncode, 64)
        self.assertEqual(existing.read_text(), "precious")

    def test_an_unknown_command(self):
        self.assert_refused(quazor("rnu", "--all"), 64, "unknown command 'rnu'; did you mean 'run'?")

    def test_names_and_parameters_that_are_none(self):
        twice = "--set 'duration=1' and --set 'experiment.duration=2' set the same parameter twice"
        rows = [
            ("--bogus", {"arguments": ["--bogus"]}),
            ("there is no diagnostic 'Fake.Oen'; did you mean 'Fake.One'?", {"names": ["Fake.Oen"]}),
            ("there is no diagnostic 'Fake'; did you mean 'Fake*'?", {"names": ["Fake"]}),
            ("no diagnostic matches 'X*'", {"names": ["Fake.One", "X*"]}),
            ("name the diagnostics to run", {"names": []}),
            ("has a parameter 'measurd'; did you mean 'measured'?", {"arguments": ["--set", "measurd=1"]}),
            ("no analysis of the selected diagnostics has a parameter 'measured'",
             {"arguments": ["--set", "analysis.measured=1"]}),
            ("Fake.One requires the parameter experiment.duration", {"duration": None}),
            (twice, {"arguments": ["--set", "experiment.duration=2"]}),
        ]
        for problem, options in rows:
            with self.subTest(problem):
                self.refuse(64, problem, **options)

    def test_values_that_are_no_finite_numbers(self):
        for text, problem in {"": "a number is missing", "x": "'x' is not a number", "1x": "'1x' is not a number",
                              "nan": "not a finite number", "inf": "not a finite number",
                              "1e999": "outside the range of numbers"}.items():
            with self.subTest(text):
                self.refuse(64, f"--set 'measured={text}'", problem, arguments=["--set", f"measured={text}"])

    def test_a_malformed_seed(self):
        for text in ("", "-1", "1.5", "seven", "18446744073709551616"):
            with self.subTest(text):
                self.refuse(64, f"--seed '{text}'", arguments=["--seed", text])

    def test_scenarios_that_cannot_be_read(self):
        bad_reference = json.loads(json.dumps(SCENARIO))
        bad_reference["groups"]["back"]["master"] = "tele"
        rows = {
            "missing.json": None,
            "empty.json": "",
            "malformed.json": "{\n  \"title\": ,\n}",
            "reference.json": json.dumps(bad_reference),
        }
        for name, content in rows.items():
            with self.subTest(name):
                path = self.directory / name if content is None else self.write(name, content)
                result = quazor("run", "Fake.One", "--plugin", WORKING, "--profile", "none", "--set", "duration=1",
                                "--output", self.output, "--phone", path)
                self.assert_refused(result, 66, "the simulated phone cannot be created", name)

    def test_profiles_that_cannot_be_used(self):
        def entry(text):
            return '{"schema": 1, "diagnostics": {' + text + "}}"

        rows = {
            "missing": (None, ": the file does not exist."),
            "malformed": ("{", ":1: not valid JSON: "),
            "schema": ('{"schema": 9, "diagnostics": {}}', 'schema: must be 1, not 9.'),
            "diagnostic": (entry('"Fake.Oen": {}'), 'no diagnostic has this name; did you mean "Fake.One"?'),
            "parameter": (entry('"Fake.*": {"experiment": {"duratoin": 1}}'), 'did you mean "duration"?'),
            "text": (entry('"Fake.*": {"experiment": {"duration": "1"}}'), "duration: must be a number, not"),
        }
        for name, (content, problem) in rows.items():
            with self.subTest(name):
                path = self.directory / name if content is None else self.write(name, content)
                result = quazor("run", "Fake.One", "--plugin", WORKING, "--phone", self.phone, "--output", self.output,
                                "--profile", path)
                self.assert_refused(result, 66, str(path), problem)


class PluginTest(CommandLineTest):
    def refuse(self, plugin, *texts):
        for command in (["list"], ["run", "--all", "--output", self.output, "--phone", self.phone]):
            self.assert_refused(quazor(*command, "--plugin", plugin), 66, f"the plug-in '{plugin}'", *texts)

    def test_a_missing_file(self):
        self.refuse(self.directory / "nothing.so", "does not exist")

    def test_a_directory(self):
        self.refuse(self.directory, "is a directory")

    def test_a_text_file(self):
        self.refuse(self.write("text.so", "#!/bin/sh\n"), "is not a shared object")

    def test_a_truncated_plugin(self):
        whole = pathlib.Path(WORKING).read_bytes()
        for size in (4, 40, 64, 200, 5000, 20000):
            with self.subTest(size):
                path = self.directory / f"cut{size}.so"
                path.write_bytes(whole[:size])
                self.refuse(path, "is a truncated shared object")

    def test_a_plugin_of_another_contract_version(self):
        version = quazor("--version").stdout.split()[-1]
        self.refuse(PLUGINS / "stranger_plugin.so", "was built against version 999 of the plug-in contract",
                    f"this program has version {version};", "rebuild the plug-in")

    def test_a_shared_object_that_is_no_plugin(self):
        self.refuse(PLUGINS / "empty_plugin.so", "registers nothing")

    def test_a_name_that_is_registered_twice(self):
        self.refuse(PLUGINS / "repeating_plugin.so", "registers the name 'Repeated', which is already taken")

    def test_an_analysis_that_nobody_registered(self):
        self.refuse(PLUGINS / "dangling_plugin.so", "the diagnostic 'Dangling' with the analysis 'DanglingAnalysys'",
                    "did you mean 'DanglingAnalysis'?")

    def test_two_plugins_with_one_name(self):
        copy = self.directory / "copy.so"
        copy.write_bytes(pathlib.Path(WORKING).read_bytes())
        self.assert_refused(quazor("list", "--plugin", WORKING, "--plugin", copy), 66, f"the plug-in '{copy}'",
                            "registers the name 'FakeExperiment', which is already taken")

    def test_a_plugin_that_is_given_twice_is_loaded_once(self):
        link = self.directory / "link.so"
        link.symlink_to(WORKING)
        result = quazor("list", "--plugin", WORKING, "--plugin", link)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual(result.stdout.count("Fake.One"), 1)


class ListTest(CommandLineTest):
    def test_lists_in_the_order_of_registration(self):
        result = quazor("list", "--plugin", WORKING)
        self.assertEqual(result.returncode, 0)
        names = [line.split()[0] for line in result.stdout.splitlines()]
        self.assertEqual(names, ["Fake.One", "Fake.Two", "Broken.Nothing", "Broken.Factory", "Broken.Description"])

    def test_lists_as_json_into_a_file(self):
        result = quazor("list", "--plugin", WORKING, "--format", "json", "--output", self.output)
        self.assertEqual((result.returncode, result.stdout), (0, ""))
        document = json.loads(self.output.read_text())
        self.assertEqual(document["diagnostics"][0], {"name": "Fake.One", "summary": "Does as it is told.",
                                                      "experiment": "FakeExperiment", "analysis": "FakeAnalysis"})
        self.assertEqual(document["experiments"], [])

    def test_lists_experiments_that_no_diagnostic_uses(self):
        result = quazor("list", "--plugin", WORKING, "--plugin", EXPERIMENTS)
        self.assertEqual(result.returncode, 0, result.stderr)
        heading = "\n\nExperiments that no diagnostic uses (run one with 'quazor experiment NAME'):\n"
        before, after = result.stdout.split(heading)
        self.assertIn("Fake.One", before)
        self.assertEqual([line.split()[0] for line in after.splitlines()],
                         ["Alone.Images", "Alone.Counts", "Alone.Nothing"])
        self.assertRegex(after, r"Alone\.Images +Gives images\.\n")
        self.assertRegex(after, r"Alone\.Nothing +could not be described: the factory of Alone\.Nothing returned no object\n")

    def test_lists_experiments_as_json(self):
        document = json.loads(quazor("list", "--plugin", EXPERIMENTS, "--format", "json").stdout)
        self.assertEqual(document, {"schema": 1, "diagnostics": [], "experiments": [
            {"name": "Alone.Images", "summary": "Gives images."},
            {"name": "Alone.Counts", "summary": "Measures what it is told to."},
            {"name": "Alone.Nothing", "summary": None}]})

    def test_an_output_file_that_cannot_be_written(self):
        result = quazor("list", "--plugin", WORKING, "--output", self.directory / "nowhere" / "out")
        self.assertEqual(result.returncode, 73)
        self.assertIn("cannot be written: No such file or directory", result.stderr)


class DescribeTest(CommandLineTest):
    def test_shows_values_and_where_they_come_from(self):
        profile = self.write("mine.json", '{"schema": 1, "diagnostics": {"Fake.*": {"experiment": {"duration": 3}}}}')
        result = quazor("describe", "Fake.One", "--plugin", WORKING, "--profile", profile, "--set", "minimum=2")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertRegex(result.stdout, r"duration +3  profile mine\.json +How long it takes")
        self.assertRegex(result.stdout, r"minimum +2  command line +The least")
        self.assertRegex(result.stdout, r"measured +-  not set +What it measures")

    def test_a_diagnostic_that_cannot_be_described_is_an_error(self):
        result = quazor("describe", "Broken.*", "--plugin", WORKING, "--profile", "none")
        self.assertEqual(result.returncode, 2)
        self.assertIn("the factory of NoExperiment returned no object", result.stdout)
        self.assertIn("describing ThrowingFactory threw an exception: factory threw", result.stdout)
        self.assertIn("describing UndescribableExperiment threw an exception: description threw", result.stdout)


    def test_an_experiment_on_its_own(self):
        profile = self.write("mine.json", '{"schema": 1, "diagnostics": {}, "experiments": {"Alone.*": {"images": 5}}}')
        result = quazor("describe", "Alone.Images", "--plugin", EXPERIMENTS, "--profile", profile, "--set", "samples=2")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertIn("An experiment. No diagnostic uses it.", result.stdout)
        self.assertRegex(result.stdout, r"images +5  profile mine\.json +How many images")
        self.assertRegex(result.stdout, r"samples +2  command line +How many samples")
        self.assertNotIn("Analysis", result.stdout)

    def test_an_experiment_of_diagnostics(self):
        result = quazor("describe", "FakeExperiment", "--plugin", WORKING, "--profile", "none", "--format", "json")
        self.assertEqual(result.returncode, 0, result.stderr)
        document = json.loads(result.stdout)
        self.assertEqual(document["diagnostics"], [])
        self.assertEqual(document["experiments"][0]["name"], "FakeExperiment")
        self.assertEqual([one["name"] for one in document["experiments"][0]["parameters"]],
                         ["duration", "measured", "behaviour"])


class RunTest(CommandLineTest):
    def document(self, *arguments, code=0, **options):
        result = self.run_fake("--format", "json", *arguments, **options)
        self.assertEqual(result.returncode, code, result.stderr)
        return json.loads(result.stdout)

    def test_exit_codes_follow_the_verdicts(self):
        rows = [
            ("passes", [], 0),
            ("fails", ["--set", "minimum=1"], 1),
            ("ends in an error", ["--set", "experiment.behaviour=5"], 2),
        ]
        for name, arguments, code in rows:
            with self.subTest(name):
                self.assertEqual(self.run_fake(*arguments).returncode, code)

    def test_an_error_wins_over_a_failure(self):
        for names in (["Fake.One", "Broken.Nothing"], ["Broken.Nothing", "Fake.One"]):
            result = self.run_fake("--set", "minimum=1", names=names)
            self.assertEqual(result.returncode, 2)
            self.assertIn("2 diagnostics: 0 passed, 1 failed, 1 ended in an error", result.stdout)

    def test_a_table_a_verdict_and_a_summary(self):
        result = self.run_fake("--set", "measured=90", "--set", "minimum=90", "--verbose", names=["Fake.*"])
        self.assertEqual(result.returncode, 0)
        self.assertRegex(result.stdout, r"Count +90  frames  Enough: >= 90  pass\n")
        self.assertIn("\n  PASS\n", result.stdout)
        self.assertTrue(result.stdout.endswith("2 diagnostics: 2 passed, 0 failed, 0 ended in an error\n"))

    def test_the_chain_of_errors_is_shown(self):
        result = self.run_fake("--set", "experiment.behaviour=5")
        self.assertIn("\n\n  FakeDomain code 2: run failed\n  caused by ", result.stdout)

    def test_a_failure_without_an_error_says_so(self):
        result = self.run_fake("--set", "experiment.behaviour=6")
        self.assertIn("run of FakeExperiment failed without giving an error; the last error line of its log: an error line\n",
                      result.stdout)

    def test_exceptions_stop_at_the_boundary(self):
        for behaviour in (3, 4, 7, 10):
            with self.subTest(behaviour):
                result = self.run_fake("--set", f"experiment.behaviour={behaviour}")
                self.assertEqual(result.returncode, 2)
                self.assertIn("QuazorHostErrorDomain code 2", result.stdout)

    def test_all_diagnostics_run_even_when_some_are_broken(self):
        result = self.run_fake("--all", names=[])
        self.assertEqual(result.returncode, 2)
        self.assertIn("5 diagnostics: 2 passed, 0 failed, 3 ended in an error", result.stdout)

    def test_the_json_document(self):
        document = self.document("--set", "measured=3", "--seed", "9", duration=2.5)
        self.assertEqual(document["schema"], 1)
        record, = document["diagnostics"]
        self.assertEqual(list(record), ["name", "summary", "verdict", "parameters", "measuredResults", "measurements",
                                        "auxiliaryData", "error", "log", "faults", "seed", "durations"])
        self.assertEqual(record["name"], "Fake.One")
        self.assertEqual(record["verdict"], "pass")
        self.assertEqual(record["parameters"], {"experiment": {"duration": 2.5, "measured": 3}, "analysis": {}})
        self.assertEqual(record["measuredResults"], [
            {"name": "Count", "value": 3.0, "unit": "frames",
             "limit": {"name": "Enough", "lower": {"value": 0.0, "open": False}, "upper": None}, "verdict": "pass"},
            {"name": "Echo", "value": 3.0, "unit": "frames", "limit": None, "verdict": "none"}])
        self.assertEqual(record["measurements"], {"Count": {"value": 3.0, "unit": "frames"}})
        self.assertEqual(record["auxiliaryData"], {"bytes": "00a5",
                                                   "list": [-1, 18446744073709551615, 36.6, 0.1, True, "text"]})
        self.assertIsNone(record["error"])
        self.assertEqual(record["log"], [{"time": 0.0, "level": "error", "text": "an error line"},
                                         {"time": 0.0, "level": "default", "text": "a default line of 3"},
                                         {"time": 2.5, "level": "default", "text": "teardown"}])
        self.assertEqual(record["faults"], [])
        self.assertEqual(record["seed"], 9)
        self.assertEqual(record["durations"], {"setup": 0.0, "run": 2.5, "teardown": 0.0, "analysis": 0.0})

    def test_an_error_in_json(self):
        record, = self.document("--set", "experiment.behaviour=5", code=2)["diagnostics"]
        self.assertEqual(record["error"]["domain"], "FakeDomain")
        self.assertEqual(record["error"]["code"], 2)
        self.assertIsNone(record["durations"]["analysis"])

    def test_numbers_that_json_does_not_have(self):
        record, = self.document("--set", "behaviour=27", code=2)["diagnostics"]
        self.assertEqual(record["measuredResults"][0]["value"], "nan")

    def test_two_runs_with_one_seed_are_equal_to_the_byte(self):
        runs = {without_identity(self.run_fake("--format", "json", "--seed", "5", "--log-level", "debug",
                                               names=["Fake.*"]).stdout)
                for _ in range(3)}
        self.assertEqual(len(runs), 1)
        self.assertIn('"seed": 5', runs.pop())

    def test_the_output_file_and_the_verdicts(self):
        result = self.run_fake("--format", "json", "--output", self.output)
        self.assertEqual((result.returncode, result.stdout.splitlines()[0]), (0, "PASS  Fake.One"))
        self.assertEqual(json.loads(self.output.read_text())["diagnostics"][0]["verdict"], "pass")

    def test_an_output_file_that_cannot_be_written_is_refused_before_anything_runs(self):
        rows = {self.directory / "nowhere" / "out": "No such file or directory", self.directory: "it is a directory",
                self.phone / "out": "Not a directory"}
        for path, why in rows.items():
            for output in (path, f"junit:{path}"):
                with self.subTest(output):
                    self.assert_refused(self.run_fake("--output", output), 73,
                                        f"the output file '{path}' cannot be written: {why}")

    def test_an_output_file_that_turns_out_not_to_be_writable(self):
        result = self.run_fake("--output", "/dev/full", "--set", "minimum=1")
        self.assertEqual(result.returncode, 73)
        self.assertIn("the output file '/dev/full' cannot be written: No space left on device", result.stderr)
        self.assertIn("FAIL  Fake.One", result.stdout)

    def test_a_standard_output_that_is_full(self):
        with open("/dev/full", "w") as full:
            result = self.run_fake(stdout=full)
        self.assertEqual(result.returncode, 73)
        self.assertIn("standard output cannot be written", result.stderr)

    def test_a_fault_that_never_fired_is_pointed_out(self):
        phone = self.write("fault.json", json.dumps({**SCENARIO, "faults": [UNFIRED_FAULT]}))
        result = quazor("run", "Fake.One", "--plugin", WORKING, "--profile", "none", "--set", "duration=1", "--phone",
                        phone)
        self.assertEqual(result.returncode, 0)
        self.assertIn("Fake.One: a fault of the simulated phone never fired", result.stderr)
        self.assertIn("CaptureStream.start", result.stderr)

    def test_log_lines_on_standard_error(self):
        rows = [
            ([], 1),
            (["--log-level", "error"], 1),
            (["--log-level", "default"], 3),
            (["--log-level", "debug"], 4),
        ]
        for arguments, lines in rows:
            with self.subTest(arguments):
                result = self.run_fake(*arguments)
                self.assertEqual(len(result.stderr.splitlines()), lines, result.stderr)
                self.assertIn("an error line", result.stderr)

    def test_the_system_log_changes_nothing_else(self):
        self.assertEqual(without_run(self.run_fake("--system-log").stdout), without_run(self.run_fake().stdout))


class TerminalTest(CommandLineTest):
    def run_on_terminal(self, env, *arguments, plugin=WORKING, diagnostic="Fake.One"):
        """Returns what the program writes to a terminal, on standard output and standard error."""
        environment = {key: value for key, value in os.environ.items() if key != "NO_COLOR"}
        environment.update(env)
        main, other = pty.openpty()
        command = [PROGRAM, "run", diagnostic, "--plugin", plugin, "--phone", str(self.phone), "--profile", "none",
                   *arguments]
        process = subprocess.Popen(command, stdout=other, stderr=other, env=environment)
        os.close(other)
        written = b""
        try:
            while chunk := os.read(main, 4096):
                written += chunk
        except OSError:  # the other end was closed
            pass
        os.close(main)
        process.wait(timeout=120)
        return written.decode()

    def run_until(self, run, check):
        """Returns the first of ten outputs that passes the check; fails like the last one. The output depends on the
        duration of a run, and a busy machine is sometimes too slow."""
        for _ in range(9):
            written = run()
            with contextlib.suppress(AssertionError):
                check(written)
                return written
        written = run()
        check(written)
        return written

    def test_a_pipe_gets_no_escape_codes(self):
        result = self.run_fake(env={"TERM": "xterm"})
        self.assertNotIn("\033", result.stdout + result.stderr)

    def test_a_terminal_gets_colour(self):
        written = self.run_on_terminal({"TERM": "xterm"}, "--set", "duration=1")
        self.assertIn("\033[32mPASS\033[0m", written)

    def test_no_color_is_honoured(self):
        written = self.run_on_terminal({"TERM": "xterm", "NO_COLOR": "1"}, "--set", "duration=1")
        self.assertIn("PASS", written)
        self.assertNotIn("\033[3", written)

    def test_progress_is_shown_and_erased_only_in_a_run_that_takes_its_time(self):
        def quick():
            return self.run_on_terminal({"TERM": "xterm"}, "--set", "duration=1")

        def slow():
            return self.run_on_terminal({"TERM": "xterm", "NO_COLOR": "1"}, "--realtime", "--set", "duration=0.8")

        self.run_until(quick, lambda written: self.assertNotIn("Running", written))
        self.run_until(slow, lambda written: self.assertRegex(
            written, r"Running Fake\.One: \d\.\d s of 0\.8 s\r\x1b\[K"))
        self.assertNotIn("Running", slow().split("\r\033[K")[-1])

    def test_progress_compares_frames_with_the_count_asked_for(self):
        def run():
            return self.run_on_terminal({"TERM": "xterm", "NO_COLOR": "1"}, "--realtime", "--set", "frameCount=25",
                                        "--set", "timeout=10", plugin=str(PLUGINS / "streaming_plugin.so"),
                                        diagnostic="Streaming")

        def counts_in(written):
            shown = re.findall(r"Running Streaming: \d\.\d s of 10 s, (\d+) of 25 frames\r\x1b\[K", written)
            return [int(count) for count in shown]

        def check(written):
            counts = counts_in(written)
            self.assertGreaterEqual(len(counts), 2, written)
            self.assertGreater(counts[0], 0)

        counts = counts_in(self.run_until(run, check))
        self.assertEqual(counts, sorted(set(counts)))
        self.assertLessEqual(counts[-1], 25)


if __name__ == "__main__":
    unittest.main()
