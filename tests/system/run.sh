#!/usr/bin/env bash
# System tests: boots the distribution kernel under qemu with a busybox
# initramfs holding the guest test programs, simulated NAND (nandsim) and NOR
# (mtdram) flash, an AHCI hard disk and a virtio disk standing in for the
# eMMC, then turns the guest's result lines into this script's result.
#
# Usage: tests/system/run.sh            (from anywhere)
# Environment:
#   STBPLAT_SYSTEM_TIMEOUT  seconds before a hung guest is killed (default 600)
#   STBPLAT_SYSTEM_BUILD    build directory (default build/system)
#   STBPLAT_SYSTEM_ONLY     space-separated scenario names to run (default all)
#   STBPLAT_SYSTEM_KVER     kernel version under /lib/modules (default newest
#                           one that has a /boot/vmlinuz)
set -euo pipefail

here=$(cd "$(dirname "$0")" && pwd)
root=$(cd "$here/../.." && pwd)
build=${STBPLAT_SYSTEM_BUILD:-$root/build/system}
bound=${STBPLAT_SYSTEM_TIMEOUT:-600}
start=$(date +%s)

"$root/scripts/deps.sh" build tools system

# --- Build the library and the guest programs ------------------------------
cmake -S "$root" -B "$build" -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo \
  -DCMAKE_CXX_COMPILER=g++ -DCMAKE_C_COMPILER=gcc \
  -DSTBPLAT_BUILD_TESTS=OFF -DSTBPLAT_BUILD_TOOLS=ON \
  -DSTBPLAT_BUILD_SYSTEM_TESTS=ON >/dev/null
cmake --build "$build" -j2 --target stbplat_systest stbplat_tool
guest_bin="$build/tests/system/stbplat_systest"
tool_bin="$build/tools/stbplat"

# --- Kernel -------------------------------------------------------------------
if [ -n "${STBPLAT_SYSTEM_KVER:-}" ]; then
  kver=$STBPLAT_SYSTEM_KVER
else
  kver=""
  for k in $(ls /lib/modules | sort -V); do
    [ -f "/boot/vmlinuz-$k" ] && kver=$k
  done
fi
[ -n "$kver" ] || { echo "run.sh: no kernel with modules found" >&2; exit 2; }
kernel=/boot/vmlinuz-$kver
[ -r "$kernel" ] || { echo "run.sh: cannot read $kernel" >&2; exit 2; }

# --- Initramfs ------------------------------------------------------------------
vm="$build/vm"
rm -rf "$vm/root"
mkdir -p "$vm/root"
rootfs="$vm/root"
mkdir -p "$rootfs"/{bin,sbin,etc,proc,sys,dev,tmp,run,realdev,usr/bin,usr/sbin,var/lib/smartmontools/drivedb}

# Copies a file into the initramfs under the same absolute path, following
# symbolic links so the soname path holds the real library.
put() {
  mkdir -p "$rootfs$(dirname "$1")"
  cp -L "$1" "$rootfs$1"
}

# A program and every shared library ldd lists for it (the dynamic loader
# included).
put_program() {
  put "$1"
  ldd "$1" 2>/dev/null | awk '/=> \//{print $3} /^[ \t]*\/.*ld-linux/{print $1}' |
    while read -r lib; do put "$lib"; done
}

cp /bin/busybox "$rootfs/bin/busybox"
for tool in nanddump nandwrite flash_erase mtdinfo mtdpart hdparm smartctl; do
  put_program "$(command -v "$tool")"
done
# The guest program, the tool and the project's libraries go to
# /opt/stbplat (the build tree may lie under /tmp, which the guest mounts
# over).
mkdir -p "$rootfs/opt/stbplat/lib" "$rootfs/opt/stbplat/bin"
cp "$guest_bin" "$rootfs/opt/stbplat/systest"
cp "$tool_bin" "$rootfs/opt/stbplat/bin/stbplat"
for program in "$guest_bin" "$tool_bin"; do
  ldd "$program" | awk '/=> \//{print $3} /^[ \t]*\/.*ld-linux/{print $1}' |
    while read -r lib; do
      case "$lib" in
        "$build"/*) cp -L "$lib" "$rootfs/opt/stbplat/lib/$(basename "$lib")" ;;
        *) put "$lib" ;;
      esac
    done
done

# smartctl's drive database: the packaged one, plus a local entry for the
# emulated disk's model (see init.sh for why).
for db in /var/lib/smartmontools/drivedb/drivedb.h /usr/share/smartmontools/drivedb.h; do
  [ -f "$db" ] && put "$db"
done
cp "$here/smart_drivedb.h" "$rootfs/etc/smart_drivedb.h"

# Kernel modules with their dependencies, in load order. moddeps lists, per
# module, the files to insmod (dependencies first).
modules="mtd mtdram nandsim ahci sd_mod sg virtio_pci virtio_blk"
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
  done < <(modprobe --show-depends -S "$kver" "$m")
  echo "$m:$files" >>"$rootfs/etc/moddeps"
done

# The box's memory map (devices, partitions, slots) for the platform
# library, matching the partition table init.sh presents.
[ -f "$here/memory-map.ini" ] && cp "$here/memory-map.ini" "$rootfs/etc/memory-map.ini"
cp "$here/init.sh" "$rootfs/init"
cp "$here/scenarios.sh" "$rootfs/etc/scenarios.sh"
chmod +x "$rootfs/init"
echo "${STBPLAT_SYSTEM_ONLY:-}" >"$rootfs/etc/systest-only"
(cd "$rootfs" && find . | cpio -o -H newc --quiet) | gzip -1 >"$vm/initramfs.gz"

# --- Disks -------------------------------------------------------------------------
# xfer.img carries files out of the guest: a tar archive written over the
# raw disk (see the tool scenarios).
rm -f "$vm/hdd.img" "$vm/emmc.img" "$vm/xfer.img"
truncate -s 256M "$vm/hdd.img"
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
timeout -k 10 "$bound" qemu-system-x86_64 \
  -machine q35 -accel tcg -cpu max -m 1024 -smp 1 \
  -nodefaults -display none -no-reboot \
  -kernel "$kernel" -initrd "$vm/initramfs.gz" \
  -append 'console=ttyS0 memmap=1M$0x30000000 panic=-1 loglevel=4' \
  -serial "file:$console" -serial "file:$results" \
  -drive if=none,id=hdd,file="$vm/hdd.img",format=raw \
  -device ide-hd,drive=hdd,bus=ide.0,model=ST1000DM003-1SB102,serial=Z9A0SYS1 \
  -drive if=none,id=emmc,file="$vm/emmc.img",format=raw \
  -device virtio-blk-pci,drive=emmc \
  -drive if=none,id=xfer,file="$vm/xfer.img",format=raw \
  -device virtio-blk-pci,drive=xfer
qemu_rc=$?
set -e
end=$(date +%s)

# --- Results ---------------------------------------------------------------------------
# The guest writes "PASS <name>", "FAIL <name>: <why>", "INFO <text>" and a
# final "DONE" to its second serial port.
tr -d '\r' <"$results" >"$results.clean"
"$here/host_checks.sh" "$vm/xfer.img" "$tool_bin" "$here/memory-map.ini" >>"$results.clean"
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
echo "run.sh: guest ran $((end - boot_start))s, whole run $((end - start))s"
echo "$passed passed, $failed failed"
[ "$failed" -eq 0 ]
