"""quazor new: the project of a plug-in, and what is refused. packaging/check_installed builds such a project."""

import json
import os
import unittest

from command_line_fixture import PLUGINS, CommandLineTest, quazor

EXAMPLE = PLUGINS / "event_count.so"


class NewCommandTest(CommandLineTest):
    def content(self):
        """Every path below the test's directory."""
        return sorted(str(path.relative_to(self.directory)) for path in self.directory.rglob("*"))

    def test_a_project_has_the_names_of_its_folder(self):
        result = quazor("new", self.directory / "light_check")
        self.assertEqual(result.returncode, 0, result.stderr)
        project = self.directory / "light_check"
        files = {path.name: path.read_text() for path in project.rglob("*") if path.is_file()}
        self.assertEqual(set(files), {"CMakeLists.txt", "README.md", "light_check.cpp", "light_check.json", "light_check_errors.json",
                                      "few_events.json", "many_events.json", "channel_missing.json", "report_refused.json"})
        self.assertIn('addDiagnosticWithName("LightCheckDiagnostic"', files["light_check.cpp"])
        self.assertIn("quazor_add_plugin(light_check light_check.cpp)", files["CMakeLists.txt"])
        self.assertEqual(list(json.loads(files["few_events.json"])["expect"]), ["LightCheckDiagnostic"])
        for name, text in files.items():
            self.assertNotIn("event_count", text, name)
            self.assertNotIn("EventCount", text, name)
            self.assertIn(name, result.stdout)
        self.assertEqual(project.stat().st_mode & 0o777, 0o755)

    def test_an_empty_folder_is_filled(self):
        (self.directory / "demo").mkdir()
        self.assertEqual(quazor("new", f"{self.directory}/demo/").returncode, 0)
        self.assertTrue((self.directory / "demo/demo.cpp").is_file())

    def test_the_current_folder_is_filled(self):
        here = self.directory / "demo"
        here.mkdir()
        kept = os.stat(here).st_ino
        result = quazor("new", ".", cwd=here)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual(os.stat(here).st_ino, kept, "a shell that is in the folder would stay in one that is gone")
        self.assertEqual({path.name for path in here.iterdir()},
                         {"CMakeLists.txt", "README.md", "demo.cpp", "explanations", "phones"})
        self.assertIn("  CMakeLists.txt\n", result.stdout)
        self.assertIn("for yourself:\n  cmake -B build", result.stdout)
        self.assertNotIn("cd ", result.stdout)

    def test_the_folder_to_enter_is_a_word_of_the_shell(self):
        (self.directory / "two words").mkdir()
        result = quazor("new", "two words/demo", cwd=self.directory)
        self.assertIn("\n  cd 'two words/demo'\n", result.stdout)

    def test_the_current_folder_is_refused_if_it_has_files(self):
        here = self.directory / "demo"
        here.mkdir()
        self.write("demo/notes.txt", "mine")
        result = quazor("new", ".", cwd=here)
        self.assert_refused(result, 73, "'.' cannot be made: the folder is not empty")
        self.assertEqual([path.name for path in here.iterdir()], ["notes.txt"])

    def test_what_is_there_is_not_touched(self):
        (self.directory / "full").mkdir()
        self.write("full/notes.txt", "mine")
        self.write("file", "mine")
        os.symlink("nowhere", self.directory / "link")
        before = self.content()
        for name, why in (("full", "the folder is not empty"), ("file", "there is a file of that name"),
                          ("link", "there is a file of that name"), ("missing/demo", "No such file or directory")):
            with self.subTest(name):
                self.assert_refused(quazor("new", self.directory / name), 73, f"{name}' cannot be made", why)
                self.assertEqual(self.content(), before)
        self.assertEqual((self.directory / "full/notes.txt").read_text(), "mine")

    def test_names_that_no_plug_in_can_have(self):
        before = self.content()
        for name in ("Demo", "1st", "my-plugin", "my plugin", "a.b", "a;b", "é", "_x", "a" * 65, "libdemo", "test", "all"):
            with self.subTest(name):
                self.assert_refused(quazor("new", self.directory / name), 64, f"'{name}' cannot be the name of a plug-in")
                self.assertEqual(self.content(), before)
        self.assertEqual(quazor("new", "/").returncode, 64)
        self.assertEqual(quazor("new").returncode, 64)
        self.assertEqual(quazor("new", "one", "two").returncode, 64)

    def test_names_of_installed_plug_ins_and_their_diagnostics_are_refused(self):
        before = self.content()
        self.assert_refused(quazor("new", self.directory / "single_camera"), 64,
                            "'single_camera' cannot be the name of a plug-in: the plug-in '", "/single_camera.so' has it",
                            "choose another one")
        self.assert_refused(quazor("new", self.directory / "nimbe_image"), 64,
                            "it would register 'NimbeImageExperiment', as '", "/sensor_images.so' does",
                            "choose another one")
        self.assert_refused(quazor("new", self.directory / "tessel_fault"), 64, "'TesselFaultDiagnostic'")
        self.assertEqual(self.content(), before)

    def test_what_is_not_yet_installed_is_told_how_to_be_found(self):
        by_file = "and one that is not installed is given by its file"
        self.assert_refused(quazor("selftest", "demo/*"), 64, "no installed phone is called 'demo/*'", by_file)
        self.assert_refused(quazor("run", "--all", "--phone", "demo/many_events"), 66, by_file)
        self.assert_refused(quazor("run", "DemoDiagnostic"), 64, "'--plugin FILE' loads a plug-in that is not installed")
        for topic in ("Demo.Total", "DemoErrorDomain:2"):
            self.assert_refused(quazor("explain", topic), 64, "no explanation of ", "'cmake --install build' in its project")

    def test_selftest_judges_the_phones_of_a_project(self):
        self.assertEqual(quazor("new", self.directory / "event_count").returncode, 0)
        phones = sorted((self.directory / "event_count/phones").glob("*.json"))
        result = quazor("selftest", *phones, "--plugin", EXAMPLE)
        self.assertEqual(result.returncode, 0, result.stdout + result.stderr)
        for phone in phones:
            self.assertIn(str(phone), result.stdout)
        wrong = json.loads(phones[0].read_text())
        wrong["expect"]["EventCountDiagnostic"] = {"verdict": "pass"}
        phones[0].write_text(json.dumps(wrong))
        self.assertEqual(quazor("selftest", *phones, "--plugin", EXAMPLE).returncode, 1)


if __name__ == "__main__":
    unittest.main()
