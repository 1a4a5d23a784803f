#!/usr/bin/env python3
"""Measures how long quazor records takes for each question about a made-up store.

    records_store.py PROGRAM [RUNS]

The store has RUNS runs, 20,000 by default, of 50 results each at four stations on 60 days; 4 % of the runs fail, and a
third of the phones come again. Each question is asked five times by a new process, whose start is in the time. Exits
with 1 if the median of a question is above MAX_SECONDS, a bar for 20,000 runs.
"""

import os
import pathlib
import random
import sqlite3
import statistics
import subprocess
import sys
import tempfile
import time

ROOT = pathlib.Path(__file__).resolve().parent.parent
MAX_SECONDS = 0.1
RESULTS = 50
DAYS = 60


def made_store(program, directory, runs):
    """A store whose layout the program made, filled past it: an import of so many records would take minutes."""
    os.environ["QUAZOR_PROGRAM"] = program
    os.environ.setdefault("QUAZOR_TEST_PLUGINS", "")
    sys.path[:0] = [str(ROOT / "host/command"), str(ROOT / "host/command/records")]
    import records_fixture  # needs the program
    store, first = directory / "records.sqlite", directory / "first.jsonl"
    lines = records_fixture.record_lines([records_fixture.result(f"R{one}", 0.5, -1, 1) for one in range(RESULTS)],
                                         serial="first", station="S0")
    first.write_text("".join(lines))
    subprocess.run([program, "records", "import", str(first), "--store", str(store)], check=True, stdout=subprocess.DEVNULL)
    chance = random.Random(5)
    database = sqlite3.connect(store)
    characteristics = [row[0] for row in database.execute("SELECT id FROM characteristic")]
    run_rows, result_rows = [], []
    for number in range(2, runs + 1):
        day = records_fixture.day(number * DAYS // (runs + 1))
        failing = chance.choice(characteristics) if chance.random() < 0.04 else None
        run_rows.append((number, number.to_bytes(32, "big"), f"{number:032x}", f"{day}T{number % 24:02}:00:00.000000000Z", day,
                         "run", f"S{chance.randrange(4)}", f"P{chance.randrange(runs * 3 // 4)}", "h", "p", "0", "f", 9, 1, 1,
                         "pass" if failing is None else "fail"))
        result_rows += [(one, number, 1, 5, "fail") if one == failing else (one, number, 1, chance.gauss(0, 0.2), "pass")
                        for one in characteristics]
    database.executemany(f"INSERT INTO run VALUES({','.join('?' * 16)})", run_rows)
    database.executemany("INSERT INTO result VALUES(?, ?, ?, ?, ?)", sorted(result_rows))
    database.execute("DELETE FROM summary")
    database.execute(
        "INSERT INTO summary SELECT characteristic, day, station, count(*), count(*), avg(value), "
        "sum(value * value) - count(*) * avg(value) * avg(value), min(value), max(value), sum(value <> round(value)), "
        "sum(result.verdict = 'pass'), sum(result.verdict = 'fail') FROM result JOIN run ON run.id = result.run GROUP BY 1, 2, 3")
    database.commit()
    database.close()
    return store


def main():
    program, runs = sys.argv[1], int(sys.argv[2]) if len(sys.argv) > 2 else 20000
    slow = 0
    with tempfile.TemporaryDirectory() as name:
        store = made_store(program, pathlib.Path(name), runs)
        print(f"{runs} runs, {runs * RESULTS} results, {store.stat().st_size / 1e6:.1f} MB")
        for question in ("yield", "yield --station S1 --since 2026-12-01", "failures", "failures --serial P17", "flaky", "drift",
                         "drift --result R3 --station S1", "capability", "gauge --result R3", "list --serial P17", "show 77"):
            seconds = []
            for _ in range(5):
                begin = time.perf_counter()
                subprocess.run([program, "records", *question.split(), "--store", str(store)], check=True,
                               stdout=subprocess.DEVNULL)
                seconds.append(time.perf_counter() - begin)
            median = statistics.median(seconds)
            slow += median > MAX_SECONDS
            print(f"{question:40} best {min(seconds) * 1e3:7.1f} ms  median {median * 1e3:7.1f} ms"
                  f"{'  TOO SLOW' if median > MAX_SECONDS else ''}")
    return 1 if slow else 0


if __name__ == "__main__":
    sys.exit(main())
