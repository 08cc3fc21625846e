"""One log, read by ipmisel, ipmitool and ipmi-sel: every standard sensor and event type and offset.

docs/event-phrases.tsv pairs what each says of an event; a difference has its reason there.
"""
import csv
import re
import tempfile
import unittest

from side_by_side import SOURCE, Peers, main
import guest  # its folder is known now

SENSOR_SPECIFIC, THRESHOLD, DEASSERTION = 0x6F, 0x01, 0x80
GENERIC_SENSOR_TYPE = 0x17  # one without offsets of its own
# Sensor type, signedness, unit, M, B, exponents of B and R; name. IPMI 2.0, clause 36.3.
ANALOG = [
    (0x01, 0x80, 1, 1, 0, 0, 0, "Signed"), (0x01, 0x40, 1, 1, 0, 0, 0, "Ones complement"),
    (0x01, 0x00, 1, 2, -50, 0, 0, "Offset"), (0x01, 0x00, 1, -3, 7, 1, -1, "Negative"),
    (0x01, 0x80, 1, 2, 7, 0, 0, "Signed raw"),
    (0x02, 0x00, 4, 61, 0, 0, -3, "Volts"), (0x03, 0x00, 5, 5, 0, 0, -2, "Amps"),
    (0x04, 0x00, 18, 1, 0, 0, 2, "Fan"), (0x0B, 0x00, 6, 4, 0, 0, 0, "Watts"),
]
# Compatibility: the readings of a signed sensor are shown as they come, without its factors.
SHOWN_RAW = {"Signed raw"}
THRESHOLD_DATA = [(0x40, 0x45), (0x43, 0xE2), (0x00, 0x7F)]


def ten_bits(value: int) -> list[int]:
    return [value & 0xFF, value >> 2 & 0xC0]


def sensor(number: int, kind: int, kind_of_event: int, name: str, analog=None) -> bytes:
    """A full sensor record, or a compact one without reading factors."""
    rest = [0x20, 0, number, 3, 1, 0x7F, 0x68, kind, kind_of_event, *[0] * 6]
    if analog:
        sign, unit, m, b, b_exponent, r_exponent = analog
        rest += [sign, unit, 0, 0, *ten_bits(m), *ten_bits(b), 0,
                 (r_exponent & 15) << 4 | b_exponent & 15, *[0] * 17]
    else:
        rest += [0xC0, 0, 0, 1, 0, *[0] * 6]
    rest += [0xC0 | len(name), *name.encode()]
    return bytes([number, 0, 0x51, 1 if analog else 2, len(rest), *rest])


def make_log() -> tuple[list[tuple], list[bytes]]:
    """(sensor type, sensor, event type, data 1 to 3) of each record; the sensors."""
    events, sensors = [], []
    kinds = [(kind, SENSOR_SPECIFIC, f"Type {kind:02x}") for kind in range(0x05, 0x2D)]
    kinds += [(GENERIC_SENSOR_TYPE, event, f"Generic {event:02x}") for event in range(0x02, 0x0D)]
    for kind, event, name in kinds:
        sensors.append(sensor(len(sensors) + 1, kind, event, name))
        events += [(kind, len(sensors), event, offset, 0xFF, 0xFF) for offset in range(15)]
    for kind, sign, unit, m, b, b_exponent, r_exponent, name in ANALOG:
        sensors.append(sensor(len(sensors) + 1, kind, THRESHOLD, name,
                              (sign, unit, m, b, b_exponent, r_exponent)))
        events += [(kind, len(sensors), THRESHOLD | direction, 0x50 | offset,
                    *THRESHOLD_DATA[offset % 3])
                   for offset in range(12) for direction in (0, DEASSERTION)]
    return events, sensors


def texts() -> dict[str, str]:
    lines = (SOURCE / "plugins/ipmisel/texts/ipmisel.INI").read_text().splitlines()
    return dict(line.split("=", 1) for line in lines if re.match(r"\d+=", line))


def readings(text: str, *patterns: str) -> list[tuple[float, str]]:
    """(value, unit) for each pattern."""
    found = [re.search(pattern + r" (-?[\d.]+) ?([^.:;<>\n]*)", text) for pattern in patterns]
    return [(float(match[1]), match[2].strip().lower()) if match else None for match in found]


class SideBySide(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.events, sensors = make_log()
        cls.names = [record[-(record[47 if record[3] == 1 else 31] & 31):].decode()
                     for record in sensors]
        log = [bytes([number & 255, number >> 8, 2, 0, 0, 0, 0, 0x20, 0, 4, *event])
               for number, event in enumerate(cls.events, 1)]
        with guest.ipmi_sim(log, sensors) as (port, _), tempfile.TemporaryDirectory() as home:
            peers = Peers(port, home, check=True)
            cls.ours, cls.standard = (peers.ours(name) for name in ("QORSG_IPMILogRecord", "IPMI_Event"))
            cls.tool = list(csv.reader(peers.ipmitool("-c", "sel", "elist")))
            cls.free = [line.split(",", 6) for line in peers.freeipmi(
                "ipmi-sel", "--output-event-state", "--comma-separated-output", "--no-header-output",
                "--non-abbreviated-units")]

    def rows(self):
        return [(event, ours, ours["Message"].partition("ssertion: ")[2], tool, free)
                for event, ours, tool, free in zip(self.events, self.ours, self.tool, self.free)]

    def test_every_record_sensor_and_direction(self):
        self.assertEqual([len(self.ours), len(self.tool), len(self.free)], [len(self.events)] * 3)
        for event, ours, _, tool, free in self.rows():
            with self.subTest(event=event, ours=ours, tool=tool, free=free):
                name = self.names[event[1] - 1]
                self.assertEqual(ours["SensorInformation"], name)
                self.assertTrue(tool[3].endswith(" " + name))
                self.assertEqual(free[3], name)
                self.assertEqual("Deassertion: " in ours["Message"], tool[5] == "Deasserted")
                self.assertEqual(int(ours["RecordID"]), int(tool[0], 16))
                self.assertEqual(int(ours["RecordID"]), int(free[0]))

    def test_readings_and_thresholds(self):
        for event, _, text, tool, free in self.rows():
            if event[2] & 0x7F != THRESHOLD:
                continue
            with self.subTest(event=event, text=text, tool=tool, free=free):
                (reading, unit), (limit, limit_unit) = readings(text, "Trigger reading:",
                                                                "Trigger threshold value:")
                theirs = readings(tool[6], "Reading", "Threshold") + readings(
                    free[6], "Sensor Reading =", "Threshold =")
                if self.names[event[1] - 1] in SHOWN_RAW:
                    reading, limit = 2 * reading + 7, 2 * limit + 7
                for mine, other in zip((reading, limit, reading, limit), theirs):
                    self.assertAlmostEqual(mine, other[0], delta=0.006)
                # ipmitool has the unit once, after the threshold
                units = {other[1] for other in theirs} - {""}
                self.assertEqual(units | {unit, limit_unit}, {unit.lower()})

    def test_the_standards_reading_converts_as_they_do(self):
        for event, ours, tool, free in zip(self.events, self.standard, self.tool, self.free):
            if event[2] & 0x7F != THRESHOLD:
                continue
            with self.subTest(event=event, ours=ours, tool=tool, free=free):
                for text, pattern in (tool[6], "%s"), (free[6], "(?:Sensor )?%s ="):
                    theirs = readings(text, pattern % "Reading", pattern % "Threshold")
                    for mine, other in zip((ours["Reading"], ours["Threshold"]), theirs):
                        self.assertAlmostEqual(mine, other[0], delta=0.006)

    def test_severities_differ_from_ipmi_sel_where_their_page_says_so(self):
        page, event_type, sensor_type = {}, 0, 0
        for line in (SOURCE / "docs/severities.md").read_text().splitlines():
            if line.startswith("## "):
                event_type = re.search(r"event type (..)h", line)
                sensor_type = re.search(r"sensor type (..)h", line)
            elif re.match(r"\| \d", line):
                cells = [cell.strip() for cell in line.strip("|").split("|")]
                key = (int(event_type[1], 16), int(sensor_type[1], 16) if sensor_type else 0,
                       int(cells[0]))
                page[key] = cells[2], cells[5], cells[6]
        same = {"information": "nominal", "ok": "nominal", "warning": "warning",
                "critical": "critical", "fatal": "critical", "none": "-"}
        seen = 0
        for event, ours, free in zip(self.events, self.standard, self.free):
            specific = event[2] == SENSOR_SPECIFIC
            if event[2] & DEASSERTION or not (specific or event[2] == THRESHOLD):
                continue
            row = page.get((event[2], event[0] if specific else 0, event[3] & 15))
            state = free[5].lower().replace("n/a", "-")
            with self.subTest(event=event, ours=ours, free=free, row=row):
                if row is None:
                    self.assertNotIn("Severity", ours)
                    continue
                seen += 1
                self.assertEqual(ours.get("Severity", "none"), row[0])
                self.assertEqual(state, row[1])
                self.assertEqual(same[row[0]] == state and row[0] != "fatal", not row[2])
        self.assertEqual(seen, 204 + 12 * len(ANALOG))

    def test_offsets_mean_the_same(self):
        numbered, said = texts(), {}
        for event, _, text, tool, free in self.rows():
            key = (f"{event[2] & 0x7F:02x}", f"{event[0]:02x}", str(event[3] & 15))
            theirs = re.sub(r" ; .*|^Event Offset = .*", "", free[6])
            said[key] = (text.strip(), tool[4].strip(), theirs)
        with open(SOURCE / "docs/event-phrases.tsv", encoding="utf-8") as file:
            table = {tuple(row[:3]): row[3:] for row in csv.reader(file, delimiter="\t")
                     if row and not row[0].startswith("#")}
        self.assertEqual({key for key, phrases in said.items() if any(phrases)}, set(table))
        for key, (ours, tool, free, reason) in table.items():
            with self.subTest(key=key, said=said[key]):
                expected = numbered.get(ours, ours).partition("%")[0]
                self.assertTrue(said[key][0].startswith(expected) if expected else not said[key][0])
                self.assertEqual(said[key][1:], (tool, free))
                self.assertEqual(bool(ours) == bool(tool or free), reason == "same")


if __name__ == "__main__":
    main("ipmi-sel:freeipmi-tools")
