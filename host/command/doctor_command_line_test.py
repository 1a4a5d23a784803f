"""quazor doctor on intact and on broken installations."""

import os
import pathlib
import shutil
import unittest

import command_line_fixture
from command_line_fixture import PLUGINS, PROGRAM, CommandLineTest, quazor

STREAMING = PLUGINS / "streaming_plugin.so"
DATA = ("scenarios", "bindings", "profiles", "explanations")


class DoctorCase(CommandLineTest):
    def setUp(self):
        super().setUp()
        self.state = self.directory / "state"

    def doctor(self, plugin_path=None):
        """The exit code, and for each line of output: (accepted or not, kind and name, finding)."""
        environment = {"XDG_STATE_HOME": str(self.state)}
        if plugin_path:
            environment["QUAZOR_PLUGIN_PATH"] = str(plugin_path)
        result = quazor("doctor", env=environment)
        self.assertEqual(result.stderr, "")
        lines = result.stdout.splitlines()
        self.assertEqual(len(lines) % 2, 0, result.stdout)
        found = []
        for head, finding in zip(lines[::2], lines[1::2]):
            self.assertIn(head[:9], ("ok       ", "REFUSED  ", "REMARK   "))
            self.assertTrue(finding.startswith(" " * 11), finding)
            found.append((not head.startswith("REFUSED"), head[9:], finding[11:]))
        self.remarks = [(head[9:], finding[11:]) for head, finding in zip(lines[::2], lines[1::2])
                        if head.startswith("REMARK")]
        return result.returncode, found

    def assert_refused(self, outcome, what, why):
        """Checks that only this item is refused, for this reason."""
        code, found = outcome
        self.assertEqual(code, 66)
        refused = [(name, finding) for fine, name, finding in found if not fine]
        self.assertEqual(len(refused), 1, refused)
        self.assertIn(what, refused[0][0])
        self.assertIn(why, refused[0][1])


class DoctorTest(DoctorCase):
    def test_a_whole_installation(self):
        code, found = self.doctor()
        self.assertEqual(code, 0, found)
        self.assertTrue(all(fine for fine, _, _ in found))
        findings = {name.rsplit("/", 1)[-1]: finding for _, name, finding in found}
        self.assertEqual(findings["camera_sensor_diagnostics.so"], "4 diagnostics, 4 experiments")
        self.assertEqual(findings["sensor_images.so"], "0 diagnostics, 1 experiment; loaded only if --plugin names it")
        self.assertRegex(findings["backend simulated"], r"^created the healthy phone; \d+ phones installed$")
        self.assertEqual(findings["last_run.jsonl"], "no run recorded yet")
        self.assertEqual(self.remarks, [])

    def test_a_plug_in_that_hides_a_shipped_one_is_remarked(self):
        folder = self.directory / "plugins"
        folder.mkdir()
        shutil.copy(STREAMING, folder / "sensor_images.so")
        self.assertEqual(self.doctor(plugin_path=folder)[0], 0)
        self.assertEqual(len(self.remarks), 1, self.remarks)
        name, finding = self.remarks[0]
        self.assertTrue(name.endswith("/lib/quazor/sensor_images.so"), name)
        self.assertIn(f"not loaded, because '{folder}/sensor_images.so' has its file name and hides it", finding)

    def test_a_place_for_the_last_run_that_cannot_be_written(self):
        self.state.write_text("a file")
        code, found = self.doctor()
        self.assertEqual(code, 0, found)
        self.assertEqual([finding for _, finding in self.remarks],
                         [f"it cannot be written, so that 'run --only failed' does not know the last run: '{self.state}' "
                          "is not a folder"])

    def test_plug_ins_are_looked_at_one_by_one(self):
        folder = self.directory / "plugins"
        folder.mkdir()
        for file in (PLUGINS / "fatal_plugin.so", STREAMING, PLUGINS / "undescribable_plugin.so", self.phone):
            shutil.copy(file, folder / pathlib.Path(file).with_suffix(".so").name)
        code, found = self.doctor(plugin_path=folder)
        self.assertEqual(code, 66)
        plugins = {name.rsplit("/", 1)[-1]: (fine, finding) for fine, name, finding in found
                   if name.startswith(f"plug-in {folder}")}
        self.assertEqual({name: fine for name, (fine, _) in plugins.items()},
                         {"fatal_plugin.so": False, "streaming_plugin.so": True, "phone.so": False,
                          "undescribable_plugin.so": False})
        self.assertIn("crashed: its process was terminated by signal", plugins["fatal_plugin.so"][1])
        self.assertIn("is not a shared object", plugins["phone.so"][1])
        self.assertIn("cannot be described", plugins["undescribable_plugin.so"][1])

    def test_a_place_for_the_last_run_that_leads_nowhere(self):
        last = self.state / "quazor/last_run.jsonl"
        last.parent.mkdir(parents=True, exist_ok=True)
        last.symlink_to(last.name)
        result = quazor("doctor", env={"XDG_STATE_HOME": str(self.state)})
        self.assertEqual(result.returncode, 66, result.stderr)
        self.assertIn("Too many levels of symbolic links", result.stdout)
        again = quazor("run", "--only", "failed", env={"XDG_STATE_HOME": str(self.state)})
        self.assertEqual((again.returncode, again.stdout), (66, ""))
        self.assertIn("cannot be read: Too many levels of symbolic links", again.stderr)

    def test_the_record_of_the_last_run(self):
        self.assertEqual(self.run_fake("--set", "minimum=90", "--set", "measured=1",
                                       env={"XDG_STATE_HOME": str(self.state)}).returncode, 1)
        self.assertIn("1 diagnostic did not pass", [finding for _, _, finding in self.doctor()[1]])
        (self.state / "quazor/last_run.jsonl").write_text("no record\n")
        self.assert_refused(self.doctor(), "last run", "line 1: not valid JSON")


class BrokenInstallationTest(DoctorCase):
    """An installation whose data a test can damage."""

    def setUp(self):
        super().setUp()
        built = pathlib.Path(PROGRAM).parent.parent
        root = self.directory / "root"
        (root / "bin").mkdir(parents=True)
        shutil.copy(PROGRAM, root / "bin")
        os.symlink(built / "lib", root / "lib")
        self.data = root / "share/quazor"
        for name in DATA:
            shutil.copytree(built / "share/quazor" / name, self.data / name)
        self.addCleanup(setattr, command_line_fixture, "PROGRAM", PROGRAM)
        command_line_fixture.PROGRAM = str(root / "bin" / pathlib.Path(PROGRAM).name)

    def test_an_entry_of_a_profile_for_a_diagnostic_that_no_plug_in_has_is_remarked(self):
        path = self.data / "profiles/default.json"
        whole = path.read_text()
        self.assertIn('"TesselFaultDiagnostic"', whole)
        path.write_text(whole.replace('"TesselFaultDiagnostic"', '"TeselFaultDiagnostic"'))
        self.assertEqual(self.doctor()[0], 0)
        self.assertEqual([name for name, _ in self.remarks], [f"profile {path}"])
        self.assertRegex(self.remarks[0][1], r"default\.json:7: .*TeselFaultDiagnostic.*no diagnostic has this name; "
                         r"did you mean .TesselFaultDiagnostic.\?")

    def test_data_that_cannot_be_used(self):
        kinds = {"scenarios/healthy.json": "backend simulated", "scenarios/camera_sync/frames_dropped.json": "phone",
                 "bindings/vivid.json": "binding", "profiles/default.json": "profile",
                 "explanations/LinuxErrorDomain.json": "explanations"}
        for file, kind in kinds.items():
            with self.subTest(file):
                path = self.data / file
                whole = path.read_text()
                path.write_text('{"titel": 1}')
                code, found = self.doctor()
                path.write_text(whole)
                self.assertEqual(code, 66)
                refused = [name for fine, name, _ in found if not fine]
                self.assertTrue(any(name.startswith(kind) for name in refused), refused)
                self.assertEqual(self.doctor()[0], 0)


if __name__ == "__main__":
    unittest.main()
