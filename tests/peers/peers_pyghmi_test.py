"""A session with another's BMC side of RMCP+: the server of python3-pyghmi, cipher suite 3.

Session and packets are pyghmi's own; this file hands out the records. The report must be that of a
simulated server with the same records.
"""
import contextlib
import json
import multiprocessing
import os
import struct
import subprocess
import sys
import tempfile
import unittest

from side_by_side import PROGRAM, SOURCE, skip

sys.path.insert(0, str(SOURCE / "bench"))
import make_log  # noqa: E402
from lan_peers import free_udp_port, wait_for_bmc  # noqa: E402

RECORDS, SENSORS = 300, 20
CLASSES = ("QORSG_IPMILogRecord", "IPMI_Event")
NO_SUCH_RECORD = 0xCB


def serve(port):
    """IPMI 2.0, clauses 31.2, 31.5, 33.9, 33.11 and 33.12."""
    from pyghmi.ipmi import bmc

    log = [struct.pack("<H", i + 1) + make_log.event(i, SENSORS) for i in range(RECORDS)]
    sensors = [make_log.sensor_record(i) for i in range(SENSORS)]

    def read(records, data):
        """The answer to Get SEL Entry or Get SDR, which ask alike."""
        _, asked, offset, count = struct.unpack("<HHBB", data[:6])
        ids = [struct.unpack("<H", record[:2])[0] for record in records]
        at = {0: 0, 0xFFFF: len(ids) - 1}.get(asked) if asked not in ids else ids.index(asked)
        if at is None:
            return None
        following = ids[at + 1] if at + 1 < len(ids) else 0xFFFF
        return struct.pack("<H", following) + records[at][offset:offset + count]

    class Server(bmc.Bmc):
        def handle_raw_request(self, request, session):
            data = bytes(request["data"])
            answers = {(0x0A, 0x40): lambda: struct.pack("<BHHIIB", 0x51, RECORDS, 0x1000,
                                                         make_log.START + RECORDS, 0, 0x02),
                       (0x0A, 0x43): lambda: read(log, data),
                       (0x0A, 0x20): lambda: struct.pack("<BHHIIB", 0x51, SENSORS, 0x1000, 1, 0,
                                                         0x02),
                       (0x0A, 0x22): lambda: struct.pack("<H", 1),
                       (0x0A, 0x23): lambda: read(sensors, data)}
            answer = answers.get((request["netfn"], request["command"]))
            if answer is None:
                super().handle_raw_request(request, session)
                return
            found = answer()
            if found is None:
                session.send_ipmi_response(code=NO_SUCH_RECORD)
            else:
                session.send_ipmi_response(data=list(found))

    Server({"root": "secret"}, port=port, address="127.0.0.1").listen()


@contextlib.contextmanager
def pyghmi_bmc():
    port = free_udp_port()
    server = multiprocessing.Process(target=serve, args=(port,), daemon=True)
    server.start()
    try:
        server.poll = lambda: server.exitcode
        wait_for_bmc(port, server)
        yield port
    finally:
        server.kill()
        server.join()


def collect(source, *options):
    """Exit status, and the instances without what depends on when they were read."""
    classes = [word for name in CLASSES for word in ("--class", name)]
    run = subprocess.run([PROGRAM, "collect", "--from", source, "--format", "json", *classes,
                          *options], capture_output=True, text=True, check=False, timeout=120,
                         env=dict(os.environ, IPMISEL_PASSWORD="secret"))
    report = json.loads(run.stdout)
    return run, [(instance["class"], {name: value for name, value in instance["properties"].items()
                                      if name not in ("Key", "Time", "TimeStamp", "CorrectedTime")})
                 for instance in report["instances"]]


class Pyghmi(unittest.TestCase):
    def test_its_bmc_side_gives_the_report_of_the_same_records(self):
        with tempfile.TemporaryDirectory() as folder:
            make_log.write_sim(RECORDS, SENSORS, f"{folder}/server.json")
            _, expected = collect(f"sim:{folder}/server.json")
        self.assertEqual(len(expected), RECORDS * len(CLASSES))
        for window in ("1", "15", None):
            with self.subTest(window=window), pyghmi_bmc() as port:
                options = ["--user", "root", "--cipher-suite", "3"]
                run, found = collect(f"lan:127.0.0.1:{port}", *options,
                                     *(["--window", window] if window else []))
                self.assertEqual(run.returncode, 0, run.stderr)
                self.assertEqual(len(found), len(expected))
                for one, other in zip(found, expected):
                    self.assertEqual(one, other)


if __name__ == "__main__":
    try:
        import pyghmi  # noqa: F401
    except ImportError:
        skip("no pyghmi (package python3-pyghmi)")
    unittest.main(argv=sys.argv[:1], verbosity=2)
