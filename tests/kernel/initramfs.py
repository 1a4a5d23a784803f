"""Builds an initial file system for a guest: a cpio archive in the kernel's format ("newc"), without being root."""

import os
import pathlib
import re
import stat
import subprocess

MAGIC = "070701"
TRAILER = "TRAILER!!!"


class Archive:
    """A cpio archive under construction. Parent directories are added automatically; all files belong to root."""

    def __init__(self):
        self._entries = {}  # path without a leading "/": mode, content, device numbers

    def add(self, path, content, mode):
        """Adds a file. `path` is absolute in the guest. A second file with the same path replaces the first."""
        self._directories_above(path)
        self._entries[path.strip("/")] = (stat.S_IFREG | mode, content, (0, 0))

    def add_file(self, path, source):
        """Adds a copy of a file and keeps its executable bit."""
        self.add(path, source.read_bytes(), 0o755 if os.access(source, os.X_OK) else 0o644)

    def add_tree(self, path, source, suffix=""):
        """Adds copies of all files below a directory whose names end in `suffix`."""
        for file in sorted(source.rglob("*" + suffix)):
            if file.is_file():
                self.add_file(f"{path}/{file.relative_to(source)}", file)

    def add_link(self, path, target):
        self._directories_above(path)
        self._entries[path.strip("/")] = (stat.S_IFLNK | 0o777, target.encode(), (0, 0))

    def add_directory(self, path):
        self._directories_above(path + "/.")

    def add_character_device(self, path, major, minor):
        self._directories_above(path)
        self._entries[path.strip("/")] = (stat.S_IFCHR | 0o600, b"", (major, minor))

    def bytes(self):
        """The complete archive."""
        entries = [*self._entries.items(), (TRAILER, (0, b"", (0, 0)))]
        return b"".join(self._entry(number, path, *what) for number, (path, what) in enumerate(entries, 1))

    def _directories_above(self, path):
        parts = path.strip("/").split("/")[:-1]
        for depth in range(1, len(parts) + 1):
            self._entries.setdefault("/".join(parts[:depth]), (stat.S_IFDIR | 0o755, b"", (0, 0)))

    @staticmethod
    def _entry(number, path, mode, content, device):
        name = path.encode() + b"\0"
        fields = (number, mode, 0, 0, 1, 0, len(content), 0, 0, *device, len(name), 0)
        header = MAGIC.encode() + b"".join(b"%08X" % field for field in fields) + name
        return padded(header) + padded(content)


def padded(content):
    return content + b"\0" * (-len(content) % 4)


def libraries_of(program):
    """The shared libraries of a program, including its loader, as paths on this machine."""
    listed = subprocess.run(["ldd", program], capture_output=True, text=True, check=True).stdout
    missing = re.findall(r"(\S+) => not found", listed)
    if missing:
        raise FileNotFoundError(f"{program} needs {', '.join(missing)}, which cannot be found")
    return [pathlib.Path(path) for path in re.findall(r"^\s*(?:\S+ => )?(/\S+) \(0x", listed, re.MULTILINE)]


def add_program(archive, path, program):
    """Adds a program or plug-in and the system libraries that it needs, where the loader finds them."""
    archive.add_file(path, program)
    for library in libraries_of(program):
        if not library.name.startswith("libquazor"):  # installed with the program
            archive.add_file(str(library), library.resolve())
