#!/usr/bin/env python3
"""Reads random runs back from every report format and from the record, each with its own parser, and compares them.

usage: reports_agree.py REPORT_SAMPLES

REPORT_SAMPLES is the program that generates the runs. The lines of Open Compute Test & Validation must also obey the
rules of their format. With QUAZOR_THOROUGH=1 in the environment there are ten times as many runs. Exit code 0: all
formats agree; 1: they do not, or a kind of run was missing from the samples.
"""

import collections
import json
import math
import os
import pathlib
import statistics
import subprocess
import sys
import tempfile
import xml.etree.ElementTree

import csv_reader
import ocp_rules
import page_reader
import record_reader
import report_limits
import report_readers
from report_readers import blurred, in_xml

COUNT = 1000
SEED = 20261121
SHOWN = 20
FORMS = ("text", "json", "csv", "ocp", "junit", "html", "record")
INTERRUPTION = report_readers.Error("QuazorHostErrorDomain", 11, "it was interrupted")
LIMIT_WITHOUT_RESULT = ("QuazorHostErrorDomain", 14)
SIGNS = ("]]>", "\ufffd", "\uffff", "\\u0000", "\\r", "\u2028", ",")  # as in JSON
# The samples must contain some of each.
KINDS = {"a diagnostic: pass", "a diagnostic: fail", "a diagnostic: error", "a diagnostic: skip", "an experiment: pass",
         "an experiment: error", "an experiment: skip", "a skip: no-such-hardware", "a skip: not-allowed",
         "a skip: not-reached", "a run with tags", "a run with a serial number", "a run with repetitions", "a flaky diagnostic",
         "an error that was accepted", "an analysis of a record", "a result that varied", "an interrupted run without a record", "an interrupted run with a record", "a run that never began",
         "no results", "many results", "a deep error", "a value that is not finite", "a limit without bounds",
         "a result: pass", "a result: fail", "a result: error", "a result: none",
         *(f"a {kind}, {severity}: {verdict}" for kind in ("number", "interval", "relation")
           for severity, verdicts in (("fail", ("pass", "fail", "error", "skip")), ("warn", ("pass", "warn", "skip")))
           for verdict in verdicts),
         "a record with bytes that are no text", "a tolerance", "a tolerance without a bound", "a unit",
         "a limit on a value that is not finite", "a limit without a result", "a run with attempts",
         "a run that ended with a later attempt", "a warning in a run that passed", *(f"a text with {sign!r}" for sign in SIGNS)}


def trial_text(record, run):
    """Which attempt and repetition it was, as people read it."""
    parts = []
    if record["repetition"]:
        parts.append(f"repetition {record['repetition']} of {run['repetitions']}")
    if record["attempt"] and (record["attempt"] > 1 or record["verdict"] == "error"):
        passed = "pass in " if record["verdict"] == "pass" else ""
        parts.append(f"{passed}attempt {record['attempt']} of {run['attempts']}")
    if record["repetition"] and record["verdict"] in ("fail", "error"):
        parts.append(f"seed {record['seed']}")
    return ", ".join(parts)


def last_attempts(records):
    """The entries after which there is no other attempt."""
    return [one for one, after in zip(records, [*records[1:], None])
            if after is None or (after["attempt"] or 1) == 1]


def outcome_of(record):
    return "flaky" if record["verdict"] == "pass" and (record["attempt"] or 1) > 1 else record["verdict"]


def is_of_limit(record):
    """True for the entry of a limit that fits no result, which is no diagnostic."""
    return bool(record["errors"]) and record["errors"][0][:2] == LIMIT_WITHOUT_RESULT


def counts_line(records, of_experiments, never_began):
    limits = sum(map(is_of_limit, records))
    ended = [one for one in last_attempts(records) if not is_of_limit(one)]
    count = collections.Counter(outcome_of(one) for one in ended)
    many = "" if len(ended) == 1 else "s"
    noun = "run" if any(one["repetition"] for one in records) else "experiment" if of_experiments else "diagnostic"
    more = "".join(f", {count[key]} {word}" for key, word in (("skip", "skipped"), ("flaky", "flaky")) if count[key])
    if never_began:
        more += f", {never_began} not reached"
    if limits:
        more += f", {limits} limit{'' if limits == 1 else 's'} without a result"
    if warnings := report_limits.warnings_in(records):
        more += f", {warnings} warning{'' if warnings == 1 else 's'}"
    if of_experiments:
        return (f"{len(ended)} {noun}{many}: {count['pass']} returned a result, "
                f"{count['error']} ended in an error{more}")
    return (f"{len(ended)} {noun}{many}: {count['pass']} passed, {count['fail']} failed, "
            f"{count['error']} ended in an error{more}")


def failure_line(record):
    """The line at the end of a text that says what did not pass."""
    if record["skip"]:
        what = ": ".join(record["skip"])
    elif record["errors"]:
        what = f"{record['errors'][0].domain} code {record['errors'][0].code}"
    else:
        names = report_limits.failed_names(record)
        what = ", ".join(names[:3]) + (f" and {len(names) - 3} more" if len(names) > 3 else "")
    word = {"fail": "FAIL ", "error": "ERROR", "skip": "SKIP ", "pass": "FLAKY"}[record["verdict"]]
    name = report_readers.printable(record["name"])
    return f"{word} {name}: {report_readers.printable(what)}" if what else f"{word} {name}"


def failure_lines(records):
    """The lines of what did not pass, or only after an error. The repetitions that ended alike share one."""
    lines = []  # [text, trial, times]
    before = None
    for record in records:
        last = any(one is record for one in last_attempts(records))
        if last and outcome_of(record) != "pass":
            shown = record | {"errors": before["errors"]} if outcome_of(record) == "flaky" else record
            text = failure_line(shown)
            same = [one for one in lines if one[0] == text and record["repetition"]]
            if same:
                same[0][2] += 1
            else:
                lines.append([text, record["trial"], 1])
        before = record
    for text, trial, times in lines:
        yield text + (f" ({times} times, first in {trial})" if times > 1 else f" ({trial})" if trial else "")


def text_begin(run):
    """The lines that say which run it was."""
    def line(what, one):
        return (what + (f"{one['id']}, " if one["id"] else "") +
                f"{one['date']}, on {report_readers.printable(one['host']) or 'an unknown machine'}")

    analyzed = run.get("analyzed")
    tags = "".join(f", {report_readers.printable(key)}={report_readers.printable(value)}"
                   for key, value in run["tags"].items())
    where = f"{report_readers.printable(run['phone'])}, seed {run['seed']}{tags}"
    if analyzed:
        return [line("Analysis ", run), line("of run   ", analyzed), f"Phone    {where}"]
    return [line("Run   ", run), f"Phone {where}"]


def text_end(records, of_experiments, interrupted, run, never_began):
    """The lines after the records of a text and after the table of what varied."""
    if len(records) != 1 or interrupted is not None:
        yield counts_line(records, of_experiments, never_began)
    if any(outcome_of(one) == "flaky" for one in last_attempts(records)) and not run.get("acceptFlaky"):
        yield "A pass after an error counts as an error, unless --accept-flaky is given."
    if any(outcome_of(one) == "fail" and (one["attempt"] or 1) > 1 for one in last_attempts(records)) and not run.get("acceptFlaky"):
        yield "A failure after an error counts as an error, unless --accept-flaky is given."
    if not of_experiments:
        yield from unlimited_line(records)
        yield from failure_lines(records)
    if interrupted is None and run_verdict(records, run.get("acceptFlaky")) == "skip":
        yield "What was skipped makes the exit code 2, unless --allow-skips is given."
    if interrupted or (interrupted == "" and "analyzed" in run):
        running = report_readers.printable(interrupted) or f"no {'experiment' if of_experiments else 'diagnostic'}"
        end = "The recorded run did not come to its end: it stopped while" if "analyzed" in run else "Interrupted while"
        yield f"{end} {running} was running."


def unlimited_line(records):
    """The sentence about diagnostics that pass whatever is measured."""
    names = []
    for record in records:
        rows = report_limits.rows_of(record, lambda label, *_: label)
        if record["verdict"] == "pass" and rows and all(one.verdict == "none" for one in rows):
            names.append(report_readers.printable(record["name"]))
    names = list(dict.fromkeys(names))
    if names:
        more = f" and {len(names) - 3} more" if len(names) > 3 else ""
        yield (f"No result of {', '.join(names[:3])}{more} has a limit, so {'it passes' if len(names) == 1 else 'they pass'} "
               "whatever is measured. Add limits: --limit 'RESULT >= NUMBER', or --profile.")


def with_interrupted(records, interrupted, run):
    """The records in the text and the CSV of an analysis, which have what the recorded run stopped in."""
    if not interrupted or "analyzed" not in run or has_interruption(records):
        return records
    error = INTERRUPTION._replace(message=f"{interrupted} was interrupted")
    return [*records, {"name": interrupted, "summary": "The recorded run stopped while this was running.", "verdict": "error",
                       "skip": None, "attempt": None, "repetition": None, "trial": "", "results": [], "checks": [],
                       "measurements": [], "errors": [error], "seed": run["seed"], "auxiliaryData": {}, "error stage": ""}]


def has_interruption(records):
    return bool(records) and records[-1]["errors"][:1] == [INTERRUPTION]


def run_verdict(records, accepts_flaky):
    """The verdict of a run, from its last attempts."""
    verdicts = {"error" if one["verdict"] in ("pass", "fail") and (one["attempt"] or 1) > 1 and not accepts_flaky
                else one["verdict"] for one in last_attempts(records)}
    return next((one for one in ("error", "fail", "skip") if one in verdicts), "pass")


class Comparison:
    """The differences between the report formats, and the kinds of runs that occurred."""

    def __init__(self):
        self.found = []
        self.kinds = collections.Counter()

    def check(self, where, got, expected):
        if got != expected:
            self.found.append(f"{where}: got {got!r:.600}, expected {expected!r:.600}")

    def check_record(self, where, got, expected):
        """Compares the keys of `got` that `expected` has too."""
        for key in got.keys() & expected.keys():
            self.check(f"{where}: {key}", got[key], expected[key])

    def check_counts(self, name, of_records, streams, root):
        suites = root.findall("testsuite")
        self.check(f"{name}: streams and suites", len(streams), len(suites))
        self.check(f"{name}: fewer streams than records", len(streams) < of_records, False)
        for key in ("tests", "failures", "errors", "skipped"):
            self.check(f"{name} junit: {key}", int(root.get(key)), sum(int(suite.get(key)) for suite in suites))
        difference = float(root.get("time")) - sum(float(suite.get("time")) for suite in suites)
        self.check(f"{name} junit: time", abs(difference) <= 0.001 * len(suites), True)

    def compare(self, name, reports):
        """`reports` contains the reports of one run by format, as bytes."""
        of_experiments, records, interrupted = report_readers.read_json(reports["json"].decode("utf-8"))
        run = json.loads(reports["json"])["run"]
        for record in records:
            record["trial"] = trial_text(record, run)
        self.count_kinds(of_experiments, records)
        self.check_limits(name, records)
        self.check_verdict(name, json.loads(reports["json"]), records)
        self.compare_record(name, record_reader.Reader(reports["record"]), run, records, interrupted)
        streams = ocp_rules.streams_of(reports["ocp"], f"{name} ocp", self.found)
        root = xml.etree.ElementTree.fromstring(reports["junit"])
        suites = root.findall("testsuite")
        self.check_counts(name, len(records), streams, root)
        for place, (record, stream, suite) in enumerate(zip(records, streams, suites)):
            where = f"{name} {place}"
            self.check_record(f"{where} ocp", report_readers.read_ocp(stream), report_readers.expected_of_ocp(record))
            accepted = run.get("acceptFlaky") and self.is_superseded(records, place)
            self.kinds["an error that was accepted"] += bool(accepted)
            junit = report_readers.read_superseded(suite) if accepted else report_readers.read_junit(suite)
            self.check_record(f"{where} junit", blurred(junit), blurred(report_readers.expected_of_junit(record)))
            self.check(f"{where} ocp: superseded", stream.start["metadata"].get("superseded", False), bool(accepted))
            self.check(f"{where}: begin", suite.get("timestamp"), stream.begin)
            record["error stage"] = None if accepted else junit.get("error stage", "")
        self.check_unrecorded(name, streams[len(records):], suites[len(records):], records, interrupted)
        due = "error" if interrupted is not None else run_verdict(records, run.get("acceptFlaky"))
        code = {"pass": 0, "fail": 1, "error": 2, "skip": 2}[run_verdict(records, run.get("acceptFlaky"))]
        if interrupted is not None:
            code = (code or 3) if "analyzed" in run else 130
        for suite in suites:
            properties = report_readers.properties_of(suite)
            self.check(f"{name} junit: run", (properties["run.verdict"], properties["run.exitCode"]), (due, str(code)))
        identity = json.loads(reports["json"])["run"]
        self.check_identity(name, identity, streams, suites)
        rows = csv_reader.csv_rows(reports["csv"])
        seeds = self.without_identity(name, rows, identity)
        never_began = sum(one.end["status"] == "SKIP" for one in streams[len(records):])
        records = with_interrupted(records, interrupted, run)
        self.check(f"{name} csv: seeds", seeds, [str(one["seed"]) for one in records
                                                 for _ in range(csv_reader.lines_of(one, of_experiments))])
        self.compare_csv(name, rows, of_experiments, records)
        end = list(text_end(records, of_experiments, interrupted, run, never_began))
        varies = any(one["varying"] for one in json.loads(reports["json"]).get("variation", []))
        lines = report_readers.Lines(reports["text"])
        begin = [line.decode("utf-8", "replace") for line in lines.block()]
        self.check(f"{name} text: begin", blurred(begin), blurred(text_begin(run)))
        self.compare_text(name, lines, of_experiments, records, varies, end)
        counts = counts_line(records, of_experiments, never_began)
        page_reader.compare(self, name, reports["html"], run, of_experiments, records, due, interrupted, counts)

    @staticmethod
    def is_superseded(records, place):
        """True for an error with a later attempt, the last of which passed or failed."""
        last = next(at for at in range(place, len(records))
                    if at + 1 == len(records) or (records[at + 1]["attempt"] or 1) == 1)
        return last > place and records[last]["verdict"] in ("pass", "fail")

    def check_limits(self, name, records):
        """Judges by the limits of the user. Texts with U+FFFD may have differed before it replaced their bytes."""
        for record in records:
            for one, checks in zip(record["results"], record["checks"]):
                for check in checks:
                    condition = report_limits.condition_of(check.text)
                    kind = "relation" if condition.other else "number" if condition.operator else "interval"
                    self.kinds[f"a {kind}, {check.severity}: {check.verdict}"] += 1
                    self.kinds["a tolerance"] += condition.tolerance > 0
                    self.kinds["a tolerance without a bound"] += (
                        kind == "number" and condition.operator == "==" and None in (condition.lower, condition.upper))
                    self.kinds["a unit"] += condition.unit is not None
                    self.kinds["a limit on a value that is not finite"] += one.value in ("nan", "inf", "-inf")
                    if "\ufffd" not in check.text + one.unit:
                        expected = report_limits.verdict_of(check, one, record["results"])
                        self.check(f"{name} json: {one.name}: {check.text}", check.verdict, expected)

    def check_verdict(self, name, document, records):
        run = document["run"]
        expected = run_verdict(records, run.get("acceptFlaky")) if "attempts" in run or "repetitions" in run else None
        self.check(f"{name} json: verdict", document.get("verdict"), expected)
        counts = {}
        for record in last_attempts(records):
            if record["repetition"]:
                of_one = counts.setdefault(record["name"], dict.fromkeys(("pass", "flaky", "fail", "error", "skip"), 0))
                of_one[outcome_of(record)] += 1
        found = [(one["name"], one["verdicts"]) for one in document.get("variation", [])]
        self.check(f"{name} json: variation", found, list(counts.items()))
        self.kinds["a run with repetitions"] += bool(counts)
        self.kinds["a run with attempts"] += "attempts" in run
        self.kinds["a run that ended with a later attempt"] += bool(records) and (records[-1]["attempt"] or 1) > 1
        self.kinds["a limit without a result"] += any(map(is_of_limit, records))
        self.kinds["a warning in a run that passed"] += (run_verdict(records, run.get("acceptFlaky")) == "pass" and
                                                         report_limits.warnings_in(records) > 0)
        self.kinds["a flaky diagnostic"] += sum(outcome_of(one) == "flaky" for one in records)
        for one in document.get("variation", []):
            self.check_values(f"{name} json: variation of {one['name']}", one, records)

    def check_values(self, where, variation, records):
        """Compares what is said of each name that occurs once in every entry."""
        repeated = [one for one in records
                    if one["name"] == variation["name"] and one["repetition"] and not one["errors"]]
        entries = [one["results"] or [report_readers.Result(*each, None, "none") for each in one["measurements"]]
                   for one in repeated]
        names = collections.Counter(each.name for entry in entries for each in entry)
        for one in variation["varying"]:
            values = [float(each.value) for entry in entries for each in entry if each.name == one["name"]]
            if one["values"] != names[one["name"]]:
                continue  # several of this name, or other units
            finite = sorted(value for value in values if math.isfinite(value))
            expected = [min(finite), statistics.median(finite), max(finite)] if finite else [math.nan] * 3
            got = [float(one[key]) for key in ("minimum", "median", "maximum")]
            same = all(a == b or (math.isnan(a) and math.isnan(b)) or math.isinf(b) for a, b in zip(got, expected))
            self.check(f"{where}: {one['name']}: {got} and {expected}", same, True)
            for key in ("minimum", "maximum"):
                first = [int(each["repetition"]) for each, entry in zip(repeated, entries) for result in entry
                         if result.name == one["name"] and float(result.value) == float(one[key])]
                self.check(f"{where}: {one['name']}: the first repetition with the {key}", one[f"{key}Repetition"],
                           first[0] if first else None)
            for each, entry in zip(repeated, entries):
                if each["repetition"] == one["outlierRepetition"]:
                    self.check(f"{where}: {one['name']}: seed", one["outlierSeed"], each["seed"])
            self.kinds["a result that varied"] += 1

    def check_identity(self, name, run, streams, suites):
        self.kinds["a run with tags"] += len(run["tags"]) > 1
        self.kinds["a run with a serial number"] += "serial" in run["tags"]
        analyzed = run.get("analyzed")
        self.kinds["an analysis of a record"] += analyzed is not None
        for suite in suites:
            found = report_readers.properties_of(suite)
            of_record = {key: found.get(f"analyzed.{key}", "") for key in ("run", "date", "host")}
            self.check(f"{name} junit: analyzed", of_record, {"run": analyzed["id"] if analyzed else "",
                                                             **{key: analyzed[key] if analyzed else ""
                                                                for key in ("date", "host")}})
            tags = {key[len("tag."):]: value for key, value in found.items() if key.startswith("tag.")}
            self.check(f"{name} junit: run", (found["run"], found["host"], tags), (run["id"], run["host"], run["tags"]))
        for stream in streams:
            found = stream.start["metadata"]
            of_record = found.get("analyzed")
            self.check(f"{name} ocp: analyzed", of_record and {"run": "", "host": ""} | of_record,
                       analyzed and {"run": analyzed["id"], "date": analyzed["date"], "host": analyzed["host"]})
            self.check(f"{name} ocp: run", (found["run"], found["host"], found.get("tags", {})),
                       (run["id"], run["host"], run["tags"]))
            serials = [one["serialNumber"] for one in stream.start["dutInfo"].get("hardwareInfos", [])]
            self.check(f"{name} ocp: serial number", serials,
                       [run["tags"]["serial"]] if "serial" in run["tags"] else [])

    def without_identity(self, name, rows, run):
        """Removes the cells that say which run it was from the lines of a table. Returns the seeds of its entries."""
        seeds = []
        cells = {"run": run["id"], "date": run["date"], "host": run["host"], "program": run["program"],
                 "contract": str(run["contract"]), "plugins": "; ".join(run["plugins"]), "phone": run["phone"],
                 "seed": None, **({f"analyzed{word}": run["analyzed"][key] for word, key in
                                   (("Run", "id"), ("Date", "date"), ("Host", "host"))} if "analyzed" in run else {}),
                 **{f"tag.{key}": value for key, value in run["tags"].items()}}
        for place, row in enumerate(rows):
            found = dict(zip(cells, row[-len(cells):]))
            if place:
                seeds.append(found["seed"])
                self.check(f"{name} csv: run", found | {"seed": None}, cells)
            else:
                self.check(f"{name} csv: columns of the run", list(found.values()), list(cells))
            del row[-len(cells):]
        return seeds

    def check_unrecorded(self, name, streams, suites, records, interrupted):
        self.check(f"{name}: unrecorded", [one.get("name") for one in suites],
                   [in_xml(one.start["name"]) for one in streams])
        ends = [{"ERROR": "error", "SKIP": None}[one.end["status"]] for one in streams]
        self.check(f"{name}: unrecorded verdicts", [report_readers.derived_verdict(one) for one in suites], ends)
        has_record = has_interruption(records)
        expected = int(interrupted is not None and not has_record)
        self.check(f"{name}: interrupted ones without a record", ends.count("error"), expected)
        if expected:
            self.check(f"{name}: interrupted", streams[0].start["name"], interrupted or "quazor")
        if interrupted is None:
            self.check(f"{name}: unrecorded runs", len(streams), 0)
        self.kinds["a run that never began"] += None in ends
        self.kinds["an interrupted run without a record"] += expected
        self.kinds["an interrupted run with a record"] += has_record

    def compare_csv(self, name, rows, of_experiments, records):
        if of_experiments:
            expected = [(record["name"], *one) for record in records for one in record["measurements"]]
            self.check(f"{name} csv", csv_reader.read_experiment_csv(rows), expected)
            return
        of_skips = ["skipKind", "skipReason"] if any(one["skip"] for one in records) else []
        trials = [key for key in ("attempt", "repetition") if any(one[key] for one in records)]
        header = rows.pop(0)
        self.check(f"{name} csv: header", header, [*csv_reader.CSV_HEADER, *of_skips, *trials])
        for place, record in enumerate(records):
            count = csv_reader.lines_of(record, of_experiments)
            got = csv_reader.read_csv(rows[:count], header)
            self.check_record(f"{name} {place} csv", got, csv_reader.expected_of_csv(record))
            if record["error stage"] is not None:
                self.check(f"{name} {place} csv: stage", got["error stage"], record["error stage"])
            del rows[:count]
        self.check(f"{name} csv: lines left", rows, [])

    def compare_record(self, name, found, run, records, interrupted):
        self.kinds["a record with bytes that are no text"] += found.has_bytes
        identity = {key: run[key] for key in record_reader.RUN_KEYS if key in run}
        self.check(f"{name} record: run", blurred(record_reader.shown(found.run)), blurred(identity))
        self.check(f"{name} record: end", blurred(record_reader.shown(found.ended)), blurred({"interrupted": interrupted}))
        self.check(f"{name} record: entries", len(found.records), len(records))
        for place, (one, record) in enumerate(zip(found.records, records)):
            self.check_record(f"{name} {place} record", blurred(record_reader.shown(one)),
                              blurred(record_reader.expected(record)))

    def compare_text(self, name, lines, of_experiments, records, varies, end):
        for place, record in enumerate(records):
            expected = report_readers.expected_of_text(record, of_experiments)
            got = report_readers.read_text(lines, expected)
            self.check_record(f"{name} {place} text", blurred(got), blurred(expected))
        if any(one["repetition"] for one in records):
            title = b"What varied between the repetitions" + b" (#: the first repetition with that value; Outlier: the one whose rare value differs most, and its seed)" * varies + b":"
            self.check(f"{name} text: variation", lines.block()[0], title)
        left = [line.decode("utf-8", "replace") for line in lines.rest()]
        self.check(f"{name} text: end", blurred(left), blurred([*end, ""]))

    def count_kinds(self, of_experiments, records):
        for record in records:
            self.kinds[f"{'an experiment' if of_experiments else 'a diagnostic'}: {record['verdict']}"] += 1
            if record["skip"]:
                self.kinds[f"a skip: {record['skip'][0]}"] += 1
            self.kinds["no results"] += not record["results"]
            self.kinds["many results"] += len(record["results"]) > 100
            self.kinds["a deep error"] += len(record["errors"]) > 20
            for one in record["results"]:
                self.kinds["a value that is not finite"] += one.value in ("nan", "inf", "-inf")
                self.kinds["a limit without bounds"] += one.limit is not None and one.limit[1:] == (None, None)
                self.kinds[f"a result: {one.verdict}"] += 1
            text = json.dumps(record, ensure_ascii=False)
            for sign in SIGNS:
                self.kinds[f"a text with {sign!r}"] += sign in text


def reports_in(file):
    """The reports of one format, one per run."""
    content = file.read_bytes()
    at = 0
    while at < len(content):
        end = content.index(b"\n", at) + 1
        at = end + int(content[at:end])
        yield content[end:at]


def main():
    count = COUNT * 10 if os.environ.get("QUAZOR_THOROUGH") == "1" else COUNT
    comparison = Comparison()
    with tempfile.TemporaryDirectory() as directory:
        subprocess.run([sys.argv[1], directory, str(count), str(SEED)], check=True)
        forms = {file.name: list(reports_in(file)) for file in pathlib.Path(directory).iterdir()}
    comparison.check("reports", {form: len(reports) for form, reports in forms.items()}, dict.fromkeys(FORMS, count))
    for run, reports in enumerate(zip(*forms.values())):
        try:
            comparison.compare(f"run {run}", dict(zip(forms, reports)))
        except (ValueError, LookupError, AttributeError, TypeError, xml.etree.ElementTree.ParseError) as problem:
            comparison.found.append(f"run {run}: cannot be read back: {type(problem).__name__}: {problem}")
    comparison.check("kinds of runs that are missing", {kind for kind in KINDS if not comparison.kinds[kind]}, set())
    for one in comparison.found[:SHOWN]:
        print(one)
    print(f"{count} runs, {len(comparison.found)} differences")
    return 1 if comparison.found else 0


if __name__ == "__main__":
    sys.exit(main())
