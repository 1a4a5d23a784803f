#!/usr/bin/env python3
"""Runs the commands of every document in the tree, and compares its excerpts with the source files.

usage: documents_test.py ROOT PROGRAM PLUGIN...

document_commands.py describes the rules for documents. The commands of a document run in order in a
directory that looks like the tree after its program and the PLUGINs were built; a command may read files that an
earlier one has written. Lists the commands that are not run and the reasons. Exit code 0: everything agrees with the
documents; 1: something does not.
"""

import concurrent.futures
import os
import pathlib
import subprocess
import sys
import tempfile

import document_commands
from document_commands import Problem

TIME_LIMIT = 120  # seconds per command
LINES_SHOWN = 20  # of the output of a command with an unexpected result

RUN = """#!/bin/sh
[ $# -gt 0 ] || set -- run --all
exec quazor "$@"
"""


def documents(root):
    """The documents of the tree, without those in build directories."""
    files = sorted(root.rglob("*.md"))
    parts = {file: file.relative_to(root).parts for file in files}
    return [file for file in files if not parts[file][0].startswith("build") and
            not any(part.startswith(".") for part in parts[file])]


def lay_out(directory, root, program, plugins):
    """Makes the directory look like a built tree. Returns the environment for commands in it."""
    for name in ("data", "examples"):
        (directory / name).symlink_to(root / name)
    (directory / "run").write_text(RUN)
    (directory / "run").chmod(0o755)
    (directory / "my_phone.json").write_text('{"base": "data/scenarios/healthy.json", "title": "My phone"}\n')
    programs = directory / "build" / "release" / "bin"
    installed = directory / "build" / "release" / "lib" / "quazor"
    for folder in (programs, installed):
        folder.mkdir(parents=True)
    (programs / "quazor").symlink_to(program)
    for plugin in plugins:
        # Plug-ins of the tree are in the directory of its build, others in the current directory.
        (installed / plugin.name).symlink_to(plugin)
        (directory / "build" / plugin.name).symlink_to(plugin)
    path = f"{programs}{os.pathsep}{os.environ['PATH']}"
    return {**os.environ, "PATH": path, "HOME": str(directory), "NO_COLOR": "1"}


def outcome(command, directory, environment):
    """Describes an unexpected result of the command; empty if the result is as documented."""
    try:
        run = subprocess.run(
            ["bash", "-euo", "pipefail", "-c", command.text], cwd=directory, env=environment, stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, errors="replace", timeout=TIME_LIMIT,
            check=False)
    except subprocess.TimeoutExpired:
        return f"it did not end within {TIME_LIMIT} s"
    if run.returncode == command.exit_code:
        return ""
    last_lines = "\n".join(run.stdout.splitlines()[-LINES_SHOWN:])
    return f"exit code {run.returncode} instead of {command.exit_code}\n{last_lines}\n"


def check_excerpts(name, text, root):
    """The excerpts that are not in their files, as sentences."""
    found = []
    for excerpt in document_commands.excerpts(text):
        file = root / excerpt.file
        if not file.is_file():
            found.append(f"{name}:{excerpt.line}: there is no {excerpt.file}")
        elif not document_commands.is_in(excerpt, file.read_text(encoding="utf-8")):
            found.append(f"{name}:{excerpt.line}: this does not stand in {excerpt.file} so")
    return found


def check(document, root, program, plugins):
    """The problems of a document, notes on commands that were not run, and the number of commands run."""
    name = str(document.relative_to(root))
    text = document.read_text(encoding="utf-8")
    try:
        commands = document_commands.commands(text)
        problems = check_excerpts(name, text, root)
    except Problem as problem:
        return [f"{name}:{problem}"], [], 0
    notes = [f"{name}:{command.line}: not run, {command.reason}: {command.text}"
             for command in commands if command.reason]
    to_run = [command for command in commands if not command.reason]
    with tempfile.TemporaryDirectory() as directory:
        directory = pathlib.Path(directory)
        environment = lay_out(directory, root, program, plugins)
        for command in to_run:
            wrong = outcome(command, directory, environment)
            if wrong:
                problems.append(f"{name}:{command.line}: {command.text}: {wrong}")
    return problems, notes, len(to_run)


def main():
    root, program, *plugins = (pathlib.Path(argument).resolve() for argument in sys.argv[1:])
    run, problems, notes = 0, [], []
    files = documents(root)
    with concurrent.futures.ThreadPoolExecutor(os.cpu_count()) as pool:
        for of_file in pool.map(lambda file: check(file, root, program, plugins), files):
            problems += of_file[0]
            notes += of_file[1]
            run += of_file[2]
    for line in [*notes, *problems]:
        print(line)
    print(f"{len(files)} documents: {run} commands run, {len(notes)} not run, {len(problems)} problems")
    return 1 if problems or run == 0 else 0


if __name__ == "__main__":
    sys.exit(main())
