#!/usr/bin/env bash
# Instructions per call of each kernel version under qemu-arm (where timings
# are the emulator's, not the processor's): the checkasm program from an ARM
# cross build makes N calls of one version of one kernel; qemu runs one
# instruction per block and logs every block it executes, and the difference
# between the counts for N calls and for none, divided by N, is one call.
#
#   scripts/checkasm_count.sh [BUILD_DIR] [N]     (default build-arm, 20)
set -euo pipefail
build=${1:-build-arm}
calls=${2:-20}
checkasm=$build/tests/vamrnb_checkasm
qemu=(qemu-arm -L /usr/arm-linux-gnueabihf -singlestep -d nochain,exec -D /dev/stderr)

count() {   # kernel version calls -> executed instructions of the whole run
    "${qemu[@]}" "$checkasm" --function="$1" --version="$2" --calls="$3" 2>&1 >/dev/null |
        grep -c '^Trace'
}

kernels=(syn_filt syn_filt_m residu pred_lt_3or6 energy inner_product comp_corr convolve
         cor_h_x vq_subvec vq_subvec_s vq_subvec4)
printf '%-14s %12s %12s %8s\n' kernel "c insn" "neon insn" ratio
for k in "${kernels[@]}"; do
    base=$(count "$k" c 0)
    c=$(( ($(count "$k" c "$calls") - base) / calls ))
    n=$(( ($(count "$k" new "$calls") - base) / calls ))
    printf '%-14s %12d %12d %8s\n' "$k" "$c" "$n" "x$(awk "BEGIN {printf \"%.2f\", $c / ($n > 0 ? $n : 1)}")"
done
