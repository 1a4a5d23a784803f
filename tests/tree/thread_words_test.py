#!/usr/bin/env python3
"""Tests tests/tree/thread_words.py with small headers and small trees."""

import re
import unittest

import thread_words
from made_up_tree import run_over


def silent_in(text):
    return [name for _, name in thread_words.silent_classes(text)]


class ClassesThatMustSayTest(unittest.TestCase):
    CASES = {
        "a class": "class Lamp {\n public:\n  void light();\n};\n",
        "a class without functions": "class Lamp {\n  int brightness_ = 0;\n};\n",
        "an exported class": "class QUAZOR_EXPORT Lamp {\n};\n",
        "a class with an attribute": "class [[nodiscard]] Lamp {\n};\n",
        "a final class with a base": "class Lamp final : public Light {\n};\n",
        "a class with a base on the next line": "class Lamp final\n    : public Light<int>,\n      public Bulb {\n};\n",
        "a template": "template <class T>\nclass Lamp {\n};\n",
        "a specialization": "template <>\nclass Lamp<int> {\n};\n",
        "a template with a constraint": "template <class T>\nrequires(sizeof(T) > 1)\nclass Lamp {\n};\n",
        "a struct with a function": "struct Lamp {\n  void light();\n};\n",
        "a struct with a defined function": "struct Lamp {\n  void light() { on = true; }\n  bool on = false;\n};\n",
        "a struct with a constructor": "struct Lamp {\n  explicit Lamp(int brightness);\n};\n",
        "a struct with an operator": "struct Lamp {\n  Lamp& operator+=(const Lamp& other);\n};\n",
        "a struct with a base": "struct Lamp : Light {\n};\n",
        "a class in two namespaces": "namespace a {\nnamespace b::c {\nclass Lamp {\n};\n}\n}\n",
        "a class after a function": "inline int two() {\n  if (true) { return 2; }\n  return 3;\n}\nclass Lamp {\n};\n",
        "a class after an enumeration": "enum class Colour { kRed };\nclass Lamp {\n};\n",
        "a class whose comment says something else": "// Gives light. Thread: any.\nclass Lamp {\n};\n",
        "a class whose comment is cut off": "// Thread: any.\n\nclass Lamp {\n};\n",
        "a class that names nobody": "// Thread: \nclass Lamp {\n};\n",
        "a class whose functions alone say it": "class Lamp {\n  // Thread: any.\n  void light();\n};\n",
    }

    def test_without_a_word_it_is_found(self):
        for name, text in self.CASES.items():
            with self.subTest(name):
                self.assertEqual(silent_in(f"#pragma once\n\nnamespace quazor {{\n\n{text}\n}}\n"), ["Lamp"])

    def test_with_a_word_it_is_not(self):
        for name, text in self.CASES.items():
            place = re.search(r"^(template|class|struct)\b", text, re.MULTILINE).start()
            said = text[:place] + "// Gives light.\n// Thread: any.\n" + text[place:]
            with self.subTest(name):
                self.assertEqual(silent_in(said), [])

    def test_every_class_of_a_header_is_looked_at(self):
        text = "// Thread: any.\nclass Lamp {\n};\nclass Bulb {\n};\n// Thread: any.\nclass Socket {\n};\nclass Cord {\n};\n"
        self.assertEqual(list(thread_words.silent_classes(text)), [(4, "Bulb"), (9, "Cord")])


class WhatNeedsNoWordTest(unittest.TestCase):
    CASES = {
        "data": "struct Lamp {\n  int brightness = 0;\n  std::string colour;\n};\n",
        "data with initializers that call": "struct Lamp {\n  Value colour = darkness();\n  Value size{Dictionary{}};\n};\n",
        "data that holds functions": "struct Lamp {\n  std::function<void(int)> lit;\n  void (*dark)(int) = nullptr;\n};\n",
        "data with const functions": "struct Lamp {\n  bool on() const { return lit; }\n  int size() const;\n  bool lit;\n};\n",
        "data that compares": "struct Lamp {\n  bool operator==(const Lamp&) const = default;\n  int a;\n};\n",
        "data with a friend": "struct Lamp {\n  friend bool operator<(const Lamp& a, const Lamp& b);\n  int a;\n};\n",
        "data that is made by name": "struct Lamp {\n  static Lamp red();\n  int a;\n};\n",
        "data that is not copied": "struct Lamp {\n  Lamp() = default;\n  Lamp(const Lamp&) = delete;\n};\n",
        "data with an enumeration": "struct Lamp {\n  enum class Colour { kRed, kBlue };\n  Colour colour;\n};\n",
        "a declaration": "class Lamp;\nstruct Bulb;\n",
        "a friend": "// Thread: any.\nclass Socket {\n  friend class Lamp;\n};\n",
        "an inner class": "// Thread: any.\nclass Socket {\n  class Lamp {\n    void light();\n  };\n};\n",
        "an exception": "class LampError : public std::runtime_error {\n  using std::runtime_error::runtime_error;\n};\n",
        "an exception of ours": "class LampError : public CommandError {\n  explicit LampError(int lamp);\n};\n",
        "an enumeration": "enum class Lamp { kOn };\n",
        "a class in a comment": "// class Lamp {\n/* class Bulb {\n}; */\n",
        "a class in a text": 'inline constexpr char kText[] = "class Lamp {};";\n',
        "a class in a macro": "#define LAMP(name) \\\n  class name {      \\\n  };\n",
    }

    def test_it_is_not_found(self):
        for name, text in self.CASES.items():
            with self.subTest(name):
                self.assertEqual(silent_in(f"namespace quazor {{\n{text}}}\n"), [])


class TreeTest(unittest.TestCase):
    def run_on(self, names):
        return run_over(thread_words, dict.fromkeys(names, "class Lamp {\n};\n"))

    def test_product_headers_are_checked(self):
        run = self.run_on(["host/run/lamp.h", "contract/lamp.h"])
        self.assertEqual(run.returncode, 1)
        self.assertIn("contract/lamp.h:1: Lamp", run.stdout)
        self.assertIn("host/run/lamp.h:1: Lamp", run.stdout)

    def test_other_headers_are_not(self):
        others = ["tests/support/a.h", "benchmarks/a.h", "examples/a/a.h", "host/testing/a.h", "build/x/a.h", ".x/a.h",
                  "host/run/a_for_tests.h", "host/run/a_conformance.h", "host/run/a_fixture.h", "host/run/a.cpp"]
        run = self.run_on(others)
        self.assertEqual((run.returncode, run.stdout.splitlines()[0][:10]), (1, "no headers"))

    def test_a_tree_that_says_all_passes(self):
        run = run_over(thread_words, {"lamp.h": "// Thread: any.\nclass Lamp {\n};\n"})
        self.assertEqual((run.returncode, run.stdout), (0, "1 headers, 0 violations\n"))


if __name__ == "__main__":
    unittest.main()
