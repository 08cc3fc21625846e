"""Runs the program on a terminal: a line of progress, the pager, colours, as wide as the window.

usage: terminal_test.py PROGRAM TREE
"""
import fcntl
import json
import os
import pathlib
import pty
import re
import select
import shutil
import signal
import struct
import subprocess
import sys
import tempfile
import termios
import time
import unittest

PROGRAM, TREE = sys.argv[1], pathlib.Path(sys.argv[2])
ERASE = "\r\x1b[K"


class Terminal:
    """A terminal of `columns` by `rows`, and what a program in its foreground writes to it."""

    def __init__(self, columns=80, rows=24):
        self.leader, self.follower = pty.openpty()
        fcntl.ioctl(self.follower, termios.TIOCSWINSZ, struct.pack("HHHH", rows, columns, 0, 0))
        self.written = b""

    def __enter__(self):
        return self

    def __exit__(self, *_):
        os.close(self.leader)

    def start(self, *arguments, stdin=None, stdout=None, stderr=None, **environment):
        """What is not given otherwise is the terminal."""
        def own_terminal():
            os.setsid()
            fcntl.ioctl(self.follower, termios.TIOCSCTTY, 0)
        settings = {k: v for k, v in os.environ.items()
                    if k not in ("COLUMNS", "NO_COLOR", "PAGER", "IPMISEL_PAGER", "LESS")}
        settings |= {"TERM": "xterm", "TZ": "UTC"} | environment
        pick = lambda stream: self.follower if stream is None else stream
        self.process = subprocess.Popen(
            [PROGRAM, *map(str, arguments)], cwd=TREE, env=settings, stdin=pick(stdin), stdout=pick(stdout),
            stderr=pick(stderr), preexec_fn=own_terminal, pass_fds=(self.follower,))
        os.close(self.follower)
        return self

    def read(self, seconds=20, until=None):
        """What has been written until the program ends, or until a text comes."""
        end = time.monotonic() + seconds
        while time.monotonic() < end and not (until and until in self.written):
            if not select.select([self.leader], [], [], 0.1)[0]:
                continue
            try:
                piece = os.read(self.leader, 65536)
            except OSError:  # nobody has the terminal open any more
                break
            if not piece:
                break
            self.written += piece
        if not until:
            self.process.wait(20)
        return self.written.decode()

    def run(self, *arguments, **settings):
        return self.start(*arguments, **settings).read()


def shown(text):
    """The lines that stand in the end."""
    lines = [line.split(ERASE)[-1] for line in text.replace("\r\n", "\n").split("\n")]
    return [line for line in lines if line]


def slow_server(folder, records=400, milliseconds=4):
    file = pathlib.Path(folder, "slow.json")
    smbios = ["26 12 00 30  01 20 20 00  a3 0c 00 00 00 00 00 00  01 05  00 00"]  # type 38: there is a BMC
    entries = [f"{i & 255:02x}{i >> 8:02x} 02 b0e5e665 2000 04 01 30 01 59 50 45" for i in range(1, records + 1)]
    file.write_text(json.dumps({"smbios": smbios, "bmcs": [{
        "device_id": "20 01 02 15 02 bf 57 01 00 00 01 00 00 00 00", "latency_us": milliseconds * 1000,
        "sel": {"entries": entries}}]}))
    return f"sim:{file}"


class Progress(unittest.TestCase):
    def test_counts_what_a_slow_controller_gave_and_is_gone_in_the_end(self):
        with tempfile.TemporaryDirectory() as folder, Terminal(columns=60) as terminal:
            output = pathlib.Path(folder, "events")
            text = terminal.run("collect", "--from", slow_server(folder), "--format", "events", "--output", output)
            self.assertIn('"summary"', output.read_text())
        drawn = re.findall(r"event log: (\d+) of 400 records, about \d+ s left", text)
        self.assertTrue(drawn, repr(text))
        self.assertEqual(sorted(map(int, drawn)), list(map(int, drawn)))
        self.assertTrue(text.endswith(ERASE), repr(text[-40:]))
        self.assertEqual(shown(text), [])
        for line in text.split(ERASE):
            self.assertLess(len(line), 60)

    def test_is_not_there_without_a_terminal_and_not_between_the_lines_of_a_report(self):
        with tempfile.TemporaryDirectory() as folder:
            source = slow_server(folder)
            with Terminal() as terminal:
                terminal.start("collect", "--from", source, "--format", "events", stderr=subprocess.PIPE)
                terminal.read()
                self.assertEqual(terminal.process.communicate()[1], b"")
            with Terminal() as terminal:
                text = terminal.run("collect", "--from", source, "--format", "events")
                self.assertNotIn(ERASE, text)
                for line in text.splitlines():
                    json.loads(line)
            with Terminal() as terminal:
                self.assertNotIn(ERASE, terminal.run("collect", "--from", source, TERM="dumb", PAGER="cat"))

    def test_gives_way_to_messages(self):
        with tempfile.TemporaryDirectory() as folder, Terminal() as terminal:
            terminal.start("collect", "--from", slow_server(folder, records=4000), "--format", "events", "--output",
                           pathlib.Path(folder, "out"))
            terminal.read(until=b"records")
            terminal.process.send_signal(signal.SIGINT)
            lines = shown(terminal.read())
        self.assertEqual(len(lines), 1, lines)
        self.assertRegex(lines[0], "^ipmisel: collected in part: ")


class Table(unittest.TestCase):
    def table(self, *arguments, columns=80, rows=500, **settings):
        with Terminal(columns, rows) as terminal:
            return terminal.run("collect", "--from", "sim:examples/rack-server.json", *arguments, **settings)

    def test_is_as_wide_as_the_window(self):
        for columns in (80, 120, 200):
            lines = re.sub("\x1b[^m]*m", "", self.table("--no-pager", columns=columns)).splitlines()
            with self.subTest(columns=columns):
                self.assertLessEqual(max(map(len, lines)), columns)
                self.assertGreater(max(map(len, lines)), columns * 3 // 4)

    def test_has_colours_where_they_are_wanted(self):
        colour = "\x1b["
        self.assertIn(colour, self.table("--no-pager"))
        self.assertNotIn(colour, self.table("--no-pager", NO_COLOR="1"))
        self.assertNotIn(colour, self.table("--no-pager", "--color", "never"))
        self.assertNotIn(colour, self.table("--no-pager", TERM="dumb"))
        self.assertIn(colour, self.table("--no-pager", "--color", "always", NO_COLOR="1"))

    def test_goes_through_the_pager_when_it_is_longer_than_the_screen(self):
        for rows, paged in ((500, False), (20, True)):
            with self.subTest(rows=rows), Terminal(rows=rows) as terminal:
                terminal.start("collect", "--from", "sim:examples/rack-server.json", PAGER="less")
                text = terminal.read(seconds=3 if paged else 20, until=b"\n:" if paged else None)
                ended = terminal.process.poll() is not None
                if paged:
                    self.assertFalse(ended, text)
                    os.write(terminal.leader, b"q")
                    terminal.read()
                self.assertEqual(terminal.process.wait(20), 0)
        self.assertEqual(self.table(PAGER="sed s/^/PAGED:/").count("PAGED:"), len(self.table("--no-pager").splitlines()))
        self.assertNotIn("PAGED", self.table("--no-pager", PAGER="sed s/^/PAGED:/"))

    def test_is_written_plainly_without_a_pager_and_a_missing_one_is_named_only_to_who_chose_it(self):
        with tempfile.TemporaryDirectory() as folder:
            pathlib.Path(folder, "cat").symlink_to(shutil.which("cat"))
            plain = self.table("--no-pager", rows=20)
            self.assertEqual(self.table(rows=20, PATH=folder), plain)
            chosen = self.table(rows=20, PATH=folder, PAGER="no-such-pager")
            self.assertIn("no-such-pager", chosen)
            self.assertTrue(chosen.endswith(plain), chosen[:200])

    def test_shows_fewer_events_when_that_is_wanted(self):
        def events(*arguments):
            text = self.table("--no-pager", "--color", "never", *arguments, columns=118)
            return re.findall(r"(?m)^(2026-03-\d\d \d\d:\d\d:\d\d)  (\S+)", text)
        every = events()
        self.assertEqual(events("--last", "3"), every[-3:])
        since = events("--since", "2026-03-09 18:00")
        self.assertEqual(since, [event for event in every if event[0] >= "2026-03-09 18:00"])
        self.assertTrue(0 < len(since) < len(every))
        worse = events("--severity", "critical")
        self.assertEqual(worse, [event for event in every if event[1] in ("critical", "fatal")])
        self.assertTrue(0 < len(worse) < len(every))


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1])
