# Scenarios of the system tests, sourced by the guest init (init.sh), which
# provides load, nand_load, make_table, want, pass, fail, info, run_guest.
# Box numbering (see LAYOUT in init.sh): mtd0-7 NOR partitions, mtd8 the NOR
# chip, mtd9 KERNEL.A, mtd10 KERNEL.B, mtd11 ROOTFS.A, mtd12 DATA.A,
# mtd13 USER.A.
BLOCK=131072
PAGE=2048

# check <scenario> <description> <command...>: records the first failing
# check of a scenario; scenario_end reports it.
SCEN_FAIL=""
check() {
  s=$1; d=$2; shift 2
  if ! "$@" >/tmp/check.out 2>&1; then
    [ -z "$SCEN_FAIL" ] && SCEN_FAIL="$d"
    echo "check failed: $d"; cat /tmp/check.out
  fi
}
scenario_end() {
  if [ -z "$SCEN_FAIL" ]; then pass "$1"; else fail "$1" "$SCEN_FAIL"; fi
  SCEN_FAIL=""
}
has() { grep -q -- "$1" "$2"; }

# ---- Kernel and mtd-utils only: proves the plumbing ---------------------------
if want smoke.mtd_table; then
  s=smoke.mtd_table
  check $s "table has 15 partitions" test "$(grep -c '^mtd' /proc/mtd)" -eq 15
  check $s "eMMC row" has 'mtd14: 04000000 00080000 "EMMC0.APPS.A"' /proc/mtd
  check $s "eMMC node" test -b /dev/mtd14
  check $s "KERNEL.A row" has 'mtd9: 00200000 00020000 "flash1.KERNEL.A"' /proc/mtd
  check $s "ROOTFS.A row" has 'mtd11: 00800000 00020000 "flash1.ROOTFS.A"' /proc/mtd
  check $s "NOR chip row" has 'mtd8: 00400000 00010000 "flash0"' /proc/mtd
  check $s "NOR partition row" has 'mtd0: 00080000 00010000 "flash0.BOOT.A"' /proc/mtd
  mtdinfo /dev/mtd11 >/tmp/mi 2>&1; cat /tmp/mi
  check $s "mtdinfo type" has 'Type:.*nand' /tmp/mi
  check $s "mtdinfo erase block" has 'Eraseblock size:.*131072 bytes' /tmp/mi
  check $s "mtdinfo page" has 'Minimum input/output unit size:.*2048 bytes' /tmp/mi
  check $s "mtdinfo blocks" has 'Amount of eraseblocks: *64 (8388608 bytes' /tmp/mi
  mtdinfo /dev/mtd8 >/tmp/mi 2>&1
  check $s "mtdinfo NOR chip size" has 'Amount of eraseblocks: *64 (4194304 bytes' /tmp/mi
  scenario_end $s
fi

if want smoke.nand_tools; then
  s=smoke.nand_tools
  # KERNEL.B (mtd10) has block 4 bad from the factory.
  check $s "flash_erase" flash_erase -q /dev/mtd10 0 0
  dd if=/dev/urandom of=/tmp/d bs=$BLOCK count=10 2>/dev/null
  check $s "nandwrite" nandwrite -q -p /dev/mtd10 /tmp/d
  check $s "nanddump" nanddump -q --bb=skipbad -f /tmp/r /dev/mtd10
  check $s "dump skips the bad block" test "$(stat -c %s /tmp/r)" -eq $((15 * BLOCK))
  check $s "data reads back" cmp -n $((10 * BLOCK)) /tmp/d /tmp/r
  nanddump -q --bb=padbad -f /tmp/p /dev/mtd10 2>/dev/null
  dd if=/tmp/p of=/tmp/p4 bs=$BLOCK skip=4 count=1 2>/dev/null
  head -c $BLOCK /dev/zero | tr '\0' '\377' >/tmp/ff
  check $s "bad block dumps as 0xFF" cmp /tmp/p4 /tmp/ff
  scenario_end $s
fi

if want smoke.devmem; then
  s=smoke.devmem
  check $s "write reserved RAM" devmem $SDRAM_BASE 32 0xA5C3F00D
  check $s "read it back" test "$(devmem $SDRAM_BASE 32)" = 0xA5C3F00D
  scenario_end $s
fi

if want smoke.disk_tools; then
  # sda is the USB stick, sdb the disk (see init.sh).
  s=smoke.disk_tools
  hdparm -i /dev/sdb >/tmp/hd 2>&1
  check $s "hdparm model" has 'Model=ST1000DM003-1SB102' /tmp/hd
  smartctl -d ata -A /dev/sdb >/tmp/sm 2>&1
  check $s "smartctl temperature line" has 'Temperature_Celsius' /tmp/sm
  info "smartctl -d ata -A /dev/sdb: $(grep -i temperature /tmp/sm | tr -s ' ')"
  check $s "sdb on ATA" sh -c 'readlink /sys/class/block/sdb | grep -q /ata'
  check $s "sda on USB" sh -c 'readlink /sys/class/block/sda | grep -q /usb'
  scenario_end $s
fi

if want smoke.emmc; then
  s=smoke.emmc
  check $s "mmca size" test "$(blockdev --getsize64 /dev/mmca)" -eq 67108864
  dd if=/dev/urandom of=/tmp/e bs=4096 count=16 2>/dev/null
  check $s "write" dd if=/tmp/e of=/dev/mmca bs=4096 seek=100 conv=fsync
  echo 3 >/proc/sys/vm/drop_caches
  check $s "read back" sh -c 'dd if=/dev/mmca bs=4096 skip=100 count=16 2>/dev/null | cmp - /tmp/e'
  scenario_end $s
fi

# ---- The kernel's MTD behaviour, no library code ------------------------------
run_guest kernel.nand_semantics
run_guest kernel.nor_semantics

# ---- Disk probing on the emulated ATA disk --------------------------------------
for s in disk.is_dev_hdd disk.blk_dev_size disk.vendor_info disk.vendor_type \
         disk.node_position disk.temperature disk.smart_loop; do
  run_guest $s
done
# The stick is pulled (deleted through sysfs) in the first; then a card
# reader with an empty slot comes in on the lowest free letter (sda after
# the stick), and the second takes the disk away for a while.
run_guest disk.usb_stick
if want disk.usb_empty_slot; then
  load ehci_pci && run_guest disk.usb_empty_slot || fail disk.usb_empty_slot "ehci_pci"
fi

# ---- Flash faults ----------------------------------------------------------------------
# DATA.A (mtd12) spans NAND blocks 96-127, pages of 2 KiB, 64 a block.
# Faults: block 2 page 5 fails every write, block 6 fails every erase, block 8
# page 10 reads back garbage (an uncorrectable ECC error).
DATA_FIRST_BLOCK=96
WEAK_PAGE=$(((DATA_FIRST_BLOCK + 2) * 64 + 5))
WEAK_BLOCK=$((DATA_FIRST_BLOCK + 6))
GRAVE_PAGE=$(((DATA_FIRST_BLOCK + 8) * 64 + 10))
nand_faults() {
  nand_load badblocks=$BAD_AT_LOAD weakpages=$WEAK_PAGE:0 weakblocks=$WEAK_BLOCK:0 \
            gravepages=$GRAVE_PAGE:0
}
if want kernel.nand_faults; then
  nand_faults && run_guest kernel.nand_faults || fail kernel.nand_faults "nandsim with faults"
fi

# ---- FlashInterface ---------------------------------------------------------------------
nand_load badblocks=$BAD_AT_LOAD
for s in flash.table flash.nand_slot flash.nand_partial_page flash.mtd_utils flash.nor flash.nor_read_only \
         flash.emmc flash.erase_slots flash.timing streams.nand_record streams.sdram; do
  run_guest $s
done
# The whole 240 MiB USER.A each way: under a minute on a quiet host, several
# times that on a busy one, past the default limit.
run_guest flash.timing_whole_user 400
if want flash.erase_weak_block || want flash.weak_page_relocation || want flash.grave_page; then
  nand_faults
  for s in flash.erase_weak_block flash.weak_page_relocation flash.grave_page; do
    run_guest $s
  done
fi

# ---- The stbplat tool on the real devices -------------------------------------------
# KERNEL.B (mtd10) is 16 blocks with block 4 bad from the factory. The tool
# writes 5 blocks and a bit across it; the guest's read, a nanddump --oob
# --bb=dumpbad image and the partition table go out through the transfer disk, where the
# runner reads the image back in host mode (host_checks.sh).
STBPLAT=/opt/stbplat/bin/stbplat
XFER_DISK=/realdev/vdb
if want tool.mtd_list || want tool.nand_dump || want tool.whole_partition || want tool.raw_nand ||
   want tool.mtd_info || want tool.mtd_erase; then
  nand_load badblocks=$BAD_AT_LOAD || fail tool "nandsim reload"
fi
if want tool.mtd_list; then
  s=tool.mtd_list
  check $s "mtd list exits 0" $STBPLAT mtd list
  $STBPLAT mtd list >/tmp/ml 2>&1; cat /tmp/ml
  check $s "KERNEL.B row" grep -Eq '^mtd10 +NAND0\.KERNEL\.B +NAND +2 MiB +128 KiB +2 KiB +1$' /tmp/ml
  check $s "USER.A has no bad block" grep -Eq '^mtd13 +NAND0\.USER\.A +NAND .* 0$' /tmp/ml
  check $s "NOR slot row" grep -Eq '^mtd2 +NOR0\.CFG\.A +NOR +512 KiB +64 KiB' /tmp/ml
  $STBPLAT --json mtd list >/tmp/mj 2>&1
  check $s "JSON bad blocks of KERNEL.B" sh -c \
    "tr -d ' \n' </tmp/mj | grep -q '\"name\":\"NAND0.KERNEL.B\"[^}]*\"badBlocks\":\[524288\]'"
  scenario_end $s
fi
if want tool.nand_dump; then
  s=tool.nand_dump
  mkdir -p /tmp/xfer
  dd if=/dev/urandom of=/tmp/in bs=1000 count=$((5 * BLOCK / 1000 + 1)) 2>/dev/null
  check $s "refused without --yes" sh -c "! $STBPLAT flash write NAND0.KERNEL.B /tmp/in"
  check $s "flash write" $STBPLAT flash write --erase --yes NAND0.KERNEL.B /tmp/in
  check $s "flash read" $STBPLAT flash read NAND0.KERNEL.B -o /tmp/xfer/guest.read
  check $s "read spans the good blocks" test "$(stat -c %s /tmp/xfer/guest.read)" -eq $((15 * BLOCK))
  check $s "data reads back" cmp -n "$(stat -c %s /tmp/in)" /tmp/in /tmp/xfer/guest.read
  check $s "nanddump agrees" nanddump -q --bb=skipbad -f /tmp/skip /dev/mtd10
  check $s "same bytes as nanddump" cmp /tmp/skip /tmp/xfer/guest.read
  check $s "bad block untouched" sh -c \
    "nanddump -q --bb=dumpbad -s $((4 * BLOCK)) -l $BLOCK -f /tmp/b4 /dev/mtd10 && \
     ! cmp -s -n $BLOCK /tmp/b4 /tmp/in"
  # nanddump leaves bad blocks out by default; the image keeps them in place.
  check $s "nanddump --oob" nanddump -q --oob --bb=dumpbad -f /tmp/xfer/mtd10.oob /dev/mtd10
  check $s "dump size" test "$(stat -c %s /tmp/xfer/mtd10.oob)" -eq $((16 * 64 * (PAGE + 64)))
  grep '^mtd10:' /proc/mtd >/tmp/xfer/mtd10.row
  $STBPLAT mtd list | grep '^mtd10 ' >/tmp/xfer/guest.mtdlist
  check $s "archive to the transfer disk" tar -cf $XFER_DISK -C /tmp/xfer .
  sync
  scenario_end $s
fi
if want tool.whole_partition; then
  # ROOTFS.A (mtd11) has block 8 bad: its 63 good blocks, written whole in
  # pieces with --verify, then read back whole, against nanddump.
  s=tool.whole_partition
  good=$((63 * BLOCK))
  dd if=/dev/urandom of=/tmp/whole bs=$BLOCK count=63 2>/dev/null
  # busybox time counts ru_maxrss (KiB) as pages and multiplies by the page
  # size in KiB: divide it back out.
  page_kib=$(sed -n 's/^KernelPageSize: *\([0-9]*\) kB/\1/p' /proc/self/smaps | head -n 1)
  peak() { echo $(($(sed -n 's/.*Maximum resident set size (kbytes): //p' /tmp/time.$1) / page_kib)); }
  check $s "flash write --verify" busybox time -v -o /tmp/time.w \
    $STBPLAT flash write --erase --verify --yes NAND0.ROOTFS.A /tmp/whole
  check $s "flash read" busybox time -v -o /tmp/time.r $STBPLAT flash read NAND0.ROOTFS.A -o /tmp/whole.read
  check $s "read takes the good blocks" test "$(stat -c %s /tmp/whole.read)" -eq $good
  check $s "data reads back" cmp /tmp/whole /tmp/whole.read
  check $s "nanddump agrees" nanddump -q --bb=skipbad -f /tmp/whole.dump /dev/mtd11
  check $s "same bytes as nanddump" cmp /tmp/whole.dump /tmp/whole.read
  info "tool peak memory, whole ROOTFS.A ($good bytes): write --erase --verify $(peak w) KiB, read $(peak r) KiB"
  rm -f /tmp/whole /tmp/whole.read /tmp/whole.dump
  scenario_end $s
fi

# KERNEL.A (mtd9) has block 2 bad from the factory. nandwrite puts 5 blocks
# and a bit on it around the bad block; the tool's raw reads must give what
# nanddump gives, with each of its bad-block methods, whole and from an
# offset, by every name the partition has.
if want tool.raw_nand; then
  s=tool.raw_nand
  dd if=/dev/urandom of=/tmp/raw.in bs=1000 count=$((5 * BLOCK / 1000 + 1)) 2>/dev/null
  check $s "flash_erase" flash_erase -q /dev/mtd9 0 0
  check $s "nandwrite" nandwrite -q -p /dev/mtd9 /tmp/raw.in
  check $s "nanddump --oob" nanddump -q --oob -f /tmp/nd.default /dev/mtd9
  check $s "flash read --raw --oob" $STBPLAT flash read --raw --oob --mtd mtd9 -o /tmp/sp.default
  check $s "same as nanddump --oob" cmp /tmp/nd.default /tmp/sp.default
  for bb in skipbad padbad dumpbad; do
    check $s "nanddump --bb=$bb" nanddump -q --oob --bb=$bb -f /tmp/nd.$bb /dev/mtd9
    check $s "flash read --bb=$bb" $STBPLAT flash read --oob --bb=$bb NAND0.KERNEL.A -o /tmp/sp.$bb
    check $s "same as nanddump --bb=$bb" cmp /tmp/nd.$bb /tmp/sp.$bb
  done
  check $s "nanddump -s -l" nanddump -q --oob -s $BLOCK -l $((2 * BLOCK)) -f /tmp/nd.range /dev/mtd9
  check $s "flash read from an offset" $STBPLAT flash read --raw --oob --mtd flash1.KERNEL.A+$BLOCK \
    -n $((2 * BLOCK)) -o /tmp/sp.range
  check $s "same range as nanddump" cmp /tmp/nd.range /tmp/sp.range
  check $s "nanddump without OOB" nanddump -q --bb=padbad -f /tmp/nd.data /dev/mtd9
  check $s "flash read --raw" $STBPLAT flash read --raw --bb=padbad --mtd /dev/mtd9 -o /tmp/sp.data
  check $s "same data as nanddump" cmp /tmp/nd.data /tmp/sp.data
  $STBPLAT flash read --raw --oob --mtd mtd9 -o /tmp/sp.default 2>/tmp/sp.err
  check $s "the bad block named" has 'bad block 2 (at 0x40000) skipped' /tmp/sp.err
  rm -f /tmp/nd.* /tmp/sp.*
  scenario_end $s
fi

# mtd info against mtdinfo: size, erase blocks, page and OOB size, bad blocks
# (mtdinfo's map), writable or not, for NAND with and without bad blocks
# and the NOR chip. BOOT.A's node is the kernel's read-only one, which
# mtdinfo takes for another device (it finds a device by the node's minor
# number): there only stbplat's own answer is checked.
mtd_info_agrees() {  # NODE-NUMBER NAME-FOR-STBPLAT
  mtdinfo -M /dev/mtd$1 >/tmp/mi 2>&1 && $STBPLAT mtd info "$2" >/tmp/si 2>&1 || return 1
  cat /tmp/mi /tmp/si
  mi_blocks=$(sed -n 's/^Amount of eraseblocks: *\([0-9]*\) (\([0-9]*\) bytes.*/\1 \2/p' /tmp/mi)
  si_blocks=$(sed -n 's/^  erase blocks *\([0-9]*\) of.*/\1/p' /tmp/si)
  si_size=$(sed -n 's/^  size *\([0-9]*\) bytes.*/\1/p' /tmp/si)
  mi_page=$(sed -n 's/^Minimum input\/output unit size: *\([0-9]*\) byte.*/\1/p' /tmp/mi)
  si_page=$(sed -n 's/^  page *\([0-9]*\) byte.*/\1/p' /tmp/si)
  # mtdinfo has no OOB line for a device without OOB bytes.
  mi_oob=$(sed -n 's/^OOB size: *\([0-9]*\) bytes.*/\1/p' /tmp/mi)
  mi_oob=${mi_oob:-0}
  si_oob=$(sed -n 's/^  OOB *\([0-9]*\) bytes.*/\1/p' /tmp/si)
  mi_bad=$(grep -o '[0-9]*: *[0-9a-fA-Fx]* *BAD' /tmp/mi | sed 's/:.*//' | tr '\n' ' ')
  si_bad=$(sed -n 's/^  bad blocks *[0-9]*:* *//p' /tmp/si | sed 's/ (at [0-9a-fA-Fx]*),* */ /g')
  [ "$si_bad" = 0 ] && si_bad=
  mi_writable=$(sed -n 's/^Device is writable: *//p' /tmp/mi)
  si_writable=$(sed -n 's/^  writable *\([a-z]*\).*/\1/p' /tmp/si)
  echo "mtdinfo: $mi_blocks, page $mi_page, OOB $mi_oob, bad [$mi_bad], writable $mi_writable"
  echo "stbplat: $si_blocks $si_size, page $si_page, OOB $si_oob, bad [$si_bad], writable $si_writable"
  [ "$mi_writable" = true ] && mi_writable=yes || mi_writable=no
  [ "$mi_blocks" = "$si_blocks $si_size" ] && [ "$mi_page" = "$si_page" ] && [ "$mi_oob" = "$si_oob" ] &&
    [ "$(echo $mi_bad)" = "$(echo $si_bad)" ] && [ "$mi_writable" = "$si_writable" ]
}
if want tool.mtd_info; then
  s=tool.mtd_info
  check $s "KERNEL.A by slot name" mtd_info_agrees 9 NAND0.KERNEL.A
  check $s "KERNEL.B by node" mtd_info_agrees 10 mtd10
  check $s "USER.A by kernel name" mtd_info_agrees 13 flash1.USER.A
  check $s "NOR chip" mtd_info_agrees 8 NOR0
  $STBPLAT mtd info nor0.boot.a >/tmp/si 2>&1; cat /tmp/si
  check $s "read-only BOOT.A" has 'writable *no (/dev/mtd0 opens for reading only)' /tmp/si
  check $s "BOOT.A blocks" has 'erase blocks *8 of 65536 bytes' /tmp/si
  $STBPLAT mtd info mtd9 >/tmp/si 2>&1
  check $s "kernel name and node" sh -c "grep -q 'kernel name *flash1.KERNEL.A' /tmp/si && grep -q 'node */dev/mtd9' /tmp/si"
  check $s "ECC counters" has 'ECC *[0-9]* corrected, [0-9]* failed; 1 bad' /tmp/si
  scenario_end $s
fi

# Erasing by the kernel's offsets: blocks 1 to 3 of KERNEL.A around its bad
# block 2, then the whole NOR chip.
if want tool.mtd_erase; then
  s=tool.mtd_erase
  dd if=/dev/urandom of=/tmp/er.in bs=$BLOCK count=5 2>/dev/null
  check $s "flash_erase" flash_erase -q /dev/mtd9 0 0
  check $s "nandwrite" nandwrite -q -p /dev/mtd9 /tmp/er.in
  check $s "refused without --yes" sh -c "! $STBPLAT flash erase --mtd mtd9+$BLOCK -n $((3 * BLOCK))"
  check $s "refused off a block" sh -c "! $STBPLAT flash erase --mtd mtd9+$PAGE -n $BLOCK --yes"
  $STBPLAT flash erase --mtd mtd9+$BLOCK -n $((3 * BLOCK)) --yes 2>/tmp/er.out; echo "exit $?" >>/tmp/er.out
  cat /tmp/er.out
  check $s "range erased" has 'erased 2 blocks of mtd9+131072 (/dev/mtd9, 0x20000 to 0x80000); skipped bad block 2 (at 0x40000)' /tmp/er.out
  check $s "exit 0" has 'exit 0' /tmp/er.out
  check $s "nanddump" nanddump -q --bb=padbad -l $((5 * BLOCK)) -f /tmp/er.dump /dev/mtd9
  head -c $BLOCK /dev/zero | tr '\0' '\377' >/tmp/er.ff
  for b in 1 2 3; do
    check $s "block $b erased" sh -c "dd if=/tmp/er.dump bs=$BLOCK skip=$b count=1 2>/dev/null | cmp - /tmp/er.ff"
  done
  check $s "block 0 kept" cmp -n $BLOCK /tmp/er.dump /tmp/er.in
  dd if=/tmp/er.in of=/tmp/er.in3 bs=$BLOCK skip=3 count=1 2>/dev/null
  check $s "block 4 kept" sh -c "dd if=/tmp/er.dump bs=$BLOCK skip=4 count=1 2>/dev/null | cmp - /tmp/er.in3"
  check $s "whole NOR chip" $STBPLAT flash erase --mtd flash0 --yes
  check $s "NOR chip erased" sh -c "head -c 4194304 /dev/zero | tr '\0' '\377' | cmp - /dev/mtd8"
  rm -f /tmp/er.*
  scenario_end $s
fi
