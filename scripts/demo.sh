#!/usr/bin/env bash
# The main job: the stbplat tool on the bundled example device
# (examples/device): the boot-loader information record, decoded by the
# library's readers, then checked byte by byte.
set -euo pipefail
build=${1:-build/default}
stbplat=$build/tools/stbplat
device=examples/device
run() {
  printf '$ stbplat %s\n' "$*"
  "$stbplat" "$@"
  echo
}
run record show "$device/dev/mtd8" --at 0x10000
run record check "$device/dev/mtd8" --at 0x10000
