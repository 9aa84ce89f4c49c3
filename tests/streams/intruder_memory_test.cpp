// Intruder over memory: encoding, full and failed writes, growth and the
// behaviours kept on purpose (the bool write, the resize gap).
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "stbplat/intruder.h"
#include "support/log_capture.h"

using stbplat::test::LogCapture;

namespace {

std::vector<unsigned char> Written(const Intruder& out) {
  return std::vector<unsigned char>(out.pStart, out.pStart + (out.pCurrent - out.pStart));
}

TEST(IntruderMemory, EncodesEveryWidthBigEndian) {
  unsigned char buffer[32] = {};
  Intruder out(buffer, sizeof buffer);
  EXPECT_EQ(out.intrude(static_cast<unsigned short>(0x1234)), 1u);
  EXPECT_EQ(out.intrude(static_cast<short>(-2)), 1u);
  EXPECT_EQ(out.intrude(0x01020304u), 1u);
  EXPECT_EQ(out.intrude(-1), 1u);
  EXPECT_EQ(out.intrude(0x1122334455667788ul), 1u);
  EXPECT_EQ(out.intrude(static_cast<unsigned char>(0xAB)), 1u);
  const unsigned char tail[] = {'x', 'y', 'z'};
  EXPECT_EQ(out.intrude(tail, 3), 1u);
  EXPECT_EQ(Written(out), (std::vector<unsigned char>{0x12, 0x34, 0xFF, 0xFE, 1, 2, 3, 4, 0xFF,
                                                      0xFF, 0xFF, 0xFF, 0x11, 0x22, 0x33, 0x44,
                                                      0x55, 0x66, 0x77, 0x88, 0xAB, 'x', 'y', 'z'}));
  EXPECT_EQ(out.bytesLeft, 8u);
}

TEST(IntruderMemory, FillingReturnsTwoThenOverflowReturnsThreeWithMessage) {
  unsigned char buffer[4] = {};
  Intruder out(buffer, sizeof buffer);
  EXPECT_EQ(out.intrude(0x01020304u), 2u);
  EXPECT_EQ(Written(out), (std::vector<unsigned char>{1, 2, 3, 4}));
  LogCapture log;
  EXPECT_EQ(out.intrude(static_cast<unsigned char>(5)), 3u);
  EXPECT_EQ(out.pCurrent, buffer + 4);
  ASSERT_EQ(log.messages().size(), 1u);
  EXPECT_EQ(log.messages()[0].text, "Can't intrude 1 bytes, bytesLeft = 0\r\n");
  EXPECT_EQ(log.messages()[0].sourceFile, "../intruder");
  EXPECT_EQ(log.messages()[0].function, "verify");
}

TEST(IntruderMemory, BoolWriteIgnoresVerify) {
  unsigned char buffer[2] = {0xEE, 0xEE};
  Intruder out(buffer, 1);
  EXPECT_EQ(out.intrude(true), 2u);
  EXPECT_EQ(buffer[0], 1);
  // Full, no growth: nothing is written, yet the result is 2 (from bytesLeft).
  EXPECT_EQ(out.intrude(true), 2u);
  EXPECT_EQ(buffer[1], 0xEE);
  EXPECT_EQ(out.pCurrent, buffer + 1);
}

TEST(IntruderMemory, OwnedBufferGrowsByTheLargerOfStepAndRequest) {
  Intruder out(4u, 0u);
  ASSERT_NE(out.pStart, nullptr);
  EXPECT_TRUE(out.ownsBuffer);
  EXPECT_EQ(out.growthStep, 0u) << "this constructor never grows on its own";
  out.growthStep = 16;
  EXPECT_EQ(out.intrude(0xA1A2A3A4u), 2u);
  EXPECT_EQ(out.intrude(0x0102030405060708ul), 1u);
  EXPECT_EQ(out.length, 20u);
  EXPECT_EQ(out.bytesLeft, 8u);
  EXPECT_EQ(Written(out),
            (std::vector<unsigned char>{0xA1, 0xA2, 0xA3, 0xA4, 1, 2, 3, 4, 5, 6, 7, 8}));
}

TEST(IntruderMemory, FallbackSizeServesWhenInitialIsZero) {
  Intruder out(0u, 6u);
  EXPECT_EQ(out.length, 6u);
  EXPECT_EQ(out.bytesLeft, 6u);
}

TEST(IntruderMemory, ResizeResumesAtTheOldEndLeavingAGap) {
  Intruder out(6u, 0u);
  out.growthStep = 4;
  EXPECT_EQ(out.intrude(0x11223344u), 1u);  // 2 bytes left
  std::memset(out.pCurrent, 0xCC, 2);       // the old unused tail
  EXPECT_EQ(out.intrude(0x55667788u), 1u);
  EXPECT_EQ(out.length, 10u);
  EXPECT_EQ(out.bytesLeft, 2u) << "2 + 4 - 4: overstates the real room by the gap";
  EXPECT_EQ(Written(out),
            (std::vector<unsigned char>{0x11, 0x22, 0x33, 0x44, 0xCC, 0xCC, 0x55, 0x66, 0x77, 0x88}));
  // The overstated room is never written past the buffer: the write grows it.
  EXPECT_EQ(out.intrude(static_cast<unsigned short>(0x99AA)), 1u);
  EXPECT_EQ(out.pStart[10], 0x99);
}

TEST(IntruderMemory, PositionMovesPatchEarlierFields) {
  unsigned char buffer[8] = {};
  Intruder out(buffer, sizeof buffer);
  out.intrude(0u);
  out.intrude(static_cast<unsigned short>(0xBEEF));
  unsigned char* end = out.getP();
  out -= 6;
  out.intrude(6u);
  EXPECT_TRUE(out.setP(end));
  EXPECT_EQ(out.bytesLeft, 2u);
  EXPECT_EQ(std::vector<unsigned char>(buffer, buffer + 6),
            (std::vector<unsigned char>{0, 0, 0, 6, 0xBE, 0xEF}));
}

TEST(IntruderMemory, WritesReadBackThroughAnExtruder) {
  Intruder out(64u, 0u);
  out.intrude(0xCAFEu);
  out.intrude(static_cast<unsigned short>(7));
  out.intrude(0xFFFFFFFFFFFFFFFEul);
  Extruder in(out.pStart, static_cast<unsigned int>(out.pCurrent - out.pStart));
  unsigned int a = 0;
  unsigned short b = 0;
  unsigned long c = 0;
  EXPECT_EQ(in.extrude(&a), 0u);
  EXPECT_EQ(in.extrude(&b), 0u);
  EXPECT_EQ(in.extrude(&c), 1u);
  EXPECT_EQ(a, 0xCAFEu);
  EXPECT_EQ(b, 7);
  EXPECT_EQ(c, 0xFFFFFFFFFFFFFFFEul);
}

}  // namespace
