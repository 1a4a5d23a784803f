"""Trees of made-up files for the tests of this folder's checks."""

import contextlib
import pathlib
import subprocess
import sys
import tempfile


@contextlib.contextmanager
def made_up_tree(files):
    """A directory with the files, a dictionary of their names and texts; gone at the end."""
    with tempfile.TemporaryDirectory() as directory:
        for name, text in files.items():
            path = pathlib.Path(directory, name)
            path.parent.mkdir(parents=True, exist_ok=True)
            path.write_text(text, encoding="utf-8")
        yield pathlib.Path(directory)


def run_over(check, files):
    """Runs the module of a check over such a tree."""
    with made_up_tree(files) as root:
        return subprocess.run([sys.executable, check.__file__, root], capture_output=True, text=True, check=False)
