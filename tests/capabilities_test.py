#!/usr/bin/env python3
"""Checks that a plug-in has no more capabilities than its user.

    capabilities_test.py PROGRAM PLUGIN LIBRARY

PLUGIN is tests/misbehaving/capabilities_plugin.cpp, LIBRARY the contract's shared object. A copy of PROGRAM gets a
capability from its file, or from the process that starts it, and another user runs it. Needs root, and is skipped
where the system grants no capabilities.
"""

import os
import pathlib
import shutil
import struct
import subprocess
import sys
import tempfile
import unittest

OTHER_USER = 65534
PERFMON = 38
SKIPPED = 77
SETS = ("CapInh", "CapPrm", "CapEff", "CapBnd", "CapAmb")
RUN_PATH = b"$ORIGIN/../lib\0"  # a program with capabilities of its file ignores such a path


def file_capability(number):
    """The extended attribute security.capability (capabilities(7)): permitted and effective."""
    words = [0, 0]
    words[number // 32] = 1 << number % 32
    return struct.pack("<5I", 0x02000001, words[0], 0, words[1], 0)


def capabilities_in(text):
    return {line.split(":")[0]: int(line.split(":")[1], 16) for line in text.splitlines() if line.startswith("Cap")}


class Copies:
    """The program and the plug-in where the other user can run them."""

    def __init__(self, directory):
        self.directory = pathlib.Path(directory)
        self.directory.chmod(0o755)
        self.out = self.directory / "out"
        self.out.mkdir()
        self.out.chmod(0o777)
        self.plugin = self.copy(PLUGIN)
        library = self.copy(LIBRARY.resolve(), LIBRARY.name)
        self.run_path = pathlib.Path(f"/tmp/q{os.getpid():x}")  # not longer than the path that it replaces
        self.run_path.symlink_to(library.parent)
        content = PROGRAM.read_bytes()
        assert RUN_PATH in content
        self.program = self.directory / "quazor"
        self.program.write_bytes(content.replace(RUN_PATH, str(self.run_path).encode().ljust(len(RUN_PATH), b"\0")))
        self.program.chmod(0o755)
        self.phone = self.directory / "phone.json"
        self.phone.write_text('{"title": "No devices", "cameras": {}, "groups": {}, "faults": []}')
        self.cat = self.copy(pathlib.Path(shutil.which("cat")).resolve(), "cat")

    def copy(self, file, name=None):
        made = self.directory / (name or file.name)
        shutil.copyfile(file, made)
        made.chmod(0o755)
        return made

    def command(self, *options):
        return [str(self.program), "run", "TellCapabilities", "--plugin", str(self.plugin), "--profile", "none",
                "--phone", str(self.phone), *options]


class CapabilitiesTest(unittest.TestCase):
    def setUp(self):
        directory = tempfile.TemporaryDirectory()
        self.addCleanup(directory.cleanup)
        self.copies = Copies(directory.name)
        self.addCleanup(self.copies.run_path.unlink)

    def told_by(self, command, **options):
        """The capabilities at each moment at which the plug-in tells them."""
        state = self.copies.out / "state"
        state.unlink(missing_ok=True)
        environment = dict(os.environ, MISBEHAVIOUR_STATE=str(state), XDG_STATE_HOME=str(self.copies.out))
        done = subprocess.run(command, env=environment, cwd="/", capture_output=True, text=True, check=False, **options)
        self.assertTrue(state.exists(), done.stdout + done.stderr)
        told = {}
        for line in state.read_text().splitlines():
            when, name, value = line.replace(":", "").split()
            told.setdefault(when, []).append((name, int(value, 16)))
        self.assertEqual(set(told), {"load", "describe", "run"}, done.stdout + done.stderr)
        return told

    def assert_none(self, told):
        for when, sets in told.items():
            for name, value in sets:
                if name != "CapBnd":
                    self.assertEqual((when, name, value), (when, name, 0))

    def granted(self, command, **options):
        """Skips the test if a command that is granted capabilities has none."""
        done = subprocess.run(command, capture_output=True, text=True, check=False, **options)
        if capabilities_in(done.stdout).get("CapEff", 0) == 0:
            self.skipTest(f"the system grants no capabilities here: {done.stdout}{done.stderr}")

    def test_a_capability_of_the_programs_file_does_not_reach_plugins(self):
        for file in (self.copies.cat, self.copies.program):
            try:
                os.setxattr(file, "security.capability", file_capability(PERFMON))
            except OSError as refusal:
                self.skipTest(f"the file system takes no capabilities: {refusal}")
        user = {"user": OTHER_USER, "group": OTHER_USER, "extra_groups": []}
        self.granted([str(self.copies.cat), "/proc/self/status"], **user)
        for way in ([], ["--in-process"]):
            with self.subTest(way):
                self.assert_none(self.told_by(self.copies.command(*way), **user))

    def test_a_capability_of_the_starting_process_does_not_reach_plugins(self):
        if shutil.which("setpriv") is None:
            self.skipTest("there is no setpriv")
        grant = ["setpriv", f"--reuid={OTHER_USER}", f"--regid={OTHER_USER}", "--clear-groups", "--inh-caps=+perfmon",
                 "--ambient-caps=+perfmon", "--"]
        self.granted([*grant, "cat", "/proc/self/status"])
        for way in ([], ["--in-process"]):
            with self.subTest(way):
                self.assert_none(self.told_by([*grant, *self.copies.command(*way)]))

    def test_root_keeps_what_it_has(self):
        own = capabilities_in(pathlib.Path("/proc/self/status").read_text())
        for when, sets in self.told_by(self.copies.command()).items():
            self.assertEqual((when, dict(sets)), (when, {name: own[name] for name in SETS}))


if __name__ == "__main__":
    LIBRARY, PLUGIN, PROGRAM = (pathlib.Path(sys.argv.pop()) for _ in range(3))
    if os.geteuid() != 0:
        print("skipped: only root can grant capabilities")
        sys.exit(SKIPPED)
    unittest.main()
