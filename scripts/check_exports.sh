#!/usr/bin/env bash
# Fails when the shared library exports a dynamic symbol outside the
# library's own prefixes (C++ mangled names included).
#   scripts/check_exports.sh build/libvamrnb.so     (NM=<target nm> to override)
set -euo pipefail
lib=${1:?usage: check_exports.sh <libvamrnb.so>}
nm_tool=${NM:-nm}
[ -f "$lib" ] || { echo "check_exports: no such file: $lib" >&2; exit 2; }

# Names as nm prints them, without the version suffix (name@@VAMRNB_0).
symbols=$("$nm_tool" -D --defined-only "$lib" | awk 'NF >= 3 { print $3 }' | sed 's/@.*$//')
bad=$(printf '%s\n' "$symbols" | grep -v -E '^(vamrnb_|vamrnbd_|vamrnbe_|vcmn_|amrnb_l_shr$|VAMRNB_[0-9]+$)' \
      | grep -v '^$' || true)
count=$(printf '%s\n' "$symbols" | grep -c -v -E '^(VAMRNB_[0-9]+)?$' || true)
if [ -n "$bad" ]; then
    echo "check_exports: $lib exports symbols outside the library's prefixes:" >&2
    printf '  %s\n' $bad >&2
    exit 1
fi
echo "check_exports: $count exported symbols, all with the library's prefixes"
