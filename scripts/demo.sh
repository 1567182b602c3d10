#!/usr/bin/env bash
# One command from a fresh Debian machine to a working demo: installs missing
# packages (when run as root), builds the library, tests and tools in build/,
# then runs a small C program over the public interface.
set -euo pipefail
cd "$(dirname "$0")/.."
source scripts/setup-deps.sh
vamrnb_setup_deps

cmake -S . -B build -DCMAKE_BUILD_TYPE=Release
cmake --build build -j2

echo
echo "== public interface smoke program =="
build/tests/vamrnb_api_smoke
