// The platform stand-in's own log service: levels from STBPLAT_LOG_LEVEL and
// the line written to standard error. Built without the tests' log capture.
#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "stbplat/log.h"

namespace {

std::string Expected() {
  const char* e = std::getenv("EXPECTED_LEVELS");
  return e ? e : "";
}

std::string Levels() {
  std::string out;
  for (int m : {0, 2, 3, 11, 18, 31}) {
    if (!out.empty()) out += ",";
    out += std::to_string(m) + "=" + std::to_string(subSystemLogLevel[m]);
  }
  return out;
}

TEST(PlatformLog, LevelsFollowTheEnvironment) { EXPECT_EQ(Levels(), Expected()); }

TEST(PlatformLog, WritesPrefixAndMessageToStandardError) {
  testing::internal::CaptureStderr();
  GlobalLogUtilAdd(eLogModuleFlashAccess, 2, "../FlashInterface", 10, "NANDRead",
                   "NANDRead: LookupMTDPartition for %s failed\r\n", "NAND0.KERNEL.A");
  std::string err = testing::internal::GetCapturedStderr();
  EXPECT_EQ(err, "[m2 l2 NANDRead] NANDRead: LookupMTDPartition for NAND0.KERNEL.A failed\r\n");
}

}  // namespace
