#!/usr/bin/env bash
# Installs a build tree into a scratch prefix, then builds and runs a small C
# program against the installed library: through pkg-config, and through
# find_package(vamrnb) in a throw-away CMake project (shared and static).
#   scripts/check_install.sh <build-dir> <scratch-dir>
set -euo pipefail
build=$(cd "${1:?usage: check_install.sh <build-dir> <scratch-dir>}" && pwd)
scratch=${2:?usage: check_install.sh <build-dir> <scratch-dir>}
src=$(cd "$(dirname "$0")/.." && pwd)
cc=${CC:-cc}
cmake_bin=${CMAKE:-cmake}

rm -rf "$scratch"
mkdir -p "$scratch"
scratch=$(cd "$scratch" && pwd)
prefix=$scratch/prefix
"$cmake_bin" --install "$build" --prefix "$prefix" >/dev/null

pc=$(find "$prefix" -name vamrnb.pc | head -n 1)
[ -n "$pc" ] || { echo "check_install: vamrnb.pc was not installed" >&2; exit 1; }
libdir=$(dirname "$(dirname "$pc")")
export PKG_CONFIG_PATH=$(dirname "$pc")
flags=$(pkg-config --cflags --libs vamrnb)
echo "check_install: pkg-config gives: $flags"
# shellcheck disable=SC2086
"$cc" -std=c11 -Wall -Wextra -Werror -pedantic -o "$scratch/api_smoke" \
    "$src/tests/abi/api_smoke.c" $flags
LD_LIBRARY_PATH=$libdir "$scratch/api_smoke"

mkdir -p "$scratch/consumer"
cat > "$scratch/consumer/CMakeLists.txt" <<CMAKE
cmake_minimum_required(VERSION 3.20)
project(vamrnb_consumer C CXX)
find_package(vamrnb 0 REQUIRED CONFIG)
add_executable(smoke_shared $src/tests/abi/api_smoke.c)
target_link_libraries(smoke_shared PRIVATE vamrnb::vamrnb)
add_executable(smoke_static $src/tests/abi/api_smoke.c)
target_link_libraries(smoke_static PRIVATE vamrnb::vamrnb_static)
CMAKE
"$cmake_bin" -S "$scratch/consumer" -B "$scratch/consumer/build" \
    -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_BUILD_TYPE=Release >/dev/null
"$cmake_bin" --build "$scratch/consumer/build" >/dev/null
"$scratch/consumer/build/smoke_shared" >/dev/null
"$scratch/consumer/build/smoke_static" >/dev/null
echo "check_install: pkg-config and find_package consumers built and ran"
