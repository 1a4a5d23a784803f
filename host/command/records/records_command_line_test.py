"""quazor records: the import, the lists and the marks. figures_command_line_test.py has the figures."""

import json
import resource
import signal
import sqlite3
import subprocess
import unittest

from command_line_fixture import PROGRAM, RecordTest, quazor, start
from records_fixture import DIAGNOSTIC, StoreTest, day, record_lines, result


class ImportTest(StoreTest):
    def test_what_is_there_is_known(self):
        for number in range(3):
            self.make([result("Offset", number / 8, -1, 1)], serial=f"P{number}")
        self.imported(imported=3)
        before = self.content()
        self.imported(known=3)
        self.assertEqual(self.content(), before)
        copy = self.directory / "copy.jsonl"
        copy.write_bytes((self.folder / "00001.jsonl").read_bytes())
        self.assertIn("1 record: 0 imported, 1 known\n", self.records("import", copy).stdout)
        self.records("check")

    def test_a_wrong_verdict_is_refused(self):
        right = self.make([result("Offset", 0.5, -1, 1)])
        lies = record_lines([result("Offset", 5, -1, 1)])
        lies[-2] = lies[-2].replace('"fail"', '"pass"')
        (self.folder / "lies.jsonl").write_text("".join(lies))
        (self.folder / "text.jsonl").write_text("no record\n")
        (self.folder / "empty.jsonl").write_text("")
        done = self.records("import", self.folder, code=66)
        self.assertEqual(done.stdout, "4 records: 1 imported, 2 refused as wrong, 1 unreadable\n")
        self.assertIn("lies.jsonl: ", done.stderr)
        self.assertEqual([row["file"] for row in self.rows("list")], [str(right)])
        (self.folder / "empty.jsonl").unlink()
        self.records("import", self.folder, code=1)

    def test_half_a_record_is_counted_in_no_rate_and_replaced_by_the_whole(self):
        lines = record_lines([result("Offset", 5, -1, 1)], serial="P", station="S")
        file = self.folder / "run.jsonl"
        for end in (3, 5):
            file.write_text("".join(lines[:end]) + lines[end][:10])
            self.imported(incomplete=1)
        self.assertEqual([(row["verdict"], row["serial"]) for row in self.rows("list")], [("not whole", "P")])
        self.assertEqual(self.rows("yield")[-1]["runs"], 0)
        self.assertEqual(self.rows("failures"), [])
        file.write_text("".join(lines))
        self.imported(imported=1)
        self.assertEqual([row["verdict"] for row in self.rows("list")], ["fail"])
        self.assertEqual(self.rows("failures")[0]["failed"], 1)
        file.write_text("".join(lines[:4]))
        self.imported(known=1)
        self.records("check")

    def test_another_record_of_the_same_run_is_refused(self):
        self.make([result("Offset", 0.5, -1, 1)], id="0" * 32)
        self.make([result("Offset", 0.25, -1, 1)], id="0" * 32)
        done = self.records("import", self.folder, code=1)
        self.assertIn("the store has another record of this run", done.stderr)

    def test_a_limit_that_changes_is_a_new_characteristic(self):
        for upper in (1, 1, 2):
            self.make([result("Offset", 0.5, -1, upper), result("Free", 3)], serial="P")
        self.imported(imported=3)
        rows = self.rows("capability", "--result", "Offset")
        self.assertEqual([(row["limit"], row["runs"]) for row in rows], [("[-1, 1]", 2), ("[-1, 2]", 1)])
        self.assertEqual([row["runs"] for row in self.rows("capability", "--result", "Free")], [3])

    def test_runs_that_do_not_count(self):
        self.make([result("Offset", 5, -1, 1)], serial="P", analyzed={"id": "1" * 32, "date": f"{day(0)}T00:00:00.000000000Z",
                                                                     "host": "h"})
        interrupted = record_lines([result("Offset", 5, -1, 1)], serial="P")
        interrupted[-1] = interrupted[-1].replace('"event": "runEnded"', '"event": "runEnded", "interrupted": ""')
        (self.folder / "interrupted.jsonl").write_text("".join(interrupted))
        self.imported(imported=1, incomplete=1)
        self.assertEqual(self.rows("failures"), [])
        self.assertEqual(self.rows("yield"), [dict(self.rows("yield")[0], runs=0, passed=0, failed=0, neither=0)])

    def test_a_newer_store_is_refused(self):
        self.make([result("Offset", 0.5, -1, 1)])
        self.imported(imported=1)
        database = sqlite3.connect(self.store)
        database.execute("PRAGMA user_version = 2")
        database.close()
        for arguments in (["import", self.folder], ["list"], ["check"]):
            done = self.records(*arguments, code=66)
            self.assertIn("it has layout 2, and this quazor knows layouts up to 1; use a newer quazor", done.stderr)

    def test_what_is_no_store_is_refused_and_stays(self):
        self.make([result("Offset", 0.5, -1, 1)])
        self.store.parent.mkdir()
        database = sqlite3.connect(self.store)
        database.execute("CREATE TABLE precious(x)")
        database.commit()
        database.close()
        for content in (self.store.read_bytes(), b"This is a text, and not a database at all." * 99):
            self.store.write_bytes(content)
            for arguments in (["import", self.folder], ["list"]):
                self.records(*arguments, code=66)
            self.assertEqual(self.store.read_bytes(), content)
        self.store.unlink()
        self.assertIn("there is no store", self.records("list", code=66).stderr)
        self.assertFalse(self.store.exists())

    def test_a_full_disk_leaves_the_store_as_it_was(self):
        self.make([result("Offset", 0.5, -1, 1)])
        self.imported(imported=1)
        before = self.content()
        for number in range(150):
            self.make([result(f"Offset {number}.{one}", 0.5, -1, 1) for one in range(8)])
        limit = self.store.stat().st_size + 8192
        done = subprocess.run([PROGRAM, "records", "import", str(self.folder), "--store", str(self.store)],
                              capture_output=True, text=True, check=False, timeout=120,
                              preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (limit, limit)))
        self.assertEqual(done.returncode, 73, done.stderr)
        self.assertIn("cannot be written", done.stderr)
        self.assertEqual(self.content(), before)
        self.imported(known=1, imported=150)

    def test_two_at_once_wait_for_each_other(self):
        for number in range(300):
            self.make([result("Offset", number / 7, -1, 1)])
        imports = [start("records", "import", self.folder, "--store", self.store) for _ in range(2)]
        for one in imports:
            out, err = one.communicate(timeout=120)
            self.assertEqual(one.returncode, 0, out + err)
        both = self.content()
        self.store.unlink()
        self.imported(imported=300)
        self.assertEqual(self.content(), both)

    def test_a_kill_leaves_whole_batches(self):
        """tests/kill_imports.py does this a number of times."""
        for number in range(450):
            self.make([result("Offset", number / 7, -1, 1)])
        for wait in (0.02, 0.1):
            with subprocess.Popen([PROGRAM, "records", "import", str(self.folder), "--store", str(self.store)],
                                  stdout=subprocess.DEVNULL) as one:
                try:
                    one.wait(timeout=wait)
                except subprocess.TimeoutExpired:
                    one.send_signal(signal.SIGKILL)
        self.records("import", self.folder)
        repeated = self.content()
        self.records("check")
        self.store.unlink()
        self.imported(imported=450)
        self.assertEqual(self.content(), repeated)


class CheckTest(StoreTest):
    def test_a_summary_that_lies_is_found(self):
        for number in range(3):
            self.make([result("Offset", number / 8, -1, 1)], station="S")
        self.imported(imported=3)
        self.assertEqual(self.records("check").stdout, "The summary agrees with the results.\n")
        for lie, problem in (("UPDATE summary SET mean = mean + 1e-6", "the summary differs from the results"),
                             ("UPDATE summary SET failed = failed + 1", "the summary differs from the results"),
                             ("DELETE FROM summary", "the summary lacks"),
                             ("DELETE FROM result", "the summary has results that are missing")):
            with self.subTest(lie):
                content = self.store.read_bytes()
                database = sqlite3.connect(self.store)
                database.execute(lie)
                database.commit()
                database.close()
                self.assertIn(problem, self.records("check", code=1).stdout)
                self.store.write_bytes(content)


class ListTest(StoreTest):
    def test_filters(self):
        for number, (serial, station) in enumerate((("A", "S1"), ("B", "S1"), ("A", "S2"), ("", ""))):
            self.make([result("Offset", 0.5, -1, 1)], serial=serial, station=station, on=number)
        self.imported(imported=4)
        for arguments, expected in (((), [3, 2, 1, 0]), (("--since", day(2)), [3, 2]), (("--until", day(0)), [0]),
                                    (("--station", "S1"), [1, 0]), (("--station", ""), [3]), (("--serial", "A"), [2, 0]),
                                    (("--since", day(1), "--until", day(2), "--serial", "A"), [2])):
            with self.subTest(arguments):
                self.assertEqual([row["date"][:10] for row in self.rows("list", *arguments)], [day(one) for one in expected])

    def test_show(self):
        self.make([result("Offset", 0.5, -1, 1)], serial="A", id="ab" * 16)
        self.make([], error=True, id="ac" * 16)
        self.imported(imported=2)
        for name in ("1", "ab", "ab" * 16):
            self.assertIn({"fact": "tag serial", "value": "A"}, self.rows("show", name, table="run"))
        self.assertEqual(self.rows("show", "1", table="results"),
                         [{"diagnostic": DIAGNOSTIC, "result": "Offset", "value": 0.5, "unit": "mm", "limit": "[-1, 1]",
                           "verdict": "pass"}])
        self.assertEqual(self.rows("show", "ac", table="diagnostics")[0]["message"],
                         "The operation failed (Made error 7).")
        self.records("show", "a", code=64)
        self.records("show", "99", code=64)

    def test_csv(self):
        self.make([result("Offset", 0.5, -1, 1)], serial="=A,1")
        self.imported(imported=1)
        header, row = self.records("list", "--format", "csv").stdout.splitlines()
        self.assertEqual(header, "number,date,verdict,kind,station,serial,host,run,file")
        self.assertIn("A,1\"", row)


class UsageTest(StoreTest):
    def test_what_does_not_apply(self):
        for arguments, text in ((["import"], "takes records, or folders of them"),
                                (["import", "a", "--since", day(0)], "--since does not apply to 'quazor records import'"),
                                (["yield", "--result", "A"], "--result does not apply to 'quazor records yield'"),
                                (["list", "a"], "'a': 'quazor records list' takes no file"),
                                (["show"], "takes the number of one run"), (["gauge"], "requires --result"),
                                (["mark", "--repaired"], "requires --serial"), (["mark", "--serial", "A"], "requires --repaired"),
                                (["list", "--note", "x"], "--note does not apply"),
                                (["list", "--since", "Monday"], "--since 'Monday' is no day, such as 2026-11-21"),
                                (["list", "--since", "2026-02-30"], "is no day"),
                                (["list", "--since", day(1), "--until", day(0)], "--until is before --since"),
                                (["flaky", "--by", "lot"], "--by does not apply to 'quazor records flaky'"),
                                (["yield", "--by", ""], "--by is empty"),
                                (["flaky", "--result", ""], "--result is empty")):
            with self.subTest(arguments):
                self.assert_refused(quazor("records", *arguments), 64, text)
        self.assertEqual(quazor("records", "dance").returncode, 64)


class RunTest(RecordTest):
    def setUp(self):
        super().setUp()
        self.store = self.directory / "records.sqlite"

    def test_a_run_goes_into_the_store(self):
        for record in (self.record, str(self.directory / "folder") + "/"):
            done = self.run_fake(f"--store={self.store}", "--record", record, "--tag", "serial=A")
            self.assertEqual(done.returncode, 0, done.stderr)
        listed = json.loads(quazor("records", "list", "--store", self.store, "--format", "json").stdout)["runs"]
        self.assertEqual([(one["verdict"], one["serial"]) for one in listed], [("pass", "A")] * 2)
        self.assertEqual(listed[1]["file"], str(self.record))

    def test_the_usual_store(self):
        done = self.run_fake("--store", "--record", self.record, env={"XDG_DATA_HOME": str(self.directory)})
        self.assertEqual(done.returncode, 0, done.stderr)
        self.assertTrue((self.directory / "quazor/records.sqlite").exists())

    def test_without_a_record(self):
        self.assert_refused(self.run_fake(f"--store={self.store}"), 64, "--store requires --record")
        self.assertFalse(self.store.exists())

    def test_a_store_that_cannot_be_used_is_refused_before_the_run(self):
        self.store.write_text("This is a text, and not a database at all." * 99)
        self.assert_refused(self.run_fake(f"--store={self.store}", "--record", self.record), 66, "cannot be read")
        self.assertFalse(self.record.exists())

    def test_a_failed_import_is_told_and_leaves_the_verdict(self):
        self.run_fake(f"--store={self.store}", "--record", self.record)
        database = sqlite3.connect(self.store)
        database.execute("CREATE TRIGGER full BEFORE INSERT ON run BEGIN SELECT raise(FAIL, 'no room'); END")
        database.commit()
        database.close()
        done = self.run_fake(f"--store={self.store}", "--record", self.directory / "other.jsonl")
        self.assertEqual(done.returncode, 73, done.stderr)
        self.assertIn("PASS", done.stdout)
        self.assertIn(f"quazor records import {self.directory / 'other.jsonl'}", done.stderr)
        self.assertIn("no room", done.stderr)
        self.assertEqual(quazor("verify", self.directory / "other.jsonl").returncode, 0)


if __name__ == "__main__":
    unittest.main()
