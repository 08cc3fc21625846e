"""The files of examples/fleet with a real Slurm (a controller, two nodes on this machine, munge) and a real PostgreSQL.
"""
import json
import os
import pathlib
import shutil
import signal
import socket
import subprocess
import sys
import tempfile
import time
import unittest

from side_by_side import PROGRAM, SOURCE, eventually, skip

SIMULATOR = PROGRAM.parent / "ipmisel-simulator"
FLEET = SOURCE / "examples/fleet"
CONTROLLERS = 200
RECORDS = 20
TASKS = 8
KILLED = 3  # of the tasks
CONFIGURATION = """ClusterName=test
SlurmctldHost={host}(127.0.0.1)
SlurmctldPort={ports[0]}
AuthInfo=socket={folder}/munge.socket,cred_expire=10
SlurmUser=root
SlurmdUser=root
StateSaveLocation={folder}/state
SlurmdSpoolDir={folder}/spool-%n
SlurmctldPidFile={folder}/slurmctld.pid
SlurmdPidFile={folder}/slurmd-%n.pid
ProctrackType=proctrack/linuxproc
TaskPlugin=task/none
SelectType=select/cons_tres
SelectTypeParameters=CR_CPU
SchedulerParameters=sched_interval=1
SlurmdParameters=config_overrides
JobAcctGatherType=jobacct_gather/none
ReturnToService=2
MpiDefault=none
KillWait=2
NodeName=n1 NodeHostname={host} NodeAddr=127.0.0.1 Port={ports[1]} CPUs=8 State=UNKNOWN
NodeName=n2 NodeHostname={host} NodeAddr=127.0.0.1 Port={ports[2]} CPUs=8 State=UNKNOWN
PartitionName=all Nodes=n1,n2 Default=YES MaxTime=INFINITE State=UP
"""


def free_ports(count):
    sockets = [socket.create_server(("127.0.0.1", 0)) for _ in range(count)]
    ports = [each.getsockname()[1] for each in sockets]
    for each in sockets:
        each.close()
    return ports


class Slurm(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.folder = pathlib.Path(tempfile.mkdtemp(prefix="slurm-"))
        cls.folder.chmod(0o755)  # munged insists
        (cls.folder / "state").mkdir()
        key = cls.folder / "munge.key"
        key.write_bytes(os.urandom(1024))
        key.chmod(0o600)
        cls.configuration = cls.folder / "slurm.conf"
        cls.configuration.write_text(CONFIGURATION.format(host=socket.gethostname().split(".")[0], folder=cls.folder,
                                                          ports=free_ports(3)))
        cls.environment = dict(os.environ, SLURM_CONF=str(cls.configuration), IPMISEL=str(PROGRAM))
        cls.daemons = []
        of_munge = [f"--{what}={cls.folder}/munge.{what.split('-')[0]}"
                    for what in ("key-file", "socket", "pid-file", "log-file", "seed-file")]
        cls.start("munged", "--force", "--foreground", *of_munge)
        if not eventually((cls.folder / "munge.socket").exists, 10):
            cls.give_up("munged")
        cls.start("slurmctld", "-D")
        for node in ("n1", "n2"):
            cls.start("slurmd", "-D", "-N", node)
        if not eventually(lambda: cls.state("n1") == cls.state("n2") == "IDLE", 30):
            cls.give_up("slurmctld")

    @classmethod
    def give_up(cls, daemon):
        told = (cls.folder / f"{daemon}.out").read_text()
        cls.tearDownClass()
        raise RuntimeError(f"{daemon} does not start: {told}")

    @classmethod
    def tearDownClass(cls):
        for daemon in reversed(cls.daemons):
            daemon.terminate()
            try:
                daemon.wait(10)
            except subprocess.TimeoutExpired:
                daemon.kill()
                daemon.wait()
        shutil.rmtree(cls.folder, ignore_errors=True)

    @classmethod
    def start(cls, *command):
        with open(cls.folder / (command[0] + ".out"), "a") as out:
            cls.daemons.append(subprocess.Popen(command, stdout=out, stderr=out, env=cls.environment))

    @classmethod
    def slurm(cls, *command, **more):
        environment = dict(cls.environment, **more)
        return subprocess.run(command, capture_output=True, text=True, timeout=60, env=environment).stdout

    @classmethod
    def node(cls, name):
        return cls.slurm("scontrol", "--oneliner", "show", "node", name)

    @classmethod
    def state(cls, name):
        return cls.node(name).partition(" State=")[2].split(" ")[0]

    def server_of_postgresql(self):
        """Its folder, which holds its socket; its owner is "owner"."""
        folder = pathlib.Path(tempfile.mkdtemp(prefix="postgresql-"))
        self.addCleanup(shutil.rmtree, folder, ignore_errors=True)
        shutil.chown(folder, "postgres")
        path = ":".join([*map(str, pathlib.Path("/usr/lib/postgresql").glob("*/bin")), os.environ["PATH"]])
        tool = ["runuser", "-u", "postgres", "--", "env", f"PATH={path}", f"PGDATA={folder}/data"]
        for command in (["initdb", "-A", "trust", "-U", "owner"],
                        ["pg_ctl", "-w", "-l", f"{folder}/log", "-o", f"-F -k {folder} -c listen_addresses=", "start"]):
            subprocess.run([*tool, *command], cwd="/", check=True, stdout=subprocess.DEVNULL)
        self.addCleanup(subprocess.run, [*tool, "pg_ctl", "-m", "immediate", "stop"], cwd="/", stdout=subprocess.DEVNULL)
        return folder

    def processes_of_task(self, task):
        """Of the batch script and what it has started."""
        found = []
        for process in pathlib.Path("/proc").glob("[0-9]*"):
            try:
                environment = (process / "environ").read_text(errors="replace").split("\0")
                if {f"SLURM_ARRAY_TASK_ID={task}", f"SLURM_CONF={self.configuration}"} <= set(environment):
                    found.append(int(process.name))
            except OSError:
                pass
        return found

    def test_a_job_array_stores_each_event_once_also_when_a_task_is_killed_and_run_again(self):
        password = self.folder / "password"
        password.write_text("secret\n")
        events = self.folder / "events"
        events.mkdir()
        server = self.server_of_postgresql()
        uri = f"postgresql://collector@/postgres?host={server}"

        def sql(question, user="owner"):
            return subprocess.run(["psql", "-qAt", "-v", "ON_ERROR_STOP=1", "-h", server, "-U", user, "postgres"],
                                  input=question, capture_output=True, text=True, check=True).stdout.splitlines()

        subprocess.run([PROGRAM, "check", "--store", uri.replace("collector", "owner")], stdout=subprocess.DEVNULL)
        sql((FLEET / "roles.sql").read_text())
        sql("CREATE ROLE collector LOGIN IN ROLE ipmisel_collector; CREATE ROLE reader LOGIN IN ROLE ipmisel_reader")
        simulator = subprocess.Popen([SIMULATOR, "--port", "0", "--controllers", str(CONTROLLERS), "--records",
                                      str(RECORDS), "--delay", "50"], stdout=subprocess.PIPE, text=True)
        self.addCleanup(simulator.stdout.close)
        self.addCleanup(simulator.wait)
        self.addCleanup(simulator.kill)
        hosts = self.folder / "bmcs"
        hosts.write_text("".join(simulator.stdout.readline() for _ in range(CONTROLLERS)))
        access = (f"@{hosts}", "--user", "root", "--password-file", str(password))
        begin = time.monotonic()
        job = self.slurm("sbatch", "--parsable", f"--array=1-{TASKS}", "-o", f"{self.folder}/out-%a",
                         str(FLEET / "slurm-collect.sh"), *access, "--jobs", "2", "--store", uri, "--new",
                         IPMISEL_OUTPUT=str(events)).strip()
        task = f"{job}_{KILLED}"

        def visited():
            return int(sql("SELECT COUNT(*) FROM visits", "reader")[0])

        # Some controllers are stored then, and some are not.
        self.assertTrue(eventually(lambda: self.processes_of_task(KILLED) and visited() >= CONTROLLERS // 5))
        for process in self.processes_of_task(KILLED):
            os.kill(process, signal.SIGKILL)
        self.assertTrue(eventually(lambda: "JobState=FAILED" in self.slurm("scontrol", "show", "job", task)))
        self.assertFalse((events / f"events-{KILLED}.ndjson").exists())
        self.slurm("scontrol", "requeue", task)
        self.assertTrue(eventually(lambda: not self.slurm("squeue", "--noheader", "--job", job), 180),
                        self.slurm("squeue"))
        seconds = time.monotonic() - begin
        for number in range(1, TASKS + 1):
            told = (self.folder / f"out-{number}").read_text()
            lines = [json.loads(line) for line in (events / f"events-{number}.ndjson").read_text().splitlines()]
            self.assertTrue(all(line["summary"]["complete"] for line in lines if "summary" in line), told)
        alone = subprocess.run([PROGRAM, "collect", "--hosts", *access, "--format", "events"], capture_output=True,
                               text=True, timeout=120)
        wanted = [(event["system"], event["Key"]) for event in map(json.loads, alone.stdout.splitlines()) if "Key" in event]
        keys = [tuple(row.split("|")) for row in
                sql("SELECT s.name, e.key FROM events e JOIN systems s ON s.id = e.system", "reader")]
        self.assertEqual(len(wanted), CONTROLLERS * RECORDS)
        self.assertEqual(set(keys), set(wanted))
        self.assertEqual(len(keys), len(wanted))
        rows = {table: int(sql(f"SELECT COUNT(*) FROM {table}")[0]) for table in ("systems", "visits", "events", "parts",
                                                                                "findings")}
        print(f"{CONTROLLERS} controllers, an array of {TASKS}, one task killed and run again: {seconds:.1f} s, rows {rows}",
              file=sys.stderr)

    def health(self, example):
        subprocess.run([FLEET / "slurm-health-check.sh", "--from", f"sim:{example}"], check=True, timeout=60,
                       env=dict(self.environment, SLURMD_NODENAME="n2"))

    def test_the_health_check_drains_a_node_and_gives_it_back(self):
        well = self.folder / "well.json"
        well.write_text(json.dumps({"smbios": ["26123000012020ffa30c0000000000000105 0000"], "bmcs": [{
            "device_id": "20 01 02 15 02 bf 57 01 00 00 01 00 00 00 00", "sel": {"entries": []},
            "sdr": {"records": []}}]}))
        rack = SOURCE / "examples/rack-server.json"
        self.health(well)
        self.assertEqual(self.state("n2"), "IDLE")
        self.health(rack)
        self.assertIn("DRAIN", self.state("n2"))
        self.assertIn("Reason=ipmisel: IPMI CRITICAL - DIMM 5", self.node("n2"))
        self.health(SOURCE / "examples/no-bmc.json")  # not known: nothing changes
        self.assertIn("DRAIN", self.state("n2"))
        self.health(well)
        self.assertTrue(eventually(lambda: self.state("n2") == "IDLE", 10), self.node("n2"))
        # What an operator drained stays so.
        self.slurm("scontrol", "update", "NodeName=n2", "State=DRAIN", "Reason=new disks")
        self.health(well)
        self.assertIn("DRAIN", self.state("n2"))
        self.slurm("scontrol", "update", "NodeName=n2", "State=RESUME")


if __name__ == "__main__":
    missing = [name for name in ("munged", "slurmctld", "slurmd", "sbatch") if shutil.which(name) is None]
    if missing:
        skip(f"{', '.join(missing)} missing (packages slurm-wlm, munge)")
    if shutil.which("psql") is None or not list(pathlib.Path("/usr/lib/postgresql").glob("*/bin/initdb")):
        skip("PostgreSQL missing (package postgresql)")
    if os.geteuid() != 0:
        skip("munged and slurmd are started as root")
    # The daemons are ours alone: what ends this test ends them.
    signal.signal(signal.SIGTERM, lambda *_: sys.exit(1))
    unittest.main(argv=sys.argv[:1])
