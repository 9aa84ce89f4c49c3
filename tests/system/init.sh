#!/bin/busybox sh
# Guest init of the system tests. Sets up the flash simulators, the device
# nodes and the partition table the library expects on the set-top box,
# runs the scenarios and powers off. Results go to the second serial port,
# one line each: "PASS <name>", "FAIL <name>: <why>", "INFO <text>", and
# "DONE" at the end.
/bin/busybox --install -s /bin
export PATH=/bin:/sbin:/usr/bin:/usr/sbin
mount -t proc proc /proc
mount -t sysfs sys /sys
mount -t devtmpfs dev /realdev
mount -t tmpfs tmp /tmp
mount -t tmpfs dev /dev
mkdir -p /dev/pts /dev/shm

# /dev is our own: links to the kernel's nodes, except the MTD nodes, which
# follow the device's numbering (see make_table).
for n in null zero full random urandom console tty kmsg mem ttyS0 ttyS1 \
         ttyAMA0 hvc0 sda sdb sdc sdd sde sg0 sg1 sg2 sg3 sg4 vda; do
  ln -s /realdev/$n /dev/$n
done
# The eMMC of the box is /dev/mmca; here it is the virtio disk.
ln -s /realdev/vda /dev/mmca

# RESULTS_PORT (the second serial port or a virtio console) and SDRAM_BASE
# (physical memory the kernel leaves to /dev/mem) depend on the machine.
. /etc/systest-env
export STBPLAT_SYSTEST_SDRAM=$SDRAM_BASE
RESULTS=/dev/$RESULTS_PORT
export STBPLAT_SYSTEST_RESULTS=$RESULTS
GUEST=/opt/stbplat/systest
export LD_LIBRARY_PATH=/opt/stbplat/lib
[ -f /etc/memory-map.ini ] && export STBPLAT_MEMORY_MAP=/etc/memory-map.ini
ONLY=$(cat /etc/systest-only)
KVER=$(uname -r)

say() { echo "$*" >"$RESULTS"; echo "systest: $*"; }
pass() { say "PASS $1"; }
fail() { say "FAIL $1: $2"; }
info() { say "INFO $*"; }
want() {
  [ -z "$ONLY" ] && return 0
  for w in $ONLY; do [ "$w" = "$1" ] && return 0; done
  return 1
}

# ---- Modules ----------------------------------------------------------------
load() {  # load <module> [params...]
  m=$1; shift
  files=$(sed -n "s/^$m://p" /etc/moddeps)
  last=""
  for f in $files; do last=$f; done
  for f in $files; do
    name=$(basename "$f" .ko | tr - _)
    [ -d /sys/module/$name ] && continue
    if [ "$f" = "$last" ]; then
      insmod "$f" "$@" || { echo "insmod $f $* failed"; return 1; }
    else
      insmod "$f" || { echo "insmod $f failed"; return 1; }
    fi
  done
}

# ---- Flash layout -------------------------------------------------------------
# The box's table: NOR partitions first (mtd0-7), the whole NOR chip as mtd8,
# then the NAND partitions. Each row: box number, kernel name, box name, and
# "ro" for a read-only partition (the boot loader's, as on the box): its node
# is the kernel's read-only one, which refuses an open for writing (EACCES).
NAND_PARTS=16,16,64,32
NAND_ID=0x20,0xaa,0x00,0x15
LAYOUT="
0|flash0.BOOT.A|flash0.BOOT.A|ro
1|flash0.BOOT.B|flash0.BOOT.B
2|flash0.CFG.A|flash0.CFG.A
3|flash0.CFG.B|flash0.CFG.B
4|flash0.SPLASH.A|flash0.SPLASH.A
5|flash0.SPLASH.B|flash0.SPLASH.B
6|flash0.NVRAM.A|flash0.NVRAM.A
7|flash0.NVRAM.B|flash0.NVRAM.B
8|mtdram test device|flash0
9|NAND simulator partition 0|flash1.KERNEL.A
10|NAND simulator partition 1|flash1.KERNEL.B
11|NAND simulator partition 2|flash1.ROOTFS.A
12|NAND simulator partition 3|flash1.DATA.A
13|NAND simulator partition 4|flash1.USER.A
14|block:vda|EMMC0.APPS.A
"
# eMMC partitions share the table; on the box their nodes are block devices.
EMMC_UNIT=0x80000
NOR_PART_SIZE=0x80000

real_mtd() {  # real_mtd <kernel name> -> N of the kernel's mtdN
  for d in /sys/class/mtd/mtd*; do
    case "$d" in *ro) continue ;; esac
    [ "$(cat "$d/name")" = "$1" ] && { basename "$d" | sed 's/^mtd//'; return 0; }
  done
  return 1
}

make_table() {
  rm -f /dev/mtd[0-9]* /tmp/fake_mtd.new
  echo "dev:    size   erasesize  name" >/tmp/fake_mtd.new
  echo "$LAYOUT" | while IFS='|' read -r box kname bname access; do
    [ -n "$box" ] || continue
    case "$kname" in
      block:*)
        b=${kname#block:}
        [ -e /sys/class/block/$b/dev ] || { echo "no block device $b"; continue; }
        dev=$(cat /sys/class/block/$b/dev)
        mknod /dev/mtd$box b "${dev%%:*}" "${dev##*:}"
        printf 'mtd%d: %08x %08x "%s"\n' "$box" $(($(cat /sys/class/block/$b/size) * 512)) \
          $((EMMC_UNIT)) "$bname" >>/tmp/fake_mtd.new
        continue ;;
    esac
    r=$(real_mtd "$kname") || { echo "no kernel MTD named '$kname'"; continue; }
    size=$(cat /sys/class/mtd/mtd$r/size)
    erase=$(cat /sys/class/mtd/mtd$r/erasesize)
    dev=$(cat /sys/class/mtd/mtd$r/dev)
    minor=${dev##*:}
    [ "$access" = ro ] && minor=$((minor + 1))  # mtdNro
    mknod /dev/mtd$box c "${dev%%:*}" "$minor"
    printf 'mtd%d: %08x %08x "%s"\n' "$box" "$size" "$erase" "$bname" >>/tmp/fake_mtd.new
  done
  # Rewrite in place: /proc/mtd is bound to this very file.
  cat /tmp/fake_mtd.new >/tmp/fake_mtd
}

setup_nor() {
  load mtdram total_size=4096 erase_size=64 || return 1
  whole=$(real_mtd "mtdram test device") || return 1
  i=0
  for p in BOOT.A BOOT.B CFG.A CFG.B SPLASH.A SPLASH.B NVRAM.A NVRAM.B; do
    mtdpart add /realdev/mtd$whole flash0.$p $((i * NOR_PART_SIZE)) $((NOR_PART_SIZE)) || return 1
    i=$((i + 1))
  done
}

# nand_load [extra nandsim parameters]: (re)loads the NAND simulator with the
# box's partitions plus the given faults, and rebuilds the table.
nand_load() {
  [ -d /sys/module/nandsim ] && rmmod nandsim
  load nandsim id_bytes=$NAND_ID parts=$NAND_PARTS "$@" || return 1
  make_table
}

# ---- Start-up -------------------------------------------------------------------
echo "systest: kernel $KVER"
# The USB stick is found before the AHCI driver loads, so it is sda (sg0) and
# the disk sdb (sg1): a stick plugged in at boot can take a lower letter
# than the disk on the box too. The card-reader slot's controller (ehci_pci)
# is loaded by the scenarios that want it.
for m in virtio_pci virtio_console xhci_pci usb_storage sd_mod sg virtio_blk mtd; do load $m; done
wait_for() { for _ in $(seq 1 50); do [ -e "$1" ] && return 0; sleep 0.2; done; return 1; }
wait_for /realdev/$RESULTS_PORT
stty -F /realdev/$RESULTS_PORT raw -echo 2>/dev/null
wait_for /realdev/sda || fail setup "no USB stick"
load ahci
setup_nor || fail setup "NOR simulator"
: >/tmp/fake_mtd
mount --bind /tmp/fake_mtd /proc/mtd
# Blocks bad from the factory: KERNEL.A block 2, KERNEL.B block 4,
# ROOTFS.A block 8, DATA.A block 4.
BAD_AT_LOAD=2,20,40,100
# Disk nodes appear asynchronously once the controllers probed.
wait_for /realdev/sdb && wait_for /realdev/vda || fail setup "no disk"
nand_load badblocks=$BAD_AT_LOAD || fail setup "NAND simulator"
cat /proc/mtd

# ---- Scenarios --------------------------------------------------------------------
# run_guest <name> [seconds]: one scenario of the guest program, in its own
# process, killed after the seconds given (default 120).
run_guest() {
  want "$1" || return 0
  timeout "${2:-120}" "$GUEST" "$1"
  rc=$?
  [ $rc -gt 1 ] && fail "$1" "guest program exited with status $rc"
  return 0
}

. /etc/scenarios.sh

info "guest uptime $(cut -d' ' -f1 /proc/uptime)s"
say DONE
sync
poweroff -f
