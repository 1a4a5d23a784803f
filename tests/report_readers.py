"""Parses the report formats back into records, with an independent parser per format.

The information that a format contains is a dictionary; `expected_of_FORM` derives it from that of the JSON document.
"""

import collections
import json
import math
import re
import unicodedata

import report_limits

VERDICTS = {("COMPLETE", "PASS"): "pass", ("COMPLETE", "FAIL"): "fail", ("ERROR", "NOT_APPLICABLE"): "error",
            ("SKIP", "NOT_APPLICABLE"): "skip"}

Result = collections.namedtuple("Result", "name value unit limit verdict severity", defaults=[""])  # of a user's limit
Limit = collections.namedtuple("Limit", "name lower upper")  # bounds are (value, open)
Error = collections.namedtuple("Error", "domain code message")
NO_LIMIT = Limit("", None, None)


def number(text):
    """A number in comparable form, independent of its notation: NaN equals itself, and zeros keep their sign."""
    return repr(float(text))


def printable(text):
    """Escapes control characters and marks of direction as \\xNN, as in user-readable text."""
    escaped = re.sub("[\x00-\x1f\x7f-\x9f]", lambda found: f"\\x{ord(found[0]):02x}", text)
    return re.sub("[\u061c\u200e\u200f\u202a-\u202e\u2066-\u2069]",
                  lambda found: "".join(f"\\x{byte:02x}" for byte in found[0].encode()), escaped)


def blurred(value):
    """Replaces each run of U+FFFD or of escaped bytes \\xNN, in all texts of the value, with one U+FFFD: JSON has the
    former where user-readable text has the latter."""
    if isinstance(value, str):
        return re.sub(r"(?:\ufffd|\\x[89a-f][0-9a-f])+", "\ufffd", value)
    if isinstance(value, dict):
        return {blurred(key): blurred(one) for key, one in value.items()}
    if isinstance(value, tuple) and hasattr(value, "_fields"):
        return type(value)(*map(blurred, value))
    if isinstance(value, (list, tuple)):
        return type(value)(map(blurred, value))
    return value


def in_xml(text):
    """Replaces the characters that XML 1.0 does not allow."""
    return re.sub("[\x00-\x08\x0b\x0c\x0e-\x1f\ufffe\uffff]", "\ufffd", text)


def errors_of(error):
    """An error of the JSON document and its underlying errors, the nearest first."""
    errors = []
    while error is not None:
        errors.append(Error(error["domain"], error["code"], error["message"]))
        error = error.get("underlying-error")
    return errors


# --- JSON: the reference for the other formats ---


def limit_of(limit):
    def bound(one):
        return None if one is None else (number(one["value"]), one["open"])

    return None if limit is None else Limit(limit["name"], bound(limit["lower"]), bound(limit["upper"]))


def skip_of(one):
    """The kind and the reason, or nothing."""
    skip = one.get("skip")
    return None if skip is None else (skip["kind"], skip["reason"])


def read_json(text):
    document = json.loads(text)
    of_experiments = "experiments" in document
    records = []
    for one in document["experiments" if of_experiments else "diagnostics"]:
        parameters = {"experiment": one["parameters"], "analysis": {}} if of_experiments else one["parameters"]
        records.append({
            "name": one["name"],
            "summary": one["summary"],
            "verdict": one["verdict"],
            "skip": skip_of(one),
            "attempt": one.get("attempt"),
            "repetition": one.get("repetition"),
            "results": [
                Result(each["name"], number(each["value"]), each["unit"], limit_of(each["limit"]), each["verdict"])
                for each in one.get("measuredResults", [])],
            "checks": [
                [report_limits.check_of(check) for check in each.get("userLimits", [])]
                for each in one.get("measuredResults", [])],
            "measurements": [
                (name, number(each["value"]), each["unit"]) for name, each in one["measurements"].items()],
            "errors": errors_of(one["error"]),
            "log": [(line["level"], line["text"]) for line in one["log"]],
            "parameters": {half: {name: number(value) for name, value in values.items()}
                           for half, values in parameters.items()},
            "seed": one["seed"],
            "auxiliaryData": one["auxiliaryData"],
            "faults": one["faults"],
        })
    return of_experiments, records, document.get("interrupted")


# --- Open Compute Test & Validation ---


def split_symptom(error):
    domain, _, code = error["symptom"].rpartition(":")
    return Error(domain, int(code), error["message"])


def ocp_limit(measurement):
    validators = [one for one in measurement.get("validators", []) if not report_limits.is_label(one["name"])]
    if validators:
        bounds = {}
        for one in validators:
            which = "lower" if one["type"].startswith("GREATER") else "upper"
            bounds[which] = (number(one["value"]), not one["type"].endswith("OR_EQUAL"))
            name = one["name"]
        return Limit(name, bounds.get("lower"), bounds.get("upper"))
    limit = measurement.get("metadata", {}).get("limit")
    if limit is None:
        return None
    bounds = {which: (number(limit[which]["value"]), limit[which]["open"]) for which in ("lower", "upper")
              if which in limit}
    return Limit(limit["name"], bounds.get("lower"), bounds.get("upper"))


def ocp_results(stream):
    """The results of the analysis; each diagnosis follows its measurement."""
    results = []
    for one in stream.of_step("analysis"):
        if "measurement" in one:
            it = one["measurement"]
            results.append(Result(it["name"], number(it["value"]), it.get("unit", ""), ocp_limit(it), "none"))
        if "diagnosis" in one and not report_limits.is_of_limit(one, results[-1].name):
            kind = one["diagnosis"]["type"].lower()
            if one["diagnosis"]["verdict"] != f"{results[-1].name}-{kind}":
                raise ValueError(f"diagnosis {one['diagnosis']} of {results[-1]}")
            results[-1] = results[-1]._replace(verdict=kind)
    return results


def read_ocp(stream):
    """Converts a test run to a record."""
    levels = {"ERROR": "error", "INFO": "default", "DEBUG": "debug"}
    raw = [one["measurement"] for one in stream.of_step("experiment") if "measurement" in one]
    extensions = {one["extension"]["name"]: one["extension"]["content"]
                  for one in stream.of_step("experiment") if "extension" in one}
    if not all(one["name"].startswith("raw.") for one in raw):
        raise ValueError("a measurement of the experiment that is not marked as raw")
    parameters = stream.start["parameters"]
    record = {
        "name": stream.start["name"],
        "summary": stream.start["metadata"].get("summary", ""),
        "verdict": VERDICTS.get((stream.end["status"], stream.end["result"])),
        "results": ocp_results(stream),
        "checks": report_limits.read_ocp(stream.of_step("analysis")),
        "measurements": [(one["name"][len("raw."):], number(one["value"]), one.get("unit", "")) for one in raw],
        "skip": skip_of(stream.start["metadata"]),
        "attempt": stream.start["metadata"].get("attempt"),
        "repetition": stream.start["metadata"].get("repetition"),
        "errors": [split_symptom(one) for one in stream.all_of("error")],
        "log": [(levels[one["severity"]], one["message"]) for one in stream.all_of("log")
                if one["severity"] != "WARNING"],
        "parameters": {half: {name: number(value) for name, value in parameters.get(half, {}).items()}
                       for half in ("experiment", "analysis")},
        "seed": stream.start["metadata"]["seed"],
        "auxiliaryData": extensions.get("auxiliaryData", {}),
    }
    if stream.of_step("experiment"):
        record["faults"] = [one["fault"] | {"fired": one["fired"]}
                            for one in extensions.get("faults", {}).get("faults", [])]
    return record


def expected_of_ocp(record):
    """After an error the state of the hardware is unknown."""
    record = record | {"checks": report_limits.expected_of_ocp(record)}
    if record["skip"]:
        kind, reason = record["skip"]
        return record | {"log": [*record["log"], ("default", f"{kind}: {reason}")]}
    if record["verdict"] != "error":
        return record
    unknown = [one if one.verdict == "none" else one._replace(verdict="unknown") for one in record["results"]]
    return record | {"results": unknown}


# --- JUnit ---


def properties_of(element):
    found = [(one.get("name"), one.get("value")) for one in element.findall("properties/property")]
    return dict(found)


def derived_verdict(suite):
    """The outcome of a suite as a continuous integration server shows it."""
    counts = {key: int(suite.get(key)) for key in ("tests", "failures", "errors", "skipped")}
    cases = suite.findall("testcase")
    real = {"tests": len(cases), "failures": sum(one.find("failure") is not None for one in cases),
            "errors": sum(one.find("error") is not None for one in cases),
            "skipped": sum(one.find("skipped") is not None for one in cases)}
    if counts != real:
        raise ValueError(f"counts {counts} where there are {real}")
    if counts["errors"]:
        return "error"
    if counts["failures"]:
        return "fail"
    return "pass" if counts["tests"] > counts["skipped"] else "skip" if properties_of(suite).get("verdict") else None


def junit_result(case, verdict_of_suite):
    it = properties_of(case)

    def bound(which):
        return (number(it[which]), {"true": True, "false": False}[it[which + "Open"]]) if which in it else None

    limit = Limit(it["limit"], bound("lower"), bound("upper")) if "limit" in it else None
    result = Result(case.get("name"), number(it["value"]), it["unit"], limit, it["verdict"], it.get("severity", ""))
    allowed = {"pass": [], "none": [], "warn": [], "fail": ["failure"], "error": ["error"],
               "skip": ["skipped"]}[result.verdict]
    finite = all(math.isfinite(float(it[key])) for key in ("value", "lower", "upper") if key in it)
    if result.verdict in ("pass", "fail") and not finite:
        raise ValueError(f"{result} cannot be judged")
    found = [one.tag for one in case if one.tag != "properties"]
    if found != allowed or (found == ["error"] and verdict_of_suite != "error"):
        raise ValueError(f"{result} with {found}")
    return result


def junit_log(suite):
    text = suite.findtext("system-out") or ""
    lines = [line.split(" ", 2) for line in text.split("\n")[:-1]]
    return [(level, message) for _, level, message in lines]


def whole(text):
    return None if text is None else int(text)


def read_superseded(suite):
    """An error that was accepted: one test case, which is skipped."""
    it = properties_of(suite)
    case, = suite.findall("testcase")
    sentence, _, errors = case.find("skipped").get("message").partition("\n")
    if not sentence.endswith(" ended in an error, which was accepted because a later attempt had none:"):
        raise ValueError(f"superseded: {sentence}")
    return {"name": suite.get("name"), "summary": it["summary"], "verdict": it["verdict"], "seed": int(it["seed"]),
            "attempt": whole(it.get("attempt")), "repetition": whole(it.get("repetition")), "log": junit_log(suite),
            "error lines": errors, "outcome": derived_verdict(suite)}


def read_junit(suite):
    it = properties_of(suite)
    cases = suite.findall("testcase")
    errors = [one for one in cases if one.find("error") is not None and "value" not in properties_of(one)]
    measured = next((properties_of(one) for one in cases if one.get("name") == "result"), {})
    values = {key[len("measurement."):]: value.partition(" ")[::2]
              for key, value in measured.items() if key.startswith("measurement.")}
    record = {
        "name": suite.get("name"),
        "summary": it["summary"],
        "verdict": it["verdict"],
        "skip": next(((one.get("name"), one.find("skipped").get("message")) for one in cases
                      if one.find("skipped") is not None and "value" not in properties_of(one)), None),
        "results": [junit_result(one, it["verdict"]) for one in cases if "value" in properties_of(one)],
        "parameters": {half: {key[len(f"parameter.{half}."):]: number(value) for key, value in it.items()
                              if key.startswith(f"parameter.{half}.")} for half in ("experiment", "analysis")},
        "seed": int(it["seed"]),
        "attempt": whole(it.get("attempt")),
        "repetition": whole(it.get("repetition")),
        "log": junit_log(suite),
        "junit errors": [],
    }
    if values:
        record["measurements"] = [(name, number(value), unit) for name, (value, unit) in values.items()]
    if [f"source.{half}.{name}" in it for half, all_of in record["parameters"].items() for name in all_of].count(False):
        raise ValueError("a parameter without its source")
    if derived_verdict(suite) != it["verdict"]:
        raise ValueError(f"it says {it['verdict']}, and its test cases {derived_verdict(suite)}")
    # If results cannot be judged, their cases have the errors. That of the run is the first of a limit of its own, if
    # there is one, else the first of a limit of the user.
    unjudged = [one for one in cases if one.find("error") is not None and "value" in properties_of(one)]
    unjudged.sort(key=lambda one: report_limits.is_label(properties_of(one).get("limit", "")))
    if len(errors) > 1 or bool(errors or unjudged) != (it["verdict"] == "error"):
        raise ValueError(f"{len(errors)} errors of the run")
    for one in errors or unjudged[:1]:
        error = one.find("error")
        record["junit errors"] = [error.get("type"), error.get("message"), error.text]
        record["error stage"] = one.get("name") if errors else "analyze"
    return record


def error_lines(errors, indent):
    """The errors as user-readable text."""
    return [indent + ("caused by " if place else "") + printable(f"{one.domain} code {one.code}: {one.message}")
            for place, one in enumerate(errors)]


def skip_lines(skip):
    return [] if skip is None else [f"    {skip[0]}: {printable(skip[1])}"]


def expected_of_junit(record):
    errors = record["errors"]
    lines = "".join(line + "\n" for line in error_lines(errors, ""))
    return {
        "name": in_xml(record["name"]),
        "summary": in_xml(record["summary"]),
        "verdict": record["verdict"],
        "skip": record["skip"] and (record["skip"][0], in_xml(record["skip"][1])),
        "results": [one._replace(name=in_xml(one.name), unit=in_xml(one.unit),
                                 limit=one.limit and one.limit._replace(name=in_xml(one.limit.name)))
                    for one in report_limits.rows_of(record, Limit, lambda name, label: f"{name}: {label}")],
        "measurements": [(in_xml(name), value, in_xml(unit)) for name, value, unit in record["measurements"]],
        "parameters": {half: {in_xml(name): value for name, value in values.items()}
                       for half, values in record["parameters"].items()},
        "seed": record["seed"],
        "attempt": record["attempt"],
        "repetition": record["repetition"],
        "error lines": in_xml(lines),
        "outcome": "skip",  # of an error that was accepted
        "log": [(level, in_xml(printable(text))) for level, text in record["log"]],
        "junit errors": errors and [in_xml(f"{errors[0].domain}:{errors[0].code}"), in_xml(errors[0].message),
                                    in_xml(lines)],
    }


# --- The text ---


def width_of(character):
    """The columns that a character takes on a terminal."""
    category = unicodedata.category(character)
    if category in ("Mn", "Me") or character in "\u200b\u200c\u200d\u2060\ufeff" or "\u1160" <= character <= "\u11ff":
        return 0
    return 2 if category != "Cn" and unicodedata.east_asian_width(character) in "WF" else 1


def columns_of(line, begins):
    """The cells of a table line, as bytes. A blank precedes every cell, so blanks at the beginning of a cell belong to
    it."""
    cuts = []
    column = at = 0
    for piece in re.findall("[ -~]+|[^ -~]", line.decode()):  # most of a table is blanks
        is_ascii = piece.isascii()
        width = len(piece) if is_ascii else width_of(piece)
        while len(cuts) < len(begins) and begins[len(cuts)] <= column + width:
            inside = begins[len(cuts)] - column
            if inside != width and not is_ascii:
                raise ValueError(f"column {begins[len(cuts)]} is in the middle of {piece!r}")
            cuts.append(at + (inside if is_ascii else len(piece.encode())))
        column += width
        at += len(piece.encode())
    if len(cuts) < len(begins):
        raise ValueError(f"a line of a table ends before column {begins[len(cuts)]}")
    return [line[begin:end] for begin, end in zip(cuts, cuts[1:] + [len(line)])]


def readable(cell):
    return cell.decode("utf-8", "replace").rstrip(" ")


def table_of(lines):
    """The rows of a table whose second column is a right-aligned number."""
    header = lines[0].decode()
    begins = [header.index(word) for word in ("Unit", "Limit", "Severity", "Verdict") if word in header]
    rows = []
    for line in lines[1:]:
        first, *others = columns_of(line, [2, *begins])
        name, _, value = first.rstrip(b" ").rpartition(b" ")
        rows.append([readable(name), number(value.decode()), *map(readable, others)])
    return rows


def text_limit(text):
    """Parses a limit and its name."""
    if text == "-":
        return None
    if report_limits.is_label(text):
        return Limit(text, None, None)
    one = r"(-?[0-9.e+-]+|-?inf|nan)"
    found = re.fullmatch(f"(?s)(.*): (?:no bounds|= {one}|(?:(>=?) {one})?(?:, )?(?:(<=?) {one})?)", text)
    name, exact, above, low, below, high = found.groups()
    if exact is not None:
        return Limit(name, (number(exact), False), (number(exact), False))
    return Limit(name, above and (number(low), above == ">"), below and (number(high), below == "<"))


class Lines:
    """Reads the lines of a text one by one."""

    def __init__(self, content):
        self.lines = content.split(b"\n")
        self.at = 0

    def next(self):
        self.at += 1
        return self.lines[self.at - 1]

    def block(self):
        """The lines up to an empty one, which is skipped."""
        begin = self.at
        while self.next():
            pass
        return self.lines[begin:self.at - 1]

    def rest(self):
        return self.lines[self.at:]


def read_text(lines, expected):
    """The next record in a text."""
    record = {"name": lines.next().decode("utf-8", "replace")}
    head = [line.decode("utf-8", "replace") for line in lines.block()]
    record["summary"], said = head[:len(expected["summary"])], head[len(expected["summary"]):]
    record["said"] = "".join(said).replace(" ", "")  # its lines are broken at blanks
    beginning = blurred(re.sub(r"(\\x?[0-9a-f]?)?\.\.\.$", "", record["said"]))
    is_cut = record["said"].endswith("...") and len(record["said"]) > 100  # it is too long
    if is_cut and blurred(expected["said"]).startswith(beginning):
        record["said"] = expected["said"]
    record["results"], record["measurements"] = [], []
    if expected["results"]:
        record["results"] = [Result(name, value, unit, text_limit(limit), verdict.replace("-", "none"),
                                    "".join(severity).replace("-", ""))
                             for name, value, unit, limit, *severity, verdict in table_of(lines.block())]
    if expected["measurements"]:
        record["measurements"] = [tuple(row) for row in table_of(lines.block())]
    if expected["auxiliaryData"]:
        lines.block()
    verdict, *errors = lines.block()
    record["verdict"] = {b"PASS": "pass", b"DONE": "pass", b"FAIL": "fail", b"ERROR": "error",
                         b"SKIP": "skip"}[verdict[2:]]
    record["errors"] = [line.decode("utf-8", "replace") for line in errors]
    return record


def expected_of_text(record, of_experiments):
    def shown(text):
        return printable(text).rstrip(" ")

    def of_limit(limit):
        return limit and limit._replace(name=printable(limit.name))

    return {
        "name": printable(record["name"]),
        "summary": ["  " + printable(line) for line in record["summary"].split("\n")],
        "said": "".join(printable(f"{name}: {value}") for name, value in record["auxiliaryData"].items()
                        if isinstance(value, str) and not of_experiments).replace(" ", ""),
        "results": [one._replace(name=shown(one.name), unit=shown(one.unit), limit=of_limit(one.limit))
                    for one in report_limits.rows_of(record, lambda label, *_: Limit(label, None, None))],
        "measurements": [(shown(name), value, shown(unit)) for name, value, unit in record["measurements"]]
        if of_experiments else [],
        "auxiliaryData": of_experiments and record["auxiliaryData"],
        "verdict": record["verdict"],
        "errors": ([f"    {record['trial']}"] if record["trial"] else []) +
                  (error_lines(record["errors"], "    ") or skip_lines(record["skip"])),
    }
