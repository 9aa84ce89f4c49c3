#!/usr/bin/env bash
# The main job: the stbplat tool on the bundled example device
# (examples/device, emulated from its files with --root): the picture of its
# storage, then the boot-loader information record read from its NOR slot
# through the library's flash layer and decoded by the library's readers,
# and its first bytes as a hex dump.
set -euo pipefail
build=${1:-build/default}
stbplat=$build/tools/stbplat
device=examples/device
run() {
  printf '$ stbplat %s\n' "$*"
  "$stbplat" "$@"
  echo
}
run --root "$device" map
run --root "$device" record show NOR0.FSBLINFO.A
# The same record's first bytes as stored in the NOR image.
run hexdump --offset 65536 --length 64 "$device/dev/mtd8"
