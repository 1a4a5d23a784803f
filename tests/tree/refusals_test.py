#!/usr/bin/env python3
"""Tests tests/tree/refusals.py with small documents."""

import unittest

import refusals

DOCUMENT = """Text with `no text`.

| what you see | what to do |
|---|---|
| `It is gone`, `No such device` | Run `it`. |
| `no camera is ...; there are ...` | `a \\| b` |

`After` it.
"""


class RefusalsTest(unittest.TestCase):
    def test_the_first_column_is_read(self):
        self.assertEqual(refusals.quoted(DOCUMENT), ["It is gone", "No such device", "no camera is ...; there are ..."])

    def test_strings_that_follow_each_other_are_one(self):
        self.assertEqual(refusals.strings('f("a \\"b\\" "\n  "c", "d");'), ['a "b" c', "d"])

    def test_what_nothing_says_is_told(self):
        said = ["%@: It is gone.", "no camera is any", "; there are "]
        self.assertEqual(refusals.missing(DOCUMENT, said), [])
        self.assertEqual(refusals.missing(DOCUMENT, said[:2]), ["no camera is ...; there are ..."])
        self.assertEqual(refusals.missing(DOCUMENT, said[1:]), ["It is gone"])

    def test_a_value_stands_for_a_placeholder(self):
        self.assertTrue(refusals.says("The camera does not accept Index", ["The camera does not accept %@ = %@."]))
        self.assertFalse(refusals.says("The camera does not take Index", ["The camera does not accept %@ = %@."]))
        self.assertFalse(refusals.says("The camera", ["%@ = %@."]))


if __name__ == "__main__":
    unittest.main()
