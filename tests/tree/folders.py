#!/usr/bin/env python3
"""Checks that every folder has a README, and that folders and files do not become too large.

    folders.py [ROOT]

  - A folder that holds C++ has a row in include_directions.py, or is below tests/, benchmarks/ or examples/, and it has
    a CMakeLists.txt, unless BUILT_ABOVE lists it.
  - A folder that holds C++, and each of DESCRIBED, has a README.md: a title, an empty line, and the five lines of
    LINES in that order. A document may follow after an empty line.
  - The line "What it may include" agrees with the folder's row: each `folder/` that it names is in the row, above a
    folder of the row, or the folder itself; and for each folder in the row, that folder or one above it is named.
  - The names in `back quotes` in the five lines exist: a file (`name.h`) somewhere in the tree, a class or function
    (`ClassName`, `name()`) in some source.
  - A folder contains at most MAX_FILES source files (*.h and *.cpp, except tests), and a source file
    at most MAX_LINES lines (including Python programs).

Exits with 1 and prints a line per violation.
"""

import pathlib
import re
import sys

import include_directions

MAX_FILES = 40
MAX_LINES = 500
LINES = ("What happens here", "What comes in", "What goes out", "What it may include", "Threads")

# Folders without C++ sources that need a README.
DESCRIBED = ["backends", "base", "benchmarks", "cmake", "data", "data/bindings", "data/explanations", "data/profiles",
             "data/scenarios", "data/schemas", "diagnostics", "docs", "examples", "host", "packaging", "tests", "tests/mutation",
             "tests/tree"]
# Folders whose sources are listed in a CMakeLists.txt above them.
BUILT_ABOVE = ["tests/compile_failures", "tests/misbehaving"]
# Folders that may include nearly everything, so their README does not list it.
NOT_LISTED = ["tests", "benchmarks"]
# Examples have a different kind of README: a document for users who do not see the rest of the tree.
SELF_DESCRIBED = "examples/"

NAMED_FILE = re.compile(r"`([\w./-]+\.(?:h|cpp|py|json|cmake|sh|md))`")
NAMED_CODE = re.compile(r"`(?:\w+::)*([A-Z]\w*[a-z]\w*|\w+(?=\(\)))(?:\(\))?`")
NAMED_FOLDER = re.compile(r"`([\w/]+)/`")


def is_ours(path, root):
    names = path.relative_to(root).parts
    return not any(name.startswith(".") for name in names) and not names[0].startswith("build")


def folders_with_sources(root):
    """The C++ files by folder."""
    folders = {}
    for path in include_directions.sources(root):
        folders.setdefault(str(path.parent), []).append(path)
    return folders


def names_of_tree(root, folders):
    """The names of all files, and all words of the C++ sources."""
    files = {path.name for path in root.rglob("*") if is_ours(path, root)}
    words = set()
    for paths in folders.values():
        for path in paths:
            words.update(re.findall(r"\w+", (root / path).read_text(encoding="utf-8")))
    return files, words


def is_below(folder, above):
    return folder == above or folder.startswith(above + "/")


def row_of(folder, rows):
    """What a folder's README may name; for a folder without a row, what the folders below it may include."""
    for above in ("tests", "benchmarks", "examples"):
        if folder.startswith(above + "/"):
            return [folder, above, *rows.get(above, [])]
    if folder in rows:
        return [folder, *rows[folder]]
    below = [name for name in rows if name.startswith(folder + "/")]
    return [folder, *below, *(included for name in below for included in rows[name])]


def check_readme(root, folder, rows, files, words):
    """The problems of a folder's README, as a list of sentences."""
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
    text = "\n".join(described)
    missing = [one for one in NAMED_FILE.findall(text) if pathlib.PurePosixPath(one).name not in files]
    missing += [one for one in NAMED_CODE.findall(text) if one not in words]
    named = NAMED_FOLDER.findall(described[LINES.index("What it may include")])
    allowed, wanted = row_of(folder, rows), rows.get(folder, []) if folder not in NOT_LISTED else []
    return [*(f"{name}: there is no {one}, which it names" for one in missing),
            *(f"{name}: {folder}/ must not include {one}/, which it names" for one in named
              if not any(is_below(other, one) for other in allowed)),
            *(f"{name}: {folder}/ may include {one}/, which it does not name" for one in wanted
              if not any(is_below(one, above) for above in named))]


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
    files, words = names_of_tree(root, folders)
    for folder in sorted({*folders, *described}):
        if not folder.startswith(SELF_DESCRIBED):
            found += check_readme(root, folder, rows, files, words)
    return found + check_sizes(root, folders)


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ".").resolve()
    folders = folders_with_sources(root)
    found = violations(root, include_directions.ALLOWED, DESCRIBED)
    return include_directions.report(found, f"{len(folders)} folders with C++") or not folders


if __name__ == "__main__":
    sys.exit(main())
