#!/usr/bin/env python3
"""Runs diagnostics and experiments on every shipped scenario and compares the outcome with the scenario's
expectation.

usage: scenarios_test.py PROGRAM SCENARIOS PLUGIN

PLUGIN registers the experiments that scenarios name. Every scenario must obey the schema and expect an outcome of each
diagnostic and experiment that it concerns, and each of its faults must have fired, because a run whose fault never
fired shows nothing. Exit code 0: everything is as expected; 1: it is not.
"""

import concurrent.futures
import json
import os
import pathlib
import subprocess
import sys

import jsonschema

HOST_DOMAIN = "QuazorHostErrorDomain"


def merge_patch(target, patch):
    """RFC 7396."""
    if not isinstance(patch, dict):
        return patch
    merged = dict(target) if isinstance(target, dict) else {}
    for key, value in patch.items():
        if value is None:
            merged.pop(key, None)
        else:
            merged[key] = merge_patch(merged.get(key), value)
    return merged


def read(file):
    """The scenario, merged with the files that it is based on."""
    content = json.loads(file.read_text(encoding="utf-8"))
    base = content.pop("base", None)
    return content if base is None else merge_patch(read(file.parent / base), content)


def error_of(error):
    """The members of an error that a scenario can expect."""
    return None if error is None else {key: error[key] for key in ("domain", "code", "message")}


def differences(expected, outcome):
    """The differences between an outcome and the scenario's expectation, as sentences."""
    error = outcome["error"]
    wanted = expected.get("error")
    if error is not None and error["domain"] == HOST_DOMAIN and wanted == "none":
        error = None  # the host's own error for a run that reported none
    is_any = wanted is None and expected["verdict"] == "error"
    pairs = {
        "verdict": (expected["verdict"], outcome["verdict"]),
        "error": (None, None) if is_any else (None if wanted == "none" else wanted, error_of(error)),
        "failed results": (
            expected.get("failedResults", []),
            [result["name"] for result in outcome.get("measuredResults", []) if result["verdict"] == "fail"],
        ),
    }
    if "underlying" in expected:
        pairs["underlying error"] = (expected["underlying"], error_of((error or {}).get("underlying-error")))
    if "images" in expected:
        pairs["images"] = (expected["images"], len(outcome["auxiliaryData"].get("images", [])))
    return [f"{what}: expected {want}, got {got}" for what, (want, got) in pairs.items() if want != got]


def compare(command, expectations, fired):
    """Runs the program for the outcomes that `expectations` describes by name and adds the counts of its faults to
    `fired`. Returns the differences as sentences."""
    run = subprocess.run(
        [*command, "--format", "json"],
        stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True, timeout=300, check=False)
    if run.returncode not in (0, 1, 2):
        return [f"exit code {run.returncode}: {run.stderr}"]
    report = json.loads(run.stdout)
    outcomes = {outcome["name"]: outcome for kind in ("diagnostics", "experiments") for outcome in report.get(kind, [])}
    found = []
    for name, expected in expectations.items():
        found += [f"{name}: {difference}" for difference in differences(expected, outcomes[name])]
        for number, fault in enumerate(outcomes[name]["faults"]):
            fired[number] = fired.get(number, 0) + fault["fired"]
    verdicts = {outcomes[name]["verdict"] for name in expectations}
    code = 2 if "error" in verdicts else 1 if "fail" in verdicts else 0
    if run.returncode != code:
        found.append(f"exit code {run.returncode} instead of {code}")
    return found


def problems(program, plugin, file):
    """Runs everything that a scenario expects; returns the differences as sentences."""
    expectations = read(file).get("expect", {})
    if not expectations:
        return ["it expects nothing"]
    fired = {}
    diagnostics = {name: expected for name, expected in expectations.items() if "experiment" not in expected}
    found = []
    if diagnostics:
        found += compare([program, "run", *diagnostics, "--phone", str(file)], diagnostics, fired)
    for name, expected in expectations.items():
        if name in diagnostics:
            continue
        command = [program, "experiment", expected["experiment"], "--plugin", plugin, "--phone", str(file)]
        command += ["--profile", "none"]
        for parameter, value in expected.get("parameters", {}).items():
            command += ["--set", f"{parameter}={value}"]
        label = "" if name == expected["experiment"] else f"{name}: "
        found += [label + sentence for sentence in compare(command, {expected["experiment"]: expected}, fired)]
    found += [f"fault {number} never fired" for number, count in fired.items() if count == 0]
    return found


def main():
    program, folder, plugin = sys.argv[1], pathlib.Path(sys.argv[2]), sys.argv[3]
    schema = json.loads((folder / "scenario.schema.json").read_text(encoding="utf-8"))
    validator = jsonschema.Draft202012Validator(schema)
    files = sorted(file for file in folder.rglob("*.json") if file.name != "scenario.schema.json")
    failed = 0
    with concurrent.futures.ThreadPoolExecutor(os.cpu_count()) as pool:
        for file, found in zip(files, pool.map(lambda file: problems(program, plugin, file), files)):
            content = json.loads(file.read_text(encoding="utf-8"))
            found = [f"schema: {error.message}" for error in validator.iter_errors(content)] + found
            for sentence in found:
                print(f"{file.relative_to(folder)}: {sentence}")
            failed += bool(found)
    print(f"{len(files)} scenarios, {failed} not as expected")
    return 1 if failed or not files else 0


if __name__ == "__main__":
    sys.exit(main())
