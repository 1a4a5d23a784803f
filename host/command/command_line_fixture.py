"""Helpers for the tests of the program's command line.

CTest passes the program and the directory of the test plug-ins in the environment.
"""

import fcntl
import json
import os
import pathlib
import re
import signal
import subprocess
import tempfile
import unittest

PROGRAM = os.environ["QUAZOR_PROGRAM"]
PLUGINS = pathlib.Path(os.environ["QUAZOR_TEST_PLUGINS"])
WORKING = str(PLUGINS / "working_plugin.so")
EXPERIMENTS = str(PLUGINS / "experiments_plugin.so")

# Default directory for the record of the previous run.
STATE = tempfile.TemporaryDirectory()
os.environ["XDG_STATE_HOME"] = STATE.name
os.environ["XDG_DATA_HOME"] = STATE.name  # without any plug-in or scenario
for variable in ("QUAZOR_SET", "QUAZOR_PLUGIN_PATH"):
    os.environ.pop(variable, None)

SCENARIO = {
    "title": "One camera",
    "cameras": {"wide": {"port": "BackFacingCamera", "formats": [{"maximumFrameRate": 30}]}},
    "groups": {"back": {"cameras": ["wide"], "master": "wide"}},
    "faults": [],
}
UNFIRED_FAULT = {"operation": "CaptureStream.start", "action": "fail"}


def quazor(*arguments, **options):
    environment = {key: value for key, value in os.environ.items() if key not in ("NO_COLOR", "TERM")}
    environment.update(options.pop("env", {}))
    options.setdefault("stdout", subprocess.PIPE)
    options.setdefault("timeout", 120)
    return subprocess.run([PROGRAM, *map(str, arguments)], stderr=subprocess.PIPE, text=True, env=environment, **options)


def start(*arguments, ignored=False, **options):
    """Starts the program. SIGINT has its default action in it or, like in a background job of a shell, is ignored."""
    action = signal.SIG_IGN if ignored else signal.SIG_DFL
    options = {"stdout": subprocess.PIPE, "stderr": subprocess.PIPE, **options}
    return subprocess.Popen([PROGRAM, *map(str, arguments)], text=True,
                            preexec_fn=lambda: signal.signal(signal.SIGINT, action), **options)


def fill(writer):
    """Fills a pipe, so that it takes nothing more until somebody reads."""
    flags = fcntl.fcntl(writer, fcntl.F_GETFL)
    fcntl.fcntl(writer, fcntl.F_SETFL, flags | os.O_NONBLOCK)
    try:
        while True:
            os.write(writer, b"x" * 4096)
    except BlockingIOError:
        pass
    fcntl.fcntl(writer, fcntl.F_SETFL, flags)


def without_identity(document):
    """A JSON report without the ID and the date of its run, which differ between two runs."""
    changed, count = re.subn(r'"run": {\n    "id": "[0-9a-f]{32}",\n    "date": "[0-9TZ:.-]*"', '"run": {', document)
    assert count == 1, document[-500:]
    return changed


def without_run(text):
    """A text report without the lines at its beginning that say which run it was."""
    changed, count = re.subn(r"\A(?:Run |Analysis .*\nof run ).*\nPhone .*\n\n", "", text)
    assert count == 1, text[:500]
    return changed


def events_in(record):
    """The events of a record; each line must be complete."""
    text = pathlib.Path(record).read_text()
    assert text.endswith("\n"), text[-100:]
    return [json.loads(line) for line in text.splitlines()]


class CommandLineTest(unittest.TestCase):
    def setUp(self):
        directory = tempfile.TemporaryDirectory()
        self.addCleanup(directory.cleanup)
        self.directory = pathlib.Path(directory.name)
        self.phone = self.write("phone.json", json.dumps(SCENARIO))
        self.output = self.directory / "out.json"

    def write(self, name, content):
        path = self.directory / name
        path.write_text(content)
        return path

    def run_fake(self, *arguments, names=("Fake.One",), duration=1, **options):
        """Runs the fake diagnostic, which passes unless the arguments say otherwise."""
        fixed = ["--plugin", WORKING, "--phone", self.phone, "--profile", "none"]
        if duration is not None:
            fixed += ["--set", f"duration={duration}"]
        return quazor("run", *names, *fixed, *arguments, **options)

    def assert_verifies(self, record):
        result = quazor("verify", record)
        self.assertEqual(result.returncode, 0, result.stdout + result.stderr)

    def assert_refused(self, result, code, *texts):
        """Checks the exit code and each text on standard error; standard output must be empty and no device used."""
        self.assertEqual(result.returncode, code, result.stderr)
        self.assertTrue(result.stderr.startswith("quazor: "), result.stderr)
        for text in texts:
            self.assertIn(text, result.stderr)
        self.assertEqual(result.stdout, "")
        self.assertFalse(self.output.exists())
        self.assertEqual([path.name for path in self.directory.glob("*.tmp")], [])


def analyze(record, *arguments, **options):
    """Analyzes a record of the fake diagnostic, whose plug-in is not installed."""
    return quazor("analyze", record, "--plugin", WORKING, *arguments, **options)


class RecordTest(CommandLineTest):
    def setUp(self):
        super().setUp()
        self.record = self.directory / "run.jsonl"

    def recorded(self, *arguments, code=0, record=None, **options):
        """Returns a record of a run of the fake diagnostic."""
        record = record or self.record
        result = self.run_fake("--record", record, "--replace", *arguments, **options)
        self.assertEqual(result.returncode, code, result.stderr)
        return record

    def changed(self, change):
        """Writes a copy of the record with changed events."""
        events = events_in(self.record)
        change(events)
        return self.write("changed.jsonl", "".join(json.dumps(event) + "\n" for event in events))
