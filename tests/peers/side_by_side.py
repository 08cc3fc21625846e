"""What the tests of this folder share: one BMC read by ipmisel, ipmitool and a program of FreeIPMI, and waiting.

usage of each: TEST.py PROGRAM SOURCE_FOLDER        (exit status 77: a facility is missing)
"""
import json
import os
import pathlib
import shutil
import subprocess
import sys
import time
import unittest

PROGRAM = pathlib.Path(sys.argv[1]).resolve()
SOURCE = pathlib.Path(sys.argv[2]).resolve()
sys.path.insert(0, str(SOURCE / "tests/guest"))


class Peers:
    """The programs, with a home folder of their own."""

    def __init__(self, port, home: str, check: bool = False):
        self.port, self.check = str(port), check
        self.environment = dict(os.environ, IPMISEL_PASSWORD="secret", HOME=home, TZ="UTC")

    def run(self, *command: str) -> str:
        return subprocess.run(["timeout", "300", *command], capture_output=True, check=self.check, text=True,
                              errors="replace", env=self.environment).stdout

    def collect(self, *classes: str, source: tuple[str, ...] = ()) -> list[dict]:
        """The instances; of the BMC at the port, unless another source is named."""
        named = [word for name in classes for word in ("--class", name)]
        source = source or ("--from", f"lan:127.0.0.1:{self.port}", "--user", "root", "--workaround",
                            "opensesspriv")
        return json.loads(self.run(str(PROGRAM), "collect", *source, "--format", "json", *named))["instances"]

    def ours(self, name: str, **source) -> list[dict]:
        """The properties of a class."""
        return [one["properties"] for one in self.collect(name, **source)]

    def ipmitool(self, *arguments: str) -> list[str]:
        return self.run("ipmitool", "-I", "lanplus", "-C", "3", "-H", "127.0.0.1", "-p", self.port, "-U",
                        "root", "-P", "secret", *arguments).splitlines()

    def freeipmi(self, program: str, *arguments: str) -> list[str]:
        return self.run(program, "-D", "LAN_2_0", "-I", "3", "-h", f"127.0.0.1:{self.port}", "-u", "root",
                        "-p", "secret", "-W", "opensesspriv", "--quiet-cache", *arguments).splitlines()


def skip(why: str):
    print(f"SKIPPED: {why}")
    sys.exit(77)


def eventually(condition, seconds: float = 60) -> bool:
    end = time.monotonic() + seconds
    while not condition():
        if time.monotonic() > end:
            return False
        time.sleep(0.1)
    return True


def main(*needed: str):
    """Runs the tests; exit status 77 where a program, named as PROGRAM:PACKAGE, is missing."""
    for program, package in (one.split(":") for one in ("ipmi_sim:openipmi", "ipmitool:ipmitool", *needed)):
        if not shutil.which(program):
            skip(f"no {program} (package {package})")
    unittest.main(argv=sys.argv[:1], verbosity=2)
