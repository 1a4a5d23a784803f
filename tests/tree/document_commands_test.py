#!/usr/bin/env python3
"""Tests tests/tree/document_commands.py and tests/tree/documents_test.py with small documents."""

import pathlib
import subprocess
import sys
import tempfile
import unittest

import document_commands
from document_commands import Command, Excerpt, Problem

FOLDER = pathlib.Path(__file__).resolve().parent


def document(*lines):
    return "\n".join(lines) + "\n"


class BlocksTest(unittest.TestCase):
    def test_text_without_blocks_has_none(self):
        self.assertEqual(document_commands.blocks(document("A `word`.", "", "    ./run")), [])

    def test_a_block_has_its_language_and_lines(self):
        block, = document_commands.blocks(document("Text.", "```sh  of a kind", "./run", "", "```", "More."))
        self.assertEqual((block.line, block.language, block.rest, block.lines), (2, "sh", "of a kind", ("./run", "")))

    def test_a_longer_fence_may_hold_a_shorter_one(self):
        block, = document_commands.blocks(document("````text", "```sh", "./run", "```", "````"))
        self.assertEqual(block.lines, ("```sh", "./run", "```"))

    def test_a_block_that_does_not_end_is_a_problem(self):
        with self.assertRaisesRegex(Problem, "^2: the block does not end$"):
            document_commands.blocks(document("", "```sh", "./run"))


class CommandsTest(unittest.TestCase):
    def only(self, *lines):
        return document_commands.commands(document("```sh", *lines, "```"))

    ROWS = [
        ("a command", ["./run"], [Command(2, "./run")]),
        ("two programs", ["./run list", "quazor list"], [Command(2, "./run list"), Command(3, "quazor list")]),
        ("empty lines and comments", ["", "# first", "./run"], [Command(4, "./run")]),
        ("a comment behind it", ["./run list  # all of them"], [Command(2, "./run list")]),
        ("an exit code", ["./run list  # it fails: exit code 66"], [Command(2, "./run list", 66)]),
        ("no exit code in the command", ["./run 'exit code 1'"], [Command(2, "./run 'exit code 1'")]),
        ("a number sign in quotes", ["./run 'a # b' \"c # d\" # e"], [Command(2, "./run 'a # b' \"c # d\"")]),
        ("a number sign in a word", ["./run a#b"], [Command(2, "./run a#b")]),
        ("a quote in other quotes", ["./run \"it's\" # it's"], [Command(2, "./run \"it's\"")]),
        ("a command of two lines", ["./run list \\", "  --format json", "./run"],
         [Command(2, "./run list   --format json"), Command(4, "./run")]),
        ("all tests", ["./test"], [Command(2, "./test", reason=document_commands.RUNS_ALL_TESTS)]),
    ]

    def test_rows(self):
        for name, lines, expected in self.ROWS:
            with self.subTest(name):
                self.assertEqual(self.only(*lines), expected)

    def test_other_languages_hold_no_commands(self):
        self.assertEqual(document_commands.commands(document("```json", "./run", "```", "```", "./run", "```")), [])

    def test_commands_of_a_block_that_is_not_run_have_its_reason(self):
        found = document_commands.commands(document("```sh not run: no network", "cmake -S .", "./run", "```"))
        self.assertEqual([command.text for command in found], ["cmake -S .", "./run"])
        self.assertEqual({command.reason for command in found}, {"no network"})

    PROBLEMS = [
        ("another program", ["```sh", "cmake -S .", "```"], "^2: 'cmake' is neither"),
        ("another shell", ["```bash", "./run", "```"], "^1: the language of commands is 'sh', not 'bash'"),
        ("no reason", ["```sh not run:", "./run", "```"], "^1: behind 'sh' there may stand"),
        ("another word behind the language", ["```sh install", "./run", "```"], "^1: .* not 'install'"),
        ("a command that goes on", ["```sh", "./run \\", "```"], "^2: the command goes on"),
    ]

    def test_problems(self):
        for name, lines, expected in self.PROBLEMS:
            with self.subTest(name), self.assertRaisesRegex(Problem, expected):
                document_commands.commands(document(*lines))


class ExcerptsTest(unittest.TestCase):
    CONTENT = "int a;\nif (a) {\n  b();\n  c();\n}\nint d;\n"
    ROWS = [
        ("lines of the file", ["b();", "c();"], True),
        ("lines with another indentation", ["    b();", "c();"], True),
        ("parts of the file", ["int a;", "...", "c();", "  ...", "int d;"], True),
        ("lines with one left out", ["if (a) {", "c();"], False),
        ("parts in another order", ["int d;", "...", "int a;"], False),
        ("the same line twice", ["int a;", "...", "int a;"], False),
        ("a line that is not there", ["int e;"], False),
    ]

    def test_rows(self):
        for name, lines, expected in self.ROWS:
            with self.subTest(name):
                excerpt, = document_commands.excerpts(document("```cpp from a/b.cpp", *lines, "```"))
                self.assertEqual(document_commands.is_in(excerpt, self.CONTENT), expected)

    def test_an_excerpt_names_its_file(self):
        found = document_commands.excerpts(
            document("```cpp from a/b.cpp", "x", "...", "y", "```", "```cpp", "z", "```"))
        self.assertEqual(found, [Excerpt(1, "a/b.cpp", (("x",), ("y",)))])

    def test_problems(self):
        rows = [
            ("another word", "like a/b.cpp", "x", "not 'like a/b.cpp'"),
            ("no line", "from a/b.cpp", "...", "empty"),
        ]
        for name, rest, line, expected in rows:
            with self.subTest(name), self.assertRaisesRegex(Problem, expected):
                document_commands.excerpts(document(f"```cpp {rest}", line, "```"))


class ProgramTest(unittest.TestCase):
    """Runs the complete program on trees with one document. The fake quazor exits with its first argument."""

    def run_on(self, *lines):
        with tempfile.TemporaryDirectory() as directory:
            root = pathlib.Path(directory)
            for folder in ("scenarios", "profiles", "build", ".hidden"):
                (root / folder).mkdir()
            (root / "README.md").write_text(document(*lines))
            for outside in ("build", ".hidden"):
                (root / outside / "other.md").write_text("```sh\nno such command\n```\n")
            (root / "source.h").write_text("int a;\n")
            program = root / "quazor_program"
            program.write_text('#!/bin/sh\necho "it says $*"\n[ "$1" != run ] || exit 0\nexit $1\n')
            program.chmod(0o755)
            plugin = root / "plugin.so"
            plugin.write_text("a plug-in")
            run = subprocess.run([sys.executable, "-B", FOLDER / "documents_test.py", root, program, plugin],
                                 capture_output=True, text=True, check=False)
            self.assertEqual(run.stderr, "")
            return run.returncode, run.stdout

    def test_a_document_that_holds_passes(self):
        code, out = self.run_on(
            "```sh", "./run", "quazor 0 > said.txt", "./run 7  # exit code 7", "./run 0 && grep -q 'says 0' said.txt",
            "quazor 0 && test -f build/release/lib/quazor/plugin.so -a -f build/plugin.so -a -f my_phone.json",
            "./test", "```", "```cpp from source.h", "int a;", "```")
        self.assertEqual((code, out.splitlines()[-1]), (0, "1 documents: 5 commands run, 1 not run, 0 problems"))
        self.assertIn("README.md:7: not run, it runs all tests", out)

    FAILURES = [
        ("a wrong exit code", ["```sh", "./run 3 x", "```"],
         "README.md:2: ./run 3 x: exit code 3 instead of 0\nit says 3 x"),
        ("a success for a failure", ["```sh", "./run 0  # exit code 1", "```"], "exit code 0 instead of 1"),
        ("a failure before a pipe", ["```sh", "./run 3 | cat", "```"], "exit code 3 instead of 0"),
        ("a problem", ["```sh", "rm x", "```"], "README.md:2: 'rm' is neither"),
        ("an excerpt of no file", ["```sh", "./run", "```", "```cpp from b.h", "int a;", "```"], "there is no b.h"),
        ("another excerpt", ["```sh", "./run", "```", "```cpp from source.h", "int b;", "```"],
         "README.md:4: this does not stand"),
        ("nothing to run", ["Text."], "0 commands run"),
    ]

    def test_failures(self):
        for name, lines, expected in self.FAILURES:
            with self.subTest(name):
                code, out = self.run_on(*lines)
                self.assertEqual(code, 1)
                self.assertIn(expected, out)


if __name__ == "__main__":
    unittest.main()
