#!/usr/bin/env python3
"""Tests tests/tree/error_codes.py with small trees, one per form of returning an error."""

import unittest

import error_codes
from made_up_tree import made_up_tree

DOMAIN = 'inline constexpr std::string_view LampErrorDomain = "LampErrorDomain";\n'


def in_tree(files, call):
    with made_up_tree(files) as root:
        return call(root)


def errors_in(body, **more):
    """The errors of a tree whose lamp/lamp.cpp contains `body`, without the file names."""
    files = {"contract/diagnostic_error.h": "#pragma once\n" + DOMAIN, "lamp/lamp.cpp": body}
    files.update({name.replace("__", "/") + ".h": text for name, text in more.items()})
    folders = sorted({name.split("/")[0] for name in files})
    errors = in_tree(files, lambda root: error_codes.errors_of(root, folders))
    return [(error.domain, error.code, error.symbol, error.message) for error in errors]


class KnownFormTest(unittest.TestCase):
    CASES = [
        ("fail with a number", 'void f(E* e) { fail(e, LampErrorDomain, 3, nullptr, "It is %@!", x); }',
         [(3, None, "It is %@!")]),
        ("makeError", 'P f() { return g(makeError(LampErrorDomain, -7, "no")); }', [(-7, None, "no")]),
        ("errorWithMessage", "P f() { return errorWithMessage(LampErrorDomain, 0x10, std::move(text), nullptr); }",
         [(16, None, None)]),
        ("a constant of the file",
         'namespace { constexpr std::int64_t kOut = 1\'0; }\nvoid f() { makeError(LampErrorDomain, kOut, "a" "b"); }',
         [(10, "kOut", "ab")]),
        ("a constant of a namespace in the file",
         'namespace q::lamp { inline constexpr int kOut = 4; }\n'
         'void f() { makeError(LampErrorDomain, lamp::kOut, "m"); }',
         [(4, "kOut", "m")]),
        ("an enumerator", "enum class Code : int { kA = 1, kB };\n"
         'void f() { makeError(LampErrorDomain, static_cast<std::int64_t>(Code::kB), "m"); }', [(2, "kB", "m")]),
        ("two in one expression",
         'P f() { return x ? makeError(LampErrorDomain, 1, "a") : makeError(LampErrorDomain, 2, "b"); }',
         [(1, None, "a"), (2, None, "b")]),
        ("in a class", 'class Lamp final : public Base {\n public:\n'
         '  Lamp() : light_{1} { makeError(LampErrorDomain, 5, "m"); }\n};', [(5, None, "m")]),
        ("in a member function",
         'bool Lamp::on(E* e) const { fail(e, LampErrorDomain, 5, nullptr, "m"); return false; }',
         [(5, None, "m")]),
        ("a message that is a parameter",
         'void no(E* e, MessageFormat<> text) { fail(e, LampErrorDomain, 5, nullptr, text); }\n'
         'void f(E* e) { no(e, "a"); no(e, "b"); }', [(5, None, "a"), (5, None, "b")]),
        ("a code and a message that are parameters",
         "constexpr int kA = 1;\ntemplate <class... A>\n"
         "void no(E* e, int code, const P& p, MessageFormat<A...> text, const A&... a) {\n"
         '  fail<A...>(e, LampErrorDomain, code, p, text, a...);\n}\nvoid f(E* e) { no(e, kA, nullptr, "a %@", 3); }',
         [(1, "kA", "a %@")]),
        ("a code that goes through two functions",
         'void inner(E* e, int code) { fail(e, LampErrorDomain, code, nullptr, "m"); }\n'
         "void outer(E* e, int number) { inner(e, number); }\nvoid f(E* e) { outer(e, 9); }", [(9, None, "m")]),
        ("all enumerators that are mentioned",
         "enum class Code : int { kA = 1, kB = 2, kC = 3 };\n"
         "P no(Code code, std::string m) {\n"
         "  return errorWithMessage(LampErrorDomain, static_cast<std::int64_t>(code), m, nullptr);\n}\n"
         'void f() { no(Code::kA, "a"); problem = Code::kC; }', [(1, "kA", None), (3, "kC", None)]),
        ("a comparison of the domain", "bool f() { return error->domain() == LampErrorDomain; }", []),
        ("a comment and a text",
         '// makeError(LampErrorDomain, x, "m")\n/* LampErrorDomain */ auto t = "LampErrorDomain.";', []),
        ("the ending of all domains", 'constexpr std::string_view kEnding = "ErrorDomain";', []),
        ("a function of the same name with fewer arguments",
         'void f() { fail("no"); cursor.fail(a, b, c, d, e); }', []),
        ("an error as a type", "void f(const DiagnosticError& error) { g<DiagnosticError>(error); }", []),
    ]

    def test_each_form_is_followed(self):
        for name, body, expected in self.CASES:
            with self.subTest(name):
                self.assertEqual(errors_in(body), [("LampErrorDomain", *error) for error in expected])

    def test_a_constant_may_stand_in_another_file(self):
        body = 'void f() { makeError(LampErrorDomain, lamp_error::kOut, "m"); }'
        header = "namespace q::lamp_error { inline constexpr std::int64_t kOut = 4; }"
        self.assertEqual(errors_in(body, lamp__errors=header), [("LampErrorDomain", 4, "kOut", "m")])

    def test_a_domain_has_the_value_of_its_constant(self):
        body = 'constexpr std::string_view OwnErrorDomain = "Own";\nvoid f() { makeError(OwnErrorDomain, 1, "m"); }'
        self.assertEqual(errors_in(body), [("Own", 1, None, "m")])

    def test_tests_are_passed_over(self):
        files = {f"lamp/{name}": "makeError(x)" for name in ("lamp_test.cpp", "lamp_for_tests.h", "notes.md")}
        self.assertEqual(in_tree(files, lambda root: error_codes.errors_of(root, ["lamp"])), [])

    def test_a_scenarios_error_is_passed_on(self):
        text = "P f() { return errorWithMessage(fault.error->domain, fault.error->code, text, nullptr); }"
        for file in ("backends/faults/fault.cpp", "backends/simulated/hid/sensor.cpp"):
            with self.subTest(file):
                self.assertEqual(in_tree({file: text}, lambda root: error_codes.errors_of(root, ["backends"])), [])


class UnknownFormTest(unittest.TestCase):
    CASES = [
        ("a domain that is written out", 'void f() { makeError("LampErrorDomain", 1, "m"); }', "the domain is none of"),
        ("a domain that is written out elsewhere", 'auto d = f("LampErrorDomain");', "is written out"),
        ("a domain that is not defined", 'void f() { makeError(OvenErrorDomain, 1, "m"); }', "the domain is none of"),
        ("a domain in a variable", "void f() { auto domain = LampErrorDomain; }", "is used in a way that is not known"),
        ("a domain of a scenario elsewhere",
         "P f() { return errorWithMessage(a.error->domain, a.error->code, a.error->message, nullptr); }",
         "the domain is none of"),
        ("a domain handed to a function", "void f() { report(LampErrorDomain, 3); }",
         "is used in a way that is not known"),
        ("a domain whose value is no text", "constexpr std::string_view LampErrorDomain = kLamp;", "is not one text"),
        ("a code that is computed", 'void f() { makeError(LampErrorDomain, kBase + 1, "m"); }',
         "'kBase + 1' is no code"),
        ("a code that is chosen", 'void f() { makeError(LampErrorDomain, x ? 1 : 2, "m"); }', "is no code"),
        ("a code that nothing defines", 'void f() { makeError(LampErrorDomain, kOut, "m"); }', "'kOut' is no code"),
        ("a constant of another file without its namespace", 'void f() { makeError(LampErrorDomain, kOther, "m"); }',
         "'kOther' is no code"),
        ("a code of a function that nothing calls",
         'void no(int code) { makeError(LampErrorDomain, code, "m"); }', "nothing calls no"),
        ("a code of one of two functions of that name",
         'void no(int code) { makeError(LampErrorDomain, code, "m"); }\nvoid no(E* e) {}\nvoid f() { no(1); }',
         "several functions are named no"),
        ("a code that goes round for ever",
         'void no(int code) { makeError(LampErrorDomain, code, "m"); }\nvoid a(int n) { b(n); no(n); }\n'
         "void b(int n) { a(n); }", "through too many functions"),
        ("an enumerator that is no number", "enum class Code { kA = kB };", "is not a number"),
        ("an enumerator that does not exist",
         "enum class Code : int { kA = 1 };\n"
         "P no(Code code) { return makeError(LampErrorDomain, static_cast<std::int64_t>(code), m); }\n"
         "void f() { no(Code::kB); }", "Code has no enumerator kB"),
        ("too few arguments", "void f() { makeError(LampErrorDomain, 1); }", "makeError with 2 arguments"),
        ("an error made by hand", "P f() { return std::make_shared<const DiagnosticError>(d, 1, info); }",
         "without a function"),
        ("an error made in place", "P f() { return g(DiagnosticError(d, 1, info)); }", "without a function"),
        ("a bracket that does not close", "void f() { makeError(LampErrorDomain, 1, ", "does not close"),
    ]

    def test_each_other_form_is_refused(self):
        for name, body, expected in self.CASES:
            with self.subTest(name), self.assertRaises(error_codes.UnknownForm) as caught:
                errors_in(body, lamp__other="namespace q { constexpr int kOther = 1; }")
            self.assertIn(expected, str(caught.exception), name)


class RegisteredTest(unittest.TestCase):
    def names_in(self, text):
        files = {"lamp/plugin.cpp": text, "contract/lab.cpp": "void QZLab::addExperimentWithName(std::string name) {}"}
        return in_tree(files, lambda root: error_codes.registered(root, ["frame", "lamp"]))

    def test_names_are_collected_by_kind(self):
        text = ('void f() { lab.addExperimentWithName("E.1", make); lab.addAnalysisWithName("A", make);\n'
                '  QZLab::defaultLab().addDiagnosticWithName("D", "It.", "E.1", "A");\n'
                '  lab.addExperimentWithName("E.2", make); }')
        self.assertEqual(self.names_in(text), {"experiment": ["E.1", "E.2"], "analysis": ["A"], "diagnostic": ["D"]})

    def test_a_name_that_is_no_text_is_refused(self):
        for text in ("lab.addExperimentWithName(kName, make);", 'lab.addExperimentWithName("a" + b, make);',
                     "auto add = &QZLab::addExperimentWithName;"):
            with self.subTest(text), self.assertRaises(error_codes.UnknownForm):
                self.names_in("void f() { " + text + " }")


if __name__ == "__main__":
    unittest.main()
