#!/usr/bin/env python3
"""Opens report pages in a browser. Pages have no script.

usage: page_browser_test.py QUAZOR

Exit code 77: skipped, because the browser (Debian's chromium-headless-shell) is not installed.
"""

import html
import json
import os
import pathlib
import re
import shutil
import subprocess
import sys
import tempfile
import unittest

import page_reader

BROWSER = shutil.which("chromium-headless-shell")
PROGRAM = sys.argv.pop(1) if len(sys.argv) > 1 else ""
THOROUGH = os.environ.get("QUAZOR_THOROUGH") == "1"
MAX_PAGE_OF_ALL = 150_000
MAX_PAGE_OF_MANY_FRAMES = 8_000_000
FRAMES = 1_000_000 if THOROUGH else 100_000
# Each would leave a mark in the document.
ATTACKS = ("</style></title></script><script>document.documentElement.id='attacked'</script>",
           "<img src=x onerror=\"document.documentElement.id='attacked'\">", "\" autofocus onfocus=\"location='#attacked'",
           "\u202eevil\u2066", "x" * 100_000)


def quazor(*arguments, codes=(0,)):
    result = subprocess.run([PROGRAM, *map(str, arguments)], capture_output=True, text=True, timeout=300)
    if result.returncode not in codes:
        raise AssertionError(f"{arguments}: {result.returncode}: {result.stderr}")


class PageTest(unittest.TestCase):
    def setUp(self):
        directory = tempfile.TemporaryDirectory()
        self.addCleanup(directory.cleanup)
        self.directory = pathlib.Path(directory.name)
        os.environ["XDG_STATE_HOME"] = directory.name
        self.record = self.directory / "run.jsonl"
        self.page = self.directory / "page.html"

    def make(self, *arguments):
        quazor("run", "--all", "--record", self.record, *arguments, codes=(0, 1))
        quazor("report", self.record, "--output", self.page)

    def browse(self, *switches):
        result = subprocess.run([BROWSER, "--no-sandbox", "--disable-gpu", "--enable-logging=stderr", "--timeout=20000",
                                 f"--user-data-dir={self.directory / 'browser'}", *switches, self.page.as_uri()],
                                capture_output=True, text=True, timeout=120)
        self.assertEqual(result.returncode, 0, result.stderr)
        return result

    def open(self):
        """The document after the page was loaded, and what the browser says on its console."""
        result = self.browse("--virtual-time-budget=5000", "--dump-dom")
        return result.stdout, [line for line in result.stderr.splitlines() if "CONSOLE" in line]

    def picture(self, *switches):
        file = self.directory / "page.png"
        file.unlink(missing_ok=True)
        self.browse("--window-size=1000,6000", f"--screenshot={file}", *switches)
        return file.read_bytes()

    def test_the_browser_shows_what_the_file_says(self):
        self.make("--phone", "camera_sync/frames_dropped", "--profile", "strict")
        document, complaints = self.open()
        self.assertEqual(complaints, [])
        self.assertNotEqual(self.picture(), self.picture("--blink-settings=preferredColorScheme=0"))  # light and dark
        shown, written = (page_reader.Page(text.encode()) for text in (document, self.page.read_text()))
        self.assertEqual((shown.verdict, shown.facts), ("FAIL", written.facts))
        self.assertEqual(shown.records, written.records)
        self.assertEqual(len(shown.records), 5)

    def sheets(self, text):
        """The number of sheets of paper that the page takes."""
        self.page.write_text(text)
        file = self.directory / "page.pdf"
        file.unlink(missing_ok=True)
        self.browse(f"--print-to-pdf={file}", "--no-pdf-header-footer")
        return len(re.findall(rb"/Type /Page\b", file.read_bytes()))

    def test_closed_sections_are_printed(self):
        self.make()
        text = self.page.read_text()
        self.assertIn("<details>", text)
        closed = self.sheets(text)
        self.assertEqual(closed, self.sheets(text.replace("<details>", "<details open>")))
        # Without the rule of the style, and so without the policy, they are not: this test would see it.
        without = re.sub("<meta http-equiv[^>]*>", "", text).replace("details::details-content{", "details::no-such-part{")
        self.assertLess(self.sheets(without), closed)

    def test_it_loads_nothing(self):
        self.make()
        text = self.page.read_text()
        self.assertNotRegex(text, r"<(link|script|iframe|object|embed|img|base|form)\b|url\(|@import|\bsrc=")
        self.assertEqual([one for one in re.findall(r'href="([^"]*)"', text) if not one.startswith("#")], [])
        self.assertLess(len(text.encode()), MAX_PAGE_OF_ALL)

    def test_every_link_leads_somewhere(self):
        self.make("--phone", "camera_sync/frames_dropped", "--profile", "strict")
        text = self.page.read_text()
        names = re.findall(r'\bid="([^"]*)"', text)
        self.assertEqual(len(names), len(set(names)))
        self.assertLessEqual(set(re.findall(r'href="#([^"]*)"', text)), set(names))

    def test_text_of_others_runs_nothing(self):
        """A record in which every text is an attack."""
        self.make("--tag", "serial=C02X")
        quazor("run", "--all", "--record", self.record, "--replace", "--tag", "serial=C02X", codes=(0, 1))
        lines = self.record.read_text().splitlines()
        for attack in ATTACKS:
            with self.subTest(attack=attack[:40]):
                self.record.write_text("\n".join(self.attacked(line, attack) for line in lines) + "\n")
                quazor("report", self.record, "--output", self.page)
                document, complaints = self.open()
                self.assertEqual(complaints, [])
                self.assertNotRegex(document, "id=\"attacked\"|<script|<img|\u202e|\u2066")
                self.assertIn("<footer>", document)
                self.assertGreater(document.count(html.escape(page_reader.printable(attack), quote=False)[:5]), 20)

    @staticmethod
    def attacked(line, attack):
        event = json.loads(line)

        def attack_texts(value, key=None):
            if isinstance(value, dict):
                return {name: attack_texts(one, name) for name, one in value.items()}
            if isinstance(value, list):
                return [attack_texts(one, key) for one in value]
            free = ("summary", "text", "plugins", "phone", "host", "program", "source", "stream")
            return attack if isinstance(value, str) and key in free else value

        changed = attack_texts(event)
        for result in changed.get("results", []):
            result["name"] = attack
        return json.dumps(changed)

    def test_the_policy_stops_what_were_not_escaped(self):
        self.make()
        text = self.page.read_text()
        for attack in ATTACKS[:2]:
            self.page.write_text(text.replace("<main>", "<main>" + attack))
            document, complaints = self.open()
            self.assertNotIn('id="attacked"', document)
            self.assertTrue(any("Content Security Policy" in one for one in complaints), complaints)
        # Without the policy, they do run: this test would see it.
        self.page.write_text(re.sub("<meta http-equiv[^>]*>", "", text).replace("<main>", "<main>" + ATTACKS[1]))
        self.assertIn('id="attacked"', self.open()[0])

    def test_many_frames(self):
        """A forged record of one stream with a gap."""
        self.make()
        lines = self.record.read_text().splitlines()
        index = max(place for place, line in enumerate(lines) if '"event":"frames"' in line)
        event = json.loads(lines[index])
        period = 33_333_333
        events = []
        for first in range(0, FRAMES, 4096):
            rows = min(4096, FRAMES - first)
            columns = {name: [(first + 1) * period] + [period] * (rows - 1)
                       for name in ("captured", "delivered", "returned")}
            columns["number"] = [first + (2 if first > FRAMES // 2 else 0)] + [1] * (rows - 1)
            events.append(json.dumps(event | {"columns": columns}))
        lines[index:index + 1] = events
        with self.record.open("w") as record:
            for place, line in enumerate(lines):
                record.write(json.dumps(json.loads(line) | {"sequence": place}) + "\n")
        quazor("report", self.record, "--output", self.page)
        self.assertLess(len(self.page.read_bytes()), MAX_PAGE_OF_MANY_FRAMES)
        document, complaints = self.open()
        self.assertEqual(complaints, [])
        self.assertIn(f"{FRAMES} frames, captured from 0.0333333 s", document)
        self.assertIn("2 frame numbers are missing, at 1 place", document)


if __name__ == "__main__":
    if BROWSER is None:
        print("skipped: chromium-headless-shell is not installed, so no page was opened in a browser")
        sys.exit(77)
    unittest.main()
