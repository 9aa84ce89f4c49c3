// Reads a MemoryConfigDescriptor from arbitrary bytes; what reads and can be
// stored must store, read back and store again to the same bytes. Records in
// the old (minor 5 and below) layouts are read but stored in the new layout
// under their old header, on purpose, so they take no part in the round trip.
#include "fuzz_support.h"

namespace {

constexpr unsigned char kNewLayoutMinor = 6;

bool AllInNewLayout(const MemoryConfigDescriptor& config) {
  for (const MemoryControllerDescriptor& controller : config.memoryControllers) {
    if (controller.minorVer < kNewLayoutMinor) return false;
    for (const MemoryControllerSegmentDescriptor& segment : controller.memorySegments)
      if (segment.minorVer < kNewLayoutMinor) return false;
  }
  return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const unsigned char* data, size_t size) {
  if (size > 0xFFFFFFFFu) return 0;
  Extruder in(data, static_cast<unsigned int>(size));
  MemoryConfigDescriptor record;
  auto read = [](MemoryConfigDescriptor& r, Extruder& from) { return r.ReadTLVAndData(from, nullptr); };
  auto store = [](const MemoryConfigDescriptor& r, Intruder& to) { return r.StoreTLVAndData(&to); };
  if (read(record, in) == 0 && AllInNewLayout(record))
    stbplat::fuzz::CheckRoundTrip(record, read, store);
  return 0;
}
