# The AArch64 guest: Debian's arm64 kernel, busybox, mtd-utils, hdparm and
# smartctl unpacked from their packages (scripts/fetch-arm64-guest.sh), the
# flash simulators that kernel leaves out built as modules from Debian's
# source (scripts/build-flash-modules.sh), and the project cross-built for
# the device, on qemu's virt machine.
# Sourced by run.sh; see arch-x86_64.sh for the other side of each name.
build=${STBPLAT_SYSTEM_BUILD:-$root/build/system-aarch64}
cmake_args=(-DCMAKE_TOOLCHAIN_FILE="$root/cmake/toolchain-aarch64.cmake")
cross=/usr/aarch64-linux-gnu
sysroot=$root/build/arm64-guest/root
# virt has one PL011; the results go to a virtio console instead.
results_port=hvc0
console_port=ttyAMA0
# RAM runs from 0x40000000 (1 GiB here); mem= leaves the kernel the first
# 768 MiB, so the top is not System RAM and /dev/mem may reach it.
sdram_base=0x70000000

arch_deps() {
  "$root/scripts/deps.sh" build tools system cross
  "$root/scripts/deps.sh" system-arm64
  kver=$("$root/scripts/fetch-arm64-guest.sh" "$root/build/arm64-guest")
  "$root/scripts/build-flash-modules.sh" "$sysroot" "$kver" arm64 aarch64-linux-gnu
}

arch_kernel() {  # sets kver and kernel (kver came with the packages)
  kernel=$sysroot/boot/vmlinuz-$kver
  # The packages ship no module index.
  [ -f "$sysroot/lib/modules/$kver/modules.dep" ] || depmod -b "$sysroot" "$kver"
}

# The shared libraries a program loads, found by their DT_NEEDED names in
# the build, the unpacked packages and the cross toolchain's tree.
arch_libs() {
  local seen=" " queue=("$1") f lib dir found interp
  interp=$(aarch64-linux-gnu-readelf -l "$1" | sed -n 's/.*program interpreter: \(.*\)]/\1/p')
  [ -n "$interp" ] && echo "$cross/lib/$(basename "$interp")"
  while [ ${#queue[@]} -gt 0 ]; do
    f=${queue[0]}
    queue=("${queue[@]:1}")
    for lib in $(aarch64-linux-gnu-readelf -d "$f" | sed -n 's/.*(NEEDED).*\[\(.*\)\]/\1/p'); do
      case "$seen" in *" $lib "*) continue ;; esac
      seen="$seen$lib "
      found=""
      for dir in "$build" "$sysroot/lib/aarch64-linux-gnu" "$sysroot/usr/lib/aarch64-linux-gnu" "$cross/lib"; do
        [ -e "$dir/$lib" ] && { found="$dir/$lib"; break; }
      done
      [ -n "$found" ] || { echo "run.sh: $lib (needed by $f) not found" >&2; continue; }
      echo "$found"
      queue+=("$found")
    done
  done
}
arch_lib_dest() {
  case "$1" in
    */ld-linux-*) echo "/lib/$(basename "$1")" ;;
    *) echo "/lib/aarch64-linux-gnu/$(basename "$1")" ;;
  esac
}

arch_program() {
  local d
  for d in usr/sbin sbin usr/bin bin; do
    [ -x "$sysroot/$d/$1" ] && { echo "$sysroot/$d/$1"; return 0; }
  done
  return 1
}

arch_qemu() {  # sets qemu: the command line without the virtio disks
  qemu=(qemu-system-aarch64 -machine virt -accel tcg -cpu max,pauth-impdef=on -m 1024 -smp 1 \
    -nodefaults -display none -no-reboot \
    -kernel "$kernel" -initrd "$vm/initramfs.gz" \
    -append "console=$console_port mem=768M panic=-1 loglevel=4" \
    -serial "file:$console" \
    -device virtio-serial-pci -chardev file,id=results,path="$results" \
    -device virtconsole,chardev=results \
    -device ich9-ahci,id=ahci \
    -drive if=none,id=hdd,file="$vm/hdd.img",format=raw \
    -device ide-hd,drive=hdd,bus=ahci.0,model=ST1000DM003-1SB102,serial=Z9A0SYS1)
}

host_tool=(qemu-aarch64 -L "$cross" "$build/tools/stbplat")
