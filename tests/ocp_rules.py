"""Parses lines of Open Compute Test & Validation, version 2.0, and checks the rules that concern more than one line and
the additional guarantees of this project."""

import json
import re

TIMESTAMP = re.compile(r"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d\.\d{9}Z")
PAIRS = {("COMPLETE", "PASS"), ("COMPLETE", "FAIL"), ("ERROR", "NOT_APPLICABLE"), ("SKIP", "NOT_APPLICABLE")}
START_KEYS = {"name", "version", "commandLine", "parameters", "dutInfo"}
HOLDS = {
    "GREATER_THAN": lambda value, bound: value > bound,
    "GREATER_THAN_OR_EQUAL": lambda value, bound: value >= bound,
    "LESS_THAN": lambda value, bound: value < bound,
    "LESS_THAN_OR_EQUAL": lambda value, bound: value <= bound,
}


class Stream:
    """One test run."""

    def __init__(self, begin):
        self.begin = begin  # its first time stamp
        self.last = begin
        self.start = None
        self.end = None
        self.of_run = []  # (key, content)
        self.steps = {}  # by ID: the contents in order, without start and end
        self.status_of_step = {}  # by ID; None: not ended

    def of_step(self, step):
        return self.steps.get(step, [])

    def all_of(self, key):
        """The contents of that key in the run and in its steps."""
        of_steps = [one[key] for artifacts in self.steps.values() for one in artifacts if key in one]
        return [content for name, content in self.of_run if name == key] + of_steps


def refuse_constant(text):
    raise ValueError(f"{text} is no number in JSON")


def has_null(value):
    if isinstance(value, dict):
        return any(has_null(one) for one in value.values())
    return value is None or isinstance(value, list) and any(has_null(one) for one in value)


def is_number(value):
    return isinstance(value, (int, float)) and not isinstance(value, bool)


def measurement_problems(measurement):
    value = measurement["value"]
    if not is_number(value) and value not in ("nan", "inf", "-inf"):
        yield f"value {value!r}"
    for one in measurement.get("validators", []):
        if not (is_number(one["value"]) and is_number(value)):
            yield f"validator of {one['value']!r} for {value!r}"


def verdict_problems(step):
    """Checks that the diagnosis of a result follows its measurement, those of the user's limits follow it, and all
    agree with their validators. The result's own validators are the first ones."""
    measurement = {}
    before = {}
    for one in step:
        measurement = one.get("measurement", measurement)
        diagnosis = one.get("diagnosis", {"type": "UNKNOWN"})
        validators = measurement.get("validators", [])
        if diagnosis["type"] != "UNKNOWN":
            of_limit = diagnosis["verdict"].startswith(f"{measurement.get('name')}-limit-")
            wanted = [each for each in validators if diagnosis["message"].endswith(f", limit {each['name']}")
                      ] if of_limit else [each for each in validators if each["name"] == validators[0]["name"]]
            holds = all(HOLDS[each["type"]](measurement["value"], each["value"]) for each in wanted)
            is_missing = not of_limit and (not wanted or "measurement" not in before)
            if is_missing or (wanted and (diagnosis["type"] == "PASS") != holds):
                yield f"diagnosis {diagnosis} of {measurement}"
        before = one


def end_problems(stream):
    """Checks that the contents agree with the end of the run."""
    pair = (stream.end["status"], stream.end["result"])
    if pair not in PAIRS:
        yield f"the pair {pair}"
    kinds = [one["type"] for one in stream.all_of("diagnosis")]
    if ("FAIL" in kinds) != (pair == ("COMPLETE", "FAIL")):
        yield f"diagnoses {kinds} with {pair}"
    if bool(stream.all_of("error")) != (pair[0] == "ERROR"):
        yield f"{len(stream.all_of('error'))} errors with {pair}"
    if pair[0] == "ERROR" and "PASS" in kinds:
        yield "a diagnosis PASS of a run that ended in an error"
    for step, status in stream.status_of_step.items():
        has_error = any("error" in one for one in stream.steps[step])
        if status is None or (status == "ERROR" and pair[0] != "ERROR") or (has_error and status != "ERROR"):
            yield f"step {step} ended with {status}, errors: {has_error}"


def add_to_run(stream, artifact):
    ((key, content),) = artifact.items()
    if key == "testRunStart":
        if stream.start is not None or not START_KEYS <= content.keys() or "dutInfoId" not in content["dutInfo"]:
            yield "testRunStart out of place or incomplete"
        stream.start = content
    elif stream.start is None:
        yield f"{key} before testRunStart"
    elif key == "testRunEnd":
        stream.end = content
        yield from end_problems(stream)
    else:
        stream.of_run.append((key, content))


def add_to_step(stream, artifact):
    step = artifact.pop("testStepId")
    ((key, content),) = artifact.items()
    if key == "testStepStart":
        if step in stream.steps or stream.start is None:
            yield f"step {step} begins out of place"
        stream.steps[step] = []
        stream.status_of_step[step] = None
        return
    if stream.status_of_step.get(step, "ended") is not None:
        yield f"{key} in step {step}, which is not open"
    if key == "testStepEnd":
        stream.status_of_step[step] = content["status"]
        yield from verdict_problems(stream.of_step(step))
        return
    if key == "measurement":
        yield from measurement_problems(content)
    stream.steps.setdefault(step, []).append({key: content})


def add(stream, line, number):
    """Adds a line to a stream; returns the violations as sentences."""
    if stream.end is not None:
        yield "a line behind testRunEnd"
    if line.pop("sequenceNumber") != number:
        yield f"not number {number}"
    timestamp = line.pop("timestamp")
    if not TIMESTAMP.fullmatch(timestamp) or timestamp < stream.last:
        yield f"timestamp {timestamp} after {stream.last}"
    stream.last = timestamp
    if has_null(line):
        yield "null"
    ((key, content),) = line.items()
    if key == "schemaVersion":
        if content != {"major": 2, "minor": 0} or number != 0:
            yield f"schemaVersion {content}"
    elif key == "testRunArtifact":
        yield from add_to_run(stream, content)
    elif key == "testStepArtifact":
        yield from add_to_step(stream, content)
    else:
        yield f"unknown key {key}"


def streams_of(content, where, found):
    """The test runs of a file. Adds violations to `found`, as sentences that begin with `where`."""
    streams = []
    number = 0
    lines = content.decode("utf-8").split("\n")
    if lines.pop() != "":
        found.append(f"{where}: the last line has no end")
    for place, text in enumerate(lines, 1):
        line = json.loads(text, parse_constant=refuse_constant)
        if "schemaVersion" in line:
            if streams and streams[-1].end is None:
                found.append(f"{where}:{place}: the run before did not end")
            streams.append(Stream(line["timestamp"]))
            number = 0
        found += [f"{where}:{place}: {problem}" for problem in add(streams[-1], line, number)]
        number += 1
    if streams and streams[-1].end is None:
        found.append(f"{where}: the last run did not end")
    return streams
