// Reads a MemoryConfigDescriptor from arbitrary bytes; what reads must
// store, read back and store again to the same bytes. Records in the old
// (minor 5 and below) layouts convert as they are read, so they take part.
#include "fuzz_support.h"

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
  if (size > 0xFFFFFFFFu) return 0;
  Extruder in(data, static_cast<unsigned int>(size));
  MemoryConfigDescriptor record;
  auto read = [](MemoryConfigDescriptor& r, Extruder& from) { return r.ReadTLVAndData(from, nullptr); };
  auto store = [](const MemoryConfigDescriptor& r, Intruder& to) { return r.StoreTLVAndData(&to); };
  if (read(record, in) == 0)
    stbplat::fuzz::CheckRoundTrip(record, read, store);
  return 0;
}
