"""Made-up records: the lines of a real one with other results, tags and dates, and verdicts that follow from them."""

import datetime
import json
import sqlite3
import uuid

from command_line_fixture import CommandLineTest, quazor

DIAGNOSTIC = "Made.Up"
UNIT = "mm"
FIRST_DAY = datetime.date(2026, 11, 1)


def day(number):
    """The day with that number, from 0, as the program's options take it."""
    return str(FIRST_DAY + datetime.timedelta(days=number))


def bound(value):
    return None if value is None else [[value, UNIT], False]


def result(name, value, lower=None, upper=None):
    found = {"name": name, "measurement": [value, UNIT]}
    if lower is not None or upper is not None:
        found["limit"] = {"name": "L", "lower": bound(lower), "upper": bound(upper)}
    return found


def verdict_of(results):
    def fails(one):
        limit, value = one.get("limit"), one["measurement"][0]
        return limit and ((limit["lower"] and value < limit["lower"][0][0]) or
                          (limit["upper"] and value > limit["upper"][0][0]))
    return "fail" if any(fails(one) for one in results) else "pass"


def record_lines(results, serial="", station="", on=0, second=0, error=False, **began):
    """The lines of a record of one diagnostic with these results, on that day."""
    date = f"{day(on)}T{second // 3600:02}:{second // 60 % 60:02}:{second % 60:02}.000000000Z"
    tags = [[key, value] for key, value in (("serial", serial), ("station", station)) if value]
    events = [
        {"record": 2, "event": "runBegan", "program": "0.1.0", "contract": 3, "date": date, "plugins": [],
         "phone": "phone.json", "seed": 0, "ofExperiments": False, "names": [DIAGNOSTIC], "limits": [],
         "id": uuid.uuid4().hex, "host": "made-up", "tags": tags, **began},
        {"event": "diagnosticBegan", "name": DIAGNOSTIC, "summary": "", "experiment": "E", "analysis": "A",
         "experimentOnly": False, "parameters": {"experiment": [], "analysis": []}, "seed": 0, "date": date},
        {"event": "stageBegan", "stage": "analyze", "date": date},
        {"event": "stageEnded", "stage": "analyze", "nanoseconds": 0, "date": date}]
    if error:
        events.append({"event": "failed", "stage": "analyze",
                       "error": {"domain": "Made", "code": 7, "userInfo": []}})
    else:
        events.append({"event": "found", "results": results})
    events += [{"event": "diagnosticCompleted"},
               {"event": "diagnosticEnded", "verdict": "error" if error else verdict_of(results), "date": date},
               {"event": "runEnded", "date": date}]
    return [json.dumps({"sequence": number, **event}) + "\n" for number, event in enumerate(events)]


class StoreTest(CommandLineTest):
    def setUp(self):
        super().setUp()
        self.store = self.directory / "made/records.sqlite"
        self.folder = self.directory / "records"
        self.folder.mkdir()
        self.made = 0

    def make(self, *arguments, name=None, **options):
        """A made-up record in the folder."""
        self.made += 1
        file = self.folder / (name or f"{self.made:05}.jsonl")
        file.write_text("".join(record_lines(*arguments, second=self.made, **options)))
        return file

    def records(self, *arguments, code=0):
        done = quazor("records", *arguments, "--store", self.store)
        self.assertEqual(done.returncode, code, done.stdout + done.stderr)
        return done

    def rows(self, *arguments, table=None):
        """The rows of an answer's first table, or of the one of that name."""
        document = json.loads(self.records(*arguments, "--format", "json").stdout)
        return document[table or next(iter(document))]

    def imported(self, **expected):
        counts = self.rows("import", self.folder)[0]
        del counts["records"]
        self.assertEqual({key: count for key, count in counts.items() if count}, expected)

    def content(self):
        """What the store has, however it got there: without numbers, and with rounded means."""
        database = sqlite3.connect(self.store)
        self.assertEqual(database.execute("PRAGMA integrity_check").fetchone(), ("ok",))
        runs = "SELECT hex(digest), run, date, station, serial, whole, counted, verdict FROM run ORDER BY 1"
        results = ("SELECT hex(digest), c.name, c.lower, c.upper, r.number, r.value, r.verdict FROM result r "
                   "JOIN run ON run.id = r.run JOIN characteristic c ON c.id = r.characteristic ORDER BY 1, 2, 3, 4, 5")
        summary = ("SELECT c.name, c.lower, c.upper, day, station, runs, n, round(mean, 9), round(m2, 9), low, high, "
                   "fractional, passed, failed FROM summary s JOIN characteristic c ON c.id = s.characteristic "
                   "ORDER BY 1, 2, 3, 4, 5")
        content = [database.execute(one).fetchall() for one in (runs, results, summary)]
        database.close()
        return content
