"""Checks that the manual page and the program's help have the same commands and options.

usage: man_page_test.py PROGRAM MAN_PAGE
"""

import pathlib
import re
import subprocess
import sys


def options_in(text):
    return set(re.findall(r"(?<![\w-])--[a-z][a-z-]*", text))


def main():
    program, page = sys.argv[1], pathlib.Path(sys.argv[2])
    help_of_all = subprocess.run([program, "--help"], capture_output=True, text=True, check=True).stdout
    commands = re.findall(r"^  ([a-z]+) {2,}", help_of_all.split("Subcommands:")[1].split("Examples:")[0], re.MULTILINE)
    offered = {"--help", "--version"}
    for command in commands:
        text = subprocess.run([program, command, "--help"], capture_output=True, text=True, check=True).stdout
        offered |= options_in(text.split("Options:")[1])
    roff = page.read_text(encoding="utf-8")
    options_section = roff.split(".SH OPTIONS")[1].split(".SH")[0].replace("\\-", "-")
    described = set(re.findall(r"^\.TP\n\.BI? (--[a-z-]+)", options_section, re.MULTILINE))
    commands_section = roff.split(".SH COMMANDS")[1].split(".SH")[0]
    described_commands = re.findall(r"^\.TP\n\.B ([a-z]+)$", commands_section, re.MULTILINE)
    found = [f"the manual page lacks {one}" for one in sorted(offered - described)]
    found += [f"the manual page has {one}, which no command takes" for one in sorted(described - offered)]
    if sorted(described_commands) != sorted(commands):
        found.append(f"the manual page's commands are {described_commands}, and the program's {commands}")
    if not commands or len(offered) < 10:
        found.append(f"the help was not understood: commands {commands}, options {sorted(offered)}")
    print("\n".join(found) or f"{len(commands)} commands and {len(offered)} options, all in the manual page")
    return 1 if found else 0


sys.exit(main())
