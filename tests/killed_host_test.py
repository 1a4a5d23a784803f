#!/usr/bin/env python3
"""Checks that killing the program leaves a record of everything that the user has seen, and no process.

    killed_host_test.py PROGRAM PLUGINS

PLUGINS is the directory with the plug-ins of misbehaving/. PROGRAM is killed (SIGKILL) at random times:
while it loads and describes plug-ins, while log lines flood, while a process sleeps and between two diagnostics.
With QUAZOR_THOROUGH=1 in the environment there are 200 kills, otherwise 20; QUAZOR_SEED changes the times.
"""

import collections
import functools
import json
import os
import pathlib
import random
import re
import signal
import subprocess
import sys
import tempfile
import time
import unittest

from marked_processes import end_processes, environment_with_marker, processes_in
from pace import slowdown
from report_readers import printable

KILLS = 200 if os.environ.get("QUAZOR_THOROUGH") == "1" else 20
SEED = int(os.environ.get("QUAZOR_SEED", "1"))
LONGEST_DEATH = 5.0  # seconds on an idle machine until a child notices the end of its parent
KILLS_PER_LENGTH = 5  # the length of a run is measured again after so many kills, as the load changes
COUNT = 2000  # of log lines, measurements and results
# The diagnostics in order: quiet and loud ones, and one that never ends.
NAMES = ("CrashInRun", "LogFlood", "WellBehaved", "ManyMeasurements", "GarbageToOutput", "ForkIntoHost", "ManyResults",
         "CrashInAnalysis", "CloseConnection", "Abort", "HangInRun")
# Diagnostics whose processes try to outlive the program.
ESCAPES = ("ForgetParent", "ForgetParentAndSignals", "ForgetParentAndDescriptors", "LeaveDaemon")
LOG_LINE = re.compile(r"(?:\d{4}-\d\d-\d\d )?\S+ (error|default|debug) quazor: (.*)")
VERDICTS = {"PASS": "pass", "FAIL": "fail", "ERROR": "error"}


def whole_lines(file):
    """The complete lines of a file."""
    content = file.read_bytes() if file.exists() else b""
    return content.decode("utf-8", errors="surrogateescape").split("\n")[:-1]


def shown_verdicts(lines):
    """The names and verdicts in a text report: a name begins a line, and its verdict is below it."""
    name, shown = None, []
    for line in lines:
        if line and not line.startswith(" "):
            name = line
        elif line.strip() in VERDICTS:
            shown.append((name, VERDICTS[line.strip()]))
    return shown


def recorded_verdicts(events):
    name, recorded = None, []
    for event in events:
        if event["event"] == "diagnosticBegan":
            name = event["name"]
        elif event["event"] == "diagnosticEnded":
            recorded.append((name, event["verdict"]))
    return recorded


class Killed:
    """A run of the program that was killed, and the files that it left. `wait` returns at the time of the kill."""

    def __init__(self, directory, wait, names=NAMES, settings=("--set", f"count={COUNT}")):
        self.record = directory / "record.jsonl"
        environment = environment_with_marker(XDG_STATE_HOME=str(directory), MISBEHAVIOUR_STATE=str(directory / "state"))
        command = [PROGRAM, "run", *names, "--verbose", "--record", str(self.record), "--log-level", "debug",
                   *settings]
        for plugin in ("misbehaving", "well_behaved"):
            command += ["--plugin", str(PLUGINS / f"{plugin}.so")]
        with open(directory / "out", "wb") as out, open(directory / "err", "wb") as err:
            process = subprocess.Popen(command, stdin=subprocess.DEVNULL, stdout=out, stderr=err, env=environment)
            wait()
            self.had_children = len(processes_in(environment)) > 1
            process.send_signal(signal.SIGKILL)
            self.code = process.wait()
        self.left = processes_in(environment)
        limit = time.monotonic() + LONGEST_DEATH * (slowdown() if self.left else 1)
        while self.left and time.monotonic() < limit:
            time.sleep(0.01)
            self.left = processes_in(environment)
        end_processes(self.left)
        self.verdicts = shown_verdicts(whole_lines(directory / "out"))
        found = [LOG_LINE.fullmatch(line) for line in whole_lines(directory / "err")]
        self.log = [(match[1], match[2]) for match in found if match]
        self.events = [json.loads(line) for line in whole_lines(self.record)]

    @property
    def moment(self):
        """The activity of the program according to the last complete line of the record."""
        if not self.events:
            return "before the first event"
        last = self.events[-1]["event"]
        if last in ("runBegan", "diagnosticEnded"):
            return "between two"
        return {"log": "while logging", "measured": "while measuring", "found": "while finding"}.get(last, "elsewhere")


class KilledHostTest(unittest.TestCase):
    def test_what_was_seen_is_in_the_record_and_nothing_is_left(self):
        chance = random.Random(SEED)
        tally = collections.Counter()
        for number in range(KILLS):
            if number % KILLS_PER_LENGTH == 0:
                longest = self.length_of_run()
            # The first tenth of a run, in which the plug-ins are loaded, gets its own share of the kills.
            seconds = chance.uniform(0, longest * (0.1 if number % 10 == 0 else 1.05))
            with self.subTest(number=number, seconds=seconds), tempfile.TemporaryDirectory() as directory:
                killed = Killed(pathlib.Path(directory), functools.partial(time.sleep, seconds))
                self.check(killed)
                tally[killed.moment] += 1
                tally["(with a child)"] += killed.had_children
                tally["(verdicts seen)"] += len(killed.verdicts)
                tally["(log lines seen)"] += len(killed.log)
        print(f"{KILLS} kills within {longest:.2f} s: " + ", ".join(f"{n} {what}" for what, n in sorted(tally.items())))
        self.assertGreater(tally["(with a child)"], KILLS / 3)
        self.assertGreater(tally["(verdicts seen)"], KILLS)
        self.assertGreater(tally["(log lines seen)"], KILLS)

    def test_no_process_escapes(self):
        for name in ESCAPES:
            with self.subTest(name), tempfile.TemporaryDirectory() as directory:
                state = pathlib.Path(directory) / "state"

                def wait():
                    limit = time.monotonic() + 60
                    while not state.exists():
                        self.assertLess(time.monotonic(), limit, "the diagnostic has not begun")
                        time.sleep(0.005)

                killed = Killed(pathlib.Path(directory), wait, [name], [])
                self.assertEqual(killed.code, -signal.SIGKILL)
                self.assertTrue(killed.had_children)
                self.assertEqual(killed.left, [], "processes are left")

    def length_of_run(self):
        """The time in seconds until the diagnostic that never ends runs."""
        with tempfile.TemporaryDirectory() as directory:
            record = pathlib.Path(directory) / "record.jsonl"
            begin = time.monotonic()

            def wait():
                while f'"diagnosticBegan","name":"{NAMES[-1]}"' not in "".join(whole_lines(record)):
                    self.assertLess(time.monotonic() - begin, 60, "the run does not come to its last diagnostic")
                    time.sleep(0.1)

            self.check(Killed(pathlib.Path(directory), wait))
            return time.monotonic() - begin

    def check(self, killed):
        self.assertEqual(killed.code, -signal.SIGKILL)
        self.assertEqual(killed.left, [], "processes are left")
        self.assertEqual(killed.verdicts, recorded_verdicts(killed.events)[:len(killed.verdicts)])
        logged = [one for one in killed.events if one["event"] == "log" and isinstance(one["text"], str)]
        recorded = collections.Counter((one["level"], printable(one["text"])) for one in logged)
        seen = collections.Counter((level, text) for level, text in killed.log if r"\x" not in text)
        self.assertEqual(seen - recorded, collections.Counter(), "lines were seen that are not in the record")
        if not killed.events:  # killed before it could have shown anything
            self.assertEqual((killed.verdicts, killed.log), ([], []))
            return
        done = subprocess.run([PROGRAM, "verify", str(killed.record)], stdout=subprocess.PIPE,
                              stderr=subprocess.STDOUT, encoding="utf-8", check=False)
        self.assertEqual(done.returncode, 3, done.stdout)
        self.assertIn(f"{len(killed.events)} event", done.stdout)
        self.assertIn(" 0 problems\nThe record is incomplete: the run did not end", done.stdout)


if __name__ == "__main__":
    PLUGINS, PROGRAM = pathlib.Path(sys.argv.pop()), sys.argv.pop()
    unittest.main()
