"""The folders in which quazor finds plug-ins, scenarios, profiles and explanations of users."""

import json
import os
import shutil
import unittest

from command_line_fixture import PLUGINS, SCENARIO, WORKING, CommandLineTest, quazor

SHIPPED = "CameraSyncDiagnostic.Back"


class PluginFoldersTest(CommandLineTest):
    def setUp(self):
        super().setUp()
        self.data = self.directory / "data"
        self.own = self.data / "quazor/plugins"
        self.own.mkdir(parents=True)
        self.path = self.directory / "path"
        self.path.mkdir()

    def quazor(self, *arguments, path=None):
        env = {"XDG_DATA_HOME": str(self.data)}
        if path is not None:
            env["QUAZOR_PLUGIN_PATH"] = path
        return quazor(*arguments, env=env)

    def listed(self, *arguments, **options):
        result = self.quazor("list", "--format", "json", *arguments, **options)
        self.assertEqual(result.returncode, 0, result.stderr)
        document = json.loads(result.stdout)
        return [one["name"] for kind in ("diagnostics", "experiments") for one in document[kind]]


class FoundPluginsTest(PluginFoldersTest):
    def test_a_plug_in_in_the_users_folder_is_listed_described_completed_and_run(self):
        shutil.copy(WORKING, self.own)
        names = self.listed()
        self.assertIn("Fake.One", names)
        self.assertLess(names.index(SHIPPED), names.index("Fake.One"))
        self.assertEqual(self.quazor("describe", "Fake.One", "--profile", "none").returncode, 0)
        self.assertIn("Fake.One", self.quazor("__complete", "run", "Fa").stdout.split())
        self.assertIn("working_plugin.so", self.quazor("doctor").stdout)
        result = self.quazor("run", "Fake.One", "--phone", self.phone, "--profile", "none", "--set", "duration=1")
        self.assertEqual(result.returncode, 0, result.stdout + result.stderr)

    def test_run_all_runs_the_plug_ins_of_every_folder(self):
        shutil.copy(PLUGINS / "sullen_plugin.so", self.own)
        shutil.copy(WORKING, self.path)
        self.assertIn("Sullen", self.listed())
        result = self.quazor("run", "--all", "--set", "duration=2", "--format", "json", path=str(self.path))
        verdicts = {one["name"]: one["verdict"] for one in json.loads(result.stdout)["diagnostics"]}
        self.assertEqual((verdicts[SHIPPED], verdicts["Fake.One"]), ("pass", "pass"))

    def test_a_plug_in_for_which_the_memory_is_too_little_names_the_option(self):
        result = self.quazor("list", "--memory", "1")
        self.assertEqual(result.returncode, 66, result.stderr)
        self.assertIn("failed to map segment from shared object; its process may use 1 MiB of memory; --memory raises that "
                      "limit\n", result.stderr)

    def test_a_plug_in_for_which_the_memory_is_too_little_names_the_option(self):
        result = self.quazor("list", "--memory", "1")
        self.assertEqual(result.returncode, 66, result.stderr)
        self.assertIn("failed to map segment from shared object; its process may use 1 MiB of memory; --memory raises that "
                      "limit\n", result.stderr)

    def test_folders_of_the_environment_hide_the_users_which_hide_the_installed(self):
        shutil.copy(WORKING, self.own / "mine.so")
        self.assertIn("Fake.One", self.listed())
        shutil.copy(PLUGINS / "moody_plugin.so", self.path / "mine.so")
        names = self.listed(path=str(self.path))
        self.assertIn("Moody", names)
        self.assertNotIn("Fake.One", names)
        shutil.copy(WORKING, self.own / "camera_sensor_diagnostics.so")
        self.assertNotIn(SHIPPED, self.listed(path=str(self.path)))

    def test_a_refused_one_tells_what_it_hides(self):
        (self.path / "camera_sensor_diagnostics.so").write_text("no plug-in")
        told = "camera_sensor_diagnostics.so', which has the same file name"
        for arguments in (("list",), ("run", "--all")):
            result = self.quazor(*arguments, path=str(self.path))
            text = " ".join((result.stdout + result.stderr).split())
            self.assertEqual(text.count("; it hides '"), 1, text)
            self.assertIn(told, text)
        self.assertNotIn("it hides", self.quazor("list", "--plugin", self.path / "camera_sensor_diagnostics.so",
                                                 path=str(self.path)).stderr)

    def test_the_path_of_the_environment_is_checked(self):
        for path, why in ((f"{self.path}:", "an entry is empty"), (f":{self.path}", "an entry is empty"),
                          (f"{self.path}::/usr", "an entry is empty"), ("here", "the entry 'here' is relative")):
            with self.subTest(path):
                self.assert_refused(self.quazor("list", path=path), 64, "QUAZOR_PLUGIN_PATH", why)
        missing = self.directory / "missing"
        self.assert_refused(self.quazor("list", path=str(missing)), 66, f"the folder '{missing}' does not exist")
        self.assertEqual(self.quazor("explain", "--format", "json", path="here").returncode, 0)

    def test_an_empty_path_of_the_environment_is_none(self):
        self.assertEqual(self.listed(path=""), self.listed())
        without = self.quazor("doctor")
        empty = self.quazor("doctor", path="")
        self.assertEqual((empty.returncode, empty.stdout, empty.stderr), (0, without.stdout, ""))

    def test_what_is_no_plug_in_is_skipped(self):
        (self.own / "notes.txt").write_text("no plug-in")
        shutil.copy(WORKING, self.own / "libhelper.so")
        self.assertNotIn("Fake.One", self.listed())


class NamedPluginsTest(PluginFoldersTest):
    def test_a_plug_in_may_ask_to_be_loaded_only_when_named(self):
        self.assertNotIn("NimbeImageExperiment", self.listed())
        for name in ("sensor_images", "sensor_images.so"):
            self.assertEqual(self.listed("--plugin", name), ["NimbeImageExperiment"])

    def test_named_plug_ins_replace_those_of_the_folders(self):
        shutil.copy(WORKING, self.own)
        shutil.copy(PLUGINS / "moody_plugin.so", self.own)
        self.assertEqual(self.listed("--plugin", "moody_plugin"), ["Moody"])

    def test_a_folder_hides_no_installed_name(self):
        for name in ("sensor_images", "strict", "healthy", "camera_sync/start_refused_on_first", "vivid", "unknown"):
            (self.directory / name).mkdir(parents=True)
        before = os.getcwd()
        self.addCleanup(os.chdir, before)
        os.chdir(self.directory)
        self.assertEqual(self.listed("--plugin", "sensor_images"), ["NimbeImageExperiment"])
        for option in ("--profile", "--parameters"):
            result = self.quazor("run", SHIPPED, option, "strict", "--phone", "healthy")
            self.assertEqual(result.returncode, 0, result.stderr)
            self.assertIn("profile strict.json", result.stdout)
        failed = self.quazor("run", SHIPPED, "--phone", "camera_sync/start_refused_on_first", "--format", "json")
        self.assertEqual(failed.returncode, 2, failed.stderr)
        self.assertEqual(self.quazor("selftest", "healthy", "--seeds", "1").returncode, 0)
        absent = self.quazor("run", SHIPPED, "--phone", "linux:vivid")
        self.assertNotIn("directory", absent.stderr)
        for arguments in (("--profile", "unknown"), ("--phone", "unknown"), ("--phone", "linux:unknown")):
            self.assert_refused(self.quazor("run", SHIPPED, *arguments), 66, "unknown: this is a directory, not a file")

    def test_an_unknown_name_is_told_what_there_is(self):
        shutil.copy(WORKING, self.own)
        self.assert_refused(self.quazor("list", "--plugin", "working_plugn"), 66, "the plug-in 'working_plugn'",
                            "did you mean 'working_plugin'?", "camera_sensor_diagnostics, sensor_images, single_camera, working_plugin")
        completed = self.quazor("__complete", "run", "--plugin", "").stdout.split()
        self.assertEqual(completed, ["camera_sensor_diagnostics", "sensor_images", "single_camera", "working_plugin"])


class RefusedPluginsTest(PluginFoldersTest):
    def check_error(self, file, why, text):
        """`list` shows the others and the sentence; `run --all` has an entry with the error beside the others."""
        listed = self.quazor("list")
        self.assertEqual(listed.returncode, 66)
        self.assertIn(SHIPPED, listed.stdout)
        self.assertIn(f"the plug-in '{file}' {why}", listed.stderr)
        result = self.quazor("run", "--all", "--format", "json")
        self.assertEqual(result.returncode, 2, result.stderr)
        entries = {one["name"]: one for one in json.loads(result.stdout)["diagnostics"]}
        self.assertEqual(entries[SHIPPED]["verdict"], "pass")
        entry = entries.pop(file.name)
        self.assertEqual((entry["verdict"], entry["error"]["code"]), ("error", 15))
        self.assertIn(text, entry["error"]["message"])
        self.assertEqual({one["verdict"] for one in entries.values()}, {"pass"})

    def test_a_file_that_is_no_shared_object(self):
        file = self.own / "text.so"
        file.write_text("hello, this is text")
        self.check_error(file, "is not a shared object", "is not a shared object")

    def test_a_plug_in_of_another_contract_version(self):
        shutil.copy(PLUGINS / "stranger_plugin.so", self.own)
        self.check_error(self.own / "stranger_plugin.so", "was built against version 999", "rebuild the plug-in")

    def test_a_plug_in_with_a_name_that_is_taken(self):
        shipped = next(file for file in (PLUGINS.parent.parent / "lib").rglob("camera_sensor_diagnostics.so"))
        shutil.copy(shipped, self.own / "copy.so")
        self.check_error(self.own / "copy.so", "registers the name 'TesselTelemonExperiment', which is already taken",
                         "already taken")

    def test_a_plug_in_with_a_diagnostic_without_its_analysis(self):
        shutil.copy(PLUGINS / "dangling_plugin.so", self.own)
        self.check_error(self.own / "dangling_plugin.so", "registers the diagnostic 'Dangling'", "not registered")

    def test_a_plug_in_that_others_may_change(self):
        shutil.copy(WORKING, self.own)
        (self.own / "working_plugin.so").chmod(0o666)
        self.check_error(self.own / "working_plugin.so", "may be changed by others", "chmod go-w")

    def test_a_plug_in_that_is_named_is_refused_at_once(self):
        (self.own / "text.so").write_text("hello, this is text")
        self.assert_refused(self.quazor("run", "--all", "--plugin", "text"), 66, "is not a shared object")
        self.assert_refused(self.quazor("run", "--all", "--in-process"), 66, "is not a shared object")


class UserDataTest(PluginFoldersTest):
    def write_data(self, name, content):
        file = self.data / "quazor" / name
        file.parent.mkdir(parents=True, exist_ok=True)
        file.write_text(json.dumps(content))
        return file

    def test_a_scenario_of_the_user(self):
        shutil.copy(WORKING, self.own)
        self.write_data("scenarios/mine/one_camera.json", SCENARIO)
        result = self.quazor("run", "Fake.One", "--phone", "mine/one_camera", "--profile", "none", "--set", "duration=1")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertIn("mine/one_camera", self.quazor("__complete", "run", "--phone", "mine").stdout.split())

    def test_a_scenario_may_be_based_on_a_name_wherever_it_stands(self):
        expected = {"TesselTelemonDiagnostic": {"verdict": "pass"}, "TesselFaultDiagnostic": None,
                    "CameraSyncDiagnostic.Front": None, "NimbeImageExperiment": None}
        self.write_data("scenarios/mine/base.json", {"base": "healthy", "title": "Mine", "expect": expected})
        here = self.write("here.json", json.dumps({"base": "mine/base", "title": "Here"}))
        for phone in ("mine/base", here):
            with self.subTest(phone):
                result = self.quazor("run", SHIPPED, "--phone", phone)
                self.assertEqual(result.returncode, 0, result.stderr)
                result = self.quazor("selftest", phone, "--seeds", "1")
                self.assertEqual(result.returncode, 0, result.stdout + result.stderr)
                self.assertIn("TesselTelemonDiagnostic", result.stdout)
        self.assertNotIn("REFUSED", self.quazor("doctor").stdout)
        unknown = self.write("unknown.json", json.dumps({"base": "helthy", "title": "Here"}))
        self.assert_refused(self.quazor("run", SHIPPED, "--phone", unknown), 66, "unknown.json:1: base:",
                            "the file does not exist")

    def test_a_file_beside_a_scenario_is_its_base_before_an_installed_one_of_that_name(self):
        self.write("healthy", json.dumps(SCENARIO))
        phone = self.write("phone2.json", json.dumps({"base": "healthy", "title": "Small"}))
        shutil.copy(WORKING, self.own)
        result = self.quazor("run", SHIPPED, "--phone", phone)
        self.assertNotEqual(result.returncode, 0)  # it has one camera only

    def test_a_profile_of_the_user(self):
        self.write_data("profiles/mine.json", {"schema": 1, "diagnostics": {SHIPPED: {"experiment": {"duration": 4}}}})
        result = self.quazor("describe", SHIPPED, "--profile", "mine")
        self.assertRegex(result.stdout, r"4 .*mine\.json")

    def test_explanations_of_the_user_join_the_installed_ones(self):
        entry = {"names": ["Fake.One"], "kind": "diagnostic", "title": "A fake", "meaning": "It only pretends.",
                 "causes": ["A test."], "next": ["Nothing."]}
        self.write_data("explanations/fake.json", {"schema": 1, "names": [entry]})
        self.assertIn("It only pretends.", self.quazor("explain", "Fake.One").stdout)
        self.assertEqual(self.quazor("explain", SHIPPED).returncode, 0)

    def test_data_of_the_user_hide_installed_ones_of_the_same_name(self):
        entry = {"names": ["Fake.One"], "kind": "diagnostic", "title": "A fake", "meaning": "It only pretends.",
                 "causes": ["A test."], "next": ["Nothing."]}
        self.write_data("explanations/camera_sync.json", {"schema": 1, "names": [entry]})
        self.assertEqual(self.quazor("explain", SHIPPED).returncode, 64)
        self.write_data("profiles/strict.json", {"schema": 1, "diagnostics": {SHIPPED: {"experiment": {"duration": 4}}}})
        self.assertRegex(self.quazor("describe", SHIPPED, "--profile", "strict").stdout, r"duration.* 4 ")


if __name__ == "__main__":
    unittest.main()
