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

enum Where { kOut, kErr, kExactOut };

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
    {{"crc32", "/nonexistent/file"}, 1, kErr, "/nonexistent/file"},
    // Hex dump: the library's lines, an offset past the end.
    {{"hexdump", "@/dump.bin"}, 0, kExactOut,
     "00000000  41 42 43 44 45 46 47 48 49 4A 4B 4C 4D 4E 4F 50      ABCDEFGHIJKLMNOP\n"
     "00000010  51 00 7F                                             Q..             \n"},
    {{"hexdump", "--offset", "100", "@/dump.bin"}, 2, kErr, "--offset 0x64"},
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
    // Conventions: help; usage errors exit 2 naming the argument.
    {{"--help"}, 0, kOut, "Usage:"},
    {{"frobnicate"}, 2, kErr, "frobnicate"},
    {{"hexdump", "--indent", "500", "x"}, 2, kErr, "--indent"},
    {{"disk", "info", "/dev/sda"}, 2, kErr, "/dev/sda"},
    {{"--root", "@", "crc16", "-"}, 2, kErr, "proc/mtd", "x"},
    {{"record", "show", "NAND0.KERNELIMAGE.A"}, 2, kErr, "'KERNELIMAGE'"},
    {{"flash", "read", "not-a-target"}, 2, kErr, "'not-a-target'"},
    // The example device in host mode.
    {{"--root", "@/device", "map"}, 0, kOut, "bad blocks: 2 (at 0x40000) 5 (at 0xA0000)"},
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
    {{"--root", "@/device", "flash", "erase", "NOR0.NOPE.A", "--yes"}, 1, kErr, "NOR0.NOPE.A"},
    {{"--root", "@/device", "flash", "read", "NOR0.BOOT.A", "-n", "1M", "-o", "@/x"}, 2, kErr,
     "--length 1M runs past the end of NOR0.BOOT.A (65536 bytes left)"},
    {{"--root", "@/device", "flash", "write", "NOR0.BOOT.A", "@/long.bin", "--yes"}, 2, kErr,
     "(70000 bytes) does not fit in NOR0.BOOT.A (65536 bytes left)"},
    // A new front-panel text goes into its slot.
    {{"record", "make", "front-panel", "GOODBYE", "-o", "@/panel.bin"}, 0, kExactOut, ""},
    {{"--root", "@/device", "flash", "erase", "NOR0.PANEL.A", "--yes"}, 0, kErr, ""},
    {{"--root", "@/device", "flash", "write", "NOR0.PANEL.A", "@/panel.bin", "--yes"}, 0, kErr, ""},
    {{"--root", "@/device", "record", "show", "NOR0.PANEL.A"}, 0, kOut, "text: \"GOODBYE\""},
    // NOR programming without an erase only clears bits: --verify names the
    // first byte that did not take.
    {{"--root", "@/device", "flash", "write", "NOR0.PANEL.A", "-", "--verify", "--yes"}, 1, kErr,
     "differs from - at offset 0x0 (wrote 0x0D, read 0x01)", "\x0D"},
};

std::string Expand(std::string text, const std::string& dir) {
  for (size_t at; (at = text.find('@')) != std::string::npos;) text.replace(at, 1, dir);
  return text;
}

TEST(Commands, AnswerEachRow) {
  ScratchDir dir;
  std::filesystem::copy(kExample, dir / "device", std::filesystem::copy_options::recursive);
  dir.Write("check.txt", "123456789");
  dir.Write("long.bin", std::string(70000, 'a'));
  dir.Write("dump.bin", std::string("ABCDEFGHIJKLMNOPQ\0\x7f", 19));
  dir.Write("good.ini", "top = 1\n[net]\naddress = 10.0.0.1 ; home\nmask: 255.0.0.0\n");
  dir.Write("bad.ini", "[a]\nx = 1\n[broken\ny = 2\n");
  dir.Write("altered.bin", Stream(true));
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
    if (row.where == kExactOut)
      EXPECT_EQ(text, run.out);
    else
      EXPECT_NE(std::string::npos, (row.where == kErr ? run.err : run.out).find(text));
  }
  const std::vector<unsigned char> before = dir.Read(kNor);
  const std::vector<unsigned char> after = dir.Read("device/dev/mtd8");
  EXPECT_TRUE(std::equal(before.begin(), before.begin() + 0x30000, after.begin()));  // up to PANEL.A
}

TEST(ExampleDevice, CheckedInFilesAreWhatTheGeneratorWrites) {
  ScratchDir dir;
  ASSERT_EQ(0, std::system((STBPLAT_MKEXAMPLE_PATH " " + dir.path() + "/device").c_str()));
  const std::string diff = "diff -r -x README.md " + dir.path() + "/device " + kExample + " >&2";
  EXPECT_EQ(0, std::system(diff.c_str())) << "run examples/make-device.sh";
}

}  // namespace
