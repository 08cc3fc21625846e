#!/usr/bin/env python3
"""Manual pages: one of each command, and none that a formatter warns of.

usage: pages_test.py PROGRAM ROOT            (exit status 77: a facility is missing)
"""
import pathlib
import re
import shutil
import subprocess
import sys
import tempfile

PROGRAM, ROOT = map(pathlib.Path, sys.argv[1:3])
for tool in ("lowdown", "help2man", "man"):
    if shutil.which(tool) is None:
        print(f"SKIPPED: {tool} is not installed")
        sys.exit(77)


def fail(text):
    sys.exit(f"pages: {text}")


with tempfile.TemporaryDirectory() as folder:
    subprocess.run([sys.executable, ROOT / "packaging/man/make_pages.py", PROGRAM, folder], check=True)
    pages = {path.name: path for path in pathlib.Path(folder).glob("man*/*")}
    listed = subprocess.run([PROGRAM, "--help"], capture_output=True, text=True, check=True).stdout
    commands = re.findall(r"^  ([a-z]+) +\S", listed.split("Subcommands:")[1], re.MULTILINE)
    wanted = {f"ipmisel-{command}.1" for command in commands} | {
        "ipmisel.1", "ipmisel.conf.5", "ipmisel-simulated-server.5", "ipmisel-capture.5", "ipmisel-fleet.7"}
    if missing := wanted - set(pages):
        fail(f"{missing} missing")
    for name, path in pages.items():
        shown = subprocess.run(["man", "--warnings", "-E", "UTF-8", "-l", path], capture_output=True, text=True,
                               env={"MANWIDTH": "80", "PATH": "/usr/bin:/bin", "LANG": "C.UTF-8"})
        if shown.returncode != 0 or shown.stderr or not shown.stdout.split("\n", 1)[0].startswith(name.rsplit(".", 1)[0]):
            fail(f"{name}: {shown.stderr or shown.stdout[:200]}")
        if shutil.which("mandoc"):
            lint = subprocess.run(["mandoc", "-T", "lint", "-W", "warning", path], capture_output=True, text=True)
            if lint.stdout:
                fail(lint.stdout)
        # A link of a document that is no page leaves no mark behind.
        if re.search(r"\]\(\S+\.md", path.read_text()):
            fail(f"{name}: a link was not resolved")
