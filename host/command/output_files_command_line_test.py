"""Files of a run: outputs that would overwrite what it reads, a record that another host is writing, names of formats."""

import fcntl
import json
import os
import pathlib
import resource
import subprocess
import unittest

from command_line_fixture import PROGRAM, WORKING, CommandLineTest, quazor

PLUGIN = ("--plugin", WORKING)


class OutputFilesTest(CommandLineTest):
    """Outputs that name an input of the same run."""

    def assert_untouched(self, file, result):
        self.assert_refused(result, 64, "is an input of this run and would be overwritten")
        self.assertEqual(file.read_bytes(), self.before[file])

    def setUp(self):
        super().setUp()
        self.record = self.directory / "run.jsonl"
        self.assertEqual(self.run_fake("--record", self.record).returncode, 0)
        self.before = {file: file.read_bytes() for file in (self.record, self.phone)}

    def test_the_record_that_is_analyzed(self):
        symbolic, hard = self.directory / "symbolic", self.directory / "hard"
        symbolic.symlink_to(self.record)
        hard.hardlink_to(self.record)
        for name in (self.record, symbolic, hard, f"{self.directory}/./run.jsonl"):
            for option in (["--record", name], ["--output", name], ["--output", f"json:{name}"]):
                with self.subTest(option):
                    self.assert_untouched(self.record, quazor("analyze", self.record, *PLUGIN, *option))
                    self.assert_untouched(self.record, quazor("run", "--only", "failed", "--of", self.record, *PLUGIN, *option))
        self.assert_untouched(self.record, quazor("analyze", hard, *PLUGIN, "--record", symbolic))

    def test_a_report_never_replaces_a_record(self):
        old = self.record.read_bytes()
        for command in (("run", "Fake.One", "--phone", self.phone, "--profile", "none", "--set", "duration=1"),
                        ("list",)):
            for option in (("--output", self.record), ("--format", "json", "--output", self.record)):
                with self.subTest(command=command, option=option):
                    self.assert_refused(quazor(*command, *PLUGIN, *option), 73,
                                        f"the file '{self.record}' is a record, which a report would replace; choose "
                                        "another file for the report, or remove the record first")
                    self.assertEqual(self.record.read_bytes(), old)
        self.assert_refused(self.run_fake("--output", f"ocp:{self.record}"), 73, "is a record")
        ocp = self.directory / "ocp.jsonl"
        for _ in range(2):  # a report is replaced
            self.assertEqual(self.run_fake("--output", f"ocp:{ocp}").returncode, 0)

    def test_the_phone_the_profile_the_parameters_and_the_plug_in(self):
        profile = self.write("profile.json", '{"schema": 1, "entries": []}')
        parameters = self.write("parameters.json", "{}")
        plugin = self.directory / "plugin.so"
        plugin.write_bytes(pathlib.Path(WORKING).read_bytes())
        for file in (self.phone, profile, parameters, plugin):
            before = file.read_bytes()
            for option in ("--record", "--output"):
                with self.subTest([option, file]):
                    result = quazor("run", "Fake.One", "--plugin", plugin, "--phone", self.phone, "--profile",
                                    profile if file == profile else "none", "--set", "duration=1",
                                    *(["--parameters", parameters] if file == parameters else []), option, file)
                    self.assertIn(result.returncode, (64, 66), result.stdout)
                    self.assertEqual(file.read_bytes(), before)

    def test_the_bases_of_the_profiles_and_of_the_phone_and_the_explanations(self):
        def based(name, kind, base, **more):
            file = self.directory / "quazor" / kind / name
            file.parent.mkdir(parents=True, exist_ok=True)
            file.write_text(json.dumps({**({"base": base} if base else {}), **more}))
            self.before[file] = file.read_bytes()
            return file

        empty = {"schema": 1, "diagnostics": {}}
        profiles = [based("low.json", "profiles", None, **empty), based("middle.json", "profiles", "low", **empty),
                    based("top.json", "profiles", "middle.json", **empty)]
        phones = [based("low.json", "scenarios", str(self.phone), title="Low"),
                  based("middle.json", "scenarios", "low", title="Middle"),
                  based("top.json", "scenarios", "middle.json", title="Top")]
        explanation = {"names": ["Fake.One"], "kind": "diagnostic", "title": "A", "meaning": "B.", "causes": ["C."], "next": ["D."]}
        files = [self.phone, *profiles, *phones, based("fake.json", "explanations", None, schema=1, names=[explanation])]
        own = {"XDG_DATA_HOME": str(self.directory)}
        run = ("run", "Fake.One", *PLUGIN, "--phone", "top", "--set", "duration=1")
        for file in files:
            for option in (["--output", file], ["--output", f"json:{file}"], ["--record", file, "--replace"]):
                with self.subTest(option):
                    self.assert_untouched(file, quazor(*run, "--profile", "top", *option, env=own))
                    self.assert_untouched(file, quazor(*run, "--profile", "none", "--parameters", "top", *option, env=own)
                                          if file in profiles else quazor(*run, *option, env=own))
        for file in (profiles[0], files[-1]):
            analyze = ("analyze", self.record, *PLUGIN, "--profile", "top", "--output", file)
            self.assert_untouched(file, quazor(*analyze, env=own))
        result = quazor(*run, "--profile", "top", "--output", f"json:{self.output}", env=own)
        self.assertEqual(result.returncode, 0, result.stderr)

    def test_the_record_of_the_last_run(self):
        state = {"XDG_STATE_HOME": str(self.directory / "state")}
        self.assertEqual(self.run_fake(env=state).returncode, 0)
        last = self.directory / "state/quazor/last_run.jsonl"
        self.before[last] = last.read_bytes()
        self.assert_untouched(last, self.run_fake("--record", last, env=state))
        self.assert_untouched(last, self.run_fake("--output", f"json:{last}", env=state))

    def test_what_a_killed_host_left_behind_is_removed(self):
        left = [self.directory / f".{name}.quazor-1.tmp" for name in ("run.jsonl", "out.json")]
        for file in left:
            file.write_text("half a")
        result = self.run_fake("--record", self.record, "--replace", "--format", "json", "--output", self.output)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual([file for file in left if file.exists()], [])

    def test_a_link_where_the_record_of_the_last_run_belongs_is_not_followed(self):
        precious = self.write("precious", "precious")
        state = self.directory / "state/quazor"
        state.mkdir(parents=True)
        last = state / "last_run.jsonl"
        last.symlink_to(precious)
        result = self.run_fake(env={"XDG_STATE_HOME": str(state.parent)})
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual(precious.read_text(), "precious")
        self.assertFalse(last.is_symlink())
        self.assert_verifies(last)

    def test_standard_output_as_a_file(self):
        for name in ("/dev/stdout", "/dev/fd/1", "/proc/self/fd/1"):
            with self.subTest(name):
                out = self.write("out.txt", "before\n")
                with open(out, "a", encoding="utf-8") as stream:
                    result = self.run_fake("--format", "json", "--output", name, stdout=stream)
                self.assertEqual(result.returncode, 0, result.stderr)
                text = out.read_text()
                self.assertTrue(text.startswith("before\n"), text)
                self.assertIn("Fake.One", text[:text.index("{")])  # the verdict
                self.assertEqual(json.loads(text[text.index("{"):])["diagnostics"][0]["name"], "Fake.One")

    def test_a_limit_on_file_sizes_is_an_error_of_every_output(self):
        """SIGXFSZ ends no command: each says which file it could not write, and exits with 73."""
        def limited():
            resource.setrlimit(resource.RLIMIT_FSIZE, (10, 10))

        run = ["run", "Fake.One", *PLUGIN, "--phone", self.phone, "--profile", "none", "--set", "duration=1"]
        out = self.directory / "out"
        rows = {form: [*run, "--output", f"{form}:{out}"] for form in ("text", "json", "csv", "junit", "ocp")}
        rows |= {
            "record": [*run, "--record", out],
            "list": ["list", *PLUGIN, "--format", "json", "--output", out],
            "describe": ["describe", "Fake.One", *PLUGIN, "--profile", "none", "--output", out],
            "explain": ["explain", "QuazorHostErrorDomain:6", "--output", out],
            "analyze": ["analyze", self.record, *PLUGIN, "--format", "json", "--output", out],
        }
        for name, arguments in rows.items():
            with self.subTest(name):
                out.unlink(missing_ok=True)
                result = quazor(*arguments, preexec_fn=limited)
                self.assertEqual(result.returncode, 73, result.stderr)
                self.assertIn(f"{out}' cannot be written: File too large", result.stderr)
                self.assertEqual(list(self.directory.glob(".*.tmp")), [], "nothing half-written is left")
        for arguments in (run, ["list"], ["describe", "Fake.One", *PLUGIN, "--profile", "none"], ["--help"],
                          ["explain", "QuazorHostErrorDomain:6"], ["completion", "bash"]):
            with self.subTest(arguments), open(out, "w", encoding="utf-8") as stream:
                result = quazor(*arguments, stdout=stream, preexec_fn=limited)
                self.assertEqual(result.returncode, 73, result.stderr)
                self.assertIn("quazor: standard output cannot be written", result.stderr)
        last = self.directory / "state"
        result = quazor(*run, preexec_fn=limited, env={"XDG_STATE_HOME": str(last)})
        self.assertEqual(result.returncode, 0, "nobody asked for the record of the last run")
        self.assertEqual(list((last / "quazor").glob(".*.tmp")), [])

    def test_a_working_folder_that_was_deleted(self):
        folder = self.directory / "deleted"
        deleted = ["sh", "-c", 'cd "$0" && rmdir "$0" && exec "$@"', folder, PROGRAM]
        for arguments, code, text in (
                (["run", "Fake.One", *PLUGIN, "--phone", self.phone, "--profile", "none", "--set", "duration=1"], 0, ""),
                (["list"], 0, ""),
                (["list", "--plugin", "x.so"], 66, "the plug-in 'x.so' does not exist"),
                (["run", "--all", "--phone", "phone.json"], 66, "phone.json"),
                (["run", "--all", "--output", "out"], 73, "the output file 'out' cannot be written: No such file"),
                (["run", "--all", "--record", "run"], 73, "the record 'run' cannot be written: No such file"),
                (["run", "--all", "--record", "a", "--output", "b"], 73, "cannot be written: No such file"),
                (["verify", "run"], 66, "the record 'run' cannot be read: No such file")):
            with self.subTest(arguments):
                folder.mkdir()
                result = subprocess.run([*deleted, *arguments], capture_output=True, text=True, check=False, timeout=120)
                self.assertEqual(result.returncode, code, result.stderr)
                self.assertIn(text, result.stderr)

    def test_texts_on_a_full_disk(self):
        for arguments in (["--help"], ["run", "--help"], ["--version"], ["list"], ["doctor"], ["explain"],
                          ["completion", "bash"], ["__complete", "ru"], ["verify", self.record]):
            with self.subTest(arguments), open("/dev/full", "w", encoding="utf-8") as full:
                result = quazor(*arguments, stdout=full)
                self.assertEqual(result.returncode, 73, result.stderr)
                self.assertEqual(result.stderr, "quazor: standard output cannot be written\n")

    def test_a_record_that_another_host_is_writing(self):
        with open(self.record, "rb") as busy:
            fcntl.flock(busy, fcntl.LOCK_EX)
            for option, why in (("--replace", "another process is writing it"), ("--in-process", "it exists already")):
                self.assert_refused(self.run_fake("--record", self.record, option), 73, why)
            self.assertEqual(self.record.read_bytes(), self.before[self.record])
        self.assertEqual(self.run_fake("--record", self.record, "--replace").returncode, 0)

    def test_a_standard_output_that_nobody_reads_any_more(self):
        report = self.directory / "report.json"
        for arguments in ([], ["--verbose"], ["--format", "csv"], ["--in-process"]):
            with self.subTest(arguments):
                read, write = os.pipe()
                os.close(read)
                result = self.run_fake("--output", f"json:{report}", *arguments, names=["Fake.*"], stdout=write)
                os.close(write)
                self.assertEqual(result.returncode, 73, result.stderr)
                self.assertIn("quazor: standard output cannot be written\n", result.stderr)
                names = [one["name"] for one in json.loads(report.read_text())["diagnostics"]]
                self.assertEqual(names, ["Fake.One", "Fake.Two"])
                report.unlink()

    def test_a_format_that_is_none(self):
        result = self.run_fake("--output", "xml:report", cwd=self.directory)
        self.assert_refused(result, 64, "unknown format 'xml' (for a file of this name, write './xml:report')")
        result = self.run_fake("--output", "jnuit:report", cwd=self.directory)
        self.assert_refused(result, 64, "'./jnuit:report'); did you mean 'junit'?")
        result = self.run_fake("--output", "./xml:report", cwd=self.directory)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertIn("Fake.One", pathlib.Path(self.directory / "xml:report").read_text())

    @staticmethod
    def told(result):
        """The lines on standard error that are not of the log."""
        return [line for line in result.stderr.splitlines() if line.startswith("quazor: ")]

    def test_a_format_behind_the_file(self):
        for swapped in ("report.pdf:junit", "report:json", "a:b:csv"):
            file, form = swapped.rsplit(":", 1)
            with self.subTest(swapped):
                result = self.run_fake("--output", swapped, cwd=self.directory)
                self.assert_refused(result, 64, f"--output '{swapped}': the format comes first, as in --output {form}:{file} "
                                    f"(for a file of this name, write 'text:{swapped}')")
        for meant, name in (("./x:junit", "x:junit"), ("text:y:junit", "y:junit"), (":json", ":json")):
            with self.subTest(meant):
                result = self.run_fake("--output", meant, cwd=self.directory)
                self.assertEqual((result.returncode, self.told(result)), (0, []))
                self.assertIn("Fake.One", pathlib.Path(self.directory / name).read_text())

    def test_a_suffix_that_contradicts_the_format_is_a_warning(self):
        for output, form, suggested in (("junit:r.json", "junit", "json"), ("json:r.xml", "json", "junit"),
                                        ("r.JSON", "text", "json"), ("csv:r.txt", "csv", "text")):
            with self.subTest(output):
                file = output.split(":")[-1]
                result = self.run_fake("--output", output, cwd=self.directory)
                self.assertEqual(result.returncode, 0, result.stderr)
                self.assertEqual(self.told(result), [
                    f"quazor: the {form} report goes to '{file}', whose suffix suggests {suggested}; for that, use "
                    f"--output {suggested}:{file}"])
                self.assertTrue((self.directory / file).exists())
        result = self.run_fake("--output", "json:r.jsonl", cwd=self.directory)
        self.assertEqual(self.told(result), [
            "quazor: the json report goes to 'r.jsonl', whose suffix suggests a record or ocp; for that, use --record "
            "r.jsonl or --output ocp:r.jsonl"])
        for output in ("junit:r.xml", "json:r.json", "ocp:r.jsonl", "ocp:r.json", "trace:r.json", "r.txt", "r.log", "csv:r.csv", "junit:r.pdf", "r"):
            with self.subTest(output):
                result = self.run_fake("--output", output, cwd=self.directory)
                self.assertEqual((result.returncode, self.told(result)), (0, []))

    def test_a_suffix_for_a_command_with_two_formats(self):
        warning = "quazor: the text report goes to 'l.json', whose suffix suggests json; for that, use --format json\n"
        result = quazor("list", *PLUGIN, "--output", "l.json", cwd=self.directory)
        self.assertEqual((result.returncode, result.stderr), (0, warning))
        result = quazor("list", *PLUGIN, "--format", "json", "--output", "l.json", cwd=self.directory)
        self.assertEqual((result.returncode, result.stderr), (0, ""))
        result = quazor("phone", "probe", "--output", "board.json", cwd=self.directory)
        self.assertEqual((result.returncode, result.stderr), (0, ""))


if __name__ == "__main__":
    unittest.main()
