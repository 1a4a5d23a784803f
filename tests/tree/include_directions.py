#!/usr/bin/env python3
"""Checks the include directions between folders.

    include_directions.py [ROOT]

Every folder shares one include root, so the compiler cannot reject a wrong include; this program does. The rules:

  - `#include "..."` names a file of the tree, written from its root.
  - A folder includes itself and the folders that ALLOWED lists for it, no others. A folder that is not listed there
    may hold no C++ at all. ALLOWED has no cycle.
  - contract/, platform/, base/text/ and the diagnostics include the standard library and nothing else from outside.
  - Tests (`*_test.cpp`, `*_fuzz.cpp`, `*_for_tests.h`, `*_conformance.h`) may include any library, the helpers in
    tests/support/ and, in addition to what their folder may, what TEST_ALLOWED lists. Other files must not include a
    header of a test.
  - tests/ and benchmarks/ may include everything; examples/ the installed headers.

Exits with 1 and prints a line per violation.
"""

import pathlib
import re
import sys

CONTRACT = ["contract", "platform"]
DIAGNOSTICS = ["diagnostics/camera_sync", "diagnostics/projector_fault", "diagnostics/report_channels",
               "diagnostics/sensor_images", "diagnostics/single_camera"]

# One row per folder: what its sources may include in addition to the folder itself.
SIMULATED = "backends/simulated/"
LINUX = "backends/linux/"
ALLOWED = {
    "contract": [],
    "platform": ["contract"],
    "base/text": [],
    "base/json": ["contract", "base/text"],
    "diagnostics/camera_sync": CONTRACT,
    "diagnostics/report_channels": CONTRACT,
    "diagnostics/projector_fault": [*CONTRACT, "diagnostics/report_channels"],
    "diagnostics/sensor_images": CONTRACT,
    "diagnostics/single_camera": CONTRACT,
    "plugins": [*CONTRACT, *DIAGNOSTICS],
    "backends/log": [*CONTRACT, "base/text"],
    "backends/threads": CONTRACT,
    "backends/capture": CONTRACT,
    "backends/faults": [*CONTRACT, "backends/capture", "base/json", "base/text"],
    "backends/counters": CONTRACT,
    "backends/hid": CONTRACT,
    SIMULATED + "time": [*CONTRACT, "backends/threads"],
    SIMULATED + "scenario": [*CONTRACT, "backends/capture", "backends/faults", "base/json", "base/text"],
    SIMULATED + "errors": [*CONTRACT, "backends/capture", "backends/faults"],
    SIMULATED + "capture": [*CONTRACT, "backends/capture", SIMULATED + "errors", SIMULATED + "scenario"],
    SIMULATED + "counters": [*CONTRACT, "backends/counters", SIMULATED + "errors", SIMULATED + "capture",
                             SIMULATED + "scenario"],
    SIMULATED + "display": [*CONTRACT, SIMULATED + "scenario"],
    SIMULATED + "hid": [*CONTRACT, "backends/faults", "backends/hid", SIMULATED + "errors", SIMULATED + "capture",
                        SIMULATED + "scenario"],
    LINUX + "system": [*CONTRACT, "backends/log", "backends/threads"],
    LINUX + "binding": [*CONTRACT, "backends/faults", "base/json", "base/text"],
    LINUX + "video": [*CONTRACT, "base/text", LINUX + "binding", LINUX + "system"],
    LINUX + "media": [*CONTRACT, "base/text", LINUX + "binding", LINUX + "system", LINUX + "video"],
    LINUX + "capture": [*CONTRACT, "backends/capture", LINUX + "binding", LINUX + "media", LINUX + "system",
                        LINUX + "video"],
    LINUX + "hid": [*CONTRACT, "backends/hid", "base/text", LINUX + "system"],
    LINUX + "counters": [*CONTRACT, "backends/counters", LINUX + "binding", LINUX + "system"],
    LINUX + "display": [*CONTRACT, LINUX + "binding"],
}


def parts(folder):
    """The folders below `folder`."""
    return [name for name in ALLOWED if name.startswith(folder + "/")]


ALLOWED[LINUX + "probe"] = [*CONTRACT, "base/text", *parts("backends/linux")]
ALLOWED["backends/simulated"] = [*CONTRACT, "backends/faults", "backends/threads", *parts("backends/simulated")]
ALLOWED["backends/linux"] = [*CONTRACT, "backends/faults", "backends/threads", *parts("backends/linux")]
BACKENDS = [name for name in ALLOWED if name.startswith("backends/")]

# The host's folders, lower ones first.
for name, below in {
    "error": [],
    "text": ["error"],
    "system": ["error"],
    "device": ["error", "text"],
    "limits": ["error", "text"],
    "plugin": ["error", "limits", "text"],
    "model": ["device", "error", "limits", "plugin", "text"],
    "record": ["error", "limits", "model", "plugin", "system", "text"],
    "report": ["device", "error", "limits", "model", "plugin", "record", "system", "text"],
    "report/page": ["limits", "model", "plugin", "record", "report", "text"],
    "statistics": [],
    "store": ["error", "limits", "model", "plugin", "record", "statistics", "system", "text"],
    "run": ["device", "error", "limits", "model", "plugin", "record", "report", "system", "text"],
    "cli": ["device", "error", "limits", "plugin", "report", "run", "store", "system", "text"],
    "command/records": ["cli", "error", "model", "record", "report", "statistics", "store", "system", "text"],
    "command": ["cli", "command/records", "device", "error", "limits", "model", "plugin", "record", "report",
                "report/page", "run", "store", "system", "text"],
}.items():
    ALLOWED["host/" + name] = [*CONTRACT, "base/json", "base/text", *("host/" + folder for folder in below)]
ALLOWED["host/device"] += BACKENDS
ALLOWED["host/report"] += ["backends/log"]
ALLOWED["host"] = [*CONTRACT, *parts("host")]
ALLOWED["host/testing"] = ALLOWED["host"]
ALLOWED["host/testing/plugins"] = CONTRACT

ALLOWED["examples"] = CONTRACT
ALLOWED["tests"] = [name for name in ALLOWED if name != "examples"]
ALLOWED["benchmarks"] = [*ALLOWED["tests"], "tests"]

STANDARD_LIBRARY_ONLY = [*CONTRACT, "base/text", *DIAGNOSTICS]

# What the tests below a folder may include in addition to its row.
TEST_ALLOWED = {
    "diagnostics": BACKENDS,
    "plugins": BACKENDS,
    "backends/faults": ["backends/threads", SIMULATED + "time"],
    "backends/simulated": ["backends/faults", "backends/threads", "backends/simulated", *parts("backends/simulated")],
    "backends/linux": ["backends/threads", "backends/linux", *parts("backends/linux")],
    "host": ["host", *parts("host"), *BACKENDS],
}

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
    """Every C++ file of the tree, as paths from its root; skips build and hidden directories."""
    for path in sorted(root.rglob("*")):
        names = path.relative_to(root).parts
        if path.suffix not in SOURCE_SUFFIXES or not path.is_file():
            continue
        if any(name.startswith(".") for name in names) or names[0].startswith("build"):
            continue
        yield pathlib.PurePosixPath(*names)


def folder_of(path):
    """The folder in ALLOWED that a file belongs to, or None."""
    folder = str(path.parent)
    whole = [above for above in ("tests", "benchmarks", "examples") if folder == above or folder.startswith(above + "/")]
    return whole[0] if whole else folder if folder in ALLOWED else None


def is_test(path):
    return path.name.endswith(TEST_SUFFIXES)


def allowed_folders(path, folder):
    allowed = [folder, *ALLOWED[folder]]
    if is_test(path):
        allowed.append("tests")
        for above, folders in TEST_ALLOWED.items():
            if folder == above or folder.startswith(above + "/"):
                allowed += folders
    return allowed


def cycle_in(rows):
    """Folders whose rows form a cycle, as a list that ends where it begins; empty if there is none."""
    done, way = set(), []

    def visit(folder):
        if folder in way:
            return [*way[way.index(folder):], folder]
        if folder in done:
            return []
        way.append(folder)
        for included in rows.get(folder, []):
            cycle = visit(included)
            if cycle:
                return cycle
        done.add(way.pop())
        return []

    for folder in rows:
        cycle = visit(folder)
        if cycle:
            return cycle
    return []


def check_own_header(root, path, folder, target):
    """The problem of `#include "target"`, or None."""
    if ".." in pathlib.PurePosixPath(target).parts or not (root / target).is_file():
        return f'"{target}" is no file of the tree; includes are written from its root'
    if is_test(pathlib.PurePosixPath(target)) and not is_test(path) and folder not in TEST_FOLDERS:
        return f'"{target}" is for tests only'
    included = folder_of(pathlib.PurePosixPath(target))
    if included not in allowed_folders(path, folder):
        return f'"{target}": {folder}/ must not include {included}/'
    return None


def check_line(root, path, folder, line):
    """The problem of the line, or None."""
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
    """One line per include that breaks the rules, and per file in a folder without a row."""
    cycle = cycle_in(ALLOWED)
    found = [f"a cycle of folders: {' -> '.join(cycle)}"] if cycle else []
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


def report(found, count):
    """Prints the violations and how many there are among how many files; the exit code."""
    for line in found:
        print(line)
    print(f"{count}, {len(found)} violations")
    return 1 if found else 0


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ".").resolve()
    count = len(list(sources(root)))
    if count == 0:
        print(f"no C++ under {root}")
        return 1
    return report(violations(root), f"{count} files")


if __name__ == "__main__":
    sys.exit(main())
