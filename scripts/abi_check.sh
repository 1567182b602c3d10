#!/usr/bin/env bash
# Compares the ABI that callers of the shared library see with the recorded
# baseline abi/vamrnb.abi, using libabigail (abidw, abidiff).
#
#   scripts/abi_check.sh <libvamrnb.so>            check; fails on an incompatible change
#   scripts/abi_check.sh --update <libvamrnb.so>   record the library as the new baseline
#
# The library must carry debug information (a RelWithDebInfo or Debug
# build).  What counts is what the installed headers declare: the functions
# and tables declared in include/*.h and the records and enums defined there.
# Everything else the library exports for other codec components, and every
# internal record, may change freely.  Incompatible, and a failure: a public
# function or table removed or changed, a public record or enum changed or
# removed.  Added functions, tables and types pass (reported, not fatal).
set -euo pipefail
cd "$(dirname "$0")/.."
update=0
if [ "${1:-}" = --update ]; then update=1; shift; fi
lib=${1:?usage: abi_check.sh [--update] <libvamrnb.so>}
baseline=abi/vamrnb.abi
[ -f "$lib" ] || { echo "abi_check: no such file: $lib" >&2; exit 2; }
for tool in abidw abidiff readelf; do
    command -v "$tool" >/dev/null || { echo "abi_check: $tool not found (Debian: abigail-tools, binutils)" >&2; exit 2; }
done
if ! readelf -S "$lib" | grep '\.debug_info' >/dev/null; then  # grep -q would cut readelf off (pipefail)
    echo "abi_check: $lib has no debug information; build it with -DCMAKE_BUILD_TYPE=RelWithDebInfo" >&2
    exit 2
fi

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# Names declared in the public headers: functions and exported tables.
functions=$(sed -n 's/^VAMRNB_API[^(;]*[ *]\([A-Za-z_][A-Za-z0-9_]*\) *(.*/\1/p' include/*.h | sort -u | paste -sd'|')
# Opaque handles: structs the headers only name (typedef struct x x;).
handles=$(sed -n 's/^typedef struct \([A-Za-z_][A-Za-z0-9_]*\) \1;.*/\1/p' include/*.h | sort -u | paste -sd'|')
variables=$(sed -n 's/^VAMRNB_API extern .*[ *]\([A-Za-z_][A-Za-z0-9_]*\)\(\[[0-9]*\]\)* *;.*/\1/p' include/*.h | sort -u | paste -sd'|')
cat >"$work/public.suppr" <<SUPPR
[suppress_function]
  symbol_name_not_regexp = ^($functions)\$
  drop = yes
[suppress_variable]
  symbol_name_not_regexp = ^($variables)\$
  drop = yes
[suppress_type]
  source_location_not_regexp = .*/include/vamrnb[a-z_]*\\.h
  name_not_regexp = ^($handles)\$
  drop = yes
SUPPR

# Every type the public headers define, reachable or not (enums included);
# all other types are dropped, except the opaque handles, which
# --drop-private-types keeps as declarations (dropping them would drop the
# parameters that point to them).
abidw --headers-dir include --drop-private-types --load-all-types \
      --suppressions "$work/public.suppr" --no-show-locs --no-corpus-path \
      --no-comp-dir-path "$lib" >"$work/current.abi"
# Source paths relative to the checkout, so the baseline does not depend on it.
sed "s|$(pwd)/||g" "$work/current.abi" >"$work/current.rel.abi"

if [ $update -eq 1 ]; then
    mkdir -p "$(dirname "$baseline")"
    cp "$work/current.rel.abi" "$baseline"
    echo "abi_check: baseline $baseline updated from $lib"
    exit 0
fi
[ -f "$baseline" ] || { echo "abi_check: no baseline $baseline (run with --update)" >&2; exit 2; }

status=0
abidiff --non-reachable-types "$baseline" "$work/current.rel.abi" >"$work/report" || status=$?
cat "$work/report"
if [ $((status & 3)) -ne 0 ]; then
    echo "abi_check: abidiff failed (status $status)" >&2
    exit 2
fi
# Removed or changed entries in any summary line are incompatible.
broken=$(grep -E 'summary:' "$work/report" | grep -E '[1-9][0-9]* (Removed|removed|Changed|changed)' || true)
if [ $((status & 8)) -ne 0 ] || [ -n "$broken" ]; then
    echo "abi_check: FAILED: incompatible change to the public interface of $lib" >&2
    exit 1
fi
if [ $((status & 4)) -ne 0 ]; then
    echo "abi_check: compatible additions only"
else
    echo "abi_check: no change to the public interface"
fi
