#!/usr/bin/env bash
# Builds everything in build/ and runs every registered test: unit tests,
# public-header, export and installation checks, and the conformance runs
# that are switched on (VAMRNB_CONFORMANCE_DEC / _ENC / _DTX).
# Extra arguments are passed to the CMake configure step.
set -euo pipefail
cd "$(dirname "$0")/.."
source scripts/setup-deps.sh
vamrnb_setup_deps

# Conformance switches follow the project defaults, not a stale cache.
cmake -S . -B build -DCMAKE_BUILD_TYPE=Release -DVAMRNB_BUILD_TESTS=ON \
    -U "VAMRNB_CONFORMANCE_*" "$@"
cmake --build build -j2
ctest --test-dir build --output-on-failure -j2

# The conformance tallies (frames exact / frames checked) of the runs above.
log=build/Testing/Temporary/LastTest.log
if [ -f "$log" ] && grep -q '^\(decoder\|encoder\), ' "$log"; then
    echo
    echo "== conformance =="
    sed -n '/^\(decoder\|encoder\), /,/^  total/p' "$log"
fi
