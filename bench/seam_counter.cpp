#include "seam_counter.h"

namespace stbplat {
namespace bench {
namespace {

// The forwarding entries are plain function pointers, so the forwarded-to
// table and the counts live at namespace scope: one counter at a time.
os::SysCalls g_inner;
SeamCallCounts g_counts;

os::SysCalls CountingTable() {
  os::SysCalls t = g_inner;
  // Each entry: a captureless generic lambda, converted to the entry's type.
#define STBPLAT_COUNT(name, bucket) \
  t.name = [](auto... args) { ++g_counts.bucket; return g_inner.name(args...); }
  STBPLAT_COUNT(open, open);
  STBPLAT_COUNT(close, close);
  STBPLAT_COUNT(lseek64, lseek64);
  STBPLAT_COUNT(read, read);
  STBPLAT_COUNT(write, write);
  STBPLAT_COUNT(ioctl, ioctl);
  STBPLAT_COUNT(fopen64, stdio);
  STBPLAT_COUNT(fclose, stdio);
  STBPLAT_COUNT(fread, stdio);
  STBPLAT_COUNT(fwrite, stdio);
  STBPLAT_COUNT(fseek, stdio);
  STBPLAT_COUNT(ftell, stdio);
  STBPLAT_COUNT(fgets, stdio);
  STBPLAT_COUNT(ferror, stdio);
  STBPLAT_COUNT(popen, stdio);
  STBPLAT_COUNT(pclose, stdio);
  STBPLAT_COUNT(mmap64, other);
  STBPLAT_COUNT(munmap, other);
  STBPLAT_COUNT(readlink, other);
  STBPLAT_COUNT(unlink, other);
  STBPLAT_COUNT(sleep, other);
  t.getpagesize = [] { ++g_counts.other; return g_inner.getpagesize(); };
#undef STBPLAT_COUNT
  return t;
}

}  // namespace

SeamCallCounter::SeamCallCounter() {
  g_inner = os::Sys();
  g_counts = SeamCallCounts();
  swap_ = std::make_unique<os::ScopedSysCalls>(CountingTable());
}

SeamCallCounter::~SeamCallCounter() = default;

const SeamCallCounts& SeamCallCounter::counts() const { return g_counts; }

void SeamCallCounter::Reset() { g_counts = SeamCallCounts(); }

}  // namespace bench
}  // namespace stbplat
