// "MCFG": the list of memory controllers.
#include "descriptors/nested_list.h"
#include "descriptors/record_io.h"
#include "stbplat/memory_config.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kMcfgMajorVersion = 0;
}  // namespace

MemoryConfigDescriptor::MemoryConfigDescriptor()
    : MemoryConfigDescriptor(0, kMcfgMajorVersion, kMemoryLayoutMinorVersion) {}

MemoryConfigDescriptor::MemoryConfigDescriptor(unsigned short flagsWord, unsigned char major,
                                               unsigned char minor)
    : SystemDescriptor(kEntryTypeMCFG, flagsWord, major, minor) {}

MemoryConfigDescriptor::~MemoryConfigDescriptor() {}

unsigned int MemoryConfigDescriptor::Read(Extruder& in, unsigned int) {
  unsigned char numControllers = 0;
  if (!Extruded(in.extrude(&numControllers, 1))) {
    RECORD_ERROR("Read", "Error reading numControllers\r\n");
    return kDescriptorFieldError;
  }
  unsigned char reserved = 0;
  if (!Extruded(in.extrude(&reserved, 1))) {
    RECORD_ERROR("Read", "Error reading reserved\r\n");
    return kDescriptorFieldError;
  }
  const unsigned int result =
      ReadList(numControllers, memoryControllers, FailedElement::kKept, [&in](MemoryControllerDescriptor& controller) {
        return controller.ReadTLVAndData(in, nullptr);
      });
  if (result != kDescriptorOk) RECORD_ERROR("Read", "Error reading memoryControllers\r\n");
  return result;
}

unsigned int MemoryConfigDescriptor::Store(Intruder* out) const {
  if (!Intruded(out->intrude(static_cast<unsigned char>(memoryControllers.size())))) {
    RECORD_ERROR("Store", "Error writing numControllers\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(static_cast<unsigned char>(0)))) {
    RECORD_ERROR("Store", "Error writing reserved\r\n");
    return kDescriptorFieldError;
  }
  const bool stored = StoreList(memoryControllers, [out](const MemoryControllerDescriptor& c) {
    return c.StoreTLVAndData(out);
  });
  if (!stored) {
    RECORD_ERROR("Store", "Error writing memoryControllers\r\n");
    return kDescriptorWrongType;
  }
  return kDescriptorOk;
}
