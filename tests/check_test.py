#!/usr/bin/env python3
"""Runs ./check in small repositories, with fake versions of the tools that it calls.

    check_test.py CHECK

Needs git; without it the exit code is 77.
"""

import os
import pathlib
import shutil
import subprocess
import sys
import tempfile
import unittest

CHECK = None
RULES = ("include_directions", "every_test_is_built", "folders", "thread_words")
# Shell scripts; they fail if a file contains the word WRONG.
TOOLS = {
    "clang-format": 'shift 2; ! grep -H WRONG "$@"',
    "clang-tidy": "exit 0",
    "cppcheck": "exit 0",
    "cmake": "exit 0",
    "ninja": "exit 0",
}
LINT = '#!/bin/sh\necho "$@" >lint_was_called\nshift; ! grep -H UNCLEAN "$@"\n'
PROGRAMS = ("bash", "sh", "git", "grep", "dirname", "basename", "python3", "env", "rm")


class CheckTest(unittest.TestCase):
    def setUp(self):
        directory = tempfile.TemporaryDirectory()
        self.addCleanup(directory.cleanup)
        self.root = pathlib.Path(directory.name, "tree")
        self.tools = pathlib.Path(directory.name, "tools")
        self.tools.mkdir()
        for name in PROGRAMS:
            self.write_tool(name, f'exec {shutil.which(name)} "$@"')
        for name, text in TOOLS.items():
            self.write_tool(name, text)
        for rule in RULES:
            self.write(f"tests/tree/{rule}.py", "")
        self.write("tests/lint", LINT).chmod(0o755)
        self.write(".gitignore", "lint_was_called\n")
        self.write("host/run/a.cpp", "int a;\n")
        shutil.copy(CHECK, self.root / "check")
        self.git("init", "--quiet", "--initial-branch=main")
        self.commit()

    def write_tool(self, name, text):
        tool = self.tools / name
        tool.write_text(f"#!{shutil.which('sh')}\n{text}\n")
        tool.chmod(0o755)

    def write(self, name, text):
        path = self.root / name
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_text(text)
        return path

    def git(self, *arguments):
        run = subprocess.run(["git", "-c", "user.name=a", "-c", "user.email=a@b.invalid", "-C", self.root, *arguments],
                             capture_output=True, text=True, check=False)
        self.assertEqual(run.returncode, 0, run.stderr)

    def commit(self):
        self.git("add", "--all")
        self.git("commit", "--quiet", "--message", "a step")

    def check(self, *arguments, program="./check"):
        (self.root / "lint_was_called").unlink(missing_ok=True)
        environment = {"PATH": str(self.tools), "HOME": str(self.root)}
        return subprocess.run([program, *arguments], cwd=self.root, env=environment, capture_output=True, text=True,
                              check=False)

    def linted(self):
        called = self.root / "lint_was_called"
        return called.read_text().split() if called.is_file() else []

    def test_a_tree_without_a_change_passes(self):
        run = self.check()
        self.assertEqual(run.returncode, 0, run.stderr)
        self.assertIn("0 changed files of C++, 0 linted", run.stdout)
        self.assertEqual(self.linted(), [])

    def test_what_is_changed_and_what_is_new_is_looked_at(self):
        self.write("host/run/a.cpp", "int b;\n")
        self.write("contract/new.cpp", "int c;\n")
        self.write("host/run/a_test.cpp", "int d;\n")
        run = self.check()
        self.assertEqual(run.returncode, 0, run.stderr)
        self.assertIn("3 changed files of C++, 2 linted", run.stdout)
        self.assertEqual(sorted(self.linted()), ["--quick", "contract/new.cpp", "host/run/a.cpp"])

    def test_a_wrong_format_fails(self):
        self.write("host/run/a_test.cpp", "int WRONG;\n")
        run = self.check()
        self.assertEqual(run.returncode, 1)
        self.assertIn("host/run/a_test.cpp", run.stderr)
        self.assertIn("failed: format", run.stderr)

    def test_what_lint_finds_fails(self):
        self.write("host/run/a.cpp", "int UNCLEAN;\n")
        run = self.check()
        self.assertEqual(run.returncode, 1)
        self.assertIn("failed: tests/lint", run.stderr)

    def test_every_rule_of_the_tree_is_run(self):
        for rule in RULES:
            with self.subTest(rule=rule):
                path = self.write(f"tests/tree/{rule}.py", "print('broken'); raise SystemExit(1)")
                run = self.check()
                self.assertEqual(run.returncode, 1)
                self.assertIn("broken", run.stderr)
                self.assertIn(f"failed: tests/tree/{rule}.py", run.stderr)
                path.write_text("")

    def test_what_a_branch_has_committed_is_looked_at_too(self):
        self.git("switch", "--quiet", "--create", "work")
        self.write("host/run/a.cpp", "int WRONG;\n")
        self.commit()
        self.assertEqual(self.check().returncode, 1)
        self.assertEqual(self.check("HEAD").returncode, 0)

    def test_as_a_hook_it_looks_at_what_is_staged_alone(self):
        hook = self.root / ".git/hooks/pre-commit"
        hook.parent.mkdir(exist_ok=True)
        hook.symlink_to("../../check")
        self.write("host/run/a.cpp", "int WRONG;\n")
        self.assertEqual(self.check(program=str(hook)).returncode, 0)
        self.git("add", "--all")
        self.assertEqual(self.check(program=str(hook)).returncode, 1)

    def test_what_is_not_installed_is_skipped_and_named(self):
        self.write("host/run/a.cpp", "int WRONG;\n")
        for tool, package in (("clang-format", "clang-format"), ("clang-tidy", "clang-tidy"), ("cppcheck", "cppcheck"),
                              ("ninja", "ninja-build")):
            with self.subTest(tool=tool):
                path = self.tools / tool
                text = path.read_text()
                path.unlink()
                self.assertIn(f"{tool} is not installed (Debian's package {package})", self.check().stdout)
                path.write_text(text)
                path.chmod(0o755)

    def test_a_header_is_left_to_the_build(self):
        self.write("host/run/a.h", "int c;\n")
        run = self.check()
        self.assertEqual(run.returncode, 0, run.stderr)
        self.assertIn("skipped: what includes the changed headers (1)", run.stdout)


if __name__ == "__main__":
    if shutil.which("git") is None:
        print("git is not installed")
        sys.exit(77)
    CHECK = os.path.abspath(sys.argv.pop(1))
    unittest.main()
