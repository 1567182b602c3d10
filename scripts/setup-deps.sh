#!/usr/bin/env bash
# Makes sure the Debian packages that building, testing, cross-testing and
# fuzzing need are present, and the web package's node packages.  As root it installs the missing ones
# (apt-get update once, then apt-get install -y); otherwise it names them and
# fails.  Sourced or run by demo.sh and test.sh.
set -euo pipefail

vamrnb_packages=(cmake g++ make pkg-config googletest libgtest-dev libbenchmark-dev
                 g++-arm-linux-gnueabihf qemu-user clang libsndfile1-dev libsoxr-dev
                 python3 g++-aarch64-linux-gnu valgrind help2man doxygen abigail-tools
                 tshark
                 libgstreamer1.0-dev libgstreamer-plugins-base1.0-dev gstreamer1.0-tools
                 gstreamer1.0-plugins-base gstreamer1.0-plugins-good
                 python3-dev python3-numpy python3-pybind11 python3-pytest
                 python3-setuptools python3-build python3-venv python3-mypy
                 emscripten chromium nodejs
)

vamrnb_setup_deps() {
    if ! command -v dpkg-query >/dev/null 2>&1; then
        echo "setup: not a Debian system; make sure these are installed: ${vamrnb_packages[*]}" >&2
        vamrnb_setup_web
        return 0
    fi
    local missing=() p
    for p in "${vamrnb_packages[@]}"; do
        if ! dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q 'install ok installed'; then
            missing+=("$p")
        fi
    done
    # Debian's node has npm in its own package; a node from elsewhere brings it.
    command -v npm >/dev/null 2>&1 || missing+=(npm)
    if [ ${#missing[@]} -eq 0 ]; then
        vamrnb_setup_web
        return
    fi
    if [ "$(id -u)" -ne 0 ]; then
        echo "setup: missing Debian packages: ${missing[*]}" >&2
        echo "setup: install them (as root: apt-get install -y ${missing[*]}) and run again" >&2
        return 1
    fi
    echo "setup: installing ${missing[*]}"
    export DEBIAN_FRONTEND=noninteractive
    # tshark: no set-uid capture helper, and so no question during installation.
    echo "wireshark-common wireshark-common/install-setuid boolean false" | debconf-set-selections
    apt-get update
    apt-get install -y "${missing[@]}"
    vamrnb_setup_web
}

# The web package's development packages (playwright-core, typescript), as
# pinned in web/package-lock.json; again after every change of the lock file.
vamrnb_setup_web() {
    command -v npm >/dev/null 2>&1 || return 0
    local dir
    dir="$(cd "$(dirname "${BASH_SOURCE[0]}")/../web" && pwd)"
    if [ -d "$dir/node_modules" ] && [ "$dir/node_modules/.package-lock.json" -nt "$dir/package-lock.json" ]; then
        return 0
    fi
    echo "setup: npm ci in web/"
    (cd "$dir" && npm ci --no-audit --no-fund)
}

if [ "${BASH_SOURCE[0]}" = "$0" ]; then
    vamrnb_setup_deps
fi
