#!/usr/bin/env bash
# `stbplat run` as the tool sets it up, without the tool (builds without the
# tool run this too): a program built against libstbplat.so, started with the
# preload library and STBPLAT_ROOT, raises a NAND slot's version on a copy of
# the example device, and a second start reads what the first stored. Started
# without the preload, the same program does not see the copy. An emulator
# (qemu-aarch64 for the device build) gets the preload for its guest only.
#   check-run-preload.sh PRELOAD PROGRAM EXAMPLE_DEVICE [EMULATOR ARGS...]
set -euo pipefail
preload=$1 program=$2 example=$3
shift 3
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cp -r "$example" "$work/device"
export STBPLAT_ROOT=$work/device STBPLAT_LOG_LEVEL=0
unset STBPLAT_MEMORY_MAP LD_PRELOAD

rewrite() {
  if [ $# -gt 0 ]; then
    QEMU_SET_ENV=LD_PRELOAD=$preload "$@" "$program" NAND0 KERNEL A
  else
    LD_PRELOAD=$preload "$program" NAND0 KERNEL A
  fi
}
expect() {
  [ "$2" = "$1" ] || { echo "check-run-preload: expected '$1', the program printed '$2'" >&2; exit 1; }
}

status=0
"$@" "$program" NAND0 KERNEL A >/dev/null 2>&1 || status=$?
[ "$status" = 1 ] || { echo "check-run-preload: without the preload the program exited $status, not 1" >&2; exit 1; }
cmp -s "$example/dev/mtd7" "$work/device/dev/mtd7" || { echo "check-run-preload: the copy changed" >&2; exit 1; }
expect "5.15a -> 5.16a" "$(rewrite "$@")"
expect "5.16a -> 5.17a" "$(rewrite "$@")"
echo "check-run-preload: the program rewrote the copy's record twice through the preload"
