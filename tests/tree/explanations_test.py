#!/usr/bin/env python3
"""Tests tests/tree/explanations.py with small explanations: it finds each kind of problem and nothing else."""

import copy
import json
import pathlib
import shutil
import tempfile
import unittest

import explanations
from error_codes import Error

SCHEMA = pathlib.Path(__file__).resolve().parents[2] / "data" / "explanations" / "explanations.schema.json"

TEXTS = {"title": "T", "meaning": "M", "causes": ["C"], "next": ["N"]}
ERROR = {"domain": "D", "code": 1, "symbols": ["kA"], **TEXTS,
         "messages": [{"text": "no ... at ...!", "from": ["TesselFaultDiagnostic"]}]}
RETURNED = Error("diagnostics/projector_fault/a.cpp", "D", 1, "kA", "no %@ at %lu!")
HOST_ERROR = {"domain": "H", "code": 1, **TEXTS}
HOST_RETURNED = Error("host/a.h", "H", 1, None, None)
NAMES = [{"names": ["Lamp"], "kind": "diagnostic", **TEXTS}, {"names": ["Light", "Warmth"], "kind": "result",
                                                              "from": ["Lamp"], **TEXTS}]
REGISTERED = {"diagnostic": ["Lamp"], "experiment": []}
RESULTS = {"Lamp": {"Light", "Warmth"}}


def changed(entry, **changes):
    return {**copy.deepcopy(entry), **changes}


class ErrorProblemsTest(unittest.TestCase):
    def problems(self, entries, errors):
        return explanations.error_problems([*entries, HOST_ERROR], [*errors, HOST_RETURNED])

    def test_what_is_right_passes(self):
        self.assertEqual(self.problems([ERROR, *NAMES], [RETURNED]), [])

    def test_each_problem_is_found(self):
        message = ERROR["messages"][0]
        other = Error("diagnostics/report_channels/b.cpp", "D", 1, "kA", "no %@ at %lu!")
        for name, entries, errors, expected in [
            ("a code without an explanation", [], [RETURNED],
             "D:1 has no explanation; diagnostics/projector_fault/a.cpp returns it"),
            ("an explanation of nothing", [ERROR], [], "D:1 is explained, but nothing returns it"),
            ("another symbol", [changed(ERROR, symbols=["kB"])], [RETURNED], "D:1: its symbols are ['kA'], not ['kB']"),
            ("no symbol", [{key: value for key, value in ERROR.items() if key != "symbols"}], [RETURNED],
             "D:1: its symbols are ['kA'], not []"),
            ("a message that is missing", [changed(ERROR, messages=[])], [RETURNED],
             "D:1: the message 'no ... at ...!' is missing"),
            ("a message that nothing gives", [changed(ERROR, messages=[message, changed(message, text="x")])],
             [RETURNED], "D:1: nothing gives the message 'x'"),
            ("a message from somebody else", [changed(ERROR, messages=[changed(message, **{"from": ["Lamp"]})])],
             [RETURNED], "D:1: the message 'no ... at ...!' is from TesselFaultDiagnostic"),
            ("a message from one of two", [ERROR], [RETURNED, other],
             "D:1: the message 'no ... at ...!' is from TesselFaultDiagnostic, TesselTelemonDiagnostic"),
            ("a message that cannot be followed", [ERROR], [Error("diagnostics/projector_fault/a.cpp", "D", 1, "kA", None)],
             "D:1: diagnostics/projector_fault/a.cpp makes it with a message that cannot be followed"),
        ]:
            with self.subTest(name):
                self.assertEqual(self.problems(entries, errors), [expected])


class TemplateProblemsTest(unittest.TestCase):
    OWN = Error(f"{explanations.TEMPLATE_FOLDER}/a.cpp", "D", 1, "kA", "no %@!")
    SHARED = Error(f"{explanations.TEMPLATE_FOLDER}/a.cpp", explanations.SHARED_DOMAIN, 5, "kB", None)
    ENTRY = changed(ERROR, messages=[{"text": "no ...!", "from": ["EventCountDiagnostic"]}])

    def test_its_own_errors_are_explained(self):
        self.assertEqual(explanations.template_problems([self.ENTRY, *NAMES], [self.OWN, self.SHARED]), [])

    def test_each_problem_is_found(self):
        self.assertEqual(explanations.template_problems(NAMES, [self.OWN]),
                         [f"D:1 has no explanation; {explanations.TEMPLATE_FOLDER}/a.cpp returns it"])
        self.assertEqual(explanations.template_problems([], [self.SHARED]), ["the template returns no error of its own"])


class NameProblemsTest(unittest.TestCase):
    def test_what_is_right_passes(self):
        self.assertEqual(explanations.name_problems([ERROR, *NAMES], REGISTERED, RESULTS), [])

    def test_each_problem_is_found(self):
        lamp, light = NAMES
        for name, entries, registered, results, expected in [
            ("a name without an explanation", [light], REGISTERED, RESULTS, "the diagnostic 'Lamp' has no explanation"),
            ("a result without an explanation", NAMES, REGISTERED, {"Lamp": {"Light", "Warmth", "Hum"}},
             "the result 'Hum' has no explanation"),
            ("an explanation of no name", NAMES, {"diagnostic": []}, RESULTS,
             "'Lamp' is explained, but there is no such name"),
            ("an explanation of no result", NAMES, REGISTERED, {"Lamp": {"Light"}},
             "'Warmth' is explained, but there is no such name"),
            ("another kind", [changed(lamp, kind="analysis"), light], REGISTERED, RESULTS,
             "'Lamp' is of the kind diagnostic, not analysis"),
            ("a result of somebody else", [lamp, changed(light, **{"from": ["Oven"]})], REGISTERED, RESULTS,
             "'Light' is a result of Lamp"),
        ]:
            with self.subTest(name):
                self.assertEqual(explanations.name_problems(entries, registered, results), [expected])


class CommandProblemsTest(unittest.TestCase):
    def problems(self, text):
        return explanations.command_problems([ERROR, *NAMES, changed(HOST_ERROR, next=[text])])

    def test_commands_for_what_there_is_pass(self):
        for text in ["Run `quazor run Lamp --set x=3`.", "`quazor run --all`", "`quazor run NAME`", "`df -h`",
                     "`quazor explain D:1`, `quazor explain \"Warmth\"`", "`quazor explain DOMAIN:CODE`",
                     "`quazor explain`"]:
            with self.subTest(text):
                self.assertEqual(self.problems(text), [])

    def test_each_problem_is_found(self):
        for text, expected in [
            ("`quazor run Lmap`", "H:1: 'quazor run Lmap' asks for what there is not"),
            ("`quazor run Light`", "H:1: 'quazor run Light' asks for what there is not"),
            ("`quazor run D:1`", "H:1: 'quazor run D:1' asks for what there is not"),
            ("`quazor experiment Lamp`", "H:1: 'quazor experiment Lamp' asks for what there is not"),
            ("`quazor explain D:2`", "H:1: 'quazor explain D:2' asks for what there is not"),
            ("`quazor ecplain D:1`", "H:1: there is no command 'ecplain'"),
            ("`quazor explain", "H:1: a back quote has no end: `quazor explain"),
        ]:
            with self.subTest(text):
                self.assertEqual(self.problems(text), [expected])


class ReadTest(unittest.TestCase):
    def read(self, content):
        with tempfile.TemporaryDirectory() as directory:
            folder = pathlib.Path(directory)
            shutil.copy(SCHEMA, folder)
            (folder / "a.json").write_text(json.dumps(content))
            return explanations.read(folder, folder / "explanations.schema.json")

    def test_a_file_of_errors_is_read_with_their_domain(self):
        self.assertEqual(self.read({"schema": 1, "domain": "D", "errors": [{"code": 1, **TEXTS}]}),
                         ([{"domain": "D", "code": 1, **TEXTS}], []))

    def test_a_file_of_names_is_read(self):
        self.assertEqual(self.read({"schema": 1, "names": NAMES}), (NAMES, []))

    def test_what_the_schema_refuses_is_found(self):
        error = {"code": 1, **TEXTS}
        for name, content in [
            ("no next step", {"schema": 1, "domain": "D", "errors": [changed(error, next=[])]}),
            ("no steps at all", {"schema": 1, "domain": "D", "errors": [{"code": 1, "title": "T", "meaning": "M",
                                                                         "causes": ["C"]}]}),
            ("no cause", {"schema": 1, "domain": "D", "errors": [changed(error, causes=[])]}),
            ("a blank at the end", {"schema": 1, "domain": "D", "errors": [changed(error, title="T ")]}),
            ("two lines", {"schema": 1, "domain": "D", "errors": [changed(error, meaning="M\nN")]}),
            ("a title that is too long", {"schema": 1, "domain": "D", "errors": [changed(error, title="T" * 75)]}),
            ("an unknown key", {"schema": 1, "domain": "D", "errors": [changed(error, cause="C")]}),
            ("a result of nothing", {"schema": 1, "names": [{"names": ["Light"], "kind": "result", **TEXTS}]}),
            ("a diagnostic of something", {"schema": 1, "names": [changed(NAMES[0], **{"from": ["D"]})]}),
            ("errors without a domain", {"schema": 1, "errors": []}),
            ("errors and names", {"schema": 1, "domain": "D", "errors": [], "names": []}),
            ("another schema", {"schema": 2, "names": []}),
        ]:
            with self.subTest(name):
                entries, found = self.read(content)
                self.assertEqual(entries, [])
                self.assertEqual(len(found), 1, found)
                self.assertTrue(found[0].startswith("a.json: $"), found)


if __name__ == "__main__":
    unittest.main()
