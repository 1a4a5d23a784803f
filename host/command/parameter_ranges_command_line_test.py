"""Black-box tests of the ranges of parameters: what a plug-in or an explanation says, and what is refused."""

import json
import pathlib
import unittest

from command_line_fixture import PLUGINS, CommandLineTest, quazor

RANGED = str(PLUGINS / "ranged_plugin.so")
SHIPPED = "CameraSyncDiagnostic.Back"
EXPERIMENT = "CameraSyncExperiment.Back"


class RangesTest(CommandLineTest):
    def setUp(self):
        super().setUp()
        self.record = self.directory / "r.jsonl"
        self.data = self.directory / "data"
        (self.data / "quazor" / "explanations").mkdir(parents=True)

    def run_ranged(self, *arguments, env=None, command="run", name="Ranged"):
        more = [] if command == "describe" else ["--phone", self.phone, "--record", self.record, "--output", self.output]
        return quazor(command, name, "--plugin", RANGED, "--profile", "none", *more, *arguments,
                      env={"XDG_DATA_HOME": str(self.data), **(env or {})})

    def describe(self, *arguments, env=None):
        return quazor("describe", *arguments, "--profile", "none", env={"XDG_DATA_HOME": str(self.data), **(env or {})})

    def explain(self, parameters, kind="experiment", name="RangedExperiment"):
        """Writes explanations of the user and returns their file. The range stands on line 4."""
        file = self.data / "quazor" / "explanations" / "mine.json"
        file.write_text('{"schema": 1, "names": [{\n"names": ["%s"], "kind": "%s", "title": "T", "meaning": "M",\n'
                        '"causes": ["C"], "next": ["N"], "parameters": {\n%s}}]}\n' % (name, kind, parameters))
        return str(file)

    def assert_nothing_began(self, result, code, *texts):
        self.assert_refused(result, code, *texts)
        self.assertFalse(self.record.exists())


class PluginTest(RangesTest):
    def test_describe_shows_what_the_plug_in_says(self):
        result = self.describe("Ranged", "--plugin", RANGED)
        self.assertEqual(result.returncode, 0, result.stderr)
        for text in ("Accepts", "an integer >= 1 and <= 8", "> 0 dB, default 0.5", " -  "):
            self.assertIn(text, result.stdout)
        result = self.describe("Ranged", "--plugin", RANGED, "--format", "json")
        parameters = json.loads(result.stdout)["diagnostics"][0]["experiment"]["parameters"]
        self.assertEqual([one["range"] for one in parameters],
                         [{"minimum": 1, "maximum": 8, "integer": True},
                          {"exclusiveMinimum": 0, "unit": "dB", "default": 0.5}, None])

    def test_values_inside_are_accepted(self):
        for settings in (["count=1"], ["count=8", "gain=1e-300", "anything=-1e300"], ["count=3.0"]):
            with self.subTest(settings):
                self.record.unlink(missing_ok=True)
                result = self.run_ranged(*[word for one in settings for word in ("--set", one)])
                self.assertEqual(result.returncode, 0, result.stderr)

    def test_values_outside_are_refused_before_anything_begins(self):
        rows = {
            "count=0": "an integer >= 1 and <= 8, not 0",
            "count=9": "an integer >= 1 and <= 8, not 9",
            "count=2.5": "an integer >= 1 and <= 8, not 2.5",
            "count=18446744073709551615": "not 18446744073709551615",
        }
        for setting, problem in rows.items():
            with self.subTest(setting):
                self.assert_nothing_began(self.run_ranged("--set", setting), 64,
                                          f"--set '{setting}': the parameter 'count' of Ranged must be ", problem)
                self.assert_nothing_began(self.run_ranged("--set", setting, "--in-process"), 64, problem)
                self.assert_nothing_began(self.run_ranged(env={"QUAZOR_SET": setting}), 64,
                                          f"QUAZOR_SET '{setting}': the parameter 'count' of Ranged must be ", problem)
                self.assert_refused(self.run_ranged("--set", setting, command="describe"), 64, problem)
        self.assert_nothing_began(self.run_ranged("--set", "count=3", "--set", "experiment.gain=0"), 64,
                                  "the parameter 'gain' of Ranged must be > 0 dB, not 0")
        self.assert_refused(self.run_ranged("--set", "gain=0", command="experiment", name="RangedExperiment"), 64,
                            "the parameter 'gain' of RangedExperiment must be > 0 dB, not 0")

    def test_values_outside_in_a_file_are_refused_with_the_line(self):
        file = self.write("p.json", '{"schema": 1, "diagnostics": {"R*": {"experiment": {\n"count": 3,\n"gain": -1}}}}')
        problem = f"{file}:3: diagnostics.R*.experiment.gain: must be > 0 dB, not -1, for Ranged."
        self.assert_nothing_began(self.run_ranged("--parameters", file), 66, problem)
        self.assert_nothing_began(self.run_ranged("--parameters", file, "--set", "gain=1"), 66, problem)
        self.assert_nothing_began(quazor("run", "Ranged", "--plugin", RANGED, "--phone", self.phone, "--profile", file,
                                         "--record", self.record, "--output", self.output), 66, problem)

    def test_the_first_mistake_of_a_file_is_told(self):
        file = self.write("p.json", '{"schema": 1, "diagnostics": {"Ranged": {"experiment": {\n"count": 0,\n"gian": 1}}}}')
        self.assert_nothing_began(self.run_ranged("--parameters", file), 66, f"{file}:2: ", "must be an integer >= 1")
        file = self.write("p.json", '{"schema": 1, "diagnostics": {"Ranged": {"experiment": {\n"gian": 1,\n"count": 0}}}}')
        self.assert_nothing_began(self.run_ranged("--parameters", file), 66, f"{file}:2: ", 'did you mean "gain"?')

    def test_a_value_that_another_entry_overrides_does_not_count(self):
        file = self.write("p.json", '{"schema": 1, "diagnostics": {"*": {"experiment": {"count": 0}},'
                                    '"Ranged": {"experiment": {"count": 3}}}}')
        self.assertEqual(self.run_ranged("--parameters", file).returncode, 0)

    def test_a_range_that_is_nonsense_is_an_error_of_the_plug_in(self):
        rows = {
            "swapped": "RangedExperiment gives the range of 'count': no number is an integer >= 9 and <= 8",
            "nan": "RangedExperiment gives the range of 'count': its maximum is nan, but must be a finite number",
            "unknown": "RangedExperiment gives the range of 'cuont', which is not one of its parameters; did you mean "
                       "'count'?",
            "required": "RangedExperiment gives the range of 'count': the parameter is required and can have no default",
            "throw": "describing RangedExperiment threw an exception: no ranges today",
        }
        for way, problem in rows.items():
            with self.subTest(way):
                environment = {"RANGED_PLUGIN": way}
                result = self.describe("Ranged", "--plugin", RANGED, env=environment)
                self.assertEqual(result.returncode, 2, result.stderr)
                self.assertIn(problem, result.stdout)
                if way != "throw":
                    self.assertIn("QuazorHostErrorDomain code 17", result.stdout)
                self.record.unlink(missing_ok=True)
                result = self.run_ranged(env=environment)
                self.assertEqual(result.returncode, 2, result.stderr)
                self.assertIn(problem, self.output.read_text())
                self.output.unlink()


class ExplanationsTest(RangesTest):
    def test_the_shipped_parameters_are_not_negative(self):
        for setting, name in (("duration=-1", SHIPPED), ("frameCount=-1", "TesselFaultDiagnostic"),
                              ("analysis.frameCount=-1", "TesselFaultDiagnostic"),
                              ("timeout=-0.5", "TesselFaultDiagnostic")):
            with self.subTest(setting):
                result = quazor("run", name, "--phone", self.phone, "--set", setting, "--record", self.record,
                                "--output", self.output)
                self.assert_nothing_began(result, 64, f"--set '{setting}': the parameter '", f"of {name} must be >= 0 ")
        result = quazor("run", SHIPPED, "--set", "duration=1")
        self.assertEqual(result.returncode, 2, "the plug-in's own check answers")
        text = quazor("describe", SHIPPED).stdout
        self.assertIn(">= 0 s", text)

    def test_an_explanation_of_ones_own_gives_a_range(self):
        self.explain('"anything": {"maximum": 5, "integer": true, "unit": "mm", "default": 2}')
        text = self.describe("Ranged", "--plugin", RANGED).stdout
        self.assertIn("an integer <= 5 mm, default 2", text)
        self.assert_nothing_began(self.run_ranged("--set", "count=3", "--set", "anything=6"), 64,
                                  "the parameter 'anything' of Ranged must be an integer <= 5 mm, not 6")
        environment = {"XDG_DATA_HOME": str(self.data)}
        self.assertIn("anything: an integer <= 5 mm, default 2",
                      quazor("explain", "RangedExperiment", env=environment).stdout)
        document = json.loads(quazor("explain", "RangedExperiment", "--format", "json", env=environment).stdout)
        self.assertEqual(document["explanations"][0]["parameters"],
                         {"anything": {"maximum": 5, "integer": True, "unit": "mm", "default": 2}})

    def test_the_plug_in_takes_precedence(self):
        self.explain('"count": {"minimum": 100}')
        self.assertEqual(self.run_ranged("--set", "count=3").returncode, 0)

    def test_what_is_wrong_is_told_with_file_line_and_what_would_be_right(self):
        rows = {
            '"anything": {"minimum": 5, "maximum": 2}': "is not a range: no number is >= 5 and <= 2.",
            '"anything": {"minimm": 5}': 'unknown key "minimm"; did you mean "minimum"?',
            '"anything": {"minimum": "5"}': 'minimum: must be a number, not "5".',
            '"anything": 5': "must be an object, not 5.",
            '"anythng": {"minimum": 5}': 'RangedExperiment has no such parameter; did you mean "anything"?',
            '"count": {"minimum": 5, "default": 6}': "the parameter is required and can have no default.",
        }
        for text, problem in rows.items():
            with self.subTest(text):
                file = self.explain(text)
                self.assert_nothing_began(self.run_ranged("--set", "count=3"), 66,
                                          f"{file}:4: names[0].parameters.", problem)
        file = self.explain('"anything": {"minimum": 5}', kind="diagnostic", name="Ranged")
        self.assert_nothing_began(self.run_ranged("--set", "count=3"), 66, f"{file}:3: names[0].parameters: ",
                                  "only an experiment or analysis can have this key.")

    def test_a_mistake_in_explanations_without_ranges_does_not_stop_a_run(self):
        (self.data / "quazor" / "explanations" / "other.json").write_text("{")
        self.assertEqual(self.run_ranged("--set", "count=3").returncode, 0)

    def test_a_key_in_escapes_is_read_too(self):
        file = pathlib.Path(self.explain('"anything": {"maximum": 5}'))
        file.write_text(file.read_text().replace('"parameters"', '"p\\u0061rameters"'))
        self.assert_nothing_began(self.run_ranged("--set", "count=3", "--set", "anything=6"), 64, "must be <= 5, not 6")


class RecordedTest(RangesTest):
    def test_values_of_a_record_are_checked_too(self):
        result = self.run_ranged("--set", "count=3")
        self.assertEqual(result.returncode, 0, result.stderr)
        text = self.record.read_text()
        forged = self.write("forged.jsonl", text.replace('{"signed":3}', '{"signed":33}').replace('"verdict":"pass"',
                                                                                            '"verdict":"error"'))
        self.assertNotEqual(forged.read_text(), text)
        self.output.unlink()
        result = quazor("run", "--only", "failed", "--of", forged, "--plugin", RANGED, "--output", self.output)
        self.assert_refused(result, 66, "diagnostics.Ranged.experiment.count: must be an integer >= 1 and <= 8, not 33")


if __name__ == "__main__":
    unittest.main()
