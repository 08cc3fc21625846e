#!/usr/bin/env python3
"""The Python module over the program as it was built.

usage: ipmisel_test.py PROGRAM ROOT
"""
import datetime
import json
import os
import pathlib
import subprocess
import sys
import tempfile
import unittest

PROGRAM, ROOT = sys.argv.pop(1), pathlib.Path(sys.argv.pop(1))
sys.path.insert(0, str(ROOT / "python"))
sys.dont_write_bytecode = True
import ipmisel  # noqa: E402

RACK = f"sim:{ROOT}/examples/rack-server.json"
LINE = ('{"format": "ipmisel/1", "system": "s", "Key": "k", "Node": 1, "RecordID": 7, "Severity": "critical", '
        '"Time": "2026-03-09T02:31:44Z", "Raw": "0100ff"}')


def printed(*arguments):
    """What the program writes, whole or not; the example without a BMC writes no report."""
    return subprocess.run([PROGRAM, *arguments], check=False, capture_output=True, text=True).stdout


class EveryExample(unittest.TestCase):
    """Held against the types that the plug-ins declare for their properties."""

    @classmethod
    def setUpClass(cls):
        definitions = json.loads(printed("classes", "--schema"))["$defs"]
        cls.declared = {name: each["properties"]["properties"]["properties"] for name, each in definitions.items()}

    def check(self, class_name, written, typed):
        self.assertEqual(list(written), list(typed))
        for name, value in written.items():
            declared = self.declared[class_name].get(name, {})
            with self.subTest(property=f"{class_name}.{name}"):
                if declared.get("format") == "date-time":
                    self.assertEqual(typed[name].utcoffset(), datetime.timedelta(0))
                    self.assertEqual(typed[name].strftime("%Y-%m-%dT%H:%M:%SZ"), value)
                elif declared.get("type") == "array":
                    self.assertIsInstance(typed[name], bytes if "integer" in declared["items"].values() else tuple)
                    self.assertEqual(list(typed[name]), value)
                elif class_name.startswith("IPMI_") and name == "Severity":
                    self.assertEqual(typed[name].name.lower(), value)
                elif name == "Raw":
                    self.assertEqual(typed[name].hex(), value)
                elif name != "collected":
                    self.assertEqual((type(typed[name]), typed[name]), (type(value), value))

    def test_has_the_declared_types(self):
        seen = set()
        for example in sorted((ROOT / "examples").glob("*.json")):
            with tempfile.NamedTemporaryFile("w", suffix=".json") as file:
                file.write(printed("collect", "--from", f"sim:{example}", "--format", "json"))
                file.flush()
                if not os.path.getsize(file.name):
                    continue
                report = ipmisel.load(file.name)
                lines = printed("report", file.name, "--format", "events").splitlines()
            records = list(ipmisel.read(lines))
            events = [record for record in records if isinstance(record, ipmisel.Event)]
            self.assertEqual(all(record.complete for record in records if record not in events), report.complete)
            self.assertEqual(len(list(report.instances_of("IPMI_Event"))), len(events))
            for line, record in zip(lines, records):
                if record in events:
                    self.check("IPMI_Event", json.loads(line), record.properties)
            for written, (class_name, typed) in zip(report.details["instances"], report.instances):
                seen.add(class_name)
                self.check(class_name, written["properties"], typed)
        self.assertGreaterEqual(seen, {name for name in self.declared if name.startswith("IPMI_")})


class Read(unittest.TestCase):
    def test_an_event_has_types(self):
        (event,) = ipmisel.read([LINE, "\n"])
        self.assertEqual((event.system, event.key, event.record_id), ("s", "k", 7))
        self.assertIs(event.severity, ipmisel.Severity.CRITICAL)
        self.assertEqual(event.time, datetime.datetime(2026, 3, 9, 2, 31, 44, tzinfo=datetime.timezone.utc))
        self.assertEqual(event.raw, b"\x01\x00\xff")
        self.assertIsNone(event.part)

    def test_a_time_that_is_not_known_is_none(self):
        (event,) = ipmisel.read([LINE.replace('"Time": "2026-03-09T02:31:44Z", ', "")])
        self.assertIsNone(event.time)

    def test_what_is_no_report_is_refused(self):
        for text in ("", "[]", "{}", LINE):
            with tempfile.NamedTemporaryFile("w") as file, self.assertRaises(ipmisel.Error, msg=text):
                file.write(text)
                file.flush()
                ipmisel.load(file.name)

    def test_other_lines_are_refused(self):
        for line in ("{", "[]", LINE.replace("ipmisel/1", "ipmisel/2"), LINE.replace('"Key"', '"Kay"'),
                     LINE.replace("critical", "grave"), LINE.replace("T02", "T32"), LINE.replace("ff", "fg")):
            with self.assertRaises(ipmisel.Error, msg=line):
                list(ipmisel.read([line]))

    def test_severities_are_ordered(self):
        self.assertGreater(ipmisel.Severity.FATAL, ipmisel.Severity.CRITICAL)
        self.assertGreater(ipmisel.Severity.WARNING, ipmisel.Severity.OK)


class Collect(unittest.TestCase):
    def test_gives_every_record_of_the_log(self):
        events = list(ipmisel.collect(RACK, program=PROGRAM))
        printed = subprocess.run([PROGRAM, "collect", "--from", RACK, "--format", "ndjson", "--class",
                                  "QORSG_IPMILogRecord"], check=True, capture_output=True, text=True).stdout
        records = [line for line in printed.splitlines() if json.loads(line).get("class")]
        self.assertEqual(len(events), len(records))
        self.assertGreater(len(events), 50)
        self.assertTrue(any(event.severity is ipmisel.Severity.CRITICAL for event in events))

    def test_a_report_that_is_not_whole_is_said_after_its_events(self):
        broken = f"sim:{ROOT}/examples/broken-bmc.json"
        allowed = list(ipmisel.collect(broken, program=PROGRAM, allow_partial=True))
        seen = []
        with self.assertRaises(ipmisel.PartialReport) as caught:
            for event in ipmisel.collect(broken, program=PROGRAM):
                seen.append(event)
        self.assertEqual(seen, allowed)
        self.assertFalse(caught.exception.summaries[0].complete)

    def test_a_source_that_cannot_be_opened_is_said_in_the_programs_words(self):
        for source, words in (("/no/such.json", "/no/such"), (f"{ROOT}/examples/no-bmc.json", "no BMC")):
            with self.assertRaisesRegex(ipmisel.Error, words):
                list(ipmisel.collect(f"sim:{source}", program=PROGRAM))


if __name__ == "__main__":
    unittest.main()
