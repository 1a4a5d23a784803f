#!/usr/bin/env python3
"""Tests tests/tree/folders.py with small trees, one per rule, and checks that the folders it names exist."""

import pathlib
import unittest

import folders
from made_up_tree import made_up_tree

ROWS = {"contract": [], "base/text": [], "base/json": ["contract", "base/text"], "host/run": ["contract", "base/json"]}
README = """# contract: a title

**What happens here**: values.
**What comes in**: calls.
**What goes out**: results.
**What it may include**: the standard library only.
**Threads**: any.
"""
TREE = {"contract/value.h": "", "contract/CMakeLists.txt": "", "contract/README.md": README}


def found_in(changes, described=()):
    """The violations in a tree that is well but for `changes`: texts by path, None for a file that is not there."""
    with made_up_tree({name: text for name, text in {**TREE, **changes}.items() if text is not None}) as root:
        return folders.violations(root, ROWS, described)


def may_include(text):
    return {"base/json/a.h": "", "base/json/CMakeLists.txt": "",
            "base/json/README.md": README.replace("the standard library only.", text)}


class FoldersTest(unittest.TestCase):
    def test_a_tree_that_keeps_the_rules_passes(self):
        self.assertEqual(found_in({}), [])

    def test_a_folder_with_sources_needs_its_files_and_its_row(self):
        self.assertEqual(found_in({"contract/README.md": None}), ["contract/ has no README.md"])
        self.assertEqual(found_in({"contract/CMakeLists.txt": None}), ["contract/ has no CMakeLists.txt"])
        strange = {"attic/a.cpp": "", "attic/CMakeLists.txt": "", "attic/README.md": README}
        self.assertEqual(found_in(strange), ["attic/ has no row in tests/tree/include_directions.py"])

    def test_what_is_built_or_hidden_needs_nothing(self):
        self.assertEqual(found_in({"build/x/a.cpp": "", ".cache/a.h": "", "build/a.py": "\n" * 600}), [])

    def test_sources_that_are_built_above_need_no_cmake_lists(self):
        built_above = {"tests/misbehaving/a.cpp": "", "tests/misbehaving/README.md": README}
        self.assertEqual(found_in(built_above), [])

    def test_a_folder_without_sources_needs_a_readme_where_it_is_listed(self):
        self.assertEqual(found_in({"data/a.json": ""}), [])
        self.assertEqual(found_in({"data/a.json": ""}, ["data"]), ["data/ has no README.md"])

    def test_an_example_describes_itself(self):
        example = {"examples/lamp/a.cpp": "", "examples/lamp/CMakeLists.txt": ""}
        self.assertEqual(found_in(example), [])

    def test_the_five_lines_stand_in_their_form(self):
        lines = README.splitlines()
        for number in range(2, 7):
            for what, text in (("left out", ""), ("empty", lines[number].split(":")[0] + ":"),
                               ("another", "**Purpose**: values.")):
                changed = [*lines[:number], *([text] if text else []), *lines[number + 1:]]
                with self.subTest(what=what, line=lines[number]):
                    heading = folders.LINES[number - 2]
                    self.assertEqual(found_in({"contract/README.md": "\n".join(changed) + "\n"}),
                                     [f'contract/README.md:{number + 1}: this line must be "**{heading}**: ..."'])

    def test_a_readme_begins_with_a_title_and_an_empty_line(self):
        for text in (README[2:], README.replace("\n\n", "\n", 1), "", "\n" + README):
            with self.subTest(text=text[:20]):
                self.assertEqual(found_in({"contract/README.md": text}),
                                 ["contract/README.md: it must begin with a title and an empty line"])

    def test_a_document_may_follow_after_an_empty_line(self):
        self.assertEqual(found_in({"contract/README.md": README + "\nMore.\n"}), [])
        self.assertEqual(found_in({"contract/README.md": README + "More.\n"}),
                         ["contract/README.md:8: an empty line must follow the five lines"])

    def test_a_readme_names_only_folders_of_its_row(self):
        for text in ("`contract/`, `base/text/`.", "`contract/`, `base/`.", "`contract/`, `base/`, `base/json/`."):
            with self.subTest(text=text):
                self.assertEqual(found_in(may_include(text)), [])
        for named in ("platform", "host", "base/te"):
            with self.subTest(named=named):
                self.assertEqual(found_in(may_include(f"`contract/`, `base/text/`, `{named}/`.")),
                                 [f"base/json/README.md: base/json/ must not include {named}/, which it names"])

    def test_a_readme_names_every_folder_of_its_row(self):
        for text, missing in (("`contract/`.", ["base/text"]), ("`contract` and `base/text`.", ["contract", "base/text"]),
                              ("`base/`.", ["contract"])):
            with self.subTest(text=text):
                self.assertEqual(found_in(may_include(text)),
                                 [f"base/json/README.md: base/json/ may include {one}/, which it does not name" for one in missing])

    def test_what_a_readme_names_is_there(self):
        source = {"contract/value.h": "class Value { int kind_; void print(); };"}
        for text, missing in (("`Value` in `value.h`", []), ("`contract/value.h`", []), ("`print()` of `Value::print()`", []),
                              ("`Lamp` in `lamp.h`", ["lamp.h", "Lamp"]), ("`light()`", ["light"]), ("`Lamp::print()`", []),
                              ("`*_test.py`, `./run`, `quazor`", [])):
            with self.subTest(text=text):
                found = found_in({**source, "contract/README.md": README.replace("values.", text + ".")})
                self.assertEqual(found, [f"contract/README.md: there is no {one}, which it names" for one in missing])

    def test_a_folder_above_may_name_what_its_folders_may(self):
        readme = {"base/README.md": README.replace("the standard library only.", "`contract/`, `base/text/`.")}
        self.assertEqual(found_in(readme, ["base"]), [])
        readme = {"base/README.md": README.replace("the standard library only.", "`host/run/`.")}
        self.assertEqual(found_in(readme, ["base"]), ["base/README.md: base/ must not include host/run/, which it names"])

    def test_a_folder_holds_at_most_so_many_sources(self):
        full = {f"contract/a{number}.h": "" for number in range(folders.MAX_FILES - 1)}
        tests = {f"contract/a{number}_test.cpp": "" for number in range(30)}
        self.assertEqual(found_in({**full, **tests}), [])
        self.assertEqual(found_in({**full, "contract/b.cpp": ""}), ["contract/ holds 41 source files, more than 40"])

    def test_a_file_has_at_most_so_many_lines(self):
        self.assertEqual(found_in({"contract/value.h": "\n" * 500, "tests/a.py": "\n" * 500}), [])
        self.assertEqual(found_in({"contract/value.h": "\n" * 501, "tests/a.py": "\n" * 502}),
                         ["contract/value.h has 501 lines, more than 500", "tests/a.py has 502 lines, more than 500"])


class OwnTreeTest(unittest.TestCase):
    ROOT = pathlib.Path(__file__).resolve().parents[2]

    def test_every_listed_folder_is_there(self):
        for folder in [*folders.DESCRIBED, *folders.BUILT_ABOVE]:
            with self.subTest(folder=folder):
                self.assertTrue((self.ROOT / folder).is_dir())


if __name__ == "__main__":
    unittest.main()
