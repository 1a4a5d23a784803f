"""Interrupts: the first tears down, the second kills, the third ends quazor."""

import json
import os
import pathlib
import re
import signal
import time
import unittest

from command_line_fixture import PLUGINS, WORKING, CommandLineTest, events_in, fill, quazor, start
from terminal_fixture import Terminal

FATAL = str(PLUGINS / "fatal_plugin.so")
UNRULY = str(PLUGINS / "unruly_plugin.so")


class InterruptTest(CommandLineTest):
    NAMES = ("Broken.Nothing", "Fake.One", "Fake.Two")

    def setUp(self):
        super().setUp()
        self.record = self.directory / "run.jsonl"

    def interrupted(self, *arguments, signals=(signal.SIGINT,), grace="0.5"):
        """Runs one diagnostic that ends at once and two that never end in time, and interrupts the second."""
        process = start("run", *self.NAMES, "--plugin", WORKING, "--phone", self.phone, "--profile", "none",
                        "--realtime", "--set", "duration=60", "--record", self.record, "--replace", "--grace", grace, *arguments)
        self.addCleanup(process.kill)
        line = process.stderr.readline()  # the first log line: the second diagnostic is running
        self.assertIn("an error line", line)
        begin = time.monotonic()
        for one in signals:
            process.send_signal(one)
        out, err = process.communicate(timeout=50)
        self.assertLess(time.monotonic() - begin, 20)
        self.assertEqual(process.returncode, 130)
        self.assertIn("interrupted while Fake.One was running", err)
        self.assert_verifies(self.record)
        events = events_in(self.record)
        self.assertEqual((events[-1]["event"], events[-1]["interrupted"]), ("runEnded", "Fake.One"))
        return out

    def test_the_first_says_at_once_how_long_it_takes(self):
        process = start("run", "Fake.One", "--plugin", WORKING, "--phone", self.phone, "--profile", "none", "--realtime",
                        "--set", "duration=60", "--grace", "60")
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        self.assertIn("an error line", process.stderr.readline())
        process.send_signal(signal.SIGINT)
        self.assertEqual(process.stderr.readline(), self.notice("60"))
        self.assertIsNone(process.poll())
        process.send_signal(signal.SIGINT)
        out, err = process.communicate(timeout=50)
        self.assertEqual(process.returncode, 130, out)
        self.assertNotIn("Ctrl-C", err)

    @staticmethod
    def notice(grace):
        return (f"quazor: interrupting Fake.One: its run may take up to {grace} s (--grace) to return, and then its teardown "
                "follows; a second Ctrl-C ends it at once\n")

    def test_a_terminal_shows_it_too(self):
        terminal = Terminal(400, "run", "Fake.One", "--plugin", WORKING, "--phone", self.phone, "--profile", "none",
                            "--realtime", "--set", "duration=60", "--grace", "0.5")
        before = terminal.read_for(60, until=b"Running Fake.One")
        self.assertIn(b"Running Fake.One", before)
        terminal.process.send_signal(signal.SIGINT)
        code, rest = terminal.finish()
        self.assertEqual(code, 130, rest)
        self.assertIn(self.notice("0.5").rstrip().encode(), rest)

    WAYS = ([], ["--in-process"])

    def test_json_stays_one_document_with_all_that_ran(self):
        for way in self.WAYS:
            with self.subTest(way):
                document = json.loads(self.interrupted("--format", "json", *way))
                self.assertEqual([(record["name"], record["verdict"]) for record in document["diagnostics"]],
                                 [("Broken.Nothing", "error"), ("Fake.One", "error")])
                self.assertEqual(document["interrupted"], "Fake.One")
                error = document["diagnostics"][1]["error"]
                self.assertEqual((error["domain"], error["code"]), ("QuazorHostErrorDomain", 11))
                self.assertIn("an error line", [line["text"] for line in document["diagnostics"][1]["log"]])

    def test_text_shows_all_that_ran(self):
        for way in self.WAYS:
            with self.subTest(way):
                out = self.interrupted(*way)
                self.assertIn("Broken.Nothing", out)
                self.assertRegex(out, r"QuazorHostErrorDomain code 11: .*Fake\.One was interrupted")
                self.assertIn("2 diagnostics: 0 passed, 0 failed, 2 ended in an error, 1 not reached\n", out)

    def test_repetitions_that_were_not_reached_are_counted(self):
        out = self.interrupted("--repeat", "3")
        self.assertIn("2 runs: 0 passed, 0 failed, 2 ended in an error, 7 not reached\n", out)

    def test_every_output_file_is_written(self):
        for way in self.WAYS:
            with self.subTest(way):
                junit = self.directory / "report.xml"
                self.interrupted("--format", "json", "--output", self.output, "--output", f"junit:{junit}", *way)
                self.assertEqual(json.loads(self.output.read_text())["interrupted"], "Fake.One")
                self.assertIn("Fake.Two", junit.read_text())
                self.output.unlink()

    def test_a_termination_ends_a_run_as_an_interrupt_does(self):
        self.interrupted(signals=[signal.SIGTERM])

    def test_a_second_interrupt_kills_at_once(self):
        begin = time.monotonic()
        self.interrupted(signals=[signal.SIGINT, signal.SIGTERM], grace="60")
        self.assertLess(time.monotonic() - begin, 30)

    def test_a_run_that_does_not_return_in_time_has_no_teardown(self):
        self.interrupted(grace="0.2")
        events = self.about("Fake.One")
        self.assertNotIn("teardown", [one.get("stage") for one in events])
        self.assertEqual([one["text"] for one in events if one["event"] == "log"][-1],
                         "the teardown of Fake.One was not reached")

    def test_a_run_that_returns_in_time_has_its_teardown_and_no_analysis(self):
        process = start("run", "Unruly", "Fake.One", "--plugin", UNRULY, "--plugin", WORKING, "--phone", self.phone,
                        "--profile", "none", "--set", "way=16", "--set", "duration=1", "--record", self.record)
        _, err = process.communicate(timeout=50)
        self.assertEqual(process.returncode, 130, err)
        self.assertEqual(events_in(self.record)[-1]["interrupted"], "Unruly")
        events = self.about("Unruly")
        self.assertEqual([one["stage"] for one in events if one["event"] == "stageEnded"],
                         ["load", "describe", "setup", "run", "teardown"])
        failed, = [one for one in events if one["event"] == "failed"]
        self.assertEqual((failed["error"]["code"], failed["stage"]), (11, "run"))
        self.assertEqual(events[-1]["verdict"], "error")
        self.assert_verifies(self.record)

    def test_a_grace_that_is_refused(self):
        for text, problem in {"": "the value is empty", "-1": "less than zero", "soon": "not a number"}.items():
            with self.subTest(text):
                self.assert_refused(self.run_fake("--grace", text), 64, "--grace", problem)

    def about(self, name):
        """The recorded events of a diagnostic."""
        events = events_in(self.record)
        first = next(i for i, one in enumerate(events) if one.get("name") == name)
        last = next(i for i, one in enumerate(events) if i > first and one["event"] == "diagnosticEnded")
        return events[first:last + 1]

    def test_an_interrupt_behind_the_end_of_a_diagnostic_is_one_between_two(self):
        process = start("run", "Unruly", "Fake.One", "--plugin", UNRULY, "--plugin", WORKING, "--phone", self.phone,
                        "--profile", "none", "--set", "way=12", "--set", "duration=1", "--record", self.record,
                        "--format", "json")
        out, err = process.communicate(timeout=50)
        self.assertEqual(process.returncode, 130, err)
        self.assertIn("interrupted while no diagnostic was running", err)
        document = json.loads(out)
        self.assertEqual((len(document["diagnostics"]), document["interrupted"]), (1, ""))
        self.assertEqual(events_in(self.record)[-1]["interrupted"], "")
        self.assert_verifies(self.record)

    def test_what_was_interrupted_can_be_run_then(self):
        self.interrupted()
        again = ("--only", "failed", "--of", self.record, "--format", "json")
        result = self.run_fake(*again, names=[], duration=None)
        self.assertEqual(result.stderr.count("that run ended before"), 0, result.stderr)
        diagnostics = json.loads(result.stdout)["diagnostics"]
        self.assertEqual([one["name"] for one in diagnostics], list(self.NAMES))
        for one in diagnostics[1:]:
            self.assertEqual(one["parameters"]["experiment"]["duration"], 60, one["name"])
        # An earlier record does not say what was planned.
        events = events_in(self.record)
        del events[0]["planned"]
        self.write("run.jsonl", "".join(json.dumps(one) + "\n" for one in events))
        self.assert_verifies(self.record)
        result = self.run_fake(*again, names=[])
        began = [event["name"] for event in events if event["event"] == "diagnosticBegan"]
        for name in self.NAMES:
            self.assertEqual(f"quazor: {name}: that run ended before this diagnostic began" in result.stderr,
                             name not in began, result.stderr)
        self.assertLess(len(began), len(self.NAMES))
        self.assertEqual([record["name"] for record in json.loads(result.stdout)["diagnostics"]], list(self.NAMES))

    def test_the_record_and_its_page_tell_what_was_planned_for_what_was_not_reached(self):
        self.interrupted()
        planned = events_in(self.record)[0]["planned"]
        self.assertEqual([one["name"] for one in planned], list(self.NAMES))
        value = {"name": "duration", "value": {"signed": 60}, "source": "command line"}
        for one in planned[1:]:
            found = next(each for each in one["parameters"]["experiment"] if each["name"] == "duration")
            self.assertEqual({key: found[key] for key in value}, value)
        page = self.directory / "page.html"
        self.assertEqual(quazor("report", self.record, "--output", page).returncode, 0)
        section = page.read_text().split("(never run)</span>")[1].split("</section>")[0]
        self.assertRegex(section, "duration.*60.*command line")
        self.assertIn("Fake.Two", page.read_text().split("To run it again")[1])

    def test_an_interrupt_while_plugins_are_loaded(self):
        process = start("run", "--all", "--plugin", FATAL, "--phone", self.phone, "--profile", "none", "--record",
                        self.record, env={**os.environ, "FATAL_PLUGIN": "hang"})
        self.addCleanup(process.kill)
        children = pathlib.Path(f"/proc/{process.pid}/task/{process.pid}/children")
        limit = time.monotonic() + 20
        while not children.read_text() and time.monotonic() < limit:
            time.sleep(0.01)
        process.send_signal(signal.SIGINT)
        out, err = process.communicate(timeout=50)
        self.assertEqual((process.returncode, out), (130, ""))
        self.assertIn("interrupted while loading the plug-ins", err)
        self.assertFalse(self.record.exists())

    def test_ignored_interrupts_stay_ignored(self):
        process = start("run", "Fake.One", "--plugin", WORKING, "--phone", self.phone, "--profile", "none",
                        "--realtime", "--set", "duration=0.5", "--log-level", "error", ignored=True)
        self.addCleanup(process.kill)
        self.assertIn("an error line", process.stderr.readline())
        process.send_signal(signal.SIGINT)
        out, _ = process.communicate(timeout=50)
        self.assertEqual(process.returncode, 0, out)


class BlockedOutputTest(CommandLineTest):
    """Interrupts of a program whose output nobody reads."""

    def setUp(self):
        super().setUp()
        self.fifo = self.directory / "fifo"
        os.mkfifo(self.fifo)

    def ran(self, *arguments):
        """A program that has run its diagnostic and now writes its reports; None if it ended before."""
        record = self.directory / "run.jsonl"
        process = start("run", "Fake.One", "--plugin", WORKING, "--phone", self.phone, "--profile", "none", "--set",
                        "duration=1", "--record", record, *arguments)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        limit = time.monotonic() + 60
        while not (record.exists() and '"runEnded"' in record.read_text()):
            self.assertLess(time.monotonic(), limit)
            time.sleep(0.01)
        time.sleep(0.2)
        return process

    def test_a_third_interrupt_ends_it_at_once(self):
        process = self.ran("--output", f"junit:{self.fifo}")
        begin = time.monotonic()
        for one in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP):
            process.send_signal(one)
            time.sleep(0.05)
        self.assertEqual(process.wait(20), 130)
        self.assertLess(time.monotonic() - begin, 1.5)

    def test_two_seconds_after_a_second_interrupt_it_ends(self):
        process = self.ran("--output", f"junit:{self.fifo}")
        process.send_signal(signal.SIGINT)
        # A signal that is still pending when the next of its kind comes is one with it.
        status = pathlib.Path(f"/proc/{process.pid}/status")
        limit = time.monotonic() + 20
        while not re.search(r"^ShdPnd:\s*0+$", status.read_text(), re.MULTILINE):
            self.assertLess(time.monotonic(), limit)
            time.sleep(0.01)
        self.assertIsNone(process.poll())
        begin = time.monotonic()
        process.send_signal(signal.SIGINT)
        self.assertEqual(process.wait(20), 130)
        self.assertGreater(time.monotonic() - begin, 1.5)

    def test_one_interrupt_while_the_reports_are_written_changes_nothing(self):
        for one in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP):
            with self.subTest(one):
                process = self.ran("--output", f"junit:{self.fifo}", "--set", "minimum=1")
                process.send_signal(one)
                time.sleep(0.1)
                self.assertIn("Fake.One", self.fifo.read_text())
                self.assertEqual(process.wait(20), 1)  # the run's own code: its result is below the limit
                (self.directory / "run.jsonl").unlink()

    def test_a_pipe_that_is_not_read_does_not_keep_it_from_ending(self):
        process = start("run", "Unruly", "--plugin", UNRULY, "--phone", self.phone, "--profile", "none", "--set",
                        "way=8", "--log-level", "debug")
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        children = pathlib.Path(f"/proc/{process.pid}/task/{process.pid}/children")
        waits = pathlib.Path(f"/proc/{process.pid}/wchan")
        limit = time.monotonic() + 60
        while "pipe" not in waits.read_text() and time.monotonic() < limit:
            time.sleep(0.01)
        for _ in range(2):
            process.send_signal(signal.SIGINT)
            time.sleep(0.05)
        guards = children.read_text().split()
        self.assertEqual(process.wait(20), 130)
        while any(pathlib.Path("/proc", guard).exists() for guard in guards):
            self.assertLess(time.monotonic(), limit + 60)
            time.sleep(0.01)

    def test_an_error_stream_that_is_not_read_does_not_delay_the_teardown(self):
        record = self.directory / "run.jsonl"
        reader, writer = os.pipe()
        process = start("run", "Fake.One", "--plugin", WORKING, "--phone", self.phone, "--profile", "none", "--realtime",
                        "--set", "duration=6", "--grace", "60", "--record", record, stderr=writer)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        self.addCleanup(os.close, reader)
        self.assertIn(b"an error line", os.read(reader, 4096))
        fill(writer)
        os.close(writer)
        process.send_signal(signal.SIGINT)
        limit = time.monotonic() + 60
        while '"runEnded"' not in record.read_text():
            self.assertLess(time.monotonic(), limit)
            time.sleep(0.01)
        events = events_in(record)
        self.assertEqual(events[-1]["interrupted"], "Fake.One")
        self.assertIn("teardown", [one["stage"] for one in events if one["event"] == "stageEnded"])

    def test_a_record_that_is_not_read_does_not_keep_it_from_ending(self):
        process = start("run", "Fake.One", "--plugin", WORKING, "--phone", self.phone, "--profile", "none", "--set",
                        "duration=1", "--record", self.fifo)
        self.addCleanup(process.communicate)
        self.addCleanup(process.kill)
        time.sleep(1)
        self.assertIsNone(process.poll())
        for _ in range(3):
            process.send_signal(signal.SIGINT)
            time.sleep(0.05)
        self.assertEqual(process.wait(20), 130)


if __name__ == "__main__":
    unittest.main()
