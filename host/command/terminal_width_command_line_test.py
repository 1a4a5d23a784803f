"""What the program prints on terminals of several widths: no line is wider than its terminal, and nothing is lost."""

import os
import re
import shlex
import shutil
import signal
import time
import unittest

from command_line_fixture import RecordTest, quazor
from terminal_fixture import CSI, PLAIN, UTF8, Terminal, lines_on_screen, on_terminal, width_of

WIDTHS = (40, 80, 200)
DROPPED = "camera_sync/frames_dropped"


def squeezed(text):
    return re.sub(r"\s", "", CSI.sub("", text))


def without_identity(text):
    """What two runs of the same diagnostics have in common."""
    return re.sub(r"\b[0-9a-f]{32}\b", "ID", re.sub(r"\d{4}-\d\d-\d\dT[\d:.]+Z", "DATE", text))


class TerminalWidthTest(RecordTest):
    def commands(self):
        record = self.recorded()
        other = self.directory / "other.jsonl"
        self.recorded("--set", "duration=2", record=other, duration=None)
        files = self.directory / "records"
        files.mkdir()
        for name in ("one", "two_with_a_name_that_is_longer_than_forty_columns"):
            shutil.copy(record, files / f"{name}.jsonl")
        (files / "broken.jsonl").write_text(record.read_text().replace('"pass"', '"fail"'))
        return [
            [], ["--help"], ["run", "--help"], ["selftest", "--help"], ["phone", "--help"], ["list"],
            ["list", "--plugin", "sensor_images"],
            ["describe", "*"], ["run", "--all"], ["run", "--all", "--verbose"],
            ["run", "--all", "--phone", DROPPED, "--profile", "strict"],
            ["run", "--all", "--phone", DROPPED, "--profile", "strict", "--verbose"],
            ["run", "--all", "--phone", "camera_sync/start_refused_on_first"],
            ["run", "--all", "--skip", "Camera*=the cameras of this phone are with a colleague in another building"],
            ["run", "CameraSyncDiagnostic.Back", "--log-level", "debug"],
            ["run", "SingleCameraDiagnostic", "--repeat", "3", "--phone", "single_camera/fast"],
            ["experiment", "NimbeImageExperiment", "--plugin", "sensor_images", "--set", "imagesRequested=1"],
            ["experiment", "CameraSyncExperiment.Back"],
            ["explain"], ["explain", "BackTele.Total"], ["explain", "QZCapturePlugInErrorDomain:206"],
            ["selftest", DROPPED, "healthy"], ["doctor"], ["verify", record], ["verify", files],
            ["phone", "list"],
            ["diff", record, other], ["run", "nothing"], ["lst"], ["run", "--limit", "x", "--all"],
        ]

    def test_no_line_is_wider_than_the_terminal(self):
        commands = self.commands()
        # What stands for characters of UTF-8 is wider, which matters where there is the least room.
        for columns, env in (*((columns, UTF8) for columns in WIDTHS), (min(WIDTHS), PLAIN)):
            for arguments in commands:
                with self.subTest(arguments=arguments, columns=columns, env=env):
                    code, output = on_terminal(columns, *arguments, env=env)
                    self.assertLess(code, 70, output)
                    self.assertGreaterEqual(code, 0, output)
                    self.assertTrue(output)
                    for line in lines_on_screen(output):
                        self.assertLessEqual(width_of(line), columns, line)
                    if env is PLAIN:
                        self.assertTrue(output.isascii(), output)

    def test_nothing_is_lost_on_a_narrow_terminal(self):
        # Names, numbers and limits are there as often as in a pipe, whatever the layout. A block needs neither a heading
        # for its first line nor cells without a value.
        left_out = {"-", "Parameter", "Value", "Result", "Phone", "Run"}
        for arguments in (["list"], ["describe", "*"], ["run", "--all", "--verbose"],
                          ["run", "--all", "--phone", DROPPED, "--profile", "strict", "--verbose"],
                          ["explain"], ["explain", "BackTele.Total"], ["selftest", DROPPED, "healthy"], ["doctor"],
                          ["run", "--help"]):
            with self.subTest(arguments):
                wide = re.sub(r"\ARun .*\n", "", quazor(*arguments).stdout)  # another run
                narrow = squeezed(on_terminal(40, *arguments)[1].decode())
                words = [word for word in wide.split() if word not in left_out]
                self.assertGreater(len(words), 10)
                for word in set(words):
                    # A word may also be a part of others.
                    self.assertGreaterEqual(narrow.count(word), sum(one.count(word) for one in words), word)

    def test_a_pipe_has_no_width(self):
        for columns in ("40", "200"):
            result = quazor("run", "--all", "--verbose", env={"COLUMNS": columns})
            self.assertIn("  Number Vok INT_FAULT_STROBE_SHORT_LATCH          0  events  Limit: = 0              pass\n",
                          result.stdout)
        self.assertTrue(any(len(line) > 80 for line in quazor("--help").stdout.splitlines()))

    def test_output_for_programs_is_not_folded(self):
        for arguments in (["list", "--format", "json"], ["run", "--all", "--format", "json"],
                          ["run", "--all", "--format", "csv"], ["describe", "*", "--format", "json"],
                          ["completion", "bash"]):
            with self.subTest(arguments):
                code, output = on_terminal(40, *arguments)
                self.assertEqual(code, 0)
                text = "".join(line + "\n" for line in output.decode().replace("\r\n", "\n").split("\n")[:-1])
                text = re.sub(r"Running [^\r]*|\r\x1b\[K", "", text)
                self.assertEqual(without_identity(text), without_identity(quazor(*arguments).stdout))

    def test_wide_characters_count_twice(self):
        scenario = self.phone.read_text().replace("One camera", "\u76f8\u673a\u6d4b\u8bd5" * 12 + " e\u0301" * 30)
        phone = self.write("wide.json", scenario)
        limit = "Count >= -1"
        profile = self.write("wide_limit.json", '{"schema": 1, "diagnostics": {"Fake.One": {"limits": [{"limit": "'
                             + limit + '", "name": "' + "\u6bcf\u4e2a" * 20 + " e\u0301\u0300" * 9 + '"}]}}}')
        for columns in WIDTHS:
            for env in (UTF8, PLAIN):
                code, output = on_terminal(
                    columns, "run", "Fake.One", "--plugin", os.environ["QUAZOR_TEST_PLUGINS"] + "/working_plugin.so",
                    "--phone", phone, "--profile", "none", "--set", "duration=1", "--parameters", profile, env=env)
                self.assertEqual(code, 0, output)
                for line in lines_on_screen(output):
                    self.assertLessEqual(width_of(line), columns, line)
                if env is UTF8:
                    self.assertEqual(squeezed(output.decode()).count("\u6bcf\u4e2a"), 20)
                else:
                    self.assertIn(b"\\xe6\\xaf\\x8f", output)

    def test_progress_shortens_the_name_and_keeps_the_numbers(self):
        arguments = ["run", "CameraSyncDiagnostic.Back", "--realtime", "--set", "duration=2"]
        code, output = on_terminal(40, *arguments)
        self.assertEqual(code, 0, output)
        progress = [line for line in lines_on_screen(output) if " s of 2 s" in line]
        self.assertTrue(progress, output)
        for line in progress:
            self.assertLess(width_of(line), 40)
        self.assertRegex(output.decode(), r"Running CameraSyncDiag\.\.\.: [0-9.]+ s of 2 s")
        self.assertRegex(on_terminal(80, *arguments)[1].decode(), r"Running CameraSyncDiagnostic\.Back: [0-9.]+ s of 2 s")

    def test_a_terminal_may_change_its_width_during_a_run(self):
        terminal = Terminal(80, "run", "CameraSyncDiagnostic.Back", "--realtime", "--set", "duration=3", "--verbose")
        before = terminal.read_for(30, until=b"Running CameraSyncDiagnostic.Back: ")
        terminal.resize(40)
        os.killpg(terminal.process.pid, signal.SIGWINCH)
        time.sleep(0.3)
        skipped = terminal.read_for(0.2)
        code, output = terminal.finish()
        self.assertEqual(code, 0, before + skipped + output)
        for line in lines_on_screen(output):
            self.assertLessEqual(width_of(line), 40, line)
        self.assertIn("PASS", output.decode())

    def test_the_command_to_type_next_is_never_broken(self):
        _, output = on_terminal(40, "run", "--all", "--phone", DROPPED, "--profile", "strict")
        end = CSI.sub("", output.decode()).replace("\r\n", "\n").splitlines()[-2:]
        self.assertEqual(end, ["Next: quazor explain BackTele.Total", "      quazor explain FrontInfrared.Total"])
        for line in end:
            command = shlex.split(line.removeprefix("Next: "))
            self.assertEqual(quazor(*command[1:]).returncode, 0)


if __name__ == "__main__":
    unittest.main()
