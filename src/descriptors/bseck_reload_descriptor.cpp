// "BSCK": the executing boot-security image type and the reload errors.
#include "descriptors/nested_list.h"
#include "descriptors/record_io.h"
#include "stbplat/bseck_reload.h"

using namespace stbplat::records;

namespace {
constexpr unsigned char kBsckMajorVersion = 0;
constexpr unsigned char kBsckMinorVersion = 0;
}  // namespace

BseckReloadDescriptor::BseckReloadDescriptor()
    : BseckReloadDescriptor(0, kBsckMajorVersion, kBsckMinorVersion) {}

BseckReloadDescriptor::BseckReloadDescriptor(unsigned short flagsWord, unsigned char major,
                                             unsigned char minor)
    : SystemDescriptor(kEntryTypeBSCK, flagsWord, major, minor), ExecutingType(0) {}

BseckReloadDescriptor::~BseckReloadDescriptor() {}

unsigned int BseckReloadDescriptor::Read(Extruder& in, unsigned int) {
  if (!Extruded(in.extrude(&ExecutingType))) {
    RECORD_ERROR("Read", "Error reading ExecutingType\r\n");
    return kDescriptorFieldError;
  }
  unsigned short numReloadError = 0;
  if (!Extruded(in.extrude(&numReloadError))) {
    RECORD_ERROR("Read", "Error reading numReloadError\r\n");
    return kDescriptorFieldError;
  }
  const unsigned int result = ReadList(numReloadError, ReloadErrors, FailedElement::kDropped,
                                       [&in](BseckReloadError& error) { return error.Read(in); });
  if (result != kDescriptorOk) RECORD_ERROR("Read", "Error reading ReloadErrors\r\n");
  return result;
}

unsigned int BseckReloadDescriptor::Store(Intruder* out) const {
  if (!Intruded(out->intrude(ExecutingType))) {
    RECORD_ERROR("Store", "Error writing ExecutingType\r\n");
    return kDescriptorFieldError;
  }
  if (!Intruded(out->intrude(static_cast<unsigned short>(ReloadErrors.size())))) {
    RECORD_ERROR("Store", "Error writing numReloadError\r\n");
    return kDescriptorFieldError;
  }
  const bool stored =
      StoreList(ReloadErrors, [out](const BseckReloadError& error) { return error.Store(out); });
  if (!stored) {
    RECORD_ERROR("Store", "Error writing ReloadErrors\r\n");
    return kDescriptorWrongType;
  }
  return kDescriptorOk;
}
