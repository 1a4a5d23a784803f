"""`quazor verify` of several records and of folders."""

import json
import os
import signal
import time
import unittest

from command_line_fixture import RecordTest, quazor, start
from terminal_fixture import Terminal


class ManyRecordsTest(RecordTest):
    def setUp(self):
        super().setUp()
        whole = self.recorded("--set", "measured=90").read_text()
        self.lines = whole.splitlines(keepends=True)
        self.folder = self.directory / "records"
        self.whole = self.put("b.jsonl", whole)
        self.cut = self.put("c/cut.jsonl", "".join(self.lines[:-1]) + self.lines[-1][:5])
        self.wrong = self.put("a.jsonl", whole.replace('"verdict":"pass"', '"verdict":"fail"'))
        self.empty = self.put("c/a/empty.jsonl", "")
        self.put("notes.txt", "no record")
        self.put(".d.jsonl.quazor-1.tmp", "no record")
        os.mkfifo(self.folder / "pipe.jsonl")
        (self.folder / "c/loop").symlink_to(self.folder)

    def put(self, name, text):
        file = self.folder / name
        file.parent.mkdir(parents=True, exist_ok=True)
        file.write_text(text)
        return file

    def verified(self, *arguments, code):
        result = quazor("verify", *arguments)
        self.assertEqual((result.returncode, result.stderr), (code, ""), result.stdout)
        return result.stdout.splitlines()

    def test_a_line_for_each_in_the_order_of_their_names_and_a_total(self):
        events = len(self.lines)
        lines = self.verified(self.folder, code=66)
        self.assertEqual(lines, [
            f"WRONG       {self.wrong}: {events} events, 1 verdict (1 fail), 1 problem",
            "    Fake.One: the recorded verdict is fail, but the results, limits and errors give pass",
            f"OK          {self.whole}: {events} events, 1 verdict (1 pass), 0 problems",
            f"UNREADABLE  {self.empty}: the record '{self.empty}' contains no events",
            f"INCOMPLETE  {self.cut}: {events - 1} events, 1 verdict (1 pass), 0 problems; the run did not end, and the record's last line is cut off",
            "4 records: 1 OK, 1 incomplete, 1 wrong, 1 unreadable"])

    def test_the_worst_counts(self):
        self.verified(self.whole, self.whole.parent / "../run.jsonl", code=0)
        self.verified(self.whole, self.cut, code=3)
        self.empty.unlink()
        self.verified(self.folder, code=1)
        self.verified(self.folder / "c", code=3)
        self.verified(self.folder / "c", self.directory / "missing", code=66)

    def test_a_line_that_is_wrong(self):
        self.put("a.jsonl", "{}\n")
        self.assertEqual(self.verified(self.wrong, self.whole, code=1)[:2], [
            f"WRONG       {self.wrong}: 1 problem",
            f"    the record '{self.wrong}', line 1: \"record\" is missing"])

    def test_a_record_that_is_named_twice_counts_once(self):
        (self.directory / "link").symlink_to(self.folder / "b.jsonl")
        lines = self.verified(self.whole, self.directory / "link", f"{self.folder}/./b.jsonl", self.record, code=0)
        self.assertEqual(lines[-1], "2 records: 2 OK")

    def test_a_folder_with_one_record(self):
        self.assertEqual(self.verified(self.folder / "c/a", code=66)[-1], "1 record: 1 unreadable")

    def test_a_folder_without_records_is_refused(self):
        (self.directory / "none").mkdir()
        for arguments in ([self.directory / "none"], [self.whole, self.directory / "none"]):
            self.assert_refused(quazor("verify", *arguments), 66,
                                f"the folder '{self.directory}/none' contains no record: no file in it ends in .jsonl")

    def test_a_folder_that_cannot_be_read_to_its_end_is_refused(self):
        if os.geteuid() == 0:
            self.skipTest("root reads every folder")
        (self.folder / "c").chmod(0)
        self.addCleanup((self.folder / "c").chmod, 0o700)
        self.assert_refused(quazor("verify", self.folder), 66, "Permission denied")

    def test_names_cannot_control_the_terminal(self):
        self.put("a/\x1b[31m\nOK.jsonl", "{}\n")
        self.assertIn("\\x1b[31m\\x0aOK.jsonl: 1 problem", self.verified(self.folder / "a", code=1)[0])

    def test_a_record_cut_at_any_byte_is_never_ok(self):
        """The lines of the answer follow the names, and the names the sizes."""
        whole = "".join(self.lines).encode()
        first = whole.index(b"\n")
        for size in range(len(whole)):
            self.directory.joinpath("cuts").mkdir(exist_ok=True)
            (self.directory / f"cuts/{size:06}.jsonl").write_bytes(whole[:size])
        lines = [line for line in self.verified(self.directory / "cuts", code=66) if not line.startswith(" ")]
        words = [line.split()[0] for line in lines[:-1]]
        self.assertEqual(words, ["UNREADABLE"] * (first + 1) + ["INCOMPLETE"] * (len(whole) - first - 1))
        self.assertEqual(lines[-1], f"{len(whole)} records: {len(whole) - first - 1} incomplete, {first + 1} unreadable")


class SlowRecordTest(RecordTest):
    """The record arrives through a pipe, so it takes as long as the test wants."""

    def setUp(self):
        super().setUp()
        lines = self.recorded().read_text().splitlines(keepends=True)
        end = json.loads(lines[-3])["sequence"]
        log = {"event": "log", "date": "2026-11-21T01:08:00.000000000Z", "nanoseconds": 0, "level": "default", "text": ""}
        events = [*map(json.loads, lines[:end]), *[dict(log) for _ in range(1000)], *map(json.loads, lines[end:])]
        self.lines = [json.dumps({**event, "sequence": at}) + "\n" for at, event in enumerate(events)]
        self.pipe = self.directory / "pipe.jsonl"
        os.mkfifo(self.pipe)

    def test_an_interrupt_keeps_what_was_verified(self):
        for before, out, err in (
                ([self.record], "1 record: 1 OK\n", "quazor: interrupted: 1 of 2 records were verified\n"),
                ([], "", "quazor: interrupted before the record was verified\n")):
            with self.subTest(before):
                process = start("verify", *before, self.pipe)
                writer = os.open(self.pipe, os.O_WRONLY)  # waits until the program has opened it, too
                process.send_signal(signal.SIGINT)
                try:
                    os.write(writer, "".join(self.lines[:600]).encode())
                except BrokenPipeError:  # it has ended before it read everything
                    pass
                output, errors = process.communicate(timeout=60)
                os.close(writer)
                self.assertEqual((process.returncode, errors), (130, err))
                self.assertTrue(output.endswith(out), output)
                self.assertEqual(output.count("OK  "), len(before))

    def test_a_terminal_shows_the_progress(self):
        for before, text in (([self.record], "Verifying 2 of 2: pipe.jsonl"), ([], "Verifying: pipe.jsonl")):
            with self.subTest(before):
                terminal = Terminal(80, "verify", *before, self.pipe)
                with open(self.pipe, "w") as writer:
                    time.sleep(0.5)  # what takes less shows no progress
                    writer.write("".join(self.lines[:600]))
                    writer.flush()
                    output = terminal.read_for(60, until=text.encode())
                    writer.write("".join(self.lines[600:]))
                code, rest = terminal.finish()
                self.assertIn(text, output.decode())
                self.assertEqual(code, 0, output + rest)
                self.assertIn("\r\x1b[K", rest.decode())

    def test_a_pipe_shows_none(self):
        process = start("verify", self.record, self.pipe)
        with open(self.pipe, "w") as writer:
            time.sleep(0.5)
            writer.write("".join(self.lines))
        output, errors = process.communicate(timeout=60)
        self.assertEqual((process.returncode, errors), (0, ""), output)


if __name__ == "__main__":
    unittest.main()
