#!/usr/bin/env bash
# Encodes the bundled recording in all eight modes, decodes each stream back
# to WAV and prints a table of bit rate, file size and coding speed.
# Usage: run_demo.sh VAMRNB_BINARY [OUTPUT_DIR]
set -euo pipefail
tool=${1:?usage: run_demo.sh VAMRNB_BINARY [OUTPUT_DIR]}
here=$(cd "$(dirname "${BASH_SOURCE[0]}")" && pwd)
out=${2:-out/demo}
input="$here/allison-congrats.wav"
mkdir -p "$out"

# The tool's summary line ends in "<N>x real time"; keep N.
rtf() { sed -n 's/.*, \([0-9.]*\)x real time$/\1/p' | tail -1; }

printf '%-6s %9s %10s %12s %12s\n' mode "kbit/s" "bytes" "encode RTF" "decode RTF"
names=(MR475 MR515 MR59 MR67 MR74 MR795 MR102 MR122)
rates=(4.75 5.15 5.90 6.70 7.40 7.95 10.2 12.2)
for i in 0 1 2 3 4 5 6 7; do
  m=${names[$i]}
  name="allison-congrats_$m"
  enc=$("$tool" encode -m "$m" "$input" "$out/$name.amr" 2>&1 | rtf)
  dec=$("$tool" decode "$out/$name.amr" "$out/$name.wav" 2>&1 | rtf)
  size=$(stat -c %s "$out/$name.amr")
  printf '%-6s %9s %10s %11sx %11sx\n' "$m" "${rates[$i]}" "$size" "$enc" "$dec"
done
echo
echo "Encoded streams and decoded WAV files are in $out/"
