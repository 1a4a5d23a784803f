"""Completion through bash and its script, and the candidates that zsh's script requests.

CTest passes the program in the environment.
"""

import os
import pathlib
import shutil
import subprocess
import sys
import tempfile
import unittest

PROGRAM = os.environ["QUAZOR_PROGRAM"]

BASH = r"""
source "$1"; shift
COMP_WORDS=("$@"); COMP_CWORD=$(($# - 1)); COMP_LINE="$*"; COMP_POINT=${#COMP_LINE}
_quazor
printf '%s\n' "${COMPREPLY[@]}"
"""


class CompletionTest(unittest.TestCase):
    def setUp(self):
        directory = tempfile.TemporaryDirectory()
        self.addCleanup(directory.cleanup)
        self.script = pathlib.Path(directory.name) / "script"
        self.environment = dict(os.environ, PATH=f"{pathlib.Path(PROGRAM).parent}:{os.environ['PATH']}")

    def complete(self, *words):
        """The candidates that bash offers for the last word."""
        self.script.write_text(subprocess.run([PROGRAM, "completion", "bash"], capture_output=True, text=True,
                                              check=True).stdout)
        result = subprocess.run(["bash", "-c", BASH, "bash", str(self.script), "quazor", *words], capture_output=True,
                                text=True, env=self.environment, timeout=300, check=False)
        return result.stdout.split()

    def test_commands(self):
        self.assertEqual(self.complete("ve"), ["verify"])
        self.assertIn("experiment", self.complete(""))

    def test_names_of_what_the_command_runs(self):
        self.assertEqual(self.complete("run", "Camera"), ["CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front"])
        self.assertEqual(self.complete("experiment", "TesselT"), ["TesselTelemonExperiment"])
        self.assertEqual(self.complete("run", "TesselTelemonE"), [])
        self.assertIn("TesselTelemonExperiment", self.complete("describe", "Tessel"))

    def test_options_of_the_command(self):
        self.assertEqual(self.complete("run", "--form"), ["--format"])
        self.assertEqual(self.complete("verify", "--form"), [])

    def test_values(self):
        self.assertEqual(self.complete("run", "--format", "j"), ["json", "junit"])
        self.assertEqual(self.complete("run", "--output", "t"), ["text:", "trace:"])
        self.assertEqual(self.complete("run", "--output", "h"), ["html:"])
        self.assertEqual(self.complete("run", "--log-level", "de"), ["default", "debug"])
        self.assertEqual(self.complete("run", "--deadline", "te"), ["teardown="])
        self.assertEqual(self.complete("run", "--only", ""), ["failed"])
        self.assertEqual(self.complete("run", "--log-limit", ""), ["none"])
        self.assertEqual(self.complete("run", "--log-lim"), ["--log-limit"])
        self.assertEqual(self.complete("run", "--trace", "frames"), ["frames", "frames=all"])
        self.assertEqual(self.complete("run", "TesselFaultDiagnostic", "--set", ""), ["frameCount=", "timeout="])
        self.assertIn("camera_sync/frames_dropped", self.complete("run", "--phone", "camera_sync/fr"))
        self.assertEqual(self.complete("completion", "z"), ["zsh"])

    def test_nothing_where_any_file_may_stand(self):
        self.assertEqual(self.complete("verify", ""), [])
        self.assertEqual(self.complete("run", "--record", ""), [])

    def test_a_plug_in_that_cannot_be_loaded_leaves_names_out(self):
        self.assertEqual(self.complete("run", "--plugin", "nowhere.so", "Camera"), [])

    @unittest.skipUnless(shutil.which("zsh"), "zsh is not installed")
    def test_the_script_for_zsh_is_one(self):
        script = subprocess.run([PROGRAM, "completion", "zsh"], capture_output=True, text=True, check=True).stdout
        subprocess.run(["zsh", "-n", "-c", script], check=True)


if __name__ == "__main__":
    sys.exit(unittest.main())
