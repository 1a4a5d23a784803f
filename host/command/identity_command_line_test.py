"""Which run it was, of which phone: in records and reports."""

import socket
import unittest

from command_line_fixture import CommandLineTest, events_in


class IdentityTest(CommandLineTest):
    def test_a_record_says_which_run_it_is_of_which_phone(self):
        record = self.directory / "record.jsonl"
        begun = []
        for _ in range(2):
            self.run_fake("--record", record, "--replace", "--tag", "serial=C02X", env={"QUAZOR_TAGS": "serial=old station=S3"})
            begun.append(events_in(record)[0])
        self.assertRegex(begun[0]["id"], "^[0-9a-f]{32}$")
        self.assertNotEqual(begun[0]["id"], begun[1]["id"])
        self.assertEqual(begun[0]["host"], socket.gethostname())
        self.assertEqual(begun[0]["tags"], [["serial", "C02X"], ["station", "S3"]])
        self.assert_refused(self.run_fake("--tag", "serial"), 64, "--tag 'serial': expected KEY=VALUE")
        self.assert_refused(self.run_fake(env={"QUAZOR_TAGS": "x="}), 64, "QUAZOR_TAGS 'x=': the value is empty")


if __name__ == "__main__":
    unittest.main()
