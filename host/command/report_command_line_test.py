"""The page and the time line of a record: quazor report."""

import html
import json
import os
import re
import shlex
import subprocess
import unittest

from command_line_fixture import PROGRAM, SCENARIO, RecordTest, events_in, quazor


def timeline_of(path):
    return json.loads(path.read_text())["traceEvents"]


class TimelineTest(RecordTest):
    def run_diagnostics(self, *arguments):
        result = quazor("run", "CameraSyncDiagnostic.Back", "SingleCameraDiagnostic", "--record", self.record, *arguments)
        self.assertEqual(result.returncode, 0, result.stderr)

    def report(self, *arguments, code=0):
        result = quazor("report", self.record, "--format", "trace", *arguments)
        self.assertEqual(result.returncode, code, result.stderr)
        return result

    def test_every_stage_and_frame_of_the_record(self):
        self.run_diagnostics()
        output = self.directory / "run.trace.json"
        result = self.report("--output", output)
        self.assertEqual((result.stdout, result.stderr), ("", ""))
        shown = timeline_of(output)
        recorded = events_in(self.record)
        stages = [event["stage"] for event in recorded if event["event"] == "stageEnded"]
        self.assertEqual([event["name"] for event in shown if event["ph"] in "Xi" and event["tid"] == 1], stages)
        frames = [event for event in shown if event["name"].startswith("frame ")]
        self.assertEqual(len(frames), sum(len(event["columns"]["number"]) for event in recorded
                                          if event["event"] == "frames"))
        self.assertGreater(len(frames), 80)
        self.assertLessEqual({event["ph"] for event in shown}, set("XiCM"))
        # 30 frames a second, to the nanosecond.
        steps = {round((after["ts"] - before["ts"]) * 1000) for before, after in zip(frames, frames[1:])}
        self.assertLessEqual(steps, {33333333, 33333334})

    def test_a_run_writes_the_same(self):
        line = self.directory / "run.trace.json"
        self.run_diagnostics("--output", f"trace:{line}", "--phone", "camera_sync/frames_dropped")
        self.assertEqual(line.read_text(), self.report().stdout)
        self.assertIn('"name":"frame 10"', line.read_text())
        again = quazor("analyze", self.record, "--record", self.directory / "again.jsonl", "--output", f"trace:{line}")
        self.assertEqual(again.returncode, 0, again.stderr)
        self.record = self.directory / "again.jsonl"
        self.assertEqual(line.read_text(), self.report().stdout)
        self.assertIn('"analyzed":', line.read_text())

    def test_a_run_without_a_record(self):
        line = self.directory / "run.trace.json"
        for places in (["--output", f"trace:{line}"], ["--format", "trace", "--output", line]):
            with self.subTest(places=places):
                result = quazor("experiment", "SingleCameraExperiment", *places)
                self.assertEqual((result.returncode, result.stderr), (0, ""))
                names = [event["name"] for event in timeline_of(line)]
                self.assertIn("SingleCameraExperiment", names)
                self.assertGreater(sum(name.startswith("frame ") for name in names), 80)
                line.unlink()
        result = quazor("run", "SingleCameraDiagnostic", "--format", "trace")
        self.assertEqual((result.returncode, result.stderr), (0, ""))
        self.assertEqual([event["name"] for event in json.loads(result.stdout)["traceEvents"]
                          if event["ph"] == "X" and event["tid"] == 0], ["SingleCameraDiagnostic", "run"])

    def test_a_run_that_cannot_write_it(self):
        for output, code, text in (("trace:", 64, "--output 'trace:': the file name is missing"),
                                   ("trcae:line", 64, "did you mean 'trace'"),
                                   (f"{self.directory}/line:trace", 64, "the format comes first"),
                                   (f"trace:{self.directory}/missing/line", 73, "missing"),
                                   ("trace:/dev/full", 73, "/dev/full")):
            with self.subTest(output=output):
                result = quazor("run", "SingleCameraDiagnostic", "--output", output)
                self.assertEqual(result.returncode, code, result.stderr)
                self.assertIn(text, result.stderr)

    def test_the_console_gets_the_same(self):
        self.run_diagnostics()
        output = self.directory / "run.trace.json"
        self.report("--output", output)
        self.assertEqual(self.report().stdout, output.read_text())

    def test_a_part(self):
        self.run_diagnostics()
        times = [event["ts"] for event in json.loads(self.report("--from", "4", "--to", "5").stdout)["traceEvents"]
                 if event["ph"] == "i"]
        self.assertGreater(len(times), 25)
        self.assertTrue(all(4e6 <= time <= 5e6 for time in times))

    def test_a_part_that_has_nothing_is_told_with_the_length_of_the_run(self):
        self.run_diagnostics()
        everything = self.report()
        end = max(event["ts"] + event["dur"] for event in json.loads(everything.stdout)["traceEvents"] if event["ph"] == "X")
        self.assertEqual(everything.stderr, "")
        for part in (("--from", "1000"), ("--from", "1000", "--to", "2000")):
            result = self.report(*part)
            self.assertEqual([event["name"] for event in json.loads(result.stdout)["traceEvents"] if event["ph"] != "M"], [])
            told = re.fullmatch(r"quazor: .*run\.jsonl: nothing happens in the part that --from and --to choose; the time line "
                                r"goes from 0 to ([0-9.]+) s\n", result.stderr)
            self.assertTrue(told, result.stderr)
            self.assertAlmostEqual(float(told[1]), end / 1e6, places=5)
        self.assertEqual(self.report("--from", "1", "--to", "2").stderr, "")

    def test_a_record_that_was_cut(self):
        self.run_diagnostics()
        lines = self.record.read_text().splitlines(keepends=True)
        self.record.write_text("".join(lines[:-3]))
        result = self.report()
        self.assertIn("the run did not end", result.stderr)
        self.assertTrue(json.loads(result.stdout)["traceEvents"])

    def test_mistakes(self):
        self.run_diagnostics()
        for arguments, code, text in [
                (["report"], 64, "RECORD"),
                (["report", self.record, "--format", "pdf"], 64, "--format: pdf not in {html,trace}"),
                (["report", self.record, "--format", "junit"], 64, "this command writes html and trace; for junit, "
                 "'quazor analyze RECORD --output junit:FILE' judges the record again"),
                (["report", self.record, "--from", "1"], 64, "--from applies only to --format trace"),
                (["report", self.record, "--to", "1"], 64, "--to applies only to --format trace"),
                (["report", self.record, "--format", "trace", "--no-frames"], 64, "--no-frames applies only to"),
                (["report", self.record, self.record, "--format", "trace"], 64, "a time line is of one record"),
                (["report", self.record, "--format", "trace", "--from", "x"], 64, "--from 'x'"),
                (["report", self.record, "--format", "trace", "--from", "-1"], 64, "less than zero"),
                (["report", self.record, "--format", "trace", "--from", "2", "--to", "1"], 64, "--to '1'"),
                (["report", self.record, "--format", "trace", "--output", self.record], 73, "is a record"),
                (["report", self.directory, "--format", "trace"], 66, "folder"),
                (["report", self.directory / "missing", "--format", "trace"], 66, "missing"),
                (["reprot", self.record], 64, "did you mean 'report'"),
        ]:
            with self.subTest(arguments=arguments):
                result = quazor(*arguments)
                self.assertEqual(result.returncode, code, result.stderr)
                self.assertIn(text, result.stderr)

    @unittest.skipUnless(os.environ.get("QUAZOR_THOROUGH"), "takes a minute; QUAZOR_THOROUGH=1 runs it")
    def test_a_time_line_that_is_too_large(self):
        """A forged record of 2,000,000 frames."""
        self.run_diagnostics()
        lines = self.record.read_text().splitlines()
        index = max(i for i, line in enumerate(lines) if '"event":"frames"' in line)
        event = json.loads(lines[index])
        count = 4096
        first = 10**10

        def more(i):
            event["columns"] = {name: [first + i * count] + [1] * (count - 1)
                                for name in ("number", "captured", "delivered", "returned")}
            return json.dumps(event, separators=(",", ":"))

        with self.record.open("w") as record:
            for i, line in enumerate([*lines[:index], *map(more, range(490)), *lines[index + 1:]]):
                tail = line.partition(",")[2]
                record.write(f'{{"sequence":{i},{tail}\n')
        result = self.report("--output", self.directory / "o", code=64)
        self.assertIn("--from SECONDS and --to SECONDS", result.stderr)
        self.assertFalse((self.directory / "o").exists())
        self.report("--from", "1000", "--output", self.directory / "o")


class PageTest(RecordTest):
    def run_all(self, *arguments, code=0):
        result = quazor("run", "--all", "--record", self.record, *arguments)
        self.assertEqual(result.returncode, code, result.stderr)

    def page(self, *arguments, code=0):
        result = quazor("report", *arguments)
        self.assertEqual((result.returncode, result.stderr), (code, ""))
        return result.stdout

    def test_a_run_and_its_record_have_the_same_page(self):
        page = self.directory / "run.html"
        self.run_all("--output", f"html:{page}")
        again = self.page(self.record).replace(
            f'<tr><th scope="row">Record</th><td>{self.record}</td></tr>\n', "")
        self.assertEqual(again, page.read_text())
        self.assertEqual(again, self.page(self.record, "--format", "html").replace(
            f'<tr><th scope="row">Record</th><td>{self.record}</td></tr>\n', ""))
        self.assertIn("Stream front-infrared", again)
        self.assertLess(len(again.encode()), 150_000)

    def test_a_failure_is_explained(self):
        self.run_all("--phone", "camera_sync/frames_dropped", "--profile", "strict", code=1)
        page = self.page(self.record)
        self.assertIn("<strong>BackTele.Total</strong> is <strong>87 frames</strong>, <strong>3 below the limit</strong>", page)
        self.assertIn("What to do next", page)
        self.assertIn("quazor explain BackTele.Total", page)

    def test_without_frames(self):
        self.run_all()
        self.assertNotIn("Stream front-infrared", self.page(self.record, "--no-frames"))

    def test_two_records_compared(self):
        self.run_all()
        other = self.directory / "other.jsonl"
        result = quazor("run", "--all", "--record", other, "--phone", "camera_sync/frames_dropped")
        self.assertEqual(result.returncode, 0, result.stderr)
        page = self.page(self.record, other, "--compare")
        differences = quazor("diff", self.record, other).stdout.splitlines()
        self.assertGreater(len(differences), 5)
        self.assertIn(f"The records differ in {len(differences)} places", page)
        self.assertIn("TesselFaultDiagnostic: stream front-infrared", page)
        self.assertIn('class="curve1"', page)
        self.assertNotIn("<svg", self.page(self.record, other, "--compare", "--no-frames"))
        self.assertIn("The records do not differ", self.page(self.record, self.record, "--compare"))

    def test_a_folder_of_records(self):
        self.run_all()
        (self.directory / "other.jsonl").write_bytes(self.record.read_bytes())
        page = self.page(self.directory)
        self.assertIn("2 runs: 2 passed, 0 did not", page)
        self.assertLess(page.index("The runs of this page"), page.index('id="run1"'))
        self.assertIn('id="run2"', page)

    def test_a_record_that_was_cut(self):
        """At every line, there is a page that says so."""
        self.run_all()
        lines = self.record.read_text().splitlines(keepends=True)
        for count in range(1, len(lines), 7):
            self.record.write_text("".join(lines[:count]))
            result = quazor("report", self.record)
            self.assertEqual(result.returncode, 0, result.stderr)
            self.assertIn("the run did not end; the page ends with the record", result.stderr)
            self.assertIn('<p class="stop">The run did not come to its end', result.stdout)
            self.assertIn('<span class="word">ERROR</span>', result.stdout)

    def test_mistakes(self):
        self.run_all()
        noise = self.directory / "noise"
        noise.write_text("no record\n")
        for arguments, code, text in [
                (["report", noise], 66, "noise"),
                (["report", self.record, "--compare"], 64, "--compare takes two records, but there are 1"),
                (["report", self.record, noise, "--compare"], 66, "noise"),
                (["report", self.record, self.directory, "--compare"], 66, "folder"),
                (["report", self.record, noise], 66, "noise"),
                (["report", self.directory / "missing"], 66, "missing"),
                (["report", self.record, "--output", self.record], 73, "is a record"),
                (["report", self.record, "--output", "/dev/full"], 73, "/dev/full"),
                (["report", self.record, "--output", self.directory / "no" / "page.html"], 73, "page.html"),
        ]:
            with self.subTest(arguments=arguments):
                result = quazor(*arguments)
                self.assertEqual(result.returncode, code, result.stderr)
                self.assertIn(text, result.stderr)


class RerunTest(RecordTest):
    """The commands of a page repeat its run."""

    def commands_of(self, page):
        shown = re.search('<pre class="command">(.*?)</pre>', page.read_text(), re.DOTALL)
        return re.findall(r"(?:.*\\\n)*.*[^\\]\n", html.unescape(shown[1]))

    def repeat(self, command, record):
        """Runs a command as a shell reads it."""
        folder = self.directory / "bin"
        folder.mkdir(exist_ok=True)
        program = folder / "quazor"
        if not program.exists():
            program.symlink_to(PROGRAM)
        path = f"{folder}:{os.environ['PATH']}"
        return subprocess.run(["sh", "-c", f"{command.rstrip()} --record {shlex.quote(str(record))}"], text=True,
                              capture_output=True, timeout=120, env={**os.environ, "PATH": path}, cwd=self.directory)

    def test_the_results_are_the_same(self):
        profile = self.directory / "my limits.json"
        profile.write_text(json.dumps({"schema": 1, "base": "strict", "diagnostics": {
            "SingleCameraDiagnostic": {"experiment": {"camera": 1, "duration": 2},
                                       "limits": [{"limit": "Frames in [10, 59] frames", "name": "it's few"}]}}}))
        cases = (["--profile", "strict", "--phone", "camera_sync/frames_dropped", "--seed", "3"],
                 ["--profile", profile, "--limit", "*.Total >= 80", "--tag", "name=a 'b' $HOME"],
                 ["--phone", "camera_sync/frames_dropped", "--skip", "Tessel*=no 'lab' $0", "--repeat", "2"],
                 ["--set", "duration=4", "--limit", "*.NoSuch >= 80"])
        for place, case in enumerate(cases):
            with self.subTest(case=case):
                record = self.directory / f"{place}.jsonl"
                page = self.directory / f"{place}.html"
                first = quazor("run", "--all", *case, "--record", record, "--output", f"html:{page}")
                self.assertIn(first.returncode, (0, 1, 2), first.stderr)
                repeated = []
                for number, command in enumerate(self.commands_of(page)):
                    again = self.directory / f"{place}.{number}.jsonl"
                    result = self.repeat(command, again)
                    self.assertIn(result.returncode, (0, 1, 2), result.stderr)
                    names = [event["name"] for event in events_in(again) if event["event"] == "diagnosticBegan"]
                    repeated += names
                    lines = quazor("diff", record, again).stdout.splitlines()
                    # What another of the commands runs is not in this one.
                    self.assertEqual([line for line in lines if not line.endswith(" is only in the first")
                                      and line != "The records do not differ."], [])
                    self.assertFalse([line for line in lines if any(line.startswith(f"{name} ") for name in names)])
                self.assertEqual(set(repeated), {event["name"] for event in events_in(record)
                                                 if event["event"] == "diagnosticBegan"})


if __name__ == "__main__":
    unittest.main()
