#include "stbplat/subsystem_init.h"

#include <gtest/gtest.h>

#include "support/log_capture.h"

namespace {
int g_tokenThreadStarts = 0;
constexpr int kPlatformResult = 77;
}  // namespace

// Stands in for the platform library's entry point in this executable, so the
// test sees what ZanSubSystemInit passes on and returns.
extern "C" int StartTokenAgingThread(void) {
  ++g_tokenThreadStarts;
  return kPlatformResult;
}

namespace {

TEST(SubsystemInit, ZanForwardsToThePlatformHWSpecificLogsATrace) {
  EXPECT_EQ(ZanSubSystemInit(), kPlatformResult);
  EXPECT_EQ(g_tokenThreadStarts, 1);
  stbplat::test::LogCapture capture;
  capture.SetLevel(eLogModuleHWSpecific, 5);
  HWSpecificInit();
  EXPECT_TRUE(capture.messages().empty());
  capture.SetLevel(eLogModuleHWSpecific, 6);
  HWSpecificInit();
  ASSERT_EQ(capture.messages().size(), 1u);
  const stbplat::test::LogMessage& m = capture.messages()[0];
  EXPECT_EQ(m.module, 11);
  EXPECT_EQ(m.level, 6u);
  EXPECT_EQ(m.sourceFile, "HWSpecific");
  EXPECT_EQ(m.function, "HWSpecificInit");
  EXPECT_EQ(m.text, "HW Specific Init\n");
}

}  // namespace
