"""Frames in the record: --trace."""

import itertools
import json
import re
import unittest

from command_line_fixture import PLUGINS, SCENARIO, RecordTest, events_in, quazor

STREAMING = str(PLUGINS / "streaming_plugin.so")
COLUMNS = ("number", "captured", "delivered", "returned")


def rows_of(event):
    """The frames of an event, each with its four values."""
    columns = []
    for name in COLUMNS:
        last, column = 0, []
        for entry in event["columns"][name]:
            last += entry or 0
            column.append(None if entry is None else last)
        columns.append(column)
    assert len({len(column) for column in columns}) == 1
    return list(zip(*columns))


def frames_in(record):
    """The frames of each stream of a record with one diagnostic, each as its step, number and times."""
    streams = {}
    for event in events_in(record):
        if event["event"] == "frames":
            streams.setdefault(event["stream"], []).extend((event["step"], *row) for row in rows_of(event))
    return streams


def frame_time(frame, rate):
    """Nanoseconds from the start of a simulated stream to a frame."""
    return -(-(frame + 1) * 10**9 // rate)


class TraceTest(RecordTest):
    def stream(self, count, *arguments, code=0):
        """A record of a run that takes frames from the first camera of a phone with two."""
        scenario = json.loads(json.dumps(SCENARIO))
        scenario["cameras"]["tele"] = {"port": "BackFacingTelephotoCamera", "formats": [{"maximumFrameRate": 60}]}
        phone = self.write("phone.json", json.dumps(scenario))
        result = quazor("experiment", "StreamingExperiment", "--plugin", STREAMING, "--phone", phone, "--profile", "none",
                        "--set", f"frameCount={count}", "--set", "timeout=9", "--record", self.record, "--replace",
                        *arguments)
        self.assertEqual(result.returncode, code, result.stderr)
        return self.record

    def assert_first_frames(self, streams, count):
        """The stream begins at time 0 of the run, and a handler takes no time."""
        self.assertEqual(list(streams), ["wide"])
        self.assertGreaterEqual(len(streams["wide"]), count)
        self.assertEqual(streams["wide"], [(1, k, *[frame_time(k, 30)] * 3) for k in range(len(streams["wide"]))])

    def test_every_frame_with_its_times(self):
        for mode in ([], ["--in-process"]):
            with self.subTest(mode=mode):
                record = self.stream(90, *mode)
                self.assertEqual(events_in(record)[0]["record"], 3)
                self.assert_first_frames(frames_in(record), 90)
                self.assert_verifies(record)
                names = [event["event"] for event in events_in(record)]
                self.assertEqual(names.count("frames"), 1)
                self.assertLess(names.index("frames"), names.index("diagnosticCompleted"))

    def test_both_ways_to_run_give_the_same_frames(self):
        apart = self.stream(9000)
        events = [event for event in events_in(apart) if event["event"] == "frames"]
        self.assertEqual([len(event["columns"]["number"]) for event in events][:2], [4096, 4096])
        self.assert_first_frames(frames_in(apart), 9000)
        kept = apart.rename(self.directory / "apart.jsonl")
        together = self.stream(9000, "--in-process")
        result = quazor("diff", kept, together)
        self.assertEqual((result.returncode, result.stdout), (0, "The records do not differ.\n"))

    def test_after_many_frames_fewer_are_kept(self):
        rows = frames_in(self.stream(1000, "--trace", "frames=100"))["wide"]
        steps = {step: [row[1] for row in group] for step, group in itertools.groupby(rows, lambda row: row[0])}
        self.assertEqual(steps[1], list(range(100)))
        self.assertEqual(steps[2], list(range(100, 300, 2)))
        self.assertEqual(steps[4], list(range(300, 700, 4)))
        self.assertEqual(steps[8], list(range(704, 1000, 8)))
        self.assertEqual([row[2:] for row in rows], [(frame_time(row[1], 30),) * 3 for row in rows])
        self.assertFalse([event for event in events_in(self.record) if "lost" in event])
        every = frames_in(self.stream(1000, "--trace", "frames=all"))
        self.assert_first_frames(every, 1000)

    def test_off_is_a_record_without_frames(self):
        record = self.stream(90, "--trace", "off")
        self.assertEqual(events_in(record)[0]["record"], 2)
        self.assertEqual(frames_in(record), {})
        self.assert_verifies(record)
        kept = record.rename(self.directory / "off.jsonl")
        result = quazor("diff", kept, self.stream(90))
        self.assertEqual((result.returncode, result.stdout), (0, "The records do not differ.\n"))

    def test_diff_tells_the_first_frame_that_differs(self):
        self.stream(90)

        def hold(events):
            event = next(event for event in events if event["event"] == "frames")
            event["columns"]["returned"][4] = None

        changed = self.changed(hold)
        result = quazor("diff", self.record, changed)
        self.assertEqual(result.returncode, 1)
        time = frame_time(4, 30)
        begin = f"number 4, captured at {time} ns, delivered at {time} ns, "
        self.assertEqual(result.stdout.splitlines()[0],
                         f"StreamingExperiment: stream wide: frame 5, the first that differs, was {begin}returned at {time} "
                         f"ns and is {begin}not returned")
        self.assertEqual(len(result.stdout.splitlines()), 1)

    def test_the_analysis_of_a_record_has_no_frames(self):
        self.recorded()
        self.assertEqual(events_in(self.record)[0]["record"], 3)
        again = self.directory / "again.jsonl"
        result = quazor("analyze", self.record, "--plugin", PLUGINS / "working_plugin.so", "--record", again)
        self.assertEqual(result.returncode, 0, result.stderr)
        self.assertEqual(events_in(again)[0]["record"], 2)

    def test_frames_outlast_a_run_that_is_ended(self):
        record = self.stream(10**9, "--realtime", "--deadline", "run=2", code=2)
        rows = frames_in(record)["wide"]
        self.assertGreater(len(rows), 10)
        started = rows[0][2] - frame_time(0, 30)
        for step, number, captured, delivered, returned in rows[:-1]:
            self.assertEqual((step, captured), (1, started + frame_time(number, 30)))
            self.assertGreaterEqual(delivered, captured)
            self.assertGreaterEqual(returned, delivered)
        self.assertEqual([row[1] for row in rows], list(range(len(rows))))
        self.assert_verifies(record)

    def test_readers_refuse_what_cannot_be_with_line_and_column(self):
        self.stream(10)
        line = [event["event"] for event in events_in(self.record)].index("frames") + 1

        def refusal_of(change):
            def edit(events):
                change(events[line - 1]["columns"])
            bad = self.changed(edit)
            self.assertEqual(quazor("verify", bad).returncode, 1)
            result = quazor("diff", self.record, bad)
            self.assert_refused(result, 66, f"'{bad}', line {line}: ")
            return re.sub(r".*, line \d+: ", "", result.stderr.strip())

        self.assertIn('the column "delivered" has ', refusal_of(lambda columns: columns["delivered"].pop()))
        self.assertEqual(refusal_of(lambda columns: columns.update(exposed=[])), "unknown column 'exposed'")
        self.assertEqual(refusal_of(lambda columns: columns["delivered"].__setitem__(3, -1)),
                         'the column "delivered", entry 4: the frame was delivered before the one before it')

        def early(events):  # as the camera says
            events[line - 1]["columns"]["captured"][3] = -99
        self.assertEqual(quazor("verify", self.changed(early)).returncode, 0)

    def test_settings_that_are_refused(self):
        for text in ("", "on", "queue", "frames=", "frames=0", "frames=-1", "frames=1.5", "frames=1000000001", "frames=ALL",
                     "Frames", "off=1", "frames,off"):
            with self.subTest(text):
                self.assert_refused(self.run_fake("--trace", text), 64, "--trace")
        self.assertEqual(quazor("analyze", self.record, "--trace", "off").returncode, 64)
        self.assertEqual(quazor("selftest", "--trace", "off").returncode, 64)


class QueuesTest(RecordTest):
    def record_of(self, *arguments):
        result = quazor("run", "TesselFaultDiagnostic", "--profile", "none", "--set", "experiment.frameCount=40", "--set", "timeout=9",
                        "--set", "analysis.frameCount=40", "--record", self.record, "--replace", *arguments)
        self.assertEqual(result.returncode, 0, result.stdout + result.stderr)
        return events_in(self.record)

    def test_the_tasks_of_the_plug_in(self):
        untraced = self.record_of()
        self.assertNotIn("tasks", [event["event"] for event in untraced])
        without = [event for event in untraced if event["event"] == "frames"]
        for mode in ([], ["--in-process"], ["--realtime"]):
            with self.subTest(mode):
                events = self.record_of("--trace", "queues", *mode)
                self.assertEqual(events[0]["record"], 4)
                self.assertEqual(quazor("verify", self.record).returncode, 0)
                queues = {event["queue"]: event["columns"] for event in events if event["event"] == "tasks"}
                self.assertEqual(sorted(queues), ["QZTesselFaultExperiment", "QZTesselFaultExperiment.primaryScalar"])
                # A task for each frame that was taken in, and one for each that was examined.
                self.assertGreaterEqual(len(queues["QZTesselFaultExperiment.primaryScalar"]["thread"]), 40)
                self.assertGreaterEqual(len(queues["QZTesselFaultExperiment"]["thread"]), 40)
                for columns in queues.values():
                    posted, begun = itertools.accumulate(columns["posted"]), itertools.accumulate(columns["begun"])
                    self.assertTrue(all(before <= at for before, at in zip(posted, begun)))
                if mode == []:
                    self.assertEqual([{**event, "sequence": 0} for event in events if event["event"] == "frames"],
                                     [{**event, "sequence": 0} for event in without])

    def test_two_runs_have_the_same_tasks(self):
        self.record_of("--trace", "queues")
        other = self.directory / "other.jsonl"
        other.write_bytes(self.record.read_bytes())
        self.record_of("--trace", "queues")
        self.assertEqual(quazor("diff", self.record, other).stdout, "The records do not differ.\n")
        text = other.read_text()
        changed = re.sub(r'("event":"tasks","queue":"QZTesselFaultExperiment","step":1,"columns":{"thread":\[)1', r"\g<1>2", text)
        self.assertNotEqual(text, changed)
        other.write_text(changed)
        self.assertIn("queue QZTesselFaultExperiment: task 1, the first that differs, was thread 1",
                      quazor("diff", self.record, other).stdout)

    def test_time_line_and_page(self):
        self.record_of("--trace", "queues")
        timeline, page = self.directory / "t.json", self.directory / "p.html"
        self.assertEqual(quazor("report", self.record, "--format", "trace", "--output", timeline).returncode, 0)
        names = [event["args"]["name"] for event in json.loads(timeline.read_text())["traceEvents"] if event["name"] == "thread_name"]
        self.assertIn("tasks of QZTesselFaultExperiment", names)
        self.assertEqual(quazor("report", self.record, "--output", page).returncode, 0)
        self.assertIn("Tasks of queues", page.read_text())
        # A run writes the same page at its end.
        page.unlink()
        self.record_of("--trace", "queues", "--output", f"html:{page}")
        self.assertIn("Tasks of queues", page.read_text())


if __name__ == "__main__":
    unittest.main()
