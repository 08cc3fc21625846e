#!/usr/bin/env python3
"""Reads one BMC over the network with this program and with its peers, and compares.

usage: bench/lan_peers.py [--runs N] [--records N] [--sensors N] [--program FILE]

The BMC is OpenIPMI's ipmi_sim on 127.0.0.1. Every contender opens a session with cipher suite 3,
reads the whole event log and the sensor repository anew, and prints the events with the names of
their sensors. Runs are interleaved; a run that did not print every record ends the comparison.
"""
import argparse
import contextlib
import os
import pathlib
import shutil
import socket
import statistics
import subprocess
import sys
import tempfile
import time

HERE = pathlib.Path(__file__).resolve().parent
sys.path.insert(0, str(HERE))
import make_log  # noqa: E402

SENSOR_NAMES = [row[0] for row in make_log.FULL + make_log.COMPACT]
USER, PASSWORD = "root", "secret"


class RunFailed(Exception):
    """A contender did not print everything."""


def free_udp_port():
    with socket.socket(socket.AF_INET, socket.SOCK_DGRAM) as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


def wait_for_bmc(port, process):
    # Get Channel Authentication Capabilities in a packet of IPMI 1.5, which wants no session.
    request = bytes.fromhex("0600ff07 000000000000000000 09 2018c881 00388e04b5")
    with socket.socket(socket.AF_INET, socket.SOCK_DGRAM) as client:
        client.settimeout(0.2)
        for _ in range(400):  # it takes half a minute to take 10,000 records in
            if process.poll() is not None:
                sys.exit("ipmi_sim ended at once")
            try:
                client.sendto(request, ("127.0.0.1", port))
                client.recv(256)
                return
            except OSError:
                time.sleep(0.1)
    sys.exit("ipmi_sim does not answer")


def run(command, environment, output):
    """Wall, user and system seconds of one run; the output goes to a file. May raise RunFailed."""
    with open(output, "wb") as out, open(f"{output}.err", "wb") as err:
        start = time.monotonic()
        process = subprocess.Popen(command, stdout=out, stderr=err,
                                   env={**os.environ, **environment})
        _, status, usage = os.wait4(process.pid, 0)
        wall = time.monotonic() - start
        process.returncode = os.waitstatus_to_exitcode(status)
    if process.returncode != 0:
        message = pathlib.Path(f"{output}.err").read_text(errors="replace")
        raise RunFailed(f"{command[0]} ended with {process.returncode}: {message}")
    return wall, usage.ru_utime, usage.ru_stime


def check(name, output, records):
    """Every record was printed, and with the name of its sensor; else RunFailed."""
    lines = pathlib.Path(output).read_text(errors="replace").splitlines()
    if name.startswith("ipmi-sel"):
        lines = lines[1:]  # the heading
    if lines and '"summary"' in lines[-1]:
        lines = lines[:-1]  # of ipmisel
    named = sum(any(f"{word} " in line for word in SENSOR_NAMES) for line in lines)
    if len(lines) != records or named != records:
        raise RunFailed(f"{name}: {len(lines)} records, {named} with a sensor's name, "
                        f"not {records}")


def check_count(name, output, records):
    """Every record was printed; else RunFailed."""
    lines = len(pathlib.Path(output).read_text(errors="replace").splitlines())
    if lines != records:
        raise RunFailed(f"{name}: {lines} records, not {records}")


def arguments(doc, runs, records, sensors):
    """The options that every comparison has; the programs are all there."""
    parser = argparse.ArgumentParser(description=doc.splitlines()[0])
    parser.add_argument("--runs", type=int, default=runs)
    parser.add_argument("--records", type=int, default=records)
    parser.add_argument("--sensors", type=int, default=sensors)
    parser.add_argument("--program", default=str(HERE.parent / "build/release/bin/ipmisel"))
    return parser


def require_programs(options):
    needed = {options.program: "run tools/demo first", "ipmi_sim": "package openipmi",
              "ipmitool": "package ipmitool", "ipmi-sel": "package freeipmi-tools"}
    for program, hint in needed.items():
        if shutil.which(program) is None:
            sys.exit(f"{program} is missing: {hint}")


@contextlib.contextmanager
def simulated_bmc(records, sensors):
    """A folder to work in, and the port of an ipmi_sim that lives as long."""
    with tempfile.TemporaryDirectory() as name:
        folder = pathlib.Path(name)
        (folder / "state").mkdir()
        port = free_udp_port()
        make_log.write_ipmi_sim(records, sensors, port, name)
        with open(folder / "ipmi_sim.log", "wb") as log:
            bmc = subprocess.Popen(["ipmi_sim", "-c", name + "/lan.conf", "-f", name + "/bmc.emu",
                                    "-s", name + "/state", "-n"],
                                   stdin=subprocess.DEVNULL, stdout=log, stderr=log)
        try:
            wait_for_bmc(port, bmc)
            yield folder, port
        finally:
            bmc.kill()
            bmc.wait()


def commands(program, port):
    """The contenders. CACHE stands for the folder of ipmi-sel's cache of sensors."""
    return {
        "ipmisel": [program, "collect", "--from", f"lan:127.0.0.1:{port}",
                    "--user", USER, "--cipher-suite", "3", "--workaround", "opensesspriv",
                    "--class", "QORSG_IPMILogRecord", "--format", "ndjson"],
        "ipmitool": ["ipmitool", "-I", "lanplus", "-C", "3", "-H", "127.0.0.1", "-p", str(port),
                     "-U", USER, "-E", "sel", "elist"],
        "ipmi-sel": ["ipmi-sel", "-D", "LAN_2_0", "-I", "3", "-W", "opensesspriv",
                     "-h", f"127.0.0.1:{port}", "-u", USER, "-p", PASSWORD,
                     "--quiet-cache", "--sdr-cache-directory", "CACHE"],
    }


ENVIRONMENT = {"IPMISEL_PASSWORD": PASSWORD, "IPMI_PASSWORD": PASSWORD}


def with_cache(command, cache):
    """The command with a folder for its cache, which is made if it is not there."""
    cache.mkdir(exist_ok=True)
    return [str(cache) if word == "CACHE" else word for word in command]


def main():
    options = arguments(__doc__, 7, 1000, 100).parse_args()
    require_programs(options)
    with simulated_bmc(options.records, options.sensors) as (folder, port):
        compare(options, folder, port)


def compare(options, folder, port):
    contenders = commands(options.program, port)
    times = {name: [] for name in contenders}
    for number in range(options.runs):
        for name, command in contenders.items():
            # A cache of its own for every run, empty: each contender reads the sensors.
            command = with_cache(command, folder / f"cache-{number}")
            output = str(folder / name)
            try:
                times[name].append(run(command, ENVIRONMENT, output))
                check(name, output, options.records)
            except RunFailed as failure:
                sys.exit(str(failure))

    medians = {name: [statistics.median(column) for column in zip(*rows)]
               for name, rows in times.items()}
    best_wall = min(medians[name][0] for name in medians if name != "ipmisel")
    best_cpu = min(sum(medians[name][1:]) for name in medians if name != "ipmisel")
    print(f"{options.records} records, {options.sensors} sensors, medians of {options.runs} runs; "
          "ratios to the better peer")
    print()
    print("| program  | wall s | user s | system s | cpu us a record | wall ratio | cpu ratio |")
    print("| -------- | -----: | -----: | -------: | --------------: | ---------: | --------: |")
    for name, (wall, user, system) in medians.items():
        cpu = user + system
        print(f"| {name:8} | {wall:6.3f} | {user:6.3f} | {system:8.3f} | "
              f"{cpu / options.records * 1e6:15.0f} | {wall / best_wall:10.2f} | "
              f"{cpu / best_cpu:9.2f} |")


if __name__ == "__main__":
    main()
