#!/usr/bin/env python3
"""Tests tests/tree/include_directions.py with small trees, one per rule."""

import unittest

import include_directions
from made_up_tree import made_up_tree, run_over

TREE = [
    "contract/value.h", "platform/clock.h", "diagnostics/camera_sync/names.h", "diagnostics/report_channels/names.h", "diagnostics/projector_fault/fault.h",
    "diagnostics/sensor_images/image.h", "base/json/file.h", "backends/threads/queue.h", "backends/simulated/phone.h",
    "backends/simulated/time/fiber.h", "backends/linux/camera.h", "backends/linux/video/node.h", "host/model/judge.h",
    "host/run/deadlines.h", "host/testing/values.h", "tests/helper.h", "contract/table.inc",
    "platform/clock_for_tests.h",
]


def found_in(path, line, extra=()):
    """The violations in a tree whose one interesting file, `path`, holds `line`."""
    with made_up_tree({**dict.fromkeys([*TREE, *extra], "#pragma once\n"), path: f"// A file.\n{line}\n"}) as root:
        return include_directions.violations(root)


class AllowedTest(unittest.TestCase):
    CASES = [
        ("contract/a.cpp", '#include "contract/value.h"'),
        ("contract/a.cpp", "#include <vector>"),
        ("plugins/camera_sensor_diagnostics.cpp", '#include "diagnostics/camera_sync/names.h"'),
        ("plugins/camera_sensor_diagnostics.cpp", '#include "platform/clock.h"'),
        ("platform/a.h", '#include "contract/value.h"'),
        ("diagnostics/camera_sync/a.cpp", '#include "platform/clock.h"'),
        ("diagnostics/projector_fault/a.cpp", '#include "diagnostics/report_channels/names.h"'),
        ("backends/simulated/a.cpp", '#include "backends/threads/queue.h"'),
        ("backends/simulated/a.cpp", "#include <nlohmann/json.hpp>"),
        ("backends/simulated/scenario/a.cpp", '#include "base/json/file.h"'),
        ("backends/linux/binding/a.cpp", '#include "base/json/file.h"'),
        ("backends/simulated/hid/a_test.cpp", '#include "backends/simulated/phone.h"'),
        ("host/device/a.cpp", '#include "backends/linux/camera.h"'),
        ("host/run/a.cpp", '#include "host/model/judge.h"'),
        ("host/model/a_test.cpp", '#include "host/run/deadlines.h"'),
        ("host/model/a_test.cpp", '#include "host/testing/values.h"'),
        ("backends/simulated/a.cpp", '#include "backends/simulated/time/fiber.h"'),
        ("diagnostics/camera_sync/a_test.cpp", '#include "backends/simulated/phone.h"'),
        ("diagnostics/camera_sync/a_test.cpp", "#include <gtest/gtest.h>"),
        ("diagnostics/camera_sync/a_test.cpp", '#include "tests/helper.h"'),
        ("platform/clock_conformance.h", "#include <gtest/gtest.h>"),
        ("tests/a.cpp", '#include "host/model/judge.h"'),
        ("tests/a.cpp", '#include "platform/clock_for_tests.h"'),
        ("platform/a_test.cpp", '#include "platform/clock_for_tests.h"'),
        ("benchmarks/a.cpp", '#include "tests/helper.h"'),
        ("contract/a.cpp", '#include "contract/table.inc"'),
        ("contract/a.cpp", '// #include "host/model/judge.h"'),
        ("contract/a.cpp", '#  include  "contract/value.h"  // why'),
        ("build/a.cpp", '#include "nowhere.h"'),
        (".hidden/a.cpp", '#include "nowhere.h"'),
    ]

    def test_what_the_rules_allow_passes(self):
        for path, line in self.CASES:
            with self.subTest(path=path, line=line):
                self.assertEqual(found_in(path, line), [])


class RefusedTest(unittest.TestCase):
    CASES = [
        ("contract/a.cpp", '#include "platform/clock.h"', "contract/ must not include platform/"),
        ("contract/a.cpp", '#include "diagnostics/camera_sync/names.h"', "contract/ must not include diagnostics/camera_sync/"),
        ("contract/a.cpp", '  #  include "host/model/judge.h"', "contract/ must not include host/model/"),
        ("plugins/camera_sensor_diagnostics.cpp", '#include "host/model/judge.h"', "plugins/ must not include host/model/"),
        ("platform/a.cpp", '#include "diagnostics/camera_sync/names.h"', "platform/ must not include diagnostics/camera_sync/"),
        ("platform/catalogue.cpp", '#include "diagnostics/camera_sync/names.h"', "platform/ must not include diagnostics/camera_sync/"),
        ("diagnostics/camera_sync/a.cpp", '#include "diagnostics/report_channels/names.h"', "must not include diagnostics/report_channels/"),
        ("diagnostics/report_channels/a.cpp", '#include "diagnostics/projector_fault/fault.h"', "must not include diagnostics/projector_fault/"),
        ("diagnostics/projector_fault/a.cpp", '#include "diagnostics/camera_sync/names.h"', "must not include diagnostics/camera_sync/"),
        ("diagnostics/sensor_images/a.cpp", '#include "diagnostics/report_channels/names.h"', "must not include diagnostics/report_channels/"),
        ("diagnostics/camera_sync/a.cpp", '#include "backends/threads/queue.h"', "must not include backends/threads/"),
        ("diagnostics/camera_sync/a.cpp", '#include "tests/helper.h"', "must not include tests/"),
        ("backends/threads/a.cpp", '#include "diagnostics/camera_sync/names.h"', "must not include diagnostics/camera_sync/"),
        ("backends/threads/a.cpp", '#include "backends/simulated/phone.h"', "must not include backends/simulated/"),
        ("backends/linux/a.cpp", '#include "backends/simulated/phone.h"', "must not include backends/simulated/"),
        ("backends/simulated/a.cpp", '#include "backends/linux/camera.h"', "must not include backends/linux/"),
        ("backends/simulated/a.cpp", '#include "host/model/judge.h"', "must not include host/"),
        ("base/json/a.cpp", '#include "backends/simulated/phone.h"', "must not include backends/simulated/"),
        ("backends/threads/a.cpp", '#include "base/json/file.h"', "must not include base/json/"),
        ("backends/simulated/time/a.cpp", '#include "backends/simulated/phone.h"', "must not include backends/simulated/"),
        ("backends/linux/video/a.cpp", '#include "backends/linux/camera.h"', "must not include backends/linux/"),
        ("host/model/a.cpp", '#include "host/run/deadlines.h"', "host/model/ must not include host/run/"),
        ("host/model/a.cpp", '#include "host/testing/values.h"', "host/model/ must not include host/testing/"),
        ("host/model/a.cpp", '#include "backends/linux/camera.h"', "host/model/ must not include backends/linux/"),
        ("host/a.cpp", '#include "diagnostics/camera_sync/names.h"', "host/ must not include diagnostics/camera_sync/"),
        ("host/a_test.cpp", '#include "diagnostics/camera_sync/names.h"', "host/ must not include diagnostics/camera_sync/"),
        ("diagnostics/camera_sync/a_test.cpp", '#include "diagnostics/report_channels/names.h"', "must not include diagnostics/report_channels/"),
        ("diagnostics/camera_sync/a_test.cpp", '#include "host/model/judge.h"', "must not include host/"),
        ("backends/threads/a_test.cpp", '#include "backends/simulated/phone.h"', "must not include"),
        ("examples/lamp/a.cpp", '#include "diagnostics/camera_sync/names.h"', "examples/ must not include diagnostics/camera_sync/"),
        ("contract/a.cpp", '#include "value.h"', "no file of the tree"),
        ("contract/a.cpp", '#include "contract/missing.h"', "no file of the tree"),
        ("contract/a.cpp", '#include "contract/../host/judge.h"', "no file of the tree"),
        ("platform/a.cpp", '#include "platform/clock_for_tests.h"', "is for tests only"),
        ("contract/a.cpp", "#include NAME", "names no file: NAME"),
        ("contract/a.cpp", "#include <unistd.h>", "<unistd.h> is not of the standard library"),
        ("platform/a.h", "#include <nlohmann/json.hpp>", "is not of the standard library"),
        ("diagnostics/sensor_images/a.cpp", "#include <gtest/gtest.h>", "is not of the standard library"),
        ("newcomer/a.cpp", "", "no rule says"),
        ("host/newcomer/a.cpp", "", "no rule says"),
        ("stray.cpp", "", "no rule says"),
    ]

    def test_each_kind_of_violation_is_found_once_and_named(self):
        for path, line, expected in self.CASES:
            with self.subTest(path=path, line=line):
                found = found_in(path, line)
                self.assertEqual(len(found), 1, found)
                self.assertTrue(found[0].startswith(path), found)
                self.assertIn(expected, found[0])

    def test_folders_that_include_each_other_are_found(self):
        cycle_in = include_directions.cycle_in
        self.assertEqual(cycle_in({"a": ["b"], "b": ["c"], "c": ["b"]}), ["b", "c", "b"])
        self.assertEqual(cycle_in({"a": ["b", "c"], "b": ["c"], "c": []}), [])

    def test_a_violation_names_its_line(self):
        self.assertTrue(found_in("contract/a.cpp", '#include "host/model/judge.h"')[0].startswith("contract/a.cpp:2: "))


class CommandTest(unittest.TestCase):
    def test_a_clean_tree_exits_with_0(self):
        result = run_over(include_directions, {"contract/a.h": "#include <string>\n"})
        self.assertEqual((result.returncode, result.stdout), (0, "1 files, 0 violations\n"))

    def test_a_violation_exits_with_1(self):
        result = run_over(include_directions, {"contract/a.h": "#include <unistd.h>\n"})
        self.assertEqual(result.returncode, 1)
        self.assertIn("contract/a.h:1: <unistd.h>", result.stdout)

    def test_a_tree_without_sources_is_no_success(self):
        self.assertEqual(run_over(include_directions, {"README.md": ""}).returncode, 1)


if __name__ == "__main__":
    unittest.main()
