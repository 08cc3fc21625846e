"""Collects in a Linux guest with a real IPMI driver and compares with the same log read otherwise.

usage: guest_test.py BUILD_FOLDER CACHE_FOLDER     (exit status 77: a facility is missing)
"""
import json
import os
import pathlib
import subprocess
import sys
import tempfile
import unittest

import equal_instances
import guest
from guest import SDRS, SEL

BUILD = pathlib.Path(sys.argv[1]).resolve()
CACHE = pathlib.Path(sys.argv[2]).resolve()
PROGRAM = BUILD / "bin/ipmisel"
RACK_SERVER = pathlib.Path(__file__).parents[2] / "examples/rack-server.json"

KCS_INTERNAL = ["-device", "ipmi-bmc-sim,id=bmc0", "-device", "isa-ipmi-kcs,bmc=bmc0"]
LOG = "collect --from inband --format json --class QORSG_IPMILogRecord"


def external(tcp: int) -> list[str]:
    return ["-chardev", f"socket,id=ipmi0,host=127.0.0.1,port={tcp},reconnect=10",
            "-device", "ipmi-bmc-extern,chardev=ipmi0,id=bmc0",
            "-device", "isa-ipmi-kcs,bmc=bmc0"]


def collect(*arguments: str, classes=("QORSG_IPMILogRecord",)) -> dict:
    """The report of the program on this machine, in the guest's time zone."""
    environment = dict(os.environ, TZ="UTC", IPMISEL_PASSWORD="secret")
    named = [word for name in classes for word in ("--class", name)]
    done = subprocess.run([PROGRAM, "collect", "--format", "json", *named, *arguments],
                          capture_output=True, text=True, check=False, env=environment)
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

    def test_the_rack_server_in_band_and_captured_is_as_simulated(self):
        machine = equal_instances.read_example(RACK_SERVER)
        classes = equal_instances.CLASSES
        simulated = collect("--from", f"sim:{RACK_SERVER}", classes=classes)["instances"]
        named = " ".join(f"--class {name}" for name in classes)
        with tempfile.TemporaryDirectory() as folder:
            # A machine has a structure for each of its processors.
            smbios = ["-smp", "2,sockets=2,cores=1,threads=1"]
            for number, structure in enumerate(machine["smbios"]):
                path = pathlib.Path(folder) / str(number)
                path.write_bytes(bytes.fromhex(structure))
                if structure[:2] not in ("26", "7f"):  # IPMI device and end are the machine's own
                    smbios += ["-smbios", f"file={path}"]
            with equal_instances.openipmi(machine["bmcs"][0]) as (_, tcp):
                run = self.run_guest(f"collect --from inband --format json {named} --record "
                                     "/tmp/capture --output /tmp/report "
                                     "&& cat /tmp/report /tmp/capture", external(tcp) + smbios)
            self.assertEqual(run.status, 0, run.err)
            report, end = json.JSONDecoder().raw_decode(run.out)
            self.assertTrue(report["complete"])
            capture = pathlib.Path(folder) / "capture"
            capture.write_text(run.out[end:].lstrip())
            replayed = collect("--from", f"replay:{capture}", classes=classes)["instances"]
        self.assertEqual(
            equal_instances.differences(simulated, report["instances"], "guest"), [])
        self.assertEqual(
            equal_instances.differences(report["instances"], replayed, "replay of the guest"), [])

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

    def test_the_doctor_names_each_piece_that_is_missing(self):
        whole = r"ok +SMBIOS +announces the BMC \(type 38\) where the driver has it: kcs, i/o 0xca2"
        found = {  # what the shell does before, the exit status, some of the lines
            "no module": ("", 3, [r"WRONG +module ipmi_devintf +not loaded; modprobe", r"WRONG +device +no /dev/ipmi0"]),
            "no interface": ("insmod /modules/ipmi_msghandler.ko; insmod /modules/ipmi_devintf.ko", 3,
                             [r"ok +module ipmi_devintf", r"WRONG +module of the interface +not loaded"]),
            "all": ("insmod /modules/ipmi_si.ko; sleep 1", 4,
                    [r"ok +module of the interface", r"ok +device +/dev/ipmi0", whole, r"ok +Get Device ID +[0-9]",
                     r"WRONG +clock +never set"]),  # of ipmi_sim, as over the network
            "another address": ("cp -r /sys/firmware/dmi/tables /tmp/t; xxd -p /tmp/t/DMI | tr -d '\\n' | "
                                "sed s/a30c0000000000/a90c0000000000/ | xxd -r -p >/tmp/DMI; mv /tmp/DMI /tmp/t/DMI; "
                                "mount -o bind /tmp/t /sys/firmware/dmi/tables", 4,
                                [r"WRONG +SMBIOS +.*kcs, i/o 0xca8, the driver has one at kcs, i/o 0xca2;"]),
            "no SMBIOS": ("umount /sys/firmware/dmi/tables; mount -t tmpfs none /sys/firmware/dmi", 4,
                          [r"WRONG +SMBIOS +announces no BMC", r"ok +Get Device ID"]),
            "no device": ("umount /sys/firmware/dmi; mv /dev/ipmi0 /tmp/ipmi0", 3,
                          [r"WRONG +device +no /dev/ipmi0: the driver found no BMC"]),
            "no rights": ("mv /tmp/ipmi0 /dev/ipmi0; chmod 600 /dev/ipmi0; AS='su -s /bin/sh nobody -c'", 3,
                          [r"WRONG +device +/dev/ipmi0: Permission denied; run as root"]),
            "a silent BMC": ("AS='sh -c'", 3, [r"WRONG +Get Device ID +.*(hangs|no answer)"]),
        }
        commands = ("mkdir -p /etc; echo nobody:x:65534:65534::/:/bin/sh >/etc/passwd; AS='sh -c'\n"
                    "examine() { echo \"== $1\"; $AS '/opt/bin/ipmisel doctor --timeout 10'; echo \"status $?\"; }\n")
        commands += "".join(f"{before}\nexamine '{name}'\n" for name, (before, _, _) in found.items())
        with guest.ipmi_sim(SEL, SDRS) as (_, tcp), guest.FallingSilent(tcp, whole_runs=3) as relay:
            run = self.run_guest("", external(relay.port), load_driver=False, commands=commands)
        parts = dict(part.split("\n", 1) for part in run.out.split("== ")[1:])
        for name, (_, status, lines) in found.items():
            with self.subTest(missing=name):
                self.assertIn(f"status {status}", parts[name])
                for line in lines:
                    self.assertRegex(parts[name], line)


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
