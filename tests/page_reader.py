"""Parses the HTML page of a run back into records, with Python's own parser."""

import html.parser
import re

from report_limits import rows_of
from report_readers import Error, Limit, Result, blurred, number, printable, text_limit

EMPTY = {"meta", "input", "wbr"}  # elements without an end
MAX_NAME = 160  # columns of a name in a heading


class Node:
    """An element, or the document."""

    def __init__(self, tag, attributes=()):
        self.tag = tag
        self.attributes = dict(attributes)
        self.children = []  # nodes and texts

    def all(self, tag, kind=None):
        """The elements below this one with that tag and class, in order."""
        for one in self.children:
            if isinstance(one, Node):
                if one.tag == tag and (kind is None or kind in one.attributes.get("class", "").split()):
                    yield one
                yield from one.all(tag, kind)

    def first(self, tag, kind=None):
        return next(self.all(tag, kind), None)

    @property
    def text(self):
        return "".join(one if isinstance(one, str) else one.text for one in self.children)


class Parser(html.parser.HTMLParser):
    """Builds the tree of a page. Refuses one whose elements are not closed in order."""

    def __init__(self):
        super().__init__(convert_charrefs=True)
        self.document = Node("document")
        self.open = [self.document]

    def handle_starttag(self, tag, attributes):
        node = Node(tag, attributes)
        self.open[-1].children.append(node)
        if tag not in EMPTY:
            self.open.append(node)

    def handle_startendtag(self, tag, attributes):
        self.open[-1].children.append(Node(tag, attributes))

    def handle_endtag(self, tag):
        if self.open[-1].tag != tag:
            raise ValueError(f"</{tag}> ends <{self.open[-1].tag}>")
        self.open.pop()

    def handle_data(self, text):
        self.open[-1].children.append(text)


def tree_of(content):
    parser = Parser()
    parser.feed(content.decode("utf-8"))
    parser.close()
    if len(parser.open) > 1:
        raise ValueError(f"<{parser.open[-1].tag}> is not closed")
    return parser.document


def table(section, caption):
    """The cells of the table whose caption matches, without the header; none if there is no such table."""
    for one in section.all("table"):
        if re.fullmatch(caption, one.first("caption").text):
            return [[cell for cell in row.children if isinstance(cell, Node)] for row in one.first("tbody").all("tr")]
    return []


def verdict_of(badge):
    return "none" if "none" in badge.attributes["class"] else badge.text.split("\u00a0")[1]


def limits_of(section):
    """The limits of the results, a list for each result: its name, value and unit, and a limit, its source, its severity
    and the verdict."""
    found = next((one for one in section.all("table") if one.first("caption").text == "Results and their limits"), None)
    if found is None:
        return []
    columns = [one.text for one in found.first("thead").all("th")][3:]
    groups = []
    for row in found.first("tbody").all("tr"):
        cells = [one for one in row.children if isinstance(one, Node)]
        if cells[0].tag == "th":
            left = int(cells[0].attributes.get("rowspan", "1"))
            groups.append([])
            name, value, unit = cells[:3]
            cells = cells[3:]
        left -= 1
        if left < 0 or len(cells) != len(columns):
            raise ValueError(f"the rows of {name.text} do not fit their table")
        shown = dict(zip(columns, cells))
        verdict = verdict_of(shown["Verdict"].first("span"))
        svg = shown["In the limit"].first("svg") if "In the limit" in shown else None
        if svg is not None and (svg.attributes["aria-label"] == "inside the limit") != (verdict == "pass"):
            raise ValueError(f"the bar of {name.text} contradicts the verdict {verdict}")
        source = shown.get("Limit from")
        limit, severity = shown["Limit"].text, ""
        if source is not None and source.attributes.get("class") != "soft":
            severity = "fail" if source.first("small") is None else "warn"
            limit += f" ({source.children[0]})"
        whole = number(value.attributes.get("title", value.text))
        groups[-1].append(Result(name.text, whole, unit.text, text_limit(limit), verdict, severity))
    return groups


RANKS = ("fail", "error", "skip", "warn", "pass", "none")


def results_of(section):
    """The rows of results. The worst come first, and a result without a limit of the plug-in has no row for it."""
    groups = limits_of(section)
    ranks = [min(RANKS.index(one.verdict) for one in group) for group in groups]
    if ranks != sorted(ranks):
        raise ValueError(f"the worst results are not first: {ranks}")
    rows = []
    for group in groups:
        if group[0].severity:
            rows.append(group[0]._replace(limit=None, verdict="none", severity=""))
        rows += group
    return rows


def in_order_of_page(rows):
    """The rows of results as they are in a record, in the order of a page."""
    groups = []
    for one in rows:
        if one.severity:
            groups[-1].append(one)
        else:
            groups.append([one])
    groups.sort(key=lambda group: min(RANKS.index(one.verdict) for one in group))
    return [one for group in groups for one in group]


def error_of(paragraph):
    soft = list(paragraph.all("span", "soft"))[-1].text
    domain, code = re.fullmatch(r"(?s)\((.*) code (-?\d+)\)", soft).groups()
    return Error(domain, int(code), paragraph.first("strong").text)


def read_section(section):
    """One diagnostic."""
    details = section.first("details")
    title = next(one for one in details.first("summary").children if isinstance(one, Node))
    whole = section.first("p", "whole")
    badge = title.first("span", "badge")
    trial = title.first("span", "soft")
    paragraphs = [one for one in details.children if isinstance(one, Node) and one.tag == "p" and one is not whole]
    body = [one for one in paragraphs[1:] if "class" not in one.attributes]
    verdict = verdict_of(badge)
    return {
        "name": whole.text[len("Whole name: "):] if whole else title.children[0][:-1],
        "trial": trial.text[1:-1] if trial else "",
        "verdict": verdict,
        "summary": paragraphs[0].text,
        "skip": body[0].text if verdict == "skip" else None,
        "errors": [] if verdict == "skip" else [error_of(one) for one in body],
        "results": results_of(section),
        "measurements": [(row[0].text, number(row[1].attributes.get("title", row[1].text)), row[2].text)
                         for row in table(section, "Measurements of the experiment")],
        "parameters": [(row[1].text, row[0].text, number(row[2].text))
                       for row in table(section, "Parameters and where .*") if not row[2].text.startswith("not set (")],
        "log": [(row[1].text, row[2].text) for row in table(section, r"\d+ lines?, by the phone's clock")],
        "seed": int(paragraphs[-1].text[len("Seed "):]),
    }


def shown_lines(text):
    """Like printable(), for a text that keeps its newlines and tabs."""
    return "".join(one if one in "\n\t" else printable(one) for one in text)


def in_page(value):
    """The two characters that are no text in a page either."""
    if isinstance(value, str):
        return re.sub("[\ufffe\uffff]", "\ufffd", value)
    if isinstance(value, tuple) and hasattr(value, "_fields"):
        return type(value)(*map(in_page, value))
    if isinstance(value, dict):
        return {key: in_page(one) for key, one in value.items()}
    if isinstance(value, (list, tuple)):
        return type(value)(map(in_page, value))
    return value


def expected(record):
    def shown(one):
        limit = one.limit and one.limit._replace(name=printable(one.limit.name))
        return one._replace(name=printable(one.name), unit=printable(one.unit), limit=limit)

    return in_page({
        "name": printable(record["name"]),
        "trial": record["trial"],
        "verdict": record["verdict"],
        "summary": printable(record["summary"]),
        "skip": record["skip"] and f"{record['skip'][0]}: {printable(record['skip'][1])}",
        "errors": [Error(printable(one.domain), one.code, printable(one.message)) for one in record["errors"]],
        "results": [shown(one) for one in
                    in_order_of_page(rows_of(record, lambda label, *_: Limit(label, None, None)))],
        "measurements": [(printable(name), value, printable(unit)) for name, value, unit in record["measurements"]],
        "parameters": [(half, printable(name), value) for half, values in record.get("parameters", {}).items()
                       for name, value in values.items()],
        "log": [(level, shown_lines(text)) for level, text in record.get("log", [])],
        "seed": record["seed"],
    })


class Page:
    """What a page of one run says."""

    def __init__(self, content):
        document = tree_of(content)
        if list(document.all("script")) or list(document.all("img")) or list(document.all("link")):
            raise ValueError("the page runs or loads something")
        self.verdict = document.first("span", "word").text
        heading = document.first("h1")
        self.summary = heading.first("span", "sentence").text
        self.device = heading.first("span", "device").text
        self.stop = document.first("p", "stop")
        self.records = [read_section(one) for one in document.all("section", "diagnostic")]
        self.facts = [(row[0].text, row[1].text) for row in table(document, "What was run, .*")]
        self.never = [row.children[0].text for row in document.all("tr", "never")]


def kind_of_phone(phone):
    return "Linux binding" if phone.startswith("linux:") else "simulated phone" if phone else "unknown phone"


def facts_of(run):
    """The rows of the table about a run that every run has."""
    rows = [("Analysis" if "analyzed" in run else "Run", run["id"]), ("Date", run["date"]), ("Phone", run["phone"]),
            ("Seed", str(run["seed"])),
            ("Kind of phone", kind_of_phone(run["phone"])), ("Program", f"quazor {run['program']}"),
            *(("Plug-in", one) for one in run["plugins"]), *((f"Tag {key}", one) for key, one in run["tags"].items())]
    return {(name, printable(text)) for name, text in in_page(rows)}


def compare(comparison, name, content, run, of_experiments, records, due, interrupted, summary):
    """Checks the page of a run. `due` is the verdict on it, and `summary` the line that counts diagnostics."""
    page = Page(content)
    word = {"pass": "DONE" if of_experiments else "PASS"}.get(due, due.upper())
    comparison.check(f"{name} html: verdict", page.verdict, word)
    comparison.check(f"{name} html: summary", page.summary, summary)
    device = kind_of_phone(run["phone"])
    comparison.check(f"{name} html: device", page.device.partition(":")[0], device)
    comparison.check(f"{name} html: end", page.stop is not None, interrupted is not None)
    missing = set(blurred(sorted(facts_of(run)))) - set(blurred(page.facts))
    comparison.check(f"{name} html: facts", missing, set())
    comparison.check(f"{name} html: entries", len(page.records), len(records))
    for place, (one, record) in enumerate(zip(page.records, records)):
        comparison.check_record(f"{name} {place} html", blurred(one), blurred(expected(record)))
