#!/usr/bin/env bash
# Instructions per frame of the encoder (DTX off, DTX on with VAD 1) and the
# decoder, every mode, at the default and the portable kernel level, on
#   x86-64   callgrind, counting inside vamrnbe_encode / vamrnbd_decode
#   armv7    qemu-arm with bench/qemu_insn_plugin.c
#   aarch64  qemu-aarch64 with the same plugin
# Under qemu the count is the difference between a full run of
# bench/insn_loop.c and a dry run that skips only the codec calls.
# Instruction counts are not cycles, but they are exact and repeatable.
#
#   bench/insn_count.sh [--frames N] [--arch x86-64,armv7,aarch64]
#                       [--input FILE.wav] [--build ARCH=DIR]...
#
# --frames N   frames of the input to code (default 100; 0 = the whole file)
# --build      a build directory to reuse for ARCH (configured Release);
#              otherwise build-insn/ARCH is configured and built here.
# The input defaults to the demo recording; the default and portable runs of
# each mode must give the same output, or the command fails.
set -euo pipefail
cd "$(dirname "$0")/.."
src=$PWD

frames=100
archs=x86-64,armv7,aarch64
input=tools/demo/allison-congrats.wav
declare -A builds=()
while [ $# -gt 0 ]; do
    case $1 in
        --frames) frames=$2; shift 2 ;;
        --arch) archs=$2; shift 2 ;;
        --input) input=$2; shift 2 ;;
        --build) builds[${2%%=*}]=${2#*=}; shift 2 ;;
        *) echo "usage: $0 [--frames N] [--arch LIST] [--input FILE.wav] [--build ARCH=DIR]..." >&2
           exit 2 ;;
    esac
done
input=$(cd "$(dirname "$input")" && pwd)/$(basename "$input")
work=$src/build-insn
mkdir -p "$work"

# Library and driver for one architecture: sets loop (the driver) and run
# (the command prefix that executes target programs).
prepare() {
    local arch=$1 toolchain= cc=cc sysroot=
    case $arch in
        x86-64) ;;
        armv7) toolchain=cmake/armhf.cmake; cc="arm-linux-gnueabihf-gcc -march=armv7-a -mfpu=neon -mfloat-abi=hard"
               sysroot=/usr/arm-linux-gnueabihf ;;
        aarch64) toolchain=cmake/aarch64.cmake; cc="aarch64-linux-gnu-gcc -march=armv8-a"
                 sysroot=/usr/aarch64-linux-gnu ;;
        *) echo "unknown architecture $arch" >&2; exit 2 ;;
    esac
    local dir=${builds[$arch]:-$work/$arch}
    if [ ! -f "$dir/CMakeCache.txt" ]; then
        cmake -S "$src" -B "$dir" -DCMAKE_BUILD_TYPE=Release -DVAMRNB_BUILD_TESTS=OFF \
            -DVAMRNB_BUILD_TOOL=OFF ${toolchain:+-DCMAKE_TOOLCHAIN_FILE=$src/$toolchain} >/dev/null
    fi
    cmake --build "$dir" -j2 --target vamrnb_static >/dev/null
    loop=$work/insn_loop-$arch
    $cc -std=c11 -O2 -g -I"$src/include" -o "$loop" "$src/bench/insn_loop.c" \
        "$dir/libvamrnb.a" -lstdc++ -lm
    case $arch in
        x86-64) run=() ;;
        armv7) run=(qemu-arm -L "$sysroot" -plugin "$work/qemu_insn_plugin.so") ;;
        aarch64) run=(qemu-aarch64 -L "$sysroot" -plugin "$work/qemu_insn_plugin.so") ;;
    esac
}

# Instructions per frame of one mode: prints "COUNT CHECKSUM".
measure() {
    local arch=$1 what=$2 mode=$3 out
    if [ "$arch" = x86-64 ]; then
        local fn=vamrnbe_encode
        [ "$what" = dec ] && fn=vamrnbd_decode
        out=$(valgrind --tool=callgrind --toggle-collect="$fn" \
              --callgrind-out-file="$work/callgrind.out" "$loop" "$what" "$mode" "$input" "$frames" \
              2>/dev/null)
        local n
        n=$(awk '/^(summary|totals):/ {print $2; exit}' "$work/callgrind.out")
        echo "$(( n / $(awk '{print $2}' <<<"$out") )) $(awk '{print $4}' <<<"$out")"
    else
        local full dry
        full=$("${run[@]}" "$loop" "$what" "$mode" "$input" "$frames" 2>"$work/qemu.err")
        local a b
        a=$(awk '/^guest_insns/ {print $2}' "$work/qemu.err")
        "${run[@]}" "$loop" "$what" "$mode" "$input" "$frames" dry 2>"$work/qemu.err" >/dev/null
        b=$(awk '/^guest_insns/ {print $2}' "$work/qemu.err")
        echo "$(( (a - b) / $(awk '{print $2}' <<<"$full") )) $(awk '{print $4}' <<<"$full")"
    fi
}

gcc -shared -fPIC -O2 -Wall -Wextra -Werror -o "$work/qemu_insn_plugin.so" \
    "$src/bench/qemu_insn_plugin.c"
modes=(MR475 MR515 MR59 MR67 MR74 MR795 MR102 MR122)
shown=$frames
[ "$frames" -gt 0 ] || shown=all
echo "Instructions per frame, $shown frames of $(basename "$input")"
printf '%-8s %-9s %-6s %10s %11s %9s\n' arch kernels mode encode encode+DTX decode
declare -A sums=()
IFS=, read -ra arch_list <<<"$archs"
for arch in "${arch_list[@]}"; do
    prepare "$arch"
    for level in default portable; do
        if [ $level = portable ]; then export VAMRNB_CPU_FLAGS=0; else unset VAMRNB_CPU_FLAGS; fi
        for mode in 0 1 2 3 4 5 6 7; do
            row=()
            for what in enc dtx dec; do
                result=$(measure "$arch" $what $mode)
                read -r count sum <<<"$result"
                key=$arch/$what/$mode
                if [ -n "${sums[$key]:-}" ] && [ "${sums[$key]}" != "$sum" ]; then
                    echo "$arch $what ${modes[$mode]}: portable output differs from default" >&2
                    exit 1
                fi
                sums[$key]=$sum
                row+=("$count")
            done
            printf '%-8s %-9s %-6s %10d %11d %9d\n' "$arch" $level "${modes[$mode]}" "${row[@]}"
        done
    done
done
unset VAMRNB_CPU_FLAGS
