// mtd list, map and flash read | write | erase end to end, in host mode on a
// copy of the example device.
#include <gtest/gtest.h>

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

TEST_F(DeviceCopy, MtdListShowsSizesAndBadBlocks) {
  ToolRun run = Run({"mtd", "list"});
  ASSERT_EQ(0, run.exitCode) << run.err;
  EXPECT_NE(std::string::npos, run.out.find("mtd5   NAND0.KERNEL.A       NAND     512 KiB    128 KiB    2 KiB    1"))
      << run.out;
  EXPECT_NE(std::string::npos, run.out.find("mtd7   NAND0...             NAND       1 MiB    128 KiB    2 KiB    2  (whole chip)"))
      << run.out;
  ToolRun json = Run({"--json", "mtd", "list"});
  EXPECT_NE(std::string::npos, json.out.find("\"name\": \"NOR0.FSBLINFO.A\"")) << json.out;
  EXPECT_NE(std::string::npos, json.out.find("\"eraseSize\": 65536")) << json.out;
}

TEST_F(DeviceCopy, MapDrawsEveryDeviceAndMarksTheBadBlocks) {
  ToolRun run = Run({"map", "--svg", dir / "map.svg"});
  ASSERT_EQ(0, run.exitCode) << run.err;
  EXPECT_NE(std::string::npos, run.out.find("NOR0  SPI_NOR 256 KiB at 0xE0000000")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("bad blocks: 2 (at 0x40000) 5 (at 0xA0000)")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("EMMC0  EMMC 1 MiB")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("│FSBLINFO       │")) << run.out;
  std::vector<unsigned char> svg = dir.Read("map.svg");
  std::string text(svg.begin(), svg.end());
  EXPECT_EQ(0u, text.find("<svg ")) << text.substr(0, 100);
  EXPECT_NE(std::string::npos, text.find("bad block at 0xA0000")) << text;
  ToolRun json = Run({"--json", "map"});
  EXPECT_NE(std::string::npos, json.out.find("\"source\": \"memory map\"")) << json.out;
  EXPECT_NE(std::string::npos, json.out.find("\"badBlocks\": [\n        262144,\n        655360\n      ]")) << json.out;
}

TEST_F(DeviceCopy, RecordShowReadsSlotsOnEveryMedium) {
  ToolRun fsbl = Run({"record", "show", "NOR0.FSBLINFO.A"});
  ASSERT_EQ(0, fsbl.exitCode) << fsbl.err;
  EXPECT_NE(std::string::npos, fsbl.out.find("FSBL 3.2c (example board)")) << fsbl.out;
  // The first block of ROOTFS.A is bad: the record comes from the next one.
  ToolRun rootfs = Run({"record", "show", "NAND0.ROOTFS.A"});
  EXPECT_EQ(0, rootfs.exitCode) << rootfs.err;
  EXPECT_NE(std::string::npos, rootfs.out.find("root file system 2026.11b")) << rootfs.out;
  ToolRun apps = Run({"record", "show", "EMMC0.APPS.B"});
  EXPECT_EQ(0, apps.exitCode) << apps.err;
  EXPECT_NE(std::string::npos, apps.out.find("applications 1.3c")) << apps.out;
  ToolRun package = Run({"record", "check", "NAND0.PKGHDR.A"});
  EXPECT_EQ(0, package.exitCode) << package.err;
  ToolRun environment = RunTool({"record", "show", "NOR0.PANEL.A"}, "", {"STBPLAT_ROOT=" + root()});
  EXPECT_EQ(0, environment.exitCode) << environment.err;
  EXPECT_NE(std::string::npos, environment.out.find("HELLO FROM STBPLAT")) << environment.out;
}

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
  // byte that did not take, from a file and from standard input alike.
  std::string other(data.size(), '\x5A');
  for (const std::string& source : {dir.Write("other.bin", other), std::string("-")}) {
    ToolRun mismatch = Run({"flash", "write", "NAND0.ROOTFS.A", source, "--verify", "--yes"}, other);
    EXPECT_EQ(1, mismatch.exitCode);
    EXPECT_NE(std::string::npos, mismatch.err.find("differs from " + source + " at offset 0x0 (wrote 0x5A, read 0x40)"))
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

TEST_F(DeviceCopy, ReadsByNorAddressAndByMtdName) {
  ToolRun byAddress = Run({"flash", "read", "0xE0010000", "-n", "4", "-o", dir / "a.bin"});
  ASSERT_EQ(0, byAddress.exitCode) << byAddress.err;
  std::vector<unsigned char> a = dir.Read("a.bin");
  EXPECT_EQ("FSBL", std::string(a.begin(), a.end()));
  ToolRun byName = Run({"flash", "read", "--mtd", "NAND0.KERNEL.A", "-n", "4", "-o", dir / "k.bin"});
  ASSERT_EQ(0, byName.exitCode) << byName.err;
  std::vector<unsigned char> k = dir.Read("k.bin");
  EXPECT_EQ("VERS", std::string(k.begin(), k.end()));
}

TEST_F(DeviceCopy, ChangesNeedYesAndGoodTargets) {
  std::vector<unsigned char> before = Image("mtd8");
  ToolRun unconfirmed = Run({"flash", "erase", "NOR0.BOOT.A"});
  EXPECT_EQ(2, unconfirmed.exitCode);
  EXPECT_NE(std::string::npos, unconfirmed.err.find("--yes")) << unconfirmed.err;
  EXPECT_TRUE(before == Image("mtd8"));
  ToolRun noSlot = Run({"flash", "erase", "NOR0.NOPE.A", "--yes"});
  EXPECT_EQ(1, noSlot.exitCode);
  EXPECT_NE(std::string::npos, noSlot.err.find("NOR0.NOPE.A")) << noSlot.err;
  ToolRun tooLong = Run({"flash", "read", "NOR0.BOOT.A", "-n", "1M", "-o", dir / "x"});
  EXPECT_EQ(2, tooLong.exitCode);
  EXPECT_NE(std::string::npos, tooLong.err.find("--length 1M")) << tooLong.err;
  std::string big = dir.Write("big.bin", std::string(70000, 'x'));
  ToolRun noRoom = Run({"flash", "write", "NOR0.BOOT.A", big, "--yes"});
  EXPECT_EQ(2, noRoom.exitCode);
  EXPECT_NE(std::string::npos, noRoom.err.find("does not fit")) << noRoom.err;
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

}  // namespace
