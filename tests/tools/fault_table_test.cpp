// Writes and erases on a device that fails, one row each: the faults go into
// a fresh copy of the example device, the command runs, and then its exit
// code, a piece of its message and every byte of the chip image are checked:
// the range the command erased is erased, the bytes it wrote are programmed
// over it, and nothing else changed.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "support/scratch_dir.h"
#include "tool_runner.h"

namespace {

using stbplat::test::RunTool;
using stbplat::test::ScratchDir;

const std::string kExample = std::string(STBPLAT_SOURCE_DIR) + "/examples/device";
constexpr uint64_t kNandPage = 2048, kNandOob = 64, kNandBlock = 0x20000;
// What marking a block bad leaves in the first OOB byte of its first page.
constexpr unsigned char kBadBlockMarker = 0x00;

struct Row {
  const char* ini;  // dev/NAME.ini the fault keys are added to
  const char* keys;
  std::vector<std::string> args;  // after "--root COPY flash"; "@" is the scratch folder
  int exitCode;
  const char* message;  // in standard error
  const char* chip;     // the image compared afterwards (mtd7: NAND with OOB bytes)
  uint64_t erasedAt = 0, erasedLength = 0;  // erased first
  uint64_t wroteAt = 0, wroteLength = 0;    // then the input's first bytes programmed here
  std::vector<uint64_t> markedBad = {};     // NAND blocks erased and marked bad, as the kernel marks them
};

const Row kRows[] = {
    // Read-only partitions: refused before anything changes.
    {"mtd3", "readonly = yes", {"write", "NOR0.PANEL.A", "@/64k", "--erase", "--yes"}, 1, "NOR0.PANEL.A", "mtd8"},
    {"mtd4", "readonly = yes", {"erase", "NAND0.PKGHDR.A", "--yes"}, 1, "NAND0.PKGHDR.A", "mtd7"},
    // A full device: what lies before the offset is written.
    {"mtd8", "fullfrom = 0x38000", {"write", "NOR0.PANEL.A", "@/64k", "--erase", "--yes"}, 1,
     "writing failed at 0x8000; the first 0x8000 bytes are written, the rest of the slot is erased", "mtd8", 0x30000,
     0x10000, 0x30000, 0x8000},
    // Power cuts: what landed before the cut stays.
    {"mtd8", "powercut = 1", {"write", "NOR0.PANEL.A", "@/64k", "--erase", "--yes"}, 1,
     "back failed at 0x0; it may not be erased", "mtd8", 0x30000,
     0x10000},
    {"mtd7", "powercut = 1", {"write", "NAND0.PKGHDR.A", "@/12k", "--erase", "--yes"}, 1,
     "back failed at 0x0; it may not be erased", "mtd7", 0, 0x20000},
    // No power at all: the library's slot erase reports success, the read-back does not.
    {"mtd8", "powercut = 0", {"erase", "NOR0.PANEL.A", "--yes"}, 1, "it may not be erased", "mtd8"},
    {"mtd7", "powercut = 2", {"write", "NAND0.PKGHDR.A", "@/12k", "--erase", "--yes"}, 0,
     "wrote 12288 bytes to NAND0.PKGHDR.A", "mtd7", 0, 0x20000, 0, 0x3000},  // the erase and one write
    // eMMC (mtd10 is EMMC0.APPS.B, a window at 0x80000): whole pages from the
    // offset must fit; a chunk the device keeps refusing is not tried for ever.
    {"mmca", "", {"write", "EMMC0.APPS.B+0x7FF9C", "@/100", "--yes"}, 2,
     "100 bytes at +0x7FF9C change 0x800 bytes, up to +0x8079C, past the end of /dev/mtd10", "mmca"},
    {"mmca", "fullfrom = 0xC0000", {"write", "EMMC0.APPS.B", "@/12k", "--erase", "--yes"}, 1,
     "filling with 0xFF kept failing at 0x0 (/dev/mtd10)", "mmca", 0x80000, 0x40000},
    {"mmca", "powercut = 2", {"write", "EMMC0.APPS.B+0x800", "@/12k", "--erase", "--yes"}, 0,
     "wrote 12288 bytes to EMMC0.APPS.B+0x800", "mmca", 0x80000, 0x80000, 0x80800, 0x3000},
    // A weak page in KERNEL.A's first block (chip block 1): the block is marked
    // bad, the write goes on in block 3 (2 is bad).
    {"mtd7", "weakpages = 0x21000", {"write", "NAND0.KERNEL.A", "@/12k", "--erase", "--yes"}, 0,
     "writes failed in the block at +0x0, which the library marked bad (the data went on in the next good blocks); "
     "NAND0.KERNEL.A now has 2 good blocks (262144 bytes)", "mtd7", 0x20000, 0x80000, 0x60000, 0x3000, {0x20000}},
    // A full NAND: every block the write tries is marked bad, and the message says so.
    {"mtd7", "fullfrom = 0x22000", {"write", "NAND0.KERNEL.A", "@/12k", "--erase", "--yes"}, 1,
     "writing failed at 0x0; the first 0x0 bytes are written, the rest of the slot is erased; writes failed in the "
     "blocks at +0x0, +0x40000, +0x60000, which the library marked bad; NAND0.KERNEL.A has no good block left",
     "mtd7", 0x20000, 0x80000, 0, 0, {0x20000, 0x60000, 0x80000}},
    // The last partial page does not program: the message counts the whole block that did.
    {"mtd7", "fullfrom = 0x60000", {"write", "NAND0.KERNEL.A", "@/128k+100", "--erase", "--yes"}, 1,
     "writing failed at 0x20000; the first 0x20000 bytes are written, the rest of the slot is erased", "mtd7",
     0x20000, 0x80000, 0x20000, 0x20000, {0x60000, 0x80000}},
    // An ECC failure: the read fails naming the page, the chip is as it was.
    {"mtd7", "eccpages = 0x800", {"read", "NAND0.PKGHDR.A", "-o", "@/out"}, 1, "reading failed at 0x800", "mtd7"},
};

uint64_t FileOffset(const std::string& chip, uint64_t offset) {
  return chip == "mtd7" ? offset / kNandPage * (kNandPage + kNandOob) + offset % kNandPage : offset;
}

TEST(Faults, EachRowLeavesTheChipAsItMust) {
  ScratchDir dir;
  std::string input;
  for (int i = 0; i < 0x20064; ++i) input += static_cast<char>(i % 251);  // never 0xFF
  dir.Write("128k+100", input);
  dir.Write("64k", input.substr(0, 0x10000));
  dir.Write("12k", input.substr(0, 0x3000));
  dir.Write("100", input.substr(0, 100));
  for (const Row& row : kRows) {
    const std::string root = dir / "device";
    std::filesystem::remove_all(root);
    std::filesystem::copy(kExample, root, std::filesystem::copy_options::recursive);
    std::ofstream(root + "/dev/" + row.ini + ".ini", std::ios::app) << row.keys << "\n";
    std::vector<unsigned char> chip = dir.Read("device/dev/" + std::string(row.chip));
    std::vector<std::string> args = {"--root", root, "flash"};
    for (const std::string& arg : row.args) args.push_back(arg[0] == '@' ? dir.path() + arg.substr(1) : arg);
    const auto run = RunTool(args);
    SCOPED_TRACE(std::string(row.keys) + ": " + testing::PrintToString(row.args) + "\n" + run.err);
    EXPECT_EQ(row.exitCode, run.exitCode);
    EXPECT_NE(std::string::npos, run.err.find(row.message));
    for (uint64_t at = row.erasedAt; at < row.erasedAt + row.erasedLength; ++at) chip[FileOffset(row.chip, at)] = 0xFF;
    for (uint64_t i = 0; i < row.wroteLength; ++i)
      chip[FileOffset(row.chip, row.wroteAt + i)] &= static_cast<unsigned char>(input[i]);
    for (uint64_t block : row.markedBad) {
      for (uint64_t at = block; at < block + kNandBlock; ++at) chip[FileOffset(row.chip, at)] = 0xFF;
      chip[FileOffset(row.chip, block) + kNandPage] = kBadBlockMarker;
    }
    const std::vector<unsigned char> after = dir.Read("device/dev/" + std::string(row.chip));
    ASSERT_EQ(chip.size(), after.size());
    uint64_t first = 0;
    while (first < chip.size() && chip[first] == after[first]) ++first;
    EXPECT_EQ(chip.size(), first) << "first byte differing from what it must be: file offset " << first;
  }
}

}  // namespace
