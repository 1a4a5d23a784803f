"""Where a record is made, and what happens to one that is there already."""

import datetime
import json
import os
import re
import stat
import subprocess
import unittest

from command_line_fixture import PROGRAM, WORKING, RecordTest, analyze, events_in, quazor, start

MANY = 50
NAME = re.compile(r"([0-9]{8}T[0-9]{6}Z)-([0-9a-f]{32})\.jsonl")
WAY_OUT = "it exists already; replace it with --replace, or give each record a name of its own with --record DIR/"


def told(result):
    """The last line of standard error."""
    return result.stderr.splitlines()[-1]


class ExclusiveTest(RecordTest):
    def test_a_record_that_is_there_is_refused_and_nothing_is_touched(self):
        state = {"XDG_STATE_HOME": str(self.directory / "state")}
        self.recorded(env=state)
        last = self.directory / "state/quazor/last_run.jsonl"
        (self.directory / "link").symlink_to("run.jsonl")
        (self.directory / "dangling").symlink_to("nowhere")
        text = self.write("notes.txt", "precious")
        before = {file: file.read_bytes() for file in (self.record, last, text)}
        for file in (self.record, self.directory / "link", self.directory / "dangling", text):
            with self.subTest(file.name):
                result = self.run_fake("--record", file, "--output", self.output, env=state)
                self.assert_refused(result, 73, f"the record '{file}' cannot be written: {WAY_OUT}")
                self.assertEqual({file: file.read_bytes() for file in before}, before)
        self.assertFalse((self.directory / "nowhere").exists())

    def test_a_record_cut_off_is_not_replaced_either(self):
        self.recorded()
        cut = self.write("cut.jsonl", self.record.read_text()[:-20])
        self.assert_refused(self.run_fake("--record", cut), 73, WAY_OUT)

    def test_all_commands_that_record(self):
        self.recorded("--set", "measured=90")
        other = self.write("other.jsonl", "precious")
        self.assert_refused(analyze(self.record, "--record", other), 73, WAY_OUT)
        result = quazor("experiment", "FakeExperiment", "--plugin", WORKING, "--profile", "none", "--set", "duration=1",
                        "--phone", self.phone, "--record", other)
        self.assert_refused(result, 73, WAY_OUT)
        self.assertEqual(self.run_fake(env={"XDG_STATE_HOME": str(self.directory)}).returncode, 0)
        result = quazor("run", "--only", "failed", "--record", other, env={"XDG_STATE_HOME": str(self.directory)})
        self.assert_refused(result, 73, WAY_OUT)
        self.assertEqual(other.read_text(), "precious")

    def test_of_many_that_start_at_once_one_records(self):
        """Each waits for the end of a pipe, so that all start together."""
        for option, file in (((), self.directory / "one.jsonl"), (("--in-process",), self.directory / "other.jsonl")):
            with self.subTest(option):
                gate, release = os.pipe()
                runs = [subprocess.Popen(
                    ["sh", "-c", 'read -r nothing; exec "$@"', "sh", PROGRAM, "run", "Fake.One", "--plugin", WORKING,
                     "--phone", str(self.phone), "--profile", "none", "--set", "duration=1", "--record", str(file),
                     *option, "--tag", f"number={number}"],
                    stdin=gate, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True) for number in range(MANY)]
                os.close(gate)
                os.close(release)
                ends = [(*run.communicate(timeout=300), run.returncode) for run in runs]
                winners = [number for number, (_, _, code) in enumerate(ends) if code == 0]
                self.assertEqual(len(winners), 1, ends)
                for number, (out, err, code) in enumerate(ends):
                    if number != winners[0]:
                        self.assertEqual((out, code), ("", 73), err)
                        self.assertRegex(err, f"the record '{file}' cannot be written: (it exists already|another process)")
                self.assertEqual(events_in(file)[0]["tags"], [["number", str(winners[0])]])
                self.assert_verifies(file)

    def test_what_is_no_regular_file_is_written_as_it_is(self):
        self.assertEqual(self.run_fake("--record", "/dev/null").returncode, 0)
        out = self.write("out", "")
        with open(out, "a", encoding="utf-8") as stream:
            result = self.run_fake("--record", "/dev/stdout", "--output", self.output, stdout=stream)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertIn('{"sequence":0,', out.read_text())
        pipe = self.directory / "pipe"
        os.mkfifo(pipe)
        with subprocess.Popen(["cat", pipe], stdout=subprocess.PIPE, text=True) as reader:
            self.assertEqual(self.run_fake("--record", pipe).returncode, 0)
            lines = reader.communicate()[0].splitlines()
        self.assertEqual(json.loads(lines[-1])["event"], "runEnded")


class ReplaceTest(RecordTest):
    def test_it_replaces_the_record(self):
        before = events_in(self.recorded())[0]["id"]
        self.record.chmod(0o640)
        after = events_in(self.recorded())[0]["id"]
        self.assertNotEqual(before, after)
        self.assertEqual(stat.S_IMODE(self.record.stat().st_mode), 0o640)
        self.assert_verifies(self.record)
        self.assertEqual(events_in(self.recorded(record=self.directory / "new.jsonl"))[0]["sequence"], 0)

    def test_the_old_record_is_kept_if_the_run_cannot_begin(self):
        self.recorded()
        before = self.record.read_bytes()
        file = self.write("file", "")
        missing = self.directory / "missing.json"
        rows = [(["--set", "bogus=1"], 64), (["--parameters", missing], 66), (["--output", file / "report"], 73)]
        for arguments, code in rows:
            with self.subTest(arguments):
                self.assert_refused(self.run_fake("--record", self.record, "--replace", *arguments), code)
                self.assertEqual(self.record.read_bytes(), before)
        self.phone.write_text("no scenario")
        for arguments in ([], ["--in-process"]):
            with self.subTest(arguments):
                self.assert_refused(self.run_fake("--record", self.record, "--replace", *arguments), 66, str(self.phone))
                self.assertEqual(self.record.read_bytes(), before)

    def test_the_old_record_is_kept_if_the_first_line_cannot_be_written(self):
        self.recorded()
        before = self.record.read_bytes()
        shell = ["sh", "-c", 'ulimit -f 0; exec "$@"', "sh", PROGRAM, "run", "Fake.One", "--plugin", WORKING, "--phone",
                 self.phone, "--profile", "none", "--set", "duration=1", "--record", self.record, "--replace"]
        result = subprocess.run([str(word) for word in shell], capture_output=True, text=True, check=False, timeout=120)
        self.assert_refused(result, 73, f"the record '{self.record}' cannot be written: File too large")
        self.assertEqual(self.record.read_bytes(), before)

    def test_it_needs_a_record(self):
        self.assert_refused(self.run_fake("--replace"), 64, "--replace requires --record")
        self.assert_refused(analyze(self.recorded(), "--replace"), 64, "--replace requires --record")


class FolderTest(RecordTest):
    def only_record_in(self, folder):
        files = list(folder.iterdir())
        self.assertEqual(len(files), 1, files)
        return files[0]

    def test_a_record_gets_a_name_of_its_own(self):
        (self.directory / "there").mkdir()
        (self.directory / "link").symlink_to("there")
        for given, folder in (("new/", "new"), ("deep/er/", "deep/er"), ("there", "there")):
            with self.subTest(given):
                result = self.run_fake("--record", given, cwd=self.directory)
                self.assertEqual(result.returncode, 0, result.stderr)
                record = self.only_record_in(self.directory / folder)
                self.assertEqual(told(result), f"Recorded in {folder}/{record.name}")
                began = events_in(record)[0]
                date, identifier = NAME.fullmatch(record.name).groups()
                self.assertEqual(identifier, began["id"])
                self.assertEqual(datetime.datetime.strptime(date, "%Y%m%dT%H%M%SZ"),
                                 datetime.datetime.strptime(began["date"][:19], "%Y-%m-%dT%H:%M:%S"))
                self.assert_verifies(record)
        for _ in range(3):
            self.assertEqual(self.run_fake("--record", self.directory / "link").returncode, 0)
        self.assertEqual(len(list((self.directory / "there").iterdir())), 4)

    def test_an_analysis_too(self):
        self.recorded("--set", "measured=90")
        result = analyze(self.record, "--record", f"{self.directory}/again/")
        record = self.only_record_in(self.directory / "again")
        self.assertEqual(told(result), f"Recorded in {record}")
        self.assert_verifies(record)

    def test_where_one_record_is_to_be_read_a_folder_lists_its_last_records(self):
        folder = self.directory / "records"
        (folder / "sub").mkdir(parents=True)
        other = self.recorded()
        commands = (["analyze", folder, "--plugin", WORKING], ["diff", folder, other], ["diff", other, folder],
                    ["run", "--only", "failed", "--of", folder])
        empty = f"the folder '{folder}' contains no record: no file in it ends in .jsonl\n"
        for command in commands:
            with self.subTest(command):
                self.assert_refused(quazor(*command), 66, empty)
        for name in ("1.jsonl", "2.jsonl", "sub/3.jsonl", "4.jsonl", "5.jsonl"):
            (folder / name).write_bytes(other.read_bytes())
        listed = ", ".join(str(folder / name) for name in ("sub/3.jsonl", "5.jsonl", "4.jsonl"))
        for command in commands:
            with self.subTest(command):
                self.assert_refused(quazor(*command), 66, f"the folder '{folder}' is not a record; name one of the records "
                                    f"in it: {listed} and 2 more\n")

    def test_a_named_record_is_not_told(self):
        self.assertNotIn("Recorded", self.run_fake("--record", self.record).stderr)

    def test_an_interrupted_run_tells_it_too(self):
        process = start("run", "Fake.One", "--plugin", WORKING, "--phone", self.phone, "--profile", "none", "--realtime",
                        "--set", "duration=60", "--grace", "0.1", "--record", f"{self.directory}/records/")
        while not list(self.directory.glob("records/*.jsonl")):
            self.assertIsNone(process.poll())
        while "stageBegan" not in self.only_record_in(self.directory / "records").read_text():
            self.assertIsNone(process.poll())
        process.send_signal(2)
        err = process.communicate(timeout=120)[1]
        self.assertEqual(process.returncode, 130, err)
        self.assertIn(f"Recorded in {self.only_record_in(self.directory / 'records')}\n", err)

    def test_a_refused_run_makes_no_folder(self):
        self.assert_refused(self.run_fake("--record", f"{self.directory}/new/", "--set", "bogus=1"), 64)
        self.assert_refused(self.run_fake("--record", f"{self.directory}/new/", "--output", f"{self.directory}/new"), 64,
                            "would be written twice")
        self.assertFalse((self.directory / "new").exists())

    def test_folders_that_cannot_be_made(self):
        self.assert_refused(self.run_fake("--record", f"{self.phone}/"), 73,
                            f"the folder '{self.phone}/' of records cannot be made: ")
        self.assert_refused(self.run_fake("--record", f"{self.phone}/deeper/"), 73, "Not a directory")


if __name__ == "__main__":
    unittest.main()
