#!/usr/bin/env python3
"""Checks which folder includes which.

    include_directions.py [ROOT]

Every folder shares one include root, so the compiler cannot refuse a wrong include; this does. The rules:

  - `#include "..."` names a file of the tree, written from its root.
  - A folder includes itself and the folders that ALLOWED lists for it, no others. A folder that is not listed there
    may hold no C++ at all.
  - frame/, platform/ and the subsystems include the standard library and nothing else from outside.
  - frame/catalogue.cpp belongs to the plug-in and may include the subsystems.
  - Tests (`*_test.cpp`, `*_fuzz.cpp`, `*_for_tests.h`, `*_conformance.h`) may include any library and, beyond what
    their folder may, the helpers in tests/; in a subsystem also the backends, which stand in for its hardware. A test
    includes no other subsystem than its folder does, and none but those of host/ include host/. What is no test
    includes no test's header.
  - tests/ and benchmarks/ may include everything; examples/ what is installed.

Exits with 1 and a line per violation.
"""

import pathlib
import re
import sys

SUBSYSTEMS = ["camera_sync", "projector_fault", "report_channels", "sensor_images"]
BACKENDS = ["backends/json", "backends/threads", "backends/simulated", "backends/linux"]

ALLOWED = {
    "frame": [],
    "platform": ["frame"],
    "camera_sync": ["frame", "platform"],
    "report_channels": ["frame", "platform"],
    "projector_fault": ["frame", "platform", "report_channels"],
    "sensor_images": ["frame", "platform"],
    "backends/json": ["frame", "platform"],
    "backends/threads": ["frame", "platform"],
    "backends/simulated": ["frame", "platform", "backends/json", "backends/threads"],
    "backends/linux": ["frame", "platform", "backends/json", "backends/threads"],
    "host": ["frame", "platform", *BACKENDS],
    "examples": ["frame", "platform"],
    "tests": ["frame", "platform", *SUBSYSTEMS, *BACKENDS, "host"],
    "benchmarks": ["frame", "platform", *SUBSYSTEMS, *BACKENDS, "host", "tests"],
}
STANDARD_LIBRARY_ONLY = ["frame", "platform", *SUBSYSTEMS]
EXCEPTIONS = {"frame/catalogue.cpp": ["platform", *SUBSYSTEMS]}

SOURCE_SUFFIXES = (".h", ".cpp")
TEST_SUFFIXES = ("_test.cpp", "_fuzz.cpp", "_for_tests.h", "_conformance.h")
TEST_FOLDERS = ["tests", "benchmarks"]

STANDARD_HEADERS = set("""
    algorithm any array atomic barrier bit bitset cassert cctype cerrno cfenv cfloat charconv chrono cinttypes climits
    clocale cmath codecvt compare complex concepts condition_variable coroutine csetjmp csignal cstdarg cstddef
    cstdint cstdio cstdlib cstring ctime cuchar cwchar cwctype deque exception execution filesystem format
    forward_list fstream functional future initializer_list iomanip ios iosfwd iostream istream iterator latch limits
    list locale map memory memory_resource mutex new numbers numeric optional ostream queue random ranges ratio regex
    scoped_allocator semaphore set shared_mutex source_location span sstream stack stdexcept stop_token streambuf
    string string_view strstream syncstream system_error thread tuple type_traits typeindex typeinfo unordered_map
    unordered_set utility valarray variant vector version
""".split())

INCLUDE = re.compile(r"^\s*#\s*include\b\s*(.*)$")
TARGET = re.compile(r'^(?:"([^"]+)"|<([^>]+)>)')


def sources(root):
    """Every C++ file of the tree, as paths from its root; what is built or hidden is passed over."""
    for path in sorted(root.rglob("*")):
        parts = path.relative_to(root).parts
        if path.suffix not in SOURCE_SUFFIXES or not path.is_file():
            continue
        if any(part.startswith(".") for part in parts) or parts[0].startswith("build"):
            continue
        yield pathlib.PurePosixPath(*parts)


def folder_of(path):
    """The folder of ALLOWED that a file belongs to, or None."""
    folders = [folder for folder in ALLOWED if str(path).startswith(folder + "/")]
    return max(folders, key=len, default=None)


def is_test(path):
    return path.name.endswith(TEST_SUFFIXES)


def allowed_folders(path, folder):
    allowed = [folder, *ALLOWED[folder], *EXCEPTIONS.get(str(path), [])]
    if is_test(path):
        allowed.append("tests")
        if folder in SUBSYSTEMS:
            allowed += BACKENDS
    return allowed


def check_own_header(root, path, folder, target):
    """What is wrong with `#include "target"`, or None."""
    if ".." in pathlib.PurePosixPath(target).parts or not (root / target).is_file():
        return f'"{target}" is no file of the tree; includes are written from its root'
    if is_test(pathlib.PurePosixPath(target)) and not is_test(path) and folder not in TEST_FOLDERS:
        return f'"{target}" is for tests only'
    included = folder_of(pathlib.PurePosixPath(target))
    if included not in allowed_folders(path, folder):
        return f'"{target}": {folder}/ must not include {included}/'
    return None


def check_line(root, path, folder, line):
    """What is wrong with the line, or None."""
    include = INCLUDE.match(line)
    if include is None:
        return None
    target = TARGET.match(include.group(1))
    if target is None:
        return f"an include that names no file: {include.group(1)}"
    if target.group(1) is not None:
        return check_own_header(root, path, folder, target.group(1))
    header = target.group(2)
    if folder in STANDARD_LIBRARY_ONLY and not is_test(path) and header not in STANDARD_HEADERS:
        return f"<{header}> is not of the standard library"
    return None


def violations(root):
    """One line per include that breaks the rules, and per file in a folder that has none."""
    found = []
    for path in sources(root):
        folder = folder_of(path)
        if folder is None:
            found.append(f"{path}: no rule says what this folder may include")
            continue
        for number, line in enumerate((root / path).read_text(encoding="utf-8").splitlines(), start=1):
            fault = check_line(root, path, folder, line)
            if fault is not None:
                found.append(f"{path}:{number}: {fault}")
    return found


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ".").resolve()
    count = len(list(sources(root)))
    if count == 0:
        print(f"no C++ under {root}")
        return 1
    found = violations(root)
    for line in found:
        print(line)
    print(f"{count} files, {len(found)} violations")
    return 1 if found else 0


if __name__ == "__main__":
    sys.exit(main())
