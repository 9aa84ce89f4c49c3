#!/usr/bin/env bash
# Checks run on the host after the guest stopped, on files the guest left
# on the transfer disk. Prints result lines like the guest's ("PASS name",
# "FAIL name: why", "INFO text").
#
# tool.dump_in_host_mode: the guest's nanddump --oob image of KERNEL.B
# (mtd10, a factory-bad block) read in host mode must give the very bytes
# NANDRead gave on the device.
# Usage: host_checks.sh XFER_IMAGE MEMORY_MAP TOOL_COMMAND...
set -uo pipefail
xfer=$1 map=$2
shift 2
tool=("$@")
work=$(dirname "$xfer")/xfer
rm -rf "$work"
mkdir -p "$work"
# Nothing on the disk: the scenario did not run (STBPLAT_SYSTEM_ONLY).
tar -xf "$xfer" -C "$work" 2>/dev/null || exit 0
[ -f "$work/mtd10.oob" ] || exit 0

name=tool.dump_in_host_mode
root=$work/root
mkdir -p "$root/proc" "$root/dev"
cp "$map" "$root/memory-map.ini"
{ echo "dev:    size   erasesize  name"; cat "$work/mtd10.row"; } >"$root/proc/mtd"
cp "$work/mtd10.oob" "$root/dev/mtd10"
printf 'medium = nand\nwritesize = 2048\noobsize = 64\n' >"$root/dev/mtd10.ini"

if ! "${tool[@]}" --root "$root" flash read NAND0.KERNEL.B -o "$work/host.read" 2>"$work/host.err"; then
  echo "FAIL $name: host-mode read failed: $(head -c 300 "$work/host.err" | tr '\n' ' ')"
  exit 0
fi
if ! cmp -s "$work/host.read" "$work/guest.read"; then
  echo "FAIL $name: host-mode read differs from the guest's NANDRead ($(cmp "$work/host.read" "$work/guest.read" 2>&1 | head -1))"
  exit 0
fi
"${tool[@]}" --root "$root" mtd list | grep '^mtd10 ' >"$work/host.mtdlist"
if ! cmp -s "$work/host.mtdlist" "$work/guest.mtdlist"; then
  echo "FAIL $name: mtd list rows differ: host '$(cat "$work/host.mtdlist")', guest '$(cat "$work/guest.mtdlist")'"
  exit 0
fi
echo "INFO host mode read $(stat -c %s "$work/host.read") bytes of the guest's KERNEL.B dump, as NANDRead did"
echo "PASS $name"
