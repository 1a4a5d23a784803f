#!/usr/bin/env python3
"""Checks that a misbehaving plug-in affects only its own diagnostic.

    misbehaving_test.py PROGRAM PLUGINS --sanitizers=SANITIZERS

PLUGINS is the directory with the plug-ins of misbehaving/. Each case runs one diagnostic and then a well-behaved
one in the same call of PROGRAM. The first must end as its case specifies, within its deadline; the second must pass
in an unchanged environment; the record must contain everything up to the end and must pass verification; and no
process may be left. SANITIZERS, which may be empty, lists the sanitizers of the program's build; memory limits do
not work with them, so the cases that need one are skipped.

With QUAZOR_THOROUGH=1 in the environment floods have a million items, otherwise fewer.
"""

import concurrent.futures
import datetime
import functools
import json
import os
import pathlib
import subprocess
import sys
import tempfile
import time
import unittest

from marked_processes import end_processes, environment_with_marker, processes_in
from misbehaving_cases import (CANNOT_BE_JUDGED, CASES, CRASHED, EXITED, GRACE, HOST, LATER_CRASH, LIMIT, MANY, MARGIN, MEMORY,
                               NOTHING_MEASURED, WELL_BEHAVED, Outcome)
from pace import slowdown


def events_in(file):
    return [json.loads(line) for line in file.read_text(encoding="utf-8").splitlines()]


def run(names, plugins, options=(), shell='exec "$@"', directory=None):
    """Runs the diagnostics in one call of the program; in `directory`, if given, with relative names of plug-ins."""
    folder = pathlib.Path() if directory else PLUGINS
    with tempfile.TemporaryDirectory() as state:
        record = pathlib.Path(state) / "record.jsonl"
        command = ["sh", "-c", shell, "sh", PROGRAM, "run", *names, *options, "--record", str(record)]
        for plugin in plugins:
            command += ["--plugin", str(folder / f"{plugin}.so")]
        # The sanitizers must not intercept crashes.
        sanitizers = "handle_segv=0:handle_abort=0:die_after_fork=0"
        environment = environment_with_marker(
            XDG_STATE_HOME=state, MISBEHAVIOUR_STATE=os.path.join(state, "state"),
            ASAN_OPTIONS=sanitizers + ":detect_leaks=0", TSAN_OPTIONS=sanitizers)
        slowdown_before = slowdown()
        begin = time.monotonic()
        done = subprocess.run(command, cwd=directory, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                              env=environment, encoding="utf-8", errors="surrogateescape",
                              timeout=300 if MANY < 1_000_000 else 3000, check=False)
        seconds = time.monotonic() - begin
        left = processes_in(environment)
        end_processes(left)
        slowest = max(slowdown_before, slowdown())
        verified = subprocess.run([PROGRAM, "verify", str(record)], stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                                  encoding="utf-8", check=False)
        return Outcome(done.returncode, done.stdout, done.stderr, seconds, slowest, events_in(record), record.stat().st_size,
                       verified, left)


def memory_options(case):
    return ("--memory", str(MEMORY)) if case.needs_memory_limit else ()


def outcome_of(case):
    options = [*memory_options(case), *case.options]
    if case.hangs:
        options += ["--deadline", f"{case.stage}={LIMIT}"]
    if case.count:
        options += ["--set", f"count={case.count}"]
    names = [WELL_BEHAVED] if case.name.endswith(".so") else [case.name, WELL_BEHAVED]
    return run(names, [*case.plugins, "well_behaved"], options, case.shell)


@functools.lru_cache(maxsize=None)
def usual_surroundings(options, shell):
    return surroundings(run([WELL_BEHAVED], ["well_behaved"], options, shell))


def surroundings(outcome):
    return {one["key"]: one["value"] for one in outcome.about(WELL_BEHAVED) if one["event"] == "collected"}


def moment(event):
    return datetime.datetime.fromisoformat(event["date"].replace("Z", "+00:00"))


class MisbehavingTest(unittest.TestCase):
    maxDiff = 2000

    def test_surroundings_are_what_the_program_promises(self):
        told = usual_surroundings(("--memory", "2048") if not SANITIZERS else (), 'umask 027; exec "$@"')
        if not SANITIZERS:
            self.assertEqual(told["memory"], {"unsigned": 2048 * 1024 * 1024})
        self.assertEqual(told["directory"], {"string": os.getcwd()})
        self.assertEqual(told["umask"], {"unsigned": 0o027})
        self.assertEqual(told["descriptors"], {"string": "0 1 2 250 "})
        self.assertEqual(told["leads its group"], {"boolean": True})
        self.assertIn("SigBlk:\t0000000000000000", str(told["status"]["string"]))

    def test_what_is_not_selected_is_not_described(self):
        outcome = run([WELL_BEHAVED], ["hanging_in_description", "misbehaving_in_description", "well_behaved"],
                      ["--deadline", "describe=30"])
        self.assertEqual(outcome.code, 0, outcome.err)
        self.assertLess(outcome.seconds, 30)
        self.assertEqual(outcome.about(WELL_BEHAVED)[-1]["verdict"], "pass")

    def test_all_that_is_selected_is_described(self):
        outcome = run(["--all"], ["misbehaving_in_description", "well_behaved"])
        self.assertEqual(outcome.code, 2, outcome.err)
        for name in ("CrashWhenDescribed", "ExitWhenDescribed", "ThrowWhenDescribed"):
            failures = [one for one in outcome.about(name) if one["event"] == "failed"]
            self.assertEqual([one["stage"] for one in failures], ["describe"], name)
        self.assertEqual(outcome.about(WELL_BEHAVED)[-1]["verdict"], "pass")

    def test_a_plug_in_that_crashes_at_a_later_load_harms_its_own_diagnostic_only(self):
        for way, stage in (("FirstTime", "describe"), ("SecondTime", "load")):
            name = f"Loaded.crashAfterThe{way}"
            outcome = run([WELL_BEHAVED, name], [f"crashAfterThe{way}_on_load", "well_behaved"])
            self.assertEqual(outcome.code, 2, outcome.err)
            self.assertEqual(outcome.about(WELL_BEHAVED)[-1]["verdict"], "pass")
            failed = [one for one in outcome.about(name) if one["event"] == "failed"]
            self.assertEqual([(one["stage"], one["error"]["code"]) for one in failed], [(stage, CRASHED)])

    def test_a_plug_in_is_not_loaded_again_to_describe_others(self):
        outcome = run(["CrashWhenDescribed", "ExitWhenDescribed", WELL_BEHAVED],
                      [LATER_CRASH, "misbehaving_in_description", "well_behaved"])
        self.assertEqual(outcome.code, 2, outcome.err)
        failed = [one for one in outcome.events if one["event"] == "failed"]
        self.assertEqual([(one["stage"], one["error"]["code"]) for one in failed],
                         [("describe", CRASHED), ("describe", EXITED)])
        self.assertEqual(outcome.about(WELL_BEHAVED)[-1]["verdict"], "pass")

    def test_a_plug_in_that_aborts_later_harms_no_other(self):
        outcome = run([WELL_BEHAVED, "Loaded.takeASecond"],
                      ["abortLater_on_load", "takeASecond_on_load", "well_behaved"])
        self.assertEqual(outcome.code, 0, outcome.out + outcome.err)

    def test_a_plug_in_that_changes_the_directory_harms_no_other(self):
        outcome = run([WELL_BEHAVED], ["changeDirectory_on_load", "well_behaved"], directory=PLUGINS)
        self.assertEqual(outcome.code, 0, outcome.out + outcome.err)

    def test_a_process_that_kills_its_guard_does_not_pass_and_leaves_nothing(self):
        outcome = run(["KillGuardAndFinish", WELL_BEHAVED], ["misbehaving", "well_behaved"])
        self.assertEqual(outcome.code, 2, outcome.err)
        events = outcome.about("KillGuardAndFinish")
        self.assertEqual(events[-1]["verdict"], "error")
        failed, = [one for one in events if one["event"] == "failed"]
        self.assertIn("lost the process that guards its own", str(failed["error"]["userInfo"]))
        self.assertEqual(outcome.left, [], "processes are left")
        self.assertEqual(outcome.about(WELL_BEHAVED)[-1]["verdict"], "pass")

    def check(self, case, outcome):
        events = outcome.about(case.name)
        self.check_end(case, outcome, events)
        self.check_time(case, outcome, events)
        self.check_what_came_before(case, events)
        self.assertEqual(outcome.left, [], "processes are left")
        verdicts = "1 pass, 1 error" if case.code else "2 pass"
        self.assertEqual((outcome.verified.returncode, outcome.verified.stdout.splitlines()[-1:]),
                         (0, [f"{len(outcome.events)} events, 2 verdicts ({verdicts}), 0 problems"]))
        self.check_well_behaved(case, outcome)
        if case.check is not None:
            case.check(outcome, self)

    def check_end(self, case, outcome, events):
        self.assertEqual(outcome.code, 2 if case.code else 0, outcome.err)
        self.assertEqual(events[-1]["verdict"], "error" if case.code else "pass")
        failures = [one for one in events if one["event"] == "failed"]
        self.assertEqual(len(failures), 1 if case.code else 0)
        for failure in failures:
            error = failure["error"]
            self.assertEqual((error["domain"], error["code"]), (HOST, case.code))
            self.assertIn(case.message, str(error["userInfo"]))
            self.assertIn(case.message, outcome.out)
            judged = case.code in (CANNOT_BE_JUDGED, NOTHING_MEASURED)
            self.assertEqual(failure.get("stage"), None if judged else case.stage)

    def check_time(self, case, outcome, events):
        margin = MARGIN * outcome.slowdown
        if case.hangs:
            self.assertGreaterEqual(outcome.seconds, LIMIT)
        if case.stage in ("load", "describe"):
            self.assertLess(outcome.seconds, LIMIT + margin)
            return
        begin = next(one for one in events if one["event"] == "stageBegan" and one["stage"] == case.stage)
        seconds = (moment(events[-1]) - moment(begin)).total_seconds()
        if case.hangs:
            self.assertGreaterEqual(seconds, LIMIT + GRACE if case.grace else LIMIT)
            self.assertLess(seconds, LIMIT + GRACE + margin)
        elif not case.count and not case.floods:
            self.assertLess(seconds, GRACE + margin)

    def check_what_came_before(self, case, events):
        if case.count or case.stage in ("load", "describe"):
            return
        log = [one["text"] for one in events if one["event"] == "log"]
        self.assertIn(f"{case.name} begins", log)
        for line in case.log:
            self.assertIn(line, log)
        if case.stage in ("teardown", "analyze") and case.name != "EmptyResult":
            measured = [one["measurements"] for one in events if one["event"] == "measured"]
            self.assertEqual(measured, [[["Answer", [42.0, "events"]]]])

    def check_well_behaved(self, case, outcome):
        events = outcome.about(WELL_BEHAVED)
        self.assertEqual([one for one in events if one["event"] == "failed"], [])
        self.assertEqual(events[-1]["verdict"], "pass")
        self.assertEqual([one["text"] for one in events if one["event"] == "log"], ["the well-behaved one runs"])
        self.assertEqual(surroundings(outcome), usual_surroundings((*memory_options(case), *case.options), case.shell))
        self.assertEqual(outcome.events[-1]["event"], "runEnded")


def add_tests():
    """One test per case. Several cases run at once because most of them sleep; each test waits for its own."""
    pool = concurrent.futures.ThreadPoolExecutor(3)
    for number, case in enumerate(CASES):
        if case.needs_memory_limit and SANITIZERS:
            def test(_, reason=f"no limit of memory with {SANITIZERS}"):
                raise unittest.SkipTest(reason)
        else:
            def test(self, case=case, outcome=pool.submit(outcome_of, case)):
                self.check(case, outcome.result())
        setattr(MisbehavingTest, f"test_{number:02}_{case.name.removesuffix('.so')}", test)


if __name__ == "__main__":
    SANITIZERS = sys.argv.pop().removeprefix("--sanitizers=")
    PLUGINS, PROGRAM = pathlib.Path(sys.argv.pop()), sys.argv.pop()
    add_tests()
    unittest.main()
