"""The installed tree: it runs from where it was moved to, its documents link what is there, and the
example's plug-in is built against it and collects.

Usage: installed_test.py BUILD_TREE SOURCE_TREE CXX"""

import json
import pathlib
import re
import subprocess
import sys
import tempfile

build, tree, compiler = map(pathlib.Path, sys.argv[1:4])

SERVER = {
    "smbios": ["26123000012020ffa30c0000000000000105 0000"],
    "bmcs": [{"self_test": "57 08"}, {}],
}


def run(*command):
    ended = subprocess.run([str(part) for part in command], capture_output=True, text=True)
    if ended.returncode != 0:
        sys.exit(f"{command}: {ended.returncode}\n{ended.stdout}{ended.stderr}")
    return ended.stdout


def expect(found, expected, what):
    if found != expected:
        sys.exit(f"{what}: {found} instead of {expected}")


with tempfile.TemporaryDirectory() as folder:
    folder = pathlib.Path(folder)
    run("cmake", "--install", build, "--prefix", folder / "first")
    prefix = (folder / "first").rename(folder / "moved")

    libraries = sorted(path.name for path in (prefix / "lib/ipmisel").iterdir())
    expect(libraries, ["ipmisel.INI", "libipmisel.pi", "libipmistandard.pi", "libsmbios.so",
                       "libspdriver.so", "libtqrcore.so"], "lib/ipmisel")
    expect([path.name for path in (prefix / "lib").iterdir()], ["ipmisel"], "lib")

    for completion in ("bash-completion/completions/ipmisel", "zsh/site-functions/_ipmisel",
                       "fish/vendor_completions.d/ipmisel.fish"):
        expect((prefix / "share" / completion).is_file(), True, completion)
    documents = prefix / "share/doc/ipmisel"
    for document in documents.rglob("*.md"):
        for link in re.findall(r"\]\(([^)#:]+)(?:#[^)]*)?\)", document.read_text()):
            if not (document.parent / link).exists():
                sys.exit(f"{document.relative_to(documents)} links {link}, which is not installed")

    source = prefix / "share/doc/ipmisel/examples/plugin"
    run("cmake", "-G", "Ninja", "-S", source, "-B", folder / "build", f"-DIPMISEL_PREFIX={prefix}",
        f"-DCMAKE_CXX_COMPILER={compiler}", "-DCMAKE_CXX_FLAGS=-Wall -Wextra -Wpedantic -Werror")
    run("cmake", "--build", folder / "build")
    plugin = folder / "build/self_test.pi"

    program = prefix / "bin/ipmisel"
    listed = run(program, "classes", "--plugin", plugin).splitlines()[-1]
    expect(listed.split(None, 1), ["EXAMPLE_SelfTest", "self test of the management controller"],
           "ipmisel classes")
    server = folder / "server.json"
    server.write_text(json.dumps(SERVER))
    report = json.loads(run(program, "collect", "--from", f"sim:{server}", "--plugin", plugin,
                            "--class", "EXAMPLE_SelfTest", "--format", "json"))
    expect(report["instances"],
           [{"class": "EXAMPLE_SelfTest",
             "properties": {"Node": 1, "Passed": False, "Result": 0x57, "Detail": 8}}],
           "the collection")
    lines = (tree / "examples/plugin/self_test.cpp").read_text().count("\n")
    if lines > 100:
        sys.exit(f"the example's plug-in has {lines} lines; it is to be short")
