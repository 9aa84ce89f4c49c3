#include "stbplat/display_utils.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/log_capture.h"

namespace {

using stbplat::test::LogCapture;

const etLogUtilModuleId kModule = eLogModuleRecords;

std::vector<std::string> Dump(unsigned char indent, const std::vector<unsigned char>& bytes) {
  LogCapture capture;
  DumpBuffer(kModule, indent, bytes.data(), static_cast<unsigned int>(bytes.size()));
  for (const auto& m : capture.messages()) {
    EXPECT_EQ(m.module, kModule);
    EXPECT_EQ(m.level, 4u);
    EXPECT_EQ(m.function, "DumpBuffer");
  }
  return capture.texts();
}

TEST(DumpBuffer, SixteenBytesMakeOneLine) {
  std::vector<unsigned char> bytes;
  for (unsigned char b = 0x30; b < 0x40; ++b) bytes.push_back(b);
  std::vector<std::string> lines = Dump(2, bytes);
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_EQ(lines[0],
            "  30 31 32 33 34 35 36 37 38 39 3A 3B 3C 3D 3E 3F      0123456789:;<=>?\r\n");
}

TEST(DumpBuffer, SeventeenthBytePadsASecondLine) {
  std::vector<unsigned char> bytes(17, 0xAB);
  bytes[16] = 'z';
  std::vector<std::string> lines = Dump(0, bytes);
  ASSERT_EQ(lines.size(), 2u);
  EXPECT_EQ(lines[0],
            "AB AB AB AB AB AB AB AB AB AB AB AB AB AB AB AB      ................\r\n");
  EXPECT_EQ(lines[1], "7A " + std::string(45, ' ') + "     z" + std::string(15, ' ') + "\r\n");
}

TEST(DumpBuffer, UnprintableBytesShowAsDots) {
  std::vector<std::string> lines = Dump(1, {0x41, 0x00, 0x7F});
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_EQ(lines[0],
            " 41 00 7F " + std::string(39, ' ') + "     A.." + std::string(13, ' ') + "\r\n");
}

TEST(DumpBuffer, NothingToDump) {
  LogCapture capture;
  const unsigned char byte = 1;
  DumpBuffer(kModule, 4, nullptr, 5);
  DumpBuffer(kModule, 4, &byte, 0);
  EXPECT_EQ(capture.texts(), (std::vector<std::string>{"<none>\r\n", "<none>\r\n"}));
}

TEST(DumpBuffer, IndentIsClampedTo103) {
  std::vector<std::string> lines = Dump(200, {0x20});
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_EQ(lines[0].find_first_not_of(' '), 103u);
  EXPECT_EQ(lines[0].substr(103, 3), "20 ");
  lines = Dump(103, {0x20});
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_EQ(lines[0].find_first_not_of(' '), 103u);
}

TEST(DumpBuffer, GatedByTheModuleLevel) {
  LogCapture capture;
  capture.SetLevel(kModule, 3);
  const unsigned char bytes[40] = {};
  DumpBuffer(kModule, 0, bytes, sizeof bytes);
  DumpBuffer(kModule, 0, nullptr, 0);
  EXPECT_TRUE(capture.messages().empty());
  capture.SetLevel(kModule, 4);
  DumpBuffer(kModule, 0, bytes, sizeof bytes);
  EXPECT_EQ(capture.messages().size(), 3u);
  capture.Clear();
  DumpBuffer(static_cast<etLogUtilModuleId>(eLogModuleCount), 0, bytes, sizeof bytes);
  EXPECT_TRUE(capture.messages().empty());
}

}  // namespace
