#!/usr/bin/env python3
"""Writes an event log and a sensor repository of a given size, the same ones every time.

usage: make_log.py sim RECORDS SENSORS FILE             a simulated server
       make_log.py ipmi_sim RECORDS SENSORS PORT FOLDER  lan.conf and bmc.emu for OpenIPMI's ipmi_sim

Three of four sensors are full sensor records with threshold events (reading and limit), the fourth
is a compact one with discrete events. The events go round the sensors; every fifth is a deassertion.
"""
import json
import struct
import sys

START = 1772928000  # 2026-03-08 00:00:00 UTC
# Name, sensor type, and of full records base unit, M and R exponent: degrees C, volts, RPM.
FULL = [("Temp", 0x01, 0x01, 1, 0), ("Volt", 0x02, 0x04, 16, -3), ("Fan", 0x04, 0x12, 60, 0)]
# Name, sensor type, event type, first byte of event data.
COMPACT = [("PS", 0x08, 0x6F, 0x03), ("DIMM", 0x0C, 0x6F, 0x00), ("Drive", 0x0D, 0x6F, 0x01),
           ("Watchdog", 0x23, 0x6F, 0xC1), ("ACPI", 0x22, 0x6F, 0x05), ("Supply", 0x09, 0x0B, 0x01),
           ("Session", 0x2A, 0x6F, 0x00), ("Cover", 0x05, 0x6F, 0x00)]


def is_full(sensor):
    return sensor % 4 != 3


def event(index, sensors):
    """Bytes 2 to 15 of an event record (IPMI 2.0, table 32-1)."""
    sensor = index % sensors
    if is_full(sensor):
        sensor_type, event_type = FULL[sensor % len(FULL)][1], 0x01
        data = bytes([0x57, 40 + index % 50, 40])
    else:
        _, sensor_type, event_type, data1 = COMPACT[sensor // 4 % len(COMPACT)]
        data = bytes([data1, 0x04, 0xFF])
    direction = 0x80 if index % 5 == 4 else 0x00
    return (struct.pack("<BIHBBBB", 0x02, START + index, 0x0020, 0x04, sensor_type, sensor + 1,
                        direction | event_type) + data)


def sensor_record(sensor):
    """A full or a compact sensor record (IPMI 2.0, tables 43-1 and 43-2)."""
    name, sensor_type, *rest = (FULL[sensor % len(FULL)] if is_full(sensor)
                                else COMPACT[sensor // 4 % len(COMPACT)])
    text = f"{name} {sensor + 1}".encode()
    body = bytes([0x20, 0x00, sensor + 1, 0x07, sensor % 60 + 1, 0x7F, 0x68, sensor_type])
    if is_full(sensor):
        unit, m, r_exponent = rest
        body += struct.pack("<BHHH", 0x01, 0x0A80, 0x7A80, 0x3838)
        body += bytes([0x00, unit, 0x00, 0x00, m, 0x00, 0x00, 0x00, 0x00, (r_exponent & 0xF) << 4])
        body += bytes([0x00, 0x00, 0x00, 0x00, 0xFF, 0x00, 0xC8, 0x96, 40, 0x00, 0x00, 0x00])
        body += bytes([0x02, 0x02, 0x00, 0x00, 0x00])
    else:
        body += struct.pack("<BHHH", rest[0], 0x01FF, 0x0000, 0x01FF)
        body += bytes([0xC0, 0x00, 0x00, 0x01, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00])
    body += bytes([0xC0 | len(text)]) + text
    # No byte of a record ID is 0xFF: many a reader, this one included, takes it for the end.
    record_id = sensor // 254 << 8 | sensor % 254 + 1
    return struct.pack("<HBBB", record_id, 0x51, 0x01 if is_full(sensor) else 0x02,
                       len(body)) + body


def write_sim(records, sensors, file):
    ipmi_device = "26123000 012020ffa30c0000000000000105 0000"
    entries = [struct.pack("<H", i + 1).hex() + event(i, sensors).hex() for i in range(records)]
    with open(file, "w", encoding="ascii") as out:
        json.dump({"smbios": [ipmi_device],
                   "local_time": "20260310093000.000000+000",
                   "bmcs": [{"sel": {"entries": entries, "time": 1773135000},
                             "sdr": {"records": [sensor_record(i).hex() for i in range(sensors)]},
                             "aux_log": {"count": 0}}]}, out, indent=0)


def write_ipmi_sim(records, sensors, port, folder):
    numbers = lambda data: " ".join(f"0x{byte:02x}" for byte in data)
    auths = "".join(f"allowed_auths_{level} none md2 md5 straight\n"
                    for level in ("callback", "user", "operator", "admin"))
    with open(f"{folder}/lan.conf", "w", encoding="ascii") as out:
        out.write('name "bench"\nset_working_mc 0x20\nstartlan 1\n'
                  f"addr 127.0.0.1 {port}\npriv_limit admin\n{auths}"
                  "guid a123456789abcdefa123456789abcdef\nendlan\n"
                  'user 2 true "root" "secret" admin 10 none md2 md5 straight\n')
    with open(f"{folder}/bmc.emu", "w", encoding="ascii") as out:
        out.write("mc_setbmc 0x20\n"
                  "mc_add 0x20 0 no-device-sdrs 0x23 9 8 0x9f 0x1291 0xf02 persist_sdr\n"
                  f"sel_enable 0x20 {records + 100} 0x0a\n")
        for i in range(sensors):
            out.write(f"main_sdr_add 0x20 {numbers(sensor_record(i))}\n")
        for i in range(records):
            out.write(f"sel_add 0x20 {numbers(event(i, sensors))}\n")
        out.write("mc_enable 0x20\n")


def main():
    if len(sys.argv) == 5 and sys.argv[1] == "sim":
        write_sim(int(sys.argv[2]), int(sys.argv[3]), sys.argv[4])
    elif len(sys.argv) == 6 and sys.argv[1] == "ipmi_sim":
        write_ipmi_sim(int(sys.argv[2]), int(sys.argv[3]), int(sys.argv[4]), sys.argv[5])
    else:
        sys.exit(__doc__)


if __name__ == "__main__":
    main()
