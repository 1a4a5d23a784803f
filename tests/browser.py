"""Runs Debian's headless Chromium."""

import os
import shutil
import subprocess

BROWSER = shutil.which("chromium-headless-shell")
DARK = "--blink-settings=preferredColorScheme=0"


def browse(page, directory, *switches):
    """Opens the file; the browser keeps its own files in the directory. Returns what it printed."""
    result = subprocess.run([BROWSER, "--no-sandbox", "--disable-gpu", "--enable-logging=stderr", "--timeout=20000",
                             f"--user-data-dir={os.path.join(directory, 'browser')}", *switches, page.as_uri()],
                            capture_output=True, text=True, timeout=120)
    if result.returncode != 0:
        raise AssertionError(result.stderr)
    return result
