#!/usr/bin/env bash
# The GStreamer elements against the command-line tool on the demo recording:
# MD5 of each pipeline's output beside the tool's output for the same job,
# then the best of five wall-clock times of each, as multiples of real time.
#   bench/gst_throughput.sh [build-dir]      (default build/)
set -euo pipefail
src=$(cd "$(dirname "$0")/.." && pwd)
build=$(cd "${1:-$src/build}" && pwd)
tool=$build/tools/vamrnb
wav=$src/tools/demo/allison-congrats.wav
export GST_PLUGIN_PATH=$build/gst GST_REGISTRY_1_0=$build/gst/registry.bin
tmp=$(mktemp -d)
trap 'rm -rf "$tmp"' EXIT
seconds=$(awk "BEGIN { print ($(stat -c %s "$wav") - 44) / 16000 }")

launch() { gst-launch-1.0 -q "$@" >/dev/null; }
sum() { md5sum "$1" | cut -c1-32; }

echo "== outputs (element | tool) =="
"$tool" encode -q "$wav" "$tmp/tool.amr"
launch filesrc location="$wav" ! wavparse ! vamrnbenc file-header=true ! filesink location="$tmp/gst.amr"
echo "encode MR122       $(sum "$tmp/gst.amr") | $(sum "$tmp/tool.amr")"
"$tool" decode -q --raw "$tmp/tool.amr" "$tmp/tool.pcm"
launch filesrc location="$tmp/tool.amr" ! amrparse ! vamrnbdec ! filesink location="$tmp/gst.pcm"
echo "decode amrparse    $(sum "$tmp/gst.pcm") | $(sum "$tmp/tool.pcm")"
launch filesrc location="$wav" ! wavparse ! vamrnbenc ! 3gppmux ! filesink location="$tmp/gst.3gp"
launch filesrc location="$tmp/gst.3gp" ! qtdemux ! vamrnbdec ! filesink location="$tmp/gst.pcm"
echo "3gp round trip     $(sum "$tmp/gst.pcm") | $(sum "$tmp/tool.pcm")"
launch filesrc location="$wav" ! wavparse ! vamrnbenc ! rtpamrpay ! rtpamrdepay ! vamrnbdec ! \
    filesink location="$tmp/gst.pcm"
echo "rtp round trip     $(sum "$tmp/gst.pcm") | $(sum "$tmp/tool.pcm")"

best() {
    local t b=999
    for _ in 1 2 3 4 5; do
        t=$( { TIMEFORMAT=%R; time "$@" >/dev/null 2>&1; } 2>&1 )
        b=$(awk "BEGIN { print ($t < $b) ? $t : $b }")
    done
    printf '%6.3f s  %5.0fx real time' "$b" "$(awk "BEGIN { print $seconds / $b }")"
}
echo
echo "== throughput on ${seconds} s of speech, best of 5 (element | tool) =="
echo "encode MR122   $(best launch filesrc location="$wav" ! wavparse ! vamrnbenc ! fakesink)" \
     " | $(best "$tool" encode -q "$wav" "$tmp/t.amr")"
echo "decode         $(best launch filesrc location="$tmp/tool.amr" ! amrparse ! vamrnbdec ! fakesink)" \
     " | $(best "$tool" decode -q --raw "$tmp/tool.amr" "$tmp/t.pcm")"
echo "gst-launch-1.0 start-up alone: $(best launch filesrc location="$wav" ! fakesink)"
