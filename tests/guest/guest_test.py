"""Collects in a Linux guest with a real IPMI driver and compares with the same log read otherwise.

usage: guest_test.py BUILD_FOLDER CACHE_FOLDER     (exit status 77: a facility is missing)
"""
import json
import os
import pathlib
import re
import subprocess
import sys
import tempfile
import unittest

import guest
from guest import SDRS, SEL

BUILD = pathlib.Path(sys.argv[1]).resolve()
CACHE = pathlib.Path(sys.argv[2]).resolve()
PROGRAM = BUILD / "bin/ipmisel"

KCS_INTERNAL = ["-device", "ipmi-bmc-sim,id=bmc0", "-device", "isa-ipmi-kcs,bmc=bmc0"]
LOG = "collect --from inband --format json --class QORSG_IPMILogRecord"


def external(tcp: int) -> list[str]:
    return ["-chardev", f"socket,id=ipmi0,host=127.0.0.1,port={tcp},reconnect=10",
            "-device", "ipmi-bmc-extern,chardev=ipmi0,id=bmc0",
            "-device", "isa-ipmi-kcs,bmc=bmc0"]


def collect(*arguments: str) -> dict:
    """The report of the program on this machine, in the guest's time zone."""
    environment = dict(os.environ, TZ="UTC", IPMISEL_PASSWORD="secret")
    done = subprocess.run([PROGRAM, "collect", "--format", "json", "--class", "QORSG_IPMILogRecord",
                           *arguments], capture_output=True, text=True, check=False,
                          env=environment)
    if done.returncode != 0:
        raise AssertionError(f"status {done.returncode}: {done.stderr}")
    return json.loads(done.stdout)


class InTheGuest(unittest.TestCase):
    def run_guest(self, *arguments, **options) -> guest.Run:
        return guest.run_guest(BUILD, CACHE, *arguments, **options)

    def test_a_full_log_reads_as_over_the_network_and_simulated(self):
        with guest.ipmi_sim(SEL, SDRS) as (udp, tcp):
            # Before the guest: ipmi_sim does not outlive a virtual machine that leaves.
            lan = collect("--from", f"lan:127.0.0.1:{udp}", "--user", "root")
            run = self.run_guest(LOG, external(tcp) + ["-smbios", "type=1,product=SIM-1"])
        self.assertEqual(run.status, 0, run.err)
        inband = json.loads(run.out)
        self.assertEqual(len(inband["instances"]), len(SEL))
        self.assertEqual(inband["instances"], lan["instances"])
        server = {"local_time": "20240305120000.000000+000", "machine_type": "SIM-1",
                  "smbios": ["26 12 00 30 01 20 20 00 a3 0c 00 00 00 00 00 00 01 05 00 00"],
                  "bmcs": [{"sel": {"entries": [bytes(i["properties"]["RawData"]).hex()
                                                for i in inband["instances"]]},
                            "sdr": {"records": [record.hex() for record in SDRS]}}]}
        with tempfile.NamedTemporaryFile("w", suffix=".json") as file:
            json.dump(server, file)
            file.flush()
            simulated = collect("--from", f"sim:{file.name}")
        self.assertEqual(inband["instances"], simulated["instances"])

    def test_a_record_costs_one_command(self):
        log = [bytes([i, 0]) + SEL[i % len(SEL)][2:] for i in range(1, 201)]
        sensors = [bytes([i, 0]) + SDRS[i % len(SDRS)][2:] for i in range(1, 41)]
        with guest.ipmi_sim(log, []) as (_, tcp):
            run = self.run_guest(LOG, external(tcp))
        self.assertEqual(len(json.loads(run.out)["instances"]), len(log))
        self.assertIn(run.transactions, range(len(log), len(log) + 24))
        # QEMU's own BMC gives whole sensor records, ipmi_sim only parts.
        with tempfile.NamedTemporaryFile() as file:
            file.write(b"".join(sensors))
            file.flush()
            run = self.run_guest(LOG, ["-device", f"ipmi-bmc-sim,id=bmc0,sdrfile={file.name}",
                                       *KCS_INTERNAL[2:]])
        self.assertEqual(json.loads(run.out)["completeness"][0]["sensors"]["read"], len(sensors))
        self.assertIn(run.transactions, range(len(sensors), len(sensors) + 24))

    def test_a_report_does_not_depend_on_what_the_host_remembers(self):
        def collect(memory):
            return (f"/opt/tests/program_{memory}_memory collect --format json $classes"
                    f" --output /tmp/{memory}")
        both = ("classes | while read name rest; do echo --class $name; done >/tmp/classes;"
                f" classes=$(cat /tmp/classes); {collect('with')} && {collect('without')} &&"
                " cat /tmp/with /tmp/without")
        with guest.ipmi_sim(SEL, SDRS) as (_, tcp):
            run = self.run_guest(both, external(tcp) + ["-smbios", "type=1,product=SIM-1"])
        self.assertEqual(run.status, 0, run.err)
        # The controller's clock runs on between the two.
        times = r'"\d{4}-\d\d-\d\dT[\d:]{8}Z"|(?<="ClockOffsetSeconds": )[-.\de]+'
        lines = re.sub(times, "...", run.out).splitlines()
        self.assertEqual(lines[:len(lines) // 2], lines[len(lines) // 2:])
        self.assertGreater(run.out.count("IPMI_Event"), len(SEL))

    def test_an_empty_log_is_whole(self):
        run = self.run_guest(LOG, KCS_INTERNAL)
        self.assertEqual(run.status, 0, run.err)
        self.assertEqual(json.loads(run.out)["instances"], [])

    def test_without_the_driver_the_notice_is_given(self):
        run = self.run_guest(LOG, KCS_INTERNAL, load_driver=False)
        self.assertIn("the IPMI driver is not installed", run.err)
        self.assertIn("the IPMI driver is not installed", json.loads(run.out)["notices"][0])
        self.assertNotEqual(run.status, 0)

    def test_without_a_bmc_the_source_cannot_be_opened(self):
        run = self.run_guest(LOG, [])
        self.assertEqual(run.status, 3, run.err)
        self.assertEqual(len(run.err.splitlines()), 1)


if __name__ == "__main__":
    try:
        guest.kernel(CACHE)
        with tempfile.TemporaryDirectory() as probe:
            guest.initramfs(BUILD, [], "")
        if not guest.shutil.which("qemu-system-x86_64"):
            raise guest.Missing("no qemu-system-x86_64 (package qemu-system-x86)")
    except guest.Missing as missing:
        print(f"SKIPPED: {missing}")
        sys.exit(77)
    unittest.main(argv=sys.argv[:1], verbosity=2)
