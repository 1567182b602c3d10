#!/usr/bin/env bash
# One command from a fresh Debian machine to a working demo: installs missing
# packages (when run as root), builds the library, tests and the vamrnb tool in
# build/, then encodes the bundled recording in all eight modes, decodes each
# stream back to WAV and prints a table of bit rate, size and coding speed.
set -euo pipefail
cd "$(dirname "$0")/.."
source scripts/setup-deps.sh
vamrnb_setup_deps

cmake -S . -B build -DCMAKE_BUILD_TYPE=Release
cmake --build build -j2

echo
echo "== vamrnb demo: tools/demo/allison-congrats.wav, 30.26 s of speech =="
tools/demo/run_demo.sh build/tools/vamrnb out/demo
