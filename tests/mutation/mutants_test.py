#!/usr/bin/env python3
"""Tests of the mutation operators: what they change in a text, and what they leave alone."""

import unittest

from mutants import mutants_of


def changes(text, operator=None):
    """The changed lines as (before, after), in a function body."""
    whole = f"void f() {{\n  {text}\n}}\n"
    return [(one.before, one.after) for one in mutants_of("a.cpp", whole) if operator in (None, one.operator)]


def results(text, operator):
    return [after for _, after in changes(text, operator)]


class OperatorsTest(unittest.TestCase):
    def test_comparisons_move_by_one_or_turn_around(self):
        self.assertEqual(results("x = a < b;", "comparison"), ["x = a <= b;"])
        self.assertEqual(results("x = a <= b;", "comparison"), ["x = a < b;"])
        self.assertEqual(results("x = a > b;", "comparison"), ["x = a >= b;"])
        self.assertEqual(results("x = a >= b;", "comparison"), ["x = a > b;"])
        self.assertEqual(results("x = a == b;", "comparison"), ["x = a != b;"])
        self.assertEqual(results("x = a != b;", "comparison"), ["x = a == b;"])

    def test_brackets_of_templates_are_no_comparisons(self):
        self.assertEqual(results("std::vector<int> x;", "comparison"), [])
        self.assertEqual([one.operator for one in mutants_of("a.h", "template <class T>\nvoid f(T x);\n")], [])
        self.assertEqual([one.operator for one in mutants_of("a.h", "bool operator<(A a, B b);\n")], [])

    def test_sums_become_differences(self):
        self.assertEqual(results("x = a + b;", "arithmetic"), ["x = a - b;"])
        self.assertEqual(results("x -= b;", "arithmetic"), ["x += b;"])
        self.assertEqual(results("++x;", "arithmetic"), ["--x;"])
        self.assertEqual(results("x = a * b;", "arithmetic"), ["x = a / b;"])

    def test_a_sign_is_no_operator_and_a_text_cannot_be_subtracted(self):
        self.assertEqual(results("x = -a;", "arithmetic"), [])
        self.assertEqual(results('x = a + "b";', "arithmetic"), [])
        self.assertEqual(results("const T* x = nullptr;", "arithmetic"), [])

    def test_and_becomes_or(self):
        self.assertEqual(results("x = a && b;", "logic"), ["x = a || b;"])
        self.assertEqual(results("x = a || b;", "logic"), ["x = a && b;"])
        self.assertEqual(results("T&& x = g();", "logic"), [])

    def test_conditions_are_negated(self):
        self.assertEqual(results("if (a || b) g();", "negate condition"), ["if (!(a || b)) g();"])
        self.assertEqual(results("while (!a.empty()) g();", "negate condition"), ["while (!(!a.empty())) g();"])
        self.assertEqual(results("if (auto x = g(); x > 1) g();", "negate condition"),
                         ["if (auto x = g(); !(x > 1)) g();"])

    def test_a_declaration_as_a_condition_and_a_constant_one_are_left_alone(self):
        self.assertEqual(results("if (const auto* x = g()) h();", "negate condition"), [])
        self.assertEqual(results("if constexpr (a) h();", "negate condition"), [])

    def test_a_not_is_removed(self):
        self.assertEqual(results("x = !a;", "remove not"), ["x = a;"])
        self.assertEqual(results("x = a != b;", "remove not"), [])

    def test_statements_are_dropped(self):
        self.assertEqual(results("g(1);", "drop statement"), [";"])
        self.assertEqual(results("x->y = 1;", "drop statement"), [";"])
        self.assertEqual(results("std::sort(x);", "drop statement"), [";"])
        self.assertEqual(results("if (a) return;", "drop statement"), ["if (a) ;"])
        self.assertEqual(results("for (;;) {\n g();\n }", "drop statement"), [";"])
        self.assertEqual(results("switch (a) {\n case 1: g(); break;\n }", "drop statement"),
                         ["case 1: ; break;", "case 1: g(); ;"])

    def test_declarations_are_not_dropped(self):
        for text in ("int x = 1;", "const auto x = g();", "std::string x;", "std::vector<int> x(1);", "T& x = y;",
                     "using A = B;", "static_cast<void>(x);", "return x;"):
            self.assertEqual(results(text, "drop statement"), [], text)

    def test_statements_in_lambdas_are_dropped(self):
        self.assertIn(("h();", ";"), changes("g([&] {\n  h();\n});", "drop statement"))
        self.assertIn(("h(a);", ";"), changes("auto x = [](int a) {\n  h(a);\n};", "drop statement"))

    def test_members_of_classes_and_values_of_lists_are_no_statements(self):
        text = "struct A {\n  int x = 1;\n  void f();\n};\nconst int b[] = {g(1), 2};\n"
        self.assertEqual({one.operator for one in mutants_of("a.h", text)}, {"constant"})

    def test_neighbours_are_swapped(self):
        self.assertEqual(results("g();\n  h();", "swap statements"), ["h(); g();"])
        self.assertEqual(results("int x = 1;\n  h();", "swap statements"), [])
        self.assertEqual(results("if (a) g();\n  h();", "swap statements"), [])
        self.assertEqual(results("{ g(); }\n  h();", "swap statements"), [])

    def test_returned_values_become_the_default(self):
        self.assertEqual(results("return g(x);", "return default"), ["return {};"])
        self.assertEqual(results("return true;", "return default"), ["return false;"])
        self.assertEqual(results("return false;", "return default"), ["return true;"])
        for text in ("return;", "return {};", "return nullptr;", "return std::nullopt;", "return 0;"):
            self.assertEqual(results(text, "return default"), [], text)

    def test_constants_change_by_one(self):
        self.assertEqual(results("g(10);", "constant"), ["g(11);", "g(9);"])
        self.assertEqual(results("g(10'000U);", "constant"), ["g(10001U);", "g(9999U);"])
        self.assertEqual(results("g(0xff);", "constant"), ["g(0x100);", "g(0xfe);"])
        self.assertEqual(sorted(results("g(1.5);", "constant")), ["g(0.5);", "g(2.5);"])
        self.assertEqual(results("g(x1);", "constant"), [])

    def test_a_function_without_a_body_stays_one(self):
        self.assertEqual(mutants_of("a.h", "struct A {\n  virtual int f() const = 0;\n};\n"), [])

    def test_texts_change(self):
        self.assertEqual(results('g("a\\"b");', "string"), ['g("a\\"b~");'])
        self.assertEqual(results("g('a');", "string"), [])

    def test_comments_includes_and_assertions_are_left_alone(self):
        text = ('// a < b\n/* "x" 1\n */\n#include "a.h"\n#define A \\\n  1 < 2\nextern "C" int f();\n'
                'static_assert(sizeof(int) == 4, "x");\n')
        self.assertEqual(mutants_of("a.cpp", text), [])

    def test_raw_texts_do_not_confuse(self):
        self.assertEqual(results('g(R"x(a "b" < 1)x");', "comparison"), [])
        self.assertEqual(results('g(R"x(a "b" < 1)x");', "string"), [])


class MutantTest(unittest.TestCase):
    def test_a_mutant_changes_the_text_at_one_place(self):
        text = "void f() {\n  g(1);\n  h(1);\n}\n"
        mutated = {one.applied(text) for one in mutants_of("a.cpp", text) if one.operator == "constant"}
        self.assertEqual(mutated, {text.replace("g(1)", "g(2)"), text.replace("g(1)", "g(0)"),
                                   text.replace("h(1)", "h(2)"), text.replace("h(1)", "h(0)")})

    def test_the_key_does_not_depend_on_other_lines(self):
        body = "void f() {\n  g(a < b);\n}\n"
        keys = {one.key for one in mutants_of("a.cpp", body)}
        self.assertEqual(keys, {one.key for one in mutants_of("a.cpp", "// A comment.\n\n" + body)})

    def test_equal_changes_of_equal_lines_have_different_keys(self):
        found = mutants_of("a.cpp", "void f() {\n  g();\n}\nvoid h() {\n  g();\n}\n")
        self.assertEqual([one.key for one in found],
                         ["a.cpp | drop statement | g(); | ;", "a.cpp | drop statement | g(); | ; | 2"])


if __name__ == "__main__":
    unittest.main()
