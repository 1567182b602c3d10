#!/bin/sh
# Builds dist/ (the WebAssembly module and its loader) from the library's
# sources with Debian's emscripten, in ../build-wasm.  Incremental.
set -e
cd "$(dirname "$0")/.."
if [ ! -f build-wasm/CMakeCache.txt ]; then
    cmake -S . -B build-wasm -DCMAKE_TOOLCHAIN_FILE=cmake/wasm.cmake -DCMAKE_BUILD_TYPE=Release \
        -DVAMRNB_BUILD_TESTS=OFF -DVAMRNB_BUILD_TOOL=OFF -DVAMRNB_BUILD_EXAMPLES=OFF \
        -DVAMRNB_BUILD_PYTHON=OFF -DVAMRNB_BUILD_GST=OFF -Wno-dev >/dev/null
fi
cmake --build build-wasm -j2 --target vamrnb_wasm
