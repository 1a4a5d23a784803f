"""Attacks by the surroundings of the program: descriptors, limits, folders, variables, other processes and signals."""

import contextlib
import functools
import json
import os
import pathlib
import resource
import shutil
import signal
import time

from cases import Case, told
from pace import slowdown

ANY = "find.emptyLimit"  # a diagnostic that passes
FINE, FULL = ("exit code 0",), ("exit code 73",)


def limited(which, soft, hard=None):
    return lambda: resource.setrlimit(which, (soft, soft if hard is None else hard))


def closing(*descriptors):
    def close():
        for one in descriptors:
            with contextlib.suppress(OSError):
                os.close(one)
    return close


def opening_many():
    for _ in range(300):
        os.set_inheritable(os.open("/dev/zero", os.O_RDWR), True)


def in_removed_folder():
    folder = pathlib.Path("/tmp") / f"removed-{os.getpid()}"
    folder.mkdir()
    os.chdir(folder)
    folder.rmdir()


def ignoring(*signals):
    def ignore():
        for one in signals or set(signal.valid_signals()) - {signal.SIGKILL, signal.SIGSTOP}:
            with contextlib.suppress(OSError):
                signal.signal(one, signal.SIG_IGN)
    return ignore


def blocking():
    signal.pthread_sigmask(signal.SIG_BLOCK, signal.valid_signals())


def with_child(state):
    """Leaves the program a child that it did not start."""
    def start():
        child = os.fork()
        if child == 0:
            null = os.open("/dev/null", os.O_RDWR)
            for descriptor in range(3):
                os.dup2(null, descriptor)
            os.execlp("sleep", "sleep", "60")
        pathlib.Path(state, "child").write_text(str(child), encoding="utf-8")
    return start


def with_zombie():
    if os.fork() == 0:
        os._exit(0)
    time.sleep(0.05)


def variables_of_size(size):
    return {f"ATTACK_{number}": "x" * 1000 for number in range(size // 1000)}


# Each: the expected outcomes, options of Popen, and variables.
PLAIN = {
    "standard input closed": (FINE, {"preexec_fn": closing(0)}, {}),
    "standard error closed": (FINE, {"preexec_fn": closing(2)}, {}),
    "input and error closed": (FINE, {"preexec_fn": closing(0, 2)}, {}),
    "standard output closed": (FULL, {"preexec_fn": closing(1)}, {}),
    "all three closed": (FULL, {"preexec_fn": closing(0, 1, 2)}, {}),
    "a directory for standard input": (FINE, {"stdin": os.open("/", os.O_RDONLY)}, {}),
    "a full device for standard output": (FULL, {"stdout": os.open("/dev/full", os.O_WRONLY)}, {}),
    "a full device for standard error": (FINE, {"stderr": os.open("/dev/full", os.O_WRONLY)}, {}),
    "standard output that is only read": (FULL, {"stdout": os.open("/dev/null", os.O_RDONLY)}, {}),
    "300 open descriptors": (FINE, {"preexec_fn": opening_many, "close_fds": False}, {}),
    "4 descriptors": (("exit code 2", "exit code 66", "exit code 73"), {"preexec_fn": limited(resource.RLIMIT_NOFILE, 4)}, {}),
    "10 descriptors": (("exit code 0", "exit code 2", "exit code 66", "exit code 73"),
                       {"preexec_fn": limited(resource.RLIMIT_NOFILE, 10)}, {}),
    "30 descriptors": (FINE, {"preexec_fn": limited(resource.RLIMIT_NOFILE, 30)}, {}),
    "no core files": (FINE, {"preexec_fn": limited(resource.RLIMIT_CORE, 0)}, {}),
    "files of no size": (FULL, {"preexec_fn": limited(resource.RLIMIT_FSIZE, 0)}, {}),
    "files of 100 bytes": (FULL, {"preexec_fn": limited(resource.RLIMIT_FSIZE, 100)}, {}),
    "a small stack": (FINE, {"preexec_fn": limited(resource.RLIMIT_STACK, 256 << 10)}, {}),
    "an endless stack": (FINE, {"preexec_fn": limited(resource.RLIMIT_STACK, resource.RLIM_INFINITY)}, {}),
    "no queued signals": (("exit code 0", "exit code 2", "exit code 70"), {"preexec_fn": limited(resource.RLIMIT_SIGPENDING, 0)}, {}),
    "a removed folder": (FINE, {"preexec_fn": in_removed_folder}, {}),
    "a strict umask": (FINE, {"preexec_fn": lambda: os.umask(0o777) and None}, {}),
    "a session of its own": (FINE, {"preexec_fn": os.setsid}, {}),
    "all signals ignored": (FINE, {"preexec_fn": ignoring()}, {}),
    "ends of children ignored": (FINE, {"preexec_fn": ignoring(signal.SIGCHLD)}, {}),
    "all signals blocked": (FINE, {"preexec_fn": blocking}, {}),
    "a zombie for a child": (FINE, {"preexec_fn": with_zombie}, {}),
    "no home": (FINE, {}, {"HOME": None, "XDG_STATE_HOME": None}),
    "a relative home": (FINE, {}, {"HOME": "home", "XDG_STATE_HOME": "state"}),
    "a device for the state": (FINE, {}, {"XDG_STATE_HOME": "/dev/full"}),
    "the kernel's files for the state": (FINE, {}, {"XDG_STATE_HOME": "/proc"}),
    "an unknown locale": (FINE, {}, {"LC_ALL": "xx_YY.nothing", "LANG": "\udcff"}),
    "a Turkish locale": (FINE, {}, {"LC_ALL": "tr_TR.UTF-8", "LANGUAGE": "tr"}),
    "an odd terminal": (FINE, {}, {"TERM": "\x1b[2J", "COLUMNS": "-1", "LINES": "99999999999999999999"}),
    "no columns": (FINE, {}, {"COLUMNS": "0", "TERM": ""}),
    "an odd time zone": (FINE, {}, {"TZ": ":/dev/zero"}),
    "a time zone out of the way": (FINE, {}, {"TZ": "../../../etc/passwd"}),
    "two megabytes of environment": (FINE, {}, variables_of_size(1_500_000)),
    "a temporary folder that is none": (FINE, {}, {"TMPDIR": "/nowhere"}),
    "a setting without a name": (("exit code 64",), {}, {"QUAZOR_SET": "=1"}),
    "a setting of bytes": (("exit code 64",), {}, {"QUAZOR_SET": "\udcff=\udcfe"}),
    "a tag without a name": (("exit code 64",), {}, {"QUAZOR_TAGS": "=1"}),
    "a tag of control characters": (("exit code 64", *FINE), {}, {"QUAZOR_TAGS": "a=\x1b[2J"}),
    "a plug-in of the linker": (FINE, {}, {"LD_BIND_NOW": "1", "LD_LIBRARY_PATH": "/nowhere:::"}),
    "odd memory settings": (FINE, {}, {"MALLOC_PERTURB_": "90", "MALLOC_ARENA_MAX": "1"}),
}

# Signals in order; a pause of a tenth of a second is between two of them. The program has a stage that hangs.
S = signal
SIGNALS = {
    (S.SIGINT,): ("exit code 130",), (S.SIGTERM,): ("exit code 130",), (S.SIGHUP,): ("exit code 130",),
    (S.SIGINT, S.SIGINT): ("exit code 130",), (S.SIGTERM, S.SIGHUP): ("exit code 130",),
    (S.SIGINT, S.SIGINT, S.SIGINT): ("exit code 130",), (S.SIGHUP, S.SIGTERM, S.SIGINT): ("exit code 130",),
    (S.SIGSTOP, S.SIGCONT, S.SIGINT): ("exit code 130",), (S.SIGSTOP, S.SIGINT, S.SIGCONT): ("exit code 130",),
    (S.SIGWINCH, S.SIGCHLD, S.SIGURG, S.SIGCONT, S.SIGTERM): ("exit code 130",),
    (S.SIGTSTP, S.SIGTERM, S.SIGCONT): ("exit code 130",), (S.SIGALRM, S.SIGTERM): ("exit code 130",),
    (S.SIGINT, S.SIGKILL): ("signal 9",), (S.SIGSTOP, S.SIGKILL): ("signal 9",),
    **{(one,): (f"signal {int(one)}",) for one in (S.SIGKILL, S.SIGQUIT, S.SIGABRT, S.SIGSEGV, S.SIGBUS, S.SIGILL, S.SIGTRAP,
                                                   S.SIGFPE, S.SIGSYS, S.SIGUSR1, S.SIGUSR2, S.SIGVTALRM,
                                                   S.SIGPROF, S.SIGXCPU, S.SIGIO, S.SIGPWR, S.SIGRTMIN, S.SIGRTMAX)},
}


def plain(bench, name):
    expected, options, variables = PLAIN[name]
    with bench.folder() as folder:
        record = folder / "record"
        call = bench.call("run", ANY, "--plugin", bench.plugins / "attacker.so", "--record", record, state=folder,
                          variables={"QUAZOR_ATTACKS": ANY, **variables}, **options)
        problems = call.problems()
        if call.code == 70 and "exit code 70" in expected:
            problems.remove("failed itself")
        if call.code == 0 and not whole(record):
            problems.append("the record is incomplete")
        if call.code in (64, 66) and record.exists():
            problems.append("wrote a record")
        return Case(f"surroundings: {name}", expected, told(problems, f"exit code {call.code}"))


def whole(record):
    lines = record.read_text(encoding="utf-8").splitlines()
    return json.loads(lines[-1])["event"] == "runEnded"


def other_child(bench):
    with bench.folder() as folder:
        call = bench.call("run", "WellBehaved", "--plugin", bench.plugins / "well_behaved.so", state=folder,
                          preexec_fn=with_child(folder))
        child = int((folder / "child").read_text(encoding="utf-8"))
        try:
            os.kill(child, signal.SIGKILL)
            state = "lives"
        except ProcessLookupError:
            state = "is gone"
        return Case("surroundings: a child of somebody else", ("exit code 0, and it lives",),
                    told(call.problems(), f"exit code {call.code}, and it {state}"))


def output_in(bench, form, option, target, expected):
    """A report or record that cannot be written to its end."""
    with bench.folder() as folder:
        name = f"{form}:{target}" if option == "--output" else target
        call = bench.call("run", "WellBehaved", "--plugin", bench.plugins / "well_behaved.so", option, name, state=folder)
        return Case(f"surroundings: {option} {name}", expected, told(call.problems(), f"exit code {call.code}"))


def precious(bench, make, name):
    """A link where the last run belongs must not lead to the loss of what it points to."""
    with bench.folder() as folder:
        target = folder / "precious"
        target.write_text("precious", encoding="utf-8")
        make(folder, target)
        call = bench.call("run", "WellBehaved", "--plugin", bench.plugins / "well_behaved.so", state=folder)
        problems = call.problems()
        if target.read_text(encoding="utf-8") != "precious":
            problems.append("it is lost")
        return Case(f"surroundings: {name}", FINE, told(problems, f"exit code {call.code}"))


def link_as_last_run(folder, target):
    (folder / "quazor").mkdir()
    (folder / "quazor" / "last_run.jsonl").symlink_to(target)


def hard_link_as_last_run(folder, target):
    (folder / "quazor").mkdir()
    os.link(target, folder / "quazor" / "last_run.jsonl")


def directory_as_last_run(folder, _target):
    (folder / "quazor" / "last_run.jsonl" / "inner").mkdir(parents=True)


def pipe_as_last_run(folder, _target):
    (folder / "quazor").mkdir()
    os.mkfifo(folder / "quazor" / "last_run.jsonl")


def file_as_folder(folder, target):
    shutil.copy(target, folder / "quazor")


def signalled(bench, signals):
    with bench.folder() as folder:
        record = folder / "record"

        def send(process):
            limit = time.monotonic() + 30 * slowdown()
            while not (record.exists() and b'"stage":"run"' in record.read_bytes()) and time.monotonic() < limit:
                time.sleep(0.02)
            for one in signals:
                process.send_signal(one)
                time.sleep(0.1)

        call = bench.call("run", "run.waitForPipe", "WellBehaved", "--plugin", bench.plugins / "attacker.so", "--plugin",
                          bench.plugins / "well_behaved.so", "--record", record, "--grace", "0.5", state=folder,
                          variables={"QUAZOR_ATTACKS": "run.waitForPipe"}, during=send)
        problems = [one for one in call.problems() if not one.startswith("ended by signal")]
        if b'"verdict":"pass"' in record.read_bytes():
            problems.append("a false PASS")
        got = f"signal {-call.code}" if call.code < 0 else f"exit code {call.code}"
        names = " ".join(signal.Signals(one).name for one in signals)
        return Case(f"surroundings: {names}", SIGNALS[signals], told(problems, got))


def one_case(make, *arguments):
    return [make(*arguments)]


def jobs(bench, is_all):
    def job(make, *arguments):
        return functools.partial(one_case, make, bench, *arguments)
    for name in PLAIN:
        yield job(plain, name)
    yield job(other_child)
    for form in ("json", "csv", "junit", "ocp", "text"):
        yield job(output_in, form, "--output", "/dev/full", FULL)
        yield job(output_in, form, "--output", "/nowhere/file", FULL)
    for target in ("/dev/full", "/nowhere/file", "/proc", "/proc/version"):
        yield job(output_in, "", "--record", target, FULL)
    for make, name in ((link_as_last_run, "a link for the last run"), (hard_link_as_last_run, "a hard link for the last run"),
                       (directory_as_last_run, "a folder for the last run"), (pipe_as_last_run, "a pipe for the last run"),
                       (file_as_folder, "a file for the state folder")):
        yield job(precious, make, name)
    chosen = list(SIGNALS)
    for signals in chosen if is_all else chosen[:13]:
        yield job(signalled, signals)


