#!/usr/bin/env python3
"""Checks that what docs/linux.md says a person may see is what the program says.

    refusals.py [ROOT]

The first column of its tables under "what you see" quotes texts; "..." stands for what differs. Each part must stand in
a string of a C++ source, where "%@" stands for anything, or be a text of the system for an error number. Exits with 1
and prints a line for each text that nothing says.
"""

import errno
import os
import pathlib
import re
import sys

HEADING = "| what you see |"
SYSTEM = {os.strerror(number) for number in errno.errorcode}
FOLDERS = ("backends", "diagnostics", "platform")


def quoted(document):
    """The texts in the first column of the tables."""
    texts = []
    is_inside = False
    for line in document.splitlines():
        is_inside = line.startswith(HEADING) or (is_inside and line.startswith("|"))
        if is_inside and not line.startswith(HEADING):
            texts += re.findall("`([^`]+)`", re.split(r"(?<!\\)\|", line)[1])
    return texts


def strings(source):
    """The string literals, those that follow each other as one."""
    joined = re.sub(r'"\s*\n\s*"', "", source)
    return [text.replace('\\"', '"') for text in re.findall(r'"((?:[^"\\\n]|\\.)*)"', joined)]


def says(text, said):
    """True if one of the strings has the part, or could become a text that begins with it."""
    if text in SYSTEM:
        return True
    for one in said:
        if text in one:
            return True
        pieces = one.split("%@")
        if len(pieces) > 1 and len(pieces[0]) > 10 and text.startswith(pieces[0]):
            return True
    return False


def parts(text):
    """A name of several parts is put together by the program."""
    pieces = text.split("...") if " " in text else text.split(".")
    return [piece.strip(" ;") for piece in pieces if piece.strip(" ;")]


def missing(document, said):
    return [text for text in quoted(document) if not all(says(part, said) for part in parts(text))]


def main(root):
    said = {text for folder in FOLDERS for path in sorted((root / folder).rglob("*.cpp")) + sorted((root / folder).rglob("*.h"))
            for text in strings(path.read_text())}
    document = (root / "docs" / "linux.md").read_text()
    for text in missing(document, said):
        print(f"docs/linux.md: nothing says '{text}'")
    return 1 if missing(document, said) or not quoted(document) else 0


if __name__ == "__main__":
    sys.exit(main(pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ".")))
