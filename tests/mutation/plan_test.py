#!/usr/bin/env python3
"""Tests of what is drawn and how outcomes are counted."""

import contextlib
import io
import pathlib
import tempfile
import types
import unittest

import laboratory
import plan
import run
from mutants import Mutant, mutants_of

BODY = "void f() {\n" + "".join(f"  g{i}({i} < x, !y);\n" for i in range(20)) + "}\n"


def many():
    return mutants_of("a.cpp", BODY)


class PlanTest(unittest.TestCase):
    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.folder = pathlib.Path(scratch.name)

    def equivalents(self, text):
        file = self.folder / "equivalent.txt"
        file.write_text(text, encoding="utf-8")
        return plan.read_equivalents(file)

    def test_the_order_is_that_of_the_seed(self):
        keys = [one.key for one in plan.drawn("1", many())]
        self.assertEqual(keys, [one.key for one in plan.drawn("1", reversed(many()))])
        self.assertNotEqual(keys, [one.key for one in plan.drawn("2", many())])
        self.assertEqual(sorted(keys), sorted(one.key for one in many()))

    def test_operators_take_turns(self):
        first = plan.drawn("1", many())[:4]
        self.assertEqual(len({one.operator for one in first}), 4)

    def test_a_change_of_one_line_keeps_the_order_of_the_others(self):
        keys = [one.key for one in plan.drawn("1", many()) if "g7" not in one.key and one.operator == "remove not"]
        changed = plan.drawn("1", mutants_of("a.cpp", BODY.replace("g7", "h")))
        self.assertEqual(keys, [one.key for one in changed if "h(" not in one.key and one.operator == "remove not"])

    def test_every_folder_gets_at_least_its_share(self):
        self.assertEqual(plan.shares({"a": 100, "b": 300, "c": 1}, 40), {"a": 10, "b": 30, "c": 1})
        self.assertEqual(plan.shares({"a": 2, "b": 2}, 40), {"a": 2, "b": 2})

    def test_every_folder_of_the_tree_has_mutants_and_only_of_product_sources(self):
        for name, mutants in plan.all_mutants(plan.root_of_tree()).items():
            self.assertGreater(len(mutants), 50, name)
            files = {one.file for one in mutants}
            self.assertFalse([file for file in files if "_test." in file or "_for_tests." in file])

    def test_equivalent_mutants_have_reasons(self):
        self.assertEqual(self.equivalents("# Comment.\n\na | b\nreason: Because.\n\nc | d\nreason: So.\n"),
                         {"a | b": "Because.", "c | d": "So."})
        for text in ("a | b\n", "a | b\nreason:\n", "a\nreason: x\nmore\n", "a\nreason: x\n\na\nreason: y\n"):
            with self.assertRaises(plan.EquivalentError, msg=text):
                self.equivalents(text)

    def test_an_equivalent_mutant_must_exist(self):
        mutants = {"folder": many()}
        plan.check_equivalents({many()[0].key: "Because."}, mutants)
        with self.assertRaises(plan.EquivalentError):
            plan.check_equivalents({"a.cpp | comparison | gone | gone": "Because."}, mutants)

    def test_the_list_of_equivalent_mutants_is_valid(self):
        equivalents = plan.read_equivalents(pathlib.Path(__file__).with_name("equivalent.txt"))
        plan.check_equivalents(equivalents, plan.all_mutants(plan.root_of_tree()))


class FakeJudge:
    """Judges by a function of the mutant, and remembers what it judged."""

    def __init__(self, outcome):
        self.outcome = outcome
        self.judged = []
        self.steps = []

    def judge(self, _folder, mutant, first, count):
        self.judged.append(mutant.key)
        self.steps.append((first, count))
        return self.outcome(mutant), "a_test"


class OutcomesTest(unittest.TestCase):
    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.root = pathlib.Path(scratch.name)
        (self.root / "a.cpp").write_text(BODY, encoding="utf-8")
        self.drawn = {"contract": plan.drawn("1", many())}

    def outcomes(self):
        return run.Outcomes(self.root / "outcomes.jsonl")

    def perform(self, judge, share, retry=False, own=False):
        options = types.SimpleNamespace(retry=retry, own=own, minutes=None)
        with contextlib.redirect_stdout(io.StringIO()):
            run.test_mutants(judge, [plan.FOLDERS[0]], self.drawn, {"contract": share}, self.outcomes(), options)

    def table(self, share):
        output = io.StringIO()
        with contextlib.redirect_stdout(output):
            code = run.print_table(self.root, self.drawn, {"contract": share}, self.outcomes())
        return code, output.getvalue()

    def test_tests_as_many_as_the_share(self):
        judge = FakeJudge(lambda _: "killed")
        self.perform(judge, 7)
        self.assertEqual(judge.judged, [one.key for one in self.drawn["contract"][:7]])
        self.assertEqual(self.table(7)[0], 0)

    def test_folders_take_turns_in_batches(self):
        other = plan.FOLDERS[1]
        self.drawn[other.name] = plan.drawn("1", mutants_of("b.cpp", BODY))
        judge = FakeJudge(lambda _: "killed")
        options = types.SimpleNamespace(retry=False, own=False, minutes=None)
        with contextlib.redirect_stdout(io.StringIO()):
            run.test_mutants(judge, plan.FOLDERS[:2], self.drawn, {"contract": 15, other.name: 12}, self.outcomes(), options)
        self.assertEqual("".join(key[0] for key in judge.judged), "a" * 10 + "b" * 10 + "a" * 5 + "b" * 2)

    def test_goes_on_where_an_earlier_call_ended(self):
        self.perform(FakeJudge(lambda _: "killed"), 3)
        judge = FakeJudge(lambda _: "killed")
        self.perform(judge, 5)
        self.assertEqual(judge.judged, [one.key for one in self.drawn["contract"][3:5]])

    def test_draws_another_for_one_that_does_not_compile(self):
        judge = FakeJudge(lambda one: "does not compile" if one.operator == "constant" else "killed")
        self.perform(judge, 10)
        of_other_operators = [one for one in judge.judged if "| constant |" not in one]
        self.assertEqual(len(of_other_operators), 10)
        self.assertEqual(self.table(10)[0], 0)

    def test_survivors_are_shown_and_count(self):
        self.perform(FakeJudge(lambda one: "survived" if one == self.drawn["contract"][0] else "killed"), 10)
        code, output = self.table(10)
        self.assertEqual(code, 1)
        self.assertIn("survived: " + self.drawn["contract"][0].key, output)
        self.assertIn("--- a.cpp", output)
        self.assertRegex(output, r"contract +9 +1 +0 +10 +90\.0")

    def test_one_survivor_in_forty_is_allowed(self):
        self.perform(FakeJudge(lambda one: "survived" if one == self.drawn["contract"][0] else "killed"), 40)
        self.assertEqual(self.table(40)[0], 0)

    def test_survivors_are_tested_again_on_request(self):
        self.perform(FakeJudge(lambda _: "survived"), 4)
        judge = FakeJudge(lambda _: "killed")
        self.perform(judge, 4)
        self.assertEqual(judge.judged, [])
        self.perform(judge, 4, retry=True)
        self.assertEqual(len(judge.judged), 4)
        self.assertEqual(self.table(4)[0], 0)

    def test_what_passed_its_own_tests_is_continued_later(self):
        self.perform(FakeJudge(lambda _: run.OPEN), 2, own=True)
        self.assertEqual(self.table(2)[0], 2)
        self.assertIn(run.OPEN, self.table(2)[1])
        judge = FakeJudge(lambda _: "killed")
        self.perform(judge, 2, own=True)
        self.assertEqual(judge.judged, [])
        self.perform(judge, 2)
        self.assertEqual(judge.steps, [(1, 2), (1, 2)])
        self.assertEqual(self.table(2)[0], 0)

    def test_an_unfinished_count_says_so(self):
        self.perform(FakeJudge(lambda _: "killed"), 3)
        self.assertEqual(self.table(10)[0], 2)


class FakeLaboratory:
    """Builds and passes as it is told while a mutant is applied, and remembers those steps."""

    def __init__(self, builds=True, failing=None, sound=True, reason="Failed", times=100):
        self.builds = builds
        self.failing = failing
        self.sound = sound
        self.reason = reason
        self.times = times  # how often the test fails
        self.is_mutated = False
        self.steps = []

    @contextlib.contextmanager
    def mutated(self, _mutant):
        self.is_mutated = True
        yield
        self.is_mutated = False

    def make(self, targets, limit=0):
        if self.is_mutated:
            self.steps.append(("make", targets))
        return self.builds or not self.is_mutated, ""

    def test(self, pattern, each, limit):
        if not self.is_mutated:
            return self.sound, ""
        self.steps.append(("test", pattern))
        if pattern not in (self.failing, "^(b_test)$") or self.times == 0:
            return True, ""
        self.times -= 1
        return False, f"The following tests FAILED:\n\t  3 - b_test ({self.reason})\n"


class OutputTest(unittest.TestCase):
    def test_the_names_of_tests_are_read_from_a_list(self):
        listed = "Test project /a: b\n  Test  #1: one_test\n  Test #10: two.test (Disabled)\n\nTotal Tests: 2\n"
        self.assertEqual(laboratory.LISTED_TEST.findall(listed), ["one_test", "two.test"])

    def test_the_names_of_failed_tests_are_read_from_a_summary(self):
        summary = "The following tests FAILED:\n\t  1 - one_test (Failed)\n\t 12 - two_test (Timeout)\nErrors while\n"
        self.assertEqual(run.FAILED_TEST.findall(summary), [("one_test", "Failed"), ("two_test", "Timeout")])


class LaboratoryTest(unittest.TestCase):
    def test_a_test_that_exceeds_its_time_is_ended(self):
        with tempfile.TemporaryDirectory() as folder:
            work = pathlib.Path(folder)
            one = laboratory.Laboratory(work, work, 1, [])
            self.addCleanup(one.close)
            self.assertEqual(one.enclosing_mode() & 0o011, 0o011, "tests become other users")
            one.build.mkdir(parents=True)
            (one.build / "CTestTestfile.cmake").write_text("add_test(hangs sleep 100)\n", encoding="utf-8")
            passed, output = one.test("hangs", 1, 60)
            self.assertFalse(passed)
            self.assertEqual(run.FAILED_TEST.findall(output), [("hangs", "Timeout")])


class JudgeTest(unittest.TestCase):
    FOLDER = plan.Folder("x", (), ("a_test",), ("b_test", "script_test"))
    MUTANT = Mutant("a.cpp", "constant", 0, 1, "2", "1", "2")

    def judge(self, fake, first=0, count=run.STEPS, folder=FOLDER, mutant=MUTANT):
        tests, targets = {"a_test", "b_test", "script_test"}, {"a_test", "b_test"}
        return run.Judge(fake, tests, targets).judge(folder, mutant, first, count)

    def test_a_survivor_passes_every_step(self):
        fake = FakeLaboratory()
        self.assertEqual(self.judge(fake), ("survived", ""))
        self.assertEqual(fake.steps, [("make", ("a_test",)), ("test", "^(a_test)$"), ("make", ()),
                                            ("test", "^(b_test|script_test)$"), ("make", ()), ("test", "")])

    def test_the_test_of_the_files_folder_judges_first(self):
        folder = plan.Folder("x", (), ("a_test", "b_test"), ("script_test",))
        mutant = Mutant("x/b/some.cpp", "constant", 0, 1, "2", "1", "2")
        fake = FakeLaboratory()
        self.assertEqual(self.judge(fake, 0, 1, folder, mutant), ("killed", "b_test (Failed)"))
        self.assertEqual(fake.steps[:2], [("make", ("b_test",)), ("test", "^(b_test)$")])
        fake = FakeLaboratory(times=0)
        self.assertEqual(self.judge(fake, 0, 1, folder, mutant), (run.OPEN, ""))
        self.assertEqual(fake.steps, [("make", ("b_test",)), ("test", "^(b_test)$"), ("make", ("a_test",)),
                                      ("test", "^(a_test)$")])

    def test_a_test_that_compiles_its_source_itself_needs_no_build(self):
        name = plan.COMPILE_FAILURE + "some"
        fake = FakeLaboratory()
        judge = run.Judge(fake, {"a_test", name}, {"a_test"})
        judge.judge(plan.Folder("x", (), ("a_test", name), ()), Mutant("x/a/some.cpp", "", 0, 1, "2", "1", "2"), 0, 1)
        self.assertEqual(fake.steps, [("make", ("a_test",)), ("test", "^(a_test)$"), ("make", (run.NO_TARGET,)),
                                      ("test", f"^({name})$")])

    def test_the_compile_failures_of_the_plan_are_those_of_the_tree(self):
        sources = (plan.root_of_tree() / "tests" / "compile_failures").glob("*.cpp")
        self.assertEqual(sorted(plan.COMPILE_FAILURES), sorted(plan.COMPILE_FAILURE + one.stem for one in sources))

    def test_the_first_failure_kills(self):
        fake = FakeLaboratory(failing="^(a_test)$")
        self.assertEqual(self.judge(fake), ("killed", "b_test (Failed)"))
        self.assertEqual(fake.steps, [("make", ("a_test",)), ("test", "^(a_test)$"), ("test", "^(b_test)$")])

    def test_a_test_that_fails_once_does_not_kill(self):
        self.assertEqual(self.judge(FakeLaboratory(failing="^(a_test)$", times=1)), ("survived", ""))

    def test_tests_that_fail_now_and_then_decide_nothing(self):
        fake = FakeLaboratory(failing="^(a_test)$")
        fake.test = lambda pattern, each, limit: (pattern != "^(a_test)$" or not fake.is_mutated,
                                                        "\t  3 - b_test (Failed)\n")
        with self.assertRaises(run.BaselineError):
            self.judge(fake)

    def test_a_timeout_kills_unless_the_machine_is_busy(self):
        fake = FakeLaboratory(failing="^(a_test)$", reason="Timeout")
        self.assertEqual(self.judge(fake), ("killed", "b_test (Timeout)"))
        fake = FakeLaboratory(failing="^(a_test)$", reason="Timeout")
        idle = fake.test
        fake.test = lambda pattern, each, limit: (
            (False, "") if pattern == "^(b_test)$" and not fake.is_mutated else idle(pattern, each, limit))
        with self.assertRaises(run.BaselineError):
            self.judge(fake)

    def test_nobody_waits_twice_for_a_timeout(self):
        fake = FakeLaboratory(failing="^(a_test)$", reason="Timeout")
        self.judge(fake, 0, 1)
        self.assertEqual(fake.steps, [("make", ("a_test",)), ("test", "^(a_test)$")])

    def test_a_step_that_exceeds_its_time_kills_unless_the_machine_is_busy(self):
        fake = FakeLaboratory()
        fake.test = lambda pattern, each, limit: (not fake.is_mutated and pattern == "^(a_test)$", "no summary")
        self.assertEqual(self.judge(fake), ("killed", "all tests (Timeout)"))

    def test_some_of_the_steps_do_not_decide_about_a_survivor(self):
        self.assertEqual(self.judge(FakeLaboratory(), 0, 1), (run.OPEN, ""))
        fake = FakeLaboratory()
        self.assertEqual(self.judge(fake, 1, 2), ("survived", ""))
        self.assertEqual(len(fake.steps), 4)

    def test_what_does_not_compile_is_not_killed(self):
        self.assertEqual(self.judge(FakeLaboratory(builds=False)), ("does not compile", ""))

    def test_a_failure_without_a_mutant_is_no_kill(self):
        with self.assertRaises(run.BaselineError):
            self.judge(FakeLaboratory(sound=False))


if __name__ == "__main__":
    unittest.main()
