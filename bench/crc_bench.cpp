// Checksums against baselines: the CRC-32 against zlib's (same polynomial,
// same result, table-driven with slicing), the CRC-16 against the plain
// bit-at-a-time loop that a table saves.
#include <benchmark/benchmark.h>
#include <zlib.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "bench_data.h"
#include "stbplat/crc.h"

namespace {

constexpr std::size_t kSmall = 4 * 1024;
constexpr std::size_t kLarge = 1024 * 1024;
// CalcCRC16 takes a 16-bit count: longer data goes in pieces of at most this.
constexpr std::size_t kCrc16Piece = 0xFFFF;
constexpr uint16_t kKermitPolyReflected = 0x8408;

uint16_t BitwiseCrc16(uint16_t crc, const unsigned char* data, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    crc ^= data[i];
    for (int bit = 0; bit < 8; ++bit) {
      crc = (crc & 1u) ? static_cast<uint16_t>((crc >> 1) ^ kKermitPolyReflected)
                       : static_cast<uint16_t>(crc >> 1);
    }
  }
  return crc;
}

void Crc32Library(benchmark::State& state, std::size_t size) {
  const std::vector<unsigned char> data = stbplat::bench::PatternBytes(size);
  for (auto _ : state) {
    benchmark::DoNotOptimize(ComputeCRC32(data.data(), static_cast<unsigned int>(size)));
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * size));
}

void Crc32Zlib(benchmark::State& state, std::size_t size) {
  const std::vector<unsigned char> data = stbplat::bench::PatternBytes(size);
  for (auto _ : state) {
    benchmark::DoNotOptimize(crc32(0L, data.data(), static_cast<uInt>(size)));
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * size));
}

void Crc16Library(benchmark::State& state, std::size_t size) {
  const std::vector<unsigned char> data = stbplat::bench::PatternBytes(size);
  for (auto _ : state) {
    unsigned short crc = 0;
    for (std::size_t at = 0; at < size; at += kCrc16Piece) {
      const std::size_t piece = std::min(kCrc16Piece, size - at);
      crc = CalcCRC16(data.data() + at, static_cast<unsigned short>(piece), crc, false,
                      nullptr, nullptr);
    }
    benchmark::DoNotOptimize(crc);
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * size));
}

void Crc16Bitwise(benchmark::State& state, std::size_t size) {
  const std::vector<unsigned char> data = stbplat::bench::PatternBytes(size);
  for (auto _ : state) {
    benchmark::DoNotOptimize(BitwiseCrc16(0, data.data(), size));
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * size));
}

BENCHMARK_CAPTURE(Crc32Library, 4KiB, kSmall)->Name("crc32/4KiB/stbplat");
BENCHMARK_CAPTURE(Crc32Zlib, 4KiB, kSmall)->Name("crc32/4KiB/zlib");
BENCHMARK_CAPTURE(Crc32Library, 1MiB, kLarge)->Name("crc32/1MiB/stbplat");
BENCHMARK_CAPTURE(Crc32Zlib, 1MiB, kLarge)->Name("crc32/1MiB/zlib");
BENCHMARK_CAPTURE(Crc16Library, 4KiB, kSmall)->Name("crc16/4KiB/stbplat");
BENCHMARK_CAPTURE(Crc16Bitwise, 4KiB, kSmall)->Name("crc16/4KiB/bitwise");
BENCHMARK_CAPTURE(Crc16Library, 1MiB, kLarge)->Name("crc16/1MiB/stbplat");
BENCHMARK_CAPTURE(Crc16Bitwise, 1MiB, kLarge)->Name("crc16/1MiB/bitwise");

}  // namespace
