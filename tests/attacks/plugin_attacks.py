"""Attacks by plug-ins: each way at each stage, results and errors that nobody expects, and odd texts on each surface."""

import csv
import functools
import io
import json
import re
import shutil
import xml.etree.ElementTree

from cases import Case, told

LIMIT = 2  # seconds, for a stage that hangs
DOMAIN = "QuazorHostErrorDomain"
# The stage that the program names for each moment of an attack.
STAGE = {"load": "load", "factory": "describe", "describe": "describe", "describeAgain": "describe", "setup": "setup",
         "run": "run", "thread": "run", "teardown": "teardown", "destructor": "teardown", "analysisFactory": "describe",
         "analyze": "analyze", "analysisDestructor": "analyze"}
EVERYWHERE = tuple(STAGE)
DESTRUCTORS = ("destructor", "analysisDestructor", "thread", "load")  # here no exception is caught
PASS = "pass"


def crash(*numbers):
    return tuple(f"error 6 by signal {number}" for number in numbers)


EXIT, THROW, HANG, LOST = ("error 7",), ("error 2",), ("error 8",), ("error 9",)

# The end of each way, at any stage.
ENDS = {
    "pthreadExit": crash(6, 11),  # the end that passes through the host's frames is none that it can catch
    **dict.fromkeys(("exit0", "exit3", "exit255", "atOnce0", "quick0", "onThread0", "exitGroup", "endMainThread",
                     "becomeThisProgram", "becomeScript", "forkAndLeaveToChild", "terminateSilently"), EXIT),
    **dict.fromkeys(("exitInHandler", "abort", "freeTwice", "throwAbortingText", "throwAtEnd",
                     "throwThroughNoexcept", "terminate"), crash(6)),
    **dict.fromkeys(("readBehindFile",), crash(7)),
    **dict.fromkeys(("runData", "unmapOwnCode", "overflowStackOfThread", "ptraceAndCrash"), crash(11)),
    "trap": crash(4), "divideByZero": crash(8), "seccompStrict": crash(9, 11), "ptraceAndExecute": crash(5),
    "jumpNowhere": (*crash(6, 11), *EXIT, *HANG),
    **dict.fromkeys(("endMainThreadOnly", "ptraceAndStop", "stopAgain", "stopByTerminal", "lockTwice", "joinHanging",
                     "waitForReader", "waitForPipe", "spinWithHandlers", "vforkAndHang"), HANG),
    **dict.fromkeys(("throwEmpty", "throwLong", "throwBytes", "throwControl", "throwNul", "throwSilent", "throwText",
                     "throwNull", "throwString", "throwFunction", "throwError", "throwNoMemory", "throwSystem",
                     "throwFiles", "throwVariant", "throwFuture", "throwTypeInfo", "throwTwice", "throwNested",
                     "throwPointer", "rethrowNothing"), THROW),
    **dict.fromkeys(("overwriteByNull", "overwriteByFull", "overwriteByFile", "overwriteByOutput", "overwriteBySocket",
                     "sayWithoutToken", "sayWithZeros", "sayWithFs", "sayShortToken", "sayNothing", "sayNul",
                     "sayLineBreaks", "sayHalfWithoutEnd"), LOST),
    **dict.fromkeys(("printEvents", "closeOutput", "emptyShared", "chains", "hundredChildren", "siblings", "quietChild",
                     "namedGuard", "namedProjector", "otherReaper", "signalGuard", "forkAndGoOn"), (PASS,)),
    "fillShared": ("error 4",),  # it looks interrupted to itself, and does not analyze
    "fillSharedAndCrash": crash(11), "fillSharedAndLeave": EXIT,
    **dict.fromkeys(("limitGuardFiles", "limitGuardMemory", "limitGuardTime", "limitGuardStack", "limitGuardProcesses",
                     "limitGuardSignals"), (PASS, *LOST)),  # it may end at once, or after the diagnostic
    "stopGuardAgain": (PASS, *HANG),  # it may tell the end in between
    "readConnection": (PASS, *EXIT, *HANG, *LOST),  # documented: it can; but nothing else is harmed
    **dict.fromkeys(("removedDirectory", "umask", "noFiles", "noFileSize", "noProcesses", "noLocks", "noQueues",
                     "niceness", "idle", "oneProcessor", "personality", "newSession", "otherGroup", "notDumpable",
                     "noNewPrivileges", "noDeathSignal", "deathSignalStop", "namedGuardItself", "namedOddly", "subreaper",
                     "ignoreTerminate", "ignoreChildren", "ignorePipes", "blockSignals", "handleSignals", "timer",
                     "noEnvironment", "fullEnvironment", "otherHome", "commaLocale", "cLocale", "roundUp", "trapNumbers",
                     "raiseNumbers", "terminateHandler", "newHandler", "closedStreams", "oneArena", "manyThreads",
                     "spinningThreads", "allDescriptors", "registerMore", "logLongLines", "abortAtTheEnd"), (PASS,)),
    "noStack": (PASS, *crash(11)),
    **{f"signal{number}": crash(number) for number in (*range(1, 17), *range(24, 28), 29, 30, 31, 34, 40, 64)},
}
SLOW = ("stopGuardAgain", "chains", "spinningThreads", "limitGuardMemory")
# The ways that are tried at every stage; the others only while it runs.
AT_EVERY_STAGE = ("exit0", "atOnce0", "quick0", "signal9", "signal15", "signal34", "throwText", "throwEmpty", "terminate",
                  "sayWithZeros", "overwriteByNull", "fillSharedAndCrash", "overflowStackOfThread", "hundredChildren",
                  "commaLocale", "endMainThread")
HANGS_AT_EVERY_STAGE = ("waitForPipe",)

NUMBERS = {"nanUnlimited": PASS, "infinityUnlimited": PASS, "negativeNan": "error 5", "signallingNan": "error 5",
           "negativeInfinity": "error 5", "negativeZero": PASS, "denormal": PASS, "denormalOutside": "fail",
           "largest": PASS, "nextAfterBound": "fail", "onOpenBound": "fail", "nanBound": "error 5",
           "infiniteBound": "error 5", "crossedBounds": "error 5", "openPoint": "error 5", "halfOpenPoint": "error 5",
           "nothingBetween": "fail", "otherUnit": "error 5", "emptyLimit": PASS, "sameNameTwice": PASS}
ERRORS = {"none": "error 1", "noDomain": "error  0", "smallestCode": f"error Domain {-2**63}",
          "largestCode": f"error Domain {2**63 - 1}", "longChain": "error Chain 19999", "deepInfo": "error Info 1",
          "wideInfo": "error Info 1", "numberForMessage": "error Info 1", "textForCause": "error Info 1",
          "oddKey": "error Info 1", "largeMessage": "error Domain 1", "tooLarge": "error 9"}
TEXTS = ("empty", "path", "control", "nul", "direction", "bytes", "surrogate", "markup", "formula", "long", "option")
SURFACES = ("measurement", "unit", "data", "result", "limit", "log", "error", "name", "summary")


def told_error(failed):
    error = failed["error"]
    if error["domain"] != DOMAIN:
        domain = error["domain"] if isinstance(error["domain"], str) else "odd"
        return f"error {domain if len(domain) < 100 else 'long'} {error['code']}"
    by = re.search(r"terminated by signal (\d+)", str(error["userInfo"]))
    return f"error {error['code']}" + (f" by signal {by[1]}" if by else "")


def outcomes_in(record):
    """What the record tells of each diagnostic, in order: (name, outcome, stage)."""
    found, name, failed = [], None, None
    for line in record.read_text(encoding="utf-8").splitlines():
        event = json.loads(line)
        if event["event"] == "diagnosticBegan":
            name, failed = event["name"], None
        elif event["event"] == "failed" and failed is None:
            failed = event
        elif event["event"] == "diagnosticEnded":
            outcome = event["verdict"] if failed is None else told_error(failed)
            if failed is not None and event["verdict"] != "error":
                outcome += f" but {event['verdict']}"
            found.append((name, outcome, (failed or {}).get("stage")))
    return found


def problems_of_reports(folder):
    """Whether each report can be read."""
    found = []
    csv.field_size_limit(1 << 30)
    readers = {"json": json.loads, "junit": xml.etree.ElementTree.fromstring,
               "csv": lambda text: list(csv.reader(io.StringIO(text), strict=True)),
               "ocp": lambda text: [json.loads(line) for line in text.splitlines()],
               "text": lambda text: re.search("[\x00-\x09\x0b-\x1f\x7f-\x9f\u202a-\u202e\u2066-\u2069]", text) and 1 / 0}
    for name, read in readers.items():
        try:
            read((folder / name).read_bytes().decode("utf-8", errors="surrogateescape" if name == "csv" else "strict"))
        except (ValueError, OSError, SyntaxError, csv.Error, ZeroDivisionError) as problem:
            found.append(f"{name} report: {str(problem)[:80]}")
    return found


def run_batch(bench, attacks, options=()):
    """Runs the attacks and then the well-behaved diagnostic in one call. Returns the outcomes and what is wrong."""
    with bench.folder() as folder:
        plugins = []
        names = [f"{stage}.{way}" for stage, way in attacks if stage != "load"]
        for stage, way in attacks:
            if stage == "load":
                copy = folder / f"load-{way}.so"
                shutil.copy(bench.plugins / "attacker.so", copy)
                copy.chmod(0o755)
                plugins += ["--plugin", copy]
        if names:
            plugins += ["--plugin", bench.plugins / "attacker.so"]
        selected = ["name:*" if stage == "name-text" else f"{stage}.{way}" for stage, way in attacks if stage != "load"]
        outputs = [word for form in ("json", "junit", "csv", "ocp", "text") for word in ("--output", f"{form}:{folder / form}")]
        call = bench.call("run", *dict.fromkeys(selected), "WellBehaved", *plugins, "--plugin",
                          bench.plugins / "well_behaved.so", "--record", folder / "record", *outputs, *options,
                          state=folder, variables={"QUAZOR_ATTACKS": " ".join(names)})
        problems = call.problems()
        if not (folder / "record").exists():
            return {}, [*problems, f"no record: exit code {call.code} {call.err[-300:]!r}"]
        outcomes = outcomes_in(folder / "record")
        if not outcomes or outcomes[-1][:2] != ("WellBehaved", PASS):
            problems.append(f"the well-behaved one: {outcomes[-1:]}")
        verdicts = {outcome.split()[0] for _, outcome, _ in outcomes}
        code = 2 if "error" in verdicts else 1 if "fail" in verdicts else 0
        if call.code != code:
            problems.append(f"exit code {call.code} instead of {code}")
        verified = bench.call("verify", folder / "record", state=folder)
        if verified.code != 0:
            problems.append(f"verify: exit code {verified.code}")
        problems += problems_of_reports(folder) + verified.problems()
        by_name = {}
        if any(stage == "name-text" for stage, _ in attacks):
            by_name = dict(zip(attacks, [(outcome, stage) for _, outcome, stage in outcomes]))
        else:
            found = {name: (outcome, stage) for name, outcome, stage in outcomes}
            for stage, way in attacks:
                name = f"load-{way}.so" if stage == "load" else f"{stage}.{way}"
                by_name[stage, way] = found.get(name, ("pass", None) if stage == "load" else ("missing", None))
        return by_name, problems


def cases_of_batch(bench, group, attacks, options=()):
    """`attacks` maps (stage, way) to the expected outcomes. The last case of a batch is the rest of the run."""
    outcomes, problems = run_batch(bench, list(attacks), options)
    cases = []
    for (stage, way), expected in attacks.items():
        got, at = outcomes.get((stage, way), ("missing", None))
        wanted = STAGE.get(stage)
        if got.startswith("error") and wanted and at != wanted and got != "error 4":
            got += f" in {at}"
        cases.append(Case(f"plug-in: {way} in {stage}", tuple(expected), got))
    cases.append(Case(f"plug-in: the run with {group}", ("nothing else is harmed",), told(problems, "nothing else is harmed")))
    return cases


def expected_of(way, stage):
    ends = ENDS[way]
    if stage == "thread" and way == "endMainThread":  # it ends that thread only
        return (PASS,)
    if ends == THROW and stage in DESTRUCTORS:
        return crash(6)
    return ends


def batches(is_all):
    """The name of each batch, its attacks and the options of its run."""
    quick = [way for way, ends in ENDS.items() if HANG[0] not in ends and way not in SLOW]
    hanging = [way for way in ENDS if way not in quick]
    for at in range(0, len(quick), 20):
        some = quick[at:at + 20]
        yield f"{some[0]} and others", {("run", way): expected_of(way, "run") for way in some}, ()
    for stage in EVERYWHERE if is_all else ("load", "describe", "setup", "teardown", "destructor", "analyze"):
        if stage == "run":
            continue
        yield f"attacks in {stage}", {(stage, way): expected_of(way, stage) for way in AT_EVERY_STAGE}, ()
    yield "odd numbers", {("find", kind): (expected,) for kind, expected in NUMBERS.items()}, ()
    yield "odd errors", {("error", kind): (expected,) for kind, expected in ERRORS.items()}, ()
    for surface in SURFACES:
        expected = {"error": tuple(f"error {kind} 1" for kind in ("odd", "long", ""))}.get(surface, (PASS,))
        attacks = {(f"{surface}-text", kind): expected for kind in TEXTS}
        if surface == "error":
            for kind in TEXTS:
                attacks[f"{surface}-text", kind] = None
        yield f"odd texts as {surface}", attacks, ()
    for way in hanging if is_all else hanging[:3]:
        deadline = ("--deadline", f"run={LIMIT}", "--deadline", f"analyze={LIMIT}")
        yield f"{way}", {("run", way): expected_of(way, "run")}, deadline
    for stage in EVERYWHERE if is_all else ("load", "analysisDestructor"):
        for way in HANGS_AT_EVERY_STAGE:
            if stage != "run":
                yield f"{way} in {stage}", {(stage, way): HANG}, ("--deadline", f"{STAGE[stage]}={LIMIT}")


def jobs(bench, is_all):
    for group, attacks, options in batches(is_all):
        attacks = {one: expected if expected is not None else error_of_text(one[1]) for one, expected in attacks.items()}
        yield functools.partial(cases_of_batch, bench, group, attacks, options)


def error_of_text(kind):
    """The error of a run whose error has the text for a domain."""
    domains = {"empty": "", "path": "../../etc/passwd", "formula": "=cmd|' /C calc'!A0", "option": "--help", "long": "long",
               "control": "a\r\nb\tc\x1b[2J\x07\x7f\x9b", "nul": "a\0b", "direction": "a\u202eb\u2066c\u200fd",
               "markup": "<a href=\"&amp;]]>'\\u0000{}%s%n</testcase>"}
    return (f"error {domains.get(kind, 'odd')} 1",)
