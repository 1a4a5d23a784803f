#!/usr/bin/env python3
"""Measures the cost of running plug-ins in separate processes.

usage: isolation.py BUILD

BUILD is a release build directory with the program, the plug-in and the benchmark plug-in log_flood. Exit code 0: all
requirements are met; 1: one is missed; 2: invalid arguments.
"""

import json
import os
import pathlib
import statistics
import subprocess
import sys
import tempfile
import time

from requirements import Requirements

REPETITIONS = 50
LINES = 300_000
FLOODS = 5
# In virtual time the diagnostic itself takes only a few milliseconds.
DIAGNOSTIC = ("run", "CameraSyncDiagnostic.Back")


def seconds_of(command, state):
    """The duration of a command, which must succeed. `state` is the directory for the previous run's record."""
    begin = time.perf_counter()
    subprocess.run(command, stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE, check=True,
                   env=dict(os.environ, XDG_STATE_HOME=str(state)))
    return time.perf_counter() - begin


def lines_in(record):
    """The number of the flood's lines in a record. They are numbered and must be in order."""
    count = 0
    with open(record, encoding="utf-8") as file:
        for line in file:
            if '"event":"log"' in line and json.loads(line)["text"] == f"line {count}":
                count += 1
    return count


def measure(build, quick=False):
    """The medians: "child", "in process" and "list" in seconds, "lines" per second; and the number of lines "lost".
    None if a command fails."""
    print("running isolation ...", flush=True)
    try:
        return measured(build, 1 if quick else REPETITIONS, 1 if quick else FLOODS)
    except subprocess.CalledProcessError as failure:
        print(f"{failure}: {failure.stderr.decode(errors='replace')}")
        return {}


def measured(build, repetitions, floods):
    program = str(pathlib.Path(build) / "bin" / "quazor")
    flood = [program, "run", "LogFlood", "--plugin", str(pathlib.Path(build) / "benchmarks" / "log_flood.so")]
    commands = {
        "child": [program, *DIAGNOSTIC],
        "in process": [program, *DIAGNOSTIC, "--in-process"],
        "list": [program, "list"],
    }
    with tempfile.TemporaryDirectory() as state:
        seconds = {name: [] for name in commands}
        for _ in range(repetitions):
            for name, command in commands.items():
                seconds[name].append(seconds_of(command, state))
        medians = {name: statistics.median(times) for name, times in seconds.items()}
        rates, medians["lost"] = [], 0
        record = os.path.join(state, "record.jsonl")
        for _ in range(floods):
            empty = seconds_of([*flood, "--record", record, "--replace", "--set", "count=0"], state)
            full = seconds_of([*flood, "--record", record, "--replace", "--set", f"count={LINES}"], state)
            rates.append(LINES / (full - empty))
            medians["lost"] += LINES - lines_in(record)
        medians["lines"] = statistics.median(rates)
    return medians


def check_isolation(requirements, medians):
    def more():
        child, here = medians["child"] * 1e3, medians["in process"] * 1e3
        return child - here < 15, f"{child:.1f} against {here:.1f} ms, {child - here:.1f} ms more"

    def lines():
        rate, lost = medians["lines"], medians["lost"]
        return rate >= 1e5 and lost == 0, f"{rate / 1e3:.0f} thousand/s, {lost} lost"

    requirements.check("a diagnostic in a process of its own: less than 15 ms more than in the program's", more)
    requirements.check("quazor list: less than 20 ms",
                       lambda: (medians["list"] * 1e3 < 20, f"{medians['list'] * 1e3:.1f} ms"))
    requirements.check("log lines from a process of its own: 100 thousand a second, and none lost", lines)


def main():
    if len(sys.argv) != 2:
        print(__doc__)
        return 2
    requirements = Requirements()
    check_isolation(requirements, measure(sys.argv[1]))
    return requirements.exit_code()


if __name__ == "__main__":
    sys.exit(main())
