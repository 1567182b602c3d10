#!/usr/bin/env bash
# Makes sure the Debian packages that building, testing, cross-testing and
# fuzzing need are present.  As root it installs the missing ones
# (apt-get update once, then apt-get install -y); otherwise it names them and
# fails.  Sourced or run by demo.sh and test.sh.
set -euo pipefail

vamrnb_packages=(cmake g++ make pkg-config googletest libgtest-dev libbenchmark-dev
                 g++-arm-linux-gnueabihf qemu-user clang libsndfile1-dev libsoxr-dev
                 python3 g++-aarch64-linux-gnu valgrind)

vamrnb_setup_deps() {
    if ! command -v dpkg-query >/dev/null 2>&1; then
        echo "setup: not a Debian system; make sure these are installed: ${vamrnb_packages[*]}" >&2
        return 0
    fi
    local missing=() p
    for p in "${vamrnb_packages[@]}"; do
        if ! dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q 'install ok installed'; then
            missing+=("$p")
        fi
    done
    [ ${#missing[@]} -eq 0 ] && return 0
    if [ "$(id -u)" -ne 0 ]; then
        echo "setup: missing Debian packages: ${missing[*]}" >&2
        echo "setup: install them (as root: apt-get install -y ${missing[*]}) and run again" >&2
        return 1
    fi
    echo "setup: installing ${missing[*]}"
    export DEBIAN_FRONTEND=noninteractive
    apt-get update
    apt-get install -y "${missing[@]}"
}

if [ "${BASH_SOURCE[0]}" = "$0" ]; then
    vamrnb_setup_deps
fi
