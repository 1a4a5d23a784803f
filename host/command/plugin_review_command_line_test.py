"""quazor doctor --plugin: what a reviewer would find in the shipped plug-ins, the examples and bad ones."""

import json
import pathlib
import re
import shutil
import unittest

from command_line_fixture import PLUGINS, PROGRAM, SCENARIO, WORKING, CommandLineTest, quazor

SHIPPED = pathlib.Path(PROGRAM).parent.parent / "lib/quazor"
MISBEHAVING = PLUGINS.parent / "misbehaving"
HEAD = re.compile(r"  (ok     |advice |problem)  (.*)")


class ReviewCase(CommandLineTest):
    def review(self, plugin, *arguments, **options):
        """The exit code, and the findings as (rating, text); the last line must count them."""
        result = quazor("doctor", "--plugin", plugin, *arguments, **options)
        self.assertEqual(result.stderr, "")
        first, *lines, last = result.stdout.splitlines()
        self.assertTrue(first.startswith("plug-in ") and first.removesuffix(".so").endswith(str(plugin).removesuffix(".so")), first)
        findings = []
        for line in lines:
            self.assertLessEqual(len(line), max(80, 12 + max(map(len, line.split()))), line)
            if head := HEAD.fullmatch(line):
                findings.append([head[1].strip(), head[2]])
            else:
                self.assertTrue(line.startswith(" " * 11), line)
                findings[-1][1] += " " + line.strip()
        counts = {rating: sum(one == rating for one, _ in findings) for rating in ("problem", "advice")}
        self.assertRegex(last, f"^1 plug-in: {counts['problem']} problems?, {counts['advice']} pieces? of advice$")
        self.assertEqual(result.returncode, 66 if counts["problem"] else 0)
        return findings

    shipped_reviews = {}

    def review_of_shipped(self, name):
        """One review for all tests of a shipped plug-in: it runs every diagnostic on a phone."""
        if name not in self.shipped_reviews:
            self.shipped_reviews[name] = self.review(SHIPPED / name)
        return self.shipped_reviews[name]

    def texts(self, rating, findings):
        return [text for one, text in findings if one == rating]

    def assert_said(self, rating, pattern, findings):
        self.assertTrue(any(re.search(pattern, text) for text in self.texts(rating, findings)),
                        f"no {rating} {pattern!r} in {findings}")


class ShippedTest(ReviewCase):
    def test_the_shipped_plug_ins_have_no_problem(self):
        plugins = sorted(SHIPPED.glob("*.so"))
        self.assertGreaterEqual(len(plugins), 3)
        for plugin in plugins:
            with self.subTest(plugin.name):
                findings = self.review_of_shipped(plugin.name)
                self.assertEqual(self.texts("problem", findings), [])
                self.assert_said("ok", r"^contract: built for version \d+", findings)
                self.assert_said("ok", r"^hardening: functions are bound at the start", findings)
                self.assert_said("ok", r"^name: \d+ names?, of the usual form", findings)

    def test_every_diagnostic_was_run_and_is_explained(self):
        findings = self.review_of_shipped("camera_sensor_diagnostics.so")
        for name, results in (("CameraSyncDiagnostic.Back", "9 results, 2 with limits"),
                              ("CameraSyncDiagnostic.Front", "6 results, 1 with a limit"),
                              ("TesselFaultDiagnostic", "64 results, 64 with limits"),
                              ("TesselTelemonDiagnostic", "60 results, 60 with limits")):
            self.assertIn(["ok", f"{name}: passes on the healthy phone"], findings)
            self.assertIn(["ok", f"{name}: {results}"], findings)
        self.assertNotIn("explain", "".join(self.texts("advice", findings)))
        self.assert_said("ok", "^phones: 4 diagnostics with a phone that must pass and one that must not", findings)

    def test_a_plug_in_can_be_named(self):
        findings = self.review("sensor_images")
        self.assert_said("ok", "loaded only if --plugin names it", findings)
        self.assert_said("ok", "^NimbeImageExperiment: returns a result on the healthy phone", findings)

    def test_what_loading_and_describing_took(self):
        findings = self.review_of_shipped("camera_sensor_diagnostics.so")
        for what in ("loading", "describing"):
            cost = [text for _, text in findings if text.startswith(f"{what}: ")]
            self.assertRegex(cost[0], r"^\w+: \d+\.\d ms, \d+\.\d MiB")
            self.assertGreater(float(cost[0].split()[1]), 0)

    def test_several_plug_ins(self):
        files = [SHIPPED / "camera_sensor_diagnostics.so", SHIPPED / "sensor_images.so"]
        result = quazor("doctor", *(word for file in files for word in ("--plugin", file)))
        self.assertEqual(result.returncode, 0, result.stdout)
        self.assertEqual([line for line in result.stdout.splitlines() if not line.startswith(" ")][:2],
                         [f"plug-in {file}" for file in files])
        self.assertIn("\n2 plug-ins: 0 problems, ", result.stdout)


class FileNameTest(ReviewCase):
    def test_the_file_name_of_a_shipped_plug_in_is_advised_against(self):
        plugin = self.directory / "single_camera.so"
        shutil.copy(PLUGINS / "sleep_accuracy.so", plugin)
        findings = self.review(plugin, "--set", "duration=0.2")
        self.assert_said("advice", "^name: '.*/lib/quazor/single_camera.so' has the same file name, and is not loaded",
                         findings)
        self.assertNotIn("used by no installed plug-in", "".join(self.texts("ok", findings)))


class ExampleTest(ReviewCase):
    def test_the_example_of_the_guide(self):
        findings = self.review(PLUGINS / "sleep_accuracy.so", "--set", "duration=0.2")
        self.assertEqual(self.texts("problem", findings), [])
        self.assert_said("ok", "^SleepAccuracyDiagnostic: passes on the healthy phone", findings)
        self.assert_said("advice", "if Lateness fails, 'quazor explain' has no answer", findings)
        self.assert_said("advice", "^SleepAccuracyDiagnostic: no phone says what it must find", findings)

    def test_a_required_parameter_without_a_value(self):
        findings = self.review(PLUGINS / "sleep_accuracy.so")
        self.assertEqual(self.texts("problem", findings), [])
        self.assert_said("advice", "^SleepAccuracyDiagnostic: it was not run: .*duration.*--set", findings)

    def test_phones_and_explanations_beside_it(self):
        """The layout of a project: build/NAME.so, phones/ and explanations/."""
        project = self.directory / "project"
        (project / "build").mkdir(parents=True)
        shutil.copy(PLUGINS / "event_count.so", project / "build")
        plugin = project / "build/event_count.so"
        findings = self.review(plugin)
        self.assert_said("advice", "if EventCount.Total fails, 'quazor explain' has no answer", findings)
        self.assert_said("advice", "^explanations: none of EventCountDiagnostic", findings)
        self.assert_said("advice", "^EventCountDiagnostic: no phone says what it must find", findings)
        root = pathlib.Path(__file__).resolve().parents[2]
        for folder in ("phones", "explanations"):
            shutil.copytree(root / "examples/event_count" / folder, project / folder)
        findings = self.review(plugin)
        self.assertEqual(self.texts("problem", findings), [])
        # Built by the functions of this tree, it has the run path of the build.
        self.assertEqual([text for text in self.texts("advice", findings) if not text.startswith("run path: ")], [])
        self.assert_said("ok", "^EventCountDiagnostic: passes on the healthy phone", findings)
        self.assert_said("ok", "^phones: 1 diagnostic with a phone that must pass", findings)
        left = project / "explanations/event_count.json"
        left.write_text(left.read_text().replace('"EventCountDiagnostic"', '"CountDiagnostic"')
                        .replace("Changes of the display's brightness", "TODO: say what it is"))
        findings = self.review(plugin)
        for text in ("that of CountDiagnostic is about CountDiagnostic, which the plug-in does not have; correct the name",
                     "that of EventCount.Total is about CountDiagnostic, which the plug-in does not have",
                     "that of CountDiagnostic is not written yet: 'TODO: say what it is'"):
            self.assert_said("advice", f"^explanations: {text}", findings)
        (project / "phones/few_events.json").write_text("{")
        (project / "explanations/event_count.json").write_text("{}")
        problems = self.texts("problem", self.review(plugin))
        self.assertEqual([text.split(":")[0] for text in problems], ["phones", "explanations"])
        for text, file in zip(problems, ("few_events.json", "event_count.json")):
            self.assertIn(file, text)


class BadPluginTest(ReviewCase):
    def test_a_sloppy_plug_in(self):
        findings = self.review(PLUGINS.parents[1] / "sloppy_plugins/sloppy_plugin.so")
        for text in ("^name: 'my check' has characters",
                     "^my check: has no summary",
                     "^measure_things, parameter how.many: has no summary",
                     "^measure_things: the parameter 'how.many' cannot be set",
                     "^my check: it can never fail: no limit on any of 2 results",
                     r"^run path: libraries are searched in 'somewhere/else'"):
            self.assert_said("problem", text, findings)
        for text in ("^name: 'measure_things' is unlike others",
                     "^name: 'measure_things' does not say that it is an experiment",
                     "^measure_things: its summary, 'counts something ', begins or ends with a space, begins with a small "
                     "letter, does not end with a full stop; write one sentence",
                     "^SloppyAnalysis: its summary, .* has a line end",
                     "^measure_things: the parameter 'Unused' is unlike others",
                     "^my check: unusual unit: parsec",
                     "^my check: no unit: Else",
                     "^hardening: link with -Wl,-z,now"):
            self.assert_said("advice", text, findings)
        self.assertNotIn("Not used. By anything.", str(findings))

    def test_parameters_of_which_too_little_is_known(self):
        plugin = self.directory / "ranged_plugin.so"
        shutil.copy(PLUGINS / "ranged_plugin.so", plugin)
        self.assert_said("advice", "^RangedExperiment: the parameter 'anything' has no range, no unit, no default, so that",
                         self.review(plugin))
        (self.directory / "explanations").mkdir()

        def explained(anything):
            texts = {"title": "T", "meaning": "M", "causes": ["C"], "next": ["N"]}
            (self.directory / "explanations/ranged.json").write_text(json.dumps({"schema": 1, "names": [
                {"names": ["RangedExperiment"], "kind": "experiment", "parameters": {"anything": anything}, **texts}]}))
            return self.review(plugin)

        findings = explained({"minimum": 0, "default": 2})
        self.assert_said("advice", "^RangedExperiment: the parameter 'anything' has no unit, so that", findings)
        self.assertNotIn("'anything'", str(explained({"minimum": 0, "default": 2, "unit": "s"})))
        self.assertNotIn("'anything'", str(explained({"minimum": 0, "default": 2, "integer": True})))
        self.assert_said("problem", "^explanations: .*its default -1 is not >= 0", explained({"minimum": 0, "default": -1}))

    def test_names_of_another_installed_plug_in(self):
        folder = self.directory / "plugins"
        folder.mkdir()
        shutil.copy(WORKING, folder / "other.so")
        environment = {"QUAZOR_PLUGIN_PATH": str(folder)}
        findings = self.review(WORKING, "--profile", "none", "--set", "duration=1", env=environment)
        self.assert_said("problem", "^name: 'Fake.One' is a name of '.*other.so' too", findings)
        self.assert_said("problem", "^name: 'FakeAnalysis' is a name of", findings)
        # A plug-in of the same file name hides the other one.
        (folder / "other.so").rename(folder / "working_plugin.so")
        findings = self.review(WORKING, "--profile", "none", "--set", "duration=1", env=environment)
        self.assertNotIn("is a name of", str(findings))

    def test_diagnostics_that_cannot_be_described_or_end_in_an_error(self):
        findings = self.review(WORKING, "--profile", "none", "--set", "duration=1", "--set", "behaviour=26")
        for text in ("^Broken.Factory: it cannot be described: .*factory threw",
                     "^Broken.Nothing: it cannot be described",
                     "^Fake.One: on the healthy phone it ends in an error: .*Count"):
            self.assert_said("problem", text, findings)
        findings = self.review(WORKING, "--profile", "none", "--set", "duration=1", "--set", "minimum=2")
        self.assert_said("problem", "^Fake.One: fails on the healthy phone", findings)

    def test_a_diagnostic_that_the_healthy_phone_has_no_hardware_for(self):
        plugin = self.directory / "working_plugin.so"
        shutil.copy(WORKING, plugin)
        arguments = ["--profile", "none", "--set", "duration=1", "--set", "behaviour=5"]
        self.assert_said("advice", "^Fake.One: on the healthy phone it ends in an error: .* Write a phone on which it "
                         "passes", self.review(plugin, *arguments))
        phones = self.directory / "phones"
        phones.mkdir()
        (phones / "other.json").write_text(json.dumps({**SCENARIO, "expect": {"Fake.One": {"verdict": "pass"}}}))
        findings = self.review(plugin, *arguments)
        self.assert_said("problem", "^Fake.One: on .*phones/other.json it ends in an error", findings)
        self.assert_said("advice", "^Fake.One: no phone on which it must fail or end in an error", findings)

    def test_a_plug_in_that_nothing_can_be_run_of(self):
        findings = self.review(PLUGINS / "analysis_plugin.so")
        self.assert_said("advice", "^loading: it registers neither a diagnostic nor an experiment", findings)

    def test_a_plug_in_that_takes_a_second_to_load(self):
        findings = self.review(MISBEHAVING / "takeASecond_on_load.so")
        self.assert_said("advice", r"^loading: \d{4}\.\d ms, .*; every command waits for it", findings)

    def test_plug_ins_that_cannot_be_loaded(self):
        rows = {
            PLUGINS / "fatal_plugin.so": "^loading: .*crashed: its process was terminated by signal",
            MISBEHAVING / "crash_on_load.so": "^loading: .*crashed: its process was terminated by signal 11",
            MISBEHAVING / "throwException_on_load.so": "^loading: .*crashed: its process was terminated by signal 6",
            MISBEHAVING / "leave_on_load.so": "^loading: .*ended its own process with exit code 0",
            MISBEHAVING / "forgeScan_on_load.so": "^loading: ",
            MISBEHAVING / "sleepForEver_on_load.so": "^loading: .*exceeded its deadline",
            MISBEHAVING / "hanging_in_description.so": "cannot be described: .*exceeded its deadline",
            MISBEHAVING / "misbehaving_in_description.so": "cannot be described: .*crashed",
            PLUGINS / "undescribable_plugin.so": "^Fatal: it cannot be described: .*exit code 4",
            PLUGINS / "empty_plugin.so": "^loading: .*registers nothing",
            PLUGINS / "repeating_plugin.so": "^loading: .*Repeated",
            PLUGINS / "dangling_plugin.so": "^loading: .*DanglingAnalysys",
            PLUGINS / "stranger_plugin.so": "^loading: .*contract",
            self.phone: "^file: it is not a shared object",
            self.directory / "missing.so": "^file: it does not exist",
        }
        for plugin, text in rows.items():
            with self.subTest(plugin.name):
                self.assert_said("problem", text, self.review(plugin, "--deadline", "2"))

    def test_a_plug_in_that_crashes_the_second_time(self):
        environment = {"MISBEHAVIOUR_STATE": str(self.directory / "state")}
        findings = self.review(MISBEHAVING / "crashAfterTheFirstTime_on_load.so", env=environment)
        self.assert_said("problem", "crashed: its process was terminated by signal 11", findings)

    def test_a_plug_in_that_others_may_change_is_not_loaded(self):
        plugin = self.directory / "fatal_plugin.so"
        shutil.copy(PLUGINS / "fatal_plugin.so", plugin)
        plugin.chmod(0o777)
        findings = self.review(plugin)
        self.assertEqual(len(findings), 1, findings)
        self.assert_said("problem", "^file: it may be changed by others: .*chmod go-w", findings)

    def test_a_diagnostic_that_crashes_or_hangs_in_its_run(self):
        for way, text in ((1, "crashed"), (2, "ended its own process with exit code 3"), (3, "exceeded its deadline")):
            with self.subTest(way):
                findings = self.review(PLUGINS / "unruly_plugin.so", "--deadline", "1", "--set", f"way={way}")
                self.assert_said("problem", f"^Unruly: on the healthy phone it ends in an error: .*{text}", findings)


class CommandLineOfDoctorTest(ReviewCase):
    def test_what_does_not_fit(self):
        rows = [
            (["--set", "duration=1"], 64, "are for the runs of 'doctor --plugin'"),
            (["--profile", "none"], 64, "are for the runs of 'doctor --plugin'"),
            (["--plugin", WORKING, "--in-process"], 64, "in processes of its own"),
            (["--plugin", WORKING, "--set", "lenght=1"], 64, "lenght"),
            (["--plugin", "working_plugn"], 66, "working_plugn"),
        ]
        for arguments, code, text in rows:
            with self.subTest(arguments):
                self.assert_refused(quazor("doctor", *arguments), code, text)


if __name__ == "__main__":
    unittest.main()
