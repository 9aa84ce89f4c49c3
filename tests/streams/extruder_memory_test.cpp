// Extruder over a memory buffer: decoding, return codes, messages and the
// position rules, including the ones kept on purpose.
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "stbplat/extruder.h"
#include "support/log_capture.h"

using stbplat::test::LogCapture;

namespace {

TEST(ExtruderMemory, DecodesEveryWidthBigEndian) {
  const unsigned char bytes[] = {0x12, 0x34, 0x80, 0x01, 0x02, 0x03, 0x04, 0xFF, 0xFE,
                                 0x01, 0x02, 0x03, 0x04, 0x05, 0x06, 0x07, 0x08, 0xAB};
  Extruder in(bytes, sizeof bytes);
  unsigned short u16 = 0;
  short s16 = 0;
  unsigned int u32 = 0;
  unsigned long u64 = 0;
  unsigned char last = 0;
  EXPECT_EQ(in.extrude(&u16), 0u);
  EXPECT_EQ(u16, 0x1234);
  EXPECT_EQ(in.extrude(&s16), 0u);
  EXPECT_EQ(s16, static_cast<short>(0x8001));
  EXPECT_EQ(in.extrude(&u32), 0u);
  EXPECT_EQ(u32, 0x020304FFu);
  in -= 4;
  int s32 = 0;
  EXPECT_EQ(in.extrude(&s32), 0u);
  EXPECT_EQ(s32, 0x020304FF);
  unsigned char skip = 0;
  EXPECT_EQ(in.extrude(&skip, 1), 0u);
  EXPECT_EQ(skip, 0xFE);
  EXPECT_EQ(in.extrude(&u64), 0u);
  EXPECT_EQ(u64, 0x0102030405060708ul);
  EXPECT_EQ(in.extrude(&last, 1), 1u) << "the last byte exhausts the buffer";
  EXPECT_EQ(last, 0xAB);
}

TEST(ExtruderMemory, LastReadReturnsOneThenTwoWithMessage) {
  const unsigned char bytes[] = {0x12, 0x34};
  Extruder in(bytes, sizeof bytes);
  LogCapture log;
  unsigned short value = 0;
  EXPECT_EQ(in.extrude(&value), 1u);
  EXPECT_EQ(value, 0x1234);
  EXPECT_EQ(in.extrude(&value), 2u);
  ASSERT_EQ(log.messages().size(), 1u);
  EXPECT_EQ(log.messages()[0].text, "Can't extrude uint16_t, bytesLeft = 0\r\n");
  EXPECT_EQ(log.messages()[0].module, 0);
  EXPECT_EQ(log.messages()[0].level, 2u);
  EXPECT_EQ(log.messages()[0].sourceFile, "../extruder");
  EXPECT_EQ(log.messages()[0].function, "extrude");
}

TEST(ExtruderMemory, RefusedReadsLeaveThePositionAndNameTheirWidth) {
  const unsigned char bytes[] = {1, 2, 3};
  Extruder in(bytes, sizeof bytes);
  LogCapture log;
  unsigned int u32 = 0xDEADBEEF;
  unsigned long u64 = 0;
  bool flag = false;
  unsigned char array[5] = {};
  EXPECT_EQ(in.extrude(&u32), 2u);
  EXPECT_EQ(u32, 0xDEADBEEFu) << "nothing is decoded on failure";
  EXPECT_EQ(in.extrude(&u64), 2u);
  EXPECT_EQ(in.extrude(array, 5), 2u);
  EXPECT_EQ(in.pCurrent, bytes);
  EXPECT_EQ(in.bytesLeft, 3u);
  in += 3;
  EXPECT_EQ(in.extrude(&flag), 2u);
  EXPECT_EQ(log.texts(), (std::vector<std::string>{
                             "Can't extrude uint32_t, bytesLeft = 3\r\n",
                             "Can't extrude uint64_t, bytesLeft = 3\r\n",
                             "Can't extrude array of 5 bytes, bytesLeft = 3\r\n",
                             "Can't extrude bool, bytesLeft = 0\r\n"}));
}

TEST(ExtruderMemory, BoolKeepsTheRawByte) {
  const unsigned char bytes[] = {0x02};
  Extruder in(bytes, 1);
  bool flag = false;
  EXPECT_EQ(in.extrude(&flag), 1u);
  unsigned char raw = 0;
  std::memcpy(&raw, &flag, 1);
  EXPECT_EQ(raw, 0x02);
}

TEST(ExtruderMemory, MessagesAreGatedByModuleZeroLevel) {
  const unsigned char bytes[] = {1};
  Extruder in(bytes, 1);
  LogCapture log(0);
  log.SetLevel(eLogModuleByteStreams, 1);
  unsigned int value = 0;
  EXPECT_EQ(in.extrude(&value), 2u) << "the status does not depend on the log level";
  EXPECT_TRUE(log.messages().empty());
  log.SetLevel(eLogModuleByteStreams, 2);
  EXPECT_EQ(in.extrude(&value), 2u);
  EXPECT_EQ(log.messages().size(), 1u);
}

TEST(ExtruderMemory, AdvancePastTheEndStopsAtTheEnd) {
  const unsigned char bytes[8] = {};
  Extruder in(bytes, sizeof bytes);
  LogCapture log;
  in += 3;
  EXPECT_EQ(in.bytesLeft, 5u);
  in += 10;
  EXPECT_EQ(in.pCurrent, bytes + 8);
  EXPECT_EQ(in.bytesLeft, 0u);
  EXPECT_EQ(log.texts(), std::vector<std::string>{"Unable to advance 10 bytes, bytesLeft = 5\r\n"});
  EXPECT_EQ(log.messages()[0].function, "operator+=");
}

TEST(ExtruderMemory, GoingBackTooFarRewindsAndSetsBytesLeftToTheRequest) {
  const unsigned char bytes[10] = {};
  Extruder in(bytes, sizeof bytes);
  in += 4;
  in -= 2;
  EXPECT_EQ(in.pCurrent, bytes + 2);
  EXPECT_EQ(in.bytesLeft, 8u);
  LogCapture log;
  in -= 5;
  EXPECT_EQ(in.pCurrent, bytes);
  EXPECT_EQ(in.bytesLeft, 5u) << "kept: bytesLeft becomes n, not length";
  EXPECT_EQ(log.texts(), std::vector<std::string>{"Unable to go back 5 bytes, length-count = 5\r\n"});
}

TEST(ExtruderMemory, BytesLeftOverstatedByAQuirkNeverReadsPastTheBuffer) {
  const unsigned char bytes[4] = {1, 2, 3, 4};
  Extruder in(bytes, sizeof bytes);
  in += 1;
  in -= 100;  // bytesLeft is now 100 over a 4-byte buffer
  EXPECT_EQ(in.bytesLeft, 100u);
  unsigned char out[8];
  EXPECT_EQ(in.extrude(out, 8), 2u);
  unsigned int value = 0;
  EXPECT_EQ(in.extrude(&value), 0u);
  EXPECT_EQ(value, 0x01020304u);
}

TEST(ExtruderMemory, SetPMovesWithinAndRefusesBeyondTheEnd) {
  const unsigned char storage[8] = {0, 1, 2, 3, 4, 5, 6, 7};
  const unsigned char* bytes = storage;
  Extruder in(bytes, 6);
  EXPECT_TRUE(in.setP(const_cast<unsigned char*>(bytes) + 4));
  EXPECT_EQ(in.getP(), bytes + 4);
  EXPECT_EQ(in.bytesLeft, 2u);
  EXPECT_TRUE(in.setP(const_cast<unsigned char*>(bytes) + 6));
  EXPECT_EQ(in.bytesLeft, 0u);
  LogCapture log;
  EXPECT_FALSE(in.setP(const_cast<unsigned char*>(bytes) + 7));
  EXPECT_EQ(in.getP(), bytes + 6);
  ASSERT_EQ(log.messages().size(), 1u);
  EXPECT_EQ(log.messages()[0].format,
            "Unable to setP, pNewCurr = 0x%8p, pStart = 0x%8p, length = 0x%08X\r\n");
  EXPECT_EQ(log.messages()[0].function, "setP");
}

TEST(ExtruderMemory, SetLengthAdjustsBytesLeftByTheDifference) {
  const unsigned char bytes[10] = {};
  Extruder in(bytes, sizeof bytes);
  in += 2;
  in.SetLength(6);
  EXPECT_EQ(in.length, 6u);
  EXPECT_EQ(in.bytesLeft, 4u);
  in.SetLength(9);
  EXPECT_EQ(in.bytesLeft, 7u);
  EXPECT_EQ(in.count(), 7u);
}

TEST(ExtruderMemory, IncrementAndDecrementGoThroughTheVirtualMoves) {
  const unsigned char bytes[3] = {};
  Extruder in(bytes, sizeof bytes);
  ++in;
  ++in;
  --in;
  EXPECT_EQ(in.pCurrent, bytes + 1);
  EXPECT_EQ(in.bytesLeft, 2u);
}

TEST(ExtruderMemory, Positions64BitOnlyMoveFlashStreams) {
  const unsigned char bytes[3] = {};
  Extruder in(bytes, sizeof bytes);
  EXPECT_FALSE(in.Is64Address());
  EXPECT_TRUE(in.setP64(0x1234));
  EXPECT_EQ(in.getP64(), 0u) << "setP64 does nothing outside NAND and eMMC";
  EXPECT_EQ(in.pCurrent, bytes);
}

struct BitCase {
  unsigned char byte0;
  unsigned char byte1;
  unsigned int width;
  unsigned int highBit;
  unsigned int rc;
  unsigned int value;
};

class ExtruderBitField : public testing::TestWithParam<BitCase> {};

TEST_P(ExtruderBitField, ReadsOneUnit) {
  const BitCase& c = GetParam();
  const unsigned char bytes[] = {c.byte0, c.byte1, 0xEE};
  Extruder in(bytes, sizeof bytes);
  UXB cell;
  cell.word = 0xFFFF;
  EXPECT_EQ(in.extrude(&cell, c.width, c.highBit), c.rc);
  if (c.rc == 0) {
    if (c.width > 8) {
      EXPECT_EQ(cell.word, c.value);
      EXPECT_EQ(in.bytesLeft, 1u);
    } else {
      EXPECT_EQ(cell.byte, c.value);
      EXPECT_EQ(in.bytesLeft, 2u);
    }
  } else {
    EXPECT_EQ(in.bytesLeft, 3u);
  }
}

INSTANTIATE_TEST_SUITE_P(
    Fields, ExtruderBitField,
    testing::Values(BitCase{0x68, 0, 3, 5, 0, 0x5},          // 0110_1000: bits 5..3 = 101
                    BitCase{0x68, 0, 1, 3, 0, 0x1},          // width 1: mask 1
                    BitCase{0x68, 0, 4, 0xFFFFFFFF, 0, 0x6}, // top bit of the byte: no mask
                    BitCase{0xF0, 0, 8, 7, 0, 0xF0},
                    BitCase{0x12, 0x34, 12, 11, 0, 0x234},   // 16-bit unit, big-endian
                    BitCase{0x12, 0x34, 9, 0xFFFFFFFF, 0, 0x1234 >> 7},
                    BitCase{0x12, 0x34, 17, 5, 4, 0},        // too wide
                    BitCase{0x12, 0x34, 0, 5, 4, 0},         // zero width
                    BitCase{0x12, 0x34, 4, 2, 4, 0},         // field below bit 0
                    BitCase{0x12, 0x34, 4, 200, 4, 0}));     // shift wider than a word

TEST(ExtruderBitFieldEdges, SixteenBitUnitNeedsTwoBytes) {
  const unsigned char bytes[] = {0xAB};
  Extruder in(bytes, 1);
  UXB cell;
  EXPECT_EQ(in.extrude(&cell, 12, 11), 2u);
  EXPECT_EQ(in.extrude(&cell, 4, 7), 1u);
  EXPECT_EQ(cell.byte, 0xA);
}

}  // namespace
