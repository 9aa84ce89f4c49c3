// Front-panel display entry: golden bytes, display prefix clamp and the
// bounded text.
#include <gtest/gtest.h>

#include <string>

#include "record_test_util.h"
#include "stbplat/front_panel.h"

namespace {

using namespace records_test;
using stbplat::test::LogCapture;

TEST(FrontPanel, GoldenRecordReadsAndStoresBack) {
  const Bytes golden = Golden("afpd.bin");
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  AnimatedFrontPanelDisplayEntry e;
  EXPECT_EQ(e.entryType, 0x41465044u);
  ASSERT_EQ(e.ReadTLVAndData(in, nullptr), 0u);
  ASSERT_EQ(e.text.length, 6u);
  EXPECT_STREQ(reinterpret_cast<const char*>(e.text.GetData()), "HELLO");

  EXPECT_EQ(Stored(e, golden.size()), golden);
}

TEST(FrontPanel, MajorVersionOneIsRefused) {
  Bytes bytes = Golden("afpd.bin");
  bytes[10] = 1;
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  AnimatedFrontPanelDisplayEntry e;
  EXPECT_EQ(e.ReadTLVAndData(in, nullptr), 0xA011u);
  EXPECT_EQ(e.text.GetData(), nullptr);
}

TEST(FrontPanel, ReadAndStoreFailuresAreNested) {
  Bytes bytes = Entry("AFPD", Entry("VERS", {}));
  Extruder in(bytes.data(), static_cast<unsigned int>(bytes.size()));
  AnimatedFrontPanelDisplayEntry e;
  LogCapture capture;
  EXPECT_EQ(e.ReadTLVAndData(in, nullptr), 0xA004u);
  EXPECT_EQ(RecordTexts(capture).back(), "Error reading text\r\n");
  EXPECT_EQ(in.bytesLeft, 0u);

  e.text.CreateData(4);
  unsigned char buffer[6];
  Intruder out(buffer, sizeof buffer);
  capture.Clear();
  EXPECT_EQ(e.Store(&out), 0xA004u);
  EXPECT_EQ(RecordTexts(capture).back(), "Error writing text\r\n");
}

TEST(FrontPanel, DisplayPrefixIsClampedAndTextFollows) {
  const Bytes golden = Golden("afpd.bin");
  Extruder in(golden.data(), static_cast<unsigned int>(golden.size()));
  AnimatedFrontPanelDisplayEntry e;
  ASSERT_EQ(e.ReadTLVAndData(in, nullptr), 0u);
  const struct {
    unsigned char indent;
    size_t spaces;
  } cases[] = {{0, 0}, {3, 3}, {99, 99}, {200, 99}};
  for (const auto& c : cases) {
    LogCapture capture;
    e.Display(c.indent);
    ASSERT_EQ(capture.messages().size(), 2u);
    EXPECT_EQ(capture.messages()[0].format, "%s");
    EXPECT_EQ(capture.messages()[0].text, std::string(c.spaces, ' '));
    EXPECT_EQ(capture.messages()[1].text, "AnimatedFrontPanelDisplayEntry text = HELLO\r\n");
    EXPECT_EQ(capture.messages()[1].level, 4u);
  }
  LogCapture quiet(3);
  e.Display(1);
  EXPECT_TRUE(quiet.messages().empty());
}

TEST(FrontPanel, UnterminatedTextIsShownUpToItsLength) {
  AnimatedFrontPanelDisplayEntry e;
  e.text.CreateData(3, reinterpret_cast<const unsigned char*>("ABC"));
  LogCapture capture;
  e.Display(0);
  EXPECT_EQ(capture.texts().at(1), "AnimatedFrontPanelDisplayEntry text = ABC\r\n");
}

}  // namespace
