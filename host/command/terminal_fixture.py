"""A pseudoterminal of a given width for the tests of the program's command line."""

import fcntl
import os
import pty
import re
import select
import struct
import subprocess
import termios
import time
import unicodedata

from command_line_fixture import PROGRAM

CSI = re.compile(r"\x1b\[[0-9;]*([A-Za-z])")
UTF8 = {"LC_ALL": "C.UTF-8"}
PLAIN = {"LC_ALL": "C"}


def width_of(text):
    """The columns of a text, by the tables of this interpreter."""
    width = 0
    for character in CSI.sub("", text):
        if unicodedata.category(character) not in ("Mn", "Me"):
            width += 2 if unicodedata.east_asian_width(character) in "WF" else 1
    return width


def lines_on_screen(output):
    """Every line that was on the terminal, including progress lines that were erased later."""
    text = output.decode("utf-8", "surrogateescape").replace("\r\n", "\n")
    return [part for line in text.split("\n") for part in line.split("\r")]


class Terminal:
    """A pseudoterminal of a given width, and a program in it."""

    def __init__(self, columns, *arguments, env=None, separate_output=False):
        self.master, slave = pty.openpty()
        self.resize(columns)
        environment = {**os.environ, "TERM": "xterm", **(env or UTF8)}
        environment.pop("COLUMNS", None)
        out = subprocess.PIPE if separate_output else slave
        self.process = subprocess.Popen([PROGRAM, *map(str, arguments)], stdin=slave, stdout=out, stderr=slave,
                                        env=environment, start_new_session=True)
        os.close(slave)

    def resize(self, columns):
        fcntl.ioctl(self.master, termios.TIOCSWINSZ, struct.pack("HHHH", 24, columns, 0, 0))

    def read_for(self, seconds, until=None):
        """What is printed until the program closes the terminal, the time is over or `until` appears."""
        output = b""
        end = time.monotonic() + seconds
        while time.monotonic() < end and not (until and until in output):
            if not select.select([self.master], [], [], 0.1)[0]:
                continue
            try:
                piece = os.read(self.master, 65536)
            except OSError:  # the program has closed it
                break
            if not piece:
                break
            output += piece
        return output

    def finish(self):
        output = self.read_for(120)
        code = self.process.wait(60)
        os.close(self.master)
        return code, output


def on_terminal(columns, *arguments, env=None):
    return Terminal(columns, *arguments, env=env).finish()
