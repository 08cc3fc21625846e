"""A Linux guest under QEMU with a real IPMI driver, and BMCs for it.

The guest is a Debian kernel with an initramfs of busybox and the built program. What it prints
between two marks on its serial console is what the program printed.
"""
import base64
import contextlib
import os
import pathlib
import re
import select
import shutil
import socket
import struct
import subprocess
import sys
import tempfile
import threading

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[2] / "bench"))
from lan_peers import wait_for_bmc  # noqa: E402

BOOT_SECONDS = 240  # software emulation on a busy machine; six seconds on an idle one
MODULES = ("ipmi_msghandler", "ipmi_devintf", "ipmi_si")


def record(number: int, kind: int, body: str, name: str) -> bytes:
    """A sensor data record: header, body to the byte before the ID string, ID string."""
    rest = bytes.fromhex(body) + bytes([0xC0 | len(name)]) + name.encode()
    return bytes([number, 0, 0x51, kind, len(rest)]) + rest


# A full record: sensor 0x30, degrees C, M = 1; and a compact one, sensor 0x31.
SDRS = [
    record(1, 1, "2000 30 0301 7f68 0101 000000000000 80010000 0100 0000 0000" + "00" * 17,
           "CPU1 Temp"),
    record(2, 2, "2000 31 0401 6740 0d6f 000000000000 c00000" + "00" * 8, "Drive 1"),
]
# record ID, type 02, time, generator, revision, sensor type, number, event type, data 1 to 3
SEL = [bytes.fromhex(f"{i:02x}00 02 00000000 2000 04 {event}") for i, event in enumerate(
    ["01 30 01 59 50 45", "01 30 81 59 40 45", "0d 31 6f f0 ff ff", "0f 00 6f c2 01 ff"], 1)]


class Missing(Exception):
    """A facility of the test bed is not there; the text says which."""


def kernel(cache: pathlib.Path) -> tuple[pathlib.Path, list[pathlib.Path]]:
    """Kernel image and IPMI modules of the kernel package, unpacked below `cache` once."""
    root = cache / "kernel"
    if not root.exists():
        depends = subprocess.run(["apt-cache", "depends", "linux-image-amd64"],
                                 capture_output=True, text=True, check=False).stdout
        names = [line.split()[-1] for line in depends.splitlines() if "Depends: linux-image" in line]
        if not names:
            raise Missing("no package linux-image-amd64 is known")
        cache.mkdir(parents=True, exist_ok=True)
        with tempfile.TemporaryDirectory(dir=cache) as folder:
            loaded = subprocess.run(["apt-get", "download", names[0]], cwd=folder, check=False,
                                    capture_output=True, text=True)
            packages = list(pathlib.Path(folder).glob("*.deb"))
            if loaded.returncode != 0 or not packages:
                raise Missing(f"package {names[0]} cannot be had")
            subprocess.run(["dpkg-deb", "-x", packages[0], folder + "/root"], check=True)
            os.rename(folder + "/root", root)
    images = sorted(root.glob("boot/vmlinuz-*"))
    modules = [found for name in MODULES for found in sorted(root.glob(f"lib/modules/*/**/{name}.ko"))]
    if not images or len(modules) != len(MODULES):
        raise Missing("the kernel package holds no image, or no IPMI modules")
    return images[0], modules


def _cpio(entries: list[tuple[str, int, bytes]]) -> bytes:
    """A "newc" archive of (name, mode, contents)."""
    archive = bytearray()
    for number, (name, mode, contents) in enumerate(entries + [("TRAILER!!!", 0, b"")], 1):
        fields = (number, mode, 0, 0, 1, 0, len(contents), 0, 0, 0, 0, len(name) + 1, 0)
        archive += b"070701" + b"".join(b"%08X" % field for field in fields)
        for part in (name.encode() + b"\0", contents):
            archive += part
            archive += b"\0" * (-len(archive) % 4)
    return bytes(archive)


def _libraries(binary: pathlib.Path) -> set[str]:
    lines = subprocess.run(["ldd", binary], capture_output=True, text=True, check=True).stdout
    return set(re.findall(r"(?:=> |^\s*)(/\S+)", lines, re.MULTILINE))


def initramfs(build: pathlib.Path, modules: list[pathlib.Path], script: str) -> bytes:
    """The guest's root: busybox, the modules, the program with its libraries, /init."""
    busybox = shutil.which("busybox") or "/bin/busybox"
    if not os.path.exists(busybox) or "statically" not in subprocess.run(
            ["file", "-L", busybox], capture_output=True, text=True, check=False).stdout:
        raise Missing("no static busybox (package busybox-static)")
    files = {"bin/busybox": pathlib.Path(busybox)}
    files |= {f"modules/{module.name}": module for module in modules}
    installed = [build / "bin/ipmisel", *sorted((build / "lib/ipmisel").iterdir()),
                 *sorted((build / "tests").glob("program_with*_memory"))]
    libraries = set()
    for path in installed:
        files["opt/" + str(path.relative_to(build))] = path
        if path.suffix != ".INI":
            libraries |= _libraries(path)
    for library in libraries:
        if not library.startswith(str(build)):
            files[library.lstrip("/")] = pathlib.Path(library)
    folders = {"proc", "sys", "dev", "tmp"}
    for name in files:
        folders |= {str(parent) for parent in pathlib.PurePath(name).parents if str(parent) != "."}
    entries = [(folder, 0o040755, b"") for folder in sorted(folders)]
    entries += [(name, 0o100755, path.read_bytes()) for name, path in sorted(files.items())]
    entries.append(("init", 0o100755, script.encode()))
    return _cpio(entries)


INIT = """#!/bin/busybox sh
export PATH=/bin
/bin/busybox --install -s /bin
mount -t proc proc /proc; mount -t sysfs sys /sys; mount -t devtmpfs dev /dev
{modules}
transactions() {{ find /sys/devices -name complete_transactions -exec cat {{}} + || echo 0; }}
before=$(transactions)
{{
{commands}
}} >/tmp/out 2>/tmp/err </dev/null
echo "status $? $(($(transactions) - before))" >/tmp/status
for part in status err out; do
    echo "@@@ begin $part"; base64 /tmp/$part; echo "@@@ end $part"
done
poweroff -f
"""


class Run:
    """What the program did in the guest; `transactions` with the BMC, as the driver counts them."""

    def __init__(self, console: str):
        parts = {name: base64.b64decode("".join(text.split())).decode(errors="replace")
                 for name, text in re.findall(r"@@@ begin (\w+)(.*?)@@@ end \1", console, re.DOTALL)}
        if len(parts) != 3:
            raise AssertionError("the guest did not come to its end:\n" + console[-3000:])
        self.status, self.transactions = map(int, parts["status"].split()[1:])
        self.err, self.out = parts["err"], parts["out"]


def run_guest(build, cache, arguments: str, devices: list[str], load_driver: bool = True,
              commands: str = "") -> Run:
    """Boots the guest with QEMU devices and runs the program with `arguments` in it, or `commands` of its shell."""
    qemu = shutil.which("qemu-system-x86_64")
    if not qemu:
        raise Missing("no qemu-system-x86_64 (package qemu-system-x86)")
    image, modules = kernel(cache)
    load = "\n".join(f"insmod /modules/{module.name}" for module in modules)
    script = INIT.format(modules=load + "\nsleep 1" if load_driver else "", commands=commands or f"/opt/bin/ipmisel {arguments}")
    with tempfile.TemporaryDirectory() as folder:
        root = pathlib.Path(folder) / "initramfs"
        root.write_bytes(initramfs(build, modules, script))
        command = [qemu, "-machine", "q35", "-accel", "tcg", "-m", "512", "-nographic", "-no-reboot",
                   "-kernel", str(image), "-initrd", str(root), "-append",
                   "console=ttyS0 quiet panic=1 no_timer_check", *devices]
        done = subprocess.run(command, stdin=subprocess.DEVNULL, capture_output=True, check=False,
                              timeout=BOOT_SECONDS)
    return Run(done.stdout.decode(errors="replace"))


class FallingSilent:
    """A BMC at a TCP port for virtual machines, that of another port until the doctor has been through all of its
    commands so many times; from then on it takes what comes and answers nothing."""

    LAST = bytes([0x04 << 2, 0x13])  # Get PEF Configuration Parameters, the last command but those of a sensor

    def __init__(self, port: int, whole_runs: int):
        self.target, self.left = port, whole_runs
        self.listener = socket.create_server(("127.0.0.1", 0))
        self.port = self.listener.getsockname()[1]

    def __enter__(self):
        threading.Thread(target=self.serve, daemon=True).start()
        return self

    def __exit__(self, *_):
        self.listener.close()

    def serve(self):
        with contextlib.suppress(OSError):
            machine, _ = self.listener.accept()
            with machine, socket.create_connection(("127.0.0.1", self.target)) as bmc:
                while True:
                    for ready in select.select([machine, bmc], [], [])[0]:
                        data = ready.recv(4096)
                        if not data:
                            return
                        if self.left > 0:
                            (bmc if ready is machine else machine).sendall(data)
                        if ready is machine and self.LAST in data:
                            self.left -= 1


def free_port(kind=socket.SOCK_STREAM) -> int:
    with socket.socket(socket.AF_INET, kind) as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


@contextlib.contextmanager
def ipmi_sim(sel: list[bytes], sdrs: list[bytes], commands: tuple[str, ...] = (), log_size: int = 0,
             controller: str = "0 no-device-sdrs 0x23 9 8 0x9f 0x1291 0xf02 persist_sdr",
             guid: str = "a123456789abcdefa123456789abcdef"):
    """A BMC of OpenIPMI, reached over the LAN and by a virtual machine: (udp port, tcp port).

    `commands` are its own, given before the BMC is enabled; `controller` is what follows the address
    in its command mc_add; `guid` as on the wire."""
    program = shutil.which("ipmi_sim")
    if not program:
        raise Missing("no ipmi_sim (package openipmi)")
    udp, tcp = free_port(socket.SOCK_DGRAM), free_port()
    levels = "\n".join(f"allowed_auths_{level} none md2 md5 straight"
                       for level in ("callback", "user", "operator", "admin"))
    lan = (f'name "guest"\nset_working_mc 0x20\n'
           f"startlan 1\naddr 127.0.0.1 {udp}\npriv_limit admin\n{levels}\n"
           f"guid {guid}\nendlan\n"
           f"serial 15 127.0.0.1 {tcp} codec VM\n"
           f'user 2 true "root" "secret" admin 10 none md2 md5 straight\n')
    def hexes(data):
        return " ".join(f"0x{byte:02x}" for byte in data)

    emu = ["mc_setbmc 0x20", f"mc_add 0x20 {controller}",
           f"sel_enable 0x20 {log_size or max(len(sel), 1) + 10} 0x0a"]
    emu += [f"sel_add 0x20 0x{entry[2]:02x} {hexes(entry[3:])}" for entry in sel]
    emu += [f"main_sdr_add 0x20 {hexes(record)}" for record in sdrs]
    emu += [*commands, "mc_enable 0x20"]
    with tempfile.TemporaryDirectory() as folder:
        base = pathlib.Path(folder)
        (base / "lan.conf").write_text(lan)
        (base / "bmc.emu").write_text("\n".join(emu) + "\n")
        (base / "state").mkdir()
        process = subprocess.Popen([program, "-c", "lan.conf", "-f", "bmc.emu", "-s", "state", "-n"],
                                   cwd=folder, stdin=subprocess.DEVNULL,
                                   stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        try:
            wait_for_bmc(udp, process)
            yield udp, tcp
        finally:
            process.kill()
            process.wait()
