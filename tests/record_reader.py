"""Parses records back, and tells what they say of a run whose JSON document is known."""

import json

import report_limits
from report_readers import Error, Limit, Result, number

RUN_KEYS = ("id", "host", "date", "program", "contract", "plugins", "phone", "seed", "tags", "attempts", "repetitions",
            "acceptFlaky", "analyzed")


def exact(text):
    """A text with all its bytes; those that are not UTF-8 are surrogates."""
    return bytes.fromhex(text["hex"]).decode("utf-8", "surrogateescape") if isinstance(text, dict) else text


def shown(value):
    """The value as other formats have it: U+FFFD replaces what is not UTF-8."""
    if isinstance(value, str):
        return value.encode("utf-8", "surrogateescape").decode("utf-8", "replace")
    if isinstance(value, dict):
        return {shown(key): shown(one) for key, one in value.items()}
    if isinstance(value, tuple) and hasattr(value, "_fields"):
        return type(value)(*map(shown, value))
    if isinstance(value, (list, tuple)):
        return type(value)(map(shown, value))
    return value


def measurement_of(json_value):
    value, unit = json_value
    return number(value), exact(unit)


def result_of(one):
    def bound(which):
        return None if limit[which] is None else (number(limit[which][0][0]), limit[which][1])

    limit = one.get("limit")
    return Result(exact(one["name"]), *measurement_of(one["measurement"]),
                  limit and Limit(exact(limit["name"]), bound("lower"), bound("upper")), None)


def errors_of(error):
    """The error and its causes. One without a message has the usual one."""
    errors = []
    while error is not None:
        info = {exact(key): value for key, value in error["userInfo"]}
        domain, code = exact(error["domain"]), error["code"]
        message = info.get("localized-description", {}).get("string")
        usual = f"The operation failed ({domain} error {code})."
        errors.append(Error(domain, code, usual if message is None else exact(message)))
        error = info.get("underlying-error", {}).get("error")
    return errors


def parameters_of(half):
    values = {exact(one["name"]): one.get("value") for one in half}
    return {name: number(*value.values()) for name, value in values.items() if value is not None}


def fits(pattern, name):
    """The patterns of the samples are all names or '*'."""
    return pattern in (None, "*", name)


def checks_of(limits, name, result):
    """The limits of the user on that result, in their order."""
    conditions = [(one, report_limits.condition_of(one.text)) for one in limits]
    return [one for one, condition in conditions if fits(condition.diagnostic, name) and fits(condition.result, result)]


class Reader:
    """The run in a record."""

    def __init__(self, content):
        self.run = self.ended = None
        self.limits = []
        self.records = []
        self.has_bytes = b'{"hex":' in content
        for place, line in enumerate(content.split(b"\n")[:-1]):
            event = json.loads(line)
            if event["sequence"] != place or (self.run is None) != (event["event"] == "runBegan"):
                raise ValueError(f"record: line {place} is {event['event']} {event['sequence']}")
            getattr(self, event["event"])(event)

    def runBegan(self, event):
        self.run = {key: event[key] for key in RUN_KEYS if key in event}
        self.run["tags"] = {exact(key): exact(value) for key, value in event["tags"]}
        self.run |= {key: exact(event[key]) for key in ("id", "host", "program", "phone")}
        if "analyzed" in self.run:
            self.run["analyzed"] = {key: exact(value) for key, value in self.run["analyzed"].items()}
        self.run["plugins"] = list(map(exact, event["plugins"]))
        self.limits = [report_limits.Check(exact(one["limit"]), exact(one.get("name", "")), one["severity"],
                                           exact(one["source"]), None) for one in event["limits"]]

    def diagnosticBegan(self, event):
        self.records.append({
            "name": exact(event["name"]), "summary": exact(event["summary"]), "verdict": None, "skip": None,
            "attempt": event.get("attempt"), "repetition": event.get("repetition"), "results": [], "checks": [],
            "measurements": [], "errors": [], "log": [], "seed": event["seed"], "faults": [],
            "parameters": {half: parameters_of(event["parameters"][half]) for half in ("experiment", "analysis")}})

    def stageBegan(self, event):
        pass

    stageEnded = collected = diagnosticCompleted = stageBegan

    def skipped(self, event):
        self.records[-1]["skip"] = (event["kind"], exact(event["reason"]))

    def log(self, event):
        self.records[-1]["log"].append((event["level"], exact(event["text"])))

    def measured(self, event):
        self.records[-1]["measurements"] += [(exact(name), *measurement_of(one)) for name, one in event["measurements"]]

    def found(self, event):
        record = self.records[-1]
        record["results"] += map(result_of, event["results"])
        record["checks"] += [checks_of(self.limits, record["name"], one.name) for one in record["results"]]

    def failed(self, event):
        self.records[-1]["errors"] = errors_of(event["error"])

    def faultsCounted(self, event):
        self.records[-1]["faults"] = [one["fault"] | {"fired": one["fired"]} for one in event["faults"]]

    def diagnosticEnded(self, event):
        self.records[-1]["verdict"] = event["verdict"]

    def runEnded(self, event):
        self.ended = {"interrupted": exact(event["interrupted"]) if "interrupted" in event else None}


def expected(record):
    """What the record of a diagnostic says, from the JSON document: not the verdicts on its results."""
    return record | {"results": [one._replace(verdict=None) for one in record["results"]],
                     "checks": [[check._replace(verdict=None) for check in checks] for checks in record["checks"]]}
