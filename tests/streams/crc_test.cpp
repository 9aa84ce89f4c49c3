// Checksums: standard check values, the ring wrap, and differential checks
// against zlib's crc32 and an independent bitwise CRC-16/KERMIT.
#include <gtest/gtest.h>

#include <random>
#include <vector>

#include "stbplat/crc.h"

#ifdef STBPLAT_HAVE_ZLIB
#include <zlib.h>
#endif

namespace {

const unsigned char kCheck[] = {'1', '2', '3', '4', '5', '6', '7', '8', '9'};

// CRC-16/KERMIT one bit at a time, straight from its definition.
unsigned short BitwiseKermit(const unsigned char* data, size_t n, unsigned short crc) {
  for (size_t i = 0; i < n; ++i) {
    crc ^= data[i];
    for (int bit = 0; bit < 8; ++bit) crc = (crc & 1) ? static_cast<unsigned short>((crc >> 1) ^ 0x8408) : crc >> 1;
  }
  return crc;
}

TEST(Crc, CheckValues) {
  EXPECT_EQ(ComputeCRC16(kCheck, sizeof kCheck), 0x2189);
  EXPECT_EQ(ComputeCRC32(kCheck, sizeof kCheck), 0xCBF43926u);
  EXPECT_EQ(ComputeCRC32(kCheck, 0), 0u);
  EXPECT_EQ(CalcCRC16(kCheck, 0, 0xBEEF, false, nullptr, nullptr), 0xBEEF);
  EXPECT_EQ(CRC32Enet(0x12345678u, kCheck, 0), 0x12345678u);
}

TEST(Crc, Crc32SplitsOverRunningValues) {
  unsigned int running = CRC32Enet(0xFFFFFFFFu, kCheck, 4);
  running = CRC32Enet(running, kCheck + 4, 5);
  EXPECT_EQ(CRC32EnetFinal(running), 0xCBF43926u);
}

TEST(Crc, Crc16PiecesChainThroughTheInitialValue) {
  unsigned short first = CalcCRC16(kCheck, 5, 0, false, nullptr, nullptr);
  EXPECT_EQ(CalcCRC16(kCheck + 5, 4, first, false, nullptr, nullptr), 0x2189);
}

TEST(Crc, Crc16WrapsAfterTheRingEnd) {
  const unsigned char ring[] = {'A', 'B', 'C'};
  const unsigned char flat[] = {'B', 'C', 'A'};
  EXPECT_EQ(CalcCRC16(ring + 1, 3, 0, true, ring, ring + 2), ComputeCRC16(flat, 3));
  // Without the wrap flag the ring bounds are ignored.
  const unsigned char longer[] = {'A', 'B', 'C', 'D'};
  EXPECT_EQ(CalcCRC16(longer + 1, 3, 0, false, longer, longer + 1), ComputeCRC16(longer + 1, 3));
}

TEST(Crc, Crc16MatchesBitwiseKermitOnRandomData) {
  std::mt19937 rng(1234);
  for (int round = 0; round < 200; ++round) {
    std::vector<unsigned char> data(rng() % 3000);
    for (auto& b : data) b = static_cast<unsigned char>(rng());
    unsigned short init = static_cast<unsigned short>(rng());
    ASSERT_EQ(CalcCRC16(data.data(), static_cast<unsigned short>(data.size()), init, false, nullptr, nullptr),
              BitwiseKermit(data.data(), data.size(), init));
  }
}

#ifdef STBPLAT_HAVE_ZLIB
TEST(Crc, Crc32MatchesZlibOnRandomDataAndSplits) {
  std::mt19937 rng(99);
  for (int round = 0; round < 200; ++round) {
    std::vector<unsigned char> data(rng() % 5000);
    for (auto& b : data) b = static_cast<unsigned char>(rng());
    auto expected = static_cast<unsigned int>(crc32(0L, data.data(), static_cast<uInt>(data.size())));
    ASSERT_EQ(ComputeCRC32(data.data(), static_cast<unsigned int>(data.size())), expected);
    unsigned int running = 0xFFFFFFFFu;
    size_t at = 0;
    while (at < data.size()) {
      size_t piece = std::min<size_t>(data.size() - at, rng() % 700);
      running = CRC32Enet(running, data.data() + at, static_cast<unsigned int>(piece));
      at += piece;
    }
    ASSERT_EQ(CRC32EnetFinal(running), expected);
  }
}
#endif

}  // namespace
