"""Holds every format of every example, and each with hostile texts.

usage: formats_test.py PROGRAM TREE [--update]     --update writes the golden files anew

The programs that the formats are for take them in tests/peers/peers_formats_test.py.
"""
import base64
import csv
import io
import json
import os
import pathlib
import re
import signal
import subprocess
import sys
import tempfile
import unittest

import formats_support
from formats_support import EXAMPLES, FORMATS, HOSTILE_TEXTS, TREE, Page, collect, hostile_report, run, run_bytes

formats_support.set_program(sys.argv[1])
UPDATE = "--update" in sys.argv
GOLDEN = TREE / "tests/program/reports/golden"
ENTERPRISES = pathlib.Path("/usr/share/misc/enterprise-numbers.txt")
SCHEMAS = os.environ.get("IPMISEL_REDFISH_SCHEMAS")
# What would steer a terminal or a reader if it came through.
STEERING = re.compile("[\x00-\x08\x0b\x0c\x0e-\x1f\x7f-\x9f\u200b-\u200f\u2028-\u202e\u2060-\u206f\ufeff]")
# Of big outputs schemas and rules stand for golden files; these are held to the letter.
HELD = {example: ("table100", "table160", "prometheus") for example in EXAMPLES}
HELD["no-bmc"] = ("table100", *(form for form in FORMATS if form not in ("table", "html")))
HELD["two-node"] += ("csv", "events", "redfish", "otlp")


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
    return jsonschema.validators.validator_for(schema)(schema, resolver=resolver,
                                                       format_checker=jsonschema.FormatChecker())


def our_schema(name):
    store = {p.name: json.loads(p.read_text()) for p in (TREE / "docs/schema").glob("*.json")}
    return validator(store[name], store), store


class Examples(unittest.TestCase):
    def each(self, form):
        for example in EXAMPLES:
            with self.subTest(example=example):
                yield example, collect(example, form)

    def test_what_is_held_to_the_letter_is_as_it_was(self):
        if not ENTERPRISES.exists():  # a controller's manufacturer is named by it
            raise unittest.SkipTest(f"SKIPPED: {ENTERPRISES} (package ipmitool) is not there")
        if UPDATE:
            GOLDEN.mkdir(exist_ok=True)
        held = {GOLDEN / f"{example}.{form}" for example in EXAMPLES for form in HELD[example]}
        for file in sorted(held):
            example, form, columns = re.fullmatch(r"([\w-]+)\.([a-z]+)(\d*)", file.name).groups()
            text = re.sub(r"(?m)^.*_duration_seconds.*\n", "", collect(example, form, columns)).encode()
            if UPDATE:
                file.write_bytes(text)
            with self.subTest(file=file.name):
                self.assertEqual(text, file.read_bytes(), "a meant change: run formats_test.py PROGRAM TREE --update "
                                 "and look at the difference")
                if form == "table":
                    self.assertLessEqual(max(map(len, text.decode().splitlines())), int(columns))
        self.assertEqual(set(GOLDEN.iterdir()), held)

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

    def test_instances_are_as_the_plug_ins_declare_their_classes(self):
        printed = run("classes", "--schema")
        self.assertEqual(printed, (TREE / "docs/schema/classes.json").read_text(),
                         "make it anew: ipmisel classes --schema")
        classes = json.loads(printed)["$defs"]
        # Readers take properties that they do not know; the plug-ins declare all that they write.
        for definition in classes.values():
            definition["properties"]["properties"]["additionalProperties"] = False
        validators = {name: validator(definition, {}) for name, definition in classes.items()}
        every = [word for name in classes for word in ("--class", name)]
        for example in EXAMPLES:
            report = json.loads(run("collect", "--from", f"sim:examples/{example}.json", "--format", "json", *every))
            for instance in report["instances"]:
                with self.subTest(example=example, instance=instance):
                    validators[instance["class"]].validate(instance)

    def test_csv_has_what_events_has(self):
        for example, text in self.each("csv"):
            self.assertTrue(text.endswith("\r\n"))
            rows = list(csv.DictReader(io.StringIO(text, newline=""), strict=True))
            events = [e for e in map(json.loads, collect(example, "events").splitlines()) if "Key" in e]
            self.assertEqual([row["Key"] for row in rows], [e["Key"] for e in events])
            for row, event in zip(rows, events):
                self.assertEqual(row["Text"], event["Text"])
                self.assertEqual(row["Reading"], str(event["Reading"]) if "Reading" in event else "")

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

    def test_otlp_has_the_fields_of_its_proto_files_and_no_others(self):
        schema = json.loads((TREE / "tests/program/reports/otlp.schema.json").read_text())
        logs = validator(schema, {"": schema})
        for example, text in self.each("otlp"):
            for line in text.splitlines():
                logs.validate(json.loads(line))
            self.assertTrue(text, example)

    def test_prometheus_has_each_series_once(self):
        for example, text in self.each("prometheus"):
            series = [line.rpartition(" ")[0] for line in text.splitlines() if not line.startswith("#")]
            self.assertEqual(len(series), len(set(series)), example)

    def test_html_holds_together_without_anything_else(self):
        for example, text in self.each("html"):
            page = Page(text)
            self.assertEqual(len(page.ids), len(set(page.ids)))
            self.assertLessEqual(set(page.links), set(page.ids))
            self.assertNotRegex(text, r"(?i)(src|href)=\"?(https?:)?//|url\(|@import| style=| on[a-z]+=")
            self.assertLess(len(text), 1 << 20)
            for event in map(json.loads, collect(example, "events").splitlines()):
                self.assertIn(event.get("Text", ""), page.text)

    def test_a_saved_report_gives_the_same(self):
        with tempfile.TemporaryDirectory() as folder:
            file = pathlib.Path(folder, "report.json")
            for example in EXAMPLES:
                if example == "broken-bmc":  # answers otherwise when more is asked
                    continue
                file.write_text(collect(example, "json"))
                for form in FORMATS:
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

    @staticmethod
    def write(folder, report=None):
        file = pathlib.Path(folder, "hostile.json")
        file.write_text(json.dumps(report or hostile_report()))
        return file

    def test_every_format_stays_well_formed(self):
        with tempfile.TemporaryDirectory() as folder:
            file = self.write(folder)
            for form in FORMATS:
                text = run("report", file, "--format", form, status=4)
                with self.subTest(form=form):
                    self.assertNotRegex(text, STEERING)
            json.loads(run("report", file, "--format", "json"))
            json.loads(run("report", file, "--format", "redfish"))
            for form in ("ndjson", "events", "otlp"):
                list(map(json.loads, run("report", file, "--format", form).split("\n")[:-1]))
            rows = list(csv.DictReader(io.StringIO(run("report", file, "--format", "csv"), newline=""), strict=True))
            self.assertEqual(len(rows), len(HOSTILE_TEXTS))
            for row in rows:
                self.assertNotRegex(row["Text"], r"^[=+\-@\t\r]")
                self.assertEqual(row["Reading"], "1e+308")
            page = Page(run("report", file, "--format", "html"))
            self.assertEqual(page.tags.count("script"), 1)
            self.assertIn("<script>alert(1)</script>", page.text)

    def test_a_file_that_is_no_report_is_refused(self):
        good = json.dumps(hostile_report())
        with tempfile.TemporaryDirectory() as folder:
            file = pathlib.Path(folder, "bad.json")
            for text in ("", "[]", "{}", good[:-1], good.replace("ipmisel/1", "ipmisel/2"),
                         good.replace('"instances": [', '"instances": 1, "x": ['), "\x00" * 100):
                file.write_text(text)
                with self.subTest(text=text[:40]):
                    self.assertEqual(run("report", file, status=2), "")
                    run("diff", file, file, status=2)
            run("report", pathlib.Path(folder, "none"), status=2)

    def test_bytes_that_are_no_utf_8_are_replaced(self):
        server = (TREE / "examples/rack-server.json").read_text()
        fan = "Fan 3".encode().hex()
        self.assertIn(fan, server)
        with tempfile.TemporaryDirectory() as folder:
            file = pathlib.Path(folder, "server.json")
            file.write_text(server.replace(fan, "ffc08041ed"))  # no UTF-8 at all; Latin 1 by the standard
            for form in FORMATS:
                for more in ((), ("--class", "QORSG_IPMILogRecord")):
                    with self.subTest(form=form, more=more):
                        text = run("collect", "--from", f"sim:{file}", "--format", form, *more)  # decodes strictly
                        if form in ("table", "html") and not more:
                            self.assertIn("\u00ff\u00c0", text)

    def test_a_full_disk_is_told_and_a_reader_that_leaves_is_not(self):
        with tempfile.TemporaryDirectory() as folder:
            file = self.write(folder, hostile_report(count=3000))
            for form in FORMATS:
                with self.subTest(form=form), open("/dev/full", "wb") as full:
                    done = run_bytes("report", file, "--format", form, capture_output=False, stdout=full,
                                     stderr=subprocess.PIPE)
                    self.assertEqual(done.returncode, 2)
                    self.assertRegex(done.stderr.decode(),
                                     r"^ipmisel: cannot write to standard output: No space left on device; .*\n$")
                with self.subTest(form=form):
                    reading, writing = os.pipe()
                    os.close(reading)
                    done = run_bytes("report", file, "--format", form, capture_output=False, stdout=writing,
                                     stderr=subprocess.PIPE)
                    os.close(writing)
                    self.assertEqual((done.returncode, done.stderr), (-signal.SIGPIPE, b""))


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
