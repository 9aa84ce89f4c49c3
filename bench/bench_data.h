// Inputs shared by the benchmarks.
#ifndef STBPLAT_BENCH_BENCH_DATA_H
#define STBPLAT_BENCH_BENCH_DATA_H

#include <cstddef>
#include <vector>

namespace stbplat {
namespace bench {

// Deterministic, non-repeating-looking bytes, so that no run is helped by
// data that happens to be uniform.
inline std::vector<unsigned char> PatternBytes(std::size_t size) {
  std::vector<unsigned char> bytes(size);
  unsigned int state = 0x12345678u;
  for (auto& b : bytes) {
    state = state * 1103515245u + 12345u;
    b = static_cast<unsigned char>(state >> 16);
  }
  return bytes;
}

}  // namespace bench
}  // namespace stbplat

#endif
