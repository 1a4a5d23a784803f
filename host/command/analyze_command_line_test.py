"""Records analyzed again: with new parameters, by somebody else, and from earlier versions."""

import csv
import json
import os
import pathlib
import shlex
import shutil
import unittest
from xml.etree import ElementTree

from command_line_fixture import EXPERIMENTS, WORKING, RecordTest, analyze, events_in, quazor


class AnalyzeTest(RecordTest):
    def setUp(self):
        super().setUp()
        self.recorded("--set", "measured=90", "--set", "minimum=90", names=["Fake.*"])

    def test_it_comes_to_the_same_verdict(self):
        result = analyze(self.record)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertTrue(result.stdout.endswith("2 diagnostics: 2 passed, 0 failed, 0 ended in an error\n"))

    def test_it_takes_new_parameters_and_the_recorded_ones(self):
        for arguments in (["--set", "minimum=91"], ["--set", "analysis.minimum=91"]):
            result = analyze(self.record, *arguments, "--format", "json")
            self.assertEqual(result.returncode, 1, result.stderr)
            for record in json.loads(result.stdout)["diagnostics"]:
                self.assertEqual(record["parameters"], {"experiment": {"duration": 1, "measured": 90},
                                                        "analysis": {"minimum": 91}})
                self.assertEqual(record["measuredResults"][0]["limit"]["lower"]["value"], 91.0)
        record = self.directory / "again.jsonl"
        self.assertEqual(analyze(self.record, "--record", record).returncode, 0)
        parameter, _ = events_in(record)[1]["parameters"]["analysis"]
        self.assertEqual(parameter["source"], "command line, in the record")

    def test_its_record_can_be_verified_and_analyzed_again(self):
        record = self.directory / "again.jsonl"
        self.assertEqual(analyze(self.record, "--set", "minimum=91", "--record", record).returncode, 1)
        self.assert_verifies(record)
        self.assertEqual(analyze(record).returncode, 1)
        self.assertEqual(analyze(record, "--set", "minimum=90").returncode, 0)

    def test_an_error_in_the_analysis(self):
        result = analyze(self.record, "--set", "behaviour=22")
        self.assertEqual(result.returncode, 2)
        self.assertIn("FakeDomain code 6: analyzing failed", result.stdout)

    def test_what_has_no_result_is_left_out(self):
        self.recorded("--set", "duration=1", code=2, names=["Fake.One", "Broken.Nothing"], duration=None)
        result = analyze(self.record)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertIn("Broken.Nothing has no experiment result in the record and is skipped", result.stderr)

    def test_in_this_process(self):
        result = analyze(self.record, "--in-process")
        self.assertEqual(result.returncode, 0, result.stderr)

    def test_what_is_refused(self):
        self.assert_refused(quazor("analyze", self.directory / "missing"), 66, "cannot be read")
        self.assert_refused(quazor("analyze"), 64, "RECORD")
        self.assert_refused(analyze(self.record, "--set", "minimun=1"), 64, "did you mean 'minimum'?")
        self.assert_refused(analyze(self.record, "--set", "measured=1"), 64,
                            "no analysis of the selected diagnostics has a parameter 'measured'; the experiment has it, and an analysis cannot "
                            "change it\n")
        self.assert_refused(analyze(self.record, "--set", "experiment.duration=1"), 64,
                            "--set 'experiment.duration=1': 'quazor analyze' does not run experiments")
        self.assert_refused(quazor("analyze", self.record, "--plugin", EXPERIMENTS), 64, "there is no diagnostic")
        self.assert_refused(analyze(self.record, "--realtime"), 64, "--realtime")
        self.assert_refused(quazor("analyze", self.record, "--plugin", self.directory / "no.so"), 66, "does not exist")

    def test_a_record_without_results_is_refused(self):
        self.recorded(code=2, names=["Broken.Nothing"], duration=None)
        result = analyze(self.record)
        self.assertEqual(result.returncode, 66)
        self.assertIn("contains no experiment result to analyze", result.stderr)


class ForeignRecordTest(RecordTest):
    """Records that somebody else wrote: they do not choose the code that is run."""

    def setUp(self):
        super().setUp()
        self.state = {"XDG_STATE_HOME": str(self.directory / "state")}
        self.failing = ["--set", "measured=1", "--set", "minimum=90"]

    def installed(self, *arguments):
        """Records a run of an installed plug-in."""
        result = quazor("run", "TesselTelemonDiagnostic", "--record", self.record, "--replace", *arguments, env=self.state)
        self.assertEqual(result.returncode, 0, result.stderr)

    def test_an_analysis_loads_no_plug_in_that_is_not_installed(self):
        self.recorded("--set", "measured=90", "--set", "minimum=90")
        for arguments in ([], ["--in-process"]):
            with self.subTest(arguments):
                self.assert_refused(quazor("analyze", self.record, *arguments), 66,
                                    f"the record names the plug-in '{WORKING}', which is not an installed one", "--plugin")
        self.assertEqual(analyze(self.record).returncode, 0)

    def test_plug_ins_that_were_moved_are_told_with_the_options_that_load_them(self):
        self.recorded("--set", "measured=90", "--set", "minimum=90")
        there, moved = pathlib.Path(WORKING), self.directory / "now here" / "working_plugin.so"
        moved.parent.mkdir()
        shutil.copy(there, moved)

        def analyze_named(*plugins):
            def name(events):
                events[0]["plugins"] = [str(one) for one in plugins]
            return quazor("analyze", self.changed(name))

        gone = self.directory / "gone" / "working_plugin.so"
        self.assert_refused(analyze_named(gone), 66, f"the record names the plug-in '{gone}', which is no longer there; say where "
                            "it is now: --plugin FILE\n")
        self.assertEqual(quazor("analyze", self.directory / "changed.jsonl", "--plugin", moved).returncode, 0)
        refused = analyze_named(moved, gone)
        self.assert_refused(refused, 66, f"to load it, name it: --plugin '{moved}' --plugin FILE\n")
        installed = self.directory / "old" / "camera_sensor_diagnostics.so"
        refused = analyze_named(installed)
        self.assert_refused(refused, 66, f"the record names the plug-in '{installed}', which is no longer there")
        option, new = shlex.split(refused.stderr)[-2:]
        self.assertEqual(option, "--plugin")
        self.installed()
        self.assertEqual(new, events_in(self.record)[0]["plugins"][0])
        refused = analyze_named(installed)
        again = quazor("analyze", self.directory / "changed.jsonl", option, new)
        self.assertEqual(again.returncode, 0, again.stderr)

    def test_a_record_has_the_whole_path_of_a_plug_in_that_was_named_by_a_relative_one(self):
        plugin = pathlib.Path(WORKING)
        self.run_fake("--plugin", f"./{plugin.name}", "--record", self.record, cwd=plugin.parent)
        self.assertEqual(events_in(self.record)[0]["plugins"][-1], str(plugin))
        self.assert_refused(quazor("analyze", self.record, cwd="/"), 66, "which is not an installed one; to load it, name it")

    def test_a_rerun_of_a_given_record_loads_none_either(self):
        self.recorded(*self.failing, code=1)
        self.assert_refused(quazor("run", "--only", "failed", "--of", self.record, env=self.state), 66,
                            f"the record names the plug-in '{WORKING}', which is not an installed one", "--plugin")
        self.assertEqual(self.run_fake("--only", "failed", "--of", self.record, names=[], env=self.state).returncode, 1)

    def test_installed_plug_ins_are_loaded_whatever_their_path_in_the_record(self):
        self.installed()
        result = quazor("analyze", self.record)
        self.assertEqual(result.returncode, 0, result.stderr)
        link = self.directory / "link.so"
        plugin = events_in(self.record)[0]["plugins"][0]
        link.symlink_to(plugin)

        def rename(events):
            events[0]["plugins"] = [str(link)]

        again = self.directory / "again.jsonl"
        result = quazor("analyze", self.changed(rename), "--record", again)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual(events_in(again)[0]["plugins"], [plugin])

    @unittest.skipUnless(os.geteuid() == 0, "only root can make a file another's")
    def test_a_last_run_that_belongs_to_another_is_one_of_those(self):
        result = self.run_fake(*self.failing, env=self.state)
        self.assertEqual(result.returncode, 1, result.stderr)
        again = ["run", "--only", "failed", "--phone", self.phone]
        self.assertEqual(quazor(*again, env=self.state).returncode, 1)
        os.chown(self.directory / "state/quazor/last_run.jsonl", 54321, 54321)
        self.assert_refused(quazor(*again, env=self.state), 66, "which is not an installed one")


class EarlierRecordTest(RecordTest):
    """Records that spell the stage analyze as `analyse`."""

    def setUp(self):
        super().setUp()
        self.recorded("--set", "measured=90", "--set", "minimum=90")
        self.earlier = self.changed(self.rename)

    @staticmethod
    def rename(events):
        analyses = [event for event in events if event.get("stage") == "analyze"]
        assert len(analyses) >= 2
        for event in analyses:
            event["stage"] = "analyse"

    def test_it_verifies(self):
        self.assert_verifies(self.earlier)

    def test_it_can_be_analyzed_again(self):
        result = analyze(self.earlier, "--set", "minimum=91", "--record", self.directory / "again.jsonl")
        self.assertEqual(result.returncode, 1, result.stderr)
        stages = {event["stage"] for event in events_in(self.directory / "again.jsonl") if "stage" in event}
        self.assertIn("analyze", stages)
        self.assertNotIn("analyse", stages)

    def test_it_does_not_differ_from_a_record_of_today(self):
        result = quazor("diff", self.earlier, self.record)
        self.assertEqual((result.returncode, result.stdout), (0, "The records do not differ.\n"))

    def test_where_an_error_came_from_is_read(self):
        self.recorded("--set", "analysis.behaviour=22", code=2)
        failing = self.changed(self.rename)
        self.assert_verifies(failing)
        result = quazor("diff", failing, self.record)
        self.assertEqual((result.returncode, result.stdout), (0, "The records do not differ.\n"))


class IdentityOfRecordTest(RecordTest):
    """An analysis says whose phone and which run was recorded."""

    def setUp(self):
        super().setUp()
        self.recorded("--set", "measured=90", "--set", "minimum=90", "--tag", "serial=C02X", "--tag", "station=S3",
                      names=["Fake.One"])
        self.began = events_in(self.record)[0]

    def test_every_format_has_the_recorded_run_and_its_tags(self):
        files = {form: self.directory / form for form in ("text", "json", "csv", "ocp", "junit")}
        again = self.directory / "again.jsonl"
        outputs = [word for form, file in files.items() for word in ("--output", f"{form}:{file}")]
        result = analyze(self.record, *outputs, "--tag", "station=S5", "--record", again,
                         env={"QUAZOR_TAGS": "serial=other bench=7"})
        self.assertEqual(result.returncode, 0, result.stderr)
        run, date, host = (self.began[key] for key in ("id", "date", "host"))
        began = events_in(again)[0]
        self.assertEqual(began["analyzed"], {"id": run, "date": date, "host": host})
        self.assertEqual(began["tags"], [["serial", "C02X"], ["station", "S5"]])
        text = (f"Analysis {began['id']}, {began['date']}, on {began['host']}\nof run   {run}, {date}, on {host}\n"
                f"Phone    {began['phone']}, seed 0, serial=C02X, station=S5\n\nPASS  Fake.One")
        self.assertTrue(result.stdout.startswith(text), result.stdout)
        self.assertTrue(files["text"].read_text().startswith(text))
        of_json = json.loads(files["json"].read_text())["run"]
        self.assertEqual(of_json["analyzed"], {"id": run, "date": date, "host": host})
        self.assertEqual(of_json["tags"], {"serial": "C02X", "station": "S5"})
        row = next(csv.DictReader(files["csv"].read_text().splitlines()))
        self.assertEqual((row["analyzedRun"], row["analyzedDate"], row["analyzedHost"], row["tag.serial"]),
                         (run, date, host, "C02X"))
        properties = {one.get("name"): one.get("value") for one in ElementTree.parse(files["junit"]).iter("property")}
        self.assertEqual((properties["analyzed.run"], properties["analyzed.date"], properties["analyzed.host"],
                          properties["tag.serial"]), (run, date, host, "C02X"))
        start = next(json.loads(line)["testRunArtifact"]["testRunStart"] for line in files["ocp"].read_text().splitlines()
                     if "testRunStart" in line)
        self.assertEqual(start["metadata"]["analyzed"], {"run": run, "date": date, "host": host})
        self.assertEqual(start["dutInfo"]["hardwareInfos"][0]["serialNumber"], "C02X")

    def test_the_record_of_an_analysis_keeps_the_run_that_measured(self):
        again, third = self.directory / "again.jsonl", self.directory / "third.jsonl"
        self.assertEqual(analyze(self.record, "--record", again).returncode, 0)
        self.assertEqual(analyze(again, "--record", third).returncode, 0)
        self.assert_verifies(third)
        self.assertEqual(events_in(third)[0]["analyzed"]["id"], self.began["id"])

    def test_the_text_of_a_run_says_which_it_was(self):
        text = self.run_fake("--tag", "serial=C02X", "--record", self.record, "--replace").stdout
        began = events_in(self.record)[0]
        self.assertTrue(text.startswith(f"Run   {began['id']}, {began['date']}, on {began['host']}\n"
                                        f"Phone {began['phone']}, seed 0, serial=C02X\n\n"), text)


class IncompleteRecordTest(RecordTest):
    """Records whose run was interrupted or killed: what is missing is not green."""

    def setUp(self):
        super().setUp()
        self.recorded("--set", "measured=90", "--set", "minimum=90", names=["Fake.*"])

    def refuse_green(self, record, running, *arguments, code=3):
        junit, again = self.directory / "junit", self.directory / "again.jsonl"
        result = analyze(record, *arguments, "--output", f"junit:{junit}", "--record", again, "--replace")
        self.assertEqual(result.returncode, code, result.stdout + result.stderr)
        self.assertIn(f"the recorded run did not come to its end: it stopped while {running} was running\n", result.stderr)
        self.assertEqual(ElementTree.parse(junit).getroot().get("errors"), "1")
        self.assert_verifies(again)
        return result, again

    def test_an_interrupted_run(self):
        def interrupt(events):
            events[-1]["interrupted"] = ""
            events[0]["names"].append("Fake.Third")

        result, again = self.refuse_green(self.changed(interrupt), "no diagnostic")
        again = again.rename(self.directory / "first_analysis.jsonl")
        self.assertIn("2 diagnostics: 2 passed, 0 failed, 0 ended in an error, 1 not reached\n", result.stdout)
        self.refuse_green(again, "no diagnostic")
        self.refuse_green(again, "no diagnostic", "--set", "minimum=91", code=1)

    def test_a_record_that_was_cut(self):
        ends = [at for at, event in enumerate(events_in(self.record)) if event["event"] == "diagnosticEnded"]
        self.refuse_green(self.changed(lambda events: events.pop()), "no diagnostic")
        running = events_in(self.record)[ends[0] + 1]["name"]

        def cut(events):
            del events[ends[0] + 2:]

        result, _ = self.refuse_green(self.changed(cut), running)
        self.assertIn(f"ERROR {running}\n", result.stdout)
        self.assertIn("2 diagnostics: 1 passed, 0 failed, 1 ended in an error\n", result.stdout)

        def cut_between(events):
            del events[ends[0] + 1:]

        result, again = self.refuse_green(self.changed(cut_between), "no diagnostic")
        self.assertIn("1 diagnostic: 1 passed, 0 failed, 0 ended in an error, 1 not reached\n", result.stdout)
        # The record of the analysis keeps what was planned for the other.
        planned = {one["name"]: one["parameters"]["experiment"] for one in events_in(self.record)[0]["planned"]}
        self.assertIn(running, planned)
        self.assertEqual({one["name"]: one["parameters"]["experiment"] for one in events_in(again)[0]["planned"]}, planned)

    def test_one_whose_experiment_had_returned_a_result_is_analyzed(self):
        def cut(events):
            while events[-1]["event"] != "stageBegan":
                events.pop()

        result, _ = self.refuse_green(self.changed(cut), "no diagnostic")
        self.assertIn("2 diagnostics: 2 passed", result.stdout)


if __name__ == "__main__":
    unittest.main()
