#!/usr/bin/env python3
"""Changes the product by small mistakes and counts those that no test notices.

usage: tests/mutation/run.py [--count N] [--seed S] [--jobs J] [--minutes M] [--folder NAME]... [--own]
                             [--retry] [--list] [--work FOLDER] [--copy NAME]

Draws N mutants (default 400) of the folders in plan.py, each folder at least its share, and builds and tests each in a
copy of the tree below FOLDER (default build/mutation). A mutant is killed when a test fails or exceeds its time. It is
tested by the folder's own tests first, then by those near it, then by the rest of the suite. One that does not compile
is replaced by the next. equivalent.txt lists mutants that change nothing, with the reason.

Every outcome is a line of FOLDER/outcomes.jsonl, so the next call goes on; --minutes ends this one early, --own leaves
the tests of other folders to a later call, --retry tests the survivors again, --list only shows the outcomes so far.
Calls for different folders may run at the same time if each has a copy of the tree of its own (--copy). Exit code 0: at
least 97 % are killed, and 95 % of each folder; 1: fewer; 2: not all are tested yet; 3: the tests fail without a mutant.
"""

import argparse
import collections
import dataclasses
import difflib
import json
import pathlib
import re
import signal
import sys
import time

import plan
from laboratory import Laboratory, namespace_command, seconds_since

COUNT, SEED = 400, 20261122
STEPS = 3  # a folder's own tests, those near it, the rest
LEAST, LEAST_OF_FOLDER = 0.97, 0.95
OWN_LIMIT, REST_LIMIT = 600, 3000  # seconds for the tests of one step
OWN_EACH_LIMIT, REST_EACH_LIMIT = 120, 300  # seconds for one test
NO_TARGET = "build.ninja"  # builds nothing, whereas no target at all builds everything
ATTEMPTS = 3
ALL_TESTS = "all tests"  # when the step exceeds its time, but none of its tests does
BATCH = 10  # of one folder in a row, because a header that changes back is compiled everywhere
OPEN = "passed its folder's tests"  # with --own: a later call continues
FAILED_TEST = re.compile(r"^\s*\d+ - (\S+) \((.*)\)$", re.MULTILINE)


class Outcomes:
    """The outcome of every tested mutant, the last one if it was tested again."""

    def __init__(self, file):
        self.file = file
        self.by_key = {}
        if file.exists():
            for line in file.read_text(encoding="utf-8").splitlines():
                outcome = json.loads(line)
                self.by_key[outcome["key"]] = outcome

    def of(self, mutant):
        return self.by_key.get(mutant.key, {}).get("outcome")

    def add(self, mutant, outcome, by, seconds):
        entry = {"key": mutant.key, "outcome": outcome, "by": by, "seconds": seconds}
        self.by_key[mutant.key] = entry
        with open(self.file, "a", encoding="utf-8") as file:
            file.write(json.dumps(entry) + "\n")


class BaselineError(Exception):
    pass


@dataclasses.dataclass(frozen=True)
class Step:
    """Tests that judge together."""
    targets: tuple  # empty: all
    pattern: str
    each: int  # seconds for one test
    limit: int  # seconds for all


class Judge:
    """Builds and tests mutants."""

    def __init__(self, laboratory, tests, targets):
        self.laboratory = laboratory
        self.tests = tests
        self.targets = targets
        self.sound = set()  # the steps that pass without a mutant

    def _step(self, names, each):
        known = [name for name in names if name in self.tests]
        needed = [name for name in known if not name.startswith(plan.COMPILE_FAILURE)]
        targets = tuple(name for name in needed if name in self.targets) or (NO_TARGET,)
        return Step(targets if all(name in self.targets for name in needed) else (), f"^({'|'.join(known)})$", each, OWN_LIMIT)

    def _steps(self, folder, mutant):
        """The steps of a judgement, each in parts: the first failure ends it, so what fails most often comes first."""
        nearest = plan.nearest(folder, mutant.file)
        own = [names for names in (nearest, [name for name in folder.own if name not in nearest]) if names]
        return ([self._step(names, OWN_EACH_LIMIT) for names in own], [self._step(folder.near, REST_EACH_LIMIT)],
                [Step((), "", REST_EACH_LIMIT, REST_LIMIT)])

    @staticmethod
    def _pattern_of(names):
        return f"^({'|'.join(re.escape(name) for name in names)})$"

    def _failures(self, step):
        """The tests that fail twice, as pairs of name and reason: once may be a matter of time on a busy machine.

        Nobody waits twice for a test that exceeds its time: whether the machine is busy shows without the mutant.
        """
        for _ in range(ATTEMPTS):
            passed, output = self.laboratory.test(step.pattern, step.each, step.limit)
            if passed:
                return []
            failed = FAILED_TEST.findall(output)
            if any(why == "Timeout" for _, why in failed):
                return failed
            names = [name for name, _ in failed]
            again = self._pattern_of(names) if names else step.pattern
            passed, output = self.laboratory.test(again, step.each, step.limit)
            if not passed:
                return FAILED_TEST.findall(output) or [(ALL_TESTS, "Timeout")]
        raise BaselineError(f"fails only now and then: {', '.join(names)}")

    def _require_baseline(self, step, again=False):
        """Without a mutant the step must build and pass; checked once in a call."""
        if step in self.sound and not again:
            return
        built, output = self.laboratory.make(step.targets)
        passed, output = self.laboratory.test(step.pattern, step.each, step.limit) if built else (False, output)
        if not passed:
            raise BaselineError(output[-3000:])
        self.sound.add(step)

    def judge(self, folder, mutant, first, count):
        """The outcome after `count` steps from the first one on, and what killed the mutant."""
        steps = self._steps(folder, mutant)
        for step in (part for parts in steps[first:first + count] for part in parts):
            self._require_baseline(step)
            with self.laboratory.mutated(mutant):
                built, _ = self.laboratory.make(step.targets)
                if not built:
                    return ("does not compile", "") if step in steps[0] else ("killed", "the build")
                failed = self._failures(step)
            if any(why == "Timeout" for _, why in failed):  # unless the machine is busy
                names = [name for name, _ in failed if name != ALL_TESTS]
                pattern = self._pattern_of(names) if names else step.pattern
                self._require_baseline(dataclasses.replace(step, pattern=pattern), again=True)
            if failed:
                return "killed", ", ".join(f"{name} ({why})" for name, why in failed)
        return ("survived" if first + count >= len(steps) else OPEN), ""


def selected(folder_mutants, share, outcomes):
    """The mutants of a folder that count: the first `share` drawn ones that compile, or are not tested yet."""
    return [one for one in folder_mutants if outcomes.of(one) != "does not compile"][:share]


def pending(mutants, share, outcomes, retried, own):
    """The next mutant to test, or None."""
    for one in selected(mutants, share, outcomes):
        outcome = outcomes.of(one)
        if outcome is None or (outcome == OPEN and not own) or one.key in retried:
            return one
    return None


def difference(root, mutant):
    text = (root / mutant.file).read_text(encoding="utf-8")
    lines = difflib.unified_diff(text.splitlines(), mutant.applied(text).splitlines(), mutant.file, mutant.file, n=1,
                                 lineterm="")
    return "\n".join(lines)


def print_table(root, drawn, share, outcomes):
    """Prints the table and the survivors. Returns the exit code."""
    print(f"{'folder':16} {'killed':>7} {'survived':>9} {'untested':>9} {'of':>5} {'killed %':>9}")
    counts, code, survivors = collections.Counter(), 0, []
    for name, mutants in drawn.items():
        chosen = selected(mutants, share[name], outcomes)
        of_folder = collections.Counter(outcomes.of(one) for one in chosen)
        survivors += [one for one in chosen if outcomes.of(one) in ("survived", OPEN)]
        of_folder[None] += of_folder.pop(OPEN, 0)
        counts += of_folder
        tested = of_folder["killed"] + of_folder["survived"]
        percent = f"{100 * of_folder['killed'] / tested:.1f}" if tested else "-"
        print(f"{name:16} {of_folder['killed']:7} {of_folder['survived']:9} {of_folder[None]:9} {len(chosen):5} {percent:>9}")
        if tested and of_folder["killed"] < LEAST_OF_FOLDER * tested:
            code = 1
    tested = counts["killed"] + counts["survived"]
    print(f"{'all':16} {counts['killed']:7} {counts['survived']:9} {counts[None]:9} {tested + counts[None]:5}"
          f" {100 * counts['killed'] / max(1, tested):9.1f}")
    for one in survivors:
        print(f"\n{outcomes.of(one)}: {one.key}\n{difference(root, one)}")
    if counts["killed"] < LEAST * tested:
        code = 1
    return code or (2 if counts[None] else 0)


def test_mutant(judge, folder, mutant, outcomes, retried, own):
    begin = time.monotonic()
    first = 1 if outcomes.of(mutant) == OPEN and mutant.key not in retried else 0
    outcome, by = judge.judge(folder, mutant, first, 1 if own else STEPS - first)
    retried.discard(mutant.key)
    outcomes.add(mutant, outcome, by, seconds_since(begin))
    print(f"{outcome} after {seconds_since(begin):.0f} s{' by ' + by if by else ''}: {mutant.key}", flush=True)


def test_mutants(judge, folders, drawn, share, outcomes, options):
    """Tests mutants, some of each folder in turn, until all are tested or the time is over."""
    undecided = ("survived", OPEN) if options.retry else ()
    retried = {key for key, one in outcomes.by_key.items() if one["outcome"] in undecided}
    deadline = time.monotonic() + options.minutes * 60 if options.minutes else None
    remaining = list(folders)
    while remaining:
        folder = remaining.pop(0)
        for _ in range(BATCH):
            if deadline is not None and time.monotonic() >= deadline:
                return
            mutant = pending(drawn[folder.name], share[folder.name], outcomes, retried, options.own)
            if mutant is None:
                break
            test_mutant(judge, folder, mutant, outcomes, retried, options.own)
        else:
            remaining.append(folder)


def parse(arguments):
    parser = argparse.ArgumentParser(description="Counts the mistakes in the product that no test notices.")
    parser.add_argument("--count", type=int, default=COUNT, help="how many mutants are drawn; default 400")
    parser.add_argument("--seed", default=str(SEED), help="which ones are drawn")
    parser.add_argument("--jobs", type=int, default=2, help="parallel compilers and tests; default 2")
    parser.add_argument("--minutes", type=float, help="end after this time; the next call goes on")
    parser.add_argument("--folder", action="append", choices=[one.name for one in plan.FOLDERS], default=[],
                        help="test only mutants of this folder; repeatable")
    parser.add_argument("--own", action="store_true", help="run only each folder's own tests; a later call continues")
    parser.add_argument("--retry", action="store_true", help="test the survivors again")
    parser.add_argument("--list", action="store_true", help="show the outcomes so far")
    parser.add_argument("--work", type=pathlib.Path, default=plan.root_of_tree() / "build" / "mutation",
                        help="where the outcomes and the copies of the tree are; default build/mutation")
    parser.add_argument("--copy", default="", help="the name of another copy of the tree, for a second call")
    return parser.parse_args(arguments)


def interrupt(_number, _frame):
    raise KeyboardInterrupt


def main(arguments):
    options = parse(arguments)
    for number in (signal.SIGINT, signal.SIGTERM):  # even if the shell ignores them in the background
        signal.signal(number, interrupt)
    root, work = plan.root_of_tree(), options.work.resolve()
    work.mkdir(parents=True, exist_ok=True)
    mutants = plan.all_mutants(root)
    try:
        equivalents = plan.read_equivalents(pathlib.Path(__file__).with_name("equivalent.txt"))
        plan.check_equivalents(equivalents, mutants)
    except plan.EquivalentError as problem:
        sys.exit(str(problem))
    share = plan.shares({name: len(found) for name, found in mutants.items()}, options.count)
    drawn = {name: [one for one in plan.drawn(options.seed, found) if one.key not in equivalents]
             for name, found in mutants.items()}
    outcomes = Outcomes(work / "outcomes.jsonl")
    if options.list:
        return print_table(root, drawn, share, outcomes)
    confine = namespace_command()
    if confine is None:
        sys.exit("a mutant could signal other processes, and unshare(1) cannot create a namespace to confine it")
    laboratory = Laboratory(root, work / options.copy, options.jobs, confine)
    laboratory.update()
    laboratory.configure()
    judge = Judge(laboratory, laboratory.known_tests(), laboratory.targets())
    folders = [one for one in plan.FOLDERS if not options.folder or one.name in options.folder]
    try:
        test_mutants(judge, folders, drawn, share, outcomes, options)
    except KeyboardInterrupt:
        print("interrupted")
    except BaselineError as problem:
        print(f"without a mutant:\n{problem}")
        return 3
    finally:
        laboratory.close()
    return print_table(root, drawn, share, outcomes)


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
