#!/usr/bin/env python3
"""Completion tried in the shells themselves; a shell that is missing is skipped, and said so.

usage: completion_test.py PROGRAM ROOT
"""
import os
import pathlib
import pty
import select
import shlex
import shutil
import subprocess
import sys
import tempfile
import time
import unittest

PROGRAM, ROOT = pathlib.Path(sys.argv.pop(1)).resolve(), pathlib.Path(sys.argv.pop(1)).resolve()
SCRIPTS = ROOT / "packaging/completions"
ENVIRONMENT = {**os.environ, "PATH": f"{PROGRAM.parent}:{os.environ['PATH']}", "TERM": "dumb"}
# What is typed, some of what is offered, and what is not.
CASES = (
    (["ipmisel", ""], {"collect", "classes", "--version"}, {"--from"}),
    (["ipmisel", "col"], {"collect"}, {"classes"}),
    (["ipmisel", "collect", "--pri"], {"--privilege"}, {"--from", "collect"}),
    (["ipmisel", "collect", "--privilege", ""], {"user", "operator", "admin"}, {"--from", "collect"}),
    (["ipmisel", "collect", "--format", "j"], {"json"}, {"table"}),
    (["ipmisel", "collect", "--class", "IPMI_E"], {"IPMI_Event", "IPMI_EventLog"}, {"QORSG_IPMIFRU"}),
    (["ipmisel", "collect", "--from", ""], {"inband", "lan:", "sim:", "replay:"}, {"--from"}),
    (["ipmisel", "collect", "--hosts", ""], {"%rack7", "node1-bmc", "node2-bmc"}, {"--from"}),
    (["ipmisel", "doctor", ""], {"inband", "lan:", "--user"}, {"--from"}),
    (["ipmisel", "collect", "--output", "READ"], {"README.md"}, {"--from"}),
)
# After a colon bash has three words, zsh offers what follows it, and fish the whole word.
HOSTS = ("node1-bmc", "node2-bmc")


def bash(words):
    script = (f"source {shlex.quote(str(SCRIPTS / 'ipmisel.bash'))}; "
              f"COMP_WORDS=({' '.join(shlex.quote(word) for word in words)}); COMP_CWORD={len(words) - 1}; "
              '_ipmisel; printf "%s\\n" "${COMPREPLY[@]}"')
    return subprocess.run(["bash", "--norc", "-c", script], cwd=ROOT, env=ENVIRONMENT, check=True,
                          capture_output=True, text=True).stdout.split()


def fish(words):
    script = (f"source {shlex.quote(str(SCRIPTS / 'ipmisel.fish'))}; "
              f"complete -C {shlex.quote(' '.join(words))}")
    offered = subprocess.run(["fish", "--no-config", "-c", script], cwd=ROOT, env=ENVIRONMENT, check=True,
                             capture_output=True, text=True).stdout
    return [line.split("\t")[0] for line in offered.splitlines()]


class Zsh:
    """A zsh at a terminal of its own: words are typed, and the key that lists what may follow."""

    PROMPT = "ready> "

    def __init__(self):
        self.child, self.terminal = pty.fork()
        if self.child == 0:
            os.chdir(ROOT)
            os.execvpe("zsh", ["zsh", "-f"], {**ENVIRONMENT, "PS1": self.PROMPT})
        self.count = 0
        self.wait_for(self.PROMPT)
        self.type(f"fpath=({shlex.quote(str(SCRIPTS))} $fpath); autoload -U compinit; compinit -u -D; "
                  "LISTMAX=0; ")

    def close(self):
        os.close(self.terminal)
        os.waitpid(self.child, 0)

    def wait_for(self, *texts):
        """What zsh says until these texts have come, one after the other."""
        said, rest, end = "", "", time.monotonic() + 30
        for text in texts:
            while text not in rest:
                if not select.select([self.terminal], [], [], max(0, end - time.monotonic()))[0]:
                    raise AssertionError(f"zsh said only {said + rest!r}")
                rest += os.read(self.terminal, 4096).decode(errors="replace")
            before, text, rest = rest.partition(text)
            said += before + text
        return said

    def type(self, keys):
        """Types, has zsh print a number, and gives what it said until then. Its prompt follows: before
        that, the terminal itself takes Ctrl-D and Ctrl-U."""
        self.count += 1
        os.write(self.terminal, f"{keys}print END$((1000+{self.count}))\n".encode())
        return self.wait_for(f"END{1000 + self.count}", self.PROMPT)

    def __call__(self, words):
        listing, line = "\x04", "\x15"  # Ctrl-D lists, Ctrl-U takes the line back
        said = self.type(" ".join(words) + listing + line)
        # The words that were typed are shown as well.
        return [word for word in said.split() if word not in words]


class Completion(unittest.TestCase):
    def offers(self, shell, name):
        if shutil.which(name) is None:
            self.skipTest(f"{name} is not installed")
        for words, expected, unexpected in CASES:
            with self.subTest(words=words):
                offered = set(shell(words))
                self.assertLessEqual(expected, offered)
                self.assertFalse(unexpected & offered)

    @classmethod
    def setUpClass(cls):
        cls.configuration = tempfile.TemporaryDirectory()
        pathlib.Path(cls.configuration.name, "ipmisel.conf").write_text("[group.rack7]\nhosts = \"node[1-2]-bmc\"\n")
        ENVIRONMENT["XDG_CONFIG_HOME"] = cls.configuration.name

    @classmethod
    def tearDownClass(cls):
        cls.configuration.cleanup()

    def test_bash(self):
        self.offers(bash, "bash")
        self.assertEqual(bash(["ipmisel", "collect", "--from", "lan", ":", "no"]), list(HOSTS))
        self.assertEqual(bash(["ipmisel", "collect", "--from", "sim", ":", "examples/tw"]), ["examples/two-node.json"])

    def test_zsh(self):
        if shutil.which("zsh") is None:
            self.skipTest("zsh is not installed")
        zsh = Zsh()
        try:
            self.offers(zsh, "zsh")
            self.assertLessEqual(set(HOSTS), set(zsh(["ipmisel", "doctor", "lan:"])))
        finally:
            zsh.close()

    def test_fish(self):
        self.offers(fish, "fish")
        self.assertLessEqual({f"lan:{host}" for host in HOSTS}, set(fish(["ipmisel", "doctor", "lan:"])))
        self.assertIn("sim:examples/two-node.json", fish(["ipmisel", "collect", "--from", "sim:examples/tw"]))


if __name__ == "__main__":
    unittest.main()
