"""What plug-ins do wrong, and how the run of each must end; for misbehaving_test.py."""

import os
import subprocess
from dataclasses import dataclass

HOST = "QuazorHostErrorDomain"
EXCEPTION, NOTHING_MEASURED, CANNOT_BE_JUDGED, CRASHED, EXITED, DEADLINE, CONNECTION_LOST = 2, 4, 5, 6, 7, 8, 9
TOO_DEEP = 13
WELL_BEHAVED = "WellBehaved"
LATER_CRASH = "crashAfterTheFirstTime_on_load"  # the plug-in can be loaded once
LATER_CRASH_DIAGNOSTIC = "Loaded.crashAfterTheFirstTime"
STAGES = ("load", "describe", "setup", "run", "teardown", "analyze")
LIMIT = 1  # seconds, for a stage that hangs
GRACE = 0.5  # seconds between SIGTERM and SIGKILL
MARGIN = 5.0  # seconds on an idle machine; multiplied by the slowdown of a busy one
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
