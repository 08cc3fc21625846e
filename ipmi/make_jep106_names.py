#!/usr/bin/env python3
"""Writes jep106_names.cpp from jep106.csv, the names of JEDEC standard JEP106, banks 1 to 7.

usage: ipmi/make_jep106_names.py  (from anywhere; both files stand beside this script)
"""
import csv
import pathlib

HERE = pathlib.Path(__file__).resolve().parent
BANKS, CODES = 7, 126

names = {}
with open(HERE / "jep106.csv", newline="", encoding="utf-8") as table:
    for row in csv.DictReader(table):
        names[int(row["bank"]), int(row["code"])] = row["name"]
wanted = {(bank, code) for bank in range(BANKS) for code in range(1, CODES + 1)}
if set(names) != wanted:
    raise SystemExit(f"jep106.csv: expected every code 1 to {CODES} of {BANKS} banks, once each")

lines = [
    "// Made by make_jep106_names.py from jep106.csv; edit those.",
    '#include "ipmi/jep106.h"',
    "",
    "namespace ipmi {",
    "",
    "const char* const kJep106Names[kJep106Banks * kJep106Codes] = {",
]
for bank in range(BANKS):
    lines.append(f"    // bank {bank + 1}")
    for code in range(1, CODES + 1):
        name = names[bank, code].replace("\\", "\\\\").replace('"', '\\"')
        lines.append(f'    "{name}",' if name else "    nullptr,")
lines += ["};", "", "}  // namespace ipmi"]
(HERE / "jep106_names.cpp").write_text("\n".join(lines) + "\n", encoding="utf-8")
