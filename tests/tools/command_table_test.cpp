// The commands' answers to fixed inputs, one row each, run in order: exit
// code, and a text that must stand in standard output or standard error
// (exactly, where the row says so). "@" in an argument is the scratch folder
// with the inputs and a copy of the example device ("@/device"). The example
// device itself is what its generator writes today.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "support/scratch_dir.h"
#include "tool_runner.h"

namespace {

using stbplat::test::RunTool;
using stbplat::test::ScratchDir;

const std::string kExample = std::string(STBPLAT_SOURCE_DIR) + "/examples/device";
const std::string kNor = kExample + "/dev/mtd8";

// 200 KiB and a bit: more than ROOTFS.A's first good block, and not a whole
// number of pages, so the last page goes through the partial-page buffer.
std::string Stream(bool altered) {
  std::string data;
  for (int i = 0; i < 200 * 1024 + 100; ++i) data += static_cast<char>('a' + i % 23);
  if (altered) data[150000] = '\x0D';  // 'r' & 0x0D is 0
  return data;
}
const std::string kStream = Stream(false);
// A boot-loader record with 50 entries of an unknown type (0).
const std::string kUnknownEntries = std::string("FSBL\0\0\x01\xB2\0\0\0\0VERS\0\0\0\x12", 20) + std::string(10, '\0') +
                                    std::string("DATA\0\0\0\0\0\0\0\x32", 12) + std::string(400, '\0');
// A package header whose device name is not UTF-8.
const std::string kBadName = std::string("\0\0PKGHN\xFF\x80" "D0...KERNEL..A.......", 30) + std::string(12, '\0');

// n cells of the map's horizontal line.
std::string Bar(int n) {
  std::string bar;
  for (int i = 0; i < n; ++i) bar += "─";
  return bar;
}

enum Where { kOut, kErr, kExactOut, kExactErr };

struct Row {
  std::vector<std::string> args;
  int exitCode;
  Where where;
  std::string text;
  std::string input = "";
};

const Row kRows[] = {
    // Checksums: the standard check value, a file longer than one CRC-16 call.
    {{"crc32", "@/check.txt", "-"}, 0, kExactOut, "0xCBF43926  @/check.txt\n0xCBF43926  -\n",
     "123456789"},
    {{"crc16", "@/long.bin"}, 0, kExactOut, "0x6E80  @/long.bin\n"},  // KERMIT over 70000 'a'
    {{"crc32", "/nonexistent/file"}, 1, kErr, "/nonexistent/file: No such file or directory"},
    {{"crc32", "@"}, 1, kErr, "@: Is a directory"},
    {{"record", "check", "/nonexistent/file"}, 1, kErr, "/nonexistent/file: No such file or directory (nor a"},
    // Hex dump: the library's lines, an offset past the end.
    {{"hexdump", "@/dump.bin"}, 0, kExactOut,
     "00000000  41 42 43 44 45 46 47 48 49 4A 4B 4C 4D 4E 4F 50      ABCDEFGHIJKLMNOP\n"
     "00000010  51 00 7F                                             Q..             \n"},
    {{"hexdump", "--offset", "100", "@/dump.bin"}, 2, kErr, "--offset 0x64"},
    // Rows equal to the one before squeezed to one "*"; -n 0 dumps nothing.
    {{"hexdump", "-"}, 0, kExactOut,
     "00000000  00 00 00 00 00 00 00 00 00 00 00 00 00 00 00 00      ................\n*\n"
     "00000030  5A" + std::string(51, ' ') + "Z" + std::string(15, ' ') + "\n",
     std::string(48, '\0') + "Z"},
    {{"hexdump", "-n", "0", "@/dump.bin"}, 0, kExactOut, ""},
    // Ini files: values without comments; the first bad line.
    {{"ini", "@/good.ini"}, 0, kExactOut, "top = 1\n\n[net]\naddress = 10.0.0.1\nmask = 255.0.0.0\n"},
    {{"ini", "@/bad.ini"}, 1, kErr, "@/bad.ini:3: first bad line"},
    // Records of the example NOR image, and of a package header the tool makes.
    {{"record", "show", kNor, "--at", "0x10000"}, 0, kOut, "description: \"FSBL 3.2c (example board)\""},
    {{"record", "show", kNor, "--at", "0x3F000"}, 1, kErr, "at 0x3F000 is erased"},
    // Broken records: the offset and path of the first broken field; the reader agrees.
    {{"record", "check", "@/mcet.bin", "--at", "0x10000"}, 1, kErr,
     "error at offset 0x10070 (FSBL/MCFG/MCET[0]): expected an entry of type MCET, found 'MXET'"},
    {{"record", "check", "@/devc.bin", "--at", "0x10000"}, 1, kErr,
     "error at offset 0x10108 (FSBL/DEVC): entry size 0x7F000008 runs 2130706408 bytes past the end"},
    {{"record", "show", "@/devc.bin", "--at", "0x10000"}, 1, kErr, "reader returned 0xA004"},
    {{"record", "make", "package", "--header", "nand0.pkghdr.a", "--header-tag", "PKGH", "-c",
      "KRNL=NAND0.KERNEL.A+0x800", "-c", "ROOT=NAND0.ROOTFS.A", "-o", "@/pkg.bin"}, 0, kExactOut, ""},
    {{"record", "show", "--type", "package", "@/pkg.bin"}, 0, kOut, "slotOffset: 2048 (0x800)"},
    // No known type code, and not shaped like a package header.
    {{"--root", "@/device", "record", "show", "NOR0.BOOT.A", "--at", "0x10"}, 1, kErr,
     "0x16 (package/packageHeaderLocation/deviceName): type code '??DA' (0x00004441) is no known record"},
    {{"record", "show", "-"}, 0, kErr, "FSBL info\nstbplat: library: last message repeated 49 times\n", kUnknownEntries},
    // A library message holding zero bytes shows them escaped, on its own line.
    {{"record", "show", "--type", "vers", "-"}, 1, kErr, "found \\x00\\x00AB instead\nstbplat: record show: -:",
     std::string("\0\0AB\0\0\0\x10", 8) + std::string(16, 'a')},
    {{"--json", "record", "show", "-"}, 1, kErr, "deviceName holds the byte 0xFF at 1", kBadName},
    {{"--json", "record", "show", "--type", "package", "-"}, 0, kOut, "\"N\\\\xFF\\\\x80D0.KERNEL.A\"", kBadName},
    {{"--json", "ini", "@/latin1.ini"}, 0, kOut, "\"name\": \"caf\\\\xE9\""},
    {{"record", "check", "-"}, 1, kErr, "nor a package header: deviceName holds the byte 0x20 at 4",
     "PLAIN TEXT IS NO RECORD, NOR A PACKAGE HEADER"},
    // Conventions: help; usage errors exit 2 naming the argument.
    {{"--help"}, 0, kOut, "Usage:"},
    {{"frobnicate"}, 2, kErr, "frobnicate"},
    {{"recrod", "show"}, 2, kErr, "'recrod'\nDid you mean 'record'?"},
    {{"flash"}, 2, kErr, "stbplat: flash needs a command: read, write, erase, erase-sector\n"},
    {{"--version"}, 0, kOut, "stbplat "},
    {{"--root", "@/device", "record", "show", "NOR0.PANL.A"}, 2, kErr,
     "SOURCE: no slot NOR0.PANL.A (known: NOR0.BOOT.A, NOR0.FSBLINFO.A, NOR0.BLDCFG.A, NOR0.PANEL.A, "},
    {{"hexdump", "--indent", "500", "x"}, 2, kErr, "--indent"},
    {{"hexdump", "-n", "-1", "@/dump.bin"}, 2, kErr, "--length: '-1' is not a number"},
    {{"record", "show", kNor, "--at", "-5"}, 2, kErr, "--at: '-5' is not a number"},
    {{"record", "check", kNor, "--at", "1.5"}, 2, kErr, "--at: '1.5' is not a number"},
    {{"record", "show", kNor, "--at", "0x400000000G"}, 2, kErr, "--at: '0x400000000G' is too large"},
    {{"disk", "info", "/dev/sda"}, 2, kErr, "/dev/sda"},
    {{"--root", "@", "crc16", "-"}, 2, kErr, "proc/mtd", "x"},
    {{"record", "show", "NAND0.KERNELIMAGE.A"}, 2, kErr, "'KERNELIMAGE'"},
    {{"flash", "read", "not-a-target"}, 2, kErr, "'not-a-target'"},
    // The example device in host mode.
    {{"--root", "@/device", "map"}, 0, kOut, "bad blocks: 2 (at 0x40000) 5 (at 0xA0000)"},
    // Box drawing only where the locale is UTF-8.
    {{"LC_ALL=C", "--root", "@/device", "map"}, 0, kOut, "\n  part  |BOOT           |FSBLINFO"},
    {{"LC_ALL=C.UTF-8", "--root", "@/device", "map"}, 0, kOut, "\n  part  \u2502BOOT           \u2502FSBLINFO"},
    // Its disk: identity and size from the ioctls, the temperature from smartctl through awk.
    {{"--root", "@/device", "disk", "info"}, 0, kOut, "serial     Z9A1EXMP\nsize       931.5 GiB"},
    {{"--root", "@/device", "disk", "temp"}, 0, kExactOut, "36 C\n"},
    {{"--root", "@/device", "disk", "info", "sdb"}, 1, kErr, "cannot open /dev/sdb: No such file or directory"},
    // Raw NAND: the whole chip as it was dumped (compared below), bad blocks
    // named; good-block offsets say which bad blocks they passed over.
    {{"--root", "@/device", "flash", "read", "--mtd", "flash1", "--oob", "--bb=dumpbad", "-o", "@/chip.oob"}, 0,
     kExactErr, "flash read: flash1: bad blocks 2 (at 0x40000), 5 (at 0xA0000) read as they are\n"},
    {{"--root", "@/device", "flash", "read", "--raw", "--bb=padbad", "--mtd", "mtd7+0x40000", "-n", "4", "-o", "-"},
     0, kExactOut, "\xFF\xFF\xFF\xFF"},
    {{"--root", "@/device", "flash", "read", "--mtd", "NAND0...+0x40000", "-n", "4", "-o", "-"}, 0, kErr,
     "NAND0...+0x40000: NAND offsets count good blocks only: skipped bad block 2 (at 0x40000)\n"},
    // MTD detail, by kernel name, node and chip.
    {{"--root", "@/device", "mtd", "info", "flash1.KERNEL.A"}, 0, kOut,
     "mtd5: NAND0.KERNEL.A\n  kernel name   flash1.KERNEL.A\n  node          /dev/mtd5\n  type          nand\n"},
    {{"--root", "@/device", "mtd", "info", "mtd7"}, 0, kOut,
     "  page          2048 bytes\n  OOB           64 bytes a page\n  bad blocks    2: 2 (at 0x40000), 5 (at 0xA0000)\n"
     "  ECC           0 corrected, 0 failed; 2 bad, 0 bad-block-table blocks\n  writable      yes\n"},
    {{"--root", "@/device", "flash", "read", "--mtd", "nand0.kernel.a", "-n", "4", "-o", "-"}, 0, kExactOut, "VERS"},
    {{"--root", "@/device", "mtd", "info", "/dev/mtd6"}, 0, kOut, "  bad blocks    1: 0 (at 0x0)\n"},
    // ROOTFS.A starts on a bad block: the record comes from the next one.
    {{"--root", "@/device", "record", "show", "NAND0.ROOTFS.A"}, 0, kOut, "root file system 2026.11b"},
    {{"--root", "@/device", "record", "show", "EMMC0.APPS.B"}, 0, kOut, "applications 1.3c"},
    {{"--root", "@/device", "flash", "read", "0xE0010000", "-n", "4", "-o", "-"}, 0, kExactOut, "FSBL"},
    // A stream across ROOTFS.A's bad block; a page programmed again with
    // other data without an erase fails ECC.
    {{"--root", "@/device", "flash", "write", "NAND0.ROOTFS.A", "-", "--erase", "--verify", "--yes"}, 0,
     kErr, "", kStream},
    {{"--root", "@/device", "flash", "read", "NAND0.ROOTFS.A", "-n", std::to_string(kStream.size()), "-o",
      "-"}, 0, kExactOut, kStream},
    {{"--root", "@/device", "flash", "write", "NAND0.ROOTFS.A", "@/altered.bin", "--verify", "--yes"}, 1,
     kErr, "ECC error reading the flash device /dev/mtd6"},
    // Refused changes; the image is compared with the original afterwards.
    {{"--root", "@/device", "flash", "erase", "NOR0.BOOT.A"}, 2, kErr, "add --yes to go ahead"},
    {{"--root", "@/device", "flash", "erase", "NOR0.NOPE.A", "--yes"}, 2, kErr, "no slot NOR0.NOPE.A"},
    {{"--root", "@/device", "flash", "read", "NOR0.BOOT.A", "-n", "1M", "-o", "@/x"}, 2, kErr,
     "--length 0x100000 runs past the end of NOR0.BOOT.A (65536 bytes left)"},
    {{"--root", "@/device", "flash", "write", "NOR0.BOOT.A", "@/long.bin", "--yes"}, 2, kErr,
     "(70000 bytes) does not fit in NOR0.BOOT.A (65536 bytes left)"},
    // Checked before anything is erased: standard input too long for the slot,
    // a NAND offset inside a page, a NOR range of part sectors, eMMC sectors.
    {{"--root", "@/device", "flash", "write", "NOR0.BOOT.A", "-", "--erase", "--yes"}, 2, kErr,
     "standard input holds more than the 65536 bytes NOR0.BOOT.A has; nothing was changed", std::string(70000, 'a')},
    {{"--root", "@/device", "flash", "write", "NAND0.KERNEL.A+0x801", "@/dump.bin", "--erase", "--yes"}, 2, kErr,
     "NAND is written from the start of a page (0x800 bytes); the page holding the offset starts at +0x800"},
    {{"--root", "@/device", "record", "show", "NAND0.KERNEL.A"}, 0, kOut, "kernel 5.15a"},
    // A program built against libstbplat.so, run on the device: it raises the
    // kernel slot's minor version; a second run and the tool read what it stored.
    {{"--root", "@/device", "run", "--", STBPLAT_REWRITE_VERSION_PATH, "NAND0", "KERNEL", "A"}, 0, kExactOut,
     "5.15a -> 5.16a\n"},
    {{"--root", "@/device", "run", "--", STBPLAT_REWRITE_VERSION_PATH, "NAND0", "KERNEL", "A"}, 0, kExactOut,
     "5.16a -> 5.17a\n"},
    {{"--root", "@/device", "record", "show", "NAND0.KERNEL.A"}, 0, kOut, "minorVersion: 17 (0x11)"},
    {{"run", "--", "true"}, 2, kExactErr, "stbplat: run: give the device with --root DIR (or STBPLAT_ROOT)\n"},
    {{"--root", "@/device", "flash", "erase", "0xE0000100", "--length", "0x10000", "--yes"}, 2, kErr,
     "0xE0000100 +0x10000 is not whole 0x10000-byte sectors (the sector holding it starts at 0xE0000000)"},
    {{"--root", "@/device", "flash", "erase", "0xE0020000", "--length", "0x20000", "--yes"}, 2, kErr,
     "runs past the end of its partition (0x10000 bytes left)"},
    {{"--root", "@/device", "flash", "erase-sector", "0xE0000100", "--yes"}, 2, kErr,
     "0xE0000100 +0x10000 is not whole 0x10000-byte sectors"},
    {{"--root", "@/device", "flash", "erase-sector", "EMMC0.APPS.B", "--yes"}, 2, kErr, "no erase sectors"},
    // eMMC slots are written through their own rows, at the offset in the slot.
    {{"--root", "@/device", "flash", "write", "EMMC0.APPS.B+0x7F010", "@/dump.bin", "--verify", "--yes"}, 0, kErr,
     "wrote 19 bytes to EMMC0.APPS.B+0x7F010, verified"},
    {{"--root", "@/device", "flash", "read", "EMMC0.APPS.B+0x7F010", "-n", "19", "-o", "-"}, 0, kExactOut,
     std::string("ABCDEFGHIJKLMNOPQ\0\x7f", 19)},
    // New roots: from a geometry (every slot writable), and from a box's dumps.
    {{"root", "make", "@/made", "--nand", "1M,2048,64,128K", "--emmc", "1M", "--slot", "NAND0.KERNEL.A=512K",
      "--slot", "EMMC0.APPS.A=512K"}, 0, kErr, "made @/made"},
    {{"--root", "@/made", "flash", "write", "EMMC0.APPS.A+0x100", "@/dump.bin", "--verify", "--yes"}, 0, kErr,
     "wrote 19 bytes to EMMC0.APPS.A+0x100, verified"},
    {{"root", "make", "@/two", "--nor", "256K,64K,0xE1000000", "--slot", "NOR0.BOOT.A=64K", "--slot",
      "NOR0.PANEL.A=128K"}, 0, kErr, "made @/two"},
    {{"LC_ALL=C.UTF-8", "--root", "@/two", "map"}, 0, kExactOut,
     "NOR0  SPI_NOR 256 KiB at 0xE1000000, 64 KiB sectors  [/dev/mtd2]\n        0x0             0x10000\n"
     "        ┌" + Bar(15) + "┬" + Bar(31) + "┬" + Bar(15) + "┐\n"
     "  part  │BOOT           │PANEL" + std::string(26, ' ') + "│" + std::string(15, ' ') + "│\n"
     "        ├" + Bar(15) + "┼" + Bar(31) + "┼" + Bar(15) + "┤\n"
     "  slots │A 64K mtd0     │A 128K mtd1" + std::string(20, ' ') + "│" + std::string(15, ' ') + "│\n"
     "        └" + Bar(15) + "┴" + Bar(31) + "┴" + Bar(15) + "┘\n\n"},
    {{"root", "make", "@/no", "--proc-mtd", "@/box-mtd", "--dump", "mtd0=x,2048"}, 2, kErr,
     "--dump mtd0=x,2048: expected NODE=FILE or NODE=FILE,PAGE,OOB"},
    {{"root", "make", "@/no", "--nand", "1000K,2048,64,128K", "--slot", "NAND0.A.A=128K"}, 2, kErr,
     "--nand: the size must be whole blocks; nothing was written"},
    {{"root", "make", "@/no", "--emmc", "0", "--slot", "EMMC0.A.A=2K"}, 2, kErr, "--emmc: the size must be whole 512"},
    {{"root", "make", "@/no", "--nor", "256K", "--slot", "NOR0.BOOT.A+0x10=64K"}, 2, kErr,
     "--slot NOR0.BOOT.A+0x10=64K: expected DEVICE.PARTITION.SLOT=SIZE"},
    {{"root", "make", "@/odd", "--emmc", "1M", "--slot", "EMMC0.APPS.A=1000"}, 2, kErr,
     "the size must be whole 0x800-byte eMMC write units"},
    {{"root", "make", "@/box", "--proc-mtd", "@/box-mtd", "--dump", "mtd0=@/device/dev/mtd7,2048,64", "--window",
      "mtd1=mtd0+0x20000"}, 0, kErr, "made @/box"},
    {{"--root", "@/box", "mtd", "list"}, 0, kOut, "mtd1   NAND0.KERNEL.A       NAND     512 KiB"},
    // A slot without a partition of its own ("@/split": PANEL.A halved, PANEL.B behind it on /dev/mtd11, which
    // is not there): reached by address through the chip, and no node file is made.
    {{"--root", "@/split", "flash", "read", "NOR0.PANEL.B", "-n", "4", "-o", "-"}, 0, kExactOut, "\xFF\xFF\xFF\xFF"},
    {{"--root", "@/split", "flash", "write", "NOR0.PANEL.B", "@/dump.bin", "--yes", "--verify"}, 0, kErr, "verified"},
    {{"--root", "@/split", "flash", "read", "0xE0038000", "-n", "3", "-o", "-"}, 0, kExactOut, "ABC"},
    {{"crc32", "@/split/dev/mtd11"}, 1, kErr, "No such file or directory"},
    // A read from a slot that is not there leaves the output file alone.
    {{"--root", "@/device", "flash", "read", "NOR0.PANL.A", "-n", "16", "-o", "@/check.txt"}, 2, kErr, "PANL"},
    {{"crc32", "@/check.txt"}, 0, kExactOut, "0xCBF43926  @/check.txt\n"},
    // A new front-panel text goes into its slot.
    {{"record", "make", "front-panel", "GOODBYE", "-o", "@/panel.bin"}, 0, kExactOut, ""},
    {{"--json", "--root", "@/device", "flash", "erase", "NOR0.PANEL.A", "--yes"}, 0, kOut, "\"erased\": \"whole\""},
    {{"--root", "@/device", "flash", "write", "NOR0.PANEL.A", "@/panel.bin", "--yes"}, 0, kErr, ""},
    {{"--root", "@/device", "record", "show", "NOR0.PANEL.A"}, 0, kOut, "text: \"GOODBYE\""},
    // NOR programming without an erase only clears bits: --verify names the
    // first byte that did not take.
    {{"--root", "@/device", "flash", "write", "NOR0.PANEL.A", "-", "--verify", "--yes"}, 1, kErr,
     "differs from - at offset 0x0 (wrote 0x0D, read 0x01)", "\x0D"},
    // A page programmed again fails ECC; -q keeps the library's message back, the tool's own error stays.
    {{"-q", "--root", "@/device", "flash", "write", "NAND0.KERNEL.A", "@/dump.bin", "--verify", "--yes"}, 1,
     kExactErr, "stbplat: flash write --verify: NAND0.KERNEL.A: reading back failed at 0x0\n"},
    // Erasing blocks by the kernel's offsets, then the whole chip; a raw
    // write of part of a page needs --pad, and starts past a bad block.
    {{"--root", "@/device", "flash", "erase", "--mtd", "mtd5+0x800", "-n", "0x20000", "--yes"}, 2, kErr,
     "is not whole 0x20000-byte erase blocks (the block holding the offset starts at 0x0)"},
    {{"--root", "@/device", "flash", "erase", "--mtd", "NAND0.KERNEL.A+0x20000", "-n", "0x40000", "--yes"}, 0,
     kExactErr, "erased 1 block of NAND0.KERNEL.A+0x20000 (/dev/mtd5, 0x20000 to 0x60000); skipped bad block 1 (at "
     "0x20000)\n"},
    {{"--root", "@/device", "flash", "erase", "--mtd", "flash1", "--yes"}, 0, kExactErr,
     "erased 6 blocks of flash1 (/dev/mtd7, 0x0 to 0x100000); skipped bad blocks 2 (at 0x40000), 5 (at 0xA0000)\n"},
    {{"--root", "@/device", "flash", "erase", "--mtd", "mtd5+0x60000", "-n", "0x40000", "--yes"}, 2, kErr,
     "0x60000 +0x40000 runs past the end of /dev/mtd5 (0x80000 bytes)"},
    {{"--root", "@/device", "flash", "write", "--raw", "--pad", "--mtd", "mtd5+0x20800", "@/dump.bin", "--yes"}, 2,
     kErr, "0x20800 lies inside bad block 1"},
    {{"--root", "@/device", "flash", "write", "--raw", "--mtd", "mtd7+0x40000", "@/dump.bin", "--yes"}, 2, kErr,
     "(19 bytes) is not whole 0x800-byte pages; pass --pad"},
    {{"--root", "@/device", "flash", "write", "--raw", "--pad", "--mtd", "mtd7+0x40000", "@/dump.bin", "--yes"}, 0,
     kErr, "mtd7+0x40000: skipped bad block 2 (at 0x40000)\n"},
    {{"--root", "@/device", "flash", "read", "--raw", "--mtd", "flash1+0x60000", "-n", "20", "-o", "-"}, 0, kExactOut,
     std::string("ABCDEFGHIJKLMNOPQ\0\x7f\xFF", 20)},
};

std::string Expand(std::string text, const std::string& dir) {
  for (size_t at; (at = text.find('@')) != std::string::npos;) text.replace(at, 1, dir);
  return text;
}

TEST(Commands, AnswerEachRow) {
  ScratchDir dir;
  std::filesystem::copy(kExample, dir / "device", std::filesystem::copy_options::recursive);
  std::filesystem::copy(kExample, dir / "split", std::filesystem::copy_options::recursive);
  const std::vector<unsigned char> map = dir.Read("split/memory-map.ini");
  std::string split(map.begin(), map.end());
  const std::string panel = "[slot NOR0.PANEL.A]\noffset = 0x000000\nsize = 0x010000\nnode = /dev/mtd3\n";
  split.replace(split.find(panel), panel.size(),
                "[slot NOR0.PANEL.A]\noffset = 0\nsize = 0x8000\nnode = /dev/mtd3\n\n"
                "[slot NOR0.PANEL.B]\noffset = 0x8000\nsize = 0x8000\nnode = /dev/mtd11\n");
  dir.Write("split/memory-map.ini", split);
  dir.Write("check.txt", "123456789");
  dir.Write("long.bin", std::string(70000, 'a'));
  dir.Write("dump.bin", std::string("ABCDEFGHIJKLMNOPQ\0\x7f", 19));
  dir.Write("good.ini", "top = 1\n[net]\naddress = 10.0.0.1 ; home\nmask: 255.0.0.0\n");
  dir.Write("bad.ini", "[a]\nx = 1\n[broken\ny = 2\n");
  dir.Write("latin1.ini", "name = caf\xE9\n");
  dir.Write("altered.bin", Stream(true));
  dir.Write("box-mtd", "dev:    size   erasesize  name\nmtd0: 00100000 00020000 \"flash1\"\n"
                       "mtd1: 00080000 00020000 \"flash1.KERNEL.A\"\n");
  std::vector<unsigned char> nor = dir.Read(kNor);
  nor[0x10071] = 'X';  // the type of the first memory controller
  dir.Write("mcet.bin", nor);
  nor = dir.Read(kNor);
  nor[0x10108] = 0x7F;  // the size of the device configuration
  dir.Write("devc.bin", nor);
  for (const Row& row : kRows) {
    std::vector<std::string> args;
    for (const std::string& arg : row.args) args.push_back(Expand(arg, dir.path()));
    const auto run = RunTool(args, row.input);
    const std::string text = Expand(row.text, dir.path());
    SCOPED_TRACE(testing::PrintToString(args) + "\n" + run.err);
    EXPECT_EQ(row.exitCode, run.exitCode);
    if (row.where == kExactOut || row.where == kExactErr)
      EXPECT_EQ(text, row.where == kExactOut ? run.out : run.err);
    else
      EXPECT_NE(std::string::npos, (row.where == kErr ? run.err : run.out).find(text));
  }
  const std::vector<unsigned char> before = dir.Read(kNor);
  const std::vector<unsigned char> after = dir.Read("device/dev/mtd8");
  EXPECT_TRUE(std::equal(before.begin(), before.begin() + 0x30000, after.begin()));  // up to PANEL.A
  EXPECT_EQ(dir.Read(kExample + "/dev/mtd7"), dir.Read("chip.oob"));
}

TEST(ExampleDevice, CheckedInFilesAreWhatTheGeneratorWrites) {
  ScratchDir dir;
  ASSERT_EQ(0, std::system((STBPLAT_MKEXAMPLE_PATH " " + dir.path() + "/device").c_str()));
  const std::string diff = "diff -r -x README.md " + dir.path() + "/device " + kExample + " >&2";
  EXPECT_EQ(0, std::system(diff.c_str())) << "run examples/make-device.sh";
}

}  // namespace
