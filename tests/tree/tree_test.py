#!/usr/bin/env python3
"""Which folder may include which, and how many entries the root has.

usage: tree_test.py ROOT
"""
import pathlib
import re
import subprocess
import sys
import tempfile
import unittest

# A row per folder: what its files may include beside their own folder. tests/ and bench/ are free.
ALLOWED = {
    "include": [],
    "base": [],
    "ipmi": ["base"],
    "simulator": ["ipmi", "base"],
    "host": ["simulator", "ipmi", "base", "include"],
    "program": ["host", "simulator", "ipmi", "base", "include"],
    "plugins/*": ["ipmi", "base", "include"],
    "examples/plugin": ["include"],
}
FREE = ["tests", "bench"]
MOST_ROOT_ENTRIES = 26
NOT_IN_THE_TREE = {".git", "build", ".cache"}
INCLUDE = re.compile(r'^\s*#\s*include\s*"([^"]+)"', re.MULTILINE)


def folder_rule(path):
    """The key of ALLOWED and the own folder for a file at `path` below the root; None where none is known."""
    parts = path.parts
    if parts[0] == "plugins" and len(parts) > 2:
        return "plugins/*", f"plugins/{parts[1]}"
    if parts[0] == "examples" and len(parts) > 2:
        return f"examples/{parts[1]}", f"examples/{parts[1]}"
    return parts[0], parts[0]


def resolve(root, source, name):
    """The file below the root that an include of `name` means, or None."""
    for folder in (root, root / "include", source.parent):
        if (folder / name).is_file():
            return (folder / name).resolve().relative_to(root.resolve())
    return None


def faults(root):
    """One line per include that points the wrong way, nowhere, or stands in a folder without a rule."""
    found = []
    for source in sorted([*root.rglob("*.h"), *root.rglob("*.cpp")]):
        path = source.relative_to(root)
        if path.parts[0] in NOT_IN_THE_TREE or path.parts[0] in FREE:
            continue
        rule, own = folder_rule(path)
        if rule not in ALLOWED:
            found.append(f"{path}: {rule}/ has no rule")
            continue
        for name in INCLUDE.findall(source.read_text()):
            target = resolve(root, source, name)
            if target is None:
                found.append(f"{path}: there is no {name}")
            elif not any(target.as_posix().startswith(f"{folder}/") for folder in [own, *ALLOWED[rule]]):
                found.append(f"{path}: may not include {name}")
    return found


class Tree(unittest.TestCase):
    root = pathlib.Path()

    def test_includes_point_one_way(self):
        self.assertEqual(faults(self.root), [])

    def test_every_folder_of_the_rules_is_read(self):
        for folder in ("base", "ipmi", "simulator", "host", "program", "include", "plugins/ipmisel"):
            self.assertTrue(list((self.root / folder).rglob("*.h")), folder)

    def test_the_root_stays_small(self):
        if not (self.root / ".git").exists():
            self.skipTest("not a clone: what belongs to the tree is not known")
        files = subprocess.run(["git", "-C", self.root, "ls-files"], check=True, capture_output=True, text=True)
        entries = {line.split("/")[0] for line in files.stdout.splitlines()}
        self.assertIn("CMakeLists.txt", entries)
        self.assertLessEqual(len(entries), MOST_ROOT_ENTRIES, sorted(entries))


class Rules(unittest.TestCase):
    """The rules themselves, over small trees."""

    def found(self, path, include):
        with tempfile.TemporaryDirectory() as name:
            root = pathlib.Path(name)
            for header in ("base/b.h", "ipmi/i.h", "simulator/s.h", "host/core/h.h", "program/p.h",
                           "plugins/one/x.h", "plugins/two/y.h", "include/tqr/t.h", "examples/plugin/e.h"):
                (root / header).parent.mkdir(parents=True, exist_ok=True)
                (root / header).write_text("#include <vector>\n")
            (root / path).write_text(f'// a comment\n#include "{include}"\n')
            return faults(root)

    def test_what_is_allowed(self):
        for path, include in (("base/a.cpp", "base/b.h"), ("ipmi/a.h", "base/b.h"),
                              ("simulator/a.cpp", "ipmi/i.h"), ("host/core/a.cpp", "simulator/s.h"),
                              ("host/core/a.cpp", "tqr/t.h"), ("program/a.cpp", "host/core/h.h"),
                              ("plugins/one/a.cpp", "plugins/one/x.h"), ("plugins/one/a.cpp", "ipmi/i.h"),
                              ("plugins/one/a.cpp", "x.h"), ("examples/plugin/a.cpp", "tqr/t.h")):
            self.assertEqual(self.found(path, include), [], f"{path} {include}")

    def test_what_is_not_allowed(self):
        for path, include in (("base/a.cpp", "ipmi/i.h"), ("base/a.cpp", "tqr/t.h"),
                              ("ipmi/a.h", "tqr/t.h"), ("ipmi/a.h", "simulator/s.h"),
                              ("simulator/a.cpp", "host/core/h.h"), ("host/core/a.cpp", "plugins/one/x.h"),
                              ("host/core/a.cpp", "program/p.h"), ("program/a.cpp", "plugins/one/x.h"),
                              ("plugins/one/a.cpp", "plugins/two/y.h"), ("plugins/one/a.cpp", "host/core/h.h"),
                              ("plugins/one/a.cpp", "../two/y.h"), ("plugins/one/a.cpp", "simulator/s.h"),
                              ("examples/plugin/a.cpp", "base/b.h"), ("include/tqr/a.h", "base/b.h")):
            self.assertEqual(self.found(path, include), [f"{path}: may not include {include}"])

    def test_an_include_of_nothing_is_reported(self):
        self.assertEqual(self.found("base/a.cpp", "base/gone.h"), ["base/a.cpp: there is no base/gone.h"])


if __name__ == "__main__":
    Tree.root = pathlib.Path(sys.argv.pop(1))
    unittest.main()
