"""Profiles of one's own, and the names of profiles, phones and commands."""

import json
import pathlib
import shutil
import subprocess
import unittest

from command_line_fixture import PROGRAM, WORKING, CommandLineTest, quazor

LIMITS = {"schema": 1, "diagnostics": {"Fake.One": {"limits": [{"limit": "Total >= 90"}]}}}


def values(**parameters):
    return {"schema": 1, "diagnostics": {"Fake.One": {"experiment": parameters},
                                         "SingleCamera*": {"experiment": {"camera": 1}}}}


class ProfilesCase(CommandLineTest):
    def setUp(self):
        super().setUp()
        self.folder = self.directory / "quazor" / "profiles"
        self.folder.mkdir(parents=True)
        self.environment = {"XDG_DATA_HOME": str(self.directory)}

    def add(self, name, content):
        file = self.folder / f"{name}.json"
        file.write_text(json.dumps(content))
        return file

    def install_working(self):
        (self.directory / "quazor" / "plugins").mkdir()
        (self.directory / "quazor" / "plugins" / pathlib.Path(WORKING).name).symlink_to(WORKING)

    def describe(self, *arguments):
        return quazor("describe", "Fake.One", "--plugin", WORKING, *arguments, env=self.environment)

    def run_one(self, *arguments, name="Fake.One"):
        return quazor("run", name, "--plugin", WORKING, "--phone", self.phone, *arguments, env=self.environment)


class OwnDefaultTest(ProfilesCase):
    def test_it_takes_the_place_of_the_installed_one(self):
        self.add("default", values(duration=7))
        self.assertRegex(self.describe().stdout, r"duration +7  profile default\.json")
        self.assertRegex(self.describe("--profile", "default").stdout, r"duration +7  profile default\.json")
        self.assertRegex(self.describe("--profile", "none").stdout, r"duration +-  not set, required")
        self.install_working()
        installed = quazor("describe", "CameraSyncDiagnostic.Back", env=self.environment).stdout
        self.assertNotIn("profile default.json", installed)

    def test_its_limits_count(self):
        content = values(duration=1)
        content["diagnostics"]["Fake.One"]["limits"] = [{"limit": "Nothing > 1"}]
        self.add("default", content)
        self.assertIn("Nothing > 1", self.run_one().stdout)
        self.assertNotIn("Nothing > 1", self.run_one("--profile", "none", "--set", "duration=1").stdout)

    def test_its_mistake_is_told(self):
        file = self.folder / "default.json"
        file.write_text("{")
        self.assert_refused(self.run_one(), 66, f"{file}:1: not valid JSON")

    def test_no_report_overwrites_it(self):
        file = self.add("default", values(duration=1))
        before = file.read_text()
        self.assert_refused(self.run_one("--output", file), 64, "is an input of this run")
        self.assertEqual(file.read_text(), before)

    def test_doctor_shows_which_one_is_the_default(self):
        own = self.add("mine", values(duration=1))
        profiles = self.profiles_of_doctor()
        self.assertEqual([name.endswith("share/quazor/profiles/default.json") for name, finding in profiles
                          if finding.endswith("; the default profile")], [True])
        self.assertIn((str(own), "entries for 2 diagnostics and 0 experiments"), profiles)
        own = self.add("default", values(duration=1))
        profiles = self.profiles_of_doctor()
        self.assertEqual([name for name, finding in profiles if finding.endswith("; the default profile")], [str(own)])
        self.assertEqual(len([name for name, _ in profiles if name.endswith("default.json")]), 1)

    def test_one_without_base_is_named_where_a_value_of_the_installed_one_is_missing(self):
        self.install_working()
        own = self.add("default", values(duration=7))
        hint = f'; {own} hides the shipped default profile, whose values it has only with "base": "default"'
        run = quazor("run", "CameraSyncDiagnostic.Back", env=self.environment)
        self.assert_refused(run, 64, "requires the parameter experiment.duration", hint + "\n")
        doctor = " ".join(quazor("doctor", env=self.environment).stdout.split())
        self.assertIn(f"REMARK profile {own} it hides the shipped default profile, whose values it has only with ", doctor)
        self.add("default", {"base": "default", **values(duration=7)})
        self.assertEqual(quazor("run", "CameraSyncDiagnostic.Back", env=self.environment).returncode, 0)
        self.assertNotIn("it hides", quazor("doctor", env=self.environment).stdout)

    def profiles_of_doctor(self):
        result = quazor("doctor", env={**self.environment, "XDG_STATE_HOME": str(self.directory)})
        self.assertEqual(result.returncode, 0, result.stdout)
        lines = result.stdout.splitlines()
        start = "ok       profile "
        return [(line.removeprefix(start), lines[i + 1].strip()) for i, line in enumerate(lines)
                if line.startswith(start)]


class AddedProfileTest(ProfilesCase):
    def setUp(self):
        super().setUp()
        self.add("default", values(duration=1))

    def test_a_profile_with_limits_only_replaces_the_default_one(self):
        file = self.write("limits.json", json.dumps(LIMITS))
        due = ("Fake.One requires the parameter experiment.duration; set it with --set experiment.duration=VALUE or in "
               f"a profile; --profile {file} replaces the default profile, and --parameters {file} adds to it\n")
        self.assert_refused(self.run_one("--profile", file), 64, due)
        everything = self.run_one("--profile", file, name="--all")
        self.assertEqual(everything.returncode, 2)
        self.assertIn("replaces the default profile", everything.stdout)
        self.assertNotEqual(self.run_one("--parameters", file).returncode, 64)

    def test_only_another_profile_is_the_reason(self):
        self.add("default", values())
        for arguments in ((), ("--profile", "default"), ("--profile", "none")):
            with self.subTest(arguments):
                result = self.run_one(*arguments)
                self.assert_refused(result, 64, "or in a profile\n")
                self.assertNotIn("replaces", result.stderr)

    def test_parameters_take_names_like_profile(self):
        self.add("more", values(measured=5))
        result = self.describe("--parameters", "more")
        self.assertRegex(result.stdout, r"duration +1  profile default\.json")
        self.assertRegex(result.stdout, r"measured +5  profile more\.json")
        self.assertEqual(self.describe("--parameters", self.folder / "more.json").stdout, result.stdout)
        result = self.run_one("--parameters", "more", "--output", self.folder / "more.json")
        self.assert_refused(result, 64, "is an input of this run")
        self.assertRegex(quazor("run", "--help").stdout, r"--parameters FILE\|NAME .*values and limits")


class BaseTest(ProfilesCase):
    BACK = {"CameraSyncDiagnostic.Back": {"experiment": {"duration": 4}}}

    def profile(self, base, diagnostics):
        return {"schema": 1, "base": base, "diagnostics": diagnostics}

    def described(self, name, *arguments):
        result = quazor("describe", name, *arguments, env=self.environment)
        self.assertEqual(result.returncode, 0, result.stderr)
        return result.stdout

    def test_an_own_default_profile_extends_the_installed_one(self):
        own = self.add("default", self.profile("default", self.BACK))
        self.assertRegex(self.described("CameraSyncDiagnostic.Back"), r"duration +4 +profile default\.json")
        self.assertRegex(self.described("CameraSyncDiagnostic.Front"), r"duration +3 +profile default\.json")
        self.assertRegex(self.described("TesselFaultDiagnostic"), r"frameCount +90 ")
        self.assertRegex(self.described("CameraSyncDiagnostic.Back", "--profile", own), r"duration +4 ")
        self.assertEqual(quazor("run", "--all", env=self.environment).returncode, 0)
        self.assertEqual(quazor("selftest", "healthy", "--seeds", "1", env=self.environment).returncode, 0)

    def test_the_limits_of_the_base_count_too(self):
        self.add("mine", self.profile("strict", {"CameraSyncDiagnostic.Back": {"limits": [{"limit": "*.Total <= 90"}]}}))
        result = quazor("run", "CameraSyncDiagnostic.Back", "--profile", "mine", "--format", "json", env=self.environment)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertIn("profile strict.json", result.stdout)
        self.assertIn("profile mine.json", result.stdout)

    def test_a_value_for_a_pattern_overrides_a_base_for_a_name(self):
        self.add("named", {"schema": 1, "diagnostics": self.BACK})
        self.add("mine", self.profile("named", {"CameraSync*": {"experiment": {"duration": 5}}}))
        self.assertRegex(self.described("CameraSyncDiagnostic.Back", "--profile", "mine"), r"duration +5 +profile mine")

    def test_a_file_beside_it(self):
        self.write("below.json", json.dumps({"schema": 1, "diagnostics": self.BACK}))
        file = self.write("above.json", json.dumps(self.profile("below.json", {})))
        self.assertRegex(self.described("CameraSyncDiagnostic.Back", "--profile", file), r"duration +4 +profile below")

    def test_what_is_refused(self):
        circle = "is itself based on this file; profiles must not be based on each other in a circle."
        self.write("two.json", json.dumps(self.profile("one.json", {})))
        rows = {"one.json": ("two.json", circle), "self.json": ("./self.json", circle),
                "none.json": ("nothing", '"nothing" is neither a file nor the name of another profile'),
                "number.json": (3, "base: must be a non-empty string, not 3"),
                "broken.json": ("number.json", "number.json:1: base: ")}
        for name, (base, problem) in rows.items():
            with self.subTest(name):
                file = self.write(name, json.dumps(self.profile(base, {})))
                self.assert_refused(quazor("describe", "CameraSyncDiagnostic.Back", "--profile", file), 66, problem)
        self.add("mine", self.profile("mine", {}))
        result = quazor("doctor", env=self.environment)
        self.assertEqual(result.returncode, 66)
        self.assertIn('"mine" is neither a file nor the name of another profile', " ".join(result.stdout.split()))


class LimitsForOtherValuesTest(CommandLineTest):
    REMARK = ("quazor: the limits of the profile strict.json for CameraSyncDiagnostic.* are made for duration=3, but it is "
              "{} ({})\n")

    def test_a_run_with_other_values_than_the_limits_are_made_for(self):
        result = quazor("run", "CameraSyncDiagnostic.*", "--profile", "strict", "--set", "duration=2")
        self.assertEqual((result.returncode, result.stderr), (1, self.REMARK.format(2, "command line")))
        profile = self.write("longer.json", json.dumps({"schema": 1, "diagnostics": {
            "CameraSyncDiagnostic.Back": {"experiment": {"duration": 4}}}}))
        result = quazor("run", "--all", "--parameters", "strict", "--parameters", profile)
        self.assertEqual((result.returncode, result.stderr), (1, self.REMARK.format(4, "profile longer.json")))

    def test_an_analysis_of_such_a_run(self):
        record = self.directory / "run.jsonl"
        self.assertEqual(quazor("run", "CameraSyncDiagnostic.*", "--set", "duration=2", "--record", record).returncode, 0)
        result = quazor("analyze", record, "--profile", "strict")
        self.assertEqual((result.returncode, result.stderr), (1, self.REMARK.format(2, "command line")))
        result = quazor("analyze", record)
        self.assertEqual((result.returncode, result.stderr), (0, ""))

    def test_nothing_is_said_where_they_fit(self):
        for arguments in (("--all", "--profile", "strict"), ("--all", "--set", "duration=2"),
                          ("CameraSyncDiagnostic.Back", "--profile", "strict", "--set", "duration=3.0"),
                          ("TesselFaultDiagnostic", "--profile", "strict", "--set", "timeout=9")):
            with self.subTest(arguments):
                result = quazor("run", *arguments)
                self.assertEqual((result.returncode, result.stderr), (0, ""))


class EntriesForOthersTest(ProfilesCase):
    WAY_OUT = ("An entry must be for a plug-in that is loaded or installed: correct the name, remove the entry, or load the "
               "plug-in with --plugin.\n")

    def content(self, *names):
        return {"schema": 1, "diagnostics": {"Fake.One": {"experiment": {"duration": 1}}, **{name: {} for name in names}}}

    def test_an_entry_for_what_no_plugin_has_is_refused_by_name_and_by_path(self):
        for name, told in (("Fake.Onee", 'Fake.Onee: no diagnostic has this name; did you mean "Fake.One"? '),
                           ("CameraSyncDiagnostic.Bakc", 'did you mean "CameraSyncDiagnostic.Back"? '),
                           ("Nowhere*", "no diagnostic matches this pattern; ")):
            file = self.add("line", self.content(name))
            for given in ("line", file):
                for option in ("--profile", "--parameters"):
                    with self.subTest(name=name, given=given, option=option):
                        result = quazor("run", "Fake.One", "--plugin", WORKING, option, given, env=self.environment)
                        self.assert_refused(result, 66, told, self.WAY_OUT)
        self.add("default", self.content("Fake.Onee"))
        self.assert_refused(self.run_one(), 66, "did you mean", self.WAY_OUT)
        self.assert_refused(quazor("run", "--all", env=self.environment), 66, "Fake.One: no diagnostic", self.WAY_OUT)

    def test_an_entry_for_an_installed_plugin_that_is_not_loaded_is_accepted(self):
        file = self.add("line", self.content("CameraSyncDiagnostic.Back", "Tessel*"))
        for given in ("line", file):
            result = self.run_one("--profile", given)
            self.assertEqual(result.returncode, 0, result.stderr)
            self.assertNotIn("line.json", result.stderr)

    def test_in_process_the_plugins_that_are_not_loaded_cannot_be_asked(self):
        self.add("line", self.content("Fake.Onee"))
        result = self.run_one("--profile", "line", "--in-process")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertIn('line.json:1: diagnostics.Fake.Onee: no diagnostic has this name; did you mean "Fake.One"?\n', result.stderr)

    def test_a_plugin_that_cannot_be_loaded_may_have_what_an_entry_is_for(self):
        self.add("line", self.content("Nowhere"))
        (self.directory / "quazor" / "plugins").mkdir()
        (self.directory / "quazor" / "plugins" / "broken.so").write_text("no plug-in")
        self.assertEqual(self.run_one("--profile", "line").returncode, 0)

    def test_an_installed_profile_is_remarked_upon(self):
        prefix = self.directory / "prefix"
        source = pathlib.Path(PROGRAM).resolve().parent.parent
        (prefix / "bin").mkdir(parents=True)
        shutil.copy(PROGRAM, prefix / "bin" / "quazor")
        for one in ("lib", "share"):
            if (source / one).exists():
                shutil.copytree(source / one, prefix / one)
        machine = prefix / "share" / "quazor" / "profiles" / "machine.json"
        machine.write_text(json.dumps({"schema": 1, "diagnostics": {"CameraSyncDiagnostic.Bakc": {}}}))

        def run(*arguments):
            done = subprocess.run([prefix / "bin" / "quazor", "run", *arguments, "--parameters", "machine"], text=True,
                                  capture_output=True, check=False)
            return done.returncode, done.stderr

        told = (f"quazor: {machine}:1: diagnostics.CameraSyncDiagnostic.Bakc: no diagnostic has this name; did you mean "
                '"CameraSyncDiagnostic.Back"?\n')
        self.assertEqual(run("CameraSyncDiagnostic.Back"), (0, told))
        self.assertEqual(run("Fake.One", "--plugin", WORKING, "--set", "duration=1", "--phone", self.phone,
                             "--log-level", "error", "--profile", "none")[0], 0)


class SuggestedNamesTest(ProfilesCase):
    def test_profiles(self):
        for option in ("--profile", "--parameters"):
            self.assert_refused(self.run_one(option, "strikt"), 66, "strikt: the file does not exist; did you mean 'strict'?")
        self.assert_refused(self.run_one("--profile", "strict.json"), 66, "did you mean 'strict'?")
        self.assert_refused(self.run_one("--profile", "nothing_like_it"), 66, "nothing_like_it: the file does not exist; the installed profiles are default, ")

    def test_phones(self):
        rows = {"camera_sync/frame_dropped": "camera_sync/frames_dropped", "frames_dropped": "camera_sync/frames_dropped",
                "healty": "healthy", "linux:vivit": "vivid"}
        for name, near in rows.items():
            with self.subTest(name):
                result = quazor("run", "Fake.One", "--plugin", WORKING, "--profile", "none", "--set", "duration=1",
                                "--phone", name)
                self.assert_refused(result, 66, f"{name.removeprefix('linux:')}: the file does not exist; ",
                                    f"did you mean '{near}'")
        self.assert_refused(quazor("phone", "list", "frames_dropped"), 64, "did you mean 'camera_sync/frames_dropped'")


class HelpTest(CommandLineTest):
    def test_an_unknown_option_leads_to_the_help_of_its_command(self):
        self.assert_refused(quazor("run", "--all", "--nonsense"), 64, "unknown option '--nonsense'\nRun 'quazor run --help' for usage.\n")
        self.assert_refused(quazor("verify"), 64, "Run 'quazor verify --help' for usage.\n")
        self.assert_refused(quazor("--nonsense"), 64, "Run 'quazor --help' for usage.\n")

    def test_help_is_a_word_too(self):
        for words, options in ((("help",), ("--help",)), (("help", "run"), ("run", "--help")),
                               (("help", "--help"), ("--help",))):
            with self.subTest(words):
                result = quazor(*words)
                self.assertEqual((result.returncode, result.stderr), (0, ""))
                self.assertEqual(result.stdout, quazor(*options).stdout)
        self.assert_refused(quazor("help", "rnu"), 64, "unknown command 'rnu'; did you mean 'run'?")
        self.assert_refused(quazor("help", "run", "verify"), 64, "takes the name of one command")

    def test_the_completion_offers_it(self):
        self.assertEqual(quazor("__complete", "hel").stdout.split(), ["help"])
        self.assertEqual(quazor("__complete", "help", "ver").stdout.split(), ["verify"])
        self.assertEqual(quazor("__complete", "run", "--profile", "").stdout.split(), ["default", "strict", "none"])
        self.assertEqual(quazor("__complete", "run", "--parameters", "s").stdout.split(), ["strict"])


if __name__ == "__main__":
    unittest.main()
