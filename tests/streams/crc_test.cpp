// Checksums: the standard check values, running values split over calls, the
// ring wrap, and a long pattern against a bitwise CRC-16/KERMIT and zlib's
// crc32.
#include <gtest/gtest.h>

#include <vector>

#include "stbplat/crc.h"

#ifdef STBPLAT_HAVE_ZLIB
#include <zlib.h>
#endif

namespace {

const unsigned char kCheck[] = {'1', '2', '3', '4', '5', '6', '7', '8', '9'};

TEST(Crc, CheckValuesEmptyDataSplitsAndTheRing) {
  EXPECT_EQ(ComputeCRC16(kCheck, sizeof kCheck), 0x2189);
  EXPECT_EQ(ComputeCRC32(kCheck, sizeof kCheck), 0xCBF43926u);
  EXPECT_EQ(ComputeCRC32(kCheck, 0), 0u);
  EXPECT_EQ(CalcCRC16(kCheck, 0, 0xBEEF, false, nullptr, nullptr), 0xBEEF);
  EXPECT_EQ(CRC32Enet(0x12345678u, kCheck, 0), 0x12345678u);
  EXPECT_EQ(CRC32EnetFinal(CRC32Enet(CRC32Enet(0xFFFFFFFFu, kCheck, 4), kCheck + 4, 5)), 0xCBF43926u);
  const unsigned short first = CalcCRC16(kCheck, 5, 0, false, nullptr, nullptr);
  EXPECT_EQ(CalcCRC16(kCheck + 5, 4, first, false, nullptr, nullptr), 0x2189);
  // CRC-16 wraps after the ring's end, only when asked.
  const unsigned char ring[] = {'A', 'B', 'C', 'D'};
  const unsigned char flat[] = {'B', 'C', 'A'};
  EXPECT_EQ(CalcCRC16(ring + 1, 3, 0, true, ring, ring + 2), ComputeCRC16(flat, 3));
  EXPECT_EQ(CalcCRC16(ring + 1, 3, 0, false, ring, ring + 1), ComputeCRC16(ring + 1, 3));
}

TEST(Crc, EveryTableEntryAgainstBitwiseDefinitions) {
  std::vector<unsigned char> data(4096);  // reaches every table entry many times
  for (size_t i = 0; i < data.size(); ++i) data[i] = static_cast<unsigned char>(i * 7 + i / 256);
  unsigned short kermit = 0x1D0F;
  for (unsigned char byte : data) {
    kermit ^= byte;
    for (int bit = 0; bit < 8; ++bit)
      kermit = (kermit & 1) ? static_cast<unsigned short>((kermit >> 1) ^ 0x8408) : kermit >> 1;
  }
  EXPECT_EQ(CalcCRC16(data.data(), 4096, 0x1D0F, false, nullptr, nullptr), kermit);
#ifdef STBPLAT_HAVE_ZLIB
  EXPECT_EQ(ComputeCRC32(data.data(), 4096), crc32(0L, data.data(), 4096));
#endif
}

}  // namespace
