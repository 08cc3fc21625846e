"""What the tests of the formats share: running the program, its examples, a report of hostile texts."""
import functools
import html.parser
import os
import pathlib
import shutil
import subprocess
import unittest

TREE = pathlib.Path(__file__).resolve().parents[3]
EXAMPLES = sorted(p.stem for p in (TREE / "examples").glob("*.json"))
FORMATS = ("table", "json", "ndjson", "events", "csv", "html", "redfish", "prometheus", "otlp")
PROGRAM = None


def set_program(program):
    global PROGRAM
    PROGRAM = program


def run_bytes(*arguments, columns="100", **settings):
    environment = dict(os.environ, COLUMNS=columns, TZ="UTC")
    environment.pop("IPMISEL_PASSWORD", None)
    return subprocess.run([PROGRAM, *map(str, arguments)], cwd=TREE, env=environment,
                          **{"capture_output": True, **settings})


def run(*arguments, columns="100", status=None):
    done = run_bytes(*arguments, columns=columns)
    if status is not None and done.returncode != status:
        raise AssertionError(f"{arguments}: status {done.returncode}, {done.stderr.decode()}")
    return done.stdout.decode()


@functools.lru_cache(None)  # an example gives the same each time
def collect(example, form, columns="100"):
    return run("collect", "--from", f"sim:examples/{example}.json", "--format", form, columns=columns)


def tool(name):
    found = shutil.which(name)
    if not found:
        raise unittest.SkipTest(f"SKIPPED: {name} is not installed")
    return found


class Page(html.parser.HTMLParser):
    """The elements of a page, their ids, links and texts."""

    def __init__(self, text):
        super().__init__()
        self.ids, self.links, self.tags, self.text = [], [], [], ""
        self.feed(text)

    def handle_starttag(self, tag, attributes):
        values = dict(attributes)
        self.tags.append(tag)
        if "id" in values:
            self.ids.append(values["id"])
        if values.get("href", "").startswith("#"):
            self.links.append(values["href"][1:])

    def handle_data(self, data):
        if not self.tags or self.tags[-1] not in ("style", "script"):
            self.text += data


# Every control character, marks of direction, markup, formulas of a spreadsheet, 64 kB.
HOSTILE_TEXTS = [
    "".join(map(chr, range(1, 160))), "\u202eevil\u2066", "<script>alert(1)</script>", "</script>", "=1+1",
    "+cmd|' /C calc'!A0", "-2+3", "@SUM(A1)", "\tx", "\r\nx", 'say "hi", twice\n', "\ufeffx", "a\x00b",
    "\ud7ff\U000e0001\U0001f4a9", "x" * 65536]


def hostile_report(count=0):
    """A saved report whose texts and numbers are as bad as they come; or one of so many plain events."""
    instances = []
    for i in range(count or len(HOSTILE_TEXTS)):
        text = HOSTILE_TEXTS[i % len(HOSTILE_TEXTS)] if not count else f"event {i}"
        when = ["1969-12-31T23:59:59Z", "2038-01-19T03:14:08Z", "2100-01-01T00:00:00Z"][i % 3]
        instances.append({"class": "IPMI_Event", "properties": {
            "Key": f"{i:032x}", "Node": 1, "RecordID": i, "RecordType": 2, "Time": when, "Severity": "critical",
            "State": "open", "Sensor": text, "Part": text, "Text": text, "Sentence": text, "Unit": text,
            "Reading": 1e308, "Raw": "00" * 16}})
        if not count:
            instances += [{"class": "IPMI_Sensor", "properties": {
                              "Node": 1, "Name": text, "Status": "ok", "Reading": -1e308, "UpperCritical": 1e308}},
                          {"class": "IPMI_FRU", "properties": {"Node": 1, "Name": text, "SerialNumber": text}},
                          {"class": "IPMI_Finding", "properties": {
                              "Severity": "warning", "Title": text, "SerialNumber": text, "Evidence": [text],
                              "Events": [f"{i:032x}", text]}},
                          {"class": "IPMI_Controller", "properties": {"Node": 1, "GUID": text}}]
    return {"format": "ipmisel/1", "source": HOSTILE_TEXTS[2], "collected": "2026-03-09T18:42:02Z", "complete": False,
            "systems": [{"name": HOSTILE_TEXTS[2]}], "plugin": {"name": "IPMISEL", "version": "1", "interface": "1"},
            "status": {"code": 0, "text": ""}, "instances": instances, "notices": [HOSTILE_TEXTS[0]],
            "completeness": [{"node": 1, "log": {"announced": None, "read": 0}, "sensors": {}, "faults": [
                {"what": HOSTILE_TEXTS[2], "problem": HOSTILE_TEXTS[0]}]}]}
