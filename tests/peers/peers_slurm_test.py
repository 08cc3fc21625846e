"""The files of examples/fleet with a real Slurm: a controller, two nodes on this machine, munge.

usage: peers_slurm_test.py PROGRAM SOURCE_FOLDER        (exit status 77: a facility is missing)
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

PROGRAM = pathlib.Path(sys.argv[1]).resolve()
SOURCE = pathlib.Path(sys.argv[2]).resolve()
SIMULATOR = PROGRAM.parent / "ipmisel-simulator"
FLEET = SOURCE / "examples/fleet"
CONTROLLERS = 48
RECORDS = 20
TASKS = 8
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


def skip(why):
    print(f"SKIPPED: {why}")
    sys.exit(77)


def free_ports(count):
    sockets = [socket.create_server(("127.0.0.1", 0)) for _ in range(count)]
    ports = [each.getsockname()[1] for each in sockets]
    for each in sockets:
        each.close()
    return ports


def eventually(condition, seconds=60):
    end = time.monotonic() + seconds
    while time.monotonic() < end:
        if condition():
            return True
        time.sleep(0.2)
    return False


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

    def test_a_job_array_reads_each_controller_once_also_when_a_task_is_run_again(self):
        password = self.folder / "password"
        password.write_text("secret\n")
        events = self.folder / "events"
        events.mkdir()
        simulator = subprocess.Popen([SIMULATOR, "--port", "0", "--controllers", str(CONTROLLERS), "--records",
                                      str(RECORDS), "--delay", "100"], stdout=subprocess.PIPE, text=True)
        self.addCleanup(simulator.stdout.close)
        self.addCleanup(simulator.wait)
        self.addCleanup(simulator.kill)
        hosts = self.folder / "bmcs"
        hosts.write_text("".join(simulator.stdout.readline() for _ in range(CONTROLLERS)))
        begin = time.monotonic()
        job = self.slurm("sbatch", "--parsable", f"--array=1-{TASKS}", "-o", f"{self.folder}/out-%a",
                         str(FLEET / "slurm-collect.sh"), f"@{hosts}", "--user", "root", "--password-file",
                         str(password), "--jobs", "2", IPMISEL_OUTPUT=str(events)).strip()
        running = ("squeue", "--noheader", "--array", "--states=R", "--job", f"{job}_3")
        self.assertTrue(eventually(lambda: self.slurm(*running)))
        self.slurm("scontrol", "requeue", f"{job}_3")
        self.assertTrue(eventually(lambda: not self.slurm("squeue", "--noheader", "--job", job), 180),
                        self.slurm("squeue"))
        seconds = time.monotonic() - begin
        keys, systems = [], []
        for part in range(1, TASKS + 1):
            told = (self.folder / f"out-{part}").read_text()
            for line in (events / f"events-{part}.ndjson").read_text().splitlines():
                event = json.loads(line)
                if "summary" in event:
                    self.assertTrue(event["summary"]["complete"], told)
                    systems.append(event["system"])
                else:
                    keys.append(event["Key"])
        alone = subprocess.run([PROGRAM, "collect", "--hosts", f"@{hosts}", "--user", "root", "--password-file",
                                password, "--format", "events"], capture_output=True, text=True, timeout=120)
        wanted = [json.loads(line) for line in alone.stdout.splitlines()]
        self.assertEqual(sorted(keys), sorted(event["Key"] for event in wanted if "Key" in event))
        self.assertEqual(len(set(keys)), CONTROLLERS * RECORDS)
        self.assertEqual(sorted(systems), sorted(event["system"] for event in wanted if "summary" in event))
        print(f"{CONTROLLERS} controllers, an array of {TASKS}, one task run again: {seconds:.1f} s", file=sys.stderr)

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
    if os.geteuid() != 0:
        skip("munged and slurmd are started as root")
    # The daemons are ours alone: what ends this test ends them.
    signal.signal(signal.SIGTERM, lambda *_: sys.exit(1))
    unittest.main(argv=sys.argv[:1])
