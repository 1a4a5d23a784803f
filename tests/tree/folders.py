#!/usr/bin/env python3
"""Checks that every folder is described, and that none grows beyond what a reader can survey.

    folders.py [ROOT]

  - A folder that holds C++ has a row in include_directions.py, or is below tests/, benchmarks/ or examples/, and it has
    a CMakeLists.txt, unless BUILT_ABOVE lists it.
  - A folder that holds C++, and each of DESCRIBED, has a README.md: a title, an empty line, and the five lines of
    LINES in that order. A document may follow after an empty line.
  - Where the line "What it may include" names a folder, `folder/`, that is one of the folder's row, one above those, or
    the folder itself.
  - A folder holds at most MAX_FILES source files (*.h and *.cpp; tests beside the code do not count), and a source file
    has at most MAX_LINES lines (Python programs of the tree too).

Exits with 1 and a line per violation.
"""

import pathlib
import re
import sys

import include_directions

MAX_FILES = 40
MAX_LINES = 500
LINES = ("What happens here", "What comes in", "What goes out", "What it may include", "Threads")

# Folders without C++ of their own that a newcomer looks into.
DESCRIBED = ["backends", "base", "benchmarks", "cmake", "data", "data/bindings", "data/explanations", "data/profiles",
             "data/scenarios", "diagnostics", "docs", "examples", "host", "packaging", "tests", "tests/tree"]
# Folders whose sources a CMakeLists.txt above them names.
BUILT_ABOVE = ["tests/compile_failures", "tests/misbehaving"]
# Examples have a README of their own: they are documents for people who see nothing else of the tree.
SELF_DESCRIBED = "examples/"

NAMED_FOLDER = re.compile(r"`([\w/]+)/`")


def is_ours(path, root):
    names = path.relative_to(root).parts
    return not any(name.startswith(".") for name in names) and not names[0].startswith("build")


def folders_with_sources(root):
    """Folder -> its C++ files."""
    folders = {}
    for path in include_directions.sources(root):
        folders.setdefault(str(path.parent), []).append(path)
    return folders


def row_of(folder, rows):
    """What a folder's README may name: of a folder without a row, what the folders below it may include."""
    for above in ("tests", "benchmarks", "examples"):
        if folder.startswith(above + "/"):
            return [folder, above, *rows.get(above, [])]
    if folder in rows:
        return [folder, *rows[folder]]
    below = [name for name in rows if name.startswith(folder + "/")]
    return [folder, *below, *(included for name in below for included in rows[name])]


def check_readme(root, folder, rows):
    """What is wrong with a folder's README, as a list of sentences."""
    readme = root / folder / "README.md"
    if not readme.is_file():
        return [f"{folder}/ has no README.md"]
    lines = readme.read_text(encoding="utf-8").splitlines()
    name = f"{folder}/README.md"
    if len(lines) < 2 or not lines[0].startswith("# ") or lines[1]:
        return [f"{name}: it must begin with a title and an empty line"]
    described = lines[2:2 + len(LINES)]
    for number, heading in enumerate(LINES):
        if len(described) <= number or not re.match(rf"\*\*{heading}\*\*: \S", described[number]):
            return [f'{name}:{number + 3}: this line must be "**{heading}**: ..."']
    if len(lines) > 2 + len(LINES) and lines[2 + len(LINES)]:
        return [f"{name}:{3 + len(LINES)}: an empty line must follow the five lines"]
    allowed = row_of(folder, rows)
    return [f"{name}: {folder}/ must not include {named}/, which it names"
            for named in NAMED_FOLDER.findall(described[LINES.index("What it may include")])
            if not any(one == named or one.startswith(named + "/") for one in allowed)]


def check_sizes(root, folders):
    found = []
    for folder, paths in folders.items():
        count = len(paths) if folder.startswith("tests") else sum(not include_directions.is_test(path) for path in paths)
        if count > MAX_FILES:
            found.append(f"{folder}/ holds {count} source files, more than {MAX_FILES}")
    programs = [path.relative_to(root) for path in sorted(root.rglob("*.py")) if is_ours(path, root)]
    for path in [*(path for paths in folders.values() for path in paths), *programs]:
        count = len((root / path).read_text(encoding="utf-8").splitlines())
        if count > MAX_LINES:
            found.append(f"{path} has {count} lines, more than {MAX_LINES}")
    return found


def violations(root, rows, described):
    folders = folders_with_sources(root)
    found = []
    for folder in folders:
        if include_directions.folder_of(pathlib.PurePosixPath(folder, "a.cpp")) is None:
            found.append(f"{folder}/ has no row in tests/tree/include_directions.py")
        if folder not in BUILT_ABOVE and not (root / folder / "CMakeLists.txt").is_file():
            found.append(f"{folder}/ has no CMakeLists.txt")
    for folder in sorted({*folders, *described}):
        if not folder.startswith(SELF_DESCRIBED):
            found += check_readme(root, folder, rows)
    return found + check_sizes(root, folders)


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ".").resolve()
    folders = folders_with_sources(root)
    found = violations(root, include_directions.ALLOWED, DESCRIBED)
    for line in found:
        print(line)
    print(f"{len(folders)} folders with C++, {len(found)} violations")
    return 1 if found or not folders else 0


if __name__ == "__main__":
    sys.exit(main())
