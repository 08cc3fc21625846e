#!/usr/bin/env python3
"""The Python module over the program as it was built.

usage: ipmisel_test.py PROGRAM ROOT
"""
import datetime
import json
import pathlib
import subprocess
import sys
import unittest

PROGRAM, ROOT = sys.argv.pop(1), pathlib.Path(sys.argv.pop(1))
sys.path.insert(0, str(ROOT / "python"))
sys.dont_write_bytecode = True
import ipmisel  # noqa: E402

RACK = f"sim:{ROOT}/examples/rack-server.json"
LINE = ('{"format": "ipmisel/1", "system": "s", "Key": "k", "Node": 1, "RecordID": 7, "Severity": "critical", '
        '"Time": "2026-03-09T02:31:44Z", "Raw": "0100ff"}')


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
        with self.assertRaisesRegex(ipmisel.Error, "/no/such"):
            list(ipmisel.collect("sim:/no/such.json", program=PROGRAM))


if __name__ == "__main__":
    unittest.main()
