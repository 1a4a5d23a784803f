#!/usr/bin/env python3
"""Checks that reports and records of real and of random runs obey their schemas, and that the schemas are strict.

usage: schemas_test.py PROGRAM SCHEMAS REPORT_SAMPLES SENSOR_IMAGES

SCHEMAS is the folder of the schemas, REPORT_SAMPLES the program that makes reports of random runs, and SENSOR_IMAGES a
plug-in. Each key that a person did not choose is misspelt in turn, and each is left out; the
schema must refuse the result, unless the key is optional.
"""

import copy
import json
import os
import pathlib
import subprocess
import sys
import tempfile

import jsonschema

from reports_agree import reports_in

RANDOM_RUNS = 100
SEED = 20261122
# Objects whose keys are chosen by a plug-in, a scenario or the user.
FREE = {"auxiliaryData", "measurements", "tags", "experiment", "analysis", "faults", "fault", "userInfo"}
OPTIONAL = {"interrupted", "underlying-error", "userLimits", "problem", "name", "stage", "nanoseconds", "limit",
            "attempt", "attempts", "repetition", "repetitions", "acceptFlaky", "variation", "planned"}
SENSOR_IMAGES = sys.argv[4]
MANY = ["--attempts", "2", "--repeat", "3", "--accept-flaky", "--phone", "camera_sync/start_refused_on_first"]
RUNS = (
    ["run", "--all"],
    ["run", "--all", "--phone", "camera_sync/frames_dropped", "--profile", "strict", "--tag", "serial=C02X",
     "--log-level", "debug"],
    ["run", "CameraSyncDiagnostic.*", "--phone", "camera_sync/start_refused_on_first", "--limit", "Nothing > 1"],
    ["run", "CameraSyncDiagnostic.Back", "--limit", "*.Total in [90, 90]"],
    ["run", "CameraSyncDiagnostic.Back", "--realtime", "--set", "duration=2", "--heartbeat", "1"],
    ["experiment", "--all"],
    ["run", "CameraSyncDiagnostic.*", *MANY, "--skip", "CameraSyncDiagnostic.Front=x"],
    ["run", "TesselFaultDiagnostic", "--repeat", "4", "--trace", "queues", "--phone", "camera_sync/frames_dropped"],
    ["experiment", "CameraSyncExperiment.*", *MANY],
    ["run", "--all", "--skip", "Tessel*=they are not needed"],
    ["experiment", "NimbeImageExperiment", "--plugin", SENSOR_IMAGES],
    ["experiment", "NimbeImageExperiment", "--plugin", SENSOR_IMAGES, "--phone", "sensor_images/no_sensor"],
)


def objects_in(document, path=()):
    """The paths of all objects whose keys the schema knows."""
    if isinstance(document, dict):
        yield path
        for key, value in document.items():
            if key not in FREE or isinstance(value, list) and key in ("experiment", "analysis"):
                if not (key == "parameters" and path[:1] == ("experiments",)):
                    yield from objects_in(value, (*path, key))
    elif isinstance(document, list):
        for place, value in enumerate(document):
            yield from objects_in(value, (*path, place))


def changes_of(document):
    """What is to be refused: the description of each change and the changed document."""
    for path in objects_in(document):
        found = document
        for step in path:
            found = found[step]
        for key in found:
            for misspelt in (True, False):
                # Whether a run has a verdict cannot be seen from its last event.
                optional = key in OPTIONAL or (key == "verdict" and document.get("event") == "runEnded")
                if not misspelt and optional:
                    continue
                changed = copy.deepcopy(document)
                place = changed
                for step in path:
                    place = place[step]
                value = place.pop(key)
                if misspelt:
                    place[f"{key}s"] = value
                yield f"{'misspelt' if misspelt else 'without'} {'.'.join(map(str, (*path, key)))}", changed


def shortened(document):
    """A report with at most three entries in each list: enough to misspell each key."""
    if isinstance(document, dict):
        return {key: shortened(value) for key, value in document.items()}
    return [shortened(value) for value in document[:3]] if isinstance(document, list) else document


class Check:
    def __init__(self, schemas):
        self.found, self.counts = [], {"reports": 0, "events": 0, "changes": 0}
        self.validators, self.kinds = {}, set()
        for kind in ("report", "record"):
            schema = json.loads((schemas / f"{kind}.schema.json").read_text(encoding="utf-8"))
            jsonschema.Draft202012Validator.check_schema(schema)
            self.validators[kind] = jsonschema.Draft202012Validator(schema)

    def valid(self, kind, name, document):
        for error in list(self.validators[kind].iter_errors(document))[:3]:
            self.found.append(f"{name}: {'.'.join(map(str, error.absolute_path))}: {error.message[:500]}")

    def strict(self, kind, name, document):
        self.valid(kind, name, document)
        for change, changed in changes_of(document):
            self.counts["changes"] += 1
            if self.validators[kind].is_valid(changed):
                self.found.append(f"{name}: accepted {change}")

    def check_run(self, program, arguments):
        with tempfile.TemporaryDirectory() as directory:
            record, report = pathlib.Path(directory, "record.jsonl"), pathlib.Path(directory, "report.json")
            command = [program, *arguments, "--record", str(record), "--format", "json", "--output", str(report)]
            done = subprocess.run(command, capture_output=True, text=True, check=False, timeout=120,
                                  env={**os.environ, "XDG_STATE_HOME": directory, "XDG_DATA_HOME": directory})
            name = " ".join(arguments)
            if not report.exists():
                self.found.append(f"{name}: no report: {done.stderr}")
                return
            document = json.loads(report.read_text(encoding="utf-8"))
            events = [json.loads(line) for line in record.read_text(encoding="utf-8").splitlines()]
        self.counts["reports"] += 1
        self.valid("report", name, document)
        self.strict("report", f"{name}, shortened", shortened(document))
        kinds = set()
        for event in events:
            self.counts["events"] += 1
            label = f"{name}, event {event['sequence']} {event['event']}"
            self.valid("record", label, event)
            if event["event"] not in kinds:
                kinds.add(event["event"])
                self.strict("record", f"{label}, shortened", shortened(event))
        self.kinds |= kinds


def main():
    program, schemas, samples = sys.argv[1], pathlib.Path(sys.argv[2]), sys.argv[3]
    check = Check(schemas)
    for arguments in RUNS:
        check.check_run(program, arguments)
    with tempfile.TemporaryDirectory() as directory:
        subprocess.run([samples, directory, str(RANDOM_RUNS), str(SEED)], check=True)
        for number, report in enumerate(reports_in(pathlib.Path(directory, "json"))):
            check.counts["reports"] += 1
            document = json.loads(report)
            document["run"]["id"] = f"{number:032x}"  # a random text in the samples
            if "analyzed" in document["run"]:
                document["run"]["analyzed"]["id"] = f"{number:032x}"
            check.valid("report", f"random run {number}", document)
    events = set(check.validators["record"].schema["properties"]["event"]["enum"])
    if check.kinds != events:
        check.found.append(f"events that no run had: {sorted(events - check.kinds)}")
    for sentence in check.found[:30]:
        print(sentence)
    print(f"{check.counts}, {len(check.found)} problems")
    return 1 if check.found or not check.counts["changes"] else 0


if __name__ == "__main__":
    sys.exit(main())
