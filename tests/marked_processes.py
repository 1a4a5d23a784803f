"""Identifies processes by a marker in their environment, which their children inherit."""

import contextlib
import os
import pathlib
import signal
import uuid

VARIABLE = "QUAZOR_TEST_MARKER"


def environment_with_marker(**variables):
    """The environment of this process with additional variables and a new marker."""
    return dict(os.environ, **variables, **{VARIABLE: uuid.uuid4().hex})


def processes_in(environment):
    """The IDs of the processes that have the environment's marker."""
    wanted = f"{VARIABLE}={environment[VARIABLE]}".encode()
    found = []
    for process in pathlib.Path("/proc").glob("[0-9]*"):
        with contextlib.suppress(OSError):  # the process has ended in the meantime
            if wanted in (process / "environ").read_bytes().split(b"\0"):
                found.append(int(process.name))
    return found


def end_processes(processes):
    """Kills processes that a program has left behind."""
    for process in processes:
        with contextlib.suppress(ProcessLookupError):
            os.kill(process, signal.SIGKILL)
