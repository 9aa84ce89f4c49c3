// The commands' answers to fixed inputs, one row each: exit code, and a text
// that must stand in standard output or standard error (exactly, where the
// row says so). "@" in an argument is the scratch folder with the inputs.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "scratch_dir.h"
#include "tool_runner.h"

namespace {

using stbplat::test::RunTool;
using stbplat::test::ScratchDir;
using stbplat::test::ToolRun;

const std::string kNor = std::string(STBPLAT_SOURCE_DIR) + "/examples/device/dev/mtd8";

enum Where { kOut, kErr, kExactOut };

struct Row {
  std::vector<std::string> args;
  int exitCode;
  Where where;
  std::string text;
  std::string input = "";
};

const Row kRows[] = {
    // Checksums: the standard check values, a file longer than one CRC-16 call.
    {{"crc16", "@/check.txt"}, 0, kExactOut, "0x2189  @/check.txt\n"},
    {{"crc32", "@/check.txt", "-"}, 0, kExactOut, "0xCBF43926  @/check.txt\n0xCBF43926  -\n", "123456789"},
    {{"crc16", "@/long.bin"}, 0, kExactOut, "0x6E80  @/long.bin\n"},  // KERMIT over 70000 'a', worked out bit by bit
    {{"--json", "crc32", "@/long.bin"}, 0, kOut, "\"size\": 70000"},
    {{"crc32", "/nonexistent/file"}, 1, kErr, "/nonexistent/file"},
    // Hex dump: the library's lines, a window, an offset past the end.
    {{"hexdump", "@/dump.bin"}, 0, kExactOut,
     "00000000  41 42 43 44 45 46 47 48 49 4A 4B 4C 4D 4E 4F 50      ABCDEFGHIJKLMNOP\n"
     "00000010  51 00 7F                                             Q..             \n"},
    {{"hexdump", "--offset", "16", "--length", "2", "@/dump.bin"}, 0, kExactOut,
     "00000010  51 00                                                Q.              \n"},
    {{"hexdump", "--offset", "100", "@/dump.bin"}, 2, kErr, "--offset 0x64"},
    // Ini files: values without comments; the first bad line on standard error.
    {{"ini", "@/good.ini"}, 0, kExactOut, "top = 1\n\n[net]\naddress = 10.0.0.1\nmask = 255.0.0.0\n"},
    {{"--json", "ini", "@/bad.ini"}, 1, kOut, "\"firstBadLine\": 3"},
    {{"--json", "ini", "@/bad.ini"}, 1, kOut, "\"y\": \"2\""},  // later lines still read
    {{"ini", "@/bad.ini"}, 1, kErr, "No closing ']' found on line 3"},
    {{"ini", "@/bad.ini"}, 1, kErr, "@/bad.ini:3: first bad line"},
    // Records of the example NOR image.
    {{"record", "show", kNor, "--at", "0x10000"}, 0, kOut, "description: \"FSBL 3.2c (example board)\""},
    {{"record", "show", kNor, "--at", "0x10000"}, 0, kOut, "Error                = 0x0031"},
    {{"--json", "record", "show", kNor, "--at", "0x10000"}, 0, kOut, "\"segmentPhysicalAddressStart\": 1073741824"},
    {{"record", "show", kNor, "--at", "0x20000"}, 0, kOut, "gcc 12.2"},
    {{"record", "show", kNor, "--at", "0x30000"}, 0, kOut, "AnimatedFrontPanelDisplayEntry text = HELLO FROM STBPLAT"},
    {{"record", "check", kNor, "--at", "0x20000"}, 0, kOut, "ok: "},
    {{"record", "show", kNor, "--at", "0x3F000"}, 1, kErr, "at 0x3F000 is erased"},
    {{"record", "check", kNor, "--at", "0x3F000"}, 1, kErr, "is erased"},
    // Records the tool makes read back with every field.
    {{"record", "make", "version", "--major", "4", "--minor", "17", "--letter", "q", "--description", "nightly",
      "--sequence", "MAIN", "--nv-sequence", "9", "-o", "@/vers.bin"}, 0, kExactOut, ""},
    {{"--json", "record", "show", "@/vers.bin"}, 0, kOut, "\"minorVersion\": 17,"},
    {{"--json", "record", "show", "@/vers.bin"}, 0, kOut, "\"versionLetter\": \"q\""},
    {{"--json", "record", "show", "@/vers.bin"}, 0, kOut, "\"nvSequence\": 9"},
    {{"record", "make", "package", "--header", "nand0.pkghdr.a", "--header-tag", "PKGH", "-c",
      "KRNL=NAND0.KERNEL.A+0x800", "-c", "ROOT=NAND0.ROOTFS.A", "-o", "@/pkg.bin"}, 0, kExactOut, ""},
    {{"record", "show", "--type", "package", "@/pkg.bin"}, 0, kOut, "slotOffset: 2048 (0x800)"},
    {{"record", "show", "--type", "package", "@/pkg.bin"}, 0, kOut, "Component 1:"},  // the library's display
    // Conventions: help on every level; usage errors exit 2 naming the argument.
    {{"--help"}, 0, kOut, "Usage:"},
    {{"disk", "info", "--help"}, 0, kOut, "Usage:"},
    {{}, 2, kErr, ""},
    {{"frobnicate"}, 2, kErr, "frobnicate"},
    {{"hexdump", "--indent", "500", "x"}, 2, kErr, "--indent"},
    {{"disk", "info", "/dev/sda"}, 2, kErr, "/dev/sda"},
    {{"--root", "@", "crc16", "-"}, 2, kErr, "proc/mtd", "x"},
    {{"record", "show", "no/such/file"}, 2, kErr, "'no/such/file'"},
    {{"record", "show", "NAND0.KERNELIMAGE.A"}, 2, kErr, "'KERNELIMAGE'"},
    {{"record", "show", "--type", "nope", kNor}, 2, kErr, "--type nope"},
    {{"record", "make", "package", "--header", "A.B.C", "-c", "TOOLONG=A.B.C", "-o", "@/x"}, 2, kErr, "TOOLONG"},
    {{"record", "make", "package", "--header", "nowhere", "-o", "@/x"}, 2, kErr, "--header 'nowhere'"},
    {{"record", "make", "version", "--letter", "ab", "-o", "@/x"}, 2, kErr, "--letter 'ab'"},
    {{"flash", "read", "not-a-target"}, 2, kErr, "'not-a-target'"},
    // The example device in host mode ("@/device", a copy).
    {{"--root", "@/device", "mtd", "list"}, 0, kOut,
     "mtd5   NAND0.KERNEL.A       NAND     512 KiB    128 KiB    2 KiB    1"},
    {{"--root", "@/device", "mtd", "list"}, 0, kOut,
     "mtd7   NAND0...             NAND       1 MiB    128 KiB    2 KiB    2  (whole chip)"},
    {{"--root", "@/device", "--json", "mtd", "list"}, 0, kOut, "\"eraseSize\": 65536"},
    {{"--root", "@/device", "map"}, 0, kOut, "bad blocks: 2 (at 0x40000) 5 (at 0xA0000)"},
    {{"--root", "@/device", "map"}, 0, kOut, "EMMC0  EMMC 1 MiB"},
    {{"--root", "@/device", "--json", "map"}, 0, kOut, "\"badBlocks\": [\n        262144,\n        655360\n      ]"},
    {{"--root", "@/device", "map", "--svg", "@/map.svg"}, 0, kOut, "NOR0  SPI_NOR 256 KiB at 0xE0000000"},
    {{"--root", "@/device", "record", "show", "NOR0.FSBLINFO.A"}, 0, kOut, "FSBL 3.2c (example board)"},
    // ROOTFS.A starts on a bad block: the record comes from the next one.
    {{"--root", "@/device", "record", "show", "NAND0.ROOTFS.A"}, 0, kOut, "root file system 2026.11b"},
    {{"--root", "@/device", "record", "show", "EMMC0.APPS.B"}, 0, kOut, "applications 1.3c"},
    {{"--root", "@/device", "record", "check", "NAND0.PKGHDR.A"}, 0, kOut, "ok: "},
    {{"--root", "@/device", "flash", "read", "0xE0010000", "-n", "4", "-o", "-"}, 0, kExactOut, "FSBL"},
    {{"--root", "@/device", "flash", "read", "--mtd", "NAND0.KERNEL.A", "-n", "4"}, 0, kExactOut, "VERS"},
    {{"--root", "@/device", "flash", "erase", "NOR0.BOOT.A"}, 2, kErr, "add --yes to go ahead"},
    {{"--root", "@/device", "flash", "erase", "NOR0.NOPE.A", "--yes"}, 1, kErr, "NOR0.NOPE.A"},
    {{"--root", "@/device", "flash", "read", "NOR0.BOOT.A", "-n", "1M", "-o", "@/x"}, 2, kErr,
     "--length 1M runs past the end of NOR0.BOOT.A (65536 bytes left)"},
    {{"--root", "@/device", "flash", "write", "NOR0.BOOT.A", "@/long.bin", "--yes"}, 2, kErr,
     "(70000 bytes) does not fit in NOR0.BOOT.A (65536 bytes left)"},
};

std::string Expand(std::string text, const std::string& dir) {
  for (size_t at; (at = text.find('@')) != std::string::npos;) text.replace(at, 1, dir);
  return text;
}

TEST(Commands, AnswerEachRow) {
  ScratchDir dir;
  std::filesystem::copy(std::string(STBPLAT_SOURCE_DIR) + "/examples/device", dir / "device",
                        std::filesystem::copy_options::recursive);
  dir.Write("check.txt", "123456789");
  dir.Write("long.bin", std::string(70000, 'a'));
  dir.Write("dump.bin", std::string("ABCDEFGHIJKLMNOPQ\0\x7f", 19));
  dir.Write("good.ini", "top = 1\n[net]\naddress = 10.0.0.1 ; home\nmask: 255.0.0.0\n");
  dir.Write("bad.ini", "[a]\nx = 1\n[broken\ny = 2\n");
  for (const Row& row : kRows) {
    std::vector<std::string> args;
    for (const std::string& arg : row.args) args.push_back(Expand(arg, dir.path()));
    ToolRun run = RunTool(args, row.input);
    std::string text = Expand(row.text, dir.path()), where = row.where == kErr ? run.err : run.out;
    std::string label = args.empty() ? "(no arguments)" : args[0] + " " + (args.size() > 1 ? args[1] : "");
    EXPECT_EQ(row.exitCode, run.exitCode) << label << ": " << run.err;
    if (row.where == kExactOut)
      EXPECT_EQ(text, run.out) << label;
    else
      EXPECT_NE(std::string::npos, where.find(text)) << label << ": " << where;
  }
}

}  // namespace
