#!/usr/bin/env python3
"""Runs each fuzzer for a long time, summed over as many periods as it takes.

usage: tests/fuzz/long [--seconds SECONDS] [--slice SECONDS] [--state FOLDER] BUILD_DIRECTORY [FUZZER...]

One fuzzer runs at a time, at low priority, the one with the fewest seconds first, until each has run for SECONDS (default
3600). Seconds are those of processor time, because a busy machine gives a fuzzer little of each second on the clock; nor is an
input too slow that only waited for the processor. It can be interrupted at any time: the next call goes on with the corpus and
the sums in FOLDER (default $XDG_STATE_HOME/quazor/fuzz). An input that fails stays in FOLDER/FUZZER/failing; the next call tries it again first and,
if it passes by then, moves it to the corpus. Prints a table at the end.

Exit code 0: each fuzzer has run for SECONDS; 1: an input fails, which is named; 2: interrupted.
"""

import argparse
import contextlib
import fcntl
import json
import os
import pathlib
import re
import resource
import shutil
import signal
import subprocess
import sys

ROOT = pathlib.Path(__file__).resolve().parents[2]
HEARTBEAT = 5.0  # seconds between two saves of the sums
LIMITS = ("-max_len=65536", "-rss_limit_mb=4096")
LONGEST_UNIT = 10  # seconds of processor time
STARVED = 60  # so many times as long may it take on the clock of a busy machine
TOO_SLOW = ("timeout-", "slow-unit-")
PROGRESS = re.compile(r"\bcov: (\d+)")
EXECUTIONS = re.compile(r"stat::number_of_executed_units: *(\d+)")


class Interrupted(Exception):
    pass


def raise_interrupted(_number, _frame):
    raise Interrupted


class State:
    """The sums of all fuzzers, in a file that is replaced at once."""

    def __init__(self, folder):
        self.folder = folder
        folder.mkdir(parents=True, exist_ok=True)
        self.file = folder / "state.json"
        self.sums = json.loads(self.file.read_text(encoding="utf-8")) if self.file.exists() else {}

    def of(self, fuzzer):
        return self.sums.setdefault(fuzzer, {"seconds": 0.0, "executions": 0, "coverage": 0})

    def save(self):
        temporary = self.file.with_suffix(".tmp")
        temporary.write_text(json.dumps(self.sums, indent=2) + "\n", encoding="utf-8")
        temporary.replace(self.file)

    def part(self, fuzzer, name):
        folder = self.folder / fuzzer / name
        folder.mkdir(parents=True, exist_ok=True)
        return folder

    def failing(self, fuzzer):
        return sorted(self.part(fuzzer, "failing").iterdir())


@contextlib.contextmanager
def locked(folder):
    """Only one call may use the state."""
    folder.mkdir(parents=True, exist_ok=True)
    with open(folder / "lock", "w", encoding="utf-8") as lock:
        try:
            fcntl.flock(lock, fcntl.LOCK_EX | fcntl.LOCK_NB)
        except BlockingIOError:
            sys.exit(f"another call uses {folder}")
        yield


def command_of(programs, fuzzer, *arguments):
    return ["nice", "-n", "19", str(programs / f"{fuzzer}_fuzzer"), *map(str, arguments)]


def write_seeds(programs, state):
    """The folder with the first inputs of each fuzzer, and the names of the fuzzers."""
    seeds = state.folder / "seeds"
    shutil.rmtree(seeds, ignore_errors=True)
    subprocess.run([programs / "fuzz_seeds", ROOT / "data", seeds], check=True)
    return seeds, sorted(path.name for path in seeds.iterdir())


def fails(programs, fuzzer, kept):
    """Whether an input fails if it is tried alone."""
    def limit():
        resource.setrlimit(resource.RLIMIT_CPU, (LONGEST_UNIT, LONGEST_UNIT))
    command = [programs / f"{fuzzer}_fuzzer", *LIMITS, "-timeout=0", kept]
    try:
        return subprocess.run(command, capture_output=True, check=False, preexec_fn=limit,
                              timeout=LONGEST_UNIT * STARVED).returncode != 0
    except subprocess.TimeoutExpired:
        return True


def retry_failing(programs, state, fuzzer, kinds=("",)):
    """The first kept input that still fails, or None; moves the others to the corpus. `kinds` are beginnings of names:
    an input of another kind is taken for one that fails."""
    for kept in state.failing(fuzzer):
        if not kept.name.startswith(kinds) or fails(programs, fuzzer, kept):
            return kept
        kept.replace(state.part(fuzzer, "corpus") / kept.name)
    return None


def add_statistics(sums, log):
    """Adds what the fuzzer printed at its end."""
    executed, reached = EXECUTIONS.findall(log), PROGRESS.findall(log)
    sums["executions"] += int(executed[-1]) if executed else 0
    sums["coverage"] = max(sums["coverage"], *map(int, reached)) if reached else sums["coverage"]


def processor_seconds(pid):
    """What a running process has used: utime and stime of proc(5)'s stat, which follow the name in parentheses."""
    fields = pathlib.Path(f"/proc/{pid}/stat").read_text(encoding="utf-8").rpartition(")")[2].split()
    return (int(fields[11]) + int(fields[12])) / os.sysconf("SC_CLK_TCK")


def processor_seconds_of_ended_processes():
    used = resource.getrusage(resource.RUSAGE_CHILDREN)
    return used.ru_utime + used.ru_stime


def run_slice(programs, state, seeds, fuzzer, seconds):
    """Runs a fuzzer and adds to its sums, even if interrupted. Returns its exit code."""
    sums = state.of(fuzzer)
    logfile = state.folder / fuzzer / "log"
    arguments = [f"-max_total_time={seconds}", "-print_final_stats=1", f"-timeout={LONGEST_UNIT * STARVED}", *LIMITS,
                 f"-artifact_prefix={state.part(fuzzer, 'failing')}/", state.part(fuzzer, "corpus"), seeds / fuzzer]
    before, ended_before = sums["seconds"], processor_seconds_of_ended_processes()

    def save_seconds(spent):
        sums["seconds"] = before + spent
        state.save()

    with open(logfile, "wb") as log:
        process = subprocess.Popen(command_of(programs, fuzzer, *arguments), stdout=log, stderr=subprocess.STDOUT)
        try:
            while True:
                with contextlib.suppress(subprocess.TimeoutExpired):
                    return process.wait(timeout=HEARTBEAT)
                save_seconds(processor_seconds(process.pid))
        finally:
            if process.poll() is None:
                process.terminate()  # the fuzzer still prints its statistics
                process.wait()
            add_statistics(sums, logfile.read_text(encoding="utf-8", errors="replace"))
            save_seconds(processor_seconds_of_ended_processes() - ended_before)


def table(state, fuzzers):
    """The rows that are printed."""
    rows = [("fuzzer", "seconds", "executions", "corpus", "coverage")]
    for fuzzer in fuzzers:
        sums = state.of(fuzzer)
        corpus = sum(1 for _ in state.part(fuzzer, "corpus").iterdir())
        rows.append((fuzzer, f"{sums['seconds']:.0f}", str(sums["executions"]), str(corpus), str(sums["coverage"])))
    widths = [max(len(row[i]) for row in rows) for i in range(len(rows[0]))]
    return [" ".join(cell.ljust(width) if i == 0 else cell.rjust(width)
                     for i, (cell, width) in enumerate(zip(row, widths))) for row in rows]


def report_failure(state, fuzzer, kept):
    logfile = state.folder / fuzzer / "log"
    print(f"the {fuzzer} fuzzer fails with {kept}")
    if logfile.exists():
        print(f"its last output is in {logfile}")


def fuzz(programs, state, fuzzers, seeds, goal, longest):
    """Runs the fuzzers up to the goal. Returns the exit code."""
    for fuzzer in fuzzers:
        kept = retry_failing(programs, state, fuzzer)
        if kept is not None:
            report_failure(state, fuzzer, kept)
            return 1
    while True:
        fuzzer = min(fuzzers, key=lambda name: state.of(name)["seconds"])
        left = goal - state.of(fuzzer)["seconds"]
        if left <= 0:
            return 0
        code = run_slice(programs, state, seeds, fuzzer, max(1, round(min(left, longest))))
        if code != 0 and not state.failing(fuzzer):
            report_failure(state, fuzzer, f"exit code {code} and no input")
            return 1
        kept = retry_failing(programs, state, fuzzer, TOO_SLOW)
        if kept is not None:
            report_failure(state, fuzzer, kept)
            return 1


def parse(arguments):
    home = os.environ.get("XDG_STATE_HOME") or pathlib.Path.home() / ".local" / "state"
    parser = argparse.ArgumentParser(description="Runs the fuzzers for a long time, in several periods.")
    parser.add_argument("--seconds", type=float, default=3600, help="processor time of each fuzzer in all; default 3600")
    parser.add_argument("--slice", type=float, default=300, help="how long one fuzzer runs before the next, on the clock; default 300")
    parser.add_argument("--state", type=pathlib.Path, default=pathlib.Path(home) / "quazor" / "fuzz",
                        help="the folder of the corpus and the sums")
    parser.add_argument("build", type=pathlib.Path, help="a build of the preset fuzzers or sanitized")
    parser.add_argument("fuzzers", nargs="*", help="default: all")
    return parser.parse_args(arguments)


def main(arguments):
    options = parse(arguments)
    programs = options.build.resolve() / "fuzz"
    for number in (signal.SIGINT, signal.SIGTERM):
        signal.signal(number, raise_interrupted)
    with locked(options.state):
        state = State(options.state.resolve())
        seeds, known = write_seeds(programs, state)
        unknown = sorted(set(options.fuzzers) - set(known))
        if unknown:
            sys.exit(f"there is no fuzzer {unknown[0]}; the fuzzers are {', '.join(known)}")
        fuzzers = options.fuzzers or known
        try:
            code = fuzz(programs, state, fuzzers, seeds, options.seconds, options.slice)
        except Interrupted:
            code = 2
        state.save()
        print("\n".join(table(state, fuzzers)))
    return code


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
