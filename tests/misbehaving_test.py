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
from dataclasses import dataclass

from marked_processes import end_processes, environment_with_marker, processes_in
from pace import slowdown

HOST = "QuazorHostErrorDomain"
EXCEPTION, NOTHING_MEASURED, CANNOT_BE_JUDGED, CRASHED, EXITED, DEADLINE, CONNECTION_LOST = 2, 4, 5, 6, 7, 8, 9
TOO_DEEP = 13
WELL_BEHAVED = "WellBehaved"
LATER_CRASH = "crashAfterTheFirstTime_on_load"  # the plug-in can be loaded once
LATER_CRASH_DIAGNOSTIC = "Loaded.crashAfterTheFirstTime"
STAGES = ("load", "describe", "setup", "run", "teardown", "analyze")
LIMIT = 1  # seconds, for a stage that hangs
GRACE = 0.5  # seconds between SIGTERM and SIGKILL
MARGIN = 3.0  # seconds on an idle machine; multiplied by the slowdown of a busy one
MEMORY = 256  # mebibytes
MANY = 1_000_000 if os.environ.get("QUAZOR_THOROUGH") == "1" else 5_000


@dataclass
class Case:
    """The expected outcome of a diagnostic. `stage` is the one that ends badly."""

    name: str
    code: int = 0  # code of the host's error; 0: the diagnostic passes
    message: str = ""  # the error's message contains this
    stage: str = "run"
    log: tuple = ()  # lines that the record contains in addition to the first one
    plugins: tuple = ("misbehaving",)
    options: tuple = ()
    shell: str = 'exec "$@"'  # runs the program
    hangs: bool = False  # it exceeds the deadline
    grace: bool = False  # and ignores SIGTERM
    floods: bool = False  # it needs extra time for a large amount of something
    needs_memory_limit: bool = False
    check: object = None  # takes the case's Outcome and a TestCase
    count: int = 0  # the value of the diagnostic's parameter of that name, if it has one
    options: tuple = ()  # more options of the program


@dataclass
class Outcome:
    """The outcome of a call of the program."""

    code: int
    out: str
    err: str
    seconds: float
    slowdown: float  # of this machine during the call
    events: list  # of the record
    size: int  # of the record, in bytes
    verified: subprocess.CompletedProcess
    left: list  # the IDs of remaining processes

    def about(self, name):
        """The events of a diagnostic."""
        names = [one["name"] if one["event"] == "diagnosticBegan" else None for one in self.events]
        first = names.index(name)
        last = next(i for i, one in enumerate(self.events) if i > first and one["event"] == "diagnosticEnded")
        return self.events[first:last + 1]


def hang(name, stage="run", **more):
    return Case(name, DEADLINE, f"the stage {stage} of {name} exceeded its deadline of {LIMIT} s",
                stage=stage, hangs=True, **more)


def crash(name, stage="run", number=11, **more):
    ending = {6: "signal 6 (SIGABRT)", 11: "signal 11 (SIGSEGV)"}[number]
    return Case(name, CRASHED, f"the stage {stage} of {name} crashed: its process was terminated by {ending}",
                stage=stage, **more)


def leave(name, stage="run", code=0, **more):
    return Case(name, EXITED, f"the stage {stage} of {name} ended its own process with exit code {code}", stage=stage,
                **more)


def lose_connection(name, **more):
    return Case(name, CONNECTION_LOST, f"the stage run of {name} closed or overwrote its process's connection to quazor",
                **more)


def lose_guard(name):
    return Case(name, CONNECTION_LOST, f"the stage run of {name} lost the process that guards its own")


def too_deep(name, **more):
    return Case(name, TOO_DEEP, f"the entry 'deep' in the result of {name}Experiment is nested more than 500 levels deep",
                stage="run", **more)


def of_result(name, code, message):
    """The result of the analysis is unusable."""
    return Case(name, code, message, stage="analyze")


def on_load(way, code, message, **more):
    plugin = f"{way}_on_load"
    return Case(f"{plugin}.so", code, message, stage="load", plugins=(plugin,), **more)


def described(name, code, message, plugin="misbehaving_in_description", **more):
    return Case(name, code, message, stage="describe", plugins=(plugin,), **more)


def after_results(name, code, message, **more):
    return Case(name, code, f"{name}, after its results, {message}", stage="analyze", **more)


def texts(outcome, name, event, key):
    return [one[key] for one in outcome.about(name) if one["event"] == event]


def dropped_lines(outcome, test):
    lines = [str(text) for text in texts(outcome, "FloodOfLines", "log", "text")]
    test.assertEqual(sum(line.startswith("output: as many lines") for line in lines), 10_000)
    count = 100 * -(-1_000_000 // 47)  # a flood of a hundred blocks of complete lines
    test.assertIn(f"{count - 10_000} more lines of output were dropped", lines)


def record_stays_small(outcome, test):
    test.assertLess(outcome.size, 10_000_000)
    test.assertIn("more lines of output were dropped", str(outcome.about("FloodWithoutLines")))


def all_lines(outcome, test):
    test.assertEqual(flood(outcome), [f"line {i}" for i in range(MANY)])


def flood(outcome):
    return [text for text in texts(outcome, "LogFlood", "log", "text") if str(text).startswith("line ")]


def all_lines_but_ten(outcome, test):
    test.assertEqual(flood(outcome), [f"line {i}" for i in range(MANY - 10)])
    test.assertEqual(texts(outcome, "LogFlood", "log", "text")[-1], "10 more log lines were left out (--log-limit)")


def all_measurements(outcome, test):
    measured = [one for chunk in texts(outcome, "ManyMeasurements", "measured", "measurements") for one in chunk]
    test.assertEqual([one[0] for one in measured], ["count"] + [f"number {i}" for i in range(MANY)])
    test.assertEqual([one[1][0] for one in measured], [MANY] + list(range(MANY)))


def all_results(outcome, test):
    found = [one for chunk in texts(outcome, "ManyResults", "found", "results") for one in chunk]
    test.assertEqual([one["measurement"][0] for one in found], list(range(MANY)))


def one_set_of_events(outcome, test):
    """Checks that a copy of the process reported nothing."""
    test.assertNotIn("the copy logs", texts(outcome, "ForkIntoHost", "log", "text"))
    begun = texts(outcome, "ForkIntoHost", "stageBegan", "stage")
    test.assertEqual(begun, [stage for stage in STAGES if stage in begun])
    test.assertEqual(len(texts(outcome, "ForkIntoHost", "found", "results")), 1)


def odd_texts(outcome, test):
    log = texts(outcome, "OddTexts", "log", "text")
    test.assertIn({"hex": b"two\nlines, a \0 and \xff\x1b[2J".hex()}, log)
    test.assertIn("x" * (1 << 20), log)
    names = [one[0] for one in texts(outcome, "OddTexts", "measured", "measurements")[0]]
    test.assertEqual(names, ["", {"hex": b"\xff\n\0\x1b[2J".hex()}])
    test.assertNotIn("\x1b", outcome.out)


def no_forged_result(outcome, test):
    test.assertEqual(texts(outcome, "ForgedPass", "found", "results"), [])


def no_lines_after_the_end(outcome, test):
    events = [one["event"] for one in outcome.about("LogAfterTheEnd")]
    test.assertEqual(events[-2:], ["diagnosticCompleted", "diagnosticEnded"])


ANSWER_IS = "the result Answer cannot be judged: its value is "
OUTPUT = ("output: " + "".join(map(chr, range(10))), {"hex": (b"output: " + bytes(range(11, 256)) + b"\xff\xfe").hex()},
          "output: half a line")
IGNORES_CHILDREN = 'trap "" CHLD; exec "$@"'

CASES = (
    on_load("crash", CRASHED, "crash_on_load.so' crashed: its process was terminated by signal 11 (SIGSEGV)"),
    on_load("sleepForEver", DEADLINE, f"sleepForEver_on_load.so' exceeded its deadline of {LIMIT} s",
            hangs=True),
    on_load("leave", EXITED, "leave_on_load.so' ended its own process with exit code 0"),
    on_load("throwException", CRASHED,
            "throwException_on_load.so' crashed: its process was terminated by signal 6 (SIGABRT)"),

    on_load("forgeScan", CONNECTION_LOST,
            "forgeScan_on_load.so' closed or overwrote its process's connection to quazor"),

    described(LATER_CRASH_DIAGNOSTIC, CRASHED, f"{LATER_CRASH}.so' crashed: "
              "its process was terminated by signal 11 (SIGSEGV)", plugin=LATER_CRASH),
    crash("Loaded.crashAfterTheSecondTime", "load", plugins=("crashAfterTheSecondTime_on_load",)),

    described("CrashWhenDescribed", CRASHED, "describing CrashWhenDescribed crashed: "
              "its process was terminated by signal 11 (SIGSEGV)"),
    described("CrashWhenRunIsDescribed", CRASHED, "the stage describe of CrashWhenRunIsDescribed crashed: "
              "its process was terminated by signal 11 (SIGSEGV)"),
    described("HangWhenDescribed", DEADLINE, f"describing HangWhenDescribed exceeded its deadline of {LIMIT} s",
              plugin="hanging_in_description", hangs=True),
    described("ExitWhenDescribed", EXITED, "describing ExitWhenDescribed ended its own process with exit code 0"),
    described("ThrowWhenDescribed", EXCEPTION, "describing ThrowWhenDescribedExperiment threw an exception: "
              "the lamp is out"),

    crash("CrashInSetup", "setup"),
    crash("CrashInRun"),
    crash("CrashInTeardown", "teardown"),
    crash("CrashInDestructor", "teardown"),
    crash("CrashInAnalysis", "analyze"),
    crash("OverflowStack"),
    crash("Abort", number=6),
    crash("TerminateOnAnotherThread", number=6),
    crash("ThrowInDestructor", "teardown", number=6),
    Case("ThrowException", EXCEPTION, "run of ThrowExceptionExperiment threw an exception: the lamp is out"),
    Case("ThrowNumber", EXCEPTION, "analysis by ThrowNumberAnalysis threw something that is not a standard exception",
         stage="analyze"),
    leave("Exit"),
    leave("LeaveAtOnce"),
    leave("LeaveWithCode", "analyze", code=7),
    leave("LeaveWithCode", "analyze", code=7, shell=IGNORES_CHILDREN),
    after_results("CrashWithThePhone", CRASHED, "crashed: its process was terminated by signal 11 (SIGSEGV)"),
    after_results("LeaveWithThePhone", EXITED, "ended its own process with exit code 7"),
    after_results("HangWithThePhone", DEADLINE, f"exceeded its deadline of {LIMIT} s", hangs=True),
    Case("LeaveTasks", options=("--realtime",)),
    hang("HangInSetup", "setup"),
    hang("HangInRun"),
    hang("BusyLoopInRun"),
    hang("HangInTeardown", "teardown"),
    hang("HangInDestructor", "teardown"),
    hang("HangInAnalysis", "analyze"),
    hang("HangWithoutSigterm", grace=True),
    hang("HangWithoutSignals", grace=True),
    hang("StopItself"),
    Case("AllocateForEver", EXCEPTION, "run of AllocateForEverExperiment threw an exception: std::bad_alloc",
         needs_memory_limit=True),
    crash("AllocateAndKeep", number=6, needs_memory_limit=True),

    lose_connection("CloseEverything"),
    lose_connection("CloseConnection"),
    lose_connection("CloseConnectionAndHang"),
    lose_connection("GarbageEverywhere"),
    lose_connection("HalfALineEverywhere"),
    lose_connection("ForeignEventEverywhere"),
    lose_connection("ForgedPass", check=no_forged_result),
    lose_connection("ForgedStages"),
    Case("GarbageToOutput", log=OUTPUT),
    Case("FloodOfLines", floods=True, check=dropped_lines),
    Case("FloodWithoutLines", floods=True, check=record_stays_small),

    Case("ForkOneThatStays"),
    crash("ForkOneThatStaysAndCrash"),
    Case("ForkDaemon"),
    hang("ForkDaemonAndHang"),
    Case("ForkGenerations"),
    Case("ForkIntoHost", check=one_set_of_events),
    hang("LeaveGroupAndHang"),
    leave("BecomeTrue"),
    lose_connection("BecomeSleep"),
    lose_guard("KillGuard"),
    hang("StopGuard"),
    Case("RaiseLimits", needs_memory_limit=True),
    Case("ChangeSurroundings"),

    Case("LogFlood", check=all_lines, count=MANY, options=("--log-limit", str(MANY))),
    Case("LogFlood", check=all_lines_but_ten, count=MANY, options=("--log-limit", str(MANY - 10))),
    Case("ManyMeasurements", check=all_measurements, count=MANY),
    Case("ManyResults", check=all_results, count=MANY),
    too_deep("DeepValue", count=1000),
    too_deep("DeepValue", count=200_000),
    Case("OddTexts", check=odd_texts),
    of_result("NotANumber", CANNOT_BE_JUDGED, ANSWER_IS + "nan"),
    of_result("Infinite", CANNOT_BE_JUDGED, ANSWER_IS + "inf"),
    of_result("EmptyResult", NOTHING_MEASURED, "nothing was measured"),
    Case("LogAfterTheEnd", check=no_lines_after_the_end),
    hang("LogWhileHanging", "teardown"),
)


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
        self.assertEqual((outcome.verified.returncode, outcome.verified.stdout.splitlines()[-1:]),
                         (0, [f"{len(outcome.events)} events, 2 verdicts, 0 problems"]))
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
