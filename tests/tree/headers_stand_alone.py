#!/usr/bin/env python3
"""Compiles each header by itself, as the first and only include of a source file, included twice.

    headers_stand_alone.py --compiler CXX --root INCLUDE_ROOT FOLDER...
    headers_stand_alone.py --compiler CXX --self-test

Checks every `*.h` in the folders under the include root as C++20 with warnings as errors. Exits with 1 and prints the
compiler's messages for every header that depends on an earlier include.
"""

import argparse
import concurrent.futures
import pathlib
import subprocess
import sys
import tempfile

FLAGS = ["-std=c++20", "-fsyntax-only", "-Wall", "-Wextra", "-Wpedantic", "-Werror", "-x", "c++", "-"]
JOBS = 2


def compile_alone(compiler, root, header):
    """The compiler's messages about a header, whose path is relative to the root; empty if there are none."""
    source = f'#include "{header}"\n#include "{header}"\n'
    result = subprocess.run([compiler, "-I", root, *FLAGS], input=source, capture_output=True, text=True, check=False)
    return "" if result.returncode == 0 else result.stderr or "the compiler failed without a word"


def faults(compiler, root, folders):
    """The messages for the headers that do not compile by themselves, and the number of headers."""
    headers = [path.relative_to(root) for folder in folders for path in sorted((root / folder).rglob("*.h"))]
    with concurrent.futures.ThreadPoolExecutor(JOBS) as pool:
        complaints = list(pool.map(lambda header: compile_alone(compiler, root, header), headers))
    return {header: text for header, text in zip(headers, complaints) if text}, len(headers)


def self_test(compiler):
    """Tests this program with two headers, one of which depends on the other. Returns an exit code."""
    headers = {
        "sound.h": "#pragma once\n#include <string>\nstd::string name();\n",
        "leaning.h": "#pragma once\nstd::string name();\n",
        "unguarded.h": "inline int one() { return 1; }\n",
    }
    with tempfile.TemporaryDirectory() as directory:
        root = pathlib.Path(directory)
        (root / "lamp").mkdir()
        for name, text in headers.items():
            (root / "lamp" / name).write_text(text)
        found, count = faults(compiler, root, ["lamp"])
    names = sorted(header.name for header in found)
    if names == ["leaning.h", "unguarded.h"] and count == 3:
        return 0
    print(f"found {names} of {count} headers")
    return 1


def main():
    arguments = argparse.ArgumentParser(description="Compiles each header alone.")
    arguments.add_argument("--compiler", required=True)
    arguments.add_argument("--root", type=pathlib.Path)
    arguments.add_argument("--self-test", action="store_true")
    arguments.add_argument("folders", nargs="*")
    options = arguments.parse_args()
    if options.self_test:
        return self_test(options.compiler)
    found, count = faults(options.compiler, options.root, options.folders)
    for header, text in found.items():
        print(f"{header} does not stand alone:\n{text}")
    print(f"{count} headers, {len(found)} that do not stand alone")
    return 1 if found or count == 0 else 0


if __name__ == "__main__":
    sys.exit(main())
