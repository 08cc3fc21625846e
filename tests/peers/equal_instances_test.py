"""The rack server, simulated, behind a port, as a BMC of OpenIPMI, and captured: equal instances.
"""
import json
import os
import subprocess
import tempfile
import unittest

from side_by_side import PROGRAM, SOURCE, main
import equal_instances  # its folder is known now

SIMULATOR = PROGRAM.parent / "ipmisel-simulator"
IPMI_DEVICE = "26"  # SMBIOS type 38, which says that there is a BMC


def collect(*arguments: str) -> list[dict]:
    classes = [word for name in equal_instances.CLASSES for word in ("--class", name)]
    done = subprocess.run(
        [PROGRAM, "collect", "--format", "json", *classes, *arguments], capture_output=True,
        text=True, check=False, env=dict(os.environ, TZ="UTC", IPMISEL_PASSWORD="secret"))
    if done.returncode != 0:
        raise AssertionError(f"status {done.returncode}: {done.stderr}")
    report = json.loads(done.stdout)
    assert report["complete"] and not report["completeness"][0]["faults"], report["completeness"]
    return report["instances"]


class EqualInstances(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.example = SOURCE / "examples/rack-server.json"
        cls.machine = equal_instances.read_example(cls.example)
        # Over the network nobody knows SMBIOS.
        bare = dict(cls.machine, smbios=[structure for structure in cls.machine["smbios"]
                                         if structure.startswith(IPMI_DEVICE)])
        with tempfile.NamedTemporaryFile("w", suffix=".json") as file:
            json.dump(bare, file)
            file.flush()
            cls.expected = collect("--from", f"sim:{file.name}")

    def check(self, source: str, *arguments: str):
        """Collects, and replays the capture of it."""
        with tempfile.TemporaryDirectory() as folder:
            instances = collect(*arguments, "--record", f"{folder}/capture")
            self.assertEqual(instances, collect("--from", f"replay:{folder}/capture"))
        found = equal_instances.differences(self.expected, instances, source)
        self.assertEqual(found, [])

    def test_from_a_port(self):
        with subprocess.Popen([SIMULATOR, "--server", self.example, "--port", "0"],
                              stdout=subprocess.PIPE, text=True) as simulator:
            try:
                self.check("port", "--from", simulator.stdout.readline().strip(), "--user", "root")
            finally:
                simulator.terminate()

    def test_from_openipmi(self):
        with equal_instances.openipmi(self.machine["bmcs"][0]) as (port, _):
            self.check("ipmi_sim", "--from", f"lan:127.0.0.1:{port}", "--user", "root",
                       "--workaround", "opensesspriv")

    def test_smbios_adds_names_of_parts_alone(self):
        whole = collect("--from", f"sim:{self.example}")
        found = equal_instances.differences(whole, self.expected, "without SMBIOS")
        keys = {line.split(":")[0].split()[-1] for line in found}
        self.assertEqual(keys, {"GUIDOrder", "Part", "PartCertain", "PartNumber", "SerialNumber",
                                "Sentence", "Title", "Evidence"})


if __name__ == "__main__":
    main()
