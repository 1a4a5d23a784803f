#!/usr/bin/env python3
"""Checks that documents of an installation lead only to what is installed.

    installed_documents.py PREFIX [PROGRAM]

In every Markdown document below PREFIX, and in the manual pages:

  - A relative link leads to an installed file, and its anchor to a heading of that file.
  - A file or folder of the source tree that a text names in `back quotes`, or an excerpt comes from, is installed: headers
    in include/quazor, documents, examples and some sources in share/doc. A path below /usr is one below PREFIX. A file of `data` is
    elsewhere in an installation, in share/quazor, and so is named by that path or by a command that lists it.
    What a source tree alone has may be named in a paragraph that speaks of the "source tree", and in all of a document whose
    first paragraph does.
  - Commands and options of quazor are those in the help of PROGRAM, which is PREFIX/bin/quazor unless it is given.
  - `./run` and `./test` do not appear: an installation has neither.
  - share/doc/quazor/index.md has a link to each document beside it.

Exits with 1 and prints a line per dead end, also if there is no document.
"""

import pathlib
import re
import shlex
import subprocess
import sys

LINK = re.compile(r"(?<!!)\[[^\]]*\]\(([^)\s]+)\)")
CODE = re.compile(r"`([^`\n]+)`")
FENCE = re.compile(r"^ {0,3}(`{3,}|~{3,})\s*(\S*)\s*(.*?)\s*$")
HEADING = re.compile(r"^#{1,6}\s+(.*?)\s*#*$")
# Folders of the tree, and where an installation has their files.
INSTALLED = {
    "contract": "include/quazor/contract", "platform": "include/quazor/platform",
    "docs": "share/doc/quazor", "examples": "share/doc/libquazor-dev/examples", "share": "share",
    "diagnostics": "share/doc/libquazor-dev/source/diagnostics", "plugins": "share/doc/libquazor-dev/source/plugins",
}
TREE_ONLY = ("backends", "base", "benchmarks", "cmake", "data", "host", "packaging", "tests")
INDEX = "share/doc/quazor/index.md"
SAID = "source tree"
PATH = re.compile(r"^/?[\w.*-]+(/[\w.*-]*)+$")


def anchors_of(text):
    """The anchors of the headings, as renderers make them."""
    found, fence = set(), ""
    for line in text.splitlines():
        if match := FENCE.match(line):
            fence = "" if fence and match[1].startswith(fence) else fence or match[1]
        elif not fence and (heading := HEADING.match(line)):
            words = re.sub(r"[`*_]|\[|\]\([^)]*\)", lambda mark: "_" if mark[0] == "_" else "", heading[1])
            found.add(re.sub(r"[^\w\- ]", "", words.lower()).replace(" ", "-"))
    return found


def paragraphs(text):
    """Pairs of a line number and the text of a paragraph, without fenced blocks; a row of a table is its own."""
    lines, start, fence = [], 0, ""
    for number, line in enumerate([*text.splitlines(), ""], 1):
        match = FENCE.match(line)
        if fence or match or not line.strip() or line.startswith(("|", "#", "- ", "* ")):
            if lines:
                yield start, "\n".join(lines)
            lines = []
        if match:
            fence = "" if fence and match[1].startswith(fence) else fence or match[1]
        elif not fence and line.strip():
            start = start if lines else number
            lines.append(line)


def blocks(text):
    """Triples of a line number, a language with what follows it, and the lines of a fenced block."""
    opened, lines = None, []
    for number, line in enumerate(text.splitlines(), 1):
        match = FENCE.match(line)
        if match and opened is None:
            opened, lines = (number, match[1], f"{match[2]} {match[3]}".strip()), []
        elif match and match[1].startswith(opened[1]) and not match[2]:
            yield opened[0], opened[2], lines
            opened = None
        elif opened:
            lines.append(line)


class Program:
    """The commands of quazor and their options, from its help."""

    def __init__(self, file):
        self.file = file
        self.options = {}
        help_of_all = self.help()
        listed = help_of_all.split("Subcommands:")[1].split("Examples:")[0]
        self.commands = re.findall(r"^  ([a-z]+) {2,}", listed, re.MULTILINE)
        for command in self.commands:
            self.options[command] = set(re.findall(r"--[a-z][a-z-]*", self.help(command))) | {"--help"}
        self.all = set().union({"--help", "--version"}, *self.options.values())

    def help(self, *command):
        return subprocess.run([self.file, *command, "--help"], capture_output=True, text=True, check=True).stdout

    def problems_of(self, words):
        """`words` follow "quazor"."""
        if not words or not re.fullmatch(r"[a-z]+", words[0]):
            unknown = [word for word in words[:1] if re.fullmatch(r"--[a-z-]+", word) and word not in self.all]
            return [f"quazor has no option {word}" for word in unknown]
        if words[0] not in self.commands:
            return [f"quazor has no command '{words[0]}'"]
        given = (word.split("=")[0] for word in words[1:] if re.match(r"--[a-z]", word))
        return [f"quazor {words[0]} has no option {word}" for word in given if word not in self.options[words[0]]]


class Installation:
    """The documents below a prefix."""

    def __init__(self, prefix, program):
        self.prefix = prefix
        self.program = program

    def place_of(self, path):
        """Where a path of a text should be installed; nothing if that is not for this check to know."""
        first, _, rest = path.lstrip("/").partition("/")
        if path.startswith("/usr/"):
            return rest
        if path.startswith("/") or first not in (*INSTALLED, *TREE_ONLY):
            return None
        return f"{INSTALLED[first]}/{rest}" if first in INSTALLED else ""

    def is_installed(self, place):
        place = place.rstrip("/")
        return bool(place) and any(True for _ in self.prefix.glob(place))

    def problem_with_path(self, path):
        if not PATH.match(path) or re.search(r"\b(NAME|FILE|DIR|N)\b", path):
            return []
        place = self.place_of(path)
        return [] if place is None or self.is_installed(place) else [f"{path} is not installed"]

    def problem_with_link(self, document, target):
        if re.match(r"[a-z]+:", target):
            return []
        name, _, anchor = target.partition("#")
        file = document.parent / name if name else document
        if not file.exists():
            return [f"the link {target} leads nowhere"]
        if file.resolve() != self.prefix.resolve() and self.prefix.resolve() not in file.resolve().parents:
            return [f"the link {target} leads out of the installation"]
        if anchor and anchor not in anchors_of(file.read_text(encoding="utf-8")):
            return [f"the link {target} leads to no heading"]
        return []

    def problems_of_command(self, line):
        """A line of a shell, or a code in a text."""
        found = []
        if re.search(r"(^|[\s;&|(])\./(run|test)\b", line):
            found.append("an installation has no ./run and no ./test")
        for command in re.split(r"\||;|&&", line.split(" #")[0]):
            try:
                words = shlex.split(command)
            except ValueError:  # quotes around a separator
                words = command.split()
            if words and words[0] == "quazor":
                found += self.program.problems_of([word for word in words[1:] if word not in ("\\", ">")])
        if re.fullmatch(r"--[a-z-]+", line.split()[0]) and line.split()[0] not in self.program.all:
            found.append(f"quazor has no option {line.split()[0]}")
        return found

    def problems_of_document(self, document):
        text = document.read_text(encoding="utf-8")
        found = []
        first = next((paragraph for _, paragraph in paragraphs(text) if not paragraph.startswith("#")), "")
        for number, paragraph in paragraphs(text):
            for target in LINK.findall(paragraph):
                found += [(number, one) for one in self.problem_with_link(document, target)]
            for code in CODE.findall(paragraph):
                found += [(number, one) for one in self.problems_of_command(code)]
                if SAID not in " ".join(f"{first} {paragraph}".split()):
                    found += [(number, one) for one in self.problem_with_path(code)]
        for number, head, lines in blocks(text):
            if (source := re.fullmatch(r"\S+ from (\S+)", head)) and SAID not in " ".join(first.split()):
                found += [(number, one) for one in self.problem_with_path(source[1])]
            if head.split(" ")[0] == "sh":
                joined = "\n".join(lines).replace("\\\n", " ").splitlines()
                found += [(number, one) for line in joined if line.strip() for one in self.problems_of_command(line)]
        return found

    def problems_of_page(self, page):
        roff = page.read_text(encoding="utf-8").replace("\\-", "-").replace("\\", "")
        paths = re.findall(r"(?<![\w.~$])/usr/[\w./-]*\w", roff)
        return [(0, one) for path in paths for one in self.problem_with_path(path)]


    def problems_of_index(self):
        index = self.prefix / INDEX
        linked = set(LINK.findall(index.read_text(encoding="utf-8"))) if index.exists() else set()
        beside = sorted(one.name for one in index.parent.glob("*.md"))
        return [(0, f"it has no link to {one}") for one in beside if one not in linked and one != index.name]


def main():
    prefix = pathlib.Path(sys.argv[1])
    installation = Installation(prefix, Program(sys.argv[2] if len(sys.argv) > 2 else prefix / "bin/quazor"))
    documents = sorted(prefix.rglob("*.md"))
    pages = sorted((prefix / "share/man").rglob("*.[1-8]"))
    problems = [(document, *one) for document in documents for one in installation.problems_of_document(document)]
    problems += [(prefix / INDEX, *one) for one in installation.problems_of_index()]
    problems += [(page, *one) for page in pages for one in installation.problems_of_page(page)]
    for file, line, problem in problems:
        print(f"{file.relative_to(prefix)}:{line}: {problem}")
    print(f"{len(documents)} documents, {len(pages)} manual pages: {len(problems)} dead ends")
    return 1 if problems or not documents or not pages else 0


if __name__ == "__main__":
    sys.exit(main())
