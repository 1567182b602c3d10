#!/usr/bin/env bash
# Peak memory and speed of the command-line tool on a long recording.
#   bench/tool_rss.sh [TOOL] [SECONDS] [RATE]
# Loops corpus speech with sox into a SECONDS-long (default 3600) mono WAV at
# RATE Hz (default 16000, so the resampler runs) in a temporary directory,
# then times `encode` and `decode` of it with GNU time and prints peak RSS and
# the real-time factor (audio seconds per wall-clock second) of each.
# Needs sox and /usr/bin/time; quote figures with the machine that made them.
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
tool=${1:-$here/build/tools/vamrnb}
seconds=${2:-3600}
rate=${3:-16000}
corpus=${VAMRNB_SHARED:-$here/../shared}/corpus
[ -x "$tool" ] || { echo "tool_rss: no tool at $tool (build it first)" >&2; exit 2; }
command -v sox >/dev/null || { echo "tool_rss: needs sox" >&2; exit 2; }
[ -x /usr/bin/time ] || { echo "tool_rss: needs GNU time (/usr/bin/time)" >&2; exit 2; }

tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT

# One pass over some speech items, then as many repeats as the length needs.
items=("$corpus"/mix_en-US_f_allison_*snr20dB.pcm)
[ -e "${items[0]}" ] || items=("$corpus"/*.pcm)
for f in "${items[@]:0:4}"; do
    sox -t raw -r 8000 -e signed -b 16 -c 1 "$f" -t raw - 
done > "$tmp/pass.raw"
pass_seconds=$(( $(stat -c %s "$tmp/pass.raw") / 16000 ))
repeats=$(( (seconds + pass_seconds - 1) / pass_seconds ))
sox -t raw -r 8000 -e signed -b 16 -c 1 "$tmp/pass.raw" -r "$rate" "$tmp/long.wav" \
    repeat $((repeats - 1)) trim 0 "$seconds"

measure() {
    local label=$1; shift
    /usr/bin/time -f '%M %e' -o "$tmp/time" "$@" 2>/dev/null
    read -r kb wall < "$tmp/time"
    awk -v l="$label" -v kb="$kb" -v w="$wall" -v s="$seconds" \
        'BEGIN { printf "%-7s peak RSS %7.1f MB   wall %7.2f s   %6.0fx real time\n", l, kb / 1024, w, (w > 0 ? s / w : 0) }'
}

echo "tool: $tool"
echo "input: $seconds s of speech, mono $rate Hz WAV, $(( $(stat -c %s "$tmp/long.wav") / 1000000 )) MB"
measure encode "$tool" encode -q -m 12.2 "$tmp/long.wav" "$tmp/long.amr"
measure decode "$tool" decode -q "$tmp/long.amr" "$tmp/out.wav"
