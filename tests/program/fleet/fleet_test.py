#!/usr/bin/env python3
"""Collections from many controllers at a time, which are simulated ones on ports.

usage: fleet_test.py IPMISEL IPMISEL-SIMULATOR TREE [TEST]...
"""
import csv
import io
import json
import os
import pathlib
import re
import shlex
import signal
import socket
import sqlite3
import subprocess
import sys
import tempfile
import time
import unittest

IPMISEL, SIMULATOR, TREE = (pathlib.Path(argument).resolve() for argument in sys.argv[1:4])
SECRET = "secret"


class Controllers:
    """Simulated controllers on any free ports; `silent` of them, the last, answer nothing."""

    def __init__(self, count, *options):
        self.process = subprocess.Popen([SIMULATOR, "--port", "0", "--controllers", str(count), *options],
                                        stdout=subprocess.PIPE, text=True)
        self.sources = [self.process.stdout.readline().strip() for _ in range(count)]
        self.names = [source.removeprefix("lan:") for source in self.sources]

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.process.kill()
        self.process.wait()
        self.process.stdout.close()


class Fleet(unittest.TestCase):
    def setUp(self):
        self.folder = tempfile.TemporaryDirectory()
        self.addCleanup(self.folder.cleanup)
        self.password = self.write("password", SECRET + "\n")
        self.environment = {key: value for key, value in os.environ.items() if not key.startswith("IPMISEL_")}
        self.environment["TMPDIR"] = self.folder.name

    def write(self, name, text, mode=0o600):
        file = pathlib.Path(self.folder.name, name)
        file.write_text(text)
        file.chmod(mode)
        return str(file)

    def command(self, hosts, *options, user=("--user", "root")):
        password = () if "--password-file" in options else ("--password-file", self.password)
        return [IPMISEL, "collect", "--hosts", hosts if isinstance(hosts, str) else ",".join(hosts), *user,
                *password, *options]

    def collect(self, hosts, *options, user=("--user", "root")):
        return subprocess.run(self.command(hosts, *options, user=user), capture_output=True, text=True, timeout=120,
                              env=self.environment)

    def lines(self, ended):
        return [json.loads(line) for line in ended.stdout.splitlines()]

    def test_events_of_all_come_as_lines_and_each_controllers_end_with_its_summary(self):
        with Controllers(9, "--records", "7") as all_of_them:
            ended = self.collect(all_of_them.sources, "--format", "events", "--jobs", "4")
            self.assertEqual((ended.returncode, ended.stderr), (0, ""))
            lines = self.lines(ended)
            self.assertEqual(len(lines), 9 * 8)
            for i in range(0, len(lines), 8):
                system = lines[i]["system"]
                self.assertEqual([line["system"] for line in lines[i:i + 8]], [system] * 8)
                self.assertEqual(lines[i + 7]["summary"]["counts"], {"IPMI_Event": 7})
            self.assertEqual(sorted({line["system"] for line in lines}), sorted(all_of_them.names))

    def test_a_whole_report_numbers_the_controllers_in_the_order_of_the_list(self):
        with Controllers(5, "--records", "3", "--silent", "1") as all_of_them:
            sources = all_of_them.sources
            wanted = [sources[2], sources[4], sources[0], sources[1]]
            ended = self.collect(wanted, "--format", "json", "--timeout", "1")
            self.assertEqual(ended.returncode, 4, ended.stderr)
            report = json.loads(ended.stdout)
            self.assertFalse(report["complete"])
            names = [wanted[i].removeprefix("lan:") for i in (0, 2, 3)]
            self.assertEqual([system["name"] for system in report["systems"]], names)
            accounts = report["completeness"]
            self.assertEqual([a.get("node") for a in accounts], [1, 2, 3, None])
            self.assertEqual([a["source"] for a in accounts], [wanted[0], wanted[2], wanted[3], wanted[1]])
            self.assertIn("no answer", accounts[3]["faults"][0]["problem"])
            for name, node in (("IPMI_Event", "Node"), ("QORSG_IPMILogRecord", "SourceNode")):
                nodes = [str(i["properties"][node]) for i in report["instances"] if i["class"] == name]
                self.assertEqual(nodes, ["1"] * 3 + ["2"] * 3 + ["3"] * 3, name)

    def test_other_formats_have_every_controller(self):
        with Controllers(3, "--records", "4") as all_of_them:
            rows = list(csv.DictReader(io.StringIO(self.collect(all_of_them.sources, "--format", "csv").stdout)))
            self.assertEqual([row["Node"] for row in rows], ["1"] * 4 + ["2"] * 4 + ["3"] * 4)
            for name in ("ndjson", "otlp", "prometheus", "redfish", "html", "table"):
                ended = self.collect(all_of_them.sources, "--format", name)
                self.assertEqual(ended.returncode, 0, name)
                for controller in all_of_them.names:
                    self.assertIn(controller, ended.stdout, name)

    def test_a_page_of_all_begins_with_the_worst(self):
        server = self.write("well.json", json.dumps({"bmcs": [{
            "device_id": "20 01 02 15 02 bf 57 01 00 00 01 00 00 00 00", "sel": {"entries": []},
            "sdr": {"records": []}}]}))
        with Controllers(1, "--server", server) as well, Controllers(1, "--server", server, "--silent", "1") as silent, \
                Controllers(1, "--records", "4") as bad:
            hosts = silent.sources + well.sources + bad.sources
            table = self.collect(hosts, "--timeout", "1").stdout
            self.assertTrue(table.startswith("3 controllers: 1 critical, 1 without a problem, 1 not read."), table)
            self.assertLess(table.index("power supply failed"), table.index("no answer"))
            self.assertNotIn("\n" + well.names[0], table)
            page = self.collect(hosts, "--timeout", "1", "--format", "html").stdout
            places = [page.index("<th scope=\"row\">" + bad.names[0]), page.index("<th scope=\"row\">" + silent.names[0]),
                      page.index("<li>" + well.names[0])]
            self.assertEqual(places, sorted(places))

    def test_a_silent_controller_costs_its_own_deadline_alone(self):
        with Controllers(12, "--records", "2", "--silent", "2") as all_of_them:
            begin = time.monotonic()
            ended = self.collect(all_of_them.sources, "--format", "events", "--jobs", "2", "--deadline", "3")
            self.assertLess(time.monotonic() - begin, 3 + 8)
            self.assertEqual(ended.returncode, 4)
            summaries = {line["system"]: line["summary"]["complete"] for line in self.lines(ended) if "summary" in line}
            self.assertEqual(summaries, {name: i < 10 for i, name in enumerate(all_of_them.names)})

    def test_the_status_is_that_of_all_else_in_part(self):
        with Controllers(2, "--records", "1", "--silent", "1") as all_of_them:
            good, silent = all_of_them.sources
            other = ("--timeout", "1", "--format", "ndjson")
            for hosts, status in ((good, 0), (silent, 3), (f"{good},{silent}", 4)):
                self.assertEqual(self.collect(hosts, *other).returncode, status, hosts)

    def test_a_worker_that_is_killed_is_told_and_the_others_go_on(self):
        with Controllers(4, "--records", "2", "--delay", "300") as all_of_them:
            uri = "sqlite:" + self.folder.name + "/store.db"
            with subprocess.Popen(self.command(all_of_them.sources, "--format", "ndjson", "--store", uri),
                                  stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True, env=self.environment) as run:
                workers = self.workers(run.pid, 4)
                name = all_of_them.names[1]
                victim = next(pid for pid in workers if name in arguments(pid))
                os.kill(victim, signal.SIGKILL)
                out, err = run.communicate(timeout=60)
            self.assertEqual(run.returncode, 4)
            self.assertIn(name + ": its worker was ended by Killed", err)
            complete = {}
            for line in map(json.loads, out.splitlines()):
                if "summary" in line:
                    complete[line["system"]] = line["summary"]["complete"]
            self.assertEqual(complete, {each: each != name for each in all_of_them.names})
            self.assertRegex(self.check("--store", uri, "--system", name).stdout, "UNKNOWN - its worker was ended by Killed")

    def test_what_a_store_does_not_take_is_reported_and_comes_again(self):
        with Controllers(2, "--records", "2") as all_of_them:
            store = sqlite3.connect(self.folder.name + "/store.db")
            self.addCleanup(store.close)
            new = ("--store", "sqlite:" + self.folder.name + "/store.db", "--new", "--format", "events")
            subprocess.run([IPMISEL, "collect", "--from", f"sim:{TREE}/examples/rack-server.json", *new], capture_output=True)
            store.execute("CREATE TRIGGER full BEFORE INSERT ON events BEGIN SELECT RAISE(ABORT, 'no room'); END")
            failed = self.collect(all_of_them.sources, *new)
            self.assertEqual((failed.returncode, failed.stderr.count("no room")), (2, 2), failed.stderr)
            lines = self.lines(failed)
            self.assertEqual([line["summary"]["complete"] for line in lines if "summary" in line], [True] * 2)
            self.assertEqual(len(lines), 2 * 2 + 2)
            # A service says it once, and goes on.
            out, err = self.watch(all_of_them.sources, new[1], lambda out: out.count("\n") == 4)
            self.assertEqual(err.count("\n"), 1, err)
            store.execute("DROP TRIGGER full")
            again, err = self.watch(all_of_them.sources, new[1], lambda out: out.count("\n") == 4)
            keys = [sorted(json.loads(line)["Key"] for line in text.splitlines()) for text in (out, again)]
            self.assertEqual((keys[0], err), (keys[1], ""))
            # Each event once.
            unchanged = "SELECT COUNT(*) FROM visits WHERE kind = 'unchanged'"
            out, err = self.watch(all_of_them.sources, new[1], lambda _: store.execute(unchanged).fetchone()[0] == 2)
            self.assertEqual((out, err), ("", ""))

    def watch(self, hosts, uri, is_done, command=None):
        """What a service writes until then, and what it says."""
        command = command or [IPMISEL, "watch", "--hosts", ",".join(hosts), "--user", "root", "--password-file",
                              self.password, "--store", uri]
        file = pathlib.Path(self.folder.name, "watched")
        with file.open("w") as out, subprocess.Popen(command, stdout=out, stderr=subprocess.PIPE, text=True,
                                                     env=self.environment) as run:
            for _ in range(1000):
                if is_done(file.read_text()):
                    break
                time.sleep(0.02)
            run.send_signal(signal.SIGTERM)
            err = run.communicate(timeout=60)[1]
        self.assertEqual(run.returncode, 0)
        return file.read_text(), err

    def test_the_commands_of_the_documents_and_the_units_run(self):
        texts = [(pathlib.Path(TREE, file), r"^(?:    (?:  command_line )?(?:\S*/sudo )?|ExecStart=)\S*ipmisel +(\w+ .*)$") for file in
                 ("README.md", "docs/fleet.md", "docs/store.md", "examples/fleet/ipmisel-collect.service",
                  "examples/fleet/ipmisel-watch.service")]
        found = [(file.name, shlex.split(command, comments=True)) for file, pattern in texts
                 for command in re.findall(pattern, file.read_text().replace("\\\n", ""), re.MULTILINE)]
        found = [(name, words) for name, words in found if name != "README.md" or {"--hosts", "--store"} & set(words)]
        self.assertGreater(len(found), 20)
        server = f"{TREE}/examples/rack-server.json"
        with Controllers(3, "--server", server) as three:
            names = ("node017-bmc", "bmc17", "rack7-bmc")
            hosts = self.write("bmcs", "".join(f"{host} name={name}\n" for host, name in zip(three.names, names)))
            database = pathlib.Path(self.folder.name, "events.db")
            uri = f"sqlite:{database}"
            self.collect("@" + hosts, "--store", uri, "--format", "events")
            sql = sqlite3.connect(database, isolation_level=None)
            self.addCleanup(sql.close)
            sql.execute("UPDATE visits SET started = 0")  # long ago
            key = sql.execute("SELECT key FROM findings").fetchone()[0]
            self.environment["IPMISEL_PASSWORD"] = SECRET
            for document, words in found:
                command = words[0]
                for option, value in (("--hosts", "@" + hosts), ("--from", three.sources[0]), ("--user", "root"),
                                      ("--password-file", self.password), ("--store", uri), ("--system", "node017-bmc"),
                                      ("--output", self.folder.name + "/out")):
                    words = [value if i > 0 and words[i - 1] == option else word for i, word in enumerate(words)]
                if command == "collect" and "--from" in words:
                    words += ["--name", "bmc17"]
                words = [key if re.fullmatch("[0-9a-f]{32}", word) else word for word in words]
                with self.subTest(document=document, command=" ".join(words)):
                    if command == "watch":
                        visits = "SELECT SUM(times) FROM visits"
                        wanted = sql.execute(visits).fetchone()[0] + 3
                        out, err = self.watch((), "", lambda _: sql.execute(visits).fetchone()[0] == wanted,
                                              [IPMISEL, *words, *(() if "--user" in words else ("--user", "root"))])
                        self.assertEqual((out, err), ("", ""))
                        continue
                    ended = subprocess.run([IPMISEL, *words, *(("--user", "root") if "--user" not in words and
                                                              command in ("collect", "check") else ())],
                                           capture_output=True, text=True, timeout=120, env=self.environment)
                    self.assertIn(ended.returncode, {"check": (2,), "diff": (0, 1)}.get(command, (0,)), ended.stderr)
                    self.assertEqual(ended.stderr, "")
            self.assertEqual({name for name, in sql.execute("SELECT name FROM systems")}, set(names))

    def workers(self, pid, count):
        """The worker processes, once there are so many."""
        for _ in range(1000):
            children = pathlib.Path(f"/proc/{pid}/task/{pid}/children").read_text().split()
            workers = [int(child) for child in children if arguments(child).startswith("ipmisel worker ")]
            if len(workers) == count:
                return workers
            time.sleep(0.01)
        self.fail("no workers")

    def test_passwords_stand_in_no_argument_no_environment_and_no_log(self):
        with Controllers(2, "--records", "2", "--delay", "200") as all_of_them:
            self.environment["IPMISEL_PASSWORD"] = SECRET
            command = [IPMISEL, "collect", "--hosts", ",".join(all_of_them.sources), "--user", "root", "--log-level",
                       "trace", "--format", "ndjson"]
            with subprocess.Popen(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
                                  env=self.environment) as run:
                seen = [pathlib.Path(f"/proc/{pid}/{what}").read_bytes()
                        for pid in self.workers(run.pid, 2) for what in ("cmdline", "environ")]
                out, err = run.communicate(timeout=60)
            self.assertEqual(run.returncode, 0, err)
            self.assertIn("trace: ", err)
            for text in (*seen, out.encode(), err.encode()):
                self.assertNotIn(SECRET.encode(), text)

    def test_interrupted_it_ends_in_good_order(self):
        with Controllers(6, "--records", "60", "--delay", "300") as all_of_them:
            out = pathlib.Path(self.folder.name, "out.json")
            with subprocess.Popen(self.command(all_of_them.sources, "--format", "json", "--jobs", "3", "--output",
                                               str(out)),
                                  stderr=subprocess.PIPE, text=True, env=self.environment) as run:
                workers = self.workers(run.pid, 3)
                time.sleep(1.5)
                run.send_signal(signal.SIGINT)
                _, err = run.communicate(timeout=20)
            self.assertEqual(run.returncode, 4, err)
            report = json.loads(out.read_text())
            self.assertEqual(len(report["completeness"]), 6)
            self.assertFalse(report["complete"])
            self.assertIn("interrupted before it was its turn", json.dumps(report["completeness"]))
            for worker in workers:
                self.assertFalse(pathlib.Path(f"/proc/{worker}").exists())
            self.assertEqual(sorted(os.listdir(self.folder.name)), ["out.json", "password"])

    def test_killed_it_leaves_no_worker_behind(self):
        with Controllers(3, "--records", "60", "--delay", "500") as all_of_them:
            with subprocess.Popen(self.command(all_of_them.sources, "--format", "json"), stdout=subprocess.DEVNULL,
                                  stderr=subprocess.DEVNULL, env=self.environment) as run:
                workers = self.workers(run.pid, 3)
                run.kill()
            for _ in range(500):
                left = [worker for worker in workers if state(worker) not in ("", "Z")]
                if not left:
                    break
                time.sleep(0.01)
            self.assertEqual(left, [])

    def test_each_host_has_options_of_its_own(self):
        with Controllers(3, "--records", "1") as all_of_them:
            hosts = self.write("hosts", f"{all_of_them.names[0]} name=first password={SECRET}\n"
                                        f"{all_of_them.names[1]} password-file={self.password}\n"
                                        f"{all_of_them.names[2]} password=wrong timeout=2\n")
            wrong = self.write("other", "not this one\n")
            ended = self.collect("@" + hosts, "--format", "ndjson", "--password-file", wrong)
            summaries = {line["system"]: line["summary"]["complete"] for line in self.lines(ended) if "summary" in line}
            self.assertEqual(summaries, {"first": True, all_of_them.names[1]: True, all_of_them.names[2]: False})
            self.assertIn("wrong password", ended.stderr)
            for option in ("colour=red", "cipher-suite=many", "from=inband"):
                bad = self.write("bad", f"host1 {option}\n")
                ended = self.collect("@" + bad)
                self.assertEqual(ended.returncode, 2)
                self.assertIn(f"{bad}, line 1: ", ended.stderr)
            self.assertIn("two controllers have the name", self.collect("@" + self.write("bad", "n[1-2] name=x\n")).stderr)

    def test_a_credential_of_the_service_manager_is_a_password_file(self):
        with Controllers(1, "--records", "1") as one:
            self.environment["CREDENTIALS_DIRECTORY"] = self.folder.name
            ended = self.collect(one.sources, "--format", "ndjson", "--password-file", "credential:password")
            self.assertEqual(ended.returncode, 0, ended.stderr)
            del self.environment["CREDENTIALS_DIRECTORY"]
            ended = self.collect(one.sources, "--format", "ndjson", "--password-file", "credential:password")
            self.assertEqual(ended.returncode, 2)
            self.assertIn("LoadCredential", ended.stderr)

    def test_the_parts_of_a_list_are_the_list(self):
        with Controllers(20, "--records", "1") as all_of_them:
            seen = []
            for part in range(1, 5):
                ended = self.collect(all_of_them.sources, "--format", "ndjson", "--shard", f"{part}/4")
                self.assertEqual(ended.returncode, 0, ended.stderr)
                seen += [line["system"] for line in self.lines(ended) if "summary" in line]
            self.assertEqual(sorted(seen), sorted(all_of_them.names))

    def test_other_sources_stand_beside_the_list(self):
        with Controllers(1, "--records", "1") as one:
            ended = self.collect(one.sources, "--from", f"sim:{TREE}/examples/rack-server.json", "--format", "json")
            systems = [system["name"] for system in json.loads(ended.stdout)["systems"]]
            self.assertEqual(systems, ["rack-server", "127.0.0.1"])
        with Controllers(2, "--records", "1") as two:
            sources = [word for source in two.sources for word in ("--from", source)]
            ended = subprocess.run([IPMISEL, "collect", *sources, "--user", "root", "--password-file", self.password,
                                    "--format", "ndjson"], capture_output=True, text=True, env=self.environment)
            self.assertEqual({line["system"] for line in self.lines(ended)}, set(two.names))

    def check(self, *options):
        return subprocess.run([IPMISEL, "check", *options], capture_output=True, text=True, timeout=120,
                              env=self.environment)

    def test_a_check_tells_of_live_controllers_and_saved_reports_alike(self):
        rack = f"sim:{TREE}/examples/rack-server.json"
        live = self.check("--from", rack)
        self.assertEqual(live.returncode, 2, live.stderr)
        self.assertRegex(live.stdout, r"\AIPMI CRITICAL - [^|\n]+ \| critical=\d+;;0;0 warning=\d+;0;;0 [^|\n]+\n\Z")
        saved = pathlib.Path(self.folder.name, "saved.json")
        subprocess.run([IPMISEL, "collect", "--from", rack, "--format", "json", "--output", saved], check=True)
        self.assertEqual(self.check(saved).stdout, live.stdout)
        both = self.check("--from", rack, "--from", f"sim:{TREE}/examples/broken-bmc.json")
        self.assertEqual(both.returncode, 2)
        self.assertIn(" systems=2 not_whole=1;", both.stdout)

    def test_a_check_that_fails_is_unknown_whatever_the_reason(self):
        with Controllers(1, "--silent", "1") as silent:
            for options in (("--from", "sim:/no/such/file"), ("/no/such/file",), ("--no-such-option",),
                            ("--from", "sim:x", "/no/such/file"), ("--hosts", "n[2-1]"),
                            ("--from", silent.sources[0], "--timeout", "1", "--password-file", self.password)):
                ended = self.check(*options)
                self.assertEqual(ended.returncode, 3, options)
                self.assertRegex(ended.stdout, r"\AIPMI UNKNOWN - [^\n]+\n\Z", options)

    def test_watching_tells_what_is_new_and_ends_in_good_order(self):
        source = pathlib.Path(self.folder.name, "server.json")
        lists = pathlib.Path(self.folder.name, "hosts")
        server = {"smbios": ["26123000012020ffa30c0000000000000105 0000"],
                  "bmcs": [{"device_id": "20 01 02 15 02 bf 57 01 00 00 01 00 00 00 00", "sdr": {"records": []},
                            "sel": {"entries": ["0100 02 b0e5e665 2000 04 08 30 6f 01ffff"]}}]}
        source.write_text(json.dumps(server))
        notify = socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM)
        self.addCleanup(notify.close)
        notify.bind(self.folder.name + "/notify")
        notify.settimeout(20)
        self.environment.update(NOTIFY_SOCKET=self.folder.name + "/notify", WATCHDOG_USEC="4000000")
        with Controllers(1, "--records", "3") as one:
            lists.write_text(one.names[0] + "\n")
            command = [IPMISEL, "watch", "--from", f"sim:{source}", "--hosts", f"@{lists}", "--user", "root",
                       "--password-file", self.password, "--every", "60"]
            with subprocess.Popen(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
                                  env=self.environment) as run:
                self.assertEqual(notify.recv(999), b"READY=1\nSTATUS=2 controllers")
                time.sleep(5)
                server["bmcs"][0]["sel"]["entries"].append("0200 02 b1e5e665 2000 04 08 30 ef 01ffff")
                source.write_text(json.dumps(server))
                lists.write_text(one.names[0] + "  # as before\n")
                run.send_signal(signal.SIGHUP)
                told = [notify.recv(999).split(b"\n")[0] for _ in range(36)]
                self.assertEqual(told[0], b"WATCHDOG=1")
                self.assertIn(b"RELOADING=1", told)
                self.assertIn(b"READY=1", told)
                run.send_signal(signal.SIGTERM)
                out, err = run.communicate(timeout=20)
            self.assertEqual((run.returncode, err), (0, ""))
            events = [json.loads(line) for line in out.splitlines()]
            self.assertEqual([(event["system"], event["RecordID"]) for event in events], [("server", 2)])
            while told[-1] != b"STOPPING=1":
                told.append(notify.recv(999))

    def test_what_does_not_go_with_many_is_refused(self):
        for options in (("--record", "x"), ("--name", "x"), ("--log-file", "x"), ("--jobs", "0"), ("--shard", "9/8"),
                        ("--last", "3"), ("--store", "sqlite:/no/such/folder/store.db"), ("--format", "csv", "--class", "IPMI_Event", "--class", "IPMI_FRU")):
            ended = self.collect("host1", *options)
            self.assertEqual((ended.returncode, ended.stdout), (2, ""), options)
            self.assertEqual(ended.stderr.count("\n"), 1, ended.stderr)


def arguments(pid):
    try:
        return pathlib.Path(f"/proc/{pid}/cmdline").read_bytes().decode().replace("\0", " ")
    except OSError:
        return ""


def state(pid):
    try:
        return pathlib.Path(f"/proc/{pid}/stat").read_text().rsplit(")", 1)[1].split()[0]
    except OSError:
        return ""


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1] + sys.argv[4:])
