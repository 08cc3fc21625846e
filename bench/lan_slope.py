#!/usr/bin/env python3
"""What a further record costs in processor time, over the network: this program and its peers.

usage: bench/lan_slope.py [--runs N] [--records FEW] [--many N] [--sensors N] [--program FILE]

Two of OpenIPMI's ipmi_sim on 127.0.0.1, one with few records, one with many; the slope is the
difference of the median processor times by the difference of the records. Runs are interleaved; one
that did not print every record ends the comparison.
"""
import statistics
import subprocess
import sys

import lan_peers

PEERS = ["ipmitool", "ipmi-sel"]


def described_classes(program):
    """`--class` for each class of the plug-in of the event log that a collection has by itself."""
    listed = subprocess.run([program, "classes"], capture_output=True, text=True, check=True).stdout
    return [word for line in listed.splitlines()
            if line.startswith("QORSG_") and "only when named" not in line
            for word in ("--class", line.split()[0])]


def contenders(program, port):
    """Name to command, and whether its lines are the records."""
    commands = lan_peers.commands(program, port)
    own = commands.pop("ipmisel")
    at = own.index("--class")
    every, rest = own[:at], own[at + 2:]
    return {"ipmisel, described classes": ([*every, *described_classes(program), *rest], False),
            "ipmisel, event log": (own, True),
            "ipmisel, IPMI_Event": ([*every, "--class", "IPMI_Event", *rest], True),
            "ipmisel, every class": ([*every, *rest], False),
            **{name: (command, True) for name, command in commands.items()}}


def main():
    parser = lan_peers.arguments(__doc__, 5, 1000, 100)
    parser.add_argument("--many", type=int, default=8000)
    options = parser.parse_args()
    lan_peers.require_programs(options)
    used = {}
    with lan_peers.simulated_bmc(options.records, options.sensors) as few, \
            lan_peers.simulated_bmc(options.many, options.sensors) as many:
        for number in range(options.runs):
            for records, (folder, port) in (options.records, few), (options.many, many):
                for name, (command, is_checked) in contenders(options.program, port).items():
                    command = lan_peers.with_cache(command, folder / f"cache-{number}")
                    output = str(folder / "output")
                    try:
                        _, user, system = lan_peers.run(command, lan_peers.ENVIRONMENT, output)
                        if is_checked:
                            lan_peers.check(name, output, records)
                    except lan_peers.RunFailed as failure:
                        sys.exit(str(failure))
                    used.setdefault(name, {}).setdefault(records, []).append(user + system)
    medians = {name: {records: statistics.median(times) for records, times in by_size.items()}
               for name, by_size in used.items()}
    slopes = {name: (median[options.many] - median[options.records])
              / (options.many - options.records) * 1e6 for name, median in medians.items()}
    best = min(slopes[name] for name in PEERS)
    print(f"{options.sensors} sensors, medians of {options.runs} runs; ratios to the better peer\n")
    print(f"| program | {options.records} records, ms | {options.many} records, ms "
          "| a further record, us | ratio |")
    print("| --- | ---: | ---: | ---: | ---: |")
    for name, median in medians.items():
        print(f"| {name} | {median[options.records] * 1e3:.1f} | {median[options.many] * 1e3:.1f} "
              f"| {slopes[name]:.1f} | {slopes[name] / best:.2f} |")


if __name__ == "__main__":
    main()
