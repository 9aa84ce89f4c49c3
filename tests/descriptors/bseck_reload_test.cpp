// Boot security reload record: golden bytes, partial lists, equality and the
// display lines.
#include <gtest/gtest.h>

#include <string>

#include "record_test_util.h"
#include "stbplat/bseck_reload.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

TEST(BseckReload, GoldenRecordReadsFieldByField) {
  const Bytes golden = Golden("bseck.bin");
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  BseckReloadDescriptor d;
  ASSERT_EQ(d.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_EQ(d.entryType, 0x4253434Bu);
  EXPECT_EQ(d.ExecutingType, 2);
  ASSERT_EQ(d.ReloadErrors.size(), 3u);
  EXPECT_EQ(d.ReloadErrors[0].flags, 1);
  EXPECT_EQ(d.ReloadErrors[0].majorVer, 1);
  EXPECT_EQ(d.ReloadErrors[0].minorVer, 2);
  EXPECT_EQ(d.ReloadErrors[0].Type, 0x10);
  EXPECT_EQ(d.ReloadErrors[0].Error, 0xE001);
  // Elements carry no version check of their own.
  EXPECT_EQ(d.ReloadErrors[2].flags, 0xFFFF);
  EXPECT_EQ(d.ReloadErrors[2].majorVer, 9);
  EXPECT_EQ(d.ReloadErrors[2].Error, 0xE003);
  EXPECT_EQ(Stored(d, golden.size()), golden);
}

TEST(BseckReload, ZeroCountIsAnEmptyList) {
  Bytes bytes = Entry("BSCK", {0, 7, 0, 0});
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  BseckReloadDescriptor d;
  d.ReloadErrors.resize(2);
  EXPECT_EQ(d.ReadTLVAndData(in, nullptr), 0u);
  EXPECT_TRUE(d.ReloadErrors.empty());
  EXPECT_EQ(d.ExecutingType, 7);
}

TEST(BseckReload, StreamEndingInsideTheThirdElementKeepsTwo) {
  const Bytes golden = Golden("bseck.bin");
  // The payload itself, cut 3 bytes into the third element.
  Bytes payload(golden.begin() + 12, golden.begin() + 12 + 4 + 16 + 3);
  Extruder in(payload.data(), static_cast<unsigned int>(payload.size()));
  BseckReloadDescriptor d;
  LogCapture capture;
  EXPECT_EQ(d.Read(in, 0), 0xA012u);
  ASSERT_EQ(d.ReloadErrors.size(), 2u);
  EXPECT_EQ(d.ReloadErrors[1].Error, 0xE002);
  EXPECT_EQ(RecordTexts(capture),
            (std::vector<std::string>{"Error reading minorVer\r\n", "Error reading ReloadErrors\r\n"}));
}

TEST(BseckReload, HugeCountStopsAtTheStreamEnd) {
  Bytes payload = {0, 1, 0xFF, 0xFF, 0, 0, 1, 1, 0, 5, 0, 6};
  Extruder in(payload.data(), static_cast<unsigned int>(payload.size()));
  BseckReloadDescriptor d;
  EXPECT_EQ(d.Read(in, 0), 0xA012u);
  EXPECT_EQ(d.ReloadErrors.size(), 1u);
}

TEST(BseckReload, FieldMessages) {
  const struct {
    unsigned int keep;
    const char* message;
  } cases[] = {{1, "Error reading ExecutingType\r\n"},
               {3, "Error reading numReloadError\r\n"}};
  for (const auto& c : cases) {
    Bytes payload(c.keep, 0);
    Extruder in(payload.data(), c.keep);
    BseckReloadDescriptor d;
    LogCapture capture;
    EXPECT_EQ(d.Read(in, 0), 0xA012u);
    EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{c.message});
  }
  const char* const element[] = {"Error reading flags\r\n", nullptr, "Error reading majorVer\r\n",
                                 "Error reading minorVer\r\n", "Error reading Type\r\n", nullptr,
                                 "Error reading Error\r\n"};
  const Bytes full = {0, 1, 2, 3, 0, 4, 0, 5};
  for (unsigned int keep = 0; keep < 7; ++keep) {
    if (element[keep] == nullptr) continue;
    Extruder in(full.data(), keep);
    BseckReloadError e;
    LogCapture capture;
    EXPECT_EQ(e.Read(in), 0xA012u) << keep;
    EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{element[keep]}) << keep;
  }
}

TEST(BseckReload, StoreMessages) {
  BseckReloadDescriptor d;
  d.ReloadErrors.resize(1);
  const struct {
    unsigned int room;
    const char* message;
    unsigned int status;
  } cases[] = {{1, "Error writing ExecutingType\r\n", 0xA012},
               {3, "Error writing numReloadError\r\n", 0xA012},
               {5, "Error writing ReloadErrors\r\n", 0xA004}};
  for (const auto& c : cases) {
    Bytes buffer(c.room);
    Intruder out(buffer.data(), c.room);
    LogCapture capture;
    EXPECT_EQ(d.Store(&out), c.status);
    EXPECT_EQ(RecordTexts(capture).back(), c.message);
  }
  const char* const element[] = {"Error writing flags\r\n", nullptr, "Error writing majorVer\r\n",
                                 "Error writing minorVer\r\n", "Error writing Type\r\n", nullptr,
                                 "Error writing Error\r\n"};
  for (unsigned int room = 0; room < 7; ++room) {
    if (element[room] == nullptr) continue;
    Bytes buffer(8);
    Intruder out(buffer.data(), room);
    LogCapture capture;
    EXPECT_EQ(d.ReloadErrors[0].Store(&out), 0xA012u);
    EXPECT_EQ(RecordTexts(capture), std::vector<std::string>{element[room]});
  }
}

TEST(BseckReloadError, EqualityIgnoresFlagsAndVersions) {
  BseckReloadError a;
  BseckReloadError b;
  a.Type = b.Type = 3;
  a.Error = b.Error = 0x42;
  a.flags = 1;
  b.flags = 2;
  a.majorVer = 7;
  EXPECT_TRUE(a == b);
  b.Error = 0x43;
  EXPECT_FALSE(a == b);
  b.Error = 0x42;
  b.Type = 4;
  EXPECT_FALSE(a == b);
}

TEST(BseckReloadError, DisplayLinesAndIndentClamp) {
  BseckReloadError e;
  e.Type = 0x1A;
  e.Error = 0xBEEF;
  {
    LogCapture capture;
    e.Display(2);
    ASSERT_EQ(capture.messages().size(), 2u);
    EXPECT_EQ(capture.messages()[0].text, "  Type                 = 0x001A\r\n");
    EXPECT_EQ(capture.messages()[1].text, "  Error                = 0xBEEF\r\n");
    EXPECT_EQ(capture.messages()[0].format, "%s");
    EXPECT_EQ(capture.messages()[0].level, 4u);
    EXPECT_EQ(capture.messages()[0].module, eLogModuleRecords);
  }
  for (unsigned char indent : {199, 200, 255}) {
    LogCapture capture;
    e.Display(indent);
    EXPECT_EQ(capture.texts(), std::vector<std::string>(2, std::string(199, ' '))) << int(indent);
  }
  {
    // The line is cut to the buffer's size less one, behind the indent.
    LogCapture capture;
    e.Display(190);
    EXPECT_EQ(capture.texts()[0], std::string(190, ' ') + "Type    ");
  }
  {
    LogCapture capture(3);
    e.Display(0);
    EXPECT_TRUE(capture.messages().empty());
  }
}

}  // namespace
