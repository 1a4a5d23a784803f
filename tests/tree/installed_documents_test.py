#!/usr/bin/env python3
"""Tests tests/tree/installed_documents.py with small installations."""

import pathlib
import subprocess
import sys
import tempfile
import unittest

FOLDER = pathlib.Path(__file__).resolve().parent
PROGRAM = """#!/bin/sh
case $1 in
  --help) printf 'Subcommands:\\n  run    Run\\n  list   List\\nExamples:\\n' ;;
  run) printf 'Options:\\n  --all  All\\n  --set X  Set\\n' ;;
  *) printf 'Options:\\n  --format F  Format\\n' ;;
esac
"""


class InstalledDocumentsTest(unittest.TestCase):
    def dead_ends(self, text, page="A page of quazor.\n", index="See [a](a.md) and [other](other.md).\n"):
        """The exit code, and the dead ends of a document with this text."""
        with tempfile.TemporaryDirectory() as directory:
            prefix = pathlib.Path(directory)
            for name, content in (("bin/quazor", PROGRAM), ("share/doc/quazor/a.md", text), ("share/man/man1/quazor.1", page),
                                  ("share/doc/quazor/other.md", "# Other\n\n## A `code` of 2 words, here\n"),
                                  ("share/doc/quazor/index.md", index),
                                  ("include/quazor/contract/value.h", ""), ("share/quazor/scenarios/healthy.json", "{}")):
                (prefix / name).parent.mkdir(parents=True, exist_ok=True)
                (prefix / name).write_text(content)
            (prefix / "bin/quazor").chmod(0o755)
            run = subprocess.run([sys.executable, "-B", FOLDER / "installed_documents.py", prefix],
                                 capture_output=True, text=True, check=False)
            self.assertEqual(run.stderr, "")
            *lines, total = run.stdout.splitlines()
            self.assertEqual(total, f"3 documents, 1 manual pages: {len(lines)} dead ends")
            return run.returncode, lines

    FINE = [
        ("a link", "See [it](other.md) and [there](https://example.org/x)."),
        ("a link to a heading", "See [it](other.md#a-code-of-2-words-here)."),
        ("a link to a heading of its own", "# Here it is\n\nSee [above](#here-it-is)."),
        ("a link in a block", "```text\n[x](nothing.md)\n```"),
        ("what is installed", "`contract/value.h`, `contract/`, `share/quazor/scenarios/healthy.json`, `share/quazor/scenarios/*.json`"),
        ("a path of the system", "`/dev/null` and `/proc/self/fd` and `/usr/include/quazor/contract/value.h`"),
        ("a path that stands for others", "`share/quazor/scenarios/NAME.json`"),
        ("data of the source tree, said so", "In the source\ntree, `data/scenarios/healthy.json`."),
        ("what only the source tree has, said so", "In the source tree, `tests/tree/x.py`\nand `host/y.h`."),
        ("a document about the source tree", "# A\n\nThis is about the source\ntree.\n\nLook at `host/y.h`."),
        ("commands and options", "`quazor run --all --set a=-1 | head`, `--format`, `--help`, `quazor --version`"),
        ("a block of commands", "```sh\nquazor run --all \\\n  --set x=1   # with --nothing\ncmake --install build\n```"),
    ]

    def test_fine(self):
        for name, text in self.FINE:
            with self.subTest(name):
                self.assertEqual(self.dead_ends(text), (0, []))

    DEAD = [
        ("a link to nothing", "A [b](nothing.md).", "the link nothing.md leads nowhere"),
        ("a link out", "A [b](../../../../etc).", "leads"),
        ("a link to no heading", "A [b](other.md#a-code).", "the link other.md#a-code leads to no heading"),
        ("a link over two lines", "A [b\nc](nothing.md).", "the link nothing.md leads nowhere"),
        ("a header", "`contract/nothing.h`", "contract/nothing.h is not installed"),
        ("a file of the tree", "Look at `tests/tree/x.py`.", "tests/tree/x.py is not installed"),
        ("data where the source tree has them", "`data/scenarios/healthy.json`", "data/scenarios/healthy.json is not installed"),
        ("a folder of the tree", "Look at `backends/`.", "backends/ is not installed"),
        ("a path of another machine", "`/usr/include/nothing.h`", "/usr/include/nothing.h is not installed"),
        ("an excerpt", "```cpp from examples/x.cpp\nint a;\n```", "examples/x.cpp is not installed"),
        ("a command", "`quazor fly`", "quazor has no command 'fly'"),
        ("an option of another command", "`quazor list --set a=1`", "quazor list has no option --set"),
        ("an option in a block", "```sh\nquazor run \\\n  --al\n```", "quazor run has no option --al"),
        ("an option behind a pipe", "```sh\ntrue && quazor run --al\n```", "quazor run has no option --al"),
        ("an option alone", "Use `--al`.", "quazor has no option --al"),
        ("a program of the tree", "```sh not run: x\n./run list\n```", "an installation has no ./run and no ./test"),
    ]

    def test_dead_ends(self):
        for name, text, expected in self.DEAD:
            with self.subTest(name):
                code, lines = self.dead_ends(text)
                self.assertEqual((code, len(lines)), (1, 1), lines)
                self.assertRegex(lines[0], r"^share/doc/quazor/a\.md:\d+: ")
                self.assertIn(expected, lines[0])

    def test_an_index_without_a_document(self):
        code, lines = self.dead_ends("", index="See [other](other.md).\n")
        self.assertEqual((code, lines), (1, ["share/doc/quazor/index.md:0: it has no link to a.md"]))

    def test_a_manual_page(self):
        self.assertEqual(self.dead_ends("", "See /usr/share/quazor/scenarios.\n")[0], 0)
        code, lines = self.dead_ends("", "See /usr/share/quazor/nothing\\-here.\n")
        self.assertEqual((code, len(lines)), (1, 1))
        self.assertIn("/usr/share/quazor/nothing-here is not installed", lines[0])


if __name__ == "__main__":
    unittest.main()
