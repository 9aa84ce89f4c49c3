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

TEST(DumpBuffer, LinesOfSixteenWithPaddingAndDots) {
  std::vector<unsigned char> row;
  for (unsigned char b = 0x30; b < 0x40; ++b) row.push_back(b);
  EXPECT_EQ(Dump(2, row), (std::vector<std::string>{
                              "  30 31 32 33 34 35 36 37 38 39 3A 3B 3C 3D 3E 3F      "
                              "0123456789:;<=>?\r\n"}));
  std::vector<unsigned char> seventeen(17, 0xAB);
  seventeen[16] = 'z';
  EXPECT_EQ(Dump(0, seventeen),
            (std::vector<std::string>{
                "AB AB AB AB AB AB AB AB AB AB AB AB AB AB AB AB      ................\r\n",
                "7A " + std::string(45, ' ') + "     z" + std::string(15, ' ') + "\r\n"}));
  EXPECT_EQ(Dump(1, {0x41, 0x00, 0x7F}),
            (std::vector<std::string>{" 41 00 7F " + std::string(39, ' ') + "     A.." +
                                      std::string(13, ' ') + "\r\n"}));
  // The indent is clamped to 103.
  EXPECT_EQ(Dump(200, {0x20}), Dump(103, {0x20}));
  EXPECT_EQ(Dump(200, {0x20})[0].substr(100, 7), "   20  ");
}

TEST(DumpBuffer, NothingToDumpAndLevelGate) {
  LogCapture capture;
  const unsigned char bytes[40] = {};
  DumpBuffer(kModule, 4, nullptr, 5);
  DumpBuffer(kModule, 4, bytes, 0);
  EXPECT_EQ(capture.texts(), (std::vector<std::string>{"<none>\r\n", "<none>\r\n"}));
  capture.Clear();
  capture.SetLevel(kModule, 3);
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
