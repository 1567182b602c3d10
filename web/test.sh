#!/bin/sh
# The web package's tests as ctest runs them: builds the WebAssembly module
# and runs `npm test` (node conformance and API tests, headless Chromium).
# Without emscripten, node or the node packages it exits 77 (skipped), unless
# VAMRNB_WEB_REQUIRED=1 (CI), where a missing piece is a failure.
cd "$(dirname "$0")" || exit 1
missing=""
command -v emcc >/dev/null 2>&1 || missing="$missing emcc"
command -v node >/dev/null 2>&1 || missing="$missing node"
command -v npm >/dev/null 2>&1 || missing="$missing npm"
[ -d node_modules/playwright-core ] || missing="$missing node_modules (npm ci)"
if [ -n "$missing" ]; then
    echo "web tests: missing$missing"
    [ "${VAMRNB_WEB_REQUIRED:-0}" = 1 ] && exit 1
    exit 77
fi
exec npm test --silent
