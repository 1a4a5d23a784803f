#!/usr/bin/env python3
"""Runs a test program's locale tests under a locale that writes a decimal comma.

    under_comma_locale.py TEST_PROGRAM

Machines often lack such a locale, so it is compiled for the run with localedef from Debian's package locales.
Exits with 77, which CTest shows as a skipped test, if that is not possible.
"""

import os
import pathlib
import shutil
import subprocess
import sys
import tempfile

SKIPPED = 77


def main():
    localedef = shutil.which("localedef")
    with tempfile.TemporaryDirectory() as directory:
        locale = pathlib.Path(directory, "de_DE.UTF-8")
        made = localedef and subprocess.run([localedef, "-i", "de_DE", "-f", "UTF-8", locale], check=False,
                                            capture_output=True).returncode == 0
        if not made:
            print("no locale with a decimal comma can be compiled here; Debian's package locales has the sources")
            return SKIPPED
        result = subprocess.run([sys.argv[1], "--gtest_filter=LocaleTest.*"], env={**os.environ, "LOCPATH": directory},
                                capture_output=True, text=True, check=False)
    print(result.stdout + result.stderr)
    if "SKIPPED" in result.stdout or "[  PASSED  ] 2 tests." not in result.stdout:
        return 1
    return result.returncode


if __name__ == "__main__":
    sys.exit(main())
