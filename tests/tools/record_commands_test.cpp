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
constexpr unsigned long kBuildSlot = 0x20000;
constexpr unsigned long kPanelSlot = 0x30000;

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

TEST(RecordShow, DecodesTheBootLoaderRecordFromAnImage) {
  ToolRun run = RunTool({"record", "show", kNorImage, "--at", At(kFsblSlot)});
  ASSERT_EQ(0, run.exitCode) << run.err;
  EXPECT_NE(std::string::npos, run.out.find("boot-loader information (FSBLInfo)")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("description: \"FSBL 3.2c (example board)\"")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("memoryControllers: 2")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("scbClock: 432")) << run.out;
  // The reload errors are shown by the library's own display, too.
  EXPECT_NE(std::string::npos, run.out.find("as the library displays it:")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("Error                = 0x0031")) << run.out;
}

TEST(RecordShow, JsonCarriesTheFieldsAsNumbers) {
  ToolRun run = RunTool({"--json", "record", "show", kNorImage, "--at", At(kFsblSlot)});
  ASSERT_EQ(0, run.exitCode) << run.err;
  EXPECT_NE(std::string::npos, run.out.find("\"type\": \"fsbl\"")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("\"segmentPhysicalAddressStart\": 1073741824")) << run.out;
  EXPECT_NE(std::string::npos, run.out.find("\"status\": 0")) << run.out;
}

TEST(RecordShow, DetectsEachTypeFromItsCode) {
  ToolRun build = RunTool({"record", "show", kNorImage, "--at", At(kBuildSlot)});
  EXPECT_EQ(0, build.exitCode) << build.err;
  EXPECT_NE(std::string::npos, build.out.find("(BuildConfig)")) << build.out;
  EXPECT_NE(std::string::npos, build.out.find("gcc 12.2")) << build.out;
  ToolRun panel = RunTool({"record", "show", kNorImage, "--at", At(kPanelSlot)});
  EXPECT_EQ(0, panel.exitCode) << panel.err;
  EXPECT_NE(std::string::npos, panel.out.find("AnimatedFrontPanelDisplayEntry text = HELLO FROM STBPLAT")) << panel.out;
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

TEST(RecordShow, ErasedFlashHoldsNoRecord) {
  // The NOR image's last sector past the front-panel record is erased.
  ToolRun run = RunTool({"record", "show", kNorImage, "--at", "0x3F000"});
  EXPECT_EQ(1, run.exitCode);
  EXPECT_NE(std::string::npos, run.err.find("at 0x3F000 is erased")) << run.err;
  ToolRun check = RunTool({"record", "check", kNorImage, "--at", "0x3F000"});
  EXPECT_EQ(1, check.exitCode);
}

TEST(RecordShow, BadSourceAndTypeAreUsageErrors) {
  ToolRun missing = RunTool({"record", "show", "no/such/file"});
  EXPECT_EQ(2, missing.exitCode);
  EXPECT_NE(std::string::npos, missing.err.find("'no/such/file'")) << missing.err;
  ToolRun longName = RunTool({"record", "show", "NAND0.KERNELIMAGE.A"});
  EXPECT_EQ(2, longName.exitCode);
  EXPECT_NE(std::string::npos, longName.err.find("'KERNELIMAGE'")) << longName.err;
  ToolRun type = RunTool({"record", "show", "--type", "nope", kNorImage});
  EXPECT_EQ(2, type.exitCode);
  EXPECT_NE(std::string::npos, type.err.find("--type nope")) << type.err;
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

TEST(RecordMake, RefusesBadArgumentsByName) {
  ScratchDir dir;
  ToolRun tag = RunTool({"record", "make", "package", "--header", "A.B.C", "-c", "TOOLONG=A.B.C", "-o", dir / "x"});
  EXPECT_EQ(2, tag.exitCode);
  EXPECT_NE(std::string::npos, tag.err.find("TOOLONG")) << tag.err;
  ToolRun where = RunTool({"record", "make", "package", "--header", "nowhere", "-o", dir / "x"});
  EXPECT_EQ(2, where.exitCode);
  EXPECT_NE(std::string::npos, where.err.find("--header 'nowhere'")) << where.err;
  ToolRun letter = RunTool({"record", "make", "version", "--letter", "ab", "-o", dir / "x"});
  EXPECT_EQ(2, letter.exitCode);
  EXPECT_NE(std::string::npos, letter.err.find("--letter 'ab'")) << letter.err;
}

TEST(RecordCheck, AcceptsEveryExampleRecord) {
  for (unsigned long slot : {kFsblSlot, kBuildSlot, kPanelSlot}) {
    ToolRun run = RunTool({"record", "check", kNorImage, "--at", At(slot)});
    EXPECT_EQ(0, run.exitCode) << At(slot) << ": " << run.err;
    EXPECT_EQ(0u, run.out.find("ok: ")) << run.out;
  }
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
