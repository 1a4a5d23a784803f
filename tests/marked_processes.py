"""Processes that are known by a marker in their environment, which their children inherit."""

import contextlib
import os
import pathlib
import signal
import uuid

VARIABLE = "QUAZOR_TEST_MARKER"


def environment_with_marker(**variables):
    """This process' environment with further variables and a new marker."""
    return dict(os.environ, **variables, **{VARIABLE: uuid.uuid4().hex})


def processes_in(environment):
    """The numbers of the processes that have the environment's marker."""
    wanted = f"{VARIABLE}={environment[VARIABLE]}".encode()
    found = []
    for process in pathlib.Path("/proc").glob("[0-9]*"):
        with contextlib.suppress(OSError):  # it has ended meanwhile
            if wanted in (process / "environ").read_bytes().split(b"\0"):
                found.append(int(process.name))
    return found


def end_processes(processes):
    """Ends what a program has left behind, which might stay for ever."""
    for process in processes:
        with contextlib.suppress(ProcessLookupError):
            os.kill(process, signal.SIGKILL)
