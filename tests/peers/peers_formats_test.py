"""The formats for programs, taken by the programs that they are for; the page, by a browser.

jq, sqlite3, promtool, a node exporter, rsyslog and the journal are run on loopback or on files of their
own. What is not installed is skipped, and said.
"""
import http.client
import json
import math
import os
import pathlib
import re
import shutil
import socket
import sqlite3
import subprocess
import sys
import tempfile
import time
import unittest
import uuid

from side_by_side import PROGRAM, SOURCE as TREE, eventually

sys.path.insert(0, str(TREE / "tests/program/reports"))
from formats_support import EXAMPLES, Page, collect, hostile_report, run, set_program, tool  # noqa: E402
from guest import free_port  # noqa: E402

set_program(PROGRAM)


def lines_of(text):
    """By line feeds alone: others leave U+0085 and the like as they are."""
    return text.split("\n")[:-1]


def events_of(text):
    """Every event of a report in lines, as json has it."""
    return [line for line in map(json.loads, lines_of(text)) if "summary" not in line]


def to_nul(value):
    """As what holds texts as C does: they end at a NUL."""
    if isinstance(value, str):
        return value.split("\0")[0]
    if isinstance(value, list):
        return [to_nul(each) for each in value]
    return {k: to_nul(v) for k, v in value.items()} if isinstance(value, dict) else value


class Folder(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = pathlib.Path(folder.name)
        self.hostile = self.folder / "hostile.json"
        self.hostile.write_text(json.dumps(hostile_report()))

    def start(self, *arguments, **settings):
        process = subprocess.Popen([str(a) for a in arguments], **settings)

        def end():
            process.terminate()
            process.wait(20)
        self.addCleanup(end)
        return process


class TakenByPrograms(Folder):
    def test_jq_reads_events(self):
        jq = tool("jq")
        for source in (*(f"sim:examples/{e}.json" for e in EXAMPLES), self.hostile):
            command = ("report", source) if source == self.hostile else ("collect", "--from", source)
            text = run(*command, "--format", "events")
            done = subprocess.run([jq, "-c", "select(.Key)"], input=text, text=True, capture_output=True)
            with self.subTest(source=source):
                self.assertEqual((done.returncode, done.stderr), (0, ""))
                self.assertEqual(events_of(done.stdout), events_of(text))

    def test_sqlite_imports_csv_and_reads_events(self):
        sqlite = tool("sqlite3")
        for source in ("rack-server", "hostile"):
            made = (lambda form: run("report", self.hostile, "--format", form)) if source == "hostile" else (
                lambda form: collect(source, form))
            (self.folder / "events.csv").write_bytes(made("csv").encode())
            (self.folder / "events.json").write_text(made("events"))
            events = events_of((self.folder / "events.json").read_text())
            script = (".mode json\n.import --csv events.csv imported\n"
                      "select Key, Severity, Reading, Text from imported;\n")
            done = subprocess.run([sqlite, ":memory:"], input=script, text=True, capture_output=True, cwd=self.folder)
            self.assertEqual((done.returncode, done.stderr), (0, ""))
            rows = json.loads(done.stdout)
            with self.subTest(source=source):
                self.assertEqual([row["Key"] for row in rows], [event["Key"] for event in events])
                for row, event in zip(rows, events):
                    self.assertEqual(row["Severity"], event.get("Severity", ""))
                    self.assertEqual(row["Reading"] and float(row["Reading"]), event.get("Reading", ""))
                    if source != "hostile":
                        self.assertEqual(row["Text"], event["Text"])
                lines = lines_of((self.folder / "events.json").read_text())
                database = sqlite3.connect(":memory:")
                for line, event in zip(lines, events):
                    self.assertEqual(database.execute("select json_extract(?, '$.Sentence')", (line,)).fetchone()[0],
                                     to_nul(event["Sentence"]))

    def test_promtool_takes_metrics_and_rules(self):
        promtool = tool("promtool")
        texts = [collect(example, "prometheus") for example in EXAMPLES]
        for text in (*texts, run("report", self.hostile, "--format", "prometheus")):
            done = subprocess.run([promtool, "check", "metrics"], input=text, text=True, capture_output=True)
            self.assertEqual((done.returncode, done.stderr), (0, ""), text)
        rules = TREE / "examples/prometheus/ipmisel.test.yml"
        done = subprocess.run([promtool, "test", "rules", rules.name], cwd=rules.parent, capture_output=True)
        self.assertEqual(done.returncode, 0, done.stdout + done.stderr)

    def test_a_node_exporter_serves_the_metrics(self):
        exporter, port = tool("prometheus-node-exporter"), free_port()
        for source, name in (("collect --from sim:examples/rack-server.json", "rack"), (f"report {self.hostile}", "bad")):
            run(*source.split(), "--format", "prometheus", "--output", self.folder / f"{name}.prom")
        self.start(exporter, "--collector.disable-defaults", "--collector.textfile",
                   f"--collector.textfile.directory={self.folder}", f"--web.listen-address=127.0.0.1:{port}",
                   stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)

        def fetch():
            connection = http.client.HTTPConnection("127.0.0.1", port, timeout=10)
            try:
                connection.request("GET", "/metrics")
                return connection.getresponse().read().decode()
            except OSError:
                return ""
            finally:
                connection.close()
        self.assertTrue(eventually(fetch))
        served = fetch()
        self.assertIn("node_textfile_scrape_error 0", served)

        def samples(text):
            """Name and labels of a sample, and its value."""
            found = {}
            for line in re.findall(r"(?m)^ipmisel_.*$", text):
                series, value = line.rsplit(" ", 1)
                name, _, labels = series.partition("{")
                found[name, frozenset(re.findall(r'(\w+)="((?:[^"\\]|\\.)*)"', labels))] = float(value)
            return found
        written = samples("".join((self.folder / f"{name}.prom").read_text() for name in ("rack", "bad")))
        self.assertGreater(len(written), 20)
        self.assertEqual(samples(served), written)

    def test_rsyslog_keeps_every_field_of_an_event(self):
        rsyslogd, port = tool("rsyslogd"), free_port()
        conf = (TREE / "examples/rsyslog/ipmisel.conf").read_text()
        output, spool = self.folder / "kept.json", self.folder / "spool"
        spool.mkdir()
        conf = conf.replace("/var/log/ipmisel.json", str(output)).replace("/var/spool/ipmisel", str(spool))
        # The same rules behind a port of loopback too.
        conf += ('module(load="imptcp")\n'
                 f'input(type="imptcp" address="127.0.0.1" port="{port}" maxFrameSize="1000000" ruleset="ipmisel")\n')
        conf = conf.replace("global(", f'global(workDirectory="{self.folder}" ', 1)
        (self.folder / "rsyslog.conf").write_text(conf)
        checked = subprocess.run([rsyslogd, "-N1", "-f", self.folder / "rsyslog.conf"], capture_output=True, text=True)
        self.assertEqual(checked.returncode, 0, checked.stderr)
        daemon = self.start(rsyslogd, "-n", "-f", self.folder / "rsyslog.conf", "-i", self.folder / "pid",
                            stderr=subprocess.DEVNULL)
        text = collect("rack-server", "events") + run("report", self.hostile, "--format", "events")
        wanted = [to_nul(json.loads(line)) for line in lines_of(text)]
        (spool / "first.events").write_text(text)

        def kept():
            return lines_of(output.read_text()) if output.exists() else []
        self.assertTrue(eventually(lambda: len(kept()) >= len(wanted) or daemon.poll() is not None, 40))
        self.assertEqual([json.loads(line) for line in kept()], wanted)
        with socket.create_connection(("127.0.0.1", port), timeout=10) as line:
            for event in wanted:  # RFC 5424 in the frames of RFC 6587
                message = "<133>1 - - ipmisel - - - " + json.dumps(event)
                line.sendall(f"{len(message)} {message}".encode())
        self.assertTrue(eventually(lambda: len(kept()) >= 2 * len(wanted), 40), len(kept()))
        self.assertEqual([json.loads(line) for line in kept()[len(wanted):]], wanted)

    def test_the_journal_keeps_the_lines(self):
        cat, journalctl = tool("systemd-cat"), tool("journalctl")
        tag = f"ipmisel-{uuid.uuid4()}"
        text = collect("memory-failure", "events")
        done = subprocess.run([cat, "-t", tag], input=text, text=True, capture_output=True)
        if done.returncode != 0:
            raise unittest.SkipTest("SKIPPED: no journal runs here: " + done.stderr.strip())

        def kept():
            out = subprocess.run([journalctl, "-o", "json", "-t", tag], capture_output=True, text=True).stdout
            return [json.loads(json.loads(line)["MESSAGE"]) for line in out.splitlines()]
        wanted = [json.loads(line) for line in lines_of(text)]
        self.assertTrue(eventually(lambda: len(kept()) >= len(wanted)))
        self.assertEqual(kept(), wanted)


class ReadInABrowser(Folder):
    def dom(self, page, script=True):
        """The page as the browser has it, without any network."""
        alone = ["unshare", "--net"] if os.geteuid() == 0 and shutil.which("unshare") else []
        done = subprocess.run(
            [*alone, tool("chromium"), "--headless=new", "--no-sandbox", "--disable-gpu", "--no-first-run",
             f"--user-data-dir={self.folder}/profile", "--enable-logging=stderr", "--dump-dom",
             "--host-resolver-rules=MAP * ~NOTFOUND", f"file://{page}"],
            capture_output=True, text=True, timeout=180)
        # The browser's own pages complain of a slow machine there too.
        complaints = [line for line in re.findall("CONSOLE.*", done.stderr) if "source: chrome://" not in line]
        if not script:  # that it was refused is meant
            complaints = [line for line in complaints if "Content Security Policy" not in line]
        self.assertEqual(complaints, [])
        return done.stdout

    def page(self, text):
        page = self.folder / "page.html"
        page.write_text(text)
        return page

    def test_the_page_works_with_its_script_and_is_whole_without(self):
        tool("chromium")
        events = events_of(collect("rack-server", "events"))
        page = self.page(collect("rack-server", "html"))
        alive = self.dom(page)
        self.assertIn(f"{len(events)} events</output>", alive)
        self.assertNotRegex(alive, r'<form[^>]* hidden=')
        self.assertGreater(alive.count("<option"), 20)
        text = page.read_text()
        refused = re.sub("script-src 'sha256-[^']*'", "script-src 'none'", text)
        self.assertNotEqual(refused, text)
        still = self.dom(self.page(refused), script=False)
        self.assertRegex(still, r'<form[^>]* hidden=')
        for dom in (alive, still):
            found = Page(dom)
            self.assertEqual(found.tags.count("tr"), Page(page.read_text()).tags.count("tr"))
            for event in events:
                self.assertIn(event["Text"], found.text)

    def test_what_a_controller_says_stays_text(self):
        tool("chromium")
        page = self.page(run("report", self.hostile, "--format", "html"))
        dom = self.dom(page)
        self.assertEqual(Page(dom).tags.count("script"), 1)
        self.assertIn("&lt;script&gt;alert(1)&lt;/script&gt;", dom)

    def test_tidy_finds_no_error(self):
        tidy = tool("tidy")
        for text in (*(collect(e, "html") for e in EXAMPLES), run("report", self.hostile, "--format", "html")):
            done = subprocess.run([tidy, "-q", "-e"], input=text, text=True, capture_output=True)
            self.assertNotIn("Error", done.stderr)

    def test_a_thousand_events_take_a_second_and_a_megabyte(self):
        file = self.folder / "thousand.json"
        file.write_text(json.dumps(hostile_report(count=1000)))
        times = []
        for _ in range(3):
            began = time.monotonic()
            text = run("report", file, "--format", "html")
            times.append(time.monotonic() - began)
        self.assertLess(len(text), 1_000_000)
        self.assertLess(min(times), 1)


class LongestLog(Folder):
    def test_is_written_in_little_memory(self):
        file = self.folder / "long.json"
        file.write_text(json.dumps(hostile_report(count=65535)))
        server = self.folder / "server.json"
        subprocess.run([sys.executable, TREE / "bench/make_log.py", "sim", "65279", "255", server], check=True)
        capture = self.folder / "capture"
        run("collect", "--from", f"sim:{server}", "--format", "events", "--output", self.folder / "out",
            "--record", capture)
        for source, forms in ((("report", file), ("ndjson", "events", "csv", "redfish", "otlp", "json")),
                              (("collect", "--from", f"sim:{server}"), ("ndjson", "events", "csv", "otlp", "json")),
                              (("collect", "--from", f"replay:{capture}"), ("events", "csv", "otlp"))):
            for form in forms:
                done = subprocess.run(
                    [sys.executable, "-c", "import resource,subprocess,sys\n"
                     "subprocess.run(sys.argv[1:])\n"
                     "print(resource.getrusage(resource.RUSAGE_CHILDREN).ru_maxrss)",
                     PROGRAM, *source, "--format", form, "--output", self.folder / "out"],
                    capture_output=True, text=True, cwd=TREE)
                kib = int(done.stdout.split()[-1])
                print(f"{source[0]} {pathlib.Path(source[-1]).name}, {form}: {kib / 1024:.1f} MiB")
                with self.subTest(source=source, form=form):
                    self.assertGreater((self.folder / "out").stat().st_size, 10_000_000)
                    self.assertLess(kib, 32 << 10)

    def test_stays_readable(self):
        file = self.folder / "long.json"
        file.write_text(json.dumps(hostile_report(count=65535)))
        text = run("report", file, "--format", "html")
        self.assertIn("65535 events, folded", text)
        self.assertEqual(len(re.findall("<details class=\"fold\"", text)), math.ceil(65535 / 1000))
        self.assertEqual(text.count("<details class=\"fold\" open>"), 1)


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1] + sys.argv[3:], verbosity=2)
