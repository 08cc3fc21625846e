"""Whole reports with what the host remembers and without it, over a network, byte for byte.

usage: memory_test.py BUILD_FOLDER SOURCE_FOLDER

The controllers are our own on ports, with every example's records, those of IPMISEL_REAL_MACHINES where that
is set, and OpenIPMI's ipmi_sim where it is installed.
"""
import json
import os
import pathlib
import re
import subprocess
import sys
import tempfile
import unittest

BUILD = pathlib.Path(sys.argv.pop(1)).resolve()
SOURCE = pathlib.Path(sys.argv.pop(1)).resolve()
sys.path.insert(0, str(SOURCE / "tests/guest"))
import guest  # noqa: E402

WITH, WITHOUT = BUILD / "tests/program_with_memory", BUILD / "tests/program_without_memory"
COMMENT = re.compile(r'("(?:[^"\\]|\\.)*")|//[^\n]*|/\*.*?\*/', re.DOTALL)


def run(*command):
    environment = dict(os.environ, IPMISEL_PASSWORD="secret", TZ="UTC")
    done = subprocess.run([str(part) for part in command], env=environment, capture_output=True, text=True)
    if done.returncode not in (0, 4):
        raise AssertionError(f"{command}: {done.returncode} {done.stderr}")
    return done.stdout


def machines():
    """(name, description) of each server file that has a controller, without faults that count uses."""
    folders = [SOURCE / "examples"]
    if real := os.environ.get("IPMISEL_REAL_MACHINES"):
        folders.append(pathlib.Path(real))
    for folder in folders:
        for file in sorted(folder.glob("*.json")):
            server = json.loads(COMMENT.sub(lambda found: found[1] or "", file.read_text()))
            for bmc in server.get("bmcs", []):
                bmc["faults"] = [fault for fault in bmc.get("faults", []) if "call" not in fault]
            if server.get("bmcs"):
                yield file.name, server


def collect(program, places, *arguments):
    sources = [word for place in places for word in ("--from", place)]
    classes = [word for line in run(WITH, "classes").splitlines() for word in ("--class", line.split()[0])]
    return run(program, "collect", *sources, "--user", "root", "--format", "json", *classes, *arguments)


def without_times(report):
    """What a controller's running clock does not move."""
    return re.sub(r'"\d{4}-\d\d-\d\dT[\d:]{8}Z"|(?<="ClockOffsetSeconds": )[-.\de]+', "...", report)


class Memory(unittest.TestCase):
    def same(self, places, *arguments, seen=lambda report: report):
        with_memory, without = [seen(collect(program, places, *arguments)) for program in (WITH, WITHOUT)]
        self.assertGreater(with_memory.count('"class"'), 1)
        self.assertEqual(with_memory.splitlines(), without.splitlines())

    def test_every_machine_on_a_port(self):
        for name, server in machines():
            with self.subTest(name), tempfile.NamedTemporaryFile("w", suffix=".json") as file:
                json.dump(server, file)
                file.flush()
                count = len(server["bmcs"])
                simulator = subprocess.Popen(
                    [BUILD / "bin/ipmisel-simulator", "--server", file.name, "--controllers", str(count),
                     "--port", "0"], stdout=subprocess.PIPE, text=True)
                try:
                    self.same([simulator.stdout.readline().strip() for _ in range(count)], "--timeout", "1")
                finally:
                    simulator.terminate()
                    simulator.communicate()

    def test_a_controller_of_another_project(self):
        try:
            with guest.ipmi_sim(guest.SEL, guest.SDRS) as (udp, _):
                self.same([f"lan:127.0.0.1:{udp}"], "--workaround", "opensesspriv", seen=without_times)
        except guest.Missing as missing:
            self.skipTest(str(missing))


if __name__ == "__main__":
    unittest.main()
