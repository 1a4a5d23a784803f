#!/usr/bin/env python3
"""Checks that every class of a product header documents which threads may use it.

    thread_words.py [ROOT]

The comment directly above the class, or above its `template` line, must contain a line that begins with `// Thread: `,
followed by "any" (several threads at once), "one at a time" (any thread, but never two), or a thread: "the loop's", "as
SerialQueue". More text may follow.

  - Product headers are the *.h files of the tree except those in tests/, benchmarks/, examples/ and host/testing/, and
    except `*_for_tests.h`, `*_conformance.h` and `*_fixture.h`.
  - A class is what `class` or `struct` defines at namespace scope. A nested class follows the rule of the outer class
    unless it says otherwise.
  - A plain data struct needs no line: it has no base class, and all its member functions are const, static,
    defaulted, deleted or friends.
  - Nor does an exception: a class with a base whose name ends in Error, _error or exception.

Exits with 1 and prints a line per violation.
"""

import pathlib
import re
import sys

import include_directions

OTHER_FOLDERS = ("tests/", "benchmarks/", "examples/", "host/testing/", "build")
OTHER_NAMES = ("_for_tests.h", "_conformance.h", "_fixture.h")

# Comments and literals, which are blanked out so that only code is left.
NO_CODE = re.compile(r'//[^\n]*|/\*.*?\*/|R"(\w*)\(.*?\)\1"|"(?:\\.|[^"\\\n])*"|\'(?:\\.|[^\'\\\n])+\'', re.DOTALL)
DIRECTIVE = re.compile(r"^[ \t]*#(?:[^\n\\]|\\\n|\\.)*", re.MULTILINE)
# `class QUAZOR_EXPORT Name final : public Base {`
CLASS = re.compile(r"\b(?<!enum )(class|struct)\s+(?:\[\[.*?\]\]\s*)?(?:[A-Z_]+\s+)?(?P<name>\w+)(?:<[^;{}]*?>)?(?:\s+final)?\s*"
                   r"(?P<bases>:[^;{}()]*)?\{")
EXCEPTION = re.compile(r"\w*(?:Error|_error|exception)\s*(?:,|$)")
NAMESPACE = re.compile(r"\b(?:namespace|extern)\b[^;{}()]*\{")


def blank(match):
    return re.sub(r"[^\n]", " ", match.group())


def code_of(text):
    """The text with everything but code blanked out; positions do not change."""
    return DIRECTIVE.sub(blank, NO_CODE.sub(blank, text))


def end_of_block(code, start):
    """The position after the brace that closes the one before `start`."""
    depth = 1
    for place in range(start, len(code)):
        depth += {"{": 1, "}": -1}.get(code[place], 0)
        if depth == 0:
            return place + 1
    return len(code)


def classes(code):
    """The classes defined at namespace scope: (keyword, name, bases, start, body)."""
    place = 0
    while place < len(code):
        candidates = [match for match in (NAMESPACE.search(code, place), CLASS.search(code, place)) if match]
        brace = code.find("{", place)
        if brace < 0:
            return
        found = next((match for match in candidates if match.end() == brace + 1), None)
        if found is None:  # a function, an enumeration or an initializer
            place = end_of_block(code, brace + 1)
        elif found.re is NAMESPACE:
            place = brace + 1
        else:
            end = end_of_block(code, brace + 1)
            yield found.group(1), found["name"], found["bases"], found.start(), code[brace + 1:end - 1]
            place = end


def without_template_arguments(statement):
    while True:
        shorter = re.sub(r"<[^<>]*>", "", statement)
        if shorter == statement:
            return statement
        statement = shorter


def is_more_than_data(body):
    """True if a class with this body has member functions other than const, static, defaulted, deleted or friends."""
    while True:  # removes the contents of inner braces: function bodies, initializers, inner types
        flat = re.sub(r"\{[^{}]*\}", ";", body)
        if flat == body:
            break
        body = flat
    for statement in body.split(";"):
        if re.search(r"=\s*(default|delete)\s*$|\)\s*const\b|\b(static|friend)\b", statement):
            continue
        if re.search(r"\boperator\b", statement):
            return True
        declaration = without_template_arguments(statement).split("=")[0]
        if re.search(r"\b(?!alignas\b|decltype\b|static_assert\b)\w+\s*\((?!\s*\*)", declaration):
            return True
    return False


def comment_above(lines, line):
    """The comment above a line (counted from 0), skipping the template line that belongs to it."""
    line -= 1
    while line >= 0 and re.match(r"\s*(template|requires)\b", lines[line]):
        line -= 1
    comment = []
    while line >= 0 and lines[line].lstrip().startswith("//"):
        comment.insert(0, lines[line].strip())
        line -= 1
    return comment


def silent_classes(text):
    """(line, name) of every class that must document its threads and does not."""
    code, lines = code_of(text), text.splitlines()
    for keyword, name, bases, start, body in classes(code):
        if keyword == "struct" and not bases and not is_more_than_data(body):
            continue
        if bases and EXCEPTION.search(bases):
            continue
        line = code.count("\n", 0, start)
        if not any(re.match(r"// Thread: \S", words) for words in comment_above(lines, line)):
            yield line + 1, name


def headers(root):
    for path in sorted(root.rglob("*.h")):
        name = path.relative_to(root).as_posix()
        if not name.startswith((".", *OTHER_FOLDERS)) and not name.endswith(OTHER_NAMES):
            yield name


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ".").resolve()
    names = list(headers(root))
    if not names:
        print(f"no headers under {root}")
        return 1
    found = [f"{name}:{line}: {what} does not say which threads may use it (// Thread: ...)"
             for name in names for line, what in silent_classes((root / name).read_text(encoding="utf-8"))]
    return include_directions.report(found, f"{len(names)} headers")


if __name__ == "__main__":
    sys.exit(main())
