#!/usr/bin/env python3
"""Checks where the programs and libraries of some directories look for the libraries that they need.

    run_paths.py DIRECTORY...

Each entry of a run path must be absolute or begin with $ORIGIN: an empty or relative one means the working directory, from
which anybody's library would be loaded. Neither its group nor everybody may write to an entry or to a folder above it, nor
create one that is missing; folders above with the sticky bit are excepted, since nobody may replace another's entry there.
Exits with 1 and prints a line per violation, also if a directory contains no program or library. Needs readelf.
"""

import pathlib
import re
import stat
import subprocess
import sys

RUN_PATH = re.compile(r"\((?:RPATH|RUNPATH)\)\s+Library r(?:un)?path: \[(.*)\]$", re.MULTILINE)
ORIGIN = re.compile(r"(\$ORIGIN|\$\{ORIGIN\})(/|$)")
LINKED = (2, 3)  # e_type: ET_EXEC and ET_DYN


def is_linked(path):
    """True for programs and shared libraries, which the dynamic linker reads."""
    if path.is_symlink() or not path.is_file():
        return False
    with path.open("rb") as file:
        head = file.read(18)
    return head[:4] == b"\x7fELF" and len(head) == 18 and int.from_bytes(head[16:18], sys.byteorder) in LINKED


def entries_of(path):
    read = subprocess.run(["readelf", "--dynamic", "--wide", path], capture_output=True, text=True, check=True,
                          env={"LC_ALL": "C", "PATH": "/usr/bin:/bin"})
    return [entry for run_path in RUN_PATH.findall(read.stdout) for entry in run_path.split(":")]


def problem_with(entry, file):
    """Why an entry of the file's run path is no safe place for libraries; nothing if it is one."""
    if not entry:
        return "is empty"
    if origin := ORIGIN.match(entry):
        return problem_with_place((file.parent / entry[origin.end():]).resolve())
    if not entry.startswith("/"):
        return "is relative"
    return problem_with_place(pathlib.Path(entry).resolve())


def problem_with_place(place):
    existing = next(folder for folder in (place, *place.parents) if folder.exists())
    for folder in (existing, *existing.parents):
        mode = folder.stat().st_mode
        if not mode & (stat.S_IWGRP | stat.S_IWOTH) or (folder != existing and mode & stat.S_ISVTX):
            continue
        who = "everybody" if mode & stat.S_IWOTH else "its group"
        if folder == place:
            return f"may be written by {who}"
        if folder == existing:
            return f"does not exist and may be created in {folder} by {who}"
        return f"is below {folder}, which may be written by {who}"
    return None


def violations_in(directory):
    """A line per violation, and the number of programs and libraries."""
    found = [path for path in sorted(directory.rglob("*")) if is_linked(path)]
    lines = []
    for path in found:
        # An entry that is there twice is one violation.
        for entry in dict.fromkeys(entries_of(path)):
            if problem := problem_with(entry, path):
                lines.append(f"{path.relative_to(directory)}: the entry '{entry}' of its run path {problem}")
    return lines, len(found)


def main():
    directories = [pathlib.Path(argument) for argument in sys.argv[1:]]
    bad = not directories
    for directory in directories:
        lines, count = violations_in(directory)
        if count == 0:
            lines.append("there is no program or library")
        for line in lines:
            print(f"{directory}: {line}")
        print(f"{directory}: {count} programs and libraries, {len(lines)} violations")
        bad = bad or bool(lines)
    return 1 if bad else 0


if __name__ == "__main__":
    sys.exit(main())
