"""What an attack is, and how its outcome is told."""

import contextlib
import dataclasses
import os
import pathlib
import subprocess
import sys
import tempfile
import time

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parent.parent))
from marked_processes import end_processes, environment_with_marker, processes_in  # noqa: E402
from pace import slowdown  # noqa: E402

PATIENCE = 5.0  # seconds on an idle machine until the processes of a killed program are gone
LONGEST = 60.0  # seconds that a call may take on an idle machine


@dataclasses.dataclass
class Case:
    """One line of the table. `got` must be one of `expected`."""

    name: str
    expected: tuple
    got: str = ""

    @property
    def is_right(self):
        return self.got in self.expected


@dataclasses.dataclass
class Call:
    """The outcome of a call of the program."""

    code: int
    out: bytes
    err: bytes
    left: list
    was_too_slow: bool = False

    def problems(self):
        """What no attack may cause."""
        found = []
        if self.code < 0:
            found.append(f"ended by signal {-self.code}")
        if self.code == 70:
            found.append("failed itself")
        if self.left:
            found.append(f"left {len(self.left)} processes")
        if self.was_too_slow:
            found.append("was too slow")
        if b"\x1b" in self.out + self.err or b"\x00" in self.out + self.err:
            found.append("printed control characters")
        return found


class Bench:
    """Where the attacks take place."""

    def __init__(self, program, plugins, data):
        self.program = os.path.abspath(program)
        self.plugins, self.data = pathlib.Path(plugins).resolve(), pathlib.Path(data).resolve()

    @contextlib.contextmanager
    def folder(self):
        with tempfile.TemporaryDirectory(prefix="attack-") as name:
            yield pathlib.Path(name)

    def call(self, *arguments, state, variables=(), command=None, during=None, **options):
        """Calls the program. `command` may wrap it; `variables` replace those of the environment,
        None removes one. `during` gets the process that has just begun."""
        environment = environment_with_marker(XDG_STATE_HOME=str(state), QUAZOR_ATTACK_STATE=str(state))
        for name in ("QUAZOR_SET", "QUAZOR_TAGS", "QUAZOR_ATTACKS"):
            environment.pop(name, None)
        for name, value in dict(variables).items():
            environment.pop(name, None)
            if value is not None:
                environment[name] = value
        options.setdefault("stdin", subprocess.DEVNULL)
        options.setdefault("stdout", subprocess.PIPE)
        options.setdefault("stderr", subprocess.PIPE)
        limit = LONGEST * slowdown()
        process = subprocess.Popen([*(command or [self.program]), *map(os.fspath, arguments)], env=environment, **options)
        was_too_slow = False
        if during is not None:
            during(process)
        try:
            out, err = process.communicate(timeout=limit)
        except subprocess.TimeoutExpired:
            was_too_slow = True
            process.kill()
            out, err = process.communicate()
        return Call(process.returncode, out or b"", err or b"", left_in(environment), was_too_slow)


def left_in(environment):
    """Ends the processes that are left, and returns them. A process that is being killed has a moment to go."""
    limit = time.monotonic() + PATIENCE * slowdown()
    left = processes_in(environment)
    while left and time.monotonic() < limit:
        time.sleep(0.05)
        left = processes_in(environment)
    end_processes(left)
    return left


def told(problems, otherwise):
    return "; ".join(problems) if problems else otherwise
