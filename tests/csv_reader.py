"""Parses the tables of comma-separated values back into records; see report_readers.py."""

import csv
import io
import re

import report_limits
from report_readers import NO_LIMIT, Error, Limit, Result, number, whole

CSV_HEADER = ("diagnostic,verdict,result,value,unit,limit,lower,lowerOpen,upper,upperOpen,severity,resultVerdict,"
              "errorStage,errorDomain,errorCode,errorMessage").split(",")


def lines_of(record, of_experiments):
    """The number of lines for a record without images."""
    if of_experiments:
        return len(record["measurements"])
    return max(1, len(record["results"]) + sum(map(len, record["checks"])))


def csv_rows(content):
    rows = csv.reader(io.StringIO(content.decode("utf-8", "replace"), newline=""))
    return [[re.sub(r"^'('*[=+\-@\t\r])", r"\1", cell) for cell in row] for row in rows]  # protected from spreadsheets


def read_csv(rows, header):
    """Converts a diagnostic's lines to a record."""
    if any(row[:2] != rows[0][:2] or row[12:] != rows[0][12:] for row in rows):
        raise ValueError("lines of one diagnostic differ in what they say of it")
    first = dict(zip(CSV_HEADER, rows[0]))
    results = []
    for row in rows:
        it = dict(zip(CSV_HEADER, row))
        if it["value"] == "":
            continue
        flags = {"1": True, "0": False}
        bounds = [(number(it[which]), flags[it[which + "Open"]]) if it[which] else None for which in ("lower", "upper")]
        results.append(Result(it["result"], number(it["value"]), it["unit"], Limit(it["limit"], *bounds),
                              it["resultVerdict"], it["severity"]))
    errors = [Error(first["errorDomain"], int(first["errorCode"]), first["errorMessage"])] if first["errorCode"] else []
    more = dict(zip(header[len(CSV_HEADER):], rows[0][len(CSV_HEADER):]))
    skip = (more.get("skipKind"), more.get("skipReason"))
    return {"name": first["diagnostic"], "verdict": first["verdict"], "results": results, "errors": errors,
            "error stage": first["errorStage"], "skip": skip if any(skip) else None,
            "attempt": whole(more.get("attempt") or None), "repetition": whole(more.get("repetition") or None)}


def expected_of_csv(record):
    """No limit looks like a limit without name and bounds, and there is only one error."""
    results = [one._replace(limit=one.limit or NO_LIMIT) for one in report_limits.rows_of(record, Limit)]
    return {"name": record["name"], "verdict": record["verdict"], "results": results, "errors": record["errors"][:1],
            "skip": record["skip"], "attempt": record["attempt"], "repetition": record["repetition"]}


def read_experiment_csv(rows):
    """The measurements of all experiments."""
    columns = {name: rows[0].index(name) for name in ("experiment", "measurement", "value", "unit") if name in rows[0]}
    if len(columns) < 4:
        return []
    cells = [[row[columns[name]] for name in ("experiment", "measurement", "value", "unit")] for row in rows[1:]]
    return [(experiment, name, number(value), unit) for experiment, name, value, unit in cells if value]
