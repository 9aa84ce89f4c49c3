// "MCSD": one physical address range of a memory controller.
#include "descriptors/record_io.h"
#include "stbplat/memory_config.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kMcsdMajorVersion = 0;
// Sizes were stored in bytes before the current layout; MiB since.
constexpr unsigned int kBytesToMiBShift = 20;
}  // namespace

MemoryControllerSegmentDescriptor::MemoryControllerSegmentDescriptor()
    : SystemDescriptor(kEntryTypeMCSD, 0, kMcsdMajorVersion, kMemoryLayoutMinorVersion),
      segmentPhysicalAddressStart(0),
      segmentSize(0) {}

MemoryControllerSegmentDescriptor::~MemoryControllerSegmentDescriptor() {}

unsigned int MemoryControllerSegmentDescriptor::Read(Extruder& in, unsigned int) {
  if (!Extruded(in.extrude(&segmentPhysicalAddressStart))) {
    RECORD_ERROR("Read", "Error reading segmentPhysicalAddressStart\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&segmentSize))) {
    RECORD_ERROR("Read", "Error reading segmentSize\r\n");
    return kDescriptorFieldError;
  }
  if (minorVer < kMemoryLayoutMinorVersion) {
    segmentSize >>= kBytesToMiBShift;
  }
  return kDescriptorOk;
}

unsigned int MemoryControllerSegmentDescriptor::Store(Intruder* out) const {
  if (!Intruded(out->intrude(segmentPhysicalAddressStart))) {
    RECORD_ERROR("Store", "Error writing segmentPhysicalAddressStart\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(segmentSize))) {
    RECORD_ERROR("Store", "Error writing segmentSize\r\n");
    return kDescriptorFieldError;
  }
  return kDescriptorOk;
}
