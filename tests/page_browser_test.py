#!/usr/bin/env python3
"""Opens report pages in a browser. Only a page of many frames has scripts: those that zoom.

usage: page_browser_test.py QUAZOR

Exit code 77: skipped, because the browser (Debian's chromium-headless-shell) or the library of plots (libjs-dygraphs)
is not installed.
"""

import base64
import hashlib
import html
import json
import os
import pathlib
import random
import re
import subprocess
import sys
import tempfile
import unittest

import browser
import page_reader

LIBRARY = pathlib.Path("/usr/share/javascript/dygraphs/dygraph.min.js")
PROGRAM = sys.argv.pop(1) if len(sys.argv) > 1 else ""
THOROUGH = os.environ.get("QUAZOR_THOROUGH") == "1"
MAX_PAGE_OF_ALL = 150_000
MAX_PAGE_OF_MANY_FRAMES = 8_000_000
FRAMES = 1_000_000 if THOROUGH else 100_000
MAX_READY = 3_000  # milliseconds, as all below
MAX_ZOOM = 50
PERIOD = 33_333_333  # nanoseconds, as the next
JITTER = 1_000_000
LATE = 20_000_000
# Zooms into the plot by its buttons.
PROBE = """
const ready = performance.now();
const plot = document.querySelector('.live').plot;
const rows = () => Array.from({length: plot.numRows()}, (_, row) => [plot.getValue(row, 0), plot.getValue(row, 1)]);
const press = name => {
  const before = performance.now();
  [...document.querySelectorAll('.buttons button')].find(one => one.textContent === name).click();
  return performance.now() - before;
};
const zooms = [], shown = [rows()];
for (let i = 0; i < 4; ++i) {
  zooms.push(press('Zoom in'));
  shown.push(rows());
}
zooms.push(press('Earlier'), press('Later'));
for (let i = 0; i < 4; ++i) zooms.push(press('Zoom out'));
press('Zoom in');
zooms.push(press('All'));
return {ready, zooms, shown, whole: rows()};
"""
# Each would leave a mark in the document.
ATTACKS = ("</style></title></script><script>document.documentElement.id='attacked'</script>",
           "<img src=x onerror=\"document.documentElement.id='attacked'\">", "\" autofocus onfocus=\"location='#attacked'",
           "\u202eevil\u2066", "x" * 100_000)


def quazor(*arguments, codes=(0,), environment=None):
    result = subprocess.run([PROGRAM, *map(str, arguments)], capture_output=True, text=True, timeout=300,
                            env=os.environ | (environment or {}))
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
        return browser.browse(self.page, self.directory, *switches)

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
        self.assertNotEqual(self.picture(), self.picture(browser.DARK))  # light and dark
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

    def make_with_many_frames(self, frames, environment=None):
        """The page of a forged record of one stream with jitter and a gap. Returns the times of capture."""
        quazor("run", "SingleCameraDiagnostic", "--record", self.record)
        lines = self.record.read_text().splitlines()
        index = next(place for place, line in enumerate(lines) if '"event":"frames"' in line)
        lines = [line for place, line in enumerate(lines) if place <= index or '"event":"frames"' not in line]
        event = json.loads(lines[index])
        draw = random.Random(1)
        times = [(number + 1) * PERIOD + draw.randrange(JITTER) for number in range(frames)]
        times[frames // 3] += LATE
        events = []
        for first in range(0, frames, 4096):
            part = times[first:first + 4096]
            column = [part[0]] + [after - before for before, after in zip(part, part[1:])]
            number = [first + (2 if first > frames // 2 else 0)] + [1] * (len(part) - 1)
            events.append(json.dumps(event | {"columns": {"number": number, "captured": column, "delivered": column,
                                                          "returned": column}}))
        lines[index:index + 1] = events
        with self.record.open("w") as record:
            for place, line in enumerate(lines):
                record.write(json.dumps(json.loads(line) | {"sequence": place}) + "\n")
        quazor("report", self.record, "--output", self.page, environment=environment)
        return times

    def scripted(self, script):
        """What the script, run after those of the page and allowed by its policy, leaves as the title; and the
        complaints of the console."""
        script = f"document.title = JSON.stringify((() => {{{script}}})());"
        digest = base64.b64encode(hashlib.sha256(script.encode()).digest()).decode()
        text = self.page.read_text()
        self.assertIn("; script-src ", text)
        text = text.replace("; script-src ", f"; script-src 'sha256-{digest}' ", 1)
        self.page.write_text(text.replace("</body>", f"<script>{script}</script></body>"))
        result = self.browse("--dump-dom")
        title = re.search("<title>(.*?)</title>", result.stdout, re.DOTALL).group(1)
        return json.loads(html.unescape(title)), [one for one in result.stderr.splitlines() if "CONSOLE" in one]

    def test_many_frames(self):
        times = self.make_with_many_frames(FRAMES)
        self.assertLess(len(self.page.read_bytes()), MAX_PAGE_OF_MANY_FRAMES)
        document, complaints = self.open()
        self.assertEqual(complaints, [])
        self.assertIn(f"{FRAMES} frames, captured from {times[0] / 1e9:.6g} s", document)
        self.assertIn("2 frame numbers are missing, at 1 place", document)
        facts, complaints = self.scripted(PROBE)
        self.assertEqual(complaints, [])
        print(f"{FRAMES} frames: {len(self.page.read_bytes())} bytes, ready after {facts['ready']:.0f} ms, "
              f"zooms {[round(one) for one in facts['zooms']]} ms")
        self.assertLess(facts["ready"], MAX_READY)
        self.assertLess(sorted(facts["zooms"])[len(facts["zooms"]) // 2], MAX_ZOOM)

    def test_a_zoomed_plot_shows_the_frames_of_the_record(self):
        times = self.make_with_many_frames(5_000)
        facts, complaints = self.scripted(PROBE)
        self.assertEqual(complaints, [])
        whole, *zoomed = facts["shown"]
        late = times[5_000 // 3] / 1e9
        # Most columns have few frames: what is late is there in all detail, and the greatest interval with it.
        interval = (times[5_000 // 3] - times[5_000 // 3 - 1]) / 1e6
        self.assertAlmostEqual(max(y for x, y in whole), interval, places=6)
        self.assertAlmostEqual(min(y for x, y in whole), (times[5_000 // 3 + 1] - times[5_000 // 3]) / 1e6, places=6)
        self.assertLess(min(abs(x - late) for x, y in whole), 1e-9)
        # In a part, every frame of the record is shown, and the ends of the whole.
        part = zoomed[-1]
        true = {round(after / 1e9, 9): (after - before) / 1e6 for before, after in zip(times, times[1:])}
        self.assertGreater(len(part), 100)
        for x, y in part:
            self.assertAlmostEqual(y, true[round(x, 9)], places=6)
        inner = [x for x, y in part[1:-1]]
        self.assertEqual(len(inner), sum(inner[0] <= x <= inner[-1] for x in true))
        self.assertEqual((part[0][0], part[-1][0]), (times[1] / 1e9, times[-1] / 1e9))
        self.assertEqual(facts["whole"], facts["shown"][0])  # after "All"

    def test_without_the_library_a_page_has_pictures_and_says_so(self):
        self.make_with_many_frames(1_000, environment={"XDG_DATA_DIRS": "/nonexistent"})
        text = self.page.read_text()
        self.assertNotIn("<script", text)
        self.assertIn("libjs-dygraphs", text)
        self.assertEqual(self.open()[1], [])

    def test_a_page_of_many_frames_runs_only_its_own_scripts(self):
        self.make_with_many_frames(1_000)
        self.page.write_text(self.page.read_text().replace("<main>", "<main>" + "".join(ATTACKS[:2])))
        document, complaints = self.open()
        self.assertNotIn('id="attacked"', document)
        self.assertEqual(sum("Content Security Policy" in one for one in complaints), 3, complaints)
        self.assertIn("<canvas", document)


if __name__ == "__main__":
    if browser.BROWSER is None:
        print("skipped: chromium-headless-shell is not installed, so no page was opened in a browser")
        sys.exit(77)
    if not LIBRARY.is_file():
        print("skipped: libjs-dygraphs is not installed, so no page was opened in a browser")
        sys.exit(77)
    unittest.main()
