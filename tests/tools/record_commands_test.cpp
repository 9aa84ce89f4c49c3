// record show | make | check end to end, on the example device's images and
// on records the tool builds.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "scratch_dir.h"
#include "tool_runner.h"

namespace {

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

std::vector<unsigned char> ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  return std::vector<unsigned char>(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// Offset of the first occurrence of text in bytes at or after from.
size_t Find(const std::vector<unsigned char>& bytes, const std::string& text, size_t from) {
  auto it = std::search(bytes.begin() + static_cast<long>(from), bytes.end(), text.begin(), text.end());
  return it == bytes.end() ? std::string::npos : static_cast<size_t>(it - bytes.begin());
}

TEST(RecordShow, ReadsStandardInput) {
  ScratchDir dir;
  ToolRun made = RunTool({"record", "make", "front-panel", "READY", "-o", dir / "panel.bin"});
  ASSERT_EQ(0, made.exitCode) << made.err;
  std::vector<unsigned char> bytes = dir.Read("panel.bin");
  ToolRun run = RunTool({"record", "show", "-"}, std::string(bytes.begin(), bytes.end()));
  EXPECT_EQ(0, run.exitCode) << run.err;
  EXPECT_NE(std::string::npos, run.out.find("text: \"READY\"")) << run.out;
}

TEST(RecordMake, VersionRecordReadsBackWithEveryField) {
  ScratchDir dir;
  ToolRun made = RunTool({"record", "make", "version", "--major", "4", "--minor", "17", "--letter", "q",
                          "--description", "nightly", "--sequence", "MAIN", "--nv-sequence", "9", "-o",
                          dir / "vers.bin"});
  ASSERT_EQ(0, made.exitCode) << made.err;
  std::vector<unsigned char> bytes = dir.Read("vers.bin");
  ASSERT_GE(bytes.size(), 12u);
  EXPECT_EQ(0, std::memcmp(bytes.data(), "VERS", 4));
  // type, size, header, 3 words, DATA entry of "nightly\0", letter, pad, 28.
  EXPECT_EQ(8u + 4 + 6 + 8 + 8 + 2 + 28, bytes.size());
  ToolRun shown = RunTool({"--json", "record", "show", dir / "vers.bin"});
  EXPECT_EQ(0, shown.exitCode) << shown.err;
  EXPECT_NE(std::string::npos, shown.out.find("\"majorVersion\": 4")) << shown.out;
  EXPECT_NE(std::string::npos, shown.out.find("\"minorVersion\": 17")) << shown.out;
  EXPECT_NE(std::string::npos, shown.out.find("\"versionLetter\": \"q\"")) << shown.out;
  EXPECT_NE(std::string::npos, shown.out.find("\"nvSequence\": 9")) << shown.out;
}

TEST(RecordMake, PackageHeaderListsItsComponents) {
  ScratchDir dir;
  ToolRun made = RunTool({"record", "make", "package", "--header", "nand0.pkghdr.a", "--header-tag", "PKGH",
                          "-c", "KRNL=NAND0.KERNEL.A+0x800", "-c", "ROOT=NAND0.ROOTFS.A", "-o", dir / "pkg.bin"});
  ASSERT_EQ(0, made.exitCode) << made.err;
  EXPECT_EQ(42u + 2 * 36, dir.Read("pkg.bin").size());
  ToolRun shown = RunTool({"record", "show", "--type", "package", dir / "pkg.bin"});
  EXPECT_EQ(0, shown.exitCode) << shown.err;
  EXPECT_NE(std::string::npos, shown.out.find("location: \"NAND0.KERNEL.A\"")) << shown.out;
  EXPECT_NE(std::string::npos, shown.out.find("slotOffset: 2048 (0x800)")) << shown.out;
  EXPECT_NE(std::string::npos, shown.out.find("Component 1:")) << shown.out;  // the library's display
}

TEST(RecordCheck, NamesTheOffsetOfACorruptedNestedType) {
  ScratchDir dir;
  std::vector<unsigned char> image = ReadFile(kNorImage);
  size_t controller = Find(image, "MCET", kFsblSlot);
  ASSERT_NE(std::string::npos, controller);
  image[controller + 1] = 'X';  // MCET becomes MXET
  std::string copy = dir.Write("nor.bin", image);
  ToolRun run = RunTool({"record", "check", copy, "--at", At(kFsblSlot)});
  EXPECT_EQ(1, run.exitCode);
  EXPECT_NE(std::string::npos, run.err.find("error at offset " + At(controller))) << run.err;
  EXPECT_NE(std::string::npos, run.err.find("expected an entry of type MCET, found 'MXET'")) << run.err;
  // The reader agrees that the record is broken.
  ToolRun shown = RunTool({"record", "show", copy, "--at", At(kFsblSlot)});
  EXPECT_EQ(1, shown.exitCode);
}

TEST(RecordCheck, NamesTheOffsetOfASizeThatRunsPastItsContainer) {
  ScratchDir dir;
  std::vector<unsigned char> image = ReadFile(kNorImage);
  size_t device = Find(image, "DEVC", kFsblSlot);
  ASSERT_NE(std::string::npos, device);
  image[device + 4] = 0x7F;  // the DEVC entry's size field
  std::string copy = dir.Write("nor.bin", image);
  ToolRun run = RunTool({"--json", "record", "check", copy, "--at", At(kFsblSlot)});
  EXPECT_EQ(1, run.exitCode);
  EXPECT_NE(std::string::npos, run.out.find("\"offset\": " + std::to_string(device + 4))) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("\"ok\": false")) << run.out;
}

}  // namespace
