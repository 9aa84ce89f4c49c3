#!/usr/bin/env bash
# Size of the device library as shipped: the AArch64 build (-O2) of
# libstbplat.so, stripped (a copy; the build keeps its symbols).
#   bench/libsize.sh
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/deps.sh build cross
cmake --preset aarch64 >/dev/null
cmake --build --preset aarch64 --target stbplat >/dev/null
lib=$(readlink -f build/aarch64/libstbplat.so)
copy=build/aarch64/libstbplat.stripped.so
aarch64-linux-gnu-strip -o "$copy" "$lib"
echo "libstbplat.so (AArch64, -O2, stripped): $(stat -c %s "$copy") bytes" \
     "($(stat -c %s "$lib") unstripped)"
# The file size includes the padding that aligns its two load segments to
# 64 KiB pages; the loaded text and data are:
aarch64-linux-gnu-size "$copy" | awk 'NR == 2 {
  printf "  text %d, data %d, bss %d bytes\n", $1, $2, $3 }'
