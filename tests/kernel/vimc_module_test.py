#!/usr/bin/env python3
"""Tests of building vimc, without a kernel's sources."""

import io
import pathlib
import tarfile
import tempfile
import types
import unittest

from kernel_package import KernelProblem
from vimc_module import find_vimc, packages_of, unpack_sources


def kernel_of(name, image=None):
    return types.SimpleNamespace(name=name, image=image)


class VimcModuleTest(unittest.TestCase):
    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.scratch = pathlib.Path(scratch.name)

    def archive(self, *names):
        path = self.scratch / "linux-source.tar.xz"
        with tarfile.open(path, "w:xz") as members:
            for name in names:
                member = tarfile.TarInfo(f"linux-source/{name}")
                member.size = len(name)
                members.addfile(member, io.BytesIO(name.encode()))
        return path

    def test_the_packages_are_those_of_the_kernel(self):
        packages, release = packages_of(kernel_of("linux-image-6.1.0-56-amd64_6.1.192-2"))
        self.assertEqual(release, "6.1.0-56-amd64")
        self.assertEqual(packages, ["linux-source-6.1=6.1.192-2", "linux-headers-6.1.0-56-amd64=6.1.192-2",
                                    "linux-headers-6.1.0-56-common=6.1.192-2", "linux-kbuild-6.1=6.1.192-2"])

    def test_a_package_of_another_name_is_refused(self):
        with self.assertRaisesRegex(KernelProblem, "is not named like a kernel package"):
            packages_of(kernel_of("vmlinux_1"))

    def test_only_the_sources_of_vimc_are_unpacked(self):
        folder = "drivers/media/test-drivers/"
        archive = self.archive(folder + "vicodec/a.c", folder + "vimc/Makefile", folder + "vimc/b.c", folder + "vivid/c.c")
        target = self.scratch / "vimc"
        target.mkdir()
        unpack_sources(archive, target)
        self.assertEqual(sorted(file.name for file in target.iterdir()), ["Makefile", "b.c"])
        self.assertEqual((target / "b.c").read_text(), folder + "vimc/b.c")

    def test_sources_without_vimc_are_refused(self):
        with self.assertRaisesRegex(KernelProblem, "linux-source.tar.xz has no drivers/media/test-drivers/vimc/"):
            unpack_sources(self.archive("drivers/media/a.c"), self.scratch)

    def test_a_built_module_is_not_built_again(self):
        module = self.scratch / "built/vimc.ko"
        module.parent.mkdir()
        module.write_bytes(b"module")
        said = []
        self.assertEqual(find_vimc(kernel_of("any", self.scratch / "vmlinux"), said.append), module)
        self.assertEqual(said, [])


if __name__ == "__main__":
    unittest.main()
