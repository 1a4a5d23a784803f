#!/usr/bin/env python3
"""Attacks the program in several hundred ways and prints a table: case, expected, got.

    attack.py [--all] [--wrong] [--only TEXT] PROGRAM PLUGINS DATA

PLUGINS is the directory with attacker.so and well_behaved.so, DATA that of the shipped scenarios and bindings. Without
--all, most attacks that take long are left out; --wrong prints only the lines that differ; --only runs only those whose
group or reader has the text. The exit code is 1 if any differs.
"""

import argparse
import concurrent.futures
import sys
import time

import files
import plugin_attacks
import surroundings
from cases import Bench


def shortened(text, length):
    text = text.encode("unicode_escape").decode()
    return text if len(text) <= length else text[:length - 3] + "..."


def main():
    parser = argparse.ArgumentParser()
    for switch in ("--all", "--wrong"):
        parser.add_argument(switch, action="store_true")
    parser.add_argument("--only", default="")
    for name in ("program", "plugins", "data"):
        parser.add_argument(name)
    options = parser.parse_args()
    bench = Bench(options.program, options.plugins, options.data)
    begin = time.monotonic()
    jobs = [job for module in (surroundings, files, plugin_attacks) for job in module.jobs(bench, options.all)
            if options.only in str(job.args)]
    with concurrent.futures.ThreadPoolExecutor(3) as pool:
        cases = [case for found in pool.map(lambda job: job(), jobs) for case in found]
    wrong = [case for case in cases if not case.is_right]
    for case in wrong if options.wrong else cases:
        mark = " " if case.is_right else "*"
        print(f"{mark} {shortened(case.name, 60):60}  {shortened(' or '.join(case.expected), 60):60}  "
              f"{shortened(case.got, 200 if mark == '*' else 60)}")
    print(f"{len(cases)} attacks, {len(cases) - len(wrong)} as expected, {len(wrong)} not, "
          f"in {time.monotonic() - begin:.0f} s")
    return 1 if wrong or not cases else 0


if __name__ == "__main__":
    sys.exit(main())
