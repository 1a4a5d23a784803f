#!/usr/bin/env python3
"""Tests of parcels.py: data arrives complete or is reported as damaged."""

import hashlib
import io
import tarfile
import unittest

from parcels import ParcelReader


def archive_of(files):
    content = io.BytesIO()
    with tarfile.open(fileobj=content, mode="w") as archive:
        for name, text in files.items():
            member = tarfile.TarInfo("./" + name)
            member.size = len(text)
            archive.addfile(member, io.BytesIO(text.encode()))
    return content.getvalue()


def parcel(name, body):
    return f"quazor-rig {name} {len(body)} {hashlib.md5(body).hexdigest()}\n".encode() + body


ONE = parcel("one", archive_of({"log": "first\n", "closed": "closed one\n"}))
TWO = parcel("two", archive_of({"log": "second\n"}))


class ParcelReaderTest(unittest.TestCase):
    def setUp(self):
        self.reader = ParcelReader()

    def names(self, *pieces):
        return [arrived.name for piece in pieces for arrived in self.reader.feed(piece)]

    def test_parcels_arrive_with_their_files(self):
        (one, two) = self.reader.feed(ONE + TWO)
        self.assertEqual(one.files, {"log": b"first\n", "closed": b"closed one\n"})
        self.assertEqual(two.text("log"), "second\n")
        self.assertEqual(two.text("closed"), "")
        self.reader.finish()
        self.assertEqual(self.reader.damages, [])

    def test_parcels_arrive_in_any_pieces(self):
        everything = ONE + TWO
        self.assertEqual(self.names(*(everything[i:i + 1] for i in range(len(everything)))), ["one", "two"])
        self.reader.finish()
        self.assertEqual(self.reader.damages, [])

    def test_a_parcel_that_is_cut_off_never_arrives(self):
        for length in (1, len(ONE) // 2, len(ONE) - 1):
            with self.subTest(length=length):
                self.setUp()
                self.assertEqual(self.names(ONE[:length]), [])
                self.reader.finish()
                self.assertEqual(len(self.reader.damages), 1)

    def test_a_changed_byte_is_told_and_the_next_parcel_arrives(self):
        changed = bytearray(ONE)
        changed[-1500] ^= 1
        self.assertEqual(self.names(bytes(changed) + TWO), ["two"])
        self.assertEqual(self.reader.damages, ["the parcel one came with other bytes than were sent"])

    def test_bytes_that_are_no_archive_are_told(self):
        self.assertEqual(self.names(parcel("one", b"no archive" * 100)), [])
        self.assertRegex(self.reader.damages[0], "the parcel one is no archive")

    def test_what_comes_between_parcels_is_told(self):
        self.assertEqual(self.names(ONE + b"kernel panic\n" + TWO), ["one", "two"])
        self.assertEqual(self.reader.damages, ["no header of a parcel: b'kernel panic'"])


if __name__ == "__main__":
    unittest.main()
