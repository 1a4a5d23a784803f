#!/usr/bin/env python3
"""Tests tests/tree/every_test_is_built.py with small trees."""

import unittest

import every_test_is_built
from made_up_tree import made_up_tree


def left_out_of(files):
    with made_up_tree(files) as root:
        return every_test_is_built.tests_left_out(root.resolve())


class EveryTestIsBuiltTest(unittest.TestCase):
    def test_a_test_that_its_folder_names_is_built(self):
        for text in ["quazor_test(t SOURCES a_test.cpp DEPENDS x)", "quazor_test(t\n  SOURCES\n    a_test.cpp)",
                     'add_test(NAME t COMMAND "a_test.cpp")', "f(${CMAKE_CURRENT_SOURCE_DIR}/a_test.cpp)"]:
            with self.subTest(text=text):
                self.assertEqual(left_out_of({"lamp/CMakeLists.txt": text, "lamp/a_test.cpp": ""}), ([], 1))

    def test_a_test_may_be_named_by_a_folder_above(self):
        self.assertEqual(left_out_of({"CMakeLists.txt": "t(lamp/a_test.cpp)", "lamp/a_test.cpp": ""}), ([], 1))

    def test_a_test_that_nobody_names_is_left_out(self):
        files = {"lamp/CMakeLists.txt": "t(a_test.cpp)", "lamp/a_test.cpp": "", "lamp/b_test.cpp": ""}
        self.assertEqual(left_out_of(files), (["lamp/b_test.cpp"], 2))

    def test_a_name_in_a_comment_does_not_count(self):
        files = {"lamp/CMakeLists.txt": "t(\n  # a_test.cpp\n  )", "lamp/a_test.cpp": ""}
        self.assertEqual(left_out_of(files), (["lamp/a_test.cpp"], 1))

    def test_the_same_name_in_another_folder_does_not_count(self):
        files = {"lamp/CMakeLists.txt": "t(a_test.cpp)", "lamp/a_test.cpp": "", "hinge/a_test.cpp": ""}
        self.assertEqual(left_out_of(files), (["hinge/a_test.cpp"], 2))

    def test_a_longer_name_does_not_count_for_its_end(self):
        files = {"lamp/CMakeLists.txt": "t(big_a_test.cpp)", "lamp/a_test.cpp": "", "lamp/big_a_test.cpp": ""}
        self.assertEqual(left_out_of(files), (["lamp/a_test.cpp"], 2))

    def test_python_tests_count_too(self):
        self.assertEqual(left_out_of({"tests/CMakeLists.txt": "", "tests/a_test.py": ""}), (["tests/a_test.py"], 1))

    def test_what_is_built_or_hidden_is_passed_over(self):
        self.assertEqual(left_out_of({"build/a_test.cpp": "", ".git/b_test.cpp": ""}), ([], 0))


if __name__ == "__main__":
    unittest.main()
