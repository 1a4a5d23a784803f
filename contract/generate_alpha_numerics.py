#!/usr/bin/env python3
"""Writes contract/alpha_numerics_table.cpp from the Unicode Character Database.

    generate_alpha_numerics.py [--data UnicodeData.txt]          prints the table
    generate_alpha_numerics.py [--data UnicodeData.txt] --compare FILE
                                                                  exits with 1 when FILE is not what would be printed

The data file comes with Debian's package unicode-data; without it the program exits with 77, which CTest shows as
a skipped test. Its format is described in Unicode Standard Annex 44.
"""

import argparse
import pathlib
import sys

DATA = "/usr/share/unicode/UnicodeData.txt"
SKIPPED = 77
WIDTH = 120

HEADER = """\
// Made by contract/generate_alpha_numerics.py from Unicode's character data; do not edit. To regenerate it:
//   contract/generate_alpha_numerics.py > contract/alpha_numerics_table.cpp
#include "contract/alpha_numerics_table.h"

namespace quazor {

namespace {

// clang-format off
constexpr CodePointRange kRanges[] = {
"""

FOOTER = """\
};
// clang-format on

}  // namespace

std::span<const CodePointRange> alphaNumericRanges() { return kRanges; }

}  // namespace quazor
"""


def categorised_ranges(lines):
    """Yields (first, last, category) for every line of UnicodeData.txt, or pair of lines that spans a range."""
    span_start = None
    for line in lines:
        fields = line.split(";")
        code_point, name, category = int(fields[0], 16), fields[1], fields[2]
        if name.endswith(", First>"):
            span_start = code_point
        elif name.endswith(", Last>"):
            yield span_start, code_point, category
        else:
            yield code_point, code_point, category


def alpha_numeric_ranges(lines):
    """The sorted ranges of letters, marks and numbers; adjacent ranges are merged."""
    ranges = []
    for first, last, category in categorised_ranges(lines):
        if category[0] not in "LMN":
            continue
        if ranges and ranges[-1][1] + 1 == first:
            ranges[-1][1] = last
        else:
            ranges.append([first, last])
    return ranges


def table(ranges):
    """The text of the source file."""
    text = HEADER
    line = "   "
    for first, last in ranges:
        entry = f" {{0x{first:04X}, 0x{last:04X}}},"
        if len(line) + len(entry) > WIDTH:
            text += line + "\n"
            line = "   "
        line += entry
    return text + line + "\n" + FOOTER


def main():
    arguments = argparse.ArgumentParser(description="Writes the table of letters, marks and numbers.")
    arguments.add_argument("--data", default=DATA, type=pathlib.Path, help="UnicodeData.txt")
    arguments.add_argument("--compare", type=pathlib.Path, help="compare with this file instead of printing")
    options = arguments.parse_args()
    if not options.data.exists():
        print(f"{options.data} is missing; Debian's package unicode-data has it", file=sys.stderr)
        return SKIPPED
    with options.data.open(encoding="ascii") as data:
        text = table(alpha_numeric_ranges(data))
    if options.compare is None:
        sys.stdout.write(text)
        return 0
    if options.compare.read_text(encoding="ascii") != text:
        print(f"{options.compare} differs from the output for {options.data}; regenerate it", file=sys.stderr)
        return 1
    return 0


if __name__ == "__main__":
    sys.exit(main())
