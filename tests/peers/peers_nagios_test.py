"""`ipmisel check` as the service check of a real Nagios: state, text and performance data.
"""
import os
import pathlib
import pwd
import re
import shutil
import subprocess
import sys
import tempfile
import time
import unittest

from side_by_side import PROGRAM, SOURCE, skip

USER = pwd.getpwuid(os.geteuid()).pw_name
# Service, arguments, and the state that Nagios has for it.
SERVICES = (
    ("rack", f"--from sim:{SOURCE}/examples/rack-server.json", 2),
    ("well", "--from sim:{folder}/well.json", 0),
    ("warning", "--from sim:{folder}/warning.json", 1),
    ("nothing", f"--from sim:{SOURCE}/examples/no-bmc.json", 3),
    ("usage", "--no-such-option", 3),
)
SERVER = """{{"smbios": ["26123000012020ffa30c0000000000000105 0000"], "bmcs": [{{
  "device_id": "20 01 02 15 02 bf 57 01 00 00 01 00 00 00 00",
  "sel": {{"entries": [{entries}]}}, "sdr": {{"records": []}}}}]}}"""
# Memory, correctable ECC: IPMI 2.0, table 42-3, type 0Ch, offset 0.
CORRECTABLE = '"0100 02 b0e5e665 2000 04 0c 30 6f 00ffff"'
CONFIGURATION = """log_file={folder}/nagios.log
cfg_file={folder}/objects.cfg
object_cache_file={folder}/objects.cache
precached_object_file={folder}/objects.precache
status_file={folder}/status.dat
status_update_interval=1
nagios_user={user}
nagios_group={user}
check_external_commands=0
command_file={folder}/nagios.cmd
lock_file={folder}/nagios.lock
temp_file={folder}/nagios.tmp
temp_path={folder}
check_result_path={folder}/results
query_socket={folder}/nagios.qh
state_retention_file={folder}/retention.dat
interval_length=1
service_inter_check_delay_method=n
enable_notifications=0
use_syslog=0
"""
OBJECTS = """define timeperiod {{
  timeperiod_name always
  alias always
  monday 00:00-24:00
  tuesday 00:00-24:00
  wednesday 00:00-24:00
  thursday 00:00-24:00
  friday 00:00-24:00
  saturday 00:00-24:00
  sunday 00:00-24:00
}}
define contact {{
  contact_name nobody
  host_notifications_enabled 0
  service_notifications_enabled 0
  host_notification_period always
  service_notification_period always
  host_notification_commands nothing
  service_notification_commands nothing
}}
define command {{
  command_name nothing
  command_line /bin/true
}}
define host {{
  host_name server
  address 127.0.0.1
  check_command nothing
  max_check_attempts 1
  check_period always
  contacts nobody
}}
"""
SERVICE = """define command {{
  command_name check_{name}
  command_line {program} check {arguments}
}}
define service {{
  host_name server
  service_description {name}
  check_command check_{name}
  check_interval 5
  retry_interval 5
  max_check_attempts 1
  check_period always
  contacts nobody
}}
"""


class Nagios(unittest.TestCase):
    def test_it_takes_state_text_and_performance_data(self):
        with tempfile.TemporaryDirectory() as name:
            folder = pathlib.Path(name)
            (folder / "results").mkdir()
            (folder / "well.json").write_text(SERVER.format(entries=""))
            (folder / "warning.json").write_text(SERVER.format(entries=CORRECTABLE))
            (folder / "nagios.cfg").write_text(CONFIGURATION.format(folder=folder, user=USER))
            objects = OBJECTS.format()
            for service, arguments, _ in SERVICES:
                objects += SERVICE.format(name=service, program=PROGRAM, arguments=arguments.format(folder=folder))
            (folder / "objects.cfg").write_text(objects)
            with open(folder / "out", "w") as out:
                nagios = subprocess.Popen(["nagios4", folder / "nagios.cfg"], stdout=out, stderr=out)
            try:
                known = self.statuses(folder)
            finally:
                nagios.terminate()
                nagios.wait(20)
            for service, _, state in SERVICES:
                self.assertEqual(int(known[service]["current_state"]), state, known[service])
                self.assertTrue(known[service]["plugin_output"].startswith("IPMI "), known[service])
                self.assertNotIn("|", known[service]["plugin_output"])
            self.assertIn("DIMM 5", known["rack"]["plugin_output"])
            self.assertRegex(known["rack"]["performance_data"], r"^critical=\d+;;0;0 warning=\d+;0;;0 records=\d+;;;0 ")

    def statuses(self, folder):
        """What Nagios knows of each service, once it has checked all of them."""
        file = folder / "status.dat"
        for _ in range(300):
            blocks = re.findall(r"servicestatus \{\n(.*?)\n\t\}", file.read_text(), re.S) if file.exists() else []
            known = [dict(line.strip().split("=", 1) for line in block.split("\n")) for block in blocks]
            if len(known) == len(SERVICES) and all(each["has_been_checked"] == "1" for each in known):
                return {each["service_description"]: each for each in known}
            time.sleep(0.2)
        self.fail("not checked: " + (folder / "out").read_text()[-2000:])


if __name__ == "__main__":
    if shutil.which("nagios4") is None:
        skip("nagios4 missing (package nagios4-core)")
    unittest.main(argv=sys.argv[:1])
