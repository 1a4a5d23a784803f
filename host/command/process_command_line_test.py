"""Plug-ins in separate processes, and the sources of parameters."""

import json
import os
import resource
import shutil
import signal
import time
import unittest

from command_line_fixture import PLUGINS, WORKING, CommandLineTest, events_in, quazor, without_identity

FATAL = str(PLUGINS / "fatal_plugin.so")
UNRULY = str(PLUGINS / "unruly_plugin.so")
UNPRIVILEGED = 54321  # a user without processes


class ParametersTest(CommandLineTest):
    def profile(self, name, **values):
        return self.write(name, json.dumps({"schema": 1, "diagnostics": {"Fake.*": {"experiment": values}}}))

    def described(self, *arguments, **options):
        """The value and source of each parameter of the experiment."""
        result = quazor("describe", "Fake.One", "--plugin", WORKING, "--format", "json", *arguments, **options)
        self.assertEqual(result.returncode, 0, result.stderr)
        parameters = json.loads(result.stdout)["diagnostics"][0]["experiment"]["parameters"]
        return {one["name"]: (one["value"], one["source"]) for one in parameters if one.get("value") is not None}

    def test_the_last_place_that_has_a_value_wins(self):
        profile = self.profile("profile.json", duration=1, measured=1, behaviour=0)
        first = ["--profile", profile]
        more = [*first, "--parameters", self.profile("more.json", measured=2)]
        most = [*more, "--parameters", self.profile("most.json", measured=3)]
        rows = [
            (first, {}, (1, "profile profile.json")),
            (more, {}, (2, "profile more.json")),
            (most, {}, (3, "profile most.json")),
            (most, {"QUAZOR_SET": "measured=4"}, (4, "environment")),
            ([*most, "--set", "measured=5"], {}, (5, "command line")),
            ([*most, "--set", "measured=5"], {"QUAZOR_SET": "measured=4"}, (5, "command line")),
            (["--profile", "none"], {"QUAZOR_SET": "  experiment.measured=4\tduration=2 "}, (4, "environment")),
        ]
        for arguments, env, measured in rows:
            with self.subTest(arguments, env=env):
                described = self.described(*arguments, env=env)
                self.assertEqual(described["measured"], measured)
        self.assertEqual(self.described(*most, env={"QUAZOR_SET": "measured=4"})["duration"],
                         (1, "profile profile.json"))

    def test_a_run_has_them(self):
        result = self.run_fake("--parameters", self.profile("more.json", measured=2), "--format", "json",
                               env={"QUAZOR_SET": "minimum=3"})
        self.assertEqual(result.returncode, 1, result.stderr)
        record, = json.loads(result.stdout)["diagnostics"]
        self.assertEqual(record["parameters"], {"experiment": {"duration": 1, "measured": 2},
                                                "analysis": {"minimum": 3}})

    def test_what_is_refused_of_files(self):
        rows = [
            (self.directory / "missing.json", "the file does not exist."),
            (self.write("empty.json", ""), "not valid JSON"),
            (self.directory, "this is a directory, not a file."),
            (self.profile("typo.json", measurd=1), 'did you mean "measured"?'),
            (self.write("other.json", '{"schema": 1, "diagnostics": {"Fake.Oen": {}}}'),
             "diagnostics.Fake.Oen: no diagnostic has this name"),
        ]
        for path, problem in rows:
            with self.subTest(problem):
                self.assert_refused(self.run_fake("--parameters", path), 66, str(path), problem)
        self.assert_refused(self.run_fake("--parameters", ""), 64, "--parameters: the value is empty")

    def test_what_is_refused_of_the_environment(self):
        rows = {"measured": "expected [experiment.|analysis.]NAME=VALUE", "measured=": "a number is missing",
                "measured=nan": "not a finite number", "measurd=1": "did you mean 'measured'?",
                "measured=1 measured=2": "set the same parameter twice", "measured=1e999": "outside the range"}
        for text, problem in rows.items():
            with self.subTest(text):
                self.assert_refused(self.run_fake(env={"QUAZOR_SET": text}), 64, "QUAZOR_SET '", problem)


class ProcessTest(CommandLineTest):
    def run_unruly(self, way, *arguments, names=("Unruly",), **options):
        return quazor("run", *names, "--plugin", UNRULY, "--phone", self.phone, "--profile", "none", "--set",
                      f"way={way}", *arguments, **options)

    def test_a_crash_ends_one_diagnostic_and_not_the_run(self):
        record = self.directory / "run.jsonl"
        result = quazor("run", "Unruly", "Fake.One", "--plugin", UNRULY, "--plugin", WORKING, "--phone", self.phone,
                        "--profile", "none", "--set", "way=1", "--set", "duration=1", "--record", record)
        self.assertEqual(result.returncode, 2)
        self.assertIn("QuazorHostErrorDomain code 6: the stage run of Unruly crashed: its process was terminated by signal "
                      "6 (SIGABRT)", result.stdout)
        self.assertIn("2 diagnostics: 1 passed, 0 failed, 1 ended in an error", result.stdout)
        self.assert_verifies(record)

    def test_an_exit_is_an_error(self):
        result = self.run_unruly(2)
        self.assertEqual(result.returncode, 2)
        self.assertIn("code 7: the stage run of Unruly ended its own process with exit code 3", result.stdout)

    def test_a_deadline_ends_what_takes_longer(self):
        for arguments in (["--deadline", "1"], ["--deadline", "run=1"], ["--deadline", "60", "--deadline", "run=1"]):
            with self.subTest(arguments):
                begin = time.monotonic()
                result = self.run_unruly(3, *arguments)
                self.assertLess(time.monotonic() - begin, 20)
                self.assertEqual(result.returncode, 2)
                self.assertIn("code 8: the stage run of Unruly exceeded its deadline of 1 s", result.stdout)

    def test_a_deadline_of_another_stage_is_not_its(self):
        result = self.run_fake("--realtime", "--deadline", "analyze=1", "--deadline", "setup=1", duration=1.2)
        self.assertEqual(result.returncode, 0, result.stdout)

    def test_deadlines_that_are_refused(self):
        for text, problem in {"": "a number is missing", "0": "greater than zero", "-1": "greater than zero", "soon": "not a number",
                              "nan": "not a finite number", "runn=1": "unknown stage 'runn'",
                              "run=": "a number is missing"}.items():
            with self.subTest(text):
                self.assert_refused(self.run_fake("--deadline", text), 64, f"--deadline '{text}'", problem)

    def test_memory_that_is_refused(self):
        for text in ("0", "-1", "1.5", "much", "17592186044416", "1g"):
            with self.subTest(text):
                self.assert_refused(self.run_fake("--memory", text), 64, f"--memory '{text}'")

    def test_a_memory_that_is_too_small_for_anything_is_refused(self):
        self.assert_refused(self.run_fake("--memory", "1"), 66, f"the plug-in '{WORKING}' cannot be loaded: ")

    def test_as_much_memory_as_there_is(self):
        self.assertEqual(self.run_fake("--memory", "none").returncode, 0)

    def test_no_more_of_the_log_is_kept_than_the_limit_says(self):
        for arguments in ([], ["--in-process"]):
            with self.subTest(arguments):
                record = self.directory / "run.jsonl"
                result = self.run_fake("--log-limit", "1", "--record", record, "--replace", "--log-level", "debug", *arguments)
                self.assertEqual(result.returncode, 0, result.stderr)
                texts = [event["text"] for event in events_in(record) if event["event"] == "log"]
                self.assertEqual(len(texts), 2, texts)
                self.assertRegex(texts[1], r"^[0-9]+ more log lines were left out \(--log-limit\)$")
                self.assertIn(texts[1], result.stderr)
                self.assert_verifies(record)

    def test_log_limits_that_are_refused(self):
        for text in ("0", "-1", "1.5", "many", "1000000001", "5,0", "5,1048577"):
            with self.subTest(text):
                self.assert_refused(self.run_fake("--log-limit", text), 64, "--log-limit: ", "expected an integer from 1 to")

    def test_in_process_and_isolated_runs_report_the_same(self):
        for arguments, code in ((["--set", "measured=3"], 0), (["--set", "minimum=1"], 1),
                                (["--set", "experiment.behaviour=5"], 2), (["--set", "experiment.behaviour=9"], 2)):
            with self.subTest(arguments):
                isolated = self.run_fake("--format", "json", *arguments, names=["Fake.*"])
                here = self.run_fake("--format", "json", "--in-process", *arguments, names=["Fake.*"])
                self.assertEqual((isolated.returncode, here.returncode), (code, code))
                self.assertEqual(without_identity(isolated.stdout), without_identity(here.stdout))

    def test_in_process_all_ends_with_a_crash(self):
        record = self.directory / "run.jsonl"
        result = self.run_unruly(1, "--in-process", "--record", record)
        self.assertEqual(result.returncode, -signal.SIGABRT)
        self.assertEqual(quazor("verify", record).returncode, 3)

    def test_a_plugin_that_cannot_be_loaded_is_told(self):
        text = f"quazor: loading the plug-in '{FATAL}' crashed: its process was terminated by signal 6 (SIGABRT)\n"
        listed = quazor("list", "--plugin", FATAL, "--plugin", WORKING)
        self.assertEqual((listed.returncode, listed.stderr), (66, text))
        self.assertIn("Fake.One", listed.stdout)
        described = quazor("describe", "Fake.One", "--plugin", FATAL, "--plugin", WORKING, "--profile", "none")
        self.assertEqual((described.returncode, described.stderr), (66, text))
        ran = quazor("run", "--all", "--plugin", FATAL, "--phone", self.phone, "--profile", "none")
        self.assertEqual(ran.returncode, 2)

    def test_a_plugin_that_gets_no_process_is_told(self):
        def take_processes():
            resource.setrlimit(resource.RLIMIT_NPROC, (1, 1))
            if os.getuid() == 0:
                os.setuid(UNPRIVILEGED)  # the limit does not apply to root

        self.directory.chmod(0o777)
        try:
            ran = quazor("run", "--all", "--plugin", WORKING, "--phone", self.phone, "--profile", "none", "--format",
                         "json", "--output", self.output, preexec_fn=take_processes)
        except PermissionError:
            self.skipTest("the program is in a directory that only root may read")
        self.assertEqual(ran.returncode, 2, ran.stderr)
        record, = json.loads(self.output.read_text())["diagnostics"]
        self.assertEqual((record["name"], record["error"]["code"]), ("working_plugin.so", 12))

    def test_a_late_log_line_is_not_filed_with_the_next_diagnostic(self):
        """The timeout of the first is reached while the second runs."""
        record = self.directory / "r.jsonl"
        ran = quazor("run", "TesselFaultDiagnostic", "CameraSyncDiagnostic.Back", "--in-process", "--realtime", "--profile",
                     "none", "--set", "frameCount=3", "--set", "timeout=1", "--set", "duration=2", "--record", record)
        self.assertEqual(ran.returncode, 0, ran.stderr)
        events = events_in(record)
        second = next(i for i, one in enumerate(events) if one.get("name") == "CameraSyncDiagnostic.Back")
        texts = [one["text"] for one in events[second:] if one["event"] == "log"]
        self.assertNotEqual(texts, [])
        self.assertNotIn("Timeout has been reached.", texts)

    def test_a_plugin_cannot_end_a_run_without_an_error(self):
        for line in ('{"says":"refused","code":0,"text":"nothing to do"}', '{"says":"registered","registrations":[]}',
                     '{"says":"catalogue","catalogue":[]}\n{"says":"done"}'):
            with self.subTest(line):
                ran = quazor("run", "--all", "--plugin", FATAL, "--phone", self.phone, "--profile", "none", "--format",
                             "json", env={"FATAL_PLUGIN": f"={line}"})
                self.assertEqual(ran.returncode, 2, ran.stderr)
                record, = json.loads(ran.stdout)["diagnostics"]
                self.assertEqual((record["name"], record["error"]["code"]), ("fatal_plugin.so", 9))

    def test_what_a_plugin_prints_is_kept_apart_from_the_report(self):
        result = self.run_unruly(7, "--format", "json")
        self.assertEqual(result.returncode, 0, result.stderr)
        log = [line["text"] for line in json.loads(result.stdout)["diagnostics"][0]["log"]]
        self.assertIn("output: printed", log)
        self.assertIn("output: twice", log)

    def test_a_diagnostic_that_cannot_be_described_does_not_run(self):
        result = self.run_unruly(0, "--format", "json", "--plugin", PLUGINS / "undescribable_plugin.so",
                                 names=["Fatal", "Unruly"])
        self.assertEqual(result.returncode, 2)
        fatal, unruly = json.loads(result.stdout)["diagnostics"]
        self.assertEqual((fatal["error"]["code"], fatal["durations"]["setup"]), (7, None))
        self.assertEqual(unruly["verdict"], "pass")

    def test_it_runs_where_the_ends_of_children_are_ignored(self):
        # A watcher that polls for ends it is not notified of always takes five seconds; a busy machine only sometimes.
        for _ in range(10):
            begin = time.monotonic()
            result = self.run_fake(preexec_fn=lambda: signal.signal(signal.SIGCHLD, signal.SIG_IGN))
            self.assertEqual(result.returncode, 0, result.stdout)
            if time.monotonic() - begin < 4:
                return
        self.fail("every run took four seconds and more")

    def test_it_runs_with_few_descriptors(self):
        result = self.run_fake(preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_NOFILE, (64, 64)))
        self.assertEqual(result.returncode, 0, result.stdout + result.stderr)

    def test_a_missing_standard_descriptor_is_not_taken_by_a_file(self):
        # What cannot be shown on standard output is told by the exit code.
        for descriptor, code in {0: 0, 1: 73, 2: 0}.items():
            with self.subTest(descriptor):
                record = self.directory / f"{descriptor}.jsonl"
                result = self.run_fake("--record", record, preexec_fn=lambda: os.close(descriptor))
                self.assertEqual([event["sequence"] for event in events_in(record)][0], 0)
                self.assert_verifies(record)
                self.assertEqual(result.returncode, code, result.stdout + result.stderr)


class TrustTest(CommandLineTest):
    """Plug-ins that others than the user may change."""

    def setUp(self):
        super().setUp()
        folder = self.directory / "plugins"
        folder.mkdir(0o755)
        self.plugin = folder / "working_plugin.so"
        shutil.copy(WORKING, self.plugin)
        self.plugin.chmod(0o644)

    def run_copy(self, command, *arguments):
        return quazor(*command, "--plugin", self.plugin, *arguments)

    def test_they_are_refused_by_every_command_that_loads_plug_ins(self):
        self.assertEqual(self.run_copy(["list"]).returncode, 0)
        self.plugin.chmod(0o664)
        for command in (["list"], ["describe", "Fake.One"], ["run", "Fake.One"], ["run", "--all", "--in-process"],
                        ["experiment", "--all"], ["selftest"]):
            with self.subTest(command):
                self.assert_refused(self.run_copy(command), 66,
                                    f"the plug-in '{self.plugin}' may be changed by others: its group may write to "
                                    f"'{self.plugin}' (mode 0664); this ends it: chmod g-w '{self.plugin}'")

    def test_the_check_comes_before_the_load(self):
        fatal = self.directory / "plugins/fatal_plugin.so"  # loading it ends the process
        shutil.copy(FATAL, fatal)
        fatal.chmod(0o666)
        result = quazor("list", "--in-process", "--plugin", fatal)
        self.assert_refused(result, 66, "everybody may write to")

    def test_so_are_those_in_a_folder_that_others_may_write(self):
        for mode, refused in ((0o775, True), (0o757, True), (0o1777, False), (0o755, False)):
            with self.subTest(mode):
                self.plugin.parent.chmod(mode)
                result = self.run_copy(["list"])
                if refused:
                    self.assert_refused(result, 66, f"'{self.plugin.parent}' (mode {mode:04o})")
                else:
                    self.assertEqual(result.returncode, 0, result.stderr)

    @unittest.skipUnless(os.geteuid() == 0, "only root can make a file another's")
    def test_so_are_those_of_another_user(self):
        os.chown(self.plugin, 54321, 54321)
        self.assert_refused(self.run_copy(["list"]), 66, f"'{self.plugin}' belongs to user 54321, who is neither root")

    def test_the_doctor_tells_it(self):
        self.plugin.chmod(0o666)
        result = self.run_copy(["doctor"])
        self.assertEqual(result.returncode, 66)
        self.assertIn("problem  file: it may be changed by others: everybody may write to", result.stdout)


if __name__ == "__main__":
    unittest.main()
