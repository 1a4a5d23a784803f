"""Reads the commands and excerpts in the fenced code blocks of Markdown documents.

A block with the language `sh` contains commands, one per line; a backslash at the end of a line continues it. Their
first word is `./run` or `quazor`. A command must end with exit code 0 unless its comment says `exit code N`.

`./test` and the commands in a block that begins with

    ```sh not run: REASON

are not run. A block that begins with

    ```LANGUAGE from FILE

is an excerpt of that file in the tree: its lines must be in the file in this order and without gaps, except for a
line `...`. Indentation is ignored.
"""

import dataclasses
import re

PROGRAMS = ("./run", "quazor")
RUNS_ALL_TESTS = "it runs all tests, this one too"
OTHER_SHELLS = ("bash", "console", "shell", "shell-session", "zsh")
FENCE = re.compile(r"^ {0,3}(`{3,}|~{3,})\s*(.*?)\s*$")
GAP = "..."


class Problem(Exception):
    """A block that violates these rules."""


@dataclasses.dataclass(frozen=True)
class Block:
    """A fenced block: its first line number, the text after the fence, and its lines."""

    line: int
    language: str
    rest: str
    lines: tuple


@dataclasses.dataclass(frozen=True)
class Command:
    """A command without its comment. One with a `reason` is not run."""

    line: int
    text: str
    exit_code: int = 0
    reason: str = ""


@dataclasses.dataclass(frozen=True)
class Excerpt:
    """Lines in a file, whose path is relative to the root of the tree; each part has no gaps."""

    line: int
    file: str
    parts: tuple


def blocks(text):
    """The fenced blocks of a document."""
    found, opened, lines = [], None, []
    for number, line in enumerate(text.splitlines(), 1):
        fence = FENCE.match(line)
        if opened is None:
            if fence:
                opened, lines = (number, *fence.groups()), []
        elif fence and fence[1].startswith(opened[1]) and not fence[2]:
            language, _, rest = opened[2].partition(" ")
            found.append(Block(opened[0], language, rest.strip(), tuple(lines)))
            opened = None
        else:
            lines.append(line)
    if opened:
        raise Problem(f"{opened[0]}: the block does not end")
    return found


def split_comment(line):
    """A command and its comment, which may be empty."""
    quote = ""
    for at, character in enumerate(line):
        if quote:
            quote = "" if character == quote else quote
        elif character in "'\"":
            quote = character
        elif character == "#" and (at == 0 or line[at - 1].isspace()):
            return line[:at].strip(), line[at + 1:].strip()
    return line.strip(), ""


def joined_lines(block):
    """Numbers and texts of the block's lines; joins continued lines."""
    start, text = 0, ""
    for number, line in enumerate(block.lines, block.line + 1):
        start = start or number
        if line.endswith("\\"):
            text += line[:-1]
            continue
        yield start, text + line
        start, text = 0, ""
    if start:
        raise Problem(f"{start}: the command goes on after the end of the block")


def reason_of(block):
    """Why the commands of the block are not run; empty if they are."""
    if not block.rest:
        return ""
    reason = re.fullmatch(r"not run: (.+)", block.rest)
    if not reason:
        raise Problem(f"{block.line}: behind 'sh' there may stand 'not run: REASON', not '{block.rest}'")
    return reason[1]


def commands(text):
    """The commands of a document."""
    found = []
    for block in blocks(text):
        if block.language in OTHER_SHELLS:
            raise Problem(f"{block.line}: the language of commands is 'sh', not '{block.language}'")
        if block.language != "sh":
            continue
        reason = reason_of(block)
        for line, joined in joined_lines(block):
            command, comment = split_comment(joined)
            if not command:
                continue
            program = command.split()[0]
            if not reason and program not in (*PROGRAMS, "./test"):
                raise Problem(f"{line}: '{program}' is neither ./run nor quazor; "
                              "a block of other commands begins with 'sh not run: REASON'")
            code = re.search(r"\bexit code (\d+)", comment)
            why = reason or (RUNS_ALL_TESTS if program == "./test" else "")
            found.append(Command(line, command, int(code[1]) if code else 0, why))
    return found


def excerpts(text):
    """The excerpts of a document."""
    found = []
    for block in blocks(text):
        source = re.fullmatch(r"from (\S+)", block.rest)
        if block.language == "sh" or not block.rest:
            continue
        if not source:
            raise Problem(f"{block.line}: behind the language there may stand 'from FILE', not '{block.rest}'")
        parts, part = [], []
        for line in [*block.lines, GAP]:
            if line.strip() != GAP:
                part.append(line.strip())
            elif part:
                parts.append(tuple(part))
                part = []
        if not parts:
            raise Problem(f"{block.line}: the excerpt is empty")
        found.append(Excerpt(block.line, source[1], tuple(parts)))
    return found


def is_in(excerpt, content):
    """True if the file contains the parts of the excerpt in this order."""
    lines = [line.strip() for line in content.splitlines()]
    at = 0
    for part in excerpt.parts:
        places = (place for place in range(at, len(lines)) if tuple(lines[place:place + len(part)]) == part)
        place = next(places, None)
        if place is None:
            return False
        at = place + len(part)
    return True
