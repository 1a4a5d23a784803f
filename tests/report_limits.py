"""Limits of the user in the report formats: parses their canonical text, judges by them, and tells what each format
says of them.
"""

import collections
import math
import re

Check = collections.namedtuple("Check", "text name severity source verdict")  # as in the JSON document
Condition = collections.namedtuple("Condition", "diagnostic result shown lower upper unit other operator tolerance")

NAME = r'("(?:[^"\\]|\\.)*"|[^<>=!:"+]+?)'
NUMBER = r"([-+.0-9][^\s,\])]*)"
UNIT = r'(?: ("(?:[^"\\]|\\.)*"|(?!\+-)[^ \t"]+))?'
LIMIT = re.compile(rf"(?s)(?:{NAME}:)?({NAME} (?:in ([\[(]){NUMBER}, {NUMBER}([\])]){UNIT}|"
                   rf"(<=|>=|<|>|==) (?:{NUMBER}{UNIT}|{NAME})(?: \+- {NUMBER})?))")
# The end of a label; the limits of the samples have these sources.
SOURCE = re.compile(r"(?s)\((?:command line|profile .*)\)$")
VALIDATORS = {("lower", False): "GREATER_THAN_OR_EQUAL", ("lower", True): "GREATER_THAN",
              ("upper", False): "LESS_THAN_OR_EQUAL", ("upper", True): "LESS_THAN"}


def check_of(json):
    """Reads a limit of JSON."""
    return Check(*(json[key] for key in ("limit", "name", "severity", "source", "verdict")))


def unquoted(name):
    """A name without its quotation marks."""
    if name is None or not name.startswith('"'):
        return name
    return re.sub(r'(?s)\\(["\\])', r"\1", name[1:-1])


def condition_of(text):
    """Parses the canonical text of a limit. Bounds are (number, open)."""
    found = LIMIT.fullmatch(text)
    if found is None:
        raise ValueError(f"not a limit: {text!r}")
    diagnostic, shown, result, left, low, high, right, of_interval, sign, number, unit, other, margin = found.groups()
    lower = upper = None
    if left:
        lower, upper, unit = (float(low), left == "("), (float(high), right == ")"), of_interval
    elif number is not None:
        value, around = float(number), float(margin or 0)
        if sign in (">", ">=", "=="):
            lower = (value - around, sign == ">")
        if sign in ("<", "<=", "=="):
            upper = (value + around if sign == "==" else value, sign == "<")  # -0.0 + 0 is 0
    return Condition(unquoted(diagnostic), unquoted(result), shown, *map(finite, (lower, upper)), unquoted(unit),
                     unquoted(other), sign, float(margin or 0))


def finite(bound):
    """Beyond the largest double there is nothing to compare with."""
    return bound if bound and math.isfinite(bound[0]) else None


def label_of(check):
    """The name, the text without the diagnostic, and the source."""
    return (check.name + ": " if check.name else "") + condition_of(check.text).shown + f" ({check.source})"


def is_label(text):
    return SOURCE.search(text) is not None


def bounds_of(check):
    condition = condition_of(check.text)
    return [None if one is None else (repr(one[0]), one[1]) for one in (condition.lower, condition.upper)]


def compared(check, result, results):
    """True or false, or nothing if the result cannot be compared with the limit."""
    condition, value = condition_of(check.text), float(result.value)
    if not math.isfinite(value) or condition.unit not in (None, result.unit):
        return None
    if condition.other is None:
        above, below = condition.lower, condition.upper
        return ((above is None or value > above[0] or (value == above[0] and not above[1])) and
                (below is None or value < below[0] or (value == below[0] and not below[1])))
    others = [one for one in results if one.name == condition.other]
    if len(others) != 1 or others[0].unit != result.unit or not math.isfinite(float(others[0].value)):
        return None
    other, margin = float(others[0].value), condition.tolerance
    return {"<": value < other, "<=": value <= other, ">": value > other, ">=": value >= other,
            "==": other - margin <= value <= other + margin}[condition.operator]


def verdict_of(check, result, results):
    """The verdict that the limit must have."""
    passed = compared(check, result, results)
    if passed:
        return "pass"
    if passed is None and result.verdict == "error":
        return "skip"
    return "error" if passed is None and check.severity == "fail" else check.severity


def warnings_in(records):
    return sum(check.verdict == "warn" for one in records for checks in one["checks"] for check in checks)


def failed_names(record):
    """The results that failed, by their own limits or by those of the user, each once."""
    return list(dict.fromkeys(one.name for one, checks in zip(record["results"], record["checks"])
                              if "fail" in (one.verdict, *(check.verdict for check in checks))))


def rows_of(record, limit_of, name_of=None):
    """The results, each followed by one row per limit of the user. `limit_of` makes the limit of a row from the label
    and the bounds, `name_of` the name from those of the result and the limit."""
    rows = []
    for one, checks in zip(record["results"], record["checks"]):
        rows.append(one)
        for check in checks:
            label = label_of(check)
            name = name_of(one.name, label) if name_of else one.name
            rows.append(one._replace(name=name, limit=limit_of(label, *bounds_of(check)), verdict=check.verdict,
                                     severity=check.severity))
    return rows


# --- Open Compute Test & Validation ---


def expected_of_ocp(record):
    """Per result its validators, what is said of each limit, a diagnosis or a warning, and the limits themselves."""
    known = record["verdict"] != "error"
    expected = []
    for checks in record["checks"]:
        validators, said = [], []
        for check in checks:
            label = label_of(check)
            bounds = zip(("lower", "upper"), bounds_of(check))
            if check.severity == "fail" and check.verdict not in ("error", "skip"):
                validators += [(label, VALIDATORS[which, bound[1]], bound[0]) for which, bound in bounds if bound]
            said.append((check.verdict if known or check.verdict == "warn" else "unknown", label))
        expected.append((validators, said, checks))
    return expected


def read_ocp(artifacts):
    """Reads the same from the artifacts of the analysis."""
    found = []
    name = None
    for one in artifacts:
        if "measurement" in one:
            name = one["measurement"]["name"]
            checks = one["measurement"].get("metadata", {}).get("userLimits", [])
            found.append(([(each["name"], each["type"], repr(float(each["value"])))
                           for each in one["measurement"].get("validators", []) if is_label(each["name"])], [],
                          [check_of(each) for each in checks]))
        elif one.get("log", {}).get("severity") == "WARNING":
            found[-1][1].append(("warn", one["log"]["message"].partition(", limit ")[2]))
        elif is_of_limit(one, name):
            kind = one["diagnosis"]["type"].lower()
            if one["diagnosis"]["verdict"] != f"{name}-limit-{kind}":
                raise ValueError(f"diagnosis {one['diagnosis']} of {name}")
            found[-1][1].append((kind, one["diagnosis"]["message"].partition(", limit ")[2]))
    return found


def is_of_limit(artifact, name):
    """True for the diagnosis of a limit of the user on the result of that name."""
    return artifact.get("diagnosis", {}).get("verdict", "").startswith(f"{name}-limit-")
