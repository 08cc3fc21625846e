"""One machine read in several ways gives the same instances of the IPMI_ classes.

The machine is an example's: as it is simulated, behind a port, as a BMC of OpenIPMI, and captured.
ALLOWED names every property in which two readings may differ, and why; all others are compared.
"""
import contextlib
import json
import pathlib
import re
import subprocess
import tempfile

import guest

CLASSES = ["IPMI_Controller", "IPMI_EventLog", "IPMI_Sensor", "IPMI_FRU", "IPMI_Event", "IPMI_Finding"]

# (sources, class, property, reason). Sources: "port" (a simulated BMC behind a port), "ipmi_sim"
# (OpenIPMI's over the network), "guest" (the same in-band, in a Linux guest).
LIVE = {"port", "ipmi_sim", "guest"}
OPENIPMI = {"ipmi_sim", "guest"}
ALLOWED = [
    (LIVE, "IPMI_Controller", "ClockOffsetSeconds", "the example's own clock stands still"),
    (LIVE, "IPMI_Controller", "ClockUncertaintySeconds", "the example's clock takes no time to ask"),
    (LIVE, "IPMI_Event", "CorrectedTime", "follows the offset of the clock"),
    (OPENIPMI, "IPMI_Controller", "Time", "its clock goes on while it is read"),
    (OPENIPMI, "IPMI_Controller", "SelfTest", "it has no Get Self Test Results"),
    (OPENIPMI, "IPMI_Controller", "AuxiliaryRevision", "it has zeros, and no way to set them"),
    (OPENIPMI, "IPMI_Controller", "UTCOffsetMinutes", "it has no Get SEL Time UTC Offset"),
    (OPENIPMI, "IPMI_Event", "TimeZoneKnown", "follows UTCOffsetMinutes"),
    ({"guest"}, "IPMI_Controller", "PowerOn", "the virtual machine that collects is on"),
    ({"guest"}, "IPMI_Controller", "GUID", "it gives none over the way of a virtual machine"),
    ({"guest"}, "IPMI_Controller", "GUIDOrder", "follows GUID"),
    ({"guest"}, "IPMI_Event", "Key", "follows GUID; what refers to it is compared by record"),
    ({"guest", "replay of the guest"}, "IPMI_Controller", "Manufacturer",
     "the guest has no list of enterprise numbers"),
    ({"guest", "replay of the guest"}, "IPMI_Event", "Manufacturer",
     "the guest has no list of enterprise numbers"),
]
KEYS = {"ResolvedBy", "ContinuationOf", "FirstCause", "Events"}


def _by_record(report: list[dict]) -> list[dict]:
    """The instances with the records of events instead of their keys, where they refer to them."""
    records = {one["properties"]["Key"]: one["properties"]["RecordID"] for one in report
               if one["class"] == "IPMI_Event"}

    def record_of(key):
        return [record_of(one) for one in key] if isinstance(key, list) else records[key]
    return [{"class": one["class"], "properties": {
        name: record_of(value) if name in KEYS else value
        for name, value in one["properties"].items()}} for one in report]


def differences(expected: list[dict], actual: list[dict], source: str) -> list[str]:
    """What differs between the instances of two reports and is not allowed to."""
    found = []
    expected, actual = _by_record(expected), _by_record(actual)
    for name in CLASSES:
        pair = [[one["properties"] for one in report if one["class"] == name]
                for report in (expected, actual)]
        if len(pair[0]) != len(pair[1]):
            found.append(f"{len(pair[0])} {name}, but {len(pair[1])} from {source}")
        allowed = {row[2] for row in ALLOWED if source in row[0] and row[1] == name}
        for place, (one, other) in enumerate(zip(*pair)):
            for key in sorted({*one, *other} - allowed):
                if one.get(key) != other.get(key):
                    found.append(f"{name} {place} {key}: {one.get(key)!r}, but {other.get(key)!r} "
                                 f"from {source}")
    return found


def read_example(path: pathlib.Path) -> dict:
    return json.loads(re.sub(r"^\s*//.*$", "", path.read_text(), flags=re.MULTILINE))


def _sensor_commands(records: list[bytes], sensors: dict) -> list[str]:
    kinds = {record[7]: (record[12], record[13]) for record in records if record[3] in (1, 2)}
    commands = []
    for key, sensor in sensors.items():
        number, states = int(key, 16), bytes.fromhex(sensor["states"])
        kind, event = kinds[number]
        where = f"0x20 0 {number}"
        commands.append(f"sensor_add {where} {kind} {event}")
        thresholds = bytes.fromhex(sensor.get("thresholds", ""))
        if thresholds:
            # It compares with those too that are not readable: out of the way.
            limits = [limit if thresholds[0] >> place & 1 else (0 if place < 3 else 255)
                      for place, limit in enumerate(thresholds[1:])]
            commands.append(f"sensor_set_threshold {where} readable {thresholds[0]:06b} "
                            + " ".join(str(limit) for limit in reversed(limits)))
        if event == 1:
            commands.append(f"sensor_set_value {where} {int(sensor['reading'], 16)} 0")
        else:
            commands += [f"sensor_set_bit {where} {state} 1 0" for state in range(15)
                         if (states[1] | states[2] << 8) >> state & 1]
        # A reading that is not available: one that is not scanned, which is all that it knows.
        scanning = "no-scanning" if states[0] & 0x20 else "scanning"
        commands.append(f"sensor_set_event_support {where} enable {scanning} per-state "
                        + " ".join(["000000000000000"] * 4))
    return commands


def hexes(data: bytes) -> str:
    return " ".join(f"0x{byte:02x}" for byte in data)


def _arguments(bmc: dict) -> dict:
    """What guest.ipmi_sim needs to be the controller that an example describes, without its log."""
    identity = bytes.fromhex(bmc["device_id"])
    records = [bytes.fromhex(record) for record in bmc["sdr"]["records"]]
    commands = _sensor_commands(records, bmc["sensors"])
    for device, text in bmc["fru"].items():
        data = bytes.fromhex(text)
        commands.append(f"mc_add_fru_data 0x20 {device} {len(data)} data {hexes(data)}")
    return {"sel": [], "sdrs": records, "commands": tuple(commands), "guid": bmc["guid"],
            "log_size": len(bmc["sel"]["entries"]) + bmc["sel"]["free_bytes"] // 16,
            "controller": f"0x{identity[0]:02x} no-device-sdrs {identity[1] & 15} {identity[2]} "
                          f"0x{identity[3]:02x} 0x{identity[5]:02x} "
                          f"{int.from_bytes(identity[6:9], 'little')} "
                          f"{int.from_bytes(identity[9:11], 'little')} persist_sdr"}


def _fill(port: int, bmc: dict) -> bool:
    """Gives the BMC of OpenIPMI behind a port the event filters and the log of an example; false
    when that failed. It puts its own time on a record: its clock is set before each, and may go on
    before the record is written."""
    entries = [bytes.fromhex(entry) for entry in bmc["sel"]["entries"]]
    tool = ["timeout", "60", "ipmitool", "-I", "lanplus", "-C", "3", "-H", "127.0.0.1", "-p",
            str(port), "-U", "root", "-P", "secret", "exec"]

    def run(lines: list[str]) -> str:
        with tempfile.NamedTemporaryFile("w", suffix=".commands") as file:
            file.write("\n".join(lines) + "\n")
            file.flush()
            return subprocess.run([*tool, file.name], capture_output=True, text=True,
                                  check=True).stdout

    def set_time(seconds: bytes) -> str:
        return f"raw 0x0a 0x49 {hexes(seconds)}"

    lines = [f"raw 0x04 0x12 0x06 {hexes(bytes.fromhex(entry))}" for entry in bmc["pef"]["filters"]]
    erased = set_time(bmc["sel"]["last_erase"].to_bytes(4, "little"))
    lines += [erased, "sel clear"]
    gaps, number = [], 1
    for entry in entries:
        while number < int.from_bytes(entry[:2], "little"):
            gaps.append(f"sel delete {number}")
            lines.append("raw 0x0a 0x44 0 0 0xf0" + " 0" * 13)
            number += 1
        lines += [set_time(entry[3:7]), f"raw 0x0a 0x44 {hexes(entry)}"]
        number += 1
    run([*lines, erased, *gaps, set_time(bmc["sel"]["time"].to_bytes(4, "little"))])
    written = bytes.fromhex(run([*(f"raw 0x0a 0x43 0 0 {hexes(entry[:2])} 0 0xff"
                                   for entry in entries), "raw 0x0a 0x40"]))
    written, info = written[:-14], written[-14:]
    # The next record's ID stands before each.
    return (int.from_bytes(info[9:13], "little") == bmc["sel"]["last_erase"] and
            [written[at + 2:at + 18] for at in range(0, len(written), 18)] == entries)


@contextlib.contextmanager
def openipmi(bmc: dict):
    """A BMC of OpenIPMI that is what an example describes: (udp port, tcp port)."""
    for _ in range(20):
        with guest.ipmi_sim(**_arguments(bmc)) as ports:
            if _fill(ports[0], bmc):
                yield ports
                return
    raise AssertionError("the log of ipmi_sim does not become as it was written")
