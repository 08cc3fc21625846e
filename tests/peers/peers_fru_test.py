"""FRU devices of one BMC, read by ipmisel, ipmitool and ipmi-fru: every field of every area.

With IPMISEL_REAL_MACHINES the inventories of real machines are compared as well.
"""
import datetime
import json
import os
import pathlib
import re
import tempfile
import unittest

from side_by_side import Peers, main
import guest  # its folder is known now

MOST_DEVICES = 64
# What each calls a property. ipmi-fru has one name for the file IDs of board and product.
IPMITOOL = {
    "Chassis Type": "ChassisType", "Chassis Part Number": "ChassisPartNumber",
    "Chassis Serial": "ChassisSerialNumber", "Chassis Extra": "ChassisCustom",
    "Board Mfg Date": "BoardManufactured", "Board Mfg": "BoardManufacturer",
    "Board Product": "BoardProduct", "Board Serial": "BoardSerialNumber",
    "Board Part Number": "BoardPartNumber", "Board FRU ID": "BoardFRUFile",
    "Board Extra": "BoardCustom", "Product Manufacturer": "ProductManufacturer",
    "Product Name": "ProductName", "Product Part Number": "ProductPartNumber",
    "Product Version": "ProductVersion", "Product Serial": "ProductSerialNumber",
    "Product Asset Tag": "ProductAssetTag", "Product FRU ID": "ProductFRUFile",
    "Product Extra": "ProductCustom"}
IPMI_FRU = {
    "Chassis Type": "ChassisType", "Chassis Part Number": "ChassisPartNumber",
    "Chassis Serial Number": "ChassisSerialNumber", "Chassis Custom Info": "ChassisCustom",
    "Board Manufacturing Date/Time": "BoardManufactured",
    "Board Manufacturer": "BoardManufacturer", "Board Product Name": "BoardProduct",
    "Board Serial Number": "BoardSerialNumber", "Board Part Number": "BoardPartNumber",
    "Board Custom Info": "BoardCustom", "Product Manufacturer Name": "ProductManufacturer",
    "Product Name": "ProductName", "Product Part/Model Number": "ProductPartNumber",
    "Product Version": "ProductVersion", "Product Serial Number": "ProductSerialNumber",
    "Product Asset Tag": "ProductAssetTag", "Product Custom Info": "ProductCustom"}
# Values of multi-records: how ipmi-fru calls them, and we.
VALUES = {
    "Power Supply Overall Capacity": "overall capacity", "Power Supply Peak VA": "peak apparent power",
    "Power Supply Max Inrush Current": "inrush current",
    "Power Supply Inrush Interval": "inrush interval",
    "Power Supply Low End Input Voltage 1": "input voltage range 1 low end",
    "Power Supply High End Input Voltage 1": "input voltage range 1 high end",
    "Power Supply Low End Input Voltage 2": "input voltage range 2 low end",
    "Power Supply High End Input Voltage 2": "input voltage range 2 high end",
    "Power Supply Low End Acceptable Frequency": "input frequency low end",
    "Power Supply High End Acceptable Frequency": "input frequency high end",
    "Power Supply A/C Dropout Tolerance": "input dropout tolerance",
    "Power Supply Peak Capacity": "peak capacity", "Power Supply Hold Up Time": "peak capacity held for",
    "Power Supply Total Combined Wattage": "combined capacity",
    "DC Output Output Number": "output", "DC Output Nominal Voltage": "nominal voltage",
    "DC Output Maximum Negative Voltage Deviation": "maximum negative deviation",
    "DC Output Maximum Positive Voltage Deviation": "maximum positive deviation",
    "DC Output Ripple and Noise pk-pk": "ripple and noise",
    "DC Output Minimum Current Draw": "minimum current draw",
    "DC Output Maximum Current Draw": "maximum current draw",
    "DC Load Output Number": "output needed", "DC Load Nominal Voltage": "nominal voltage",
    "DC Load Spec'd Minimum Voltage": "minimum voltage",
    "DC Load Spec'd Maximum Voltage": "maximum voltage",
    "DC Load Spec'd Ripple and Noise pk-pk": "ripple and noise",
    "DC Load Minimum Current Load": "minimum current load",
    "DC Load Maximum Current Load": "maximum current load"}


def checksum(data: bytes) -> bytes:
    return bytes([-sum(data) & 255])


def field(data: bytes, encoding: int = 3) -> bytes:
    return bytes([encoding << 6 | len(data)]) + data


def area(fixed: bytes, *fields: bytes) -> bytes:
    data = bytes([1, 0]) + fixed + b"".join(fields) + b"\xC1"
    length = (len(data) + 8) // 8 * 8
    data = data[:1] + bytes([length // 8]) + data[2:] + bytes(length - 1 - len(data))
    return data + checksum(data)


def multi_records(*records: tuple[int, bytes]) -> bytes:
    out = b""
    for place, (kind, data) in enumerate(records, 1):
        header = bytes([kind, 0x82 if place == len(records) else 2, len(data)]) + checksum(data)
        out += header + checksum(header) + data
    return out


def image(*areas: bytes, size: int = 256) -> bytes:
    header, at = bytes([1, 0]), 8
    for part in areas:
        header += bytes([at // 8 if part else 0])
        at += len(part)
    header += bytes([0] * (7 - len(header)))
    data = header + checksum(header) + b"".join(areas)
    return data.ljust(size, b"\xFF")


SUPPLY = bytes.fromhex("ee0284031e0a2823b036504620672f3f141f52a302730007")
RAIL = bytes.fromhex("50fb28fb78fb78000a00f401")
OWN = [
    image(area(b"\x17", field(b"CH-1"), field(b"CHS01"), field(b"Rack 7"), field(b"Row 2")),
          area(b"\x19\xC0\x5F\xE4", field(b"Acme"), field(b"Mainboard"), field(b"BS01"),
               field(b"BP-1"), field(b"F1"), field(b"first"), field(b"second")),
          area(b"\x00", field(b"Acme Systems"), field(b"S-1"), field(b"P-1"), field(b"A00"),
               field(b"SN01"), field(b"T9"), field(b"F2"), field(b"third"))),
    # Every encoding: six-bit, BCD plus, binary.
    image(b"", area(b"\x19\x40\x97\xF0", field(bytes([0x29, 0xDC, 0xA6]), 2),
                    field(bytes([0x12, 0x3B, 0x4C]), 1), field(bytes([0x0A, 0xFF, 0x01]), 0),
                    field(b"PN"), field(b""))),
    image(b"", b"", area(b"\x19", field(b"Acme"), field(b"PSU")),
          multi_records((0, SUPPLY), (1, b"\x82" + RAIL), (2, b"\x02" + RAIL),
                        (9, b"\x92" + RAIL), (10, b"\x02" + RAIL))),
    # More than 256 bytes, the last area behind them.
    image(b"", area(b"\x19\x00\x00\x00", field(b"Acme"), field(b"X" * 60), field(b"Y" * 60),
                    field(b"Z" * 60), field(b"W" * 60)),
          area(b"\x19", field(b"Acme"), field(b"Far"), field(b"P-9"), field(b"1.0"), field(b"SN9")),
          size=512),
]


def real_images() -> list[bytes]:
    folder = os.environ.get("IPMISEL_REAL_MACHINES")
    if not folder:
        print("no IPMISEL_REAL_MACHINES: only the images made here are compared")
        return []
    images = []
    for path in sorted(pathlib.Path(folder).glob("*.json")):
        for bmc in json.loads(path.read_text())["bmcs"]:
            images += [bytes.fromhex(text) for text in bmc.get("fru", {}).values()]
    return [one for place, one in enumerate(images) if one not in images[:place]]


def locator(device: int) -> bytes:
    name = f"Device {device}".encode()
    body = bytes([0x20, device, 0x80, 0, 0, 0x10, 0, 0x0B, device, 0, 0xC0 | len(name)]) + name
    return bytes([device, 0, 0x51, 0x11, len(body)]) + body


def fields(lines: list[str], names: dict[str, str], separator: str) -> dict[str, list[str]]:
    found = {}
    area_name = ""
    for line in lines:
        label, _, value = line.strip().partition(separator)
        label = label.strip().removeprefix("FRU ")
        area_name = label.split(" ")[0] if label.split(" ")[0] in ("Board", "Product") else area_name
        name = area_name + "FRUFile" if label == "FRU File ID" or label == "File ID" else names.get(label)
        if name and value.strip():
            found.setdefault(name, []).append(value.strip())
    return found


def devices(lines: list[str], heading: str) -> dict[int, list[str]]:
    """The lines of each device, by its ID."""
    parts = re.split(heading, "\n".join(lines))
    return {int(parts[at], 0 if "0x" in parts[at] else 16 if "h" in heading else 10):
            parts[at + 1].splitlines() for at in range(1, len(parts), 2)}


def same(mine: str, theirs: str) -> bool:
    if mine == theirs.rstrip("\0 "):
        return True
    if mine.startswith("0x"):  # binary: digits alone, or each byte with an h
        return mine[2:] == re.sub("[^0-9a-f]", "", theirs.lower())
    # BCD plus: ipmi-fru shows the number, without its leading zeros.
    return re.fullmatch(r"[\d.-]+", mine) is not None and mine.lstrip("0") == theirs.lstrip("0")


def same_time(mine: str, theirs: str) -> bool:
    for form in ("%m/%d/%y - %H:%M:%S", "%a %b %d %H:%M:%S %Y UTC"):
        try:
            when = datetime.datetime.strptime(theirs, form)
            return when.strftime("%Y-%m-%dT%H:%M:%SZ") == mine
        except ValueError:
            continue
    return False


class SideBySide(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.images = (OWN + real_images())[:MOST_DEVICES]
        commands = tuple(
            f"mc_add_fru_data 0x20 {device} {len(data)} data " +
            " ".join(f"0x{byte:02x}" for byte in data) for device, data in enumerate(cls.images))
        sdrs = [locator(device) for device in range(1, len(cls.images))]
        with guest.ipmi_sim([], sdrs, commands) as (port, _), tempfile.TemporaryDirectory() as home:
            peers = Peers(port, home)
            cls.ours = {one["DeviceID"]: one for one in peers.ours("IPMI_FRU")}
            cls.tool = devices(peers.ipmitool("-v", "fru"), r"FRU Device Description : .*\(ID (\d+)\)")
            cls.free = devices(peers.freeipmi("ipmi-fru"), r"FRU Inventory Device: .*\(ID ([0-9A-F]+)h\)")

    def test_every_device_is_there(self):
        expected = set(range(len(self.images)))
        self.assertEqual([set(self.ours), set(self.tool), set(self.free)], [expected] * 3)

    def test_every_field_that_another_has_is_ours(self):
        compared = 0
        for device, properties in self.ours.items():
            for peer, names, separator in ((self.tool, IPMITOOL, ":"), (self.free, IPMI_FRU, ":")):
                for name, values in fields(peer.get(device, []), names, separator).items():
                    mine = properties.get(name, [])
                    mine = mine if isinstance(mine, list) else [mine]
                    # ipmitool reads on behind an end mark that stands early, ipmi-fru refuses some
                    # characters of BCD plus.
                    early = any(problem.startswith(name[:5].lower()) and "fields end" in problem
                                for problem in properties.get("Problems", []))
                    if (early and not mine) or values[0].startswith("Error"):
                        continue
                    with self.subTest(device=device, name=name, ours=mine, theirs=values):
                        if name == "BoardManufactured":
                            if "nspecified" not in values[0] and mine:
                                self.assertTrue(same_time(mine[0], values[0]))
                            continue
                        self.assertEqual(len(mine), len(values))
                        for one, other in zip(mine, values):
                            self.assertTrue(same(one, other))
                        compared += 1
        self.assertGreaterEqual(compared, 60)  # of the images made here alone

    def test_values_of_multi_records(self):
        compared = 0
        for device, lines in self.free.items():
            theirs = []
            for line in lines:
                match = re.match(r" *FRU ([^:]*): (-?\d+)( mV)?", line)
                if match and match[1] in VALUES:
                    # Millivolts of ripple stay what they are.
                    volts = match[3] and "Ripple" not in match[1]
                    theirs.append((VALUES[match[1]], int(match[2]) / (1000 if volts else 1)))
            mine = [(name, float(value)) for record in self.ours[device].get("MultiRecords", [])
                    for name, value in re.findall(r"; ([^;]*?) (-?[\d.]+)(?: [A-Za-z]+)?(?=;|$)", record)
                    if name in VALUES.values()]
            # 0 is "not specified" for some: left out by us.
            given = {name for name, _ in mine}
            theirs = [one for one in theirs if one[1] or one[0] in given]
            mine = [one for one in mine if one in theirs]
            with self.subTest(device=device):
                self.assertEqual(sorted(mine), sorted(theirs))
            compared += len(theirs)
        self.assertGreaterEqual(compared, 14 + 4 * 7)


if __name__ == "__main__":
    main("ipmi-fru:freeipmi-tools")
