// The platform stand-in's own log service: levels from STBPLAT_LOG_LEVEL and
// the line written to standard error. Built without the tests' log capture.
#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "stbplat/log.h"

namespace {

TEST(PlatformLog, LevelsFollowTheEnvironment) {
  const char* expected = std::getenv("EXPECTED_LEVELS");
  if (expected == nullptr) GTEST_SKIP() << "ctest runs it with each STBPLAT_LOG_LEVEL and the levels it gives";
  std::string levels;
  for (int m : {0, 2, 3, 11, 18, 31})
    levels += (levels.empty() ? "" : ",") + std::to_string(m) + "=" +
              std::to_string(subSystemLogLevel[m]);
  EXPECT_EQ(levels, expected);
}

TEST(PlatformLog, WritesPrefixAndMessageToStandardError) {
  testing::internal::CaptureStderr();
  GlobalLogUtilAdd(eLogModuleFlashAccess, 2, "../FlashInterface", 10, "NANDRead",
                   "NANDRead: LookupMTDPartition for %s failed\r\n", "NAND0.KERNEL.A");
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "[m2 l2 NANDRead] NANDRead: LookupMTDPartition for NAND0.KERNEL.A failed\r\n");
}

}  // namespace
