# The x86-64 guest: the host's own Debian kernel and programs, on q35.
# Sourced by run.sh; see arch-aarch64.sh for the other side of each name.
build=${STBPLAT_SYSTEM_BUILD:-$root/build/system}
cmake_args=(-DCMAKE_CXX_COMPILER=g++ -DCMAKE_C_COMPILER=gcc)
sysroot=""
results_port=ttyS1
console_port=ttyS0
# Reserved on the kernel line below; /dev/mem reaches it.
sdram_base=0x30000000

arch_deps() { "$root/scripts/deps.sh" build tools system; }

arch_kernel() {  # sets kver and kernel
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
}

# The shared libraries a program loads (the dynamic loader included), as
# host paths; each goes to the same path in the guest.
arch_libs() {
  ldd "$1" 2>/dev/null | awk '/=> \//{print $3} /^[ \t]*\/.*ld-linux/{print $1}'
}
arch_lib_dest() { echo "$1"; }

arch_program() { command -v "$1"; }

arch_qemu() {  # sets qemu: the command line without the virtio disks
  qemu=(qemu-system-x86_64 -machine q35 -accel tcg -cpu max -m 1024 -smp 1 \
    -nodefaults -display none -no-reboot \
    -kernel "$kernel" -initrd "$vm/initramfs.gz" \
    -append "console=$console_port memmap=1M\$$sdram_base panic=-1 loglevel=4" \
    -serial "file:$console" -serial "file:$results" \
    -drive if=none,id=hdd,file="$vm/hdd.img",format=raw \
    -device ide-hd,drive=hdd,bus=ide.0,model=ST1000DM003-1SB102,serial=Z9A0SYS1)
}

# The tool as the host runs it (host_checks.sh).
host_tool=("$build/tools/stbplat")
