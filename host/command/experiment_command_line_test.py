"""The `experiment` command, run as a program."""

import csv
import io
import json
import unittest

from command_line_fixture import EXPERIMENTS, PLUGINS, WORKING, CommandLineTest, quazor


class ExperimentTest(CommandLineTest):
    """quazor experiment: the results of experiments, without an analysis or a judgement."""

    def run_alone(self, *arguments, names=("Alone.Images",), **options):
        fixed = ["--plugin", EXPERIMENTS, "--phone", self.phone, "--profile", "none"]
        return quazor("experiment", *names, *fixed, *arguments, **options)

    def run_counts(self, *arguments, **options):
        return self.run_alone("--set", "duration=2", *arguments, names=["Alone.Counts"], **options)

    def rows(self, *arguments, code=0, **options):
        """The rows of the CSV table, including the header, without the cells that say which run it was."""
        result = self.run_alone("--format", "csv", *arguments, **options)
        self.assertEqual(result.returncode, code, result.stderr)
        rows = list(csv.reader(io.StringIO(result.stdout), strict=True))
        begin = rows[0].index("run")
        self.assertEqual(rows[0][begin:],
                         ["run", "date", "host", "program", "contract", "plugins", "phone", "seed"])
        self.assertEqual({tuple(row[begin:]) for row in rows[1:]}, {tuple(row[begin:]) for row in rows[1:2]})
        return [row[:begin] for row in rows]

    def test_measurements_as_a_table_and_auxiliary_data(self):
        result = self.run_counts("--set", "measured=90")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertRegex(result.stdout, r"\n  Measurement +Value +Unit\n  Count +90  frames\n\n")
        self.assertIn("  bytes: 00a5\n  list: (-1, 18446744073709551615, 36.6, 0.1, 1, text)\n", result.stdout)
        self.assertTrue(result.stdout.endswith("\n  DONE\n\n"))

    def test_images_as_pictures_in_80_columns(self):
        for locale, full in {"C.UTF-8": "\N{FULL BLOCK}", "C": ":", "xx_XX.UTF-8": ":"}.items():
            with self.subTest(locale):
                result = self.run_alone("--set", "images=5", env={"LC_ALL": locale}, encoding="utf-8")
                self.assertEqual(result.returncode, 0, result.stderr)
                lines = result.stdout.splitlines()
                self.assertIn('  pictures 5 of 5: number 4294967294, temperature 36.6, label a, "b"', lines)
                self.assertEqual(lines.count("    i: 48 samples, min -10, max 37"), 5)
                self.assertEqual(lines.count("    q: 48 samples, min -47000, max 0"), 5)
                drawn = [line for line in lines if line.strip(" ") and line.endswith(full)]
                self.assertEqual(len(drawn), 5 * 4)
                self.assertLessEqual(max(map(len, lines)), 80)
                if full == ":":
                    self.assertTrue(result.stdout.isascii())

    def test_the_json_document(self):
        result = self.run_alone("--set", "images=2", "--set", "samples=3", "--seed", "9", "--format", "json")
        self.assertEqual(result.returncode, 0, result.stderr)
        document = json.loads(result.stdout)
        self.assertEqual(list(document), ["schema", "experiments", "run"])
        record, = document["experiments"]
        self.assertEqual(list(record), ["name", "summary", "verdict", "parameters", "measurements", "auxiliaryData",
                                        "error", "log", "faults", "seed", "durations"])
        self.assertEqual((record["name"], record["summary"], record["verdict"]),
                         ("Alone.Images", "Gives images.", "pass"))
        self.assertEqual(record["parameters"], {"images": 2, "samples": 3})
        self.assertEqual(record["auxiliaryData"]["pictures"][1],
                         {"number": 4294967291, "i": [-10, -9, -8], "q": [0, -1000, -2000], "temperature": 36.6,
                          "label": 'a, "b"'})
        self.assertEqual((record["error"], record["faults"], record["seed"]), (None, [], 9))
        self.assertEqual(record["durations"], {"setup": 0.0, "run": 0.0, "teardown": None})

    def test_a_csv_line_for_each_sample(self):
        rows = self.rows("--set", "images=2")
        self.assertEqual(rows[0], ["experiment", "image", "label", "number", "temperature", "sample", "i", "q"])
        self.assertEqual(len(rows), 1 + 2 * 48)
        self.assertEqual(rows[1], ["Alone.Images", "1", 'a, "b"', "4294967290", "36.6", "0", "-10", "0"])
        self.assertEqual(rows[96], ["Alone.Images", "2", 'a, "b"', "4294967291", "36.6", "47", "37", "-47000"])

    def test_a_csv_line_for_each_measurement(self):
        rows = self.rows("--set", "duration=1", "--set", "measured=2.5", names=["Alone.Counts"])
        self.assertEqual(rows, [["experiment", "measurement", "value", "unit"],
                                ["Alone.Counts", "Count", "2.5", "frames"]])

    def test_csv_into_a_file(self):
        result = self.run_counts("--format", "csv", "--output", self.output)
        self.assertEqual((result.returncode, result.stdout.splitlines()[0]), (0, "DONE  Alone.Counts"))
        self.assertRegex(self.output.read_text(),
                         r"^experiment,measurement,value,unit,run,.*\nAlone.Counts,Count,0,frames,[0-9a-f]{32},.*\n$")

    def test_csv_is_for_runs_only(self):
        for command in (["list"], ["describe", "Fake.One"]):
            result = quazor(*command, "--plugin", WORKING, "--format", "csv", "--output", self.output)
            self.assert_refused(result, 64, "--format: csv not in {text,json}")

    def test_an_error_beside_a_csv_table(self):
        result = self.run_counts("--format", "csv", "--set", "behaviour=5")
        self.assertEqual(result.returncode, 2)
        self.assertRegex(result.stdout, r"^experiment,measurement,value,unit,run,.*\n$")
        self.assertIn("quazor: Alone.Counts ended in an error\n  FakeDomain code 2: run failed\n", result.stderr)

    def test_exceptions_become_errors_with_their_text(self):
        for behaviour, text in {7: "run of Alone.Counts threw an exception: run threw",
                                12: "run of Alone.Counts threw something that is not a standard exception",
                                3: "setup of Alone.Counts threw an exception: setup threw",
                                10: "teardown of Alone.Counts threw an exception: teardown threw"}.items():
            with self.subTest(behaviour):
                result = self.run_counts("--set", f"behaviour={behaviour}")
                self.assertEqual(result.returncode, 2)
                self.assertIn(f"\n  ERROR\n    QuazorHostErrorDomain code 2: {text}\n", result.stdout)

    def test_all_and_patterns(self):
        result = self.run_alone("--all", "--set", "images=0", "--set", "duration=1", names=[])
        self.assertEqual(result.returncode, 2)
        self.assertIn("3 experiments: 2 returned a result, 1 ended in an error", result.stdout)
        result = self.run_alone("--set", "images=0", "--set", "duration=1", names=["Alone.[CI]*"])
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertIn("2 experiments: 2 returned a result, 0 ended in an error", result.stdout)

    def test_an_experiment_of_diagnostics_takes_their_profile_values(self):
        profile = self.write("mine.json", '{"schema": 1, "diagnostics": {"Fake.*": {"experiment": {"duration": 3}}}}')
        result = quazor("experiment", "FakeExperiment", "--plugin", WORKING, "--phone", self.phone, "--format", "json",
                        "--profile", profile)
        self.assertEqual(result.returncode, 0, result.stderr)
        record, = json.loads(result.stdout)["experiments"]
        self.assertEqual((record["parameters"], record["durations"]["run"]), ({"duration": 3}, 3.0))

    def test_what_is_refused(self):
        def refuse(*texts, plugin=EXPERIMENTS, arguments, code=64):
            result = quazor(*arguments, "--plugin", plugin, "--phone", self.phone, "--output", self.output)
            self.assert_refused(result, code, *texts)

        refuse("'Fake.One' is a diagnostic; run it with 'quazor run Fake.One', or only its experiment with "
               "'quazor experiment FakeExperiment'", plugin=WORKING, arguments=["experiment", "Fake.One"])
        refuse("'Alone.Images' is an experiment", "run it with 'quazor experiment Alone.Images'",
               arguments=["run", "Alone.Images"])
        refuse("the loaded plug-ins have no diagnostics, only experiments; run them with 'quazor experiment --all'",
               arguments=["run", "--all"])
        refuse("there is no experiment 'Alone.Image'; did you mean 'Alone.Images'?",
               arguments=["experiment", "Alone.Image"])
        refuse("Alone.Images requires the parameter images; set it with --set images=VALUE or in a profile",
               arguments=["experiment", "Alone.Images", "--profile", "none"])
        refuse("none of the selected experiments has a parameter 'image'; did you mean 'images'?",
               arguments=["experiment", "Alone.Images", "--set", "image=1"])
        profile = self.write("mine.json", '{"schema": 1, "diagnostics": {}, "experiments": {"Alone": {"images": 5}}}')
        refuse("experiments.Alone: no experiment has this name", code=66,
               arguments=["experiment", "Alone.Images", "--profile", profile])

    def test_a_plugin_without_experiments(self):
        # A diagnostic needs an experiment, so only a plug-in that registers nothing but analyses has none.
        self.assert_refused(quazor("experiment", "--all", "--plugin", PLUGINS / "analysis_plugin.so"), 64,
                            "the loaded plug-ins have no experiments")
        self.assert_refused(quazor("run", "--all", "--plugin", PLUGINS / "analysis_plugin.so", "--phone", self.phone),
                            64, "the loaded plug-ins have no diagnostics\n")


if __name__ == "__main__":
    unittest.main()
