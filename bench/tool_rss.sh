#!/usr/bin/env bash
# Peak memory and speed of the command-line tool on a long recording.
#   bench/tool_rss.sh [TOOL] [SECONDS] [RATE]
# Loops corpus speech into a SECONDS-long (default 3600) mono WAV at RATE Hz
# (default 16000, so the resampler runs) in a temporary directory, then times
# `encode` and `decode` of it with GNU time and prints peak RSS and the
# real-time factor (audio seconds per wall-clock second) of each.
# The input is put together by python3's wave module; for a RATE other than
# 8000 one pass of the speech goes through the tool itself first (encoded,
# then decoded with --rate, which resamples with libsoxr).
# Needs python3 and /usr/bin/time; quote figures with the machine that made them.
set -euo pipefail
here=$(cd "$(dirname "$0")/.." && pwd)
tool=${1:-$here/build/tools/vamrnb}
seconds=${2:-3600}
rate=${3:-16000}
corpus=${VAMRNB_SHARED:-$here/../shared}/corpus
[ -x "$tool" ] || { echo "tool_rss: no tool at $tool (build it first)" >&2; exit 2; }
command -v python3 >/dev/null || { echo "tool_rss: needs python3" >&2; exit 2; }
[ -x /usr/bin/time ] || { echo "tool_rss: needs GNU time (/usr/bin/time)" >&2; exit 2; }

tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT

# One pass over some speech items as an 8 kHz WAV, at RATE if another is asked
# for, then as many repeats of it as the length needs.
items=("$corpus"/mix_en-US_f_allison_*snr20dB.pcm)
[ -e "${items[0]}" ] || items=("$corpus"/*.pcm)
python3 - "$tmp/pass.wav" "${items[@]:0:4}" <<'PY'
import sys, wave
with wave.open(sys.argv[1], "wb") as w:
    w.setnchannels(1); w.setsampwidth(2); w.setframerate(8000)
    for item in sys.argv[2:]:
        with open(item, "rb") as f:
            w.writeframes(f.read())
PY
if [ "$rate" -ne 8000 ]; then
    "$tool" encode -q -m 12.2 "$tmp/pass.wav" "$tmp/pass.amr"
    "$tool" decode -q --rate "$rate" "$tmp/pass.amr" "$tmp/pass.wav"
fi
python3 - "$tmp/pass.wav" "$tmp/long.wav" "$seconds" <<'PY'
import sys, wave
with wave.open(sys.argv[1], "rb") as r:
    rate, one = r.getframerate(), r.readframes(r.getnframes())
left = int(sys.argv[3]) * rate * 2
with wave.open(sys.argv[2], "wb") as w:
    w.setnchannels(1); w.setsampwidth(2); w.setframerate(rate)
    while left > 0:
        w.writeframes(one[:left])
        left -= len(one)
PY

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
