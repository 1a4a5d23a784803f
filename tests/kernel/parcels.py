"""The data that a guest sends over its second serial port: parcels, each a header line and as many bytes as it says.

    quazor-rig NAME SIZE MD5

The bytes are a tar archive. Everything else (a line that is not a header, missing or changed bytes) is reported as
damage; a damaged parcel does not count as arrived.
"""

import dataclasses
import hashlib
import io
import re
import tarfile

HEADER = re.compile(rb"quazor-rig (\S+) (\d+) ([0-9a-f]{32})\n")


@dataclasses.dataclass(frozen=True)
class Parcel:
    name: str
    files: dict  # path within the archive: content

    def text(self, path):
        """The text of a file; empty if there is none."""
        return self.files.get(path, b"").decode("utf-8", errors="replace")


class ParcelReader:
    """Accepts bytes in pieces and returns complete parcels."""

    def __init__(self):
        self._pending = b""
        self.damages = []

    def feed(self, content):
        """Returns the parcels that are now complete."""
        self._pending += content
        parcels = []
        while (end := self._pending.find(b"\n")) >= 0:
            header = HEADER.fullmatch(self._pending[:end + 1])
            if header is None:
                self.damages.append(f"no header of a parcel: {self._pending[:end][:80]!r}")
                self._pending = self._pending[end + 1:]
                continue
            size = int(header[2])
            if len(self._pending) < end + 1 + size:
                break
            body = self._pending[end + 1:end + 1 + size]
            self._pending = self._pending[end + 1 + size:]
            self._take(header, body, parcels)
        return parcels

    def finish(self):
        """The port was closed: an incomplete parcel is damaged."""
        if self._pending:
            self.damages.append(f"the last parcel is cut off: {self._pending[:80]!r}")
        self._pending = b""

    def _take(self, header, body, parcels):
        name = header[1].decode()
        if hashlib.md5(body).hexdigest().encode() != header[3]:
            self.damages.append(f"the parcel {name} came with other bytes than were sent")
            return
        try:
            parcels.append(Parcel(name, files_of(body)))
        except tarfile.TarError as problem:
            self.damages.append(f"the parcel {name} is no archive: {problem}")


def files_of(body):
    """The files of a tar archive by path, without a leading "./"."""
    with tarfile.open(fileobj=io.BytesIO(body)) as archive:
        return {member.name.removeprefix("./"): archive.extractfile(member).read()
                for member in archive.getmembers() if member.isfile()}
