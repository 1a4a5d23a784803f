#!/usr/bin/env python3
"""Feeds tests/include_directions.py small made-up trees, one per rule."""

import pathlib
import subprocess
import sys
import tempfile
import unittest

import include_directions

TREE = [
    "frame/value.h", "platform/clock.h", "camera_sync/names.h", "report_channels/names.h", "projector_fault/fault.h",
    "sensor_images/image.h", "backends/json/file.h", "backends/threads/queue.h", "backends/simulated/phone.h",
    "backends/linux/camera.h", "host/judge.h", "tests/helper.h", "frame/table.inc", "platform/clock_for_tests.h",
]


def found_in(path, line, extra=()):
    """The violations in a tree whose one interesting file, `path`, holds `line`."""
    with tempfile.TemporaryDirectory() as directory:
        root = pathlib.Path(directory)
        for name in [*TREE, *extra]:
            (root / name).parent.mkdir(parents=True, exist_ok=True)
            (root / name).write_text("#pragma once\n")
        (root / path).parent.mkdir(parents=True, exist_ok=True)
        (root / path).write_text(f"// A file.\n{line}\n")
        return include_directions.violations(root)


class AllowedTest(unittest.TestCase):
    CASES = [
        ("frame/a.cpp", '#include "frame/value.h"'),
        ("frame/a.cpp", "#include <vector>"),
        ("frame/catalogue.cpp", '#include "camera_sync/names.h"'),
        ("frame/catalogue.cpp", '#include "platform/clock.h"'),
        ("platform/a.h", '#include "frame/value.h"'),
        ("camera_sync/a.cpp", '#include "platform/clock.h"'),
        ("projector_fault/a.cpp", '#include "report_channels/names.h"'),
        ("backends/simulated/a.cpp", '#include "backends/threads/queue.h"'),
        ("backends/simulated/a.cpp", "#include <nlohmann/json.hpp>"),
        ("backends/simulated/a.cpp", '#include "backends/json/file.h"'),
        ("backends/linux/a.cpp", '#include "backends/json/file.h"'),
        ("backends/simulated/parts/a.cpp", '#include "backends/simulated/phone.h"'),
        ("host/a.cpp", '#include "backends/linux/camera.h"'),
        ("camera_sync/a_test.cpp", '#include "backends/simulated/phone.h"'),
        ("camera_sync/a_test.cpp", "#include <gtest/gtest.h>"),
        ("camera_sync/a_test.cpp", '#include "tests/helper.h"'),
        ("platform/clock_conformance.h", "#include <gtest/gtest.h>"),
        ("tests/a.cpp", '#include "host/judge.h"'),
        ("tests/a.cpp", '#include "platform/clock_for_tests.h"'),
        ("platform/a_test.cpp", '#include "platform/clock_for_tests.h"'),
        ("benchmarks/a.cpp", '#include "tests/helper.h"'),
        ("frame/a.cpp", '#include "frame/table.inc"'),
        ("frame/a.cpp", '// #include "host/judge.h"'),
        ("frame/a.cpp", '#  include  "frame/value.h"  // why'),
        ("build/a.cpp", '#include "nowhere.h"'),
        (".hidden/a.cpp", '#include "nowhere.h"'),
    ]

    def test_what_the_rules_allow_passes(self):
        for path, line in self.CASES:
            with self.subTest(path=path, line=line):
                self.assertEqual(found_in(path, line), [])


class RefusedTest(unittest.TestCase):
    CASES = [
        ("frame/a.cpp", '#include "platform/clock.h"', "frame/ must not include platform/"),
        ("frame/a.cpp", '#include "camera_sync/names.h"', "frame/ must not include camera_sync/"),
        ("frame/a.cpp", '  #  include "host/judge.h"', "frame/ must not include host/"),
        ("frame/catalogue.cpp", '#include "host/judge.h"', "frame/ must not include host/"),
        ("platform/a.cpp", '#include "camera_sync/names.h"', "platform/ must not include camera_sync/"),
        ("platform/catalogue.cpp", '#include "camera_sync/names.h"', "platform/ must not include camera_sync/"),
        ("camera_sync/a.cpp", '#include "report_channels/names.h"', "must not include report_channels/"),
        ("report_channels/a.cpp", '#include "projector_fault/fault.h"', "must not include projector_fault/"),
        ("projector_fault/a.cpp", '#include "camera_sync/names.h"', "must not include camera_sync/"),
        ("sensor_images/a.cpp", '#include "report_channels/names.h"', "must not include report_channels/"),
        ("camera_sync/a.cpp", '#include "backends/threads/queue.h"', "must not include backends/threads/"),
        ("camera_sync/a.cpp", '#include "tests/helper.h"', "must not include tests/"),
        ("backends/threads/a.cpp", '#include "camera_sync/names.h"', "must not include camera_sync/"),
        ("backends/threads/a.cpp", '#include "backends/simulated/phone.h"', "must not include backends/simulated/"),
        ("backends/linux/a.cpp", '#include "backends/simulated/phone.h"', "must not include backends/simulated/"),
        ("backends/simulated/a.cpp", '#include "backends/linux/camera.h"', "must not include backends/linux/"),
        ("backends/simulated/a.cpp", '#include "host/judge.h"', "must not include host/"),
        ("backends/json/a.cpp", '#include "backends/simulated/phone.h"', "must not include backends/simulated/"),
        ("backends/threads/a.cpp", '#include "backends/json/file.h"', "must not include backends/json/"),
        ("host/a.cpp", '#include "camera_sync/names.h"', "host/ must not include camera_sync/"),
        ("host/a_test.cpp", '#include "camera_sync/names.h"', "host/ must not include camera_sync/"),
        ("camera_sync/a_test.cpp", '#include "report_channels/names.h"', "must not include report_channels/"),
        ("camera_sync/a_test.cpp", '#include "host/judge.h"', "must not include host/"),
        ("backends/threads/a_test.cpp", '#include "backends/simulated/phone.h"', "must not include"),
        ("examples/lamp/a.cpp", '#include "camera_sync/names.h"', "examples/ must not include camera_sync/"),
        ("frame/a.cpp", '#include "value.h"', "no file of the tree"),
        ("frame/a.cpp", '#include "frame/missing.h"', "no file of the tree"),
        ("frame/a.cpp", '#include "frame/../host/judge.h"', "no file of the tree"),
        ("platform/a.cpp", '#include "platform/clock_for_tests.h"', "is for tests only"),
        ("frame/a.cpp", "#include NAME", "names no file: NAME"),
        ("frame/a.cpp", "#include <unistd.h>", "<unistd.h> is not of the standard library"),
        ("platform/a.h", "#include <nlohmann/json.hpp>", "is not of the standard library"),
        ("sensor_images/a.cpp", "#include <gtest/gtest.h>", "is not of the standard library"),
        ("newcomer/a.cpp", "", "no rule says"),
        ("stray.cpp", "", "no rule says"),
    ]

    def test_each_kind_of_violation_is_found_once_and_named(self):
        for path, line, expected in self.CASES:
            with self.subTest(path=path, line=line):
                found = found_in(path, line)
                self.assertEqual(len(found), 1, found)
                self.assertTrue(found[0].startswith(path), found)
                self.assertIn(expected, found[0])

    def test_a_violation_names_its_line(self):
        self.assertTrue(found_in("frame/a.cpp", '#include "host/judge.h"')[0].startswith("frame/a.cpp:2: "))


class CommandTest(unittest.TestCase):
    def run_over(self, files):
        with tempfile.TemporaryDirectory() as directory:
            for name, text in files.items():
                path = pathlib.Path(directory, name)
                path.parent.mkdir(parents=True, exist_ok=True)
                path.write_text(text)
            program = pathlib.Path(include_directions.__file__)
            return subprocess.run([sys.executable, program, directory], capture_output=True, text=True, check=False)

    def test_a_clean_tree_exits_with_0(self):
        result = self.run_over({"frame/a.h": "#include <string>\n"})
        self.assertEqual((result.returncode, result.stdout), (0, "1 files, 0 violations\n"))

    def test_a_violation_exits_with_1(self):
        result = self.run_over({"frame/a.h": "#include <unistd.h>\n"})
        self.assertEqual(result.returncode, 1)
        self.assertIn("frame/a.h:1: <unistd.h>", result.stdout)

    def test_a_tree_without_sources_is_no_success(self):
        self.assertEqual(self.run_over({"README.md": ""}).returncode, 1)


if __name__ == "__main__":
    unittest.main()
