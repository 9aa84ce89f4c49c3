#!/usr/bin/env bash
# Whole-command figures of the stbplat tool on real-size devices in host
# mode: a 256 MiB NAND (2 KiB pages, 128 KiB blocks, 3 bad blocks) and a
# 4 GiB eMMC, each command's wall time and peak resident memory beside
# cat / dd of the same bytes with a warm page cache. Writes the table into
# docs/performance.md between its flash-commands markers and prints it.
#   bench/flash_commands.sh            (work files in build/bench-flash)
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/deps.sh build tools bench
cmake --preset default >/dev/null
cmake --build --preset default --target stbplat_tool >/dev/null
tool=$PWD/build/default/tools/stbplat
work=$PWD/build/bench-flash
rm -rf "$work" && mkdir -p "$work/root/dev" "$work/root/proc"
root=$work/root

mib=$((1024 * 1024))
nand_size=$((256 * mib)) block=$((128 * 1024)) page=2048 oob=64
emmc_size=$((4096 * mib))
# As nanddump --oob writes a real device: each page's OOB bytes behind it,
# a bad block marked in the first OOB byte of its first page.
python3 - "$root/dev/mtd1" $nand_size $block $page $oob <<'PY'
import os, sys
path, size, block, page, oob = sys.argv[1], *map(int, sys.argv[2:])
bad = {17, 900, size // block - 1}
with open(path, 'wb') as f:
    for b in range(size // block):
        data = os.urandom(block)
        for p in range(block // page):
            marker = b'\x00' if b in bad and p == 0 else b'\xff'
            f.write(data[p * page:(p + 1) * page] + marker + b'\xff' * (oob - 1))
PY
printf 'medium = nand\nwritesize = %d\noobsize = %d\n' $page $oob >"$root/dev/mtd1.ini"
printf 'image = mtd1\noffset = 0\n' >"$root/dev/mtd0.ini"
truncate -s $emmc_size "$root/dev/mmca"
printf 'medium = emmc\nsize = %d\n' $emmc_size >"$root/dev/mmca.ini"
cat >"$root/proc/mtd" <<MTD
dev:    size   erasesize  name
mtd0: $(printf %08x $nand_size) $(printf %08x $block) "flash1.ROOTFS.A"
mtd1: $(printf %08x $nand_size) $(printf %08x $block) "flash1"
MTD
cat >"$root/memory-map.ini" <<MAP
[device NAND0]
technology = NAND....
base = 0
size = $nand_size
[partition NAND0.ROOTFS]
offset = 0
size = $nand_size
[slot NAND0.ROOTFS.A]
offset = 0
size = $nand_size
node = /dev/mtd0
[device EMMC0]
technology = EMMC....
base = 0
size = $emmc_size
[partition EMMC0.APPS]
offset = 0
size = $emmc_size
[slot EMMC0.APPS.A]
offset = 0
size = $((emmc_size / 2))
node = /dev/mmca
MAP
head -c $((200 * mib)) /dev/urandom >"$work/in.bin"

# "seconds kilobytes" of one command.
measure() { /usr/bin/time -f '%e %M' -o "$work/time" "$@" >/dev/null 2>"$work/err" || {
  cat "$work/err" >&2; exit 1; }; cat "$work/time"; }

rows=()
row() {  # label, reference label, bar (peak KiB below, most time ratio or -), command..., --, reference command...
  local label=$1 reflabel=$2 barkib=$3 barratio=$4; shift 4
  local cmd=() ref=()
  while [ "$1" != -- ]; do cmd+=("$1"); shift; done; shift
  ref=("$@")
  local r c
  r=$(measure "${ref[@]}"); r=$(measure "${ref[@]}")   # the second with a warm cache
  c=$(measure "${cmd[@]}")
  read -r cs ck <<<"$c"; read -r rs rk <<<"$r"
  rows+=("$(awk -v l="$label" -v rl="$reflabel" -v cs="$cs" -v ck="$ck" -v rs="$rs" -v rk="$rk" \
    -v bk="$barkib" -v br="$barratio" 'BEGIN {
      ratio = rs > 0 ? cs / rs : 0
      bar = sprintf("peak < %d MiB: %s", bk / 1024, ck < bk ? "met" : "MISSED")
      if (br != "-") bar = bar sprintf("; time <= %s x: %s", br, rs > 0 && ratio <= br ? "met" : "MISSED")
      shown = rs > 0 ? sprintf("%.2f", ratio) : "-"
      printf("| `%s` | %.2f s | %.1f MiB | `%s`: %.2f s, %.1f MiB | %s | %s |", l, cs, ck / 1024, rl, rs, rk / 1024,
        shown, bar) }')")
}

bar=$((32 * 1024))
row "flash read NAND0.ROOTFS.A -o /dev/null (256 MiB slot, 3 bad blocks)" "cat IMAGE > /dev/null" $bar 3 \
  "$tool" --root "$root" flash read NAND0.ROOTFS.A -o /dev/null -- cat "$root/dev/mtd1"
row "flash read NAND0.ROOTFS.A -o out" "cat IMAGE > out" $bar - \
  "$tool" --root "$root" flash read NAND0.ROOTFS.A -o "$work/out" -- sh -c "cat '$root/dev/mtd1' >'$work/out'"
row "flash read EMMC0.APPS.A --length 0x40000000 -o out (1 GiB)" "dd bs=1M count=1024 of=out" $bar 2 \
  "$tool" --root "$root" flash read EMMC0.APPS.A --length 0x40000000 -o "$work/out" -- \
  dd if="$root/dev/mmca" of="$work/out" bs=1M count=1024 status=none
row "flash write NAND0.ROOTFS.A in.bin --erase --verify --yes (200 MiB)" "cat in.bin > /dev/null" $bar - \
  "$tool" --root "$root" flash write NAND0.ROOTFS.A "$work/in.bin" --erase --verify --yes -- cat "$work/in.bin"
cmp <("$tool" --root "$root" flash read NAND0.ROOTFS.A --length $((200 * mib)) -o -) "$work/in.bin"

table=$(printf '%s\n' "Host mode, $(date -u '+%Y-%m-%d %H:%M UTC'), commit $(git rev-parse --short HEAD):" "" \
  "| Command | Time | Peak memory | Reference (same bytes, warm cache) | Ratio | Bars |" \
  "|---|---|---|---|---|---|" "${rows[@]}")
printf '%s\n' "$table"
python3 - "$table" <<'PY'
import re, sys
path = 'docs/performance.md'
text = open(path).read()
begin, end = '<!-- flash-commands:begin -->', '<!-- flash-commands:end -->'
block = begin + '\n' + sys.argv[1] + '\n' + end
text = re.sub(re.escape(begin) + '.*?' + re.escape(end), lambda m: block, text, flags=re.S) if begin in text \
    else text.rstrip('\n') + '\n\n## Flash commands on real-size devices\n\n' + block + '\n'
open(path, 'w').write(text)
PY
[ -n "${STBPLAT_BENCH_KEEP:-}" ] || rm -rf "$work"
