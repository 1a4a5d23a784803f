"""quazor phone: the phones that --phone accepts."""

import json
import pathlib
import unittest

from command_line_fixture import STATE, CommandLineTest, quazor

DROPPED = "camera_sync/frames_dropped"
OWN = pathlib.Path(STATE.name) / "quazor" / "scenarios"


class PhoneListTest(CommandLineTest):
    def own(self, name, content):
        file = OWN / name
        file.parent.mkdir(parents=True, exist_ok=True)
        file.write_text(content)
        self.addCleanup(file.unlink)
        return file

    def listed(self, *arguments, code=0):
        result = quazor("phone", "list", *arguments, "--format", "json")
        self.assertEqual(result.returncode, code, result.stderr)
        document = json.loads(result.stdout)
        self.assertEqual(document["schema"], 1)
        return {one["name"]: one for one in document["phones"]}

    def test_lists_what_phone_accepts(self):
        self.own("bench/mine.json", '{"base": "healthy", "title": "My own phone"}')
        phones = self.listed()
        self.assertGreater(len(phones), 100)
        self.assertEqual((phones["bench/mine"]["title"], phones["bench/mine"]["from"]), ("My own phone", "yours"))
        self.assertEqual(phones["bench/mine"]["file"], str(OWN / "bench/mine.json"))
        self.assertEqual(phones[DROPPED]["from"], "installed")
        for one in phones.values():
            self.assertTrue(one["title"])
            self.assertTrue(pathlib.Path(one["file"]).is_file())
        for name in ("bench/mine", "healthy"):
            self.assertEqual(quazor("run", "CameraSyncDiagnostic.Back", "--phone", name).returncode, 0)

    def test_text_names_the_phone_its_origin_and_its_title(self):
        result = quazor("phone", "list", "camera_sync/frames_*")
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual(result.stdout.splitlines()[0].split(), ["Phone", "From", "Title"])
        self.assertRegex(result.stdout, r"\ncamera_sync/frames_dropped +installed +Two cameras lose frames;")

    def test_names_and_patterns(self):
        phones = self.listed("camera_sync/frame*", DROPPED, "healthy", self.phone)
        self.assertEqual(sorted(phones), sorted(["camera_sync/frame_rate_drift", DROPPED, "healthy", str(self.phone)]))
        self.assertEqual((phones[str(self.phone)]["from"], phones[str(self.phone)]["title"]), ("file", "One camera"))
        self.assert_refused(quazor("phone", "list", "healty"), 64, "'healty'", "did you mean 'healthy'?")
        self.assert_refused(quazor("phone", "list", "camera_sync"), 64,
                            "camera_sync: this is a group of phones; to see them: quazor phone list 'camera_sync/*'\n")

    def test_an_own_phone_hides_an_installed_one(self):
        self.own("healthy.json", self.phone.read_text())
        phone = self.listed("healthy")["healthy"]
        self.assertEqual((phone["from"], phone["title"]), ("yours", "One camera"))

    def test_a_broken_phone_does_not_hide_the_others(self):
        self.own("broken.json", '{\n  "title": 5\n}')
        result = quazor("phone", "list")
        self.assertEqual(result.returncode, 66)
        self.assertRegex(result.stderr, r"^quazor: broken: .*broken\.json:2: title: ")
        self.assertEqual(len(result.stderr.splitlines()), 1)
        self.assertNotIn("\nbroken ", result.stdout)
        self.assertIn("\nhealthy ", result.stdout)
        self.assertNotIn("broken", self.listed(code=66))

    def test_bad_arguments(self):
        for arguments, text in ((["nothing"], "nothing"), ([], "WHAT"), (["probe", "x"], "takes no name"),
                                (["probe", "--format", "json"], "--format")):
            self.assert_refused(quazor("phone", *arguments), 64, text)

    def test_writes_a_file(self):
        result = quazor("phone", "list", "healthy", "--format", "json", "--output", self.output)
        self.assertEqual((result.returncode, result.stdout), (0, ""), result.stderr)
        self.assertEqual(json.loads(self.output.read_text())["phones"][0]["name"], "healthy")

    def test_completion(self):
        def complete(*words):
            return quazor("__complete", *words).stdout.split()

        self.assertEqual(complete("phone", ""), ["list", "probe"])
        self.assertIn(DROPPED, complete("phone", "list", "camera_sync/fr"))
        self.assertEqual(complete("phone", "probe", ""), [])


LISTED = "; 'quazor list' shows what is available, and '--plugin FILE' loads a plug-in that is not installed"


class PhoneNamesTest(CommandLineTest):
    def refuse(self, code, text, *arguments):
        with self.subTest(arguments):
            result = quazor(*arguments)
            self.assert_refused(result, code)
            self.assertEqual(result.stderr, f"quazor: {text}\n")

    def test_a_phone_that_is_none(self):
        run = ("run", "--all", "--phone")
        self.refuse(66, "--phone camera_sync: this is a group of phones; to see them: quazor phone list 'camera_sync/*'",
                    *run, "camera_sync")
        self.refuse(66, "--phone nope: the file does not exist, and no installed phone has this name; 'quazor phone list' "
                    "shows them, and one that is not installed is given by its file", *run, "nope")
        result = quazor(*run, "linux:nope")
        self.assert_refused(result, 66, "--phone linux:nope: the file does not exist; the installed bindings are ")
        self.assertNotIn("simulated", result.stderr)
        broken = self.write("broken.json", "{")
        self.assertNotIn("simulated", quazor(*run, f"linux:{broken}").stderr)

    def test_a_phone_in_the_place_of_a_name(self):
        for command in ("run", "describe", "list", "explain", "experiment"):
            self.refuse(64, "'healthy' is a simulated phone; run diagnostics on it with 'quazor run --all --phone healthy'",
                        command, "healthy")

    def test_unknown_names_lead_to_the_list(self):
        for what, name, command in (("diagnostic or experiment", "Camra", "list"), ("diagnostic or experiment", "Foo", "describe")):
            self.refuse(64, f"there is no {what} '{name}'{LISTED}", command, name)
        self.refuse(64, f"no diagnostic matches 'Foo*'{LISTED}", "run", "Foo*")

    def test_a_name_of_a_plug_in_that_is_loaded_only_when_named(self):
        name = "NimbeImageExperiment"
        for given, command in (("experiment", "experiment"), ("run", "experiment"), ("describe", "describe"), ("list", "list")):
            self.refuse(64, f"{name} is an experiment of the plug-in sensor_images, which is loaded only when it is named; use "
                        f"'quazor {command} {name} --plugin sensor_images'", given, name)
        self.assertEqual(quazor("experiment", name, "--plugin", "sensor_images").returncode, 0)


if __name__ == "__main__":
    unittest.main()
