"""Holds every format of every example against a program that reads it in earnest.

usage: formats_test.py PROGRAM TREE [--update]     --update writes the golden files anew
"""
import base64
import csv
import html.parser
import io
import json
import os
import pathlib
import re
import shutil
import sqlite3
import subprocess
import sys
import tempfile
import unittest

PROGRAM, TREE = sys.argv[1], pathlib.Path(sys.argv[2])
UPDATE = "--update" in sys.argv
GOLDEN = TREE / "tests/program/reports/golden"
ENTERPRISES = pathlib.Path("/usr/share/misc/enterprise-numbers.txt")
EXAMPLES = sorted(p.stem for p in (TREE / "examples").glob("*.json"))
SCHEMAS = os.environ.get("IPMISEL_REDFISH_SCHEMAS")
# What would steer a terminal or a reader if it came through.
STEERING = re.compile("[\x00-\x08\x0b\x0c\x0e-\x1f\x7f-\x9f\u200b-\u200f\u2028-\u202e\u2060-\u206f\ufeff]")


def run(*arguments, columns="100", status=None):
    environment = dict(os.environ, COLUMNS=columns, TZ="UTC")
    environment.pop("IPMISEL_PASSWORD", None)
    done = subprocess.run([PROGRAM, *map(str, arguments)], cwd=TREE, capture_output=True, env=environment)
    if status is not None and done.returncode != status:
        raise AssertionError(f"{arguments}: status {done.returncode}, {done.stderr.decode()}")
    return done.stdout.decode()


def collect(example, form, columns="100"):
    return run("collect", "--from", f"sim:examples/{example}.json", "--format", form, columns=columns)


def tool(name):
    found = shutil.which(name)
    if not found:
        raise unittest.SkipTest(f"SKIPPED: {name} is not installed")
    return found


def validator(schema, store):
    try:
        import warnings
        warnings.simplefilter("ignore", DeprecationWarning)
        import jsonschema
    except ImportError:
        raise unittest.SkipTest("SKIPPED: python3-jsonschema is not installed")

    class Resolver(jsonschema.RefResolver):
        """What is not there resolves to anything."""

        def resolve_fragment(self, document, fragment):
            return super().resolve_fragment(document, fragment) if document else {}

    resolver = Resolver(schema.get("$id", ""), schema, store=store,
                        handlers={"http": lambda uri: {}, "": lambda uri: store[uri]})
    return jsonschema.validators.validator_for(schema)(schema, resolver=resolver)


def our_schema(name):
    store = {p.name: json.loads(p.read_text()) for p in (TREE / "docs/schema").glob("*.json")}
    return validator(store[name], store), store


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


class Examples(unittest.TestCase):
    def each(self, form):
        for example in EXAMPLES:
            with self.subTest(example=example):
                yield example, collect(example, form)

    def test_table_and_prometheus_are_as_they_were(self):
        if UPDATE:
            GOLDEN.mkdir(exist_ok=True)
        if not GOLDEN.exists():
            raise unittest.SkipTest("SKIPPED: there are no golden files; --update writes them")
        if not ENTERPRISES.exists():  # the table names a controller's manufacturer by it
            raise unittest.SkipTest(f"SKIPPED: {ENTERPRISES} (package ipmitool) is not there")
        for example in EXAMPLES:
            for form, columns in (("table", "100"), ("table", "160"), ("prometheus", "")):
                text = re.sub(r"(?m)^.*_duration_seconds.*\n", "", collect(example, form, columns))
                file = GOLDEN / f"{example}.{form}{columns}"
                if UPDATE:
                    file.write_text(text)
                with self.subTest(file=file.name):
                    self.assertEqual(text, file.read_text(),
                                     "a meant change: run formats_test.py PROGRAM TREE --update and look at "
                                     "the difference")
                    if form == "table":
                        self.assertLessEqual(max(map(len, text.splitlines())), int(columns))

    def test_reports_and_lines_keep_to_their_schemas(self):
        report, store = our_schema("report.json")
        for _, text in self.each("json"):
            report.validate(json.loads(text))
        line = validator({"$ref": "report.json#/$defs/line"}, store)
        for _, text in self.each("ndjson"):
            for each in text.splitlines():
                line.validate(json.loads(each))
        events, _ = our_schema("events.json")
        for _, text in self.each("events"):
            lines = [json.loads(each) for each in text.splitlines()]
            self.assertIn("summary", lines[-1])
            for each in lines:
                events.validate(each)

    def test_csv_has_what_events_has(self):
        for example, text in self.each("csv"):
            self.assertTrue(text.endswith("\r\n"))
            rows = list(csv.DictReader(io.StringIO(text, newline=""), strict=True))
            events = [e for e in map(json.loads, collect(example, "events").splitlines()) if "Key" in e]
            self.assertEqual([row["Key"] for row in rows], [e["Key"] for e in events])
            for row, event in zip(rows, events):
                self.assertEqual(row["Text"], event["Text"])
                self.assertEqual(row["Reading"], str(event["Reading"]) if "Reading" in event else "")

    def test_sqlite_and_jq_take_them(self):
        sqlite, jq = tool("sqlite3"), tool("jq")
        with tempfile.TemporaryDirectory() as folder:
            file = pathlib.Path(folder, "events.csv")
            file.write_bytes(collect("rack-server", "csv").encode())
            query = "select count(*), sum(Severity='critical') from events where Reading+0 >= 0"
            out = subprocess.run([sqlite, "-csv", ":memory:", f".import {file} events", query],
                                 capture_output=True, text=True, check=True).stdout
        events = [e for e in map(json.loads, collect("rack-server", "events").splitlines()) if "Key" in e]
        critical = sum(e.get("Severity") == "critical" for e in events)
        self.assertEqual(out.strip(), f"{len(events)},{critical}")
        counted = subprocess.run([jq, "-s", 'map(select(.Severity == "critical")) | length'], text=True,
                                 input=collect("rack-server", "events"), capture_output=True, check=True).stdout
        self.assertEqual(int(counted), critical)

    def test_redfish_keeps_to_the_schema_of_dmtf(self):
        if not SCHEMAS:
            raise unittest.SkipTest("SKIPPED: IPMISEL_REDFISH_SCHEMAS names no folder with DMTF's schemas")
        store = {}
        for file in pathlib.Path(SCHEMAS).glob("*.json"):
            schema = json.loads(file.read_text())
            store[f"http://redfish.dmtf.org/schemas/v1/{file.name}"] = schema
            if file.name.startswith("LogEntry.v"):  # of which a collection's entries are
                store["http://redfish.dmtf.org/schemas/v1/LogEntry.json"] = schema
        entry = validator({"$ref": "http://redfish.dmtf.org/schemas/v1/LogEntry.json#/definitions/LogEntry"}, store)
        collection = validator(
            {"$ref": "http://redfish.dmtf.org/schemas/v1/LogEntryCollection.json#/definitions/LogEntryCollection"},
            store)
        decoder = json.JSONDecoder()
        for example, text in self.each("redfish"):
            documents = []
            while text.strip():
                document, end = decoder.raw_decode(text)
                text = text[end:].lstrip()
                documents.append(document)
            self.assertEqual(len(documents), 2 if example == "two-node" else 1)
            for document in documents:
                collection.validate(document)
                self.assertEqual(document["Members@odata.count"], len(document["Members"]))
                for member in document["Members"]:
                    entry.validate(member)
                    self.assertEqual(len(base64.b64decode(member["DiagnosticData"])), 16)

    def test_promtool_takes_metrics_and_rules(self):
        promtool = tool("promtool")
        for _, text in self.each("prometheus"):
            done = subprocess.run([promtool, "check", "metrics"], input=text, text=True, capture_output=True)
            self.assertEqual((done.returncode, done.stderr), (0, ""), text)
        rules = TREE / "examples/prometheus/ipmisel.test.yml"
        done = subprocess.run([promtool, "test", "rules", rules.name], cwd=rules.parent, capture_output=True)
        self.assertEqual(done.returncode, 0, done.stdout + done.stderr)

    def test_otlp_has_the_fields_of_its_proto_files(self):
        for example, text in self.each("otlp"):
            for line in text.splitlines():
                for resource in json.loads(line)["resourceLogs"]:
                    for scope in resource["scopeLogs"]:
                        for record in scope["logRecords"]:
                            self.assertRegex(record["timeUnixNano"], "^[0-9]+$")
                            self.assertIn(record["severityNumber"], (0, 9, 10, 13, 18, 21))
                            for each in record["attributes"]:
                                self.assertEqual(list(each), ["key", "value"])
            self.assertTrue(text)

    def test_html_holds_together_without_anything_else(self):
        for _, text in self.each("html"):
            page = Page(text)
            self.assertEqual(len(page.ids), len(set(page.ids)))
            self.assertLessEqual(set(page.links), set(page.ids))
            self.assertNotRegex(text, r"(?i)(src|href)=\"?(https?:)?//|url\(|@import| style=| on[a-z]+=")
            self.assertLess(len(text), 1 << 20)
        tidy = tool("tidy")
        done = subprocess.run([tidy, "-q", "-e"], input=collect("rack-server", "html"), text=True,
                              capture_output=True)
        self.assertNotIn("Error", done.stderr)

    def test_a_browser_runs_the_page_and_nothing_else(self):
        browser = tool("chromium")
        with tempfile.TemporaryDirectory() as folder:
            page = pathlib.Path(folder, "page.html")
            page.write_text(collect("rack-server", "html"))
            dom = subprocess.run(
                [browser, "--headless=new", "--no-sandbox", "--disable-gpu", f"--user-data-dir={folder}/profile",
                 "--enable-logging=stderr", "--dump-dom", f"file://{page}"], capture_output=True, text=True,
                timeout=120)
        self.assertNotIn("Content Security Policy", dom.stderr)
        count = collect("rack-server", "events").count('"Key"')
        self.assertIn(f"{count} events</output>", dom.stdout)  # the filters are alive

    def test_a_saved_report_gives_the_same(self):
        with tempfile.TemporaryDirectory() as folder:
            file = pathlib.Path(folder, "report.json")
            for example in EXAMPLES:
                if example == "broken-bmc":  # answers otherwise when more is asked
                    continue
                file.write_text(collect(example, "json"))
                for form in ("table", "json", "ndjson", "events", "csv", "html", "redfish", "prometheus", "otlp"):
                    if form == "html" and example == "no-bmc":  # the advice is another
                        continue
                    fresh = collect(example, form)
                    saved = run("report", file, "--format", form)
                    if form in ("html", "prometheus"):  # how long it took is not in a report
                        fresh = re.sub(r"(?m)^.*(_duration_seconds|<dt>Took</dt>).*\n", "", fresh)
                    if form == "events":  # for which alone fewer sensors are read
                        fresh, saved = (re.sub(r'"readings":{[^}]*},', "", text) for text in (fresh, saved))
                    with self.subTest(example=example, form=form):
                        self.assertEqual(saved, fresh)
                self.assertEqual(run("diff", file, file, status=0), "")


class Hostile(unittest.TestCase):
    """A saved report whose texts and numbers are as bad as they come."""

    TEXTS = ["".join(map(chr, range(1, 160))), "\u202eevil\u2066", "<script>alert(1)</script>", "</script>",
             "=1+1", "+cmd|' /C calc'!A0", "-2+3", "@SUM(A1)", "\tx", "\r\nx", 'say "hi", twice\n', "\ufeffx",
             "a\x00b", "\ud7ff\U000e0001\U0001f4a9", "x" * 65536]

    def report(self, count=0):
        instances = []
        for i in range(count or len(self.TEXTS)):
            text = self.TEXTS[i % len(self.TEXTS)] if not count else f"event {i}"
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
        return {"format": "ipmisel/1", "source": self.TEXTS[2], "collected": "2026-03-09T18:42:02Z", "complete": False,
                "systems": [{"name": self.TEXTS[2]}], "plugin": {"name": "IPMISEL", "version": "1", "interface": "1"},
                "status": {"code": 0, "text": ""}, "instances": instances, "notices": [self.TEXTS[0]],
                "completeness": [{"node": 1, "log": {"announced": None, "read": 0}, "sensors": {}, "faults": [
                    {"what": self.TEXTS[2], "problem": self.TEXTS[0]}]}]}

    def write(self, folder, **kwargs):
        file = pathlib.Path(folder, "hostile.json")
        file.write_text(json.dumps(self.report(**kwargs)))
        return file

    def test_every_format_stays_well_formed(self):
        with tempfile.TemporaryDirectory() as folder:
            file = self.write(folder)
            for form in ("table", "json", "ndjson", "events", "csv", "html", "redfish", "prometheus", "otlp"):
                text = run("report", file, "--format", form, status=4)
                with self.subTest(form=form):
                    self.assertNotRegex(text, STEERING)
            json.loads(run("report", file, "--format", "json"))
            json.loads(run("report", file, "--format", "redfish"))
            for form in ("ndjson", "events", "otlp"):
                list(map(json.loads, run("report", file, "--format", form).split("\n")[:-1]))
            rows = list(csv.DictReader(io.StringIO(run("report", file, "--format", "csv"), newline=""), strict=True))
            self.assertEqual(len(rows), len(self.TEXTS))
            for row in rows:
                self.assertNotRegex(row["Text"], r"^[=+\-@\t\r]")
                self.assertEqual(row["Reading"], "1e+308")
            page = Page(run("report", file, "--format", "html"))
            self.assertEqual(page.tags.count("script"), 1)
            self.assertIn("<script>alert(1)</script>", page.text)

    def test_a_file_that_is_no_report_is_refused(self):
        good = json.dumps(self.report())
        with tempfile.TemporaryDirectory() as folder:
            file = pathlib.Path(folder, "bad.json")
            for text in ("", "[]", "{}", good[:-1], good.replace("ipmisel/1", "ipmisel/2"),
                         good.replace('"instances": [', '"instances": 1, "x": ['), "\x00" * 100):
                file.write_text(text)
                with self.subTest(text=text[:40]):
                    self.assertEqual(run("report", file, status=2), "")
                    run("diff", file, file, status=2)
            run("report", pathlib.Path(folder, "none"), status=2)

    def test_the_longest_log_stays_readable_in_little_memory(self):
        with tempfile.TemporaryDirectory() as folder:
            file = self.write(folder, count=65535)
            for form in ("table", "ndjson", "events", "csv", "redfish", "otlp", "prometheus", "html"):
                out = pathlib.Path(folder, "out")
                done = subprocess.run(["/usr/bin/env", "python3", "-c", (
                    "import resource,subprocess,sys\n"
                    "subprocess.run(sys.argv[1:])\n"
                    "print(resource.getrusage(resource.RUSAGE_CHILDREN).ru_maxrss)"), PROGRAM, "report", file,
                    "--format", form, "--output", out], capture_output=True, text=True)
                with self.subTest(form=form):
                    self.assertGreater(out.stat().st_size, 500)
                    if form in ("ndjson", "events", "csv", "redfish", "otlp"):
                        self.assertLess(int(done.stdout.split()[-1]), 32 << 10)
                    if form == "html":
                        self.assertIn("65535 events, folded", out.read_text())


class Differences(unittest.TestCase):
    def test_what_changed_is_told_by_part_firmware_and_problem(self):
        def report(folder, name, serial, firmware, title):
            file = pathlib.Path(folder, name)
            file.write_text(json.dumps({
                "format": "ipmisel/1", "complete": True, "completeness": [], "instances": [
                    {"class": "IPMI_FRU", "properties": {"Name": "PSU 1", "SerialNumber": serial}},
                    {"class": "IPMI_FRU", "properties": {"Name": "PSU 2", "SerialNumber": "same"}},
                    {"class": "IPMI_Controller", "properties": {"FirmwareVersion": firmware}},
                    {"class": "IPMI_Finding", "properties": {"Title": title, "Severity": "warning"}}]}))
            return file
        with tempfile.TemporaryDirectory() as folder:
            before = report(folder, "a", "S1", "1.0", "fan stopped")
            after = report(folder, "b", "S2", "1.1", "fan slow")
            self.assertEqual(run("diff", before, after, status=1),
                             "Problems\n+ fan slow: warning\n- fan stopped: warning\n"
                             "Parts\n- PSU 1: serial number S1\n+ PSU 1: serial number S2\n"
                             "Firmware\n- Controller: 1.0\n+ Controller: 1.1\n")
            self.assertEqual(run("diff", before, before, status=0), "")


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1])
