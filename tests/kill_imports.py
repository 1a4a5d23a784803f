#!/usr/bin/env python3
"""Kills imports of quazor records at random moments and compares the store with one that was never disturbed.

    kill_imports.py PROGRAM [KILLS]

Each time, new records are imported by a process that is killed somewhere in between. Then the store must be whole, and
have exactly a number of the records that were given; an import after it completes it. KILLS is 200 by default. Prints
how many kills met a running import; exits with 1 at the first store that differs.
"""

import json
import os
import pathlib
import random
import signal
import sqlite3
import subprocess
import sys
import tempfile
import time

ROOT = pathlib.Path(__file__).resolve().parent.parent
os.environ["QUAZOR_PROGRAM"] = sys.argv[1]
os.environ.setdefault("QUAZOR_TEST_PLUGINS", "")
sys.path[:0] = [str(ROOT / "host/command"), str(ROOT / "host/command/records")]
from records_fixture import StoreTest, record_lines, result  # noqa: E402  pylint: disable=wrong-import-position

RECORDS = 1000


def command(store, folder):
    return [sys.argv[1], "records", "import", str(folder), "--store", str(store)]


def content(store):
    """As StoreTest.content(), of any store."""
    test = StoreTest()
    test.store = store
    return test.content()


def main():
    kills = int(sys.argv[2]) if len(sys.argv) > 2 else 200
    chance = random.Random(kills)
    with tempfile.TemporaryDirectory() as name:
        directory = pathlib.Path(name)
        folder = directory / "records"
        folder.mkdir()
        for number in range(RECORDS):
            lines = record_lines([result(f"R{one}", number / 7 + one, -1e6, 1e6) for one in range(20)], serial=f"P{number}",
                                 station=f"S{number % 3}", second=number)
            (folder / f"{number:05}.jsonl").write_text("".join(lines))
        undisturbed = directory / "undisturbed.sqlite"
        begin = time.monotonic()
        subprocess.run(command(undisturbed, folder), check=True, stdout=subprocess.DEVNULL)
        whole = time.monotonic() - begin
        expected = content(undisturbed)
        running = partly = 0
        store = directory / "killed.sqlite"
        for _ in range(kills):
            if not store.exists() or chance.random() < 0.3:
                for old in directory.glob("killed.sqlite*"):
                    old.unlink()
            with subprocess.Popen(command(store, folder), stdout=subprocess.DEVNULL) as process:
                time.sleep(chance.uniform(0, whole))
                running += process.poll() is None
                process.send_signal(signal.SIGKILL)
            if not store.exists():
                continue
            check = subprocess.run([sys.argv[1], "records", "check", "--store", str(store)], capture_output=True, text=True,
                                   check=False)
            if check.returncode not in (0, 66) or (check.returncode == 66 and "it is empty" not in check.stderr):
                print(check.stdout + check.stderr)
                return 1
            if check.returncode == 66:
                continue
            found = content(store)
            partly += 0 < len(found[0]) < RECORDS
            if not set(found[0]) <= set(expected[0]) or not set(found[1]) <= set(expected[1]):
                print("the store has what no record says")
                return 1
            runs = {row[0] for row in found[0]}
            if len(found[1]) != sum(row[0] in runs for row in expected[1]):
                print("the store lacks results of a run that it has")
                return 1
        done = subprocess.run(command(store, folder) + ["--format", "json"], capture_output=True, text=True, check=True)
        if content(store) != expected:
            print("the completed store differs from the undisturbed one", json.loads(done.stdout))
            return 1
    print(f"{kills} kills, {running} of a running import, {partly} left a part of the records: all stores right")
    return 0


if __name__ == "__main__":
    sys.exit(main())
