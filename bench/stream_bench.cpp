// Scalar reads and writes through the memory-mode streams against a
// hand-written inline big-endian loop over the same buffer.
#include <benchmark/benchmark.h>

#include <cstddef>
#include <cstdint>
#include <vector>

#include "bench_data.h"
#include "stbplat/extruder.h"
#include "stbplat/intruder.h"

namespace {

constexpr std::size_t kBufferSize = 4 * 1024;

template <typename T>
inline T LoadBigEndian(const unsigned char* p) {
  T value = 0;
  for (std::size_t i = 0; i < sizeof(T); ++i) value = static_cast<T>((value << 8) | p[i]);
  return value;
}

template <typename T>
inline void StoreBigEndian(unsigned char* p, T value) {
  for (std::size_t i = sizeof(T); i-- > 0;) {
    p[i] = static_cast<unsigned char>(value);
    value = static_cast<T>(value >> 8);
  }
}

template <typename T>
void ExtrudeLibrary(benchmark::State& state) {
  const std::vector<unsigned char> data = stbplat::bench::PatternBytes(kBufferSize);
  const std::size_t count = kBufferSize / sizeof(T);
  Extruder in(data.data(), static_cast<unsigned int>(data.size()));
  for (auto _ : state) {
    in.setP(const_cast<unsigned char*>(data.data()));
    T sum = 0;
    for (std::size_t i = 0; i < count; ++i) {
      T value;
      in.extrude(&value);
      sum = static_cast<T>(sum + value);
    }
    benchmark::DoNotOptimize(sum);
  }
  state.SetItemsProcessed(static_cast<int64_t>(state.iterations() * count));
}

template <typename T>
void ExtrudeInline(benchmark::State& state) {
  const std::vector<unsigned char> data = stbplat::bench::PatternBytes(kBufferSize);
  const std::size_t count = kBufferSize / sizeof(T);
  for (auto _ : state) {
    const unsigned char* p = data.data();
    std::size_t left = data.size();
    T sum = 0;
    for (std::size_t i = 0; i < count; ++i) {
      if (left < sizeof(T)) break;
      sum = static_cast<T>(sum + LoadBigEndian<T>(p));
      p += sizeof(T);
      left -= sizeof(T);
    }
    benchmark::DoNotOptimize(sum);
  }
  state.SetItemsProcessed(static_cast<int64_t>(state.iterations() * count));
}

template <typename T>
void IntrudeLibrary(benchmark::State& state) {
  std::vector<unsigned char> out(kBufferSize);
  const std::size_t count = kBufferSize / sizeof(T);
  Intruder sink(out.data(), static_cast<unsigned int>(out.size()));
  for (auto _ : state) {
    sink.setP(out.data());
    for (std::size_t i = 0; i < count; ++i) sink.intrude(static_cast<T>(i));
    benchmark::DoNotOptimize(out.data());
    benchmark::ClobberMemory();
  }
  state.SetItemsProcessed(static_cast<int64_t>(state.iterations() * count));
}

template <typename T>
void IntrudeInline(benchmark::State& state) {
  std::vector<unsigned char> out(kBufferSize);
  const std::size_t count = kBufferSize / sizeof(T);
  for (auto _ : state) {
    unsigned char* p = out.data();
    std::size_t left = out.size();
    for (std::size_t i = 0; i < count; ++i) {
      if (left < sizeof(T)) break;
      StoreBigEndian<T>(p, static_cast<T>(i));
      p += sizeof(T);
      left -= sizeof(T);
    }
    benchmark::DoNotOptimize(out.data());
    benchmark::ClobberMemory();
  }
  state.SetItemsProcessed(static_cast<int64_t>(state.iterations() * count));
}

BENCHMARK(ExtrudeLibrary<unsigned short>)->Name("extrude_u16/stbplat");
BENCHMARK(ExtrudeInline<unsigned short>)->Name("extrude_u16/inline");
BENCHMARK(ExtrudeLibrary<unsigned int>)->Name("extrude_u32/stbplat");
BENCHMARK(ExtrudeInline<unsigned int>)->Name("extrude_u32/inline");
BENCHMARK(ExtrudeLibrary<unsigned long>)->Name("extrude_u64/stbplat");
BENCHMARK(ExtrudeInline<unsigned long>)->Name("extrude_u64/inline");
BENCHMARK(IntrudeLibrary<unsigned short>)->Name("intrude_u16/stbplat");
BENCHMARK(IntrudeInline<unsigned short>)->Name("intrude_u16/inline");
BENCHMARK(IntrudeLibrary<unsigned int>)->Name("intrude_u32/stbplat");
BENCHMARK(IntrudeInline<unsigned int>)->Name("intrude_u32/inline");
BENCHMARK(IntrudeLibrary<unsigned long>)->Name("intrude_u64/stbplat");
BENCHMARK(IntrudeInline<unsigned long>)->Name("intrude_u64/inline");

}  // namespace
