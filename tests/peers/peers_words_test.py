"""What an event says, beside ipmitool and ipmi-sel: every type, offset and direction, every meaning of
event data 2 and 3, and the events and sensors of real machines. Neither may say more than we do.

With IPMISEL_REAL_MACHINES the logs and repositories of real machines are compared as well. docs/classes.md
("What others say") has the differences that are meant.
"""
import csv
import json
import os
import pathlib
import re
import tempfile
import unittest

from side_by_side import Peers, main
import guest  # its folder is known now

SENSOR_SPECIFIC, DEASSERTION = 0x6F, 0x80
UNSPECIFIED = 0xFF
# Sensor types and offsets to whose event data 2 or 3 the standard gives a meaning (table 42-3).
WITH_DATA = {0x05: [4], 0x08: [6], 0x0C: [0, 1], 0x0F: [0, 1, 2], 0x10: [0, 1, 5, 6], 0x12: [3, 4, 5], 0x19: [0],
             0x1D: [7], 0x21: [0, 2], 0x23: [1, 8], 0x28: [0, 4, 5], 0x2A: [0, 1], 0x2B: [1], 0x2C: [4]}
CODES = [*range(0x0F), 0x13, 0x19, 0x81, 0xF0]
# A code of no meaning, in their words.
NOTHING = re.compile(r"unspecified|unknown$|reserved|Previous State = *$", re.IGNORECASE)


def record(number: int, kind: int, event: int, *data: int) -> bytes:
    return bytes([number & 255, number >> 8, 2, 0, 0, 0, 0x60, 0x20, 0, 4, kind, 1, event, *data])


def offsets_and_directions() -> list[bytes]:
    types = [(kind, SENSOR_SPECIFIC) for kind in range(0x05, 0x2D)]
    types += [(0x17, event) for event in range(0x02, 0x0D)]
    events = [(kind, event | direction, offset, 0xFF, 0xFF) for kind, event in types
              for offset in range(15) for direction in (0, DEASSERTION)]
    return [record(number, *event) for number, event in enumerate(events, 1)]


def event_data() -> list[bytes]:
    events = []
    for kind, offsets in WITH_DATA.items():
        for offset in offsets:
            for code in CODES:
                events.append((kind, SENSOR_SPECIFIC, 0xC0 | offset, code, UNSPECIFIED))
                events.append((kind, SENSOR_SPECIFIC, 0x30 | offset, UNSPECIFIED, code))
    # Severity and previous state; the vendor's bytes.
    events += [(0x07, event, use, code, 0x12) for event in (0x03, 0x07, 0x0B, SENSOR_SPECIFIC, 0x70)
               for use in (0x40, 0xA0) for code in (0x00, 0x0F, 0xF0, 0x12, 0x9A)]
    return [record(number, *event) for number, event in enumerate(events, 1)]


def any_sensor() -> bytes:
    """ipmi-sel wants a repository that is not empty."""
    return bytes([1, 0, 0x51, 2, 31, 0x20, 0, 0xEE, 3, 1, 0x7F, 0x68, 7, SENSOR_SPECIFIC, *[0] * 6,
                  0xC0, 0, 0, 1, *[0] * 7, 0xC4]) + b"Else"


class Readings:
    """One log and repository by each of the three: rows by record ID."""

    def __init__(self, log: list[bytes], sensors: list[bytes]):
        with guest.ipmi_sim(log, sensors) as (port, _), tempfile.TemporaryDirectory() as home:
            peers = Peers(port, home)
            self.ours = {one["RecordID"]: one for one in peers.ours("IPMI_Event")}
            self.tool = {int(row[0], 16): row for row in csv.reader(peers.ipmitool("-c", "sel", "elist"))}
            self.free = {int(line.split(",")[0]): line.split(",", 6) for line in peers.freeipmi(
                "ipmi-sel", "--output-event-state", "--comma-separated-output", "--no-header-output")}


class Words(unittest.TestCase):
    def hold(self, peers: Readings, records: int) -> int:
        """Holds each event against what the others say; how many of their words were compared."""
        self.assertEqual(len(peers.ours), records)
        self.assertEqual(len(peers.tool), records)
        compared = 0
        for number, ours in peers.ours.items():
            tool, free = peers.tool[number], peers.free.get(number)
            with self.subTest(ours=ours, tool=tool, free=free):
                if ours["RecordType"] not in (2, 4):
                    continue  # bytes, by all three
                self.assertIn(ours["Direction"].title(), tool)
                words = [tool[4].strip()]
                more = []
                if free:
                    first, *more = free[6].split(" ; ")
                    words.append(re.sub(r"^(OEM )?Event Offset = .*", "", first))
                    if not re.match(r"Sensor #|N/A", free[3]):
                        self.assertEqual(ours.get("Sensor"), free[3])
                if any(word and not NOTHING.search(word) for word in words):
                    self.assertNotRegex(ours["Text"], "not defined by IPMI|vendor-specific")
                    compared += 1
                for phrase in more:
                    compared += self.hold_phrase(ours, phrase)
        return compared

    def hold_phrase(self, ours: dict, phrase: str) -> int:
        """A phrase of ipmi-sel for event data 2 or 3."""
        if phrase.startswith(("Sensor Reading", "Threshold")):
            name = "reading" if phrase.startswith("Sensor") else "threshold"
            self.assertRegex(ours["Sentence"], rf"\b{name} ")
        elif phrase.startswith("OEM Event Data") and "MakerData" in ours:
            self.assertIn(phrase[-3:-1].lower(), ours["MakerData"])
        elif ours.get("SensorType") == "Event Logging Disabled" and "MakerData" in ours:
            return 0  # event data 3 tells how to read data 2, and there is none
        elif NOTHING.search(phrase) or ours["EventTypeCode"] == 0:
            return 0
        elif found := re.fullmatch(r"Event Data[23] = (?:([0-9A-F]{2})|[0-9A-F])h", phrase):
            # A byte without words, by them as by us.
            if found[1] and found[1] != "00" and "MakerData" in ours:
                self.assertIn(found[1].lower(), ours["MakerData"])
            return 0
        else:
            self.assertIn(", ", ours["Text"])
        return 1

    def test_every_type_offset_and_direction(self):
        log = offsets_and_directions()
        self.assertGreaterEqual(self.hold(Readings(log, [any_sensor()]), len(log)), 490)

    def test_every_meaning_of_event_data(self):
        log = event_data()
        self.assertGreaterEqual(self.hold(Readings(log, [any_sensor()]), len(log)), len(log))

    def test_the_logs_of_real_machines(self):
        folder = os.environ.get("IPMISEL_REAL_MACHINES")
        if not folder:
            self.skipTest("SKIPPED: no IPMISEL_REAL_MACHINES")
        for path in sorted(pathlib.Path(folder).glob("*.json")):
            for bmc in json.loads(path.read_text())["bmcs"]:
                log = [bytes.fromhex(text) for text in bmc.get("sel", {}).get("entries", [])]
                sensors = [bytes.fromhex(text) for text in bmc.get("sdr", {}).get("records", [])]
                if log:
                    self.hold(Readings(log, sensors or [any_sensor()]), len(log))


if __name__ == "__main__":
    main("ipmi-sel:freeipmi-tools")
