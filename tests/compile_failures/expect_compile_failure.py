#!/usr/bin/env python3
"""Checks that the compiler rejects a mistake, and for the right reason.

    expect_compile_failure.py --compiler CXX --root INCLUDE_ROOT SNIPPET
    expect_compile_failure.py --compiler CXX --self-test

A snippet's first line is `// refused with: REGULAR EXPRESSION`. It must compile with -DCORRECTED, so that it cannot
fail for another reason; without, it must not, and the compiler's messages must match the expression.
"""

import argparse
import pathlib
import re
import subprocess
import sys
import tempfile

FLAGS = ["-std=c++20", "-fsyntax-only", "-Wall", "-Wextra", "-Wno-unused"]
FIRST_LINE = re.compile(r"// refused with: (.+)")


def fault_of(compiler, root, snippet):
    """Describes what is wrong with the snippet's behaviour; None if it is correct."""
    first_line = FIRST_LINE.fullmatch(snippet.read_text(encoding="utf-8").splitlines()[0])
    if first_line is None:
        return "its first line does not say with which words it is refused"

    def compile_it(*definitions):
        command = [compiler, *FLAGS, "-I", root, *definitions, snippet]
        return subprocess.run(command, capture_output=True, text=True, check=False)

    corrected = compile_it("-DCORRECTED", "-Werror")
    if corrected.returncode != 0:
        return f"the corrected form does not compile:\n{corrected.stderr}"
    mistaken = compile_it()
    if mistaken.returncode == 0:
        return "the mistake compiles"
    # Omits the quoted source lines, which contain the mistake itself. Includes notes, in which clang explains reasons.
    errors = "\n".join(line for line in mistaken.stderr.splitlines() if re.search("(error|note):", line))
    if re.search(first_line.group(1), errors) is None:
        return f"refused, but not with '{first_line.group(1)}':\n{mistaken.stderr}"
    return None


def self_test(compiler):
    """Tests this program with invalid snippets and a valid one. Returns an exit code."""
    mistake = "#ifdef CORRECTED\nint one = 1;\n#else\nint one = nothing;\n#endif\n"
    snippets = {
        "// refused with: 'nothing'|nothing\n" + mistake: None,
        "// refused with: everything\n" + mistake: "not with",
        "// refused with: nothing\nint one = nothing;\n": "corrected form does not compile",
        "// refused with: nothing\nint one = 1;\n": "the mistake compiles",
        "int one = nothing;\n": "first line",
    }
    with tempfile.TemporaryDirectory() as directory:
        path = pathlib.Path(directory, "snippet.cpp")
        for text, expected in snippets.items():
            path.write_text(text)
            fault = fault_of(compiler, directory, path)
            if (fault is None) != (expected is None) or (expected is not None and expected not in fault):
                print(f"{text}\ngave: {fault}\nnot: {expected}")
                return 1
    return 0


def main():
    arguments = argparse.ArgumentParser(description="Checks that a mistake does not compile.")
    arguments.add_argument("--compiler", required=True)
    arguments.add_argument("--root", type=pathlib.Path)
    arguments.add_argument("--self-test", action="store_true")
    arguments.add_argument("snippet", nargs="?", type=pathlib.Path)
    options = arguments.parse_args()
    if options.self_test:
        return self_test(options.compiler)
    fault = fault_of(options.compiler, options.root, options.snippet)
    if fault is not None:
        print(f"{options.snippet.name}: {fault}")
    return 0 if fault is None else 1


if __name__ == "__main__":
    sys.exit(main())
