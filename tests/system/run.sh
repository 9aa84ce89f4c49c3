#!/usr/bin/env bash
# System tests: boots a Debian kernel under qemu with a busybox initramfs
# holding the guest test programs, simulated NAND (nandsim) and NOR (mtdram)
# flash, an AHCI hard disk, USB storage and a virtio disk standing in for the
# eMMC, then
# turns the guest's result lines into this script's result.
#
# Usage: tests/system/run.sh            (from anywhere)
# Environment:
#   STBPLAT_SYSTEM_ARCH     x86_64 (default: the host's kernel on q35) or
#                           aarch64 (Debian's arm64 kernel on virt, with the
#                           device build); see arch-*.sh
#   STBPLAT_SYSTEM_TIMEOUT  seconds before a hung guest is killed (default 600)
#   STBPLAT_SYSTEM_BUILD    build directory (default build/system, or
#                           build/system-aarch64)
#   STBPLAT_SYSTEM_ONLY     space-separated scenario names to run (default all)
#   STBPLAT_SYSTEM_KVER     x86_64: kernel version under /lib/modules (default
#                           the newest one that has a /boot/vmlinuz)
set -euo pipefail

here=$(cd "$(dirname "$0")" && pwd)
root=$(cd "$here/../.." && pwd)
arch=${STBPLAT_SYSTEM_ARCH:-x86_64}
[ -f "$here/arch-$arch.sh" ] || { echo "run.sh: no guest for architecture $arch" >&2; exit 2; }
# shellcheck source=arch-x86_64.sh
. "$here/arch-$arch.sh"
bound=${STBPLAT_SYSTEM_TIMEOUT:-600}
start=$(date +%s)

arch_deps

# --- Build the library and the guest programs ------------------------------
cmake -S "$root" -B "$build" -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo "${cmake_args[@]}" \
  -DSTBPLAT_BUILD_TESTS=OFF -DSTBPLAT_BUILD_TOOLS=ON \
  -DSTBPLAT_BUILD_SYSTEM_TESTS=ON >/dev/null
cmake --build "$build" -j2 --target stbplat_systest stbplat_tool
guest_bin="$build/tests/system/stbplat_systest"
tool_bin="$build/tools/stbplat"

# --- Kernel -------------------------------------------------------------------
arch_kernel
[ -r "$kernel" ] || { echo "run.sh: cannot read $kernel" >&2; exit 2; }

# --- Initramfs ------------------------------------------------------------------
vm="$build/vm"
rm -rf "$vm/root"
mkdir -p "$vm/root"
rootfs="$vm/root"
mkdir -p "$rootfs"/{bin,sbin,etc,proc,sys,dev,tmp,run,realdev,usr/bin,usr/sbin,var/lib/smartmontools/drivedb}

# Copies a file into the initramfs at a path (by default its own),
# following symbolic links so the soname path holds the real library.
put() {
  local dest=${2:-$1}
  mkdir -p "$rootfs$(dirname "$dest")"
  cp -L "$1" "$rootfs$dest"
}

# A program (at its path below the packages' root) and every shared library
# it loads; the project's own libraries go to /opt/stbplat/lib (the build
# tree may lie under /tmp, which the guest mounts over).
put_program() {
  put "$1" "${2:-$1}"
  arch_libs "$1" | while read -r lib; do
    case "$lib" in
      "$build"/*) put "$lib" "/opt/stbplat/lib/$(basename "$lib")" ;;
      *) put "$lib" "$(arch_lib_dest "$lib")" ;;
    esac
  done
}

put "$(arch_program busybox)" /bin/busybox
for tool in nanddump nandwrite flash_erase mtdinfo mtdpart hdparm smartctl; do
  path=$(arch_program "$tool")
  put_program "$path" "${path#"$sysroot"}"
done
put_program "$guest_bin" /opt/stbplat/systest
put_program "$tool_bin" /opt/stbplat/bin/stbplat

# smartctl's drive database: the packaged one, plus a local entry for the
# emulated disk's model (see init.sh for why).
for db in /var/lib/smartmontools/drivedb/drivedb.h /usr/share/smartmontools/drivedb.h; do
  [ -f "$sysroot$db" ] && put "$sysroot$db" "$db"
done
cp "$here/smart_drivedb.h" "$rootfs/etc/smart_drivedb.h"

# Kernel modules with their dependencies, in load order. moddeps lists, per
# module, the files to insmod (dependencies first).
modules="mtd mtdram nandsim ahci sd_mod sg virtio_pci virtio_blk virtio_console xhci_pci ehci_pci usb_storage"
: >"$rootfs/etc/moddeps"
for m in $modules; do
  files=""
  while read -r verb path _; do
    [ "$verb" = insmod ] || continue
    dest="/lib/modules/$kver/$(basename "${path%.xz}")"
    mkdir -p "$rootfs/lib/modules/$kver"
    case "$path" in
      *.xz) xz -dc "$path" >"$rootfs$dest" ;;
      *.zst) zstd -qdc "$path" >"$rootfs$dest" ;;
      *) cp "$path" "$rootfs$dest" ;;
    esac
    files="$files $dest"
  done < <(modprobe --show-depends ${sysroot:+-d "$sysroot"} -S "$kver" "$m" 2>/dev/null)
  [ -n "$files" ] || modprobe --show-depends ${sysroot:+-d "$sysroot"} -S "$kver" "$m" 2>/dev/null |
    grep -q '^builtin ' || { echo "run.sh: kernel $kver has no module $m" >&2; exit 2; }
  echo "$m:$files" >>"$rootfs/etc/moddeps"
done

# The box's memory map (devices, partitions, slots) for the platform
# library, matching the partition table init.sh presents.
sed "s/0x30000000/$sdram_base/" "$here/memory-map.ini" >"$rootfs/etc/memory-map.ini"
# What the guest's init needs to know of this machine.
cat >"$rootfs/etc/systest-env" <<ENV
RESULTS_PORT=$results_port
SDRAM_BASE=$sdram_base
ENV
cp "$here/init.sh" "$rootfs/init"
cp "$here/scenarios.sh" "$rootfs/etc/scenarios.sh"
chmod +x "$rootfs/init"
echo "${STBPLAT_SYSTEM_ONLY:-}" >"$rootfs/etc/systest-only"
(cd "$rootfs" && find . | cpio -o -H newc --quiet) | gzip -1 >"$vm/initramfs.gz"

# --- Disks -------------------------------------------------------------------------
# xfer.img carries files out of the guest: a tar archive written over the
# raw disk (see the tool scenarios). stick.img is a USB stick (on the xHCI
# controller); the EHCI controller holds a card-reader slot with no card in
# it (a removable usb-storage device with no medium).
rm -f "$vm/hdd.img" "$vm/emmc.img" "$vm/xfer.img" "$vm/stick.img"
truncate -s 256M "$vm/hdd.img"
truncate -s 16M "$vm/stick.img"
truncate -s 64M "$vm/emmc.img"
truncate -s 16M "$vm/xfer.img"

# --- Boot ------------------------------------------------------------------------------
console="$vm/console.log"
results="$vm/results.txt"
: >"$console"
: >"$results"
echo "run.sh: booting $kernel (log: $console)"
boot_start=$(date +%s)
set +e
arch_qemu
timeout -k 10 "$bound" "${qemu[@]}" \
  -drive if=none,id=emmc,file="$vm/emmc.img",format=raw \
  -device virtio-blk-pci,drive=emmc \
  -drive if=none,id=xfer,file="$vm/xfer.img",format=raw \
  -device virtio-blk-pci,drive=xfer \
  -device qemu-xhci,id=xhci \
  -drive if=none,id=stick,file="$vm/stick.img",format=raw \
  -device usb-storage,bus=xhci.0,drive=stick,serial=STICK0001 \
  -device usb-ehci,id=ehci \
  -drive if=none,id=slot \
  -device usb-storage,bus=ehci.0,drive=slot,removable=on,serial=SLOT0001
qemu_rc=$?
set -e
end=$(date +%s)

# --- Results ---------------------------------------------------------------------------
# The guest writes "PASS <name>", "FAIL <name>: <why>", "INFO <text>" and a
# final "DONE" to its second serial port.
tr -d '\r' <"$results" >"$results.clean"
"$here/host_checks.sh" "$vm/xfer.img" "$here/memory-map.ini" "${host_tool[@]}" >>"$results.clean"
grep '^INFO ' "$results.clean" | sed 's/^INFO /  /' || true
grep -E '^(PASS|FAIL) ' "$results.clean" || true
passed=$(grep -c '^PASS ' "$results.clean" || true)
failed=$(grep -c '^FAIL ' "$results.clean" || true)
if [ "$qemu_rc" -eq 124 ] || [ "$qemu_rc" -eq 137 ]; then
  echo "FAIL vm: guest killed after ${bound}s (see $console)"
  failed=$((failed + 1))
elif ! grep -qx 'DONE' "$results.clean"; then
  echo "FAIL vm: guest stopped before finishing (qemu exit $qemu_rc, see $console)"
  failed=$((failed + 1))
fi
if [ "$passed" -eq 0 ] && [ "$failed" -eq 0 ]; then
  echo "FAIL vm: no results"
  failed=1
fi
echo "run.sh: $arch guest ran $((end - boot_start))s, whole run $((end - start))s"
echo "$passed passed, $failed failed"
[ "$failed" -eq 0 ]
