"""Attacks by files: each hostile file for each reader of files."""

import functools
import os
import resource
import shutil
import socket
import stat
import threading

from cases import Case, told

MEMORY = 3 << 30  # bytes of address space that reading may take
REFUSED = ("exit code 66",)

# The arguments before and after the file. {good} is a good file of the kind.
READERS = {
    "verify": ("record", ["verify", "{}"]),
    "diff": ("record", ["diff", "{good}", "{}"]),
    "analyze": ("record", ["analyze", "{}", "--plugin", "{plugin}"]),
    "failed of": ("record", ["run", "--only", "failed", "--of", "{}", "--plugin", "{plugin}"]),
    "last run": ("record", ["run", "--only", "failed", "--plugin", "{plugin}"]),
    "profile": ("profile", ["run", "WellBehaved", "--plugin", "{plugin}", "--profile", "{}", "--output", "{output}"]),
    "parameters": ("profile", ["run", "WellBehaved", "--plugin", "{plugin}", "--parameters", "{}", "--output", "{output}"]),
    "scenario": ("scenario", ["run", "WellBehaved", "--plugin", "{plugin}", "--phone", "{}", "--output", "{output}"]),
    "binding": ("binding", ["run", "WellBehaved", "--plugin", "{plugin}", "--phone", "linux:{}", "--output", "{output}"]),
    "plug-in": ("plugin", ["run", "--all", "--plugin", "{}", "--output", "{output}"]),
}


def link(target):
    return lambda path, good: path.symlink_to(target)


def text(make):
    return lambda path, good: path.write_bytes(make(good.read_bytes()))


def endless(path, _good):
    """A FIFO whose writer never stops, as long as there is a reader."""
    os.mkfifo(path)

    def write():
        try:
            with open(path, "wb", buffering=0) as stream:
                while True:
                    stream.write(b"[0,\n" * 16384)
        except OSError:
            pass
    threading.Thread(target=write, daemon=True).start()


def listening(path, _good):
    with socket.socket(socket.AF_UNIX) as one:
        one.bind(str(path))


def chain_of_links(path, _good):
    for number in range(60):
        path.with_name(f"{path.name}{number}").symlink_to(f"{path.name}{number + 1}")
    path.symlink_to(f"{path.name}0")


def twice(content):
    """The first member of the first object, a second time."""
    at = content.index(b"{") + 1
    member = content[at:content.index(b",", at)]
    return content[:at] + member + b"," + content[at:]


HOSTILE = {
    "missing": lambda path, good: None,
    "empty": text(lambda good: b""),
    "a directory": lambda path, good: path.mkdir(),
    "a link to itself": lambda path, good: path.symlink_to(path.name),
    "a chain of links": chain_of_links,
    "endless zeros": link("/dev/zero"),
    "a full device": link("/dev/full"),
    "random bytes": link("/dev/urandom"),
    "an endless pipe": endless,
    "a socket": listening,
    "the null device": link("/dev/null"),
    "its own memory": link("/proc/self/mem"),
    "deep arrays": text(lambda good: b"[" * 1_000_000),
    "deep objects": text(lambda good: b'{"a":' * 1_000_000),
    "a long line": text(lambda good: b'{"a":"' + b"x" * (70 << 20)),
    "many members": text(lambda good: b"{" + b",".join(b'"k%d":%d' % (i, i) for i in range(100_000)) + b"}\n"),
    "a key twice": text(twice),
    "an array": text(lambda good: b"[]\n"),
    "a number": text(lambda good: b"7\n"),
    "null": text(lambda good: b"null\n"),
    "an empty object": text(lambda good: b"{}\n"),
    "a large number": text(lambda good: b'{"sequence": 1e999}\n'),
    "NUL bytes": text(lambda good: b"\0" + good),
    "invalid UTF-8": text(lambda good: good[:1] + b"\xff" + good[1:]),
    "UTF-16": text(lambda good: b"\xff\xfe" + b"".join(bytes((one, 0)) for one in good)),
    "the first half": text(lambda good: good[:len(good) // 2]),
    "the first byte": text(lambda good: good[:1]),
    "something behind the end": text(lambda good: good + b"\n}"),
}
# What is right besides: a record may be cut, and is then incomplete.
OTHER = {
    ("verify", "the first half"): ("exit code 1", "exit code 3", *REFUSED),
    ("verify", "something behind the end"): ("exit code 1", "exit code 66"),
    ("verify", "the first byte"): REFUSED,
    ("diff", "the first half"): ("exit code 1", *REFUSED),
    ("analyze", "the first half"): ("exit code 0", "exit code 2", *REFUSED),
    ("failed of", "the first half"): ("exit code 0", *REFUSED),
    ("last run", "the first half"): ("exit code 0", *REFUSED),
    **{("verify", kind): ("exit code 1",)
       for kind in ("endless zeros", "a full device", "random bytes", "an endless pipe")},  # a line of it is wrong
}
# Only for plug-ins: what the dynamic linker, or somebody else, could be fooled by.
PLUGINS = {
    "its group may write": lambda path, good: copied(path, good, 0o775),
    "everybody may write": lambda path, good: copied(path, good, 0o757),
    "its folder may be written": lambda path, good: in_open_folder(path, good),
    "a link into such a folder": lambda path, good: link_into_open_folder(path, good),
    "of another user": lambda path, good: of_another_user(path, good),
    "the program itself": lambda path, good: path.symlink_to(PROGRAM[0]),
    "a library without plug-in": lambda path, good: path.symlink_to(next((good.parents[2] / "lib").glob("libquazor.so"))),
    "the header only": text(lambda good: good[:64]),
    "headers of zeros": text(lambda good: good[:16] + bytes(1000)),
    "headers of ones": text(lambda good: good[:20] + b"\xff" * 1000),
    "for another machine": text(lambda good: good[:18] + b"\xf3\x00" + good[20:]),
    "with 32 bits": text(lambda good: good[:4] + b"\x01" + good[5:]),
    "a script": text(lambda good: b"#!/bin/sh\ntouch /tmp/owned\n"),
}
PROGRAM = [""]


def copied(path, good, mode):
    shutil.copy(good, path)
    path.chmod(mode)


def in_open_folder(path, good):
    path.mkdir()
    inner = path / "plugin.so"
    shutil.copy(good, inner)
    path.chmod(0o777)
    return inner


def link_into_open_folder(path, good):
    folder = path.with_name("open")
    folder.mkdir()
    shutil.copy(good, folder / "plugin.so")
    folder.chmod(0o777)
    path.symlink_to(folder / "plugin.so")


def of_another_user(path, good):
    shutil.copy(good, path)
    if os.geteuid() == 0:
        os.chown(path, 12345, 12345)
    else:
        path.chmod(0o777)  # only root can give files away


def limit_memory():
    resource.setrlimit(resource.RLIMIT_AS, (MEMORY, resource.RLIM_INFINITY))


def good_files(bench, folder):
    plugin = bench.plugins / "well_behaved.so"
    record = folder / "good.jsonl"
    state = folder / "other"
    state.mkdir()
    done = bench.call("run", "WellBehaved", "--plugin", plugin, "--record", record, state=state)
    assert done.code == 0, done.err
    return {"plugin": plugin, "record": record, "profile": bench.data / "profiles" / "strict.json",
            "scenario": bench.data / "scenarios" / "healthy.json", "binding": bench.data / "bindings" / "board_example.json"}


def outcome(bench, reader, make):
    kind, arguments = READERS[reader]
    with bench.folder() as folder:
        good = good_files(bench, folder)
        path, output = folder / "hostile", folder / "output"
        if reader == "last run":
            (folder / "quazor").mkdir()
            path = folder / "quazor" / "last_run.jsonl"
        path = make(path, good[kind]) or path
        filled = [one.format(path, good=good["record"], plugin=good["plugin"], output=output) if "{" in one else one
                  for one in arguments]
        call = bench.call(*filled, state=folder, preexec_fn=limit_memory)
        problems = call.problems()
        if call.code == 66 and not call.err.startswith(b"quazor: ") and reader != "verify":
            problems.append(f"told {call.err[:60]!r}")
        if call.code == 66 and (output.exists() or call.out and reader != "verify"):
            problems.append("wrote a report")
        if list(folder.glob("*.tmp")):
            problems.append("left a temporary file")
        for one in folder.iterdir():  # nobody waits for a pipe any more
            if stat.S_ISFIFO(one.lstat().st_mode):
                os.close(os.open(one, os.O_RDONLY | os.O_NONBLOCK))
        return told(problems, f"exit code {call.code}")


def cases_of(bench, reader, kinds):
    return [Case(f"file: {kind} as {reader}", OTHER.get((reader, kind), REFUSED), outcome(bench, reader, make))
            for kind, make in kinds.items()]


def jobs(bench, is_all):
    PROGRAM[0] = os.path.abspath(bench.program)
    slow = ("endless zeros", "a full device", "random bytes", "an endless pipe", "a long line", "many members", "UTF-16")
    for reader in READERS if is_all else ("verify", "last run", "profile", "plug-in"):
        is_tried = is_all or reader == "last run"
        kinds = {kind: make for kind, make in HOSTILE.items() if is_tried or kind not in slow}
        if reader == "plug-in":
            for kind in ("a key twice", "something behind the end", "invalid UTF-8"):
                del kinds[kind]  # these say nothing about a shared object
            kinds |= PLUGINS
        names = list(kinds)
        for at in range(0, len(names), 10):
            yield functools.partial(cases_of, bench, reader, {name: kinds[name] for name in names[at:at + 10]})
