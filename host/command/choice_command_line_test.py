"""Which diagnostics run, in which order, and with which waits between them."""

import json
import signal
import time
import unittest

from command_line_fixture import CommandLineTest, WORKING, events_in, quazor, start


class ChoiceTest(CommandLineTest):
    def names_run(self, *arguments, names, code=0):
        done = self.run_fake("--format", "json", *arguments, names=names)
        self.assertEqual(done.returncode, code, done.stderr)
        return [one["name"] for one in json.loads(done.stdout)["diagnostics"]]

    def test_diagnostics_run_in_the_order_in_which_they_are_named(self):
        self.assertEqual(self.names_run(names=("Fake.Two", "Fake.One")), ["Fake.Two", "Fake.One"])
        self.assertEqual(self.names_run(names=("Fake.Two", "Fake.*", "Fake.Two")), ["Fake.Two", "Fake.One"])
        self.assertEqual(self.names_run(names=("Fake.*",)), ["Fake.One", "Fake.Two"])

    def test_except_leaves_out_what_its_patterns_fit(self):
        self.assertEqual(self.names_run("--except", "Broken.*", "--except", "Fake.One", names=("--all",)), ["Fake.Two"])
        self.assertEqual(self.names_run("--except", "*.[O]ne", names=("Fake.*",)), ["Fake.Two"])

    def test_except_is_refused_if_it_fits_nothing_or_everything(self):
        for pattern, text in (("Nowhere.*", "--except 'Nowhere.*' fits nothing"), ("Fake.Two", "'Fake.Two' fits nothing"),
                              ("Fake.*", "--except leaves nothing to run"), ("", "--except: the value is empty")):
            with self.subTest(pattern=pattern):
                self.assert_refused(self.run_fake("--except", pattern, "--output", self.output), 64, text)

    def test_all_runs_the_others_without_a_required_parameter(self):
        record = self.directory / "record.jsonl"
        for names in (("--all",), ("Fake.*", "Broken.Factory")):
            with self.subTest(names=names):
                done = self.run_fake("--format", "json", "--record", record, "--replace", names=names, duration=None)
                self.assertEqual(done.returncode, 2, done.stderr)
                found = {one["name"]: one for one in json.loads(done.stdout)["diagnostics"]}
                error = found["Fake.One"]["error"]
                self.assertEqual((error["domain"], error["code"]), ("QuazorHostErrorDomain", 16))
                self.assertIn("Fake.One requires the parameter experiment.duration", error["message"])
                self.assertIn("Broken.Factory", found)
                self.assert_verifies(record)
                self.assert_untouched(record, "Fake.One")

    def assert_untouched(self, record, name):
        events = events_in(record)
        begin = [event.get("name") for event in events].index(name)
        self.assertEqual([event["event"] for event in events[begin:begin + 3]],
                         ["diagnosticBegan", "failed", "diagnosticEnded"])

    def test_a_named_diagnostic_without_a_required_parameter_is_refused(self):
        for names in (("Fake.One",), ("Fake.*", "Fake.One")):
            with self.subTest(names=names):
                done = self.run_fake("--output", self.output, names=names, duration=None)
                self.assert_refused(done, 64, "Fake.One requires the parameter experiment.duration")

    def test_list_shows_what_the_patterns_fit(self):
        def listed(*names):
            done = quazor("list", *names, "--plugin", WORKING, "--format", "json")
            self.assertEqual(done.returncode, 0, done.stderr)
            document = json.loads(done.stdout)
            return [one["name"] for kind in ("diagnostics", "experiments") for one in document[kind]]

        self.assertEqual(listed("Fake.Two", "Fake.*"), ["Fake.Two", "Fake.One"])
        self.assertEqual(listed("FakeExperiment"), ["FakeExperiment"])
        self.assertIn("Broken.Nothing", listed())
        self.assert_refused(quazor("list", "Nowhere.*", "--plugin", WORKING), 64, "matches 'Nowhere.*'")

    def test_a_simulated_phone_settles_in_no_time(self):
        begin = time.monotonic()
        self.assertEqual(self.names_run("--settle", "100000", names=("Fake.*",)), ["Fake.One", "Fake.Two"])
        self.assertLess(time.monotonic() - begin, 10000)

    def test_a_phone_in_real_time_settles_between_two_diagnostics(self):
        record = self.directory / "record.jsonl"
        done = self.run_fake("--realtime", "--settle", "0.75", "--record", record, names=("Fake.*",), duration=0.1)
        self.assertEqual(done.returncode, 0, done.stderr)
        ends = [event["date"] for event in events_in(record) if event["event"] in ("diagnosticBegan", "diagnosticEnded")]
        self.assertGreaterEqual(seconds_of(ends[2]) - seconds_of(ends[1]), 0.75)

    def test_an_interrupt_ends_the_wait(self):
        record = self.directory / "record.jsonl"
        running = start("run", "Fake.*", "--plugin", WORKING, "--phone", self.phone, "--profile", "none", "--realtime",
                        "--settle", "100000", "--set", "duration=0.1", "--record", record)
        while running.poll() is None and (not record.exists() or "diagnosticEnded" not in record.read_text()):
            time.sleep(0.05)
        running.send_signal(signal.SIGINT)
        out, err = running.communicate(timeout=120)
        self.assertEqual(running.returncode, 130, out + err)
        self.assertEqual(events_in(record)[-1].get("interrupted"), "")
        self.assert_verifies(record)

    def test_times_to_settle_that_are_refused(self):
        for text in ("-1", "x", "nan", "inf", "1e300", "31536000", ""):
            with self.subTest(text=text):
                self.assert_refused(self.run_fake(f"--settle={text}", "--output", self.output), 64, "--settle")


def seconds_of(date):
    """The second of the day of a date of a record, which has nanoseconds; no test runs for a day."""
    hours, minutes, seconds = date[date.index("T") + 1:-1].split(":")
    return int(hours) * 3600 + int(minutes) * 60 + float(seconds)


if __name__ == "__main__":
    unittest.main()
