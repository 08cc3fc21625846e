#!/usr/bin/env bash
# The built packages: what they hold, and how they come and go in a Debian with nothing installed.
#
# usage: packages_test.sh FOLDER      with the packages of one architecture; works in FOLDER/test
#
# Exit status 77, and a line that says why, where the second half cannot be tried.
set -euo pipefail
folder=$(realpath "$1")
cd "$(dirname "$0")/../.."
. tools/lib.sh
work=$folder/test
mapfile -t packages < <(find "$folder" -maxdepth 1 -name '*.deb' ! -name '*-dbgsym_*' | sort)
fail() {
    echo "packages_test: $*" >&2
    exit 1
}

[ ${#packages[@]} -eq 4 ] || fail "${#packages[@]} packages in $folder instead of 4"
rm -rf "$work/tree"
mkdir -p "$work/tree"
for package in "${packages[@]}"; do
    dpkg-deb -x "$package" "$work/tree"
    name=$(dpkg-deb -f "$package" Package)
    for holder in 'authors of ipmisel' 'University of Cincinnati' 'Niels Lohmann' 'Florian Loitsch' 'Bjoern Hoehrmann'; do
        grep -q "$holder" "$work/tree/usr/share/doc/$name/copyright" || fail "$name: no copyright of $holder"
        grep -q "$holder" NOTICE || [ "$holder" = 'authors of ipmisel' ] || fail "NOTICE: no copyright of $holder"
    done
done
binaries=0
while read -r file; do
    case $(readelf -SW "$file" 2>/dev/null) in
    '') ;;
    *.symtab* | *.debug_*) fail "$file is not stripped" ;;
    *) binaries=$((binaries + 1)) ;;
    esac
done < <(find "$work/tree" -type f)
[ "$binaries" -eq 7 ] || fail "$binaries binaries instead of 7"
python3 - "$work/tree" <<'PY'
import pathlib, re, sys
root = pathlib.Path(sys.argv[1])
links = 0
for path in root.rglob("*"):
    if path.is_symlink():
        target = path.parent / path.readlink()
        # The package base-files has the common licences.
        if not target.exists() and "/common-licenses/" not in str(target):
            sys.exit(f"{path} leads nowhere")
    elif path.suffix == ".md":
        for link in re.findall(r"\]\(([^)#:\s]+)(?:#[^)]*)?\)", path.read_text()):
            links += 1
            target = path.parent / link
            if not target.exists() and not target.is_symlink():
                sys.exit(f"{path} leads to {link}, which is not installed")
if links < 20:
    sys.exit(f"the documents have {links} links")
PY
echo "what the packages hold: in order"

[ "$(id -u)" -eq 0 ] || { echo "SKIPPED: to install in a bare Debian, run it as root" && exit 77; }
install_packages "${package_test_packages[@]}" || { echo "SKIPPED: ${package_test_packages[*]} cannot be installed" && exit 77; }
root=build/bare/root  # the archive beside it stays for the next time
bare_debian "$root" "$(dpkg-deb -f "$folder"/ipmisel_*.deb Architecture)" ||
    { echo "SKIPPED: no bare Debian can be made, see build/bare" && exit 77; }
root=$(realpath "$root")
files() { inside "$root" find / -xdev ! -path '/var/*' ! -path '/proc/*' ! -path '/tmp/*' ! -path '/run/*' | sort; }
files >"$work/before"

mkdir "$root/tmp/packages"
cp "${packages[@]}" "$root/tmp/packages/"
inside "$root" sh -c 'apt-get -qq install -y --no-install-recommends /tmp/packages/*.deb >/dev/null'
# As docs/plugin-authors.md has it, with the compiler of this machine.
if [ "$(dpkg-deb -f "$folder"/ipmisel_*.deb Architecture)" = "$(dpkg --print-architecture)" ]; then
    read -r -a flags < <(PKG_CONFIG_SYSROOT_DIR=$work/tree PKG_CONFIG_PATH=$work/tree/usr/share/pkgconfig \
        pkg-config --cflags --libs ipmisel)
    g++ -std=c++20 -shared -fPIC -fvisibility=hidden "$work/tree/usr/share/doc/ipmisel-dev/examples/plugin/self_test.cpp" \
        -o "$root/tmp/self_test.pi" "${flags[@]}"
    [[ $(inside "$root" ipmisel classes --plugin /tmp/self_test.pi) == *EXAMPLE_SelfTest* ]] || fail "no example plug-in"
fi
report=$(inside "$root" ipmisel collect --from sim:/usr/share/doc/ipmisel-simulator/examples/rack-server.json)
[[ $report == *"DIMM 5: uncorrectable memory error"* ]] || fail "the installed program says: $report"
inside "$root" gzip -t /usr/share/man/man1/ipmisel.1.gz /usr/share/man/man1/ipmisel-collect.1.gz \
    /usr/share/man/man1/ipmisel-simulator.1.gz \
    /usr/share/man/man5/ipmisel.conf.5.gz /usr/share/man/man5/ipmisel-simulated-server.5.gz
inside "$root" bash -c '. /usr/share/bash-completion/completions/ipmisel && complete -p ipmisel >/dev/null'
inside "$root" python3 -c 'import ipmisel
events = list(ipmisel.collect("sim:/usr/share/doc/ipmisel-simulator/examples/rack-server.json"))
assert len(events) == 53 and ipmisel.Severity.FATAL in (event.severity for event in events)'
echo "installed: the program, its pages, its completion and the module work"

inside "$root" sh -c 'apt-get -qq purge -y --auto-remove "ipmisel*" python3-ipmisel >/dev/null' 2>"$work/purge.log"
files >"$work/after"
diff "$work/before" "$work/after" || fail "this is left behind, or gone"
[ -z "$(inside "$root" dpkg-query -W -f '${Package}\n' '*ipmisel*' 2>/dev/null)" ] || fail "dpkg knows it still"
echo "purged: nothing is left"

rm -rf "$work/autopkgtest"
# A program finds the libraries beside it by way of /proc.
unshare --mount bash -c 'mount -t proc proc "$0/proc" && exec "$@"' "$root" autopkgtest --no-built-binaries \
    --output-dir "$work/autopkgtest" "${packages[@]}" "$folder/ipmisel/" -- chroot "$root" \
    >"$work/autopkgtest.log" 2>&1 || fail "autopkgtest: see $work/autopkgtest.log"
grep -qE '^simulated-server +PASS' "$work/autopkgtest/summary" || fail "autopkgtest ran something else"
echo "autopkgtest: simulated-server passes"
rm -rf "$root" "$work/tree"
