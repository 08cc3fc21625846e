# shellcheck shell=bash disable=SC2034
# What the scripts of this folder share. Sourced, not run.

# install_packages NAME...: installs those that are missing; fails when one cannot be had.
install_packages() {
    local missing=() name
    for name in "$@"; do
        dpkg-query -W -f='${Status}' "$name" 2>/dev/null | grep -q '^install ok installed' ||
            missing+=("$name")
    done
    [ ${#missing[@]} -eq 0 ] && return 0
    if ! command -v apt-get >/dev/null; then
        echo "install these first, apt-get is not here: ${missing[*]}" >&2
        return 1
    fi
    local as_root=()
    if [ "$(id -u)" -ne 0 ]; then
        command -v sudo >/dev/null || {
            echo "run this as root, or install: ${missing[*]}" >&2
            return 1
        }
        as_root=(sudo)
    fi
    echo "Installing: ${missing[*]}"
    # The list of packages is made new once, and only when something is to be installed.
    if [ -z "${packages_updated:-}" ]; then
        "${as_root[@]}" env DEBIAN_FRONTEND=noninteractive apt-get -qq update || return 1
        packages_updated=yes
    fi
    "${as_root[@]}" env DEBIAN_FRONTEND=noninteractive \
        apt-get -qq install --no-install-recommends -y "${missing[@]}" >/dev/null
}

# bare_debian FOLDER [ARCHITECTURE]: a Debian 12 with nothing installed, made once and kept as an archive
# beside it; takes the network from this machine: its resolver, its proxy, its settings of apt.
bare_debian() {
    local folder=$1 architecture=${2:-$(dpkg --print-architecture)} archive
    archive=$(dirname "$folder")/bookworm-$architecture.tar
    rm -rf "$folder"
    mkdir -p "$folder"
    if [ ! -e "$archive" ]; then
        debootstrap --arch="$architecture" --variant=minbase bookworm "$folder" >"$archive.log" || return 1
        tar -C "$folder" -cf "$archive.new" . && mv "$archive.new" "$archive" || return 1
    else
        tar -C "$folder" -xf "$archive" || return 1
    fi
    cp /etc/resolv.conf "$folder/etc/"
    apt-config dump | grep -E '^Acquire::(http|https|Check)' >"$folder/etc/apt/apt.conf.d/50host" || true
    echo 'Dpkg::Use-Pty "0";' >>"$folder/etc/apt/apt.conf.d/50host"
    # dpkg is to leave the disk to itself: nobody keeps this one.
    echo force-unsafe-io >"$folder/etc/dpkg/dpkg.cfg.d/unsafe-io"
    inside "$folder" apt-get -qq update
}
# inside FOLDER COMMAND...: runs it in there, with processes of its own that end with it.
inside() {
    local folder=$1
    shift
    unshare --mount --pid --fork --kill-child --mount-proc="$folder/proc" -- env -i ${http_proxy:+http_proxy="$http_proxy"} \
        ${https_proxy:+https_proxy="$https_proxy"} PATH=/usr/sbin:/usr/bin:/sbin:/bin LANG=C.UTF-8 HOME=/root \
        DEBIAN_FRONTEND=noninteractive chroot "$folder" "$@"
}

# What the build needs, its tests need on top, and the tests that compare with other people's programs.
build_packages=(g++ cmake ninja-build pkg-config libssl-dev libcli11-dev nlohmann-json3-dev
                libpq-dev libsqlite3-dev)
test_packages=(git googletest less libfreeipmi-dev openipmi python3)
peer_packages=(ipmitool freeipmi-tools file fish zsh jq sqlite3 postgresql python3-jsonschema python3-pyghmi prometheus prometheus-node-exporter
               rsyslog tidy chromium)
package_packages=(debhelper dh-python fakeroot help2man lintian lowdown)
package_test_packages=(autopkgtest debootstrap python3)
