#!/usr/bin/env python3
"""Tests of the cache of kernels, without a package."""

import json
import pathlib
import tempfile
import unittest

import kernel_package


class CacheTest(unittest.TestCase):
    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.cache = pathlib.Path(scratch.name)

    def add(self, name, modules=None):
        """A directory of the cache with these groups of modules; None: it was never completed."""
        directory = self.cache / name
        directory.mkdir()
        (directory / "vmlinux").write_bytes(b"")
        if modules is not None:
            order = {group: {"wanted": wanted, "files": ["first.ko", *(f"{module}.ko" for module in wanted)]}
                     for group, wanted in modules.items()}
            (directory / "modules.json").write_text(json.dumps(order))
        return directory

    def test_a_kernel_has_its_modules_by_group(self):
        kernel = kernel_package.kernel_of(self.add("linux_1", kernel_package.MODULES))
        self.assertEqual(kernel.name, "linux_1")
        self.assertEqual(set(kernel.modules), set(kernel_package.MODULES))
        self.assertEqual(kernel.modules["usb"][0], self.cache / "linux_1/modules/first.ko")

    def test_an_incomplete_one_and_one_of_other_modules_are_none(self):
        fewer = {group: modules[1:] for group, modules in kernel_package.MODULES.items()}
        without_a_group = {"usb": kernel_package.MODULES["usb"]}
        self.assertIsNone(kernel_package.kernel_of(self.cache / "absent"))
        self.assertIsNone(kernel_package.kernel_of(self.add("linux_1")))
        self.assertIsNone(kernel_package.kernel_of(self.add("linux_2", fewer)))
        self.assertIsNone(kernel_package.kernel_of(self.add("linux_3", without_a_group)))
        self.assertIsNone(kernel_package.newest_cached(self.cache))

    def test_the_newest_complete_one_is_found(self):
        self.add("linux_1", kernel_package.MODULES)
        self.add("linux_2")
        self.assertEqual(kernel_package.newest_cached(self.cache).name, "linux_1")


if __name__ == "__main__":
    unittest.main()
