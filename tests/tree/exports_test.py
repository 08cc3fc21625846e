#!/usr/bin/env python3
"""What the shared libraries export: the host's namespace NQORTQR20, the plug-ins their entry points.

usage: exports_test.py NM FOLDER
"""
import pathlib
import re
import subprocess
import sys
import unittest

NM, FOLDER = sys.argv.pop(1), pathlib.Path(sys.argv.pop(1))
# A function or an operation, or what the compiler makes for a type.
HOST_NAME = re.compile(r"(?:(?:vtable|VTT|typeinfo|typeinfo name) for )?NQORTQR20::")
ENTRY_POINTS = {
    "libipmisel.pi": {"IPMISELInit", "IPMISELPluginInit", "IPMISELPluginDeInit", "IPMISELGetData",
                      "IPMISELGetInfo", "IPMISELGetStatus", "IPMISELGetDataZero", "ExportMessageLog",
                      "ExportReferences", "fdrPluginClasses"},
    "libipmistandard.pi": {"fdrPluginClasses", "fdrPluginCheckOption"},
}


def exported(library):
    lines = subprocess.run([NM, "-D", "-C", "--defined-only", FOLDER / library], check=True,
                           capture_output=True, text=True).stdout.splitlines()
    return {re.fullmatch(r"[0-9a-f]+ \S (.*)", line)[1] for line in lines}


class Exports(unittest.TestCase):
    def test_the_host_libraries_export_their_namespace_alone(self):
        for library, one in (("libtqrcore.so", "NQORTQR20::fdrRegisterPlugin("),
                             ("libspdriver.so", "NQORTQR20::SPLibrary::GetNumberBMCNode("),
                             ("libsmbios.so", "NQORTQR20::smBiosLoad(")):
            names = exported(library)
            self.assertTrue(any(name.startswith(one) for name in names), library)
            self.assertEqual([name for name in names if not HOST_NAME.match(name)], [], library)

    def test_a_plugin_exports_its_entry_points_alone(self):
        for library, names in ENTRY_POINTS.items():
            self.assertEqual(exported(library), names, library)

    def test_every_library_of_the_folder_is_held(self):
        libraries = {path.name for pattern in ("*.so", "*.pi") for path in FOLDER.glob(pattern)}
        self.assertEqual(libraries, {"libtqrcore.so", "libspdriver.so", "libsmbios.so", *ENTRY_POINTS})


if __name__ == "__main__":
    unittest.main()
