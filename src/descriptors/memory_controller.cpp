// "MCET": one memory controller's DDR settings and its segments.
#include "descriptors/nested_list.h"
#include "descriptors/record_io.h"
#include "stbplat/memory_config.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kMcetMajorVersion = 0;

unsigned int ReadSegments(Extruder& in, unsigned long count,
                          std::vector<MemoryControllerSegmentDescriptor>& segments) {
  const unsigned int result =
      ReadList(count, segments, FailedElement::kDropped, [&in](MemoryControllerSegmentDescriptor& segment) {
        return segment.ReadTLVAndData(in, nullptr);
      });
  if (result != kDescriptorOk) RECORD_ERROR("Read", "Error reading memorySegments\r\n");
  return result;
}

}  // namespace

MemoryControllerDescriptor::MemoryControllerDescriptor()
    : SystemDescriptor(kEntryTypeMCET, 0, kMcetMajorVersion, kMemoryLayoutMinorVersion),
      ddrCfgWidth(0),
      ddrSize(0),
      ddrSpeed(0),
      ddrDevTech(0),
      ddrMode(0),
      ddrDevWidth(0) {}

MemoryControllerDescriptor::~MemoryControllerDescriptor() {}

unsigned int MemoryControllerDescriptor::Read(Extruder& in, unsigned int) {
  if (minorVer < kMemoryLayoutMinorVersion) {
    unsigned int memoryControllerNumber = 0;
    if (!Extruded(in.extrude(&memoryControllerNumber))) {
      RECORD_ERROR("Read", "Error reading memoryControllerNumber\r\n");
      return kDescriptorFieldError;
    }
    unsigned int numSegments = 0;
    if (!Extruded(in.extrude(&numSegments))) {
      RECORD_ERROR("Read", "Error reading numSegments\r\n");
      return kDescriptorFieldError;
    }
    const unsigned int result = ReadSegments(in, numSegments, memorySegments);
    if (result != kDescriptorOk) return result;
    // The old layout has no DDR settings: the record reads, but is marked
    // as not valid.
    ddrCfgWidth = ddrSize = ddrSpeed = ddrDevTech = ddrMode = ddrDevWidth = 0;
    valid = false;
    return kDescriptorOk;
  }
  if (!Extruded(in.extrude(&ddrCfgWidth))) {
    RECORD_ERROR("Read", "Error reading ddrCfgWidth\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&ddrSize))) {
    RECORD_ERROR("Read", "Error reading ddrSize\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&ddrSpeed))) {
    RECORD_ERROR("Read", "Error reading ddrSpeed\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&ddrDevTech))) {
    RECORD_ERROR("Read", "Error reading ddrDevTech\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&ddrMode))) {
    RECORD_ERROR("Read", "Error reading ddrMode\r\n");
    return kDescriptorFieldError;
  }
  if (!Extruded(in.extrude(&ddrDevWidth))) {
    RECORD_ERROR("Read", "Error reading ddrDevWidth\r\n");
    return kDescriptorFieldError;
  }
  unsigned short numSegments = 0;
  if (!Extruded(in.extrude(&numSegments))) {
    RECORD_ERROR("Read", "Error reading numSegments\r\n");
    return kDescriptorFieldError;
  }
  return ReadSegments(in, numSegments, memorySegments);
}

unsigned int MemoryControllerDescriptor::Store(Intruder* out) const {
  if (!Intruded(out->intrude(ddrCfgWidth))) {
    RECORD_ERROR("Store", "Error writing ddrCfgWidth\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(ddrSize))) {
    RECORD_ERROR("Store", "Error writing ddrSize\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(ddrSpeed))) {
    RECORD_ERROR("Store", "Error writing ddrSpeed\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(ddrDevTech))) {
    RECORD_ERROR("Store", "Error writing ddrDevTech\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(ddrMode))) {
    RECORD_ERROR("Store", "Error writing ddrMode\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(ddrDevWidth))) {
    RECORD_ERROR("Store", "Error writing ddrDevWidth\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(static_cast<unsigned short>(memorySegments.size())))) {
    RECORD_ERROR("Store", "Error writing numSegments\r\n");
    return kDescriptorFieldError;
  }
  const bool stored = StoreList(memorySegments, [out](const MemoryControllerSegmentDescriptor& s) {
    return s.StoreTLVAndData(out);
  });
  if (!stored) {
    RECORD_ERROR("Store", "Error writing memorySegments\r\n");
    return kDescriptorWrongType;
  }
  return kDescriptorOk;
}
