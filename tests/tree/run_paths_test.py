#!/usr/bin/env python3
"""Tests tests/tree/run_paths.py with libraries that the compiler COMPILER makes.

    run_paths_test.py COMPILER
"""

import pathlib
import sys
import tempfile
import unittest
import subprocess

import run_paths
from made_up_tree import run_over

COMPILER = sys.argv.pop(1)


class RunPathsTest(unittest.TestCase):
    def setUp(self):
        directory = tempfile.TemporaryDirectory()
        self.addCleanup(directory.cleanup)
        self.root = pathlib.Path(directory.name)

    def violations(self, *run_paths_of_libraries):
        for number, run_path in enumerate(run_paths_of_libraries):
            options = [] if run_path is None else [f"-Wl,-rpath,{run_path}"]
            subprocess.run([COMPILER, "-shared", "-x", "c++", "/dev/null", "-o", self.root / f"{number}.so", *options],
                           check=True)
        return run_paths.violations_in(self.root)

    def test_absolute_paths_and_those_beside_the_file_are_safe(self):
        self.assertEqual(self.violations(None, "/usr/lib", "$ORIGIN", "$ORIGIN/lib:/usr/lib", "/no/such/place"), ([], 5))

    def test_an_empty_entry_is_found_wherever_it_is(self):
        lines, count = self.violations("/usr/lib:", ":/usr/lib", "/usr/lib::/lib", "::")
        self.assertEqual(lines, [f"{number}.so: the entry '' of its run path is empty" for number in range(4)])
        self.assertEqual(count, 4)

    def test_a_relative_entry_is_found(self):
        lines, _ = self.violations("lib", "/usr/lib:../lib", "$ORIGINAL", "x/$ORIGIN")
        self.assertEqual([line.split("'")[1] for line in lines], ["lib", "../lib", "$ORIGINAL", "x/$ORIGIN"])
        self.assertTrue(all(line.endswith("is relative") for line in lines), lines)

    def test_a_place_that_everybody_may_write_is_found(self):
        everybodys = self.root / "everybodys"
        everybodys.mkdir()
        everybodys.chmod(0o1777)
        self.assertEqual(self.violations(everybodys), (
            [f"0.so: the entry '{everybodys}' of its run path may be written by everybody"], 1))

    def folder(self, name, mode):
        path = self.root / name
        path.mkdir()
        path.chmod(mode)
        return path

    def test_a_place_that_its_group_may_write_is_found(self):
        groups = self.folder("groups", 0o775)
        self.assertEqual(self.violations(groups), (
            [f"0.so: the entry '{groups}' of its run path may be written by its group"], 1))

    def test_a_place_beside_the_file_is_no_exception(self):
        self.folder("groups", 0o775)
        lines, _ = self.violations("$ORIGIN/groups", "${ORIGIN}/../" + self.root.name + "/groups", "$ORIGIN")
        self.assertEqual([line.split("run path ")[1] for line in lines], 2 * ["may be written by its group"])

    def test_a_place_below_one_that_others_may_write_is_found(self):
        everybodys = self.folder("everybodys", 0o777)
        (everybodys / "lib").mkdir(0o755)
        line = f"is below {everybodys}, which may be written by everybody"
        lines, _ = self.violations(everybodys / "lib", "$ORIGIN/everybodys/lib")
        self.assertEqual([one.split("run path ")[1] for one in lines], [line, line])
        everybodys.chmod(0o1777)
        self.assertEqual(self.violations(everybodys / "lib"), ([], 2))

    def test_a_missing_place_that_others_may_create_is_found(self):
        everybodys = self.folder("everybodys", 0o1777)
        self.assertEqual(self.violations(everybodys / "lib"), (
            [f"0.so: the entry '{everybodys}/lib' of its run path does not exist and may be created in {everybodys} by "
             "everybody"], 1))

    def test_what_is_not_linked_is_left_out(self):
        subprocess.run([COMPILER, "-c", "-x", "c++", "/dev/null", "-o", self.root / "object.o"], check=True)
        (self.root / "text").write_text("text")
        self.assertEqual(self.violations(), ([], 0))

    def test_a_directory_without_programs_is_a_violation(self):
        result = run_over(run_paths, {"text": "text"})
        self.assertEqual(result.returncode, 1)
        self.assertIn("there is no program or library", result.stdout)


if __name__ == "__main__":
    unittest.main()
