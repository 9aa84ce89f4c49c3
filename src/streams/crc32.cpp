// The Ethernet CRC-32 (IEEE 802.3), computed with the normal (non-reflected)
// polynomial table and explicit bit reversals.
#include "stbplat/crc.h"

#include <atomic>

namespace {

constexpr unsigned int kPolynomial = 0x04C11DB7u;
constexpr unsigned int kTopBit = 0x80000000u;
constexpr unsigned int kBitsPerByte = 8;
constexpr unsigned int kTopByteShift = 24;
constexpr unsigned int kByteMask = 0xFFu;

// Built on first use. Two threads racing here build identical contents;
// the flag is published with release and read with acquire, so a thread that
// sees it set also sees every entry, on weakly ordered CPUs too.
unsigned int crc32Table[256];
std::atomic<bool> crc32TableBuilt{false};

void BuildCrc32Table() {
  for (unsigned int i = 0; i < 256; ++i) {
    unsigned int entry = i << kTopByteShift;
    for (unsigned int bit = 0; bit < kBitsPerByte; ++bit)
      entry = (entry & kTopBit) != 0 ? (entry << 1) ^ kPolynomial : entry << 1;
    crc32Table[i] = entry;
  }
  crc32TableBuilt.store(true, std::memory_order_release);
}

// The low `bits` bits of value in reverse order.
unsigned int reverse(unsigned int value, unsigned int bits) {
  unsigned int out = 0;
  for (unsigned int i = 0; i < bits; ++i) {
    out = (out << 1) | (value & 1u);
    value >>= 1;
  }
  return out;
}

}  // namespace

extern "C" {

unsigned int CRC32Enet(unsigned int crc, const unsigned char* data, unsigned int count) {
  if (!crc32TableBuilt.load(std::memory_order_acquire)) BuildCrc32Table();
  for (unsigned int i = 0; i < count; ++i) {
    unsigned int r = reverse(data[i], kBitsPerByte);
    crc = (crc << kBitsPerByte) ^ crc32Table[((crc >> kTopByteShift) ^ r) & kByteMask];
  }
  return crc;
}

unsigned int CRC32EnetFinal(unsigned int crc) { return ~reverse(crc, 32); }

unsigned int ComputeCRC32(const unsigned char* data, unsigned int count) {
  return CRC32EnetFinal(CRC32Enet(0xFFFFFFFFu, data, count));
}

}  // extern "C"
