"""One repository, read by ipmisel, ipmitool and ipmi-sensors: names, units, readings, thresholds.

With IPMISEL_REAL_MACHINES the repositories of real machines are compared as well.
"""
import csv
import json
import os
import pathlib
import subprocess
import tempfile
import unittest

from side_by_side import PROGRAM, Peers, main
import guest  # its folder is known now

UNSIGNED, ONES, TWOS = 0x00, 0x40, 0x80
# Name, sensor type, format and rate and percentage, base unit, linearization, M, B, exponents of B
# and R, reading, thresholds from lower non-critical to upper non-recoverable. IPMI 2.0, 36.3.
ANALOG = [
    ("Unsigned", 0x01, UNSIGNED, 1, 0, 1, 0, 0, 0, 0x59, (5, 3, 1, 0x60, 0x70, 0xF0)),
    ("Offset", 0x01, UNSIGNED, 1, 0, 2, -50, 0, 0, 0x40, (5, 3, 1, 0x60, 0x70, 0xF0)),
    ("Negative M", 0x01, UNSIGNED, 1, 0, -3, 7, 1, -1, 0x21, (0xF0, 0xF1, 0xF2, 5, 4, 3)),
    ("Twos", 0x01, TWOS, 1, 0, 2, 7, 0, 0, 0xF6, (0xE0, 0xD0, 0xC0, 0x10, 0x20, 0x30)),
    ("Ones", 0x01, ONES, 1, 0, 1, 0, 0, 0, 0xF6, (0xE0, 0xD0, 0xC0, 0x10, 0x20, 0x30)),
    ("Volts", 0x02, UNSIGNED, 4, 0, 61, 0, 0, -3, 0xC4, (0xB0, 0xA0, 0x90, 0xD0, 0xE0, 0xF0)),
    ("Amps", 0x03, UNSIGNED, 5, 0, 5, 0, 0, -2, 0x10, (2, 1, 0, 0x60, 0x70, 0xF0)),
    ("Fan", 0x04, UNSIGNED, 18, 0, 60, 0, 0, 0, 0x70, (20, 10, 0, 0xC0, 0xD0, 0xE0)),
    ("Watts", 0x0B, UNSIGNED, 6, 0, 4, 0, 0, 0, 0x30, (5, 3, 1, 0x60, 0x70, 0xF0)),
]
FUNCTIONS = ["linear", "ln", "log10", "log2", "e", "exp10", "exp2", "1/x", "sqr", "cube", "sqrt",
             "cube root"]
# M = 1, R exponent -1: raw 20 is 2.
ANALOG += [(name, 0x01, UNSIGNED, 1, function, 1, 0, 0, -1, 20, (10, 5, 2, 30, 35, 40))
           for function, name in enumerate(FUNCTIONS) if function]
# As they are in a record, and what they say.
NAMES = [
    (0xC5, b"Latin", "Latin"), (0x84, bytes([0x29, 0xDC, 0xA6]), "IPMI"),
    (0x46, bytes([0x01, 0x2B, 0x9C]), "012-9."), (0x03, "\u00dcn\u00ef".encode("utf-16-le"), "\u00dcn\u00ef"),
]
LIMITS = ["LowerNonCritical", "LowerCritical", "LowerNonRecoverable", "UpperNonCritical",
          "UpperCritical", "UpperNonRecoverable"]
UNITS = {1: "degrees C", 4: "Volts", 5: "Amps", 6: "Watts", 18: "RPM"}
# A reading is shown to two or three places, or to six significant ones.
PLACES = 0.006


def ten_bits(value: int) -> list[int]:
    return [value & 0xFF, value >> 2 & 0xC0]


def record(number: int, analog: tuple, name: tuple[int, bytes]) -> bytes:
    _, kind, form, unit, function, m, b, b_exponent, r_exponent, _, limits = analog
    upper_first = [limits[place] for place in (5, 4, 3, 2, 1, 0)]
    rest = [0x20, 0, number, 3, 1, 0x7F, 0x68, kind, 1, 0, 0, 0, 0, 0x3F, 0x3F, form, unit, 0,
            function, *ten_bits(m), *ten_bits(b), 0, (r_exponent & 15) << 4 | b_exponent & 15, 0,
            0, 0, 0, 0, 0, *upper_first, 1, 1, 0, 0, 0, name[0], *name[1]]
    return bytes([number, 0, 0x51, 1, len(rest), *rest])


def number(text: str) -> float | None:
    try:
        return float(text)
    except ValueError:
        return None


def sensors_of(peers: Peers, folder: str, *more: str) -> tuple[list[list[str]], list[list[str]]]:
    """The rows of ipmitool and of ipmi-sensors."""
    tool = [[cell.strip() for cell in line.split("|")] for line in peers.ipmitool("sensor")]
    return tool, list(csv.reader(peers.freeipmi(
        "ipmi-sensors", "--comma-separated-output", "--no-header-output", "--output-sensor-thresholds",
        "--sdr-cache-directory", folder, "--non-abbreviated-units", *more)))


class SideBySide(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        rows = [(analog, (0xC0 | len(analog[0]), analog[0].encode())) for analog in ANALOG]
        rows += [(ANALOG[0], name[:2]) for name in NAMES]
        records = [record(place, *row) for place, row in enumerate(rows, 1)]
        commands = []
        for place, (analog, _) in enumerate(rows, 1):
            commands += [
                f"sensor_add 0x20 0 {place} {analog[1]} 1",
                f"sensor_set_value 0x20 0 {place} {analog[9]} 0",
                f"sensor_set_threshold 0x20 0 {place} settable 111111 "
                + " ".join(str(analog[10][limit]) for limit in (5, 4, 3, 2, 1, 0)),
                f"sensor_set_event_support 0x20 0 {place} enable scanning per-state "
                + " ".join(["000000000000000"] * 4)]
        with guest.ipmi_sim([], records, tuple(commands)) as (port, _), \
                tempfile.TemporaryDirectory() as folder:
            peers = Peers(port, folder, check=True)
            cls.ours = peers.ours("IPMI_Sensor")
            cls.tool, cls.free = sensors_of(peers, folder)

    def test_every_sensor_is_told_of_by_all(self):
        count = len(ANALOG) + len(NAMES)
        self.assertEqual([len(self.ours), len(self.tool), len(self.free)], [count] * 3)

    def test_names(self):
        for analog, ours, tool, free in zip(ANALOG, self.ours, self.tool, self.free):
            self.assertEqual([ours["Name"], tool[0], free[1]], [analog[0]] * 3)
        # The other two know 8-bit names alone.
        for (_, _, name), ours in zip(NAMES, self.ours[len(ANALOG):]):
            self.assertEqual(ours["Name"], name)

    def test_units_readings_and_thresholds(self):
        for analog, ours, tool, free in zip(ANALOG, self.ours, self.tool, self.free):
            with self.subTest(sensor=analog[0], ours=ours, tool=tool, free=free):
                unit = UNITS[analog[3]]
                self.assertEqual([ours["Unit"], tool[2].lower(), free[4].lower()],
                                 [unit, unit.lower(), unit.lower()])
                values = [ours.get("Reading"), *(ours.get(limit) for limit in LIMITS)]
                self.assertNotIn(None, values)
                # ipmitool: lower ones from non-recoverable up, upper ones from non-critical up.
                theirs = [number(tool[cell]) for cell in (1, 6, 5, 4, 7, 8, 9)]
                others = [number(free[cell]) for cell in (3, 7, 6, 5, 8, 9, 10)]
                for mine, one, other in zip(values, theirs, others):
                    # ipmi-sensors takes cube^-1(x) for 1/x^3; after sqrt(x) in the standard's list
                    # it is the root, as ipmitool has it.
                    for peer in (one,) if analog[0] == "cube root" else (one, other):
                        self.assertIsNotNone(peer)
                        self.assertAlmostEqual(mine, peer,
                                               delta=max(PLACES, abs(mine) * 1e-5))


def simulated_sensors(records: list[bytes]) -> dict:
    """Readings, states and thresholds for every sensor of a repository, each another."""
    sensors = {}
    for record in records:
        if record[3] not in (1, 2):
            continue
        for place in range(max(1, record[23] & 15) if record[3] == 2 else 1):
            number = record[7] + place & 255
            state = 1 << number % (6 if record[12] == 1 else 15)
            sensors[f"{record[5]:02x}/{record[6] & 3}/{number:02x}"] = {
                "reading": f"{number * 37 + 11 & 255:02x}",
                "states": f"c0 {state & 255:02x} {0x80 | state >> 8:02x}",
                "thresholds": "3f 10 08 04 c8 d2 dc"}
    return sensors


@unittest.skipUnless(os.environ.get("IPMISEL_REAL_MACHINES"),
                     "no IPMISEL_REAL_MACHINES: the repositories of real machines are not compared")
class RealMachines(unittest.TestCase):
    """No other program says of a sensor what we do not. What they say more is not the sensor's:

    - ipmi-sensors and ipmitool ask the BMC for the number of another controller's sensor;
    - ipmitool asks for thresholds where the record says that there are none;
    - ipmi-sensors gives a state to "state asserted" and "entity absent", which the standard leaves
      open; ipmitool has one name for all sensors that share a record.
    """
    def machine(self, path: pathlib.Path, folder: str):
        server = json.loads(path.read_text())
        for bmc in server["bmcs"]:
            bmc["sensors"] = simulated_sensors([bytes.fromhex(one) for one in bmc["sdr"]["records"]])
        file = pathlib.Path(folder) / "server.json"
        file.write_text(json.dumps(server))
        with subprocess.Popen([PROGRAM.parent / "ipmisel-simulator", "--server", file, "--port", "0",
                               "--cipher-suite", "3"], stdout=subprocess.PIPE,
                              text=True) as simulator:
            try:
                peers = Peers(simulator.stdout.readline().strip().rpartition(":")[2], folder)
                tool, free = sensors_of(peers, folder, "--output-sensor-state", "--shared-sensors")
            finally:
                simulator.terminate()
        return peers.ours("IPMI_Sensor", source=("--from", f"sim:{file}")), free, tool

    def values(self, mine: dict, names: list[str], cells: list[str]):
        """Each number that another has is ours; ours alone is no fault."""
        for name, cell in zip(names, cells):
            value = number(cell)
            if value is not None:
                self.assertIn(name, mine)
                self.assertAlmostEqual(mine[name], value,
                                       delta=max(PLACES, abs(mine[name]) * 1e-5))

    def test_no_other_program_says_more(self):
        upward = ["Reading", "LowerNonRecoverable", "LowerCritical", "LowerNonCritical", *LIMITS[3:]]
        compared = 0
        for path in sorted(pathlib.Path(os.environ["IPMISEL_REAL_MACHINES"]).glob("*.json")):
            with tempfile.TemporaryDirectory() as folder:
                ours, free, tool = self.machine(path, folder)
            rows = {}
            for one in ours:
                rows.setdefault(one["RecordID"], []).append(one)
            for row in free:
                self.assertIn(int(row[0]), rows, path.name)
                mine = rows[int(row[0])].pop(0)
                if mine["OwnerAddress"] != 0x20:
                    continue
                with self.subTest(machine=path.name, ours=mine, theirs=row):
                    self.assertEqual(mine["Name"].split(), row[1].split())
                    self.assertTrue(row[2] == "N/A" or mine.get("Type"))
                    self.values(mine, upward, [row[4], *row[6:12]])
                    if number(row[4]) is not None and row[5] not in ("unspecified", "%"):
                        self.assertTrue(mine["Unit"].lower().startswith(row[5].lower()))
                    left_open = {"state asserted", "state deasserted", "absent"}
                    if row[3] != "N/A" and row[12] != "'reserved'" and not (
                            left_open & set(mine.get("States", []))):
                        self.assertIn("Status", mine)
                    if row[12] not in ("N/A", "'OK'"):
                        self.assertIn("States", mine)
                compared += 1
            named = {}
            for one in ours:
                named.setdefault(one["Name"], []).append(one)
            for row in tool:
                if row[2] == "discrete" or len(named.get(row[0], [])) != 1:
                    continue
                mine = named[row[0]][0]
                with self.subTest(machine=path.name, ours=mine, theirs=row):
                    limits = row[4:10] if any(limit in mine for limit in LIMITS) else []
                    self.values(mine, upward, [row[1], *limits])
                compared += 1
        self.assertGreater(compared, 1500)


if __name__ == "__main__":
    main("ipmi-sensors:freeipmi-tools")
