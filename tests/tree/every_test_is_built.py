#!/usr/bin/env python3
"""Checks that a CMakeLists.txt in the same or a parent folder names every test file.

    every_test_is_built.py [ROOT]

A test file is `*_test.cpp` or `*_test.py`. A name in a comment does not count. Exits with 1 and prints a line per
missing file.
"""

import pathlib
import re
import sys

PATTERNS = ("*_test.cpp", "*_test.py")
TOKEN = re.compile(r'[^\s()"]+')


def named_files(cmake_lists):
    """The files that a CMakeLists.txt names, as absolute paths."""
    folder = cmake_lists.parent
    lines = cmake_lists.read_text(encoding="utf-8").splitlines()
    text = "\n".join(line.split("#", 1)[0] for line in lines)
    text = text.replace("${CMAKE_CURRENT_SOURCE_DIR}/", "")
    return {(folder / token).resolve() for token in TOKEN.findall(text) if "$" not in token}


def is_ours(path, root):
    parts = path.relative_to(root).parts
    return not any(part.startswith(".") for part in parts) and not parts[0].startswith("build")


def tests_left_out(root):
    """The test files that no CMakeLists.txt names, and the number of test files."""
    named = set()
    for cmake_lists in root.rglob("CMakeLists.txt"):
        if is_ours(cmake_lists, root):
            named |= named_files(cmake_lists)
    tests = sorted(path for pattern in PATTERNS for path in root.rglob(pattern) if is_ours(path, root))
    return [str(path.relative_to(root)) for path in tests if path.resolve() not in named], len(tests)


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ".").resolve()
    left_out, count = tests_left_out(root)
    for path in left_out:
        print(f"{path} is in no CMakeLists.txt")
    print(f"{count} test files, {len(left_out)} left out")
    return 1 if left_out or count == 0 else 0


if __name__ == "__main__":
    sys.exit(main())
