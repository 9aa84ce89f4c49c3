// The commands end to end where a table row does not do: flash transfers in
// host mode on a copy of the example device, records the tool makes and
// records it finds broken.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include "scratch_dir.h"
#include "tool_runner.h"

namespace {

namespace fs = std::filesystem;
using stbplat::test::RunTool;
using stbplat::test::ScratchDir;
using stbplat::test::ToolRun;

const std::string kDevice = std::string(STBPLAT_SOURCE_DIR) + "/examples/device";
const std::string kNorImage = kDevice + "/dev/mtd8";
constexpr unsigned long kFsblSlot = 0x10000;

std::string At(unsigned long offset) {
  char text[32];
  std::snprintf(text, sizeof text, "0x%lX", offset);
  return text;
}

// Offset of the first occurrence of text in bytes at or after from.
size_t Find(const std::vector<unsigned char>& bytes, const std::string& text, size_t from) {
  auto it = std::search(bytes.begin() + static_cast<long>(from), bytes.end(), text.begin(), text.end());
  return it == bytes.end() ? std::string::npos : static_cast<size_t>(it - bytes.begin());
}

class DeviceCopy : public ::testing::Test {
 protected:
  void SetUp() override { fs::copy(kDevice, root(), fs::copy_options::recursive); }
  std::string root() const { return dir / "device"; }
  ToolRun Run(std::vector<std::string> args, const std::string& input = "") {
    args.insert(args.begin(), {"--root", root()});
    return RunTool(args, input);
  }
  std::vector<unsigned char> Image(const std::string& name) const { return dir.Read("device/dev/" + name); }
  ScratchDir dir;
};

TEST_F(DeviceCopy, StreamsAcrossABadBlockAndVerifies) {
  // 200 KiB: more than the first good block of ROOTFS.A (blocks 6 and 7),
  // and not a whole number of pages, so the last page goes through the
  // partial-page buffer.
  std::string data;
  for (int i = 0; i < 200 * 1024 + 100; ++i) data += static_cast<char>('a' + i % 23);
  std::string in = dir.Write("in.bin", data);
  for (const std::string& source : {in, std::string("-")}) {
    ToolRun write = Run({"flash", "write", "NAND0.ROOTFS.A", source, "--erase", "--verify", "--yes"}, data);
    ASSERT_EQ(0, write.exitCode) << source << ": " << write.err;
    ToolRun read = Run({"flash", "read", "NAND0.ROOTFS.A", "-n", std::to_string(data.size()), "-o", "-"});
    ASSERT_EQ(0, read.exitCode) << read.err;
    EXPECT_TRUE(read.out == data) << source;
  }
  // The bad block kept no data: the write went around it.
  std::vector<unsigned char> nand = Image("mtd7");
  const size_t pageWithOob = 2048 + 64;
  EXPECT_EQ(0x00, nand[5 * 64 * pageWithOob + 2048]);  // still marked bad
  EXPECT_EQ('a', nand[6 * 64 * pageWithOob]);           // the data starts in block 6
  // Without --length a read takes what the slot holds around its bad block.
  ToolRun whole = Run({"flash", "read", "NAND0.ROOTFS.A", "-o", "-"});
  ASSERT_EQ(0, whole.exitCode) << whole.err;
  EXPECT_EQ(256u * 1024, whole.out.size());
  // Programming without an erase only clears bits: --verify names the first
  // byte that did not take ('r' & 0x0D), from a file and from standard input alike.
  std::string other = data;
  other[150000] = '\x0D';
  for (const std::string& source : {dir.Write("other.bin", other), std::string("-")}) {
    ToolRun mismatch = Run({"flash", "write", "NAND0.ROOTFS.A", source, "--verify", "--yes"}, other);
    EXPECT_EQ(1, mismatch.exitCode);
    EXPECT_NE(std::string::npos, mismatch.err.find("differs from " + source + " at offset 0x249F0 (wrote 0x0D, read 0x00)"))
        << mismatch.err;
  }
}

TEST_F(DeviceCopy, EmmcSlotSizeComesFromTheMemoryMap) {
  ToolRun read = Run({"flash", "read", "EMMC0.APPS.B", "-o", "-"});
  ASSERT_EQ(0, read.exitCode) << read.err;
  EXPECT_EQ(512u * 1024, read.out.size());
  EXPECT_NE(std::string::npos, read.out.find("applications 1.3c"));
}

TEST_F(DeviceCopy, NewFrontPanelTextGoesIntoItsSlot) {
  std::string record = dir / "panel.bin";
  ASSERT_EQ(0, RunTool({"record", "make", "front-panel", "GOODBYE", "-o", record}).exitCode);
  ToolRun erase = Run({"flash", "erase", "NOR0.PANEL.A", "--yes"});
  ASSERT_EQ(0, erase.exitCode) << erase.err;
  ToolRun write = Run({"flash", "write", "NOR0.PANEL.A", record, "--yes"});
  ASSERT_EQ(0, write.exitCode) << write.err;
  ToolRun shown = Run({"record", "show", "NOR0.PANEL.A"});
  EXPECT_EQ(0, shown.exitCode) << shown.err;
  EXPECT_NE(std::string::npos, shown.out.find("text: \"GOODBYE\"")) << shown.out;
}

TEST_F(DeviceCopy, RefusedChangesLeaveTheDeviceAlone) {
  std::vector<unsigned char> before = Image("mtd8");
  EXPECT_EQ(2, Run({"flash", "erase", "NOR0.BOOT.A"}).exitCode);
  EXPECT_EQ(2, Run({"flash", "write", "NOR0.BOOT.A", dir.Write("big.bin", std::string(70000, 'x')), "--yes"}).exitCode);
  EXPECT_TRUE(before == Image("mtd8"));
}

}  // namespace

namespace {

TEST(MtdList, FindsBadBlocksAtTheEdgesAndInRuns) {
  ScratchDir dir;
  const size_t block = 16 * 1024, blocks = 16;
  // The flash layer measures the NAND block size on the chip's first slot.
  dir.Write("proc/mtd",
            "dev:    size   erasesize  name\n"
            "mtd0: 00040000 00004000 \"flash1\"\n"
            "mtd1: 00040000 00004000 \"flash1.DATA.A\"\n");
  dir.Write("dev/mtd0", std::vector<unsigned char>(block * blocks, 0xFF));
  dir.Write("dev/mtd0.ini", "medium = nand\nwritesize = 512\n");
  dir.Write("dev/mtd0.bad", "0\n3\n4\n9\n15\n");
  dir.Write("dev/mtd1.ini", "image = mtd0\n");
  dir.Write("memory-map.ini",
            "[device NAND0]\ntechnology = NAND....\nbase = 0\nsize = 0x40000\n"
            "[partition NAND0.DATA]\noffset = 0\nsize = 0x40000\n"
            "[slot NAND0.DATA.A]\noffset = 0\nsize = 0x40000\nnode = /dev/mtd1\n");
  ToolRun run = RunTool({"--root", dir.path(), "--json", "mtd", "list"});
  ASSERT_EQ(0, run.exitCode) << run.err;
  std::string expected = "\"badBlocks\": [";
  for (size_t b : {0, 3, 4, 9, 15}) expected += std::string(b == 0 ? "" : ",") + "\n      " + std::to_string(b * block);
  EXPECT_NE(std::string::npos, run.out.find(expected + "\n    ]")) << run.out;
}

TEST(RecordCheck, NamesTheOffsetOfTheFirstBrokenField) {
  struct Corruption {
    std::string type;
    size_t at;  // from the entry's start
    unsigned char value;
    std::string message;  // behind the offset and the entry's path
  };
  const Corruption corruptions[] = {
      {"MCET", 1, 'X', "expected an entry of type MCET, found 'MXET'"},  // a nested type
      {"DEVC", 4, 0x7F, "runs 2130706408 bytes past the end of FSBL"},  // a size that runs past its container
  };
  ScratchDir dir;
  for (const Corruption& c : corruptions) {
    std::vector<unsigned char> image = dir.Read(kNorImage);
    size_t entry = Find(image, c.type, kFsblSlot);
    ASSERT_NE(std::string::npos, entry);
    image[entry + c.at] = c.value;
    std::string copy = dir.Write("nor.bin", image);
    ToolRun run = RunTool({"record", "check", copy, "--at", At(kFsblSlot)});
    EXPECT_EQ(1, run.exitCode);
    size_t offset = entry + (c.type == "DEVC" ? c.at : 0);
    EXPECT_NE(std::string::npos, run.err.find("error at offset " + At(offset) + " (")) << run.err;
    EXPECT_NE(std::string::npos, run.err.find(c.message)) << run.err;
    EXPECT_EQ(1, RunTool({"record", "show", copy, "--at", At(kFsblSlot)}).exitCode);  // the reader agrees
  }
}

}  // namespace
