#!/usr/bin/env python3
"""What README and manual tell somebody to type is understood, and what documents link is there.

usage: documents_test.py PROGRAM ROOT
"""
import json
import os
import pathlib
import re
import shlex
import shutil
import socket
import subprocess
import sys
import tempfile
import unittest

PROGRAM, ROOT = pathlib.Path(sys.argv.pop(1)).resolve(), pathlib.Path(sys.argv.pop(1)).resolve()
EXIT_USAGE = 2


def commands(document, start):
    """The lines of code that begin with `start`, without their comments."""
    lines = re.findall(rf"^    ({start}.*)$", (ROOT / document).read_text(), re.MULTILINE)
    return [shlex.split(line, comments=True) for line in lines]


def on_this_machine(words, folder):
    """The same with a simulated server instead of controllers on the network, and the files that it names."""
    simulated, sources, done = "sim:examples/rack-server.json", 0, []
    for word in words:
        if word == "--hosts":
            word = "--from"
        elif word.startswith("lan:") or (done and done[-1] == "--from" and ":" not in word):
            word = simulated
        elif done and done[-1] == "--password-file":
            word = str(folder / "password")
            (folder / "password").write_text("secret\n")
        sources += word == simulated
        if word == simulated and sources > 1:
            done.pop()
        else:
            done.append(word)
    return done


class Commands(unittest.TestCase):
    def collect(self, document):
        """Runs each of them in one folder, one after the other."""
        with tempfile.TemporaryDirectory() as name:
            folder = pathlib.Path(name)
            (folder / "examples").symlink_to(ROOT / "examples")
            found = [words for words in commands(document, "ipmisel ")
                     if not {"|", "<", ">", "&&", "||"} & set(words)]
            for words in (on_this_machine(words, folder) for words in found):
                ended = subprocess.run([PROGRAM, *words[1:]], cwd=folder, capture_output=True, text=True,
                                       env={**os.environ, "IPMISEL_PASSWORD": "secret"})
                with self.subTest(command=" ".join(words)):
                    if words[1] == "check":
                        self.assertIn(ended.returncode, (0, 1, 2), ended.stdout)
                    elif words[1] not in ("collect", "doctor") or re.search(" (sim|replay):", " ".join(words)):
                        self.assertEqual(ended.returncode, 0, ended.stderr)
                    else:
                        # This machine: whatever BMC it has, if it has one.
                        self.assertNotEqual(ended.returncode, EXIT_USAGE, ended.stderr)
            return len(found)

    def test_readme(self):
        self.assertGreaterEqual(self.collect("README.md"), 12)

    def test_samples_after_commands_are_what_these_write(self):
        """The lines of code right after a command: stretches of its output, in order, "..." for what is left out."""
        text = (ROOT / "README.md").read_text() + (ROOT / "docs/formats.md").read_text()
        blocks = re.findall(r"^    (ipmisel [^|\n]*)\n((?:    (?!ipmisel |sqlite3 ).+\n)+)", text, re.MULTILINE)
        self.assertGreaterEqual(len(blocks), 5)
        for command, sample in blocks:
            ended = subprocess.run([PROGRAM, *shlex.split(command)[1:]], cwd=ROOT, capture_output=True, text=True)
            at = 0
            for piece in re.split(r" ?\.\.\.\s*|\n", sample.replace("\n    ", "\n")):
                found = ended.stdout.find(piece.strip(), at)
                with self.subTest(command=command, piece=piece):
                    self.assertGreaterEqual(found, 0)
                at = max(at, found)

    def test_manual(self):
        self.assertGreaterEqual(self.collect("docs/manual.md"), 3)

    def test_picture_is_what_the_program_writes(self):
        if not pathlib.Path("/usr/share/misc/enterprise-numbers.txt").exists():
            self.skipTest("no list of enterprise numbers, whose names it shows (package ipmitool)")
        with tempfile.TemporaryDirectory() as folder:
            drawn = pathlib.Path(folder, "report.svg")
            subprocess.run([sys.executable, ROOT / "tools/picture", PROGRAM, drawn], check=True)
            self.assertEqual(drawn.read_text(), (ROOT / "docs/report.svg").read_text(), "run tools/picture")

    @unittest.skipUnless(shutil.which("jq"), "jq is not installed")
    def test_jq_of_the_manual_finds_what_is_critical_and_nothing_else(self):
        pipe = re.search(r"^    ipmisel collect --format events \|\n +(jq .*)$",
                         (ROOT / "docs/manual.md").read_text(), re.MULTILINE)[1]
        # Threshold events of a fan: record ID, type, time, generator, revision, sensor type and number, direction,
        # then lower non-critical (52h at offset 0), lower critical (offset 2), lower non-recoverable (offset 4).
        server = {"bmcs": [{"sel": {"entries": [
            f"{number:02x}00 02 {number:02x}e5e665 2000 04 04 {sensor} {direction} {offset} 0a 1e"
            for number, (sensor, direction, offset) in enumerate(
                [("30", "01", "52"), ("30", "81", "52"),  # critical, and over
                 ("31", "01", "50"),                      # a warning
                 ("32", "01", "52"),                      # critical
                 ("33", "01", "54")], 1)]}}]}             # fatal
        with tempfile.TemporaryDirectory() as folder:
            pathlib.Path(folder, "server.json").write_text(json.dumps(server))
            events = subprocess.run([PROGRAM, "collect", "--from", "sim:server.json", "--format", "events"],
                                    cwd=folder, capture_output=True, text=True).stdout
        lines = subprocess.run(["bash", "-c", pipe], input=events, check=True, capture_output=True,
                               text=True).stdout.splitlines()
        self.assertEqual([re.search(r"sensor (..)h", line)[1] for line in lines], ["32", "33"], lines)

    @unittest.skipUnless(shutil.which("ipmi_sim"), "ipmi_sim is not installed (package openipmi)")
    def test_recipe_with_ipmi_sim(self):
        recipe = re.search(r"## A BMC that does not exist\n.*?\n((?:    [^\n]*\n){6})\n",
                           (ROOT / "docs/manual.md").read_text(), re.DOTALL)[1]
        install, *lines = recipe.replace("    ", "").splitlines()
        self.assertIn("openipmi", install)
        with socket.socket(socket.AF_INET, socket.SOCK_DGRAM) as probe:
            probe.bind(("127.0.0.1", 0))
            port = probe.getsockname()[1]
        # Whoever types takes longer than the BMC does to be there.
        there = f"until grep -qi ':{port:04X} ' /proc/net/udp; do sleep 0.05; done"
        lines = ["trap 'kill $!' EXIT"] + [line.replace("6230", str(port)) + (f"\n{there}" if line.endswith("&") else "")
                                           for line in lines]
        with tempfile.TemporaryDirectory() as folder:
            shutil.copytree(ROOT / "examples/ipmi_sim", pathlib.Path(folder, "ipmi_sim"))
            configuration = pathlib.Path(folder, "ipmi_sim/lan.conf")
            configuration.write_text(configuration.read_text().replace("6230", str(port)))
            ended = subprocess.run(["bash", "-c", "\n".join(lines)], cwd=folder, capture_output=True, text=True,
                                   timeout=120, env={**os.environ, "PATH": f"{PROGRAM.parent}:{os.environ['PATH']}"})
        self.assertEqual(ended.returncode, 0, ended.stderr)
        self.assertEqual(re.findall(r"^WRONG +(.*?)  ", ended.stdout, re.MULTILINE), ["clock", "cipher suite 0"])
        self.assertIn("Fan 1: below the lower critical threshold", ended.stdout)

    @unittest.skipUnless((PROGRAM.parent / "ipmisel-simulator").exists(), "built without access over the network")
    def test_recipe_with_the_simulator(self):
        lines = re.search(r"^((?:    .*\n)*    ipmisel-simulator .*\n(?:    .*\n)*)", (ROOT / "docs/manual.md").read_text(),
                          re.MULTILINE)[1].replace("    ", "")
        script = "trap 'kill $!' EXIT\n" + re.sub(
            r"^(ipmisel-simulator .*) &$", r'\1 --port 0 >"$PLACE" &\nuntil [ -s "$PLACE" ]; do sleep 0.05; done', lines,
            flags=re.MULTILINE).replace("lan:127.0.0.1:6230", "$(cat $PLACE)")
        with tempfile.TemporaryDirectory() as folder:
            ended = subprocess.run(["bash", "-c", script], cwd=ROOT / "examples", capture_output=True, text=True, timeout=120,
                                   env={**os.environ, "PLACE": f"{folder}/place",
                                        "PATH": f"{PROGRAM.parent}:{os.environ['PATH']}"})
        self.assertEqual(ended.returncode, 0, ended.stderr)
        self.assertIn("Memory Module 6: uncorrectable memory error", ended.stdout)

    def test_scripts_and_presets_that_are_named_exist(self):
        presets = {preset["name"] for preset in
                   json.loads((ROOT / "CMakePresets.json").read_text())["buildPresets"]}
        for document in ("README.md", "CONTRIBUTING.md"):
            for words in commands(document, "tools/"):
                self.assertTrue(os.access(ROOT / words[0], os.X_OK), words[0])
            for words in commands(document, "cmake --preset"):
                self.assertLessEqual({words[i + 1] for i, word in enumerate(words) if word == "--preset"},
                                     presets)


class Links(unittest.TestCase):
    def test_lead_to_what_is_there(self):
        documents = [*ROOT.glob("*.md"), *ROOT.glob("docs/*.md"), *ROOT.glob("bench/*.md")]
        self.assertGreater(len(documents), 8)
        for document in documents:
            for target in re.findall(r"\]\(([^)#:\s]+)(?:#[^)]*)?\)", document.read_text()):
                with self.subTest(document=document.name, link=target):
                    self.assertTrue((document.parent / target).exists())

    def test_tests_that_documents_name_are_there(self):
        named = {name for document in [*ROOT.glob("*.md"), *ROOT.glob("docs/*.md"), *ROOT.glob("bench/*.md")]
                 for name in re.findall(r"`(?:tests/)?((?:\w+/)+\w+_test\.\w+)`", document.read_text())}
        self.assertGreater(len(named), 10)
        for name in named:
            with self.subTest(test=name):
                self.assertTrue((ROOT / "tests" / name).exists())


if __name__ == "__main__":
    unittest.main()
