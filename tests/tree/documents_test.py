#!/usr/bin/env python3
"""What README and manual tell somebody to type is understood, and what documents link is there.

usage: documents_test.py PROGRAM ROOT
"""
import json
import os
import pathlib
import re
import shlex
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


class Commands(unittest.TestCase):
    def collect(self, document, start):
        """Runs each of them in one folder, one after the other: a simulated server instead of a BMC."""
        with tempfile.TemporaryDirectory() as name:
            folder = pathlib.Path(name)
            (folder / "examples").symlink_to(ROOT / "examples")
            (folder / "bin").symlink_to(PROGRAM.parent)
            found = [words for words in commands(document, start)
                     if not {"|", "<", ">", "&&", "||"} & set(words)]
            for words in found:
                sources = [word for word in words if word.startswith("lan:")]
                for extra in sources[1:]:
                    at = words.index(extra)
                    del words[at - 1:at + 1]
                if sources:
                    words[words.index(sources[0])] = "sim:examples/rack-server.json"
                ended = subprocess.run([PROGRAM, *words[1:]], cwd=folder, capture_output=True, text=True,
                                       env={**os.environ, "IPMISEL_PASSWORD": "secret"})
                with self.subTest(command=" ".join(words)):
                    if "--from" in words or sources or words[1] not in ("collect", "doctor"):
                        self.assertEqual(ended.returncode, 0, ended.stderr)
                    else:
                        # This machine: whatever BMC it has, if it has one.
                        self.assertNotEqual(ended.returncode, EXIT_USAGE, ended.stderr)
            return len(found)

    def test_readme(self):
        self.assertGreaterEqual(self.collect("README.md", "build/release/bin/ipmisel"), 6)

    def test_samples_after_commands_in_readme_are_what_these_write(self):
        """The lines of code right after a command: stretches of its output, in order, "..." for what is left out."""
        blocks = re.findall(r"^    (build/release/bin/ipmisel .*)\n((?:    (?!build/).+\n)+)",
                            (ROOT / "README.md").read_text(), re.MULTILINE)
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
        self.assertGreaterEqual(self.collect("docs/manual.md", "ipmisel"), 3)

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


if __name__ == "__main__":
    unittest.main()
