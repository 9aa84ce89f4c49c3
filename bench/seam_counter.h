// Counts the calls that library code makes through the OS seam. Installs a
// table whose every entry counts and forwards to the table in force when the
// counter was created (the C library or a simulator), for its lifetime.
#ifndef STBPLAT_BENCH_SEAM_COUNTER_H
#define STBPLAT_BENCH_SEAM_COUNTER_H

#include <cstdint>
#include <memory>

#include "os/seam.h"

namespace stbplat {
namespace bench {

struct SeamCallCounts {
  std::uint64_t open = 0, close = 0, lseek64 = 0, read = 0, write = 0, ioctl = 0;
  std::uint64_t stdio = 0;  // fopen64 .. ferror, popen, pclose
  std::uint64_t other = 0;  // mmap64, munmap, getpagesize, readlink, unlink, sleep

  std::uint64_t Total() const {
    return open + close + lseek64 + read + write + ioctl + stdio + other;
  }
};

class SeamCallCounter {
 public:
  SeamCallCounter();
  ~SeamCallCounter();
  SeamCallCounter(const SeamCallCounter&) = delete;
  SeamCallCounter& operator=(const SeamCallCounter&) = delete;

  const SeamCallCounts& counts() const;
  void Reset();

 private:
  std::unique_ptr<os::ScopedSysCalls> swap_;
};

}  // namespace bench
}  // namespace stbplat

#endif
