// Streams over memory: big-endian values both ways, the exhausted and full
// codes, refused reads and writes that change nothing, the position rules and
// the bool write kept on purpose, growth, and bit-fields; and the checksums.
#include <gtest/gtest.h>

#include <cstring>

#include "descriptors/record_test_util.h"
#include "stbplat/crc.h"

using stbplat::test::LogCapture;
using namespace records_test;

namespace {

// One value read with the expected code; 7 when nothing was decoded.
template <class T>
T Take(Extruder& in, unsigned int rc = 0) {
  T value = static_cast<T>(7);
  EXPECT_EQ(in.extrude(&value), rc);
  return value;
}

TEST(MemoryStreams, SignedValuesAndBoolsGoOutAndComeBackBigEndian) {
  unsigned char buffer[8] = {};
  Intruder out(buffer, sizeof buffer);
  EXPECT_EQ(out.intrude(static_cast<short>(-2)), 1u);
  EXPECT_EQ(out.intrude(static_cast<unsigned char>(0xAB)), 1u);
  EXPECT_EQ(out.intrude(true), 1u);
  EXPECT_EQ(out.intrude(-0x01020305), 2u) << "exactly full";
  EXPECT_EQ(Written(out), (Bytes{0xFF, 0xFE, 0xAB, 1, 0xFE, 0xFD, 0xFC, 0xFB}));
  buffer[3] = 0x02;  // a bool byte other than 1
  Extruder in(buffer, 8);
  EXPECT_EQ(Take<short>(in), -2);
  in += 1;
  bool flag = false;
  EXPECT_EQ(in.extrude(&flag), 0u);
  EXPECT_EQ(*reinterpret_cast<unsigned char*>(&flag), 0x02) << "the bool keeps the raw byte";
  EXPECT_EQ(Take<int>(in, 1), -0x01020305) << "the last value exhausts the buffer";
  Extruder cut(buffer, 8);
  cut.SetLength(3);  // the end moves, the position stays
  EXPECT_EQ(std::make_pair(cut.length, cut.bytesLeft), std::make_pair(3u, 3u));
}

TEST(MemoryStreams, RefusedReadsAndWritesChangeNothingAndSayWhy) {
  unsigned char bytes[4] = {1, 2, 3, 0xEE};
  Extruder in(bytes, 3);
  LogCapture log;
  EXPECT_EQ(Take<unsigned int>(in, 2), 7u);
  EXPECT_EQ(Take<int>(in, 2), 7);
  EXPECT_EQ(Take<unsigned long>(in, 2), 7u);
  EXPECT_EQ(in.extrude(bytes, 5), 2u);
  EXPECT_EQ(in.bytesLeft, 3u);
  in += 2;
  EXPECT_EQ(Take<short>(in, 2), 7);
  in += 1;
  bool flag = true;
  EXPECT_EQ(in.extrude(&flag), 2u);
  EXPECT_TRUE(flag);
  Intruder out(bytes, 3);
  out += 3;
  EXPECT_EQ(out.intrude(static_cast<unsigned char>(5)), 3u);
  EXPECT_EQ(out.intrude(true), 2u) << "kept: the bool write answers from bytesLeft alone";
  EXPECT_EQ(bytes[3], 0xEE);
  const Texts expected = {
      "Can't extrude uint32_t, bytesLeft = 3\r\n", "Can't extrude uint32_t, bytesLeft = 3\r\n",
      "Can't extrude uint64_t, bytesLeft = 3\r\n", "Can't extrude array of 5 bytes, bytesLeft = 3\r\n",
      "Can't extrude uint16_t, bytesLeft = 1\r\n", "Can't extrude bool, bytesLeft = 0\r\n",
      "Can't intrude 1 bytes, bytesLeft = 0\r\n", "Can't intrude 1 bytes, bytesLeft = 0\r\n"};
  EXPECT_EQ(log.texts(), expected);
  EXPECT_EQ(log.messages()[0].sourceFile + " " + log.messages()[0].function, "../extruder extrude");
  EXPECT_EQ(log.messages()[7].sourceFile + " " + log.messages()[7].function, "../intruder verify");
  LogCapture quiet(1);
  EXPECT_EQ(in.extrude(&flag), 2u) << "the status does not hang on the message";
  EXPECT_TRUE(quiet.messages().empty());
}

TEST(MemoryStreams, MovesStopAtTheEndOrRewindWithTheKeptCountAndNeverReadPastTheBuffer) {
  // The stream holds the first 8 bytes; the rest lets a move past its end
  // be asked for without leaving the array.
  const unsigned char bytes[16] = {0xA1, 2, 3, 4, 5, 6, 7, 8};
  Extruder in(bytes, 8);
  LogCapture log;
  in += 3;
  in += 5;  // exactly to the end
  in -= 8;  // exactly back to the start
  EXPECT_EQ(in.bytesLeft, 8u);
  in += 3;
  in += 10;
  EXPECT_EQ(in.pCurrent, bytes + 8);
  EXPECT_EQ(in.bytesLeft, 0u);
  in -= 2;
  in -= 7;  // 2 + 7 is more than the length
  EXPECT_EQ(in.pCurrent, bytes);
  EXPECT_EQ(in.bytesLeft, 7u) << "kept: bytesLeft becomes the request";
  EXPECT_EQ(log.texts(), (Texts{"Unable to advance 10 bytes, bytesLeft = 5\r\n",
                                "Unable to go back 7 bytes, length-count = 1\r\n"}));
  EXPECT_EQ(log.messages()[0].function + " " + log.messages()[1].function, "operator+= operator-=");
  unsigned char all[8];
  UXB cell;
  EXPECT_EQ(in.extrude(all, 8), 2u);
  in -= 100;  // bytesLeft 100 over 8 bytes
  in += 7;
  EXPECT_EQ(in.extrude(all, 2), 2u);
  EXPECT_EQ(in.extrude(&cell, 12, 11), 2u);
  in -= 1;  // back at the start, bytesLeft 1 over 8 bytes
  EXPECT_EQ(in.extrude(&cell, 12, 11), 2u);
  EXPECT_EQ(in.extrude(&cell, 4, 7), 1u);
  EXPECT_EQ(cell.byte, 0xA);
  log.Clear();
  EXPECT_FALSE(in.setP(const_cast<unsigned char*>(bytes) + 9));
  EXPECT_EQ(in.getP(), bytes + 1) << "a refused move stays put";
  EXPECT_EQ(log.messages().at(0).format,
            "Unable to setP, pNewCurr = 0x%8p, pStart = 0x%8p, length = 0x%08X\r\n");
}

TEST(MemoryStreams, BitFields) {
  const struct {
    unsigned char byte0, byte1;
    unsigned int width, highBit, rc, value;
  } cases[] = {
      {0x68, 0, 3, 5, 0, 0x5},         {0x68, 0, 1, 3, 0, 0x1},        {0x68, 0, 4, 0xFFFFFFFF, 0, 0x6},
      {0xF0, 0, 8, 7, 0, 0xF0},        {0x12, 0x34, 12, 11, 0, 0x234}, {0x12, 0x34, 9, 0xFFFFFFFF, 0, 0x24},
      {0x12, 0x34, 16, 15, 0, 0x1234}, {0x12, 0x34, 17, 5, 4, 0},      {0x12, 0x34, 0, 5, 4, 0},
      {0x12, 0x34, 4, 2, 4, 0},        {0x12, 0x34, 4, 200, 4, 0},     {0x12, 0x34, 9, 39, 0, 0},
  };
  for (const auto& c : cases) {
    const unsigned char bytes[] = {c.byte0, c.byte1, 0xEE};
    Extruder in(bytes, sizeof bytes);
    UXB cell;
    cell.word = 0xFFFF;
    EXPECT_EQ(in.extrude(&cell, c.width, c.highBit), c.rc) << c.width << "/" << c.highBit;
    const unsigned int unit = c.rc != 0 ? 0 : c.width > 8 ? 2 : 1;
    EXPECT_EQ(in.bytesLeft, 3u - unit) << c.width << "/" << c.highBit;
    const unsigned int value = unit == 2 ? cell.word : unit == 1 ? cell.byte : c.value;
    EXPECT_EQ(value, c.value) << c.width << "/" << c.highBit;
  }
  const unsigned char last[] = {0x12, 0x34};  // a unit that ends the buffer is read
  Extruder in(last, sizeof last);
  UXB cell;
  EXPECT_EQ(in.extrude(&cell, 16, 15), 1u);
  EXPECT_EQ(cell.word, 0x1234);
}

TEST(MemoryStreams, GrowthTakesTheLargerOfStepAndRequestAndResumesAtTheOldEnd) {
  Intruder out(6u, 0u);
  out.growthStep = 4;
  EXPECT_EQ(out.intrude(0x11223344u), 1u);  // 2 bytes left
  std::memset(out.pCurrent, 0xCC, 2);
  EXPECT_EQ(out.intrude(0x55667788u), 1u);
  EXPECT_EQ(out.bytesLeft, 2u) << "overstates the room by the gap";
  EXPECT_EQ(Written(out), (Bytes{0x11, 0x22, 0x33, 0x44, 0xCC, 0xCC, 0x55, 0x66, 0x77, 0x88}));
  EXPECT_EQ(out.intrude(0x0102030405060708ul), 1u);
  EXPECT_EQ(out.length, 18u) << "grown by the request, 8";
  EXPECT_EQ(Intruder(0u, 6u).length, 6u) << "the fallback size";
  unsigned char borrowed[2] = {0xA1, 0xA2};
  Intruder grown(borrowed, 1);  // a one-byte buffer is copied too
  grown.growthStep = 1;
  grown += 1;
  EXPECT_EQ(grown.intrude(static_cast<unsigned short>(0xB1B2)), 2u);
  EXPECT_TRUE(grown.ownsBuffer);
  EXPECT_EQ(Written(grown), (Bytes{0xA1, 0xB1, 0xB2}));
  Intruder none(static_cast<unsigned char*>(nullptr), 4);  // a length but no buffer: nothing to copy
  none.growthStep = 4;
  EXPECT_EQ(none.intrude(static_cast<unsigned char>(0xC1)), 1u);
  Intruder huge(borrowed, 2);  // a step that would take the length past 32 bits
  huge.growthStep = 0xFFFFFFFFu;
  huge += 2;
  EXPECT_EQ(huge.intrude(0u), 6u);
  EXPECT_EQ(huge.pStart, borrowed);
}

// Checksums: the standard check values, running values split over calls and
// the ring wrap.
TEST(Crc, CheckValuesEmptyDataSplitsAndTheRing) {
  const unsigned char check[] = {'1', '2', '3', '4', '5', '6', '7', '8', '9'};
  EXPECT_EQ(ComputeCRC16(check, sizeof check), 0x2189);
  EXPECT_EQ(ComputeCRC32(check, sizeof check), 0xCBF43926u);
  EXPECT_EQ(ComputeCRC32(check, 0), 0u);
  EXPECT_EQ(CalcCRC16(check, 0, 0xBEEF, false, nullptr, nullptr), 0xBEEF);
  EXPECT_EQ(CRC32Enet(0x12345678u, check, 0), 0x12345678u);
  EXPECT_EQ(CRC32EnetFinal(CRC32Enet(CRC32Enet(0xFFFFFFFFu, check, 4), check + 4, 5)), 0xCBF43926u);
  const unsigned short first = CalcCRC16(check, 5, 0, false, nullptr, nullptr);
  EXPECT_EQ(CalcCRC16(check + 5, 4, first, false, nullptr, nullptr), 0x2189);
  // CRC-16 wraps after the ring's end, only when asked.
  const unsigned char ring[] = {'A', 'B', 'C', 'D'};
  const unsigned char flat[] = {'B', 'C', 'A'};
  EXPECT_EQ(CalcCRC16(ring + 1, 3, 0, true, ring, ring + 2), ComputeCRC16(flat, 3));
  EXPECT_EQ(CalcCRC16(ring + 1, 3, 0, false, ring, ring + 1), ComputeCRC16(ring + 1, 3));
}

}  // namespace
